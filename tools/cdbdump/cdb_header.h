// cdbdump --header: a C header of a CDB's identifiers (class names and ids,
// attribute and action ids) as constants, read through libcdb, so that
// service code names them instead of hard-coding numbers.
#ifndef CDBDUMP_CDB_HEADER_H
#define CDBDUMP_CDB_HEADER_H

#include <cstddef>
#include <cstdint>
#include <string>

#include "cdb_sink.h"

namespace cdbdump {

// The C identifier of a name: letters and digits upper-cased, anything else
// an underscore, an underscore before a leading digit.
std::string c_identifier(const std::string &name);

// Writes the header of a verified image; `file` names it in the comment and
// the include guard.
void write_c_header(const uint8_t *data, size_t size, const std::string &file, text_sink &out);

} // namespace cdbdump

#endif
