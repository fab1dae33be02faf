// The source language as the checker and the generated documents see it: the
// stanza types and their statements, read from the compiler's own keyword
// table, with each statement classified by what its value means.
#ifndef QECFG_LANG_H
#define QECFG_LANG_H

#include <cstddef>
#include <string>
#include <vector>

#include "cdb_format.h"

namespace lang {

// What a statement's value is and what the compiler does with it.
enum class value_kind {
    integer,       // a number stored in 8 or 16 bits (message ids, keys, intervals)
    identifier,    // a number stored in 32 bits
    text,          // a string kept in the strings table
    properties,    // a comma list of property words
    version,       // a dotted version number
    perm_template, // a permission template: any non-empty text
    manager,       // the resource manager name
    locator,       // the name of a persistent resource attribute
    variety,       // low,high variety numbers
    valid_value,   // a value or low,high range of the attribute's or element's type
    default_value, // one value (one element for an array type)
    initial_value, // one value (one element for an array type)
    display_name,  // a message id for the last valid value
    data_type,     // a data type name
    element_type,  // a data type name of a structured-data element
    variable_type, // a variable type name
    range,         // low,high of the attribute's type
    element_index, // the position of the element, from 0
    element_name,  // the element's name
    refused,       // accepted by the keyword table, refused when given
    ignored,       // accepted, nothing stored
    permission,    // a permission letter
};

struct statement_row {
    std::string name;
    value_kind kind;
    bool optional;
    bool repeatable;
    unsigned bit;         // the row's bit among the stanza's required or optional ones
    const props_t *props; // the property words of a properties row
    int props_count;
};

struct stanza_type {
    std::string name;
    std::vector<statement_row> rows;
    // False when the required rows can never satisfy the stanza's completion
    // mask, so that every optional statement is refused.
    bool optional_accepted;
    bool structured_data; // an element of a structured-data definition
};

// Every stanza type, in the order of the compiler's keyword table.
const std::vector<stanza_type> &stanza_types();
const stanza_type *find_stanza(const std::string &name);
const statement_row *find_row(const stanza_type &s, const std::string &name);

// Names of the data types and variable types as the source writes them.
std::vector<std::string> data_type_names();
std::vector<std::string> variable_type_names();

// The property word tables by the name of the record they describe, and the
// permission letters.
struct property_table {
    const char *owner; // "class", "persistent attribute", ...
    const props_t *words;
    int count;
};
std::vector<property_table> property_tables();
std::string permission_letters();

// The reader's conventions. A source is read in pieces of at most this many
// characters, each processed as a line.
constexpr size_t READ_PIECE = QECFG_PIECE_MAX;
// Cuts the comment and newline off a piece; false when nothing is left.
bool strip_line_comment(char *piece);
// The value of a statement without its quotes; null for unmatched quotes.
char *unquote(char *value);

// The compiler's conversions of value text. A data type name gives ZU_UNKNOWN
// when it names none. A value converts as the compiler converts it for that
// type (an array type converts one element); `number` receives the numeric
// members only.
zu_data_type_t data_type_named(const std::string &name);
bool is_array(zu_data_type_t type);
uint32_t version_number(const std::string &text);
zu_data_type_t element_type_of(zu_data_type_t type);
bool value_converts(zu_data_type_t type, const std::string &text, zu_value_t *number = nullptr);

} // namespace lang

#endif
