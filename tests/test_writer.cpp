// The image writer alone: records made by hand, no source and no compile.
#include <gtest/gtest.h>

#include <bit>
#include <cerrno>

#include "qecfg/cdb_reader.h"
#include "qecfg_bld.h"

namespace {

struct hand_made_records {
    table_arena arena;
    record_table classes{"ResourceClasses", 3584}, maps{"ResourceCMMaps", 480}, managers{"ResourceManagers", 192},
        var_classes{"ResourceVariableClasses", 320};
    std::vector<bool> named;
    std::set<std::pair<const tbl *, size_t>> numeric_ranges;

    hand_made_records() {
        rsrc_class_t c{};
        c.rc_cb_ID = RSRC_CLASS_ID;
        c.rc_class_id = 7;
        classes.append(arena, c);
        rsrc_mgr_t m{};
        m.rm_cb_ID = RSRC_MGR_ID;
        tbl *strings = arena.new_tbl("ManagerStrings", 8192);
        arena.add_to_tbl(strings, "RM", 3);
        m.u_rm_strings_table = table_ref(strings);
        managers.append(arena, m);
        maps.append(arena, rsrc_cmmap_t{});
    }
    compiled_records records() { return {classes, maps, managers, var_classes, named, numeric_ranges}; }
};

TEST(Writer, LaysRecordsIntoDsectsBehindTheHeaderAndAnchors) {
    hand_made_records r;
    std::vector<uint8_t> image;
    memory_sink sink(image);
    cdb_writer(r.arena, image_target{&sink, "", {}}, false).write(r.records());
    size_t manager = CDB_HEADER_SIZE + 3 * CDB_ANCHOR_SIZE + sizeof(rsrc_class_t);
    size_t map = manager + sizeof(rsrc_mgr_t) + 8;
    ASSERT_EQ(image.size(), map + sizeof(rsrc_cmmap_t));
    // The records are bare (no names, no tables), so the image is read as far
    // as open and the manager go, without the full check.
    cdb_t db;
    ASSERT_EQ(cdb_open(&db, image.data(), image.size()), CDB_OK);
    EXPECT_TRUE(cdb_check_checksum(&db));
    cdb_header_t h;
    cdb_get_header(&db, &h);
    EXPECT_EQ(h.length, image.size() - 4);
    EXPECT_EQ(h.dsect_count, 3u);
    EXPECT_EQ(h.max_class_id, 7);
    // Class, manager, map: each anchor gives its dsect's offset and length.
    const uint32_t anchors[][3] = {{CDB_DSECT_CLASS, CDB_HEADER_SIZE + 3 * CDB_ANCHOR_SIZE, sizeof(rsrc_class_t)},
                                   {CDB_DSECT_RSRC_MGR, uint32_t(manager), sizeof(rsrc_mgr_t) + 8},
                                   {CDB_DSECT_CMMAP, uint32_t(map), sizeof(rsrc_cmmap_t)}};
    for (uint32_t i = 0; i < 3; i++) {
        cdb_dsect_t d{};
        EXPECT_EQ(cdb_dsect_at(&db, i, &d), CDB_OK);
        EXPECT_EQ(d.type, anchors[i][0]) << i;
        EXPECT_EQ(d.offset, anchors[i][1]) << i;
        EXPECT_EQ(d.length, anchors[i][2]) << i;
    }
    // The manager's strings right behind its record.
    cdb_manager_t m{};
    ASSERT_EQ(cdb_get_manager(&db, &m), CDB_OK);
    EXPECT_EQ(m.name, reinterpret_cast<const char *>(image.data()) + manager + sizeof(rsrc_mgr_t));
    EXPECT_STREQ(m.name, "RM");
}

TEST(Writer, ReversedImageIsInTheOtherByteOrder) {
    hand_made_records r;
    std::vector<uint8_t> image;
    memory_sink sink(image);
    cdb_writer(r.arena, image_target{&sink, "", {}}, true).write(r.records());
    cdb_t db;
    ASSERT_EQ(cdb_open(&db, image.data(), image.size()), CDB_OK);
    EXPECT_NE(db.big_endian != 0, std::endian::native == std::endian::big);
    EXPECT_TRUE(cdb_check_checksum(&db));
}

// A sink that fails at commit, and must then be told to give up the image.
class failing_sink final : public image_sink {
  public:
    explicit failing_sink(sink_failure failure) : failure(std::move(failure)) {}
    char *acquire(size_t size) override { return (bytes = std::vector<char>(size)).data(); }
    void commit(size_t) override { throw failure; }
    void abandon() noexcept override { abandoned = true; }
    sink_failure failure;
    std::vector<char> bytes;
    bool abandoned = false;
};

// The failure's row and reason (or else its error number's text) make the
// message.
TEST(Writer, FailedCommitIsFatalAndAbandonsTheImage) {
    const std::pair<sink_failure, std::string> cases[] = {
        {{msg::cannot_write, ENOSPC, ""}, std::string("Cannot write CDB file: ") + std::strerror(ENOSPC)},
        {{msg::cannot_extend, EINVAL, "File shorter than its reserved size"},
         "Cannot extend CDB file: File shorter than its reserved size"},
    };
    for (const auto &[failure, message] : cases) {
        hand_made_records r;
        failing_sink sink(failure);
        try {
            cdb_writer(r.arena, image_target{&sink, "", {}}, false).write(r.records());
            ADD_FAILURE() << "the commit failure was lost";
        } catch (const qecfg_fatal &f) {
            EXPECT_EQ(f.id, failure.id);
            EXPECT_EQ(f.text(false), message);
        }
        EXPECT_TRUE(sink.abandoned);
    }
}

} // namespace
