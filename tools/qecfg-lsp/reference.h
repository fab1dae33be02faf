// The reference's text for the words of the language, cut from the blocks
// that the reference generator writes into docs/language.md.
#ifndef QECFG_LSP_REFERENCE_H
#define QECFG_LSP_REFERENCE_H

#include <string>
#include <string_view>

#include "lang.h"

namespace lsp {

// The statement table of a stanza type.
std::string stanza_reference(const lang::stanza_type &s);
// The table header and the row of one statement of a stanza type.
std::string statement_reference(const lang::stanza_type &s, std::string_view keyword);
// The table header and the row of the property words of a stanza type.
std::string property_reference(const lang::stanza_type &s);
std::string permission_reference();
std::string data_type_reference();
std::string variable_type_reference();

} // namespace lsp

#endif
