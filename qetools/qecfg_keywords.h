// The source language as data: the stanza types, the statements they take,
// and the rules each keyword row carries.
#ifndef QECFG_KEYWORDS_H
#define QECFG_KEYWORDS_H

#include <cstdint>

#include "qecfg/messages.h"
#include "qecfg_language.h"

// The kind of a structured-data stanza: whose input, response or value its
// definition describes.
typedef enum {
    SD_TYPE_ONLINE = 0,
    SD_TYPE_OFFLINE = 1,
    SD_TYPE_DEFINE = 2,
    SD_TYPE_UNDEFINE = 3,
    SD_TYPE_RESET = 4,
    SD_TYPE_ACT_IN = 5,
    SD_TYPE_ACT_RESP = 6,
    SD_TYPE_PATTR = 7,
    SD_TYPE_DATTR = 8,
    SD_TYPE_UNKNOWN = 9, // not a structured-data stanza
} sd_type_t;

// What a statement does with its value.
enum class statement : uint8_t {
    number16,         // a 16-bit number into the row's field
    identifier,       // a 32-bit number into the row's field
    text,             // a string table entry, its offset into the field
    class_properties, // property keywords of each record kind
    pattr_properties,
    dattr_properties,
    action_properties,
    version,               // a dotted version as one 32-bit number
    permission_template,   // the field marked as given; the text is not kept
    resource_manager,      // the name of the map's manager
    locator,               // the class's locator attribute, resolved at completion
    variety_range,         // one low,high pair of the record's variety list
    valid_value,           // one value (or low,high pair) of the valid values
    default_value,         // one value of a persistent attribute's default
    initial_value,         // the initial value of a dynamic attribute
    value_display_name,    // the message id of the valid value given last
    data_type,             // the attribute's data type
    variable_type,         // the dynamic attribute's variable type
    range,                 // the low,high range of a dynamic attribute
    list_action,           // accepted, nothing stored
    permission,            // the action's permission letter
    element_index,         // checked only: indices run from 0 without gaps
    element_data_type,     // the element's data type, never structured
    element_valid_value,   // as valid_value, for the element
    element_default_value, // refused
};

// One keyword of a stanza type.
struct keyword_row {
    const char *name; // compared exactly
    statement what;
    uint16_t field; // offset of the target field in the stanza's record
    uint32_t bit;   // among the required, or among the optional, rows
    bool optional;  // given only after every required row
    bool repeatable;
};

constexpr int MAX_ROWS_PER_STANZA = 25;

struct stanza_def {
    const char *name;
    int num_rows;
    const keyword_row *rows;
    // The required rows a stanza must have had before an optional one.
    uint32_t required_mask;
    sd_type_t sd_kind; // SD_TYPE_UNKNOWN for every other stanza type
};
extern const stanza_def stanza_defs[NUM_STANZA_TYPES];

inline bool is_sd_stanza(int t) { return stanza_defs[t].sd_kind != SD_TYPE_UNKNOWN; }
inline bool is_attr_sd_stanza(int t) {
    return stanza_defs[t].sd_kind == SD_TYPE_PATTR || stanza_defs[t].sd_kind == SD_TYPE_DATTR;
}

// The required and optional rows a stanza has had.
struct given_rows {
    uint32_t required = 0, optional = 0;
    bool has(const keyword_row &r) const { return ((r.optional ? optional : required) & r.bit) == r.bit; }

    // The required-before-optional and duplicate rules: a row of a stanza
    // whose required rows are `required_mask` is counted as given, or its
    // refusal is returned (optional_before_required, duplicate_statement).
    qecfg::message_id admit(const keyword_row &r, uint32_t required_mask) {
        if (r.optional && required != required_mask)
            return qecfg::message_id::optional_before_required;
        if (has(r) && !r.repeatable)
            return qecfg::message_id::duplicate_statement;
        (r.optional ? optional : required) |= r.bit;
        return qecfg::message_id::none;
    }
};

// The row of a stanza type with this keyword.
const keyword_row &row_named(int stanza, const char *name);

#endif
