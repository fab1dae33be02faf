// The JSON side of the protocol: error codes, the typed error a handler
// raises, and the reading and writing of positions, ranges and parameters.
#ifndef QECFG_LSP_PROTOCOL_H
#define QECFG_LSP_PROTOCOL_H

#include <nlohmann/json.hpp>
#include <string>

#include "document.h"

namespace lsp {

using json = nlohmann::json;

enum error_code {
    PARSE_ERROR = -32700,
    INVALID_REQUEST = -32600,
    METHOD_NOT_FOUND = -32601,
    INVALID_PARAMS = -32602,
    INTERNAL_ERROR = -32603,
    SERVER_NOT_INITIALIZED = -32002,
    REQUEST_CANCELLED = -32800,
};

// A request that cannot be answered; the dispatcher turns it into the
// error response.
struct rpc_error {
    int code;
    std::string message;
};

// Members of the parameters, or an INVALID_PARAMS error naming what is wrong.
const json &member(const json &obj, const char *name);
std::string string_member(const json &obj, const char *name);
int int_member(const json &obj, const char *name);
position position_member(const json &obj, const char *name);
byte_span range_member(const document &d, const json &obj, const char *name);

json to_json(position p);
json range_json(const document &d, byte_span span);
json location_json(const document &d, byte_span span);

// Serialises with invalid UTF-8 replaced, so that no document text can make
// a response unwritable.
std::string serialise(const json &msg);

// The file path of a file: URI (percent-decoded); other URIs as they are.
std::string path_of_uri(const std::string &uri);

} // namespace lsp

#endif
