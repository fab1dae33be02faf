// Lookups by position use the model's line order (binary search), so a
// request on a large document costs little beyond its own stanza.
#include "cursor.h"

#include <algorithm>

namespace lsp {

const check::stanza *stanza_holding(const check::source_model &m, int line) {
    auto it = std::upper_bound(m.stanzas.begin(), m.stanzas.end(), line,
                               [](int l, const check::stanza &s) { return l < s.line; });
    return it == m.stanzas.begin() ? nullptr : &*(it - 1);
}

cursor cursor_at(const document &d, position p) {
    cursor c;
    c.offset = d.offset_of(p);
    c.piece = d.piece_at(c.offset);
    c.parts = d.parts(c.piece);
    c.stanza = stanza_holding(d.model(), c.piece);
    if (c.stanza && !c.parts.header)
        for (const check::statement &s : c.stanza->statements)
            if (s.line == c.piece)
                c.statement = &s;
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

byte_span value_span(const document &d, const check::statement &s) { return d.parts(s.line).value; }

byte_span keyword_span(const document &d, const check::statement &s) { return d.parts(s.line).keyword; }

} // namespace lsp
