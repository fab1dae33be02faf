// The walker's basics, the header, the anchors and the manager, map and
// variable-class dsects.
#include <algorithm>
#include <cstdint>
#include <cstring>
#include <utility>

#include "cdb.h"
#include "cdb_names.h"
#include "cdb_read.h"
#include "cdb_walker.h"

namespace cdbdump {

namespace {
// Thrown by the one reading function; every read is checked before it is
// made, so this only guards against a check that was forgotten.
struct read_past_end {
    size_t off;
};

const char *const size_fields[NUM_RECORD_SIZES] = {
    "cdb_hdr_rsrc_class_size",          "cdb_hdr_rsrc_cmmap_size", "cdb_hdr_rsrc_mgr_size",
    "cdb_hdr_rsrc_variable_class_size", "cdb_hdr_rsrc_pattr_size", "cdb_hdr_rsrc_dattr_size",
    "cdb_hdr_rsrc_action_size",         "cdb_hdr_rsrc_error_size", "cdb_hdr_rsrc_depend_size",
};

// Position of a dsect type in the order the file keeps them: classes, the
// manager, the map, the variable classes.
int dsect_rank(uint32_t type) {
    switch (type) {
    case CDB_DSECT_CLASS: return 0;
    case CDB_DSECT_RSRC_MGR: return 1;
    case CDB_DSECT_CMMAP: return 2;
    case CDB_DSECT_VAR_CLASS: return 3;
    default: return -1;
    }
}

std::string id_text(uint32_t id) {
    std::string s = hex(id);
    if ((id >> 8) == 0x434442)
        s += std::string(" (\"CDB") + char(id & 0xff) + "\")";
    return s;
}
} // namespace

const uint16_t record_sizes[NUM_RECORD_SIZES] = {
    sizeof(rsrc_class_t),          sizeof(rsrc_cmmap_t), sizeof(rsrc_mgr_t),
    sizeof(rsrc_variable_class_t), sizeof(rsrc_pattr_t), sizeof(rsrc_dattr_t),
    sizeof(rsrc_action_t),         sizeof(rsrc_error_t), sizeof(rsrc_depend_t),
};

// ---------------------------------------------------------------------------
// Basics

uint64_t walker::get(size_t off, unsigned width) const {
    if (!(off <= n_ && width <= n_ - off))
        throw read_past_end{off};
    uint64_t v = 0;
    for (unsigned i = 0; i < width; i++)
        v |= uint64_t(d_[off + i]) << (big_ ? 8 * (width - 1 - i) : 8 * i);
    return v;
}

bool walker::check(bool ok, size_t off, const std::string &what) {
    if (ok)
        return true;
    if (!annotating_)
        throw cdb_invalid(off, what);
    violations_++;
    if (in_window(off))
        spans_.push_back(span{off, 0, "", what, true});
    return false;
}

void walker::emit(size_t off, size_t len, std::string field, std::string value) {
    if (annotating_ && in_window(off))
        spans_.push_back(span{off, len, std::move(field), std::move(value), false});
}

uint64_t walker::num(size_t off, unsigned width, const std::string &field) {
    uint64_t v = get(off, width);
    if (annotating_)
        emit(off, width, field, hexdec(v));
    return v;
}

bool walker::expect_id(size_t off, uint32_t id, const std::string &field) {
    uint32_t v = uint32_t(get(off, 4));
    emit(off, 4, field, id_text(v));
    return check(v == id, off, field + " is " + id_text(v) + ", expected " + id_text(id));
}

uint32_t walker::ref(size_t off, const std::string &field) {
    uint32_t high = uint32_t(get(off + 4, 4));
    check(high == 0, off + 4, field + ": offset[1] is " + hex(high) + ", expected 0");
    return uint32_t(get(off, 4));
}

bool walker::claimed(size_t off, size_t len) const {
    auto it = claims_.lower_bound(off + len);
    if (it == claims_.begin())
        return false;
    --it; // the last claim that starts before the end; claims never overlap each other
    return it->second > off;
}

bool walker::claim(size_t off, size_t len, size_t at, const std::string &what) {
    if (!check(!claimed(off, len), at,
               what + " at " + hex(off) + " overlaps a list or value body already reached; each is referred to once"))
        return false;
    claims_[off] = off + len;
    return true;
}

std::optional<std::string> walker::string_at(const region &r, uint32_t off, size_t at, const std::string &field) {
    if (!check(off < r.len, at,
               field + ": offset " + hex(off) + " is outside " + r.name + " (" + std::to_string(r.len) + " bytes)"))
        return std::nullopt;
    size_t start = r.base + off;
    auto known = string_lengths_.find(start);
    if (known != string_lengths_.end())
        return std::string(reinterpret_cast<const char *>(d_ + start), known->second);
    const void *nul = std::memchr(d_ + start, 0, r.len - off);
    if (!check(nul != nullptr, at,
               field + ": the string at " + r.name + "+" + hex(off) + " is not terminated inside the table"))
        return std::nullopt;
    size_t len = size_t(static_cast<const uint8_t *>(nul) - (d_ + start));
    string_lengths_[start] = len;
    std::string s(reinterpret_cast<const char *>(d_ + start), len);
    emit(start, len + 1, "string of " + field, c_quote(s));
    return s;
}

std::optional<std::string> walker::string_ref(size_t at, const region &r, const std::string &field, bool none_allowed) {
    uint32_t off = ref(at, field);
    if (off == CDB_NONE) {
        emit(at, 8, field, "none");
        check(none_allowed, at, field + " holds the none marker but must name a string");
        return std::nullopt;
    }
    auto s = string_at(r, off, at, field);
    emit(at, 8, field, hex(off) + " -> " + (s ? c_quote(*s) : std::string("?")));
    return s;
}

// A string that a required statement sets, which the compiler does not
// enforce: without the statement the field keeps 0 in a table that holds
// nothing.
std::optional<std::string> walker::unset_string_ref(size_t at, const region &r, const std::string &field) {
    uint32_t off = uint32_t(get(at, 4));
    if (off == 0 && r.len == 0) {
        ref(at, field);
        emit(at, 8, field, "0 (no string)");
        return std::nullopt;
    }
    return string_ref(at, r, field, true);
}

// ---------------------------------------------------------------------------
// Header and anchors

bool walker::detect_order() {
    big_ = true;
    uint32_t as_big = uint32_t(get(8, 4));
    big_ = false;
    uint32_t as_little = uint32_t(get(8, 4));
    if (as_little == CDB_FORMAT || as_big == CDB_FORMAT) {
        big_ = as_little != CDB_FORMAT;
        emit(8, 4, "header.cdb_hdr_format", hex(CDB_FORMAT) + (big_ ? " (big-endian)" : " (little-endian)"));
        return true;
    }
    emit(8, 4, "header.cdb_hdr_format", hex(as_little) + " (unknown; read as little-endian)");
    return check(false, 8,
                 "the format word reads " + hex(as_little) + " little-endian and " + hex(as_big) + " big-endian, not " +
                     hex(CDB_FORMAT) + " in either byte order");
}

void walker::walk_header(cdb_file &f) {
    f.big_endian = big_;
    f.length = uint32_t(num(0, 4, "header.cdb_hdr_length"));
    check(n_ % 4 == 0, 0, "the file size " + std::to_string(n_) + " is not a multiple of 4");
    check(f.length == n_ - 4, 0,
          "cdb_hdr_length is " + std::to_string(f.length) + ", but the file has " + std::to_string(n_ - 4) +
              " bytes after the length field");
    f.checksum = uint32_t(get(4, 4));
    uint32_t sum = cdb_checksum(uint32_t(n_ - 4), [&](size_t off) { return uint32_t(get(off, 4)); });
    emit(4, 4, "header.cdb_hdr_checksum",
         hex(f.checksum) + (sum == f.checksum ? " (matches)" : " (computed " + hex(sum) + ")"));
    check(sum == f.checksum, 4,
          "the checksum " + hex(f.checksum) + " does not match " + hex(sum) +
              ", the XOR of the length and of every word after the checksum");
    f.seqno = uint32_t(num(12, 4, "header.cdb_hdr_seqno"));
    f.tv_sec = uint32_t(num(16, 4, "header.cdb_hdr_timestamp.tv_sec"));
    f.tv_usec = uint32_t(num(20, 4, "header.cdb_hdr_timestamp.tv_usec"));
    f.max_rm_id = uint16_t(num(28, 2, "header.cdb_hdr_max_rm_id"));
    f.max_class_id = uint16_t(num(30, 2, "header.cdb_hdr_max_class_id"));
    for (int i = 0; i < NUM_RECORD_SIZES; i++) {
        size_t off = 32 + 2 * size_t(i);
        f.record_sizes[i] = uint16_t(num(off, 2, std::string("header.") + size_fields[i]));
        check(f.record_sizes[i] == record_sizes[i], off,
              std::string(size_fields[i]) + " is " + std::to_string(f.record_sizes[i]) + ", expected " +
                  std::to_string(record_sizes[i]));
    }
    emit(50, 30, "header.cdb_hdr_spares", "");
}

std::vector<bool> walker::walk_anchors(cdb_file &f) {
    uint32_t count = uint32_t(num(24, 4, "header.cdb_hdr_dsect_count"));
    size_t room = (n_ - CDB_HEADER_SIZE) / CDB_ANCHOR_SIZE;
    check(count <= room, 24,
          "cdb_hdr_dsect_count is " + std::to_string(count) + ", but only " + std::to_string(room) +
              " anchors fit in the file");
    size_t n = std::min<size_t>(count, room);
    std::vector<bool> walkable(n, false);
    size_t prev_end = CDB_HEADER_SIZE + CDB_ANCHOR_SIZE * n;
    int last_rank = 0;
    int per_rank[4] = {0, 0, 0, 0};
    for (size_t i = 0; i < n; i++) {
        size_t at = CDB_HEADER_SIZE + CDB_ANCHOR_SIZE * i;
        std::string path = "anchor[" + std::to_string(i) + "]";
        anchor a;
        a.type = uint32_t(get(at, 4));
        emit(at, 4, path + ".cda_type", std::to_string(a.type) + " (" + dsect_kind_name(a.type) + ")");
        a.offset = uint32_t(num(at + 4, 4, path + ".cda_offset"));
        a.length = uint32_t(num(at + 8, 4, path + ".cda_length"));
        a.revision = uint32_t(num(at + 12, 4, path + ".cda_revision"));
        f.anchors.push_back(a);
        int rank = dsect_rank(a.type);
        bool known = check(rank >= 0, at,
                           path + ": dsect type " + std::to_string(a.type) +
                               " is not one this reader knows (3 manager, 4 variable class, 5 class, 6 map)");
        if (known) {
            check(rank >= last_rank && !(rank == last_rank && (rank == 1 || rank == 2)), at,
                  path + ": a " + dsect_kind_name(a.type) +
                      " dsect out of order; the order is classes, one manager, one map, variable classes");
            last_rank = std::max(last_rank, rank);
            per_rank[rank]++;
        }
        bool after = check(a.offset >= prev_end, at + 4,
                           path + ": the dsect at " + std::to_string(a.offset) + " starts before " +
                               std::to_string(prev_end) + ", the end of what precedes it");
        bool inside = check(a.length <= n_ && a.offset <= n_ - a.length, at + 8,
                            path + ": the dsect at " + std::to_string(a.offset) + " of " + std::to_string(a.length) +
                                " bytes runs past the end of the file (" + std::to_string(n_) + " bytes)");
        if (inside)
            prev_end = std::max<size_t>(prev_end, size_t(a.offset) + a.length);
        walkable[i] = known && after && inside;
    }
    check(per_rank[0] >= 1 && per_rank[1] == 1 && per_rank[2] == 1, 24,
          "the file has " + std::to_string(per_rank[0]) + " class, " + std::to_string(per_rank[1]) + " manager and " +
              std::to_string(per_rank[2]) + " map dsects; it needs at least one class, one manager and one map");
    return walkable;
}

void walker::walk_dsects(cdb_file &f, const std::vector<bool> &walkable) {
    for (size_t i = 0; i < walkable.size(); i++) {
        const anchor &a = f.anchors[i];
        if (!walkable[i] || a.offset >= window_end_ || size_t(a.offset) + a.length < window_start_)
            continue;
        pass_spans(a.offset);
        // A dsect's lists, bodies and strings lie inside it, and dsects do not overlap.
        claims_.clear();
        string_lengths_.clear();
        std::string path = "dsect[" + std::to_string(i) + "]";
        try {
            switch (a.type) {
            case CDB_DSECT_CLASS: keep(f, walk_class(a, path)); break;
            case CDB_DSECT_RSRC_MGR: keep(f, walk_manager(a, path)); break;
            case CDB_DSECT_CMMAP: keep(f, walk_map(a, path)); break;
            default: keep(f, walk_var_class(a, path)); break;
            }
        } catch (const read_past_end &e) {
            check(false, e.off, path + ": a read past the end of the file");
        }
    }
}

void walker::keep(cdb_file &f, dsect d) {
    if (auto *m = std::get_if<mgr_dsect>(&d))
        maxima_.rm_id = std::max(maxima_.rm_id, m->id);
    if (auto *c = std::get_if<class_dsect>(&d))
        maxima_.class_id = std::max(maxima_.class_id, c->class_id);
    if (each_)
        each_(maxima_.walked, std::move(d));
    else
        f.dsects.push_back(std::move(d));
    maxima_.walked++;
}

void walker::pass_spans(size_t below) {
    if (each_spans_)
        each_spans_(std::exchange(spans_, {}), below);
}

void walker::check_maxima(const cdb_file &f, const dsect_maxima &m) {
    if (m.walked != f.anchors.size())
        return;
    check(f.max_rm_id == m.rm_id, 28,
          "cdb_hdr_max_rm_id is " + std::to_string(f.max_rm_id) + ", but the largest manager id is " +
              std::to_string(m.rm_id));
    check(f.max_class_id == m.class_id, 30,
          "cdb_hdr_max_class_id is " + std::to_string(f.max_class_id) + ", but the largest class id is " +
              std::to_string(m.class_id));
}

cdb_file walker::run() {
    cdb_file f;
    if (!check(n_ >= CDB_HEADER_SIZE, 0,
               "the file has " + std::to_string(n_) + " bytes, fewer than the " + std::to_string(CDB_HEADER_SIZE) +
                   " of a header")) {
        emit(0, n_, "truncated header", "");
        pass_spans(n_);
        return f;
    }
    try {
        detect_order();
        walk_header(f);
        std::vector<bool> walkable = walk_anchors(f);
        if (known_maxima_)
            check_maxima(f, *known_maxima_);
        walk_dsects(f, walkable);
        if (!known_maxima_)
            check_maxima(f, maxima_);
    } catch (const read_past_end &e) {
        check(false, e.off, "a read past the end of the file");
    }
    pass_spans(SIZE_MAX);
    return f;
}

annotation walker::take_annotation() {
    annotation a;
    a.big_endian = big_;
    a.spans = std::move(spans_);
    a.violations = violations_;
    return a;
}

// ---------------------------------------------------------------------------
// Manager, map and variable class

// The record that opens a dsect: long enough, with its identifier word.
bool walker::dsect_record(const anchor &a, size_t size, uint32_t id, const char *kind, const std::string &path,
                          const char *id_field) {
    if (!check(a.length >= size, a.offset,
               path + ": a " + kind + " dsect of " + std::to_string(a.length) + " bytes is shorter than its record"))
        return false;
    expect_id(a.offset, id, path + "." + id_field);
    return true;
}

mgr_dsect walker::walk_manager(const anchor &a, const std::string &path) {
    mgr_dsect m;
    size_t b = a.offset;
    if (!dsect_record(a, sizeof(rsrc_mgr_t), RSRC_MGR_ID, "manager", path, "rm_cb_ID"))
        return m;
    m.id = uint16_t(num(b + offsetof(rsrc_mgr_t, rm_id), 2, path + ".rm_id"));
    num(b + offsetof(rsrc_mgr_t, rm_spare), 2, path + ".rm_spare");
    region strings{b + sizeof(rsrc_mgr_t), a.length - sizeof(rsrc_mgr_t), "ManagerStrings"};
    size_t tbl_at = b + offsetof(rsrc_mgr_t, u_rm_strings_table);
    uint32_t tbl = ref(tbl_at, path + ".u_rm_strings_table");
    emit(tbl_at, 8, path + ".u_rm_strings_table", hex(tbl) + " -> ManagerStrings at " + hex(strings.base));
    check(tbl == 0, tbl_at,
          path + ".u_rm_strings_table is " + hex(tbl) + "; the strings follow the record, so it must be 0");
    m.name = string_ref(b + offsetof(rsrc_mgr_t, u_rm_RMname), strings, path + ".u_rm_RMname", false).value_or("");
    return m;
}

map_dsect walker::walk_map(const anchor &a, const std::string &path) {
    map_dsect m;
    size_t b = a.offset;
    if (!dsect_record(a, sizeof(rsrc_cmmap_t), RSRC_CMMAP_ID, "map", path, "rcm_cb_ID"))
        return m;
    m.class_id = uint16_t(num(b + offsetof(rsrc_cmmap_t, rcm_class_ID), 2, path + ".rcm_class_ID"));
    m.rm_id = uint16_t(num(b + offsetof(rsrc_cmmap_t, rcm_rm_ID), 2, path + ".rcm_rm_ID"));
    region strings{b + sizeof(rsrc_cmmap_t), a.length - sizeof(rsrc_cmmap_t), "CMMapStrings"};
    size_t tbl_at = b + offsetof(rsrc_cmmap_t, u_rcm_strings);
    uint32_t tbl = ref(tbl_at, path + ".u_rcm_strings");
    emit(tbl_at, 8, path + ".u_rcm_strings", hex(tbl) + " -> CMMapStrings at " + hex(strings.base));
    check(tbl == sizeof(rsrc_cmmap_t), tbl_at,
          path + ".u_rcm_strings is " + hex(tbl) + "; the strings follow the record, so it must be 60");
    m.message_catalog = unset_string_ref(b + offsetof(rsrc_cmmap_t, u_rcm_msg_file), strings, path + ".u_rcm_msg_file");
    uint16_t *const shorts[] = {&m.dscr_msg_set, &m.first_key, &m.last_key,  &m.asnno_start,
                                &m.num_sctx,     &m.num_vctx,  &m.num_stats, &m.num_ctx_tmplts};
    const char *const short_names[] = {"rcm_dscr_msg_set", "rcm_first_key", "rcm_last_key",  "rcm_asnno_start",
                                       "rcm_num_sctx",     "rcm_num_vctx",  "rcm_num_stats", "rcm_num_ctx_tmplts"};
    for (size_t i = 0; i < 8; i++)
        *shorts[i] =
            uint16_t(num(b + offsetof(rsrc_cmmap_t, rcm_dscr_msg_set) + 2 * i, 2, path + "." + short_names[i]));
    uint32_t *const words[] = {&m.static_contexts, &m.volatile_contexts, &m.stats, &m.ctx_tmplts};
    const char *const word_names[] = {"rcm_static_contexts", "rcm_volatile_contexts", "rcm_stats", "rcm_ctx_tmplts"};
    for (size_t i = 0; i < 4; i++)
        *words[i] =
            uint32_t(num(b + offsetof(rsrc_cmmap_t, rcm_static_contexts) + 4 * i, 4, path + "." + word_names[i]));
    emit(b + offsetof(rsrc_cmmap_t, rcm_reserved), 4, path + ".rcm_reserved", "");
    return m;
}

var_class_dsect walker::walk_var_class(const anchor &a, const std::string &path) {
    var_class_dsect v;
    size_t b = a.offset;
    const size_t rec = sizeof(rsrc_variable_class_t);
    if (!dsect_record(a, rec, RSRC_VARIABLE_CLASS_ID, "variable-class", path, "rvc_cb_ID"))
        return v;
    v.obsv_interval =
        uint16_t(num(b + offsetof(rsrc_variable_class_t, rvc_obsv_interval), 2, path + ".rvc_obsv_interval"));
    v.report_interval =
        uint16_t(num(b + offsetof(rsrc_variable_class_t, rvc_report_interval), 2, path + ".rvc_report_interval"));
    size_t room = a.length - rec;
    size_t tbl_at = b + offsetof(rsrc_variable_class_t, u_rvc_string_tbl);
    uint32_t strings_len = ref(tbl_at, path + ".u_rvc_string_tbl");
    emit(tbl_at, 8, path + ".u_rvc_string_tbl",
         std::to_string(strings_len) + " bytes of VarClassStrings; the IDs follow at " + hex(b + rec + strings_len));
    if (!check(strings_len % 8 == 0 && strings_len <= room, tbl_at,
               path + ".u_rvc_string_tbl: a string table of " + std::to_string(strings_len) +
                   " bytes must be a multiple of 8 and fit in the " + std::to_string(room) + " bytes after the record"))
        strings_len = 0;
    region strings{b + rec, strings_len, "VarClassStrings"};
    v.name = unset_string_ref(b + offsetof(rsrc_variable_class_t, u_rvc_name), strings, path + ".u_rvc_name");
    v.alias =
        string_ref(b + offsetof(rsrc_variable_class_t, u_rvc_compat_name), strings, path + ".u_rvc_compat_name", true);
    size_t count_at = b + offsetof(rsrc_variable_class_t, rvc_var_count);
    uint32_t count = uint32_t(num(count_at, 4, path + ".rvc_var_count"));
    size_t id_room = room - strings_len;
    bool fit = check(count <= id_room / 4, count_at,
                     path + ".rvc_var_count is " + std::to_string(count) + ", but only " + std::to_string(id_room / 4) +
                         " IDs fit after the strings");
    if (fit) {
        check(round8(4 * size_t(count)) == id_room, b,
              path + ": the dsect is " + std::to_string(a.length) + " bytes, but a record, " +
                  std::to_string(strings_len) + " bytes of strings and " + std::to_string(count) +
                  " IDs rounded to 8 make " + std::to_string(rec + strings_len + round8(4 * size_t(count))));
        for (uint32_t i = 0; i < count; i++)
            v.var_ids.push_back(
                uint32_t(num(b + rec + strings_len + 4 * size_t(i), 4, path + ".var_ids[" + std::to_string(i) + "]")));
    }
    emit(b + offsetof(rsrc_variable_class_t, rvc_reserved), 4, path + ".rvc_reserved", "");
    return v;
}

// ---------------------------------------------------------------------------
// Entries

// A file the library's check accepts is read through the library; any other
// is walked, which finds and names its first violation.
cdb_file verify(const uint8_t *data, size_t size) { return verify_each(data, size, nullptr); }

cdb_file verify_each(const uint8_t *data, size_t size, const dsect_consumer &each) {
    cdb_file f;
    if (read_checked(data, size, f, each))
        return f;
    walker w(data, size, false);
    if (each)
        w.hand_dsects_to(each);
    return w.run();
}

annotation annotate_walk(const uint8_t *data, size_t size) {
    walker w(data, size, true);
    w.run();
    return w.take_annotation();
}

// The listing must come in file order, but the walk reaches bodies after the
// records that refer to them. So after a first walk, which keeps nothing but
// finds the largest ids, the file is listed window by window: each walk
// keeps the spans that start in its window only, and walks only the dsects
// that reach into it.
size_t annotate_each(const uint8_t *data, size_t size, bool &big_endian, const span_consumer &each, size_t window) {
    walker first(data, size, true);
    first.hand_spans_to([](std::vector<span> &&, size_t) {});
    first.hand_dsects_to([](size_t, dsect &&) {});
    big_endian = first.run().big_endian;
    size_t violations = first.take_annotation().violations;
    for (size_t start = 0;; start += window) {
        walker w(data, size, true);
        bool last = size - start <= window;
        w.set_window(start, last ? SIZE_MAX : start + window);
        w.know_maxima(first.maxima());
        w.hand_dsects_to([](size_t, dsect &&) {});
        w.hand_spans_to(each);
        w.run();
        if (last)
            break;
    }
    return violations;
}

} // namespace cdbdump
