/* libcdb: reads a class definition database (CDB) in place.
 *
 * The reader works on a buffer the caller owns (typically a read-only mapping
 * of the file), in either byte order, without copying or swapping it and
 * without allocating anything. Every handle below is a small value the caller
 * keeps (on its stack, say) that points into that buffer; the buffer must
 * outlive them, and a handle that names a class (cdb_class_t) must outlive
 * the attribute, action, list and value handles taken from it.
 *
 * Two levels of trust:
 * - cdb_open checks the header, the length, the format word, the record
 *   sizes and the anchor table: O(number of dsects), no pass over the data.
 *   After it every accessor still bounds every read by the buffer: on a
 *   damaged file an accessor returns an error (or 0, or NULL, as documented),
 *   never reads outside the buffer.
 * - cdb_check verifies everything else (checksum, every record, list, body
 *   and string, identifier words, data types, the header's maxima): one pass
 *   over the file. A service can run it once at deploy time and only open
 *   afterwards.
 *
 * Errors are negative CDB_ERR_* codes; cdb_strerror names them. Functions
 * returning int return CDB_OK (0) on success. Costs: O(1) unless stated.
 *
 * The header is C99; <qecfg/cdb_reader.hpp> is a thin C++17 layer on top.
 */
#ifndef QECFG_CDB_READER_H
#define QECFG_CDB_READER_H

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* ---- Errors ------------------------------------------------------------ */

enum cdb_error {
    CDB_OK = 0,
    CDB_ERR_TRUNCATED = -1, /* shorter than a header, or a size not a multiple of 4 */
    CDB_ERR_FORMAT = -2,    /* the format word is wrong in both byte orders */
    CDB_ERR_LENGTH = -3,    /* the header's length does not match the buffer */
    CDB_ERR_CHECKSUM = -4,  /* the checksum does not match */
    CDB_ERR_HEADER = -5,    /* a record size or a maximum id of the header is wrong */
    CDB_ERR_ANCHORS = -6,   /* the anchor table is damaged (count, type, order, bounds) */
    CDB_ERR_IDENT = -7,     /* a record or list has the wrong identifier word */
    CDB_ERR_BOUNDS = -8,    /* an offset or a count leads outside its table or dsect */
    CDB_ERR_LAYOUT = -9,    /* a table is not where the layout puts it, or a fixed field is wrong */
    CDB_ERR_STRING = -10,   /* a string is missing or not terminated inside its table */
    CDB_ERR_TYPE = -11,     /* a data type or variable type is out of range */
    CDB_ERR_OVERLAP = -12,  /* a list or value body is referred to twice */
    CDB_ERR_NOTFOUND = -13, /* no such item (not an error of the file) */
    CDB_ERR_KIND = -14,     /* the value is not of the kind asked for */
    CDB_ERR_NOSPACE = -15,  /* the caller's buffer is too small */
    CDB_ERR_BADARG = -16    /* an argument is out of range */
};

/* A constant English text for an error code; "unknown error" otherwise. */
const char *cdb_strerror(int err);

/* ---- Data types and names ---------------------------------------------- */

/* The data types of values (zu_data_type_t); the array types are 13 to 22 and
 * the element type of array type t is t - 11. */
enum cdb_data_type {
    CDB_UNKNOWN = 0,
    CDB_NONE_TYPE = 1,
    CDB_INT32 = 2,
    CDB_UINT32 = 3,
    CDB_INT64 = 4,
    CDB_UINT64 = 5,
    CDB_FLOAT32 = 6,
    CDB_FLOAT64 = 7,
    CDB_STRING = 8,
    CDB_BINARY = 9,
    CDB_RH = 10,
    CDB_SD = 11,
    CDB_SBS = 12,
    CDB_INT32_ARRAY = 13,
    CDB_UINT32_ARRAY = 14,
    CDB_INT64_ARRAY = 15,
    CDB_UINT64_ARRAY = 16,
    CDB_FLOAT32_ARRAY = 17,
    CDB_FLOAT64_ARRAY = 18,
    CDB_STRING_ARRAY = 19,
    CDB_BINARY_ARRAY = 20,
    CDB_RH_ARRAY = 21,
    CDB_SD_ARRAY = 22,
    CDB_NUM_DATA_TYPES = 23
};

