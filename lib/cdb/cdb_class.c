/* A class's records: attributes, actions, their lists, structured-data
 * definitions and typed values. */
#include "cdb_internal.h"

static const uint32_t attr_ids[4] = {ID_PATTR_CLASS, ID_DATTR_CLASS, ID_PATTR, ID_DATTR};

static int is_dattr(int kind) { return kind == CDB_DATTR_CLASS || kind == CDB_DATTR; }
static size_t attr_size(int kind) { return is_dattr(kind) ? DA_SIZE : PA_SIZE; }

size_t cdb_attr_offset(const cdb_attr_t *a, int pattr_offset, int dattr_offset) {
    return a->rec + (size_t)(is_dattr(a->kind) ? dattr_offset : pattr_offset);
}

/* Record i of table t whose records are `size` bytes with identifier `id`. */
static int record_at(const cdb_class_t *c, int t, size_t size, uint32_t i, uint32_t id, uint32_t *rec) {
    if (i >= c->tables[t][1] / size)
        return CDB_ERR_NOTFOUND;
    *rec = (uint32_t)(c->tables[t][0] + size * i);
    return cdb_rd32(c->db, *rec) == id ? CDB_OK : CDB_ERR_IDENT;
}

static const char *string_ref(const cdb_class_t *c, size_t at) {
    uint32_t off = cdb_rd32(c->db, at);
    if (off == NONE_OFF || cdb_rd32(c->db, at + 4) != 0)
        return NULL;
    return cdb_string_in(c->db, c->strings, c->strings_len, off);
}

int cdb_list_in(const cdb_class_t *c, int table, uint32_t ref, uint32_t id, size_t entry, uint32_t *at,
                uint32_t *count) {
    size_t len = c->tables[table][1];
    uint32_t off = cdb_rd32(c->db, ref);
    if (cdb_rd32(c->db, ref + 4) != 0)
        return CDB_ERR_LAYOUT;
    if (off == NONE_OFF)
        return CDB_ERR_NOTFOUND;
    /* A list occupies its header and one entry even when empty. */
    if (!cdb_fits(off, LIST_HEADER + entry, len))
        return CDB_ERR_BOUNDS;
    *at = c->tables[table][0] + off;
    if (cdb_rd32(c->db, *at) != id)
        return CDB_ERR_IDENT;
    *count = cdb_rd32(c->db, *at + 4);
    if (*count > (len - off - LIST_HEADER) / entry)
        return CDB_ERR_BOUNDS;
    return CDB_OK;
}

/* ---- Attributes ----------------------------------------------------------- */

uint32_t cdb_attr_count(const cdb_class_t *c, int kind) {
    return kind >= 0 && kind < 4 ? (uint32_t)(c->tables[kind][1] / attr_size(kind)) : 0;
}

int cdb_attr_at(const cdb_class_t *c, int kind, uint32_t i, cdb_attr_t *a) {
    if (kind < 0 || kind > 3)
        return CDB_ERR_BADARG;
    a->cls = c;
    a->kind = kind;
    return record_at(c, kind, attr_size(kind), i, attr_ids[kind], &a->rec);
}

/* The first record of table t whose id word at id_at is id or, when name is
 * not NULL, whose name at name_at is name. */
static int find_record(const cdb_class_t *c, int t, size_t size, uint32_t ident, size_t id_at, int32_t id,
                       size_t name_at, const char *name, uint32_t *rec) {
    uint32_t i, n = (uint32_t)(c->tables[t][1] / size);
    for (i = 0; i < n; i++) {
        const char *s;
        if (record_at(c, t, size, i, ident, rec) != CDB_OK)
            continue;
        if (name ? (s = string_ref(c, *rec + name_at)) != NULL && strcmp(s, name) == 0
                 : (int32_t)cdb_rd32(c->db, *rec + id_at) == id)
            return CDB_OK;
    }
    return CDB_ERR_NOTFOUND;
}

static int find_attr(const cdb_class_t *c, int kind, int32_t id, const char *name, cdb_attr_t *a) {
    if (kind < 0 || kind > 3)
        return CDB_ERR_BADARG;
    a->cls = c;
    a->kind = kind;
    return find_record(c, kind, attr_size(kind), attr_ids[kind], is_dattr(kind) ? DA_ATTR_ID : PA_ATTR_ID, id, RA_NAME,
                       name, &a->rec);
}

int cdb_find_attr(const cdb_class_t *c, int kind, int32_t id, cdb_attr_t *a) { return find_attr(c, kind, id, NULL, a); }

