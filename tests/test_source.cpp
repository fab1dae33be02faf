// The positioned source model, read without a compile: stanzas, statements,
// their lines, columns and keyword rows, and the problems kept as data.
#include <gtest/gtest.h>

#include "qecfg_context.h"
#include "qecfg_fatal.h"
#include "qecfg_source.h"

namespace {

TEST(SourceModel, StanzasAndStatementsWithTheirPositionsAndRows) {
    source_model m = read_source_model("# head\n"
                                       "ControlDefinition   # the class\n"
                                       "\tFileVersion = 1\n"
                                       "    FileVersion=\"2.0\"  # quoted\n"
                                       "Bogus\n"
                                       "  Name=\"\"\n");
    ASSERT_EQ(m.stanzas.size(), 2u);
    const model_stanza &cd = m.stanzas[0];
    EXPECT_EQ(cd.line, 2u);
    EXPECT_EQ(cd.type, ST_CONTROL_DEFINITION);
    EXPECT_EQ(cd.header, "ControlDefinition");
    ASSERT_EQ(cd.statements.size(), 2u);
    // A keyword with a blank before '=' is no keyword of the stanza.
    EXPECT_EQ(cd.statements[0].name, "FileVersion ");
    EXPECT_EQ(cd.statements[0].row, nullptr);
    EXPECT_EQ(cd.statements[0].value, " 1");
    const model_statement &v = cd.statements[1];
    EXPECT_EQ(v.line, 4u);
    EXPECT_EQ(v.name, "FileVersion");
    EXPECT_EQ(v.name_column, 4u);
    EXPECT_EQ(v.value, "2.0");
    EXPECT_EQ(v.value_column, 17u);
    ASSERT_NE(v.row, nullptr);
    EXPECT_STREQ(v.row->name, "FileVersion");
    EXPECT_EQ(v.row->what, statement::version);
    EXPECT_EQ(m.stanzas[1].type, -1);
    EXPECT_EQ(m.stanzas[1].header, "Bogus");
    EXPECT_TRUE(m.stanzas[1].statements[0].skipped);
    EXPECT_EQ(m.last_line, 6u);
    EXPECT_EQ(m.stop.id, msg::none);
}

TEST(SourceModel, ProblemsOfALineAreKeptInTheOrderTheyAreReported) {
    source_model m = read_source_model("  Early=1\n"
                                       "ResourceClass\n"
                                       "    Description\n"
                                       "    Name=\"open\n"
                                       "    Name=" +
                                       std::string(300, 'n') + "\n");
    // The second piece of the long line is a header of no stanza type.
    ASSERT_EQ(m.stanzas.size(), 3u);
    EXPECT_EQ(m.stanzas[2].header, std::string(300 - 245, 'n'));
    EXPECT_EQ(m.stanzas[0].line, 0u); // statements before any header
    EXPECT_EQ(m.stanzas[0].statements[0].problem, msg::statement_before_stanza);
    const auto &st = m.stanzas[1].statements;
    ASSERT_GE(st.size(), 3u);
    EXPECT_EQ(st[0].problem, msg::missing_equals);
    EXPECT_EQ(st[0].name, "Description");
    EXPECT_EQ(st[1].problem, msg::unmatched_quotes);
    // A physical line past 254 characters is read as pieces, each a line.
    EXPECT_EQ(st[2].line, 5u);
    EXPECT_EQ(st[2].value.size(), 245u);
    EXPECT_EQ(m.last_line, 6u);
}

TEST(SourceModel, ReadingStopsAtTheFirstNulByte) {
    static const char text[] = "ResourceClass\n  Name=a\n# x\0y\nControlDefinition\n";
    source_model m = read_source_model(std::string(text, sizeof text - 1) + std::string(1 << 20, '\0'));
    ASSERT_EQ(m.stanzas.size(), 1u);
    EXPECT_EQ(m.stanzas[0].statements.size(), 1u);
    EXPECT_EQ(m.stop.id, msg::nul_character);
    EXPECT_EQ(m.stop.line, 3u);
}

TEST(SourceModel, CountingMayStartPastTwoToTheThirtyOne) {
    FILE *fp = open_memory_source("\nBogus\n");
    source_reader r(fp, (uint64_t(1) << 31) + 1);
    source_line l;
    ASSERT_TRUE(r.next(l));
    EXPECT_TRUE(l.header);
    EXPECT_EQ(l.line, 2147483651u);
    EXPECT_FALSE(r.next(l));
    std::fclose(fp);
}

} // namespace
