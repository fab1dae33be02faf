// Glossary: zu_ names the data-type and value model (zu_data_type_t, the
//   typed value zu_value_t) that sources, records and readers share. The
//   other names of the format are explained at the top of cdb.h.
//
// Common data types and the typed value model shared by the compiler, the
// CDB records and every reader of a CDB.
#ifndef ZU_H
#define ZU_H

#include <cstddef>
#include <cstdint>

typedef char zu_char_t;
typedef int8_t zu_int8_t;
typedef int16_t zu_int16_t;
typedef uint16_t zu_uint16_t;
typedef int32_t zu_int32_t;
typedef uint32_t zu_uint32_t;
typedef int64_t zu_int64_t;
typedef uint64_t zu_uint64_t;
typedef float zu_float32_t;
typedef double zu_float64_t;

// A 32-bit enumeration; the array types are exactly 13 to 22 and the element
// type of array type t is t - 11.
typedef enum : uint32_t {
    ZU_UNKNOWN = 0,
    ZU_NONE = 1,
    ZU_INT32 = 2,
    ZU_UINT32 = 3,
    ZU_INT64 = 4,
    ZU_UINT64 = 5,
    ZU_FLOAT32 = 6,
    ZU_FLOAT64 = 7,
    ZU_CHAR_PTR = 8,
    ZU_BINARY_PTR = 9,
    ZU_RSRC_HANDLE_PTR = 10,
    ZU_SD_PTR = 11,
    ZU_SBS_PTR = 12,
    ZU_INT32_ARRAY = 13,
    ZU_UINT32_ARRAY = 14,
    ZU_INT64_ARRAY = 15,
    ZU_UINT64_ARRAY = 16,
    ZU_FLOAT32_ARRAY = 17,
    ZU_FLOAT64_ARRAY = 18,
    ZU_CHAR_PTR_ARRAY = 19,
    ZU_BINARY_PTR_ARRAY = 20,
    ZU_RSRC_HANDLE_PTR_ARRAY = 21,
    ZU_SD_PTR_ARRAY = 22,
} zu_data_type_t;

constexpr unsigned ZU_NUM_DATA_TYPES = 23;

// Every value form is packed on 4-byte boundaries, like the records that hold
// them: a value field may sit at any multiple of 4 in a record.
#pragma pack(push, 4)

struct zu_binary_t;
struct zu_resource_handle_t;
struct zu_structured_data_t;
struct zu_sbs_t;
struct zu_array_t;

typedef zu_char_t *zu_char_ptr_t;
typedef zu_binary_t *zu_binary_ptr_t;
typedef zu_resource_handle_t *zu_resource_handle_ptr_t;
typedef zu_structured_data_t *zu_sd_ptr_t;
typedef zu_sbs_t *zu_sbs_ptr_t;
typedef zu_array_t *zu_array_ptr_t;

typedef union {
    zu_int32_t val_int32;
    zu_uint32_t val_uint32;
    zu_int64_t val_int64;
    zu_uint64_t val_uint64;
    zu_float32_t val_float32;
    zu_float64_t val_float64;
    zu_char_ptr_t ptr_char;
    zu_binary_ptr_t ptr_binary;
    zu_resource_handle_ptr_t ptr_rsrc_handle;
    zu_sd_ptr_t ptr_sd;
    zu_sbs_ptr_t ptr_sbs;
    zu_array_ptr_t ptr_array;
} zu_value_t;

struct zu_binary_t {
    zu_uint32_t length;
    zu_char_t data[1];
};

struct zu_resource_id_t {
    zu_uint32_t id1, id2, id3, id4;
};

struct zu_resource_handle_t {
    zu_uint32_t header;
    zu_resource_id_t id;
};

struct zu_structured_data_element_t {
    zu_data_type_t data_type;
    zu_uint32_t pad;
    zu_value_t value;
};

struct zu_structured_data_t {
    zu_uint32_t element_count;
    zu_uint32_t pad;
    zu_structured_data_element_t elements[1];
};

struct zu_array_t {
    zu_uint32_t element_count;
    zu_uint32_t pad;
    zu_value_t elements[1];
};

typedef enum : int8_t {
    ZU_SF_INT32 = 0,
    ZU_SF_FLOAT32 = 1,
    ZU_SF_STRING = 2,
    ZU_SF_BINARY = 3,
} zu_sbs_field_data_type_t;

struct zu_sbs_field_t {
    zu_int16_t field_length;
    zu_int8_t field_dtype;
    zu_int8_t field_sn;
    zu_char_t field_data[1];
};

struct zu_sbs_t {
    zu_int32_t length;
    zu_sbs_field_t field1;
};

#pragma pack(pop)

static_assert(sizeof(zu_data_type_t) == 4);
static_assert(sizeof(zu_value_t) == 8);
static_assert(sizeof(zu_resource_handle_t) == 20);
static_assert(sizeof(zu_structured_data_element_t) == 16);
static_assert(offsetof(zu_structured_data_element_t, value) == 8);
static_assert(sizeof(zu_structured_data_t) == 24);
static_assert(offsetof(zu_structured_data_t, elements) == 8);
static_assert(sizeof(zu_array_t) == 16);
static_assert(offsetof(zu_array_t, elements) == 8);
static_assert(offsetof(zu_binary_t, data) == 4);

// Byte offsets of the value bodies as laid out in a string table: a binary's
// data start 8 bytes after its length word.
constexpr size_t ZU_BINARY_DATA_OFFSET = 8;
constexpr size_t ZU_ARRAY_HEADER_SIZE = 8;
constexpr size_t ZU_ARRAY_ELEMENT_SIZE = 8;
constexpr size_t ZU_SD_HEADER_SIZE = 8;
constexpr size_t ZU_SD_ELEMENT_SIZE = 16;

// Names of the data types in source text, indexed by the type (zuTypeMap maps
// entry i to the value i).
inline constexpr const char *zuTypeStr[ZU_NUM_DATA_TYPES] = {
    "UNKNOWN",      "None",        "Int32",       "UInt32",     "Int64",       "UInt64",
    "Float32",      "Float64",     "String",      "Binary",     "RH",          "SD",
    "SBS",          "Int32Array",  "UInt32Array", "Int64Array", "UInt64Array", "Float32Array",
    "Float64Array", "StringArray", "BinaryArray", "RHArray",    "SDArray",
};

constexpr bool zu_is_array_type(uint32_t dt) { return dt >= ZU_INT32_ARRAY && dt <= ZU_SD_PTR_ARRAY; }

#endif
