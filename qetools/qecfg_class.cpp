// Class, class-to-manager map and variable-class records, and the starters
// of the variable-length sections inside a class's tables.
#include "qecfg_builders.h"

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

} // namespace

void class_builder::start() {
    rec = rsrc_class_t{};
    rec.rc_cb_ID = RSRC_CLASS_ID;
    rec.u_rc_name = rec.u_rc_alias = rec.u_rc_def_input = rec.u_rc_undef_input = none_ref();
    rec.u_rc_online_input = rec.u_rc_offline_input = rec.u_rc_reset_input = none_ref();
    for (const class_table_def &d : class_tables)
        rec.*d.field = table_ref(arena.new_tbl(d.name, d.au));
}

void class_builder::store_statement(const keyword_row &row, char *v) {
    if (row.what != statement::locator)
        return stanza_builder::store_statement(row, v);
    // Resolved when the class is completed, against its own attributes.
    locator_given = true;
    std::strncpy(locator, v, sizeof locator - 1);
}

// An unnamed class takes the output file name up to its first ".cdef".
void class_builder::name_from_output(const std::string &output_name) {
    size_t pos = output_name.find(".cdef");
    if (pos == std::string::npos)
        raise_fatal(msg::unnamed_class_output, 0);
    std::string name = output_name.substr(0, pos);
    rec.u_rc_name.offset[0] = arena.add_to_tbl(strings(), name.c_str(), name.size() + 1);
}

void class_builder::finish() {
    resolve_locator();
    for (const class_table_def &d : class_tables)
        arena.release_if_empty(rec.*d.field);
    classes.append(arena, rec);
    rec.rc_cb_ID = 0;
}

// The locator is resolved for each class against its own persistent resource
// attributes, then forgotten, so that every class gets its own.
void class_builder::resolve_locator() {
    rec.rc_locator = CDB_NO_LOCATOR;
    if (locator_given && locator[0]) {
        const tbl *pattrs = ref_table(rec.u_rc_pattrs);
        const tbl *st = strings();
        size_t n = tbl_used(pattrs) / sizeof(rsrc_pattr_t);
        for (size_t i = 0; i < n; i++) {
            const char *p = pattrs->tbl_base + i * sizeof(rsrc_pattr_t);
            uint32_t name_off = load<uint32_t>(p + offsetof(rsrc_pattr_t, u_ra_name));
            if (name_off < tbl_used(st) && std::strcmp(st->tbl_base + name_off, locator) == 0) {
                rec.rc_locator = uint16_t(load<int32_t>(p + offsetof(rsrc_pattr_t, ra_attr_id)));
                break;
            }
        }
    }
    locator_given = false;
    std::memset(locator, 0, sizeof locator);
}

// Appends a section header of a class table with its identifier and a zero
// count, and returns its offset.
uint32_t class_builder::new_section(cdb_ref_t rsrc_class_t::*table, size_t size, uint32_t id) {
    tbl *t = ref_table(rec.*table);
    char *p = static_cast<char *>(arena.alloc_tble(t, size));
    store<uint32_t>(p, id);
    store<uint32_t>(p + 4, 0);
    return uint32_t(p - t->tbl_base);
}

void map_builder::start() {
    if (open())
        raise_fatal(msg::second_map, 0);
    rec = rsrc_cmmap_t{};
    rec.rcm_cb_ID = RSRC_CMMAP_ID;
    rec.u_rcm_strings = table_ref(arena.new_tbl("CMMapStrings", STRINGS_AU));
}

void map_builder::store_statement(const keyword_row &row, char *v) {
    if (row.what != statement::resource_manager)
        return stanza_builder::store_statement(row, v);
    // The only manager has the ID 0; its name is its record's first string.
    store<uint16_t>(record() + row.field, 0);
    manager = v;
    manager_given = true;
}

void map_builder::complete() {
    if (rec.rcm_first_key > rec.rcm_last_key)
        statement_error(msg::first_key_above_last);
    maps.append(arena, rec);
    rec.rcm_cb_ID = 0;
}

void var_class_builder::start() {
    if (open())
        complete();
    rec = rsrc_variable_class_t{};
    rec.rvc_cb_ID = RSRC_VARIABLE_CLASS_ID;
    rec.u_rvc_compat_name = none_ref();
    rec.u_rvc_string_tbl = table_ref(arena.new_tbl("VarClassStrings", STRINGS_AU));
    name_given = false;
}

void var_class_builder::store_statement(const keyword_row &row, char *v) {
    stanza_builder::store_statement(row, v);
    if (row.field == offsetof(rsrc_variable_class_t, u_rvc_name))
        name_given = true;
}

void var_class_builder::complete() {
    var_classes.append(arena, rec);
    named.push_back(name_given);
    rec.rvc_cb_ID = 0;
}
