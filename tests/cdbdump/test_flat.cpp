// The renderings of a flat document: where the text output breaks a value
// into a block, and how JSON lays out arrays and objects.
#include <gtest/gtest.h>

#include "cdb_flat.h"

using namespace cdbdump;

namespace {
// An object {key: [n tokens of eight letters]}.
flat_doc tokens(int n) {
    flat_doc d;
    d.begin_object();
    d.begin_array("k");
    for (int i = 0; i < n; i++)
        d.token({}, "abcdefgh");
    d.end();
    d.end();
    return d;
}

std::string text_block(const flat_doc &d) {
    std::string out;
    render_text_block(d, 0, 0, out);
    return out;
}

std::string json(const flat_doc &d) {
    std::string out;
    render_json(d, 0, 0, out);
    return out;
}
} // namespace

TEST(Flat, TextKeepsAListOnItsLineWhileItFitsTheWidth) {
    // After "k: " 97 columns are left; nine tokens take 1 + 9 * 8 + 8 * 2 = 89
    // of them, ten would take 99.
    std::string nine = "k: [abcdefgh";
    for (int i = 1; i < 9; i++)
        nine += ", abcdefgh";
    EXPECT_EQ(text_block(tokens(9)), nine + "]\n");
    std::string ten = "k:\n";
    for (int i = 0; i < 10; i++)
        ten += "  - abcdefgh\n";
    EXPECT_EQ(text_block(tokens(10)), ten);
    EXPECT_EQ(text_block(tokens(0)), "k: []\n");
}

TEST(Flat, TextGivesRecordsOfMoreThanThreeMembersABlockMarkedAsAnItem) {
    flat_doc d;
    d.begin_object();
    d.begin_array("list");
    d.begin_object();
    d.string("name", "a\tb");
    d.flags("bits", 46);
    d.null("none");
    d.end();
    d.begin_object();
    for (const char *key : {"w", "x", "y", "z"})
        d.uinteger(key, 1);
    d.end();
    d.end();
    d.end();
    EXPECT_EQ(text_block(d), "list:\n"
                             "  - {name: \"a\\tb\", bits: 46 (0x2e), none: none}\n"
                             "  - w: 1\n"
                             "    x: 1\n"
                             "    y: 1\n"
                             "    z: 1\n");
}

TEST(Flat, JsonPutsArraysOfScalarsOnOneLineAndRecordsOnLinesOfTheirOwn) {
    flat_doc d;
    d.begin_object();
    d.begin_array("numbers");
    d.integer({}, -1);
    d.flags({}, 255);
    d.end();
    d.begin_array("pairs");
    d.begin_array();
    d.uinteger({}, 1);
    d.end();
    d.end();
    d.begin_array("empty");
    d.end();
    d.begin_object("nothing");
    d.end();
    d.string("s", "\xff");
    d.end();
    EXPECT_EQ(json(d), "{\n"
                       "  \"numbers\": [-1, 255],\n"
                       "  \"pairs\": [\n"
                       "    [1]\n"
                       "  ],\n"
                       "  \"empty\": [],\n"
                       "  \"nothing\": {},\n"
                       "  \"s\": \"\\uf7ff\"\n"
                       "}");
    std::string line;
    render_json_line(d, 0, line);
    EXPECT_EQ(line, "{\"numbers\":[-1,255],\"pairs\":[[1]],\"empty\":[],\"nothing\":{},\"s\":\"\\uf7ff\"}");
}

TEST(Flat, ABufferReusedAfterClearHoldsOnlyTheNewRecord) {
    flat_doc d = tokens(3);
    d.clear();
    d.begin_object();
    d.bytes("b", reinterpret_cast<const uint8_t *>("\x01\xab"), 2);
    d.end();
    EXPECT_EQ(text_block(d), "b: 0x01ab\n");
}
