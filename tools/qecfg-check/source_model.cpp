// Reading a source into stanzas and statements the way the compiler's reader
// does: pieces of at most 254 characters, its comment rules, headers in the
// first column, `Keyword=value` statements with their quotes removed. The
// reader's rules only cut a piece short or skip into it, so every keyword and
// value is a view into the source text.
#include "source_model.h"

#include <algorithm>
#include <cstring>

namespace check {

namespace {

bool given_as(const statement &s, std::string_view keyword) { return !s.skipped && s.keyword() == keyword; }

} // namespace

std::vector<const statement *> stanza::given(std::string_view keyword) const {
    std::vector<const statement *> v;
    for (const statement &s : statements)
        if (given_as(s, keyword))
            v.push_back(&s);
    return v;
}

const statement *stanza::first(std::string_view keyword) const {
    for (const statement &s : statements)
        if (given_as(s, keyword))
            return &s;
    return nullptr;
}

const statement *stanza::last(std::string_view keyword) const {
    for (auto it = statements.rbegin(); it != statements.rend(); ++it)
        if (given_as(*it, keyword))
            return &*it;
    return nullptr;
}

std::string stanza::value_of(std::string_view keyword) const {
    const statement *s = first(keyword);
    return s ? s->text() : "";
}

const stanza *source_model::stanza_at(int line) const {
    auto after =
        std::upper_bound(stanzas.begin(), stanzas.end(), line, [](int l, const stanza &s) { return l < s.line; });
    return after == stanzas.begin() ? nullptr : &*(after - 1);
}

const statement *source_model::statement_at(int line) const {
    if (const stanza *s = stanza_at(line))
        for (const statement &st : s->statements)
            if (st.line == line)
                return &st;
    return nullptr;
}

std::vector<std::vector<const stanza *>> source_model::classes() const {
    std::vector<std::vector<const stanza *>> v;
    for (const stanza &s : stanzas) {
        if (s.is(ST_CONTROL_DEFINITION))
            v.emplace_back();
        if (!v.empty())
            v.back().push_back(&s);
    }
    return v;
}

namespace {

// One piece of the source copied out, with the way back to the text.
struct piece {
    char chars[lang::READ_PIECE + 2];
    const char *origin; // where chars[0] stands in the text

    const char *in_text(const char *p) const { return origin + (p - chars); }
};

statement read_statement(const piece &pc, char *start, int number, const lang::stanza_type *in) {
    statement st;
    st.line = number;
    char *name = start + std::strspn(start, " \t");
    char *eq = std::strchr(name, '=');
    st.at = pc.in_text(name);
    st.keyword_length = std::uint8_t(eq ? eq - name : std::strlen(name));
    if (!eq)
        return st;
    st.skipped = std::strcmp(eq + 1, "\"\"") == 0;
    char *value = lang::unquote(eq + 1);
    if (!value)
        value = eq + 1;
    st.value_offset = std::uint8_t(value - name);
    st.value_length = std::uint8_t(std::strlen(value));
    if (in)
        st.row = lang::find_row(*in, std::string(st.keyword()));
    return st;
}

int kind_of(const lang::stanza_type *t) { return t ? int(t - lang::stanza_types().data()) : NO_STANZA_TYPE; }

} // namespace

source_model read_model(std::string_view text) {
    source_model m;
    // Statements never outnumber lines; reserving once keeps the vector from
    // doubling past what it needs.
    m.statements.reserve(size_t(std::count(text.begin(), text.end(), '\n')) + 1);
    std::vector<size_t> first_statement;
    piece pc;
    for (size_t pos = 0; pos < text.size();) {
        size_t len = std::min(text.size() - pos, lang::READ_PIECE);
        const char *nl = static_cast<const char *>(std::memchr(text.data() + pos, '\n', len));
        if (nl)
            len = size_t(nl - (text.data() + pos)) + 1;
        std::memcpy(pc.chars, text.data() + pos, len);
        pc.chars[len] = '\0';
        pc.origin = text.data() + pos;
        pos += len;
        m.last_line++;
        if (!lang::strip_line_comment(pc.chars))
            continue;
        if (pc.chars[0] != ' ' && pc.chars[0] != '\t') {
            const lang::stanza_type *t = lang::find_stanza(pc.chars);
            m.stanzas.push_back(
                stanza{m.last_line, kind_of(t), t, std::string_view(pc.origin, std::strlen(pc.chars)), {}});
            first_statement.push_back(m.statements.size());
        } else if (!m.stanzas.empty() && pc.chars[std::strspn(pc.chars, " \t")] != '\0') {
            m.statements.push_back(read_statement(pc, pc.chars, m.last_line, m.stanzas.back().type));
        }
    }
    first_statement.push_back(m.statements.size());
    for (size_t i = 0; i < m.stanzas.size(); i++)
        m.stanzas[i].statements = std::span<const statement>(m.statements.data() + first_statement[i],
                                                             first_statement[i + 1] - first_statement[i]);
    return m;
}

} // namespace check