/* Variable types of dynamic attributes. */
enum cdb_var_type { CDB_COUNTER = 0, CDB_QUANTITY = 1, CDB_STATE = 2, CDB_QUANTUM = 3, CDB_NUM_VAR_TYPES = 4 };

/* Source name of a data type ("Int32", "SDArray"); NULL outside 0..22. */
const char *cdb_data_type_name(uint32_t type);
/* Source name of a variable type ("Counter"); NULL outside 0..3. */
const char *cdb_var_type_name(uint32_t type);
/* The element type of an array type; any other type is its own. */
uint32_t cdb_element_type(uint32_t type);

/* The property words of each record kind and the permission letters. */
enum cdb_words {
    CDB_WORDS_CLASS = 0,     /* rc_props: ResourceClass Properties */
    CDB_WORDS_PATTR = 1,     /* persistent attribute Properties */
    CDB_WORDS_DATTR = 2,     /* dynamic attribute Properties */
    CDB_WORDS_ACTION = 3,    /* action Properties */
    CDB_WORDS_PERMISSION = 4 /* action Permission letters, as one-letter words */
};
/* Word i of a table in source order and its bit in *bit; NULL past the end. */
const char *cdb_word(int table, unsigned i, uint32_t *bit);
/* Writes the words whose bits are set, separated by ",", into buf (always
 * terminated when size > 0). Returns the length of the whole text (as
 * snprintf does: a result >= size means it was cut), or CDB_ERR_BADARG. */
int cdb_format_words(int table, uint32_t bits, char *buf, size_t size);

/* ---- Opening ----------------------------------------------------------- */

/* An open CDB. Fill it with cdb_open; its fields are for the reader. */
typedef struct cdb {
    const unsigned char *data;
    size_t size;
    int big_endian;
    uint32_t dsect_count;
} cdb_t;

/* Opens the image of size bytes at data: checks the size (a multiple of 4, at
 * least a header), the format word (which gives the byte order), the length,
 * the record sizes and the anchor table (every dsect known, in order,
 * inside the file, not overlapping; one manager, one map, at least one
 * class). Does not read the dsects nor the checksum. O(dsects). */
int cdb_open(cdb_t *db, const void *data, size_t size);

/* Whether the checksum matches. O(size). */
int cdb_check_checksum(const cdb_t *db);

/* Bytes of scratch memory cdb_check needs to find lists and value bodies
 * referred to twice: one bit per byte of the largest dsect. O(dsects). */
size_t cdb_check_scratch_size(const cdb_t *db);

/* The full structural check: the checksum, every dsect's records, tables,
 * lists, value bodies and strings bounded and terminated, identifier words,
 * data and variable types, the fixed fields, the header's maxima. With
 * scratch memory of cdb_check_scratch_size bytes (zeroed by the call) it also
 * checks that no list or body is referred to twice; with scratch NULL it skips
 * that check. On failure *bad_offset (when not NULL) receives the file offset
 * of the first violation found. O(size). After CDB_OK every accessor reads
 * every item of the file without error. */
int cdb_check(const cdb_t *db, void *scratch, size_t scratch_size, size_t *bad_offset);

/* ---- Header and dsects -------------------------------------------------- */

enum cdb_dsect_type { CDB_MANAGER_DSECT = 3, CDB_VAR_CLASS_DSECT = 4, CDB_CLASS_DSECT = 5, CDB_MAP_DSECT = 6 };

typedef struct cdb_header {
    uint32_t length, checksum, seqno, tv_sec, tv_usec, dsect_count;
    uint16_t max_rm_id, max_class_id;
} cdb_header_t;
void cdb_get_header(const cdb_t *db, cdb_header_t *h);

typedef struct cdb_dsect {
    uint32_t type, offset, length, revision;
} cdb_dsect_t;
/* Anchor i. CDB_ERR_NOTFOUND past the last. */
int cdb_dsect_at(const cdb_t *db, uint32_t i, cdb_dsect_t *d);
/* The index of the first dsect of that type at or after index `from`, or
 * CDB_ERR_NOTFOUND. O(dsects). */
int cdb_find_dsect(const cdb_t *db, uint32_t type, uint32_t from);

