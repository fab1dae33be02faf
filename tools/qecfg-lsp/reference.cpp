// Hover texts are rows of the generated reference, so an editor shows
// exactly what docs/language.md says.
#include "reference.h"

#include <map>
#include <sstream>
#include <vector>

#include "docgen.h"

namespace lsp {

namespace {

const std::map<std::string, std::string> &blocks() {
    static const std::map<std::string, std::string> b = docgen::reference_blocks();
    return b;
}

const std::string &block(const std::string &name) {
    static const std::string none;
    auto it = blocks().find(name);
    return it == blocks().end() ? none : it->second;
}

// The two header lines of a Markdown table and the rows that `keep` selects.
template <typename F> std::string table_rows(const std::string &table, F keep) {
    std::istringstream in(table);
    std::string out, line;
    for (int n = 0; std::getline(in, line); n++)
        if (n < 2 ? line.rfind('|', 0) == 0 : keep(line))
            out += line + "\n";
    return out;
}

} // namespace

std::string stanza_reference(const lang::stanza_type &s) {
    return "### " + s.name + "\n\n" + block("stanza " + s.name);
}

std::string statement_reference(const lang::stanza_type &s, std::string_view keyword_view) {
    std::string keyword(keyword_view);
    std::string row = "| `" + keyword + "` |";
    return "**" + keyword + "** (" + s.name + ")\n\n" +
           table_rows(block("stanza " + s.name), [&](const std::string &l) { return l.rfind(row, 0) == 0; });
}

std::string property_reference(const lang::stanza_type &s) {
    return "**Properties** of " + s.name + "\n\n" + table_rows(block("properties"), [&](const std::string &l) {
               // A row names its stanzas in its first cell, comma-separated.
               std::string cell = l.substr(0, l.find(" |", 1)) + ",";
               return cell.find(" " + s.name + ",") != std::string::npos;
           });
}

std::string permission_reference() {
    return "**Permission letters** (only the first character of the value counts)\n\n" + block("permissions");
}

std::string data_type_reference() { return "**Data types**\n\n" + block("data-types"); }

std::string variable_type_reference() { return "**Variable types**\n\n" + block("variable-types"); }

} // namespace lsp
