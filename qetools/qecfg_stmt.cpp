// Attribute statements: syntax, keyword row lookup, the required-before-
// optional and duplicate rules, and the handlers of every attribute type code.
#include <cstdlib>

#include "qecfg.h"

namespace {

constexpr size_t MAX_VALUE_LEN = 1797;

// The integer of a statement: strtol in base 0, truncated by the caller. A
// short plain decimal number, the usual case, is converted directly.
long stmt_int(const char *v) {
    if (v[0] >= '1' && v[0] <= '9') {
        long n = v[0] - '0';
        int i = 1;
        for (; i < 9 && v[i] >= '0' && v[i] <= '9'; i++)
            n = n * 10 + (v[i] - '0');
        if (v[i] == '\0')
            return n;
    }
    return std::strtol(v, nullptr, 0);
}

bool is_unranged_type(zu_data_type_t dt) {
    switch (dt) {
    case ZU_SD_PTR:
    case ZU_SD_PTR_ARRAY:
    case ZU_CHAR_PTR:
    case ZU_CHAR_PTR_ARRAY:
    case ZU_BINARY_PTR:
    case ZU_BINARY_PTR_ARRAY:
    case ZU_RSRC_HANDLE_PTR:
    case ZU_RSRC_HANDLE_PTR_ARRAY: return true;
    default: return false;
    }
}

} // namespace

tbl *qecfg_compiler::entry_tbl(const cdb_ref_t *field) const {
    return field ? static_cast<tbl *>(field->ptr) : nullptr;
}

uint32_t qecfg_compiler::next_list_entry(tbl *t, uint32_t sec, size_t entry_size) {
    // The first entry goes into the room of the header; later ones are appended
    // directly behind, since nothing else is appended to the table meanwhile.
    uint32_t count = load<uint32_t>(t->tbl_base + sec + 4);
    if (count == 0)
        return sec + 8;
    char *p = static_cast<char *>(alloc_tble(t, entry_size));
    return uint32_t(p - t->tbl_base);
}

void qecfg_compiler::save_attr(char *il, int table_id) {
    srtable_ctrl *e = &sc_tables[table_id];
    char *name = il;
    while (*name == ' ' || *name == '\t')
        name++;
    if (!*name)
        return;
    char *eq = std::strchr(name, '=');
    if (!eq)
        statement_error("Missing '=' after attribute name");
    *eq = '\0';
    char *value = eq + 1;
    if (std::strcmp(value, "\"\"") == 0)
        return;
    value = strip_quotes(value);
    if (!value)
        statement_error("Unmatched double quotes for attribute: ", name);
    if (std::strlen(value) > MAX_VALUE_LEN)
        statement_error("Attibute value exceeds maximum length: ", name);
    const table_attrs *row = nullptr;
    size_t name_len = size_t(eq - name);
    for (int i = 0; i < e->sc_num_attrs_in_table && !row; i++)
        if (attr_name_len[table_id][i] == name_len && std::memcmp(e->sc_attrs[i].ta_name, name, name_len) == 0)
            row = &e->sc_attrs[i];
    if (!row)
        statement_error("Attribute name not defined in table (name/table): ", name, e->sc_name);
    if (!*value) {
        QECFG_TRACE(*this, "In file %s: ", opt.cdefsrc.c_str());
        statement_error("Missing attribute value: ", name);
    }
    if (opt.debugLevel > 1)
        QECFG_TRACE(*this, "%s: found attr: \"%s\", value: \"%s\",length: %d\n", e->sc_name, name, value,
                    int(std::strlen(value)));
    apply_masks(e, row, name);
    char *target = static_cast<char *>(e->sc_cb) + row->ta_offset;
    dispatch_statement(e, table_id, row->ta_type, target, value);
}

void qecfg_compiler::apply_masks(srtable_ctrl *e, const table_attrs *row, const char *name) {
    uint32_t bit = row->req_bit;
    if (bit & OPTIONAL_BIT) {
        if (e->req_mask != e->req_mask_cmplt)
            statement_error("Optional attribute discovered before all required attributes have been defined", name);
        if ((e->opt_mask & bit & ~OPTIONAL_BIT) && !row->dup_allowed)
            statement_error("Already defined. Duplicated definitions not allowed for ", name);
        e->opt_mask |= bit;
        return;
    }
    if ((e->req_mask & bit) && !row->dup_allowed)
        statement_error("Already defined. Duplicated definitions not allowed for ", name);
    e->req_mask |= bit;
    if (opt.debugLevel > 1)
        QECFG_TRACE(*this, "Added %x to mask, which is now %x\n", bit, e->req_mask);
}

