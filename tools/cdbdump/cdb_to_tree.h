// The content of a verified CDB as a document tree (the JSON schema is in
// README.md). Everything that depends on where items are stored (file length,
// checksum, anchor offsets and lengths) is kept under the top-level "layout".
#ifndef CDBDUMP_CDB_TO_TREE_H
#define CDBDUMP_CDB_TO_TREE_H

#include "cdb_model.h"
#include "cdb_tree.h"

namespace cdbdump {

node to_tree(const cdb_file &f);
node value_node(const value &v);

// The same document written while the dsects are read (verify_each): the
// header and layout, then each dsect in anchor order, then the end.
void begin_file(tree_writer &w, const cdb_file &f);
void write_dsect(tree_writer &w, const dsect &d, const anchor &a);
void end_file(tree_writer &w);

} // namespace cdbdump

#endif
