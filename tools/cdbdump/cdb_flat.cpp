#include "cdb_flat.h"

#include <algorithm>
#include <charconv>

#include "cdb_text.h"

namespace cdbdump {

flat_doc::entry &flat_doc::add(std::string_view key, kind k, std::string_view text) {
    if (!open_.empty())
        entries_[open_.back()].count++;
    auto at = uint32_t(chars_.size());
    chars_.append(text);
    entries_.push_back(entry{k, false, key, at, uint32_t(text.size()), uint32_t(entries_.size() + 1), 0, 0});
    return entries_.back();
}

namespace {
template <typename T> std::string_view decimal(char (&buf)[24], T v) {
    return std::string_view(buf, size_t(std::to_chars(buf, buf + sizeof buf, v).ptr - buf));
}
} // namespace

void flat_doc::integer(std::string_view key, int64_t v) {
    char buf[24];
    add(key, kind::integer, decimal(buf, v));
}

void flat_doc::uinteger(std::string_view key, uint64_t v) {
    char buf[24];
    add(key, kind::integer, decimal(buf, v));
}

void flat_doc::flags(std::string_view key, uint64_t v) {
    char buf[24];
    entry &e = add(key, kind::integer, decimal(buf, v));
    e.hex = true;
    e.bits = v;
}

void flat_doc::bytes(std::string_view key, const uint8_t *p, size_t n) {
    entry &e = add(key, kind::token);
    chars_ += "0x";
    append_hex_digits(chars_, p, n);
    e.text_len = uint32_t(chars_.size() - e.text_at);
}

void flat_doc::open(std::string_view key, kind k) {
    add(key, k);
    open_.push_back(uint32_t(entries_.size() - 1));
}

void flat_doc::end() {
    entries_[open_.back()].end = uint32_t(entries_.size());
    open_.pop_back();
}

// ---------------------------------------------------------------------------
// JSON

namespace {
void json_scalar(const flat_doc &d, const flat_doc::entry &e, std::string &out) {
    switch (e.type) {
    case flat_doc::kind::null: out += "null"; return;
    case flat_doc::kind::string:
    case flat_doc::kind::token: append_json_quoted(out, d.text(e)); return;
    default: out += d.text(e);
    }
}
} // namespace

void render_json(const flat_doc &d, size_t i, size_t indent, std::string &out) {
    const flat_doc::entry &e = d.at(i);
    if (d.is_scalar(i))
        return json_scalar(d, e, out);
    bool object = e.type == flat_doc::kind::object;
    // An array of scalars only stays on one line.
    bool flat = !object;
    for (size_t c = i + 1; flat && c < e.end; c = d.at(c).end)
        flat = d.is_scalar(c);
    out += object ? '{' : '[';
    bool first = true;
    for (size_t c = i + 1; c < e.end; c = d.at(c).end) {
        if (!first)
            out += ',';
        if (flat) {
            if (!first)
                out += ' ';
        } else {
            out += '\n';
            out.append(indent + 2, ' ');
        }
        if (object) {
            append_json_quoted(out, d.at(c).key);
            out += ": ";
        }
        render_json(d, c, indent + 2, out);
        first = false;
    }
    if (!flat && e.count) {
        out += '\n';
        out.append(indent, ' ');
    }
    out += object ? '}' : ']';
}

void render_json_line(const flat_doc &d, size_t i, std::string &out) {
    const flat_doc::entry &e = d.at(i);
    if (d.is_scalar(i))
        return json_scalar(d, e, out);
    bool object = e.type == flat_doc::kind::object;
    out += object ? '{' : '[';
    for (size_t c = i + 1; c < e.end; c = d.at(c).end) {
        if (c != i + 1)
            out += ',';
        if (object) {
            append_json_quoted(out, d.at(c).key);
            out += ':';
        }
        render_json_line(d, c, out);
    }
    out += object ? '}' : ']';
}

// ---------------------------------------------------------------------------
// Text

namespace {
constexpr size_t TEXT_WIDTH = 100;
constexpr size_t INLINE_MEMBERS = 3; // larger records always get a block of their own
} // namespace

void render_text_scalar(const flat_doc &d, size_t i, std::string &out) {
    const flat_doc::entry &e = d.at(i);
    switch (e.type) {
    case flat_doc::kind::null: out += "none"; return;
    case flat_doc::kind::string: append_c_quoted(out, d.text(e)); return;
    default:
        out += d.text(e);
        if (e.hex) {
            out += " (";
            append_hex(out, e.bits);
            out += ')';
        }
    }
}

namespace {
// Appends the one-line form of the entry; false (with out as it was) when it
// does not fit in `room`: an object of many members, or a line whose items,
// counted from this entry's bracket, would pass `room` (scalars always fit).
bool inline_text(const flat_doc &d, size_t i, size_t room, std::string &out) {
    if (d.is_scalar(i)) {
        render_text_scalar(d, i, out);
        return true;
    }
    const flat_doc::entry &e = d.at(i);
    bool object = e.type == flat_doc::kind::object;
    if (object && e.count > INLINE_MEMBERS)
        return false;
    size_t start = out.size();
    out += object ? '{' : '[';
    for (size_t c = i + 1; c < e.end; c = d.at(c).end) {
        if (c != i + 1)
            out += ", ";
        if (object) {
            out += d.at(c).key;
            out += ": ";
        }
        size_t before = out.size();
        if (!inline_text(d, c, room, out) || out.size() == before || out.size() - start > room) {
            out.resize(start);
            return false;
        }
    }
    out += object ? '}' : ']';
    return true;
}

size_t room_after(size_t used) { return TEXT_WIDTH - std::min(TEXT_WIDTH - 20, used); }

} // namespace

void render_text_block(const flat_doc &d, size_t i, size_t indent, std::string &out) {
    const flat_doc::entry &e = d.at(i);
    for (size_t c = i + 1; c < e.end; c = d.at(c).end)
        if (e.type == flat_doc::kind::object)
            render_text_member(d, c, indent, out);
        else
            render_text_item(d, c, indent, out);
}

void render_text_member(const flat_doc &d, size_t i, size_t indent, std::string &out) {
    std::string_view key = d.at(i).key;
    out.append(indent, ' ');
    out += key;
    out += ": ";
    size_t line = out.size();
    if (inline_text(d, i, room_after(indent + key.size() + 2), out) && out.size() > line) {
        out += '\n';
        return;
    }
    out.pop_back(); // the blank after the colon
    out += '\n';
    render_text_block(d, i, indent + 2, out);
}

void render_text_item(const flat_doc &d, size_t i, size_t indent, std::string &out) {
    size_t start = out.size();
    out.append(indent, ' ');
    out += "- ";
    if (inline_text(d, i, room_after(indent + 2), out)) {
        out += '\n';
        return;
    }
    // The item's block, with its first line marked as the start of an item.
    out.resize(start);
    render_text_block(d, i, indent + 2, out);
    out.replace(start + indent, 2, "- ");
}

} // namespace cdbdump
