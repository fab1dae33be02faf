// The named things of a source: classes and their parts, the map and the
// variable classes, with where each is defined and used.
#ifndef QECFG_LSP_SYMBOLS_H
#define QECFG_LSP_SYMBOLS_H

#include <string>
#include <vector>

#include "document.h"
#include "source_model.h"

namespace lsp {

// The names that ResourceVariableClass stanzas define, with their statements.
std::vector<const check::statement *> variable_class_definitions(const check::source_model &m);
// The VariableClass statements of dynamic attributes.
std::vector<const check::statement *> variable_class_uses(const check::source_model &m);

// The stanzas of the class that holds a line, or empty before any class.
std::vector<const check::stanza *> class_holding(const check::source_model &m, int line);
// The Name statements of the class's PersistentResourceAttribute stanzas.
std::vector<const check::statement *> locator_targets(const std::vector<const check::stanza *> &cls);
// The class's Locator statements.
std::vector<const check::statement *> locator_uses(const std::vector<const check::stanza *> &cls);

} // namespace lsp

#endif
