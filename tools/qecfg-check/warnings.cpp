// The warnings, one function each, in the manner of a table of checks: every
// check walks the source model and reports what compiles but is most likely
// not what the author meant.
#include "warnings.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <map>
#include <optional>

#include "value_order.h"

namespace check {

namespace {

std::string quoted(const std::string &s) { return "'" + s + "'"; }
std::string on_line(int line) { return "line " + std::to_string(line); }

// The data type of an attribute or element stanza, and its name as given.
std::string type_text(const stanza &s) {
    const statement *dt = s.first("DataType");
    return dt ? dt->value : "";
}
zu_data_type_t type_of(const stanza &s) { return lang::data_type_named(type_text(s)); }

bool all_digits(const std::string &s) {
    return !s.empty() &&
           std::all_of(s.begin(), s.end(), [](char c) { return std::isdigit(static_cast<unsigned char>(c)); });
}

void locator(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const auto &cls : m.classes()) {
        std::vector<std::string> names;
        std::map<std::string, std::string> other_kinds;
        for (const stanza *s : cls)
            if (const statement *n = s->first("Name"); n && s->is_attribute()) {
                if (s->is("PersistentResourceAttribute"))
                    names.push_back(n->value);
                else
                    other_kinds.emplace(n->value, s->type->name);
            }
        for (const stanza *s : cls) {
            const statement *loc = s->is("ResourceClass") ? s->first("Locator") : nullptr;
            if (!loc || std::find(names.begin(), names.end(), loc->value) != names.end())
                continue;
            std::string why = other_kinds.count(loc->value)
                                  ? " is a " + other_kinds[loc->value] + ", not a PersistentResourceAttribute"
                                  : " names no PersistentResourceAttribute of this class";
            std::string hint = nearest(loc->value, names);
            out.push_back({loc->line, "Locator " + quoted(loc->value) + why +
                                          (hint.empty() ? "" : " (did you mean " + quoted(hint) + "?)") +
                                          "; the class is stored without a locator"});
        }
    }
}

// Reports the second of two stanzas of one group with the same key.
template <typename Key>
void report_repeats(const std::vector<std::pair<Key, const statement *>> &keyed, const std::string &what,
                    std::vector<diagnostic> &out) {
    std::map<Key, const statement *> first;
    for (const auto &[key, st] : keyed)
        if (auto [it, fresh] = first.emplace(key, st); !fresh)
            out.push_back(
                {st->line, what + " " + quoted(st->value) + " is already given on " + on_line(it->second->line)});
}

// The groups of stanzas of a class whose members must differ: each attribute
// and action kind by Id; resource attributes, class attributes and each action
// kind by Name.
const std::vector<std::vector<const char *>> id_groups = {
    {"PersistentResourceAttribute"}, {"PersistentClassAttribute"}, {"DynamicResourceAttribute"},
    {"DynamicClassAttribute"},       {"ResourceAction"},           {"ClassAction"}};
const std::vector<std::vector<const char *>> name_groups = {{"PersistentResourceAttribute", "DynamicResourceAttribute"},
                                                            {"PersistentClassAttribute", "DynamicClassAttribute"},
                                                            {"ResourceAction"},
                                                            {"ClassAction"}};

bool in_group(const stanza &s, const std::vector<const char *> &group) {
    return std::any_of(group.begin(), group.end(), [&](const char *t) { return s.is(t); });
}

void duplicate_id(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const auto &cls : m.classes())
        for (const auto &group : id_groups) {
            std::vector<std::pair<long, const statement *>> ids;
            for (const stanza *s : cls)
                if (const statement *id = s->first("Id"); id && in_group(*s, group))
                    ids.emplace_back(long(uint32_t(std::strtol(id->value.c_str(), nullptr, 0))), id);
            report_repeats(ids, std::string(group[0]) + " Id", out);
        }
}

void duplicate_name(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const auto &cls : m.classes())
        for (const auto &group : name_groups) {
            std::vector<std::pair<std::string, const statement *>> names;
            for (const stanza *s : cls)
                if (const statement *n = s->first("Name"); n && in_group(*s, group))
                    names.emplace_back(n->value, n);
            report_repeats(names, "name", out);
        }
    // The elements of one structured-data definition: a run of one type.
    std::vector<std::pair<std::string, const statement *>> elements;
    const lang::stanza_type *run = nullptr;
    for (const stanza &s : m.stanzas) {
        if (s.type != run) {
            report_repeats(elements, "element name", out);
            elements.clear();
        }
        run = s.type && s.type->structured_data ? s.type : nullptr;
        if (const statement *n = s.first("ElementName"); n && run)
            elements.emplace_back(n->value, n);
    }
    report_repeats(elements, "element name", out);
}

