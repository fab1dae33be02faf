// Diagnostics come from the checker's own check of the text and of the
// document's model (read once for every request after a change), so the server
// and qecfg-check report the same error and warnings on the same lines.
#include "diagnostics.h"

namespace lsp {

namespace {

enum severity_number { ERROR = 1, WARNING = 2 };

json related(const document &d, const std::vector<check::diagnostic> &notes) {
    json v = json::array();
    for (const check::diagnostic &n : notes)
        v.push_back({{"location", location_json(d, finding_span(d, n))}, {"message", n.text}});
    return v;
}

} // namespace

byte_span finding_span(const document &d, const check::diagnostic &where) {
    if (where.line == 0) // the whole file: shown on its first line
        return {0, d.line(0).size()};
    piece_parts p = d.parts(where.line);
    if (p.whole.to == p.whole.from) // a line the reader ignores
        return p.piece;
    if (p.header)
        return p.keyword;
    std::string value = d.text().substr(p.value.from, p.value.to - p.value.from);
    bool quoted = !value.empty() && where.text.find("'" + value + "'") != std::string::npos;
    return quoted || p.keyword.from == p.keyword.to ? p.value : p.keyword;
}

json diagnostics_of(const document &d, const check::check_options &opt) {
    check::check_report report = check::check_text(path_of_uri(d.uri()), d.text(), opt, d.model());
    json list = json::array();
    for (const check::finding &f : report.findings) {
        json diag = {{"range", range_json(d, finding_span(d, f.where))},
                     {"severity", f.level == check::severity::error ? ERROR : WARNING},
                     {"source", "qecfg"},
                     {"message", f.where.text}};
        if (!f.name.empty())
            diag["code"] = f.name;
        if (f.where.line == 0) // no line of the source is at fault
            diag["data"] = {{"wholeFile", true}};
        if (!f.notes.empty())
            diag["relatedInformation"] = related(d, f.notes);
        list.push_back(std::move(diag));
    }
    return {{"jsonrpc", "2.0"},
            {"method", "textDocument/publishDiagnostics"},
            {"params", {{"uri", d.uri()}, {"version", d.version()}, {"diagnostics", list}}}};
}

} // namespace lsp
