// Positions in UTF-16 code units, incremental edits, and the compiler's
// 254-character pieces against document lines.
#include <gtest/gtest.h>

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
    EXPECT_EQ(d.model().stanzas[1].statements[0].value, "2.0");
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

TEST(LspDocument, CommentsAndTrailingBlanksAreNoPartOfAStatement) {
    document d("u", "ControlDefinition # starts\n  FileVersion=1.0  // why\n", 1);
    lsp::piece_parts h = d.parts(1), st = d.parts(2);
    EXPECT_EQ(d.text().substr(h.keyword.from, h.keyword.to - h.keyword.from), "ControlDefinition");
    EXPECT_EQ(d.text().substr(st.value.from, st.value.to - st.value.from), "1.0");
}

} // namespace
