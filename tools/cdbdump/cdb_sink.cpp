#include "cdb_sink.h"

#include <cerrno>

namespace cdbdump {

void text_sink::drain() {
    errno = 0;
    if (!error_ && !buf_.empty() && std::fwrite(buf_.data(), 1, buf_.size(), to_) != buf_.size())
        error_ = errno ? errno : EIO;
    buf_.clear();
}

bool text_sink::finish() {
    if (!to_)
        return true;
    drain();
    errno = 0;
    if (!error_ && std::fflush(to_) != 0)
        error_ = errno ? errno : EIO;
    if (!error_ && std::ferror(to_))
        error_ = EIO;
    return error_ == 0;
}

} // namespace cdbdump
