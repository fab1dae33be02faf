// The language view over the compiler's keyword table. The only place that
// knows how a keyword row encodes its handler, its optional flag and its bit.
#include "lang.h"

#include <cstring>

#include "qecfg.h"
#include "zu_qel.h"

namespace lang {

namespace {

constexpr int STATEMENT_CODE_COUNT = 32;

// What each handler code of the keyword table does with its value.
constexpr value_kind kind_of_code[STATEMENT_CODE_COUNT] = {
    value_kind::integer,       value_kind::integer,       value_kind::identifier,    value_kind::text,
    value_kind::properties,    value_kind::version,       value_kind::perm_template, value_kind::manager,
    value_kind::locator,       value_kind::identifier,    value_kind::variety,       value_kind::properties,
    value_kind::properties,    value_kind::properties,    value_kind::valid_value,   value_kind::default_value,
    value_kind::display_name,  value_kind::data_type,     value_kind::variable_type, value_kind::range,
    value_kind::initial_value, value_kind::element_index, value_kind::element_name,  value_kind::integer,
    value_kind::integer,       value_kind::element_type,  value_kind::valid_value,   value_kind::display_name,
    value_kind::refused,       value_kind::ignored,       value_kind::ignored,       value_kind::permission,
};

struct props_ref {
    const props_t *words;
    int count;
};

props_ref props_of_code(int code) {
    switch (code) {
    case 4: return {rc_props, rc_props_cnt};
    case 11: return {pa_props, pa_props_cnt};
    case 12: return {da_props, da_props_cnt};
    case 13: return {act_props, act_props_cnt};
    default: return {nullptr, 0};
    }
}

// The one reading of a keyword row.
statement_row read_row(const table_attrs &r) {
    props_ref p = props_of_code(r.ta_type);
    bool optional = (r.req_bit & OPTIONAL_BIT) != 0;
    return statement_row{
        r.ta_name, kind_of_code[r.ta_type], optional, r.dup_allowed != 0, r.req_bit & ~OPTIONAL_BIT, p.words, p.count};
}

stanza_type read_stanza(const stanza_def &d) {
    stanza_type s{d.name, {}, false, std::strstr(d.name, "SDDefinition") != nullptr};
    unsigned required = 0;
    for (int i = 0; i < d.num_attrs; i++) {
        s.rows.push_back(read_row(d.attrs[i]));
        if (!s.rows.back().optional)
            required |= s.rows.back().bit;
    }
    s.optional_accepted = required == d.req_mask_cmplt;
    return s;
}

} // namespace

const std::vector<stanza_type> &stanza_types() {
    static const std::vector<stanza_type> all = [] {
        std::vector<stanza_type> v;
        for (const stanza_def &d : stanza_defs)
            v.push_back(read_stanza(d));
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

bool is_array(zu_data_type_t type) { return is_zu_array(type) != 0; }

uint32_t version_number(const std::string &text) {
    uint32_t n = 0;
    ver_str_convert(text.c_str(), &n);
    return n;
}

zu_data_type_t element_type_of(zu_data_type_t type) { return scalar_zu(type); }

bool value_converts(zu_data_type_t type, const std::string &text, zu_value_t *number) {
    // A conversion needs a compile only for the storage of text copies.
    qecfg_compiler c{qecfg_options{}};
    zu_value_t v{};
    if (c.str_to_zu(&v, type, text.c_str()) != 0)
        return false;
    if (number)
        *number = v;
    return true;
}

} // namespace lang
