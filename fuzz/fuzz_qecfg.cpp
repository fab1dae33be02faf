// Fuzz harness of the compiler: any bytes as a source, compiled in-process,
// with and without byte-order reversal (chosen by the first byte).
#include <cstdint>
#include <cstdio>
#include <string>
#include <cerrno>
#include <sys/stat.h>
#include <unistd.h>

#include "qecfg.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const std::string dir = "/tmp/qecfg-fuzz-" + std::to_string(getpid());
    static const bool made = [] { return mkdir(dir.c_str(), 0700) == 0 || errno == EEXIST; }();
    if (!made || size == 0)
        return 0;
    std::string src = dir + "/input.src", out = dir + "/out.cdef";
    FILE *f = std::fopen(src.c_str(), "wb");
    if (!f)
        return 0;
    std::fwrite(data + 1, 1, size - 1, f);
    std::fclose(f);
    static FILE *devnull = std::fopen("/dev/null", "w");
    qecfg_options opt;
    opt.cdefsrc = src;
    opt.cdefname = out;
    opt.swap_endianness = data[0] & 1;
    opt.debugLevel = (data[0] >> 1) & 3;
    opt.trace_out = opt.trace_err = devnull;
    try {
        qecfg_compiler c(opt);
        c.run();
    } catch (const qecfg_fatal &) {
    }
    std::remove(out.c_str());
    return 0;
}
