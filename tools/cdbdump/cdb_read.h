// The model of a CDB read through libcdb: after its full check passes, every
// dsect is read through the library's accessors. A file the check refuses
// goes to the walker, which names its first violation.
#ifndef CDBDUMP_CDB_READ_H
#define CDBDUMP_CDB_READ_H

#include <cstddef>
#include <cstdint>

#include <qecfg/cdb_reader.h>

#include "cdb_walk.h"

namespace cdbdump {

// Whether the library's full check (with its overlap map) accepts the image.
bool library_accepts(const uint8_t *data, size_t size);

// The 20 bytes of a resource handle value as stored.
constexpr size_t HANDLE_SIZE = 20;
void handle_bytes(const cdb_value_t &v, bool big_endian, uint8_t *out);

// Opens the image when the library's full check accepts it.
bool open_checked(const uint8_t *data, size_t size, cdb_t &db);
// The header and anchors of an opened image (no dsect).
cdb_file read_head(const cdb_t &db);
// The model of dsect i (anchor d) of an opened image.
dsect read_dsect(const cdb_t &db, uint32_t i, const cdb_dsect_t &d);

// Whether the library's full check accepts the image; when it does, the
// header and anchors go into `head` and each dsect to `each` (or into
// head.dsects when `each` is empty).
bool read_checked(const uint8_t *data, size_t size, cdb_file &head, const dsect_consumer &each);

} // namespace cdbdump

#endif
