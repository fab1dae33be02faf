// The sinks of a compile's image: a caller's buffer, or a file.
//
// A file is replaced atomically where it can be: the image goes to a new
// temporary file beside the output, which is renamed over the output name
// once complete, so that readers of the old file keep a consistent image and
// a new open sees the whole new one. Where no temporary file can be created
// (a directory without write permission, a read-only file system) or the
// output is not a regular file, the output is written in place as it always
// was.
#include <algorithm>
#include <atomic>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <new>
#include <pthread.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "qecfg/qecfg.h"
#include "qecfg_sink.h"

namespace {

const char CREATE[] = "Cannot create CDB file: ";
const char EXTEND[] = "Cannot extend CDB file: ";
const char MAP[] = "Cannot map CDB file: ";
const char WRITE[] = "Cannot write CDB file: ";

[[noreturn]] void fail(const char *prefix, int err) { throw sink_failure{prefix, err}; }

// ---------------------------------------------------------------------------
// Temporary files that a terminating signal must remove. The handler only
// reads armed slots, so registering and releasing need no lock.

constexpr int SLOTS = 16;
enum slot_state : int { SLOT_FREE, SLOT_FILLING, SLOT_ARMED };
struct temp_slot {
    std::atomic<int> state{SLOT_FREE};
    char path[PATH_MAX];
};
temp_slot temp_slots[SLOTS];

int register_temporary(const std::string &path) {
    if (path.size() >= PATH_MAX)
        return -1;
    for (int i = 0; i < SLOTS; i++) {
        int expected = SLOT_FREE;
        if (temp_slots[i].state.compare_exchange_strong(expected, SLOT_FILLING)) {
            std::memcpy(temp_slots[i].path, path.c_str(), path.size() + 1);
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

const int CLEANUP_SIGNALS[] = {SIGINT, SIGTERM, SIGHUP};

extern "C" void remove_temporaries_and_die(int sig) {
    for (temp_slot &s : temp_slots)
        if (s.state.load() == SLOT_ARMED)
            unlink(s.path);
    // The handler was reset to the default: the signal, pending until the
    // handler returns, then ends the process as it would have.
    raise(sig);
}

// Holds the cleanup signals back while a temporary file is created and
// registered, so that none can be left behind unregistered.
class signals_held {
  public:
    signals_held() {
        sigset_t set;
        sigemptyset(&set);
        for (int s : CLEANUP_SIGNALS)
            sigaddset(&set, s);
        pthread_sigmask(SIG_BLOCK, &set, &old_);
    }
    ~signals_held() { pthread_sigmask(SIG_SETMASK, &old_, nullptr); }

  private:
    sigset_t old_;
};

// ---------------------------------------------------------------------------
// Names.

std::string directory_of(const std::string &path) {
    size_t slash = path.rfind('/');
    if (slash == std::string::npos)
        return ".";
    return slash == 0 ? "/" : path.substr(0, slash);
}

std::string base_of(const std::string &path) {
    size_t slash = path.rfind('/');
    return slash == std::string::npos ? path : path.substr(slash + 1);
}

// The file a name designates once symbolic links are followed; a dangling
// link designates the file it names, which the output then creates.
std::string resolve_links(std::string path) {
    for (int depth = 0; depth < 40; depth++) {
        struct stat st;
        if (lstat(path.c_str(), &st) != 0 || !S_ISLNK(st.st_mode))
            return path;
        std::string target(size_t(st.st_size > 0 ? st.st_size : PATH_MAX), '\0');
        ssize_t n = readlink(path.c_str(), target.data(), target.size());
        if (n < 0)
            return path;
        target.resize(size_t(n));
        path = target.front() == '/' ? target : directory_of(path) + "/" + target;
    }
    return path; // a loop: opening it reports the error
}

// Gives a file the owner and group of another, or failing that the group
// alone; where neither is allowed it keeps this process's.
void carry_owner(int fd, const struct stat &old) {
    if (old.st_uid == geteuid() && old.st_gid == getegid())
        return;
    if (fchown(fd, old.st_uid, old.st_gid) != 0)
        (void)!fchown(fd, uid_t(-1), old.st_gid);
}

// ---------------------------------------------------------------------------

class file_sink final : public image_sink {
  public:
    file_sink(std::string path, file_identity source) : name_(std::move(path)), source_(source) {}
    ~file_sink() override { abandon(); }
    char *acquire(size_t size) override;
    void commit(size_t length) override;
    void abandon() noexcept override;

  private:
    void open_output();
    int create_temporary();
    void open_in_place();
    void extend(size_t size);
    void replace_output();

    std::string name_;       // as given
    std::string target_;     // the file that name designates
    std::string temp_;       // the temporary file, when not written in place
    file_identity source_;
    struct stat old_ {};     // the file being replaced, when replaces_
    bool replaces_ = false;
    int fd_ = -1;
    int slot_ = -1;
    void *map_ = nullptr;
    size_t mapped_ = 0;
    bool regular_ = false;
};

void file_sink::open_output() {
    target_ = resolve_links(name_);
    struct stat st;
    bool exists = stat(target_.c_str(), &st) == 0;
    if (exists && source_.known && st.st_dev == source_.dev && st.st_ino == source_.ino)
        throw sink_failure{CREATE, 0, "Output is the source file"};
    if (exists && !S_ISREG(st.st_mode))
        return open_in_place();
    // A file this process may not write stays as protected as it was.
    if (exists && faccessat(AT_FDCWD, target_.c_str(), W_OK, AT_EACCESS) != 0)
        fail(CREATE, errno);
    replaces_ = exists;
    if (replaces_)
        old_ = st;
    int err = create_temporary();
    if (err == EACCES || err == EPERM || err == EROFS)
        return open_in_place();
    if (err)
        fail(CREATE, err);
}

// Creates the temporary file beside the output: exclusively, 0644 before the
// umask like the output itself. Its name starts with a dot and never equals
// the output's. Returns 0 or the error number.
int file_sink::create_temporary() {
    static std::atomic<unsigned> serial{0};
    std::string stem = directory_of(target_) + "/." + base_of(target_).substr(0, 100) + ".tmp-" +
                       std::to_string(getpid()) + "-";
    for (int tries = 0; tries < 100; tries++) {
        std::string path = stem + std::to_string(serial++);
        signals_held held;
        int fd = open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0644);
        if (fd < 0 && errno == EEXIST)
            continue;
        if (fd < 0)
            return errno;
        fd_ = fd;
        temp_ = path;
        slot_ = register_temporary(path);
        regular_ = true;
        return 0;
    }
    return EEXIST;
}

void file_sink::open_in_place() {
    // Non-blocking, so that a FIFO named as output fails instead of hanging.
    int fd = open(name_.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_NONBLOCK | O_CLOEXEC, 0644);
    if (fd < 0)
        fail(CREATE, errno);
    fd_ = fd;
    struct stat st;
    regular_ = fstat(fd, &st) == 0 && S_ISREG(st.st_mode);
}

// Reserves the file's blocks, so that a full disk shows here and not as a
// fault while the mapping is filled. A fresh temporary file has them
// allocated by the file system where it can; otherwise zeros are written in
// whole blocks of EXTEND_BLOCK bytes, many blocks at a time.
void file_sink::extend(size_t size) {
    constexpr size_t EXTEND_BLOCK = 1024;
    mapped_ = 0;
    if (!temp_.empty()) {
        int err = posix_fallocate(fd_, 0, off_t(size));
        if (err == 0) {
            mapped_ = size;
            return;
        }
        if (err != EOPNOTSUPP && err != EINVAL)
            fail(EXTEND, err);
    }
    static const char zeros[EXTEND_BLOCK * 256] = {};
    while (mapped_ < size) {
        size_t blocks = std::min<size_t>((size - mapped_ + EXTEND_BLOCK - 1) / EXTEND_BLOCK, 256);
        size_t want = blocks * EXTEND_BLOCK, done = 0;
        while (done < want) {
            ssize_t n = write(fd_, zeros + done, want - done);
            if (n < 0 && errno == EINTR)
                continue;
            if (n <= 0)
                fail(EXTEND, n < 0 ? errno : ENOSPC);
            done += size_t(n);
        }
        mapped_ += want;
    }
    struct stat st;
    if (fstat(fd_, &st) != 0)
        fail(MAP, errno);
    if (st.st_size < off_t(size))
        fail(MAP, EINVAL);
    mapped_ = size_t(st.st_size);
}

char *file_sink::acquire(size_t size) {
    open_output();
    extend(size);
    void *p = mmap(nullptr, mapped_, PROT_READ | PROT_WRITE, MAP_SHARED, fd_, 0);
    if (p == MAP_FAILED)
        fail(MAP, errno);
    map_ = p;
    return static_cast<char *>(p);
}

// The old file's permission bits, owner and group carry over (the owner only
// where the process may set it); the image reaches the disk before its name
// does, so that a crash leaves the old file or the new one.
void file_sink::replace_output() {
    if (replaces_) {
        carry_owner(fd_, old_);
        if (fchmod(fd_, old_.st_mode & 07777) != 0 || fsync(fd_) != 0)
            fail(WRITE, errno);
    }
    int fd = fd_;
    fd_ = -1;
    if (close(fd) != 0)
        fail(WRITE, errno);
    if (rename(temp_.c_str(), target_.c_str()) != 0)
        fail(WRITE, errno);
    release_temporary(slot_);
    slot_ = -1;
    temp_.clear();
}

void file_sink::commit(size_t length) {
    void *p = map_;
    map_ = nullptr;
    if (munmap(p, mapped_) != 0)
        fail(WRITE, errno);
    if (regular_ && ftruncate(fd_, off_t(length)) != 0)
        fail(WRITE, errno);
    if (!temp_.empty())
        return replace_output();
    int fd = fd_;
    fd_ = -1;
    if (close(fd) != 0)
        fail(WRITE, errno);
}

// A temporary file is removed; an output written in place is removed when it
// is a regular file (never a device or a FIFO named as output).
void file_sink::abandon() noexcept {
    if (map_) {
        munmap(map_, mapped_);
        map_ = nullptr;
    }
    if (fd_ >= 0) {
        close(fd_);
        fd_ = -1;
        if (temp_.empty() && regular_)
            unlink(target_.c_str());
    }
    if (!temp_.empty()) {
        unlink(temp_.c_str());
        release_temporary(slot_);
        slot_ = -1;
        temp_.clear();
    }
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

std::unique_ptr<image_sink> make_file_sink(const std::string &path, file_identity source) {
    return std::make_unique<file_sink>(path, source);
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
    for (int s : CLEANUP_SIGNALS) {
        struct sigaction old {};
        // A signal the process was started ignoring stays ignored.
        if (sigaction(s, nullptr, &old) == 0 && old.sa_handler != SIG_IGN)
            sigaction(s, &sa, nullptr);
    }
    signal(SIGXFSZ, SIG_IGN);
}
