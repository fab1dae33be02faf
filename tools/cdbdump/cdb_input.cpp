#include "cdb_input.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "cdb.h"

namespace cdbdump {

namespace {
constexpr size_t FORMAT_END = 12; // the length, the checksum and the format word

// The length field read in the byte order the format word gives, or nothing
// when the format word is wrong in both orders.
bool length_field(const std::vector<uint8_t> &head, uint64_t &length) {
    for (bool big : {false, true}) {
        auto word = [&](size_t off) {
            uint32_t v = 0;
            for (unsigned i = 0; i < 4; i++)
                v |= uint32_t(head[off + i]) << (big ? 8 * (3 - i) : 8 * i);
            return v;
        };
        if (word(8) == CDB_FORMAT) {
            length = word(0);
            return true;
        }
    }
    return false;
}

// Reads up to `want` bytes more, growing the buffer only as bytes arrive;
// false on a read error.
bool read_more(int fd, std::vector<uint8_t> &bytes, size_t want, bool &at_end) {
    constexpr size_t CHUNK = 1 << 20;
    while (want > 0 && !at_end) {
        size_t start = bytes.size(), piece = std::min(want, CHUNK);
        bytes.resize(start + piece);
        ssize_t n = ::read(fd, bytes.data() + start, piece);
        bytes.resize(start + size_t(std::max<ssize_t>(n, 0)));
        if (n < 0 && errno == EINTR)
            continue;
        if (n < 0)
            return false;
        at_end = n == 0;
        want -= size_t(n);
    }
    return true;
}
} // namespace

input_file::~input_file() {
    if (mapped_)
        ::munmap(const_cast<uint8_t *>(mapped_), mapped_size_);
}

input_file::outcome input_file::fail(const char *step) {
    error_ = std::string(step) + ": " + std::strerror(errno);
    return outcome::unreadable;
}

input_file::outcome input_file::refuse(size_t at, std::string what) {
    refused_at_ = at;
    error_ = std::move(what);
    return outcome::refused;
}

input_file::outcome input_file::load(const std::string &path) {
    if (path == "-")
        return load_fd(STDIN_FILENO);
    int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return fail("cannot open");
    outcome o = load_fd(fd);
    ::close(fd);
    return o;
}

input_file::outcome input_file::load_fd(int fd) {
    struct stat st {};
    if (::fstat(fd, &st) != 0)
        return fail("cannot read");
    if (S_ISDIR(st.st_mode)) {
        errno = EISDIR;
        return fail("cannot read");
    }
    if (!S_ISREG(st.st_mode))
        return read_stream(fd);
    uint64_t size = uint64_t(st.st_size);
    if (size > MAX_CDB_SIZE)
        return refuse(0, "the file has " + std::to_string(size) + " bytes, more than the " +
                             std::to_string(MAX_CDB_SIZE) + " that a 32-bit length field can describe");
    if (size == 0)
        return outcome::loaded;
    void *p = ::mmap(nullptr, size_t(size), PROT_READ, MAP_PRIVATE, fd, 0);
    if (p == MAP_FAILED)
        return fail("cannot read");
    mapped_ = static_cast<const uint8_t *>(p);
    mapped_size_ = size_t(size);
    return outcome::loaded;
}

// A stream has no size to check beforehand: the header is read first, and no
// more than its length field announces (plus one byte, to tell that the
// stream is longer). Without a valid format word the header alone is enough
// to refuse the file.
input_file::outcome input_file::read_stream(int fd) {
    bool at_end = false;
    if (!read_more(fd, read_, CDB_HEADER_SIZE, at_end))
        return fail("cannot read");
    uint64_t length = 0;
    if (at_end || read_.size() < FORMAT_END || !length_field(read_, length))
        return outcome::loaded;
    uint64_t expected = length + 4;
    if (expected > read_.size() && !read_more(fd, read_, size_t(expected - read_.size()), at_end))
        return fail("cannot read");
    if (at_end)
        return outcome::loaded;
    if (!read_more(fd, read_, 1, at_end))
        return fail("cannot read");
    if (read_.size() <= expected)
        return outcome::loaded;
    return refuse(0, "cdb_hdr_length is " + std::to_string(length) + ", but the file has more than " +
                         std::to_string(length) + " bytes after the length field");
}

} // namespace cdbdump
