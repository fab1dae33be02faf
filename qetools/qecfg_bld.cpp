// The image writer: the variable ID tables, the exact size, the image taken
// from the sink, the header, anchors and dsects laid into it, the checksum.
#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <sys/time.h>

#include "qecfg_bld.h"
#include "qecfg_swap.h"

namespace {

constexpr size_t MAX_TABLE_RECORDS = 65535;
constexpr uint64_t MAX_IMAGE = uint64_t(1) << 32;

const char *string_at(const tbl *t, uint32_t off) {
    return t && off < tbl_used(t) && std::memchr(t->tbl_base + off, '\0', tbl_used(t) - off) ? t->tbl_base + off
                                                                                             : nullptr;
}

tbl *ref_tbl(const char *rec, size_t field) { return ref_table(load<cdb_ref_t>(rec + field)); }

} // namespace

// ---------------------------------------------------------------------------
// Variable ID tables.

void cdb_writer::bld_var_id_tbls() {
    size_t n = tbl_used(&in->classes.t) / sizeof(rsrc_class_t);
    for (size_t i = 0; i < n; i++) {
        const char *rc = in->classes.t.tbl_base + i * sizeof(rsrc_class_t);
        const tbl *strings = ref_tbl(rc, offsetof(rsrc_class_t, u_rc_strings));
        const std::pair<size_t, uint32_t> kinds[] = {{offsetof(rsrc_class_t, u_rc_dattrsC), CDB_CLASS_VAR_ID_BIT},
                                                     {offsetof(rsrc_class_t, u_rc_dattrs), 0}};
        for (auto [field, id_bit] : kinds) {
            tbl *dattrs = ref_tbl(rc, field);
            size_t m = tbl_used(dattrs) / sizeof(rsrc_dattr_t);
            for (size_t j = 0; j < m; j++) {
                char *rec = dattrs->tbl_base + j * sizeof(rsrc_dattr_t);
                char *vclass = rec + offsetof(rsrc_dattr_t, u_ra_vclass);
                uint32_t off = load<uint32_t>(vclass);
                uint32_t id = uint32_t(load<int32_t>(rec + offsetof(rsrc_dattr_t, ra_attr_id))) | id_bit;
                const char *name = off == CDB_NONE ? nullptr : string_at(strings, off);
                if (name)
                    add_varID_to_var_class(name, id);
                std::memset(vclass, 0, sizeof(cdb_ref_t));
            }
        }
    }
}

void cdb_writer::add_varID_to_var_class(const char *srch_name, uint32_t varID) {
    if (var_class_index.empty()) {
        // The first variable class of a name wins; unnamed ones match nothing.
        size_t n = tbl_used(&in->var_classes.t) / sizeof(rsrc_variable_class_t);
        for (size_t i = 0; i < n; i++) {
            const char *rec = in->var_classes.t.tbl_base + i * sizeof(rsrc_variable_class_t);
            const tbl *strings = ref_tbl(rec, offsetof(rsrc_variable_class_t, u_rvc_string_tbl));
            const char *name =
                in->var_class_named[i]
                    ? string_at(strings, load<uint32_t>(rec + offsetof(rsrc_variable_class_t, u_rvc_name)))
                    : nullptr;
            if (name)
                var_class_index.emplace(name, uint32_t(i * sizeof(rsrc_variable_class_t)));
        }
        var_class_index.emplace("", CDB_NONE); // marks the index as built
    }
    auto it = var_class_index.find(srch_name);
    if (it == var_class_index.end() || it->second == CDB_NONE)
        return;
    char *rec = in->var_classes.t.tbl_base + it->second;
    tbl *ids = find_tbl_entry(rec);
    if (!ids) {
        ids = arena.new_tbl("VariableIDs", 64);
        var_id_tbls.emplace(it->second, ids);
    }
    store<uint32_t>(arena.alloc_tble(ids, sizeof varID), varID);
    char *count = rec + offsetof(rsrc_variable_class_t, rvc_var_count);
    store<uint32_t>(count, load<uint32_t>(count) + 1);
}

