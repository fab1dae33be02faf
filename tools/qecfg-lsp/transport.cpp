// Content-Length framing. Every header line and header block is bounded, a
// body above the limit is read past in pieces, and an input that ends at any
// point is reported, never waited on.
#include "transport.h"

#include <cctype>
#include <cerrno>
#include <cstring>
#include <poll.h>
#include <unistd.h>

namespace lsp {

namespace {

constexpr size_t PIECE = 65536;
const char CONTENT_LENGTH[] = "content-length:";

bool starts_with_nocase(const std::string &s, const char *prefix) {
    size_t n = std::strlen(prefix);
    return s.size() >= n && strncasecmp(s.c_str(), prefix, n) == 0;
}

// The decimal value of a Content-Length header; false when it is no plain
// count or exceeds what size_t holds.
bool parse_length(const std::string &line, size_t &length) {
    size_t i = sizeof CONTENT_LENGTH - 1;
    while (i < line.size() && (line[i] == ' ' || line[i] == '\t'))
        i++;
    size_t end = line.size();
    while (end > i && (line[end - 1] == ' ' || line[end - 1] == '\t'))
        end--;
    if (i == end)
        return false;
    size_t n = 0;
    for (; i < end; i++) {
        if (line[i] < '0' || line[i] > '9' || n > (SIZE_MAX - 9) / 10)
            return false;
        n = n * 10 + size_t(line[i] - '0');
    }
    length = n;
    return true;
}

// After a message whose body was not consumed, that body runs into the next
// header line: the line is read from its Content-Length on.
void resynchronise(std::string &line) {
    std::string lower = line;
    for (char &c : lower)
        c = char(std::tolower(static_cast<unsigned char>(c)));
    size_t at = lower.find(CONTENT_LENGTH);
    if (at != std::string::npos && at > 0)
        line.erase(0, at);
}

} // namespace

size_t fd_input::read_some(char *buf, size_t n) {
    for (;;) {
        ssize_t got = ::read(fd_, buf, n);
        if (got >= 0)
            return size_t(got);
        if (errno != EINTR)
            return 0;
    }
}

bool fd_input::ready() {
    pollfd p{fd_, POLLIN, 0};
    return ::poll(&p, 1, 0) > 0;
}

size_t memory_input::read_some(char *buf, size_t n) {
    n = std::min(n, bytes_.size() - pos_);
    std::memcpy(buf, bytes_.data() + pos_, n);
    pos_ += n;
    return n;
}

bool message_reader::fill() {
    if (pos_ == buf_.size()) {
        buf_.clear();
        pos_ = 0;
    }
    char piece[PIECE];
    size_t got = in_.read_some(piece, sizeof piece);
    buf_.append(piece, got);
    return got > 0;
}

// One header line without its line end; a line longer than the limit is
// read to its end and dropped.
message_reader::line_status message_reader::header_line(std::string &line) {
    line.clear();
    bool too_long = false;
    for (;;) {
        if (pos_ == buf_.size() && !fill())
            return line_status::end;
        const char *start = buf_.data() + pos_;
        const char *nl = static_cast<const char *>(std::memchr(start, '\n', buf_.size() - pos_));
        size_t n = nl ? size_t(nl - start) : buf_.size() - pos_;
        if (!too_long && line.size() + n <= MAX_HEADER_LINE)
            line.append(start, n);
        else
            too_long = true;
        pos_ += n + (nl ? 1 : 0);
        if (nl)
            break;
    }
    if (!line.empty() && line.back() == '\r')
        line.pop_back();
    return too_long ? line_status::too_long : line_status::line;
}

// Reads `length` bytes into `body`, or past them when `body` is null.
bool message_reader::read_body(size_t length, std::string *body) {
    if (body) {
        body->clear();
        body->reserve(length);
    }
    while (length > 0) {
        if (pos_ == buf_.size() && !fill())
            return false;
        size_t n = std::min(length, buf_.size() - pos_);
        if (body)
            body->append(buf_, pos_, n);
        pos_ += n;
        length -= n;
    }
    return true;
}

frame_status message_reader::next(std::string &body) {
    std::string line;
    bool have_length = false, bad_header = false, any = false;
    size_t length = 0;
    for (size_t lines = 0;; lines++) {
        line_status s = header_line(line);
        if (s == line_status::end)
            return any ? frame_status::truncated : frame_status::end;
        if (line.empty() && s == line_status::line) {
            if (!any)
                continue; // blank lines between messages
            break;
        }
        any = true;
        if (s == line_status::too_long || lines >= MAX_HEADER_LINES)
            bad_header = true;
        else if (resynchronise(line), starts_with_nocase(line, CONTENT_LENGTH)) {
            // A second Content-Length, or one that is no plain count, leaves the length unknown.
            bad_header = bad_header || have_length || !parse_length(line, length);
            have_length = true;
        }
    }
    if (bad_header || !have_length)
        return frame_status::no_length;
    if (length > max_body_)
        return read_body(length, nullptr) ? frame_status::too_large : frame_status::truncated;
    return read_body(length, &body) ? frame_status::message : frame_status::truncated;
}

bool write_message(int fd, const std::string &body) {
    std::string out = "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
    for (size_t done = 0; done < out.size();) {
        ssize_t n = ::write(fd, out.data() + done, out.size() - done);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            return false;
        done += size_t(n);
    }
    return true;
}

} // namespace lsp
