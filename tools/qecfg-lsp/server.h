// One language server session: the lifecycle (initialize, shutdown, exit),
// the dispatch of requests and notifications, and document sync.
#ifndef QECFG_LSP_SERVER_H
#define QECFG_LSP_SERVER_H

#include <string>
#include <vector>

#include "protocol.h"
#include "workspace.h"

namespace lsp {

class server {
  public:
    // The messages to send in answer to one message of the client.
    std::vector<json> handle(const json &msg);
    // The answer to a request cancelled before it ran.
    static json cancelled(const json &id);
    // The answer to a message that could not be read or parsed.
    static json error_response(const json &id, int code, const std::string &message);

    bool exited() const { return state_ == state::exited; }
    // 0 after a shutdown request, 1 when the client exits without one.
    int exit_status() const { return shut_down_ ? 0 : 1; }

  private:
    enum class state { starting, running, exited };

    json request(const std::string &method, const json &params);
    void notification(const std::string &method, const json &params, std::vector<json> &out);
    json initialize(const json &params);
    void open(const json &params, std::vector<json> &out);
    void change(const json &params, std::vector<json> &out);
    void close(const json &params, std::vector<json> &out);

    workspace ws_;
    state state_ = state::starting;
    bool shut_down_ = false;
};

// True when a message's JSON stays within the nesting depth and the number
// of values a protocol message needs, so that parsing it needs bounded memory.
bool within_json_limits(const std::string &body);

} // namespace lsp

#endif
