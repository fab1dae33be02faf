// Growable tables: named, zero-filled blocks to which items are only appended
// and which are referred to by offsets, because a block moves when it grows.
#include <cerrno>
#include <algorithm>
#include <cstdlib>
#include <new>

#include "qecfg_context.h"

namespace {
constexpr size_t CHUNK = size_t(1) << 20;
constexpr size_t OWN_BLOCK = CHUNK / 16; // larger requests get a block of their own
constexpr size_t MIN_BLOCK = 16;
constexpr size_t LARGE_TABLE = size_t(32) << 10;
constexpr size_t LARGE_BLOCK = size_t(1) << 20;
} // namespace

void *qecfg_context::cfg_malloc(size_t s) {
    size_t need = round8(s ? s : 1);
    if (need <= chunk_left) {
        void *p = chunk_next;
        chunk_next += need;
        chunk_left -= need;
        return p;
    }
    size_t block = need > OWN_BLOCK ? need : CHUNK;
    void *p = std::calloc(1, block);
    if (!p) {
        int e = errno;
        raise_fatal(msg::out_of_memory, 0, {std::strerror(e)}, e);
    }
    owned_blocks.push_back(p);
    if (block == CHUNK) {
        chunk_next = static_cast<char *>(p) + need;
        chunk_left = CHUNK - need;
    }
    return p;
}

tbl *qecfg_context::new_tbl(const char *name, size_t au) {
    tbl *t;
    if (!free_tbls.empty()) {
        t = free_tbls.back();
        free_tbls.pop_back();
        *t = tbl{};
    } else {
        t = new (cfg_malloc(sizeof(tbl))) tbl{};
        owned_tbls.push_back(t);
    }
    t->tbl_au = au;
    t->tbl_name = name;
    return t;
}

// A completed record's empty table is given back for new_tbl to reuse; its
// reference becomes null, which the builder takes as an empty table. A
// source of many small records then holds no table objects it does not use.
void qecfg_context::release_if_empty(cdb_ref_t &ref) {
    tbl *t = static_cast<tbl *>(ref.ptr);
    if (!t || tbl_used(t))
        return;
    std::free(t->tbl_base);
    *t = tbl{};
    free_tbls.push_back(t);
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
void *qecfg_context::alloc_tble(tbl *t, size_t s) {
    bool trace = opt.debugLevel > 2;
    if (trace)
        QECFG_TRACE(*this, "alloc_tble: %s, structure size: %d\n", t->tbl_name, int(s));
    if (!t->tbl_base) {
        t->tbl_size = 0;
        if (!reserve_block(t, std::max<size_t>(s, 1))) { // a table always has a block
            int e = errno;
            raise_fatal(msg::table_malloc, 0, {t->tbl_name, std::strerror(e)}, e);
        }
        t->tbl_size = t->tbl_au;
        t->tbl_next = t->tbl_base;
        if (trace)
            QECFG_TRACE(*this, "alloc_tble: %s, table size: %d\n", t->tbl_name, int(t->tbl_size));
    }
    size_t used = size_t(t->tbl_next - t->tbl_base);
    if (s >= t->tbl_size - used) {
        // Grow by whole units, enough for the request alone; an exact fit grows too.
        size_t incr = s == 0 ? t->tbl_au : t->tbl_au * ((s + t->tbl_au - 1) / t->tbl_au);
        if (trace)
            std::fprintf(opt.trace_err, "alloc_tble: overflow by %d b. Adding %d b to %s\n", int(s), int(incr),
                         t->tbl_name);
        t->tbl_size += incr;
        if (trace)
            QECFG_TRACE(*this, "alloc_tble: %s, new table size: %d\n", t->tbl_name, int(t->tbl_size));
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

zu_uint32_t qecfg_context::save_tbl_val_round(tbl *tp, const void *val, size_t len) {
    size_t rounded = round8(len);
    char *p = static_cast<char *>(alloc_tble(tp, rounded));
    memcpy_8_rounded(p, val, len);
    return zu_uint32_t(p - tp->tbl_base);
}

// Once a table's bytes are in the image, or a list is spent, its storage is
// given back; the table keeps its name and unit.
void qecfg_context::release_storage(tbl *t) {
    if (!t || !t->tbl_base)
        return;
    std::free(t->tbl_base);
    *t = tbl{nullptr, nullptr, 0, t->tbl_au, t->tbl_name, 0};
}
