// Driving the language server in-process, message by message, and as a
// child process over pipes.
#ifndef LSP_SUPPORT_H
#define LSP_SUPPORT_H

#include <string>
#include <sys/types.h>
#include <vector>

#include "protocol.h"
#include "server.h"

using lsp::json;

// An initialized server and the notifications it sent.
class session {
  public:
    explicit session(json init_options = nullptr);
    json request(const std::string &method, json params);
    void notify(const std::string &method, json params);
    // Opens a document and returns its diagnostics.
    json open(const std::string &uri, const std::string &text);
    json change(const std::string &uri, json changes);
    json last_diagnostics(const std::string &uri) const;
    // Requests about a position of a document.
    json at(const std::string &method, const std::string &uri, int line, int character, json extra = json::object());

  private:
    std::vector<json> handle(const json &msg);
    lsp::server s_;
    int next_id_ = 1;
    int version_ = 1;
    std::vector<json> notifications_;
};

// The text of a file.
std::string slurp(const std::string &path);

// Applies LSP text edits (UTF-16 positions on ASCII text) to a text.
std::string apply_edits(const std::string &text, const json &edits);

// The server binary as a child process.
class child_server {
  public:
    child_server();
    ~child_server();
    void send_raw(const std::string &bytes);
    void send(const json &msg);
    // The next message body, or a null json after `seconds` or at the end.
    json receive(double seconds = 10);
    // Closes its input and returns its exit status (waits at most `seconds`).
    int finish(double seconds = 10);
    // The child's peak resident memory in kB, known after finish().
    long peak_kb() const { return peak_kb_; }

  private:
    pid_t pid_ = -1;
    int in_ = -1, out_ = -1;
    std::string buffer_;
    long peak_kb_ = 0;
};

std::string frame(const std::string &body);

#endif
