// Byte-order reversal of a finished CDB image, for a reader of the other
// endianness. The image is in this machine's order when the walk starts, so
// every count, offset and data type is read before the field that holds it is
// reversed: what a record refers to goes first, the record's own fields last;
// the sub-records of a dsect before its anchor, the header after all dsects.
// Nothing moves: every number keeps its value, stored the other way round.
#include "qecfg_swap.h"

#include <algorithm>
#include <initializer_list>

#include "cdb_format.h"
#include "qecfg_tbl.h"

void swap_any(void *enum_p, int size) {
    if (size != 2 && size != 4 && size != 8)
        return;
    auto *bytes = static_cast<unsigned char *>(enum_p);
    std::reverse(bytes, bytes + size);
}

namespace {

// The deepest nesting of bodies the compiler writes is an SD array holding a
// structured value holding an array of binaries; anything much deeper can
// only be a cycle in a damaged image.
constexpr int MAX_VALUE_DEPTH = 8;

// A number inside a record: its offset and width. A reference is reversed as
// its first word only; the second is 0.
struct spot {
    size_t off;
    int width;
};
#define NUM(rec, f)                                                                                                    \
    spot { offsetof(rec, f), int(sizeof(rec::f)) }
#define REF(rec, f)                                                                                                    \
    spot { offsetof(rec, f), 4 }

void swap_field(const swap_image &img, size_t pos, int width) {
    if (char *p = img.at(pos, size_t(width)))
        swap_any(p, width);
}

void swap_spots(const swap_image &img, size_t rec, std::initializer_list<spot> spots) {
    for (const spot &s : spots)
        swap_field(img, rec + s.off, s.width);
}

// Calls fn with the position of each of count items of size bytes from first,
// stopping at the first item that does not lie wholly inside the image.
template <typename Fn> void for_each_item(const swap_image &img, size_t first, uint64_t count, size_t size, Fn fn) {
    for (uint64_t i = 0; i < count; ++i) {
        const size_t pos = first + i * size;
        if (!img.at(pos, size))
            return;
        fn(pos);
    }
}

// count numbers of one width, stride bytes apart.
void swap_run(const swap_image &img, size_t first, uint64_t count, int width, size_t stride) {
    for_each_item(img, first, count, stride, [&](size_t pos) { swap_field(img, pos, width); });
}

uint32_t load_u32(const swap_image &img, size_t pos, uint32_t absent) {
    const char *p = img.at(pos, 4);
    return p ? load<uint32_t>(p) : absent;
}

uint16_t load_u16(const swap_image &img, size_t pos) {
    const char *p = img.at(pos, 2);
    return p ? load<uint16_t>(p) : 0;
}

// The first word of a reference or reference-type value; none when unreadable.
uint32_t ref_offset(const swap_image &img, size_t pos) { return load_u32(img, pos, CDB_NONE); }

zu_data_type_t load_type(const swap_image &img, size_t pos) { return zu_data_type_t(load_u32(img, pos, ZU_UNKNOWN)); }

// Calls walk with the position of the item that the reference at ref_pos
// designates in the table at base, unless it designates nothing.
template <typename Fn> void walk_ref(const swap_image &img, size_t ref_pos, size_t base, Fn walk) {
    const uint32_t off = ref_offset(img, ref_pos);
    if (off != CDB_NONE)
        walk(base + off);
}

// ---------------------------------------------------------------------------
// Values and their bodies in the class string table.

void swap_value_at(const swap_image &img, size_t pos, zu_data_type_t type, size_t sbase, int depth);

// A structured value: each element's value by the element's own type, then
// that type, then the count.
void swap_sd_body(const swap_image &img, size_t body, size_t sbase, int depth) {
    using S = zu_structured_data_t;
    using E = zu_structured_data_element_t;
    const uint32_t count = load_u32(img, body + offsetof(S, element_count), 0);
    for_each_item(img, body + offsetof(S, elements), count, sizeof(E), [&](size_t el) {
        swap_value_at(img, el + offsetof(E, value), load_type(img, el + offsetof(E, data_type)), sbase, depth + 1);
        swap_spots(img, el, {NUM(E, data_type)});
    });
    swap_spots(img, body, {NUM(S, element_count)});
}

void swap_array_body(const swap_image &img, size_t body, zu_data_type_t elem_type, size_t sbase, int depth) {
    const uint32_t count = load_u32(img, body + offsetof(zu_array_t, element_count), 0);
    for_each_item(img, body + offsetof(zu_array_t, elements), count, sizeof(zu_value_t),
                  [&](size_t el) { swap_value_at(img, el, elem_type, sbase, depth + 1); });
    swap_spots(img, body, {NUM(zu_array_t, element_count)});
}

// A value that designates a body: the body first, then the offset.
template <typename Fn> void swap_reference(const swap_image &img, size_t pos, size_t sbase, Fn swap_body) {
    walk_ref(img, pos, sbase, swap_body);
    swap_field(img, pos, 4);
}

void swap_value_at(const swap_image &img, size_t pos, zu_data_type_t type, size_t sbase, int depth) {
    if (depth > MAX_VALUE_DEPTH)
        return;
    switch (type) {
    case ZU_INT32:
    case ZU_UINT32:
    case ZU_FLOAT32:
    case ZU_CHAR_PTR:        // the text stays as it is
    case ZU_RSRC_HANDLE_PTR: // so does the handle body
        swap_field(img, pos, 4);
        return;
    case ZU_INT64:
    case ZU_UINT64:
    case ZU_FLOAT64: swap_field(img, pos, 8); return;
    case ZU_BINARY_PTR: // the length word only; the data bytes stay
        swap_reference(img, pos, sbase, [&](size_t body) { swap_spots(img, body, {NUM(zu_binary_t, length)}); });
        return;
    case ZU_SD_PTR:
        swap_reference(img, pos, sbase, [&](size_t body) { swap_sd_body(img, body, sbase, depth); });
        return;
    default:
        // UNKNOWN, None, SBS and undefined types are left whole, offset included.
        if (zu_is_array_type(type))
            swap_reference(img, pos, sbase, [&](size_t body) {
                swap_array_body(img, body, zu_data_type_t(zu_element_type(type)), sbase, depth);
            });
        return;
    }
}

// ---------------------------------------------------------------------------
// Lists and the records that refer to them.

void walk_var_list(const swap_image &img, size_t ref_pos, const swap_bases &b) {
    walk_ref(img, ref_pos, b.vlbase, [&](size_t list) { swap_var_list(img, list); });
}

void walk_valid_vals(const swap_image &img, size_t ref_pos, zu_data_type_t type, const swap_bases &b) {
    walk_ref(img, ref_pos, b.vvbase, [&](size_t list) { swap_valid_vals(img, list, type, b.sbase); });
}

void walk_sd_def(const swap_image &img, size_t ref_pos, const swap_bases &b) {
    walk_ref(img, ref_pos, b.sdbase, [&](size_t def) { swap_sd_def(img, def, b.vvbase, b.sbase); });
}

// The type by which an attribute's default or initial value is walked. A
// structured-data attribute without a definition holds 0 there, which
// designates no body.
zu_data_type_t own_value_type(const swap_image &img, size_t sd_ref_pos, zu_data_type_t type) {
    return zu_is_sd_type(type) && ref_offset(img, sd_ref_pos) == CDB_NONE ? ZU_NONE : type;
}

// The type by which a dynamic attribute's range is walked. A Range statement
// on an array attribute stores values of the element type, not array bodies.
zu_data_type_t range_type(const swap_image &img, size_t rec, zu_data_type_t type) {
    const bool given = img.numeric_ranges && rec <= UINT32_MAX && img.numeric_ranges->count(uint32_t(rec));
    return given && zu_is_array_type(type) ? zu_data_type_t(zu_element_type(type)) : type;
}

typedef void (*record_walker)(const swap_image &, size_t, uint32_t, const swap_bases &);

} // namespace