tbl *cdb_writer::find_tbl_entry(const void *rvcp) const {
    auto key = uint32_t(static_cast<const char *>(rvcp) - in->var_classes.t.tbl_base);
    auto it = var_id_tbls.find(key);
    return it == var_id_tbls.end() ? nullptr : it->second;
}

// ---------------------------------------------------------------------------
// Size.

size_t cdb_writer::cdb_size() {
    uint32_t dsect_count = in->maps.count + in->managers.count + in->var_classes.count + in->classes.count;
    uint64_t size = CDB_HEADER_SIZE + CDB_ANCHOR_SIZE * uint64_t(dsect_count);
    size_t nvc = tbl_used(&in->var_classes.t) / sizeof(rsrc_variable_class_t);
    for (size_t i = 0; i < nvc; i++) {
        const char *rec = in->var_classes.t.tbl_base + i * sizeof(rsrc_variable_class_t);
        uint32_t count = load<uint32_t>(rec + offsetof(rsrc_variable_class_t, rvc_var_count));
        size += sizeof(rsrc_variable_class_t) +
                round8(tbl_used(ref_tbl(rec, offsetof(rsrc_variable_class_t, u_rvc_string_tbl)))) +
                round8(4 * size_t(count));
    }
    size_t nmap = tbl_used(&in->maps.t) / sizeof(rsrc_cmmap_t);
    for (size_t i = 0; i < nmap; i++)
        size += sizeof(rsrc_cmmap_t) + round8(tbl_used(ref_tbl(in->maps.t.tbl_base + i * sizeof(rsrc_cmmap_t),
                                                               offsetof(rsrc_cmmap_t, u_rcm_strings))));
    size_t nmgr = tbl_used(&in->managers.t) / sizeof(rsrc_mgr_t);
    for (size_t i = 0; i < nmgr; i++)
        size += sizeof(rsrc_mgr_t) + round8(tbl_used(ref_tbl(in->managers.t.tbl_base + i * sizeof(rsrc_mgr_t),
                                                             offsetof(rsrc_mgr_t, u_rm_strings_table))));
    size_t ncl = tbl_used(&in->classes.t) / sizeof(rsrc_class_t);
    for (size_t i = 0; i < ncl; i++)
        size += class_dsect_size(reinterpret_cast<rsrc_class_t *>(in->classes.t.tbl_base + i * sizeof(rsrc_class_t)));
    if (size >= MAX_IMAGE)
        raise_fatal(msg::image_too_large, 0);
    return size_t(size);
}

// Stores the counts and table sizes into the class record and returns the
// length of its dsect.
uint64_t cdb_writer::class_dsect_size(rsrc_class_t *rc) {
    auto records = [&](const cdb_ref_t &ref, size_t rec_size) -> uint16_t {
        const tbl *t = static_cast<const tbl *>(ref.ptr);
        size_t n = tbl_used(t) / rec_size;
        if (n > MAX_TABLE_RECORDS)
            raise_fatal(msg::too_many_records, 0, {t->tbl_name});
        return uint16_t(n);
    };
    auto bytes = [](const cdb_ref_t &ref) { return tbl_used(static_cast<const tbl *>(ref.ptr)); };
    rc->rc_num_pattrsC = records(rc->u_rc_pattrsC, sizeof(rsrc_pattr_t));
    rc->rc_num_pattrs = records(rc->u_rc_pattrs, sizeof(rsrc_pattr_t));
    rc->rc_num_dattrsC = records(rc->u_rc_dattrsC, sizeof(rsrc_dattr_t));
    rc->rc_num_dattrs = records(rc->u_rc_dattrs, sizeof(rsrc_dattr_t));
    rc->rc_num_actionsC = records(rc->u_rc_actionsC, sizeof(rsrc_action_t));
    rc->rc_num_actions = records(rc->u_rc_actions, sizeof(rsrc_action_t));
    uint64_t sd = bytes(rc->u_rc_sd_defs), vl = bytes(rc->u_rc_variety_lists), vv = bytes(rc->u_rc_valid_vals);
    uint64_t strings = round8(bytes(rc->u_rc_strings));
    rc->rc_sd_size = uint32_t(sd);
    rc->rc_varlist_size = uint32_t(vl);
    rc->rc_valval_size = uint32_t(vv);
    return sizeof(rsrc_class_t) + sizeof(rsrc_pattr_t) * uint64_t(rc->rc_num_pattrs + rc->rc_num_pattrsC) +
           sizeof(rsrc_dattr_t) * uint64_t(rc->rc_num_dattrs + rc->rc_num_dattrsC) +
           sizeof(rsrc_action_t) * uint64_t(rc->rc_num_actions + rc->rc_num_actionsC) + sd + vl + vv + strings;
}

