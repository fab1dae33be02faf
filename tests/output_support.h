// A scratch directory for tests of the output file, sources of chosen sizes,
// and the listing that shows what a compile left behind.
#ifndef OUTPUT_SUPPORT_H
#define OUTPUT_SUPPORT_H

#include <gtest/gtest.h>

#include <grp.h>
#include <sys/mman.h>
#include <sys/resource.h>
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

// A source large enough that its image takes a while to lay down.
inline std::string large_source() {
    std::string s = attributes_source(20000);
    for (int cls = 1; cls < 6; cls++)
        s += "ControlDefinition\n    FileVersion=1.0\nResourceClass\n    Description=1\n    DisplayName=2\n    "
             "Properties=HasResources\n"
             "    ClassPermTemplate=t\n    ResourcePermTemplate=t\n    Name=Test.Class" +
             std::to_string(cls) + "\n" + attribute_stanzas(20000);
    return s;
}

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

// Run in a child before the program: becomes the user uid (group uid), or
// ends the child with status 126.
inline void become_user(uid_t uid) {
    if (setgroups(0, nullptr) != 0 || setgid(gid_t(uid)) != 0 || setuid(uid) != 0)
        _exit(126);
}

// Two users other than the superuser, for tests of a shared directory: one
// plants files, the other compiles.
constexpr uid_t OTHER_USER = 65534, COMPILING_USER = 65533;

// Run in a child before the program: an unprivileged user, so that
// permissions hold even when the tests run as the superuser.
inline void unprivileged() {
    if (geteuid() == 0)
        become_user(OTHER_USER);
}

// The environment that preloads the fault injector (see fault_shim.cpp):
// `fault` is NAME:N:ERRNO or empty; `hit` the file created when it fired.
inline std::vector<std::string> injected(const std::string &fault, const fs::path &hit = {},
                                         bool unnamed_files = true) {
    std::vector<std::string> env = {std::string("LD_PRELOAD=") + QECFG_FAULT_SHIM,
                                    // a sanitizer's runtime must otherwise come first
                                    "ASAN_OPTIONS=verify_asan_link_order=0"};
    if (!fault.empty())
        env.push_back("QECFG_FAULT=" + fault);
    if (!hit.empty())
        env.push_back("QECFG_FAULT_HIT=" + hit.string());
    if (!unnamed_files)
        env.push_back("QECFG_NO_TMPFILE=1");
    return env;
}

// The file system as one without unnamed temporary files: the temporary
// file then has a name.
inline std::vector<std::string> named_temporaries() { return injected("", {}, false); }

// Starts the qecfg binary in a directory on input.src into out.cdef, with
// NAME=VALUE environment additions; a signal that dumps core leaves none.
inline pid_t start_qecfg(const fs::path &dir, const std::vector<std::string> &env = {}) {
    pid_t pid = fork();
    if (pid == 0) {
        struct rlimit no_core {};
        setrlimit(RLIMIT_CORE, &no_core);
        if (chdir(dir.c_str()) != 0)
            _exit(127);
        for (const std::string &kv : env)
            putenv(strdup(kv.c_str()));
        execl(QECFG_BIN, "qecfg", "input.src", "out.cdef", static_cast<char *>(nullptr));
        _exit(127);
    }
    return pid;
}

// Memory shared with forked children.
template <typename T> T *shared_object() {
    void *p = mmap(nullptr, sizeof(T), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    return p == MAP_FAILED ? nullptr : new (p) T{};
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
    // Runs the qecfg binary in the directory, with NAME=VALUE environment
    // additions.
    e2e::run_result qecfg(const std::vector<std::string> &args, const std::function<void()> &setup = {},
                          const std::vector<std::string> &env = {}) {
        e2e::run_result r = e2e::run(work, QECFG_BIN, args, env, setup);
        fs::remove(work.string() + ".stdout");
        fs::remove(work.string() + ".stderr");
        return r;
    }
};

} // namespace output_test

#endif
