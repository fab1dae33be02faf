// The output in a directory shared with another user who prepares it: links
// they plant are not followed, the temporary file is never open to them,
// and a file they plant does not give them the output. Acting as two users
// needs the superuser; the tests are skipped otherwise.
#include <atomic>
#include <fcntl.h>
#include <sys/wait.h>

#include "output_support.h"

namespace {

using namespace output_test;

// Runs f in a child as the user uid; false when it failed.
bool as_user(uid_t uid, const std::function<bool()> &f) {
    pid_t pid = fork();
    if (pid == 0) {
        become_user(uid);
        _exit(f() ? 0 : 1);
    }
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

bool plant_link(uid_t uid, const std::string &target, const fs::path &link) {
    return as_user(uid, [&] { return symlink(target.c_str(), link.c_str()) == 0; });
}

struct stat status_of(const fs::path &p) {
    struct stat st {};
    EXPECT_EQ(lstat(p.c_str(), &st), 0) << p;
    return st;
}

struct SharedDir : OutputDir {
    fs::path shared, secret;
    std::string image;
    void SetUp() override {
        OutputDir::SetUp();
        if (geteuid() != 0)
            GTEST_SKIP() << "acting as other users needs the superuser";
        fs::copy_file(fs::path(QECFG_SOURCE_DIR) / "examples" / "disk.src", work / "input.src");
        image = image_of(e2e::read_file(work / "input.src"));
        // Like /tmp: sticky and world-writable, the superuser's.
        shared = work / "shared";
        fs::create_directory(shared);
        fs::permissions(shared, fs::perms(01777));
        // What a planted link aims at: only the superuser's.
        secret = work / "secret";
        fs::create_directory(secret);
        fs::permissions(secret, fs::perms(0700));
        write("secret/secret.cdef", "secret");
        fs::permissions(secret / "secret.cdef", fs::perms(0600));
    }
};

TEST_F(SharedDir, PlantedLinksAreRefusedAndTheirTargetsUntouched) {
    const std::string target = (secret / "secret.cdef").string();
    ASSERT_TRUE(plant_link(OTHER_USER, target, shared / "to-file.cdef"));
    ASSERT_TRUE(plant_link(OTHER_USER, (secret / "new.cdef").string(), shared / "dangling.cdef"));
    ASSERT_TRUE(plant_link(OTHER_USER, target, shared / "planted.cdef"));
    const char *const refused = ": Permission denied: the symbolic link ";
    const char *const why = " belongs to another user of a sticky directory\n";
    for (uid_t compiling : {uid_t(0), COMPILING_USER}) {
        SCOPED_TRACE("compiling as " + std::to_string(compiling));
        // A chain that starts with the compiling user's own link.
        fs::remove(shared / "chain.cdef");
        ASSERT_TRUE(plant_link(compiling, "planted.cdef", shared / "chain.cdef"));
        const std::pair<const char *, std::string> cases[] = {
            {"shared/to-file.cdef", "shared/to-file.cdef"},
            {"shared/dangling.cdef", "shared/dangling.cdef"},
            {"shared/chain.cdef", "planted.cdef"},
        };
        for (const auto &[output, link] : cases) {
            SCOPED_TRACE(output);
            e2e::run_result r = qecfg({"input.src", output}, [&] {
                if (compiling)
                    become_user(compiling);
            });
            EXPECT_EQ(r.status, 1);
            EXPECT_EQ(r.err, std::string("Cannot create CDB file") + refused + link + why);
        }
        EXPECT_EQ(e2e::read_file(secret / "secret.cdef"), "secret");
        EXPECT_EQ(status_of(secret / "secret.cdef").st_mode & 07777, 0600u);
        EXPECT_EQ(entries(secret), std::set<std::string>{"secret.cdef"});
        EXPECT_EQ(entries(shared),
                  (std::set<std::string>{"chain.cdef", "dangling.cdef", "planted.cdef", "to-file.cdef"}));
    }
}

// The kernel's rule: a link of the compiling user or of the directory's
// owner is followed.
TEST_F(SharedDir, LinksOfTheUserOrTheDirectoryOwnerAreFollowed) {
    fs::create_directory(work / "pub");
    fs::permissions(work / "pub", fs::perms(0777));
    ASSERT_TRUE(plant_link(COMPILING_USER, "../pub/own.cdef", shared / "own.cdef"));
    ASSERT_TRUE(plant_link(0, "../pub/owners.cdef", shared / "owners.cdef"));
    for (const char *output : {"shared/own.cdef", "shared/owners.cdef"}) {
        SCOPED_TRACE(output);
        e2e::run_result r = qecfg({"input.src", output}, [] { become_user(COMPILING_USER); });
        EXPECT_EQ(r.status, 0) << r.err;
        EXPECT_TRUE(fs::is_symlink(work / output));
    }
    EXPECT_EQ(e2e::read_file(work / "pub/own.cdef"), image);
    EXPECT_EQ(e2e::read_file(work / "pub/owners.cdef"), image);
}

// Another user watches the directory while the image is written over a
// 0600 output: nothing there opens for them, named temporary file or not.
TEST_F(SharedDir, TemporaryFileIsNeverOpenToOthers) {
    write("input.src", large_source());
    for (bool named : {false, true}) {
        SCOPED_TRACE(named ? "named" : "unnamed");
        write("out.cdef", "old");
        fs::permissions(work / "out.cdef", fs::perms(0600));
        struct watch {
            std::atomic<bool> stop{false};
            std::atomic<int> opened{0}, seen{0};
        } *w = shared_object<watch>();
        ASSERT_NE(w, nullptr);
        pid_t watcher = fork();
        if (watcher == 0) {
            become_user(OTHER_USER);
            while (!w->stop)
                for (const std::string &name : entries(work)) {
                    if (name.find("out.cdef") == std::string::npos)
                        continue; // the source and the fixture's directories
                    w->seen += name.rfind(".out.cdef.tmp-", 0) == 0;
                    int fd = open((work / name).c_str(), O_RDONLY | O_NONBLOCK);
                    if (fd >= 0) {
                        w->opened++;
                        close(fd);
                    }
                }
            _exit(0);
        }
        for (int run = 0; run < 3; run++)
            EXPECT_EQ(
                qecfg({"input.src", "out.cdef"}, {}, named ? named_temporaries() : std::vector<std::string>{}).status,
                0);
        w->stop = true;
        waitpid(watcher, nullptr, 0);
        EXPECT_EQ(w->opened, 0);
        if (named) {
            EXPECT_GT(w->seen, 0) << "the watcher never saw the temporary file";
        }
        EXPECT_EQ(status_of(work / "out.cdef").st_mode & 07777, 0600u);
        munmap(w, sizeof *w);
    }
}

TEST_F(SharedDir, PlantedFileDoesNotGiveThemTheOutput) {
    ASSERT_TRUE(as_user(OTHER_USER, [&] {
        int fd = open((shared / "out.cdef").c_str(), O_WRONLY | O_CREAT | O_EXCL, 0600);
        return fd >= 0 && fchmod(fd, 04777) == 0 && close(fd) == 0;
    }));
    e2e::run_result r = qecfg({"input.src", "shared/out.cdef"}, [] { umask(022); });
    ASSERT_EQ(r.status, 0) << r.err;
    struct stat st = status_of(shared / "out.cdef");
    EXPECT_EQ(st.st_uid, 0u);
    EXPECT_EQ(st.st_gid, 0u);
    EXPECT_EQ(st.st_mode & 07777, 0644u);
    EXPECT_EQ(e2e::read_file(shared / "out.cdef"), image);
    EXPECT_FALSE(as_user(OTHER_USER, [&] { return open((shared / "out.cdef").c_str(), O_WRONLY) >= 0; }));
}

// A user who may not replace another's file in a sticky directory learns why;
// an error of the source still comes first, as it always did.
TEST_F(SharedDir, AnotherUsersFileThatCannotBeReplacedIsRefusedWithWhy) {
    ASSERT_TRUE(as_user(OTHER_USER, [&] {
        int fd = open((shared / "theirs.cdef").c_str(), O_WRONLY | O_CREAT | O_EXCL, 0666);
        return fd >= 0 && fchmod(fd, 0666) == 0 && ::write(fd, "theirs", 6) == 6 && close(fd) == 0;
    }));
    e2e::run_result r = qecfg({"input.src", "shared/theirs.cdef"}, [] { become_user(COMPILING_USER); });
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "Cannot create CDB file: Operation not permitted: theirs.cdef belongs to another user of a "
                     "sticky directory\n");
    write("input.src", BASE_SOURCE + "Bogus\n");
    r = qecfg({"input.src", "shared/theirs.cdef"}, [] { become_user(COMPILING_USER); });
    EXPECT_TRUE(r.err.ends_with(": Invalid table name: Bogus\n")) << r.err;
    EXPECT_EQ(e2e::read_file(shared / "theirs.cdef"), "theirs");
    EXPECT_EQ(entries(shared), std::set<std::string>{"theirs.cdef"});
}

} // namespace
