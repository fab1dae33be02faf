// The command at its limits: peak memory on a large CDB, output that cannot be
// written, input refused before it is read, memory exhausted.
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <vector>

#include <gtest/gtest.h>

#include "test_dirs.h"
#include "test_images.h"

namespace fs = std::filesystem;

namespace {
struct run_result {
    int status;
    std::string err;
    long peak_kb;
};

using cdbtest::read_text;
using cdbtest::work_dir;

std::string write_file(const work_dir &w, const std::string &name, const std::vector<uint8_t> &bytes) {
    std::ofstream(w.path / name, std::ios::binary)
        .write(reinterpret_cast<const char *>(bytes.data()), long(bytes.size()));
    return (w.path / name).string();
}

// Runs a shell command line in the work directory; its standard error, exit
// status and the peak resident memory of the command.
run_result shell(const work_dir &w, const std::string &line) {
    std::string err = (w.path / "err.txt").string();
    pid_t pid = fork();
    if (pid == 0) {
        std::string cmd = "cd '" + w.path.string() + "' && " + line + " 2>'" + err + "'";
        execl("/bin/sh", "sh", "-c", cmd.c_str(), static_cast<char *>(nullptr));
        _exit(127);
    }
    int st = 0;
    struct rusage ru {};
    wait4(pid, &st, 0, &ru);
    return run_result{WIFEXITED(st) ? WEXITSTATUS(st) : 128 + WTERMSIG(st), read_text(err), ru.ru_maxrss};
}

const std::string dump = CDBDUMP_BIN;

// A source of `classes` classes with `attrs` attributes each, every attribute
// with a default or initial value, a valid value and a variable class.
std::string large_source(int classes, int attrs) {
    std::ostringstream s;
    for (int c = 0; c < classes; c++) {
        s << "ControlDefinition\n    FileVersion=1.0.0." << c << "\nResourceClass\n    Description=1\n"
          << "    DisplayName=2\n    Properties=HasResources\n    ClassPermTemplate=t\n    ResourcePermTemplate=t\n"
          << "    Name=Large.Class" << c << "\n";
        for (int a = 0; a < attrs; a++) {
            if (a % 2)
                s << "PersistentResourceAttribute\n    Name=Attr" << a << "\n    Description=3\n    DisplayName=4\n"
                  << "    Id=" << a << "\n    DataType=String\n    VarietyRange=1,1\n    ValidValue=text" << a
                  << "\n    DefaultValue=some default text " << a << "\n";
            else
                s << "DynamicResourceAttribute\n    Name=Dyn" << a << "\n    Description=5\n    DisplayName=6\n"
                  << "    Id=" << a << "\n    DataType=Float64\n    VariableType=Quantity\n    VarietyRange=1,1\n"
                  << "    VariableClass=VC" << a % 3 << "\n    Range=0,1000\n    InitialValue=1.25\n";
        }
    }
    s << "ClassToManagerMapping\n    ResourceManager=Large.RM\n    FirstKey=1\n    LastKey=100\n";
    for (int v = 0; v < 3; v++)
        s << "ResourceVariableClass\n    VariableClass=VC" << v << "\n";
    return s.str();
}

// One large CDB for the tests that need one, compiled once.
const work_dir &large() {
    static work_dir w;
    static bool made = [] {
        std::ofstream(w.path / "large.src") << large_source(4, 6000);
        return shell(w, std::string(QECFG_BIN) + " large.src large.cdef").status == 0;
    }();
    EXPECT_TRUE(made);
    return w;
}

#if defined(__SANITIZE_ADDRESS__)
constexpr bool sanitized = true; // the sanitizers' shadow memory hides the program's own
#else
constexpr bool sanitized = false;
#endif
} // namespace

// The bounds of README.md: --check the file plus 4 times its largest dsect
// plus 8 MB; text and --json the file plus 6 times its largest dsect plus 16 MB.
TEST(Limits, PeakMemoryStaysWithinTheDocumentedBound) {
    if (sanitized)
        GTEST_SKIP() << "peak memory is not the program's own under the sanitizers";
    const work_dir &w = large();
    long file_kb = long(fs::file_size(w.path / "large.cdef") / 1024);
    ASSERT_GT(file_kb, 4000); // a size at which a copy per byte would show
    long dsect_kb = file_kb / 4;
    const std::pair<const char *, long> bounds[] = {
        {"--check", file_kb + 4 * dsect_kb + 8 * 1024},
        {"--json", file_kb + 6 * dsect_kb + 16 * 1024},
        {"", file_kb + 6 * dsect_kb + 16 * 1024},
    };
    for (const auto &[mode, bound_kb] : bounds) {
        run_result r = shell(w, dump + " " + mode + " large.cdef >/dev/null");
        EXPECT_EQ(r.status, 0) << r.err;
        EXPECT_LE(r.peak_kb, bound_kb) << mode << ": " << r.peak_kb << " KB for a file of " << file_kb << " KB";
    }
}

TEST(Limits, MemoryExhaustionEndsWithAMessage) {
    if (sanitized)
        GTEST_SKIP() << "the sanitizers need more address space than the limit leaves";
    const work_dir &w = large();
    run_result r = shell(w, "ulimit -v 40000; " + dump + " --annotate large.cdef >/dev/null");
    EXPECT_EQ(r.status, 2) << r.err;
    EXPECT_EQ(r.err, "cdbdump: out of memory\n");
}

