/* The full structural check: every dsect, record, table, list, value body and
 * string of the file, read once. Each check is the condition an accessor
 * relies on, or a fact the compiler always writes. */
#include "cdb_internal.h"

typedef struct checker {
    const cdb_t *db;
    unsigned char *claims; /* one bit per byte of the dsect being checked, or NULL */
    size_t base;           /* the dsect's offset */
    size_t bad;
} checker_t;

static int fail(checker_t *ck, int err, size_t off) {
    ck->bad = off;
    return err;
}
#define CHECK(cond, err, off)                                                                                          \
    do {                                                                                                               \
        if (!(cond))                                                                                                   \
            return fail(ck, err, off);                                                                                 \
    } while (0)
#define TRY(call)                                                                                                      \
    do {                                                                                                               \
        int err_ = (call);                                                                                             \
        if (err_)                                                                                                      \
            return err_;                                                                                               \
    } while (0)

/* Marks [off, off + len) of the dsect as reached; fails when any byte of it
 * was reached before: each list and body is referred to once. */
static int claim(checker_t *ck, size_t off, size_t len, size_t at) {
    size_t i, rel = off - ck->base;
    if (!ck->claims)
        return CDB_OK;
    for (i = rel; i < rel + len; i++) {
        if ((i & 7) == 0 && rel + len - i >= 8) {
            CHECK(ck->claims[i >> 3] == 0, CDB_ERR_OVERLAP, at);
            ck->claims[i >> 3] = 0xff;
            i += 7;
            continue;
        }
        CHECK(!(ck->claims[i >> 3] & (1u << (i & 7))), CDB_ERR_OVERLAP, at);
        ck->claims[i >> 3] |= (unsigned char)(1u << (i & 7));
    }
    return CDB_OK;
}

/* A reference's second word is always 0 in the file. */
static int ref(checker_t *ck, size_t at, uint32_t *off) {
    CHECK(cdb_rd32(ck->db, at + 4) == 0, CDB_ERR_LAYOUT, at + 4);
    *off = cdb_rd32(ck->db, at);
    return CDB_OK;
}

static int string_ref(checker_t *ck, size_t at, size_t base, size_t len, int none_allowed) {
    uint32_t off;
    TRY(ref(ck, at, &off));
    if (off == NONE_OFF) {
        CHECK(none_allowed, CDB_ERR_STRING, at);
        return CDB_OK;
    }
    CHECK(cdb_string_in(ck->db, base, len, off) != NULL, CDB_ERR_STRING, at);
    return CDB_OK;
}

/* A string a statement sets that may be missing: 0 in an empty table. */
static int unset_string_ref(checker_t *ck, size_t at, size_t base, size_t len) {
    uint32_t off;
    if (len == 0 && cdb_rd32(ck->db, at) == 0)
        return ref(ck, at, &off);
    return string_ref(ck, at, base, len, 1);
}

/* ---- Lists and values ---------------------------------------------------------- */

/* The list a reference designates, claimed whole; *list is 0 for none. */
static int list(checker_t *ck, const cdb_class_t *c, int table, size_t at, uint32_t id, size_t entry, int none_allowed,
                uint32_t *list_at, uint32_t *count) {
    int err = cdb_list_in(c, table, (uint32_t)at, id, entry, list_at, count);
    *list_at = 0;
    if (err == CDB_ERR_NOTFOUND && none_allowed)
        return CDB_OK;
    if (err == CDB_ERR_LAYOUT)
        return fail(ck, err, at + 4);
    CHECK(err == CDB_OK, err == CDB_ERR_NOTFOUND ? CDB_ERR_BOUNDS : err, at);
    cdb_list_in(c, table, (uint32_t)at, id, entry, list_at, count);
    return claim(ck, *list_at, LIST_HEADER + entry * (*count ? *count : 1), at);
}

static int value(checker_t *ck, const cdb_class_t *c, size_t at, uint32_t type);

