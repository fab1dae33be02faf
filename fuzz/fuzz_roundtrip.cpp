// Round-trip fuzz harness: a source that compiles must give a file that the
// reader accepts, whose decompiled source compiles into the same content, and
// whose reversed-byte-order form holds the same content too.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "cdb_source.h"
#include "cdb_to_tree.h"
#include "cdb_tree.h"
#include "cdb_walk.h"
#include "qecfg/qecfg.h"

namespace {

// Compiles the text; the image, or nothing when the compile stops.
bool compile(const std::string &text, bool swap, std::string &image) {
    static FILE *devnull = std::fopen("/dev/null", "w");
    qecfg::options opt;
    opt.output_name = "out.cdef";
    opt.reverse_byte_order = swap;
    opt.trace_out = opt.trace_err = devnull;
    std::vector<uint8_t> bytes;
    if (!qecfg::compile_to_memory(qecfg::source::bytes("input.src", text), bytes, opt))
        return false;
    image.assign(bytes.begin(), bytes.end());
    return true;
}

cdbdump::cdb_file read(const std::string &image) {
    try {
        return cdbdump::verify(reinterpret_cast<const uint8_t *>(image.data()), image.size());
    } catch (const cdbdump::cdb_invalid &e) {
        std::fprintf(stderr, "the compiler wrote a file the reader refuses: %s\n", e.what());
        std::abort();
    }
}

std::string content(const cdbdump::cdb_file &f, bool with_order) {
    cdbdump::node t = cdbdump::to_tree(f);
    t.erase("layout");
    t.find("header")->erase("timestamp");
    if (!with_order)
        t.erase("byte_order");
    return cdbdump::to_json(t);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    setenv("ZU_CDB_FORCE_EMPTY_TIMESTAMP", "1", 1);
    std::string text(reinterpret_cast<const char *>(data), size), image;
    if (!compile(text, false, image))
        return 0;
    cdbdump::cdb_file original = read(image);
    std::string swapped;
    if (!compile(text, true, swapped) || content(read(swapped), false) != content(original, false)) {
        std::fprintf(stderr, "the reversed file holds other content\n");
        std::abort();
    }
    cdbdump::decompiled d = cdbdump::decompile(original);
    // Only what the decompiler could say in full must come back unchanged;
    // a class named after the output file is, since the output name is kept.
    for (const std::string &w : d.warnings)
        if (w.find("can only come from the output file name") == std::string::npos)
            return 0;
    std::string back;
    if (!compile(d.text, false, back) || content(read(back), true) != content(original, true)) {
        std::fprintf(stderr, "the decompiled source does not give the same content:\n%s\n", d.text.c_str());
        std::abort();
    }
    return 0;
}
