/* Opening a CDB: the header and anchors; the manager, map and variable-class
 * dsects; finding classes, with or without an index. */
#include "cdb_internal.h"

static const uint16_t record_sizes[NUM_RECORD_SIZES] = {RC_SIZE, RCM_SIZE, RM_SIZE, RVC_SIZE, PA_SIZE,
                                                        DA_SIZE, AC_SIZE,  RE_SIZE, RD_SIZE};

/* Position of a dsect type in the order the file keeps them: classes, the
 * manager, the map, the variable classes. */
static int dsect_rank(uint32_t type) {
    switch (type) {
    case CDB_CLASS_DSECT: return 0;
    case CDB_MANAGER_DSECT: return 1;
    case CDB_MAP_DSECT: return 2;
    case CDB_VAR_CLASS_DSECT: return 3;
    default: return -1;
    }
}

static int check_anchors(const cdb_t *db) {
    uint32_t count = cdb_rd32(db, HDR_DSECT_COUNT);
    size_t prev_end, i;
    int last_rank = 0, per_rank[4] = {0, 0, 0, 0};
    if (count > (db->size - HDR_SIZE) / ANCHOR_SIZE)
        return CDB_ERR_ANCHORS;
    prev_end = HDR_SIZE + (size_t)ANCHOR_SIZE * count;
    for (i = 0; i < count; i++) {
        size_t at = HDR_SIZE + ANCHOR_SIZE * i;
        uint32_t off = cdb_rd32(db, at + 4), len = cdb_rd32(db, at + 8);
        int rank = dsect_rank(cdb_rd32(db, at));
        if (rank < 0 || rank < last_rank || (rank == last_rank && (rank == 1 || rank == 2)))
            return CDB_ERR_ANCHORS;
        if (off < prev_end || !cdb_fits(off, len, db->size))
            return CDB_ERR_ANCHORS;
        last_rank = rank;
        per_rank[rank]++;
        prev_end = (size_t)off + len;
    }
    if (per_rank[0] < 1 || per_rank[1] != 1 || per_rank[2] != 1)
        return CDB_ERR_ANCHORS;
    return CDB_OK;
}

int cdb_open(cdb_t *db, const void *data, size_t size) {
    uint32_t format;
    int i;
    if (!db || (!data && size))
        return CDB_ERR_BADARG;
    db->data = (const unsigned char *)data;
    db->size = size;
    db->big_endian = cdb_host_big();
    db->dsect_count = 0;
    if (size < HDR_SIZE || size % 4 != 0 || size - 4 > UINT32_MAX)
        return CDB_ERR_TRUNCATED;
    format = cdb_rd32(db, 8);
    if (format != CDB_FORMAT_WORD) {
        if (__builtin_bswap32(format) != CDB_FORMAT_WORD)
            return CDB_ERR_FORMAT;
        db->big_endian = !db->big_endian;
    }
    if (cdb_rd32(db, 0) != size - 4)
        return CDB_ERR_LENGTH;
    for (i = 0; i < NUM_RECORD_SIZES; i++)
        if (cdb_rd16(db, HDR_RECORD_SIZES + 2 * (size_t)i) != record_sizes[i])
            return CDB_ERR_HEADER;
    i = check_anchors(db);
    if (i != CDB_OK)
        return i;
    db->dsect_count = cdb_rd32(db, HDR_DSECT_COUNT);
    return CDB_OK;
}

/* The XOR of the length and of every word from byte 8 on equals the checksum.
 * XOR commutes with the byte swap, so the words are combined as stored. */
