// Formatting as text edits: one per changed line, so that the client keeps
// its marks and cursor on the lines that stay.
#include "format.h"
#include "requests.h"

namespace lsp {

json formatting(workspace &ws, const json &params) {
    document &d = ws.named(params);
    json edits = json::array();
    for (const line_edit &e : format_edits(d.text())) {
        size_t from = d.offset_of({int(e.line), 0});
        bool past_end = int(e.line) >= d.line_count();
        byte_span span =
            past_end ? byte_span{d.text().size(), d.text().size()} : byte_span{from, from + d.line(int(e.line)).size()};
        edits.push_back({{"range", range_json(d, span)}, {"newText", past_end ? "\n" : e.new_text}});
    }
    return edits;
}

} // namespace lsp
