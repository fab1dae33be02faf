// The server as a process: lifecycle, errors of the base protocol and of
// JSON-RPC, cancellation, and inputs meant to break it.
#include <gtest/gtest.h>

#include "lsp_support.h"

namespace {

json request(int id, const std::string &method, json params = json::object()) {
    return {{"jsonrpc", "2.0"}, {"id", id}, {"method", method}, {"params", params}};
}

json notification(const std::string &method, json params = json::object()) {
    return {{"jsonrpc", "2.0"}, {"method", method}, {"params", params}};
}

int error_code(const json &msg) { return msg.contains("error") ? msg["error"]["code"].get<int>() : 0; }

void initialize(child_server &s) {
    s.send(request(1, "initialize", {{"capabilities", json::object()}}));
    json r = s.receive();
    ASSERT_TRUE(r.contains("result")) << r;
    s.send(notification("initialized"));
}

json open_params(const std::string &text) {
    return {{"textDocument", {{"uri", "file:///t/a.src"}, {"languageId", "qecfg"}, {"version", 1}, {"text", text}}}};
}

TEST(LspProtocol, ShutdownThenExitEndsWithStatusZero) {
    child_server s;
    initialize(s);
    s.send(request(2, "shutdown", nullptr));
    json r = s.receive();
    EXPECT_EQ(r["id"], 2);
    EXPECT_TRUE(r["result"].is_null());
    // After shutdown every request is refused.
    s.send(request(3, "textDocument/hover", {}));
    EXPECT_EQ(error_code(s.receive()), -32600);
    s.send(notification("exit"));
    EXPECT_EQ(s.finish(), 0);
}

TEST(LspProtocol, ExitWithoutShutdownOrEndOfInputEndsWithStatusOne) {
    child_server a;
    initialize(a);
    a.send(notification("exit"));
    EXPECT_EQ(a.finish(), 1);
    child_server b;
    initialize(b);
    EXPECT_EQ(b.finish(), 1);
}

TEST(LspProtocol, RequestsBeforeInitializeAndUnknownMethods) {
    child_server s;
    s.send(request(1, "textDocument/hover", {}));
    EXPECT_EQ(error_code(s.receive()), -32002);
    initialize(s);
    s.send(request(2, "initialize", {{"capabilities", json::object()}}));
    EXPECT_EQ(error_code(s.receive()), -32600);
    s.send(request(3, "no/such/method"));
    json r = s.receive();
    EXPECT_EQ(r["id"], 3);
    EXPECT_EQ(error_code(r), -32601);
    // An unknown notification gets no answer: the next answer is to id 4.
    s.send(notification("no/such/notification"));
    s.send(request(4, "shutdown"));
    EXPECT_EQ(s.receive()["id"], 4);
}

TEST(LspProtocol, InvalidParamsAreRefusedWithTheirId) {
    child_server s;
    initialize(s);
    const json bad[] = {
        json::array(),
        {{"textDocument", {{"uri", 5}}}, {"position", {{"line", 0}, {"character", 0}}}},
        {{"textDocument", {{"uri", "file:///not/open.src"}}}, {"position", {{"line", 0}, {"character", 0}}}},
        {{"textDocument", {{"uri", "file:///t/a.src"}}}, {"position", {{"line", -1}, {"character", 0}}}},
        {{"textDocument", {{"uri", "file:///t/a.src"}}}, {"position", {{"line", 1e12}, {"character", 0}}}},
        {{"textDocument", {{"uri", "file:///t/a.src"}}}, {"position", "here"}},
    };
    s.send(notification("textDocument/didOpen", open_params("ControlDefinition\n")));
    s.receive(); // its diagnostics
    int id = 10;
    for (const json &params : bad) {
        s.send(request(id, "textDocument/hover", params));
        json r = s.receive();
        EXPECT_EQ(r["id"], id) << params;
        EXPECT_EQ(error_code(r), -32602) << params;
        id++;
    }
    s.send(request(id, "initialize", {{"initializationOptions", {{"warnings", {{"no-such", true}}}}}}));
    EXPECT_EQ(error_code(s.receive()), -32600);
}

TEST(LspProtocol, BrokenFramesAndJsonAreAnsweredAndTheServerGoesOn) {
    child_server s;
    initialize(s);
    s.send_raw(frame("{not json"));
    EXPECT_EQ(error_code(s.receive()), -32700);
    s.send_raw("Content-Type: x\r\n\r\n");
    EXPECT_EQ(error_code(s.receive()), -32700);
    s.send_raw("Content-Length: 12abc\r\n\r\n");
    EXPECT_EQ(error_code(s.receive()), -32700);
    s.send_raw("Content-Length: 99999999999999999999999\r\n\r\n");
    EXPECT_EQ(error_code(s.receive()), -32700);
    // Two lengths: the body is unknown, and the header after it is found again.
    s.send_raw("Content-Length: 2\r\nContent-Length: 3\r\n\r\n{}");
    EXPECT_EQ(error_code(s.receive()), -32700);
    s.send_raw(frame("[1,2]"));
    EXPECT_EQ(error_code(s.receive()), -32600);
    s.send_raw(frame(R"({"jsonrpc":"1.0","id":1,"method":"shutdown"})"));
    EXPECT_EQ(error_code(s.receive()), -32600);
    s.send_raw(frame(R"({"jsonrpc":"2.0","id":{"a":1},"method":"shutdown"})"));
    EXPECT_EQ(error_code(s.receive()), -32600);
    // A header line of a megabyte is read past, not kept.
    s.send_raw(std::string(1 << 20, 'X') + "\r\n\r\n");
    EXPECT_EQ(error_code(s.receive()), -32700);
    s.send(request(7, "shutdown"));
    json r = s.receive();
    EXPECT_EQ(r["id"], 7);
    EXPECT_TRUE(r.contains("result"));
}

TEST(LspProtocol, DeepOrWideJsonIsRefusedWithoutParsing) {
    child_server s;
    initialize(s);
    s.send_raw(frame(std::string(100000, '[') + std::string(100000, ']')));
    EXPECT_EQ(error_code(s.receive()), -32600);
    std::string wide = "[0";
    for (int i = 0; i < 2000000; i++)
        wide += ",0";
    s.send_raw(frame(wide + "]"));
    EXPECT_EQ(error_code(s.receive(30)), -32600);
    s.send(request(2, "shutdown"));
    EXPECT_EQ(s.receive()["id"], 2);
}

TEST(LspProtocol, HugeMessagesAreSkippedInBoundedMemory) {
    child_server s;
    initialize(s);
    // A 100 MB document: above the message limit, skipped with an error.
    std::string open = notification("textDocument/didOpen", open_params("@")).dump();
    size_t at = open.find('@');
    open.replace(at, 1, std::string(100 << 20, 'a'));
    s.send_raw(frame(open));
    open.clear();
    json r = s.receive(60);
    EXPECT_EQ(error_code(r), -32600);
    EXPECT_TRUE(r["id"].is_null());
    s.send(request(2, "shutdown"));
    EXPECT_EQ(s.receive()["id"], 2);
    s.send(notification("exit"));
    EXPECT_EQ(s.finish(), 0);
    EXPECT_LT(s.peak_kb(), 64 * 1024);
}

TEST(LspProtocol, TruncatedMessageEndsTheSession) {
    child_server s;
    initialize(s);
    s.send_raw("Content-Length: 100\r\n\r\n{\"jsonrpc\"");
    EXPECT_EQ(s.finish(), 1);
}

TEST(LspProtocol, BinaryJunkDocumentGetsDiagnostics) {
    child_server s;
    initialize(s);
    // JSON text is UTF-8: junk bytes arrive as the characters U+0000 to U+00FF,
    // NULs and control characters escaped.
    std::string junk;
    for (int i = 0; i < 70000; i++) {
        unsigned char b = (i * 7919) % 256;
        junk += b < 0x80 ? std::string(1, char(b)) : std::string{char(0xC0 | b >> 6), char(0x80 | (b & 0x3F))};
    }
    s.send(notification("textDocument/didOpen", open_params(junk)));
    json r = s.receive();
    ASSERT_EQ(r["method"], "textDocument/publishDiagnostics");
    ASSERT_EQ(r["params"]["diagnostics"].size(), 1u);
    EXPECT_EQ(r["params"]["diagnostics"][0]["severity"], 1);
    for (const char *method : {"textDocument/hover", "textDocument/completion", "textDocument/definition"}) {
        s.send(
            request(5, method,
                    {{"textDocument", {{"uri", "file:///t/a.src"}}}, {"position", {{"line", 3}, {"character", 2}}}}));
        EXPECT_EQ(s.receive()["id"], 5) << method;
    }
    // Bytes that are no UTF-8 make the message unreadable, not the server.
    s.send_raw(frame("{\"jsonrpc\":\"2.0\",\"method\":\"x\",\"params\":\"\xff\xfe\"}"));
    EXPECT_EQ(error_code(s.receive()), -32700);
    s.send(request(6, "textDocument/formatting",
                   {{"textDocument", {{"uri", "file:///t/a.src"}}}, {"options", json::object()}}));
    EXPECT_TRUE(s.receive()["result"].is_array());
}

TEST(LspProtocol, RequestCancelledWhileWaitingIsAnsweredWithoutRunning) {
    child_server s;
    initialize(s);
    s.send(notification("textDocument/didOpen", open_params("ControlDefinition\n")));
    s.receive();
    // Both in one write: the cancellation is read before the hover runs.
    s.send_raw(
        frame(request(9, "textDocument/hover",
                      {{"textDocument", {{"uri", "file:///t/a.src"}}}, {"position", {{"line", 0}, {"character", 1}}}})
                  .dump()) +
        frame(notification("$/cancelRequest", {{"id", 9}}).dump()));
    json r = s.receive();
    EXPECT_EQ(r["id"], 9);
    EXPECT_EQ(error_code(r), -32800);
    // A cancellation of an answered request changes nothing.
    s.send(request(10, "textDocument/hover",
                   {{"textDocument", {{"uri", "file:///t/a.src"}}}, {"position", {{"line", 0}, {"character", 1}}}}));
    EXPECT_TRUE(s.receive().contains("result"));
    s.send(notification("$/cancelRequest", {{"id", 10}}));
    s.send(request(11, "shutdown"));
    EXPECT_EQ(s.receive()["id"], 11);
}

} // namespace
