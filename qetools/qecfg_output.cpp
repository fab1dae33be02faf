// The sinks of a compile's image: a caller's buffer, or a file.
//
// A file is replaced atomically where it can be: the image goes to a new
// temporary file in the output's directory (unnamed where the file system
// has unnamed files, so that nothing can open it and a killed compile leaves
// nothing), which takes the output's name once complete and flushed, so that
// readers of the old file keep a consistent image and a new open sees the
// whole new one. Where no temporary file can be created (a directory without
// write permission, a read-only file system) or the output is not a regular
// file, the output is written in place as it always was.
//
// The directory may be shared with other users: a symbolic link at the name
// is followed only where the kernel's rule for sticky directories would follow
// it, the temporary file is never open to others, and neither the owner nor
// the set-ID bits of a file another user placed there carry over.
#include <algorithm>
#include <atomic>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <fstream>
#include <new>
#include <optional>
#include <pthread.h>
#include <sys/mman.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include "qecfg/qecfg.h"
#include "qecfg_sink.h"

namespace {

constexpr qecfg::message_id CREATE = qecfg::message_id::cannot_create;
constexpr qecfg::message_id EXTEND = qecfg::message_id::cannot_extend;
constexpr qecfg::message_id MAP = qecfg::message_id::cannot_map;
constexpr qecfg::message_id WRITE = qecfg::message_id::cannot_write;

[[noreturn]] void fail(qecfg::message_id id, int err, std::string reason = {}) {
    throw sink_failure{id, err, std::move(reason)};
}

// ---------------------------------------------------------------------------
// Named temporary files that a terminating signal must remove. The handler
// only reads armed slots, so registering and releasing need no lock.

constexpr int SLOTS = 16;
enum slot_state : int { SLOT_FREE, SLOT_FILLING, SLOT_ARMED };
struct temp_slot {
    std::atomic<int> state{SLOT_FREE};
    int dir = -1;
    char name[NAME_MAX + 1];
};
temp_slot temp_slots[SLOTS];

int register_temporary(int dir, const std::string &name) {
    if (name.size() > NAME_MAX)
        return -1;
    for (int i = 0; i < SLOTS; i++) {
        int expected = SLOT_FREE;
        if (temp_slots[i].state.compare_exchange_strong(expected, SLOT_FILLING)) {
            temp_slots[i].dir = dir;
            std::memcpy(temp_slots[i].name, name.c_str(), name.size() + 1);
            temp_slots[i].state.store(SLOT_ARMED);
            return i;
        }
    }
    return -1;
}

void release_temporary(int slot) {
    if (slot >= 0)
        temp_slots[slot].state.store(SLOT_FREE);
}

// Every signal that can be caught and whose default action ends the process.
template <typename F> void for_each_cleanup_signal(F f) {
    for (int s : {SIGHUP,  SIGINT,  SIGQUIT, SIGILL,    SIGTRAP, SIGABRT,   SIGBUS,  SIGFPE, SIGUSR1, SIGSEGV, SIGUSR2,
                  SIGPIPE, SIGALRM, SIGTERM, SIGSTKFLT, SIGXCPU, SIGVTALRM, SIGPROF, SIGIO,  SIGPWR,  SIGSYS})
        f(s);
    for (int s = SIGRTMIN; s <= SIGRTMAX; s++)
        f(s);
}

extern "C" void remove_temporaries_and_die(int sig) {
    for (temp_slot &s : temp_slots)
        if (s.state.load() == SLOT_ARMED)
            unlinkat(s.dir, s.name, 0);
    // The handler was reset to the default: the signal, pending until the
    // handler returns, then ends the process as it would have.
    raise(sig);
}

// Holds the cleanup signals back while a temporary name is created and
// registered, so that none can be left behind unregistered.
class signals_held {
  public:
    signals_held() {
        sigset_t set;
        sigemptyset(&set);
        for_each_cleanup_signal([&](int s) { sigaddset(&set, s); });
        pthread_sigmask(SIG_BLOCK, &set, &old_);
    }
    ~signals_held() { pthread_sigmask(SIG_SETMASK, &old_, nullptr); }

