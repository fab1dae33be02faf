// Lookups by position use the model's line order (binary search), so a
// request on a large document costs little beyond its own stanza.
#include "cursor.h"

#include <algorithm>

namespace lsp {

cursor cursor_at(const document &d, position p) {
    cursor c;
    c.offset = d.offset_of(p);
    c.piece = d.piece_at(c.offset);
    c.parts = d.parts(c.piece);
    c.stanza = d.model().stanza_at(c.piece);
    if (!c.parts.header)
        c.statement = d.model().statement_at(c.piece);
    c.on_keyword =
        c.offset >= c.parts.keyword.from && c.offset <= c.parts.keyword.to && c.parts.keyword.from < c.parts.keyword.to;
    c.after_equals = !c.parts.header && c.parts.value.from > c.parts.keyword.to && c.offset >= c.parts.value.from;
    c.on_value = c.after_equals && c.offset <= c.parts.value.to;
    return c;
}

std::string word_at(const document &d, byte_span value, size_t offset, byte_span &word) {
    const std::string &t = d.text();
    size_t from = offset, to = offset;
    while (from > value.from && t[from - 1] != ',')
        from--;
    while (to < value.to && t[to] != ',')
        to++;
    word = {from, to};
    return t.substr(from, to - from);
}

} // namespace lsp
