// Value text conversions: type names, numbers, strings, binaries, quotes,
// version numbers and property lists.
#include <gtest/gtest.h>

#include <cerrno>
#include <cfloat>
#include <cmath>
#include <cstring>
#include <limits>
#include <memory>
#include <string>
#include <tuple>
#include <utility>

#include "qecfg_fatal.h"
#include "qecfg_value.h"

namespace {

using std::string;
constexpr bool OK = true, BAD = false;

// The bytes of a binary image: a length word, then that many bytes.
string image_bytes(const void *image) {
    auto *p = static_cast<const char *>(image);
    return string(p + 4, load<zu_uint32_t>(p));
}

// A conversion into a value whose bytes start out as a known pattern, so
// that bytes the conversion must leave alone can be checked.
struct converted {
    int rc;
    alignas(8) zu_value_t v; // pointers in it are read back as such
    bool high_half_untouched() const {
        auto *b = reinterpret_cast<const unsigned char *>(&v);
        return b[4] == 0xA5 && b[5] == 0xA5 && b[6] == 0xA5 && b[7] == 0xA5;
    }
};

converted convert(table_arena &c, zu_data_type_t type, const char *text) {
    converted r;
    std::memset(&r.v, 0xA5, sizeof r.v);
    r.rc = str_to_zu(c, &r.v, type, text);
    return r;
}

class ValueConvert : public ::testing::Test {
  protected:
    table_arena c;
};

// ---------------------------------------------------------------- integers
struct int_case {
    zu_data_type_t type;
    const char *text;
    bool ok;
    uint64_t bits; // val_uint32 or val_uint64, by the type's width
};
// Test names show the value text, not the bytes of the case.
void PrintTo(const int_case &k, std::ostream *os) { *os << '"' << k.text << '"'; }

class ValueInteger : public ValueConvert, public ::testing::WithParamInterface<int_case> {};

TEST_P(ValueInteger, AcceptsExactlyTheDecimalTextInRange) {
    const int_case &k = GetParam();
    converted r = convert(c, k.type, k.text);
    ASSERT_EQ(r.rc, k.ok ? 0 : -1);
    if (!k.ok)
        return;
    zu_data_type_t t = scalar_zu(k.type);
    if (t == ZU_INT32 || t == ZU_UINT32) {
        EXPECT_EQ(r.v.val_uint32, k.bits);
        EXPECT_TRUE(r.high_half_untouched());
    } else {
        EXPECT_EQ(r.v.val_uint64, k.bits);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Ranges, ValueInteger,
    ::testing::Values(
        int_case{ZU_INT32, "2147483647", OK, 0x7FFFFFFF}, int_case{ZU_INT32, "-2147483648", OK, 0x80000000},
        int_case{ZU_INT32, "2147483648", BAD, 0}, int_case{ZU_INT32, "-2147483649", BAD, 0},
        int_case{ZU_INT32, "4294967297", BAD, 0}, int_case{ZU_INT32, "99999999999999999999", BAD, 0},
        int_case{ZU_UINT32, "-1", OK, 0xFFFFFFFF}, int_case{ZU_UINT32, "4294967295", OK, 0xFFFFFFFF},
        int_case{ZU_UINT32, "-4294967295", OK, 1}, int_case{ZU_UINT32, "4294967296", BAD, 0},
        int_case{ZU_UINT32, "-4294967296", BAD, 0}, int_case{ZU_UINT32, "18446744073709551615", BAD, 0},
        int_case{ZU_INT64, "9223372036854775807", OK, 0x7FFFFFFFFFFFFFFF},
        int_case{ZU_INT64, "-9223372036854775808", OK, 0x8000000000000000},
        int_case{ZU_INT64, "9223372036854775808", BAD, 0}, int_case{ZU_INT64, "-9223372036854775809", BAD, 0},
        int_case{ZU_UINT64, "18446744073709551615", OK, 0xFFFFFFFFFFFFFFFF},
        int_case{ZU_UINT64, "-1", OK, 0xFFFFFFFFFFFFFFFF}, int_case{ZU_UINT64, "18446744073709551616", BAD, 0},
        int_case{ZU_UINT64, "-18446744073709551616", BAD, 0}, int_case{ZU_INT32_ARRAY, "-5", OK, 0xFFFFFFFB},
        int_case{ZU_UINT64_ARRAY, "7", OK, 7}));

INSTANTIATE_TEST_SUITE_P(Notation, ValueInteger,
                         ::testing::Values(int_case{ZU_INT32, " 10", OK, 10}, int_case{ZU_INT32, "\t+10", OK, 10},
                                           int_case{ZU_INT32, "010", OK, 10}, int_case{ZU_UINT64, "010", OK, 10},
                                           int_case{ZU_INT32, "10 ", BAD, 0}, int_case{ZU_UINT32, "10 ", BAD, 0},
                                           int_case{ZU_INT64, "0x10", BAD, 0}, int_case{ZU_UINT64, "0x10", BAD, 0},
                                           int_case{ZU_INT32, "1e3", BAD, 0}, int_case{ZU_INT32, "", BAD, 0},
                                           int_case{ZU_INT32, " ", BAD, 0}, int_case{ZU_UINT32, "-", BAD, 0},
                                           int_case{ZU_INT64, "abc", BAD, 0}, int_case{ZU_UINT32, "--1", BAD, 0}));

// ------------------------------------------------------------------ floats
struct float_case {
    zu_data_type_t type;
    const char *text;
    bool ok;
    double value; // compared as the type's own width
};
// Test names show the value text, not the bytes of the case.
void PrintTo(const float_case &k, std::ostream *os) { *os << '"' << k.text << '"'; }

class ValueFloat : public ValueConvert, public ::testing::WithParamInterface<float_case> {};

TEST_P(ValueFloat, AppliesTheRangeErrorRules) {
    const float_case &k = GetParam();
    converted r = convert(c, k.type, k.text);
    ASSERT_EQ(r.rc, k.ok ? 0 : -1);
    if (!k.ok)
        return;
    if (k.type == ZU_FLOAT32) {
        EXPECT_EQ(r.v.val_float32, static_cast<float>(k.value));
        EXPECT_TRUE(r.high_half_untouched());
    } else {
        EXPECT_EQ(r.v.val_float64, k.value);
    }
}

constexpr double INF = std::numeric_limits<double>::infinity();
INSTANTIATE_TEST_SUITE_P(
    Cases, ValueFloat,
    ::testing::Values(float_case{ZU_FLOAT32, "1.5", OK, 1.5}, float_case{ZU_FLOAT32, "1e39", BAD, 0},
                      float_case{ZU_FLOAT32, "-1e39", OK, -INF}, float_case{ZU_FLOAT32, "1e-50", BAD, 0},
                      float_case{ZU_FLOAT32, "-1e-50", BAD, 0}, float_case{ZU_FLOAT32, "1e-40", OK, 1e-40f},
                      float_case{ZU_FLOAT32, "inf", OK, INF}, float_case{ZU_FLOAT32, "-inf", OK, -INF},
                      float_case{ZU_FLOAT32, "0x1p3", OK, 8}, float_case{ZU_FLOAT32, " -0.25", OK, -0.25},
                      float_case{ZU_FLOAT32, "1.5 ", BAD, 0}, float_case{ZU_FLOAT32, "1,5", BAD, 0},
                      float_case{ZU_FLOAT32, ".", BAD, 0}, float_case{ZU_FLOAT32, "1.17549430e-38", BAD, 0},
                      float_case{ZU_FLOAT32, "1.17549435e-38", OK, FLT_MIN},
                      float_case{ZU_FLOAT32, "1.1754942e-38", OK, 0x1.fffffcp-127},
                      float_case{ZU_FLOAT32, "3.4028235e38", OK, FLT_MAX}, float_case{ZU_FLOAT64, "2.5", OK, 2.5},
                      float_case{ZU_FLOAT64, "1e309", BAD, 0}, float_case{ZU_FLOAT64, "-1e309", OK, -INF},
                      float_case{ZU_FLOAT64, "1e-400", BAD, 0}, float_case{ZU_FLOAT64, "1e-310", OK, 1e-310},
                      float_case{ZU_FLOAT64, "infinity", OK, INF}, float_case{ZU_FLOAT64_ARRAY, "-3", OK, -3}));

TEST_F(ValueConvert, FloatSubnormalAndNanAreValues) {
    converted r = convert(c, ZU_FLOAT32, "1e-40");
    ASSERT_EQ(r.rc, 0);
    EXPECT_EQ(std::fpclassify(r.v.val_float32), FP_SUBNORMAL);
    r = convert(c, ZU_FLOAT32, "nan");
    ASSERT_EQ(r.rc, 0);
    EXPECT_TRUE(std::isnan(r.v.val_float32));
    r = convert(c, ZU_FLOAT64, "nan");
    ASSERT_EQ(r.rc, 0);
    EXPECT_TRUE(std::isnan(r.v.val_float64));
}

// Zero converts for every numeric type, whatever range error came before.
TEST_F(ValueConvert, EarlierRangeErrorDoesNotCount) {
    for (zu_data_type_t t : {ZU_INT32, ZU_UINT32, ZU_INT64, ZU_UINT64, ZU_FLOAT32, ZU_FLOAT64}) {
        ASSERT_EQ(convert(c, ZU_FLOAT64, "1e-400").rc, -1);
        errno = ERANGE;
        converted r = convert(c, t, "0");
        EXPECT_EQ(r.rc, 0) << zuTypeStr[t];
        EXPECT_EQ(r.v.val_uint32, 0u) << zuTypeStr[t];
    }
}

TEST_F(ValueConvert, TypesWithoutTextFormAreRefused) {
    for (uint32_t t : {0u, 1u, 10u, 11u, 12u, 21u, 22u, 23u, 0xFFFFFFFFu})
        EXPECT_EQ(convert(c, static_cast<zu_data_type_t>(t), "1").rc, -1) << t;
}

TEST_F(ValueConvert, StringIsAPrivateByteForByteCopy) {
    const char text[] = "a\\101 \"b\\";
    for (zu_data_type_t t : {ZU_CHAR_PTR, ZU_CHAR_PTR_ARRAY}) {
        converted r = convert(c, t, text);
        ASSERT_EQ(r.rc, 0);
        EXPECT_STREQ(r.v.ptr_char, text);
        EXPECT_NE(r.v.ptr_char, text);
    }
    EXPECT_EQ(convert(c, ZU_CHAR_PTR, "").rc, -1);
}

// ---------------------------------------------------------------- binaries
struct binary_case {
    const char *text;
    bool ok;
    string bytes;
};
// Test names show the value text, not the bytes of the case.
void PrintTo(const binary_case &k, std::ostream *os) { *os << '"' << k.text << '"'; }

class ValueBinary : public ValueConvert, public ::testing::WithParamInterface<binary_case> {};

TEST_P(ValueBinary, BuildsTheImage) {
    const binary_case &k = GetParam();
    for (zu_data_type_t t : {ZU_BINARY_PTR, ZU_BINARY_PTR_ARRAY}) {
        converted r = convert(c, t, k.text);
        ASSERT_EQ(r.rc, k.ok ? 0 : -1);
        if (k.ok) {
            EXPECT_EQ(image_bytes(r.v.ptr_binary), k.bytes);
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Hex, ValueBinary,
                         ::testing::Values(binary_case{"0x", OK, ""},
                                           binary_case{"0x00ff10", OK, string("\x00\xff\x10", 3)},
                                           binary_case{"0xAbCd", OK, "\xab\xcd"}, binary_case{"0x0", BAD, ""},
                                           binary_case{"0X0A", BAD, ""}, binary_case{"0", BAD, ""},
                                           binary_case{"012", BAD, ""}, binary_case{"0xg0", BAD, ""},
                                           binary_case{"0x0 ", BAD, ""}, binary_case{"", BAD, ""}));

INSTANTIATE_TEST_SUITE_P(Escapes, ValueBinary,
                         ::testing::Values(binary_case{"abc", OK, "abc"}, binary_case{"ab\\101\\\\c", OK, "abA\\c"},
                                           binary_case{"\\377", OK, "\xff"}, binary_case{"\\1234", OK, "S4"},
                                           binary_case{"\\08", OK,
                                                       string("\0"
                                                              "8",
                                                              2)},
                                           binary_case{"\\ 7x", OK, "\x07x"}, binary_case{"\\-1", OK, "\xff"},
                                           binary_case{"\\+12", OK, "\n"}, binary_case{"x\\\\", OK, "x\\"},
                                           binary_case{" 0x1", OK, " 0x1"}, binary_case{"\\400", BAD, ""},
                                           binary_case{"\\9", BAD, ""}, binary_case{"ab\\", BAD, ""},
                                           binary_case{"\\   7", BAD, ""}, binary_case{"\\x41", BAD, ""}));

// The converters write no more than binary_image_size says, even when called
// directly on texts that str_to_zu would never hand them.
TEST(ValueBinaryDirect, RefusesBadTextsWithinTheImageSize) {
    auto run_hex = [](const char *s) {
        auto buf = std::make_unique<char[]>(binary_image_size(std::strlen(s)));
        return hex_convert(buf.get(), s);
    };
    EXPECT_EQ(run_hex(""), -1);
    EXPECT_EQ(run_hex("x0"), -1);
    EXPECT_EQ(run_hex("1x00"), -1);
    EXPECT_EQ(run_hex("0x123"), -1);
    EXPECT_EQ(run_hex("0x12"), 0);
    auto buf = std::make_unique<char[]>(binary_image_size(3));
    EXPECT_EQ(oct_convert("abc", 1, buf.get()), -1);
    EXPECT_EQ(oct_convert("abc", 2, buf.get()), 0);
    EXPECT_EQ(image_bytes(buf.get()), "abc");
}

// ------------------------------------------------------------- type names
TEST(ValueNames, DataTypeNamesAreExact) {
    const std::pair<const char *, uint32_t> names[] = {
        {"None", 1},         {"Int32", 2},         {"UInt32", 3},        {"Int64", 4},        {"UInt64", 5},
        {"Float32", 6},      {"Float64", 7},       {"String", 8},        {"Binary", 9},       {"RH", 10},
        {"SD", 11},          {"SBS", 12},          {"Int32Array", 13},   {"UInt32Array", 14}, {"Int64Array", 15},
        {"UInt64Array", 16}, {"Float32Array", 17}, {"Float64Array", 18}, {"StringArray", 19}, {"BinaryArray", 20},
        {"RHArray", 21},     {"SDArray", 22}};
    for (auto &[name, dt] : names)
        EXPECT_EQ(strToZuDt(name), dt) << name;
    for (const char *bad : {"UNKNOWN", "int32", "Int32 ", " Int32", "Int", "", "Int32Arrayx"})
        EXPECT_EQ(strToZuDt(bad), ZU_UNKNOWN) << bad;
    EXPECT_EQ(strToZuDt(nullptr), ZU_UNKNOWN);
}

TEST(ValueNames, VariableTypeNamesAreExact) {
    const std::pair<const char *, uint32_t> names[] = {{"Counter", 0}, {"Quantity", 1}, {"State", 2}, {"Quantum", 3}};
    for (auto &[name, vt] : names) {
        qel_variable_type_t t = static_cast<qel_variable_type_t>(99);
        EXPECT_EQ(strToVar(name, &t), 0);
        EXPECT_EQ(t, vt) << name;
    }
    for (const char *bad : {"counter", "State ", "", static_cast<const char *>(nullptr)}) {
        qel_variable_type_t t = static_cast<qel_variable_type_t>(99);
        EXPECT_EQ(strToVar(bad, &t), 1);
        EXPECT_EQ(t, 99u);
    }
}

TEST(ValueNames, ArrayTypesAndTheirElements) {
    const uint32_t scalar_of[][2] = {{0, 0},  {8, 8},   {11, 11}, {12, 12}, {13, 2},
                                     {19, 8}, {22, 11}, {23, 23}, {40, 40}};
    for (auto &[dt, el] : scalar_of)
        EXPECT_EQ(scalar_zu(static_cast<zu_data_type_t>(dt)), el) << dt;
    for (uint32_t dt : {0u, 12u, 23u, 0xFFFFFFFFu})
        EXPECT_FALSE(zu_is_array_type(dt)) << dt;
    for (uint32_t dt : {13u, 17u, 22u})
        EXPECT_TRUE(zu_is_array_type(dt)) << dt;
}

// ------------------------------------------------------------ quotes
TEST(ValueQuotes, StripsOnlyAMatchedPair) {
    const std::pair<const char *, const char *> stripped[] = {
        {"  \"abc\"", "abc"},           {"\t\"x\"", "x"},    {"\"", ""}, {" \t\"", ""}, {"\"\"", ""},
        {"\"a \"b\" c\"", "a \"b\" c"}, {"\"a\\b\"", "a\\b"}};
    for (auto &[in, out] : stripped) {
        string buf = in;
        const char *r = strip_quotes(buf.data());
        ASSERT_NE(r, nullptr) << in;
        EXPECT_STREQ(r, out) << in;
    }
    for (const char *in : {"\"abc\\\"", "\"abc\" ", "\"abc", "\"\\\""}) {
        string buf = in;
        EXPECT_EQ(strip_quotes(buf.data()), nullptr) << in;
    }
    for (const char *in : {"abc\"", "  abc", "a\"b\""}) {
        string buf = in;
        EXPECT_EQ(strip_quotes(buf.data()), buf.data()) << in;
        EXPECT_EQ(buf, in);
    }
    EXPECT_EQ(strip_quotes(nullptr), nullptr);
}

// ------------------------------------------------------------ versions
TEST(ValueVersion, PacksFourParts) {
    const std::pair<const char *, uint32_t> versions[] = {{"1.2.3.4", 0x01020304},
                                                          {"2.1", 0x02010000},
                                                          {"1.2.3.4.5", 0x01020304},
                                                          {"", 0},
                                                          {"1.2.3.300", 0x0102032C},
                                                          {"1..3", 0x01000300},
                                                          {" 1. +2.x.7", 0x01020007},
                                                          {"-1", 0xFF000000},
                                                          {"4294967297", 0x01000000},
                                                          {"1.2.3.65536", 0x01030300},
                                                          {"1.256.3", 0x01000300},
                                                          {"1.2.3.4x.9", 0x01020304},
                                                          {".", 0},
                                                          {"7.", 0x07000000},
                                                          {"1.2.3.-1", 0xFFFFFFFF},
                                                          {"0.256.3", 0x00000300},
                                                          {"0.0.256.1", 0x00000001}};
    for (auto &[text, packed] : versions) {
        uint32_t n = 0xDEADBEEF;
        EXPECT_EQ(ver_str_convert(text, &n), 0);
        EXPECT_EQ(n, packed) << text;
    }
}

// ------------------------------------------------------------ properties
const props_t test_props[] = {{"Alpha", 0x1}, {"Beta", 0x2}, {"Beta", 0x40}, {"Gamma", 0x4}, {"Hidden", 0x8}};
constexpr int TEST_PROPS_SEARCHED = 4; // "Hidden" lies beyond the searched entries

TEST_F(ValueConvert, PropertiesAddBits) {
    const std::tuple<uint32_t, const char *, uint32_t> lists[] = {{0x100, "Alpha,,Gamma", 0x105},
                                                                  {0, ",Alpha,", 0x1},
                                                                  {0x100, ",,,", 0x100},
                                                                  {0, "Beta", 0x2},
                                                                  {0, "Alpha,Alpha", 0x1}};
    for (auto &[before, text, after] : lists) {
        uint32_t dest = before;
        string buf = text;
        set_props(&dest, test_props, TEST_PROPS_SEARCHED, buf.data());
        EXPECT_EQ(dest, after) << text;
    }
    uint32_t dest = 0;
    string buf = "Public,ReadOnly";
    set_props(&dest, pa_props, pa_props_cnt, buf.data());
    EXPECT_EQ(dest, 0x21u);
}

TEST_F(ValueConvert, UnknownPropertyStopsWithItsName) {
    const std::pair<const char *, const char *> lists[] = {{"Alpha, Gamma", " Gamma"},
                                                           {"Hidden", "Hidden"},
                                                           {"alpha", "alpha"},
                                                           {"Alpha,Gamm", "Gamm"},
                                                           {"Alpha ,Gamma", "Alpha "}};
    for (auto &[text, name] : lists) {
        uint32_t dest = 0;
        string buf = text;
        try {
            set_props(&dest, test_props, TEST_PROPS_SEARCHED, buf.data());
            ADD_FAILURE() << text << " was accepted";
        } catch (const qecfg_fatal &f) {
            EXPECT_EQ(f.id, msg::invalid_property);
            EXPECT_EQ(f.text(true), string(name) + ": invalid property\n");
            EXPECT_EQ(f.status, 1);
        }
    }
}

} // namespace
