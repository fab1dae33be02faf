// Explaining the compiler's fatal messages. The compiler stops at the first
// error with a fixed message; the source model tells where it is and what
// is missing, wrong or expected.
#include "diagnose.h"

#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <utility>

namespace check {

namespace {

const std::string INVALID_PROPERTY = ": invalid property";

bool ends_with(const std::string &s, const std::string &tail) {
    return s.size() >= tail.size() && s.compare(s.size() - tail.size(), tail.size(), tail) == 0;
}

std::string lower(std::string s) {
    for (char &c : s)
        c = char(std::tolower(static_cast<unsigned char>(c)));
    return s;
}

size_t edit_distance(const std::string &a, const std::string &b) {
    std::vector<size_t> row(b.size() + 1);
    for (size_t j = 0; j <= b.size(); j++)
        row[j] = j;
    for (size_t i = 1; i <= a.size(); i++) {
        size_t diag = row[0];
        row[0] = i;
        for (size_t j = 1; j <= b.size(); j++) {
            size_t up = row[j];
            row[j] = std::min({row[j] + 1, row[j - 1] + 1, diag + (a[i - 1] != b[j - 1])});
            diag = up;
        }
    }
    return row[b.size()];
}

std::string did_you_mean(const std::string &word, const std::vector<std::string> &candidates) {
    std::string n = nearest(word, candidates);
    return n.empty() ? "" : "; did you mean '" + n + "'?";
}

std::vector<std::string> row_names(const lang::stanza_type &t, bool required_only) {
    std::vector<std::string> v;
    for (const lang::statement_row &r : t.rows)
        if (!required_only || !r.optional)
            v.push_back(r.name);
    return v;
}

// The required statements of a stanza not given before a line.
std::vector<std::string> missing_required(const stanza &s, int before, const std::vector<std::string> &required) {
    std::vector<std::string> missing;
    for (const std::string &name : required) {
        const statement *st = s.first(name);
        if (!st || st->line >= before)
            missing.push_back(name);
    }
    return missing;
}

// What completion requires of a stanza: the required rows, except that a
// structured-data element is completed without its ElementIndex.
std::vector<std::string> completion_required(const stanza &s) {
    std::vector<std::string> v = row_names(*s.type, true);
    if (s.type->structured_data)
        v.erase(std::remove(v.begin(), v.end(), "ElementIndex"), v.end());
    return v;
}

const statement *statement_at(const source_model &m, int line) {
    const stanza *s = m.stanza_at(line);
    if (s)
        for (const statement &st : s->statements)
            if (st.line == line)
                return &st;
    return nullptr;
}

// The records still open at a line: the pending structured-data element and
// the last attribute and action of each kind in the current class.
struct open_records {
    const stanza *element = nullptr;
    std::vector<const stanza *> last;