int cdb_find_attr_by_name(const cdb_class_t *c, int kind, const char *name, cdb_attr_t *a) {
    return find_attr(c, kind, 0, name, a);
}

const char *cdb_attr_name(const cdb_attr_t *a) { return string_ref(a->cls, a->rec + RA_NAME); }
int32_t cdb_attr_id(const cdb_attr_t *a) {
    return (int32_t)cdb_rd32(a->cls->db, cdb_attr_offset(a, PA_ATTR_ID, DA_ATTR_ID));
}
uint32_t cdb_attr_data_type(const cdb_attr_t *a) {
    return cdb_rd32(a->cls->db, cdb_attr_offset(a, PA_DATA_TYPE, DA_DATA_TYPE));
}

uint32_t cdb_attr_field(const cdb_attr_t *a, int field) {
    const cdb_t *db = a->cls->db;
    size_t msgids = cdb_attr_offset(a, PA_MSGIDS, DA_MSGIDS);
    static const int dattr_only[] = {DA_VAR_TYPE, DA_EXPR_DESC, DA_REARM_DESC, DA_RANGE_DESC, DA_REPORT_INTERVAL};
    switch (field) {
    case CDB_ATTR_PROPS: return cdb_rd32(db, a->rec + RA_PROPS);
    case CDB_ATTR_DSCR_MSGID:
    case CDB_ATTR_DISP_MSGID:
    case CDB_ATTR_GROUP_MSGID:
    case CDB_ATTR_GROUP_ID: return cdb_rd16(db, msgids + 2 * (size_t)(field - CDB_ATTR_DSCR_MSGID));
    case CDB_ATTR_MAX_SD_IDX: return cdb_rd16(db, cdb_attr_offset(a, PA_MAX_SD_IDX, DA_MAX_SD_IDX));
    case CDB_ATTR_VAR_TYPE: return is_dattr(a->kind) ? cdb_rd32(db, a->rec + DA_VAR_TYPE) : 0;
    case CDB_ATTR_EXPR_DESC:
    case CDB_ATTR_REARM_DESC:
    case CDB_ATTR_RANGE_DESC:
    case CDB_ATTR_REPORT_INTERVAL:
        return is_dattr(a->kind) ? cdb_rd16(db, a->rec + (size_t)dattr_only[field - CDB_ATTR_VAR_TYPE]) : 0;
    default: return 0;
    }
}

const char *cdb_attr_expression(const cdb_attr_t *a) {
    return is_dattr(a->kind) ? string_ref(a->cls, a->rec + DA_EXPRESS) : NULL;
}
const char *cdb_attr_rearm_expression(const cdb_attr_t *a) {
    return is_dattr(a->kind) ? string_ref(a->cls, a->rec + DA_REARM) : NULL;
}

int cdb_attr_varieties(const cdb_attr_t *a, cdb_varieties_t *v) {
    v->cls = a->cls;
    return cdb_list_in(a->cls, T_VARIETIES, (uint32_t)cdb_attr_offset(a, PA_VARIETIES, DA_VARIETIES), ID_VARIETY_LIST,
                       VL_ENTRY, &v->at, &v->count);
}

int cdb_attr_valid_values(const cdb_attr_t *a, cdb_valid_values_t *vv) {
    uint32_t type = cdb_attr_data_type(a);
    if (type >= CDB_NUM_DATA_TYPES)
        return CDB_ERR_TYPE;
    vv->cls = a->cls;
    vv->type = cdb_element_type(type);
    return cdb_list_in(a->cls, T_VALID_VALS, (uint32_t)cdb_attr_offset(a, PA_VALID_VALS, DA_VALID_VALS),
                       ID_VALID_VALUES, VV_ENTRY, &vv->at, &vv->count);
}

static int sd_def(const cdb_class_t *c, size_t ref, cdb_sd_def_t *def) {
    def->cls = c;
    return cdb_list_in(c, T_SD_DEFS, (uint32_t)ref, ID_SD_DEF, SD_FIELD, &def->at, &def->count);
}

int cdb_attr_sd(const cdb_attr_t *a, cdb_sd_def_t *def) {
    return sd_def(a->cls, cdb_attr_offset(a, PA_SD, DA_SD), def);
}

int cdb_class_input(const cdb_class_t *c, int which, cdb_sd_def_t *def) {
    if (which < CDB_INPUT_DEFINE || which > CDB_INPUT_RESET)
        return CDB_ERR_BADARG;
    return sd_def(c, c->base + RC_DEF_INPUT + 8 * (size_t)which, def);
}

