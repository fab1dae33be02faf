// Byte-order reversal on images the compiler writes: the reversed file reads
// through libcdb, in the other byte order, as the plain one does, item for
// item; and the reversal stays inside an image whatever a damaged word says.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <tuple>

#include "cdb_read_support.h"
#include "cdbdump/cdb_visit.h"
#include "compile_support.h"
#include "qecfg_swap.h"

namespace {

// A source with values of every kind of body, sections of every kind, SD
// definitions and variable classes.
std::string rich_source() {
    std::ifstream in(std::filesystem::path(QECFG_SOURCE_DIR) / "tests" / "cdbdump" / "roundtrip.src");
    std::ostringstream s;
    s << in.rdbuf();
    return s.str();
}

// The XOR of all 32-bit words, read in the other byte order. A damaged image
// does not open, so whether the reversal turned every word is read by hand.
uint32_t foreign_xor(const unsigned char *b, size_t size) {
    uint32_t x = 0;
    for (size_t pos = 0; pos + 4 <= size; pos += 4)
        x ^= __builtin_bswap32(load<uint32_t>(b + pos));
    return x;
}

// The header but its checksum, which differs: strings and 16-bit pairs do
// not reverse as 32-bit words do.
auto header_of(const cdb_t &db) {
    cdb_header_t h;
    cdb_get_header(&db, &h);
    return std::tuple(h.length, h.seqno, h.tv_sec, h.tv_usec, h.dsect_count, h.max_rm_id, h.max_class_id);
}

auto anchor_of(const cdb_t &db, uint32_t i) {
    cdb_dsect_t d{};
    EXPECT_EQ(cdb_dsect_at(&db, i, &d), CDB_OK) << i;
    return std::tuple(d.type, d.offset, d.length, d.revision);
}

TEST(Swap, ReversedImageReadsAsThePlainOne) {
    compile_result plain = compile_text(rich_source());
    compile_result swapped = compile_text(rich_source(), [](qecfg::options &o) { o.reverse_byte_order = true; });
    ASSERT_EQ(plain.message, "");
    ASSERT_EQ(swapped.cdb.size(), plain.cdb.size());
    read_cdb p(plain.cdb), s(swapped.cdb); // each checksum right in its own order
    ASSERT_TRUE(p.valid());
    ASSERT_TRUE(s.valid());
    EXPECT_NE(s.db().big_endian, p.db().big_endian);
    EXPECT_EQ(header_of(s.db()), header_of(p.db()));
    EXPECT_EQ(std::get<0>(header_of(s.db())), plain.cdb.size() - 4);
    ASSERT_GT(p.db().dsect_count, 3u);
    for (uint32_t i = 0; i < p.db().dsect_count; i++)
        EXPECT_EQ(anchor_of(s.db(), i), anchor_of(p.db(), i));
    std::string content = cdbtest::visitor().run(p.db());
    EXPECT_NE(content.find("varclass"), std::string::npos);
    EXPECT_EQ(cdbtest::visitor().run(s.db()), content);
}

// Any word after the length made huge: the walk must stay inside the image
// (the buffers have the exact size, so the sanitizers see every overrun).
TEST(Swap, DamagedOffsetOrCountStaysInside) {
    compile_result r = compile_text(rich_source());
    ASSERT_EQ(r.message, "");
    const size_t size = r.cdb.size();
    for (size_t pos = 8; pos < size; pos += 4) {
        auto buf = std::make_unique<unsigned char[]>(size);
        std::memcpy(buf.get(), r.cdb.data(), size);
        store<uint32_t>(buf.get() + pos, 0xFFFFFF00);
        qecfg_cdef_swap(reinterpret_cast<qel_cdb_header_t *>(buf.get()), {});
        EXPECT_EQ(foreign_xor(buf.get(), size), 0u) << pos;
    }
}

TEST(Swap, TooShortForAHeaderIsLeftAlone) {
    unsigned char b[12] = {0};
    store<uint32_t>(b, 8);
    b[8] = 0x31;
    qecfg_cdef_swap(reinterpret_cast<qel_cdb_header_t *>(b), {});
    EXPECT_EQ(load<uint32_t>(b), 8u);
    EXPECT_EQ(b[8], 0x31);
}

} // namespace
