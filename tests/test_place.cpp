// Value placement while the string table grows. What each type and code
// places is compared byte for byte by the end-to-end cases and the cdbdump
// round trip; here every write must land at the table's address after the
// last append (the sanitizer build sees a write through a stale address).
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "qecfg_value.h"

namespace {

using std::string;

class Place : public ::testing::Test {
  protected:
    table_arena c;
    tbl *st = c.new_tbl("ClassStrings", 8192);
    alignas(8) unsigned char field[8] = {};
    body_cursor a, sda, sde;
    uint32_t u32_at(uint32_t off) const { return load<uint32_t>(st->tbl_base + off); }
};

// A value field inside the table and an array whose texts carry the table
// past its 8192-byte unit: every element and the field stay where they were.
TEST_F(Place, ArrayFilledWhileTheTableGrowsKeepsEveryElement) {
    uint32_t slot = c.add_to_tbl(st, "\0\0\0\0\0\0\0\0", 8);
    const int n = 300;
    std::vector<string> texts;
    texts.reserve(n);
    for (int i = 0; i < n; i++) {
        texts.emplace_back(31, char('A' + i % 26)); // 31 chars: 32-byte body
        texts.back().back() = char('0' + i % 10);
        zu_value_t in{};
        in.ptr_char = texts.back().data();
        ASSERT_EQ(copy_this_type(c, value_slot::in(st, slot), &in, ZU_CHAR_PTR_ARRAY, TYPE_SAME, st, &a, n), 0);
    }
    uint32_t array = 8, first_text = array + 8 + 8 * n; // 2416
    ASSERT_GT(first_text + 32 * n, 8192u);
    EXPECT_EQ(tbl_used(st), size_t(first_text + 32 * n));
    EXPECT_EQ(u32_at(slot), array);
    EXPECT_EQ(u32_at(array), uint32_t(n));
    for (int i = 0; i < n; i++) {
        uint32_t body = u32_at(array + 8 + 8 * i);
        ASSERT_EQ(body, first_text + 32 * i) << i;
        EXPECT_EQ(string(st->tbl_base + body), texts[i]) << i;
    }
}

TEST_F(Place, StructuredValueBuiltWhileTheTableGrowsKeepsEveryElement) {
    const int n = 200; // 8 + 16 * 200 = 3208 bytes, then a 16 + 24-byte handle array per element
    for (int i = 0; i < n; i++) {
        a = body_cursor{};
        ASSERT_EQ(copy_this_sd_type(c, value_slot::at(field), ZU_RSRC_HANDLE_PTR_ARRAY, DFLT_DEFAULT, st, &a, &sda,
                                    &sde, n, ZU_SD_PTR),
                  0);
    }
    uint32_t first_array = 8 + 16 * n;
    ASSERT_GT(first_array + 40 * n, 8192u);
    EXPECT_EQ(tbl_used(st), size_t(first_array + 40 * n));
    EXPECT_EQ(u32_at(0), uint32_t(n));
    for (int i = 0; i < n; i++) {
        uint32_t element = 8 + 16 * i, arr = first_array + 40 * i;
        ASSERT_EQ(u32_at(element), uint32_t(ZU_RSRC_HANDLE_PTR_ARRAY)) << i;
        ASSERT_EQ(u32_at(element + 8), arr) << i;
        ASSERT_EQ(u32_at(arr), 1u) << i;
        ASSERT_EQ(u32_at(arr + 8), arr + 16) << i;
    }
}

} // namespace
