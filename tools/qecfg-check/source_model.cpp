// Reading a source into stanzas and statements the way the compiler's reader
// does: pieces of at most 254 characters, its comment rules, headers in the
// first column, `Keyword=value` statements with their quotes removed.
#include "source_model.h"

#include <cstring>

namespace check {

bool stanza::is_attribute() const {
    return type && !type->structured_data && type->name.find("Attribute") != std::string::npos;
}

std::vector<const statement *> stanza::given(const std::string &keyword) const {
    std::vector<const statement *> v;
    for (const statement &s : statements)
        if (!s.skipped && s.keyword == keyword)
            v.push_back(&s);
    return v;
}

const statement *stanza::first(const std::string &keyword) const {
    for (const statement &s : statements)
        if (!s.skipped && s.keyword == keyword)
            return &s;
    return nullptr;
}

const stanza *source_model::stanza_at(int line) const {
    const stanza *found = nullptr;
    for (const stanza &s : stanzas)
        if (s.line <= line)
            found = &s;
    return found;
}

std::vector<std::vector<const stanza *>> source_model::classes() const {
    std::vector<std::vector<const stanza *>> v;
    for (const stanza &s : stanzas) {
        if (s.is("ControlDefinition"))
            v.emplace_back();
        if (!v.empty())
            v.back().push_back(&s);
    }
    return v;
}

namespace {

statement read_statement(char *line, int number, const stanza &in) {
    statement st;
    st.line = number;
    char *name = line + std::strspn(line, " \t");
    char *eq = std::strchr(name, '=');
    if (!eq) {
        st.keyword = name;
        return st;
    }
    st.keyword.assign(name, eq);
    st.skipped = std::strcmp(eq + 1, "\"\"") == 0;
    char *value = lang::unquote(eq + 1);
    st.value = value ? value : eq + 1;
    if (in.type)
        st.row = lang::find_row(*in.type, st.keyword);
    return st;
}

} // namespace

source_model read_model(const std::string &text) {
    source_model m;
    char piece[lang::READ_PIECE + 2];
    for (size_t pos = 0; pos < text.size();) {
        size_t len = std::min(text.size() - pos, lang::READ_PIECE);
        const char *nl = static_cast<const char *>(std::memchr(text.data() + pos, '\n', len));
        if (nl)
            len = size_t(nl - (text.data() + pos)) + 1;
        std::memcpy(piece, text.data() + pos, len);
        piece[len] = '\0';
        pos += len;
        m.last_line++;
        if (!lang::strip_line_comment(piece))
            continue;
        if (piece[0] != ' ' && piece[0] != '\t') {
            m.stanzas.push_back(stanza{m.last_line, piece, lang::find_stanza(piece), {}});
        } else if (!m.stanzas.empty() && piece[std::strspn(piece, " \t")] != '\0') {
            m.stanzas.back().statements.push_back(read_statement(piece, m.last_line, m.stanzas.back()));
        }
    }
    return m;
}

} // namespace check