// ---------------------------------------------------------------------------
// The output file.

cdb_writer::cdb_writer(table_arena &arena, image_target target, bool reverse_byte_order)
    : arena(arena), target(std::move(target)), reverse(reverse_byte_order) {}

// A failed write leaves nothing of its image behind.
cdb_writer::~cdb_writer() {
    if (image_pending)
        sink->abandon();
}

[[noreturn]] void cdb_writer::output_failed(const sink_failure &f) {
    raise_fatal(f.id, 0, {f.reason.empty() ? std::string_view(std::strerror(f.err)) : std::string_view(f.reason)});
}

char *cdb_writer::acquire_image(size_t cdb_file_size) {
    sink = target.given;
    if (!sink) {
        own_sink = make_file_sink(target.path, target.source);
        sink = own_sink.get();
    }
    image_pending = true;
    try {
        return sink->acquire(cdb_file_size);
    } catch (const sink_failure &f) {
        output_failed(f);
    }
}

// ---------------------------------------------------------------------------
// Dsects.

void cdb_writer::begin_dsect(cdb_dsect_type_t type) {
    cdb_dsect_anchor_t a{type, uint32_t(dsp - chp), 0, 0};
    std::memcpy(chp + CDB_HEADER_SIZE + CDB_ANCHOR_SIZE * dsect_idx, &a, sizeof a);
}

void cdb_writer::grow_dsect(size_t len) {
    char *a = chp + CDB_HEADER_SIZE + CDB_ANCHOR_SIZE * dsect_idx + offsetof(cdb_dsect_anchor_t, cda_length);
    store<uint32_t>(a, load<uint32_t>(a) + uint32_t(len));
    dsp += len;
}

// Starts the dsect of one record: its anchor, then the record itself.
char *cdb_writer::copy_record(cdb_dsect_type_t type, const char *src, size_t size) {
    begin_dsect(type);
    char *rec = dsp;
    std::memcpy(rec, src, size);
    grow_dsect(size);
    return rec;
}

// Copies a table behind the record and points the record's reference at it.
void cdb_writer::copy_table(char *rec, size_t ref_field, tbl *t, bool rounded) {
    cdb_ref_t ref{};
    ref.offset[0] = uint32_t(dsp - rec);
    std::memcpy(rec + ref_field, &ref, sizeof ref);
    size_t len = tbl_used(t);
    if (rounded)
        memcpy_8_rounded(dsp, len ? t->tbl_base : nullptr, len);
    else if (len)
        std::memcpy(dsp, t->tbl_base, len);
    grow_dsect(rounded ? round8(len) : len);
    if (t)
        t->release();
}

void cdb_writer::add_rsrc_class_tbls() {
    size_t n = tbl_used(&in->classes.t) / sizeof(rsrc_class_t);
    if (!n)
        raise_fatal(msg::no_class_dsects, 0);
    static const size_t copied[] = {
        offsetof(rsrc_class_t, u_rc_pattrsC),       offsetof(rsrc_class_t, u_rc_dattrsC),
        offsetof(rsrc_class_t, u_rc_pattrs),        offsetof(rsrc_class_t, u_rc_dattrs),
        offsetof(rsrc_class_t, u_rc_actionsC),      offsetof(rsrc_class_t, u_rc_actions),
        offsetof(rsrc_class_t, u_rc_variety_lists), offsetof(rsrc_class_t, u_rc_sd_defs),
        offsetof(rsrc_class_t, u_rc_valid_vals),
    };
    for (size_t i = 0; i < n; i++) {
        const char *src = in->classes.t.tbl_base + i * sizeof(rsrc_class_t);
        char *rec = copy_record(CDB_DSECT_CLASS, src, sizeof(rsrc_class_t));
        for (size_t field : copied) {
            tbl *t = ref_tbl(src, field);
            if (field == offsetof(rsrc_class_t, u_rc_dattrsC) || field == offsetof(rsrc_class_t, u_rc_dattrs))
                note_numeric_ranges(t);
            copy_table(rec, field, t, false);
        }
        copy_table(rec, offsetof(rsrc_class_t, u_rc_strings), ref_tbl(src, offsetof(rsrc_class_t, u_rc_strings)), true);
        for (size_t empty : {offsetof(rsrc_class_t, u_rc_errors), offsetof(rsrc_class_t, u_rc_depends),
                             offsetof(rsrc_class_t, u_rc_sbs_defs)})
            std::memset(rec + empty, 0, sizeof(cdb_ref_t));
        uint16_t class_id = load<uint16_t>(rec + offsetof(rsrc_class_t, rc_class_id));
        if (class_id > hdr_max_class_id)
            hdr_max_class_id = class_id;
        dsect_idx++;
    }
}

