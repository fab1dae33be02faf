/* Typed values and their bodies in the class string table, and their text. */
#include <math.h>
#include <stdio.h>

#include "cdb_internal.h"

/* Where a reference value's body starts and how many bytes of the string
 * table are left from there. CDB_ERR_NOTFOUND for the none marker. */
static int body_of(const cdb_value_t *v, size_t *body, size_t *room) {
    uint32_t off;
    if (v->at == 0)
        return CDB_ERR_NOTFOUND;
    off = cdb_rd32(v->cls->db, v->at);
    if (off == NONE_OFF)
        return CDB_ERR_NOTFOUND;
    if (off >= v->cls->strings_len)
        return CDB_ERR_BOUNDS;
    *body = v->cls->strings + off;
    *room = v->cls->strings_len - off;
    return CDB_OK;
}

/* The body of a value of the given kind of type. */
static int typed_body(const cdb_value_t *v, int ok, size_t *body, size_t *room) {
    return ok ? body_of(v, body, room) : CDB_ERR_KIND;
}

int cdb_value_is_none(const cdb_value_t *v) {
    if (v->at == 0)
        return 1;
    return !cdb_is_numeric(v->type) && v->type != CDB_UNKNOWN && v->type != CDB_NONE_TYPE && v->type != CDB_SBS &&
           cdb_rd32(v->cls->db, v->at) == NONE_OFF;
}

int cdb_value_bits(const cdb_value_t *v, uint64_t *out) {
    if (!cdb_is_numeric(v->type) || v->at == 0)
        return CDB_ERR_KIND;
    *out = cdb_is_wide(v->type) ? cdb_rd64(v->cls->db, v->at) : cdb_rd32(v->cls->db, v->at);
    return CDB_OK;
}

int cdb_value_double(const cdb_value_t *v, double *out) {
    uint64_t bits;
    int err = cdb_value_bits(v, &bits);
    if (err)
        return err;
    switch (v->type) {
    case CDB_INT32: *out = (int32_t)(uint32_t)bits; break;
    case CDB_UINT32: *out = (uint32_t)bits; break;
    case CDB_INT64: *out = (double)(int64_t)bits; break;
    case CDB_UINT64: *out = (double)bits; break;
    case CDB_FLOAT32: {
        uint32_t b = (uint32_t)bits;
        float f;
        memcpy(&f, &b, sizeof f);
        *out = f;
        break;
    }
    default: memcpy(out, &bits, sizeof *out); break;
    }
    return CDB_OK;
}

/* A number as its sign and magnitude; a float truncated toward zero, and
 * CDB_ERR_KIND when it is not finite or 2^64 or more in magnitude. */
static int sign_and_magnitude(const cdb_value_t *v, int *negative, uint64_t *magnitude) {
    uint64_t bits;
    double d;
    int err = cdb_value_bits(v, &bits);
    if (err)
        return err;
    switch (v->type) {
    case CDB_UINT32:
    case CDB_UINT64: *negative = 0, *magnitude = bits; return CDB_OK;
    case CDB_INT32:
    case CDB_INT64: {
        int64_t s = v->type == CDB_INT32 ? (int32_t)(uint32_t)bits : (int64_t)bits;
        *negative = s < 0;
        *magnitude = s < 0 ? 0 - (uint64_t)s : (uint64_t)s;
        return CDB_OK;
    }
    default:
        cdb_value_double(v, &d);
        if (!(fabs(d) < 18446744073709551616.0))
            return CDB_ERR_KIND;
        *negative = d < 0;
        *magnitude = (uint64_t)fabs(d);
        return CDB_OK;
    }
}

int cdb_value_int64(const cdb_value_t *v, int64_t *out) {
    int negative;
    uint64_t m;
    int err = sign_and_magnitude(v, &negative, &m);
    if (err)
        return err;
    if (m > (negative ? (uint64_t)INT64_MAX + 1 : (uint64_t)INT64_MAX))
        return CDB_ERR_KIND;
    *out = negative && m ? -(int64_t)(m - 1) - 1 : (int64_t)m;
    return CDB_OK;
}

int cdb_value_uint64(const cdb_value_t *v, uint64_t *out) {
    int negative;
    uint64_t m;
    int err = sign_and_magnitude(v, &negative, &m);
    if (err)
        return err;
    if (negative && m != 0)
        return CDB_ERR_KIND;
    *out = m;
    return CDB_OK;
}

