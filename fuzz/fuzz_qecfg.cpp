// Fuzz harness of the compiler: any bytes as a source, compiled in memory,
// with and without byte-order reversal and at a trace level (chosen by the
// first byte).
#include <cstdint>
#include <cstdio>
#include <string_view>
#include <vector>

#include "qecfg/qecfg.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    if (size == 0)
        return 0;
    static FILE *devnull = std::fopen("/dev/null", "w");
    qecfg::options opt;
    opt.output_name = "out.cdef";
    opt.reverse_byte_order = data[0] & 1;
    opt.trace_level = (data[0] >> 1) & 3;
    opt.trace_out = opt.trace_err = devnull;
    std::vector<uint8_t> image;
    std::string_view text(reinterpret_cast<const char *>(data + 1), size - 1);
    qecfg::compile_to_memory(qecfg::source::bytes("input.src", text), image, opt);
    return 0;
}
