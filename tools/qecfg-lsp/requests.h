// The requests on documents, each a function of the workspace and the
// request's parameters returning its result.
#ifndef QECFG_LSP_REQUESTS_H
#define QECFG_LSP_REQUESTS_H

#include "protocol.h"
#include "workspace.h"

namespace lsp {

json hover(workspace &ws, const json &params);
json completion(workspace &ws, const json &params);
json document_symbols(workspace &ws, const json &params);
json definition(workspace &ws, const json &params);
json references(workspace &ws, const json &params);
json workspace_symbols(workspace &ws, const json &params);
json code_actions(workspace &ws, const json &params);
json formatting(workspace &ws, const json &params);

} // namespace lsp

#endif
