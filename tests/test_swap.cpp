// Byte-order reversal, on images put together byte by byte from the record
// layouts. The builder writes in this machine's order and notes every number
// the reversal has to turn; all other bytes (texts, binary data, reserved
// words, pads) get non-zero patterns and must come out as they went in.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <memory>
#include <vector>

#include "qecfg.h"
#include "qecfg_swap.h"

namespace {

constexpr uint32_t NONE = 0xFFFFFFFF;

struct image {
    std::vector<unsigned char> b;
    std::vector<std::pair<size_t, int>> turned;
    unsigned char seed = 1;

    size_t take(size_t n) { return b.resize(b.size() + n), b.size() - n; }
    void raw(size_t pos, size_t n) {
        for (size_t i = 0; i < n; ++i)
            b[pos + i] = seed++;
    }
    // A number the reversal turns, of a given value.
    void num(size_t pos, int w, uint64_t v) {
        const uint16_t v2 = uint16_t(v);
        const uint32_t v4 = uint32_t(v);
        std::memcpy(&b[pos], w == 2 ? (const void *)&v2 : w == 4 ? (const void *)&v4 : &v, w);
        turned.emplace_back(pos, w);
    }
    // Numbers the reversal turns whose values do not matter: {offset, width}.
    void nums(size_t rec, std::initializer_list<std::pair<int, int>> fields) {
        for (auto [o, w] : fields)
            raw(rec + o, w), turned.emplace_back(rec + o, w);
    }
    std::vector<unsigned char> expected() const {
        std::vector<unsigned char> e = b;
        for (auto [p, w] : turned)
            std::reverse(e.begin() + p, e.begin() + p + w);
        return e;
    }
    swap_image view() { return swap_image{reinterpret_cast<char *>(b.data()), b.size(), nullptr}; }
};

// Position of the first byte in which two images differ, or their size.
size_t first_diff(const std::vector<unsigned char> &a, const std::vector<unsigned char> &b) {
    return size_t(std::mismatch(a.begin(), a.end(), b.begin(), b.end()).first - a.begin());
}

const uint32_t SD_ELEMENT_TYPES[] = {ZU_INT32,       ZU_FLOAT64,          ZU_CHAR_PTR, ZU_BINARY_PTR,
                                     ZU_INT64_ARRAY, ZU_BINARY_PTR_ARRAY, ZU_SBS_PTR};

// A value of type t at pos, its body appended to the string table at sbase.
void value(image &im, size_t pos, uint32_t t, size_t sbase) {
    size_t body = 0;
    if (t == ZU_CHAR_PTR)
        im.raw(body = im.take(8), 8);
    else if (t == ZU_RSRC_HANDLE_PTR)
        im.raw(body = im.take(24), 24);
    else if (t == ZU_BINARY_PTR) // length, pad, five data bytes
        im.num(body = im.take(16), 4, 5), im.raw(body + 4, 9);
    else if (t == ZU_SD_PTR) {
        const uint32_t n = std::size(SD_ELEMENT_TYPES);
        im.num(body = im.take(8 + 16 * n), 4, n), im.raw(body + 4, 4);
        for (uint32_t i = 0; i < n; ++i) {
            const size_t el = body + 8 + 16 * i;
            im.num(el, 4, SD_ELEMENT_TYPES[i]), im.raw(el + 4, 4);
            value(im, el + 8, SD_ELEMENT_TYPES[i], sbase);
        }
    } else if (t >= ZU_INT32_ARRAY && t <= ZU_SD_PTR_ARRAY) {
        im.num(body = im.take(24), 4, 2), im.raw(body + 4, 4);
        value(im, body + 8, t - 11, sbase), value(im, body + 16, t - 11, sbase);
    }
    if (body)
        im.num(pos, 4, body - sbase), im.raw(pos + 4, 4);
    else if (t == ZU_INT32 || t == ZU_UINT32 || t == ZU_FLOAT32)
        im.nums(pos, {{0, 4}}), im.raw(pos + 4, 4);
    else if (t >= ZU_INT64 && t <= ZU_FLOAT64)
        im.nums(pos, {{0, 8}});
    else // unknown, None, SBS and undefined types stay whole
        im.raw(pos, 8);
}

void check_value(uint32_t t, size_t none_body) {
    image im;
    const size_t pos = im.take(8), sbase = im.take(8);
    im.raw(sbase, 8);
    if (none_body)
        im.num(pos, 4, NONE), im.raw(pos + 4, 4), im.raw(im.take(none_body), none_body);
    else
        value(im, pos, t, sbase);
    const std::vector<unsigned char> want = im.expected();
    swap_value(im.view(), pos, zu_data_type_t(t), sbase);
    EXPECT_EQ(first_diff(im.b, want), want.size()) << "data type " << t;
}

} // namespace

