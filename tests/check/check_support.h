// Running the checker in-process on a source given as text.
#ifndef CHECK_SUPPORT_H
#define CHECK_SUPPORT_H

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <unistd.h>
#include <vector>

#include "checker.h"
#include "compile_support.h"

struct check_run {
    int status = -1;
    std::string out, err;
};

inline check_run run_checker(const std::vector<std::string> &args) {
    captured_stream out, err;
    check_run r;
    r.status = check::checker_main(args, out.file(), err.file());
    r.out = out.text();
    r.err = err.text();
    return r;
}

// Writes `source` to a temporary file named input.src and checks it with
// the options given; the file name in messages is "input.src".
inline check_run check_text(const std::string &source, std::vector<std::string> options = {}) {
    namespace fs = std::filesystem;
    static int serial = 0;
    fs::path dir =
        fs::temp_directory_path() / ("qecfg-check-" + std::to_string(getpid()) + "-" + std::to_string(serial++));
    fs::create_directories(dir);
    std::ofstream(dir / "input.src", std::ios::binary) << source;
    fs::path here = fs::current_path();
    fs::current_path(dir);
    options.push_back("input.src");
    check_run r = run_checker(options);
    fs::current_path(here);
    fs::remove_all(dir);
    return r;
}

// The line number of the first line holding `marker`.
inline int line_of(const std::string &text, const std::string &marker) {
    size_t at = text.find(marker);
    int line = 1;
    for (size_t i = 0; i < at && i < text.size(); i++)
        line += text[i] == '\n';
    return at == std::string::npos ? 0 : line;
}

#endif
