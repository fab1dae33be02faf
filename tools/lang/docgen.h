// The documents generated from the keyword table: the tables of the language
// reference, the Vim syntax file and the TextMate grammar.
#ifndef QECFG_DOCGEN_H
#define QECFG_DOCGEN_H

#include <map>
#include <string>
#include <vector>

namespace docgen {

// The generated blocks of the reference, by block name ("stanza NAME",
// "properties", "permissions", "variable-types", "data-types",
// "unraised-messages").
std::map<std::string, std::string> reference_blocks();

// Replaces the body of every generated block of a Markdown text. Blocks are
// delimited by "<!-- generated: NAME -->" and "<!-- end generated -->" lines;
// a block named in `blocks` that the text lacks, and a block of the text
// that `blocks` does not name, are reported in `missing`.
// `markers` gives the comment lines that delimit the blocks in another kind
// of text.
struct block_markers {
    std::string start, start_end, end;
};
extern const block_markers markdown_markers, roff_markers;
std::string fill_blocks(const std::string &text, const std::map<std::string, std::string> &blocks, std::string &missing,
                        const block_markers &markers = markdown_markers);

std::string vim_syntax();
std::string textmate_grammar();

// A section-5 manual page from the reference's Markdown.
std::string man_page(const std::string &markdown);

// A command's manual page (under the source tree) and its blocks generated
// from the command's usage table: "synopsis", "options" (options and
// operands), "environment" and "output" where it has them, and "exit-status". The blocks
// are delimited by roff_markers.
struct command_manual {
    std::string path;
    std::map<std::string, std::string> blocks;
};
std::vector<command_manual> command_manuals();

} // namespace docgen

#endif
