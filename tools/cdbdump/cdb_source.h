// --source: a class definition source that the compiler turns back into a CDB
// of the same content.
#ifndef CDBDUMP_CDB_SOURCE_H
#define CDBDUMP_CDB_SOURCE_H

#include <optional>
#include <string>
#include <vector>

#include "cdb_model.h"

namespace cdbdump {

struct decompiled {
    std::string text;
    // What the source cannot say so that the compiler reproduces it; each is
    // also a comment at its place in the text.
    std::vector<std::string> warnings;
};

decompiled decompile(const cdb_file &f);

// --- value text (cdb_source_text.cpp)

// The value the compiler's reader takes from one statement line (comments cut,
// trailing blanks removed, quotes stripped), or nothing when it ignores or
// refuses the line.
std::optional<std::string> statement_value(const std::string &line);
// The line "<tab>Name=value" in the first form (plain, then quoted) whose
// value reads back as text; nothing when neither does.
std::optional<std::string> statement_line(const std::string &name, const std::string &text);
// Binary value text: the hexadecimal form or, when shorter, the escape form.
std::string binary_text(const std::vector<uint8_t> &bytes);
// The text of a number of type 2 to 7 that the compiler converts back to the
// same bits, or nothing (a NaN payload, a value the conversion refuses).
std::optional<std::string> number_source_text(uint32_t type, uint64_t bits);

} // namespace cdbdump

#endif
