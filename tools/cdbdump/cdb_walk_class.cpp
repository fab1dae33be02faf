// The class dsect: its record, the layout of its tables, and its attribute
// and action records.
#include "cdb.h"
#include "cdb_names.h"
#include "cdb_walker.h"

namespace cdbdump {

namespace {
// The class's tables in the order they follow the record. The size of each
// comes from a record count (2 bytes) or a byte size (4 bytes) in the record.
struct table_layout {
    size_t ref_field;
    const char *ref_name;
    const char *table;
    size_t size_field;
    unsigned size_width;
    const char *size_name;
    size_t record; // 1 where the size field counts bytes
};

enum {
    T_PATTRS_C,
    T_DATTRS_C,
    T_PATTRS,
    T_DATTRS,
    T_ACTIONS_C,
    T_ACTIONS,
    T_VARIETIES,
    T_SD_DEFS,
    T_VALID_VALS,
    NUM_TABLES
};

#define REF(f) offsetof(rsrc_class_t, f), #f
#define SIZE(f, w) offsetof(rsrc_class_t, f), w, #f
const table_layout class_layout[NUM_TABLES] = {
    {REF(u_rc_pattrsC), "ClassPattrsC", SIZE(rc_num_pattrsC, 2), sizeof(rsrc_pattr_t)},
    {REF(u_rc_dattrsC), "ClassDattrsC", SIZE(rc_num_dattrsC, 2), sizeof(rsrc_dattr_t)},
    {REF(u_rc_pattrs), "ClassPattrs", SIZE(rc_num_pattrs, 2), sizeof(rsrc_pattr_t)},
    {REF(u_rc_dattrs), "ClassDattrs", SIZE(rc_num_dattrs, 2), sizeof(rsrc_dattr_t)},
    {REF(u_rc_actionsC), "ClassActionsC", SIZE(rc_num_actionsC, 2), sizeof(rsrc_action_t)},
    {REF(u_rc_actions), "ClassActions", SIZE(rc_num_actions, 2), sizeof(rsrc_action_t)},
    {REF(u_rc_variety_lists), "ClassVarietyList", SIZE(rc_varlist_size, 4), 1},
    {REF(u_rc_sd_defs), "ClassSDDefs", SIZE(rc_sd_size, 4), 1},
    {REF(u_rc_valid_vals), "ClassValidVals", SIZE(rc_valval_size, 4), 1},
};
// Tables the compiler always leaves empty: their references are 0, their sizes 0.
const table_layout empty_tables[] = {
    {REF(u_rc_errors), "ClassErrors", SIZE(rc_num_errors, 2), sizeof(rsrc_error_t)},
    {REF(u_rc_depends), "ClassDepends", SIZE(rc_num_depends, 2), sizeof(rsrc_depend_t)},
    {REF(u_rc_sbs_defs), "ClassSBSDefs", SIZE(rc_sbs_size, 4), 1},
};
#undef REF
#undef SIZE

#define ATTR_LAYOUT(T)                                                                                                 \
    attr_layout {                                                                                                      \
        offsetof(T, ra_dscr_msgid), offsetof(T, ra_attr_id), offsetof(T, ra_data_type),                                \
            offsetof(T, u_ra_variety_list), offsetof(T, u_ra_valid_vals), offsetof(T, u_ra_sd),                        \
            offsetof(T, ra_max_sd_idx)                                                                                 \
    }
const attr_layout pattr_layout = ATTR_LAYOUT(rsrc_pattr_t);
const attr_layout dattr_layout = ATTR_LAYOUT(rsrc_dattr_t);
#undef ATTR_LAYOUT

std::string indexed(const std::string &path, const char *name, size_t i) {
    return path + "." + name + "[" + std::to_string(i) + "]";
}

} // namespace

bool walker::walk_class_layout(const anchor &a, const std::string &path, class_tables &t, region tables[]) {
    size_t b = a.offset;
    size_t expected = sizeof(rsrc_class_t);
    for (int i = 0; i < NUM_TABLES; i++) {
        const table_layout &l = class_layout[i];
        size_t at = b + l.ref_field;
        std::string field = path + "." + l.ref_name;
        uint32_t start = ref(at, field);
        uint64_t len = num(b + l.size_field, l.size_width, path + "." + l.size_name) * l.record;
        emit(at, 8, field,
             hex(start) + " -> " + l.table + " at " + hex(b + start) + ", " + std::to_string(len) + " bytes");
        check(start == expected, at,
              field + " is " + std::to_string(start) + ", but " + l.table + " belongs at " + std::to_string(expected) +
                  ", after the record and the tables before it");
        if (!check(start <= a.length && len <= a.length - start, at,
                   path + ": " + l.table + " (" + std::to_string(len) + " bytes at " + std::to_string(start) +
                       ") runs past the end of the dsect (" + std::to_string(a.length) + " bytes)"))
            return false;
        tables[i] = region{b + start, size_t(len), l.table};
        expected = start + size_t(len);
    }
    size_t at = b + offsetof(rsrc_class_t, u_rc_strings);
    uint32_t start = ref(at, path + ".u_rc_strings");
    emit(at, 8, path + ".u_rc_strings",
         hex(start) + " -> ClassStrings at " + hex(b + start) + " to the end of the dsect");
    check(start == expected, at,
          path + ".u_rc_strings is " + std::to_string(start) + ", but ClassStrings belongs at " +
              std::to_string(expected) + ", after the record and the tables before it");
    if (!check(start <= a.length, at,
               path + ": ClassStrings at " + std::to_string(start) + " starts past the end of the dsect (" +
                   std::to_string(a.length) + " bytes)"))
        return false;
    t.strings = region{b + start, a.length - start, "ClassStrings"};
    t.varieties = tables[T_VARIETIES];
    t.sd_defs = tables[T_SD_DEFS];
    t.valid_values = tables[T_VALID_VALS];
    return true;
}

void walker::walk_empty_tables(size_t b, const std::string &path) {
    for (const table_layout &l : empty_tables) {
        size_t at = b + l.ref_field;
        uint32_t r = ref(at, path + "." + l.ref_name);
        emit(at, 8, path + "." + l.ref_name, hex(r) + " (" + l.table + " is always empty)");
        check(r == 0, at, path + "." + l.ref_name + " is " + hex(r) + ", expected 0: " + l.table + " is always empty");
        uint64_t size = num(b + l.size_field, l.size_width, path + "." + l.size_name);
        check(size == 0, b + l.size_field,
              path + "." + l.size_name + " is " + std::to_string(size) + ", expected 0: " + l.table +
                  " is always empty");
    }
}

void walker::walk_class_fields(size_t b, const std::string &path, const class_tables &t, class_dsect &c) {
    c.props = uint32_t(num(b + offsetof(rsrc_class_t, rc_props), 4, path + ".rc_props"));
    c.name = string_ref(b + offsetof(rsrc_class_t, u_rc_name), t.strings, path + ".u_rc_name", false).value_or("");
    c.alias = string_ref(b + offsetof(rsrc_class_t, u_rc_alias), t.strings, path + ".u_rc_alias", true);
    c.define_sd = walk_sd_def(b + offsetof(rsrc_class_t, u_rc_def_input), t, path + ".u_rc_def_input");
    c.undefine_sd = walk_sd_def(b + offsetof(rsrc_class_t, u_rc_undef_input), t, path + ".u_rc_undef_input");
    c.online_sd = walk_sd_def(b + offsetof(rsrc_class_t, u_rc_online_input), t, path + ".u_rc_online_input");
    c.offline_sd = walk_sd_def(b + offsetof(rsrc_class_t, u_rc_offline_input), t, path + ".u_rc_offline_input");
    c.reset_sd = walk_sd_def(b + offsetof(rsrc_class_t, u_rc_reset_input), t, path + ".u_rc_reset_input");
    c.perm_temp = uint32_t(num(b + offsetof(rsrc_class_t, rc_perm_temp), 4, path + ".rc_perm_temp"));
    c.perm_temp_class = uint32_t(num(b + offsetof(rsrc_class_t, rc_perm_tempC), 4, path + ".rc_perm_tempC"));
    c.class_id = uint16_t(num(b + offsetof(rsrc_class_t, rc_class_id), 2, path + ".rc_class_id"));
    c.description_msgid = uint16_t(num(b + offsetof(rsrc_class_t, rc_dscr_msgid), 2, path + ".rc_dscr_msgid"));
    c.display_msgid = uint16_t(num(b + offsetof(rsrc_class_t, rc_disp_msgid), 2, path + ".rc_disp_msgid"));
    c.locator = uint16_t(num(b + offsetof(rsrc_class_t, rc_locator), 2, path + ".rc_locator"));
    c.version = uint32_t(get(b + offsetof(rsrc_class_t, rc_version), 4));
    emit(b + offsetof(rsrc_class_t, rc_version), 4, path + ".rc_version",
         hex(c.version) + " (" + version_text(c.version) + ")");
    emit(b + offsetof(rsrc_class_t, rc_spare), 4, path + ".rc_spare", "");
}

class_dsect walker::walk_class(const anchor &a, const std::string &path) {
    class_dsect c;
    size_t b = a.offset;
    if (!dsect_record(a, sizeof(rsrc_class_t), RSRC_CLASS_ID, "class", path, "rc_cb_ID"))
        return c;
    class_tables t;
    region tables[NUM_TABLES];
    walk_empty_tables(b, path);
    if (!walk_class_layout(a, path, t, tables))
        return c;
    walk_class_fields(b, path, t, c);

    // Walks the records of one table into out, through walk(record, path, item).
    auto each = [&](int table, size_t size, const char *name, auto &out, auto walk) {
        out.resize(tables[table].len / size);
        for (size_t i = 0; i < out.size(); i++)
            walk(tables[table].base + i * size, indexed(path, name, i), out[i]);
    };
    std::vector<pending_range> pending;
    auto pattrs = [&](uint32_t id) {
        return [&, id](size_t r, const std::string &p, pattr &x) { walk_pattr(r, p, t, id, x); };
    };
    auto dattrs = [&](uint32_t id) {
        return [&, id](size_t r, const std::string &p, dattr &x) { walk_dattr(r, p, t, id, x, pending); };
    };
    auto actions = [&](uint32_t id) {
        return [&, id](size_t r, const std::string &p, action &x) { walk_action(r, p, t, id, x); };
    };
    each(T_PATTRS_C, sizeof(rsrc_pattr_t), "pattrsC", c.pattrs_class, pattrs(RSRC_PATTR_CLASS_ID));
    each(T_DATTRS_C, sizeof(rsrc_dattr_t), "dattrsC", c.dattrs_class, dattrs(RSRC_DATTR_CLASS_ID));
    each(T_PATTRS, sizeof(rsrc_pattr_t), "pattrs", c.pattrs, pattrs(RSRC_PATTR_RSRC_ID));
    each(T_DATTRS, sizeof(rsrc_dattr_t), "dattrs", c.dattrs, dattrs(RSRC_DATTR_RSRC_ID));
    each(T_ACTIONS_C, sizeof(rsrc_action_t), "actionsC", c.actions_class, actions(RSRC_ACTION_CLASS_ID));
    each(T_ACTIONS, sizeof(rsrc_action_t), "actions", c.actions, actions(RSRC_ACTION_RSRC_ID));
    // Last, so that the bodies every other value designates are known.
    for (const pending_range &p : pending)
        decide_range(p, t);
    return c;
}

void walker::walk_attr_common(size_t rec, const std::string &path, const class_tables &t, const attr_layout &l,
                              attr_common &a) {
    a.props = uint32_t(num(rec + 4, 4, path + ".ra_props"));
    a.name = string_ref(rec + 8, t.strings, path + ".u_ra_name", false).value_or("");
    a.description_msgid = uint16_t(num(rec + l.msgids, 2, path + ".ra_dscr_msgid"));
    a.display_msgid = uint16_t(num(rec + l.msgids + 2, 2, path + ".ra_disp_msgid"));
    a.group_msgid = uint16_t(num(rec + l.msgids + 4, 2, path + ".ra_group_msgid"));
    a.group_id = uint16_t(num(rec + l.msgids + 6, 2, path + ".ra_group_id"));
    a.id = int32_t(uint32_t(num(rec + l.attr_id, 4, path + ".ra_attr_id")));
    a.data_type = uint32_t(get(rec + l.data_type, 4));
    emit(rec + l.data_type, 4, path + ".ra_data_type",
         std::to_string(a.data_type) + " (" + data_type_name(a.data_type) + ")");
    bool typed = check(a.data_type < ZU_NUM_DATA_TYPES, rec + l.data_type,
                       path + ".ra_data_type: data type " + std::to_string(a.data_type) + " is out of range (0 to 22)");
    a.varieties = walk_varieties(rec + l.varieties, t, path + ".u_ra_variety_list");
    if (typed)
        a.vv = walk_valid_values(rec + l.valid_values, zu_element_type(a.data_type), t, path + ".u_ra_valid_vals");
    else
        emit(rec + l.valid_values, 8, path + ".u_ra_valid_vals", "not read: no data type to read it by");
    a.sd = walk_sd_def(rec + l.sd, t, path + ".u_ra_sd");
    a.max_sd_idx = uint16_t(num(rec + l.max_sd_idx, 2, path + ".ra_max_sd_idx"));
}

void walker::attr_value(size_t at, const attr_common &a, const std::string &field, const class_tables &t, value &out) {
    if (zu_is_sd_type(a.data_type) && !a.sd) {
        // A structured attribute without definition keeps its value 0: no body.
        uint64_t v = get(at, 8);
        emit(at, 8, field, hex(v) + " (structured value without definition)");
        check(v == 0, at, field + ": the value of a structured attribute without definition must be 0, not " + hex(v));
        out.type = a.data_type;
        return;
    }
    out = typed_value(at, a.data_type < ZU_NUM_DATA_TYPES ? a.data_type : ZU_UNKNOWN, t, field);
}

void walker::walk_pattr(size_t rec, const std::string &path, const class_tables &t, uint32_t id, pattr &p) {
    p.of_class = id == RSRC_PATTR_CLASS_ID;
    expect_id(rec, id, path + ".ra_cb_ID"); // an annotation labels the fields after a wrong one too
    walk_attr_common(rec, path, t, pattr_layout, p);
    attr_value(rec + offsetof(rsrc_pattr_t, ra_dflt_value), p, path + ".ra_dflt_value", t, p.dflt);
    emit(rec + offsetof(rsrc_pattr_t, ra_reserved2), 6, path + ".ra_reserved2", "");
}

void walker::walk_zero_ref(size_t at, const std::string &field) {
    uint64_t v = get(at, 8);
    emit(at, 8, field, hex(v));
    check(v == 0, at, field + " is " + hex(v) + "; the file keeps 0 there");
}

void walker::walk_dattr(size_t rec, const std::string &path, const class_tables &t, uint32_t id, dattr &d,
                        std::vector<pending_range> &pending) {
    d.of_class = id == RSRC_DATTR_CLASS_ID;
    expect_id(rec, id, path + ".ra_cb_ID"); // an annotation labels the fields after a wrong one too
    walk_attr_common(rec, path, t, dattr_layout, d);
    walk_zero_ref(rec + offsetof(rsrc_dattr_t, u_ra_vclass), path + ".u_ra_vclass");
    walk_zero_ref(rec + offsetof(rsrc_dattr_t, u_ra_next_in_vclass), path + ".u_ra_next_in_vclass");
    walk_zero_ref(rec + offsetof(rsrc_dattr_t, u_ra_XAV_name), path + ".u_ra_XAV_name");
    attr_value(rec + offsetof(rsrc_dattr_t, ra_init_value), d, path + ".ra_init_value", t, d.init);
    size_t vt_at = rec + offsetof(rsrc_dattr_t, ra_var_type);
    d.var_type = uint32_t(get(vt_at, 4));
    emit(vt_at, 4, path + ".ra_var_type", std::to_string(d.var_type) + " (" + var_type_name(d.var_type) + ")");
    check(d.var_type < QEL_NUM_VARIABLE_TYPES, vt_at,
          path + ".ra_var_type: variable type " + std::to_string(d.var_type) + " is out of range (0 to 3)");
    d.expression = string_ref(rec + offsetof(rsrc_dattr_t, u_ra_express), t.strings, path + ".u_ra_express", true);
    d.rearm_expression =
        string_ref(rec + offsetof(rsrc_dattr_t, u_ra_rearm_expr), t.strings, path + ".u_ra_rearm_expr", true);
    d.expr_desc = uint16_t(num(rec + offsetof(rsrc_dattr_t, ra_expr_desc), 2, path + ".ra_expr_desc"));
    d.rearm_desc = uint16_t(num(rec + offsetof(rsrc_dattr_t, ra_rearm_desc), 2, path + ".ra_rearm_desc"));
    d.range_desc = uint16_t(num(rec + offsetof(rsrc_dattr_t, ra_range_desc), 2, path + ".ra_range_desc"));
    num(rec + offsetof(rsrc_dattr_t, ra_report_interval), 2, path + ".ra_report_interval");
    emit(rec + offsetof(rsrc_dattr_t, ra_reserved), 2, path + ".ra_reserved", "");
    if (d.data_type >= ZU_INT32_ARRAY && d.data_type <= ZU_FLOAT64_ARRAY) {
        pending.push_back(pending_range{&d, rec, path});
        return;
    }
    uint32_t type = d.data_type < ZU_NUM_DATA_TYPES ? d.data_type : ZU_UNKNOWN;
    d.min = typed_value(rec + offsetof(rsrc_dattr_t, ra_min_value), type, t, path + ".ra_min_value");
    d.max = typed_value(rec + offsetof(rsrc_dattr_t, ra_max_value), type, t, path + ".ra_max_value");
}

// The range of a numeric array attribute holds plain numbers of the element
// type when a Range statement was given, and one-element arrays of 0 and 100
// otherwise; nothing in the record says which.
bool walker::is_default_range_array(size_t at, uint32_t elem_type, uint64_t expected, const class_tables &t) const {
    uint32_t off = uint32_t(get(at, 4));
    const size_t body_size = ZU_ARRAY_HEADER_SIZE + ZU_ARRAY_ELEMENT_SIZE;
    if (off == CDB_NONE || !fits(t.strings, off, body_size))
        return false;
    size_t body = t.strings.base + off;
    if (get(body, 4) != 1 || claimed(body, body_size))
        return false;
    return get(body + ZU_ARRAY_HEADER_SIZE, is_wide_type(elem_type) ? 8 : 4) == expected;
}

void walker::decide_range(const pending_range &p, const class_tables &t) {
    dattr &d = *p.target;
    uint32_t et = zu_element_type(d.data_type);
    size_t lo = p.record + offsetof(rsrc_dattr_t, ra_min_value);
    size_t hi = p.record + offsetof(rsrc_dattr_t, ra_max_value);
    bool arrays = is_default_range_array(lo, et, 0, t) && is_default_range_array(hi, et, hundred_bits(et), t);
    uint32_t type = arrays ? d.data_type : et;
    d.min = typed_value(lo, type, t, p.path + ".ra_min_value");
    d.max = typed_value(hi, type, t, p.path + ".ra_max_value");
}

void walker::walk_action(size_t rec, const std::string &path, const class_tables &t, uint32_t id, action &x) {
    x.of_class = id == RSRC_ACTION_CLASS_ID;
    expect_id(rec, id, path + ".ac_cb_ID"); // an annotation labels the fields after a wrong one too
    x.id = int32_t(uint32_t(num(rec + offsetof(rsrc_action_t, ac_action_id), 4, path + ".ac_action_id")));
    x.props = uint32_t(num(rec + offsetof(rsrc_action_t, ac_props), 4, path + ".ac_props"));
    x.description_msgid = uint16_t(num(rec + offsetof(rsrc_action_t, ac_dscr_msgid), 2, path + ".ac_dscr_msgid"));
    x.display_msgid = uint16_t(num(rec + offsetof(rsrc_action_t, ac_disp_msgid), 2, path + ".ac_disp_msgid"));
    x.confirm_msgid = uint16_t(num(rec + offsetof(rsrc_action_t, ac_confirm_msgid), 2, path + ".ac_confirm_msgid"));
    x.timeout = uint16_t(num(rec + offsetof(rsrc_action_t, ac_timeout), 2, path + ".ac_timeout"));
    x.perms = uint32_t(num(rec + offsetof(rsrc_action_t, ac_perms), 4, path + ".ac_perms"));
    x.name = string_ref(rec + offsetof(rsrc_action_t, u_ac_name), t.strings, path + ".u_ac_name", false).value_or("");
    x.varieties = walk_varieties(rec + offsetof(rsrc_action_t, u_ac_variety_list), t, path + ".u_ac_variety_list");
    x.sd_input = walk_sd_def(rec + offsetof(rsrc_action_t, u_ac_sd_input), t, path + ".u_ac_sd_input");
    x.sd_response = walk_sd_def(rec + offsetof(rsrc_action_t, u_ac_sd_resp), t, path + ".u_ac_sd_resp");
}

} // namespace cdbdump
