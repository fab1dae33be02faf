// A command's usage as data: its --help text is printed from it, and the
// SYNOPSIS, OPTIONS, ENVIRONMENT, EXIT STATUS and OUTPUT sections of its
// manual page are generated from it, so the two cannot drift apart.
//
// Texts use one markup: a metavariable stands in braces ("-d {level}"),
// printed plain by --help and in italics on the manual page; everything else
// outside "[", "]", "|" and "..." is literal (bold on the manual page).
#ifndef QECFG_COMMAND_USAGE_H
#define QECFG_COMMAND_USAGE_H

#include <algorithm>
#include <span>
#include <sstream>
#include <string>

namespace command_usage {

// An option, an operand, an environment variable or an exit status, with
// what it does.
struct item {
    const char *term;
    const char *text;
};

struct usage {
    const char *name;
    std::span<const char *const> synopsis; // each form of the command line, after the name
    const char *description;               // one paragraph
    std::span<const item> options;
    std::span<const item> operands;
    std::span<const item> environment;
    std::span<const item> exit_statuses;
    const char *output = nullptr; // what becomes of the output file, if it writes one
};

// The text without the metavariable braces.
inline std::string plain(const char *marked) {
    std::string s;
    for (const char *p = marked; *p; p++)
        if (*p != '{' && *p != '}')
            s += *p;
    return s;
}

// Words of `text` filled into lines of at most `width` columns, each
// further line starting with `indent` blanks; the first continues `line`.
inline std::string filled(std::string line, const std::string &text, size_t indent, size_t width = 79) {
    std::string out;
    bool line_empty = true;
    std::istringstream words(text);
    for (std::string word; words >> word;) {
        if (!line_empty && line.size() + 1 + word.size() > width) {
            out += line + "\n";
            line = std::string(indent, ' ');
            line_empty = true;
        }
        line += (line_empty ? "" : " ") + word;
        line_empty = false;
    }
    return out + line + "\n";
}

// The items of one section, each term in a column of its own when it fits.
inline std::string item_list(const char *title, std::span<const item> items) {
    if (items.empty())
        return "";
    size_t column = 0;
    for (const item &i : items)
        column = std::max(column, plain(i.term).size());
    column = std::min<size_t>(column, 18) + 4;
    std::string out = std::string("\n") + title + ":\n";
    for (const item &i : items) {
        std::string term = "  " + plain(i.term);
        if (term.size() + 2 > column) {
            out += term + "\n";
            term.clear();
        }
        term.resize(column, ' ');
        out += filled(term, plain(i.text), column);
    }
    return out;
}

// What --help prints.
inline std::string help_text(const usage &u) {
    std::string out;
    for (size_t i = 0; i < u.synopsis.size(); i++)
        out += (i ? "       " : "usage: ") + std::string(u.name) + " " + plain(u.synopsis[i]) + "\n";
    out += filled("", plain(u.description), 0);
    out += item_list("options", u.options);
    out += item_list("operands", u.operands);
    out += item_list("environment", u.environment);
    out += item_list("exit status", u.exit_statuses);
    if (u.output)
        out += "\noutput:\n" + filled("  ", plain(u.output), 2);
    return out;
}

} // namespace command_usage

#endif