void qecfg_compiler::dispatch_statement(srtable_ctrl *e, int table_id, int code, char *target, char *v) {
    switch (code) {
    case 0: store<uint8_t>(target, uint8_t(stmt_int(v))); break;
    case 1: store<uint16_t>(target, uint16_t(stmt_int(v))); break;
    case 2:
    case 9: store<uint32_t>(target, uint32_t(stmt_int(v))); break;
    case 3: store_string(e, target, v); break;
    case 4: store_props(target, rc_props, rc_props_cnt, v); break;
    case 11: store_props(target, pa_props, pa_props_cnt, v); break;
    case 12: store_props(target, da_props, da_props_cnt, v); break;
    case 13: store_props(target, act_props, act_props_cnt, v); break;
    case 5: {
        uint32_t n = 0;
        ver_str_convert(v, &n);
        store<uint32_t>(target, n);
        break;
    }
    case 6: store<uint32_t>(target, 0xEEEEEEEE); break;
    case 7:
        store<uint16_t>(target, 0);
        rm_name = v;
        rm_name_given = true;
        break;
    case 8:
        _rc_locator.given = true;
        std::strncpy(_rc_locator.name, v, sizeof _rc_locator.name - 1);
        break;
    case 10: store_variety(e, target, v); break;
    case 14: store_attr_valid_value(e, table_id, target, v); break;
    case 15:
    case 20: store_default(e, v); break;
    case 16:
    case 27: store_display_name(v); break;
    case 17: store_data_type(e, table_id, target, v); break;
    case 18: {
        qel_variable_type_t t = QEL_COUNTER;
        if (strToVar(v, &t) != 0)
            statement_error("Invalid variable type");
        store<uint32_t>(target, t);
        break;
    }
    case 19: store_range(e, table_id, target, v); break;
    case 29:
    case 30: break;
    case 31: store_permission(target, v); break;
    default: save_element_attr(e, code, v); break;
    }
}

void qecfg_compiler::store_string(srtable_ctrl *e, char *target, const char *v) {
    tbl *st = entry_tbl(e->sc_str_tbl);
    if (!st)
        statement_error("No tbl for strings table");
    store<uint32_t>(target, add_to_tbl(st, v, std::strlen(v) + 1));
    if (e == &sc_tables[ST_RESOURCE_VARIABLE_CLASS] && target == reinterpret_cast<char *>(&cb_rsrc_variable_class.u_rvc_name))
        rvc_name_given = true;
}

void qecfg_compiler::store_props(char *target, const props_t *props, int cnt, char *v) {
    uint32_t w = load<uint32_t>(target);
    set_props(&w, props, cnt, v);
    store<uint32_t>(target, w);
}

void qecfg_compiler::store_permission(char *target, const char *v) {
    for (int i = 0; i < num_perm_list; i++)
        if (perm_list[i].permission == v[0]) {
            store<uint32_t>(target, perm_list[i].mask);
            return;
        }
}

void qecfg_compiler::store_variety(srtable_ctrl *e, char *target, char *v) {
    char *comma = std::strchr(v, ',');
    if (!comma)
        statement_error("Incorrect variety format");
    *comma = '\0';
    tbl *vt = entry_tbl(e->sc_vty_tbl);
    uint32_t sec = load<uint32_t>(target);
    uint32_t entry = next_list_entry(vt, sec, sizeof(vl_entry));
    const char *high = comma + 1;
    if (std::strchr(high, ','))
        statement_error("Too many varieties");
    store<uint32_t>(vt->tbl_base + entry + offsetof(vl_entry, vl_high_val), uint32_t(stmt_int(high)));
    store<uint32_t>(vt->tbl_base + entry + offsetof(vl_entry, vl_low_val), uint32_t(stmt_int(v)));
    char *count = vt->tbl_base + sec + offsetof(variety_list_t, vl_count);
    store<uint32_t>(count, load<uint32_t>(count) + 1);
}

uint16_t *qecfg_compiler::vv_found_flag(int table_id) {
    switch (table_id) {
    case ST_PERSISTENT_RESOURCE_ATTRIBUTE: return &pattr_vv_found;
    case ST_PERSISTENT_CLASS_ATTRIBUTE: return &pattrC_vv_found;
    case ST_DYNAMIC_RESOURCE_ATTRIBUTE: return &dattr_vv_found;
    default: return &dattrC_vv_found;
    }
}

