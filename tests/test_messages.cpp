// The table of messages: rows that tools can key on, and fatal conditions
// that carry their row, subjects and line to the library's result.
#include <gtest/gtest.h>

#include <cerrno>
#include <regex>
#include <set>

#include "compile_support.h"

namespace {

TEST(Messages, RowsHaveDistinctStableNamesAndTexts) {
    std::set<std::string> names, texts;
    const std::regex stable("[a-z]+(-[a-z]+)*");
    for (const qecfg::message_row &m : qecfg::messages()) {
        EXPECT_TRUE(std::regex_match(m.name, stable)) << m.name;
        EXPECT_TRUE(names.insert(m.name).second) << "two rows named " << m.name;
        EXPECT_TRUE(texts.insert(m.text).second) << "two rows with the text " << m.text;
        EXPECT_NE(m.id, qecfg::message_id::none);
        EXPECT_STREQ(qecfg::message(m.id).name, m.name);
    }
}

TEST(Messages, SubjectsFillTheirPlacesAndTheLineLeadsOnlyWhereTheRowHasOne) {
    using qecfg::format_message;
    EXPECT_EQ(format_message(msg::unknown_keyword, 7, {"Nmae", "ResourceClass"}, true),
              "7: Attribute name not defined in table (name/table): NmaeResourceClass\n");
    EXPECT_EQ(format_message(msg::cannot_open, 7, {"a.src", "No such file or directory"}, false),
              "a.src: cannot open because: No such file or directory");
    // A subject holding "%s" is text, not a place.
    EXPECT_EQ(format_message(msg::invalid_stanza, 2, {"%s%s"}, false), "2: Invalid table name: %s%s");
    EXPECT_EQ(format_message(msg::incomplete_stanza, 0, {}, true), "Previous stanza incomplete\n");
}

TEST(Messages, StatusIsTheRowsOrTheSystemsErrorNumber) {
    auto status_of = [](msg id, int err) {
        try {
            raise_fatal(id, 3, {"x", "y"}, err);
        } catch (const qecfg_fatal &f) {
            EXPECT_EQ(f.line, 3u);
            EXPECT_EQ(f.subjects, (std::vector<std::string>{"x", "y"}));
            return f.status;
        }
        return -1;
    };
    EXPECT_EQ(status_of(msg::table_realloc, ENOMEM), ENOMEM);
    EXPECT_EQ(status_of(msg::invalid_data, ENOMEM), 1);
}

TEST(Messages, ResultCarriesTheIdentityNameAndLine) {
    compile_result text = compile_text(BASE_SOURCE + "Bogus\n");
    std::vector<std::uint8_t> image;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::bytes("s.src", BASE_SOURCE + "Bogus\n"), image);
    EXPECT_EQ(r.message, text.message);
    EXPECT_EQ(r.message, "16: Invalid table name: Bogus\n");
    EXPECT_EQ(r.id, msg::invalid_stanza);
    EXPECT_STREQ(r.name, "invalid-stanza");
    EXPECT_EQ(r.line, 16u);

    r = qecfg::compile_to_memory(qecfg::source::bytes("s.src", "# nothing\n"), image);
    EXPECT_EQ(r.id, msg::no_classes);
    EXPECT_EQ(r.line, 0u);
    EXPECT_EQ(r.status, 1);

    r = qecfg::compile_to_memory(qecfg::source::bytes("s.src", BASE_SOURCE), image);
    EXPECT_TRUE(r);
    EXPECT_EQ(r.id, msg::none);
    EXPECT_STREQ(r.name, "none");
}

} // namespace
