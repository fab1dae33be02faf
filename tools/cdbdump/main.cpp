#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>

#include "cdbdump_main.h"

int main(int argc, char **argv) {
    // Past a file size limit a write fails with EFBIG instead of ending the
    // process, so the failure is reported like any other.
    std::signal(SIGXFSZ, SIG_IGN);
    int status = cdbdump_main(argc, argv, stdout, stderr);
    // A stream that was never opened (EBADF) failed at its flush if it was written.
    if (std::fclose(stdout) != 0 && errno != EBADF && status != 2) {
        std::fprintf(stderr, "cdbdump: cannot write the output: %s\n", std::strerror(errno));
        return 2;
    }
    return status;
}
