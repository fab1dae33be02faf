// Value placement: numbers in the field, every other body out of line in the
// class string table, arrays and structured values element by element. The
// expected table contents are put together by hand with a small byte builder
// from the layouts of the bodies, never taken from a placement.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "qecfg.h"

namespace {

using std::string;

// Expected bytes, appended in file order.
struct bytes {
    string b;
    template <typename T> bytes &num(T v) {
        b.append(reinterpret_cast<const char *>(&v), sizeof v);
        return *this;
    }
    bytes &u32(uint32_t v) { return num(v); }
    bytes &u64(uint64_t v) { return num(v); }
    bytes &zeros(size_t n) { return b.append(n, '\0'), *this; }
    bytes &ff(size_t n) { return b.append(n, '\xFF'), *this; }
    // A text body: the text, its NUL, zeros up to a multiple of 8.
    bytes &text(const string &t) {
        b += t;
        return zeros(8 - t.size() % 8);
    }
};

template <typename T> string bits(T v) { return bytes{}.num(v).b; }

// What a fatal condition of the compile carries.
qecfg_fatal fatal_of(const std::function<void()> &f) {
    try {
        f();
    } catch (const qecfg_fatal &e) {
        return e;
    }
    return qecfg_fatal{"<no fatal condition>", -1};
}

class Place : public ::testing::Test {
  protected:
    qecfg_compiler c{qecfg_options{}};
    tbl *st = c.new_tbl("ClassStrings", 8192);
    // A value field outside the table; bytes a placement must not write keep
    // this pattern.
    alignas(8) unsigned char field[8];
    body_cursor a, sda, sde;