// Records, by file offset, the dynamic attributes whose range holds numbers.
void cdb_writer::note_numeric_ranges(const tbl *t) {
    size_t n = tbl_used(t) / sizeof(rsrc_dattr_t);
    for (size_t j = 0; j < n; j++)
        if (in->numeric_ranges.count({t, j * sizeof(rsrc_dattr_t)}))
            numeric_range_offsets.insert(uint32_t(dsp - chp + j * sizeof(rsrc_dattr_t)));
}

void cdb_writer::add_rsrc_mgr_tbls() {
    size_t n = tbl_used(&in->managers.t) / sizeof(rsrc_mgr_t);
    if (!n)
        raise_fatal(msg::no_manager_dsects, 0);
    for (size_t i = 0; i < n; i++) {
        const char *src = in->managers.t.tbl_base + i * sizeof(rsrc_mgr_t);
        char *rec = copy_record(CDB_DSECT_RSRC_MGR, src, sizeof(rsrc_mgr_t));
        copy_table(rec, offsetof(rsrc_mgr_t, u_rm_strings_table),
                   ref_tbl(src, offsetof(rsrc_mgr_t, u_rm_strings_table)), true);
        // The name is the first string, and the strings follow the record.
        std::memset(rec + offsetof(rsrc_mgr_t, u_rm_RMname), 0, sizeof(cdb_ref_t));
        std::memset(rec + offsetof(rsrc_mgr_t, u_rm_strings_table), 0, sizeof(cdb_ref_t));
        uint16_t rm_id = load<uint16_t>(rec + offsetof(rsrc_mgr_t, rm_id));
        if (rm_id > hdr_max_rm_id)
            hdr_max_rm_id = rm_id;
        dsect_idx++;
    }
}

void cdb_writer::add_rsrc_cmmap_tbls() {
    size_t n = tbl_used(&in->maps.t) / sizeof(rsrc_cmmap_t);
    if (!n)
        raise_fatal(msg::no_map_dsects, 0);
    for (size_t i = 0; i < n; i++) {
        const char *src = in->maps.t.tbl_base + i * sizeof(rsrc_cmmap_t);
        char *rec = copy_record(CDB_DSECT_CMMAP, src, sizeof(rsrc_cmmap_t));
        copy_table(rec, offsetof(rsrc_cmmap_t, u_rcm_strings), ref_tbl(src, offsetof(rsrc_cmmap_t, u_rcm_strings)),
                   true);
        dsect_idx++;
    }
}

void cdb_writer::add_rsrc_var_class_tbls() {
    size_t n = tbl_used(&in->var_classes.t) / sizeof(rsrc_variable_class_t);
    if (!n)
        raise_fatal(msg::no_variable_class_dsects, 0);
    for (size_t i = 0; i < n; i++) {
        const char *src = in->var_classes.t.tbl_base + i * sizeof(rsrc_variable_class_t);
        char *rec = copy_record(CDB_DSECT_VAR_CLASS, src, sizeof(rsrc_variable_class_t));
        tbl *strings = ref_tbl(src, offsetof(rsrc_variable_class_t, u_rvc_string_tbl));
        size_t len = tbl_used(strings);
        memcpy_8_rounded(dsp, strings ? strings->tbl_base : nullptr, len);
        grow_dsect(round8(len));
        if (strings)
            strings->release();
        // The reference holds the rounded string length: the IDs follow.
        cdb_ref_t ref{};
        ref.offset[0] = uint32_t(round8(len));
        std::memcpy(rec + offsetof(rsrc_variable_class_t, u_rvc_string_tbl), &ref, sizeof ref);
        if (tbl *ids = find_tbl_entry(src)) {
            memcpy_8_rounded(dsp, ids->tbl_base, tbl_used(ids));
            grow_dsect(round8(tbl_used(ids)));
            ids->release();
        }
        dsect_idx++;
    }
}

