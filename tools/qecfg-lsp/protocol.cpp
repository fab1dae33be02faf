// Reading parameters defensively: every member is checked for presence and
// type before use, so bad parameters give INVALID_PARAMS, never a fault.
#include "protocol.h"

#include <climits>

namespace lsp {

namespace {

[[noreturn]] void bad_params(const std::string &why) { throw rpc_error{INVALID_PARAMS, why}; }

int hex_digit(char c) {
    if (c >= '0' && c <= '9')
        return c - '0';
    if ((c | 0x20) >= 'a' && (c | 0x20) <= 'f')
        return (c | 0x20) - 'a' + 10;
    return -1;
}

} // namespace

const json &member(const json &obj, const char *name) {
    if (!obj.is_object())
        bad_params(std::string("an object with '") + name + "' expected");
    auto it = obj.find(name);
    if (it == obj.end())
        bad_params(std::string("'") + name + "' missing");
    return *it;
}

std::string string_member(const json &obj, const char *name) {
    const json &v = member(obj, name);
    if (!v.is_string())
        bad_params(std::string("'") + name + "' must be a string");
    return v.get<std::string>();
}

int int_member(const json &obj, const char *name) {
    const json &v = member(obj, name);
    if (!v.is_number_integer() || v.get<long long>() < INT_MIN || v.get<long long>() > INT_MAX)
        bad_params(std::string("'") + name + "' must be an integer");
    return v.get<int>();
}

position position_member(const json &obj, const char *name) {
    const json &p = member(obj, name);
    position pos{int_member(p, "line"), int_member(p, "character")};
    if (pos.line < 0 || pos.character < 0)
        bad_params(std::string("'") + name + "' must not be negative");
    return pos;
}

byte_span range_member(const document &d, const json &obj, const char *name) {
    const json &r = member(obj, name);
    size_t from = d.offset_of(position_member(r, "start")), to = d.offset_of(position_member(r, "end"));
    if (to < from)
        bad_params(std::string("'") + name + "' ends before it starts");
    return {from, to};
}

json to_json(position p) { return {{"line", p.line}, {"character", p.character}}; }

json range_json(const document &d, byte_span span) {
    return {{"start", to_json(d.position_of(span.from))}, {"end", to_json(d.position_of(span.to))}};
}

json location_json(const document &d, byte_span span) { return {{"uri", d.uri()}, {"range", range_json(d, span)}}; }

std::string serialise(const json &msg) { return msg.dump(-1, ' ', false, json::error_handler_t::replace); }

std::string path_of_uri(const std::string &uri) {
    const std::string scheme = "file://";
    if (uri.rfind(scheme, 0) != 0)
        return uri;
    std::string path;
    for (size_t i = scheme.size(); i < uri.size(); i++) {
        int hi = i + 2 < uri.size() ? hex_digit(uri[i + 1]) : -1;
        int lo = hi >= 0 ? hex_digit(uri[i + 2]) : -1;
        if (uri[i] == '%' && lo >= 0) {
            path += char(hi * 16 + lo);
            i += 2;
        } else {
            path += uri[i];
        }
    }
    return path;
}

} // namespace lsp
