// Where a compile's image goes. The builder knows the exact size of the image
// before it lays down a byte: it asks its sink for that many zero-filled
// writable bytes, fills them in place, and then commits or abandons them.
#ifndef QECFG_SINK_H
#define QECFG_SINK_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <sys/types.h>
#include <vector>

#include "qecfg/messages.h"

// A failure of the output: the message it ends the compile with
// (cannot_create, cannot_extend, cannot_map or cannot_write), the system's
// error number, and the reason where it is not that number's text.
struct sink_failure {
    qecfg::message_id id;
    int err;
    std::string reason; // replaces strerror(err) when not empty
};

class image_sink {
  public:
    virtual ~image_sink() = default;
    // size zero-filled bytes to fill; throws sink_failure.
    virtual char *acquire(size_t size) = 0;
    // The image is complete in the first `length` bytes; throws sink_failure.
    virtual void commit(size_t length) = 0;
    // Gives up the image: nothing of it is left behind. Never throws.
    virtual void abandon() noexcept = 0;
};

// The image lands in a caller's buffer.
class memory_sink final : public image_sink {
  public:
    explicit memory_sink(std::vector<uint8_t> &out) : out_(out) {}
    char *acquire(size_t size) override;
    void commit(size_t length) override;
    void abandon() noexcept override;

  private:
    std::vector<uint8_t> &out_;
};

// The identity of a file that the output must never replace.
struct file_identity {
    bool known = false;
    dev_t dev = 0;
    ino_t ino = 0;
};

// The image is written to a file: a temporary one renamed over the output, or
// the output itself in place where that cannot be done (see qecfg_output.cpp).
// flush: the image and the directory entry reach the disk before commit
// returns.
std::unique_ptr<image_sink> make_file_sink(const std::string &path, file_identity source, bool flush = true);

// The identity of an existing file, unknown when it cannot be found.
file_identity identity_of(const std::string &path);

#endif
