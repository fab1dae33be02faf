// Growable tables and the positions inside them that survive their growth.
#ifndef QECFG_TBL_H
#define QECFG_TBL_H

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <memory>
#include <vector>

#include "cdb_format.h"

// A zero-filled, append-only block, referred to by offsets because it moves
// when it grows. It owns its block.
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

    tbl() = default;
    tbl(const char *name, size_t au) : tbl_au(au), tbl_name(name) {}
    ~tbl() { std::free(tbl_base); }
    tbl(const tbl &) = delete;
    tbl &operator=(const tbl &) = delete;
    // Gives the block back once its bytes are spent or copied out; the table
    // keeps its name and unit and may be filled again.
    void release() {
        std::free(tbl_base);
        tbl_base = tbl_next = nullptr;
        tbl_size = tbl_cap = 0;
    }
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

// Where the table traces of -d 3 go.
struct table_trace {
    int level = 0;
    FILE *out = stdout; // the allocation lines
    FILE *err = stderr; // the growth line
};

// The tables of a compile and the zero-filled memory of its value texts,
// all given back when the arena ends.
class table_arena {
  public:
    explicit table_arena(table_trace trace = {}) : trace_(trace) {}
    table_arena(const table_arena &) = delete;
    table_arena &operator=(const table_arena &) = delete;

    void *cfg_malloc(size_t s);
    tbl *new_tbl(const char *name, size_t au);
    void *alloc_tble(tbl *t, size_t s);
    zu_uint32_t add_to_tbl(tbl *tp, const void *data, size_t len);
    // A table left empty is given back for new_tbl to reuse; the reference
    // becomes null, which the image writer takes as an empty table.
    void release_if_empty(cdb_ref_t &ref);

  private:
    struct free_block {
        void operator()(void *p) const { std::free(p); }
    };
    table_trace trace_;
    // Value texts are handed out from large chunks.
    std::vector<std::unique_ptr<void, free_block>> blocks_;
    char *chunk_next_ = nullptr;
    size_t chunk_left_ = 0;
    std::deque<tbl> tables_;       // stable addresses
    std::vector<tbl *> free_tbls_; // given back empty
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
