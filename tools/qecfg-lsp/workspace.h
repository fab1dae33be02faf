// What the server knows between messages: the open documents and the
// settings that switch the checker's warnings.
#ifndef QECFG_LSP_WORKSPACE_H
#define QECFG_LSP_WORKSPACE_H

#include <map>
#include <memory>
#include <string>

#include "check_source.h"
#include "document.h"
#include "protocol.h"

namespace lsp {

struct workspace {
    std::map<std::string, std::unique_ptr<document>> documents; // by URI
    check::check_options check;                                 // output_name empty: from each document's name

    // The open document a request names, or an INVALID_PARAMS error.
    document &named(const json &params);
    // Applies settings: {"warnings": {"NAME": bool, ...}, "outputName": "..."}.
    void configure(const json &settings);
};

} // namespace lsp

#endif