int cdb_variety_at(const cdb_varieties_t *v, uint32_t i, uint32_t *low, uint32_t *high) {
    size_t e = v->at + LIST_HEADER + (size_t)VL_ENTRY * i;
    if (i >= v->count)
        return CDB_ERR_NOTFOUND;
    *low = cdb_rd32(v->cls->db, e);
    *high = cdb_rd32(v->cls->db, e + 4);
    return CDB_OK;
}

int cdb_valid_value_at(const cdb_valid_values_t *vv, uint32_t i, cdb_value_t *low, cdb_value_t *high,
                       uint16_t *disp_msgid) {
    size_t e = vv->at + LIST_HEADER + (size_t)VV_ENTRY * i;
    if (i >= vv->count)
        return CDB_ERR_NOTFOUND;
    low->cls = high->cls = vv->cls;
    low->type = high->type = vv->type;
    low->at = (uint32_t)e;
    high->at = (uint32_t)(e + VV_HIGH);
    if (disp_msgid)
        *disp_msgid = cdb_rd16(vv->cls->db, e + VV_DISP);
    return CDB_OK;
}

/* ---- Structured-data definitions ------------------------------------------- */

int cdb_sd_element_at(const cdb_sd_def_t *def, uint32_t i, cdb_sd_element_t *e) {
    const cdb_t *db = def->cls->db;
    size_t at = def->at + LIST_HEADER + (size_t)SD_FIELD * i;
    if (i >= def->count)
        return CDB_ERR_NOTFOUND;
    e->cls = def->cls;
    e->at = (uint32_t)at;
    e->name = string_ref(def->cls, at + SDF_NAME);
    e->type = cdb_rd32(db, at + SDF_TYPE);
    e->disp_msgid = cdb_rd16(db, at + SDF_DISP);
    e->dscr_msgid = cdb_rd16(db, at + SDF_DSCR);
    e->action_id = cdb_rd32(db, at + SDF_ACTION);
    e->valid_type = cdb_rd16(db, at + SDF_VTYPE);
    return CDB_OK;
}

int cdb_find_sd_element(const cdb_sd_def_t *def, const char *name, cdb_sd_element_t *e) {
    uint32_t i;
    for (i = 0; i < def->count; i++)
        if (cdb_sd_element_at(def, i, e) == CDB_OK && e->name && strcmp(e->name, name) == 0)
            return CDB_OK;
    return CDB_ERR_NOTFOUND;
}

int cdb_sd_element_valid_values(const cdb_sd_element_t *e, cdb_valid_values_t *vv) {
    if (e->type >= CDB_NUM_DATA_TYPES || cdb_is_sd_type(e->type))
        return CDB_ERR_TYPE;
    vv->cls = e->cls;
    vv->type = cdb_element_type(e->type);
    return cdb_list_in(e->cls, T_VALID_VALS, e->at + SDF_VALID_VALS, ID_VALID_VALUES, VV_ENTRY, &vv->at, &vv->count);
}

/* ---- Attribute values ---------------------------------------------------- */

/* A value at 0 (the file header, never a value field) holds nothing. */
static int none_value(const cdb_class_t *c, uint32_t type, cdb_value_t *v) {
    v->cls = c;
    v->at = 0;
    v->type = type;
    return CDB_OK;
}

int cdb_attr_default(const cdb_attr_t *a, cdb_value_t *v) {
    uint32_t type = cdb_attr_data_type(a);
    cdb_sd_def_t def;
    if (type >= CDB_NUM_DATA_TYPES)
        return CDB_ERR_TYPE;
    /* A structured attribute without definition keeps its value 0: no body. */
    if (cdb_is_sd_type(type) && cdb_attr_sd(a, &def) == CDB_ERR_NOTFOUND)
        return none_value(a->cls, type, v);
    v->cls = a->cls;
    v->type = type;
    v->at = (uint32_t)cdb_attr_offset(a, PA_DFLT, DA_INIT);
    return CDB_OK;
}

uint64_t cdb_hundred_bits(uint32_t type) {
    return type == CDB_FLOAT32 ? 0x42c80000u : type == CDB_FLOAT64 ? 0x4059000000000000ull : 100;
}

/* The default range of a numeric array attribute: a one-element array whose
 * element has the expected bits; nothing in the record says which it is. */