TEST(Limits, OutputThatCannotBeWrittenIsAnError) {
    work_dir w;
    std::string good = write_file(w, "good.cdef", cdbtest::rich_image(false));
    // Every output is more than the 1 KB that the size limit leaves.
    const std::pair<const char *, const char *> sinks[] = {
        {"> /dev/full", "No space left on device"},
        {">&-", "Bad file descriptor"},
        {"> out.txt", "File too large"},
    };
    for (const char *mode : {"", "--json", "--annotate", "--source", "--help"})
        for (const auto &[redirect, reason] : sinks) {
            SCOPED_TRACE(std::string(mode) + " " + redirect);
            std::string limit = std::string(reason) == "File too large" ? "ulimit -f 1; " : "";
            run_result r = shell(w, limit + dump + " " + mode + " " + good + " " + redirect);
            EXPECT_EQ(r.status, 2);
            EXPECT_EQ(r.err, std::string("cdbdump: cannot write the output: ") + reason + "\n");
        }
    EXPECT_EQ(shell(w, dump + " --check " + good + " >&-").status, 0); // nothing to write
}

TEST(Limits, InputRefusedBeforeItIsRead) {
    work_dir w;
    std::string good = write_file(w, "good.cdef", cdbtest::one_attribute_class(false));
    fs::resize_file(write_file(w, "sparse.cdef", {}), (uint64_t(1) << 32) + 748);
    std::string length = std::to_string(fs::file_size(good) - 4);
    std::ofstream(w.path / "source.src") << large_source(1, 1);
    const std::pair<std::string, std::string> cases[] = {
        {"--check sparse.cdef",
         "sparse.cdef: offset 0: the file has 4294968044 bytes, more than the 4294967299 that a 32-bit length field "
         "can describe\n"},
        {"--check - < /dev/zero", "(standard input): offset 8: the format word reads 0x0 little-endian and 0x0 "
                                  "big-endian, not 0x666d7431 in either byte order\n"},
        {"(cat " + good + "; head -c 1000000 /dev/zero) | " + dump + " --json -",
         "(standard input): offset 0: cdb_hdr_length is " + length + ", but the file has more than " + length +
             " bytes after the length field\n"},
        {"source.src",
         "source.src: offset 8: the format word reads 0x6e696665 little-endian and 0x6566696e big-endian, "
         "not 0x666d7431 in either byte order\nsource.src: this looks like a class definition source, not "
         "a CDB; qecfg compiles it into one\n"},
    };
    for (const auto &[args, message] : cases) {
        std::string line = args.find('|') != std::string::npos ? args : dump + " " + args;
        run_result r = shell(w, line + " >/dev/null");
        EXPECT_EQ(r.status, 1) << args;
        EXPECT_EQ(r.err, message) << args;
        if (!sanitized) {
            EXPECT_LT(r.peak_kb, 64 * 1024) << args; // nothing read beyond the header
        }
    }
    run_result dir = shell(w, dump + " .");
    EXPECT_EQ(dir.status, 2);
    EXPECT_EQ(dir.err, "cdbdump: .: cannot read: Is a directory\n");
}

// --diff and --compat hold one pair of dsects and the changes of one dsect at
// a time: the two files plus 10 times the largest dsect plus 16 MB, even when
// every dsect or every attribute differs.
TEST(Limits, DiffMemoryStaysWithinAFewTimesTheFiles) {
    if (sanitized)
        GTEST_SKIP() << "peak memory is not the program's own under the sanitizers";
    const work_dir &w = large();
    std::string renamed_classes = large_source(4, 6000), renamed_attrs = renamed_classes;
    for (size_t at; (at = renamed_classes.find("Large.Class")) != std::string::npos;)
        renamed_classes.replace(at, 5, "Other");
    for (size_t at; (at = renamed_attrs.find("Name=Attr")) != std::string::npos;)
        renamed_attrs.replace(at, 9, "Name=Prop");
    std::ofstream(w.path / "classes.src") << renamed_classes;
    std::ofstream(w.path / "attrs.src") << renamed_attrs;
    ASSERT_EQ(shell(w, std::string(QECFG_BIN) + " classes.src classes.cdef").status, 0);
    ASSERT_EQ(shell(w, std::string(QECFG_BIN) + " attrs.src attrs.cdef").status, 0);
    long file_kb = long(fs::file_size(w.path / "large.cdef") / 1024);
    long bound_kb = 2 * file_kb + 10 * file_kb / 4 + 16 * 1024;
    const std::pair<const char *, int> runs[] = {
        {"--diff large.cdef classes.cdef", 1},        {"--diff --json large.cdef classes.cdef", 1},
        {"--compat --json large.cdef attrs.cdef", 1}, {"--diff large.cdef attrs.cdef", 1},
        {"--compat large.cdef large.cdef", 0},
    };
    for (const auto &[args, status] : runs) {
        run_result r = shell(w, dump + " " + args + " >/dev/null");
        EXPECT_EQ(r.status, status) << args << ": " << r.err;
        EXPECT_LE(r.peak_kb, bound_kb) << args << ": " << r.peak_kb << " KB for files of " << file_kb << " KB";
    }
}
