// The content of a verified CDB as a document tree (the JSON schema is in
// README.md). Everything that depends on where items are stored (file length,
// checksum, anchor offsets and lengths) is kept under the top-level "layout".
#ifndef CDBDUMP_CDB_TO_TREE_H
#define CDBDUMP_CDB_TO_TREE_H

#include "cdb_model.h"
#include "cdb_tree.h"

namespace cdbdump {

node to_tree(const cdb_file &f);
// The parts of that tree: byte order, header and layout; one dsect.
node file_head(const cdb_file &f);
node dsect_node(const dsect &d, const anchor &a);
node value_node(const value &v);

// The whole document of a verified image, written while a walk reads the
// dsects again, so that only one record's tree is ever held.
void write_file(const uint8_t *data, size_t size, const cdb_file &head, tree_writer::style style, text_sink &out);

} // namespace cdbdump

#endif
