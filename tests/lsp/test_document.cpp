// Positions in UTF-16 code units, incremental edits, and the compiler's
// 254-character pieces against document lines.
#include <gtest/gtest.h>

#include <memory>

#include "document.h"
#include "lsp_support.h"

namespace {

using lsp::document;
using lsp::position;

TEST(LspDocument, PositionsCountUtf16Units) {
    // "é" is two bytes and one unit; "😀" four bytes and two units.
    document d("u", "ab\nxé😀z\n", 1);
    EXPECT_EQ(d.offset_of({1, 0}), 3u);
    EXPECT_EQ(d.offset_of({1, 2}), 6u);  // after é
    EXPECT_EQ(d.offset_of({1, 4}), 10u); // after the emoji
    EXPECT_EQ(d.offset_of({1, 3}), 6u);  // inside the pair: before it
    EXPECT_EQ(d.position_of(10), (position{1, 4}));
    EXPECT_EQ(d.offset_of({1, 99}), 11u); // clamped to the line end
    EXPECT_EQ(d.offset_of({9, 0}), d.text().size());
    // Invalid UTF-8 counts a unit per byte, both ways.
    document junk("u", "\xff\xfe\x80x", 1);
    EXPECT_EQ(junk.position_of(3), (position{0, 2}));
    EXPECT_EQ(junk.offset_of({0, 2}), 3u);
}

TEST(LspDocument, IncrementalEditsKeepIndexesTrue) {
    document d("u", "ControlDefinition\n\tFileVersion=1\n", 1);
    d.replace({d.offset_of({1, 13}), d.offset_of({1, 14})}, "2.0", 2);
    EXPECT_EQ(d.text(), "ControlDefinition\n\tFileVersion=2.0\n");
    d.replace({d.offset_of({0, 17}), d.offset_of({0, 17})}, "\nResourceClass", 3);
    EXPECT_EQ(d.line(1), "ResourceClass");
    EXPECT_EQ(d.model().stanzas.size(), 2u);
    EXPECT_EQ(d.model().stanzas[0].statements.size(), 0u);
    EXPECT_EQ(d.model().stanzas[1].statements[0].value(), "2.0");
    EXPECT_EQ(d.version(), 3);
}

TEST(LspDocument, LongLinesAreSeveralPieces) {
    std::string longline = "\tName=" + std::string(300, 'x');
    document d("u", "ControlDefinition\n" + longline + "\nResourceClass\n", 1);
    EXPECT_EQ(d.line_count(), 4);
    EXPECT_EQ(d.piece_count(), 4); // the long line is pieces 2 and 3
    EXPECT_EQ(d.position_of(d.parts(3).piece.from), (position{1, 254}));
    EXPECT_EQ(d.parts(4).keyword.from, d.offset_of({2, 0}));
    EXPECT_TRUE(d.parts(4).header);
    lsp::piece_parts st = d.parts(2);
    EXPECT_EQ(d.text().substr(st.keyword.from, st.keyword.to - st.keyword.from), "Name");
    EXPECT_EQ(st.value.to - st.value.from, 254u - 6u);
}

std::string text_of(const document &d, lsp::byte_span s) { return d.text().substr(s.from, s.to - s.from); }

TEST(LspDocument, CommentsAndTrailingBlanksAreNoPartOfAStatement) {
    document d("u",
               "ControlDefinition # starts\n  FileVersion=1.0  // why\n# a comment\nResourceClass\n"
               "\tName=\"a#b\" # c\n\tNoEquals\n",
               1);
    lsp::piece_parts h = d.parts(1), st = d.parts(2);
    EXPECT_EQ(text_of(d, h.keyword), "ControlDefinition");
    EXPECT_EQ(text_of(d, st.value), "1.0");
    EXPECT_EQ(text_of(d, st.whole), "  FileVersion=1.0");
    lsp::piece_parts comment = d.parts(3);
    EXPECT_FALSE(comment.header);
    EXPECT_EQ(comment.whole.from, comment.whole.to);
    EXPECT_EQ(text_of(d, comment.piece), "# a comment");
    EXPECT_EQ(text_of(d, d.parts(5).value), "\"a#b\""); // the value as written, with its quotes
    lsp::piece_parts bare = d.parts(6);
    EXPECT_EQ(text_of(d, bare.keyword), "NoEquals");
    EXPECT_EQ(bare.value.from, bare.keyword.to);
    EXPECT_EQ(bare.value.to, bare.keyword.to);
}

} // namespace

namespace {

bool same_model(const check::source_model &a, const check::source_model &b) {
    if (a.stanzas.size() != b.stanzas.size() || a.last_line != b.last_line)
        return false;
    for (size_t i = 0; i < a.stanzas.size(); i++) {
        const check::stanza &x = a.stanzas[i], &y = b.stanzas[i];
        if (x.line != y.line || x.header != y.header || x.type != y.type || x.statements.size() != y.statements.size())
            return false;
        for (size_t j = 0; j < x.statements.size(); j++) {
            const check::statement &s = x.statements[j], &t = y.statements[j];
            if (s.line != t.line || s.keyword() != t.keyword() || s.value() != t.value() || s.skipped != t.skipped ||
                s.row != t.row)
                return false;
        }
    }
    return true;
}

// After edits within a line, the model is a fresh reading of the new text.
TEST(LspDocument, ModelAfterEditsEqualsAFreshReading) {
    std::string text = slurp(QECFG_SOURCE_DIR "/examples/disk.src");
    document d("u", text, 1);
    const char *const inserts[] = {"x", "=", "\"", "#", " ", "", "\t", "\"\"", "Name=", "ab,c"};
    unsigned seed = 19;
    for (int i = 0; i < 400; i++) {
        seed = seed * 1103515245 + 12345;
        d.model(); // current before the edit, as after a request
        int line = int(seed >> 8) % d.line_count();
        int len = int(d.line(line).size());
        int from = len ? int(seed >> 4) % (len + 1) : 0;
        int to = std::min(len, from + int(seed >> 20) % 3);
        d.replace({d.offset_of({line, from}), d.offset_of({line, to})}, inserts[(seed >> 12) % 10], i + 2);
        ASSERT_TRUE(same_model(d.model(), check::read_model(d.text()))) << "edit " << i << " on line " << line;
    }
}

// The model refers to its document's own text: a copy or a moved document
// does not read the text it came from, which may change or go (a short text
// lies inside the document object itself).
TEST(LspDocument, CopiedAndMovedDocumentsReadTheirOwnText) {
    for (const std::string text : {"ControlDefinition\n Version=1.0\n", "X\n V=1.0\n"}) {
        auto original = std::make_unique<document>("u", text, 1);
        original->model();
        document copy(*original);
        document moved(std::move(*original));
        original.reset();
        ASSERT_EQ(moved.model().statements.size(), 1u) << text;
        EXPECT_EQ(moved.model().statements[0].value(), "1.0");
        moved.replace({0, text.size()}, "", 2);
        EXPECT_TRUE(moved.model().statements.empty());
        ASSERT_EQ(copy.model().statements.size(), 1u);
        EXPECT_EQ(copy.model().statements[0].value(), "1.0");
        moved = copy;
        ASSERT_EQ(moved.model().statements.size(), 1u);
        EXPECT_EQ(moved.model().statements[0].value(), "1.0");
    }
}

} // namespace
