// The text and JSON documents of an image that libcdb's full check accepts,
// written straight from the library's accessors: each class record goes into
// one flat document that is reused from record to record, so that nothing of
// the file is copied into a model and nothing is allocated per record.
#ifndef CDBDUMP_CDB_PRINT_H
#define CDBDUMP_CDB_PRINT_H

#include <cstddef>
#include <cstdint>

#include "cdb_sink.h"
#include "cdb_tree.h"

namespace cdbdump {

// Writes the document of the image and returns true when the library's full
// check accepts it; writes nothing and returns false otherwise.
bool print_checked(const uint8_t *data, size_t size, tree_writer::style style, text_sink &out);

} // namespace cdbdump

#endif