/* ---- Manager, map, variable classes ------------------------------------- */

typedef struct cdb_manager {
    const char *name; /* NULL when it cannot be read */
    uint16_t id;
} cdb_manager_t;
/* The manager dsect. O(dsects) to find it. */
int cdb_get_manager(const cdb_t *db, cdb_manager_t *m);

typedef struct cdb_map {
    uint16_t class_id, rm_id;
    const char *message_catalog; /* NULL without a MessageCatalog */
    uint16_t dscr_msg_set, first_key, last_key, asnno_start;
    uint16_t num_sctx, num_vctx, num_stats, num_ctx_tmplts;
    uint32_t static_contexts, volatile_contexts, stats, ctx_tmplts;
} cdb_map_t;
/* The class-to-manager map dsect. O(dsects) to find it. */
int cdb_get_map(const cdb_t *db, cdb_map_t *m);

typedef struct cdb_var_class {
    const cdb_t *db;
    uint32_t dsect;
    const char *name;  /* NULL without a VariableClass statement */
    const char *alias; /* NULL when none */
    uint16_t obsv_interval, report_interval;
    uint32_t var_count; /* variable IDs, read with cdb_var_id */
    uint32_t ids_at;
} cdb_var_class_t;
/* The variable class of dsect index i; CDB_ERR_NOTFOUND if it is no variable class. */
int cdb_var_class_at(const cdb_t *db, uint32_t i, cdb_var_class_t *vc);
/* The first variable class of that name. O(dsects). */
int cdb_find_var_class(const cdb_t *db, const char *name, cdb_var_class_t *vc);
/* Variable ID i (class dynamic attributes carry the bit 0x8000); 0 past the end. */
uint32_t cdb_var_id(const cdb_var_class_t *vc, uint32_t i);

/* ---- Classes ----------------------------------------------------------- */

/* A class dsect, with the places of its tables. */
typedef struct cdb_class {
    const cdb_t *db;
    uint32_t dsect, base, length;
    uint32_t tables[9][2]; /* start (file offset) and length of each table */
    uint32_t strings, strings_len;
} cdb_class_t;

/* The class of dsect index i: checks its record's identifier and that its
 * tables lie inside the dsect. CDB_ERR_NOTFOUND if it is no class. */
int cdb_class_at(const cdb_t *db, uint32_t i, cdb_class_t *c);
/* The first class of that name or id. O(classes) without an index. */
int cdb_find_class(const cdb_t *db, const char *name, cdb_class_t *c);
int cdb_find_class_by_id(const cdb_t *db, uint16_t id, cdb_class_t *c);

/* An index over the class names and ids in memory the caller gives, for
 * lookups in O(1): cdb_index_size bytes (O(dsects) to compute). */
typedef struct cdb_index {
    const cdb_t *db;
    uint32_t *slots; /* by name, then by id; each a dsect index + 1, 0 empty */
    uint32_t mask;
} cdb_index_t;
size_t cdb_index_size(const cdb_t *db);
/* Builds the index in mem (aligned for uint32_t). O(classes). */
int cdb_index_build(cdb_index_t *ix, const cdb_t *db, void *mem, size_t size);
int cdb_index_find_class(const cdb_index_t *ix, const char *name, cdb_class_t *c);
int cdb_index_find_class_by_id(const cdb_index_t *ix, uint16_t id, cdb_class_t *c);

const char *cdb_class_name(const cdb_class_t *c);  /* NULL when unreadable */
const char *cdb_class_alias(const cdb_class_t *c); /* NULL when none */
uint16_t cdb_class_id(const cdb_class_t *c);

enum cdb_class_field {
    CDB_CLASS_PROPS,
    CDB_CLASS_PERM_TEMPLATE,
    CDB_CLASS_PERM_TEMPLATE_CLASS,
    CDB_CLASS_DSCR_MSGID,
    CDB_CLASS_DISP_MSGID,
    CDB_CLASS_LOCATOR,
    CDB_CLASS_VERSION
};
/* A numeric field of the class record. */
uint32_t cdb_class_field(const cdb_class_t *c, int field);

/* ---- Structured-data definitions ----------------------------------------- */

typedef struct cdb_sd_def {
    const cdb_class_t *cls;
    uint32_t at, count;
} cdb_sd_def_t;

