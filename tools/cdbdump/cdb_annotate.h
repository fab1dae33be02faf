// The --annotate listing: every byte range of the file in order.
#ifndef CDBDUMP_CDB_ANNOTATE_H
#define CDBDUMP_CDB_ANNOTATE_H

#include <cstdint>
#include <string>

#include "cdb_walk.h"

namespace cdbdump {

// Lines of "offset  hex bytes  field = value"; ranges that nothing labels are
// shown as padding (all zero) or as unreferenced bytes, violations as "!!".
std::string annotation_text(const uint8_t *data, size_t size, const annotation &a);

} // namespace cdbdump

#endif
