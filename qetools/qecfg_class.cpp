// Class, class-to-manager map, manager and variable-class records, and the
// starters of the variable-length sections inside a class's tables.
#include "qecfg.h"

namespace {

struct class_table_def {
    cdb_ref_t rsrc_class_t::*field;
    const char *name;
    size_t au;
};

// The thirteen per-class tables, in the order a class creates them.
const class_table_def class_tables[] = {
    {&rsrc_class_t::u_rc_pattrsC, "ClassPattrsC", 1152},
    {&rsrc_class_t::u_rc_dattrsC, "ClassDattrsC", 2176},
    {&rsrc_class_t::u_rc_pattrs, "ClassPattrs", 1152},
    {&rsrc_class_t::u_rc_dattrs, "ClassDattrs", 2176},
    {&rsrc_class_t::u_rc_actionsC, "ClassActionsC", 224},
    {&rsrc_class_t::u_rc_actions, "ClassActions", 224},
    {&rsrc_class_t::u_rc_errors, "ClassErrors", 192},
    {&rsrc_class_t::u_rc_depends, "ClassDepends", 32},
    {&rsrc_class_t::u_rc_sbs_defs, "ClassSBSDefs", 320},
    {&rsrc_class_t::u_rc_valid_vals, "ClassValidVals", 256},
    {&rsrc_class_t::u_rc_variety_lists, "ClassVarietyList", 64},
    {&rsrc_class_t::u_rc_strings, "ClassStrings", 8192},
    {&rsrc_class_t::u_rc_sd_defs, "ClassSDDefs", 160},
};

constexpr size_t STRINGS_AU = 8192;

cdb_ref_t none_ref() {
    cdb_ref_t r{};
    r.offset[0] = CDB_NONE;
    return r;
}

cdb_ref_t table_ref(tbl *t) {
    cdb_ref_t r{};
    r.ptr = t;
    return r;
}

} // namespace

template <typename R> void qecfg_compiler::append_record(tbl *t, const R &rec, uint32_t &count) {
    std::memcpy(alloc_tble(t, sizeof(R)), &rec, sizeof(R));
    count++;
}

void qecfg_compiler::init_class_tbl() {
    if (cb_rsrc_class.rc_cb_ID)
        cmplt_class_tbl();
    rsrc_class_t &c = cb_rsrc_class;
    c = rsrc_class_t{};
    c.rc_cb_ID = RSRC_CLASS_ID;
    c.u_rc_name = c.u_rc_alias = c.u_rc_def_input = c.u_rc_undef_input = none_ref();
    c.u_rc_online_input = c.u_rc_offline_input = c.u_rc_reset_input = none_ref();
    for (const class_table_def &d : class_tables)
        c.*d.field = table_ref(new_tbl(d.name, d.au));
}

void qecfg_compiler::cmplt_class_tbl() {
    rsrc_class_t &c = cb_rsrc_class;
    if (c.u_rc_name.offset[0] == CDB_NONE)
        name_class_from_output();
    if (cb_rsrc_pattrC.ra_cb_ID)
        cmplt_pattrC_tbl();
    if (cb_rsrc_dattrC.ra_cb_ID)
        cmplt_dattrC_tbl();
    if (cb_rsrc_pattr.ra_cb_ID)
        cmplt_pattr_tbl();
    if (cb_rsrc_dattr.ra_cb_ID)
        cmplt_dattr_tbl();
    resolve_locator();
    for (const class_table_def &d : class_tables)
        release_if_empty(c.*d.field);
    append_record(&rsrc_class_tbl, c, rsrc_class_count);
    c.rc_cb_ID = 0;
}

// An unnamed class takes the output file name up to its first ".cdef".
void qecfg_compiler::name_class_from_output() {
    size_t pos = opt.cdefname.find(".cdef");
    if (pos == std::string::npos)
        qecfg_error_exit_rtn("Invalid cdef out file name (must end in .cdef)", nullptr, nullptr, 0, 1);
    std::string name = opt.cdefname.substr(0, pos);
    srtable_ctrl &rc = sc_tables[set_table_id("ResourceClass")];
    const table_attrs *row = nullptr;
    for (int i = 0; i < rc.sc_num_attrs_in_table && !row; i++)
        if (std::strcmp(rc.sc_attrs[i].ta_name, "Name") == 0)
            row = &rc.sc_attrs[i];
    tbl *st = entry_tbl(rc.sc_str_tbl);
    if (!st)
        statement_error("No tbl for strings table");
    char *target = static_cast<char *>(rc.sc_cb) + row->ta_offset;
    store<uint32_t>(target, add_to_tbl(st, name.c_str(), name.size() + 1));
}

