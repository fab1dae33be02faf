// The bytes of the file to inspect: a regular file is mapped, anything else
// (a pipe, a device) read once; nothing is copied twice. Sizes that no CDB
// can have are refused before anything is read.
#ifndef CDBDUMP_CDB_INPUT_H
#define CDBDUMP_CDB_INPUT_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace cdbdump {

class input_file {
  public:
    enum class outcome {
        loaded,
        unreadable, // error holds the step and the system's reason
        refused,    // a size no CDB can have: error holds the violation, at refused_at
    };
    input_file() = default;
    input_file(const input_file &) = delete;
    input_file &operator=(const input_file &) = delete;
    ~input_file();

    // path "-" is standard input.
    outcome load(const std::string &path);
    const uint8_t *data() const { return mapped_ ? mapped_ : read_.data(); }
    size_t size() const { return mapped_ ? mapped_size_ : read_.size(); }
    const std::string &error() const { return error_; }
    size_t refused_at() const { return refused_at_; }

  private:
    outcome load_fd(int fd);
    outcome read_stream(int fd);
    outcome fail(const char *step);
    outcome refuse(size_t at, std::string what);
    const uint8_t *mapped_ = nullptr;
    size_t mapped_size_ = 0;
    std::vector<uint8_t> read_;
    std::string error_;
    size_t refused_at_ = 0;
};

// The largest file a 32-bit length field can describe: the length counts the
// bytes after itself.
constexpr uint64_t MAX_CDB_SIZE = 0xFFFFFFFFull + 4;

} // namespace cdbdump

#endif
