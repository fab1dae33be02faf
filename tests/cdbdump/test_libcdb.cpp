// libcdb on images made by the test-only writer: every kind of value in both
// byte orders, lookups with and without the index, the cheap open against the
// full check, and damaged files, which must stay inside the buffer and never
// pass a check that the walker refuses.
#include <gtest/gtest.h>

#include <cstddef>
#include <string>
#include <vector>

#include "cdb.h"
#include "cdb_internal.h"
#include "cdb_visit.h"
#include "cdb_walk.h"
#include "qecfg/cdb_reader.hpp"
#include "test_images.h"

// The reader's offsets are those of the record declarations.
static_assert(RC_SIZE == sizeof(rsrc_class_t) && PA_SIZE == sizeof(rsrc_pattr_t) && DA_SIZE == sizeof(rsrc_dattr_t));
static_assert(AC_SIZE == sizeof(rsrc_action_t) && RM_SIZE == sizeof(rsrc_mgr_t) && RCM_SIZE == sizeof(rsrc_cmmap_t));
static_assert(RVC_SIZE == sizeof(rsrc_variable_class_t) && HDR_SIZE == sizeof(qel_cdb_header_t));
static_assert(RC_VERSION == offsetof(rsrc_class_t, rc_version) && RC_LOCATOR == offsetof(rsrc_class_t, rc_locator));
static_assert(RC_DEF_INPUT == offsetof(rsrc_class_t, u_rc_def_input) &&
              RC_STRINGS == offsetof(rsrc_class_t, u_rc_strings));
static_assert(RC_VALVAL_SIZE == offsetof(rsrc_class_t, rc_valval_size) &&
              RC_PERM_TEMP_C == offsetof(rsrc_class_t, rc_perm_tempC));
static_assert(PA_DFLT == offsetof(rsrc_pattr_t, ra_dflt_value) && PA_SD == offsetof(rsrc_pattr_t, u_ra_sd));
static_assert(PA_ATTR_ID == offsetof(rsrc_pattr_t, ra_attr_id) &&
              PA_MAX_SD_IDX == offsetof(rsrc_pattr_t, ra_max_sd_idx));
static_assert(DA_MIN == offsetof(rsrc_dattr_t, ra_min_value) && DA_XAV == offsetof(rsrc_dattr_t, u_ra_XAV_name));
static_assert(DA_VAR_TYPE == offsetof(rsrc_dattr_t, ra_var_type) &&
              DA_REPORT_INTERVAL == offsetof(rsrc_dattr_t, ra_report_interval));
static_assert(AC_SD_RESP == offsetof(rsrc_action_t, u_ac_sd_resp) && AC_PERMS == offsetof(rsrc_action_t, ac_perms));
static_assert(SDF_VTYPE == offsetof(sd_field, sd_valid_type) && SDF_VALID_VALS == offsetof(sd_field, u_sd_valid_vals));
static_assert(RVC_STRINGS == offsetof(rsrc_variable_class_t, u_rvc_string_tbl) &&
              RCM_WORDS == offsetof(rsrc_cmmap_t, rcm_static_contexts));

