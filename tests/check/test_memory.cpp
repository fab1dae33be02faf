// Exhausted memory is a finding like any other: "out of memory" and status
// 2, never an uncaught exception. The limit is set in a forked child, which
// a sanitizer's own large reservations would defeat.
#include <gtest/gtest.h>

#include <sys/resource.h>
#include <sys/wait.h>

#include "check_support.h"

namespace {

#if defined(__SANITIZE_ADDRESS__)
constexpr bool UNDER_SANITIZER = true;
#else
constexpr bool UNDER_SANITIZER = false;
#endif

// The address space this process maps now, in bytes.
size_t mapped_now() {
    std::ifstream statm("/proc/self/statm");
    size_t pages = 0;
    statm >> pages;
    return pages * size_t(sysconf(_SC_PAGESIZE));
}

TEST(Memory, ExhaustedMemoryIsReportedWithStatus2) {
    if (UNDER_SANITIZER)
        GTEST_SKIP() << "the sanitizer reserves more address space than any limit leaves";
    namespace fs = std::filesystem;
    fs::path src = fs::temp_directory_path() / ("qecfg-check-oom-" + std::to_string(getpid()) + ".src");
    constexpr size_t SOURCE_BYTES = size_t(64) << 20; // more than the limit leaves
    std::ofstream(src).close();
    fs::resize_file(src, SOURCE_BYTES);
    std::FILE *out = std::tmpfile(), *err = std::tmpfile(); // shared with the child
    ASSERT_TRUE(out && err);
    pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        rlimit limit{mapped_now() + (size_t(16) << 20), RLIM_INFINITY};
        limit.rlim_max = limit.rlim_cur;
        setrlimit(RLIMIT_AS, &limit);
        _exit(check::checker_main({src.string()}, out, err));
    }
    int wait_status = 0;
    waitpid(child, &wait_status, 0);
    fs::remove(src);
    ASSERT_TRUE(WIFEXITED(wait_status)) << "killed by signal " << WTERMSIG(wait_status);
    EXPECT_EQ(WEXITSTATUS(wait_status), 2);
    std::rewind(err);
    char text[256] = {};
    EXPECT_EQ(std::string(text, std::fread(text, 1, sizeof text - 1, err)), src.string() + ": error: out of memory\n");
    std::fclose(out);
    std::fclose(err);
}

} // namespace
