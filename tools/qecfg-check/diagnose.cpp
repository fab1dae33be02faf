// Explaining the compiler's fatal messages. The compiler stops at the first
// error with a fixed message; the source model tells where it is and what
// is missing, wrong or expected.
#include "diagnose.h"

#include <algorithm>
#include <cctype>
#include <functional>
#include <utility>

namespace check {

namespace {

using qecfg::message_id;

std::string lower(std::string_view v) {
    std::string s(v);
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

std::string did_you_mean(std::string_view word, const std::vector<std::string> &candidates) {
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
    if (s.is_element())
        v.erase(std::remove(v.begin(), v.end(), kw::ElementIndex), v.end());
    return v;
}

// The records still open at a line: the pending structured-data element and
// the last attribute and action of each kind in the current class.
struct open_records {
    const stanza *element = nullptr;
    std::vector<const stanza *> last;

    const stanza *of(int kind) const {
        for (const stanza *s : last)
            if (s->is(kind))
                return s;
        return nullptr;
    }
};

open_records open_at(const source_model &m, int line, bool inclusive) {
    open_records r;
    for (const stanza &s : m.stanzas) {
        if (s.line > line || (s.line == line && !inclusive))
            break;
        if (s.is(ST_CONTROL_DEFINITION))
            r.last.clear();
        bool element = s.is_element();
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

void add_kinds(std::vector<const stanza *> &order, const open_records &r, std::initializer_list<int> kinds) {
    for (int k : kinds)
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
        if (!header->is_element()) {
            add_kinds(order, r, {ST_RESOURCE_ACTION, ST_CLASS_ACTION});
            if (header->is(ST_CONTROL_DEFINITION))
                add_kinds(order, r,
                          {ST_PERSISTENT_CLASS_ATTRIBUTE, ST_DYNAMIC_CLASS_ATTRIBUTE, ST_PERSISTENT_RESOURCE_ATTRIBUTE,
                           ST_DYNAMIC_RESOURCE_ATTRIBUTE});
            else if (header->is_attribute())
                add_kinds(order, r, {header->kind});
        }
    }
    if (line == m.last_line) {
        open_records r = open_at(m, line, true);
        if (r.element)
            order.push_back(r.element);
        add_kinds(order, r,
                  {ST_PERSISTENT_RESOURCE_ATTRIBUTE, ST_DYNAMIC_RESOURCE_ATTRIBUTE, ST_PERSISTENT_CLASS_ATTRIBUTE,
                   ST_DYNAMIC_CLASS_ATTRIBUTE, ST_RESOURCE_ACTION, ST_CLASS_ACTION});
    }
    return order;
}

std::string stanza_name(int kind) { return stanza_names[kind]; }

// The subjects of a message as they stand in its text: the text without the
// fixed words of its row before the first subject and after the last.
std::string subjects(const diagnostic &d, message_id id) {
    std::string_view row = qecfg::message(id).text;
    size_t first = row.find("%s"), last = row.rfind("%s");
    if (first == std::string_view::npos)
        return "";
    size_t head = first, tail = row.size() - last - 2;
    if (d.text.size() < head + tail)
        return "";
    return d.text.substr(head, d.text.size() - head - tail);
}

// The error stays on the compiler's line; the stanza that lacks statements
// is a note.
explained incomplete_stanza(const diagnostic &d, const source_model &m) {
    for (const stanza *s : completed_at(m, d.line)) {
        std::vector<std::string> missing = missing_required(*s, m.last_line + 1, completion_required(*s));
        if (!missing.empty())
            return {{d.line, d.text + ": the " + s->type->name + " stanza on " + on_line(s->line) + " lacks " +
                                 listing(missing)},
                    {{s->line, "the incomplete " + s->type->name + " stanza starts here"}}};
    }
    return {d, {}};
}

explained optional_too_early(const diagnostic &d, const source_model &m) {
    const stanza *s = m.stanza_at(d.line);
    const statement *st = m.statement_at(d.line);
    if (!s || !s->type || !st || subjects(d, message_id::optional_before_required) != st->keyword())
        return {d, {}};
    std::string text = d.text.substr(0, d.text.size() - st->keyword().size()) + ": " + quoted(st->keyword()) + " ";
    if (!s->type->optional_accepted)
        return {{d.line, text + "is refused: " + s->type->name + " accepts no optional statement"}, {}};
    std::vector<std::string> missing = missing_required(*s, d.line, row_names(*s->type, true));
    return {{d.line, text + "comes before the required " + listing(missing)}, {}};
}

// The data type a value statement converts its value to.
zu_data_type_t value_type(const stanza &s, const statement &st) {
    if (st.keyword() == kw::ElementIndex)
        return ZU_UINT32;
    return lang::data_type_named(s.value_of(kw::DataType));
}

std::string type_name(zu_data_type_t t) {
    return t == ZU_UNKNOWN ? "UNKNOWN" : lang::data_type_names().at(size_t(t) - 1);
}

explained invalid_data(const diagnostic &d, const source_model &m) {
    const statement *st = m.statement_at(d.line);
    if (!st)
        return {d, {}};
    zu_data_type_t type = value_type(*m.stanza_at(d.line), *st);
    std::string bad = st->text();
    size_t comma = bad.find(',');
    bool pair = st->row && comma != std::string::npos &&
                (st->row->kind == lang::value_kind::valid_value || st->row->kind == lang::value_kind::range);
    if (pair) {
        std::string low = bad.substr(0, comma), high = bad.substr(comma + 1);
        bad = lang::value_converts(type, high) ? low : high;
    }
    std::string what =
        lang::is_array(type) ? "an element of type " + type_name(type) : "a value of type " + type_name(type);
    return {{d.line, d.text + ": " + quoted(bad) + " (" + std::string(st->keyword()) + ") is not " + what}, {}};
}

explained invalid_name(const diagnostic &d, const source_model &m, const std::vector<std::string> &names,
                       const char *what) {
    const statement *st = m.statement_at(d.line);
    if (!st)
        return {d, {}};
    return {{d.line, d.text + ": " + quoted(st->value()) + did_you_mean(st->value(), names) + " (" + what + ": " +
                         listing(names) + ")"},
            {}};
}

explained unknown_statement(const diagnostic &d, const source_model &m) {
    const statement *st = m.statement_at(d.line);
    const stanza *s = m.stanza_at(d.line);
    if (!st || !s || !s->type || subjects(d, message_id::unknown_keyword) != std::string(st->keyword()) + s->type->name)
        return {d, {}};
    std::string prefix = d.text.substr(0, d.text.size() - st->keyword().size() - s->type->name.size());
    return {{d.line, prefix + quoted(st->keyword()) + " is no statement of " + s->type->name +
                         did_you_mean(st->keyword(), row_names(*s->type, false))},
            {}};
}

explained unknown_stanza(const diagnostic &d, const source_model &) {
    std::string header = subjects(d, message_id::invalid_stanza);
    if (!header.empty() && header.back() == '\r')
        return {{d.line, d.text + ": the line ends with a carriage return; save the source with plain newlines"}, {}};
    std::vector<std::string> names(std::begin(stanza_names), std::end(stanza_names));
    std::string hint = did_you_mean(header, names);
    return {{d.line, d.text + (hint.empty() ? ": no such stanza type (statements must be indented)" : hint)}, {}};
}

bool has_class_before(const source_model &m, int line) {
    return std::any_of(m.stanzas.begin(), m.stanzas.end(),
                       [&](const stanza &s) { return s.line < line && s.is(ST_CONTROL_DEFINITION); });
}

explained no_class_yet(const diagnostic &d, const source_model &m) {
    if (has_class_before(m, d.line))
        return {d, {}};
    return {{d.line, d.text + ": a " + stanza_name(ST_CONTROL_DEFINITION) + " stanza must come first"}, {}};
}

// The first stanza of a kind, or its second when `second`.
const stanza *stanza_of(const source_model &m, int kind, bool second = false) {
    for (const stanza &s : m.stanzas)
        if (s.is(kind) && !std::exchange(second, false))
            return &s;
    return nullptr;
}

explained second_mapping(const diagnostic &d, const source_model &m) {
    const stanza *s = stanza_of(m, ST_CLASS_TO_MANAGER_MAPPING, true);
    return {s ? diagnostic{s->line, d.text} : d, {}};
}

// The error stays on the compiler's line, where the map is completed; the
// FirstKey statement is a note.
explained keys_reversed(const diagnostic &d, const source_model &m) {
    const stanza *s = stanza_of(m, ST_CLASS_TO_MANAGER_MAPPING);
    const statement *first = s ? s->first(kw::FirstKey) : nullptr, *last = s ? s->first(kw::LastKey) : nullptr;
    if (!first || !last)
        return {d, {}};
    std::string pair = std::string(kw::FirstKey) + "=" + first->text() + ", " + kw::LastKey + "=" + last->text();
    return {{d.line, d.text + " (" + pair + " on " + on_line(last->line) + ")"},
            {{first->line, std::string(kw::FirstKey) + " is given here"}}};
}

explained no_manager(const diagnostic &d, const source_model &m) {
    const stanza *s = stanza_of(m, ST_CLASS_TO_MANAGER_MAPPING);
    if (!s)
        return {d, {}};
    return {{s->line, d.text + ": the " + stanza_name(ST_CLASS_TO_MANAGER_MAPPING) + " stanza has no " +
                          kw::ResourceManager + " statement"},
            {}};
}

explained unnamed_class(const diagnostic &d, const source_model &m) {
    for (const stanza &s : m.stanzas)
        if (s.is(ST_RESOURCE_CLASS) && !s.first(kw::Name))
            return {{s.line, d.text + ": this class has no " + kw::Name +
                                 " statement and is named after the output file; give it a " + kw::Name +
                                 " (or an output name ending in .cdef, option -o)"},
                    {}};
    return {
        {d.line, d.text + ": a class without a " + kw::Name + " statement is named after the output file (option -o)"},
        {}};
}

explained duplicate_statement(const diagnostic &d, const source_model &m) {
    const statement *st = m.statement_at(d.line);
    const stanza *s = m.stanza_at(d.line);
    if (!st || !s)
        return {d, {}};
    const statement *first = s->first(st->keyword());
    return {first && first != st ? diagnostic{d.line, d.text + " (first given on " + on_line(first->line) + ")"} : d,
            {}};
}

explained index_out_of_sequence(const diagnostic &d, const source_model &m) {
    const stanza *s = m.stanza_at(d.line);
    if (!s)
        return {d, {}};
    int expected = 0;
    for (auto it = std::find_if(m.stanzas.rbegin(), m.stanzas.rend(), [&](const stanza &x) { return &x == s; }) + 1;
         it != m.stanzas.rend() && it->type == s->type; ++it)
        expected++;
    return {{d.line, d.text + ": the element " + std::to_string(expected) + " of this " + s->type->name +
                         " definition needs " + kw::ElementIndex + "=" + std::to_string(expected)},
            {}};
}

// An attribute's structured value is built when its element run ends; an
// element whose DataType names no data type cannot be built.
explained attribute_element_type(const diagnostic &d, const source_model &m) {
    const stanza *unknown = nullptr;
    for (const stanza &s : m.stanzas) {
        if (s.line > d.line)
            break;
        const statement *dt = s.first(kw::DataType);
        bool attribute_element = s.is(ST_PATTR_SD) || s.is(ST_DATTR_SD);
        if (attribute_element && dt && lang::data_type_named(dt->text()) == ZU_UNKNOWN && !unknown)
            unknown = &s;
        else if (!attribute_element && s.line < d.line)
            unknown = nullptr; // the run ended before the error
    }
    if (!unknown)
        return {d, {}};
    const statement *dt = unknown->first(kw::DataType);
    std::string hint = did_you_mean(dt->value(), lang::data_type_names());
    return {{d.line, d.text + ": the element " + quoted(unknown->value_of(kw::ElementName)) + " of the " +
                         unknown->type->name + " definition on " + on_line(unknown->line) + " has a " + kw::DataType +
                         " that names no data type, so the attribute's structured value cannot be built"},
            {{dt->line, std::string(kw::DataType) + "=" + dt->text() + " names no data type" + hint}}};
}

// The property statement that holds a word its stanza does not allow.
explained invalid_property(const diagnostic &d, const source_model &m) {
    std::string word = subjects(d, message_id::invalid_property);
    for (const stanza &s : m.stanzas)
        for (const statement &st : s.statements) {
            if (!st.row || st.row->kind != lang::value_kind::properties || st.skipped)
                continue;
            std::vector<std::string> allowed;
            for (int i = 0; i < st.row->props_count; i++)
                allowed.push_back(st.row->props[i].s);
            if (std::find(allowed.begin(), allowed.end(), word) != allowed.end())
                continue;
            std::string list = st.text() + ",";
            for (size_t a = 0, b; (b = list.find(',', a)) != std::string::npos; a = b + 1)
                if (list.substr(a, b - a) == word)
                    return {{st.line, d.text + ": " + quoted(word) + " is no property word of " + s.type->name +
                                          did_you_mean(word, allowed) + " (the words: " + listing(allowed) + ")"},
                            {}};
        }
    return {d, {}};
}

explained with_hint(const diagnostic &d, const std::string &hint) { return {{d.line, d.text + ": " + hint}, {}}; }

struct explanation {
    message_id id;
    std::function<explained(const diagnostic &, const source_model &)> explain;
};

const explanation explanations[] = {
    {message_id::optional_before_required, optional_too_early},
    {message_id::incomplete_stanza, incomplete_stanza},
    {message_id::invalid_data, invalid_data},
    {message_id::invalid_data_type,
     [](const diagnostic &d, const source_model &m) {
         return invalid_name(d, m, lang::data_type_names(), "the data types");
     }},
    {message_id::invalid_variable_type,
     [](const diagnostic &d, const source_model &m) {
         return invalid_name(d, m, lang::variable_type_names(), "the variable types");
     }},
    {message_id::unknown_keyword, unknown_statement},
    {message_id::invalid_stanza, unknown_stanza},
    {message_id::invalid_property, invalid_property},
    {message_id::no_strings_table, no_class_yet},
    {message_id::no_class_for_sd, no_class_yet},
    {message_id::no_class_for_persistent_attribute, no_class_yet},
    {message_id::no_class_for_persistent_class_attribute, no_class_yet},
    {message_id::no_class_for_dynamic_attribute, no_class_yet},
    {message_id::no_class_for_action, no_class_yet},
    {message_id::second_map, second_mapping},
    {message_id::first_key_above_last, keys_reversed},
    {message_id::no_manager, no_manager},
    {message_id::unnamed_class_output, unnamed_class},
    {message_id::duplicate_statement, duplicate_statement},
    {message_id::element_index_order, index_out_of_sequence},
    {message_id::structured_default_not_built, attribute_element_type},
    {message_id::no_classes,
     [](const diagnostic &d, const source_model &) {
         return with_hint(d, "the source has no " + stanza_name(ST_CONTROL_DEFINITION) + " stanza");
     }},
    {message_id::no_maps,
     [](const diagnostic &d, const source_model &) {
         return with_hint(d, "the source needs a " + stanza_name(ST_CLASS_TO_MANAGER_MAPPING) + " stanza");
     }},
};

// The line and text of the compiler's message: the message is "LINE: text"
// when it has a line, else the text alone.
diagnostic split_message(const qecfg::result &r) {
    if (r.line == 0)
        return {0, r.message};
    return {int(r.line), r.message.substr(std::to_string(r.line).size() + 2)};
}

} // namespace

explained explain_failure(const qecfg::result &failure, const source_model &m) {
    diagnostic d = split_message(failure);
    for (const explanation &e : explanations)
        if (e.id == failure.id)
            return e.explain(d, m);
    return {d, {}};
}

std::string quoted(std::string_view s) { return "'" + std::string(s) + "'"; }

std::string on_line(int line) { return "line " + std::to_string(line); }

std::string listing(const std::vector<std::string> &names) {
    std::string s;
    for (const std::string &n : names)
        s += (s.empty() ? "" : ", ") + n;
    return s;
}

std::string nearest(std::string_view word, const std::vector<std::string> &candidates) {
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
