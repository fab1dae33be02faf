// The decompiler's value text and statements, on images of the test writer.
#include <gtest/gtest.h>

#include "cdb_source.h"
#include "cdb_walk.h"
#include "test_images.h"

using namespace cdbdump;

namespace {
// The escape form of a binary value as the compiler reads it (written here
// from its rules: a backslash pair is a backslash, a backslash and up to three
// octal digits a byte, anything else itself).
std::vector<uint8_t> read_escape_form(const std::string &t) {
    std::vector<uint8_t> out;
    for (size_t i = 0; i < t.size(); i++) {
        if (t[i] != '\\') {
            out.push_back(uint8_t(t[i]));
        } else if (t[i + 1] == '\\') {
            out.push_back('\\');
            i++;
        } else {
            out.push_back(uint8_t(std::stoi(t.substr(i + 1, 3), nullptr, 8)));
            i += 3;
        }
    }
    return out;
}

decompiled decompile_image(const std::vector<uint8_t> &b) { return decompile(verify(b.data(), b.size())); }

bool has(const std::string &text, const std::string &part) { return text.find(part) != std::string::npos; }
} // namespace

TEST(SourceText, StatementValueFollowsTheReader) {
    EXPECT_EQ(statement_value("\tName=abc"), "abc");
    EXPECT_EQ(statement_value("\tName= abc"), " abc");             // blanks after '=' are kept
    EXPECT_EQ(statement_value("\tDescription=12 # twelve"), "12"); // comment and trailing blanks go
    EXPECT_EQ(statement_value("\tName=\"a#b\""), "a#b");
    EXPECT_EQ(statement_value("\tName=x // note"), "x");
    EXPECT_EQ(statement_value("\tName=\"a \"b\" c\""), "a \"b\" c");
    EXPECT_EQ(statement_value("\tName=\"\""), std::nullopt);                     // ignored as a whole
    EXPECT_EQ(statement_value("\tName=\"abc\\\""), std::nullopt);                // unmatched quote
    EXPECT_EQ(statement_value("Name=abc"), std::nullopt);                        // a header, not a statement
    EXPECT_EQ(statement_value("\tName=" + std::string(250, 'a')), std::nullopt); // past one read of the line
}

TEST(SourceText, StatementLineQuotesOnlyWhenNeeded) {
    EXPECT_EQ(statement_line("Name", "plain"), "\tName=plain");
    EXPECT_EQ(statement_line("Name", "a#b"), "\tName=\"a#b\"");
    EXPECT_EQ(statement_line("Name", "trailing "), "\tName=\"trailing \"");
    EXPECT_EQ(statement_line("Name", "x\"#\\"), "\tName=x\"#\\"); // the quote puts the '#' inside
    EXPECT_EQ(statement_line("Name", "a#b\\"), std::nullopt);     // cut unquoted, unmatched quoted
}

TEST(SourceText, BinaryTextReadsBackToTheSameBytes) {
    EXPECT_EQ(binary_text({}), "0x");
    EXPECT_EQ(binary_text({0x00, 0xff, 0x10}), "0x00ff10");
    EXPECT_EQ(binary_text({'a', 'b', 'A', '\\', 'c', 'd', 'e'}), "abA\\\\cde");
    EXPECT_EQ(binary_text({'0', 'a', 'b', 'c', 'd'}), "\\060abcd"); // a leading 0 would select the hex form
    std::vector<uint8_t> all;
    for (int i = 0; i < 256; i++)
        all.push_back(uint8_t(i));
    for (const std::vector<uint8_t> &bytes : {all, std::vector<uint8_t>(all.begin() + 32, all.begin() + 127)}) {
        std::string t = binary_text(bytes);
        std::vector<uint8_t> back = t.rfind("0x", 0) == 0 ? std::vector<uint8_t>{} : read_escape_form(t);
        if (t.rfind("0x", 0) == 0)
            for (size_t i = 2; i < t.size(); i += 2)
                back.push_back(uint8_t(std::stoi(t.substr(i, 2), nullptr, 16)));
        EXPECT_EQ(back, bytes) << t;
        EXPECT_EQ(statement_value("\tDefaultValue=" + t), t.size() < 240 ? std::optional(t) : std::nullopt);
    }
}

TEST(SourceText, NumbersThatConvertBackExactly) {
    EXPECT_EQ(number_source_text(2, 0xFFFFFFFB), "-5");
    EXPECT_EQ(number_source_text(5, ~0ull), "18446744073709551615");
    EXPECT_EQ(number_source_text(6, 0x80000000), "-0");
    EXPECT_EQ(number_source_text(6, 0x000116c2), "9.9999461e-41"); // subnormal, accepted
    EXPECT_EQ(number_source_text(7, 0xfff0000000000000ull), "-inf");
    // NaNs keep their sign and payload; the conversion makes every NaN quiet.
    EXPECT_EQ(number_source_text(6, 0x7fc00001), "nan(0x1)");
    EXPECT_EQ(number_source_text(6, 0xffc00005), "-nan(0x5)");
    EXPECT_EQ(number_source_text(7, 0xfff8000000012345ull), "-nan(0x12345)");
    EXPECT_EQ(number_source_text(7, 0x7ff8000000000000ull), "nan");
    EXPECT_EQ(number_source_text(6, 0x7f800001), std::nullopt); // signalling
}

