// The documents generated from the keyword table: the tables of the language
// reference, the Vim syntax file and the TextMate grammar.
#ifndef QECFG_DOCGEN_H
#define QECFG_DOCGEN_H

#include <map>
#include <string>

namespace docgen {

// The generated blocks of the reference, by block name ("stanza NAME",
// "properties", "permissions", "variable-types", "data-types").
std::map<std::string, std::string> reference_blocks();

// Replaces the body of every generated block of a Markdown text. Blocks are
// delimited by "<!-- generated: NAME -->" and "<!-- end generated -->" lines;
// a block named in `blocks` that the text lacks, and a block of the text
// that `blocks` does not name, are reported in `missing`.
std::string fill_blocks(const std::string &text, const std::map<std::string, std::string> &blocks,
                        std::string &missing);

std::string vim_syntax();
std::string textmate_grammar();

// A section-5 manual page from the reference's Markdown.
std::string man_page(const std::string &markdown);

} // namespace docgen

#endif
