// The canonical layout of a source: headers at column 0, statements
// indented by one tab, blank lines empty, no trailing blanks, a final line
// end. Comments, blank lines and every value stay as they are.
#ifndef QECFG_LSP_FORMAT_H
#define QECFG_LSP_FORMAT_H

#include <string>
#include <vector>

namespace lsp {

struct line_edit {
    size_t line;          // 0-based
    std::string new_text; // the line's text without its line end
};

// The lines that change, in order; a line past the last one adds the final
// line end.
std::vector<line_edit> format_edits(const std::string &text);
std::string format_source(const std::string &text);

} // namespace lsp

#endif
