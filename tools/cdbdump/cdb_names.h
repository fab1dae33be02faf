// Names that the file does not hold: the source keywords of property bits and
// permission letters, data and variable type names, dsect kinds.
#ifndef CDBDUMP_CDB_NAMES_H
#define CDBDUMP_CDB_NAMES_H

#include <cstdint>
#include <string>
#include <vector>

#include "cdb_format.h"

namespace cdbdump {

// A keyword table of cdb.h: property keywords, or permission letters as
// one-character keywords.
struct prop_table {
    const props_t *entries;
    int count;
};

extern const prop_table class_props;  // ResourceClass Properties
extern const prop_table pattr_props;  // persistent attribute Properties
extern const prop_table dattr_props;  // dynamic attribute Properties
extern const prop_table action_props; // action Properties
extern const prop_table perm_letters; // action Permission (one-letter names)

// The keywords whose bits are set, in table order.
std::vector<std::string> prop_names(const prop_table &t, uint32_t bits);
// The bits that no keyword of the table has.
uint32_t unnamed_bits(const prop_table &t, uint32_t bits);

// Source name of a data type; "type N" outside 0..22.
std::string data_type_name(uint32_t dt);
std::string var_type_name(uint32_t vt);
// "class", "manager", "map", "variable_class", or "type N".
std::string dsect_kind_name(uint32_t type);

inline bool is_wide_type(uint32_t dt) { return dt == 4 || dt == 5 || dt == 7; }
// Int32 to Float64: a value held as its 32- or 64-bit pattern.
inline bool is_number_type(uint32_t dt) { return dt >= ZU_INT32 && dt <= ZU_FLOAT64; }
// The high end of a numeric range that no statement gave, as the bits of the
// type (2 to 7).
inline uint64_t hundred_bits(uint32_t dt) {
    static_assert(CDB_DEFAULT_RANGE_HIGH == 100);
    return dt == ZU_FLOAT32 ? 0x42c80000u : dt == ZU_FLOAT64 ? 0x4059000000000000ull : CDB_DEFAULT_RANGE_HIGH;
}

} // namespace cdbdump

#endif