// ---------------------------------------------------------------------------

static qel_timeval32_t build_time() {
    if (std::getenv("ZU_CDB_FORCE_EMPTY_TIMESTAMP"))
        return {0, 0};
    // A reproducible build time, when given as a plain count of seconds.
    if (const char *epoch = std::getenv("SOURCE_DATE_EPOCH")) {
        size_t len = std::strlen(epoch);
        if (len >= 1 && len <= 19 && std::strspn(epoch, "0123456789") == len)
            return {uint32_t(std::strtoull(epoch, nullptr, 10)), 0};
    }
    struct timeval tv;
    gettimeofday(&tv, nullptr);
    return {uint32_t(tv.tv_sec), uint32_t(tv.tv_usec)};
}

void cdb_writer::write(const compiled_records &records) {
    in = &records;
    bld_var_id_tbls();
    dsect_count = in->maps.count + in->managers.count + in->var_classes.count + in->classes.count;
    size_t size = cdb_size();
    chp = acquire_image(size);
    dsect_idx = 0;
    dsp = chp + CDB_HEADER_SIZE + CDB_ANCHOR_SIZE * dsect_count;
    hdr_max_class_id = hdr_max_rm_id = 0;
    add_rsrc_class_tbls();
    add_rsrc_mgr_tbls();
    add_rsrc_cmmap_tbls();
    if (in->var_classes.t.tbl_base)
        add_rsrc_var_class_tbls();
    write_header();
    commit_image();
}

void cdb_writer::write_header() {
    qel_cdb_header_t h{};
    h.cdb_hdr_length = uint32_t(dsp - chp) - 4;
    h.cdb_hdr_format = CDB_FORMAT;
    h.cdb_hdr_timestamp = build_time();
    h.cdb_hdr_dsect_count = dsect_count;
    h.cdb_hdr_max_rm_id = hdr_max_rm_id;
    h.cdb_hdr_max_class_id = hdr_max_class_id;
    h.cdb_hdr_rsrc_class_size = sizeof(rsrc_class_t);
    h.cdb_hdr_rsrc_cmmap_size = sizeof(rsrc_cmmap_t);
    h.cdb_hdr_rsrc_mgr_size = sizeof(rsrc_mgr_t);
    h.cdb_hdr_rsrc_variable_class_size = sizeof(rsrc_variable_class_t);
    h.cdb_hdr_rsrc_pattr_size = sizeof(rsrc_pattr_t);
    h.cdb_hdr_rsrc_dattr_size = sizeof(rsrc_dattr_t);
    h.cdb_hdr_rsrc_action_size = sizeof(rsrc_action_t);
    h.cdb_hdr_rsrc_error_size = sizeof(rsrc_error_t);
    h.cdb_hdr_rsrc_depend_size = sizeof(rsrc_depend_t);
    std::memcpy(chp, &h, sizeof h);
    uint32_t sum = cdb_checksum(h.cdb_hdr_length, [&](size_t off) { return load<uint32_t>(chp + off); });
    store<uint32_t>(chp + offsetof(qel_cdb_header_t, cdb_hdr_checksum), sum);
}

void cdb_writer::commit_image() {
    size_t file_len = size_t(load<uint32_t>(chp)) + 4;
    if (reverse)
        qecfg_cdef_swap(reinterpret_cast<qel_cdb_header_t *>(chp), numeric_range_offsets);
    try {
        sink->commit(file_len);
    } catch (const sink_failure &f) {
        output_failed(f);
    }
    image_pending = false;
}
