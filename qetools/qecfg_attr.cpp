// Attribute stanzas: persistent and dynamic attributes, of a resource or of
// the class; their completion supplies every value the source left out.
#include "qecfg.h"

namespace {

struct attr_kind {
    stanza_idx stanza;
    uint32_t id;
    cdb_ref_t rsrc_class_t::*table;
    const char *no_class_msg;
    const char *no_table_msg;
    bool dynamic;
};

const attr_kind attr_kinds[] = {
    {ST_PERSISTENT_RESOURCE_ATTRIBUTE, RSRC_PATTR_RSRC_ID, &rsrc_class_t::u_rc_pattrs,
     "No class for PersistentAttribute", "PersistentResourceAttribute table not found", false},
    {ST_PERSISTENT_CLASS_ATTRIBUTE, RSRC_PATTR_CLASS_ID, &rsrc_class_t::u_rc_pattrsC, "No class for pattr",
     "PersistentClassAttribute table not found", false},
    {ST_DYNAMIC_RESOURCE_ATTRIBUTE, RSRC_DATTR_RSRC_ID, &rsrc_class_t::u_rc_dattrs, "No class for DynamicAttribute",
     "DynamicResourceAttribute table not found", true},
    {ST_DYNAMIC_CLASS_ATTRIBUTE, RSRC_DATTR_CLASS_ID, &rsrc_class_t::u_rc_dattrsC, "No class for DynamicAttribute",
     "DynamicClassAttribute table not found", true},
};

constexpr uint32_t PA_REQD_FOR_DEFINE = 0x2;
constexpr uint32_t PA_OPT_FOR_DEFINE = 0x8;
constexpr uint32_t PA_INVAL_FOR_DEFINE = 0x4;
constexpr uint32_t GROUP_ID_BIT = 0x80000001;
constexpr uint16_t DEFAULT_GROUP_ID = 255;

bool is_numeric_array(zu_data_type_t dt) { return dt >= ZU_INT32_ARRAY && dt <= ZU_FLOAT64_ARRAY; }

void set_none(char *field) {
    std::memset(field, 0, sizeof(cdb_ref_t));
    store<uint32_t>(field, CDB_NONE);
}

} // namespace

char *qecfg_compiler::attr_cb(int kind) {
    switch (kind) {
    case ST_PERSISTENT_RESOURCE_ATTRIBUTE: return reinterpret_cast<char *>(&cb_rsrc_pattr);
    case ST_PERSISTENT_CLASS_ATTRIBUTE: return reinterpret_cast<char *>(&cb_rsrc_pattrC);
    case ST_DYNAMIC_RESOURCE_ATTRIBUTE: return reinterpret_cast<char *>(&cb_rsrc_dattr);
    default: return reinterpret_cast<char *>(&cb_rsrc_dattrC);
    }
}

static const attr_kind &kind_of(int stanza) { return attr_kinds[stanza - ST_PERSISTENT_RESOURCE_ATTRIBUTE]; }

void qecfg_compiler::init_attr(int stanza) {
    const attr_kind &k = kind_of(stanza);
    char *cb = attr_cb(stanza);
    if (load<uint32_t>(cb))
        cmplt_attr(stanza);
    if (!cb_rsrc_class.rc_cb_ID)
        statement_error(k.no_class_msg);
    if (k.dynamic) {
        rsrc_dattr_t &d = *reinterpret_cast<rsrc_dattr_t *>(cb);
        d = rsrc_dattr_t{};
        d.ra_cb_ID = k.id;
        d.u_ra_variety_list.offset[0] = mk_vty_sec();
        for (cdb_ref_t *r : {&d.u_ra_express, &d.u_ra_vclass, &d.u_ra_rearm_expr, &d.u_ra_sd})
            set_none(reinterpret_cast<char *>(r));
        d.ra_max_sd_idx = 0xFFFF;
    } else {
        rsrc_pattr_t &p = *reinterpret_cast<rsrc_pattr_t *>(cb);
        p = rsrc_pattr_t{};
        p.ra_cb_ID = k.id;
        p.u_ra_variety_list.offset[0] = mk_vty_sec();
        set_none(reinterpret_cast<char *>(&p.u_ra_sd));
        p.ra_max_sd_idx = 0xFFFF;
    }
    vvdisp_tbl = nullptr;
    *vv_found_flag(stanza) = 0;
}