int cdb_value_string(const cdb_value_t *v, const char **s, size_t *len) {
    size_t body, room;
    int err = typed_body(v, v->type == CDB_STRING, &body, &room);
    if (err)
        return err;
    *s = cdb_string_in(v->cls->db, body, room, 0);
    if (!*s)
        return CDB_ERR_STRING;
    if (len)
        *len = strlen(*s);
    return CDB_OK;
}

int cdb_value_binary(const cdb_value_t *v, const unsigned char **data, size_t *len) {
    size_t body, room;
    uint32_t n;
    int err = typed_body(v, v->type == CDB_BINARY, &body, &room);
    if (err)
        return err;
    if (room < BINARY_DATA)
        return CDB_ERR_BOUNDS;
    n = cdb_rd32(v->cls->db, body);
    if (n > room - BINARY_DATA)
        return CDB_ERR_BOUNDS;
    *data = v->cls->db->data + body + BINARY_DATA;
    *len = n;
    return CDB_OK;
}

int cdb_value_handle(const cdb_value_t *v, cdb_handle_t *h) {
    size_t body, room, i;
    int err = typed_body(v, v->type == CDB_RH, &body, &room);
    if (err)
        return err;
    if (room < HANDLE_SIZE)
        return CDB_ERR_BOUNDS;
    h->header = cdb_rd32(v->cls->db, body);
    for (i = 0; i < 4; i++)
        h->id[i] = cdb_rd32(v->cls->db, body + 4 + 4 * i);
    return CDB_OK;
}

/* An array's or structured value's element count and the bytes of an element. */
static int list_body(const cdb_value_t *v, size_t *body, uint32_t *count, size_t *element) {
    size_t room, slots;
    int sd = v->type == CDB_SD;
    int err = typed_body(v, sd || (v->type >= CDB_INT32_ARRAY && v->type <= CDB_SD_ARRAY), body, &room);
    if (err)
        return err;
    *element = sd ? SD_ELEMENT : ARRAY_ELEMENT;
    if (room < ARRAY_HEADER)
        return CDB_ERR_BOUNDS;
    *count = cdb_rd32(v->cls->db, *body);
    /* A structured value without elements still has room for one. */
    slots = sd && *count == 0 ? 1 : *count;
    return slots <= (room - ARRAY_HEADER) / *element ? CDB_OK : CDB_ERR_BOUNDS;
}

int cdb_value_count(const cdb_value_t *v, uint32_t *count) {
    size_t body, element;
    return list_body(v, &body, count, &element);
}

int cdb_value_element(const cdb_value_t *v, uint32_t i, cdb_value_t *e) {
    size_t body, element, at;
    uint32_t count;
    int err = list_body(v, &body, &count, &element);
    if (err)
        return err;
    if (i >= count)
        return CDB_ERR_NOTFOUND;
    at = body + ARRAY_HEADER + element * i;
    e->cls = v->cls;
    if (v->type == CDB_SD) {
        uint32_t dt = cdb_rd32(v->cls->db, at);
        e->type = dt < CDB_NUM_DATA_TYPES && !cdb_is_sd_type(dt) ? dt : CDB_UNKNOWN;
        e->at = (uint32_t)(at + 8);
    } else {
        e->type = cdb_element_type(v->type);
        e->at = (uint32_t)at;
    }
    return CDB_OK;
}

/* ---- Text ------------------------------------------------------------------ */

typedef struct text {
    char *buf;
    size_t size, len;
} text_t;

static void put_n(text_t *t, const char *s, size_t n) {
    size_t i;
    for (i = 0; i < n; i++, t->len++)
        if (t->len + 1 < t->size)
            t->buf[t->len] = s[i];
}
static void put(text_t *t, const char *s) { put_n(t, s, strlen(s)); }

static void put_float(text_t *t, double d, const char *fmt) {
    char b[48];
    if (isnan(d))
        put(t, signbit(d) ? "-nan" : "nan");
    else if (isinf(d))
        put(t, d < 0 ? "-inf" : "inf");
    else {
        snprintf(b, sizeof b, fmt, d);
        put(t, b);
    }
}