zu_data_type_t qecfg_compiler::attr_data_type(const srtable_ctrl *e) const {
    return load<zu_data_type_t>(static_cast<const char *>(e->sc_cb) + e->dt_offset);
}

void qecfg_compiler::store_attr_valid_value(srtable_ctrl *e, int table_id, char *target, char *v) {
    uint16_t *found = vv_found_flag(table_id);
    if (!*found) {
        store<uint32_t>(target, mk_vv_sec());
        *found = 1;
    }
    store_valid_value(e, load<uint32_t>(target), attr_data_type(e), v);
}

// One valid value (or a low,high pair) into the next entry of a section.
void qecfg_compiler::store_valid_value(srtable_ctrl *e, uint32_t sec, zu_data_type_t dt, char *v) {
    tbl *vvt = entry_tbl(e->sc_vv_tbl);
    tbl *st = entry_tbl(e->sc_str_tbl);
    uint32_t entry = next_list_entry(vvt, sec, sizeof(vv_entry));
    value_slot low = value_slot::in(vvt, entry + offsetof(vv_entry, vv_low_val));
    value_slot high = value_slot::in(vvt, entry + offsetof(vv_entry, vv_high_val));
    place_pair(dt, v, low, high, st);
    vvdisp_tbl = vvt;
    vvdisp_off = entry + offsetof(vv_entry, vv_disp_msgid);
    char *count = vvt->tbl_base + sec + offsetof(valid_values_t, vv_count);
    store<uint32_t>(count, load<uint32_t>(count) + 1);
}

// Converts "low,high" (or a single value for both) and places both ends.
void qecfg_compiler::place_pair(zu_data_type_t dt, char *v, value_slot low, value_slot high, tbl *st) {
    zu_data_type_t stype = scalar_zu(dt);
    zu_value_t val{};
    char *comma = std::strchr(v, ',');
    if (comma) {
        *comma = '\0';
        if (str_to_zu(&val, dt, comma + 1) != 0)
            statement_error("str_to_zu: Invalid data");
        if (copy_this_type(high, &val, stype, TYPE_SAME, st, nullptr, 0) != 0)
            statement_error("copy_this_type error");
        val = zu_value_t{};
        if (str_to_zu(&val, dt, v) != 0 || copy_this_type(low, &val, stype, TYPE_SAME, st, nullptr, 0) != 0)
            statement_error("str_to_zu: Invalid data");
        return;
    }
    if (str_to_zu(&val, dt, v) != 0)
        statement_error("str_to_zu: Invalid data");
    if (copy_this_type(low, &val, stype, TYPE_SAME, st, nullptr, 0) != 0 ||
        copy_this_type(high, &val, stype, TYPE_SAME, st, nullptr, 0) != 0)
        statement_error("copy_this_type error");
}

void qecfg_compiler::store_default(srtable_ctrl *e, const char *v) {
    zu_data_type_t dt = attr_data_type(e);
    if (dt == ZU_SD_PTR || dt == ZU_SD_PTR_ARRAY)
        statement_error("Default values not expected; place default values in individual *SDDef stanzas.");
    if (!e->dflt.tbl)
        e->dflt.tbl = new_tbl(DEFAULT_VALUES_TBL, 32);
    char *slot = static_cast<char *>(alloc_tble(e->dflt.tbl, sizeof(zu_value_t)));
    zu_value_t val{};
    if (str_to_zu(&val, dt, v) != 0)
        statement_error("str_to_zu: Invalid data");
    std::memcpy(slot, &val, sizeof val);
    e->dflt.num_elems++;
}

void qecfg_compiler::store_display_name(const char *v) {
    if (!vvdisp_tbl)
        statement_error("No ValidValue to attach ValueDisplayName to.");
    store<uint16_t>(vvdisp_tbl->tbl_base + vvdisp_off, uint16_t(stmt_int(v)));
}

