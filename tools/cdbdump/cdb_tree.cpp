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

void to_flat(const node &n, flat_doc &out, std::string_view key) {
    switch (n.type()) {
    case node::kind::null: return out.null(key);
    case node::kind::integer:
        if (n.hex_text().empty())
            return out.real(key, n.text()); // the text as it is, as an integer's
        return out.flags(key, std::stoull(n.text()));
    case node::kind::real: return out.real(key, n.text());
    case node::kind::string: return out.string(key, n.text());
    case node::kind::token: return out.token(key, n.text());
    case node::kind::array:
        out.begin_array(key);
        for (const node &i : n.items())
            to_flat(i, out);
        return out.end();
    case node::kind::object:
        out.begin_object(key);
        for (const auto &[k, v] : n.members())
            to_flat(v, out, k);
        return out.end();
    }
}

namespace {
flat_doc flat(const node &n) {
    flat_doc d;
    to_flat(n, d);
    return d;
}
} // namespace

std::string to_json(const node &n) {
    std::string out;
    render_json(flat(n), 0, 0, out);
    return out + "\n";
}

std::string to_json_line(const node &n) {
    std::string out;
    render_json_line(flat(n), 0, out);
    return out;
}

std::string to_text(const node &n) {
    std::string out;
    flat_doc d = flat(n);
    if (d.is_scalar(0)) {
        render_text_scalar(d, 0, out);
        return out + "\n";
    }
    render_text_block(d, 0, 0, out);
    return out;
}

// The indent of a frame is the one render_json or the text block would be
// given for the entry it stands for.
void tree_writer::begin_object() {
    if (open_.empty()) {
        open_.push_back({false, 0, 0});
    } else {
        frame &a = open_.back();
        if (style_ == style::json) {
            out_ << (a.done ? ",\n" : "\n");
            line_.assign(a.indent + 2, ' ');
            out_ << line_;
        }
        a.done++;
        open_.push_back({false, a.indent + 2, 0});
        item_opening_ = style_ == style::text;
    }
    if (style_ == style::json)
        out_ << "{";
}

void tree_writer::begin_object(std::string_view key) { open_member(key, false, false); }

void tree_writer::next_member(std::string_view key) {
    frame &o = open_.back();
    line_ += o.done ? ",\n" : "\n";
    line_.append(o.indent + 2, ' ');
    append_json_quoted(line_, key);
    line_ += ": ";
    o.done++;
}

// The first line of the text just rendered starts the open item.
void tree_writer::mark_item_start(size_t indent) {
    if (item_opening_)
        line_.replace(indent - 2, 2, "- ");
    item_opening_ = false;
}

void tree_writer::member(const flat_doc &d, size_t i) {
    size_t indent = open_.back().indent;
    line_.clear();
    if (style_ == style::json) {
        next_member(d.at(i).key);
        render_json(d, i, indent + 2, line_);
    } else {
        render_text_member(d, i, indent, line_);
        mark_item_start(indent);
    }
    out_ << line_;
}

void tree_writer::members(const flat_doc &d, size_t i) {
    for (size_t c = i + 1; c < d.at(i).end; c = d.at(c).end)
        member(d, c);
}

void tree_writer::member(std::string_view key, const node &n) {
    flat_doc d;
    to_flat(n, d, key);
    member(d, 0);
}

void tree_writer::members(const node &n) {
    flat_doc d;
    to_flat(n, d);
    members(d, 0);
}

void tree_writer::begin_array(std::string_view key, size_t count) { open_member(key, true, count == 0); }

// A member whose value is given piece by piece; an empty array is closed at
// once in the text.
void tree_writer::open_member(std::string_view key, bool array, bool empty) {
    size_t indent = open_.back().indent;
    line_.clear();
    if (style_ == style::json) {
        next_member(key);
        line_ += array ? '[' : '{';
    } else {
        line_.append(indent, ' ');
        line_ += key;
        line_ += empty ? ": []\n" : ":\n";
        mark_item_start(indent);
    }
    out_ << line_;
    open_.push_back({array, indent + 2, 0});
}

void tree_writer::item(const flat_doc &d, size_t i) {
    frame &a = open_.back();
    line_.clear();
    if (style_ == style::json) {
        line_ += a.done ? ",\n" : "\n";
        line_.append(a.indent + 2, ' ');
        render_json(d, i, a.indent + 2, line_);
    } else {
        render_text_item(d, i, a.indent, line_);
    }
    a.done++;
    out_ << line_;
}

void tree_writer::item(const node &n) {
    flat_doc d;
    to_flat(n, d);
    item(d, 0);
}

void tree_writer::end() {
    frame f = open_.back();
    open_.pop_back();
    if (style_ == style::text)
        return;
    if (f.done) {
        line_.assign(1, '\n');
        line_.append(f.indent, ' ');
        out_ << line_;
    }
    out_ << (f.array ? "]" : "}");
    if (open_.empty())
        out_ << '\n';
}

} // namespace cdbdump
