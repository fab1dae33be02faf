// Growable tables: allocation units, growth in whole units, the exact-fit
// rule, zero fill, rounded appends, and the allocation traces.
#include <gtest/gtest.h>

#include "compile_support.h"

namespace {

struct TblTest : ::testing::Test {
    captured_stream out, err;
    qecfg_compiler c{[this] {
        qecfg_options o;
        o.trace_out = out.file();
        o.trace_err = err.file();
        return o;
    }()};
};

TEST_F(TblTest, FirstAllocationMakesOneUnit) {
    tbl *t = c.new_tbl("T", 32);
    char *p = static_cast<char *>(c.alloc_tble(t, 0));
    EXPECT_EQ(p, t->tbl_base);
    EXPECT_EQ(t->tbl_next, t->tbl_base);
    EXPECT_EQ(t->tbl_size, 32u);
    EXPECT_EQ(t->tbl_prev_base, t->tbl_base);
}

TEST_F(TblTest, ExactFitGrowsByOneUnitFirst) {
    tbl *t = c.new_tbl("T", 32);
    c.alloc_tble(t, 24);
    char *p = static_cast<char *>(c.alloc_tble(t, 8));
    EXPECT_EQ(t->tbl_size, 64u);
    EXPECT_EQ(p - t->tbl_base, 24);
    EXPECT_EQ(tbl_used(t), 32u);
}

TEST_F(TblTest, LargeRequestGrowsByEnoughWholeUnits) {
    tbl *t = c.new_tbl("T", 32);
    c.alloc_tble(t, 8);
    c.alloc_tble(t, 100);
    EXPECT_EQ(t->tbl_size, 32u + 128u);
    c.alloc_tble(t, 0); // 108 used of 160: no growth
    EXPECT_EQ(t->tbl_size, 160u);
}

TEST_F(TblTest, FreeBytesAreZeroAndContentsSurviveGrowth) {
    tbl *t = c.new_tbl("T", 16);
    uint32_t a = c.add_to_tbl(t, "abc", 4);
    for (int i = 0; i < 100; i++)
        c.add_to_tbl(t, "0123456789", 10);
    EXPECT_STREQ(t->tbl_base + a, "abc");
    EXPECT_NE(t->tbl_prev_base, nullptr);
    // Each 10-byte append takes 16 bytes, the last 6 of them zero.
    EXPECT_EQ(std::memcmp(t->tbl_base + 8 + 16 * 99, "0123456789\0\0\0\0\0\0", 16), 0);
    // Room given back and handed out again is zero-filled.
    t->tbl_next = t->tbl_base + 8;
    char *again = static_cast<char *>(c.alloc_tble(t, 16 * 100));
    for (int i = 0; i < 16 * 100; i++)
        ASSERT_EQ(again[i], 0) << i;
}

// Whole units are what the traces report; a small table holds within twice
// what its items use, however large the unit.
TEST_F(TblTest, HoldsWhatIsUsedNotWholeUnits) {
    tbl *t = c.new_tbl("Strings", 8192);
    for (size_t used = 8; used <= 32768; used += 8) {
        c.add_to_tbl(t, "1234567", 8);
        ASSERT_EQ(t->tbl_size, 8192 * (used / 8192 + 1));
        ASSERT_LE(t->tbl_cap, std::max<size_t>(2 * used, 16)) << used;
    }
}

TEST_F(TblTest, RoundedAppendSizes) {
    tbl *t = c.new_tbl("T", 64);
    EXPECT_EQ(c.add_to_tbl(t, "x", 1), 0u);
    EXPECT_EQ(c.add_to_tbl(t, "12345678", 8), 8u);
    EXPECT_EQ(c.add_to_tbl(t, "123456789", 9), 16u);
    EXPECT_EQ(c.add_to_tbl(t, "", 0), 32u);
    EXPECT_EQ(tbl_used(t), 32u);
    EXPECT_EQ(std::memcmp(t->tbl_base, "x\0\0\0\0\0\0\0", 8), 0);
}

TEST_F(TblTest, RecordAppendsAreNotRounded) {
    tbl *t = c.new_tbl("ResourceCMMaps", 480);
    EXPECT_EQ(static_cast<char *>(c.alloc_tble(t, 60)) - t->tbl_base, 0);
    EXPECT_EQ(static_cast<char *>(c.alloc_tble(t, 60)) - t->tbl_base, 60);
}

TEST(TblTrace, LevelThreePrintsAllocationsAndGrowth) {
    captured_stream out, err;
    qecfg_options o;
    o.debugLevel = 3;
    o.trace_out = out.file();
    o.trace_err = err.file();
    qecfg_compiler c(o);
    tbl *t = c.new_tbl("Names", 16);
    c.alloc_tble(t, 8);
    c.alloc_tble(t, 8);
    EXPECT_EQ(out.text(), "alloc_tble: Names, structure size: 8\n"
                          "alloc_tble: Names, table size: 16\n"
                          "alloc_tble: Names, structure size: 8\n"
                          "alloc_tble: Names, new table size: 32\n");
    EXPECT_EQ(err.text(), "alloc_tble: overflow by 8 b. Adding 16 b to Names\n");
}

TEST(TblTrace, LevelTwoPrintsNoAllocation) {
    captured_stream out, err;
    qecfg_options o;
    o.debugLevel = 2;
    o.trace_out = out.file();
    o.trace_err = err.file();
    qecfg_compiler c(o);
    c.alloc_tble(c.new_tbl("Names", 16), 32);
    EXPECT_EQ(out.text(), "");
    EXPECT_EQ(err.text(), "");
}

TEST(MemcpyRounded, PadsToEightWithZeros) {
    char dst[16];
    std::memset(dst, 'z', sizeof dst);
    memcpy_8_rounded(dst, "abcdefghij", 10);
    EXPECT_EQ(std::memcmp(dst, "abcdefghij\0\0\0\0\0\0", 16), 0);
    std::memset(dst, 'z', sizeof dst);
    memcpy_8_rounded(dst, "abcdefgh", 8);
    EXPECT_EQ(dst[8], 'z');
}

} // namespace
