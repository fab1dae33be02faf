#include "cdb_tree.h"

#include "cdb_text.h"

namespace cdbdump {

node node::flags(uint64_t v) {
    node n(kind::integer, std::to_string(v));
    n.hex_ = hex(v);
    return n;
}

node *node::find(const std::string &key) {
    for (auto &m : members_)
        if (m.first == key)
            return &m.second;
    return nullptr;
}

void node::erase(const std::string &key) {
    for (auto it = members_.begin(); it != members_.end(); ++it)
        if (it->first == key) {
            members_.erase(it);
            return;
        }
}

namespace {
bool is_scalar(const node &n) { return n.type() != node::kind::array && n.type() != node::kind::object; }

// ---------------------------------------------------------------------------
// JSON

void json_into(const node &n, int indent, std::string &out) {
    std::string pad(size_t(indent) + 2, ' ');
    switch (n.type()) {
    case node::kind::null: out += "null"; return;
    case node::kind::integer:
    case node::kind::real: out += n.text(); return;
    case node::kind::string:
    case node::kind::token: out += json_quote(n.text()); return;
    case node::kind::array: {
        bool flat = true;
        for (const node &i : n.items())
            flat = flat && is_scalar(i);
        out += "[";
        for (size_t i = 0; i < n.items().size(); i++) {
            if (i)
                out += ",";
            out += flat ? (i ? " " : "") : "\n" + pad;
            json_into(n.items()[i], indent + 2, out);
        }
        if (!flat && !n.items().empty())
            out.append("\n").append(size_t(indent), ' ');
        out += "]";
        return;
    }
    case node::kind::object:
        out += "{";
        for (size_t i = 0; i < n.members().size(); i++) {
            out += i ? ",\n" : "\n";
            out += pad + json_quote(n.members()[i].first) + ": ";
            json_into(n.members()[i].second, indent + 2, out);
        }
        if (!n.members().empty())
            out.append("\n").append(size_t(indent), ' ');
        out += "}";
        return;
    }
}

// ---------------------------------------------------------------------------
// Text

constexpr size_t TEXT_WIDTH = 100;

std::string scalar_text(const node &n) {
    switch (n.type()) {
    case node::kind::null: return "none";
    case node::kind::string: return c_quote(n.text());
    case node::kind::integer: return n.hex_text().empty() ? n.text() : n.text() + " (" + n.hex_text() + ")";
    default: return n.text();
    }
}

constexpr size_t INLINE_MEMBERS = 3; // larger records always get a block of their own

// The one-line form of a node, or "" when it does not fit in the width left.
std::string inline_text(const node &n, size_t room) {
    if (is_scalar(n))
        return scalar_text(n);
    bool arr = n.type() == node::kind::array;
    if (!arr && n.members().size() > INLINE_MEMBERS)
        return "";
    std::string s = arr ? "[" : "{";
    size_t count = arr ? n.items().size() : n.members().size();
    for (size_t i = 0; i < count; i++) {
        if (i)
            s += ", ";
        if (!arr)
            s += n.members()[i].first + ": ";
        std::string part = inline_text(arr ? n.items()[i] : n.members()[i].second, room);
        if (part.empty() || s.size() + part.size() > room)
            return "";
        s += part;
    }
    return s + (arr ? "]" : "}");
}

void text_into(const node &n, size_t indent, std::string &out);

void text_member(const std::string &key, const node &v, size_t indent, std::string &out) {
    std::string pad(indent, ' ');
    std::string line = inline_text(v, TEXT_WIDTH - std::min(TEXT_WIDTH - 20, indent + key.size() + 2));
    if (!line.empty()) {
        out += pad + key + ": " + line + "\n";
        return;
    }
    out += pad + key + ":\n";
    text_into(v, indent + 2, out);
}

// One item of an array whose lines are indented by `indent`.
void text_item(const node &item, size_t indent, std::string &out) {
    std::string pad(indent, ' ');
    std::string line = inline_text(item, TEXT_WIDTH - std::min(TEXT_WIDTH - 20, indent + 2));
    if (!line.empty()) {
        out += pad + "- " + line + "\n";
        return;
    }
    // The item's block, with its first line marked as the start of an item.
    std::string block;
    text_into(item, indent + 2, block);
    out += pad + "- " + block.substr(indent + 2);
}

void text_into(const node &n, size_t indent, std::string &out) {
    if (n.type() == node::kind::object) {
        for (const auto &m : n.members())
            text_member(m.first, m.second, indent, out);
        return;
    }
    for (const node &item : n.items())
        text_item(item, indent, out);
}
} // namespace

std::string to_json(const node &n) {
    std::string out;
    json_into(n, 0, out);
    return out + "\n";
}

std::string to_json_line(const node &n) {
    switch (n.type()) {
    case node::kind::null: return "null";
    case node::kind::integer:
    case node::kind::real: return n.text();
    case node::kind::string:
    case node::kind::token: return json_quote(n.text());
    case node::kind::array: {
        std::string s = "[";
        for (const node &i : n.items()) {
            if (s.size() > 1)
                s += ',';
            s += to_json_line(i);
        }
        return s + "]";
    }
    default: {
        std::string s = "{";
        for (const auto &[key, v] : n.members()) {
            if (s.size() > 1)
                s += ',';
            s += json_quote(key);
            s += ':';
            s += to_json_line(v);
        }
        return s + "}";
    }
    }
}

std::string to_text(const node &n) {
    std::string out;
    if (is_scalar(n))
        return scalar_text(n) + "\n";
    text_into(n, 0, out);
    return out;
}

// The indent of a frame is the one json_into or text_into would be given for
// the node it stands for.
void tree_writer::begin_object() {
    if (open_.empty()) {
        open_.push_back({false, 0, 0});
    } else {
        frame &a = open_.back();
        if (style_ == style::json)
            out_ << (a.done ? ",\n" : "\n") << std::string(a.indent + 2, ' ');
        a.done++;
        open_.push_back({false, a.indent + 2, 0});
        item_opening_ = style_ == style::text;
    }
    if (style_ == style::json)
        out_ << "{";
}

void tree_writer::next_member(const std::string &key) {
    frame &o = open_.back();
    if (style_ == style::json)
        out_ << (o.done ? ",\n" : "\n") << std::string(o.indent + 2, ' ') << json_quote(key) << ": ";
    o.done++;
}

void tree_writer::member(const std::string &key, const node &value) {
    size_t indent = open_.back().indent;
    std::string s;
    if (style_ == style::json) {
        next_member(key);
        json_into(value, int(indent + 2), s);
    } else {
        text_member(key, value, indent, s);
        if (item_opening_)
            s.replace(indent - 2, 2, "- ");
        item_opening_ = false;
    }
    out_ << s;
}

void tree_writer::begin_array(const std::string &key, size_t count) {
    size_t indent = open_.back().indent;
    if (style_ == style::json) {
        next_member(key);
        out_ << "[";
    } else {
        std::string s = std::string(indent, ' ') + key + (count ? ":\n" : ": []\n");
        if (item_opening_)
            s.replace(indent - 2, 2, "- ");
        item_opening_ = false;
        out_ << s;
    }
    open_.push_back({true, indent + 2, 0});
}

void tree_writer::item(const node &n) {
    frame &a = open_.back();
    std::string s;
    if (style_ == style::json) {
        s = std::string(a.done ? ",\n" : "\n") + std::string(a.indent + 2, ' ');
        json_into(n, int(a.indent + 2), s);
    } else {
        text_item(n, a.indent, s);
    }
    a.done++;
    out_ << s;
}

void tree_writer::end() {
    frame f = open_.back();
    open_.pop_back();
    if (style_ == style::text)
        return;
    if (f.done)
        out_ << '\n' << std::string(f.indent, ' ');
    out_ << (f.array ? "]" : "}");
    if (open_.empty())
        out_ << '\n';
}

} // namespace cdbdump