namespace {

using cdbtest::rich_image;

struct opened {
    std::vector<uint8_t> bytes;
    cdb_t db{};
    explicit opened(std::vector<uint8_t> b) : bytes(std::move(b)) {
        EXPECT_EQ(cdb_open(&db, bytes.data(), bytes.size()), CDB_OK);
    }
    int check(bool with_scratch, size_t *bad = nullptr) const {
        std::vector<unsigned char> scratch(cdb_check_scratch_size(&db));
        return with_scratch ? cdb_check(&db, scratch.data(), scratch.size(), bad) : cdb_check(&db, nullptr, 0, bad);
    }
};

std::string text_of(const cdb_value_t &v) {
    char b[128];
    int n = cdb_format_value(&v, b, sizeof b);
    return n < 0 ? cdb_strerror(n) : std::string(b, size_t(n));
}

cdb_value_t default_of(const cdb_class_t &c, int kind, const char *name) {
    cdb_attr_t a;
    cdb_value_t v{};
    EXPECT_EQ(cdb_find_attr_by_name(&c, kind, name, &a), CDB_OK) << name;
    EXPECT_EQ(cdb_attr_default(&a, &v), CDB_OK) << name;
    return v;
}

class both_orders : public testing::TestWithParam<bool> {};

TEST_P(both_orders, reads_every_kind_of_value) {
    opened f(rich_image(GetParam()));
    EXPECT_EQ(f.db.big_endian, GetParam() ? 1 : 0);
    EXPECT_EQ(f.check(true), CDB_OK);
    cdb_class_t c;
    ASSERT_EQ(cdb_find_class(&f.db, "Rich.Class", &c), CDB_OK);
    EXPECT_EQ(cdb_class_field(&c, CDB_CLASS_PROPS), 0x2eu);

    int64_t i;
    uint64_t u;
    double d;
    cdb_value_t size = default_of(c, CDB_PATTR, "Size");
    ASSERT_EQ(cdb_value_int64(&size, &i), CDB_OK);
    EXPECT_EQ(i, -5);
    EXPECT_EQ(cdb_value_uint64(&size, &u), CDB_ERR_KIND); // a negative number has no unsigned value
    cdb_value_t ratio = default_of(c, CDB_PATTR, "Ratio");
    ASSERT_EQ(cdb_value_double(&ratio, &d), CDB_OK);
    EXPECT_EQ(d, 2.5);
    EXPECT_EQ(text_of(ratio), "2.5");
    EXPECT_EQ(text_of(default_of(c, CDB_PATTR_CLASS, "Vendor")), "\"Acme\"");
    EXPECT_EQ(text_of(default_of(c, CDB_PATTR, "Serial")), "0x00ff10");
    EXPECT_EQ(text_of(default_of(c, CDB_PATTR, "Nums")), "[1, 2, 3]");
    EXPECT_EQ(text_of(default_of(c, CDB_PATTR, "Names")), "[\"x\", \"y\"]");
    EXPECT_EQ(text_of(default_of(c, CDB_PATTR, "Layout")), "[{type: Int32, value: 7}, {type: UInt32, value: 9}]");
    EXPECT_EQ(text_of(default_of(c, CDB_PATTR, "Owner")), "0x" + std::string(40, '0'));
    cdb_value_t names = default_of(c, CDB_PATTR, "Names"), second;
    const char *s;
    size_t len;
    ASSERT_EQ(cdb_value_element(&names, 1, &second), CDB_OK);
    ASSERT_EQ(cdb_value_string(&second, &s, &len), CDB_OK);
    EXPECT_EQ(std::string(s, len), "y");
    EXPECT_EQ(cdb_value_element(&names, 2, &second), CDB_ERR_NOTFOUND);

    cdb_attr_t level;
    cdb_valid_values_t vv;
    cdb_value_t lo, hi;
    uint16_t msg;
    ASSERT_EQ(cdb_find_attr(&c, CDB_PATTR, 2, &level), CDB_OK);
    ASSERT_EQ(cdb_attr_valid_values(&level, &vv), CDB_OK);
    ASSERT_EQ(cdb_valid_value_at(&vv, 0, &lo, &hi, &msg), CDB_OK);
    EXPECT_EQ(text_of(lo) + ".." + text_of(hi) + " " + std::to_string(msg), "0..9 5");
    cdb_attr_t temp, load;
    ASSERT_EQ(cdb_find_attr_by_name(&c, CDB_DATTR, "Temp", &temp), CDB_OK);
    ASSERT_EQ(cdb_attr_range(&temp, &lo, &hi), CDB_OK);
    EXPECT_EQ(text_of(lo) + " " + text_of(hi), "[0] [100]"); // the range no statement gave
    ASSERT_EQ(cdb_find_attr_by_name(&c, CDB_DATTR, "Load", &load), CDB_OK);
    ASSERT_EQ(cdb_attr_range(&load, &lo, &hi), CDB_OK);
    EXPECT_EQ(text_of(lo) + " " + text_of(hi), "5 9");

    cdb_action_t reset;
    cdb_sd_def_t input;
    cdb_sd_element_t how;
    ASSERT_EQ(cdb_find_action_by_name(&c, 0, "Reset", &reset), CDB_OK);
    EXPECT_EQ(cdb_action_id(&reset), 3);
    ASSERT_EQ(cdb_action_sd_input(&reset, &input), CDB_OK);
    ASSERT_EQ(cdb_find_sd_element(&input, "How", &how), CDB_OK);
    EXPECT_EQ(how.type, uint32_t(CDB_INT32));
    EXPECT_EQ(cdb_action_sd_response(&reset, &input), CDB_ERR_NOTFOUND);

    cdb_var_class_t vc;
    ASSERT_EQ(cdb_find_var_class(&f.db, "VC1", &vc), CDB_OK);
    EXPECT_EQ(vc.var_count, 2u);
    EXPECT_EQ(cdb_var_id(&vc, 0), 0x8001u);
    cdb_manager_t m;
    ASSERT_EQ(cdb_get_manager(&f.db, &m), CDB_OK);
    EXPECT_STREQ(m.name, "Test.RM");
    cdb_map_t map;
    ASSERT_EQ(cdb_get_map(&f.db, &map), CDB_OK);
    EXPECT_STREQ(map.message_catalog, "test.cat");
}

INSTANTIATE_TEST_SUITE_P(order, both_orders, testing::Bool());

TEST(libcdb, both_byte_orders_read_alike_and_every_lookup_agrees) {
    std::string little = cdbtest::visit(rich_image(false).data(), rich_image(false).size());
    EXPECT_NE(little.find("attr 2 Layout 7"), std::string::npos);
    EXPECT_EQ(little, cdbtest::visit(rich_image(true).data(), rich_image(true).size()));
    opened f(rich_image(true));
    cdbtest::visitor walk;
    walk.run(f.db);
    EXPECT_EQ(walk.disagreements(), 0u);
}

TEST(libcdb, index_finds_classes_by_name_and_id) {
    cdbtest::test_class a(false, "A.Class"), b(false, "B.Class"), twin(false, "A.Class");
    b.rec.put(208, 7, 2);
    std::vector<uint8_t> img = cdbtest::image({a, b, twin});
    cdbtest::buf hdr{false, img};
    hdr.put(30, 7, 2); // the largest class id
    img = hdr.b;
    cdbtest::fix_checksum(img, false);
    opened f(img);
    ASSERT_EQ(f.check(true), CDB_OK);
    std::vector<uint32_t> mem(cdb_index_size(&f.db) / 4);
    cdb_index_t ix;
    EXPECT_EQ(cdb_index_build(&ix, &f.db, mem.data(), 4), CDB_ERR_NOSPACE);
    ASSERT_EQ(cdb_index_build(&ix, &f.db, mem.data(), mem.size() * 4), CDB_OK);
    cdb_class_t c;
    ASSERT_EQ(cdb_index_find_class(&ix, "B.Class", &c), CDB_OK);
    EXPECT_EQ(c.dsect, 1u);
    ASSERT_EQ(cdb_index_find_class(&ix, "A.Class", &c), CDB_OK);
    EXPECT_EQ(c.dsect, 0u); // the first of two of one name, as the scan finds it
    ASSERT_EQ(cdb_index_find_class_by_id(&ix, 7, &c), CDB_OK);
    EXPECT_STREQ(cdb_class_name(&c), "B.Class");
    ASSERT_EQ(cdb_index_find_class_by_id(&ix, 0, &c), CDB_OK);
    EXPECT_EQ(c.dsect, 0u);
    EXPECT_EQ(cdb_index_find_class(&ix, "C.Class", &c), CDB_ERR_NOTFOUND);
    EXPECT_EQ(cdb_index_find_class_by_id(&ix, 8, &c), CDB_ERR_NOTFOUND);
    EXPECT_EQ(cdb_find_class_by_id(&f.db, 7, &c), CDB_OK);
}

TEST(libcdb, open_refuses_damaged_headers) {
    std::vector<uint8_t> good = rich_image(false);
    cdb_t db;
    EXPECT_EQ(cdb_open(&db, good.data(), 40), CDB_ERR_TRUNCATED);
    EXPECT_EQ(cdb_open(&db, good.data(), good.size() - 2), CDB_ERR_TRUNCATED);
    EXPECT_EQ(cdb_open(&db, good.data(), good.size() - 4), CDB_ERR_LENGTH);
    auto changed = [&](size_t off, uint8_t v) {
        std::vector<uint8_t> b = good;
        b[off] = v;
        return cdb_open(&db, b.data(), b.size());
    };
    EXPECT_EQ(changed(8, 0), CDB_ERR_FORMAT);
    EXPECT_EQ(changed(32, 0), CDB_ERR_HEADER);           // the class record size
    EXPECT_EQ(changed(24, 0xff), CDB_ERR_ANCHORS);       // more dsects than fit
    EXPECT_EQ(changed(80, 9), CDB_ERR_ANCHORS);          // an unknown dsect type
    EXPECT_EQ(changed(80 + 16 + 4, 0), CDB_ERR_ANCHORS); // a dsect that starts inside the anchors
    EXPECT_EQ(changed(4, uint8_t(good[4] ^ 1)), CDB_OK); // open does not read the checksum
}

TEST(libcdb, check_reports_the_first_violation) {
    std::vector<uint8_t> b = rich_image(false);
    b[4] ^= 1;
    opened bad_sum(b);
    size_t at = 0;
    EXPECT_EQ(bad_sum.check(true, &at), CDB_ERR_CHECKSUM);
    EXPECT_EQ(at, 4u);
    EXPECT_FALSE(cdb_check_checksum(&bad_sum.db));

    b = rich_image(false);
    cdb_t probe;
    ASSERT_EQ(cdb_open(&probe, b.data(), b.size()), CDB_OK);
    cdb_class_t c;
    cdb_attr_t level;
    ASSERT_EQ(cdb_class_at(&probe, 0, &c), CDB_OK);
    ASSERT_EQ(cdb_find_attr(&c, CDB_PATTR, 2, &level), CDB_OK);
    b[level.rec + PA_DATA_TYPE] = 40; // a data type out of range
    cdbtest::fix_checksum(b, false);
    opened bad_type(b);
    EXPECT_EQ(bad_type.check(true, &at), CDB_ERR_TYPE);
    EXPECT_EQ(at, level.rec + PA_DATA_TYPE);
}

TEST(libcdb, a_list_referred_to_twice_needs_the_scratch_map) {
    cdbtest::test_class c(false, "Shared.Lists");
    uint32_t vv = c.valid_values({{1, 2, 0}});
    c.pattr(false, "A", 1, 2).put(48, vv, 4);
    c.pattr(false, "B", 2, 2).put(48, vv, 4);
    opened f(cdbtest::image({c}));
    size_t at = 0;
    EXPECT_EQ(f.check(false), CDB_OK);
    EXPECT_EQ(f.check(true, &at), CDB_ERR_OVERLAP);
    EXPECT_GT(cdbdump::annotate_walk(f.bytes.data(), f.bytes.size()).violations, 0u);
}

TEST(libcdb, names_and_words) {
    char b[128];
    EXPECT_EQ(cdb_format_words(CDB_WORDS_CLASS, 0x2e, b, sizeof b), 44);
    EXPECT_STREQ(b, "HasResources,CanControl,CanDefine,JoinPhase1");
    EXPECT_EQ(cdb_format_words(CDB_WORDS_PERMISSION, 0x41, b, 3), 3); // cut, as snprintf cuts
    EXPECT_STREQ(b, "q,");
    EXPECT_EQ(cdb_format_words(9, 1, b, sizeof b), CDB_ERR_BADARG);
    uint32_t bit = 0;
    EXPECT_STREQ(cdb_word(CDB_WORDS_ACTION, 1, &bit), "LongRun");
    EXPECT_EQ(bit, 1u);
    EXPECT_EQ(cdb_word(CDB_WORDS_ACTION, 2, &bit), nullptr);
    EXPECT_STREQ(cdb_data_type_name(CDB_SD_ARRAY), "SDArray");
    EXPECT_EQ(cdb_data_type_name(23), nullptr);
    EXPECT_STREQ(cdb_var_type_name(CDB_QUANTUM), "Quantum");
    EXPECT_EQ(cdb_element_type(CDB_RH_ARRAY), uint32_t(CDB_RH));
    EXPECT_STREQ(cdb_strerror(CDB_ERR_OVERLAP), "a list or value body is referred to twice");
    EXPECT_STREQ(cdb_strerror(-99), "unknown error");
}

TEST(libcdb, cpp_layer_reads_and_throws) {
    std::vector<uint8_t> img = rich_image(true);
    qecfg::cdb::database db(img.data(), img.size());
    db.check();
    std::optional<qecfg::cdb::resource_class> c;
    ASSERT_TRUE(db.find_class("Rich.Class", c));
    auto level = c->find_attribute(CDB_PATTR, 2);
    ASSERT_TRUE(level);
    EXPECT_EQ(level->name(), "Level");
    EXPECT_EQ(level->default_value()->as_int64(), 3);
    EXPECT_EQ(level->valid_values()->at(0).high.format(), "9");
    EXPECT_EQ(c->find_attribute(CDB_PATTR, "Nums")->default_value()->elements().size(), 3u);
    EXPECT_FALSE(db.find_class(uint16_t(4), c));
    img[4] ^= 1;
    qecfg::cdb::database damaged(img.data(), img.size());
    try {
        damaged.check();
        ADD_FAILURE() << "a wrong checksum passed";
    } catch (const qecfg::cdb::error &e) {
        EXPECT_EQ(e.code(), CDB_ERR_CHECKSUM);
        EXPECT_EQ(e.offset(), 4u);
    }
    std::optional<qecfg::cdb::database> none;
    EXPECT_EQ(qecfg::cdb::database::try_open(img.data(), 12, none), CDB_ERR_TRUNCATED);
    EXPECT_FALSE(none);
}

// Every byte of the image set to other values, with the checksum made right:
// the accessors stay inside the buffer (the sanitizer build checks), and a
// file the full check accepts is one the walker finds no violation in and
// whose lookups all agree with the walk.
TEST(libcdb, damaged_images_stay_in_bounds_and_never_pass_what_the_walker_refuses) {
    for (bool big : {false, true}) {
        const std::vector<uint8_t> good = rich_image(big);
        for (size_t off = 0; off < good.size(); off += cdbtest::SWEEP_STEP)
            for (uint8_t v : {uint8_t(0), uint8_t(0xff), uint8_t(good[off] ^ 0x10)}) {
                std::vector<uint8_t> b = good;
                b[off] = v;
                if (off >= 8)
                    cdbtest::fix_checksum(b, big);
                cdb_t db;
                if (cdb_open(&db, b.data(), b.size()) != CDB_OK)
                    continue;
                cdbtest::visitor walk;
                walk.run(db);
                std::vector<unsigned char> scratch(cdb_check_scratch_size(&db));
                if (cdb_check(&db, scratch.data(), scratch.size(), nullptr) == CDB_OK) {
                    EXPECT_EQ(cdbdump::annotate_walk(b.data(), b.size()).violations, 0u) << off << " " << int(v);
                    EXPECT_EQ(walk.disagreements(), 0u) << off << " " << int(v);
                }
            }
    }
}

} // namespace
