// A source as its stanzas and statements, read with the compiler's reader
// conventions, for the checker's diagnostics and warnings.
#ifndef QECFG_CHECK_SOURCE_MODEL_H
#define QECFG_CHECK_SOURCE_MODEL_H

#include <string>
#include <vector>

#include "lang.h"

namespace check {

struct statement {
    int line = 0;
    std::string keyword;
    std::string value;                        // without its quotes
    bool skipped = false;                     // the value is exactly "": the compiler ignores the statement
    const lang::statement_row *row = nullptr; // null when the stanza has no such statement
};

struct stanza {
    int line = 0;
    std::string header;
    const lang::stanza_type *type = nullptr; // null for a header that names no stanza type
    std::vector<statement> statements;

    bool is(const char *type_name) const { return type && type->name == type_name; }
    bool is_attribute() const;
    bool is_dynamic() const { return is("DynamicResourceAttribute") || is("DynamicClassAttribute"); }
    bool is_action() const { return is("ClassAction") || is("ResourceAction"); }
    // The statements of a keyword that the compiler takes, in order.
    std::vector<const statement *> given(const std::string &keyword) const;
    const statement *first(const std::string &keyword) const;
};

struct source_model {
    std::vector<stanza> stanzas;
    int last_line = 0;

    // The stanza that a line belongs to: the last header at or before it.
    const stanza *stanza_at(int line) const;
    // The stanzas of each class: from a ControlDefinition to the next one.
    std::vector<std::vector<const stanza *>> classes() const;
};

source_model read_model(const std::string &text);

} // namespace check

#endif
