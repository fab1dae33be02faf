// One compile: binding of the keyword table to this compile's control blocks,
// the compile sequence after the source has been read, and the error exits.
#include <cerrno>
#include <cstdlib>
#include <new>

#include "qecfg.h"
#include "qecfg_sink.h"

qecfg_compiler::qecfg_compiler(qecfg_options opts) : opt(std::move(opts)) { bind_sc_tables(); }

qecfg_compiler::~qecfg_compiler() {
    release_output();
    if (cdb_fp)
        std::fclose(cdb_fp);
    for (tbl *t : {&rsrc_class_tbl, &rsrc_cmmap_tbl, &rsrc_mgr_tbl, &rsrc_var_class_tbl})
        std::free(t->tbl_base);
    for (tbl *t : owned_tbls)
        std::free(t->tbl_base);
    for (void *p : owned_blocks)
        std::free(p);
}

void qecfg_compiler::bind_sc_tables() {
    rsrc_class_t &c = cb_rsrc_class;
    for (int i = 0; i < NUM_STANZA_TYPES; i++) {
        const stanza_def &d = stanza_defs[i];
        srtable_ctrl &e = sc_tables[i];
        e = srtable_ctrl{d.name, nullptr, d.num_attrs, nullptr, &c.u_rc_strings, &c.u_rc_variety_lists,
                         &c.u_rc_valid_vals, &c.u_rc_sd_defs, 0, d.req_mask_cmplt, 0, dflt_tbl{}, 0, d.attrs};
        for (int r = 0; r < d.num_attrs; r++)
            attr_name_len[i][r] = std::strlen(d.attrs[r].ta_name);
        if (is_SD_stanza(i)) {
            e.sc_cb = &cb_sd_def;
            e.sc_init_tbl = &qecfg_compiler::init_sd_tbl;
        }
    }
    struct binding {
        stanza_idx i;
        void *cb;
        init_rtn_t init;
        int dt_offset;
    };
    const binding bindings[] = {
        {ST_CONTROL_DEFINITION, &cb_rsrc_class, &qecfg_compiler::init_class_tbl, 0},
        {ST_CLASS_TO_MANAGER_MAPPING, &cb_rsrc_cmmap, &qecfg_compiler::init_cmmap_tbl, 0},
        {ST_RESOURCE_VARIABLE_CLASS, &cb_rsrc_variable_class, &qecfg_compiler::init_var_class_tbl, 0},
        {ST_RESOURCE_CLASS, &cb_rsrc_class, &qecfg_compiler::init_class_tbl_fake, 0},
        {ST_PERSISTENT_RESOURCE_ATTRIBUTE, &cb_rsrc_pattr, &qecfg_compiler::init_pattr_tbl,
         int(offsetof(rsrc_pattr_t, ra_data_type))},
        {ST_PERSISTENT_CLASS_ATTRIBUTE, &cb_rsrc_pattrC, &qecfg_compiler::init_pattrC_tbl,
         int(offsetof(rsrc_pattr_t, ra_data_type))},
        {ST_DYNAMIC_RESOURCE_ATTRIBUTE, &cb_rsrc_dattr, &qecfg_compiler::init_dattr_tbl,
         int(offsetof(rsrc_dattr_t, ra_data_type))},
        {ST_DYNAMIC_CLASS_ATTRIBUTE, &cb_rsrc_dattrC, &qecfg_compiler::init_dattrC_tbl,
         int(offsetof(rsrc_dattr_t, ra_data_type))},
        {ST_CLASS_ACTION, &cb_rsrc_actionC, &qecfg_compiler::init_actionC_tbl, 0},
        {ST_RESOURCE_ACTION, &cb_rsrc_action, &qecfg_compiler::init_action_tbl, 0},
    };
    for (const binding &b : bindings) {
        sc_tables[b.i].sc_cb = b.cb;
        sc_tables[b.i].sc_init_tbl = b.init;
        sc_tables[b.i].dt_offset = b.dt_offset;
    }
    // The map and the variable classes keep strings of their own.
    srtable_ctrl &map = sc_tables[ST_CLASS_TO_MANAGER_MAPPING];
    map.sc_str_tbl = &cb_rsrc_cmmap.u_rcm_strings;
    map.sc_vty_tbl = map.sc_vv_tbl = map.sc_sd_tbl = nullptr;
    srtable_ctrl &rvc = sc_tables[ST_RESOURCE_VARIABLE_CLASS];
    rvc.sc_str_tbl = &cb_rsrc_variable_class.u_rvc_string_tbl;
    rvc.sc_vty_tbl = rvc.sc_vv_tbl = nullptr;
    sc_tables[NUM_STANZA_TYPES] = srtable_ctrl{};
}

