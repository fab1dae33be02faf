// The source reader: comments, quotes, trailing blanks, headers, and the
// 254-character pieces that count as lines.
#include <gtest/gtest.h>

#include "compile_support.h"

namespace {

// With no variable class the class dsect is the first, at 80 + 3 * 16.
constexpr size_t CLASS = 128;

std::string class_string(const std::string &cdb, size_t ref_field) {
    size_t strings = CLASS + u32_at(cdb, CLASS + 160);
    return std::string(cdb.c_str() + strings + u32_at(cdb, CLASS + ref_field));
}

// The class name stored when the class's Name statement line reads `line`.
std::string class_name_with(const std::string &line) {
    std::string src = BASE_SOURCE;
    src.replace(src.find("    Name=Test.Class\n"), 20, line + "\n");
    compile_result r = compile_text(src);
    EXPECT_EQ(r.message, "");
    return r.has_output ? class_string(r.cdb, 8) : "";
}

TEST(Reader, CommentAndBlankLinesAreIgnored) {
    compile_result r = compile_text("  # note\n// note\n/* note\n\t\n  \"\"  \"\n" + BASE_SOURCE + "   /* trailing\n");
    EXPECT_EQ(r.message, "");
    EXPECT_TRUE(r.has_output);
}

TEST(Reader, CommentAfterANumberIsCut) {
    std::string src = BASE_SOURCE;
    src.replace(src.find("Description=1"), 13, "Description=12 # twelve");
    compile_result r = compile_text(src);
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u16_at(r.cdb, CLASS + 210), 12);
}

TEST(Reader, CommentsAndQuotesInTheValue) {
    EXPECT_EQ(class_name_with("    Name=\"a#b\"   "), "a#b");            // '#' inside quotes, blanks stripped
    EXPECT_EQ(class_name_with("    Name=ab # the name"), "ab");           // comment after the value
    EXPECT_EQ(class_name_with("    Name=\"x//y\" // the name"), "x//y"); // '//' inside quotes
    EXPECT_EQ(class_name_with("    Name=x/y /* z"), "x/y");              // '/*' needs no '*/'
    EXPECT_EQ(class_name_with("    Name=Test.Class\r"), "Test.Class\r"); // a carriage return is text
    EXPECT_EQ(class_name_with(std::string("    Name=Te\0st", 14)), "Te"); // a NUL ends the line
}

TEST(Reader, HeaderFollowedByCommentIsRecognised) {
    std::string src = BASE_SOURCE;
    src.replace(src.find("ResourceClass\n"), 14, "ResourceClass   # the class\n");
    EXPECT_EQ(compile_text(src).message, "");
}

TEST(Reader, IndentedHeaderIsAStatement) {
    EXPECT_EQ(compile_text(" ControlDefinition\n").message, "1: Attribute found but no table defined yet\n");
    EXPECT_EQ(compile_text(BASE_SOURCE + " ControlDefinition\n").message, "16: Missing '=' after attribute name\n");
}

TEST(Reader, LongLineIsReadInPiecesCountedAsLines) {
    // 20 + 280 = 300 characters: a piece of 254, then one of 46 in column 0.
    compile_result r = compile_text("ClassToManagerMapping\n    ResourceManager=" + std::string(280, 'y') + "\n");
    EXPECT_EQ(r.message, "3: Invalid table name: " + std::string(46, 'y') + "\n");
}

TEST(Reader, NewlineAfterTwoHundredFiftyFourCharactersIsAPieceOfItsOwn) {
    auto with_name_line = [](size_t len) {
        std::string src = BASE_SOURCE;
        src.replace(src.find("    Name=Test.Class"), 19, "    Name=" + std::string(len - 9, 'n'));
        return compile_text(src + "Bogus\n").message;
    };
    EXPECT_EQ(with_name_line(253), "16: Invalid table name: Bogus\n");
    EXPECT_EQ(with_name_line(254), "17: Invalid table name: Bogus\n");
}

TEST(Reader, UnterminatedLastLineIsRead) {
    std::string src = BASE_SOURCE.substr(0, BASE_SOURCE.size() - 1);
    EXPECT_EQ(compile_text(src + "\nBogus").message, "16: Invalid table name: Bogus\n");
}

TEST(Driver, OptionalStatementsAddNoMaskTrace) {
    compile_result r = compile_text(BASE_SOURCE, [](qecfg::options &o) { o.trace_level = 2; });
    EXPECT_NE(r.out.find("ResourceClass: found attr: \"Name\", value: \"Test.Class\",length: 10\n"
                         "ClassToManagerMapping"),
              std::string::npos);
}

} // namespace
