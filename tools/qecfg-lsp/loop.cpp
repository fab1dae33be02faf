// Messages already waiting are read before the first of them is answered, so
// that a $/cancelRequest for a queued request takes effect.
#include "loop.h"

#include <deque>

#include "protocol.h"
#include "server.h"

namespace lsp {

namespace {

constexpr size_t MAX_QUEUED = 64;

// Reads one message into the queue, or answers what cannot be read; false at
// the end of the input.
bool read_one(message_reader &reader, std::deque<json> &queue, const std::function<void(const std::string &)> &send) {
    std::string body;
    switch (reader.next(body)) {
    case frame_status::end:
    case frame_status::truncated: return false;
    case frame_status::no_length:
        send(serialise(server::error_response(nullptr, PARSE_ERROR, "a header without a valid Content-Length")));
        return true;
    case frame_status::too_large:
        send(serialise(server::error_response(nullptr, INVALID_REQUEST, "message too large")));
        return true;
    case frame_status::message: break;
    }
    if (!within_json_limits(body)) {
        send(serialise(server::error_response(nullptr, INVALID_REQUEST, "message nested too deeply or too long")));
        return true;
    }
    json msg = json::parse(body, nullptr, false);
    if (msg.is_discarded())
        send(serialise(server::error_response(nullptr, PARSE_ERROR, "malformed JSON")));
    else
        queue.push_back(std::move(msg));
    return true;
}

bool is_cancel_of(const json &msg, const json &id) {
    if (!msg.is_object() || msg.value("method", json()) != "$/cancelRequest")
        return false;
    auto params = msg.find("params");
    return params != msg.end() && params->is_object() && params->value("id", json()) == id;
}

bool cancel_waiting(const std::deque<json> &queue, const json &msg) {
    if (!msg.is_object() || !msg.contains("id") || !msg.contains("method"))
        return false;
    for (const json &m : queue)
        if (is_cancel_of(m, msg["id"]))
            return true;
    return false;
}

} // namespace

int serve(byte_input &in, const std::function<void(const std::string &)> &send, size_t max_body) {
    message_reader reader(in, max_body);
    server s;
    std::deque<json> queue;
    bool open = true;
    while (!s.exited()) {
        while (open && (queue.empty() || (queue.size() < MAX_QUEUED && reader.ready())))
            open = read_one(reader, queue, send);
        if (queue.empty())
            break;
        json msg = std::move(queue.front());
        queue.pop_front();
        if (cancel_waiting(queue, msg)) {
            send(serialise(server::cancelled(msg["id"])));
            continue;
        }
        for (const json &out : s.handle(msg))
            send(serialise(out));
    }
    return s.exit_status();
}

} // namespace lsp