    void SetUp() override { std::memset(field, 0xA5, sizeof field); }
    string table() const { return st->tbl_base ? string(st->tbl_base, tbl_used(st)) : string(); }
    string field_bytes() const { return string(reinterpret_cast<const char *>(field), 8); }
    // The field with its first bytes replaced.
    static string field_with(const string &first) { return first + string(8 - first.size(), '\xA5'); }
    // The range codes give the none marker and append no body.
    void expect_range_ends_are_none(zu_data_type_t t) {
        size_t used = tbl_used(st);
        for (int code : {R_LO_DEFAULT, R_HI_DEFAULT}) {
            SetUp();
            ASSERT_EQ(place(nullptr, t, code), 0);
            EXPECT_EQ(field_bytes(), bytes{}.ff(8).b);
        }
        EXPECT_EQ(tbl_used(st), used);
    }
    uint32_t u32_at(uint32_t off) const { return load<uint32_t>(st->tbl_base + off); }
    int place(const zu_value_t *in, zu_data_type_t t, int code, body_cursor *an = nullptr, uint32_t cnt = 1) {
        return c.copy_this_type(value_slot::at(field), in, t, code, st, an, cnt);
    }
};

zu_value_t given_text(const char *t) {
    zu_value_t v{};
    v.ptr_char = const_cast<char *>(t);
    return v;
}

// A zu_binary_t image: the length word, then the data bytes, then bytes
// that are no part of it.
struct binary_image {
    alignas(8) char b[64];
    zu_value_t v{};
    explicit binary_image(const string &data) {
        std::memset(b, 0xEE, sizeof b);
        uint32_t len = uint32_t(data.size());
        std::memcpy(b, &len, 4);
        std::memcpy(b + 4, data.data(), data.size());
        v.ptr_binary = reinterpret_cast<zu_binary_t *>(b);
    }
};

// ------------------------------------------------------------------ numbers
// Per number type: the value given for TYPE_SAME and the bytes each code
// writes at the start of the field (TYPE_SAME, INIT_DEFAULT, DFLT_DEFAULT,
// R_LO_DEFAULT, R_HI_DEFAULT).
struct number_case {
    zu_data_type_t type;
    zu_value_t given;
    string written[5];
};
void PrintTo(const number_case &k, std::ostream *os) { *os << "type " << k.type; }


// A given number in the first bytes of its value; the bytes after it are a
// pattern that must not reach the field.
template <typename T> zu_value_t number_of(T x) {
    zu_value_t v{};
    v.val_uint64 = 0xA1A2A3A4A5A6A7A8ULL;
    std::memcpy(&v, &x, sizeof x);
    return v;
}

class PlaceNumber : public Place, public ::testing::WithParamInterface<number_case> {};

TEST_P(PlaceNumber, WritesOnlyItsOwnWidthAndNoBody) {
    const number_case &k = GetParam();
    const int codes[] = {TYPE_SAME, INIT_DEFAULT, DFLT_DEFAULT, R_LO_DEFAULT, R_HI_DEFAULT};
    for (int i = 0; i < 5; i++) {
        SetUp();
        ASSERT_EQ(place(&k.given, k.type, codes[i]), 0) << "code " << codes[i];
        EXPECT_EQ(field_bytes(), field_with(k.written[i])) << "code " << codes[i];
    }
    EXPECT_EQ(tbl_used(st), 0u);
}

INSTANTIATE_TEST_SUITE_P(
    Types, PlaceNumber,
    ::testing::Values(
        number_case{ZU_INT32, number_of<int32_t>(-7),
                    {bits<int32_t>(-7), bits<int32_t>(0), bits<int32_t>(0), bits<int32_t>(0), bits<int32_t>(100)}},
        number_case{ZU_UINT32, number_of<uint32_t>(0xFFFFFFFE),
                    {bits<uint32_t>(0xFFFFFFFE), bits<uint32_t>(0), bits<uint32_t>(0), bits<uint32_t>(0),
                     bits<uint32_t>(100)}},
        number_case{ZU_INT64, number_of<int64_t>(-0x123456789),
                    {bits<int64_t>(-0x123456789), bits<int64_t>(0), bits<int64_t>(0), bits<int64_t>(0),
                     bits<int64_t>(100)}},
        number_case{ZU_UINT64, number_of<uint64_t>(0x1122334455667788ULL),
                    {bits<uint64_t>(0x1122334455667788ULL), bits<uint64_t>(0), bits<uint64_t>(0), bits<uint64_t>(0),
                     bits<uint64_t>(100)}},
        number_case{ZU_FLOAT32, number_of<float>(-2.5f),
                    {bits(-2.5f), bits(0.0f), bits(0.0f), bits(0.0f), bits(100.0f)}},
        number_case{ZU_FLOAT64, number_of<double>(-2.5), {bits(-2.5), bits(0.0), bits(0.0), bits(0.0), bits(100.0)}}),
    [](const ::testing::TestParamInfo<number_case> &i) { return string(zuTypeStr[i.param.type]); });

// Codes that are no placement leave field and table alone.
TEST_F(Place, UndeclaredAndUnusedCodesAreRefused) {
    zu_value_t in = given_text("abc");
    for (int code : {0, int(TYPE_16), int(TYPE_INIT), 8}) {
        for (zu_data_type_t t : {ZU_INT32, ZU_FLOAT64, ZU_CHAR_PTR, ZU_BINARY_PTR}) {
            EXPECT_EQ(place(&in, t, code), -1) << zuTypeStr[t] << " code " << code;
            EXPECT_EQ(field_bytes(), field_with("")) << zuTypeStr[t] << " code " << code;
        }
    }
    EXPECT_EQ(tbl_used(st), 0u);
    // The declared codes 2 and 3 are refused for every type.
    for (int code : {TYPE_16, TYPE_INIT})
        for (zu_data_type_t t : {ZU_RSRC_HANDLE_PTR, ZU_INT32_ARRAY, ZU_CHAR_PTR_ARRAY})
            EXPECT_EQ(place(&in, t, code, &a, 2), -1) << zuTypeStr[t] << " code " << code;
}

TEST_F(Place, NoneTypeWritesNothingAndUnknownTypesAreRefused) {
    EXPECT_EQ(place(nullptr, ZU_NONE, DFLT_DEFAULT), 0);
    EXPECT_EQ(place(nullptr, ZU_NONE, TYPE_SAME), 0);
    EXPECT_EQ(place(nullptr, ZU_UNKNOWN, DFLT_DEFAULT), -1);
    EXPECT_EQ(place(nullptr, static_cast<zu_data_type_t>(23), DFLT_DEFAULT), -1);
    EXPECT_EQ(field_bytes(), field_with(""));
    EXPECT_EQ(tbl_used(st), 0u);
}

// ------------------------------------------------------------------ strings
TEST_F(Place, GivenTextIsItsBodyPaddedToEight) {
    string pre = "x";
    c.add_to_tbl(st, pre.c_str(), 2); // an earlier item at 0
    zu_value_t in = given_text("abcdefgh");
    ASSERT_EQ(place(&in, ZU_CHAR_PTR, TYPE_SAME), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(8)));
    EXPECT_EQ(table(), bytes{}.text("x").text("abcdefgh").b);
}

