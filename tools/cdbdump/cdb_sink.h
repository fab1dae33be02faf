// Output written piece by piece: collected in a buffer that goes to the file
// whenever it grows past a few pages, so that no output is ever held whole.
// Every write is checked; after the first failure nothing more is written.
#ifndef CDBDUMP_CDB_SINK_H
#define CDBDUMP_CDB_SINK_H

#include <cstdio>
#include <string>
#include <string_view>

namespace cdbdump {

class text_sink {
  public:
    // Without a file, everything stays in the buffer (take).
    explicit text_sink(FILE *to = nullptr) : to_(to) {}
    text_sink(const text_sink &) = delete;
    text_sink &operator=(const text_sink &) = delete;

    text_sink &operator<<(std::string_view s) {
        buf_ += s;
        if (to_ && buf_.size() >= FLUSH_AT)
            drain();
        return *this;
    }
    text_sink &operator<<(char c) { return *this << std::string_view(&c, 1); }
    // Writes what is left and flushes the file; false when any write failed.
    bool finish();
    // The errno of the first failed write, 0 when none failed.
    int error() const { return error_; }
    std::string take() { return std::move(buf_); }

  private:
    static constexpr size_t FLUSH_AT = 64 * 1024;
    void drain();
    FILE *to_;
    std::string buf_;
    int error_ = 0;
};

} // namespace cdbdump

#endif
