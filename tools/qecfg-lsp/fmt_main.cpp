// qecfg-fmt: the canonical layout of class definition sources, for scripts
// and CI. Without files it formats standard input to standard output.
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string>
#include <sys/stat.h>
#include <vector>

#include "format.h"

namespace {

const char USAGE[] = "usage: qecfg-fmt [-i | --check] [FILE...]\n"
                     "  (no option)  write each formatted source to standard output\n"
                     "  -i           rewrite each file in place\n"
                     "  --check      list the files that are not formatted; exit status 1 if any\n"
                     "  -h, --help   show this help and exit\n"
                     "  --version    show the version and exit\n";

enum class mode { print, in_place, check };

bool read_all(std::istream &in, std::string &text) {
    std::ostringstream s;
    s << in.rdbuf();
    text = s.str();
    return !in.bad();
}

// Replaces a file through a temporary file beside it, so that a failure
// leaves the old text; the file keeps its permission bits.
bool write_file(const std::string &path, const std::string &text) {
    struct stat old {};
    if (stat(path.c_str(), &old) != 0)
        return false;
    std::string tmp = path + ".qecfg-fmt.tmp";
    {
        std::ofstream out(tmp, std::ios::binary | std::ios::trunc);
        out << text;
        if (!out.flush())
            return std::remove(tmp.c_str()), false;
    }
    if (chmod(tmp.c_str(), old.st_mode & 07777) != 0 || std::rename(tmp.c_str(), path.c_str()) != 0)
        return std::remove(tmp.c_str()), false;
    return true;
}

int format_file(const std::string &path, mode m) {
    std::string text;
    std::ifstream in(path, std::ios::binary);
    if (!in || !read_all(in, text)) {
        std::fprintf(stderr, "qecfg-fmt: %s: %s\n", path.c_str(), std::strerror(errno));
        return 2;
    }
    std::string formatted = lsp::format_source(text);
    if (m == mode::print) {
        std::cout << formatted;
        return std::cout ? 0 : 2;
    }
    if (formatted == text)
        return 0;
    if (m == mode::check) {
        std::cout << path << "\n";
        return 1;
    }
    if (!write_file(path, formatted)) {
        std::fprintf(stderr, "qecfg-fmt: %s: cannot write: %s\n", path.c_str(), std::strerror(errno));
        return 2;
    }
    return 0;
}

} // namespace

int main(int argc, char **argv) {
    mode m = mode::print;
    std::vector<std::string> files;
    for (int i = 1; i < argc; i++) {
        std::string a = argv[i];
        if (a == "-i" || a == "--check") {
            m = a == "-i" ? mode::in_place : mode::check;
        } else if (a == "-h" || a == "--help" || a == "--version") {
            std::fputs(a == "--version" ? "qecfg-fmt " QECFG_VERSION "\n" : USAGE, stdout);
            return std::fflush(stdout) == 0 ? 0 : 2;
        } else if (a.size() > 1 && a[0] == '-') {
            std::fprintf(stderr, "qecfg-fmt: unknown option %s\n%s", a.c_str(), USAGE);
            return 2;
        } else {
            files.push_back(a);
        }
    }
    if (files.empty()) {
        std::string text;
        if (m != mode::print || !read_all(std::cin, text)) {
            std::fputs(USAGE, stderr);
            return 2;
        }
        std::cout << lsp::format_source(text);
        return std::cout.flush() ? 0 : 2;
    }
    int status = 0;
    for (const std::string &f : files)
        status = std::max(status, format_file(f, m));
    std::cout.flush();
    return std::cout ? status : 2;
}