void swap_value(const swap_image &img, size_t value_pos, zu_data_type_t type, size_t sbase) {
    swap_value_at(img, value_pos, type, sbase, 0);
}

void swap_var_list(const swap_image &img, size_t vlist_pos) {
    using L = variety_list_t;
    const uint32_t count = load_u32(img, vlist_pos + offsetof(L, vl_count), 0);
    // Each entry is a low and a high 32-bit value, so the entries are 2 × count words.
    swap_run(img, vlist_pos + offsetof(L, vl_values), uint64_t(count) * 2, 4, 4);
    swap_spots(img, vlist_pos, {NUM(L, vl_cb_ID), NUM(L, vl_count)});
}

void swap_valid_vals(const swap_image &img, size_t vv_pos, zu_data_type_t type, size_t sbase) {
    using L = valid_values_t;
    // Valid values of an array attribute are single values of its element type.
    const zu_data_type_t entry_type = zu_is_array_type(type) ? zu_data_type_t(zu_element_type(type)) : type;
    const uint32_t count = load_u32(img, vv_pos + offsetof(L, vv_count), 0);
    for_each_item(img, vv_pos + offsetof(L, vv_values), count, sizeof(vv_entry), [&](size_t e) {
        swap_value(img, e + offsetof(vv_entry, vv_low_val), entry_type, sbase);
        swap_value(img, e + offsetof(vv_entry, vv_high_val), entry_type, sbase);
        swap_spots(img, e, {NUM(vv_entry, vv_disp_msgid)});
    });
    swap_spots(img, vv_pos, {NUM(L, vv_cb_ID), NUM(L, vv_count)});
}

