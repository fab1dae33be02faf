// Atomic replacement of the output: readers of the old file, compiles racing
// into one name, and compiles ended by a signal while they write.
#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <fcntl.h>
#include <fstream>
#include <sys/mman.h>
#include <sys/wait.h>

#include "output_support.h"

namespace {

using namespace output_test;
using clock_type = std::chrono::steady_clock;

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

// Whether the process has a file of the directory mapped: it is filling the
// image.
bool maps_file_in(pid_t pid, const fs::path &dir) {
    std::ifstream maps("/proc/" + std::to_string(pid) + "/maps");
    const std::string prefix = " " + dir.string() + "/";
    for (std::string line; std::getline(maps, line);)
        if (line.find(prefix) != std::string::npos)
            return true;
    return false;
}

// Starts the compile, waits until it fills the image, then sends the
// signal. False when the compile had finished first.
bool signal_mid_write(const fs::path &work, const std::vector<std::string> &env, int sig, int &status) {
    pid_t pid = start_qecfg(work, env);
    for (;;) {
        if (waitpid(pid, &status, WNOHANG) == pid)
            return false;
        if (maps_file_in(pid, work)) {
            kill(pid, sig);
            waitpid(pid, &status, 0);
            return true;
        }
        usleep(200);
    }
}

struct interrupt_case {
    int sig;
    bool named; // a file system without unnamed temporary files
};

struct Interrupt : Replace, ::testing::WithParamInterface<interrupt_case> {
    // Kills a compile over out.cdef mid-write; the old file stays. Returns
    // what else the directory holds.
    std::set<std::string> interrupted() {
        const interrupt_case c = GetParam();
        write("input.src", large_source());
        write("out.cdef", small);
        int status = 0;
        bool caught = false;
        for (int attempt = 0; attempt < 3 && !caught; attempt++) {
            caught =
                signal_mid_write(work, c.named ? named_temporaries() : std::vector<std::string>{}, c.sig, status) &&
                WIFSIGNALED(status);
            if (!caught)
                write("out.cdef", small); // it finished first: try again
        }
        EXPECT_TRUE(caught) << "the compile never was caught writing";
        EXPECT_EQ(WTERMSIG(status), c.sig);
        EXPECT_EQ(e2e::read_file(work / "out.cdef"), small);
        std::set<std::string> left = entries(work);
        left.erase("input.src");
        left.erase("out.cdef");
        return left;
    }
};

// Every signal that ends the process and can be caught removes the
// temporary file.
TEST_P(Interrupt, MidWriteLeavesTheOldFileAndNothingElse) {
    std::set<std::string> left = interrupted();
    EXPECT_TRUE(left.empty()) << *left.begin();
}

INSTANTIATE_TEST_SUITE_P(Signals, Interrupt,
                         ::testing::Values(interrupt_case{SIGINT, false}, interrupt_case{SIGTERM, true},
                                           interrupt_case{SIGHUP, true}, interrupt_case{SIGINT, true},
                                           interrupt_case{SIGPIPE, true}, interrupt_case{SIGUSR1, true},
                                           interrupt_case{SIGUSR2, true}, interrupt_case{SIGALRM, true},
                                           interrupt_case{SIGXCPU, true}, interrupt_case{SIGQUIT, true}),
                         [](const ::testing::TestParamInfo<interrupt_case> &i) {
                             return std::string(sigabbrev_np(i.param.sig)) + (i.param.named ? "_named" : "_unnamed");
                         });

struct Killed : Interrupt {};

// SIGKILL cannot be caught: an unnamed temporary file goes with the process;
// a named one stays, never under the output's name, until the next compile
// of that output removes it.
TEST_P(Killed, LeavesNothingOnceTheNextCompileRan) {
    std::set<std::string> left = interrupted();
    if (GetParam().named) {
        EXPECT_FALSE(left.empty()) << "the killed compile left its named temporary file";
    } else {
        EXPECT_TRUE(left.empty()) << *left.begin();
    }
    for (const std::string &name : left)
        EXPECT_EQ(name.rfind(".out.cdef.tmp-", 0), 0u) << name;
    write("input.src", small_src);
    ASSERT_EQ(qecfg({"input.src", "out.cdef"}).status, 0);
    EXPECT_EQ(entries(work), (std::set<std::string>{"input.src", "out.cdef"}));
}

INSTANTIATE_TEST_SUITE_P(Signals, Killed,
                         ::testing::Values(interrupt_case{SIGKILL, false}, interrupt_case{SIGKILL, true}),
                         [](const ::testing::TestParamInfo<interrupt_case> &i) {
                             return std::string(i.param.named ? "named" : "unnamed");
                         });

} // namespace
