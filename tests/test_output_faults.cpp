// The output file under faults and odd names: every failure gives its message
// and status and leaves the directory as it was; a replaced file keeps its
// permissions, owner and links; where no temporary file can be made the
// output is written in place.
#include <csignal>
#include <sys/resource.h>
#include <sys/wait.h>

#include "output_support.h"

namespace {

using namespace output_test;

struct OutputFault : OutputDir {
    std::string old_image;
    void SetUp() override {
        OutputDir::SetUp();
        old_image = image_of(attributes_source(1));
        fs::copy_file(fs::path(QECFG_SOURCE_DIR) / "examples" / "disk.src", work / "input.src");
    }
};

struct failure_case {
    const char *name;
    std::function<void(OutputFault &)> prepare;
    std::string output;
    std::function<void()> child_setup;
    std::string err;
};

TEST_F(OutputFault, EachFailureLeavesTheDirectoryAsItWas) {
    const failure_case cases[] = {
        {"source error",
         [](OutputFault &t) { t.write("input.src", BASE_SOURCE + "Bogus\n"); },
         "out.cdef",
         {},
         "16: Invalid table name: Bogus\n"},
        {"file size limit",
         {},
         "out.cdef",
         [] {
             struct rlimit rl {
                 4096, 4096
             };
             setrlimit(RLIMIT_FSIZE, &rl);
         },
         "Cannot extend CDB file: File too large\n"},
        {"missing directory", {}, "no/such/dir/out.cdef", {}, "Cannot create CDB file: No such file or directory\n"},
        {"directory as output",
         [](OutputFault &t) { fs::create_directory(t.work / "d.cdef"); },
         "d.cdef",
         {},
         "Cannot create CDB file: Is a directory\n"},
        {"read-only directory", [](OutputFault &t) { fs::permissions(t.work, fs::perms(0555)); }, "new.cdef",
         unprivileged, "Cannot create CDB file: Permission denied\n"},
        {"output not writable",
         [](OutputFault &t) {
             fs::permissions(t.work, fs::perms(0777));
             fs::permissions(t.work / "out.cdef", fs::perms(0444));
         },
         "out.cdef", unprivileged, "Cannot create CDB file: Permission denied\n"},
        {"FIFO",
         [](OutputFault &t) { ASSERT_EQ(mkfifo((t.work / "f.cdef").c_str(), 0600), 0); },
         "f.cdef",
         {},
         "Cannot map CDB file: Invalid argument\n"},
        {"output is the source", {}, "input.src", {}, "Cannot create CDB file: Output is the source file\n"},
        {"output links to the source",
         [](OutputFault &t) { fs::create_symlink("input.src", t.work / "l.cdef"); },
         "l.cdef",
         {},
         "Cannot create CDB file: Output is the source file\n"},
        {"output is a hard link of the source",
         [](OutputFault &t) { fs::create_hard_link(t.work / "input.src", t.work / "h.cdef"); },
         "h.cdef",
         {},
         "Cannot create CDB file: Output is the source file\n"},
    };
    for (const failure_case &c : cases) {
        SCOPED_TRACE(c.name);
        TearDown();
        SetUp();
        write("out.cdef", old_image);
        if (c.prepare)
            c.prepare(*this);
        std::set<std::string> before = entries(work);
        std::string source = e2e::read_file(work / "input.src");
        e2e::run_result r = qecfg({"input.src", c.output}, c.child_setup);
        EXPECT_EQ(r.status, 1);
        EXPECT_EQ(r.err, c.err);
        EXPECT_EQ(entries(work), before);
        EXPECT_EQ(e2e::read_file(work / "out.cdef"), old_image);
        EXPECT_EQ(e2e::read_file(work / "input.src"), source);
    }
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
    e2e::run_result r = qecfg({"input.src", "out.cdef"}, [] {
        struct rlimit rl {
            32 << 20, 32 << 20
        };
        setrlimit(RLIMIT_AS, &rl);
    });
    EXPECT_EQ(r.status, ENOMEM);
    EXPECT_NE(r.err.find(": Cannot allocate memory\n"), std::string::npos) << r.err;
    EXPECT_FALSE(fs::exists(work / "out.cdef"));
#endif
}

struct stat_of {
    struct stat st;
    explicit stat_of(const fs::path &p) { EXPECT_EQ(stat(p.c_str(), &st), 0) << p; }
};

// A replaced file keeps its permission bits and, where the compile may set
// them, its owner and group; a new one is 0644 before the umask.
TEST_F(OutputFault, ReplacedFileKeepsModeAndOwner) {
    const std::string image = image_of(e2e::read_file(work / "input.src"));
    write("kept.cdef", old_image);
    fs::permissions(work / "kept.cdef", fs::perms(0640));
    bool root = geteuid() == 0;
    ASSERT_EQ(chown((work / "kept.cdef").c_str(), root ? 65534 : geteuid(), root ? 65534 : getegid()), 0);
    stat_of old(work / "kept.cdef");
    ASSERT_EQ(qecfg({"input.src", "kept.cdef"}).status, 0);
    ASSERT_EQ(qecfg({"input.src", "new.cdef"}, [] { umask(027); }).status, 0);
    stat_of kept(work / "kept.cdef"), made(work / "new.cdef");
    EXPECT_EQ(e2e::read_file(work / "kept.cdef"), image);
    EXPECT_NE(kept.st.st_ino, old.st.st_ino); // a new file took the name
    EXPECT_EQ(kept.st.st_mode & 07777, 0640u);
    EXPECT_EQ(kept.st.st_uid, old.st.st_uid);
    EXPECT_EQ(kept.st.st_gid, old.st.st_gid);
    EXPECT_EQ(made.st.st_mode & 07777, 0640u);
}

// The file a symbolic link designates is replaced (or created, when the link
// dangles); the link stays.
TEST_F(OutputFault, LinkedOutputReplacesItsTarget) {
    const std::string image = image_of(e2e::read_file(work / "input.src"));
    fs::create_directory(work / "sub");
    write("sub/real.cdef", old_image);
    fs::permissions(work / "sub/real.cdef", fs::perms(0600));
    fs::create_symlink("sub/real.cdef", work / "link.cdef");
    fs::create_symlink("link.cdef", work / "chain.cdef");
    fs::create_symlink("sub/absent.cdef", work / "dangling.cdef");
    for (const char *name : {"link.cdef", "chain.cdef", "dangling.cdef"}) {
        SCOPED_TRACE(name);
        ASSERT_EQ(qecfg({"input.src", name}).status, 0);
        EXPECT_TRUE(fs::is_symlink(work / name));
    }
    EXPECT_EQ(e2e::read_file(work / "sub/real.cdef"), image);
    EXPECT_EQ(stat_of(work / "sub/real.cdef").st.st_mode & 07777, 0600u);
    EXPECT_EQ(e2e::read_file(work / "sub/absent.cdef"), image);
    EXPECT_EQ(entries(work / "sub"), (std::set<std::string>{"absent.cdef", "real.cdef"}));
}

// Without write permission on the directory, a writable output is written in
// place: same file, new content.
TEST_F(OutputFault, ReadOnlyDirectoryWritesInPlace) {
    const std::string image = image_of(e2e::read_file(work / "input.src"));
    write("out.cdef", std::string(100000, 'x'));
    ASSERT_EQ(chown((work / "out.cdef").c_str(), geteuid() == 0 ? 65534 : geteuid(), getegid()), 0);
    ino_t before = stat_of(work / "out.cdef").st.st_ino;
    fs::permissions(work, fs::perms(0555));
    e2e::run_result r = qecfg({"input.src", "out.cdef"}, unprivileged);
    EXPECT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(e2e::read_file(work / "out.cdef"), image);
    EXPECT_EQ(stat_of(work / "out.cdef").st.st_ino, before);
}

// Every system call of the output phase made to fail in turn (the Nth call
// of each kind, until there is no Nth call), for a new name, a replaced file
// and a file replaced through a link, with and without unnamed temporary
// files: each run leaves the complete new image (a failure after the rename:
// flushing the directory) or the old state byte for byte, and no other file.
TEST_F(OutputFault, InjectedFailureOfEachCallLeavesOldOrNewImageAndNoStrayFile) {
    const std::string image = image_of(e2e::read_file(work / "input.src"));
    const fs::path hit = work.string() + ".hit";
    const char *const calls[] = {"openat",    "fstatat", "fstat",           "readlinkat", "faccessat",
                                 "fchown",    "fchmod",  "posix_fallocate", "mmap",       "munmap",
                                 "ftruncate", "fsync",   "close",           "linkat",     "renameat"};
    // (unlinkat only removes a temporary file after another failure.)
    struct scenario {
        const char *name, *output;
        bool old;
    };
    const scenario scenarios[] = {{"new name", "out.cdef", false},
                                  {"replacement", "out.cdef", true},
                                  {"replacement through a link", "link.cdef", true}};
    std::set<std::string> reached;
    for (bool named : {false, true})
        for (const scenario &sc : scenarios)
            for (const char *call : calls)
                for (int n = 1; n < 30; n++) {
                    SCOPED_TRACE(std::string(sc.name) + (named ? ", named" : ", unnamed") + ": " + call + " #" +
                                 std::to_string(n));
                    fs::remove(work / "out.cdef");
                    fs::remove(work / "link.cdef");
                    fs::remove(hit);
                    fs::create_symlink("out.cdef", work / "link.cdef");
                    if (sc.old) {
                        write("out.cdef", old_image);
                        // Another owner, so that carrying it over is a call too.
                        if (geteuid() == 0) {
                            ASSERT_EQ(chown((work / "out.cdef").c_str(), OTHER_USER, OTHER_USER), 0);
                        }
                    }
                    e2e::run_result r = qecfg(
                        {"input.src", sc.output}, {},
                        injected(std::string(call) + ":" + std::to_string(n) + ":" + std::to_string(EIO), hit, !named));
                    bool fired = fs::exists(hit);
                    std::string now = e2e::read_or(work / "out.cdef", "(absent)");
                    if (r.status == 0) {
                        EXPECT_EQ(now, image);
                    } else {
                        EXPECT_TRUE(fired) << r.err;
                        EXPECT_EQ(r.status, 1);
                        EXPECT_EQ(r.err.rfind("Cannot ", 0), 0u) << r.err;
                        EXPECT_TRUE(now == (sc.old ? old_image : "(absent)") || now == image);
                    }
                    std::set<std::string> expected = {"input.src", "link.cdef"};
                    if (sc.old || r.status == 0 || now == image)
                        expected.insert("out.cdef");
                    EXPECT_EQ(entries(work), expected);
                    EXPECT_TRUE(fs::is_symlink(work / "link.cdef"));
                    if (!fired)
                        break;
                    reached.insert(call);
                }
    fs::remove(hit);
    // Each kind of call was made and failed at least once.
    for (const char *call : calls)
        EXPECT_EQ(reached.count(call), 1u) << call;
}

// Failures that used to pass for success, each with its reason.
TEST_F(OutputFault, FailingChecksAreFailuresWithTheirReason) {
    struct checked {
        std::string fault;
        std::string err;
    };
    const checked cases[] = {
        {"fstatat:1:" + std::to_string(EIO), "Cannot create CDB file: Input/output error\n"},
        {"faccessat:1:" + std::to_string(ENOSYS), "Cannot create CDB file: Function not implemented\n"},
        {"fchown:1:" + std::to_string(EIO), "Cannot create CDB file: Input/output error\n"},
        // A reservation that reports success but is not there: no fault in
        // the mapping.
        {"posix_fallocate:1:0", "Cannot extend CDB file: File shorter than its reserved size\n"},
    };
    for (const checked &c : cases) {
        SCOPED_TRACE(c.fault);
        write("out.cdef", old_image);
        if (geteuid() == 0)
            ASSERT_EQ(chown((work / "out.cdef").c_str(), OTHER_USER, OTHER_USER), 0);
        else if (c.fault.rfind("fchown", 0) == 0)
            continue; // nothing to carry over without another owner
        e2e::run_result r = qecfg({"input.src", "out.cdef"}, {}, injected(c.fault));
        EXPECT_EQ(r.status, 1);
        EXPECT_EQ(r.err, c.err);
        EXPECT_EQ(e2e::read_file(work / "out.cdef"), old_image);
        EXPECT_EQ(entries(work), (std::set<std::string>{"input.src", "out.cdef"}));
    }
}

// A replaced file's mode carries over without its set-user-ID and
// set-group-ID bits.
TEST_F(OutputFault, SetIdBitsAreDropped) {
    write("out.cdef", old_image);
    ASSERT_EQ(chmod((work / "out.cdef").c_str(), 06755), 0);
    ASSERT_EQ(qecfg({"input.src", "out.cdef"}).status, 0);
    EXPECT_EQ(stat_of(work / "out.cdef").st.st_mode & 07777, 0755u);
}

// Temporary files of this output left by compiles that no longer run (and
// are this user's) are removed; others stay.
TEST_F(OutputFault, StaleTemporaryFilesAreRemoved) {
    pid_t gone = fork();
    if (gone == 0)
        _exit(0);
    waitpid(gone, nullptr, 0);
    const std::string stale = ".out.cdef.tmp-" + std::to_string(gone) + "-Ab3dEf9hIj0k",
                      running = ".out.cdef.tmp-" + std::to_string(getpid()) + "-Ab3dEf9hIj0k",
                      other_output = ".other.cdef.tmp-" + std::to_string(gone) + "-Ab3dEf9hIj0k",
                      others = ".out.cdef.tmp-" + std::to_string(gone) + "-ZZ3dEf9hIj0k";
    for (const std::string &name : {stale, running, other_output, others})
        write(name, "partial");
    std::set<std::string> kept = {"input.src", "out.cdef", running, other_output};
    if (geteuid() == 0) {
        ASSERT_EQ(chown((work / others).c_str(), OTHER_USER, OTHER_USER), 0);
        kept.insert(others);
    }
    ASSERT_EQ(qecfg({"input.src", "out.cdef"}).status, 0);
    EXPECT_EQ(entries(work), kept);
}

} // namespace
