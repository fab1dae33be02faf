// The outline of a source, definitions and references of variable class
// names and locators, and the symbols of all open documents.
#include <algorithm>
#include <cctype>

#include "cursor.h"
#include "requests.h"
#include "symbols.h"

namespace lsp {

namespace {

enum symbol_kind { MODULE = 2, CLASS = 5, METHOD = 6, PROPERTY = 7, FIELD = 8, CONSTANT = 14, STRUCT = 23 };

struct symbol {
    std::string name, detail;
    symbol_kind kind;
    byte_span range, selection;
    std::vector<symbol> children;
};

// The text a stanza is named by, and where that name stands.
const char *const NAMING_KEYWORDS[] = {kw::Name, kw::ElementName, kw::VariableClass, kw::ResourceManager};

symbol stanza_symbol(const document &d, const check::stanza &s, symbol_kind kind) {
    piece_parts header = d.parts(s.line);
    byte_span end = s.statements.empty() ? header.piece : d.parts(s.statements.back().line).piece;
    symbol sym{std::string(s.header), std::string(s.header), kind, {header.piece.from, end.to}, header.keyword, {}};
    for (const char *keyword : NAMING_KEYWORDS)
        if (const check::statement *st = s.first(keyword)) {
            sym.name = st->text();
            sym.selection = d.value_span(*st);
            break;
        }
    return sym;
}

void extend(symbol &parent, const symbol &child) { parent.range.to = std::max(parent.range.to, child.range.to); }

// A class, its attributes and actions, and the structured-data definitions
// under the attribute, action or class they describe.
symbol class_symbol(const document &d, const std::vector<const check::stanza *> &cls) {
    symbol c = stanza_symbol(d, *cls.front(), CLASS);
    c.name = "(unnamed class)";
    size_t attr = SIZE_MAX, action = SIZE_MAX;
    symbol *run = nullptr, *run_owner = nullptr;
    const check::stanza *previous = nullptr;
    for (const check::stanza *s : cls) {
        if (s->is(ST_RESOURCE_CLASS)) {
            symbol rc = stanza_symbol(d, *s, CLASS);
            if (s->first(kw::Name))
                c.name = rc.name;
            extend(c, rc);
        } else if (s->is_attribute() || s->is_action()) {
            c.children.push_back(stanza_symbol(d, *s, s->is_action() ? METHOD : PROPERTY));
            (s->is_action() ? action : attr) = c.children.size() - 1;
            run = nullptr;
        } else if (s->type && s->type->structured_data) {
            symbol element = stanza_symbol(d, *s, FIELD);
            if (!run || !previous || previous->type != s->type) {
                size_t owner = s->is(ST_PATTR_SD) || s->is(ST_DATTR_SD)            ? attr
                               : s->is(ST_ACTION_IN_SD) || s->is(ST_ACTION_OUT_SD) ? action
                                                                                   : SIZE_MAX;
                run_owner = owner == SIZE_MAX ? &c : &c.children[owner];
                run_owner->children.push_back(
                    symbol{std::string(s->header), "structured data", STRUCT, element.range, element.selection, {}});
                run = &run_owner->children.back();
            }
            run->children.push_back(element);
            extend(*run, element);
            extend(*run_owner, element);
        }
        previous = s;
    }
    for (const symbol &child : c.children)
        extend(c, child);
    return c;
}

std::vector<symbol> outline(const document &d) {
    std::vector<symbol> top;
    const check::source_model &m = d.model();
    for (const std::vector<const check::stanza *> &cls : m.classes())
        top.push_back(class_symbol(d, cls));
    for (const check::stanza &s : m.stanzas)
        if (s.is(ST_CLASS_TO_MANAGER_MAPPING) || s.is(ST_RESOURCE_VARIABLE_CLASS))
            top.push_back(stanza_symbol(d, s, s.is(ST_CLASS_TO_MANAGER_MAPPING) ? MODULE : CONSTANT));
    std::sort(top.begin(), top.end(), [](const symbol &a, const symbol &b) { return a.range.from < b.range.from; });
    return top;
}

json symbol_json(const document &d, const symbol &s) {
    json children = json::array();
    for (const symbol &c : s.children)
        children.push_back(symbol_json(d, c));
    return {{"name", s.name.empty() ? s.detail : s.name},
            {"detail", s.detail},
            {"kind", s.kind},
            {"range", range_json(d, s.range)},
            {"selectionRange", range_json(d, s.selection)},
            {"children", children}};
}

void flatten(const document &d, const symbol &s, const std::string &container, const std::string &query, json &out) {
    std::string name = s.name.empty() ? s.detail : s.name;
    auto lower = [](std::string t) {
        std::transform(t.begin(), t.end(), t.begin(), [](unsigned char ch) { return char(std::tolower(ch)); });
        return t;
    };
    if (lower(name).find(lower(query)) != std::string::npos)
        out.push_back({{"name", name},
                       {"kind", s.kind},
                       {"location", location_json(d, s.selection)},
                       {"containerName", container}});
    for (const symbol &c : s.children)
        flatten(d, c, name, query, out);
}

// What a value names: a variable class or a locator target, with every
// statement that defines it and every statement that uses it.
struct named_thing {
    std::vector<const check::statement *> definitions, uses;
};

std::vector<const check::statement *> matching(const std::vector<const check::statement *> &v, std::string_view value) {
    std::vector<const check::statement *> out;
    for (const check::statement *st : v)
        if (st->value() == value)
            out.push_back(st);
    return out;
}

bool thing_at(const document &d, const cursor &c, named_thing &thing) {
    if (!c.on_value || !c.statement || c.statement->skipped)
        return false;
    const check::stanza &s = *c.stanza;
    std::string_view keyword = c.statement->keyword(), value = c.statement->value();
    if (keyword == kw::VariableClass && (s.is_dynamic() || s.is(ST_RESOURCE_VARIABLE_CLASS))) {
        thing = {matching(variable_class_definitions(d.model()), value),
                 matching(variable_class_uses(d.model()), value)};
        return true;
    }
    if ((keyword == kw::Locator && s.is(ST_RESOURCE_CLASS)) ||
        (keyword == kw::Name && s.is(ST_PERSISTENT_RESOURCE_ATTRIBUTE))) {
        std::vector<const check::stanza *> cls = class_holding(d.model(), c.piece);
        thing = {matching(locator_targets(cls), value), matching(locator_uses(cls), value)};
        return true;
    }
    return false;
}

json locations(const document &d, const std::vector<const check::statement *> &statements) {
    json v = json::array();
    for (const check::statement *st : statements)
        v.push_back(location_json(d, d.value_span(*st)));
    return v;
}

} // namespace

json document_symbols(workspace &ws, const json &params) {
    document &d = ws.named(params);
    json v = json::array();
    for (const symbol &s : outline(d))
        v.push_back(symbol_json(d, s));
    return v;
}

json definition(workspace &ws, const json &params) {
    document &d = ws.named(params);
    named_thing thing;
    if (!thing_at(d, cursor_at(d, position_member(params, "position")), thing))
        return nullptr;
    return locations(d, thing.definitions);
}

json references(workspace &ws, const json &params) {
    document &d = ws.named(params);
    named_thing thing;
    if (!thing_at(d, cursor_at(d, position_member(params, "position")), thing))
        return json::array();
    const json &context = params.value("context", json::object());
    bool declarations = context.is_object() && context.value("includeDeclaration", false);
    json v = locations(d, thing.uses);
    if (declarations)
        for (json &l : locations(d, thing.definitions))
            v.push_back(std::move(l));
    return v;
}

json workspace_symbols(workspace &ws, const json &params) {
    std::string query = string_member(params, "query");
    json out = json::array();
    for (const auto &[uri, doc] : ws.documents)
        for (const symbol &s : outline(*doc))
            flatten(*doc, s, "", query, out);
    return out;
}

} // namespace lsp