void qecfg_compiler::init_pattr_tbl() { init_attr(ST_PERSISTENT_RESOURCE_ATTRIBUTE); }
void qecfg_compiler::init_pattrC_tbl() { init_attr(ST_PERSISTENT_CLASS_ATTRIBUTE); }
void qecfg_compiler::init_dattr_tbl() { init_attr(ST_DYNAMIC_RESOURCE_ATTRIBUTE); }
void qecfg_compiler::init_dattrC_tbl() { init_attr(ST_DYNAMIC_CLASS_ATTRIBUTE); }
void qecfg_compiler::cmplt_pattr_tbl() { cmplt_attr(ST_PERSISTENT_RESOURCE_ATTRIBUTE); }
void qecfg_compiler::cmplt_pattrC_tbl() { cmplt_attr(ST_PERSISTENT_CLASS_ATTRIBUTE); }
void qecfg_compiler::cmplt_dattr_tbl() { cmplt_attr(ST_DYNAMIC_RESOURCE_ATTRIBUTE); }
void qecfg_compiler::cmplt_dattrC_tbl() { cmplt_attr(ST_DYNAMIC_CLASS_ATTRIBUTE); }

void qecfg_compiler::cmplt_attr(int stanza) {
    const attr_kind &k = kind_of(stanza);
    char *cb = attr_cb(stanza);
    if (!cb_rsrc_class.rc_cb_ID)
        statement_error(k.no_class_msg);
    int id = set_table_id(stanza_defs[stanza].name);
    if (id < 0)
        statement_error(k.no_table_msg);
    srtable_ctrl *e = &sc_tables[id];
    if (e->req_mask != e->req_mask_cmplt) {
        if (stanza == ST_DYNAMIC_CLASS_ATTRIBUTE) {
            QECFG_TRACE(*this, "scp->req_mask:         %x\n", e->req_mask);
            QECFG_TRACE(*this, "scp->req_mask_cmplt:   %x\n", e->req_mask_cmplt);
        }
        statement_error("Previous stanza incomplete");
    }
    size_t vv_field = k.dynamic ? offsetof(rsrc_dattr_t, u_ra_valid_vals) : offsetof(rsrc_pattr_t, u_ra_valid_vals);
    uint16_t *vv_found = vv_found_flag(stanza);
    if (!*vv_found)
        set_none(cb + vv_field);
    *vv_found = 0;

    zu_data_type_t dt = attr_data_type(e);
    tbl *st = entry_tbl(e->sc_str_tbl);
    tbl *table = static_cast<tbl *>((cb_rsrc_class.*k.table).ptr);
    if (k.dynamic)
        complete_range(stanza, dt, st, table);
    size_t value_field = k.dynamic ? offsetof(rsrc_dattr_t, ra_init_value) : offsetof(rsrc_pattr_t, ra_dflt_value);
    if (scalar_zu(dt) != ZU_SD_PTR) {
        value_slot lval = value_slot::at(cb + value_field);
        if (e->dflt.tbl && e->dflt.num_elems) {
            dump_dflt(st, e->dflt, lval, dt);
        } else {
            anchor a;
            if (copy_this_type(lval, nullptr, dt, k.dynamic ? INIT_DEFAULT : DFLT_DEFAULT, st, &a, 1) != 0)
                statement_error(k.dynamic ? "copy_this_type default value error (dattr)"
                                          : "copy_this_type default value error");
        }
    }
    if (k.dynamic) {
        if ((e->opt_mask & GROUP_ID_BIT) != GROUP_ID_BIT)
            store<uint16_t>(cb + offsetof(rsrc_dattr_t, ra_group_id), DEFAULT_GROUP_ID);
    } else {
        rsrc_pattr_t &p = *reinterpret_cast<rsrc_pattr_t *>(cb);
        if (!(p.ra_props & (PA_REQD_FOR_DEFINE | PA_OPT_FOR_DEFINE)))
            p.ra_props |= PA_INVAL_FOR_DEFINE;
    }
    size_t size = k.dynamic ? sizeof(rsrc_dattr_t) : sizeof(rsrc_pattr_t);
    std::memcpy(alloc_tble(table, size), cb, size);
    store<uint32_t>(cb, 0);
}

