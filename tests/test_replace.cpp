// Atomic replacement of the output: readers of the old file, compiles racing
// into one name, and compiles ended by a signal while they write.
#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/wait.h>

#include "output_support.h"

namespace {

using namespace output_test;
using clock_type = std::chrono::steady_clock;

// Memory shared with forked children.
template <typename T> T *shared_object() {
    void *p = mmap(nullptr, sizeof(T), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    return p == MAP_FAILED ? nullptr : new (p) T{};
}

// The whole content of a file, read through a mapping as a reader would.
std::string mapped_content(const fs::path &p) {
    int fd = open(p.c_str(), O_RDONLY);
    if (fd < 0)
        return "";
    struct stat st;
    std::string bytes;
    if (fstat(fd, &st) == 0 && st.st_size > 0) {
        void *m = mmap(nullptr, size_t(st.st_size), PROT_READ, MAP_SHARED, fd, 0);
        if (m != MAP_FAILED) {
            bytes.assign(static_cast<const char *>(m), size_t(st.st_size));
            munmap(m, size_t(st.st_size));
        }
    }
    close(fd);
    return bytes;
}

void compile_into(const std::string &source, const fs::path &out) {
    qecfg::result r = qecfg::compile_to_file(qecfg::source::bytes("input.src", source), out.string());
    EXPECT_EQ(r.message, "");
}

struct Replace : OutputDir {
    const std::string small_src = attributes_source(1), large_src = attributes_source(3000);
    const std::string small = image_of(small_src), large = image_of(large_src);
};

TEST_F(Replace, ReaderOfTheOldFileKeepsItWhileNewOnesAreComplete) {
    struct shared {
        std::atomic<bool> stop{false};
        std::atomic<int> reads{0}, torn{0};
    } *s = shared_object<shared>();
    ASSERT_NE(s, nullptr);
    fs::path out = work / "out.cdef";
    compile_into(small_src, out);
    pid_t reader = fork();
    if (reader == 0) {
        // The mapping of the old file stays whole however often the name is
        // replaced; every new open sees one complete image.
        int fd = open(out.c_str(), O_RDONLY);
        void *old = mmap(nullptr, small.size(), PROT_READ, MAP_SHARED, fd, 0);
        while (!s->stop) {
            std::string now = mapped_content(out);
            if (std::memcmp(old, small.data(), small.size()) != 0 || (now != small && now != large))
                s->torn++;
            s->reads++;
        }
        _exit(0);
    }
    auto end = clock_type::now() + std::chrono::seconds(2);
    int replaced = 0;
    for (; replaced < 400 && clock_type::now() < end; replaced++)
        compile_into(replaced % 2 ? small_src : large_src, out);
    s->stop = true;
    int status = 0;
    waitpid(reader, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << "reader ended by signal " << WTERMSIG(status);
    EXPECT_EQ(s->torn, 0);
    EXPECT_GT(s->reads, 0);
    EXPECT_EQ(e2e::read_file(out), replaced % 2 ? large : small);
    EXPECT_EQ(entries(work), std::set<std::string>{"out.cdef"});
}

TEST_F(Replace, RacingCompilesLeaveOneOfTheirImages) {
    fs::path out = work / "out.cdef";
    auto end = clock_type::now() + std::chrono::seconds(3);
    for (int round = 0; round < 60 && clock_type::now() < end; round++) {
        int go[2];
        ASSERT_EQ(pipe(go), 0);
        pid_t racers[2];
        for (int i = 0; i < 2; i++) {
            racers[i] = fork();
            if (racers[i] == 0) {
                char c;
                close(go[1]);
                if (read(go[0], &c, 1) < 0)
                    _exit(3);
                compile_into(i ? small_src : large_src, out);
                _exit(::testing::Test::HasFailure() ? 1 : 0);
            }
        }
        close(go[0]);
        close(go[1]); // both start now
        for (pid_t p : racers) {
            int status = 0;
            waitpid(p, &status, 0);
            ASSERT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << "round " << round;
        }
        std::string result = e2e::read_file(out);
        ASSERT_TRUE(result == small || result == large) << "round " << round << ": " << result.size() << " bytes";
        ASSERT_EQ(entries(work), std::set<std::string>{"out.cdef"}) << "round " << round;
    }
}

// A source large enough that its image takes a while to lay down.
std::string large_source() {
    std::string s = attributes_source(20000);
    for (int cls = 1; cls < 6; cls++)
        s += "ControlDefinition\n    FileVersion=1.0\nResourceClass\n    Description=1\n    DisplayName=2\n    Properties=HasResources\n"
             "    ClassPermTemplate=t\n    ResourcePermTemplate=t\n    Name=Test.Class" +
             std::to_string(cls) + "\n" + attribute_stanzas(20000);
    return s;
}

struct Interrupt : Replace, ::testing::WithParamInterface<int> {};

// Starts the compile, waits until its temporary file is there, then sends
// the signal. False when the compile had finished first.
bool signal_mid_write(const fs::path &work, int sig, int &status) {
    pid_t pid = start_qecfg(work);
    for (;;) {
        if (waitpid(pid, &status, WNOHANG) == pid)
            return false;
        for (const std::string &name : entries(work))
            if (name.rfind(".out.cdef.", 0) == 0) {
                kill(pid, sig);
                waitpid(pid, &status, 0);
                return true;
            }
        usleep(200);
    }
}

TEST_P(Interrupt, MidWriteLeavesTheOldFile) {
    const int sig = GetParam();
    write("input.src", large_source());
    write("out.cdef", small);
    int status = 0;
    bool caught = false;
    for (int attempt = 0; attempt < 3 && !caught; attempt++) {
        caught = signal_mid_write(work, sig, status) && WIFSIGNALED(status);
        if (!caught)
            write("out.cdef", small); // it finished first: try again
    }
    ASSERT_TRUE(caught) << "the compile never was caught writing";
    EXPECT_EQ(WTERMSIG(status), sig);
    EXPECT_EQ(e2e::read_file(work / "out.cdef"), small);
    std::set<std::string> left = entries(work);
    left.erase("input.src");
    left.erase("out.cdef");
    // Only SIGKILL, which cannot be caught, may leave the temporary file,
    // and that never has the output's name.
    if (sig != SIGKILL) {
        EXPECT_TRUE(left.empty()) << *left.begin();
    }
    for (const std::string &name : left)
        EXPECT_EQ(name.rfind(".out.cdef.tmp-", 0), 0u) << name;
}

INSTANTIATE_TEST_SUITE_P(Signals, Interrupt, ::testing::Values(SIGINT, SIGTERM, SIGHUP, SIGKILL),
                         [](const ::testing::TestParamInfo<int> &i) { return std::string(sigabbrev_np(i.param)); });

} // namespace
