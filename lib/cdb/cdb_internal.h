/* The reader's private declarations: where every field of the file sits and
 * the one bounded way of reading it. The offsets are those of include/cdb.h,
 * which pins them; tests/cdb/test_cdb_layout.cpp checks the two agree. */
#ifndef QECFG_CDB_INTERNAL_H
#define QECFG_CDB_INTERNAL_H

#include <string.h>

#include "qecfg/cdb_reader.h"

/* Identifier words: "CDB" and the kind letter. */
#define ID_CLASS 0x43444231u
#define ID_CMMAP 0x43444232u
#define ID_MGR 0x43444233u
#define ID_VAR_CLASS 0x43444234u
#define ID_VALID_VALUES 0x43444235u
#define ID_PATTR_CLASS 0x43444237u
#define ID_DATTR_CLASS 0x43444238u
#define ID_PATTR 0x43444239u
#define ID_DATTR 0x43444261u
#define ID_ACTION 0x43444262u
#define ID_ACTION_CLASS 0x43444263u
#define ID_SD_DEF 0x43444266u
#define ID_VARIETY_LIST 0x43444267u
#define CDB_FORMAT_WORD 0x666D7431u
#define NONE_OFF 0xFFFFFFFFu

enum {
    HDR_SIZE = 80,
    ANCHOR_SIZE = 16,
    HDR_DSECT_COUNT = 24,
    HDR_MAX_RM_ID = 28,
    HDR_MAX_CLASS_ID = 30,
    HDR_RECORD_SIZES = 32,
    NUM_RECORD_SIZES = 9
};

/* Record sizes, in the order of the header's size fields. */
enum {
    RC_SIZE = 224,
    RCM_SIZE = 60,
    RM_SIZE = 24,
    RVC_SIZE = 40,
    PA_SIZE = 72,
    DA_SIZE = 136,
    AC_SIZE = 56,
    RE_SIZE = 48,
    RD_SIZE = 8
};

/* rsrc_class_t */
enum {
    RC_PROPS = 4,
    RC_NAME = 8,
    RC_ALIAS = 16,
    RC_TABLE_REFS = 24,
    RC_DEF_INPUT = 56,
    RC_ERRORS = 112,
    RC_DEPENDS = 120,
    RC_VARIETIES = 128,
    RC_SBS = 136,
    RC_SD_DEFS = 144,
    RC_VALID_VALS = 152,
    RC_STRINGS = 160,
    RC_NUM_PATTRS_C = 168,
    RC_NUM_ERRORS = 180,
    RC_NUM_DEPENDS = 182,
    RC_VARLIST_SIZE = 184,
    RC_SBS_SIZE = 188,
    RC_SD_SIZE = 192,
    RC_VALVAL_SIZE = 196,
    RC_PERM_TEMP = 200,
    RC_PERM_TEMP_C = 204,
    RC_CLASS_ID = 208,
    RC_DSCR_MSGID = 210,
    RC_DISP_MSGID = 212,
    RC_LOCATOR = 214,
    RC_VERSION = 216
};
/* rsrc_cmmap_t */
enum { RCM_CLASS_ID = 4, RCM_RM_ID = 6, RCM_MSG_FILE = 8, RCM_STRINGS = 16, RCM_SHORTS = 24, RCM_WORDS = 40 };
/* rsrc_mgr_t */
enum { RM_ID = 4, RM_NAME = 8, RM_STRINGS = 16 };
/* rsrc_variable_class_t */
enum { RVC_OBSV = 4, RVC_REPORT = 6, RVC_NAME = 8, RVC_COMPAT = 16, RVC_COUNT = 24, RVC_STRINGS = 28 };
/* Fields both attribute records have, and those only one has. */
enum { RA_PROPS = 4, RA_NAME = 8 };
enum {
    PA_MSGIDS = 16,
    PA_DFLT = 24,
    PA_ATTR_ID = 32,
    PA_DATA_TYPE = 36,
    PA_VARIETIES = 40,
    PA_VALID_VALS = 48,
    PA_SD = 56,
    PA_MAX_SD_IDX = 64
};
enum {
    DA_VCLASS = 16,
    DA_NEXT = 24,
    DA_INIT = 32,
    DA_MIN = 40,
    DA_MAX = 48,
    DA_VARIETIES = 56,
    DA_VALID_VALS = 64,
    DA_SD = 72,
    DA_EXPRESS = 80,
    DA_REARM = 88,
    DA_XAV = 96,
    DA_DATA_TYPE = 104,
    DA_VAR_TYPE = 108,
    DA_MSGIDS = 112,
    DA_ATTR_ID = 120,
    DA_MAX_SD_IDX = 124,
    DA_EXPR_DESC = 126,
    DA_REARM_DESC = 128,
    DA_RANGE_DESC = 130,
    DA_REPORT_INTERVAL = 132
};
/* rsrc_action_t */
enum {
    AC_ID = 4,
    AC_PROPS = 8,
    AC_DSCR = 12,
    AC_DISP = 14,
    AC_CONFIRM = 16,
    AC_TIMEOUT = 18,
    AC_PERMS = 20,
    AC_NAME = 24,
    AC_VARIETIES = 32,
    AC_SD_INPUT = 40,
    AC_SD_RESP = 48
};
/* Lists: a header of identifier and count, then the entries. */
enum { LIST_HEADER = 8, VL_ENTRY = 8, VV_ENTRY = 24, VV_HIGH = 8, VV_DISP = 16, SD_FIELD = 32 };
/* sd_field */
enum { SDF_NAME = 0, SDF_TYPE = 8, SDF_DISP = 12, SDF_DSCR = 14, SDF_VALID_VALS = 16, SDF_ACTION = 24, SDF_VTYPE = 28 };
/* Value bodies in a class's string table. */
enum { BINARY_DATA = 8, HANDLE_SIZE = 20, ARRAY_HEADER = 8, ARRAY_ELEMENT = 8, SD_HEADER = 8, SD_ELEMENT = 16 };

