#include "cdb_annotate.h"

#include <algorithm>
#include <cstdio>

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
        if (i) s += ' ';
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
        if (off == from) out += "  " + label;
        while (!out.empty() && out.back() == ' ') out.pop_back();
        out += "\n";
    }
}

// Bytes that nothing labels, in runs of zero bytes (padding) and of other
// bytes (unreferenced, shown as text when they read as text).
void gap(const uint8_t *data, size_t from, size_t to, std::string &out) {
    while (from < to) {
        bool zero = data[from] == 0;
        size_t end = from;
        while (end < to && (data[end] == 0) == zero) end++;
        std::string label = zero ? "(padding)" : "(unreferenced bytes)";
        std::string text(reinterpret_cast<const char *>(data + from), end - from);
        if (!zero && std::all_of(text.begin(), text.end(), [](char c) { return c >= 0x20 && c < 0x7f; }))
            label += " " + c_quote(text);
        rows(data, from, end, label, out);
        from = end;
    }
}
} // namespace

std::string annotation_text(const uint8_t *data, size_t size, const annotation &a) {
    std::vector<const span *> order;
    for (const span &s : a.spans) order.push_back(&s);
    // By offset; at one offset a violation comes before the bytes it is about.
    std::stable_sort(order.begin(), order.end(), [](const span *x, const span *y) {
        if (x->off != y->off) return x->off < y->off;
        return x->flagged && !y->flagged;
    });
    std::string out =
        std::string("# ") + (a.big_endian ? "big" : "little") + "-endian CDB, " + std::to_string(size) + " bytes\n";
    size_t cursor = 0;
    for (const span *s : order) {
        size_t from = std::min(s->off, size);
        if (from > cursor) gap(data, cursor, from, out);
        cursor = std::max(cursor, from);
        if (s->flagged) {
            out += offset_text(s->off) + "  !! " + s->value + "\n";
            continue;
        }
        size_t to = std::min(size, s->off + s->len);
        std::string label = s->field + (s->value.empty() ? "" : " = " + s->value);
        if (from < cursor && to > from) label += "  (overlaps the range before)";
        rows(data, from, to, label, out);
        cursor = std::max(cursor, to);
    }
    if (cursor < size) gap(data, cursor, size, out);
    if (a.violations) out += "# " + std::to_string(a.violations) + " violation(s) flagged with !!\n";
    return out;
}

} // namespace cdbdump
