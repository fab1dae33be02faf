// What lies at a position of a document: the piece, its stanza and
// statement, and whether the position is on the keyword or the value.
#ifndef QECFG_LSP_CURSOR_H
#define QECFG_LSP_CURSOR_H

#include <string>

#include "document.h"
#include "source_model.h"

namespace lsp {

struct cursor {
    size_t offset = 0;
    int piece = 0;
    piece_parts parts;
    const check::stanza *stanza = nullptr;       // the stanza the piece belongs to
    const check::statement *statement = nullptr; // the statement the piece holds
    bool on_keyword = false;                     // a statement's keyword or a header's name
    bool on_value = false;
    bool after_equals = false; // the position is past the statement's first '='
};

cursor cursor_at(const document &d, position p);

// The comma-separated word of a value around an offset, and its span.
std::string word_at(const document &d, byte_span value, size_t offset, byte_span &word);

} // namespace lsp

#endif