void swap_sd_def(const swap_image &img, size_t sd_pos, size_t vvbase, size_t sbase) {
    using F = sd_field;
    const uint32_t count = load_u32(img, sd_pos + offsetof(sd_def_t, sd_count), 0);
    for_each_item(img, sd_pos + offsetof(sd_def_t, sd_fields), count, sizeof(F), [&](size_t f) {
        walk_ref(img, f + offsetof(F, u_sd_valid_vals), vvbase, [&](size_t list) {
            swap_valid_vals(img, list, load_type(img, f + offsetof(F, sd_field_type)), sbase);
        });
        swap_spots(img, f,
                   {REF(F, u_sd_field_name), NUM(F, sd_field_type), NUM(F, sd_disp_msgid), NUM(F, sd_dscr_msgid),
                    REF(F, u_sd_valid_vals), NUM(F, sd_action_id), NUM(F, sd_valid_type)});
    });
    swap_spots(img, sd_pos, {NUM(sd_def_t, sd_cb_ID), NUM(sd_def_t, sd_count)});
}

// What both attribute records refer to: the variety list, the valid values,
// the structured-data definition, and their own value (default or initial).
// Returns the record's data type, read before anything was reversed.
template <typename R>
zu_data_type_t swap_attr_lists_and_value(const swap_image &img, size_t rec, size_t value_field, const swap_bases &b) {
    const zu_data_type_t type = load_type(img, rec + offsetof(R, ra_data_type));
    walk_var_list(img, rec + offsetof(R, u_ra_variety_list), b);
    walk_valid_vals(img, rec + offsetof(R, u_ra_valid_vals), type, b);
    walk_sd_def(img, rec + offsetof(R, u_ra_sd), b);
    swap_value(img, rec + value_field, own_value_type(img, rec + offsetof(R, u_ra_sd), type), b.sbase);
    return type;
}

