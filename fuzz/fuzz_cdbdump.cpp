// Fuzz harness of the CDB reader: any bytes as a file, verified, and when
// valid printed in every form; the lenient annotating walk on every input.
#include <cstdint>

#include "cdb_annotate.h"
#include "cdb_source.h"
#include "cdb_text.h"
#include "cdb_to_tree.h"
#include "cdb_tree.h"
#include "cdb_walk.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    using namespace cdbdump;
    annotation a = annotate_walk(data, size);
    (void)annotation_text(data, size, a);
    try {
        cdb_file f = verify(data, size);
        (void)to_json(to_tree(f));
        (void)decompile(f);
    } catch (const cdb_invalid &) {
    }
    return 0;
}