static void put_number(text_t *t, const cdb_value_t *v) {
    char b[32];
    uint64_t bits;
    double d;
    cdb_value_bits(v, &bits);
    switch (v->type) {
    case CDB_INT32: snprintf(b, sizeof b, "%ld", (long)(int32_t)(uint32_t)bits); break;
    case CDB_UINT32: snprintf(b, sizeof b, "%lu", (unsigned long)(uint32_t)bits); break;
    case CDB_INT64: snprintf(b, sizeof b, "%lld", (long long)(int64_t)bits); break;
    case CDB_UINT64: snprintf(b, sizeof b, "%llu", (unsigned long long)bits); break;
    default:
        cdb_value_double(v, &d);
        put_float(t, d, v->type == CDB_FLOAT32 ? "%.9g" : "%.17g");
        return;
    }
    put(t, b);
}

static void put_hex(text_t *t, const unsigned char *p, size_t n) {
    static const char digits[] = "0123456789abcdef";
    size_t i;
    put(t, "0x");
    for (i = 0; i < n; i++) {
        put_n(t, &digits[p[i] >> 4], 1);
        put_n(t, &digits[p[i] & 15], 1);
    }
}

static void put_quoted(text_t *t, const char *s) {
    char b[8];
    put(t, "\"");
    for (; *s; s++) {
        unsigned char c = (unsigned char)*s;
        switch (c) {
        case '"': put(t, "\\\""); break;
        case '\\': put(t, "\\\\"); break;
        case '\n': put(t, "\\n"); break;
        case '\t': put(t, "\\t"); break;
        case '\r': put(t, "\\r"); break;
        default:
            if (c < 0x20 || c == 0x7f) {
                snprintf(b, sizeof b, "\\x%02x", c);
                put(t, b);
            } else
                put_n(t, s, 1);
        }
    }
    put(t, "\"");
}

static int put_value(text_t *t, const cdb_value_t *v) {
    const unsigned char *bytes;
    const char *s;
    size_t n;
    uint32_t count, i;
    int err = CDB_OK;
    cdb_value_t e;
    if (v->type >= CDB_NUM_DATA_TYPES)
        return CDB_ERR_TYPE;
    if (cdb_is_numeric(v->type)) {
        put_number(t, v);
        return CDB_OK;
    }
    if (v->type == CDB_UNKNOWN || v->type == CDB_NONE_TYPE || v->type == CDB_SBS) {
        if (!cdb_fits(v->at, 8, v->cls->db->size))
            return CDB_ERR_BOUNDS;
        put_hex(t, v->cls->db->data + v->at, 8); /* no decodable value: the bytes as stored */
        return CDB_OK;
    }
    if (cdb_value_is_none(v)) {
        put(t, "none");
        return CDB_OK;
    }
    switch (v->type) {
    case CDB_STRING:
        if ((err = cdb_value_string(v, &s, NULL)) == CDB_OK)
            put_quoted(t, s);
        return err;
    case CDB_BINARY:
        if ((err = cdb_value_binary(v, &bytes, &n)) == CDB_OK)
            put_hex(t, bytes, n);
        return err;
    case CDB_RH: {
        size_t body, room;
        if ((err = body_of(v, &body, &room)) != CDB_OK)
            return err;
        if (room < HANDLE_SIZE)
            return CDB_ERR_BOUNDS;
        put_hex(t, v->cls->db->data + body, HANDLE_SIZE);
        return CDB_OK;
    }
    default:
        if ((err = cdb_value_count(v, &count)) != CDB_OK)
            return err;
        put(t, "[");
        for (i = 0; i < count && err == CDB_OK; i++) {
            if (i)
                put(t, ", ");
            cdb_value_element(v, i, &e);
            if (v->type == CDB_SD) {
                put(t, "{type: ");
                put(t, cdb_data_type_name(e.type));
                put(t, ", value: ");
            }
            err = put_value(t, &e);
            if (v->type == CDB_SD)
                put(t, "}");
        }
        put(t, "]");
        return err;
    }
}

int cdb_format_value(const cdb_value_t *v, char *buf, size_t size) {
    text_t t;
    int err;
    t.buf = buf;
    t.size = buf ? size : 0;
    t.len = 0;
    err = put_value(&t, v);
    if (t.size)
        t.buf[t.len < t.size ? t.len : t.size - 1] = '\0';
    if (err)
        return err;
    return t.len > INT32_MAX ? CDB_ERR_NOSPACE : (int)t.len;
}
