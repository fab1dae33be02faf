// The source reader: comments, quotes, trailing blanks, headers, and the
// 254-character pieces that count as lines.
#include <gtest/gtest.h>

#include "cdb_read_support.h"
#include "compile_support.h"

namespace {

// The class name stored when the class's Name statement line reads `line`.
std::string class_name_with(const std::string &line) {
    std::string src = BASE_SOURCE;
    src.replace(src.find("    Name=Test.Class\n"), 20, line + "\n");
    compile_result r = compile_text(src);
    EXPECT_EQ(r.message, "");
    read_cdb f(r.cdb);
    testing::AssertionResult valid = f.valid();
    return valid ? text_or_none(cdb_class_name(&f.cls())) : valid.message();
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
    read_cdb f(r.cdb);
    ASSERT_TRUE(f.valid());
    EXPECT_EQ(cdb_class_field(&f.cls(), CDB_CLASS_DSCR_MSGID), 12u);
}

TEST(Reader, CommentsAndQuotesInTheValue) {
    EXPECT_EQ(class_name_with("    Name=\"a#b\"   "), "a#b");            // '#' inside quotes, blanks stripped
    EXPECT_EQ(class_name_with("    Name=ab # the name"), "ab");          // comment after the value
    EXPECT_EQ(class_name_with("    Name=\"x//y\" // the name"), "x//y"); // '//' inside quotes
    EXPECT_EQ(class_name_with("    Name=x/y /* z"), "x/y");              // '/*' needs no '*/'
    EXPECT_EQ(class_name_with("    Name=Test.Class\r"), "Test.Class\r"); // a carriage return is text
}

// A NUL byte would end its line early and drop the rest silently: it is
// refused on its line, in a line ended in place, in a piece copied across
// the reader's buffer, in a comment, and in a source of nothing but NULs.
TEST(Reader, NulByteIsRefusedOnItsLine) {
    const std::string nul(1, '\0');
    std::string src = BASE_SOURCE;
    src.replace(src.find("Name=Test.Class"), 15, "Name=Te" + nul + "st");
    EXPECT_EQ(compile_text(src).message, "9: NUL character in source\n");
    EXPECT_EQ(compile_text("# note " + nul + "\n" + BASE_SOURCE).message, "1: NUL character in source\n");
    EXPECT_EQ(compile_text(BASE_SOURCE + nul).message, "16: NUL character in source\n");
    // A long line is read in pieces: the NUL is in the second one.
    EXPECT_EQ(compile_text(BASE_SOURCE + "#" + std::string(300, 'x') + nul + "\n").message,
              "17: NUL character in source\n");
    // Past the reader's 64 KiB buffer, in a piece that spans two reads.
    std::string comments;
    while (comments.size() < 65536 - 200)
        comments += "# " + std::string(97, 'c') + "\n";
    size_t lines = comments.size() / 100;
    src = comments + std::string(150, 'x') + nul + std::string(80, 'y') + "\n";
    EXPECT_EQ(compile_text(src).message, std::to_string(lines + 1) + ": NUL character in source\n");
    EXPECT_EQ(compile_text(std::string(1 << 17, '\0')).message, "1: NUL character in source\n");
}

TEST(Reader, DevZeroAsSourceEnds) {
    std::vector<std::uint8_t> image;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::file("/dev/zero"), image);
    EXPECT_EQ(r.id, msg::nul_character);
    EXPECT_EQ(r.message, "1: NUL character in source\n");
    EXPECT_EQ(r.status, 1);
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

TEST(Reader, LineNumbersPastTwoToTheThirtyOneArePrintedInFull) {
    // Reading 2^31 lines takes minutes; the count is started high instead.
    qecfg_options opt;
    opt.source = qecfg::source::bytes("input.src", "\nBogus\n");
    qecfg_compiler c(opt);
    c.linenum = (uint64_t(1) << 31) + 1;
    std::string message;
    try {
        c.run();
    } catch (const qecfg_fatal &f) {
        message = f.text(true);
    }
    EXPECT_EQ(message, "2147483651: Invalid table name: Bogus\n");
}

TEST(Driver, OptionalStatementsAddNoMaskTrace) {
    compile_result r = compile_text(BASE_SOURCE, [](qecfg::options &o) { o.trace_level = 2; });
    EXPECT_NE(r.out.find("ResourceClass: found attr: \"Name\", value: \"Test.Class\",length: 10\n"
                         "ClassToManagerMapping"),
              std::string::npos);
}

} // namespace