int cdb_check_checksum(const cdb_t *db) {
    const unsigned char *p = db->data + 8, *end = db->data + db->size;
    uint64_t wide = 0;
    uint32_t sum, narrow;
    if (db->size < HDR_SIZE)
        return 0;
    for (; end - p >= 8; p += 8) {
        uint64_t w;
        memcpy(&w, p, 8);
        wide ^= w;
    }
    narrow = (uint32_t)wide ^ (uint32_t)(wide >> 32);
    if (end - p >= 4) {
        uint32_t w;
        memcpy(&w, p, 4);
        narrow ^= w;
    }
    sum = db->big_endian != cdb_host_big() ? __builtin_bswap32(narrow) : narrow;
    return (sum ^ cdb_rd32(db, 0)) == cdb_rd32(db, 4);
}

void cdb_get_header(const cdb_t *db, cdb_header_t *h) {
    h->length = cdb_rd32(db, 0);
    h->checksum = cdb_rd32(db, 4);
    h->seqno = cdb_rd32(db, 12);
    h->tv_sec = cdb_rd32(db, 16);
    h->tv_usec = cdb_rd32(db, 20);
    h->dsect_count = db->dsect_count;
    h->max_rm_id = cdb_rd16(db, HDR_MAX_RM_ID);
    h->max_class_id = cdb_rd16(db, HDR_MAX_CLASS_ID);
}

int cdb_dsect_at(const cdb_t *db, uint32_t i, cdb_dsect_t *d) {
    size_t at = HDR_SIZE + (size_t)ANCHOR_SIZE * i;
    if (i >= db->dsect_count)
        return CDB_ERR_NOTFOUND;
    d->type = cdb_rd32(db, at);
    d->offset = cdb_rd32(db, at + 4);
    d->length = cdb_rd32(db, at + 8);
    d->revision = cdb_rd32(db, at + 12);
    return CDB_OK;
}

int cdb_find_dsect(const cdb_t *db, uint32_t type, uint32_t from) {
    uint32_t i;
    for (i = from; i < db->dsect_count && i <= INT32_MAX; i++)
        if (cdb_rd32(db, HDR_SIZE + (size_t)ANCHOR_SIZE * i) == type)
            return (int)i;
    return CDB_ERR_NOTFOUND;
}

int cdb_dsect_record(const cdb_t *db, uint32_t i, uint32_t type, uint32_t size, uint32_t id, cdb_dsect_t *d) {
    if (cdb_dsect_at(db, i, d) != CDB_OK || d->type != type)
        return CDB_ERR_NOTFOUND;
    if (d->length < size)
        return CDB_ERR_BOUNDS;
    return cdb_rd32(db, d->offset) == id ? CDB_OK : CDB_ERR_IDENT;
}

const char *cdb_string_in(const cdb_t *db, size_t base, size_t len, uint32_t off) {
    const char *s;
    if (off >= len)
        return NULL;
    s = (const char *)db->data + base + off;
    return memchr(s, 0, len - off) ? s : NULL;
}

/* A string reference (offset[1] must be 0) into [base, base + len). */
static const char *string_ref(const cdb_t *db, size_t at, size_t base, size_t len) {
    uint32_t off = cdb_rd32(db, at);
    if (off == NONE_OFF || cdb_rd32(db, at + 4) != 0)
        return NULL;
    return cdb_string_in(db, base, len, off);
}

/* A string that is 0 in an empty table when its statement was not given. */
static const char *unset_string_ref(const cdb_t *db, size_t at, size_t base, size_t len) {
    return len == 0 && cdb_rd32(db, at) == 0 ? NULL : string_ref(db, at, base, len);
}

/* The first dsect of a type the file has one of, with its record. */
static int only_dsect(const cdb_t *db, uint32_t type, uint32_t size, uint32_t id, cdb_dsect_t *d) {
    int i = cdb_find_dsect(db, type, 0);
    return i < 0 ? i : cdb_dsect_record(db, (uint32_t)i, type, size, id, d);
}

int cdb_get_manager(const cdb_t *db, cdb_manager_t *m) {
    cdb_dsect_t d;
    int err = only_dsect(db, CDB_MANAGER_DSECT, RM_SIZE, ID_MGR, &d);
    if (err)
        return err;
    m->id = cdb_rd16(db, d.offset + RM_ID);
    m->name = string_ref(db, d.offset + RM_NAME, d.offset + RM_SIZE, d.length - RM_SIZE);
    return CDB_OK;
}