// The range of a dynamic attribute: none for the reference types, the
// default range when no Range statement was given.
void qecfg_compiler::complete_range(int stanza, zu_data_type_t dt, tbl *st, const tbl *table) {
    uint16_t &found = stanza == ST_DYNAMIC_RESOURCE_ATTRIBUTE ? dattr_range_found : dattrC_range_found;
    char *cb = attr_cb(stanza);
    char *lo = cb + offsetof(rsrc_dattr_t, ra_min_value);
    char *hi = cb + offsetof(rsrc_dattr_t, ra_max_value);
    switch (dt) {
    case ZU_SD_PTR:
    case ZU_CHAR_PTR:
    case ZU_BINARY_PTR:
    case ZU_RSRC_HANDLE_PTR:
        set_none(lo);
        set_none(hi);
        break;
    default:
        if (found) {
            // Plain numbers of the element type: the reversal must know.
            if (is_numeric_array(dt))
                numeric_ranges.insert({table, tbl_used(table)});
            break;
        }
        if (dt == ZU_SD_PTR_ARRAY) {
            anchor a[3];
            if (copy_this_sd_type(value_slot::at(lo), ZU_INT32, R_LO_DEFAULT, st, &a[0], &a[1], &a[2], 0,
                                  ZU_SD_PTR_ARRAY) != 0)
                statement_error("copy_this_type default min range error (dattr)");
            anchor b[3];
            if (copy_this_sd_type(value_slot::at(hi), ZU_INT32, R_HI_DEFAULT, st, &b[0], &b[1], &b[2], 0,
                                  ZU_SD_PTR_ARRAY) != 0)
                statement_error("copy_this_type default max range error (dattr)");
        } else {
            anchor a;
            if (copy_this_type(value_slot::at(lo), nullptr, dt, R_LO_DEFAULT, st, &a, 1) != 0)
                statement_error("copy_this_type default min range error (dattr)");
            anchor b;
            if (copy_this_type(value_slot::at(hi), nullptr, dt, R_HI_DEFAULT, st, &b, 1) != 0)
                statement_error("copy_this_type default max range error (dattr)");
        }
    }
    found = 0;
}

void qecfg_compiler::dump_dflt(tbl *str_tbl, const dflt_tbl &vtbl, value_slot lval, zu_data_type_t dt) {
    anchor array_anchor, sd_array_anchor, sd_element_anchor;
    uint32_t n = uint32_t(vtbl.num_elems);
    for (uint32_t i = 0; i < n; i++) {
        const char *slot = vtbl.tbl->tbl_base + size_t(i) * sizeof(zu_value_t);
        if (dt != ZU_SD_PTR && dt != ZU_SD_PTR_ARRAY) {
            zu_value_t v = load<zu_value_t>(slot);
            if (copy_this_type(lval, &v, dt, TYPE_SAME, str_tbl, &array_anchor, n) != 0)
                statement_error("dump_dflt: copy_this_type error");
            continue;
        }
        array_anchor = anchor{};
        zu_data_type_t et = load<zu_data_type_t>(slot);
        int code = sd_attr_type ? INIT_DEFAULT : DFLT_DEFAULT;
        if (copy_this_sd_type(lval, et, code, str_tbl, &array_anchor, &sd_array_anchor, &sd_element_anchor, n, dt) !=
            0)
            statement_error(sd_attr_type ? "dump_dflt: copy_this_sd_type init error"
                                         : "dump_dflt: copy_this_sd_type default error");
    }
}