void variable_class(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    std::vector<std::string> defined;
    for (const stanza &s : m.stanzas)
        if (const statement *v = s.first("VariableClass"); v && s.is("ResourceVariableClass"))
            defined.push_back(v->value);
    for (const stanza &s : m.stanzas) {
        const statement *v = s.is_dynamic() ? s.first("VariableClass") : nullptr;
        if (!v || std::find(defined.begin(), defined.end(), v->value) != defined.end())
            continue;
        std::string hint = nearest(v->value, defined);
        out.push_back({v->line, "VariableClass " + quoted(v->value) + " is defined by no ResourceVariableClass stanza" +
                                    (hint.empty() ? "" : " (did you mean " + quoted(hint) + "?)")});
    }
}

// The low,high ranges of a stanza's valid-value or range statements.
std::vector<value_range> ranges_of(const stanza &s, const char *keyword, zu_data_type_t type) {
    std::vector<value_range> v;
    for (const statement *st : s.given(keyword))
        if (std::optional<value_range> r = parse_range(type, st->value, !std::strcmp(keyword, "Range")))
            v.push_back(*r);
    return v;
}

// The values an attribute starts with: its DefaultValue or InitialValue
// statements, or the 0 that completion fills in.
std::vector<std::pair<number, int>> start_values(const stanza &s, const char *keyword, zu_data_type_t type) {
    std::vector<std::pair<number, int>> v;
    for (const statement *st : s.given(keyword))
        if (std::optional<number> n = parse_number(type, st->value))
            v.emplace_back(*n, st->line);
    if (v.empty() && s.given(keyword).empty())
        v.emplace_back(*parse_number(type, "0"), 0);
    return v;
}

void check_start_values(const stanza &s, const char *keyword, const char *limits,
                        const std::vector<value_range> &ranges, zu_data_type_t type, std::vector<diagnostic> &out) {
    if (ranges.empty())
        return;
    for (const auto &[n, line] : start_values(s, keyword, type)) {
        if (n.unordered() ||
            std::any_of(ranges.begin(), ranges.end(), [&n = n](const value_range &r) { return r.holds(n); }))
            continue;
        std::string what =
            line ? keyword + std::string(" ") + n.text() : "the default " + n.text() + " (no " + keyword + ")";
        out.push_back({line ? line : s.line, what + " lies outside the " + limits + " of " + s.type->name + " " +
                                                 quoted(s.first("Name") ? s.first("Name")->value : "")});
    }
}

void default_range(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const stanza &s : m.stanzas) {
        zu_data_type_t type = lang::element_type_of(type_of(s));
        if (!s.is_attribute() || !is_numeric(type))
            continue;
        if (!s.is_dynamic()) {
            check_start_values(s, "DefaultValue", "ValidValue ranges", ranges_of(s, "ValidValue", type), type, out);
            continue;
        }
        check_start_values(s, "InitialValue", "ValidStateValue ranges", ranges_of(s, "ValidStateValue", type), type,
                           out);
        check_start_values(s, "InitialValue", "Range", ranges_of(s, "Range", type), type, out);
    }
}

bool plain_number(const std::string &text, long long lo, long long hi) {
    char *end = nullptr;
    errno = 0;
    long long v = std::strtoll(text.c_str(), &end, 0);
    return end != text.c_str() && *end == '\0' && errno == 0 && v >= lo && v <= hi;
}

void file_version(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const stanza &s : m.stanzas)
        for (const statement *v : s.given("FileVersion")) {
            std::string parts = v->value + ".";
            size_t count = 0;
            bool plain = true;
            for (size_t a = 0, b; (b = parts.find('.', a)) != std::string::npos; a = b + 1, count++) {
                std::string part = parts.substr(a, b - a);
                plain = plain && all_digits(part) && part.size() <= 3 && std::stoi(part) <= 255;
            }
            if (!plain || count > 4)
                out.push_back({v->line, "FileVersion " + quoted(v->value) +
                                            " is not up to four dot-separated numbers of 0 to 255; it is stored as " +
                                            version_text(v->value)});
        }
}

void unnamed_class(const source_model &m, const warning_context &ctx, std::vector<diagnostic> &out) {
    std::string name = ctx.output_name.substr(0, ctx.output_name.find(".cdef"));
    for (const auto &cls : m.classes())
        if (std::none_of(cls.begin(), cls.end(),
                         [](const stanza *s) { return s->is("ResourceClass") && s->first("Name"); }))
            out.push_back({cls.front()->line, "the class has no Name statement and is named after the output file (" +
                                                  quoted(name) + " for output " + quoted(ctx.output_name) + ")"});
}

// Numbers of statements, read like strtol with base 0 and truncated.
void number_text(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const stanza &s : m.stanzas)
        for (const statement &st : s.statements) {
            if (!st.row || st.skipped)
                continue;
            bool fits = true;
            switch (st.row->kind) {
            case lang::value_kind::integer:
            case lang::value_kind::display_name: fits = plain_number(st.value, 0, 65535); break;
            case lang::value_kind::identifier: fits = plain_number(st.value, INT32_MIN, UINT32_MAX); break;
            case lang::value_kind::variety: {
                size_t comma = st.value.find(',');
                fits = comma == std::string::npos || (plain_number(st.value.substr(0, comma), INT32_MIN, UINT32_MAX) &&
                                                      plain_number(st.value.substr(comma + 1), INT32_MIN, UINT32_MAX));
                break;
            }
            default: continue;
            }
            if (!fits)
                out.push_back({st.line, st.keyword + "=" + st.value +
                                            " is not a number that fits its field; it is stored as " +
                                            stored_number(st.row->kind, st.value)});
        }
}

