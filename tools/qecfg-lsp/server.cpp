// The dispatch follows JSON-RPC 2.0 and the protocol's lifecycle: requests
// before initialize are refused, requests after shutdown are invalid, and
// every failure of a handler becomes an error response.
#include "server.h"

#include "diagnostics.h"
#include "requests.h"

namespace lsp {

namespace {

constexpr int MAX_DEPTH = 64;
constexpr size_t MAX_VALUES = 1 << 20;

using request_handler = json (*)(workspace &, const json &);

struct request_route {
    const char *method;
    request_handler run;
};

const request_route REQUESTS[] = {
    {"textDocument/hover", hover},
    {"textDocument/completion", completion},
    {"textDocument/documentSymbol", document_symbols},
    {"textDocument/definition", definition},
    {"textDocument/references", references},
    {"workspace/symbol", workspace_symbols},
    {"textDocument/codeAction", code_actions},
    {"textDocument/formatting", formatting},
};

bool valid_id(const json &id) { return id.is_number_integer() || id.is_string(); }

json response(const json &id, json result) { return {{"jsonrpc", "2.0"}, {"id", id}, {"result", std::move(result)}}; }

json capabilities() {
    return {{"textDocumentSync", {{"openClose", true}, {"change", 2}}},
            {"hoverProvider", true},
            {"completionProvider", {{"triggerCharacters", {"=", ","}}}},
            {"documentSymbolProvider", true},
            {"definitionProvider", true},
            {"referencesProvider", true},
            {"workspaceSymbolProvider", true},
            {"codeActionProvider", {{"codeActionKinds", {"quickfix"}}}},
            {"documentFormattingProvider", true}};
}

} // namespace

bool within_json_limits(const std::string &body) {
    int depth = 0;
    size_t values = 0;
    bool in_string = false;
    for (size_t i = 0; i < body.size(); i++) {
        char c = body[i];
        if (in_string) {
            if (c == '\\')
                i++;
            else if (c == '"')
                in_string = false;
            continue;
        }
        if (c == '"')
            in_string = true;
        else if (c == '[' || c == '{')
            depth++;
        else if (c == ']' || c == '}')
            depth--;
        if ((c == ',' || c == '[' || c == '{') && ++values > MAX_VALUES)
            return false;
        if (depth > MAX_DEPTH)
            return false;
    }
    return true;
}

json server::error_response(const json &id, int code, const std::string &message) {
    return {{"jsonrpc", "2.0"}, {"id", id}, {"error", {{"code", code}, {"message", message}}}};
}

json server::cancelled(const json &id) { return error_response(id, REQUEST_CANCELLED, "request cancelled"); }

std::vector<json> server::handle(const json &msg) {
    std::vector<json> out;
    if (!msg.is_object() || msg.value("jsonrpc", json()) != "2.0") {
        out.push_back(error_response(nullptr, INVALID_REQUEST, "not a JSON-RPC 2.0 message"));
        return out;
    }
    auto method = msg.find("method");
    auto id = msg.find("id");
    if (method == msg.end()) // a response: the server sends no requests
        return out;
    if (!method->is_string() || (id != msg.end() && !valid_id(*id))) {
        out.push_back(error_response(id != msg.end() && valid_id(*id) ? *id : json(), INVALID_REQUEST,
                                     "method must be a string and id a number or string"));
        return out;
    }
    json params = msg.value("params", json::object());
    std::string name = method->get<std::string>();
    try {
        if (id == msg.end())
            notification(name, params, out);
        else
            out.push_back(response(*id, request(name, params)));
    } catch (const rpc_error &e) {
        if (id != msg.end())
            out.push_back(error_response(*id, e.code, e.message));
    } catch (const json::exception &e) {
        if (id != msg.end())
            out.push_back(error_response(*id, INVALID_PARAMS, e.what()));
    } catch (const std::bad_alloc &) {
        if (id != msg.end())
            out.push_back(error_response(*id, INTERNAL_ERROR, "memory exhausted"));
    }
    return out;
}

json server::request(const std::string &method, const json &params) {
    if (method == "initialize")
        return initialize(params);
    if (state_ == state::starting)
        throw rpc_error{SERVER_NOT_INITIALIZED, "the server is not initialized"};
    if (shut_down_)
        throw rpc_error{INVALID_REQUEST, "the server is shutting down"};
    if (method == "shutdown") {
        shut_down_ = true;
        return nullptr;
    }
    for (const request_route &r : REQUESTS)
        if (method == r.method)
            return r.run(ws_, params);
    throw rpc_error{METHOD_NOT_FOUND, "unknown method " + method};
}

json server::initialize(const json &params) {
    if (state_ != state::starting)
        throw rpc_error{INVALID_REQUEST, "initialize was already received"};
    if (!params.is_object())
        throw rpc_error{INVALID_PARAMS, "initialize takes an object"};
    ws_.configure(params.value("initializationOptions", json()));
    state_ = state::running;
    return {{"capabilities", capabilities()}, {"serverInfo", {{"name", "qecfg-lsp"}}}};
}

void server::notification(const std::string &method, const json &params, std::vector<json> &out) {
    if (method == "exit") {
        state_ = state::exited;
        return;
    }
    // Notifications before initialize and after shutdown are dropped.
    if (state_ != state::running || shut_down_)
        return;
    if (method == "textDocument/didOpen") {
        open(params, out);
    } else if (method == "textDocument/didChange") {
        change(params, out);
    } else if (method == "textDocument/didClose") {
        close(params, out);
    } else if (method == "workspace/didChangeConfiguration") {
        const json &settings = member(params, "settings");
        ws_.configure(settings.is_object() && settings.contains("qecfg") ? settings["qecfg"] : settings);
        for (const auto &[uri, doc] : ws_.documents)
            out.push_back(diagnostics_of(*doc, ws_.check));
    }
}

void server::open(const json &params, std::vector<json> &out) {
    const json &item = member(params, "textDocument");
    std::string uri = string_member(item, "uri");
    auto doc = std::make_unique<document>(uri, string_member(item, "text"), int_member(item, "version"));
    out.push_back(diagnostics_of(*doc, ws_.check));
    ws_.documents[uri] = std::move(doc);
}

// Full and incremental changes, in order; a change with a range replaces
// that range, one without replaces the whole text.
void server::change(const json &params, std::vector<json> &out) {
    document &d = ws_.named(params);
    int version = int_member(member(params, "textDocument"), "version");
    const json &changes = member(params, "contentChanges");
    if (!changes.is_array())
        throw rpc_error{INVALID_PARAMS, "'contentChanges' must be an array"};
    for (const json &c : changes) {
        std::string text = string_member(c, "text");
        if (c.is_object() && c.contains("range"))
            d.replace(range_member(d, c, "range"), text, version);
        else
            d.set_text(std::move(text), version);
    }
    out.push_back(diagnostics_of(d, ws_.check));
}

void server::close(const json &params, std::vector<json> &out) {
    std::string uri = string_member(member(params, "textDocument"), "uri");
    if (ws_.documents.erase(uri))
        out.push_back({{"jsonrpc", "2.0"},
                       {"method", "textDocument/publishDiagnostics"},
                       {"params", {{"uri", uri}, {"diagnostics", json::array()}}}});
}

} // namespace lsp
