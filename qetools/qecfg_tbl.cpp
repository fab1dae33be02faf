// Growable tables: named, zero-filled blocks to which items are only appended
// and which are referred to by offsets, because a block moves when it grows.
#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <new>

#include "qecfg_fatal.h"
#include "qecfg_tbl.h"

namespace {
constexpr size_t CHUNK = size_t(1) << 20;
constexpr size_t OWN_BLOCK = CHUNK / 16; // larger requests get a block of their own
constexpr size_t MIN_BLOCK = 16;
constexpr size_t LARGE_TABLE = size_t(32) << 10;
constexpr size_t LARGE_BLOCK = size_t(1) << 20;
} // namespace

void *table_arena::cfg_malloc(size_t s) {
    size_t need = round8(s ? s : 1);
    if (need <= chunk_left_) {
        void *p = chunk_next_;
        chunk_next_ += need;
        chunk_left_ -= need;
        return p;
    }
    size_t block = need > OWN_BLOCK ? need : CHUNK;
    void *p = std::calloc(1, block);
    if (!p) {
        int e = errno;
        raise_fatal(msg::out_of_memory, 0, {std::strerror(e)}, e);
    }
    blocks_.emplace_back(p);
    if (block == CHUNK) {
        chunk_next_ = static_cast<char *>(p) + need;
        chunk_left_ = CHUNK - need;
    }
    return p;
}

tbl *table_arena::new_tbl(const char *name, size_t au) {
    tbl *t;
    if (!free_tbls_.empty()) {
        t = free_tbls_.back();
        free_tbls_.pop_back();
    } else {
        t = &tables_.emplace_back();
    }
    t->tbl_au = au;
    t->tbl_name = name;
    return t;
}

// A source of many small records then holds no table objects it does not use.
void table_arena::release_if_empty(cdb_ref_t &ref) {
    tbl *t = static_cast<tbl *>(ref.ptr);
    if (!t || tbl_used(t))
        return;
    t->release();
    free_tbls_.push_back(t);
    ref.ptr = nullptr;
}

// Makes sure the block holds at least `need` bytes, moving it if it must.
static bool reserve_block(tbl *t, size_t need) {
    if (need <= t->tbl_cap)
        return true;
    size_t cap = std::max(t->tbl_cap, MIN_BLOCK);
    while (cap < need)
        cap = cap < (size_t(1) << 62) ? cap * 2 : need;
    // A table that has grown large jumps to a block that the allocator maps
    // on its own, which then grows without being copied.
    if (cap > LARGE_TABLE)
        cap = std::max(cap, LARGE_BLOCK);
    char *nb = static_cast<char *>(std::realloc(t->tbl_base, cap));
    if (!nb)
        return false;
    size_t used = t->tbl_next - t->tbl_base;
    t->tbl_base = nb;
    t->tbl_next = nb + used;
    t->tbl_cap = cap;
    return true;
}

// Tables keep growing in whole allocation units, as the traces report them,
// but hold only the room their items use.
void *table_arena::alloc_tble(tbl *t, size_t s) {
    bool trace = trace_.level > 2;
    if (trace)
        std::fprintf(trace_.out, "alloc_tble: %s, structure size: %d\n", t->tbl_name, int(s));
    if (!t->tbl_base) {
        t->tbl_size = 0;
        if (!reserve_block(t, std::max<size_t>(s, 1))) { // a table always has a block
            int e = errno;
            raise_fatal(msg::table_malloc, 0, {t->tbl_name, std::strerror(e)}, e);
        }
        t->tbl_size = t->tbl_au;
        t->tbl_next = t->tbl_base;
        if (trace)
            std::fprintf(trace_.out, "alloc_tble: %s, table size: %d\n", t->tbl_name, int(t->tbl_size));
    }
    size_t used = size_t(t->tbl_next - t->tbl_base);
    if (s >= t->tbl_size - used) {
        // Grow by whole units, enough for the request alone; an exact fit grows too.
        size_t incr = s == 0 ? t->tbl_au : t->tbl_au * ((s + t->tbl_au - 1) / t->tbl_au);
        if (trace)
            std::fprintf(trace_.err, "alloc_tble: overflow by %d b. Adding %d b to %s\n", int(s), int(incr),
                         t->tbl_name);
        t->tbl_size += incr;
        if (trace)
            std::fprintf(trace_.out, "alloc_tble: %s, new table size: %d\n", t->tbl_name, int(t->tbl_size));
    }
    if (!reserve_block(t, used + s)) {
        int e = errno;
        raise_fatal(msg::table_realloc, 0, {t->tbl_name, std::strerror(e)}, e);
    }
    // Items are handed out zero-filled; the room behind them is left untouched.
    char *item = t->tbl_next;
    std::memset(item, 0, s);
    t->tbl_next += s;
    return item;
}

void memcpy_8_rounded(void *dst, const void *src, size_t len) {
    if (len == 0)
        return;
    std::memcpy(dst, src, len);
    std::memset(static_cast<char *>(dst) + len, 0, round8(len) - len);
}

zu_uint32_t table_arena::add_to_tbl(tbl *tp, const void *val, size_t len) {
    size_t rounded = round8(len);
    char *p = static_cast<char *>(alloc_tble(tp, rounded));
    memcpy_8_rounded(p, val, len);
    return zu_uint32_t(p - tp->tbl_base);
}