int cdb_default_range_array(const cdb_class_t *c, size_t at, uint32_t elem_type, uint64_t expected) {
    uint32_t off = cdb_rd32(c->db, at);
    size_t body;
    if (off == NONE_OFF || !cdb_fits(off, ARRAY_HEADER + ARRAY_ELEMENT, c->strings_len))
        return 0;
    body = c->strings + off;
    if (cdb_rd32(c->db, body) != 1)
        return 0;
    return (cdb_is_wide(elem_type) ? cdb_rd64(c->db, body + ARRAY_HEADER) : cdb_rd32(c->db, body + ARRAY_HEADER)) ==
           expected;
}

int cdb_attr_range(const cdb_attr_t *a, cdb_value_t *low, cdb_value_t *high) {
    uint32_t type = cdb_attr_data_type(a);
    if (!is_dattr(a->kind))
        return CDB_ERR_NOTFOUND;
    if (type >= CDB_NUM_DATA_TYPES)
        return CDB_ERR_TYPE;
    if (cdb_is_numeric_array(type)) {
        uint32_t et = cdb_element_type(type);
        int arrays = cdb_default_range_array(a->cls, a->rec + DA_MIN, et, 0) &&
                     cdb_default_range_array(a->cls, a->rec + DA_MAX, et, cdb_hundred_bits(et));
        if (!arrays)
            type = et;
    }
    low->cls = high->cls = a->cls;
    low->type = high->type = type;
    low->at = a->rec + DA_MIN;
    high->at = a->rec + DA_MAX;
    return CDB_OK;
}

/* ---- Actions ---------------------------------------------------------------- */

uint32_t cdb_action_count(const cdb_class_t *c, int of_class) {
    return c->tables[of_class ? T_ACTIONS_C : T_ACTIONS][1] / AC_SIZE;
}

int cdb_action_at(const cdb_class_t *c, int of_class, uint32_t i, cdb_action_t *x) {
    x->cls = c;
    x->of_class = of_class != 0;
    return record_at(c, of_class ? T_ACTIONS_C : T_ACTIONS, AC_SIZE, i, of_class ? ID_ACTION_CLASS : ID_ACTION,
                     &x->rec);
}

static int find_action(const cdb_class_t *c, int of_class, int32_t id, const char *name, cdb_action_t *x) {
    x->cls = c;
    x->of_class = of_class != 0;
    return find_record(c, of_class ? T_ACTIONS_C : T_ACTIONS, AC_SIZE, of_class ? ID_ACTION_CLASS : ID_ACTION, AC_ID,
                       id, AC_NAME, name, &x->rec);
}

int cdb_find_action(const cdb_class_t *c, int of_class, int32_t id, cdb_action_t *x) {
    return find_action(c, of_class, id, NULL, x);
}

int cdb_find_action_by_name(const cdb_class_t *c, int of_class, const char *name, cdb_action_t *x) {
    return find_action(c, of_class, 0, name, x);
}

const char *cdb_action_name(const cdb_action_t *x) { return string_ref(x->cls, x->rec + AC_NAME); }
int32_t cdb_action_id(const cdb_action_t *x) { return (int32_t)cdb_rd32(x->cls->db, x->rec + AC_ID); }

uint32_t cdb_action_field(const cdb_action_t *x, int field) {
    static const uint8_t shorts[] = {AC_DSCR, AC_DISP, AC_CONFIRM, AC_TIMEOUT};
    switch (field) {
    case CDB_ACTION_PROPS: return cdb_rd32(x->cls->db, x->rec + AC_PROPS);
    case CDB_ACTION_PERMS: return cdb_rd32(x->cls->db, x->rec + AC_PERMS);
    case CDB_ACTION_DSCR_MSGID:
    case CDB_ACTION_DISP_MSGID:
    case CDB_ACTION_CONFIRM_MSGID:
    case CDB_ACTION_TIMEOUT: return cdb_rd16(x->cls->db, x->rec + shorts[field - CDB_ACTION_DSCR_MSGID]);
    default: return 0;
    }
}

int cdb_action_varieties(const cdb_action_t *x, cdb_varieties_t *v) {
    v->cls = x->cls;
    return cdb_list_in(x->cls, T_VARIETIES, x->rec + AC_VARIETIES, ID_VARIETY_LIST, VL_ENTRY, &v->at, &v->count);
}
int cdb_action_sd_input(const cdb_action_t *x, cdb_sd_def_t *def) { return sd_def(x->cls, x->rec + AC_SD_INPUT, def); }
int cdb_action_sd_response(const cdb_action_t *x, cdb_sd_def_t *def) {
    return sd_def(x->cls, x->rec + AC_SD_RESP, def);
}
