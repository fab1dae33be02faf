// An open document: its text, the index from positions (lines and UTF-16
// code units, as the protocol counts them) to bytes, and the index of the
// pieces the compiler reads it in, by which its messages number lines.
#ifndef QECFG_LSP_DOCUMENT_H
#define QECFG_LSP_DOCUMENT_H

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "source_model.h"

namespace lsp {

struct position {
    int line = 0;
    int character = 0;
    bool operator==(const position &) const = default;
};

struct byte_span {
    size_t from = 0, to = 0;
};

// Where the parts of one piece lie, as the compiler's reader found them: a
// header's name, or a statement's keyword and value (empty when the piece
// holds neither).
struct piece_parts {
    byte_span piece;   // the piece without its line end; the end of the text past the last piece
    byte_span whole;   // the piece without its comment and line end
    byte_span keyword; // a statement's keyword, or a header's name
    byte_span value;   // after the first '='; empty for a header
    bool header = false;
};

class document {
  public:
    document(std::string uri, std::string text, int version);
    // The model refers to the text: a copy or a moved document reads its own.
    document(const document &other);
    document(document &&other) noexcept;
    document &operator=(document other) noexcept;

    const std::string &uri() const { return uri_; }
    const std::string &text() const { return text_; }
    int version() const { return version_; }
    // The source model of the current text, as the checker reads it.
    const check::source_model &model() const;

    // Replaces bytes [from, to) and re-reads the text.
    void replace(byte_span span, const std::string &with, int version);
    void set_text(std::string text, int version);

    // Positions past a line's end (or past the last line) clamp to the end.
    size_t offset_of(position p) const;
    position position_of(size_t offset) const;
    int line_count() const { return int(line_starts_.size()); }
    std::string_view line(int n) const;

    // Pieces, numbered from 1 like the compiler's lines.
    int piece_count() const { return int(piece_starts_.size()); }
    int piece_at(size_t offset) const;
    piece_parts parts(int piece) const;
    // Where a statement's keyword and its value after the '=' (quotes
    // included) lie.
    byte_span keyword_span(const check::statement &s) const;
    byte_span value_span(const check::statement &s) const;

  private:
    void reindex();
    byte_span span_of(std::string_view part) const; // of a view into the text

    std::string uri_;
    std::string text_;
    int version_;
    std::vector<size_t> line_starts_;
    std::vector<size_t> piece_starts_;
    // Read when first asked for after a change: several changes in one
    // message re-read the text once. It holds views into text_, so any
    // change of the text makes it stale.
    mutable check::source_model model_;
    mutable bool model_stale_ = true;
};

} // namespace lsp

#endif
