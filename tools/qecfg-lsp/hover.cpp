// Hover: the reference's text for a stanza, statement, data type, property
// word or permission letter; on a value, how the compiler reads it.
#include <limits>
#include <sstream>

#include "cursor.h"
#include "reference.h"
#include "requests.h"

namespace lsp {

namespace {

template <typename T> std::string limits_text() {
    std::ostringstream o;
    o << +std::numeric_limits<T>::lowest() << " to " << +std::numeric_limits<T>::max();
    return o.str();
}

// The numeric reading of a converted value and the range of its type.
bool numeric_reading(zu_data_type_t type, const zu_value_t &v, std::string &value, std::string &range) {
    std::ostringstream o;
    o.precision(17);
    switch (type) {
    case ZU_INT32: o << v.val_int32, range = limits_text<int32_t>(); break;
    case ZU_UINT32: o << v.val_uint32, range = limits_text<uint32_t>(); break;
    case ZU_INT64: o << v.val_int64, range = limits_text<int64_t>(); break;
    case ZU_UINT64: o << v.val_uint64, range = limits_text<uint64_t>(); break;
    case ZU_FLOAT32: o << v.val_float32, range = limits_text<float>(); break;
    case ZU_FLOAT64: o << v.val_float64, range = limits_text<double>(); break;
    default: return false;
    }
    value = o.str();
    return true;
}

std::string read_as(zu_data_type_t type, const std::string &text) {
    zu_value_t v{};
    std::string type_name = zuTypeStr[type];
    if (!lang::value_converts(type, text, &v))
        return "`" + text + "` is not a value of type " + type_name + "\n";
    std::string value, range;
    if (!numeric_reading(lang::element_type_of(type), v, value, range))
        return "`" + text + "` is read as a value of type " + type_name + "\n";
    return "`" + text + "` is read as " + type_name + " " + value + " (the type holds " + range + ")\n";
}

// The statements of the stanza that bound a default or initial value.
std::string bounds_of(const check::stanza &s) {
    std::string text;
    for (const check::statement &st : s.statements)
        if (!st.skipped &&
            (st.keyword() == "ValidValue" || st.keyword() == "ValidStateValue" || st.keyword() == "Range"))
            text += (text.empty() ? "" : ", ") + std::string(st.keyword()) + "=" + st.text();
    return text.empty() ? "" : "\nIt must lie in " + text + "\n";
}

// How a value of the attribute's (or element's) data type is read.
std::string typed_value(const check::stanza &s, const check::statement &st) {
    const check::statement *type_stmt = s.first(kw::DataType);
    zu_data_type_t type = type_stmt ? lang::data_type_named(type_stmt->text()) : ZU_UNKNOWN;
    if (type == ZU_UNKNOWN)
        return "The stanza gives no known DataType to read the value with.\n";
    bool pair = st.row->kind == lang::value_kind::range || st.row->kind == lang::value_kind::valid_value;
    size_t comma = st.text().find(',');
    zu_data_type_t element = lang::element_type_of(type);
    bool numeric = element >= ZU_INT32 && element <= ZU_FLOAT64;
    if (!pair || comma == std::string::npos || !numeric)
        return read_as(type, st.text());
    return read_as(type, st.text().substr(0, comma)) + "\n" + read_as(type, st.text().substr(comma + 1));
}

std::string value_text(const check::stanza &s, const check::statement &st, const document &d, const cursor &c) {
    using lang::value_kind;
    const lang::stanza_type &type = *s.type;
    byte_span word;
    switch (st.row->kind) {
    case value_kind::data_type:
    case value_kind::element_type: {
        zu_data_type_t t = lang::data_type_named(st.text());
        std::string what = t == ZU_UNKNOWN     ? "names no data type"
                           : lang::is_array(t) ? std::string("is an array of ") + zuTypeStr[lang::element_type_of(t)]
                                               : "is a data type";
        return "`" + st.text() + "` " + what + "\n\n" + data_type_reference();
    }
    case value_kind::variable_type: return variable_type_reference();
    case value_kind::properties: {
        std::string w = word_at(d, c.parts.value, c.offset, word);
        bool known = false;
        for (int i = 0; i < st.row->props_count; i++)
            known = known || w == st.row->props[i].s;
        return "`" + w + "` " + (known ? "is" : "is not") + " a property word of " + type.name + "\n\n" +
               property_reference(type);
    }
    case value_kind::permission: return permission_reference();
    case value_kind::version: {
        uint32_t v = lang::version_number(st.text());
        return "`" + st.text() + "` is read as the version " + std::to_string(v >> 24) + "." +
               std::to_string((v >> 16) & 255) + "." + std::to_string((v >> 8) & 255) + "." + std::to_string(v & 255) +
               "\n\n" + statement_reference(type, st.keyword());
    }
    case value_kind::valid_value:
    case value_kind::range: return typed_value(s, st) + "\n" + statement_reference(type, st.keyword());
    case value_kind::default_value:
    case value_kind::initial_value:
        return typed_value(s, st) + bounds_of(s) + "\n" + statement_reference(type, st.keyword());
    default: return statement_reference(type, st.keyword());
    }
}

std::string hover_text(const document &d, const cursor &c) {
    if (c.parts.header && c.on_keyword)
        return c.stanza && c.stanza->type ? stanza_reference(*c.stanza->type) : "";
    if (!c.statement || !c.statement->row || !c.stanza->type)
        return "";
    if (c.on_keyword)
        return statement_reference(*c.stanza->type, c.statement->keyword());
    return c.on_value ? value_text(*c.stanza, *c.statement, d, c) : "";
}

} // namespace

json hover(workspace &ws, const json &params) {
    document &d = ws.named(params);
    cursor c = cursor_at(d, position_member(params, "position"));
    std::string text = hover_text(d, c);
    if (text.empty())
        return nullptr;
    byte_span span = c.on_keyword ? c.parts.keyword : c.parts.value;
    return {{"contents", {{"kind", "markdown"}, {"value", text}}}, {"range", range_json(d, span)}};
}

} // namespace lsp
