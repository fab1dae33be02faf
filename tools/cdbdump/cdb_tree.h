// A document tree: the one description of a CDB's content from which both the
// text output and the JSON output are rendered.
#ifndef CDBDUMP_CDB_TREE_H
#define CDBDUMP_CDB_TREE_H

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "cdb_flat.h"
#include "cdb_sink.h"

namespace cdbdump {

class node {
  public:
    enum class kind { null, integer, real, string, token, array, object };

    static node null() { return node(kind::null, ""); }
    static node integer(int64_t v) { return node(kind::integer, std::to_string(v)); }
    static node uinteger(uint64_t v) { return node(kind::integer, std::to_string(v)); }
    // An integer that the text output also shows in hexadecimal.
    static node flags(uint64_t v);
    static node real(std::string text) { return node(kind::real, std::move(text)); }
    static node string(std::string s) { return node(kind::string, std::move(s)); }
    // Text shown as it is in the text output and as a string in JSON.
    static node token(std::string s) { return node(kind::token, std::move(s)); }
    static node array() { return node(kind::array, ""); }
    static node object() { return node(kind::object, ""); }

    node &add(std::string key, node v) {
        members_.emplace_back(std::move(key), std::move(v));
        return *this;
    }
    node &push(node v) {
        items_.push_back(std::move(v));
        return *this;
    }
    node *find(const std::string &key);
    void erase(const std::string &key);

    kind type() const { return kind_; }
    const std::string &text() const { return text_; }
    const std::string &hex_text() const { return hex_; }
    const std::vector<std::pair<std::string, node>> &members() const { return members_; }
    const std::vector<node> &items() const { return items_; }

  private:
    node(kind k, std::string text) : kind_(k), text_(std::move(text)) {}
    kind kind_;
    std::string text_;
    std::string hex_;
    std::vector<std::pair<std::string, node>> members_;
    std::vector<node> items_;
};

// The node as a flat document (keys refer to the node's: it must outlive
// the document).
void to_flat(const node &n, flat_doc &out, std::string_view key = {});

std::string to_json(const node &n);
// An indented "key: value" rendering; short lists and records on one line.
std::string to_text(const node &n);
// JSON on one line, without blanks.
std::string to_json_line(const node &n);

// Writes a document in either rendering while it is built, byte for byte as
// to_json or to_text of the whole tree would: an object given member by
// member, where a member may be an array given item by item, whose items may
// again be objects given member by member. Objects and array items given this
// way must have more than three members, as records do (a whole entry passed
// to member or item may be anything).
class tree_writer {
  public:
    enum class style { json, text };
    tree_writer(style s, text_sink &out) : style_(s), out_(out) {}
    // The document itself, or an item of the open array; or a member of the
    // open object.
    void begin_object();
    void begin_object(std::string_view key);
    // The entry at i of d, under its key; or n under key.
    void member(const flat_doc &d, size_t i);
    void member(std::string_view key, const node &n);
    // Each member of the object at i of d, or of the object n.
    void members(const flat_doc &d, size_t i);
    void members(const node &n);
    // A member holding `count` items, each then given by item or begin_object.
    void begin_array(std::string_view key, size_t count);
    // The entry at i of d as an item of the open array.
    void item(const flat_doc &d, size_t i);
    void item(const node &n);
    // Closes the innermost object or array; closing the document ends it.
    void end();

  private:
    struct frame {
        bool array;
        size_t indent, done;
    };
    void next_member(std::string_view key);
    void open_member(std::string_view key, bool array, bool empty);
    void mark_item_start(size_t indent);
    style style_;
    text_sink &out_;
    std::vector<frame> open_;
    std::string line_;          // the rendering of the current piece
    bool item_opening_ = false; // text: the next line starts an item ("- ")
};

} // namespace cdbdump

#endif
