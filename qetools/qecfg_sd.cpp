// Structured-data definitions: runs of element stanzas framed into one
// definition in "ClassSDDefs", attached to their owner, and the structured
// default value of an attribute built from the element types.
#include "qecfg.h"

cdb_ref_t *qecfg_compiler::sd_owner_field(int table_id) {
    rsrc_class_t &c = cb_rsrc_class;
    rsrc_action_t &a = cb_rsrc_actionC.ac_cb_ID ? cb_rsrc_actionC : cb_rsrc_action;
    switch (SD_stanza_type(table_id)) {
    case SD_TYPE_ONLINE: return &c.u_rc_online_input;
    case SD_TYPE_OFFLINE: return &c.u_rc_offline_input;
    case SD_TYPE_DEFINE: return &c.u_rc_def_input;
    case SD_TYPE_UNDEFINE: return &c.u_rc_undef_input;
    case SD_TYPE_RESET: return &c.u_rc_reset_input;
    case SD_TYPE_ACT_IN: return &a.u_ac_sd_input;
    case SD_TYPE_ACT_RESP: return &a.u_ac_sd_resp;
    default: return curr_sd_tbl; // set by the attribute's DataType statement
    }
}

void qecfg_compiler::start_sd_header(int table_id) {
    srtable_ctrl *scp = &sc_tables[table_id];
    bool attr_kind = is_attr_SD(table_id);
    // Without a class there is no structured attribute either: an attribute
    // run is refused for its missing owner, as after a ResourceClass.
    if (!cb_rsrc_class.rc_cb_ID)
        statement_error(attr_kind ? "Incorrect attribute type preceding this SD definition"
                                  : "No class for SD Definition");
    bool completed = false;
    if (prev_scp && std::strcmp(prev_scp->sc_name, scp->sc_name) != 0 && cb_sd_def.sd_cb_ID) {
        cmplt_sd_tbl(prev_scp);
        completed = true;
    }
    if (!cb_sd_def.sd_cb_ID)
        check_new_definition(table_id);
    if (completed && !attr_kind) {
        // The definition that follows no longer belongs to an attribute.
        attr_dflt_val = max_sd_idx = nullptr;
        curr_sd_tbl = nullptr;
    }
    if (attr_kind && attr_dflt_val && prev_scp)
        scp->dflt = prev_scp->dflt;
    if (!cb_sd_def.sd_cb_ID) {
        if (attr_kind && !attr_dflt_val)
            statement_error("Incorrect attribute type preceding this SD definition");
        if (!curr_sd_tbl)
            curr_sd_tbl = sd_owner_field(table_id);
        store<uint32_t>(curr_sd_tbl, mk_sd_sec());
        sd_num_elems = 0;
        if (!attr_kind)
            scp->dflt = dflt_tbl{};
    }
    init_sd_tbl();
    scp->req_mask = scp->opt_mask = 0;
}

// A definition starts: refuse owners that are missing, that still wait for
// their own definition, or that already have one.
void qecfg_compiler::check_new_definition(int table_id) {
    bool attr_kind = is_attr_SD(table_id);
    sd_type_t kind = SD_stanza_type(table_id);
    bool action_kind = kind == SD_TYPE_ACT_IN || kind == SD_TYPE_ACT_RESP;
    if (action_kind && !cb_rsrc_actionC.ac_cb_ID && !cb_rsrc_action.ac_cb_ID)
        statement_error("No action for this SD definition");
    bool attr_waiting = attr_dflt_val && curr_sd_tbl && load<uint32_t>(curr_sd_tbl) == CDB_NONE;
    if (!attr_kind && attr_waiting)
        statement_error("Expected an attribute SD definition for the preceding attribute");
    if (attr_kind) {
        if (attr_dflt_val && curr_sd_tbl && load<uint32_t>(curr_sd_tbl) != CDB_NONE)
            statement_error("Only one SD definition allowed per attribute");
        return;
    }
    if (load<uint32_t>(sd_owner_field(table_id)) != CDB_NONE)
        statement_error("Only one SD definition of this kind allowed");
}

void qecfg_compiler::init_sd_tbl() {
    if (!cb_rsrc_class.rc_cb_ID)
        statement_error("No class for SD Definition");
    if (cb_sd_def.sd_cb_ID)
        append_pending_element();
    cb_sd_def = sd_def_t{};
    cb_sd_def.sd_cb_ID = SD_DEF_ID;
    vvdisp_tbl = nullptr;
    sd_vv_found = 0;
}

void qecfg_compiler::append_pending_element() {
    if (!sd_name_found || !sd_desc_found || !sd_disp_found || !sd_dt_found)
        statement_error("Previous stanza incomplete");
    sd_name_found = sd_desc_found = sd_disp_found = sd_dt_found = 0;
    tbl *sdt = entry_tbl(sc_tables[ST_DEFINE_SD].sc_sd_tbl);
    if (!sdt)
        statement_error("No Class SD table for SD Definition");
    uint32_t def = load<uint32_t>(curr_sd_tbl);
    uint32_t count = load<uint32_t>(sdt->tbl_base + def + offsetof(sd_def_t, sd_count));
    uint32_t field = def + offsetof(sd_def_t, sd_fields);
    if (count != 0)
        field = uint32_t(static_cast<char *>(alloc_tble(sdt, sizeof(sd_field))) - sdt->tbl_base);
    sd_field el = cb_sd_def.sd_fields[0];
    el.sd_action_id = 0xFFFF;
    el.sd_valid_type = 1;
    if (!sd_vv_found) {
        el.u_sd_valid_vals = cdb_ref_t{};
        el.u_sd_valid_vals.offset[0] = CDB_NONE;
    }
    sd_vv_found = 0;
    std::memcpy(sdt->tbl_base + field, &el, sizeof el);
    store<uint32_t>(sdt->tbl_base + def + offsetof(sd_def_t, sd_count), count + 1);
}

void qecfg_compiler::cmplt_sd_tbl(srtable_ctrl *scp) {
    if (!cb_rsrc_class.rc_cb_ID)
        statement_error("No class for SD Definition");
    init_sd_tbl();
    int table_id = int(scp - sc_tables);
    if (is_attr_SD(table_id) && attr_dflt_val && scp->dflt.tbl) {
        zu_data_type_t dt = std::strcmp(scp->dflt.tbl->tbl_name, "ZU_SD_PTR") == 0 ? ZU_SD_PTR : ZU_SD_PTR_ARRAY;
        scp->dflt.num_elems = sd_num_elems;
        dump_dflt(entry_tbl(scp->sc_str_tbl), scp->dflt, value_slot::at(attr_dflt_val), dt);
    }
    if (is_attr_SD(table_id) && max_sd_idx)
        store<uint16_t>(max_sd_idx, uint16_t(curr_sdeli));
    curr_sdeli = -1;
    expected_sdeli = 0;
    cb_sd_def.sd_cb_ID = 0;
}
