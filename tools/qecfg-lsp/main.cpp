// qecfg-lsp: the language server of class definition sources, on standard
// input and output.
#include <csignal>
#include <cstdio>
#include <cstring>
#include <unistd.h>

#include "loop.h"

int main(int argc, char **argv) {
    for (int i = 1; i < argc; i++) {
        if (std::strcmp(argv[i], "--version") == 0) {
            std::puts("qecfg-lsp " QECFG_VERSION);
            return 0;
        }
        // Clients commonly pass --stdio; it is the only transport.
        if (std::strcmp(argv[i], "--stdio") != 0) {
            std::fprintf(stderr, "usage: qecfg-lsp [--stdio] [--version]\n");
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