int cdb_get_map(const cdb_t *db, cdb_map_t *m) {
    cdb_dsect_t d;
    uint16_t *shorts[8];
    uint32_t *words[4];
    size_t b, k;
    int err = only_dsect(db, CDB_MAP_DSECT, RCM_SIZE, ID_CMMAP, &d);
    if (err)
        return err;
    b = d.offset;
    m->class_id = cdb_rd16(db, b + RCM_CLASS_ID);
    m->rm_id = cdb_rd16(db, b + RCM_RM_ID);
    m->message_catalog = unset_string_ref(db, b + RCM_MSG_FILE, b + RCM_SIZE, d.length - RCM_SIZE);
    shorts[0] = &m->dscr_msg_set, shorts[1] = &m->first_key, shorts[2] = &m->last_key, shorts[3] = &m->asnno_start;
    shorts[4] = &m->num_sctx, shorts[5] = &m->num_vctx, shorts[6] = &m->num_stats, shorts[7] = &m->num_ctx_tmplts;
    words[0] = &m->static_contexts, words[1] = &m->volatile_contexts, words[2] = &m->stats, words[3] = &m->ctx_tmplts;
    for (k = 0; k < 8; k++)
        *shorts[k] = cdb_rd16(db, b + RCM_SHORTS + 2 * k);
    for (k = 0; k < 4; k++)
        *words[k] = cdb_rd32(db, b + RCM_WORDS + 4 * k);
    return CDB_OK;
}

int cdb_var_class_at(const cdb_t *db, uint32_t i, cdb_var_class_t *vc) {
    cdb_dsect_t d;
    size_t b, room;
    uint32_t strings;
    int err = cdb_dsect_record(db, i, CDB_VAR_CLASS_DSECT, RVC_SIZE, ID_VAR_CLASS, &d);
    if (err)
        return err;
    b = d.offset;
    room = d.length - RVC_SIZE;
    strings = cdb_rd32(db, b + RVC_STRINGS);
    if (strings % 8 != 0 || strings > room)
        return CDB_ERR_BOUNDS;
    vc->db = db;
    vc->dsect = i;
    vc->obsv_interval = cdb_rd16(db, b + RVC_OBSV);
    vc->report_interval = cdb_rd16(db, b + RVC_REPORT);
    vc->name = unset_string_ref(db, b + RVC_NAME, b + RVC_SIZE, strings);
    vc->alias = string_ref(db, b + RVC_COMPAT, b + RVC_SIZE, strings);
    vc->var_count = cdb_rd32(db, b + RVC_COUNT);
    vc->ids_at = (uint32_t)(b + RVC_SIZE + strings);
    if (vc->var_count > (room - strings) / 4)
        return CDB_ERR_BOUNDS;
    return CDB_OK;
}

int cdb_find_var_class(const cdb_t *db, const char *name, cdb_var_class_t *vc) {
    int i;
    for (i = cdb_find_dsect(db, CDB_VAR_CLASS_DSECT, 0); i >= 0;
         i = cdb_find_dsect(db, CDB_VAR_CLASS_DSECT, (uint32_t)i + 1))
        if (cdb_var_class_at(db, (uint32_t)i, vc) == CDB_OK && vc->name && strcmp(vc->name, name) == 0)
            return CDB_OK;
    return CDB_ERR_NOTFOUND;
}

uint32_t cdb_var_id(const cdb_var_class_t *vc, uint32_t i) {
    return i < vc->var_count ? cdb_rd32(vc->db, vc->ids_at + 4 * (size_t)i) : 0;
}

/* ---- Classes ------------------------------------------------------------- */