void qecfg_compiler::qecfg_error_exit_rtn(const char *msg, const char *v1, const char *v2, int line, int code) {
    if (cdb_fp) {
        std::fclose(cdb_fp);
        cdb_fp = nullptr;
    }
    std::string text;
    if (msg) {
        if (line != 0)
            text = std::to_string(line) + ": ";
        text += msg;
        text += v1 ? v1 : "";
        text += v2 ? v2 : "";
        if (opt.interactive)
            text += "\n";
    }
    throw qecfg_fatal{text, code};
}

void qecfg_compiler::statement_error(const char *msg, const char *v1, const char *v2) {
    qecfg_error_exit_rtn(msg, v1, v2, linenum, 1);
}

void qecfg_compiler::finish_open_records() {
    if (cb_sd_def.sd_cb_ID)
        cmplt_sd_tbl(curr_sd_scp);
    if (cb_rsrc_pattr.ra_cb_ID)
        cmplt_pattr_tbl();
    if (cb_rsrc_dattr.ra_cb_ID)
        cmplt_dattr_tbl();
    if (cb_rsrc_pattrC.ra_cb_ID)
        cmplt_pattrC_tbl();
    if (cb_rsrc_dattrC.ra_cb_ID)
        cmplt_dattrC_tbl();
    if (cb_rsrc_action.ac_cb_ID)
        cmplt_action_tbl();
    if (cb_rsrc_actionC.ac_cb_ID)
        cmplt_actionC_tbl();
}

void qecfg_compiler::build_manager() {
    // The map's ResourceManager statement is the only source of the name.
    if (!rm_name_given)
        qecfg_error_exit_rtn("No ResourceManager defined for the class-to-manager map", nullptr, nullptr, 0, 1);
    init_mgr_tbl();
    tbl *strings = static_cast<tbl *>(cb_rsrc_mgr.u_rm_strings_table.ptr);
    cb_rsrc_mgr.u_rm_RMname = cdb_ref_t{};
    cb_rsrc_mgr.u_rm_RMname.offset[0] = add_to_tbl(strings, rm_name.c_str(), rm_name.size() + 1);
    cmplt_mgr_tbl();
}

void qecfg_compiler::run() {
    try {
        compile();
    } catch (const std::bad_alloc &) {
        // Memory taken by the library's containers runs out like a table's.
        release_output();
        qecfg_error_exit_rtn("cfg_malloc malloc failure: ", std::strerror(ENOMEM), nullptr, 0, ENOMEM);
    }
}

void qecfg_compiler::compile() {
    cache_input_data(opt.cdefsrc.c_str());
    finish_open_records();
    if (!cb_rsrc_class.rc_cb_ID)
        qecfg_error_exit_rtn("No classes defined", nullptr, nullptr, 0, 1);
    cmplt_class_tbl();
    if (cb_rsrc_variable_class.rvc_cb_ID)
        cmplt_var_class_tbl();
    if (!cb_rsrc_cmmap.rcm_cb_ID)
        qecfg_error_exit_rtn("No class-to-manager maps defined", nullptr, nullptr, 0, 1);
    cmplt_cmmap_tbl();
    build_manager();
    bld_var_id_tbls();
    bld_cdb();
}
