// The checks of values: what a statement's text is stored as, compared with
// what its author most likely meant.
#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <optional>

#include "checks.h"
#include "value_order.h"

namespace check {

namespace {

bool all_of_class(std::string_view s, int (*is)(int)) {
    return !s.empty() && std::all_of(s.begin(), s.end(), [is](char c) { return is(static_cast<unsigned char>(c)); });
}

std::string statement_text(const statement &st) { return std::string(st.keyword()) + "=" + st.text(); }

// The low,high ranges of a stanza's valid-value or range statements.
std::vector<value_range> ranges_of(const stanza &s, const char *keyword, zu_data_type_t type) {
    std::vector<value_range> v;
    for (const statement *st : s.given(keyword))
        if (std::optional<value_range> r = parse_range(type, st->text(), std::string_view(keyword) == kw::Range))
            v.push_back(*r);
    return v;
}

// The values an attribute or element stores: the DefaultValue or
// InitialValue statements (of a scalar type only the last), or the 0 that
// completion fills in (line 0).
std::vector<std::pair<number, int>> stored_values(const stanza &s, const char *keyword) {
    std::vector<const statement *> given = s.given(keyword);
    if (!given.empty() && !lang::is_array(type_of(s)))
        given.erase(given.begin(), given.end() - 1);
    zu_data_type_t type = lang::element_type_of(type_of(s));
    std::vector<std::pair<number, int>> v;
    for (const statement *st : given)
        if (std::optional<number> n = parse_number(type, st->text()))
            v.emplace_back(*n, st->line);
    if (given.empty())
        v.emplace_back(*parse_number(type, "0"), 0);
    return v;
}

// Checks the stored values of `keyword` against the ranges of the
// `limits` statements.
void check_stored_values(const stanza &s, const char *keyword, const char *limits, std::vector<explained> &out) {
    zu_data_type_t type = lang::element_type_of(type_of(s));
    std::vector<value_range> ranges = ranges_of(s, limits, type);
    if (ranges.empty())
        return;
    std::string limit_name = limits + std::string(std::string_view(limits) == kw::Range ? "" : " ranges");
    bool nan_end = std::any_of(ranges.begin(), ranges.end(), [](const value_range &r) { return r.has_nan_end(); });
    for (const auto &[n, line] : stored_values(s, keyword)) {
        if (n.unordered() ||
            std::any_of(ranges.begin(), ranges.end(), [&n = n](const value_range &r) { return r.holds(n); }))
            continue;
        std::string what = line             ? keyword + std::string(" ") + n.text()
                           : s.is_element() ? "the value " + n.text() + " that the element starts with"
                                            : "the default " + n.text() + " (no " + keyword + ")";
        std::string owner = s.is_element() ? kw::ElementName : kw::Name;
        out.push_back({{line ? line : s.line, what + " lies outside the " + limit_name + " of " + s.type->name + " " +
                                                  quoted(s.value_of(owner)) +
                                                  (nan_end ? " (a range with a NaN end holds no value)" : "")},
                       {}});
    }
}

// Whether the Properties of a stanza name the word of a property bit.
bool has_property(const stanza &s, uint32_t mask) {
    const statement *p = s.first(kw::Properties);
    if (!p || !p->row)
        return false;
    std::string list = "," + p->text() + ",";
    for (int i = 0; i < p->row->props_count; i++)
        if (p->row->props[i].p == mask && list.find("," + std::string(p->row->props[i].s) + ",") != std::string::npos)
            return true;
    return false;
}

// A resource attribute required for define always gets its value from the
// define: its default never applies.
bool default_applies(const stanza &attribute) {
    return !attribute.is(ST_PERSISTENT_RESOURCE_ATTRIBUTE) || !has_property(attribute, CDB_PA_REQD_FOR_DEFINE);
}

void check_attribute(const stanza &s, std::vector<explained> &out) {
    if (s.is_persistent()) {
        if (default_applies(s))
            check_stored_values(s, kw::DefaultValue, kw::ValidValue, out);
        return;
    }
    check_stored_values(s, kw::InitialValue, kw::ValidStateValue, out);
    check_stored_values(s, kw::InitialValue, kw::Range, out);
}

} // namespace

// Values that are stored and apply: an attribute's default or initial
// value, and the 0 that each element of an attribute's structured value
// starts with.
void default_range(const check_input &in, std::vector<explained> &out) {
    const stanza *attribute = nullptr;
    for (const stanza &s : in.model.stanzas) {
        if (s.is_attribute())
            attribute = &s;
        else if (!s.is(ST_PATTR_SD) && !s.is(ST_DATTR_SD))
            attribute = nullptr;
        if (!attribute || !zu_is_numeric_type(lang::element_type_of(type_of(s))))
            continue;
        if (&s == attribute)
            check_attribute(s, out);
        else if (default_applies(*attribute))
            check_stored_values(s, kw::DefaultValue, kw::ValidValue, out);
    }
}

namespace {

// Text of one piece at most, so it is converted in place of a copy.
bool plain_number(std::string_view text, long long lo, long long hi) {
    char copy[lang::READ_PIECE + 1];
    text = text.substr(0, lang::READ_PIECE);
    text.copy(copy, text.size());
    copy[text.size()] = '\0';
    char *end = nullptr;
    errno = 0;
    long long v = std::strtoll(copy, &end, 0);
    return end != copy && *end == '\0' && errno == 0 && v >= lo && v <= hi;
}

} // namespace

void file_version(const check_input &in, std::vector<explained> &out) {
    for (const stanza &s : in.model.stanzas)
        for (const statement *v : s.given(kw::FileVersion)) {
            std::string parts = v->text() + ".";
            size_t count = 0;
            bool plain = true;
            for (size_t a = 0, b; (b = parts.find('.', a)) != std::string::npos; a = b + 1, count++) {
                std::string part = parts.substr(a, b - a);
                plain = plain && all_of_class(part, isdigit) && part.size() <= 3 && std::stoi(part) <= 255;
            }
            if (!plain || count > 4)
                out.push_back({{v->line, std::string(kw::FileVersion) + " " + quoted(v->value()) +
                                             " is not up to four dot-separated numbers of 0 to 255; it is stored as " +
                                             version_text(v->text())},
                               {}});
        }
}

// Numbers of statements, read like strtol with base 0 and truncated.
void number_text(const check_input &in, std::vector<explained> &out) {
    for (const stanza &s : in.model.stanzas)
        for (const statement &st : s.statements) {
            if (!st.row || st.skipped)
                continue;
            std::string_view value = st.value();
            bool fits = true;
            switch (st.row->kind) {
            case lang::value_kind::integer:
            case lang::value_kind::display_name: fits = plain_number(value, 0, 65535); break;
            case lang::value_kind::identifier: fits = plain_number(value, INT32_MIN, UINT32_MAX); break;
            case lang::value_kind::variety: {
                size_t comma = value.find(',');
                fits =
                    comma == std::string_view::npos || (plain_number(value.substr(0, comma), INT32_MIN, UINT32_MAX) &&
                                                        plain_number(value.substr(comma + 1), INT32_MIN, UINT32_MAX));
                break;
            }
            default: continue;
            }
            if (!fits)
                out.push_back({{st.line, statement_text(st) + " is not a number that fits its field; it is stored as " +
                                             stored_number(st.row->kind, st.text())},
                               {}});
        }
}

// Only the first letter of a Permission counts; a letter that is none leaves
// the action with no permission at all (not the default of an action
// without Permission).
void permission(const check_input &in, std::vector<explained> &out) {
    std::string letters = lang::permission_letters();
    for (const stanza &s : in.model.stanzas)
        for (const statement *p : s.given(kw::Permission)) {
            if (p->value().size() == 1 && letters.find(p->value()[0]) != std::string::npos)
                continue;
            bool known = letters.find(p->value()[0]) != std::string::npos;
            out.push_back({{p->line, std::string(kw::Permission) + " " + quoted(p->value()) +
                                         (known ? ": only the first letter counts"
                                                : ": the first letter is no permission letter (" + letters +
                                                      ") and is ignored; the action is stored with no permission "
                                                      "letter at all")},
                           {}});
        }
}

void element_type(const check_input &in, std::vector<explained> &out) {
    for (const stanza &s : in.model.stanzas) {
        const statement *dt = s.is_element() ? s.first(kw::DataType) : nullptr;
        if (dt && lang::data_type_named(dt->text()) == ZU_UNKNOWN) {
            std::string hint = nearest(dt->value(), lang::data_type_names());
            out.push_back({{dt->line, std::string(kw::DataType) + " " + quoted(dt->value()) +
                                          " names no data type; the element is stored with the type UNKNOWN" +
                                          (hint.empty() ? "" : " (did you mean " + quoted(hint) + "?)")},
                           {}});
        }
    }
}

void ignored_range(const check_input &in, std::vector<explained> &out) {
    for (const stanza &s : in.model.stanzas) {
        const statement *r = s.is_dynamic() ? s.first(kw::Range) : nullptr;
        zu_data_type_t t = lang::element_type_of(type_of(s));
        if (r && !zu_is_numeric_type(t) && t != ZU_NONE)
            out.push_back(
                {{r->line, std::string(kw::Range) + " is ignored for the data type " + s.value_of(kw::DataType)}, {}});
    }
}

void reversed_range(const check_input &in, std::vector<explained> &out) {
    for (const stanza &s : in.model.stanzas)
        for (const statement &st : s.statements) {
            if (!st.row || st.skipped)
                continue;
            // Both ends written alike convert alike: no conversion can reverse them.
            std::string_view v = st.value();
            size_t comma = v.find(',');
            if (comma == std::string_view::npos || v.substr(0, comma) == v.substr(comma + 1))
                continue;
            std::optional<value_range> r;
            if (st.row->kind == lang::value_kind::variety)
                r = parse_range(ZU_INT64, st.text(), true);
            else if (st.row->kind == lang::value_kind::valid_value || st.row->kind == lang::value_kind::range)
                r = parse_range(lang::element_type_of(type_of(s)), st.text(), true);
            if (r && r->reversed())
                out.push_back({{st.line, statement_text(st) + " has its low end above its high end"}, {}});
        }
}

void repeated_default(const check_input &in, std::vector<explained> &out) {
    for (const stanza &s : in.model.stanzas) {
        if (!s.is_attribute())
            continue;
        std::vector<const statement *> d = s.given(kw::DefaultValue);
        if (d.size() > 1 && !lang::is_array(type_of(s)))
            out.push_back({{d[1]->line, "a second " + std::string(kw::DefaultValue) + " for the scalar type " +
                                            s.value_of(kw::DataType) + ": only the last one (" +
                                            on_line(d.back()->line) + ") is kept"},
                           {}});
    }
}

namespace {

// Text the compiler stores as its characters that reads like hexadecimal
// bytes: an even number of at least eight hex digits, one of them a decimal
// digit, not starting with 0 (a value starting with 0 must be 0x...).
bool looks_hexadecimal(std::string_view v) {
    return v.size() >= 8 && v.size() % 2 == 0 && v[0] != '0' && all_of_class(v, isxdigit) &&
           std::any_of(v.begin(), v.end(), [](char c) { return std::isdigit(static_cast<unsigned char>(c)); });
}

// The texts of a value statement that convert to one binary each: the value,
// or the two ends of a valid-value pair.
std::vector<std::string_view> binary_texts(const statement &st) {
    std::string_view v = st.value();
    size_t comma = v.find(',');
    if (st.row->kind == lang::value_kind::valid_value && comma != std::string_view::npos)
        return {v.substr(0, comma), v.substr(comma + 1)};
    return {v};
}

} // namespace

void binary_text(const check_input &in, std::vector<explained> &out) {
    for (const stanza &s : in.model.stanzas) {
        if (lang::element_type_of(type_of(s)) != ZU_BINARY_PTR)
            continue;
        for (const statement &st : s.statements) {
            bool value =
                st.row && !st.skipped &&
                (st.row->kind == lang::value_kind::default_value || st.row->kind == lang::value_kind::initial_value ||
                 st.row->kind == lang::value_kind::valid_value);
            for (std::string_view text : value ? binary_texts(st) : std::vector<std::string_view>{})
                if (looks_hexadecimal(text))
                    out.push_back(
                        {{st.line, std::string(st.keyword()) + " " + quoted(text) + " is stored as its " +
                                       std::to_string(text.size()) + " characters, not as hexadecimal bytes; write 0x" +
                                       std::string(text) + " for the " + std::to_string(text.size() / 2) + " bytes"},
                         {}});
        }
    }
}

} // namespace check
