// The --annotate listing: every byte range of the file in order.
#ifndef CDBDUMP_CDB_ANNOTATE_H
#define CDBDUMP_CDB_ANNOTATE_H

#include <cstdint>
#include <string>
#include <vector>

#include "cdb_sink.h"
#include "cdb_walk.h"

namespace cdbdump {

// Writes the listing while the walk hands over its spans (annotate_each).
class annotation_writer {
  public:
    annotation_writer(const uint8_t *data, size_t size, bool big_endian, text_sink &out);
    // Writes every span below final_below, keeping the rest for later batches.
    void spans(std::vector<span> &&batch, size_t final_below);
    void finish(size_t violations);

  private:
    void write(const span &s, std::string &out);
    const uint8_t *data_;
    size_t size_;
    text_sink &out_;
    std::vector<span> pending_;
    size_t cursor_ = 0;
};

// Lines of "offset  hex bytes  field = value"; ranges that nothing labels are
// shown as padding (all zero) or as unreferenced bytes, violations as "!!".
std::string annotation_text(const uint8_t *data, size_t size, const annotation &a);
// The same listing written while the file is walked (annotate_each); returns
// the number of violations.
size_t write_annotation(const uint8_t *data, size_t size, text_sink &out, size_t window = ANNOTATE_WINDOW);

} // namespace cdbdump

#endif
