// Growable tables and the positions inside them that survive their growth.
#ifndef QECFG_TBL_H
#define QECFG_TBL_H

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "cdb_format.h"

// A zero-filled, append-only block, referred to by offsets because it moves
// when it grows.
struct tbl {
    char *tbl_base = nullptr;
    char *tbl_next = nullptr;
    size_t tbl_size = 0; // the size in whole allocation units, as the traces report it
    size_t tbl_au = 0;
    const char *tbl_name = nullptr;
    // Room actually reserved behind tbl_base: what is used, grown
    // geometrically so that a table of any size is copied a bounded number
    // of times; room past tbl_next is not touched until it is handed out.
    size_t tbl_cap = 0;
};

inline size_t tbl_used(const tbl *t) { return t && t->tbl_base ? size_t(t->tbl_next - t->tbl_base) : 0; }

void memcpy_8_rounded(void *dst, const void *src, size_t len);

// Loads and stores of fields inside packed records and tables.
template <typename T> inline T load(const void *p) {
    T v;
    std::memcpy(&v, p, sizeof v);
    return v;
}
template <typename T> inline void store(void *p, T v) { std::memcpy(p, &v, sizeof v); }

// A value field that survives growth of the table that may hold it: either a
// fixed address (a record being built) or an offset into a table.
struct value_slot {
    char *fixed = nullptr;
    const tbl *t = nullptr;
    uint32_t off = 0;
    char *addr() const { return fixed ? fixed : t->tbl_base + off; }
    static value_slot at(void *p) { return value_slot{static_cast<char *>(p), nullptr, 0}; }
    static value_slot in(const tbl *t, uint32_t off) { return value_slot{nullptr, t, off}; }
};

// The array or structured value being filled element by element, by its
// offset in the string table.
struct body_cursor {
    bool set = false;
    uint32_t off = 0;
};

// A reference that designates nothing, and one that holds a table while the
// source is compiled.
inline cdb_ref_t none_ref() {
    cdb_ref_t r{};
    r.offset[0] = CDB_NONE;
    return r;
}
inline cdb_ref_t table_ref(tbl *t) {
    cdb_ref_t r{};
    r.ptr = t;
    return r;
}
inline tbl *ref_table(const cdb_ref_t &r) { return static_cast<tbl *>(r.ptr); }

#endif
