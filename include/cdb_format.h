// Facts of the CDB format and of the source language that every tool must
// agree on: the checksum, the values that completion supplies for what a
// source leaves out, the data-type predicates and the reader's limits. Each
// tool keeps its own logic; only these facts live here.
#ifndef CDB_FORMAT_H
#define CDB_FORMAT_H

#include <cstddef>
#include <cstdint>

#include "cdb.h"

// Tables are copied into the file padded to a multiple of 8, and every
// string and value body in a string table starts at one.
constexpr size_t round8(size_t n) { return (n + 7) & ~size_t(7); }

// The checksum of an image of `length` bytes after its length word (the
// header's length): the length word XORed with every 32-bit word from byte 8
// on, so that the XOR of all words of the file is 0. `word_at(offset)` reads
// one word as the image stores it.
template <typename WordAt> uint32_t cdb_checksum(uint32_t length, WordAt word_at) {
    uint32_t sum = word_at(0);
    for (uint32_t i = 0; i < (length - 4) / 4; i++)
        sum ^= word_at(8 + 4 * size_t(i));
    return sum;
}

// What a permission template statement stores, whatever its text.
constexpr uint32_t CDB_PERM_TEMPLATE_GIVEN = 0xEEEEEEEE;
// The permission of an action without a Permission statement: the letter 's'.
constexpr uint32_t CDB_DEFAULT_PERMISSION = 0x40;
// The GroupID of a dynamic attribute without one.
constexpr uint16_t CDB_DEFAULT_GROUP_ID = 255;
// A persistent attribute that is neither required nor optional for define
// is invalid for it.
constexpr uint32_t CDB_PA_REQD_FOR_DEFINE = 0x2, CDB_PA_INVAL_FOR_DEFINE = 0x4, CDB_PA_OPT_FOR_DEFINE = 0x8;
// No locator, no structured-data element index: 16-bit none values.
constexpr uint16_t CDB_NO_LOCATOR = 0xFFFF;
constexpr uint16_t CDB_NO_SD_INDEX = 0xFFFF;
// Every structured-data element carries these.
constexpr uint32_t CDB_SD_ELEMENT_ACTION_ID = 0xFFFF;
constexpr uint16_t CDB_SD_ELEMENT_VALID_TYPE = 1;
// The high end of a numeric range that no statement gave; the low end is 0.
constexpr uint32_t CDB_DEFAULT_RANGE_HIGH = 100;
// Variable IDs of class dynamic attributes carry this bit.
constexpr uint32_t CDB_CLASS_VAR_ID_BIT = 0x8000;

// Data-type predicates.
constexpr bool zu_is_numeric_type(uint32_t dt) { return dt >= ZU_INT32 && dt <= ZU_FLOAT64; }
constexpr bool zu_is_numeric_array(uint32_t dt) { return dt >= ZU_INT32_ARRAY && dt <= ZU_FLOAT64_ARRAY; }
constexpr bool zu_is_sd_type(uint32_t dt) { return dt == ZU_SD_PTR || dt == ZU_SD_PTR_ARRAY; }
// The element type of an array type; any other type is its own.
constexpr uint32_t zu_element_type(uint32_t dt) { return zu_is_array_type(dt) ? dt - (ZU_INT32_ARRAY - ZU_INT32) : dt; }
// Texts, binaries, resource handles and structured data (and arrays of them)
// are not ordered: a Range for them is ignored, and they have no range.
constexpr bool zu_is_unordered_type(uint32_t dt) {
    return zu_element_type(dt) >= ZU_CHAR_PTR && zu_element_type(dt) <= ZU_SD_PTR;
}

// The source reader takes at most this many characters per read (a longer
// line continues as the next line), and a value holds at most this many.
constexpr size_t QECFG_PIECE_MAX = 254;
constexpr size_t QECFG_MAX_VALUE_LEN = 1797;

#endif
