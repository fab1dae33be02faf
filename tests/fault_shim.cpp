// A fault injector preloaded into qecfg by the tests of the output file.
//
//   QECFG_FAULT=NAME:N:ERRNO  the Nth call of the library function NAME fails
//                             with ERRNO (posix_fallocate returns it; there
//                             ERRNO 0 reports success without reserving)
//   QECFG_FAULT_HIT=PATH      created when that call has failed
//   QECFG_NO_TMPFILE          (any value) the file system has no unnamed
//                             temporary files
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace {

struct fault_plan {
    char name[32] = "";
    long at = 0;
    int err = EIO;
    long calls = 0;
    bool read = false;
};

// Read at the first call once the environment is there (a sanitizer's
// runtime makes calls before it is).
fault_plan &plan() {
    static fault_plan p;
    if (!p.read && environ) {
        p.read = true;
        if (const char *fault = std::getenv("QECFG_FAULT"))
            std::sscanf(fault, "%31[^:]:%ld:%d", p.name, &p.at, &p.err);
    }
    return p;
}

// Whether this call of `name` is the one to fail; then errno is set.
bool fails(const char *name) {
    fault_plan &p = plan();
    if (std::strcmp(p.name, name) != 0 || ++p.calls != p.at)
        return false;
    if (const char *hit = std::getenv("QECFG_FAULT_HIT")) {
        // Straight to the kernel: openat is one of the functions replaced here.
        long fd = syscall(SYS_openat, AT_FDCWD, hit, O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
        if (fd >= 0)
            syscall(SYS_close, fd);
    }
    errno = p.err;
    return true;
}

template <typename F> F real(const char *name) { return reinterpret_cast<F>(dlsym(RTLD_NEXT, name)); }

} // namespace

// A function that fails with `failed` and errno, or calls the real one.
#define FAULTY(ret, name, failed, params, args)                                                                        \
    extern "C" ret name params {                                                                                       \
        if (fails(#name))                                                                                              \
            return failed;                                                                                             \
        static auto next = real<ret(*) params>(#name);                                                                 \
        return next args;                                                                                              \
    }

FAULTY(int, fstatat, -1, (int d, const char *p, struct stat *st, int f), (d, p, st, f))
FAULTY(int, fstat, -1, (int fd, struct stat *st), (fd, st))
FAULTY(ssize_t, readlinkat, -1, (int d, const char *p, char *b, size_t n), (d, p, b, n))
FAULTY(int, faccessat, -1, (int d, const char *p, int m, int f), (d, p, m, f))
FAULTY(int, fchown, -1, (int fd, uid_t u, gid_t g), (fd, u, g))
FAULTY(int, fchmod, -1, (int fd, mode_t m), (fd, m))
FAULTY(ssize_t, write, -1, (int fd, const void *b, size_t n), (fd, b, n))
FAULTY(void *, mmap, MAP_FAILED, (void *a, size_t n, int pr, int fl, int fd, off_t o), (a, n, pr, fl, fd, o))
FAULTY(int, munmap, -1, (void *a, size_t n), (a, n))
FAULTY(int, ftruncate, -1, (int fd, off_t n), (fd, n))
FAULTY(int, fsync, -1, (int fd), (fd))
FAULTY(int, close, -1, (int fd), (fd))
FAULTY(int, linkat, -1, (int d1, const char *p1, int d2, const char *p2, int f), (d1, p1, d2, p2, f))
FAULTY(int, renameat, -1, (int d1, const char *p1, int d2, const char *p2), (d1, p1, d2, p2))
FAULTY(int, unlinkat, -1, (int d, const char *p, int f), (d, p, f))

extern "C" int posix_fallocate(int fd, off_t off, off_t len) {
    if (fails("posix_fallocate"))
        return errno;
    static auto next = real<int (*)(int, off_t, off_t)>("posix_fallocate");
    return next(fd, off, len);
}

extern "C" int openat(int dir, const char *path, int flags, ...) {
    mode_t mode = 0;
    if (flags & (O_CREAT | __O_TMPFILE)) {
        va_list ap;
        va_start(ap, flags);
        mode = mode_t(va_arg(ap, int));
        va_end(ap);
    }
    if ((flags & O_TMPFILE) == O_TMPFILE && std::getenv("QECFG_NO_TMPFILE")) {
        errno = EOPNOTSUPP;
        return -1;
    }
    if (fails("openat"))
        return -1;
    static auto next = real<int (*)(int, const char *, int, ...)>("openat");
    return next(dir, path, flags, mode);
}