TEST_F(Place, DefaultTextIsEightZerosAndRangeTextIsNone) {
    for (int code : {INIT_DEFAULT, DFLT_DEFAULT}) {
        SetUp();
        uint32_t at = uint32_t(tbl_used(st));
        ASSERT_EQ(place(nullptr, ZU_CHAR_PTR, code), 0);
        EXPECT_EQ(field_bytes(), field_with(bits(at)));
    }
    EXPECT_EQ(table(), bytes{}.zeros(16).b); // each default a body of its own
    expect_range_ends_are_none(ZU_CHAR_PTR);
}

// ----------------------------------------------------------------- binaries
TEST_F(Place, GivenBinaryHasItsDataEightBytesAfterTheLength) {
    binary_image three("\x01\x02\x03");
    ASSERT_EQ(place(&three.v, ZU_BINARY_PTR, TYPE_SAME), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    binary_image nine("ABCDEFGHI");
    SetUp();
    ASSERT_EQ(place(&nine.v, ZU_BINARY_PTR, TYPE_SAME), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(16)));
    EXPECT_EQ(table(), bytes{}.u32(3).zeros(4).b + "\x01\x02\x03" + string(5, '\0') +
                           bytes{}.u32(9).zeros(4).b + "ABCDEFGHI" + string(7, '\0'));
}

TEST_F(Place, EmptyGivenBinaryKeepsOneZeroDataByte) {
    binary_image empty("");
    ASSERT_EQ(place(&empty.v, ZU_BINARY_PTR, TYPE_SAME), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    EXPECT_EQ(table(), bytes{}.zeros(16).b);
}

TEST_F(Place, DefaultBinaryIsALengthWordOnly) {
    ASSERT_EQ(place(nullptr, ZU_BINARY_PTR, DFLT_DEFAULT), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    SetUp();
    ASSERT_EQ(place(nullptr, ZU_BINARY_PTR, INIT_DEFAULT), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(8)));
    EXPECT_EQ(table(), bytes{}.zeros(16).b);
    expect_range_ends_are_none(ZU_BINARY_PTR);
}

// --------------------------------------------------------- resource handles
TEST_F(Place, ResourceHandleIsAlwaysAZeroHandle) {
    zu_value_t in{};
    in.val_uint64 = 0x0102030405060708ULL;
    uint32_t at = 0;
    // every placement code, and two numbers that are none
    for (int code : {1, 4, 5, 6, 7, 0, 9}) {
        SetUp();
        EXPECT_EQ(place(code == TYPE_SAME ? &in : nullptr, ZU_RSRC_HANDLE_PTR, code), 0) << code;
        EXPECT_EQ(field_bytes(), field_with(bits(at))) << code;
        at += 24;
    }
    EXPECT_EQ(table(), string(7 * 24, '\0'));
}

// -------------------------------------------------------------- fatal types
TEST_F(Place, StructuredTypesStopTheCompile) {
    struct {
        zu_data_type_t type;
        const char *msg;
    } cases[] = {{ZU_SD_PTR, "copy_this_type: this function does not handle SD type\n"},
                 {ZU_SBS_PTR, "ZU_SBS_TYPE not supported\n"},
                 {ZU_SD_PTR_ARRAY, "copy_this_type: this function does not handle SD ARRAY type\n"}};
    for (const auto &k : cases) {
        qecfg_fatal f = fatal_of([&] { place(nullptr, k.type, DFLT_DEFAULT, &a, 1); });
        EXPECT_EQ(f.message, k.msg);
        EXPECT_EQ(f.code, 1);
    }
    EXPECT_EQ(tbl_used(st), 0u);
}

// ------------------------------------------------------------------- arrays
TEST_F(Place, IntegerArrayHoldsTheValuesInTheFirstFourBytes) {
    c.add_to_tbl(st, "s", 2);
    for (int32_t v : {1, 2, -3}) {
        zu_value_t in{};
        in.val_int32 = v;
        ASSERT_EQ(place(&in, ZU_INT32_ARRAY, TYPE_SAME, &a, 3), 0);
    }
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(8)));
    EXPECT_TRUE(a.set);
    EXPECT_EQ(a.off, 8u);
    EXPECT_EQ(table(), bytes{}.text("s").u32(3).u32(0).u32(1).u32(0).u32(2).u32(0).num<int32_t>(-3).u32(0).b);
}