static int elements(checker_t *ck, const cdb_class_t *c, size_t body, uint32_t count, uint32_t type) {
    uint32_t i;
    for (i = 0; i < count; i++) {
        size_t e = body + ARRAY_HEADER + (type == CDB_SD ? SD_ELEMENT : ARRAY_ELEMENT) * (size_t)i;
        if (type == CDB_SD) {
            uint32_t dt = cdb_rd32(ck->db, e);
            CHECK(dt < CDB_NUM_DATA_TYPES && !cdb_is_sd_type(dt), CDB_ERR_TYPE, e);
            TRY(value(ck, c, e + 8, dt));
        } else {
            TRY(value(ck, c, e, cdb_element_type(type)));
        }
    }
    return CDB_OK;
}

/* A typed value field and its body. Depth is bounded: an array holds
 * scalars or structured values, whose elements are no structured values. */
static int value(checker_t *ck, const cdb_class_t *c, size_t at, uint32_t type) {
    uint32_t off, count;
    size_t body, room, slots;
    CHECK(type < CDB_NUM_DATA_TYPES, CDB_ERR_TYPE, at);
    if (cdb_is_numeric(type) || type == CDB_UNKNOWN || type == CDB_NONE_TYPE || type == CDB_SBS)
        return CDB_OK;
    off = cdb_rd32(ck->db, at);
    if (off == NONE_OFF)
        return CDB_OK;
    CHECK(off < c->strings_len, CDB_ERR_BOUNDS, at);
    body = c->strings + off;
    room = c->strings_len - off;
    switch (type) {
    case CDB_STRING: CHECK(cdb_string_in(ck->db, c->strings, c->strings_len, off), CDB_ERR_STRING, at); return CDB_OK;
    case CDB_BINARY:
        CHECK(room >= BINARY_DATA, CDB_ERR_BOUNDS, at);
        count = cdb_rd32(ck->db, body);
        CHECK(count <= room - BINARY_DATA, CDB_ERR_BOUNDS, body);
        return claim(ck, body, BINARY_DATA + (size_t)count, at);
    case CDB_RH: CHECK(room >= HANDLE_SIZE, CDB_ERR_BOUNDS, at); return claim(ck, body, HANDLE_SIZE, at);
    case CDB_SD:
        CHECK(room >= SD_HEADER, CDB_ERR_BOUNDS, at);
        count = cdb_rd32(ck->db, body);
        slots = count ? count : 1;
        CHECK(slots <= (room - SD_HEADER) / SD_ELEMENT, CDB_ERR_BOUNDS, body);
        TRY(claim(ck, body, SD_HEADER + SD_ELEMENT * slots, at));
        return elements(ck, c, body, count, type);
    default:
        CHECK(room >= ARRAY_HEADER, CDB_ERR_BOUNDS, at);
        count = cdb_rd32(ck->db, body);
        CHECK(count <= (room - ARRAY_HEADER) / ARRAY_ELEMENT, CDB_ERR_BOUNDS, body);
        TRY(claim(ck, body, ARRAY_HEADER + ARRAY_ELEMENT * (size_t)count, at));
        return elements(ck, c, body, count, type);
    }
}

static int valid_values(checker_t *ck, const cdb_class_t *c, size_t at, uint32_t type) {
    uint32_t vv, count, i;
    TRY(list(ck, c, T_VALID_VALS, at, ID_VALID_VALUES, VV_ENTRY, 1, &vv, &count));
    for (i = 0; vv && i < count; i++) {
        size_t e = vv + LIST_HEADER + (size_t)VV_ENTRY * i;
        TRY(value(ck, c, e, type));
        TRY(value(ck, c, e + VV_HIGH, type));
    }
    return CDB_OK;
}

static int sd_def(checker_t *ck, const cdb_class_t *c, size_t at, int *present) {
    uint32_t def, count, i;
    TRY(list(ck, c, T_SD_DEFS, at, ID_SD_DEF, SD_FIELD, 1, &def, &count));
    if (present)
        *present = def != 0;
    for (i = 0; def && i < count; i++) {
        size_t e = def + LIST_HEADER + (size_t)SD_FIELD * i;
        uint32_t type = cdb_rd32(ck->db, e + SDF_TYPE);
        TRY(string_ref(ck, e + SDF_NAME, c->strings, c->strings_len, 0));
        CHECK(type < CDB_NUM_DATA_TYPES && !cdb_is_sd_type(type), CDB_ERR_TYPE, e + SDF_TYPE);
        TRY(valid_values(ck, c, e + SDF_VALID_VALS, cdb_element_type(type)));
    }
    return CDB_OK;
}