TEST(SwapAny, ReversesTwoFourAndEightBytesOnlyAndTwiceRestores) {
    const unsigned char orig[9] = {1, 2, 3, 4, 5, 6, 7, 8, 9};
    for (int size : {0, 1, 2, 3, 4, 5, 8, 9}) {
        unsigned char b[9];
        std::memcpy(b, orig, 9);
        swap_any(b, size);
        const bool turns = size == 2 || size == 4 || size == 8;
        EXPECT_EQ(b[0], turns ? size : 1) << size;
        EXPECT_EQ(b[8], 9) << size;
        swap_any(b, size);
        EXPECT_EQ(std::memcmp(b, orig, 9), 0) << size;
    }
}

TEST(SwapTables, ArrayFlagAndElementTypes) {
    for (uint32_t t = 0; t < ZU_NUM_DATA_TYPES; ++t) {
        const bool array = t >= 13;
        EXPECT_EQ(bool(kb_dtc_table_1[t] & ZU_DTC_ARRAY), array) << t;
        EXPECT_EQ(uint32_t(kb_dtc_base_types_1[t]), array ? t - 11 : 0) << t;
    }
    EXPECT_EQ(kb_dtc_table_1[ZU_INT32], 0x23);
    EXPECT_EQ(kb_dtc_table_1[ZU_SBS_PTR], 0x0C);
}

TEST(SwapValue, EveryDataTypeWithItsBody) {
    for (uint32_t t = 0; t <= ZU_NUM_DATA_TYPES; ++t)
        check_value(t, 0);
}

TEST(SwapValue, NoneMarkerTouchesNoBody) {
    for (uint32_t t = ZU_CHAR_PTR; t < ZU_NUM_DATA_TYPES; ++t)
        if (t != ZU_SBS_PTR)
            check_value(t, 64);
}

TEST(SwapValue, CyclicStructuredValueEnds) {
    image im;
    const size_t pos = im.take(8), body = im.take(24);
    store<uint32_t>(&im.b[pos], uint32_t(body)); // element 0 is an SD value designating its own body
    store<uint32_t>(&im.b[body], 1);
    store<uint32_t>(&im.b[body + 8], ZU_SD_PTR);
    store<uint32_t>(&im.b[body + 16], uint32_t(body));
    swap_value(im.view(), pos, ZU_SD_PTR, 0);
    EXPECT_EQ(load<uint32_t>(&im.b[pos]), __builtin_bswap32(uint32_t(body)));
}

