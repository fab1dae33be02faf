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
#include <functional>
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

// Receives each dsect as soon as it is read, with its position in anchor order.
using dsect_consumer = std::function<void(size_t index, dsect &&d)>;
// Verifies the whole image as verify does, keeping no dsect: each goes to the
// consumer instead, and the returned file holds the header and anchors only.
// Memory stays that of one dsect, whatever the number of dsects.
cdb_file verify_each(const uint8_t *data, size_t size, const dsect_consumer &each);

struct annotation {
    bool big_endian = false;
    std::vector<span> spans; // in the order found, not sorted
    size_t violations = 0;
};
annotation annotate_walk(const uint8_t *data, size_t size);

// The largest manager and class ids and how many dsects could be read.
struct dsect_maxima {
    uint16_t rm_id = 0, class_id = 0;
    size_t walked = 0;
};
// Receives spans in batches: no later batch holds a span that starts below `final_below`.
using span_consumer = std::function<void(std::vector<span> &&batch, size_t final_below)>;
// The annotating walk, handing its spans over in file order, window by window
// of `window` bytes, so that only the spans of one window are held; returns
// the number of violations flagged.
constexpr size_t ANNOTATE_WINDOW = 1 << 20;
size_t annotate_each(const uint8_t *data, size_t size, bool &big_endian, const span_consumer &each,
                     size_t window = ANNOTATE_WINDOW);

} // namespace cdbdump

#endif
