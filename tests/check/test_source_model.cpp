// The checker's model is the compiler's reader's: its lines, stanza types,
// keyword rows and values are the compiler's, kept as places in the text.
#include <gtest/gtest.h>

#include "source_model.h"

namespace {

TEST(SourceModel, ReadsStanzasAndStatementsAsTheCompilerDoes) {
    check::source_model m = check::read_model("    Orphan=1\n"
                                              "ResourceClass   # the class\n"
                                              "  // a comment line\n"
                                              "\n"
                                              "    Name=\"a#b\" \n"
                                              "\tDescription=12 # twelve\n"
                                              "    DisplayName=\"\"\n"
                                              "    Bogus= x\n"
                                              "Unknown stanza\n"
                                              "    Name=\"abc\\\"\n");
    ASSERT_EQ(m.stanzas.size(), 2u);
    const check::stanza &rc = m.stanzas[0];
    EXPECT_EQ(rc.line, 2);
    EXPECT_TRUE(rc.is(ST_RESOURCE_CLASS));
    ASSERT_EQ(rc.statements.size(), 4u);
    struct expected {
        int line;
        const char *keyword, *value;
        bool skipped, known;
    };
    const expected rows[] = {{5, "Name", "a#b", false, true},
                             {6, "Description", "12", false, true},
                             {7, "DisplayName", "", true, true},
                             {8, "Bogus", " x", false, false}};
    for (size_t i = 0; i < 4; i++) {
        const check::statement &st = rc.statements[i];
        EXPECT_EQ(st.line, rows[i].line);
        EXPECT_EQ(st.keyword(), rows[i].keyword);
        EXPECT_EQ(st.value(), rows[i].value);
        EXPECT_EQ(st.skipped, rows[i].skipped);
        EXPECT_EQ(st.row != nullptr, rows[i].known) << st.keyword();
    }
    EXPECT_EQ(rc.first("DisplayName"), nullptr); // a skipped statement is not given
    EXPECT_EQ(m.stanzas[1].type, nullptr);
    ASSERT_EQ(m.stanzas[1].statements.size(), 1u);
    EXPECT_EQ(m.stanzas[1].statements[0].value(), "\"abc\\\""); // unmatched quotes: kept as written
    // The text of a statement ends before its comment and trailing blanks.
    const check::statement &described = rc.statements[1];
    EXPECT_EQ(std::string_view(described.at, described.end_offset), "Description=12");
    EXPECT_TRUE(described.has_equals());
    EXPECT_EQ(m.stanza_at(6), &rc);
    EXPECT_EQ(m.stanza_at(1), nullptr);
    EXPECT_EQ(m.last_line, 10);
}

TEST(SourceModel, CountsLongLinesInPiecesOf254) {
    std::string tail = "ControlDefinition";
    std::string text = "#" + std::string(253, 'x') + tail + "\n" + tail + "\n";
    check::source_model m = check::read_model(text);
    // The piece after the first 254 characters is a line of its own: a header.
    ASSERT_EQ(m.stanzas.size(), 2u);
    EXPECT_EQ(m.stanzas[0].line, 2);
    EXPECT_EQ(m.stanzas[1].line, 3);
    EXPECT_EQ(m.last_line, 3);
}

TEST(SourceModel, EndsWhereTheCompilerStopsReading) {
    const char text[] = "ResourceClass\n\tName=a\n\tDescription=1\0\nControlDefinition\n\tNoEquals\n";
    check::source_model m = check::read_model(std::string_view(text, sizeof text - 1));
    ASSERT_EQ(m.stanzas.size(), 1u);
    EXPECT_EQ(m.stanzas[0].statements.size(), 1u); // a NUL byte ends the reading on its line
    m = check::read_model("ResourceClass\n\tNoEquals\n");
    ASSERT_EQ(m.statements.size(), 1u);
    EXPECT_EQ(m.statements[0].keyword(), "NoEquals");
    EXPECT_FALSE(m.statements[0].has_equals());
}

TEST(SourceModel, GroupsStanzasIntoClasses) {
    check::source_model m = check::read_model("ClassToManagerMapping\nControlDefinition\nResourceClass\n"
                                              "ControlDefinition\nPersistentResourceAttribute\n");
    auto classes = m.classes();
    ASSERT_EQ(classes.size(), 2u);
    EXPECT_EQ(classes[0].size(), 2u);
    EXPECT_EQ(classes[1].back()->line, 5);
}

} // namespace