void qecfg_compiler::store_data_type(srtable_ctrl *e, int table_id, char *target, const char *v) {
    zu_data_type_t dt = strToZuDt(v);
    store<uint32_t>(target, dt);
    if (dt == ZU_UNKNOWN)
        statement_error("Invalid data type");
    if (dt != ZU_SD_PTR && dt != ZU_SD_PTR_ARRAY)
        return;
    // The attribute owns a structured-data definition, which must follow.
    char *cb = static_cast<char *>(e->sc_cb);
    bool dynamic = table_id == ST_DYNAMIC_RESOURCE_ATTRIBUTE || table_id == ST_DYNAMIC_CLASS_ATTRIBUTE;
    if (dynamic) {
        attr_dflt_val = cb + offsetof(rsrc_dattr_t, ra_init_value);
        curr_sd_tbl = reinterpret_cast<cdb_ref_t *>(cb + offsetof(rsrc_dattr_t, u_ra_sd));
        max_sd_idx = cb + offsetof(rsrc_dattr_t, ra_max_sd_idx);
    } else {
        attr_dflt_val = cb + offsetof(rsrc_pattr_t, ra_dflt_value);
        curr_sd_tbl = reinterpret_cast<cdb_ref_t *>(cb + offsetof(rsrc_pattr_t, u_ra_sd));
        max_sd_idx = cb + offsetof(rsrc_pattr_t, ra_max_sd_idx);
    }
    sd_attr_type = dynamic ? 1 : 0;
    e->dflt.tbl = new_tbl(dt == ZU_SD_PTR ? "ZU_SD_PTR" : "ZU_SD_PTR_ARRAY", 32);
}

void qecfg_compiler::store_range(srtable_ctrl *e, int table_id, char *target, char *v) {
    zu_data_type_t dt = attr_data_type(e);
    if (is_unranged_type(dt))
        return;
    if (table_id == ST_DYNAMIC_RESOURCE_ATTRIBUTE)
        dattr_range_found = 1;
    else
        dattrC_range_found = 1;
    if (!std::strchr(v, ','))
        statement_error("Range requires two values");
    place_pair(dt, v, value_slot::at(target), value_slot::at(target + sizeof(zu_value_t)), entry_tbl(e->sc_str_tbl));
}

// The element statements of the structured-data stanzas fill the element
// being built, the first field slot of the definition's control block.
void qecfg_compiler::save_element_attr(srtable_ctrl *e, int code, char *v) {
    sd_field &el = cb_sd_def.sd_fields[0];
    switch (code) {
    case 21: store_element_index(v); break;
    case 22: {
        tbl *st = entry_tbl(e->sc_str_tbl);
        if (!st)
            statement_error("No tbl for strings table");
        el.u_sd_field_name = cdb_ref_t{};
        el.u_sd_field_name.offset[0] = add_to_tbl(st, v, std::strlen(v) + 1);
        sd_name_found = 1;
        break;
    }
    case 23:
        el.sd_dscr_msgid = uint16_t(stmt_int(v));
        sd_desc_found = 1;
        break;
    case 24:
        el.sd_disp_msgid = uint16_t(stmt_int(v));
        sd_disp_found = 1;
        break;
    case 25: store_element_type(e, v); break;
    case 26: {
        if (!sd_vv_found) {
            el.u_sd_valid_vals = cdb_ref_t{};
            el.u_sd_valid_vals.offset[0] = mk_vv_sec();
            sd_vv_found = 1;
        }
        store_valid_value(e, el.u_sd_valid_vals.offset[0], el.sd_field_type, v);
        break;
    }
    default: statement_error("Sorry, default SD values are not yet supported"); break;
    }
}

void qecfg_compiler::store_element_index(const char *v) {
    zu_value_t val{};
    if (str_to_zu(&val, ZU_UINT32, v) != 0)
        statement_error("str_to_zu: Invalid data");
    curr_sdeli = int(val.val_uint32);
    if (curr_sdeli != expected_sdeli) {
        QECFG_TRACE(*this, "curr_sdel = %d, expected_sdeli = %d\n", curr_sdeli, expected_sdeli);
        statement_error("ElementIndeces must be consecutive");
    }
    expected_sdeli = int(unsigned(curr_sdeli) + 1);
}

void qecfg_compiler::store_element_type(srtable_ctrl *e, const char *v) {
    zu_data_type_t type = strToZuDt(v);
    if (type == ZU_SD_PTR || type == ZU_SD_PTR_ARRAY)
        statement_error("SD elements cannot be of SD type");
    cb_sd_def.sd_fields[0].sd_field_type = type;
    sd_dt_found = 1;
    if (!attr_dflt_val)
        return;
    // The attribute's default list, handed on by the reader, collects the
    // element types in order.
    char *slot = static_cast<char *>(alloc_tble(e->dflt.tbl, sizeof(zu_value_t)));
    store<uint32_t>(slot, type);
    e->dflt.num_elems++;
    sd_num_elems++;
}