TEST_F(Place, ArrayKeepsItsCapacityWhenNotFull) {
    zu_value_t in{};
    in.val_int64 = -7;
    ASSERT_EQ(place(&in, ZU_INT64_ARRAY, TYPE_SAME, &a, 3), 0);
    EXPECT_EQ(table(), bytes{}.u32(1).u32(0).num<int64_t>(-7).zeros(16).b);
}

struct array_default_case {
    zu_data_type_t type;
    int code;
    string element;
};
void PrintTo(const array_default_case &k, std::ostream *os) { *os << "type " << k.type << ", code " << k.code; }


class PlaceArrayDefault : public Place, public ::testing::WithParamInterface<array_default_case> {};

TEST_P(PlaceArrayDefault, ElementTakesTheDefaultOfItsType) {
    const array_default_case &k = GetParam();
    ASSERT_EQ(place(nullptr, k.type, k.code, &a, 1), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    EXPECT_EQ(table(), bytes{}.u32(1).u32(0).b + k.element);
}

const string ZERO8(8, '\0');
INSTANTIATE_TEST_SUITE_P(
    Codes, PlaceArrayDefault,
    ::testing::Values(
        array_default_case{ZU_INT32_ARRAY, R_HI_DEFAULT, bytes{}.u32(100).u32(0).b},
        array_default_case{ZU_UINT32_ARRAY, DFLT_DEFAULT, ZERO8},
        array_default_case{ZU_UINT64_ARRAY, R_HI_DEFAULT, bits<uint64_t>(100)},
        array_default_case{ZU_FLOAT32_ARRAY, R_HI_DEFAULT, bytes{}.num(100.0f).u32(0).b},
        array_default_case{ZU_FLOAT64_ARRAY, R_HI_DEFAULT, bits(100.0)},
        array_default_case{ZU_FLOAT64_ARRAY, INIT_DEFAULT, ZERO8},
        // Reference elements: the body follows the 16-byte array.
        array_default_case{ZU_CHAR_PTR_ARRAY, INIT_DEFAULT, bytes{}.u32(16).u32(0).zeros(8).b},
        array_default_case{ZU_CHAR_PTR_ARRAY, DFLT_DEFAULT, bytes{}.u32(16).u32(0).zeros(8).b},
        array_default_case{ZU_CHAR_PTR_ARRAY, R_LO_DEFAULT, bytes{}.ff(8).b},
        array_default_case{ZU_BINARY_PTR_ARRAY, DFLT_DEFAULT, bytes{}.u32(16).u32(0).zeros(16).b},
        array_default_case{ZU_BINARY_PTR_ARRAY, INIT_DEFAULT, bytes{}.u32(16).u32(0).zeros(16).b},
        array_default_case{ZU_BINARY_PTR_ARRAY, R_HI_DEFAULT, bytes{}.ff(8).b},
        array_default_case{ZU_RSRC_HANDLE_PTR_ARRAY, R_LO_DEFAULT, bytes{}.u32(16).u32(0).zeros(24).b},
        array_default_case{ZU_RSRC_HANDLE_PTR_ARRAY, TYPE_SAME, bytes{}.u32(16).u32(0).zeros(24).b}));

TEST_F(Place, StringArrayElementsHoldTheOffsetsOfTheirTexts) {
    zu_value_t t1 = given_text("ab"), t2 = given_text("cdefghijk");
    ASSERT_EQ(place(&t1, ZU_CHAR_PTR_ARRAY, TYPE_SAME, &a, 2), 0);
    ASSERT_EQ(place(&t2, ZU_CHAR_PTR_ARRAY, TYPE_SAME, &a, 2), 0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    EXPECT_EQ(table(), bytes{}.u32(2).u32(0).u32(24).u32(0).u32(32).u32(0).text("ab").text("cdefghijk").b);
}

TEST_F(Place, BinaryArrayElementIsPlacedLikeTheScalar) {
    binary_image bin("xyz");
    ASSERT_EQ(place(&bin.v, ZU_BINARY_PTR_ARRAY, TYPE_SAME, &a, 1), 0);
    EXPECT_EQ(table(), bytes{}.u32(1).u32(0).u32(16).u32(0).u32(3).u32(0).b + "xyz" + string(5, '\0'));
}

// The element slot is taken before the code is looked at.
TEST_F(Place, ArrayWithAnInvalidCodeKeepsAZeroSlot) {
    EXPECT_EQ(place(nullptr, ZU_INT32_ARRAY, 0, &a, 2), -1);
    EXPECT_EQ(place(nullptr, ZU_CHAR_PTR_ARRAY, 8, &sda, 1), -1);
    EXPECT_EQ(table(), bytes{}.u32(1).zeros(20).u32(1).zeros(12).b);
}

TEST_F(Place, ArrayWithoutCapacityStops) {
    qecfg_fatal f = fatal_of([&] { place(nullptr, ZU_INT32_ARRAY, DFLT_DEFAULT, &a, 0); });
    EXPECT_EQ(f.message, "Attempt to write NULL array\n");
    EXPECT_EQ(f.code, 1);
    // also once the array exists
    ASSERT_EQ(place(nullptr, ZU_INT32_ARRAY, DFLT_DEFAULT, &a, 2), 0);
    f = fatal_of([&] { place(nullptr, ZU_INT32_ARRAY, DFLT_DEFAULT, &a, 0); });
    EXPECT_EQ(f.message, "Attempt to write NULL array\n");
    EXPECT_EQ(u32_at(0), 1u);
}

// ---------------------------------------------------- the building routines
TEST_F(Place, InitArrayCreatesOnceAndCountsSlots) {
    c.add_to_tbl(st, "", 1);
    uint32_t idx = 99;
    c.init_array(st, &a, 4, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 0u);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(8)));
    std::memset(field, 0x5A, 8);
    c.init_array(st, &a, 4, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 1u);
    EXPECT_EQ(field_bytes(), string(8, '\x5A')); // the offset is stored once
    EXPECT_EQ(table(), bytes{}.zeros(8).u32(2).zeros(36).b);
}