static int varieties(checker_t *ck, const cdb_class_t *c, size_t at) {
    uint32_t vl, count;
    return list(ck, c, T_VARIETIES, at, ID_VARIETY_LIST, VL_ENTRY, 0, &vl, &count);
}

/* ---- Records ------------------------------------------------------------------ */

static int attr(checker_t *ck, const cdb_attr_t *a) {
    const cdb_class_t *c = a->cls;
    size_t type_at = cdb_attr_offset(a, PA_DATA_TYPE, DA_DATA_TYPE), value_at = cdb_attr_offset(a, PA_DFLT, DA_INIT);
    uint32_t type = cdb_rd32(ck->db, type_at);
    int has_sd = 0;
    static const uint32_t ids[4] = {ID_PATTR_CLASS, ID_DATTR_CLASS, ID_PATTR, ID_DATTR};
    CHECK(cdb_rd32(ck->db, a->rec) == ids[a->kind], CDB_ERR_IDENT, a->rec);
    TRY(string_ref(ck, a->rec + RA_NAME, c->strings, c->strings_len, 0));
    CHECK(type < CDB_NUM_DATA_TYPES, CDB_ERR_TYPE, type_at);
    TRY(varieties(ck, c, cdb_attr_offset(a, PA_VARIETIES, DA_VARIETIES)));
    TRY(valid_values(ck, c, cdb_attr_offset(a, PA_VALID_VALS, DA_VALID_VALS), cdb_element_type(type)));
    TRY(sd_def(ck, c, cdb_attr_offset(a, PA_SD, DA_SD), &has_sd));
    /* A structured attribute without definition keeps its value 0. */
    if (cdb_is_sd_type(type) && !has_sd)
        CHECK(cdb_rd64(ck->db, value_at) == 0, CDB_ERR_LAYOUT, value_at);
    else
        TRY(value(ck, c, value_at, type));
    if (a->kind == CDB_PATTR_CLASS || a->kind == CDB_PATTR)
        return CDB_OK;
    CHECK(cdb_rd64(ck->db, a->rec + DA_VCLASS) == 0, CDB_ERR_LAYOUT, a->rec + DA_VCLASS);
    CHECK(cdb_rd64(ck->db, a->rec + DA_NEXT) == 0, CDB_ERR_LAYOUT, a->rec + DA_NEXT);
    CHECK(cdb_rd64(ck->db, a->rec + DA_XAV) == 0, CDB_ERR_LAYOUT, a->rec + DA_XAV);
    CHECK(cdb_rd32(ck->db, a->rec + DA_VAR_TYPE) < CDB_NUM_VAR_TYPES, CDB_ERR_TYPE, a->rec + DA_VAR_TYPE);
    TRY(string_ref(ck, a->rec + DA_EXPRESS, c->strings, c->strings_len, 1));
    TRY(string_ref(ck, a->rec + DA_REARM, c->strings, c->strings_len, 1));
    if (cdb_is_numeric_array(type))
        return CDB_OK; /* its range is decided once every other body is known */
    TRY(value(ck, c, a->rec + DA_MIN, type));
    return value(ck, c, a->rec + DA_MAX, type);
}

/* The range of a numeric array attribute, read the way cdb_attr_range reads it. */
static int array_range(checker_t *ck, const cdb_attr_t *a) {
    cdb_value_t low, high;
    if (!cdb_is_numeric_array(cdb_attr_data_type(a)))
        return CDB_OK;
    cdb_attr_range(a, &low, &high);
    TRY(value(ck, a->cls, low.at, low.type));
    return value(ck, a->cls, high.at, high.type);
}

