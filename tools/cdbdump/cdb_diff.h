// --diff and --compat: the content differences of two CDBs, keyed by names
// (never by position), and which of them break what was stored or called
// with the old file. Layout, timestamp, checksum and byte order are ignored.
#ifndef CDBDUMP_CDB_DIFF_H
#define CDBDUMP_CDB_DIFF_H

#include <functional>
#include <string>
#include <vector>

#include "cdb_dsects.h"
#include "cdb_model.h"
#include "cdb_sink.h"
#include "cdb_tree.h"

namespace cdbdump {

struct change {
    enum class kind { added, removed, changed, moved, reordered };
    kind what = kind::changed;
    // Where: the dsect ("class \"A\""), then members, list names and quoted
    // item names, as the text output shows them.
    std::vector<std::string> path;
    node before = node::null(), after = node::null();
    bool breaking = false;
    std::string reason; // why it breaks, or what kind of compatible change it is
    // The path for JSON: a dsect as {"dsect": kind, "name": name}, an item as
    // {"name": name}, each with "occurrence" from the second of one name on;
    // a member's key as a string.
    std::vector<node> parts = {};
    // What was removed or added, when it is not held in before or after:
    // written from the files as the member `key` of the change's document.
    std::function<void(tree_writer &w, std::string_view key)> content = {};
};

// The differences in a stable order: the old file's order, additions after;
// what was removed or added whole is not kept (its before or after is null).
std::vector<change> diff(const dsect_source &old_file, const dsect_source &new_file);
// The same in batches, each of the changes of the header or of one dsect, so
// that only one batch is held at a time; the content of a batch's changes
// can be written only while the batch is handed over.
using change_consumer = std::function<void(std::vector<change> &&batch)>;
void diff_each(const dsect_source &old_file, const dsect_source &new_file, const change_consumer &each);
std::vector<change> diff(const cdb_file &old_file, const cdb_file &new_file);
// The content of a dsect as the diff compares it: its tree without its kind.
node dsect_body(const dsect &d, const anchor &a);
// Applies the compatibility rules: marks each change breaking or not, with its
// reason; an item that left one list for another of its class becomes one
// change (persistence or scope).
void judge(std::vector<change> &changes);
// --diff (or with compat --compat) of the two files: one line per change, or
// with json one document; with compat each change carries its verdict. The
// exit status: 1 when the files differ (compat: when a change breaks).
int report_changes(const dsect_source &old_file, const dsect_source &new_file, bool json, bool compat, text_sink &out);

} // namespace cdbdump

#endif
