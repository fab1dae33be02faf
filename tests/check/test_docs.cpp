// The reference, the manual page and the editor files against the keyword
// table: every stanza type and statement row must be in each of them, and
// every message the compiler can give must be explained in the reference.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>

#include "docgen.h"
#include "lang.h"
#include "qecfg/messages.h"

namespace fs = std::filesystem;

namespace {

std::string read_source_file(const std::string &rel) {
    std::ifstream in(fs::path(QECFG_SOURCE_DIR) / rel, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    return s.str();
}

// The text of the reference from a stanza's heading to the next heading.
std::string stanza_section(const std::string &doc, const std::string &stanza) {
    size_t start = doc.find("\n### " + stanza + "\n");
    if (start == std::string::npos)
        return "";
    size_t end = doc.find("\n#", start + 1);
    return doc.substr(start, end == std::string::npos ? std::string::npos : end - start);
}

TEST(Reference, EveryStanzaHasItsStatementTable) {
    std::string doc = read_source_file("docs/language.md");
    for (const lang::stanza_type &s : lang::stanza_types()) {
        std::string section = stanza_section(doc, s.name);
        ASSERT_FALSE(section.empty()) << "no section for " << s.name;
        for (const lang::statement_row &r : s.rows) {
            std::string row = "| `" + r.name + "` | " + (r.optional ? "optional" : "required") + " | " +
                              (r.repeatable ? "yes" : "no") + " |";
            EXPECT_NE(section.find(row), std::string::npos) << s.name << " lacks the row " << row;
        }
    }
}

TEST(Reference, EditorFilesNameEveryStanzaAndKeyword) {
    struct editor_file {
        const char *path;
        std::string stanza_open, stanza_close, keyword_open, keyword_close;
    };
    const editor_file files[] = {
        {"editors/vim/syntax/qecfg.vim", "qecfgStanza \"^\\%(", "\\)\\ze[ \\t]", "qecfgKey \"^[ \\t]\\+\\zs\\%(",
         "\\)\\ze="},
        {"editors/vscode/syntaxes/qecfg.tmLanguage.json", "\"match\": \"^(", ")[ \\\\t]",
         "\"begin\": \"^([ \\\\t]+)(?:(", ")|([^=]*))"},
    };
    for (const editor_file &f : files) {
        std::string text = read_source_file(f.path);
        // The alternation of stanza names, and of keywords, as the file holds them.
        size_t s0 = text.find(f.stanza_open), s1 = text.find(f.stanza_close, s0);
        size_t k0 = text.find(f.keyword_open), k1 = text.find(f.keyword_close, k0);
        ASSERT_TRUE(s0 != std::string::npos && s1 != std::string::npos && k0 != std::string::npos &&
                    k1 != std::string::npos)
            << f.path;
        std::string stanzas = "|" + text.substr(s0 + f.stanza_open.size(), s1 - s0 - f.stanza_open.size()) + "|";
        std::string keywords = "|" + text.substr(k0 + f.keyword_open.size(), k1 - k0 - f.keyword_open.size()) + "|";
        for (std::string *alt : {&stanzas, &keywords})
            *alt = std::regex_replace(*alt, std::regex(R"(\\\|)"), "|");
        for (const lang::stanza_type &s : lang::stanza_types()) {
            EXPECT_NE(stanzas.find("|" + s.name + "|"), std::string::npos) << f.path << " lacks " << s.name;
            for (const lang::statement_row &r : s.rows)
                EXPECT_NE(keywords.find("|" + r.name + "|"), std::string::npos) << f.path << " lacks " << r.name;
        }
    }
}

// The fixed parts of a message text: what stands between its subjects.
std::vector<std::string> fixed_parts(const std::string &text) {
    std::vector<std::string> parts;
    for (size_t from = 0; from <= text.size();) {
        size_t to = text.find("%s", from);
        std::string part = text.substr(from, to == std::string::npos ? std::string::npos : to - from);
        while (!part.empty() && part.back() == ' ')
            part.pop_back();
        if (!part.empty())
            parts.push_back(part);
        if (to == std::string::npos)
            break;
        from = to + 2;
    }
    return parts;
}

// Every message the compiler raises is explained; one that it never raises
// is given no cause, only its reason in the list generated from the table.
TEST(Reference, ExplainsEveryCompilerMessage) {
    std::string doc = read_source_file("docs/language.md");
    std::string messages = doc.substr(doc.find("\n## Messages"));
    size_t list = messages.find("<!-- generated: unraised-messages -->");
    ASSERT_NE(list, std::string::npos);
    std::string explained = messages.substr(0, list), unraised = messages.substr(list);
    for (const qecfg::message_row &m : qecfg::messages()) {
        if (m.unraised) {
            EXPECT_NE(unraised.find(m.unraised), std::string::npos) << m.name << " without its reason";
        }
        for (const std::string &part : fixed_parts(m.text)) {
            if (!m.unraised) {
                EXPECT_NE(explained.find(part), std::string::npos) << "unexplained message " << m.name << ": " << part;
            } else {
                EXPECT_EQ(explained.find("`" + part), std::string::npos)
                    << "a cause for " << m.name << ", never raised";
            }
        }
    }
}

TEST(Generator, FillsBlocksAndReportsMissingAndUnknownOnes) {
    std::string missing;
    std::string text = "a\n<!-- generated: x -->\nold\n<!-- end generated -->\n<!-- generated: gone -->\n"
                       "<!-- end generated -->\nb\n";
    std::string out = docgen::fill_blocks(text, {{"x", "new\n"}, {"y", "why\n"}}, missing);
    EXPECT_EQ(out, "a\n<!-- generated: x -->\nnew\n<!-- end generated -->\n<!-- generated: gone -->\n"
                   "<!-- end generated -->\nb\n");
    EXPECT_EQ(missing, "unknown block gone, y");
    // Filling again changes nothing: the generator's output is a fixed point.
    std::string again;
    EXPECT_EQ(docgen::fill_blocks(out, {{"x", "new\n"}, {"gone", ""}}, again),
              "a\n<!-- generated: x -->\nnew\n<!-- end generated -->\n<!-- generated: gone -->\n"
              "<!-- end generated -->\nb\n");
    EXPECT_EQ(again, "");
}

// The column with the most text takes the room left; a column of words in
// several cells is as wide as its longest word, whose width tbl is given.
TEST(Generator, ManualPageTableColumnsAreAsWideAsTheirText) {
    std::string man = docgen::man_page("| Type | Value text | Examples |\n|---|---|---|\n"
                                       "| `Int32` | one decimal integer, with a sign | `-5`, `010` (ten) |\n"
                                       "| `Int32Array` ... | each like the element | `1`, `2` |\n");
    EXPECT_NE(man.find(".TS\nallbox;\nlw(11n) lx lw(9n).\n"), std::string::npos) << man;
}

// Read at 80 columns, the page gives troff nothing to complain about (a
// column too narrow for its words, a line that cannot be adjusted).
TEST(Reference, ManualPageReadsAt80Columns) {
    if (std::system("command -v man >/dev/null 2>&1 && command -v tbl >/dev/null 2>&1") != 0)
        GTEST_SKIP() << "man or tbl is not installed";
    std::string page = (fs::path(QECFG_SOURCE_DIR) / "docs" / "qecfg-src.5").string();
    std::string command = "MANWIDTH=80 man -l '" + page + "' 2>&1 >/dev/null";
    FILE *p = popen(command.c_str(), "r");
    ASSERT_NE(p, nullptr);
    std::string complaints;
    char buf[256];
    while (std::fgets(buf, sizeof buf, p))
        complaints += buf;
    EXPECT_EQ(pclose(p), 0);
    EXPECT_EQ(complaints, "");
}

TEST(Generator, ManualPageEscapesRoffAndKeepsTables) {
    std::string man =
        docgen::man_page("# Title\n\n## Part one\n\n.dot `a\\b` text\n\n| A | B |\n|---|---|\n| `x` | y |\n\n"
                         "```\n.code\\n\n```\n");
    EXPECT_NE(man.find(".TH QECFG-SRC 5"), std::string::npos);
    EXPECT_NE(man.find(".SH PART ONE\n"), std::string::npos);
    EXPECT_NE(man.find("\\&.dot \\fBa\\eb\\fR text\n"), std::string::npos);
    EXPECT_NE(man.find(".na\n.TS\nallbox;\nl lx.\nA\tT{\nB\nT}\n\\fBx\\fR\tT{\ny\nT}\n.TE\n.ad\n"), std::string::npos);
    EXPECT_NE(man.find(".nf\n\\&.code\\en\n.fi\n"), std::string::npos);
    EXPECT_NE(man.find(".SH SEE ALSO\n.BR qecfg (1),\n.BR qecfg-check (1),\n.BR cdbdump (1)\n"), std::string::npos);
}

} // namespace