TEST_F(Place, InitScalarSdReservesRoomForAllElements) {
    uint32_t idx = 99;
    c.init_scalar_sd(st, &sde, 2, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 0u);
    c.init_scalar_sd(st, &sde, 2, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 1u);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    EXPECT_EQ(table(), bytes{}.u32(2).zeros(4 + 32).b);
}

// Without elements every call makes a new 24-byte value of count 0.
TEST_F(Place, InitScalarSdWithoutElementsAlwaysMakesANewValue) {
    uint32_t idx = 99;
    c.init_scalar_sd(st, &sde, 0, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 0u);
    c.init_scalar_sd(st, &sde, 0, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 0u);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(24)));
    EXPECT_EQ(sde.off, 24u);
    EXPECT_EQ(table(), string(48, '\0'));
}

TEST_F(Place, InitArraySdSetsTheCountToOne) {
    uint32_t idx = 99;
    c.init_array_sd(st, &sda, &sde, 1, 2, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 0u);
    c.init_array_sd(st, &sda, &sde, 1, 2, value_slot::at(field), &idx);
    EXPECT_EQ(idx, 1u);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    // the array of one, then the structured value it designates
    EXPECT_EQ(table(), bytes{}.u32(1).u32(0).u32(16).u32(0).u32(2).zeros(4 + 32).b);
    qecfg_fatal f = fatal_of([&] { c.init_array_sd(st, &sda, &sde, 0, 2, value_slot::at(field), &idx); });
    EXPECT_EQ(f.message, "Attempt to write NULL array\n");
}

