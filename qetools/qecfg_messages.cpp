// The table of messages.
#include "qecfg/messages.h"

#include <iterator>

namespace qecfg {

namespace {

using enum message_id;
constexpr int SYSTEM = 0; // the status is the system's error number
constexpr line_source LINE = line_source::statement;
constexpr line_source NO_LINE = line_source::none;
constexpr const char *COMPILED_IN =
    "The stanza types are data compiled into the compiler, so the table of every kind is "
    "always found.";

constexpr message_row rows[] = {
    {none, "none", "", 0, NO_LINE},
    {cannot_open, "cannot-open", "%s: cannot open because: %s", SYSTEM, NO_LINE},
    {cannot_read, "cannot-read", "%s: cannot read because: %s", SYSTEM, NO_LINE},
    {nul_character, "nul-character", "NUL character in source", 1, LINE},
    {invalid_stanza, "invalid-stanza", "Invalid table name: %s", 1, LINE},
    {statement_before_stanza, "statement-before-stanza", "Attribute found but no table defined yet", 1, LINE},
    {missing_equals, "missing-equals", "Missing '=' after attribute name", 1, LINE},
    {unmatched_quotes, "unmatched-quotes", "Unmatched double quotes for attribute: %s", 1, LINE},
    {value_too_long, "value-too-long", "Attibute value exceeds maximum length: %s", 1, LINE,
     "A line is read in pieces of at most 254 characters, so no value reaches the limit of 1797."},
    {unknown_keyword, "unknown-keyword", "Attribute name not defined in table (name/table): %s%s", 1, LINE},
    {missing_value, "missing-value", "Missing attribute value: %s", 1, LINE},
    {optional_before_required, "optional-before-required",
     "Optional attribute discovered before all required attributes have been defined%s", 1, LINE},
    {duplicate_statement, "duplicate-statement", "Already defined. Duplicated definitions not allowed for %s", 1, LINE},
    {no_strings_table, "no-strings-table", "No tbl for strings table", 1, LINE},
    {no_valid_value_for_display_name, "no-valid-value-for-display-name", "No ValidValue to attach ValueDisplayName to.",
     1, LINE},
    {variety_format, "variety-format", "Incorrect variety format", 1, LINE},
    {too_many_varieties, "too-many-varieties", "Too many varieties", 1, LINE},
    {invalid_data, "invalid-data", "str_to_zu: Invalid data", 1, LINE},
    {value_not_placed, "value-not-placed", "copy_this_type error", 1, LINE},
    {default_for_structured, "default-for-structured",
     "Default values not expected; place default values in individual *SDDef stanzas.", 1, LINE},
    {invalid_data_type, "invalid-data-type", "Invalid data type", 1, LINE},
    {invalid_variable_type, "invalid-variable-type", "Invalid variable type", 1, LINE},
    {range_needs_two_values, "range-needs-two-values", "Range requires two values", 1, LINE},
    {invalid_property, "invalid-property", "%s: invalid property", 1, NO_LINE},
    {element_index_order, "element-index-order", "ElementIndeces must be consecutive", 1, LINE},
    {structured_element_type, "structured-element-type", "SD elements cannot be of SD type", 1, LINE},
    {element_default_refused, "element-default-refused", "Sorry, default SD values are not yet supported", 1, LINE},
    {attribute_sd_without_attribute, "attribute-sd-without-attribute",
     "Incorrect attribute type preceding this SD definition", 1, LINE},
    {no_class_for_sd, "no-class-for-sd", "No class for SD Definition", 1, LINE},
    {no_action_for_sd, "no-action-for-sd", "No action for this SD definition", 1, LINE},
    {one_sd_per_attribute, "one-sd-per-attribute", "Only one SD definition allowed per attribute", 1, LINE},
    {attribute_sd_expected, "attribute-sd-expected", "Expected an attribute SD definition for the preceding attribute",
     1, LINE},
    {one_sd_per_kind, "one-sd-per-kind", "Only one SD definition of this kind allowed", 1, LINE},
    {no_class_for_persistent_attribute, "no-class-for-persistent-attribute", "No class for PersistentAttribute", 1,
     LINE},
    {no_class_for_persistent_class_attribute, "no-class-for-persistent-class-attribute", "No class for pattr", 1, LINE},
    {no_class_for_dynamic_attribute, "no-class-for-dynamic-attribute", "No class for DynamicAttribute", 1, LINE},
    {no_class_for_action, "no-class-for-action", "No class for class action", 1, LINE},
    {incomplete_stanza, "incomplete-stanza", "Previous stanza incomplete", 1, LINE},
    {first_key_above_last, "first-key-above-last", "Error: FirstKey is greater than LastKey.", 1, LINE},
    {second_map, "second-map", "Only one ClassToManagerMapping stanza allowed", 1, NO_LINE},
    {unnamed_class_output, "unnamed-class-output", "Invalid cdef out file name (must end in .cdef)", 1, NO_LINE},
    {default_not_placed, "default-not-placed", "dump_dflt: copy_this_type error", 1, LINE},
    {default_value_not_built, "default-value-not-built", "copy_this_type default value error", 1, LINE},
    {initial_value_not_built, "initial-value-not-built", "copy_this_type default value error (dattr)", 1, LINE},
    {range_low_not_built, "range-low-not-built", "copy_this_type default min range error (dattr)", 1, LINE},
    {range_high_not_built, "range-high-not-built", "copy_this_type default max range error (dattr)", 1, LINE},
    {structured_default_not_built, "structured-default-not-built", "dump_dflt: copy_this_sd_type default error", 1,
     LINE},
    {structured_initial_not_built, "structured-initial-not-built", "dump_dflt: copy_this_sd_type init error", 1, LINE},
    {place_structured, "place-structured", "copy_this_type: this function does not handle SD type", 1, NO_LINE},
    {place_structured_array, "place-structured-array", "copy_this_type: this function does not handle SD ARRAY type", 1,
     NO_LINE},
    {place_sbs, "place-sbs", "ZU_SBS_TYPE not supported", 1, NO_LINE},
    {place_empty_array, "place-empty-array", "Attempt to write NULL array", 1, NO_LINE},
    {place_structured_only, "place-structured-only", "copy_this_sd_type: only SD types allowed", 1, NO_LINE},
    {no_classes, "no-classes", "No classes defined", 1, NO_LINE},
    {no_maps, "no-maps", "No class-to-manager maps defined", 1, NO_LINE},
    {no_manager, "no-manager", "No ResourceManager defined for the class-to-manager map", 1, NO_LINE},
    {out_of_memory, "out-of-memory", "cfg_malloc malloc failure: %s", SYSTEM, NO_LINE},
    {table_malloc, "table-malloc", "%s: alloc_tble malloc failure: %s", SYSTEM, NO_LINE},
    {table_realloc, "table-realloc", "%s: alloc_tble realloc failure: %s", SYSTEM, NO_LINE},
    {image_too_large, "image-too-large", "CDB image exceeds 4 GiB", 1, NO_LINE},
    {too_many_records, "too-many-records", "Too many records in table: %s", 1, NO_LINE},
    {no_class_dsects, "no-class-dsects", "No Rsrc Class Tables found", 1, NO_LINE},
    {no_manager_dsects, "no-manager-dsects", "No Rsrc Manager tables", 1, NO_LINE},
    {no_map_dsects, "no-map-dsects", "No Rsrc CMMAP tables", 1, NO_LINE},
    {no_variable_class_dsects, "no-variable-class-dsects", "No Rsrc Variable Class tables", 1, NO_LINE},
    {cannot_create, "cannot-create", "Cannot create CDB file: %s", 1, NO_LINE},
    {cannot_extend, "cannot-extend", "Cannot extend CDB file: %s", 1, NO_LINE},
    {cannot_map, "cannot-map", "Cannot map CDB file: %s", 1, NO_LINE},
    {cannot_write, "cannot-write", "Cannot write CDB file: %s", 1, NO_LINE},
    {pattr_table_missing, "pattr-table-missing", "PersistentResourceAttribute table not found", 1, LINE, COMPILED_IN},
    {pclass_attr_table_missing, "pclass-attr-table-missing", "PersistentClassAttribute table not found", 1, LINE,
     COMPILED_IN},
    {dattr_table_missing, "dattr-table-missing", "DynamicResourceAttribute table not found", 1, LINE, COMPILED_IN},
    {dclass_attr_table_missing, "dclass-attr-table-missing", "DynamicClassAttribute table not found", 1, LINE,
     COMPILED_IN},
    {class_action_table_missing, "class-action-table-missing", "Class Action table not found", 1, LINE, COMPILED_IN},
    {resource_action_table_missing, "resource-action-table-missing", "Resource Action table not found", 1, LINE,
     COMPILED_IN},
    {no_class_sd_table, "no-class-sd-table", "No Class SD table for SD Definition", 1, LINE,
     "A class creates its structured-data table when it starts, and a structured-data stanza without a class is "
     "refused first (`No class for SD Definition`)."},
};

constexpr bool rows_in_order() {
    for (size_t i = 0; i < std::size(rows); i++)
        if (size_t(rows[i].id) != i)
            return false;
    return true;
}
static_assert(rows_in_order(), "a message row out of the order of message_id");
static_assert(size_t(no_class_sd_table) + 1 == std::size(rows), "a message without its row");

} // namespace

const std::vector<message_row> &messages() {
    static const std::vector<message_row> all(std::begin(rows) + 1, std::end(rows));
    return all;
}

const message_row &message(message_id id) { return rows[size_t(id)]; }

std::string format_message(message_id id, std::uint64_t line, const std::vector<std::string> &subjects, bool newline) {
    const message_row &row = message(id);
    std::string out;
    if (row.line == line_source::statement && line != 0)
        out = std::to_string(line) + ": ";
    size_t next = 0;
    for (const char *p = row.text; *p; p++) {
        if (p[0] == '%' && p[1] == 's') {
            if (next < subjects.size())
                out += subjects[next++];
            p++;
        } else {
            out += *p;
        }
    }
    if (newline)
        out += '\n';
    return out;
}

} // namespace qecfg
