// Fuzz harness of the CDB reader: any bytes as a file, verified, and when
// valid printed in every form, streamed and whole (which must agree), and
// compared with itself; the lenient annotating walk on every input, listed
// whole and in small windows (which must agree).
#include <cstdint>
#include <cstdlib>

#include "cdb_annotate.h"
#include "cdb_diff.h"
#include "cdb_source.h"
#include "cdb_text.h"
#include "cdb_to_tree.h"
#include "cdb_tree.h"
#include "cdb_walk.h"

namespace {
void agree(const std::string &a, const std::string &b) {
    if (a != b)
        std::abort();
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    using namespace cdbdump;
    annotation a = annotate_walk(data, size);
    text_sink listing;
    write_annotation(data, size, listing, 512);
    agree(listing.take(), annotation_text(data, size, a));
    try {
        cdb_file f = verify(data, size);
        text_sink json;
        write_file(data, size, f, tree_writer::style::json, json);
        agree(json.take(), to_json(to_tree(f)));
        (void)decompile(f);
        std::vector<change> changes = diff(f, f);
        judge(changes);
        if (!changes.empty())
            std::abort();
    } catch (const cdb_invalid &) {
    }
    return 0;
}