void permission(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    std::string letters = lang::permission_letters();
    for (const stanza &s : m.stanzas)
        for (const statement *p : s.given("Permission")) {
            if (p->value.size() == 1 && letters.find(p->value[0]) != std::string::npos)
                continue;
            bool known = letters.find(p->value[0]) != std::string::npos;
            out.push_back({p->line, "Permission " + quoted(p->value) +
                                        (known ? ": only the first letter counts"
                                               : ": the first letter is no permission letter (" + letters +
                                                     ") and is ignored; the action gets the default 's'")});
        }
}

void element_type(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const stanza &s : m.stanzas) {
        const statement *dt = s.type && s.type->structured_data ? s.first("DataType") : nullptr;
        if (dt && lang::data_type_named(dt->value) == ZU_UNKNOWN) {
            std::string hint = nearest(dt->value, lang::data_type_names());
            out.push_back({dt->line, "DataType " + quoted(dt->value) +
                                         " names no data type; the element is stored with the type UNKNOWN" +
                                         (hint.empty() ? "" : " (did you mean " + quoted(hint) + "?)")});
        }
    }
}

void ignored_range(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const stanza &s : m.stanzas) {
        const statement *r = s.is_dynamic() ? s.first("Range") : nullptr;
        zu_data_type_t t = lang::element_type_of(type_of(s));
        if (r && !is_numeric(t) && t != ZU_NONE)
            out.push_back({r->line, "Range is ignored for the data type " + type_text(s)});
    }
}

void reversed_range(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const stanza &s : m.stanzas)
        for (const statement &st : s.statements) {
            if (!st.row || st.skipped)
                continue;
            std::optional<value_range> r;
            if (st.row->kind == lang::value_kind::variety)
                r = parse_range(ZU_INT64, st.value, true);
            else if (st.row->kind == lang::value_kind::valid_value || st.row->kind == lang::value_kind::range)
                r = parse_range(lang::element_type_of(type_of(s)), st.value, true);
            if (r && r->reversed())
                out.push_back({st.line, st.keyword + "=" + st.value + " has its low end above its high end"});
        }
}

void repeated_default(const source_model &m, const warning_context &, std::vector<diagnostic> &out) {
    for (const stanza &s : m.stanzas) {
        std::vector<const statement *> d = s.given("DefaultValue");
        if (s.is_attribute() && d.size() > 1 && !lang::is_array(type_of(s)))
            out.push_back({d[1]->line, "a second DefaultValue for the scalar type " + type_text(s) +
                                           ": only the last one (line " + std::to_string(d.back()->line) +
                                           ") is kept"});
    }
}

} // namespace

const std::vector<warning_check> &warning_checks() {
    static const std::vector<warning_check> checks = {
        {"locator", "a Locator that names no PersistentResourceAttribute of its class", locator},
        {"duplicate-id", "two attributes or actions of one kind in a class with the same Id", duplicate_id},
        {"duplicate-name", "two attributes, actions or elements of one definition with the same name", duplicate_name},
        {"variable-class", "a VariableClass that no ResourceVariableClass defines", variable_class},
        {"default-range", "a default or initial value outside the valid values or the range", default_range},
        {"file-version", "a FileVersion that is not up to four numbers of 0 to 255", file_version},
        {"unnamed-class", "a class without Name, named after the output file", unnamed_class},
        {"number-text", "a number statement that is no plain number or does not fit its field", number_text},
        {"permission", "a Permission whose letter is ignored", permission},
        {"element-type", "a structured-data element DataType that names no data type", element_type},
        {"ignored-range", "a Range for a data type that has none", ignored_range},
        {"reversed-range", "a low,high pair whose low end is above its high end", reversed_range},
        {"repeated-default", "several DefaultValue statements for a scalar type", repeated_default},
    };
    return checks;
}

std::vector<warning_finding> run_warnings(const source_model &m, const warning_context &ctx,
                                          const std::vector<bool> &enabled) {
    std::vector<warning_finding> found;
    const std::vector<warning_check> &checks = warning_checks();
    for (size_t i = 0; i < checks.size(); i++) {
        if (!enabled[i])
            continue;
        std::vector<diagnostic> out;
        checks[i].run(m, ctx, out);
        for (const diagnostic &d : out)
            found.push_back({d, checks[i].name});
    }
    std::stable_sort(found.begin(), found.end(),
                     [](const warning_finding &a, const warning_finding &b) { return a.where.line < b.where.line; });
    return found;
}

} // namespace check