/* The class tables, in the order they follow the class record. */
enum { T_PATTRS_C, T_DATTRS_C, T_PATTRS, T_DATTRS, T_ACTIONS_C, T_ACTIONS, T_VARIETIES, T_SD_DEFS, T_VALID_VALS };

/* Whether len bytes at off lie inside a region of size bytes (subtract, never add). */
static inline int cdb_fits(size_t off, size_t len, size_t size) { return off <= size && len <= size - off; }

static inline int cdb_host_big(void) {
#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ == __ORDER_BIG_ENDIAN__
    return 1;
#else
    return 0;
#endif
}

/* Reads of the file in its byte order: 0 for anything outside the buffer. */
static inline uint32_t cdb_rd32(const cdb_t *db, size_t off) {
    uint32_t v;
    if (!cdb_fits(off, 4, db->size))
        return 0;
    memcpy(&v, db->data + off, 4);
    return db->big_endian != cdb_host_big() ? __builtin_bswap32(v) : v;
}
static inline uint16_t cdb_rd16(const cdb_t *db, size_t off) {
    uint16_t v;
    if (!cdb_fits(off, 2, db->size))
        return 0;
    memcpy(&v, db->data + off, 2);
    return db->big_endian != cdb_host_big() ? __builtin_bswap16(v) : v;
}
static inline uint64_t cdb_rd64(const cdb_t *db, size_t off) {
    uint64_t v;
    if (!cdb_fits(off, 8, db->size))
        return 0;
    memcpy(&v, db->data + off, 8);
    return db->big_endian != cdb_host_big() ? __builtin_bswap64(v) : v;
}

static inline int cdb_is_numeric(uint32_t t) { return t >= CDB_INT32 && t <= CDB_FLOAT64; }
static inline int cdb_is_wide(uint32_t t) { return t == CDB_INT64 || t == CDB_UINT64 || t == CDB_FLOAT64; }
static inline int cdb_is_sd_type(uint32_t t) { return t == CDB_SD || t == CDB_SD_ARRAY; }
static inline int cdb_is_numeric_array(uint32_t t) { return t >= CDB_INT32_ARRAY && t <= CDB_FLOAT64_ARRAY; }

/* The terminated string at off inside the region [base, base + len) of the
 * file, or NULL. */
const char *cdb_string_in(const cdb_t *db, size_t base, size_t len, uint32_t off);
/* The list a reference designates inside a class table: its file offset and
 * count after checking its identifier and that its entries fit (at least
 * room for one). CDB_ERR_NOTFOUND for the none marker. */
int cdb_list_in(const cdb_class_t *c, int table, uint32_t ref, uint32_t id, size_t entry, uint32_t *at,
                uint32_t *count);
/* The record offsets of an attribute record's shared fields. */
size_t cdb_attr_offset(const cdb_attr_t *a, int pattr_offset, int dattr_offset);
/* The anchor's dsect of the given type and size, inside the file. */
int cdb_dsect_record(const cdb_t *db, uint32_t i, uint32_t type, uint32_t size, uint32_t id, cdb_dsect_t *d);
/* Whether the 4 bytes at `at` look like the default numeric array range body. */
int cdb_default_range_array(const cdb_class_t *c, size_t at, uint32_t elem_type, uint64_t expected);
uint64_t cdb_hundred_bits(uint32_t type);

#endif
