// Only what the reader ignores changes: the blanks and tabs that indent a
// statement (any indentation is one), trailing blanks and tabs (the reader
// strips them), and a missing final line end. A line the reader would cut
// into pieces, or one holding a NUL byte, is left alone, so every line keeps
// its number and the compiled image cannot change.
#include "format.h"

#include <cstring>

#include "lang.h"

namespace lsp {

namespace {

std::string canonical_line(const std::string &line) {
    size_t end = line.find_last_not_of(" \t");
    if (end == std::string::npos)
        return "";
    std::string kept = line.substr(0, end + 1);
    if (kept[0] != ' ' && kept[0] != '\t')
        return kept;
    return "\t" + kept.substr(kept.find_first_not_of(" \t"));
}

} // namespace

std::vector<line_edit> format_edits(const std::string &text) {
    std::vector<line_edit> edits;
    size_t line = 0;
    for (size_t pos = 0; pos < text.size(); line++) {
        size_t nl = text.find('\n', pos);
        size_t end = nl == std::string::npos ? text.size() : nl;
        std::string current = text.substr(pos, end - pos);
        // The length with its line end, as the reader counts a piece.
        bool whole_piece = current.size() + 1 <= lang::READ_PIECE && current.find('\0') == std::string::npos;
        std::string wanted = whole_piece ? canonical_line(current) : current;
        if (wanted != current)
            edits.push_back({line, wanted});
        if (nl == std::string::npos) {
            if (whole_piece)
                edits.push_back({line + 1, ""});
            break;
        }
        pos = nl + 1;
    }
    return edits;
}

std::string format_source(const std::string &text) {
    std::string out;
    std::vector<line_edit> edits = format_edits(text);
    auto edit = edits.begin();
    size_t line = 0;
    for (size_t pos = 0; pos < text.size(); line++) {
        size_t nl = text.find('\n', pos);
        size_t end = nl == std::string::npos ? text.size() : nl;
        if (edit != edits.end() && edit->line == line)
            out += (edit++)->new_text;
        else
            out.append(text, pos, end - pos);
        if (nl == std::string::npos)
            break;
        out += '\n';
        pos = nl + 1;
    }
    if (edit != edits.end())
        out += '\n';
    return out;
}

} // namespace lsp
