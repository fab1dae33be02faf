// A scratch directory for tests of the output file, sources of chosen sizes,
// and the listing that shows what a compile left behind.
#ifndef OUTPUT_SUPPORT_H
#define OUTPUT_SUPPORT_H

#include <gtest/gtest.h>

#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>
#include <set>

#include "compile_support.h"
#include "e2e_support.h"

namespace output_test {

namespace fs = std::filesystem;

// Stanzas of `attrs` string attributes for the class before them.
inline std::string attribute_stanzas(int attrs) {
    std::string s;
    for (int i = 0; i < attrs; i++)
        s += "PersistentResourceAttribute\n    Name=attribute_" + std::to_string(i) +
             "\n    Description=1\n    DisplayName=2\n    Id=" + std::to_string(i) +
             "\n    DataType=String\n    VarietyRange=1,1\n    DefaultValue=value_of_attribute_" + std::to_string(i) +
             "\n";
    return s;
}

// BASE_SOURCE with `attrs` string attributes: the image grows with attrs.
inline std::string attributes_source(int attrs) { return BASE_SOURCE + attribute_stanzas(attrs); }

inline std::string image_of(const std::string &source) {
    compile_result r = compile_text(source);
    EXPECT_EQ(r.message, "");
    return r.cdb;
}

// The entries of a directory, by name.
inline std::set<std::string> entries(const fs::path &dir) {
    std::set<std::string> names;
    for (const auto &e : fs::directory_iterator(dir))
        names.insert(e.path().filename().string());
    return names;
}

// Run in a child before the program: an unprivileged user, so that
// permissions hold even when the tests run as the superuser.
inline void unprivileged() {
    if (geteuid() != 0)
        return;
    if (setgroups(0, nullptr) != 0 || setgid(65534) != 0 || setuid(65534) != 0)
        _exit(126);
}

// Starts the qecfg binary in a directory on input.src into out.cdef.
inline pid_t start_qecfg(const fs::path &dir) {
    pid_t pid = fork();
    if (pid == 0) {
        if (chdir(dir.c_str()) != 0)
            _exit(127);
        execl(QECFG_BIN, "qecfg", "input.src", "out.cdef", static_cast<char *>(nullptr));
        _exit(127);
    }
    return pid;
}

struct OutputDir : ::testing::Test {
    fs::path work;
    void SetUp() override {
        setenv("ZU_CDB_FORCE_EMPTY_TIMESTAMP", "1", 1);
        char tmpl[] = "/tmp/qecfg-output-XXXXXX";
        work = mkdtemp(tmpl);
        fs::permissions(work, fs::perms(0755)); // reachable by the unprivileged user
    }
    void TearDown() override {
        fs::permissions(work, fs::perms(0755));
        fs::remove_all(work);
    }
    void write(const std::string &name, const std::string &bytes) {
        std::ofstream(work / name, std::ios::binary) << bytes;
    }
    // Runs the qecfg binary in the directory on input.src.
    e2e::run_result qecfg(const std::vector<std::string> &args, const std::function<void()> &setup = {}) {
        e2e::run_result r = e2e::run(work, QECFG_BIN, args, {}, setup);
        fs::remove(work.string() + ".stdout");
        fs::remove(work.string() + ".stderr");
        return r;
    }
};

} // namespace output_test

#endif