void swap_pattr(const swap_image &img, size_t first, uint32_t count, const swap_bases &b) {
    using R = rsrc_pattr_t;
    for_each_item(img, first, count, sizeof(R), [&](size_t rec) {
        swap_attr_lists_and_value<R>(img, rec, offsetof(R, ra_dflt_value), b);
        swap_spots(img, rec,
                   {NUM(R, ra_data_type), NUM(R, ra_cb_ID), NUM(R, ra_props), REF(R, u_ra_name), NUM(R, ra_dscr_msgid),
                    NUM(R, ra_disp_msgid), NUM(R, ra_group_msgid), NUM(R, ra_group_id), NUM(R, ra_attr_id),
                    REF(R, u_ra_variety_list), REF(R, u_ra_valid_vals), REF(R, u_ra_sd), NUM(R, ra_max_sd_idx)});
    });
}

void swap_dattr(const swap_image &img, size_t first, uint32_t count, const swap_bases &b) {
    using R = rsrc_dattr_t;
    for_each_item(img, first, count, sizeof(R), [&](size_t rec) {
        const zu_data_type_t type = swap_attr_lists_and_value<R>(img, rec, offsetof(R, ra_init_value), b);
        const zu_data_type_t rtype = range_type(img, rec, type);
        swap_value(img, rec + offsetof(R, ra_min_value), rtype, b.sbase);
        swap_value(img, rec + offsetof(R, ra_max_value), rtype, b.sbase);
        swap_spots(img, rec,
                   {NUM(R, ra_data_type),
                    NUM(R, ra_var_type),
                    NUM(R, ra_cb_ID),
                    NUM(R, ra_props),
                    REF(R, u_ra_name),
                    REF(R, u_ra_vclass),
                    REF(R, u_ra_next_in_vclass),
                    REF(R, u_ra_variety_list),
                    REF(R, u_ra_valid_vals),
                    REF(R, u_ra_sd),
                    REF(R, u_ra_express),
                    REF(R, u_ra_rearm_expr),
                    REF(R, u_ra_XAV_name),
                    NUM(R, ra_dscr_msgid),
                    NUM(R, ra_disp_msgid),
                    NUM(R, ra_group_msgid),
                    NUM(R, ra_group_id),
                    NUM(R, ra_attr_id),
                    NUM(R, ra_max_sd_idx),
                    NUM(R, ra_expr_desc),
                    NUM(R, ra_rearm_desc),
                    NUM(R, ra_range_desc)});
    });
}

void swap_action(const swap_image &img, size_t first, uint32_t count, const swap_bases &b) {
    using R = rsrc_action_t;
    for_each_item(img, first, count, sizeof(R), [&](size_t rec) {
        walk_var_list(img, rec + offsetof(R, u_ac_variety_list), b);
        walk_sd_def(img, rec + offsetof(R, u_ac_sd_input), b);
        walk_sd_def(img, rec + offsetof(R, u_ac_sd_resp), b);
        swap_spots(img, rec,
                   {NUM(R, ac_cb_ID), NUM(R, ac_action_id), NUM(R, ac_props), NUM(R, ac_dscr_msgid),
                    NUM(R, ac_disp_msgid), NUM(R, ac_confirm_msgid), NUM(R, ac_timeout), NUM(R, ac_perms),
                    REF(R, u_ac_name), REF(R, u_ac_variety_list), REF(R, u_ac_sd_input), REF(R, u_ac_sd_resp)});
    });
}

void swap_errors(const swap_image &img, size_t first, uint32_t count, const swap_bases &b) {
    using R = rsrc_error_t;
    for_each_item(img, first, count, sizeof(R), [&](size_t rec) {
        walk_var_list(img, rec + offsetof(R, u_re_variety_list), b);
        walk_sd_def(img, rec + offsetof(R, u_re_sd_input), b);
        swap_spots(img, rec,
                   {NUM(R, re_cb_ID), NUM(R, re_error_id), NUM(R, re_props), NUM(R, re_dscr_msgid),
                    NUM(R, re_disp_msgid), REF(R, u_re_name), REF(R, u_re_variety_list), REF(R, u_re_sd_input),
                    NUM(R, re_perms)});
    });
}

