// The checker's model, filled from the compiler's reader: the reader frames
// the pieces and matches the stanza types and keyword rows; the model keeps
// where they lie in the text.
#include "source_model.h"

#include <algorithm>
#include <cstring>

#include "qecfg_source.h"

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

const lang::stanza_type *type_of(int kind) {
    return kind == NO_STANZA_TYPE ? nullptr : &lang::stanza_types()[size_t(kind)];
}

// The language view of a keyword row: the same row of the same stanza type.
const lang::statement_row *row_of(int kind, const keyword_row *row) {
    return row ? &type_of(kind)->rows[size_t(row - stanza_defs[kind].rows)] : nullptr;
}

statement statement_of(const source_line &l, const char *text) {
    statement st;
    st.at = text + l.offset + l.name_column;
    st.row = row_of(l.stanza, l.row);
    st.line = int(l.line);
    st.skipped = l.skipped;
    st.keyword_length = std::uint8_t(l.name_length);
    st.value_offset = std::uint8_t(l.value ? l.value_column - l.name_column : l.name_length);
    st.value_length = std::uint8_t(l.value_length);
    st.end_offset = std::uint8_t(l.end_column - l.name_column);
    return st;
}

size_t newlines(std::string_view text) {
    size_t n = 0;
    for (const char *p = text.data(), *end = p + text.size();
         (p = static_cast<const char *>(std::memchr(p, '\n', size_t(end - p)))); p++)
        n++;
    return n;
}

} // namespace

source_model read_model(std::string_view text) {
    source_model m;
    // Statements never outnumber lines; reserving once keeps the vector from
    // doubling past what it needs.
    m.statements.reserve(newlines(text) + 1);
    std::vector<size_t> first_statement;
    m.last_line = int(read_source_lines(text, [&](const source_line &l) {
                          if (l.header) {
                              m.stanzas.push_back(stanza{int(l.line),
                                                         l.stanza,
                                                         type_of(l.stanza),
                                                         std::string_view(text.data() + l.offset, l.name_length),
                                                         {}});
                              first_statement.push_back(m.statements.size());
                          } else if (!m.stanzas.empty()) {
                              m.statements.push_back(statement_of(l, text.data()));
                          }
                      }).last_line);
    first_statement.push_back(m.statements.size());
    for (size_t i = 0; i < m.stanzas.size(); i++) {
        stanza &st = m.stanzas[i];
        st.statements = std::span<const statement>(m.statements.data() + first_statement[i],
                                                   first_statement[i + 1] - first_statement[i]);
        if (const statement *dt = st.first(kw::DataType))
            st.data_type = lang::data_type_named(dt->text());
    }
    return m;
}

} // namespace check