static int action(checker_t *ck, const cdb_action_t *x) {
    const cdb_class_t *c = x->cls;
    CHECK(cdb_rd32(ck->db, x->rec) == (x->of_class ? ID_ACTION_CLASS : ID_ACTION), CDB_ERR_IDENT, x->rec);
    TRY(string_ref(ck, x->rec + AC_NAME, c->strings, c->strings_len, 0));
    TRY(varieties(ck, c, x->rec + AC_VARIETIES));
    TRY(sd_def(ck, c, x->rec + AC_SD_INPUT, NULL));
    return sd_def(ck, c, x->rec + AC_SD_RESP, NULL);
}

/* ---- Dsects ------------------------------------------------------------------- */

static int class_dsect(checker_t *ck, uint32_t i, const cdb_dsect_t *d, uint16_t *max_class_id) {
    /* Tables the compiler always leaves empty: reference and size 0. */
    static const uint16_t empty[3][3] = {
        {RC_ERRORS, RC_NUM_ERRORS, 2}, {RC_DEPENDS, RC_NUM_DEPENDS, 2}, {RC_SBS, RC_SBS_SIZE, 4}};
    cdb_class_t c;
    cdb_attr_t a;
    cdb_action_t x;
    size_t b = d->offset, k;
    uint32_t n, kind, off;
    int err;
    CHECK(d->length >= RC_SIZE, CDB_ERR_BOUNDS, b);
    CHECK(cdb_rd32(ck->db, b) == ID_CLASS, CDB_ERR_IDENT, b);
    for (k = 0; k < 3; k++) {
        size_t size_at = b + empty[k][1];
        TRY(ref(ck, b + empty[k][0], &off));
        CHECK(off == 0, CDB_ERR_LAYOUT, b + empty[k][0]);
        CHECK((empty[k][2] == 2 ? cdb_rd16(ck->db, size_at) : cdb_rd32(ck->db, size_at)) == 0, CDB_ERR_LAYOUT, size_at);
    }
    err = cdb_class_at(ck->db, i, &c);
    CHECK(err == CDB_OK, err, b + RC_TABLE_REFS);
    if (cdb_rd16(ck->db, b + RC_CLASS_ID) > *max_class_id)
        *max_class_id = cdb_rd16(ck->db, b + RC_CLASS_ID);
    TRY(string_ref(ck, b + RC_NAME, c.strings, c.strings_len, 0));
    TRY(string_ref(ck, b + RC_ALIAS, c.strings, c.strings_len, 1));
    for (k = 0; k < 5; k++)
        TRY(sd_def(ck, &c, b + RC_DEF_INPUT + 8 * k, NULL));
    for (kind = 0; kind < 4; kind++)
        for (n = 0; cdb_attr_at(&c, (int)kind, n, &a) != CDB_ERR_NOTFOUND; n++)
            TRY(attr(ck, &a));
    for (k = 0; k < 2; k++)
        for (n = 0; cdb_action_at(&c, k == 0, n, &x) != CDB_ERR_NOTFOUND; n++)
            TRY(action(ck, &x));
    for (kind = CDB_DATTR_CLASS; kind <= CDB_DATTR; kind += 2)
        for (n = 0; cdb_attr_at(&c, (int)kind, n, &a) != CDB_ERR_NOTFOUND; n++)
            TRY(array_range(ck, &a));
    return CDB_OK;
}

static int record(checker_t *ck, const cdb_dsect_t *d, uint32_t size, uint32_t id) {
    CHECK(d->length >= size, CDB_ERR_BOUNDS, d->offset);
    CHECK(cdb_rd32(ck->db, d->offset) == id, CDB_ERR_IDENT, d->offset);
    return CDB_OK;
}

static int manager_dsect(checker_t *ck, const cdb_dsect_t *d, uint16_t *rm_id) {
    size_t b = d->offset;
    uint32_t off;
    TRY(record(ck, d, RM_SIZE, ID_MGR));
    *rm_id = cdb_rd16(ck->db, b + RM_ID);
    TRY(ref(ck, b + RM_STRINGS, &off));
    CHECK(off == 0, CDB_ERR_LAYOUT, b + RM_STRINGS); /* the strings follow the record */
    return string_ref(ck, b + RM_NAME, b + RM_SIZE, d->length - RM_SIZE, 0);
}

