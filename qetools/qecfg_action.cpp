// Action stanzas: class and resource actions with their default permission.
#include "qecfg.h"

namespace {

struct action_kind {
    stanza_idx stanza;
    uint32_t id;
    cdb_ref_t rsrc_class_t::*table;
    const char *no_table_msg;
};

const action_kind action_kinds[] = {
    {ST_CLASS_ACTION, RSRC_ACTION_CLASS_ID, &rsrc_class_t::u_rc_actionsC, "Class Action table not found"},
    {ST_RESOURCE_ACTION, RSRC_ACTION_RSRC_ID, &rsrc_class_t::u_rc_actions, "Resource Action table not found"},
};

constexpr uint32_t PERMISSION_BIT = 0x80000004;
constexpr uint32_t DEFAULT_PERMISSION = 0x40; // the letter 's'

const action_kind &action_kind_of(int stanza) { return action_kinds[stanza == ST_CLASS_ACTION ? 0 : 1]; }

} // namespace

rsrc_action_t &qecfg_compiler::action_cb(int stanza) {
    return stanza == ST_CLASS_ACTION ? cb_rsrc_actionC : cb_rsrc_action;
}

void qecfg_compiler::init_action(int stanza) {
    rsrc_action_t &a = action_cb(stanza);
    const action_kind &k = action_kind_of(stanza);
    if (a.ac_cb_ID)
        cmplt_action(stanza);
    if (!cb_rsrc_class.rc_cb_ID)
        statement_error("No class for class action");
    a = rsrc_action_t{};
    a.ac_cb_ID = k.id;
    a.u_ac_variety_list.offset[0] = mk_vty_sec();
    a.u_ac_sd_input.offset[0] = CDB_NONE;
    a.u_ac_sd_resp.offset[0] = CDB_NONE;
    vvdisp_tbl = nullptr;
}

void qecfg_compiler::cmplt_action(int stanza) {
    rsrc_action_t &a = action_cb(stanza);
    const action_kind &k = action_kind_of(stanza);
    if (!cb_rsrc_class.rc_cb_ID)
        statement_error("No class for class action");
    int id = set_table_id(stanza_defs[stanza].name);
    if (id < 0)
        statement_error(k.no_table_msg);
    const srtable_ctrl &e = sc_tables[id];
    if (e.req_mask != e.req_mask_cmplt)
        statement_error("Previous stanza incomplete");
    if ((e.opt_mask & PERMISSION_BIT) != PERMISSION_BIT)
        a.ac_perms = DEFAULT_PERMISSION;
    tbl *table = static_cast<tbl *>((cb_rsrc_class.*k.table).ptr);
    std::memcpy(alloc_tble(table, sizeof a), &a, sizeof a);
    a.ac_cb_ID = 0;
}

void qecfg_compiler::init_action_tbl() { init_action(ST_RESOURCE_ACTION); }
void qecfg_compiler::init_actionC_tbl() { init_action(ST_CLASS_ACTION); }
void qecfg_compiler::cmplt_action_tbl() { cmplt_action(ST_RESOURCE_ACTION); }
void qecfg_compiler::cmplt_actionC_tbl() { cmplt_action(ST_CLASS_ACTION); }
