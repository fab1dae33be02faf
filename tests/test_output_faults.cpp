// The output file under faults and odd names: every failure gives its message
// and status and leaves the directory as it was; a replaced file keeps its
// permissions, owner and links; where no temporary file can be made the
// output is written in place.
#include <csignal>
#include <sys/resource.h>

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
        {"source error", [](OutputFault &t) { t.write("input.src", BASE_SOURCE + "Bogus\n"); }, "out.cdef", {},
         "16: Invalid table name: Bogus\n"},
        {"file size limit", {}, "out.cdef",
         [] {
             struct rlimit rl{4096, 4096};
             setrlimit(RLIMIT_FSIZE, &rl);
         },
         "Cannot extend CDB file: File too large\n"},
        {"missing directory", {}, "no/such/dir/out.cdef", {}, "Cannot create CDB file: No such file or directory\n"},
        {"directory as output", [](OutputFault &t) { fs::create_directory(t.work / "d.cdef"); }, "d.cdef", {},
         "Cannot create CDB file: Is a directory\n"},
        {"read-only directory", [](OutputFault &t) { fs::permissions(t.work, fs::perms(0555)); }, "new.cdef",
         unprivileged, "Cannot create CDB file: Permission denied\n"},
        {"output not writable",
         [](OutputFault &t) {
             fs::permissions(t.work, fs::perms(0777));
             fs::permissions(t.work / "out.cdef", fs::perms(0444));
         },
         "out.cdef", unprivileged, "Cannot create CDB file: Permission denied\n"},
        {"FIFO", [](OutputFault &t) { ASSERT_EQ(mkfifo((t.work / "f.cdef").c_str(), 0600), 0); }, "f.cdef", {},
         "Cannot map CDB file: Invalid argument\n"},
        {"output is the source", {}, "input.src", {}, "Cannot create CDB file: Output is the source file\n"},
        {"output links to the source", [](OutputFault &t) { fs::create_symlink("input.src", t.work / "l.cdef"); },
         "l.cdef", {}, "Cannot create CDB file: Output is the source file\n"},
        {"output is a hard link of the source",
         [](OutputFault &t) { fs::create_hard_link(t.work / "input.src", t.work / "h.cdef"); }, "h.cdef", {},
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
        struct rlimit rl{32 << 20, 32 << 20};
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

} // namespace
