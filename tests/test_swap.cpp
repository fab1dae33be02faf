// Byte-order reversal on images the compiler writes. What each number turns
// into is compared by the cdbdump round trip (the reversed file must hold the
// same content); here: the reversal keeps the file's shape and checksum, and
// stays inside an image whatever a damaged word says.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>

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

// The XOR of all 32-bit words, read in the other byte order.
uint32_t foreign_xor(const unsigned char *b, size_t size) {
    uint32_t x = 0;
    for (size_t pos = 0; pos + 4 <= size; pos += 4)
        x ^= __builtin_bswap32(load<uint32_t>(b + pos));
    return x;
}

TEST(Swap, ReversedImageKeepsItsLengthAnchorsAndChecksum) {
    compile_result plain = compile_text(rich_source());
    compile_result swapped = compile_text(rich_source(), [](qecfg::options &o) { o.reverse_byte_order = true; });
    ASSERT_EQ(plain.message, "");
    ASSERT_EQ(swapped.cdb.size(), plain.cdb.size());
    const auto *b = reinterpret_cast<const unsigned char *>(swapped.cdb.data());
    EXPECT_EQ(__builtin_bswap32(load<uint32_t>(b)), plain.cdb.size() - 4);
    EXPECT_EQ(foreign_xor(b, swapped.cdb.size()), 0u);
    uint32_t dsects = u32_at(plain.cdb, offsetof(qel_cdb_header_t, cdb_hdr_dsect_count));
    ASSERT_GT(dsects, 3u);
    for (size_t a = CDB_HEADER_SIZE; a < CDB_HEADER_SIZE + CDB_ANCHOR_SIZE * dsects; a += 4)
        EXPECT_EQ(__builtin_bswap32(load<uint32_t>(b + a)), u32_at(plain.cdb, a)) << a;
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
