// Sources made by mutating the end-to-end and example sources: indentation,
// trailing blanks, comments, long lines, lines removed or repeated, values
// replaced. Reproducible from their seed.
#ifndef LSP_GENERATED_SOURCES_H
#define LSP_GENERATED_SOURCES_H

#include <random>
#include <string>
#include <vector>

#include "e2e_support.h"
#include "lsp_support.h"

inline std::vector<std::string> split_lines(const std::string &text) {
    std::vector<std::string> lines;
    size_t pos = 0;
    for (size_t nl; (nl = text.find('\n', pos)) != std::string::npos; pos = nl + 1)
        lines.push_back(text.substr(pos, nl - pos));
    if (pos < text.size())
        lines.push_back(text.substr(pos));
    return lines;
}

inline std::string mutate(const std::string &text, std::mt19937 &rng) {
    static const char *const INDENTS[] = {"", " ", "    ", "\t", " \t ", "\t\t"};
    static const char *const VALUES[] = {"0", "-1", "abc", "0x1g", "1,0", "\"\"", "00ff", "Uint32", "x y", "\"a # b\""};
    std::vector<std::string> lines = split_lines(text);
    bool final_newline = !text.empty() && text.back() == '\n';
    for (int n = 1 + int(rng() % 4); n > 0 && !lines.empty(); n--) {
        size_t i = rng() % lines.size();
        std::string &l = lines[i];
        size_t body = l.find_first_not_of(" \t");
        switch (rng() % 9) {
        case 0: l = INDENTS[rng() % 6] + (body == std::string::npos ? "" : l.substr(body)); break;
        case 1: l += rng() % 2 ? "  \t" : " # trailing"; break;
        case 2: lines.erase(lines.begin() + long(i)); break;
        case 3: lines.insert(lines.begin() + long(i), l); break;
        case 4:
            if (l.find('=') != std::string::npos)
                l = l.substr(0, l.find('=') + 1) + VALUES[rng() % 10];
            break;
        case 5: lines.insert(lines.begin() + long(i), "    Name=" + std::string(250 + rng() % 20, 'n')); break;
        case 6: lines.insert(lines.begin() + long(i), rng() % 2 ? "  // a comment" : "   "); break;
        case 7: final_newline = !final_newline; break;
        default: l = INDENTS[rng() % 6] + l; break;
        }
    }
    std::string out;
    for (size_t i = 0; i < lines.size(); i++)
        out += lines[i] + (i + 1 < lines.size() || final_newline ? "\n" : "");
    return out;
}

// The sources of the end-to-end cases and examples, then `count` mutations.
inline std::vector<std::string> test_sources(size_t count) {
    std::vector<std::string> bases;
    for (const std::filesystem::path &p : e2e::all_sources())
        bases.push_back(slurp(p.string()));
    std::vector<std::string> all = bases;
    std::mt19937 rng(19);
    for (size_t i = 0; i < count; i++)
        all.push_back(mutate(bases[rng() % bases.size()], rng));
    return all;
}

#endif