int cdb_class_at(const cdb_t *db, uint32_t i, cdb_class_t *c) {
    /* The size field of each table: a record count (2 bytes) times the record
     * size, or a byte size (4 bytes). */
    static const struct {
        uint16_t size_field, record;
    } sizes[9] = {{168, PA_SIZE}, {170, DA_SIZE},       {172, PA_SIZE},  {174, DA_SIZE},     {176, AC_SIZE},
                  {178, AC_SIZE}, {RC_VARLIST_SIZE, 0}, {RC_SD_SIZE, 0}, {RC_VALVAL_SIZE, 0}};
    static const uint16_t refs[9] = {24, 32, 40, 48, 96, 104, RC_VARIETIES, RC_SD_DEFS, RC_VALID_VALS};
    cdb_dsect_t d;
    size_t expected = RC_SIZE, t;
    int err = cdb_dsect_record(db, i, CDB_CLASS_DSECT, RC_SIZE, ID_CLASS, &d);
    if (err)
        return err;
    c->db = db;
    c->dsect = i;
    c->base = d.offset;
    c->length = d.length;
    for (t = 0; t < 9; t++) {
        uint32_t start = cdb_rd32(db, d.offset + refs[t]);
        uint64_t len = sizes[t].record ? (uint64_t)cdb_rd16(db, d.offset + sizes[t].size_field) * sizes[t].record
                                       : cdb_rd32(db, d.offset + sizes[t].size_field);
        if (start != expected || cdb_rd32(db, d.offset + refs[t] + 4) != 0)
            return CDB_ERR_LAYOUT;
        if (!cdb_fits(start, len, d.length))
            return CDB_ERR_BOUNDS;
        c->tables[t][0] = d.offset + start;
        c->tables[t][1] = (uint32_t)len;
        expected = start + (size_t)len;
    }
    if (cdb_rd32(db, d.offset + RC_STRINGS) != expected || cdb_rd32(db, d.offset + RC_STRINGS + 4) != 0)
        return CDB_ERR_LAYOUT;
    c->strings = (uint32_t)(d.offset + expected);
    c->strings_len = (uint32_t)(d.length - expected);
    return CDB_OK;
}

const char *cdb_class_name(const cdb_class_t *c) {
    return string_ref(c->db, c->base + RC_NAME, c->strings, c->strings_len);
}
const char *cdb_class_alias(const cdb_class_t *c) {
    return string_ref(c->db, c->base + RC_ALIAS, c->strings, c->strings_len);
}
uint16_t cdb_class_id(const cdb_class_t *c) { return cdb_rd16(c->db, c->base + RC_CLASS_ID); }

uint32_t cdb_class_field(const cdb_class_t *c, int field) {
    switch (field) {
    case CDB_CLASS_PROPS: return cdb_rd32(c->db, c->base + RC_PROPS);
    case CDB_CLASS_PERM_TEMPLATE: return cdb_rd32(c->db, c->base + RC_PERM_TEMP);
    case CDB_CLASS_PERM_TEMPLATE_CLASS: return cdb_rd32(c->db, c->base + RC_PERM_TEMP_C);
    case CDB_CLASS_DSCR_MSGID: return cdb_rd16(c->db, c->base + RC_DSCR_MSGID);
    case CDB_CLASS_DISP_MSGID: return cdb_rd16(c->db, c->base + RC_DISP_MSGID);
    case CDB_CLASS_LOCATOR: return cdb_rd16(c->db, c->base + RC_LOCATOR);
    case CDB_CLASS_VERSION: return cdb_rd32(c->db, c->base + RC_VERSION);
    default: return 0;
    }
}

