// The checker's findings on a document as protocol diagnostics.
#ifndef QECFG_LSP_DIAGNOSTICS_H
#define QECFG_LSP_DIAGNOSTICS_H

#include "check_source.h"
#include "document.h"
#include "protocol.h"

namespace lsp {

// The span a finding on a compiler line points at: a statement's value when
// the finding quotes it, else its keyword; a header's name; an empty span
// at the start for a finding on the whole file.
byte_span finding_span(const document &d, const check::diagnostic &where);

// A publishDiagnostics notification for the document.
json diagnostics_of(const document &d, const check::check_options &opt);

} // namespace lsp

#endif
