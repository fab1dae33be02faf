// Every message the compiler can end a compile with, as data: its identity,
// a stable name for tools to key on, the exact text, the exit status and
// where its line comes from. Texts are fixed and kept exactly as they are,
// misspellings included; "%s" marks where a subject (a name, a file, the
// system's error text) is put in.
#ifndef QECFG_MESSAGES_H
#define QECFG_MESSAGES_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace qecfg {

enum class message_id : std::uint16_t {
    none, // no message: the compile succeeded
    // reading the source
    cannot_open,
    cannot_read,
    nul_character,
    invalid_stanza,
    statement_before_stanza,
    missing_equals,
    unmatched_quotes,
    value_too_long,
    unknown_keyword,
    missing_value,
    optional_before_required,
    duplicate_statement,
    // statements
    no_strings_table,
    no_valid_value_for_display_name,
    variety_format,
    too_many_varieties,
    invalid_data,
    value_not_placed,
    default_for_structured,
    invalid_data_type,
    invalid_variable_type,
    range_needs_two_values,
    invalid_property,
    element_index_order,
    structured_element_type,
    element_default_refused,
    // structured-data runs
    attribute_sd_without_attribute,
    no_class_for_sd,
    no_action_for_sd,
    one_sd_per_attribute,
    attribute_sd_expected,
    one_sd_per_kind,
    // stanza completion
    no_class_for_persistent_attribute,
    no_class_for_persistent_class_attribute,
    no_class_for_dynamic_attribute,
    no_class_for_action,
    incomplete_stanza,
    first_key_above_last,
    second_map,
    unnamed_class_output,
    default_not_placed,
    default_value_not_built,
    initial_value_not_built,
    range_low_not_built,
    range_high_not_built,
    structured_default_not_built,
    structured_initial_not_built,
    // value placement
    place_structured,
    place_structured_array,
    place_sbs,
    place_empty_array,
    place_structured_only,
    // the compile sequence
    no_classes,
    no_maps,
    no_manager,
    out_of_memory,
    table_malloc,
    table_realloc,
    // the image
    image_too_large,
    too_many_records,
    no_class_dsects,
    no_manager_dsects,
    no_map_dsects,
    no_variable_class_dsects,
    cannot_create,
    cannot_extend,
    cannot_map,
    cannot_write,
    // texts of the language that this build never raises (message_row::unraised)
    pattr_table_missing,
    pclass_attr_table_missing,
    dattr_table_missing,
    dclass_attr_table_missing,
    class_action_table_missing,
    resource_action_table_missing,
    no_class_sd_table,
};

// Where the line printed before a message comes from.
enum class line_source : std::uint8_t {
    none,      // no line is printed
    statement, // the line being read; after the end of the source, its last line
};

struct message_row {
    message_id id;
    const char *name; // stable, lower case with hyphens
    const char *text; // exact; each "%s" is replaced by the next subject
    int status;       // the exit status; 0: the system's error number
    line_source line;
    // Why this build never raises the message, for a text that the language
    // has but no source can reach here; null for every message it raises.
    const char *unraised = nullptr;
};

// Every row, in the order of message_id, without the row of `none`.
const std::vector<message_row> &messages();
const message_row &message(message_id id);

// The text the command line prints: "LINE: " when the row has a line and it
// is not 0, the text with its subjects, and a newline when asked for.
std::string format_message(message_id id, std::uint64_t line, const std::vector<std::string> &subjects, bool newline);

} // namespace qecfg

#endif