namespace {

// Where the tables of the class being put together start. Each base is taken
// before the first item of its kind, so every offset is positive and a walk
// that used the wrong base would land on the wrong bytes.
struct class_tables {
    size_t rec, sbase, vvbase, sdbase, vlbase;
};

uint32_t vlist(image &im, const class_tables &c, uint32_t n) {
    const size_t p = im.take(8 + 8 * std::max(n, 1u));
    im.nums(p, {{0, 4}}), im.num(p + 4, 4, n);
    if (n == 0)
        im.raw(p + 8, 8); // the declared entry of an empty list
    for (uint32_t i = 0; i < n; ++i)
        im.nums(p + 8 + 8 * i, {{0, 4}, {4, 4}});
    return uint32_t(p - c.vlbase);
}

// Two valid-value entries for data type t, of its element type for an array.
uint32_t vvlist(image &im, const class_tables &c, uint32_t t) {
    const uint32_t entry_type = t >= ZU_INT32_ARRAY ? t - 11 : t;
    const size_t p = im.take(8 + 24 * 2);
    im.nums(p, {{0, 4}}), im.num(p + 4, 4, 2);
    for (size_t e = p + 8; e < p + 56; e += 24) {
        value(im, e, entry_type, c.sbase), value(im, e + 8, entry_type, c.sbase);
        im.nums(e, {{16, 2}}), im.raw(e + 18, 6);
    }
    return uint32_t(p - c.vvbase);
}

// Two fields: a UInt64Array with valid values and a String without.
uint32_t sddef(image &im, const class_tables &c) {
    const size_t p = im.take(8 + 32 * 2);
    im.nums(p, {{0, 4}}), im.num(p + 4, 4, 2);
    for (size_t f = p + 8; f < p + 72; f += 32) {
        const uint32_t t = f == p + 8 ? ZU_UINT64_ARRAY : ZU_CHAR_PTR;
        im.nums(f, {{0, 4}, {12, 2}, {14, 2}, {24, 4}, {28, 2}}), im.raw(f + 30, 2);
        im.num(f + 8, 4, t), im.num(f + 16, 4, t == ZU_CHAR_PTR ? NONE : vvlist(im, c, t));
    }
    return uint32_t(p - c.sdbase);
}

// A default or initial value; that of a structured-data type without a
// definition is 0 and designates nothing, so it stays whole.
void own_value(image &im, size_t pos, uint32_t t, uint32_t sd, const class_tables &c) {
    if ((t == ZU_SD_PTR || t == ZU_SD_PTR_ARRAY) && sd == NONE)
        im.raw(pos, 8);
    else
        value(im, pos, t, c.sbase);
}

void pattr(image &im, size_t rec, uint32_t t, uint32_t vv, uint32_t sd, const class_tables &c) {
    im.nums(rec, {{0, 4}, {4, 4}, {8, 4}, {16, 2}, {18, 2}, {20, 2}, {22, 2}, {32, 4}, {64, 2}}), im.raw(rec + 66, 6);
    im.num(rec + 36, 4, t), im.num(rec + 40, 4, vlist(im, c, 1)), im.num(rec + 48, 4, vv), im.num(rec + 56, 4, sd);
    own_value(im, rec + 24, t, sd, c);
}

// plain_range: the range holds values of the element type (a Range statement).
void dattr(image &im, size_t rec, uint32_t t, uint32_t sd, bool plain_range, const class_tables &c) {
    im.nums(rec, {{0, 4},   {4, 4},   {8, 4},   {16, 4},  {24, 4},  {80, 4},  {88, 4},  {96, 4},  {108, 4},
                  {112, 2}, {114, 2}, {116, 2}, {118, 2}, {120, 4}, {124, 2}, {126, 2}, {128, 2}, {130, 2}});
    im.raw(rec + 132, 4);
    im.num(rec + 104, 4, t), im.num(rec + 56, 4, vlist(im, c, 0)), im.num(rec + 64, 4, NONE), im.num(rec + 72, 4, sd);
    own_value(im, rec + 32, t, sd, c);
    const uint32_t rt = plain_range ? t - 11 : t;
    value(im, rec + 40, rt, c.sbase), value(im, rec + 48, rt, c.sbase);
}

void action(image &im, size_t rec, uint32_t in, uint32_t resp, const class_tables &c) {
    im.nums(rec, {{0, 4}, {4, 4}, {8, 4}, {12, 2}, {14, 2}, {16, 2}, {18, 2}, {20, 4}, {24, 4}});
    im.num(rec + 32, 4, vlist(im, c, 2)), im.num(rec + 40, 4, in), im.num(rec + 48, 4, resp);
}

size_t class_dsect(image &im, std::unordered_set<uint32_t> &ranges) {
    class_tables c{};
    c.rec = im.take(224);
    const size_t pC = im.take(72), dC = im.take(136), p = im.take(4 * 72), d = im.take(3 * 136), aC = im.take(56),
                 a = im.take(56), err = im.take(48), dep = im.take(8);
    im.raw(c.sbase = im.take(8), 8);
    c.vvbase = im.b.size();
    const uint32_t vv = vvlist(im, c, ZU_BINARY_PTR);
    c.sdbase = im.b.size();
    uint32_t sd[6];
    for (uint32_t &s : sd)
        s = sddef(im, c);
    c.vlbase = im.b.size();
    pattr(im, pC, ZU_INT64, NONE, NONE, c);
    pattr(im, p, ZU_BINARY_PTR, vv, NONE, c);
    pattr(im, p + 72, ZU_SD_PTR, NONE, sd[0], c);
    pattr(im, p + 144, ZU_SD_PTR, NONE, NONE, c);
    pattr(im, p + 216, ZU_SBS_PTR, NONE, NONE, c);
    dattr(im, dC, ZU_INT64_ARRAY, NONE, true, c);
    ranges.insert(uint32_t(dC));
    dattr(im, d, ZU_SD_PTR_ARRAY, sd[1], false, c);
    dattr(im, d + 136, ZU_SD_PTR_ARRAY, NONE, false, c);
    dattr(im, d + 272, ZU_INT32_ARRAY, NONE, false, c);
    action(im, aC, NONE, NONE, c);
    action(im, a, sd[2], sd[3], c);
    im.nums(err, {{0, 4}, {4, 4}, {8, 4}, {12, 2}, {14, 2}, {16, 4}, {40, 4}}), im.raw(err + 44, 4);
    im.num(err + 24, 4, vlist(im, c, 1)), im.num(err + 32, 4, sd[4]);
    im.nums(dep, {{0, 4}, {4, 2}}), im.raw(dep + 6, 2);
    im.nums(c.rec, {{0, 4},   {4, 4},   {8, 4},   {16, 4},  {136, 4}, {184, 4}, {188, 4}, {192, 4},
                    {196, 4}, {200, 4}, {204, 4}, {208, 2}, {210, 2}, {212, 2}, {214, 2}, {216, 4}});
    im.raw(c.rec + 220, 4);
    for (auto [o, pos] : {std::pair{24, pC}, {32, dC}, {40, p}, {48, d}, {96, aC}, {104, a}, {112, err}, {120, dep},
                          {128, c.vlbase}, {144, c.sdbase}, {152, c.vvbase}, {160, c.sbase}})
        im.num(c.rec + o, 4, pos - c.rec);
    for (auto [o, s] : {std::pair{56, NONE}, {64, NONE}, {72, sd[5]}, {80, NONE}, {88, NONE}})
        im.num(c.rec + o, 4, s);
    const uint16_t counts[] = {1, 1, 4, 3, 1, 1, 1, 1};
    for (int i = 0; i < 8; ++i)
        im.num(c.rec + 168 + 2 * i, 2, counts[i]);
    return c.rec;
}

// Header, four anchors and one dsect of each kind.
image full_image(std::unordered_set<uint32_t> &ranges) {
    image im;
    im.take(80 + 4 * 16);
    const size_t cls = class_dsect(im, ranges);
    const size_t mgr = im.take(24 + 8);
    im.nums(mgr, {{0, 4}, {4, 2}, {6, 2}, {8, 4}}), im.raw(mgr + 16, 16);
    const size_t map = im.take(60 + 16);
    im.nums(map, {{0, 4}, {4, 2}, {6, 2}, {8, 4}, {16, 4}, {40, 4}, {44, 4}, {48, 4}, {52, 4}});
    for (int o = 24; o < 40; o += 2)
        im.nums(map, {{o, 2}});
    im.raw(map + 56, 20);
    const size_t vc = im.take(40 + 16 + 16); // 12 bytes of names, three IDs
    im.nums(vc, {{0, 4}, {4, 2}, {6, 2}, {8, 4}, {16, 4}, {56, 4}, {60, 4}, {64, 4}});
    im.num(vc + 24, 4, 3), im.num(vc + 28, 4, 16), im.raw(vc + 36, 20), im.raw(vc + 68, 4);
    const std::pair<uint32_t, size_t> dsects[] = {{5, cls}, {3, mgr}, {6, map}, {4, vc}};
    for (int i = 0; i < 4; ++i)
        im.num(80 + 16 * i, 4, dsects[i].first), im.num(84 + 16 * i, 4, dsects[i].second),
            im.nums(88 + 16 * i, {{0, 4}, {4, 4}});
    im.nums(0, {{8, 4}, {12, 4}, {16, 4}, {20, 4}, {28, 2}, {30, 2}}), im.raw(50, 30);
    for (int o = 32; o < 50; o += 2)
        im.nums(0, {{o, 2}});
    im.num(24, 4, 4), im.num(0, 4, im.b.size() - 4), im.raw(4, 4);
    return im;
}

uint32_t foreign_xor(const unsigned char *b, size_t size) {
    uint32_t x = 0;
    for (size_t pos = 0; pos + 4 <= size; pos += 4)
        x ^= __builtin_bswap32(load<uint32_t>(b + pos));
    return x;
}

} // namespace