static int map_dsect(checker_t *ck, const cdb_dsect_t *d) {
    size_t b = d->offset;
    uint32_t off;
    TRY(record(ck, d, RCM_SIZE, ID_CMMAP));
    TRY(ref(ck, b + RCM_STRINGS, &off));
    CHECK(off == RCM_SIZE, CDB_ERR_LAYOUT, b + RCM_STRINGS);
    return unset_string_ref(ck, b + RCM_MSG_FILE, b + RCM_SIZE, d->length - RCM_SIZE);
}

static int var_class_dsect(checker_t *ck, const cdb_dsect_t *d) {
    size_t b = d->offset, room = d->length - RVC_SIZE;
    uint32_t strings, count;
    TRY(record(ck, d, RVC_SIZE, ID_VAR_CLASS));
    TRY(ref(ck, b + RVC_STRINGS, &strings));
    CHECK(strings % 8 == 0 && strings <= room, CDB_ERR_BOUNDS, b + RVC_STRINGS);
    TRY(unset_string_ref(ck, b + RVC_NAME, b + RVC_SIZE, strings));
    TRY(string_ref(ck, b + RVC_COMPAT, b + RVC_SIZE, strings, 1));
    count = cdb_rd32(ck->db, b + RVC_COUNT);
    CHECK(count <= (room - strings) / 4, CDB_ERR_BOUNDS, b + RVC_COUNT);
    /* The IDs fill the rest of the dsect, rounded to 8 bytes. */
    CHECK(((4 * (size_t)count + 7) & ~(size_t)7) == room - strings, CDB_ERR_LAYOUT, b);
    return CDB_OK;
}

size_t cdb_check_scratch_size(const cdb_t *db) {
    size_t largest = 0;
    uint32_t i;
    cdb_dsect_t d;
    for (i = 0; cdb_dsect_at(db, i, &d) == CDB_OK; i++)
        if (d.length > largest)
            largest = d.length;
    return (largest + 7) / 8;
}

static int check_dsects(checker_t *ck, size_t scratch_size) {
    uint16_t max_rm_id = 0, max_class_id = 0;
    uint32_t i;
    cdb_dsect_t d;
    for (i = 0; cdb_dsect_at(ck->db, i, &d) == CDB_OK; i++) {
        ck->base = d.offset;
        if (ck->claims) {
            CHECK((d.length + 7) / 8 <= scratch_size, CDB_ERR_NOSPACE, d.offset);
            memset(ck->claims, 0, (d.length + 7) / 8);
        }
        switch (d.type) {
        case CDB_CLASS_DSECT: TRY(class_dsect(ck, i, &d, &max_class_id)); break;
        case CDB_MANAGER_DSECT: TRY(manager_dsect(ck, &d, &max_rm_id)); break;
        case CDB_MAP_DSECT: TRY(map_dsect(ck, &d)); break;
        default: TRY(var_class_dsect(ck, &d)); break;
        }
    }
    CHECK(cdb_rd16(ck->db, HDR_MAX_RM_ID) == max_rm_id, CDB_ERR_HEADER, HDR_MAX_RM_ID);
    CHECK(cdb_rd16(ck->db, HDR_MAX_CLASS_ID) == max_class_id, CDB_ERR_HEADER, HDR_MAX_CLASS_ID);
    return CDB_OK;
}

int cdb_check(const cdb_t *db, void *scratch, size_t scratch_size, size_t *bad_offset) {
    checker_t checker, *ck = &checker;
    int err;
    ck->db = db;
    ck->claims = (unsigned char *)scratch;
    ck->bad = 0;
    if (db->size < HDR_SIZE || !db->data) {
        err = CDB_ERR_TRUNCATED;
    } else if (!cdb_check_checksum(db)) {
        err = fail(ck, CDB_ERR_CHECKSUM, 4);
    } else {
        err = check_dsects(ck, scratch_size);
    }
    if (err && bad_offset)
        *bad_offset = ck->bad;
    return err;
}
