// A temporary directory for the tests that run the programs, removed with the
// object, and reading a file back.
#ifndef CDBDUMP_TEST_DIRS_H
#define CDBDUMP_TEST_DIRS_H

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

namespace cdbtest {

struct work_dir {
    std::filesystem::path path;
    explicit work_dir(const char *prefix = "cdbdump_test") {
        std::string tmpl = (std::filesystem::temp_directory_path() / (std::string(prefix) + "_XXXXXX")).string();
        path = mkdtemp(tmpl.data());
    }
    work_dir(const work_dir &) = delete;
    work_dir &operator=(const work_dir &) = delete;
    ~work_dir() { std::filesystem::remove_all(path); }
};

inline std::string read_text(const std::filesystem::path &p) {
    std::ifstream in(p, std::ios::binary);
    std::stringstream s;
    s << in.rdbuf();
    return s.str();
}

} // namespace cdbtest

#endif