enum cdb_class_input { CDB_INPUT_DEFINE, CDB_INPUT_UNDEFINE, CDB_INPUT_ONLINE, CDB_INPUT_OFFLINE, CDB_INPUT_RESET };
/* One of the class's input definitions; CDB_ERR_NOTFOUND when it has none. */
int cdb_class_input(const cdb_class_t *c, int which, cdb_sd_def_t *def);

typedef struct cdb_sd_element {
    const cdb_class_t *cls;
    uint32_t at;
    const char *name; /* NULL when unreadable */
    uint32_t type, action_id;
    uint16_t dscr_msgid, disp_msgid, valid_type;
} cdb_sd_element_t;
int cdb_sd_element_at(const cdb_sd_def_t *def, uint32_t i, cdb_sd_element_t *e);
/* The first element of that name. O(elements). */
int cdb_find_sd_element(const cdb_sd_def_t *def, const char *name, cdb_sd_element_t *e);

/* ---- Attributes --------------------------------------------------------- */

enum cdb_attr_kind {
    CDB_PATTR_CLASS = 0, /* persistent class attributes */
    CDB_DATTR_CLASS = 1, /* dynamic class attributes */
    CDB_PATTR = 2,       /* persistent resource attributes */
    CDB_DATTR = 3        /* dynamic resource attributes */
};

typedef struct cdb_attr {
    const cdb_class_t *cls;
    uint32_t rec;
    int kind;
} cdb_attr_t;

uint32_t cdb_attr_count(const cdb_class_t *c, int kind);
int cdb_attr_at(const cdb_class_t *c, int kind, uint32_t i, cdb_attr_t *a);
/* The first attribute of that kind with that id or name. O(attributes of the kind). */
int cdb_find_attr(const cdb_class_t *c, int kind, int32_t id, cdb_attr_t *a);
int cdb_find_attr_by_name(const cdb_class_t *c, int kind, const char *name, cdb_attr_t *a);

const char *cdb_attr_name(const cdb_attr_t *a); /* NULL when unreadable */
int32_t cdb_attr_id(const cdb_attr_t *a);
uint32_t cdb_attr_data_type(const cdb_attr_t *a);

enum cdb_attr_field {
    CDB_ATTR_PROPS,
    CDB_ATTR_DSCR_MSGID,
    CDB_ATTR_DISP_MSGID,
    CDB_ATTR_GROUP_MSGID,
    CDB_ATTR_GROUP_ID,
    CDB_ATTR_MAX_SD_IDX,
    /* dynamic attributes only (0 for persistent ones) */
    CDB_ATTR_VAR_TYPE,
    CDB_ATTR_EXPR_DESC,
    CDB_ATTR_REARM_DESC,
    CDB_ATTR_RANGE_DESC,
    CDB_ATTR_REPORT_INTERVAL
};
uint32_t cdb_attr_field(const cdb_attr_t *a, int field);
/* A dynamic attribute's expression and rearm expression; NULL when none. */
const char *cdb_attr_expression(const cdb_attr_t *a);
const char *cdb_attr_rearm_expression(const cdb_attr_t *a);

/* ---- Values ------------------------------------------------------------ */

/* An 8-byte value field (or an array or structured-data element) and the
 * data type it is read as. */
typedef struct cdb_value {
    const cdb_class_t *cls;
    uint32_t at, type;
} cdb_value_t;

/* A persistent attribute's default, a dynamic one's initial value. A
 * structured attribute without definition has the value "none". */
int cdb_attr_default(const cdb_attr_t *a, cdb_value_t *v);
/* A dynamic attribute's range. For numeric array types the range holds plain
 * numbers of the element type when a Range was given, and one-element arrays
 * of 0 and 100 otherwise; both are returned as found. */
int cdb_attr_range(const cdb_attr_t *a, cdb_value_t *low, cdb_value_t *high);

/* Whether the value holds nothing: the none marker, or a structured value
 * without definition. */
int cdb_value_is_none(const cdb_value_t *v);
/* A number of types 2 to 7. Int32 and Int64 are sign-extended, UInt32 and
 * UInt64 zero-extended; the float types give their value as double (int64 and
 * uint64 of a float convert it, truncating, when it is in range). CDB_ERR_KIND
 * for any other type. */
