// Test drivers of the server.
#include "lsp_support.h"

#include <algorithm>
#include <chrono>
#include <csignal>
#include <fcntl.h>
#include <fstream>
#include <poll.h>
#include <sstream>
#include <stdexcept>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

session::session(json init_options) {
    request("initialize", {{"capabilities", json::object()}, {"initializationOptions", init_options}});
    notify("initialized", json::object());
}

std::vector<json> session::handle(const json &msg) {
    std::vector<json> out = s_.handle(msg);
    for (const json &m : out)
        if (!m.contains("id"))
            notifications_.push_back(m);
    return out;
}

json session::request(const std::string &method, json params) {
    int id = next_id_++;
    for (const json &m : handle({{"jsonrpc", "2.0"}, {"id", id}, {"method", method}, {"params", params}}))
        if (m.contains("id") && m["id"] == id)
            return m;
    throw std::runtime_error("no response to " + method);
}

void session::notify(const std::string &method, json params) {
    handle({{"jsonrpc", "2.0"}, {"method", method}, {"params", params}});
}

json session::last_diagnostics(const std::string &uri) const {
    for (auto it = notifications_.rbegin(); it != notifications_.rend(); ++it)
        if ((*it)["method"] == "textDocument/publishDiagnostics" && (*it)["params"]["uri"] == uri)
            return (*it)["params"]["diagnostics"];
    return nullptr;
}

json session::open(const std::string &uri, const std::string &text) {
    notify("textDocument/didOpen",
           {{"textDocument", {{"uri", uri}, {"languageId", "qecfg"}, {"version", version_++}, {"text", text}}}});
    return last_diagnostics(uri);
}

json session::change(const std::string &uri, json changes) {
    notify("textDocument/didChange",
           {{"textDocument", {{"uri", uri}, {"version", version_++}}}, {"contentChanges", changes}});
    return last_diagnostics(uri);
}

json session::at(const std::string &method, const std::string &uri, int line, int character, json extra) {
    extra["textDocument"] = {{"uri", uri}};
    extra["position"] = {{"line", line}, {"character", character}};
    return request(method, extra);
}

std::string slurp(const std::string &path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    return s.str();
}

namespace {

size_t offset_in(const std::string &text, const json &pos) {
    size_t off = 0;
    for (int line = pos["line"].get<int>(); line > 0 && off < text.size(); off++)
        line -= text[off] == '\n';
    return std::min(off + pos["character"].get<size_t>(), text.size());
}

} // namespace

std::string apply_edits(const std::string &text, const json &edits) {
    // Later edits first, so that earlier offsets stay valid.
    std::vector<std::pair<size_t, size_t>> spans;
    std::string out = text;
    std::vector<json> sorted(edits.begin(), edits.end());
    std::sort(sorted.begin(), sorted.end(), [&](const json &a, const json &b) {
        return offset_in(text, a["range"]["start"]) > offset_in(text, b["range"]["start"]);
    });
    for (const json &e : sorted) {
        size_t from = offset_in(text, e["range"]["start"]), to = offset_in(text, e["range"]["end"]);
        out.replace(from, to - from, e["newText"].get<std::string>());
    }
    return out;
}

std::string frame(const std::string &body) {
    return "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

child_server::child_server() {
    int to_child[2], from_child[2];
    if (pipe(to_child) != 0 || pipe(from_child) != 0)
        throw std::runtime_error("pipe");
    pid_ = fork();
    if (pid_ == 0) {
        dup2(to_child[0], 0);
        dup2(from_child[1], 1);
        close(to_child[1]);
        close(from_child[0]);
        execl(QECFG_LSP_BIN, QECFG_LSP_BIN, static_cast<char *>(nullptr));
        _exit(127);
    }
    close(to_child[0]);
    close(from_child[1]);
    in_ = to_child[1];
    out_ = from_child[0];
    signal(SIGPIPE, SIG_IGN);
}

child_server::~child_server() {
    if (in_ >= 0)
        close(in_);
    if (out_ >= 0)
        close(out_);
    if (pid_ > 0 && waitpid(pid_, nullptr, WNOHANG) == 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
}

void child_server::send_raw(const std::string &bytes) {
    for (size_t done = 0; done < bytes.size();) {
        ssize_t n = write(in_, bytes.data() + done, bytes.size() - done);
        if (n <= 0)
            throw std::runtime_error("write to the server failed");
        done += size_t(n);
    }
}

void child_server::send(const json &msg) { send_raw(frame(msg.dump())); }

json child_server::receive(double seconds) {
    auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    for (;;) {
        size_t head = buffer_.find("\r\n\r\n");
        if (head != std::string::npos) {
            size_t len = std::stoul(buffer_.substr(buffer_.find(':') + 1));
            if (buffer_.size() >= head + 4 + len) {
                json msg = json::parse(buffer_.substr(head + 4, len));
                buffer_.erase(0, head + 4 + len);
                return msg;
            }
        }
        auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
        pollfd p{out_, POLLIN, 0};
        if (left.count() <= 0 || poll(&p, 1, int(left.count())) <= 0)
            return nullptr;
        char buf[65536];
        ssize_t n = read(out_, buf, sizeof buf);
        if (n <= 0)
            return nullptr;
        buffer_.append(buf, size_t(n));
    }
}

int child_server::finish(double seconds) {
    close(in_);
    in_ = -1;
    auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    int status = 0;
    rusage usage{};
    while (wait4(pid_, &status, WNOHANG, &usage) == 0) {
        if (std::chrono::steady_clock::now() > deadline)
            return -1;
        usleep(10000);
    }
    pid_ = -1;
    peak_kb_ = usage.ru_maxrss;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}
