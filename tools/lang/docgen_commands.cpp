// The parts of each command's manual page that its usage table decides: the
// synopsis, the options and operands, the environment, the exit statuses and
// the output,
// in roff, from the same table that the command's --help prints.
#include <cctype>
#include <string_view>

#include "cdbdump_usage.h"
#include "check_usage.h"
#include "command_usage.h"
#include "docgen.h"
#include "qecfg_usage.h"

namespace docgen {

namespace {

enum class font { roman, bold, italic };

const char *font_escape(font f) { return f == font::bold ? "\\fB" : f == font::italic ? "\\fI" : "\\fR"; }

// Roff of a usage text: metavariables ({NAME}) in italics; other words in
// bold when `literal`, else roman; the punctuation of a synopsis roman. A
// dash is a minus sign unless it joins two words ("class-to-manager").
std::string roff(std::string_view marked, bool literal) {
    std::string o;
    font current = font::roman;
    bool meta = false;
    auto put = [&](font f, std::string_view text) {
        if (f != current)
            o += font_escape(current = f);
        o += text;
    };
    auto alnum = [&](size_t i) { return i < marked.size() && std::isalnum(static_cast<unsigned char>(marked[i])); };
    for (size_t i = 0; i < marked.size(); i++) {
        char c = marked[i];
        if (c == '{' || c == '}') {
            meta = c == '{';
        } else if (!meta && marked.substr(i, 3) == "...") {
            put(font::roman, "...");
            i += 2;
        } else if (c == ' ') {
            put(current, " ");
        } else {
            bool punctuation = c == '[' || c == ']' || c == '|';
            font f = meta ? font::italic : literal && !punctuation ? font::bold : font::roman;
            bool hyphen = c == '-' && !literal && i > 0 && alnum(i - 1) && alnum(i + 1);
            put(f, c == '\\' ? "\\e" : c == '-' && !hyphen ? "\\-" : std::string_view(&marked[i], 1));
        }
    }
    if (current != font::roman)
        o += "\\fR";
    return !o.empty() && (o[0] == '.' || o[0] == '\'') ? "\\&" + o : o;
}

std::string tagged_paragraphs(std::span<const command_usage::item> items) {
    std::string o;
    for (const command_usage::item &i : items)
        o += ".TP\n" + roff(i.term, true) + "\n" + roff(i.text, false) + "\n";
    return o;
}

command_manual manual(const std::string &path, const command_usage::usage &u) {
    command_manual m{path, {}};
    std::string synopsis;
    for (const char *form : u.synopsis)
        synopsis += std::string(synopsis.empty() ? "" : ".br\n") + ".B " + u.name + "\n" + roff(form, true) + "\n";
    m.blocks["synopsis"] = synopsis;
    m.blocks["options"] = tagged_paragraphs(u.options) + tagged_paragraphs(u.operands);
    if (!u.environment.empty())
        m.blocks["environment"] = tagged_paragraphs(u.environment);
    m.blocks["exit-status"] = tagged_paragraphs(u.exit_statuses);
    if (u.output)
        m.blocks["output"] = roff(u.output, false) + "\n";
    return m;
}

} // namespace

std::vector<command_manual> command_manuals() {
    return {manual("man/qecfg.1.in", qecfg_usage::usage), manual("man/cdbdump.1.in", cdbdump_usage::usage),
            manual("man/qecfg-check.1.in", check_usage::usage)};
}

} // namespace docgen
