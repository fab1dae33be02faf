// The output path under faults: every failure gives its message and status
// and leaves no output file behind, and never removes what is not a regular
// file.
#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <sys/resource.h>
#include <sys/stat.h>

#include <fstream>

#include "e2e_support.h"

namespace fs = std::filesystem;

namespace {

struct OutputFault : ::testing::Test {
    fs::path work;
    void SetUp() override {
        char tmpl[] = "/tmp/qecfg-fault-XXXXXX";
        work = mkdtemp(tmpl);
        fs::copy_file(fs::path(QECFG_SOURCE_DIR) / "examples" / "disk.src", work / "input.src");
    }
    void TearDown() override { fs::remove_all(work); }
    e2e::run_result compile(const std::string &out, const std::function<void()> &setup = {}) {
        e2e::run_result r = e2e::run(work, QECFG_BIN, {"input.src", out}, {}, setup);
        fs::remove(work.string() + ".stdout");
        fs::remove(work.string() + ".stderr");
        return r;
    }
};

TEST_F(OutputFault, FileSizeLimitStopsTheExtension) {
    e2e::run_result r = compile("out.cdef", [] {
        signal(SIGXFSZ, SIG_IGN);
        struct rlimit rl{2048, 2048};
        setrlimit(RLIMIT_FSIZE, &rl);
    });
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "Cannot extend CDB file: File too large\n");
    EXPECT_FALSE(fs::exists(work / "out.cdef"));
}

TEST_F(OutputFault, MissingDirectory) {
    e2e::run_result r = compile("no/such/dir/out.cdef");
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "Cannot create CDB file: No such file or directory\n");
}

TEST_F(OutputFault, OutputIsADirectory) {
    fs::create_directory(work / "d.cdef");
    e2e::run_result r = compile("d.cdef");
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "Cannot create CDB file: Is a directory\n");
    EXPECT_TRUE(fs::is_directory(work / "d.cdef"));
}

TEST_F(OutputFault, FifoIsRefusedAndKept) {
    ASSERT_EQ(mkfifo((work / "f.cdef").c_str(), 0600), 0);
    e2e::run_result r = compile("f.cdef");
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "Cannot map CDB file: Invalid argument\n");
    EXPECT_TRUE(fs::is_fifo(work / "f.cdef"));
}

TEST_F(OutputFault, MemoryExhaustionStopsWithItsErrorNumber) {
#if defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "the sanitizer runtime needs more address space than the limit leaves";
#else
    // One attribute whose array default needs far more memory than allowed.
    std::ofstream src(work / "input.src", std::ios::app);
    src << "PersistentResourceAttribute\n    Name=big\n    Description=1\n    DisplayName=2\n    Id=99\n"
           "    DataType=StringArray\n    VarietyRange=1,1\n";
    for (int i = 0; i < 100000; i++)
        src << "    DefaultValue=" << std::string(200, 'v') << i << "\n";
    src.close();
    e2e::run_result r = compile("out.cdef", [] {
        struct rlimit rl{32 << 20, 32 << 20};
        setrlimit(RLIMIT_AS, &rl);
    });
    EXPECT_EQ(r.status, ENOMEM);
    EXPECT_NE(r.err.find(": Cannot allocate memory\n"), std::string::npos) << r.err;
    EXPECT_FALSE(fs::exists(work / "out.cdef"));
#endif
}

TEST_F(OutputFault, ExistingOutputIsKeptWhenTheSourceFails) {
    std::ofstream(work / "out.cdef") << "previous";
    std::ofstream(work / "input.src", std::ios::app) << "Bogus\n";
    e2e::run_result r = compile("out.cdef");
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(e2e::read_file(work / "out.cdef"), "previous");
}

TEST_F(OutputFault, ExistingOutputIsReplacedOnSuccess) {
    std::ofstream(work / "out.cdef") << std::string(100000, 'x');
    e2e::run_result r = compile("out.cdef");
    EXPECT_EQ(r.status, 0);
    std::string b = e2e::read_file(work / "out.cdef");
    EXPECT_TRUE(e2e::check_cdb(b, false).empty());
    EXPECT_LT(b.size(), 100000u);
}

} // namespace
