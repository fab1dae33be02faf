// The language view over the compiler's keyword table. The only place that
// classifies the compiler's statements for the checker and the documents.
#include "lang.h"
#include "qecfg_source.h"

#include <cstring>

#include "qecfg_keywords.h"
#include "qecfg_value.h"
#include "zu_qel.h"

namespace lang {

namespace {

// What each statement of the keyword table does with its value; a text or
// 16-bit number of an element stanza names or describes the element.
value_kind kind_of(statement what, bool element) {
    switch (what) {
    case statement::number16: return value_kind::integer;
    case statement::identifier: return value_kind::identifier;
    case statement::text: return element ? value_kind::element_name : value_kind::text;
    case statement::class_properties:
    case statement::pattr_properties:
    case statement::dattr_properties:
    case statement::action_properties: return value_kind::properties;
    case statement::version: return value_kind::version;
    case statement::permission_template: return value_kind::perm_template;
    case statement::resource_manager: return value_kind::manager;
    case statement::locator: return value_kind::locator;
    case statement::variety_range: return value_kind::variety;
    case statement::valid_value:
    case statement::element_valid_value: return value_kind::valid_value;
    case statement::default_value: return value_kind::default_value;
    case statement::initial_value: return value_kind::initial_value;
    case statement::value_display_name: return value_kind::display_name;
    case statement::data_type: return value_kind::data_type;
    case statement::variable_type: return value_kind::variable_type;
    case statement::range: return value_kind::range;
    case statement::list_action: return value_kind::ignored;
    case statement::permission: return value_kind::permission;
    case statement::element_index: return value_kind::element_index;
    case statement::element_data_type: return value_kind::element_type;
    case statement::element_default_value: return value_kind::refused;
    }
    return value_kind::ignored;
}

struct props_ref {
    const props_t *words;
    int count;
};

props_ref props_of(statement what) {
    switch (what) {
    case statement::class_properties: return {rc_props, rc_props_cnt};
    case statement::pattr_properties: return {pa_props, pa_props_cnt};
    case statement::dattr_properties: return {da_props, da_props_cnt};
    case statement::action_properties: return {act_props, act_props_cnt};
    default: return {nullptr, 0};
    }
}

// The one reading of a keyword row.
statement_row read_row(const keyword_row &r, bool element) {
    props_ref p = props_of(r.what);
    return statement_row{r.name, kind_of(r.what, element), r.optional, r.repeatable, r.bit, p.words, p.count};
}

stanza_type read_stanza(int t) {
    const stanza_def &d = stanza_defs[t];
    bool element = is_sd_stanza(t);
    stanza_type s{d.name, {}, false, element};
    unsigned required = 0;
    for (int i = 0; i < d.num_rows; i++) {
        s.rows.push_back(read_row(d.rows[i], element));
        if (!s.rows.back().optional)
            required |= s.rows.back().bit;
    }
    s.optional_accepted = required == d.required_mask;
    return s;
}

} // namespace

const std::vector<stanza_type> &stanza_types() {
    static const std::vector<stanza_type> all = [] {
        std::vector<stanza_type> v;
        for (int t = 0; t < NUM_STANZA_TYPES; t++)
            v.push_back(read_stanza(t));
        return v;
    }();
    return all;
}

const stanza_type *find_stanza(const std::string &name) {
    for (const stanza_type &s : stanza_types())
        if (s.name == name)
            return &s;
    return nullptr;
}

const statement_row *find_row(const stanza_type &s, const std::string &name) {
    for (const statement_row &r : s.rows)
        if (r.name == name)
            return &r;
    return nullptr;
}

std::vector<std::string> data_type_names() {
    // UNKNOWN names no usable type: the compiler refuses it like any unknown name.
    return std::vector<std::string>(zuTypeStr + 1, zuTypeStr + ZU_NUM_DATA_TYPES);
}

std::vector<std::string> variable_type_names() {
    return std::vector<std::string>(zuVarStr, zuVarStr + QEL_NUM_VARIABLE_TYPES);
}

std::vector<property_table> property_tables() {
    return {{"ResourceClass", rc_props, rc_props_cnt},
            {"PersistentResourceAttribute, PersistentClassAttribute", pa_props, pa_props_cnt},
            {"DynamicResourceAttribute, DynamicClassAttribute", da_props, da_props_cnt},
            {"ClassAction, ResourceAction", act_props, act_props_cnt}};
}

std::string permission_letters() {
    std::string s;
    for (const valid_perms_t &p : perm_list)
        s += p.permission;
    return s;
}

bool strip_line_comment(char *piece) { return strip_comments(piece); }

char *unquote(char *value) { return strip_quotes(value); }

zu_data_type_t data_type_named(const std::string &name) { return strToZuDt(name.c_str()); }

bool is_array(zu_data_type_t type) { return zu_is_array_type(type); }

uint32_t version_number(const std::string &text) {
    uint32_t n = 0;
    ver_str_convert(text.c_str(), &n);
    return n;
}

zu_data_type_t element_type_of(zu_data_type_t type) { return scalar_zu(type); }

bool value_converts(zu_data_type_t type, const std::string &text, zu_value_t *number) {
    table_arena texts; // where text and binary values are copied
    zu_value_t v{};
    if (str_to_zu(texts, &v, type, text.c_str()) != 0)
        return false;
    if (number)
        *number = v;
    return true;
}

} // namespace lang
