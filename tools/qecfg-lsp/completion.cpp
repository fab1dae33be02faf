// Completion by where the position is: a stanza name at the start of a
// line, the statements a stanza still accepts, or the words a value takes.
#include <set>

#include "cursor.h"
#include "requests.h"
#include "symbols.h"

namespace lsp {

namespace {

enum item_kind { KEYWORD = 14, PROPERTY = 10, CLASS = 7, VALUE = 12, FIELD = 5 };

json item(const std::string &label, item_kind kind, const std::string &insert, const std::string &sort) {
    return {{"label", label}, {"kind", kind}, {"insertText", insert}, {"sortText", sort}};
}

std::string sort_key(size_t n) {
    std::string s = std::to_string(n);
    return std::string(4 - std::min<size_t>(s.size(), 4), '0') + s;
}

json stanza_names() {
    json items = json::array();
    size_t n = 0;
    for (const lang::stanza_type &s : lang::stanza_types())
        items.push_back(item(s.name, CLASS, s.name, sort_key(n++)));
    return items;
}

// Required statements first in their order, then the optional ones; none
// given already elsewhere in the stanza unless it repeats.
json statement_names(const check::stanza &s, int line) {
    json items = json::array();
    size_t n = 0;
    for (bool optional : {false, true})
        for (const lang::statement_row &r : s.type->rows) {
            if (r.optional != optional)
                continue;
            bool given = false;
            for (const check::statement &st : s.statements)
                given = given || (st.line != line && !st.skipped && st.keyword() == r.name);
            if (!given || r.repeatable)
                items.push_back(item(r.name, optional ? FIELD : KEYWORD, r.name + "=", sort_key(n++)));
        }
    return items;
}

json words(const std::vector<std::string> &list, item_kind kind) {
    json items = json::array();
    size_t n = 0;
    for (const std::string &w : list)
        items.push_back(item(w, kind, w, sort_key(n++)));
    return items;
}

std::vector<std::string> values_of(const std::vector<const check::statement *> &statements) {
    std::set<std::string> seen;
    std::vector<std::string> v;
    for (const check::statement *st : statements)
        if (seen.insert(st->text()).second)
            v.push_back(st->text());
    return v;
}

json value_words(const document &d, const cursor &c) {
    const lang::statement_row *row = lang::find_row(
        *c.stanza->type, d.text().substr(c.parts.keyword.from, c.parts.keyword.to - c.parts.keyword.from));
    if (!row)
        return json::array();
    using lang::value_kind;
    switch (row->kind) {
    case value_kind::data_type: return words(lang::data_type_names(), VALUE);
    case value_kind::element_type: {
        std::vector<std::string> names;
        for (const std::string &n : lang::data_type_names())
            if (!zu_is_sd_type(lang::data_type_named(n)))
                names.push_back(n);
        return words(names, VALUE);
    }
    case value_kind::variable_type: return words(lang::variable_type_names(), VALUE);
    case value_kind::properties: {
        byte_span word;
        std::string listed = "," + d.text().substr(c.parts.value.from, c.parts.value.to - c.parts.value.from) + ",";
        std::string current = word_at(d, c.parts.value, c.offset, word);
        std::vector<std::string> names;
        for (int i = 0; i < row->props_count; i++)
            if (row->props[i].s == current ||
                listed.find("," + std::string(row->props[i].s) + ",") == std::string::npos)
                names.push_back(row->props[i].s);
        return words(names, PROPERTY);
    }
    case value_kind::locator: return words(values_of(locator_targets(class_holding(d.model(), c.piece))), VALUE);
    case value_kind::permission: {
        std::vector<std::string> letters;
        for (char l : lang::permission_letters())
            letters.emplace_back(1, l);
        return words(letters, VALUE);
    }
    default:
        if (row->name == kw::VariableClass && c.stanza->is_dynamic())
            return words(values_of(variable_class_definitions(d.model())), VALUE);
        return json::array();
    }
}

} // namespace

json completion(workspace &ws, const json &params) {
    document &d = ws.named(params);
    position p = position_member(params, "position");
    std::string_view line = d.line(p.line);
    cursor c = cursor_at(d, p);
    json items = json::array();
    size_t column = c.offset - d.offset_of({p.line, 0});
    bool indented = !line.empty() && (line[0] == ' ' || line[0] == '\t');
    if (!indented && line.substr(0, column).find_first_of(" \t") == std::string_view::npos)
        items = stanza_names();
    else if (indented && c.stanza && c.stanza->type)
        items = c.after_equals ? value_words(d, c) : statement_names(*c.stanza, c.piece);
    return {{"isIncomplete", false}, {"items", items}};
}

} // namespace lsp
