// --diff and --compat: the content differences of two CDBs, keyed by names
// (never by position), and which of them break what was stored or called
// with the old file. Layout, timestamp, checksum and byte order are ignored.
#ifndef CDBDUMP_CDB_DIFF_H
#define CDBDUMP_CDB_DIFF_H

#include <string>
#include <vector>

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
};

// The differences in a stable order: the old file's order, additions after.
std::vector<change> diff(const cdb_file &old_file, const cdb_file &new_file);
// Applies the compatibility rules: marks each change breaking or not, with its
// reason; an item that left one list for another of its class becomes one
// change (persistence or scope).
void judge(std::vector<change> &changes);
// One line per change, or with json one document; with compat each change
// carries its verdict.
void write_changes(text_sink &out, const std::vector<change> &changes, bool json, bool compat);

} // namespace cdbdump

#endif
