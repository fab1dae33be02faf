// The text, JSON and annotation renderings of a verified image.
#include <algorithm>
#include <cctype>
#include <clocale>
#include <cstring>
#include <cuchar>
#include <sstream>

#include <gtest/gtest.h>

#include "cdb_annotate.h"
#include "cdb_to_tree.h"
#include "cdb_walk.h"
#include "test_images.h"

using namespace cdbdump;

namespace {
// A strict JSON syntax check: value, then nothing but white space.
struct json_checker {
    const std::string &s;
    size_t i = 0;
    void ws() {
        while (i < s.size() && std::isspace(static_cast<unsigned char>(s[i])))
            i++;
    }
    bool lit(const char *w) {
        size_t n = std::char_traits<char>::length(w);
        if (s.compare(i, n, w) != 0)
            return false;
        i += n;
        return true;
    }
    // Raw bytes must be UTF-8 (checked by the standard library's strict
    // converter), escapes one of JSON's.
    bool string() {
        if (s[i++] != '"')
            return false;
        size_t start = i;
        while (i < s.size() && s[i] != '"') {
            if (static_cast<unsigned char>(s[i]) < 0x20)
                return false;
            if (s[i] == '\\' && !escape())
                return false;
            i++;
        }
        return i < s.size() && utf8(s.substr(start, i - start)) && i++ < s.size();
    }
    bool escape() {
        i++;
        if (i < s.size() && std::strchr("\"\\/bfnrt", s[i]))
            return true;
        if (i >= s.size() || s[i] != 'u' || i + 4 >= s.size())
            return false;
        for (int k = 1; k <= 4; k++)
            if (!std::isxdigit(static_cast<unsigned char>(s[i + size_t(k)])))
                return false;
        i += 4;
        return true;
    }
    static bool utf8(const std::string &bytes) {
        std::mbstate_t state{};
        const char *p = bytes.data(), *end = p + bytes.size();
        while (p < end) {
            char32_t c;
            size_t n = std::mbrtoc32(&c, p, size_t(end - p), &state);
            if (n == 0)
                n = 1;
            if (n > size_t(end - p))
                return false;
            p += n;
        }
        return true;
    }
    bool number() {
        size_t start = i;
        while (i < s.size() && std::strchr("+-0123456789.eE", s[i]))
            i++;
        return i > start;
    }
    template <typename F> bool list(char close, F item) {
        ws();
        if (i < s.size() && s[i] == close)
            return ++i, true;
        do {
            ws();
            if (!item())
                return false;
            ws();
        } while (i < s.size() && s[i] == ',' && ++i);
        return i < s.size() && s[i++] == close;
    }
    bool value() {
        ws();
        if (i >= s.size())
            return false;
        switch (s[i]) {
        case '{': return ++i, list('}', [&] { return string() && (ws(), s[i++] == ':') && value(); });
        case '[': return ++i, list(']', [&] { return value(); });
        case '"': return string();
        default: return lit("null") || lit("true") || lit("false") || number();
        }
    }
    bool document() { return value() && (ws(), i == s.size()); }
};

cdb_file rich() {
    static const std::vector<uint8_t> b = cdbtest::rich_image(false);
    return verify(b.data(), b.size());
}

bool has(const std::string &text, const std::string &part) { return text.find(part) != std::string::npos; }
} // namespace

TEST(Output, JsonIsOneWellFormedDocument) {
    std::string j = to_json(to_tree(rich()));
    EXPECT_TRUE(json_checker{j}.document()) << j;
    EXPECT_FALSE(json_checker{std::string("{\"a\": [1,]}")}.document()); // the checker itself can fail
    for (const char *part : {"\"byte_order\": \"little\"", "\"data_type\": \"StringArray\"",
                             "\"default_value\": [\"x\", \"y\"]", "\"variable_ids\": [32769, 4]",
                             "\"names\": [\"HasResources\", \"CanControl\", \"CanDefine\", \"JoinPhase1\"]",
                             "\"default_value\": \"0x00ff10\"", "\"low\": 5", "\"high\": [100]"})
        EXPECT_TRUE(has(j, part)) << part;
}

