// The statements every builder stores alike: numbers, texts, property lists,
// versions, varieties, valid values and their display names.
#include <cstdlib>

#include "qecfg_builders.h"

namespace {

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

// The first entry of a list goes into the room of its header; later ones are
// appended directly behind, since nothing else is appended to the table
// while one stanza is read.
uint32_t next_list_entry(table_arena &arena, tbl *t, uint32_t sec, size_t entry_size) {
    uint32_t count = load<uint32_t>(t->tbl_base + sec + 4);
    if (count == 0)
        return sec + 8;
    char *p = static_cast<char *>(arena.alloc_tble(t, entry_size));
    return uint32_t(p - t->tbl_base);
}

void count_entry(tbl *t, uint32_t count_off) {
    store<uint32_t>(t->tbl_base + count_off, load<uint32_t>(t->tbl_base + count_off) + 1);
}

} // namespace

tbl *stanza_builder::class_table(cdb_ref_t rsrc_class_t::*field) const { return ref_table(cls->*field); }

void stanza_builder::store_statement(const keyword_row &row, char *v) {
    char *target = record() + row.field;
    switch (row.what) {
    case statement::number16: store<uint16_t>(target, uint16_t(stmt_int(v))); break;
    case statement::identifier: store<uint32_t>(target, uint32_t(stmt_int(v))); break;
    case statement::text: {
        tbl *st = strings();
        if (!st)
            statement_error(msg::no_strings_table);
        store<uint32_t>(target, arena.add_to_tbl(st, v, std::strlen(v) + 1));
        break;
    }
    case statement::class_properties:
    case statement::pattr_properties:
    case statement::dattr_properties:
    case statement::action_properties: {
        static const struct {
            const props_t *props;
            int count;
        } tables[] = {
            {rc_props, rc_props_cnt}, {pa_props, pa_props_cnt}, {da_props, da_props_cnt}, {act_props, act_props_cnt}};
        auto &k = tables[int(row.what) - int(statement::class_properties)];
        uint32_t w = load<uint32_t>(target);
        set_props(&w, k.props, k.count, v);
        store<uint32_t>(target, w);
        break;
    }
    case statement::version: {
        uint32_t n = 0;
        ver_str_convert(v, &n);
        store<uint32_t>(target, n);
        break;
    }
    case statement::permission_template: store<uint32_t>(target, CDB_PERM_TEMPLATE_GIVEN); break;
    case statement::variety_range: store_variety(target, v); break;
    case statement::value_display_name:
        if (!vvdisp_tbl)
            statement_error(msg::no_valid_value_for_display_name);
        store<uint16_t>(vvdisp_tbl->tbl_base + vvdisp_off, uint16_t(stmt_int(v)));
        break;
    case statement::permission:
        // Only the first letter counts; an unknown one leaves the mask.
        for (const valid_perms_t &p : perm_list)
            if (p.permission == v[0]) {
                store<uint32_t>(target, p.mask);
                break;
            }
        break;
    case statement::list_action: break;
    default: break; // the builder of the stanza has stored it
    }
}

void stanza_builder::store_variety(char *field, char *v) {
    char *comma = std::strchr(v, ',');
    if (!comma)
        statement_error(msg::variety_format);
    *comma = '\0';
    tbl *vt = class_table(&rsrc_class_t::u_rc_variety_lists);
    uint32_t sec = load<uint32_t>(field);
    uint32_t entry = next_list_entry(arena, vt, sec, sizeof(vl_entry));
    const char *high = comma + 1;
    if (std::strchr(high, ','))
        statement_error(msg::too_many_varieties);
    store<uint32_t>(vt->tbl_base + entry + offsetof(vl_entry, vl_high_val), uint32_t(stmt_int(high)));
    store<uint32_t>(vt->tbl_base + entry + offsetof(vl_entry, vl_low_val), uint32_t(stmt_int(v)));
    count_entry(vt, sec + offsetof(variety_list_t, vl_count));
}

void stanza_builder::store_valid_value(uint32_t sec, zu_data_type_t dt, char *v) {
    tbl *vvt = class_table(&rsrc_class_t::u_rc_valid_vals);
    uint32_t entry = next_list_entry(arena, vvt, sec, sizeof(vv_entry));
    value_slot low = value_slot::in(vvt, entry + offsetof(vv_entry, vv_low_val));
    value_slot high = value_slot::in(vvt, entry + offsetof(vv_entry, vv_high_val));
    place_pair(dt, v, low, high);
    vvdisp_tbl = vvt;
    vvdisp_off = entry + offsetof(vv_entry, vv_disp_msgid);
    count_entry(vvt, sec + offsetof(valid_values_t, vv_count));
}

// The high end is converted and placed before the low one, so its body
// comes first in the string table.
void stanza_builder::place_pair(zu_data_type_t dt, char *v, value_slot low, value_slot high) {
    tbl *st = strings();
    zu_data_type_t stype = scalar_zu(dt);
    zu_value_t val{};
    char *comma = std::strchr(v, ',');
    if (comma) {
        *comma = '\0';
        if (str_to_zu(arena, &val, dt, comma + 1) != 0)
            statement_error(msg::invalid_data);
        if (copy_this_type(arena, high, &val, stype, TYPE_SAME, st, nullptr, 0) != 0)
            statement_error(msg::value_not_placed);
        val = zu_value_t{};
        if (str_to_zu(arena, &val, dt, v) != 0 ||
            copy_this_type(arena, low, &val, stype, TYPE_SAME, st, nullptr, 0) != 0)
            statement_error(msg::invalid_data);
        return;
    }
    if (str_to_zu(arena, &val, dt, v) != 0)
        statement_error(msg::invalid_data);
    if (copy_this_type(arena, low, &val, stype, TYPE_SAME, st, nullptr, 0) != 0 ||
        copy_this_type(arena, high, &val, stype, TYPE_SAME, st, nullptr, 0) != 0)
        statement_error(msg::value_not_placed);
}