/* Calls the match on every readable class until it says yes. */
static int scan_classes(const cdb_t *db, cdb_class_t *c, int (*match)(const cdb_class_t *, const void *),
                        const void *key) {
    int i;
    for (i = cdb_find_dsect(db, CDB_CLASS_DSECT, 0); i >= 0; i = cdb_find_dsect(db, CDB_CLASS_DSECT, (uint32_t)i + 1))
        if (cdb_class_at(db, (uint32_t)i, c) == CDB_OK && match(c, key))
            return CDB_OK;
    return CDB_ERR_NOTFOUND;
}
static int name_is(const cdb_class_t *c, const void *name) {
    const char *n = cdb_class_name(c);
    return n && strcmp(n, (const char *)name) == 0;
}
static int id_is(const cdb_class_t *c, const void *id) { return cdb_class_id(c) == *(const uint16_t *)id; }

int cdb_find_class(const cdb_t *db, const char *name, cdb_class_t *c) { return scan_classes(db, c, name_is, name); }
int cdb_find_class_by_id(const cdb_t *db, uint16_t id, cdb_class_t *c) { return scan_classes(db, c, id_is, &id); }

/* ---- The index: two open-addressing tables of dsect index + 1 ------------ */

static uint32_t slots_for(const cdb_t *db) {
    uint32_t n = 16;
    while (n < 2 * (uint64_t)db->dsect_count && n < (1u << 30))
        n *= 2;
    return n;
}

size_t cdb_index_size(const cdb_t *db) { return 2 * (size_t)slots_for(db) * sizeof(uint32_t); }

static uint32_t hash_name(const char *s) {
    uint32_t h = 2166136261u; /* FNV-1a */
    for (; *s; s++)
        h = (h ^ (unsigned char)*s) * 16777619u;
    return h;
}
static uint32_t hash_id(uint16_t id) { return (uint32_t)id * 2654435761u; }

/* The slot of the class with that key in the table from hash h, or the empty
 * slot where it belongs. Each key is kept once, for its first class. */
static uint32_t *slot_of(const cdb_index_t *ix, uint32_t *slots, uint32_t h,
                         int (*match)(const cdb_class_t *, const void *), const void *key) {
    cdb_class_t c;
    for (;; h++) {
        uint32_t *s = &slots[h & ix->mask];
        if (*s == 0 || (cdb_class_at(ix->db, *s - 1, &c) == CDB_OK && match(&c, key)))
            return s;
    }
}

int cdb_index_build(cdb_index_t *ix, const cdb_t *db, void *mem, size_t size) {
    uint32_t n = slots_for(db);
    int i;
    cdb_class_t c;
    if (!mem || size < cdb_index_size(db))
        return CDB_ERR_NOSPACE;
    ix->db = db;
    ix->slots = (uint32_t *)mem;
    ix->mask = n - 1;
    memset(mem, 0, cdb_index_size(db));
    for (i = cdb_find_dsect(db, CDB_CLASS_DSECT, 0); i >= 0; i = cdb_find_dsect(db, CDB_CLASS_DSECT, (uint32_t)i + 1)) {
        const char *name;
        uint16_t id;
        uint32_t *s;
        if (cdb_class_at(db, (uint32_t)i, &c) != CDB_OK)
            continue;
        name = cdb_class_name(&c);
        id = cdb_class_id(&c);
        if (name && *(s = slot_of(ix, ix->slots, hash_name(name), name_is, name)) == 0)
            *s = (uint32_t)i + 1;
        if (*(s = slot_of(ix, ix->slots + n, hash_id(id), id_is, &id)) == 0)
            *s = (uint32_t)i + 1;
    }
    return CDB_OK;
}

static int found(const cdb_index_t *ix, const uint32_t *s, cdb_class_t *c) {
    return *s ? cdb_class_at(ix->db, *s - 1, c) : CDB_ERR_NOTFOUND;
}

int cdb_index_find_class(const cdb_index_t *ix, const char *name, cdb_class_t *c) {
    return found(ix, slot_of(ix, ix->slots, hash_name(name), name_is, name), c);
}

int cdb_index_find_class_by_id(const cdb_index_t *ix, uint16_t id, cdb_class_t *c) {
    return found(ix, slot_of(ix, ix->slots + ix->mask + 1, hash_id(id), id_is, &id), c);
}