// The locator is resolved for each class against its own persistent resource
// attributes, then forgotten, so that every class gets its own.
void qecfg_compiler::resolve_locator() {
    rsrc_class_t &c = cb_rsrc_class;
    c.rc_locator = 0xFFFF;
    if (_rc_locator.given && _rc_locator.name[0]) {
        const tbl *pattrs = static_cast<const tbl *>(c.u_rc_pattrs.ptr);
        const tbl *strings = entry_tbl(sc_tables[ST_PERSISTENT_RESOURCE_ATTRIBUTE].sc_str_tbl);
        size_t n = tbl_used(pattrs) / sizeof(rsrc_pattr_t);
        for (size_t i = 0; i < n; i++) {
            const char *rec = pattrs->tbl_base + i * sizeof(rsrc_pattr_t);
            uint32_t name_off = load<uint32_t>(rec + offsetof(rsrc_pattr_t, u_ra_name));
            if (strings && name_off < tbl_used(strings) &&
                std::strcmp(strings->tbl_base + name_off, _rc_locator.name) == 0) {
                c.rc_locator = uint16_t(load<int32_t>(rec + offsetof(rsrc_pattr_t, ra_attr_id)));
                break;
            }
        }
    }
    _rc_locator = rc_locator_t{};
}

void qecfg_compiler::init_cmmap_tbl() {
    if (cb_rsrc_cmmap.rcm_cb_ID)
        qecfg_error_exit_rtn("Only one ClassToManagerMapping stanza allowed", nullptr, nullptr, 0, 1);
    cb_rsrc_cmmap = rsrc_cmmap_t{};
    cb_rsrc_cmmap.rcm_cb_ID = RSRC_CMMAP_ID;
    cb_rsrc_cmmap.u_rcm_strings = table_ref(new_tbl("CMMapStrings", STRINGS_AU));
}

void qecfg_compiler::cmplt_cmmap_tbl() {
    if (cb_rsrc_cmmap.rcm_first_key > cb_rsrc_cmmap.rcm_last_key)
        statement_error("Error: FirstKey is greater than LastKey.");
    append_record(&rsrc_cmmap_tbl, cb_rsrc_cmmap, rsrc_cmmap_count);
    cb_rsrc_cmmap.rcm_cb_ID = 0;
}

void qecfg_compiler::init_mgr_tbl() {
    if (cb_rsrc_mgr.rm_cb_ID)
        cmplt_mgr_tbl();
    cb_rsrc_mgr = rsrc_mgr_t{};
    cb_rsrc_mgr.rm_cb_ID = RSRC_MGR_ID;
    cb_rsrc_mgr.u_rm_strings_table = table_ref(new_tbl("ManagerStrings", STRINGS_AU));
}

void qecfg_compiler::cmplt_mgr_tbl() {
    cb_rsrc_mgr.rm_id = qel_rm_id_t(rsrc_mgr_count);
    append_record(&rsrc_mgr_tbl, cb_rsrc_mgr, rsrc_mgr_count);
    cb_rsrc_mgr.rm_cb_ID = 0;
}

void qecfg_compiler::init_var_class_tbl() {
    if (cb_rsrc_variable_class.rvc_cb_ID)
        cmplt_var_class_tbl();
    rsrc_variable_class_t &v = cb_rsrc_variable_class;
    v = rsrc_variable_class_t{};
    v.rvc_cb_ID = RSRC_VARIABLE_CLASS_ID;
    v.u_rvc_compat_name = none_ref();
    v.u_rvc_string_tbl = table_ref(new_tbl("VarClassStrings", STRINGS_AU));
    rvc_name_given = false;
}

void qecfg_compiler::cmplt_var_class_tbl() {
    append_record(&rsrc_var_class_tbl, cb_rsrc_variable_class, rsrc_var_class_count);
    rvc_named.push_back(rvc_name_given);
    cb_rsrc_variable_class.rvc_cb_ID = 0;
}

// Appends a section header of a class table with its identifier and a zero
// count, and returns its offset.
uint32_t qecfg_compiler::mk_section(cdb_ref_t rsrc_class_t::*field, size_t size, uint32_t id) {
    tbl *t = static_cast<tbl *>((cb_rsrc_class.*field).ptr);
    char *p = static_cast<char *>(alloc_tble(t, size));
    store<uint32_t>(p, id);
    store<uint32_t>(p + 4, 0);
    return uint32_t(p - t->tbl_base);
}

zu_uint32_t qecfg_compiler::mk_vty_sec() {
    return mk_section(&rsrc_class_t::u_rc_variety_lists, sizeof(variety_list_t), VARIETY_LIST_ID);
}

zu_uint32_t qecfg_compiler::mk_vv_sec() {
    return mk_section(&rsrc_class_t::u_rc_valid_vals, sizeof(valid_values_t), VALID_VALUES_ID);
}

zu_uint32_t qecfg_compiler::mk_sd_sec() {
    return mk_section(&rsrc_class_t::u_rc_sd_defs, sizeof(sd_def_t), SD_DEF_ID);
}
