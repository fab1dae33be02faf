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
// The records of a class and its dsect's first members.
node pattr_node(const pattr &p);
node dattr_node(const dattr &d);
node action_node(const action &x);
node dsect_head(const anchor &a);        // kind and revision
node class_fields(const class_dsect &c); // everything of a class but its record lists

// Calls each(key, records of a, records of b, render) for the record lists of
// two classes, in document order.
template <typename F> void class_lists(const class_dsect &a, const class_dsect &b, F each) {
    each("persistent_class_attributes", a.pattrs_class, b.pattrs_class, pattr_node);
    each("dynamic_class_attributes", a.dattrs_class, b.dattrs_class, dattr_node);
    each("persistent_resource_attributes", a.pattrs, b.pattrs, pattr_node);
    each("dynamic_resource_attributes", a.dattrs, b.dattrs, dattr_node);
    each("class_actions", a.actions_class, b.actions_class, action_node);
    each("resource_actions", a.actions, b.actions, action_node);
}

// The members of a dsect (without its kind unless with_kind) into the open
// object of w, a class record by record.
void write_dsect_members(tree_writer &w, const dsect &d, const anchor &a, bool with_kind);

// The whole document of a verified image, written while a walk reads the
// dsects again, so that only one record's tree is ever held.
void write_file(const uint8_t *data, size_t size, const cdb_file &head, tree_writer::style style, text_sink &out);

} // namespace cdbdump

#endif
