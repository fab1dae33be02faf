// A compact document: one record's tree laid out flat in two buffers that
// are reused from record to record, so that writing a file's document
// allocates nothing once the buffers have grown to the largest record. The
// text and JSON renderings of cdbdump are made from it.
#ifndef CDBDUMP_CDB_FLAT_H
#define CDBDUMP_CDB_FLAT_H

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace cdbdump {

class flat_doc {
  public:
    enum class kind : uint8_t { null, integer, real, string, token, array, object };
    struct entry {
        kind type;
        bool hex;             // an integer that the text output also shows in hexadecimal
        std::string_view key; // a member's key (not owned: it must outlive the rendering); empty in an array
        uint32_t text_at, text_len;
        uint32_t end;   // the index after this entry's subtree: its next sibling
        uint32_t count; // members or items
        uint64_t bits;  // the value of a hex integer
    };

    void clear() {
        entries_.clear();
        chars_.clear();
        open_.clear();
    }
    // Each adds a member (with a key) or an item (without) to the open
    // object or array, or the document itself when none is open.
    void null(std::string_view key = {}) { add(key, kind::null); }
    void integer(std::string_view key, int64_t v);
    void uinteger(std::string_view key, uint64_t v);
    void flags(std::string_view key, uint64_t v);
    void real(std::string_view key, std::string_view text) { add(key, kind::real, text); }
    void string(std::string_view key, std::string_view s) { add(key, kind::string, s); }
    void token(std::string_view key, std::string_view s) { add(key, kind::token, s); }
    // A token of "0x" and the bytes in hexadecimal.
    void bytes(std::string_view key, const uint8_t *p, size_t n);
    void begin_object(std::string_view key = {}) { open(key, kind::object); }
    void begin_array(std::string_view key = {}) { open(key, kind::array); }
    void end();

    size_t size() const { return entries_.size(); }
    const entry &at(size_t i) const { return entries_[i]; }
    std::string_view text(const entry &e) const { return std::string_view(chars_).substr(e.text_at, e.text_len); }
    bool is_scalar(size_t i) const { return entries_[i].type != kind::array && entries_[i].type != kind::object; }

  private:
    entry &add(std::string_view key, kind k, std::string_view text = {});
    void open(std::string_view key, kind k);
    std::vector<entry> entries_;
    std::string chars_;
    std::vector<uint32_t> open_;
};

// The renderings of the entry at `i` (and its subtree), appended to out.
// JSON indented as to_json writes it, with `indent` the indent of its line.
void render_json(const flat_doc &d, size_t i, size_t indent, std::string &out);
// JSON on one line, without blanks.
void render_json_line(const flat_doc &d, size_t i, std::string &out);
// The text of a member "key: value" (the key is the entry's) or of an array
// item "- value", whose lines are indented by `indent`: on one line when it
// fits, else as a block.
void render_text_member(const flat_doc &d, size_t i, size_t indent, std::string &out);
void render_text_item(const flat_doc &d, size_t i, size_t indent, std::string &out);
// The members or items of the object or array at i, their lines indented by `indent`.
void render_text_block(const flat_doc &d, size_t i, size_t indent, std::string &out);
// A scalar as the text output shows it.
void render_text_scalar(const flat_doc &d, size_t i, std::string &out);

} // namespace cdbdump

#endif
