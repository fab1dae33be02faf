#include "cdb_annotate.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <iterator>
#include <optional>

#include "cdb_text.h"

namespace cdbdump {

namespace {
constexpr size_t ROW = 16;

std::string offset_text(size_t off) {
    char buf[24];
    std::snprintf(buf, sizeof buf, "%08zx", off);
    return buf;
}

std::string hex_row(const uint8_t *p, size_t n) {
    std::string s;
    for (size_t i = 0; i < n; i++) {
        if (i)
            s += ' ';
        s += hex_digits(p + i, 1);
    }
    s.resize(ROW * 3 - 1, ' ');
    return s;
}

// A range in rows of 16 bytes, the label on the first row.
void rows(const uint8_t *data, size_t from, size_t to, const std::string &label, std::string &out) {
    for (size_t off = from; off < to; off += ROW) {
        size_t n = std::min(ROW, to - off);
        out += offset_text(off) + "  " + hex_row(data + off, n);
        if (off == from)
            out += "  " + label;
        while (!out.empty() && out.back() == ' ')
            out.pop_back();
        out += "\n";
    }
}

// Bytes that nothing labels, in runs of zero bytes (padding) and of other
// bytes (unreferenced, shown as text when they read as text).
void gap(const uint8_t *data, size_t from, size_t to, std::string &out) {
    while (from < to) {
        bool zero = data[from] == 0;
        size_t end = from;
        while (end < to && (data[end] == 0) == zero)
            end++;
        std::string label = zero ? "(padding)" : "(unreferenced bytes)";
        std::string text(reinterpret_cast<const char *>(data + from), end - from);
        if (!zero && std::all_of(text.begin(), text.end(), [](char c) { return c >= 0x20 && c < 0x7f; }))
            label.append(" ").append(c_quote(text));
        rows(data, from, end, label, out);
        from = end;
    }
}
} // namespace

annotation_writer::annotation_writer(const uint8_t *data, size_t size, bool big_endian, text_sink &out)
    : data_(data), size_(size), out_(out) {
    out_ << std::string("# ") + (big_endian ? "big" : "little") + "-endian CDB, " + std::to_string(size) + " bytes\n";
}

void annotation_writer::spans(std::vector<span> &&batch, size_t final_below) {
    pending_.insert(pending_.end(), std::make_move_iterator(batch.begin()), std::make_move_iterator(batch.end()));
    // By offset; at one offset a violation comes before the bytes it is about.
    std::stable_sort(pending_.begin(), pending_.end(), [](const span &x, const span &y) {
        if (x.off != y.off)
            return x.off < y.off;
        return x.flagged && !y.flagged;
    });
    size_t n = 0;
    std::string out;
    for (; n < pending_.size() && pending_[n].off < final_below; n++) {
        write(pending_[n], out);
        out_ << out;
        out.clear();
    }
    pending_.erase(pending_.begin(), pending_.begin() + long(n));
}

void annotation_writer::write(const span &s, std::string &out) {
    size_t from = std::min(s.off, size_);
    if (from > cursor_)
        gap(data_, cursor_, from, out);
    cursor_ = std::max(cursor_, from);
    if (s.flagged) {
        out += offset_text(s.off) + "  !! " + s.value + "\n";
        return;
    }
    size_t to = std::min(size_, s.off + s.len);
    std::string label = s.field + (s.value.empty() ? "" : " = " + s.value);
    if (from < cursor_ && to > from)
        label += "  (overlaps the range before)";
    rows(data_, from, to, label, out);
    cursor_ = std::max(cursor_, to);
}

void annotation_writer::finish(size_t violations) {
    spans({}, SIZE_MAX);
    std::string out;
    if (cursor_ < size_)
        gap(data_, cursor_, size_, out);
    if (violations)
        out += "# " + std::to_string(violations) + " violation(s) flagged with !!\n";
    out_ << out;
}

std::string annotation_text(const uint8_t *data, size_t size, const annotation &a) {
    text_sink out;
    annotation_writer w(data, size, a.big_endian, out);
    w.spans(std::vector<span>(a.spans), SIZE_MAX);
    w.finish(a.violations);
    return out.take();
}

size_t write_annotation(const uint8_t *data, size_t size, text_sink &out, size_t window) {
    bool big = false;
    std::optional<annotation_writer> w;
    auto each = [&](std::vector<span> &&batch, size_t below) {
        if (!w)
            w.emplace(data, size, big, out);
        w->spans(std::move(batch), below);
    };
    size_t violations = annotate_each(data, size, big, each, window);
    w->finish(violations);
    return violations;
}

} // namespace cdbdump
