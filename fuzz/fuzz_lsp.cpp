// Fuzz harness of the language server's message loop: any bytes as the
// client's input, after an initialize request so that every request is
// served. Nothing it reads may crash the server, hang it or make it grow
// without bound.
#include <cstdint>
#include <string>

#include "loop.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const std::string init = "{\"jsonrpc\":\"2.0\",\"id\":0,\"method\":\"initialize\",\"params\":{}}";
    std::string input = "Content-Length: " + std::to_string(init.size()) + "\r\n\r\n" + init;
    input.append(reinterpret_cast<const char *>(data), size);
    lsp::memory_input in(std::move(input));
    lsp::serve(
        in, [](const std::string &) {}, size_t(1) << 20);
    return 0;
}