  private:
    sigset_t old_;
};

// ---------------------------------------------------------------------------
// The process and its names.

// A number of this process's status file ("Umask", "CapEff") in its base.
std::optional<unsigned long long> process_status(const std::string &key, int base) {
    std::ifstream in("/proc/self/status");
    for (std::string line; std::getline(in, line);)
        if (line.rfind(key + ":", 0) == 0)
            return std::strtoull(line.c_str() + key.size() + 1, nullptr, base);
    return std::nullopt;
}

// The mode a new output gets: 0644 before the umask.
mode_t new_file_mode() {
    std::optional<unsigned long long> mask = process_status("Umask", 8);
    if (!mask) {
        mode_t m = umask(022);
        umask(m);
        mask = m;
    }
    return 0644 & ~mode_t(*mask);
}

// Whether this process may rename over another user's file in a sticky
// directory: the capability to bypass ownership checks.
bool may_override_owner() {
    constexpr int CAP_FOWNER_BIT = 3;
    std::optional<unsigned long long> caps = process_status("CapEff", 16);
    return caps ? (*caps >> CAP_FOWNER_BIT & 1) != 0 : geteuid() == 0;
}

bool shared_sticky(const struct stat &dir) { return (dir.st_mode & S_ISVTX) && (dir.st_mode & S_IWOTH); }

// The prefix of every temporary name of an output entry; a process id and a
// random suffix follow it.
std::string temporary_stem(const std::string &entry) {
    std::string stem(1, '.');
    stem.append(entry, 0, 100);
    return stem.append(".tmp-");
}

std::string random_suffix() {
    static const char ALPHABET[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
    unsigned char bytes[12];
    if (getrandom(bytes, sizeof bytes, 0) != ssize_t(sizeof bytes)) {
        static std::atomic<unsigned> serial{0};
        unsigned n = serial++;
        std::memcpy(bytes, &n, sizeof n);
    }
    std::string s;
    for (unsigned char b : bytes)
        s += ALPHABET[b % (sizeof ALPHABET - 1)];
    return s;
}

// Removes this user's temporary files of an output whose compile no longer
// runs (a compile killed before it could clean up). Housekeeping: what
// cannot be read or removed stays.
void remove_stale_temporaries(int dir, const std::string &entry) {
    int fd = openat(dir, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0)
        return;
    DIR *d = fdopendir(fd);
    if (!d) {
        close(fd);
        return;
    }
    const std::string stem = temporary_stem(entry);
    while (const dirent *e = readdir(d)) {
        std::string name = e->d_name;
        if (name.compare(0, stem.size(), stem) != 0)
            continue;
        char *end = nullptr;
        long pid = std::strtol(name.c_str() + stem.size(), &end, 10);
        if (pid <= 0 || *end != '-' || pid == getpid() || kill(pid_t(pid), 0) == 0 || errno != ESRCH)
            continue;
        struct stat st;
        if (fstatat(dir, e->d_name, &st, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(st.st_mode) && st.st_uid == geteuid())
            unlinkat(dir, e->d_name, 0);
    }
    closedir(d);
}

// ---------------------------------------------------------------------------

class file_sink final : public image_sink {
  public:
    file_sink(std::string path, file_identity source, bool flush)
        : name_(std::move(path)), source_(source), flush_(flush) {}
    ~file_sink() override {
        abandon();
        if (dir_ >= 0)
            close(dir_);
    }
    char *acquire(size_t size) override;
    void commit(size_t length) override;
    void abandon() noexcept override;

  private:
    // Checks the output name and creates the temporary file (or chooses to
    // write in place).
    void prepare();
    [[noreturn]] void refuse(int err, const std::string &reason);
    bool locate();
    void open_directory(int at, const std::string &path);
    void check_replaceable();
    int create_temporary();
    int create_named_temporary();
    void give_final_mode();
    void open_in_place();
    void extend(size_t size);
    void publish();
    void name_temporary();
    void close_file(qecfg::message_id failure);
    void drop_temporary_name() noexcept;

    std::string name_; // as given
    file_identity source_;
    bool flush_;
    int dir_ = -1; // the directory of the file the name designates
    bool dir_readable_ = false;
    struct stat dir_st_ {};
    std::string entry_;  // that file's name in dir_
    struct stat old_ {}; // the file being replaced, when replaces_
    bool replaces_ = false;
    bool in_place_ = false;
    int fd_ = -1;
    bool unnamed_ = false; // the temporary file has no name yet
    std::string temp_;     // the temporary file's name in dir_, once it has one
    int slot_ = -1;
    void *map_ = nullptr;
    size_t mapped_ = 0;
    bool regular_ = false;
};

[[noreturn]] void file_sink::refuse(int err, const std::string &reason) {
    fail(CREATE, err, std::string(std::strerror(err)) + ": " + reason);
}

// Opens the directory part of path (relative to `at`) as dir_.
void file_sink::open_directory(int at, const std::string &path) {
    size_t slash = path.rfind('/');
    std::string dir = slash == std::string::npos ? "." : slash == 0 ? "/" : path.substr(0, slash);
    // A name that ends in a slash designates the directory itself.
    std::string entry = slash == std::string::npos ? path : path.substr(slash + 1);
    entry_ = entry.empty() ? std::string(".") : std::move(entry);
    // A directory that cannot be read can still be written: it then cannot
    // be flushed or searched for stale temporary files.
    int fd = openat(at, dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    dir_readable_ = fd >= 0;
    if (fd < 0 && errno == EACCES)
        fd = openat(at, dir.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0)
        fail(CREATE, errno);
    if (dir_ >= 0)
        close(dir_);
    dir_ = fd;
    if (fstat(dir_, &dir_st_) != 0)
        fail(CREATE, errno);
}

// Finds the file the name designates, following symbolic links where the
// kernel's protection of sticky directories would: in a sticky,
// world-writable directory only a link of this user or of the directory's
// owner. Returns whether that file exists (then old_ describes it).
bool file_sink::locate() {
    std::string path = name_;
    int at = AT_FDCWD;
    for (int depth = 0;; depth++) {
        open_directory(at, path);
        at = dir_;
        if (fstatat(dir_, entry_.c_str(), &old_, AT_SYMLINK_NOFOLLOW) != 0) {
            if (errno != ENOENT)
                fail(CREATE, errno);
            return false;
        }
        if (!S_ISLNK(old_.st_mode))
            return true;
        if (shared_sticky(dir_st_) && old_.st_uid != geteuid() && old_.st_uid != dir_st_.st_uid)
            refuse(EACCES, "the symbolic link " + path + " belongs to another user of a sticky directory");
        if (depth == 40)
            fail(CREATE, ELOOP);
        std::string target(size_t(old_.st_size > 0 ? old_.st_size : PATH_MAX) + 1, '\0');
        ssize_t n = readlinkat(dir_, entry_.c_str(), target.data(), target.size());
        if (n < 0)
            fail(CREATE, errno);
        target.resize(std::min(size_t(n), target.size()));
        path = target;
    }
}

// A sticky directory lets only the owners of a file, of the directory, or a
// privileged process replace it: found out now rather than after the compile.
void file_sink::check_replaceable() {
    if ((dir_st_.st_mode & S_ISVTX) && old_.st_uid != geteuid() && dir_st_.st_uid != geteuid() && !may_override_owner())
        refuse(EPERM, entry_ + " belongs to another user of a sticky directory");
}

void file_sink::prepare() {
    bool exists = locate();
    if (exists && source_.known && old_.st_dev == source_.dev && old_.st_ino == source_.ino)
        fail(CREATE, 0, "Output is the source file");
    if (exists && !S_ISREG(old_.st_mode)) {
        in_place_ = true;
        return;
    }
    // A file this process may not write stays as protected as it was.
    if (exists && faccessat(dir_, entry_.c_str(), W_OK, AT_EACCESS) != 0)
        fail(CREATE, errno);
    replaces_ = exists;
    if (replaces_)
        check_replaceable();
    remove_stale_temporaries(dir_, entry_);
    int err = create_temporary();
    if (err == EACCES || err == EPERM || err == EROFS) {
        // No temporary file here: a new output could not be created either.
        if (!exists)
            fail(CREATE, err);
        in_place_ = true;
        return;
    }
    if (err)
        fail(CREATE, err);
    regular_ = true;
    give_final_mode();
}

// Creates the temporary file in the output's directory with no access for
// others: unnamed where the file system allows it, otherwise under a name
// that starts with a dot, holds this process's id and a random suffix, and
// never equals the output's. Returns 0 or the error number.
int file_sink::create_temporary() {
    int fd = openat(dir_, ".", O_TMPFILE | O_RDWR | O_CLOEXEC, 0600);
    if (fd >= 0) {
        fd_ = fd;
        unnamed_ = true;
        return 0;
    }
    if (errno != EOPNOTSUPP && errno != EISDIR)
        return errno;
    return create_named_temporary();
}

int file_sink::create_named_temporary() {
    const std::string stem = temporary_stem(entry_) + std::to_string(getpid()) + "-";
    for (int tries = 0; tries < 100; tries++) {
        std::string name = stem + random_suffix();
        signals_held held;
        int fd = openat(dir_, name.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
        if (fd < 0 && errno == EEXIST)
            continue;
        if (fd < 0)
            return errno;
        fd_ = fd;
        temp_ = name;
        slot_ = register_temporary(dir_, name);
        return 0;
    }
    return EEXIST;
}

// Before a byte of the image is written: a replaced file's permission bits
// without set-user-ID and set-group-ID, and its owner and group where this
// process may set them; a new file's 0644 before the umask. In a sticky,
// world-writable directory only a file of this user carries anything over,
// and nothing is given to another user.
void file_sink::give_final_mode() {
    bool carry = replaces_ && (!shared_sticky(dir_st_) || old_.st_uid == geteuid());
    mode_t mode = carry ? old_.st_mode & 07777 & ~mode_t(S_ISUID | S_ISGID) : new_file_mode();
    if (carry && !shared_sticky(dir_st_) && (old_.st_uid != geteuid() || old_.st_gid != getegid())) {
        if (fchown(fd_, old_.st_uid, old_.st_gid) != 0) {
            if (errno != EPERM)
                fail(CREATE, errno);
            // Not allowed to give it away: the group alone, where allowed.
            if (fchown(fd_, uid_t(-1), old_.st_gid) != 0 && errno != EPERM)
                fail(CREATE, errno);
        }
    }
    if (fchmod(fd_, mode) != 0)
        fail(CREATE, errno);
}

void file_sink::open_in_place() {
    // Non-blocking, so that a FIFO named as output fails instead of hanging.
    int fd = openat(dir_, entry_.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_NONBLOCK | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (fd < 0)
        fail(CREATE, errno);
    fd_ = fd;
    struct stat st;
    if (fstat(fd, &st) != 0)
        fail(CREATE, errno);
    regular_ = S_ISREG(st.st_mode);
}

// Reserves the file's blocks, so that a full disk shows here and not as a
// fault while the mapping is filled. A regular file has them allocated by
// the file system where it can; otherwise zeros are written in whole blocks
// of EXTEND_BLOCK bytes, many blocks at a time.
void file_sink::extend(size_t size) {
    constexpr size_t EXTEND_BLOCK = 1024;
    size_t reserved = 0;
    if (regular_) {
        int err = posix_fallocate(fd_, 0, off_t(size));
        if (err == 0)
            reserved = size;
        else if (err != EOPNOTSUPP && err != EINVAL)
            fail(EXTEND, err);
    }
    static const char zeros[EXTEND_BLOCK * 256] = {};
    while (reserved < size) {
        size_t blocks = std::min<size_t>((size - reserved + EXTEND_BLOCK - 1) / EXTEND_BLOCK, 256);
        size_t want = blocks * EXTEND_BLOCK, done = 0;
        while (done < want) {
            ssize_t n = write(fd_, zeros + done, want - done);
            if (n < 0 && errno == EINTR)
                continue;
            if (n <= 0)
                fail(EXTEND, n < 0 ? errno : ENOSPC);
            done += size_t(n);
        }
        reserved += want;
    }
    // Filling a mapping beyond the end of the file would be a fatal fault.
    struct stat st;
    if (fstat(fd_, &st) != 0)
        fail(MAP, errno);
    if (st.st_size < off_t(size))
        fail(regular_ ? EXTEND : MAP, EINVAL, regular_ ? "File shorter than its reserved size" : "");
    mapped_ = size_t(st.st_size);
}

char *file_sink::acquire(size_t size) {
    prepare();
    if (in_place_)
        open_in_place();
    extend(size);
    void *p = mmap(nullptr, mapped_, PROT_READ | PROT_WRITE, MAP_SHARED, fd_, 0);
    if (p == MAP_FAILED)
        fail(MAP, errno);
    map_ = p;
    return static_cast<char *>(p);
}

// Gives the unnamed temporary file a temporary name, from which it is
// renamed over the output (a link cannot replace a name).
void file_sink::name_temporary() {
    const std::string stem = temporary_stem(entry_) + std::to_string(getpid()) + "-";
    const std::string by_proc = "/proc/self/fd/" + std::to_string(fd_);
    for (int tries = 0; tries < 100; tries++) {
        std::string name = stem + random_suffix();
        signals_held held;
        int r = linkat(AT_FDCWD, by_proc.c_str(), dir_, name.c_str(), AT_SYMLINK_FOLLOW);
        if (r != 0 && errno == ENOENT) // no /proc: allowed to privileged processes
            r = linkat(fd_, "", dir_, name.c_str(), AT_EMPTY_PATH);
        if (r != 0 && errno == EEXIST)
            continue;
        if (r != 0)
            fail(WRITE, errno);
        unnamed_ = false;
        temp_ = name;
        slot_ = register_temporary(dir_, name);
        return;
    }
    fail(WRITE, EEXIST);
}

void file_sink::close_file(qecfg::message_id failure) {
    int fd = fd_;
    fd_ = -1;
    if (close(fd) != 0)
        fail(failure, errno);
}

// The image reached the disk before its name does (flush_), so that a crash
// leaves the old file or the new one; the directory is flushed after, so that
// the name stays once commit has returned.
void file_sink::publish() {
    if (unnamed_)
        name_temporary();
    close_file(WRITE);
    if (renameat(dir_, temp_.c_str(), dir_, entry_.c_str()) != 0)
        fail(WRITE, errno);
    release_temporary(slot_);
    slot_ = -1;
    temp_.clear();
    if (flush_ && dir_readable_ && fsync(dir_) != 0)
        fail(WRITE, errno);
}

void file_sink::commit(size_t length) {
    void *p = map_;
    map_ = nullptr;
    if (munmap(p, mapped_) != 0)
        fail(WRITE, errno);
    if (regular_ && ftruncate(fd_, off_t(length)) != 0)
        fail(WRITE, errno);
    if (flush_ && regular_ && fsync(fd_) != 0)
        fail(WRITE, errno);
    if (in_place_)
        return close_file(WRITE);
    publish();
}

void file_sink::drop_temporary_name() noexcept {
    if (temp_.empty())
        return;
    unlinkat(dir_, temp_.c_str(), 0);
    release_temporary(slot_);
    slot_ = -1;
    temp_.clear();
}

// A temporary file is removed (an unnamed one goes with its descriptor); an
// output written in place is removed when it is a regular file (never a
// device or a FIFO named as output).
void file_sink::abandon() noexcept {
    if (map_) {
        munmap(map_, mapped_);
        map_ = nullptr;
    }
    if (fd_ >= 0) {
        close(fd_);
        fd_ = -1;
        if (in_place_ && regular_)
            unlinkat(dir_, entry_.c_str(), 0);
    }
    drop_temporary_name();
}

} // namespace

// ---------------------------------------------------------------------------

char *memory_sink::acquire(size_t size) {
    try {
        out_.assign(size, 0);
    } catch (const std::bad_alloc &) {
        fail(MAP, ENOMEM);
    }
    return reinterpret_cast<char *>(out_.data());
}

void memory_sink::commit(size_t length) { out_.resize(length); }

void memory_sink::abandon() noexcept {
    out_.clear();
    out_.shrink_to_fit();
}

std::unique_ptr<image_sink> make_file_sink(const std::string &path, file_identity source, bool flush) {
    return std::make_unique<file_sink>(path, source, flush);
}

file_identity identity_of(const std::string &path) {
    struct stat st;
    if (stat(path.c_str(), &st) != 0)
        return {};
    return {true, st.st_dev, st.st_ino};
}

void qecfg::remove_temporary_files_on_signals() {
    struct sigaction sa {};
    sa.sa_handler = remove_temporaries_and_die;
    sa.sa_flags = SA_RESETHAND;
    sigemptyset(&sa.sa_mask);
    for_each_cleanup_signal([&](int s) { sigaddset(&sa.sa_mask, s); });
    for_each_cleanup_signal([&](int s) {
        struct sigaction old {};
        // A signal the process was started ignoring stays ignored, and a
        // handler already installed (a sanitizer's) stays in place.
        if (sigaction(s, nullptr, &old) == 0 && old.sa_handler == SIG_DFL)
            sigaction(s, &sa, nullptr);
    });
    signal(SIGXFSZ, SIG_IGN);
}
