// The checker's view of the compiler's positioned source model: the stanzas
// and statements that the compiler's reader yields, with the stanza type and
// keyword row each one matched, kept as views into the source text, which
// must outlive it. A statement is 24 bytes, so that the model of a large
// source stays smaller than the source's compile.
#ifndef QECFG_CHECK_SOURCE_MODEL_H
#define QECFG_CHECK_SOURCE_MODEL_H

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "lang.h"
#include "qecfg_language.h"

namespace check {

struct statement {
    const char *at = nullptr;                 // the keyword's first character in the source text
    const lang::statement_row *row = nullptr; // null when the stanza has no such statement
    int line : 31 = 0;                        // at most 2^30 - 1: a longer source would be gigabytes of blank lines
    bool skipped : 1 = false;                 // the value is exactly "": the compiler ignores the statement
    // Lengths and offsets from `at`, within one piece of at most 254 characters.
    std::uint8_t keyword_length = 0, value_offset = 0, value_length = 0;
    std::uint8_t end_offset = 0; // where the statement's text ends, its comment cut off

    std::string_view keyword() const { return {at, keyword_length}; }
    std::string_view value() const { return {at + value_offset, value_length}; } // without its quotes
    std::string text() const { return std::string(value()); }
    bool has_equals() const { return end_offset > keyword_length; }
};
static_assert(sizeof(statement) == 24, "a statement of the model stays compact");

// The stanza type a header names, as the compiler's keyword table orders them.
constexpr int NO_STANZA_TYPE = -1;

struct stanza {
    int line = 0;
    int kind = NO_STANZA_TYPE;               // a ::stanza_type, or NO_STANZA_TYPE
    const lang::stanza_type *type = nullptr; // null for a header that names no stanza type
    std::string_view header;
    std::span<const statement> statements;
    zu_data_type_t data_type = ZU_UNKNOWN; // what its first DataType names; ZU_UNKNOWN for none

    bool is(int stanza_kind) const { return kind == stanza_kind; }
    bool is_attribute() const { return kind >= ST_PERSISTENT_RESOURCE_ATTRIBUTE && kind <= ST_DYNAMIC_CLASS_ATTRIBUTE; }
    bool is_dynamic() const { return is(ST_DYNAMIC_RESOURCE_ATTRIBUTE) || is(ST_DYNAMIC_CLASS_ATTRIBUTE); }
    bool is_persistent() const { return is(ST_PERSISTENT_RESOURCE_ATTRIBUTE) || is(ST_PERSISTENT_CLASS_ATTRIBUTE); }
    bool is_action() const { return is(ST_CLASS_ACTION) || is(ST_RESOURCE_ACTION); }
    bool is_element() const { return type && type->structured_data; }
    // The statements of a keyword that the compiler takes, in order.
    std::vector<const statement *> given(std::string_view keyword) const;
    const statement *first(std::string_view keyword) const;
    const statement *last(std::string_view keyword) const;
    // The value of the first statement of a keyword, or empty.
    std::string value_of(std::string_view keyword) const;
};

struct source_model {
    std::vector<stanza> stanzas;
    std::vector<statement> statements; // of all stanzas, in source order
    int last_line = 0;

    // The stanza that a line belongs to: the last header at or before it.
    const stanza *stanza_at(int line) const;
    // The statement on a line, or null.
    const statement *statement_at(int line) const;
    // The stanzas of each class: from a ControlDefinition to the next one.
    std::vector<std::vector<const stanza *>> classes() const;
};

// Reads `text` with the compiler's reader; the model refers to the text,
// which must outlive it. Statements before the first header belong to no
// stanza and are left out; reading ends where the compiler's does (a NUL).
source_model read_model(std::string_view text);

} // namespace check

#endif
