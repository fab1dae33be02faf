// Growable tables, seen through what they report: the offsets of appends and
// the allocation traces of -d 3 (first unit, growth in whole units, the
// exact-fit rule).
#include <gtest/gtest.h>

#include "compile_support.h"

namespace {

struct traced_compile {
    captured_stream out, err;
    table_arena c;
    explicit traced_compile(int level) : c(table_trace{level, out.file(), err.file()}) {}
};

TEST(Tbl, GrowthInWholeUnitsIsTraced) {
    struct step {
        size_t size;
        const char *out, *err;
    };
    const step steps[] = {
        {0, "alloc_tble: T, structure size: 0\nalloc_tble: T, table size: 32\n", ""},
        {24, "alloc_tble: T, structure size: 24\n", ""},
        // 24 + 8 reaches the end: an exact fit grows too.
        {8, "alloc_tble: T, structure size: 8\nalloc_tble: T, new table size: 64\n",
         "alloc_tble: overflow by 8 b. Adding 32 b to T\n"},
        // Sized from the request alone: 100 bytes take four 32-byte units.
        {100, "alloc_tble: T, structure size: 100\nalloc_tble: T, new table size: 192\n",
         "alloc_tble: overflow by 100 b. Adding 128 b to T\n"},
        {0, "alloc_tble: T, structure size: 0\n", ""},
    };
    traced_compile t(3);
    tbl *table = t.c.new_tbl("T", 32);
    std::string out, err;
    for (const step &s : steps) {
        t.c.alloc_tble(table, s.size);
        out += s.out;
        err += s.err;
        EXPECT_EQ(t.out.text(), out) << s.size;
        EXPECT_EQ(t.err.text(), err) << s.size;
    }
    EXPECT_EQ(tbl_used(table), 132u);
}

TEST(Tbl, AppendsAreRoundedToEightAndZeroPadded) {
    traced_compile t(2); // below 3 nothing is traced
    tbl *table = t.c.new_tbl("T", 16);
    EXPECT_EQ(t.c.add_to_tbl(table, "x", 1), 0u);
    EXPECT_EQ(t.c.add_to_tbl(table, "12345678", 8), 8u);
    EXPECT_EQ(t.c.add_to_tbl(table, "123456789", 9), 16u);
    EXPECT_EQ(t.c.add_to_tbl(table, "", 0), 32u);
    for (int i = 0; i < 100; i++)
        t.c.add_to_tbl(table, "0123456789", 10);
    EXPECT_EQ(std::memcmp(table->tbl_base, "x\0\0\0\0\0\0\0", 8), 0);
    EXPECT_EQ(std::memcmp(table->tbl_base + 32 + 16 * 99, "0123456789\0\0\0\0\0\0", 16), 0);
    EXPECT_EQ(t.out.text() + t.err.text(), "");
}

TEST(Tbl, RecordAppendsAreNotRounded) {
    traced_compile t(0);
    tbl *table = t.c.new_tbl("ResourceCMMaps", 480);
    EXPECT_EQ(static_cast<char *>(t.c.alloc_tble(table, 60)) - table->tbl_base, 0);
    EXPECT_EQ(static_cast<char *>(t.c.alloc_tble(table, 60)) - table->tbl_base, 60);
}

} // namespace