void swap_depends(const swap_image &img, size_t first, uint32_t count, const swap_bases &) {
    for_each_item(img, first, count, sizeof(rsrc_depend_t), [&](size_t rec) {
        swap_spots(img, rec, {NUM(rsrc_depend_t, rd_class_ID), NUM(rsrc_depend_t, rd_cb_ID)});
    });
}

// ---------------------------------------------------------------------------
// Dsects, anchors and the header.

namespace {

void swap_class_record(const swap_image &img, size_t rec) {
    using R = rsrc_class_t;
    swap_spots(img, rec, {NUM(R, rc_cb_ID), NUM(R, rc_props), REF(R, u_rc_name)});
    swap_run(img, rec + offsetof(R, u_rc_alias), 19, 4, sizeof(cdb_ref_t));    // u_rc_alias .. u_rc_strings
    swap_run(img, rec + offsetof(R, rc_num_pattrsC), 8, 2, sizeof(uint16_t));  // the counts
    swap_run(img, rec + offsetof(R, rc_varlist_size), 6, 4, sizeof(uint32_t)); // sizes and templates
    swap_spots(
        img, rec,
        {NUM(R, rc_class_id), NUM(R, rc_dscr_msgid), NUM(R, rc_disp_msgid), NUM(R, rc_locator), NUM(R, rc_version)});
}

// A class table of records: where its reference and its count are, and its walker.
struct record_table {
    size_t ref;
    size_t count;
    record_walker walk;
};

void swap_class_dsect(const swap_image &img, size_t rec) {
    using R = rsrc_class_t;
    static const record_table tables[] = {
        {offsetof(R, u_rc_pattrsC), offsetof(R, rc_num_pattrsC), swap_pattr},
        {offsetof(R, u_rc_dattrsC), offsetof(R, rc_num_dattrsC), swap_dattr},
        {offsetof(R, u_rc_pattrs), offsetof(R, rc_num_pattrs), swap_pattr},
        {offsetof(R, u_rc_dattrs), offsetof(R, rc_num_dattrs), swap_dattr},
        {offsetof(R, u_rc_actionsC), offsetof(R, rc_num_actionsC), swap_action},
        {offsetof(R, u_rc_actions), offsetof(R, rc_num_actions), swap_action},
        {offsetof(R, u_rc_errors), offsetof(R, rc_num_errors), swap_errors},
        {offsetof(R, u_rc_depends), offsetof(R, rc_num_depends), swap_depends},
    };
    auto table = [&](size_t ref) { return rec + ref_offset(img, rec + ref); };
    const swap_bases b{table(offsetof(R, u_rc_strings)), table(offsetof(R, u_rc_valid_vals)),
                       table(offsetof(R, u_rc_variety_lists)), table(offsetof(R, u_rc_sd_defs))};
    for (const record_table &t : tables)
        walk_ref(img, rec + t.ref, rec, [&](size_t first) { t.walk(img, first, load_u16(img, rec + t.count), b); });
    for (size_t input : {offsetof(R, u_rc_def_input), offsetof(R, u_rc_undef_input), offsetof(R, u_rc_online_input),
                         offsetof(R, u_rc_offline_input), offsetof(R, u_rc_reset_input)})
        walk_sd_def(img, rec + input, b);
    swap_class_record(img, rec);
}

void swap_mgr_dsect(const swap_image &img, size_t rec) {
    using R = rsrc_mgr_t;
    // u_rm_strings_table is 0 and the strings stay as they are.
    swap_spots(img, rec, {NUM(R, rm_cb_ID), NUM(R, rm_id), NUM(R, rm_spare), REF(R, u_rm_RMname)});
}

void swap_var_class_dsect(const swap_image &img, size_t rec) {
    using R = rsrc_variable_class_t;
    // The variable IDs follow the rounded string table, whose length the reference holds.
    const size_t ids = rec + sizeof(R) + ref_offset(img, rec + offsetof(R, u_rvc_string_tbl));
    swap_run(img, ids, load_u32(img, rec + offsetof(R, rvc_var_count), 0), 4, sizeof(uint32_t));
    swap_spots(img, rec,
               {NUM(R, rvc_cb_ID), NUM(R, rvc_obsv_interval), NUM(R, rvc_report_interval), REF(R, u_rvc_name),
                REF(R, u_rvc_compat_name), NUM(R, rvc_var_count), REF(R, u_rvc_string_tbl)});
}

void swap_cmmap_dsect(const swap_image &img, size_t rec) {
    using R = rsrc_cmmap_t;
    swap_spots(
        img, rec,
        {NUM(R, rcm_cb_ID), NUM(R, rcm_class_ID), NUM(R, rcm_rm_ID), REF(R, u_rcm_msg_file), REF(R, u_rcm_strings)});
    swap_run(img, rec + offsetof(R, rcm_dscr_msg_set), 8, 2, sizeof(uint16_t));    // .. rcm_num_ctx_tmplts
    swap_run(img, rec + offsetof(R, rcm_static_contexts), 4, 4, sizeof(uint32_t)); // .. rcm_ctx_tmplts
}

void swap_dsect(const swap_image &img, uint32_t type, size_t rec) {
    switch (type) {
    case CDB_DSECT_RSRC_MGR: swap_mgr_dsect(img, rec); break;
    case CDB_DSECT_VAR_CLASS: swap_var_class_dsect(img, rec); break;
    case CDB_DSECT_CLASS: swap_class_dsect(img, rec); break;
    case CDB_DSECT_CMMAP: swap_cmmap_dsect(img, rec); break;
    default: // the compiler writes no other kind
        break;
    }
}

// Each dsect, then its anchor; the count is still in this machine's order.
void swap_dsects(const swap_image &img) {
    using A = cdb_dsect_anchor_t;
    const uint32_t count = load_u32(img, offsetof(qel_cdb_header_t, cdb_hdr_dsect_count), 0);
    for_each_item(img, sizeof(qel_cdb_header_t), count, sizeof(A), [&](size_t anchor) {
        swap_dsect(img, load_u32(img, anchor + offsetof(A, cda_type), CDB_DSECT_UNUSED),
                   load_u32(img, anchor + offsetof(A, cda_offset), CDB_NONE));
        swap_run(img, anchor, 4, 4, sizeof(uint32_t));
    });
}

void swap_header(const swap_image &img) {
    using H = qel_cdb_header_t;
    swap_spots(img, 0,
               {NUM(H, cdb_hdr_seqno), NUM(H, cdb_hdr_timestamp.tv_sec), NUM(H, cdb_hdr_timestamp.tv_usec),
                NUM(H, cdb_hdr_dsect_count), NUM(H, cdb_hdr_max_rm_id), NUM(H, cdb_hdr_max_class_id)});
    swap_run(img, offsetof(H, cdb_hdr_rsrc_class_size), 9, 2, sizeof(uint16_t)); // the record sizes
    swap_spots(img, 0, {NUM(H, cdb_hdr_length), NUM(H, cdb_hdr_format)});
}

// The checksum makes the XOR of all words of the file 0, which holds in
// either byte order once it holds in one.
void store_checksum(const swap_image &img, uint32_t length) {
    uint32_t sum = cdb_checksum(length, [&](size_t off) { return load<uint32_t>(img.base + off); });
    store<uint32_t>(img.base + offsetof(qel_cdb_header_t, cdb_hdr_checksum), sum);
}

#undef NUM
#undef REF

} // namespace

void qecfg_cdef_swap(qel_cdb_header_t *cdb_hdr_p, const std::unordered_set<uint32_t> &numeric_ranges) {
    char *base = reinterpret_cast<char *>(cdb_hdr_p);
    const uint32_t length = load<uint32_t>(base + offsetof(qel_cdb_header_t, cdb_hdr_length));
    const swap_image img{base, size_t(length) + 4, &numeric_ranges};
    if (img.size < sizeof(qel_cdb_header_t)) // not an image this compiler wrote
        return;
    swap_dsects(img);
    swap_header(img);
    store_checksum(img, length);
}