TEST(Output, JsonIsUtf8WhateverTheStringsHold) {
    std::setlocale(LC_CTYPE, "C.UTF-8");
    cdbtest::test_class c(false, "C\xff");
    // A lone byte, a well-formed character, an encoded surrogate, a truncated sequence.
    c.pattr(false, "Label", 1, 8).put(24, c.strings.text("\xe9t\xc3\xa9\xed\xa0\x80\xe2\x82"), 4);
    std::vector<uint8_t> b = cdbtest::image({c});
    std::string j = to_json(to_tree(verify(b.data(), b.size())));
    EXPECT_TRUE(json_checker{j}.document()) << j;
    EXPECT_FALSE(json_checker{std::string("[\"\xe9\"]")}.document()); // the checker refuses raw non-UTF-8
    EXPECT_TRUE(has(j, "\"name\": \"C\\uf7ff\""));
    EXPECT_TRUE(has(j, "\"default_value\": \"\\uf7e9t\xc3\xa9\\uf7ed\\uf7a0\\uf780\\uf7e2\\uf782\"")) << j;
    // The text rendering keeps the bytes as stored.
    EXPECT_TRUE(has(to_text(to_tree(verify(b.data(), b.size()))), "\"\xe9t\xc3\xa9\xed"));
}

TEST(Output, StreamedRenderingsEqualThoseOfTheWholeTree) {
    for (bool big : {false, true}) {
        std::vector<uint8_t> b = cdbtest::rich_image(big);
        cdb_file f = verify(b.data(), b.size());
        EXPECT_EQ(cdbtest::streamed(b, tree_writer::style::json), to_json(to_tree(f)));
        EXPECT_EQ(cdbtest::streamed(b, tree_writer::style::text), to_text(to_tree(f)));
        annotation a = annotate_walk(b.data(), b.size());
        for (size_t window : {size_t(8), size_t(100), size_t(1) << 20})
            EXPECT_EQ(cdbtest::streamed_annotation(b, window), annotation_text(b.data(), b.size(), a)) << window;
    }
}

TEST(Output, JsonSpellsNonFiniteFloatsAsStrings) {
    cdbtest::test_class c(false, "C");
    c.pattr(false, "N", 1, 7).put(24, 0x7ff8000000000000ull, 8);
    c.pattr(false, "I", 2, 6).put(24, 0xff800000u, 4);
    std::vector<uint8_t> b = cdbtest::image({c});
    std::string j = to_json(to_tree(verify(b.data(), b.size())));
    EXPECT_TRUE(json_checker{j}.document());
    EXPECT_TRUE(has(j, "\"default_value\": \"nan\""));
    EXPECT_TRUE(has(j, "\"default_value\": \"-inf\""));
}

TEST(Output, TextShowsHeaderFirstThenEachDsect) {
    std::string t = to_text(to_tree(rich()));
    EXPECT_EQ(t.rfind("byte_order: little\n", 0), 0u);
    EXPECT_LT(t.find("layout:"), t.find("dsects:"));
    for (const char *part :
         {"name: \"Rich.Class\"", "default_value: [1, 2, 3]", "class_perm_template: 4008636142 (0xeeeeeeee)",
          "- dsect: manager", "variable_ids: [32769, 4]", "range: {low: 5, high: 9}"})
        EXPECT_TRUE(has(t, part)) << part;
}

TEST(Output, AnnotationLabelsEveryByteOnce) {
    std::vector<uint8_t> b = cdbtest::one_attribute_class(false);
    annotation a = annotate_walk(b.data(), b.size());
    EXPECT_EQ(a.violations, 0u);
    std::vector<span> spans = a.spans;
    std::sort(spans.begin(), spans.end(), [](const span &x, const span &y) { return x.off < y.off; });
    for (size_t i = 1; i < spans.size(); i++)
        EXPECT_LE(spans[i - 1].off + spans[i - 1].len, spans[i].off) << spans[i].field;
    std::string text = annotation_text(b.data(), b.size(), a);
    EXPECT_TRUE(has(text, "00000000  48 02 00 00") && has(text, "header.cdb_hdr_length = 0x248 (584)"));
    EXPECT_TRUE(has(text, "dsect[0].pattrs[0].ra_data_type = 8 (String)"));
    EXPECT_TRUE(has(text, "dsect[0].u_rc_pattrs = 0xe0 -> ClassPattrs at 0x160, 72 bytes"));
    EXPECT_TRUE(has(text, "(padding)"));
    EXPECT_FALSE(has(text, "unreferenced")); // the writer leaves nothing that is not referred to
    // Rows cover the file without gaps: each row starts where the one before ended.
    size_t expect = 0;
    std::istringstream rows(text);
    for (std::string line; std::getline(rows, line);) {
        if (line[0] == '#')
            continue;
        EXPECT_EQ(std::stoul(line.substr(0, 8), nullptr, 16), expect) << line;
        std::istringstream bytes(line.substr(10, 47));
        for (std::string byte; bytes >> byte;)
            expect++;
    }
    EXPECT_EQ(expect, b.size());
}