// --------------------------------------------------------- structured values
class PlaceSd : public Place {
  protected:
    // One element per type, as the structured-data completion adds them: the
    // array anchor emptied before each element.
    void build(std::initializer_list<zu_data_type_t> types, int code, zu_data_type_t sd_type) {
        for (zu_data_type_t t : types) {
            a = body_cursor{};
            ASSERT_EQ(c.copy_this_sd_type(value_slot::at(field), t, code, st, &a, &sda, &sde, uint32_t(types.size()),
                                          sd_type),
                      0)
                << zuTypeStr[t];
        }
    }
};

TEST_F(PlaceSd, ElementsGetTheirTypeAndTheirTypeDefault) {
    build({ZU_INT32, ZU_CHAR_PTR_ARRAY, ZU_CHAR_PTR}, DFLT_DEFAULT, ZU_SD_PTR);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    bytes want;
    want.u32(3).u32(0);                  // 0: three elements
    want.u32(ZU_INT32).u32(0).u64(0);    // 8: 0
    want.u32(ZU_CHAR_PTR_ARRAY).u32(0);  // 24
    want.u32(56).u32(0);                 // 32: its array at 56
    want.u32(ZU_CHAR_PTR).u32(0);        // 40
    want.u32(80).u32(0);                 // 48: its empty text at 80
    want.u32(1).u32(0).u32(72).u32(0);   // 56: array of one, text at 72
    want.zeros(8).zeros(8);              // 72, 80: the two empty texts
    EXPECT_EQ(table(), want.b);
}

TEST_F(PlaceSd, ScalarBinaryElementIsALengthWordArrayElementKeepsADataPart) {
    build({ZU_BINARY_PTR, ZU_BINARY_PTR_ARRAY}, INIT_DEFAULT, ZU_SD_PTR);
    bytes want;
    want.u32(2).u32(0);
    want.u32(ZU_BINARY_PTR).u32(0).u32(40).u32(0);       // 8: length word at 40
    want.u32(ZU_BINARY_PTR_ARRAY).u32(0).u32(48).u32(0); // 24: array at 48
    want.zeros(8);                                        // 40
    want.u32(1).u32(0).u32(64).u32(0);                   // 48: element body at 64
    want.zeros(16);                                       // 64: length part, one data part
    EXPECT_EQ(table(), want.b);
}