TEST(Source, ReproducesWhatCompletionSupplied) {
    decompiled d = decompile_image(cdbtest::rich_image(false));
    EXPECT_TRUE(d.warnings.empty()) << d.warnings.at(0);
    const std::string &s = d.text;
    for (const char *part :
         {"ControlDefinition\n\tFileVersion=0.0.0.0\n", "\tClassPermTemplate=template\n", "\tName=Rich.Class\n",
          "DynamicClassAttribute\n\tName=Count\n", "\tVariableClass=VC1\n", "\tRange=5,9\n",
          "\tDefaultValue=x\n\tDefaultValue=y\n", "\tDefaultValue=0x00ff10\n",
          "\tValidValue=0,9\n\tValueDisplayName=5\n",
          "PAttrSDDefinition\n\tElementName=A\n\tDescription=0\n\tDisplayName=0\n\tElementIndex=0\n",
          "ActionInSDDefinition\n\tElementName=How\n", "ResourceVariableClass\n\tVariableClass=VC1\n",
          "\tResourceManager=Test.RM\n", "\tMessageCatalog=test.cat\n"})
        EXPECT_TRUE(has(s, part)) << part << "\n" << s;
    // Defaults that completion supplies are left to it.
    for (const char *part : {"Permission", "GroupID",
                             "Owner\n\tDescription=0\n\tDisplayName=0\n\tId=4\n\tDataType=RH\n"
                             "\tVarietyRange=1,1\n\tProperties=InvalForDefine\n\tDefaultValue"})
        EXPECT_FALSE(has(s, part)) << part;
    EXPECT_EQ(std::count(s.begin(), s.end(), '\n') > 100, true);
}

TEST(Source, SaysWhatNoSourceCanGive) {
    cdbtest::test_class c(false, "out/name");
    cdbtest::buf &a = c.action(false, "Act", 1);
    a.put(20, 0x3, 4);    // two permission letters
    c.rec.put(214, 7, 2); // a locator without templates to carry it
    decompiled d = decompile_image(cdbtest::image({c}));
    ASSERT_EQ(d.warnings.size(), 3u);
    EXPECT_TRUE(has(d.warnings[0], "locator 7 names no attribute"));
    EXPECT_TRUE(has(d.warnings[1], "compile to out/name.cdef"));
    EXPECT_TRUE(has(d.warnings[2], "permission 0x3 is not one letter"));
    EXPECT_FALSE(has(d.text, "\tName=out/name"));
    EXPECT_TRUE(has(d.text, "# cdbdump: \"Act\": permission 0x3"));
}

// Two classes' dynamic attributes of one id, and one variable class holding
// that id once: the IDs cannot say which class named it. The choice is said
// in a comment where it is made, and nowhere when the IDs decide.
TEST(Source, ChoiceOfAVariableClassIsSaid) {
    cdbtest::test_class a(false, "A.Class"), b(false, "B.Class");
    a.dattr(false, "Load", 1, 2);
    b.dattr(false, "Load", 1, 2);
    decompiled d = decompile_image(cdbtest::image({a, b}, "Test.RM", {{"VC1", std::nullopt, {1}}}));
    const std::string note = "# cdbdump: variable ID 1 of variable class \"VC1\" is that of dynamic attributes of the "
                             "classes \"A.Class\", \"B.Class\"; the IDs cannot say which class named it";
    size_t at = d.text.find(note);
    ASSERT_NE(at, std::string::npos) << d.text;
    EXPECT_LT(at, d.text.find("B.Class")); // in A.Class's attribute, which the compiler met first
    EXPECT_EQ(d.text.find("\tVariableClass=VC1\n", at), d.text.find('\n', at) + 1);
    EXPECT_EQ(d.text.find(note, at + 1), std::string::npos);
    EXPECT_EQ(decompile_image(cdbtest::rich_image(false)).text.find("cannot say which class"), std::string::npos);
    // Each class's attribute gets one of the ID's two places: nothing was chosen.
    d = decompile_image(cdbtest::image({a, b}, "Test.RM", {{"VC1", std::nullopt, {1, 1}}}));
    EXPECT_EQ(d.text.find("cannot say which class"), std::string::npos) << d.text;
    // Two variable classes hold the ID: which class's attribute named which is a choice.
    d = decompile_image(cdbtest::image({a, b}, "Test.RM", {{"VC1", std::nullopt, {1}}, {"VC2", std::nullopt, {1}}}));
    EXPECT_NE(d.text.find("variable ID 1 of variable class \"VC2\""), std::string::npos) << d.text;
}
