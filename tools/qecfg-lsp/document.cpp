// Document text and its indexes. Positions count UTF-16 code units; bytes
// that are no valid UTF-8 count one unit each, so any text maps both ways.
#include "document.h"

#include <algorithm>
#include <cstring>

#include "lang.h"

namespace lsp {

namespace {

// UTF-16 units of the character starting with byte `b`: a continuation byte
// adds nothing, a four-byte sequence needs a surrogate pair.
int units_of(unsigned char b) {
    if ((b & 0xC0) == 0x80)
        return 0;
    return (b & 0xF8) == 0xF0 ? 2 : 1;
}

size_t upper_index(const std::vector<size_t> &starts, size_t offset) {
    return size_t(std::upper_bound(starts.begin(), starts.end(), offset) - starts.begin());
}

} // namespace

document::document(std::string uri, std::string text, int version)
    : uri_(std::move(uri)), text_(std::move(text)), version_(version) {
    reindex();
}

document::document(const document &other)
    : uri_(other.uri_), text_(other.text_), version_(other.version_), line_starts_(other.line_starts_),
      piece_starts_(other.piece_starts_) {}

document::document(document &&other) noexcept
    : uri_(std::move(other.uri_)), text_(std::move(other.text_)), version_(other.version_),
      line_starts_(std::move(other.line_starts_)), piece_starts_(std::move(other.piece_starts_)) {
    other.model_stale_ = true;
}

document &document::operator=(document other) noexcept {
    std::swap(uri_, other.uri_);
    std::swap(text_, other.text_);
    std::swap(version_, other.version_);
    std::swap(line_starts_, other.line_starts_);
    std::swap(piece_starts_, other.piece_starts_);
    model_stale_ = true;
    return *this;
}

void document::replace(byte_span span, const std::string &with, int version) {
    span.to = std::min(span.to, text_.size());
    span.from = std::min(span.from, span.to);
    text_.replace(span.from, span.to - span.from, with);
    version_ = version;
    reindex();
}

void document::set_text(std::string text, int version) {
    text_ = std::move(text);
    version_ = version;
    reindex();
}

void document::reindex() {
    line_starts_.assign(1, 0);
    piece_starts_.clear();
    for (size_t pos = 0; pos < text_.size();) {
        piece_starts_.push_back(pos);
        size_t len = std::min(text_.size() - pos, lang::READ_PIECE);
        const void *nl = std::memchr(text_.data() + pos, '\n', len);
        if (nl) {
            len = size_t(static_cast<const char *>(nl) - (text_.data() + pos)) + 1;
            line_starts_.push_back(pos + len);
        }
        pos += len;
    }
    model_stale_ = true;
}

const check::source_model &document::model() const {
    if (model_stale_) {
        model_ = check::read_model(text_);
        model_stale_ = false;
    }
    return model_;
}

std::string_view document::line(int n) const {
    if (n < 0 || n >= line_count())
        return {};
    size_t from = line_starts_[size_t(n)];
    size_t to = size_t(n) + 1 < line_starts_.size() ? line_starts_[size_t(n) + 1] - 1 : text_.size();
    return std::string_view(text_).substr(from, to - from);
}

size_t document::offset_of(position p) const {
    if (p.line < 0)
        return 0;
    if (p.line >= line_count())
        return text_.size();
    std::string_view l = line(p.line);
    size_t i = 0;
    for (int units = 0; i < l.size(); i++) {
        int u = units_of(static_cast<unsigned char>(l[i]));
        if (u && units + u > p.character)
            break;
        units += u;
    }
    return line_starts_[size_t(p.line)] + i;
}

position document::position_of(size_t offset) const {
    offset = std::min(offset, text_.size());
    size_t line = upper_index(line_starts_, offset) - 1;
    int units = 0;
    for (size_t i = line_starts_[line]; i < offset; i++)
        units += units_of(static_cast<unsigned char>(text_[i]));
    return {int(line), units};
}

int document::piece_at(size_t offset) const {
    return piece_starts_.empty() ? 0 : int(std::max<size_t>(upper_index(piece_starts_, offset), 1));
}

byte_span document::span_of(std::string_view part) const {
    size_t from = size_t(part.data() - text_.data());
    return {from, from + part.size()};
}

byte_span document::keyword_span(const check::statement &s) const { return span_of(s.keyword()); }

byte_span document::value_span(const check::statement &s) const {
    size_t end = span_of(std::string_view(s.at, s.end_offset)).to;
    return s.has_equals() ? byte_span{keyword_span(s).to + 1, end} : byte_span{end, end};
}

// What of the piece counts is what the compiler's reader made of it: a
// header or a statement of the model; the rest is comment or blank.
piece_parts document::parts(int piece) const {
    piece_parts p;
    p.piece = p.whole = p.keyword = p.value = {text_.size(), text_.size()};
    if (piece < 1 || piece > piece_count())
        return p;
    size_t from = piece_starts_[size_t(piece) - 1];
    size_t to = size_t(piece) < piece_starts_.size() ? piece_starts_[size_t(piece)] : text_.size();
    p.piece = {from, to > from && text_[to - 1] == '\n' ? to - 1 : to};
    p.whole = p.keyword = p.value = {from, from};
    const check::source_model &m = model();
    if (const check::stanza *s = m.stanza_at(piece); s && s->line == piece) {
        p.header = true;
        p.keyword = span_of(s->header);
        p.value = {p.keyword.to, p.keyword.to};
    } else if (const check::statement *st = m.statement_at(piece)) {
        p.keyword = keyword_span(*st);
        p.value = value_span(*st);
    } else {
        return p;
    }
    p.whole = {from, std::max(p.keyword.to, p.value.to)};
    return p;
}

} // namespace lsp
