// qecfg_docgen: writes (or with --check verifies) the documents generated
// from the compiler's keyword table under a source tree.
#include <cstdio>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "docgen.h"

namespace {

const char *USAGE = "usage: qecfg_docgen [--check] SOURCE_DIR\n";

bool read_file(const std::string &path, std::string &text) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    text = s.str();
    return bool(in) || in.eof();
}

bool write_file(const std::string &path, const std::string &text) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    out.close();
    return bool(out);
}

struct generated_file {
    std::string path; // under the source tree
    std::string text;
};

} // namespace

int main(int argc, char **argv) {
    bool check = argc == 3 && std::strcmp(argv[1], "--check") == 0;
    if (argc != 2 + check || argv[1 + check][0] == '-') {
        std::fputs(USAGE, stderr);
        return 2;
    }
    std::string dir = argv[1 + check];
    std::string reference_path = dir + "/docs/language.md", reference;
    if (!read_file(reference_path, reference)) {
        std::fprintf(stderr, "qecfg_docgen: cannot read %s\n", reference_path.c_str());
        return 2;
    }
    std::string missing;
    std::string filled = docgen::fill_blocks(reference, docgen::reference_blocks(), missing);
    if (!missing.empty()) {
        std::fprintf(stderr, "%s: generated blocks to add or remove: %s\n", reference_path.c_str(), missing.c_str());
        return 1;
    }
    std::vector<generated_file> files = {
        {"docs/language.md", filled},
        {"docs/qecfg-src.5", docgen::man_page(filled)},
        {"editors/vim/syntax/qecfg.vim", docgen::vim_syntax()},
        {"editors/vscode/syntaxes/qecfg.tmLanguage.json", docgen::textmate_grammar()},
    };
    for (const docgen::command_manual &m : docgen::command_manuals()) {
        std::string path = dir + "/" + m.path, page;
        if (!read_file(path, page)) {
            std::fprintf(stderr, "qecfg_docgen: cannot read %s\n", path.c_str());
            return 2;
        }
        files.push_back({m.path, docgen::fill_blocks(page, m.blocks, missing, docgen::roff_markers)});
        if (!missing.empty()) {
            std::fprintf(stderr, "%s: generated blocks to add or remove: %s\n", path.c_str(), missing.c_str());
            return 1;
        }
    }
    int status = 0;
    for (const generated_file &f : files) {
        std::string path = dir + "/" + f.path, current;
        bool readable = read_file(path, current);
        if (readable && current == f.text)
            continue;
        if (check) {
            std::fprintf(stderr, "%s: out of date with the tables it is generated from; run qecfg_docgen %s\n",
                         path.c_str(), dir.c_str());
            status = 1;
        } else if (!write_file(path, f.text)) {
            std::fprintf(stderr, "qecfg_docgen: cannot write %s\n", path.c_str());
            return 2;
        }
    }
    return status;
}
