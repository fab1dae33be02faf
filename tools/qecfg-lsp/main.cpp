// qecfg-lsp: the language server of class definition sources, on standard
// input and output.
#include <csignal>
#include <cstdio>
#include <cstring>
#include <unistd.h>

#include "loop.h"

namespace {

const char USAGE[] = "usage: qecfg-lsp [--stdio] [-h | --help] [--version]\n"
                     "The language server of class definition sources: JSON-RPC with Content-Length\n"
                     "framing on standard input and output, started by an editor's client.\n";

} // namespace

int main(int argc, char **argv) {
    for (int i = 1; i < argc; i++) {
        if (std::strcmp(argv[i], "--version") == 0 || std::strcmp(argv[i], "--help") == 0 ||
            std::strcmp(argv[i], "-h") == 0) {
            std::fputs(argv[i][2] == 'v' ? "qecfg-lsp " QECFG_VERSION "\n" : USAGE, stdout);
            return std::fflush(stdout) == 0 ? 0 : 2;
        }
        // Clients commonly pass --stdio; it is the only transport.
        if (std::strcmp(argv[i], "--stdio") != 0) {
            std::fputs(USAGE, stderr);
            return 2;
        }
    }
    // A client that goes away shows as a failed write, not as a signal.
    std::signal(SIGPIPE, SIG_IGN);
    lsp::fd_input in(STDIN_FILENO);
    bool writing = true;
    return lsp::serve(in,
                      [&](const std::string &body) { writing = writing && lsp::write_message(STDOUT_FILENO, body); });
}
