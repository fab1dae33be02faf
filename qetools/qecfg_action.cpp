// Action stanzas: class and resource actions with their default permission.
#include "qecfg_builders.h"

action_builder::action_builder(table_arena &arena, class_builder &owner, int stanza)
    : stanza_builder(arena, &owner.rec), owner(owner), stanza(stanza) {}

void action_builder::start() {
    if (open())
        complete();
    if (!owner.open())
        statement_error(msg::no_class_for_action);
    rec = rsrc_action_t{};
    rec.ac_cb_ID = stanza == ST_CLASS_ACTION ? RSRC_ACTION_CLASS_ID : RSRC_ACTION_RSRC_ID;
    rec.u_ac_variety_list.offset[0] =
        owner.new_section(&rsrc_class_t::u_rc_variety_lists, sizeof(variety_list_t), VARIETY_LIST_ID);
    rec.u_ac_sd_input.offset[0] = CDB_NONE;
    rec.u_ac_sd_resp.offset[0] = CDB_NONE;
    vvdisp_tbl = nullptr;
}

void action_builder::complete() {
    if (given.required != stanza_defs[stanza].required_mask)
        statement_error(msg::incomplete_stanza);
    if (!given.has(row_named(stanza, kw::Permission)))
        rec.ac_perms = CDB_DEFAULT_PERMISSION;
    tbl *table = class_table(stanza == ST_CLASS_ACTION ? &rsrc_class_t::u_rc_actionsC : &rsrc_class_t::u_rc_actions);
    std::memcpy(arena.alloc_tble(table, sizeof rec), &rec, sizeof rec);
    rec.ac_cb_ID = 0;
}