    const stanza *of(const char *type_name) const {
        for (const stanza *s : last)
            if (s->is(type_name))
                return s;
        return nullptr;
    }
};

open_records open_at(const source_model &m, int line, bool inclusive) {
    open_records r;
    for (const stanza &s : m.stanzas) {
        if (s.line > line || (s.line == line && !inclusive))
            break;
        if (s.is("ControlDefinition"))
            r.last.clear();
        bool element = s.type && s.type->structured_data;
        r.element = element ? &s : nullptr;
        if (!element) // an action ends at any other stanza
            r.last.erase(std::remove_if(r.last.begin(), r.last.end(), [](const stanza *k) { return k->is_action(); }),
                         r.last.end());
        if (s.is_attribute() || s.is_action()) {
            r.last.erase(
                std::remove_if(r.last.begin(), r.last.end(), [&](const stanza *k) { return k->type == s.type; }),
                r.last.end());
            r.last.push_back(&s);
        }
    }
    return r;
}

void add_kinds(std::vector<const stanza *> &order, const open_records &r, std::initializer_list<const char *> kinds) {
    for (const char *k : kinds)
        if (const stanza *s = r.of(k))
            order.push_back(s);
}

// The records the compiler completes at a line, in its order: at a header the
// pending element, the open actions, then the attributes that the new stanza
// ends; at the end of the source everything still open.
std::vector<const stanza *> completed_at(const source_model &m, int line) {
    std::vector<const stanza *> order;
    auto header = std::find_if(m.stanzas.begin(), m.stanzas.end(), [&](const stanza &s) { return s.line == line; });
    if (header != m.stanzas.end()) {
        open_records r = open_at(m, line, false);
        if (r.element)
            order.push_back(r.element);
        if (!header->type || !header->type->structured_data) {
            add_kinds(order, r, {"ResourceAction", "ClassAction"});
            if (header->is("ControlDefinition"))
                add_kinds(order, r,
                          {"PersistentClassAttribute", "DynamicClassAttribute", "PersistentResourceAttribute",
                           "DynamicResourceAttribute"});
            else if (header->is_attribute())
                add_kinds(order, r, {header->type->name.c_str()});
        }
    }
    if (line == m.last_line) {
        open_records r = open_at(m, line, true);
        if (r.element)
            order.push_back(r.element);
        add_kinds(order, r,
                  {"PersistentResourceAttribute", "DynamicResourceAttribute", "PersistentClassAttribute",
                   "DynamicClassAttribute", "ResourceAction", "ClassAction"});
    }
    return order;
}

diagnostic incomplete_stanza(const diagnostic &d, const source_model &m) {
    const stanza *header = m.stanza_at(d.line);
    std::string when = header && header->line == d.line ? "the stanza header on line " + std::to_string(d.line)
                                                        : "the end of the source";
    for (const stanza *s : completed_at(m, d.line)) {
        std::vector<std::string> missing = missing_required(*s, m.last_line + 1, completion_required(*s));
        if (!missing.empty())
            return {s->line, d.text + ": the " + s->type->name + " stanza lacks " + listing(missing) + " (found at " +
                                 when + ")"};
    }
    return d;
}

diagnostic optional_too_early(const diagnostic &d, const source_model &m) {
    const stanza *s = m.stanza_at(d.line);
    const statement *st = statement_at(m, d.line);
    if (!s || !s->type || !st || !ends_with(d.text, st->keyword))
        return d;
    std::string text = d.text.substr(0, d.text.size() - st->keyword.size()) + ": '" + st->keyword + "' ";
    if (!s->type->optional_accepted)
        return {d.line, text + "is refused: " + s->type->name + " accepts no optional statement"};
    std::vector<std::string> missing = missing_required(*s, d.line, row_names(*s->type, true));
    return {d.line, text + "comes before the required " + listing(missing)};
}

// The data type a value statement converts its value to.
zu_data_type_t value_type(const stanza &s, const statement &st) {
    if (st.keyword == "ElementIndex")
        return ZU_UINT32;
    const statement *dt = s.first("DataType");
    return dt ? lang::data_type_named(dt->value) : ZU_UNKNOWN;
}

std::string type_name(zu_data_type_t t) {
    return t == ZU_UNKNOWN ? "UNKNOWN" : lang::data_type_names().at(size_t(t) - 1);
}

diagnostic invalid_data(const diagnostic &d, const source_model &m) {
    const statement *st = statement_at(m, d.line);
    if (!st)
        return d;
    zu_data_type_t type = value_type(*m.stanza_at(d.line), *st);
    std::string bad = st->value;
    size_t comma = bad.find(',');
    bool pair = st->row && comma != std::string::npos &&
                (st->row->kind == lang::value_kind::valid_value || st->row->kind == lang::value_kind::range);
    if (pair) {
        std::string low = bad.substr(0, comma), high = bad.substr(comma + 1);
        bad = lang::value_converts(type, high) ? low : high;
    }
    std::string what =
        lang::is_array(type) ? "an element of type " + type_name(type) : "a value of type " + type_name(type);
    return {d.line, d.text + ": '" + bad + "' (" + st->keyword + ") is not " + what};
}

diagnostic invalid_name(const diagnostic &d, const source_model &m, const std::vector<std::string> &names,
                        const char *what) {
    const statement *st = statement_at(m, d.line);
    if (!st)
        return d;
    return {d.line, d.text + ": '" + st->value + "'" + did_you_mean(st->value, names) + " (" + what + ": " +
                        listing(names) + ")"};
}

diagnostic unknown_statement(const diagnostic &d, const source_model &m) {
    const statement *st = statement_at(m, d.line);
    const stanza *s = m.stanza_at(d.line);
    if (!st || !s || !s->type || !ends_with(d.text, st->keyword + s->type->name))
        return d;
    std::string prefix = d.text.substr(0, d.text.size() - st->keyword.size() - s->type->name.size());
    return {d.line, prefix + "'" + st->keyword + "' is no statement of " + s->type->name +
                        did_you_mean(st->keyword, row_names(*s->type, false))};
}

diagnostic unknown_stanza(const diagnostic &d, const source_model &) {
    std::string header = d.text.substr(std::strlen("Invalid table name: "));
    if (!header.empty() && header.back() == '\r')
        return {d.line, d.text + ": the line ends with a carriage return; save the source with plain newlines"};
    std::vector<std::string> names;
    for (const lang::stanza_type &t : lang::stanza_types())
        names.push_back(t.name);
    std::string hint = did_you_mean(header, names);
    return {d.line, d.text + (hint.empty() ? ": no such stanza type (statements must be indented)" : hint)};
}

bool has_class_before(const source_model &m, int line) {
    return std::any_of(m.stanzas.begin(), m.stanzas.end(),
                       [&](const stanza &s) { return s.line < line && s.is("ControlDefinition"); });
}

diagnostic no_class_yet(const diagnostic &d, const source_model &m) {
    if (has_class_before(m, d.line))
        return d;
    return {d.line, d.text + ": a ControlDefinition stanza must come first"};
}

// The first stanza of a type, or its second when `second`.
const stanza *stanza_of(const source_model &m, const char *type_name, bool second = false) {
    for (const stanza &s : m.stanzas)
        if (s.is(type_name) && !std::exchange(second, false))
            return &s;
    return nullptr;
}

diagnostic second_mapping(const diagnostic &d, const source_model &m) {
    const stanza *s = stanza_of(m, "ClassToManagerMapping", true);
    return s ? diagnostic{s->line, d.text} : d;
}

diagnostic keys_reversed(const diagnostic &d, const source_model &m) {
    const stanza *s = stanza_of(m, "ClassToManagerMapping");
    const statement *first = s ? s->first("FirstKey") : nullptr, *last = s ? s->first("LastKey") : nullptr;
    if (!first || !last)
        return d;
    return {first->line, d.text + " (FirstKey=" + first->value + ", LastKey=" + last->value + " on line " +
                             std::to_string(last->line) + ")"};
}

diagnostic no_manager(const diagnostic &d, const source_model &m) {
    const stanza *s = stanza_of(m, "ClassToManagerMapping");
    return s ? diagnostic{s->line, d.text + ": the ClassToManagerMapping stanza has no ResourceManager statement"} : d;
}

diagnostic unnamed_class(const diagnostic &d, const source_model &m) {
    for (const stanza &s : m.stanzas)
        if (s.is("ResourceClass") && !s.first("Name"))
            return {s.line, d.text + ": this class has no Name statement and is named after the output file; give it "
                                     "a Name (or an output name ending in .cdef, option -o)"};
    return {d.line, d.text + ": a class without a Name statement is named after the output file (option -o)"};
}

diagnostic duplicate_statement(const diagnostic &d, const source_model &m) {
    const statement *st = statement_at(m, d.line);
    const stanza *s = m.stanza_at(d.line);
    if (!st || !s)
        return d;
    const statement *first = s->first(st->keyword);
    return first && first != st
               ? diagnostic{d.line, d.text + " (first given on line " + std::to_string(first->line) + ")"}
               : d;
}

diagnostic index_out_of_sequence(const diagnostic &d, const source_model &m) {
    const stanza *s = m.stanza_at(d.line);
    if (!s)
        return d;
    int expected = 0;
    for (auto it = std::find_if(m.stanzas.rbegin(), m.stanzas.rend(), [&](const stanza &x) { return &x == s; }) + 1;
         it != m.stanzas.rend() && it->type == s->type; ++it)
        expected++;
    return {d.line, d.text + ": the element " + std::to_string(expected) + " of this " + s->type->name +
                        " definition needs ElementIndex=" + std::to_string(expected)};
}

// The property statement that holds a word its stanza does not allow.
diagnostic invalid_property(const diagnostic &d, const source_model &m) {
    std::string word = d.text.substr(0, d.text.size() - INVALID_PROPERTY.size());
    for (const stanza &s : m.stanzas)
        for (const statement &st : s.statements) {
            if (!st.row || st.row->kind != lang::value_kind::properties || st.skipped)
                continue;
            std::vector<std::string> allowed;
            for (int i = 0; i < st.row->props_count; i++)
                allowed.push_back(st.row->props[i].s);
            if (std::find(allowed.begin(), allowed.end(), word) != allowed.end())
                continue;
            std::string list = st.value + ",";
            for (size_t a = 0, b; (b = list.find(',', a)) != std::string::npos; a = b + 1)
                if (list.substr(a, b - a) == word)
                    return {st.line, d.text + ": '" + word + "' is no property word of " + s.type->name +
                                         did_you_mean(word, allowed) + " (the words: " + listing(allowed) + ")"};
        }
    return d;
}

diagnostic with_hint(const diagnostic &d, const char *hint) { return {d.line, d.text + ": " + hint}; }

struct explanation {
    const char *message; // the start of the compiler's message
    std::function<diagnostic(const diagnostic &, const source_model &)> explain;
};

const explanation explanations[] = {
    {"Optional attribute discovered before all required attributes have been defined", optional_too_early},
    {"Previous stanza incomplete", incomplete_stanza},
    {"str_to_zu: Invalid data", invalid_data},
    {"Invalid data type",
     [](const diagnostic &d, const source_model &m) {
         return invalid_name(d, m, lang::data_type_names(), "the data types");
     }},
    {"Invalid variable type",
     [](const diagnostic &d, const source_model &m) {
         return invalid_name(d, m, lang::variable_type_names(), "the variable types");
     }},
    {"Attribute name not defined in table (name/table): ", unknown_statement},
    {"Invalid table name: ", unknown_stanza},
    {"No tbl for strings table", no_class_yet},
    {"No class for", no_class_yet},
    {"Only one ClassToManagerMapping stanza allowed", second_mapping},
    {"Error: FirstKey is greater than LastKey.", keys_reversed},
    {"No ResourceManager defined for the class-to-manager map", no_manager},
    {"Invalid cdef out file name (must end in .cdef)", unnamed_class},
    {"Already defined. Duplicated definitions not allowed for ", duplicate_statement},
    {"ElementIndeces must be consecutive", index_out_of_sequence},
    {"No classes defined",
     [](const diagnostic &d, const source_model &) {
         return with_hint(d, "the source has no ControlDefinition stanza");
     }},
    {"No class-to-manager maps defined",
     [](const diagnostic &d, const source_model &) {
         return with_hint(d, "the source needs a ClassToManagerMapping stanza");
     }},
};

// The line and text of a message "LINE: text" (or "text" without a line).
diagnostic split_message(const std::string &message) {
    size_t digits = 0;
    while (digits < message.size() && std::isdigit(static_cast<unsigned char>(message[digits])))
        digits++;
    if (ends_with(message, INVALID_PROPERTY) || digits == 0 || message.compare(digits, 2, ": ") != 0)
        return {0, message};
    return {std::atoi(message.c_str()), message.substr(digits + 2)};
}

} // namespace

diagnostic explain_failure(const std::string &message, const source_model &m) {
    diagnostic d = split_message(message);
    if (d.line == 0 && ends_with(d.text, INVALID_PROPERTY))
        return invalid_property(d, m);
    for (const explanation &e : explanations)
        if (d.text.rfind(e.message, 0) == 0)
            return e.explain(d, m);
    return d;
}

std::string listing(const std::vector<std::string> &names) {
    std::string s;
    for (const std::string &n : names)
        s += (s.empty() ? "" : ", ") + n;
    return s;
}

std::string nearest(const std::string &word, const std::vector<std::string> &candidates) {
    std::string best;
    size_t best_distance = std::max<size_t>(2, word.size() / 3) + 1;
    for (const std::string &c : candidates) {
        size_t d = lower(c) == lower(word) ? 0 : edit_distance(lower(c), lower(word));
        if (d < best_distance) {
            best = c;
            best_distance = d;
        }
    }
    return best;
}

} // namespace check
