// The reader on images made by the test-only writer: layout, values of every
// kind, both byte orders.
#include <gtest/gtest.h>

#include "cdb_to_tree.h"
#include "cdb_walk.h"
#include "test_images.h"

using namespace cdbdump;

namespace {
cdb_file read(const std::vector<uint8_t> &b) { return verify(b.data(), b.size()); }

const class_dsect &first_class(const cdb_file &f) { return std::get<class_dsect>(f.dsects.at(0)); }

// The content apart from what depends on the byte order and the positions.
std::string content_json(const cdb_file &f) {
    node t = to_tree(f);
    t.erase("byte_order");
    t.erase("layout");
    return to_json(t);
}
} // namespace

TEST(Reader, OneAttributeClassHasItsLayout) {
    // The class dsect: the 224-byte record, one 72-byte attribute, a variety
    // list of one entry (8 + 8) and 40 bytes of strings; the manager's: 24 +
    // 8; the map's: 60 + 16. Behind the 80-byte header and three anchors.
    const uint32_t class_len = 224 + 72 + 16 + 40, mgr_len = 24 + 8, map_len = 60 + 16;
    const uint32_t first = 80 + 3 * 16;
    for (bool big : {false, true}) {
        std::vector<uint8_t> b = cdbtest::one_attribute_class(big);
        ASSERT_EQ(b.size(), first + class_len + mgr_len + map_len);
        cdb_file f = read(b);
        EXPECT_EQ(f.big_endian, big);
        EXPECT_EQ(f.length, b.size() - 4);
        ASSERT_EQ(f.anchors.size(), 3u);
        const uint32_t offsets[] = {first, first + class_len, first + class_len + mgr_len};
        const uint32_t lengths[] = {class_len, mgr_len, map_len}, types[] = {5, 3, 6};
        for (size_t i = 0; i < 3; i++) {
            EXPECT_EQ(f.anchors[i].offset, offsets[i]);
            EXPECT_EQ(f.anchors[i].length, lengths[i]);
            EXPECT_EQ(f.anchors[i].type, types[i]);
        }
        const class_dsect &c = first_class(f);
        EXPECT_EQ(c.name, "One.Attribute.Class");
        EXPECT_EQ(c.locator, 0xFFFF);
        ASSERT_EQ(c.pattrs.size(), 1u);
        EXPECT_EQ(c.pattrs[0].name, "Size");
        EXPECT_EQ(c.pattrs[0].dflt.kind, value_kind::string);
        EXPECT_EQ(c.pattrs[0].dflt.text, "");
        ASSERT_EQ(c.pattrs[0].varieties.size(), 1u);
        EXPECT_EQ(c.pattrs[0].varieties[0].high, 1u);
        EXPECT_EQ(std::get<mgr_dsect>(f.dsects[1]).name, "Test.RM");
        const map_dsect &m = std::get<map_dsect>(f.dsects[2]);
        EXPECT_EQ(m.message_catalog, "test.cat");
        EXPECT_EQ(m.last_key, 5);
    }
}

TEST(Reader, BothByteOrdersHoldTheSameContent) {
    cdb_file little = read(cdbtest::rich_image(false)), big = read(cdbtest::rich_image(true));
    EXPECT_FALSE(little.big_endian);
    EXPECT_TRUE(big.big_endian);
    EXPECT_EQ(content_json(little), content_json(big));
}

TEST(Reader, DecodesValuesOfEveryBody) {
    cdb_file f = read(cdbtest::rich_image(true));
    const class_dsect &c = first_class(f);
    EXPECT_EQ(c.pattrs_class.at(0).dflt.text, "Acme");
    ASSERT_TRUE(c.define_sd);
    EXPECT_EQ(c.define_sd->at(1).name, "Size");
    EXPECT_EQ(c.define_sd->at(1).type, 5u);
    const std::vector<pattr> &p = c.pattrs;
    ASSERT_EQ(p.size(), 9u);
    EXPECT_EQ(int64_t(p[0].dflt.bits), -5);
    ASSERT_TRUE(p[1].vv);
    EXPECT_EQ(p[1].vv->at(0).high.bits, 9u);
    EXPECT_EQ(p[1].vv->at(0).display_msgid, 5);
    EXPECT_EQ(p[2].dflt.bytes, (std::vector<uint8_t>{0x00, 0xff, 0x10}));
    EXPECT_EQ(p[3].dflt.kind, value_kind::handle);
    EXPECT_EQ(p[3].dflt.bytes.size(), 20u);
    ASSERT_EQ(p[4].dflt.elements.size(), 3u);
    EXPECT_EQ(p[4].dflt.elements[2].bits, 3u);
    ASSERT_EQ(p[5].dflt.elements.size(), 2u);
    EXPECT_EQ(p[5].dflt.elements[1].text, "y");
    ASSERT_EQ(p[6].dflt.kind, value_kind::sd);
    EXPECT_EQ(p[6].dflt.elements.at(1).type, 3u);
    EXPECT_EQ(p[6].dflt.elements.at(1).bits, 9u);
    EXPECT_EQ(p[6].max_sd_idx, 1);
    ASSERT_EQ(p[7].dflt.kind, value_kind::array);
    EXPECT_EQ(p[7].dflt.elements.at(0).kind, value_kind::sd);
    EXPECT_EQ(p[8].dflt.bits, cdbtest::DOUBLE_2_5);
    EXPECT_EQ(std::get<var_class_dsect>(f.dsects.at(3)).var_ids, (std::vector<uint32_t>{0x8001, 4}));
}

TEST(Reader, NumericArrayRangesAreArraysOnlyWhenBothAreDefaultArrays) {
    cdb_file f = read(cdbtest::rich_image(false));
    const dattr &temp = first_class(f).dattrs.at(0), &load = first_class(f).dattrs.at(1);
    ASSERT_EQ(temp.min.kind, value_kind::array);
    EXPECT_EQ(temp.max.elements.at(0).bits, 100u);
    EXPECT_EQ(load.min.kind, value_kind::number);
    EXPECT_EQ(load.min.type, 2u); // Int32, the element type
    EXPECT_EQ(load.max.bits, 9u);

    // A high end that is a one-element array of another value is a number.
    cdbtest::test_class c(false, "C");
    cdbtest::buf &d = c.dattr(false, "D", 1, 13);
    d.put(32, c.array({0}, 4), 4);
    d.put(40, c.array({0}, 4), 4);
    d.put(48, c.array({7}, 4), 4);
    cdb_file g = read(cdbtest::image({c}));
    EXPECT_EQ(first_class(g).dattrs.at(0).max.kind, value_kind::number);
}

TEST(Reader, StructuredAttributeWithoutDefinitionHasNoValue) {
    cdbtest::test_class c(false, "C");
    c.pattr(false, "S", 1, 11);
    cdb_file f = read(cdbtest::image({c}));
    EXPECT_EQ(first_class(f).pattrs.at(0).dflt.kind, value_kind::absent);
}
