// Reading a CDB: complete verification into the model (verify), or a lenient
// walk that labels every byte range and flags each violation where it stands
// (annotate_walk). Both run the same walk; no input makes them read out of
// bounds, recurse without bound or loop without a bound checked against the
// buffer.
#ifndef CDBDUMP_CDB_WALK_H
#define CDBDUMP_CDB_WALK_H

#include <cstddef>
#include <cstdint>
#include <exception>
#include <string>
#include <vector>

#include "cdb_model.h"

namespace cdbdump {

// The first violation found by verify: where it stands and what is wrong.
struct cdb_invalid : std::exception {
    size_t offset = 0;
    std::string message;
    cdb_invalid(size_t off, std::string msg) : offset(off), message(std::move(msg)) {}
    const char *what() const noexcept override { return message.c_str(); }
};

// One labelled byte range. A flagged span has no bytes of its own: it carries
// the violation found at its offset.
struct span {
    size_t off = 0, len = 0;
    std::string field;
    std::string value;
    bool flagged = false;
};

// Verifies the whole image and returns what it holds; throws cdb_invalid.
cdb_file verify(const uint8_t *data, size_t size);

struct annotation {
    bool big_endian = false;
    std::vector<span> spans; // in the order found, not sorted
    size_t violations = 0;
};
annotation annotate_walk(const uint8_t *data, size_t size);

} // namespace cdbdump

#endif