TEST_F(PlaceSd, SdArrayHoldsOneStructuredValueWithRangeDefaults) {
    build({ZU_INT64, ZU_FLOAT32, ZU_CHAR_PTR}, R_HI_DEFAULT, ZU_SD_PTR_ARRAY);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    bytes want;
    want.u32(1).u32(0).u32(16).u32(0);                    // 0: array of one
    want.u32(3).u32(0);                                    // 16: structured value
    want.u32(ZU_INT64).u32(0).u64(100);                    // 24
    want.u32(ZU_FLOAT32).u32(0).num(100.0f).u32(0);        // 40
    want.u32(ZU_CHAR_PTR).u32(0).ff(8);                    // 56: no text
    EXPECT_EQ(table(), want.b);
}

TEST_F(PlaceSd, WithoutElementsTheValueHasRoomForOne) {
    EXPECT_EQ(c.copy_this_sd_type(value_slot::at(field), ZU_INT32, R_LO_DEFAULT, st, &a, &sda, &sde, 0, ZU_SD_PTR), 0);
    EXPECT_EQ(table(), string(24, '\0'));
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(0)));
    Place::SetUp();
    a = sda = sde = body_cursor{};
    EXPECT_EQ(c.copy_this_sd_type(value_slot::at(field), ZU_INT32, R_HI_DEFAULT, st, &a, &sda, &sde, 0,
                                  ZU_SD_PTR_ARRAY),
              0);
    EXPECT_EQ(field_bytes(), field_with(bits<uint32_t>(24)));
    EXPECT_EQ(table(), string(24, '\0') + bytes{}.u32(1).u32(0).u32(40).u32(0).zeros(24).b);
}

TEST_F(PlaceSd, ElementThatCannotBePlacedStillGetsItsType) {
    auto beyond = static_cast<zu_data_type_t>(23);
    EXPECT_EQ(c.copy_this_sd_type(value_slot::at(field), beyond, DFLT_DEFAULT, st, &a, &sda, &sde, 2, ZU_SD_PTR), -1);
    EXPECT_EQ(c.copy_this_sd_type(value_slot::at(field), ZU_NONE, DFLT_DEFAULT, st, &a, &sda, &sde, 2, ZU_SD_PTR), 0);
    EXPECT_EQ(table(), bytes{}.u32(2).u32(0).u32(23).zeros(12).u32(ZU_NONE).zeros(12).b);
}

TEST_F(PlaceSd, OnlyStructuredTypesAreBuilt) {
    qecfg_fatal f = fatal_of(
        [&] { c.copy_this_sd_type(value_slot::at(field), ZU_INT32, DFLT_DEFAULT, st, &a, &sda, &sde, 1, ZU_INT32); });
    EXPECT_EQ(f.message, "copy_this_sd_type: only SD types allowed\n");
    EXPECT_EQ(f.code, 1);
    EXPECT_EQ(tbl_used(st), 0u);
}

// ------------------------------------------------- growth of the string table
// A value field inside the table and an array whose texts carry the table
// past its 8192-byte unit: every element and the field stay where they were.
TEST_F(Place, ArrayFilledWhileTheTableGrowsKeepsEveryElement) {
    uint32_t slot = c.add_to_tbl(st, "\0\0\0\0\0\0\0\0", 8);
    const int n = 300;
    std::vector<string> texts;
    for (int i = 0; i < n; i++) {
        texts.push_back(string(30, char('A' + i % 26)) + char('0' + i % 10)); // 31 chars: 32-byte body
        zu_value_t in = given_text(texts.back().c_str());
        ASSERT_EQ(c.copy_this_type(value_slot::in(st, slot), &in, ZU_CHAR_PTR_ARRAY, TYPE_SAME, st, &a, n), 0);
    }
    uint32_t array = 8, first_text = array + 8 + 8 * n; // 2416
    ASSERT_GT(first_text + 32 * n, 8192u);
    EXPECT_EQ(tbl_used(st), size_t(first_text + 32 * n));
    EXPECT_EQ(st->tbl_size, 16384u);
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
        ASSERT_EQ(c.copy_this_sd_type(value_slot::at(field), ZU_RSRC_HANDLE_PTR_ARRAY, DFLT_DEFAULT, st, &a, &sda,
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