TEST(SwapImage, TurnsEveryNumberWithItsOwnWidthAndNothingElse) {
    std::unordered_set<uint32_t> ranges;
    image im = full_image(ranges);
    std::vector<unsigned char> want = im.expected();
    const size_t size = im.b.size();
    qecfg_cdef_swap(reinterpret_cast<qel_cdb_header_t *>(im.b.data()), ranges);
    ASSERT_EQ(im.b.size(), size);
    EXPECT_EQ(__builtin_bswap32(load<uint32_t>(&im.b[0])), size - 4);
    std::copy_n(im.b.begin() + 4, 4, want.begin() + 4); // the checksum, checked next
    EXPECT_EQ(first_diff(im.b, want), size);
    EXPECT_EQ(foreign_xor(im.b.data(), size), 0u);
}

// Any word after the length made huge: the walk must stay inside the image
// (the buffers have the exact size, so the sanitizers see every overrun).
TEST(SwapImage, DamagedOffsetOrCountStaysInside) {
    std::unordered_set<uint32_t> ranges;
    const image im = full_image(ranges);
    const size_t size = im.b.size();
    for (size_t pos = 8; pos < size; pos += 4) {
        auto buf = std::make_unique<unsigned char[]>(size);
        std::memcpy(buf.get(), im.b.data(), size);
        store<uint32_t>(buf.get() + pos, 0xFFFFFF00);
        qecfg_cdef_swap(reinterpret_cast<qel_cdb_header_t *>(buf.get()), ranges);
        EXPECT_EQ(foreign_xor(buf.get(), size), 0u) << pos;
    }
}

TEST(SwapImage, TooShortForAHeaderIsLeftAlone) {
    unsigned char b[12] = {0};
    store<uint32_t>(b, 8);
    b[8] = 0x31;
    qecfg_cdef_swap(reinterpret_cast<qel_cdb_header_t *>(b), {});
    EXPECT_EQ(load<uint32_t>(b), 8u);
    EXPECT_EQ(b[8], 0x31);
}
