// The base protocol of a language server: messages framed by a
// Content-Length header, read from any byte input with bounded memory.
#ifndef QECFG_LSP_TRANSPORT_H
#define QECFG_LSP_TRANSPORT_H

#include <cstddef>
#include <cstdio>
#include <string>
#include <sys/types.h>

namespace lsp {

// Where the bytes come from: a file descriptor, or memory for the fuzzer.
class byte_input {
  public:
    virtual ~byte_input() = default;
    // Up to `n` bytes; 0 at the end of the input.
    virtual size_t read_some(char *buf, size_t n) = 0;
    // True when a read would not block.
    virtual bool ready() = 0;
};

class fd_input : public byte_input {
  public:
    explicit fd_input(int fd) : fd_(fd) {}
    size_t read_some(char *buf, size_t n) override;
    bool ready() override;

  private:
    int fd_;
};

class memory_input : public byte_input {
  public:
    explicit memory_input(std::string bytes) : bytes_(std::move(bytes)) {}
    size_t read_some(char *buf, size_t n) override;
    bool ready() override { return true; }

  private:
    std::string bytes_;
    size_t pos_ = 0;
};

// What the framing layer makes of the next message.
enum class frame_status {
    message,   // `body` holds one message
    end,       // the input ended between messages
    truncated, // the input ended inside a message
    no_length, // a header block without a usable Content-Length
    too_large, // a Content-Length above the limit: the body was skipped
};

class message_reader {
  public:
    static constexpr size_t MAX_HEADER_LINE = 1024;
    static constexpr size_t MAX_HEADER_LINES = 32;

    message_reader(byte_input &in, size_t max_body) : in_(in), max_body_(max_body) {}
    frame_status next(std::string &body);
    // True when a whole message may already be waiting.
    bool ready() { return pos_ < buf_.size() || in_.ready(); }

  private:
    enum class line_status { line, end, too_long };
    line_status header_line(std::string &line);
    bool fill();
    bool read_body(size_t length, std::string *body);

    byte_input &in_;
    size_t max_body_;
    std::string buf_;
    size_t pos_ = 0;
};

// Writes one message with its header; false when the output failed.
bool write_message(int fd, const std::string &body);

} // namespace lsp

#endif
