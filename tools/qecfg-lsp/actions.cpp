// Quick fixes for what the checker can mend: missing required statements,
// misspelt stanza names, keywords, data types and property words, a hex
// Binary value without its 0x, and DefaultValue statements that the last
// one overrides.
#include <algorithm>
#include <cctype>
#include <cstdlib>

#include "cursor.h"
#include "diagnose.h"
#include "requests.h"
#include "symbols.h"

namespace lsp {

namespace {

struct fix_context {
    const document &d;
    const json &diagnostics; // the client's diagnostics in the range
    json actions = json::array();
};

json edit(const document &d, byte_span span, const std::string &text) {
    return {{"range", range_json(d, span)}, {"newText", text}};
}

// The client's diagnostics on the lines of a span.
json diagnostics_on(const fix_context &fx, byte_span span) {
    json v = json::array();
    int first = fx.d.position_of(span.from).line, last = fx.d.position_of(span.to).line;
    for (const json &diag : fx.diagnostics) {
        int line = diag.is_object() ? diag.value(json::json_pointer("/range/start/line"), -1) : -1;
        if (line >= first && line <= last)
            v.push_back(diag);
    }
    return v;
}

void add(fix_context &fx, const std::string &title, byte_span about, json edits, bool preferred = false) {
    json action = {{"title", title},
                   {"kind", "quickfix"},
                   {"diagnostics", diagnostics_on(fx, about)},
                   {"edit", {{"changes", {{fx.d.uri(), std::move(edits)}}}}}};
    if (preferred)
        action["isPreferred"] = true;
    fx.actions.push_back(std::move(action));
}

void replace_word(fix_context &fx, byte_span span, const std::string &word, const std::vector<std::string> &names) {
    std::string better = check::nearest(word, names);
    if (!better.empty() && better != word)
        add(fx, "Replace '" + word + "' by '" + better + "'", span, json::array({edit(fx.d, span, better)}), true);
}

std::vector<std::string> stanza_names() {
    std::vector<std::string> v;
    for (const lang::stanza_type &t : lang::stanza_types())
        v.push_back(t.name);
    return v;
}

// The Id after the highest of the stanzas of the same kind in the class.
std::string next_free_id(const check::source_model &m, const check::stanza &s) {
    unsigned long next = 1;
    for (const check::stanza *other : class_holding(m, s.line))
        if (const check::statement *id = other->is(s.kind) ? other->first(kw::Id) : nullptr)
            next = std::max(next, std::strtoul(id->text().c_str(), nullptr, 0) + 1);
    return std::to_string(next);
}

// The index an element has: the elements of its definition before it.
std::string element_position(const check::source_model &m, const check::stanza &s) {
    size_t i = size_t(&s - m.stanzas.data()), before = 0;
    while (i > 0 && m.stanzas[--i].is(s.kind))
        before++;
    return std::to_string(before);
}

// The value a missing statement is inserted with: one that compiles where
// it is knowable, else TODO for the author to replace, which a text takes
// as it is and any other value is refused with its own message.
std::string placeholder(const document &d, const check::stanza &s, const lang::statement_row &r) {
    using lang::value_kind;
    switch (r.kind) {
    case value_kind::integer:
    case value_kind::display_name: return "0";
    case value_kind::identifier: return next_free_id(d.model(), s);
    case value_kind::element_index: return element_position(d.model(), s);
    case value_kind::version: return "1.0.0.0";
    case value_kind::variety: return "1,1";
    default: return "TODO";
    }
}

// The required statements a stanza lacks, inserted after its header in the
// order of the keyword table.
void missing_required(fix_context &fx, const check::stanza &s) {
    std::string text, names;
    for (const lang::statement_row &r : s.type->rows)
        if (!r.optional && !s.first(r.name)) {
            text += "\t" + r.name + "=" + placeholder(fx.d, s, r) + "\n";
            names += (names.empty() ? "" : ", ") + r.name;
        }
    if (text.empty())
        return;
    piece_parts header = fx.d.parts(s.line);
    size_t after = std::min(header.piece.to + 1, fx.d.text().size());
    std::string insert = header.piece.to == fx.d.text().size() ? "\n" + text : text;
    add(fx, "Insert the missing required statements: " + names, header.piece,
        json::array({edit(fx.d, {after, after}, insert)}), true);
}

// Several DefaultValue statements of a scalar type: all but the last go.
void repeated_default(fix_context &fx, const check::stanza &s, zu_data_type_t type) {
    std::vector<const check::statement *> defaults = s.given(kw::DefaultValue);
    if (defaults.size() < 2 || lang::is_array(type))
        return;
    json edits = json::array();
    for (size_t i = 0; i + 1 < defaults.size(); i++) {
        piece_parts p = fx.d.parts(defaults[i]->line);
        edits.push_back(edit(fx.d, {p.piece.from, std::min(p.piece.to + 1, fx.d.text().size())}, ""));
    }
    add(fx, "Remove the DefaultValue statements that the last one overrides", fx.d.parts(defaults.front()->line).piece,
        edits);
}

bool hex_digits(const std::string &v) {
    if (v.empty() || v.size() % 2 || v.rfind("0x", 0) == 0)
        return false;
    for (char c : v)
        if (!std::isxdigit(static_cast<unsigned char>(c)))
            return false;
    return true;
}

void statement_fixes(fix_context &fx, const check::stanza &s, const check::statement &st, zu_data_type_t type) {
    piece_parts p = fx.d.parts(st.line);
    if (!st.row) {
        std::vector<std::string> rows;
        for (const lang::statement_row &r : s.type->rows)
            rows.push_back(r.name);
        replace_word(fx, p.keyword, std::string(st.keyword()), rows);
        return;
    }
    using lang::value_kind;
    value_kind kind = st.row->kind;
    if ((kind == value_kind::data_type || kind == value_kind::element_type) &&
        lang::data_type_named(st.text()) == ZU_UNKNOWN) {
        replace_word(fx, p.value, st.text(), lang::data_type_names());
    } else if (kind == value_kind::properties) {
        std::vector<std::string> words;
        for (int i = 0; i < st.row->props_count; i++)
            words.push_back(st.row->props[i].s);
        for (size_t from = p.value.from; from <= p.value.to;) {
            byte_span word;
            std::string w = word_at(fx.d, p.value, from, word);
            if (std::find(words.begin(), words.end(), w) == words.end())
                replace_word(fx, word, w, words);
            from = word.to + 1;
        }
    } else if ((kind == value_kind::default_value || kind == value_kind::valid_value ||
                kind == value_kind::initial_value) &&
               lang::element_type_of(type) == ZU_BINARY_PTR && hex_digits(st.text())) {
        size_t at = fx.d.text()[p.value.from] == '"' ? p.value.from + 1 : p.value.from;
        add(fx, "Write '" + st.text() + "' as hexadecimal: 0x" + st.text(), p.value,
            json::array({edit(fx.d, {at, at}, "0x")}), st.text()[0] == '0');
    }
}

void stanza_fixes(fix_context &fx, const check::stanza &s, int first, int last) {
    if (!s.type) {
        if (s.line >= first && s.line <= last)
            replace_word(fx, fx.d.parts(s.line).keyword, std::string(s.header), stanza_names());
        return;
    }
    missing_required(fx, s);
    repeated_default(fx, s, s.data_type);
    for (const check::statement &st : s.statements)
        if (st.line >= first && st.line <= last && !st.skipped)
            statement_fixes(fx, s, st, s.data_type);
}

} // namespace

json code_actions(workspace &ws, const json &params) {
    document &d = ws.named(params);
    byte_span range = range_member(d, params, "range");
    const json &context = member(params, "context");
    json diagnostics = context.is_object() ? context.value("diagnostics", json::array()) : json::array();
    fix_context fx{d, diagnostics.is_array() ? diagnostics : json::array()};
    int first = d.piece_at(range.from), last = d.piece_at(range.to);
    const check::source_model &m = d.model();
    const check::stanza *from = m.stanza_at(first);
    const check::stanza *begin = from ? from : m.stanzas.data(), *end = m.stanzas.data() + m.stanzas.size();
    for (const check::stanza *s = begin; s < end && s->line <= last; s++)
        stanza_fixes(fx, *s, first, last);
    return fx.actions;
}

} // namespace lsp