int cdb_value_int64(const cdb_value_t *v, int64_t *out);
int cdb_value_uint64(const cdb_value_t *v, uint64_t *out);
int cdb_value_double(const cdb_value_t *v, double *out);
/* The raw 32- or 64-bit pattern of a number, in host order. */
int cdb_value_bits(const cdb_value_t *v, uint64_t *out);
/* A String: the terminated text inside the buffer and its length. */
int cdb_value_string(const cdb_value_t *v, const char **s, size_t *len);
/* A Binary: its bytes inside the buffer. */
int cdb_value_binary(const cdb_value_t *v, const unsigned char **data, size_t *len);
/* A resource handle: its header word and four id words, in host order. */
typedef struct cdb_handle {
    uint32_t header, id[4];
} cdb_handle_t;
int cdb_value_handle(const cdb_value_t *v, cdb_handle_t *h);
/* The elements of an array or a structured value. */
int cdb_value_count(const cdb_value_t *v, uint32_t *count);
int cdb_value_element(const cdb_value_t *v, uint32_t i, cdb_value_t *e);
/* The value as cdbdump prints it in a flow: numbers as numbers, strings
 * quoted with C escapes, bytes as 0x and hex digits, lists in [ ], structured
 * elements as {type: T, value: V}, none as "none". Returns the length of the
 * whole text as snprintf does, or a negative error. */
int cdb_format_value(const cdb_value_t *v, char *buf, size_t size);

/* ---- Lists -------------------------------------------------------------- */

typedef struct cdb_varieties {
    const cdb_class_t *cls;
    uint32_t at, count;
} cdb_varieties_t;
int cdb_attr_varieties(const cdb_attr_t *a, cdb_varieties_t *v);
int cdb_variety_at(const cdb_varieties_t *v, uint32_t i, uint32_t *low, uint32_t *high);

typedef struct cdb_valid_values {
    const cdb_class_t *cls;
    uint32_t at, count, type;
} cdb_valid_values_t;
/* CDB_ERR_NOTFOUND when the attribute (element) has none. */
int cdb_attr_valid_values(const cdb_attr_t *a, cdb_valid_values_t *vv);
int cdb_sd_element_valid_values(const cdb_sd_element_t *e, cdb_valid_values_t *vv);
int cdb_valid_value_at(const cdb_valid_values_t *vv, uint32_t i, cdb_value_t *low, cdb_value_t *high,
                       uint16_t *disp_msgid);
/* The attribute's structured-data definition; CDB_ERR_NOTFOUND when none. */
int cdb_attr_sd(const cdb_attr_t *a, cdb_sd_def_t *def);

/* ---- Actions ------------------------------------------------------------ */

typedef struct cdb_action {
    const cdb_class_t *cls;
    uint32_t rec;
    int of_class;
} cdb_action_t;
uint32_t cdb_action_count(const cdb_class_t *c, int of_class);
int cdb_action_at(const cdb_class_t *c, int of_class, uint32_t i, cdb_action_t *x);
int cdb_find_action(const cdb_class_t *c, int of_class, int32_t id, cdb_action_t *x);
int cdb_find_action_by_name(const cdb_class_t *c, int of_class, const char *name, cdb_action_t *x);
const char *cdb_action_name(const cdb_action_t *x);
int32_t cdb_action_id(const cdb_action_t *x);
enum cdb_action_field {
    CDB_ACTION_PROPS,
    CDB_ACTION_DSCR_MSGID,
    CDB_ACTION_DISP_MSGID,
    CDB_ACTION_CONFIRM_MSGID,
    CDB_ACTION_TIMEOUT,
    CDB_ACTION_PERMS
};
uint32_t cdb_action_field(const cdb_action_t *x, int field);
int cdb_action_varieties(const cdb_action_t *x, cdb_varieties_t *v);
/* The action's input and response definitions; CDB_ERR_NOTFOUND when none. */
int cdb_action_sd_input(const cdb_action_t *x, cdb_sd_def_t *def);
int cdb_action_sd_response(const cdb_action_t *x, cdb_sd_def_t *def);

#ifdef __cplusplus
}
#endif

#endif
