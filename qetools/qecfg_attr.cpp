// Attribute stanzas: persistent and dynamic attributes, of a resource or of
// the class; their statements, and their completion, which supplies every
// value the source left out.
#include "qecfg_builders.h"

namespace {

struct attr_kind {
    uint32_t id;
    cdb_ref_t rsrc_class_t::*table;
    msg no_class;
};

// By stanza type, from PersistentResourceAttribute on.
const attr_kind attr_kinds[] = {
    {RSRC_PATTR_RSRC_ID, &rsrc_class_t::u_rc_pattrs, msg::no_class_for_persistent_attribute},
    {RSRC_PATTR_CLASS_ID, &rsrc_class_t::u_rc_pattrsC, msg::no_class_for_persistent_class_attribute},
    {RSRC_DATTR_RSRC_ID, &rsrc_class_t::u_rc_dattrs, msg::no_class_for_dynamic_attribute},
    {RSRC_DATTR_CLASS_ID, &rsrc_class_t::u_rc_dattrsC, msg::no_class_for_dynamic_attribute},
};

const attr_kind &kind_of(int stanza) { return attr_kinds[stanza - ST_PERSISTENT_RESOURCE_ATTRIBUTE]; }

void set_none(char *field) { store(field, none_ref()); }

} // namespace

attr_builder::attr_builder(table_arena &arena, FILE *trace, class_builder &owner, int stanza,
                           std::set<std::pair<const tbl *, size_t>> &numeric_ranges)
    : stanza_builder(arena, &owner.rec), trace(trace), owner(owner), stanza(stanza),
      dynamic_(stanza == ST_DYNAMIC_RESOURCE_ATTRIBUTE || stanza == ST_DYNAMIC_CLASS_ATTRIBUTE),
      numeric_ranges(numeric_ranges) {
    values.t.tbl_au = element_types.t.tbl_au = 32;
    values.t.tbl_name = "DefaultValues";
}

zu_data_type_t attr_builder::data_type() const {
    return dynamic_ ? zu_data_type_t(rec.d.ra_data_type) : zu_data_type_t(rec.p.ra_data_type);
}

cdb_ref_t &attr_builder::sd_ref() { return dynamic_ ? rec.d.u_ra_sd : rec.p.u_ra_sd; }

void attr_builder::set_max_sd_idx(uint16_t idx) { (dynamic_ ? rec.d.ra_max_sd_idx : rec.p.ra_max_sd_idx) = idx; }

value_slot attr_builder::value_field() {
    return value_slot::at(field(offsetof(rsrc_pattr_t, ra_dflt_value), offsetof(rsrc_dattr_t, ra_init_value)));
}

void attr_builder::start() {
    if (open())
        complete();
    if (!owner.open())
        statement_error(kind_of(stanza).no_class);
    if (dynamic_) {
        rec.d = rsrc_dattr_t{};
        rec.d.ra_cb_ID = kind_of(stanza).id;
        rec.d.u_ra_variety_list.offset[0] =
            owner.new_section(&rsrc_class_t::u_rc_variety_lists, sizeof(variety_list_t), VARIETY_LIST_ID);
        rec.d.u_ra_express = rec.d.u_ra_vclass = rec.d.u_ra_rearm_expr = rec.d.u_ra_sd = none_ref();
        rec.d.ra_max_sd_idx = CDB_NO_SD_INDEX;
    } else {
        rec.p = rsrc_pattr_t{};
        rec.p.ra_cb_ID = kind_of(stanza).id;
        rec.p.u_ra_variety_list.offset[0] =
            owner.new_section(&rsrc_class_t::u_rc_variety_lists, sizeof(variety_list_t), VARIETY_LIST_ID);
        rec.p.u_ra_sd = none_ref();
        rec.p.ra_max_sd_idx = CDB_NO_SD_INDEX;
    }
    vvdisp_tbl = nullptr;
    valid_values_started = range_given = false;
    // The lists of the previous attribute are spent.
    values.t.release();
    element_types.t.release();
}

void attr_builder::store_statement(const keyword_row &row, char *v) {
    char *target = record() + row.field;
    switch (row.what) {
    case statement::valid_value: store_valid_value_statement(target, v); break;
    case statement::default_value:
    case statement::initial_value: store_default(v); break;
    case statement::data_type: store_data_type(target, v); break;
    case statement::variable_type: {
        qel_variable_type_t t = QEL_COUNTER;
        if (strToVar(v, &t) != 0)
            statement_error(msg::invalid_variable_type);
        store<uint32_t>(target, t);
        break;
    }
    case statement::range: store_range(target, v); break;
    default: stanza_builder::store_statement(row, v); break;
    }
}

void attr_builder::store_valid_value_statement(char *target, char *v) {
    if (!valid_values_started) {
        store<uint32_t>(target,
                        owner.new_section(&rsrc_class_t::u_rc_valid_vals, sizeof(valid_values_t), VALID_VALUES_ID));
        valid_values_started = true;
    }
    store_valid_value(load<uint32_t>(target), data_type(), v);
}

// The slot is taken before the value is converted, as its trace shows.
void attr_builder::store_default(const char *v) {
    zu_data_type_t dt = data_type();
    if (zu_is_sd_type(dt))
        statement_error(msg::default_for_structured);
    char *slot = values.take(arena);
    zu_value_t val{};
    if (str_to_zu(arena, &val, dt, v) != 0)
        statement_error(msg::invalid_data);
    store(slot, val);
}

void attr_builder::store_data_type(char *target, const char *v) {
    zu_data_type_t dt = strToZuDt(v);
    store<uint32_t>(target, dt);
    if (dt == ZU_UNKNOWN)
        statement_error(msg::invalid_data_type);
    // A structured attribute collects the element types of the run that
    // must follow, in a list named after its type.
    if (zu_is_sd_type(dt))
        element_types.t.tbl_name = dt == ZU_SD_PTR ? "ZU_SD_PTR" : "ZU_SD_PTR_ARRAY";
}

void attr_builder::store_range(char *target, char *v) {
    zu_data_type_t dt = data_type();
    if (zu_is_unordered_type(dt))
        return;
    range_given = true;
    if (!std::strchr(v, ','))
        statement_error(msg::range_needs_two_values);
    place_pair(dt, v, value_slot::at(target), value_slot::at(target + sizeof(zu_value_t)));
}

void attr_builder::add_element_type(zu_data_type_t type) { store(element_types.take(arena), type); }

// Each element gets the default of its type; an array-typed element an
// array of its own.
void attr_builder::build_structured_value() {
    body_cursor array, sd_array, sd_element;
    uint32_t n = uint32_t(element_types.size());
    int code = dynamic_ ? INIT_DEFAULT : DFLT_DEFAULT;
    for (uint32_t i = 0; i < n; i++) {
        array = body_cursor{};
        if (copy_this_sd_type(arena, value_field(), element_types.at(i), code, strings(), &array, &sd_array,
                              &sd_element, n, data_type()) != 0)
            statement_error(dynamic_ ? msg::structured_initial_not_built : msg::structured_default_not_built);
    }
}

void attr_builder::complete() {
    if (given.required != stanza_defs[stanza].required_mask) {
        if (stanza == ST_DYNAMIC_CLASS_ATTRIBUTE) {
            std::fprintf(trace, "scp->req_mask:         %x\n", given.required);
            std::fprintf(trace, "scp->req_mask_cmplt:   %x\n", stanza_defs[stanza].required_mask);
        }
        statement_error(msg::incomplete_stanza);
    }
    if (!valid_values_started)
        set_none(field(offsetof(rsrc_pattr_t, u_ra_valid_vals), offsetof(rsrc_dattr_t, u_ra_valid_vals)));
    valid_values_started = false;
    tbl *table = class_table(kind_of(stanza).table);
    if (dynamic_)
        complete_range();
    complete_value();
    if (dynamic_) {
        if (!given.has(row_named(stanza, kw::GroupID)))
            rec.d.ra_group_id = CDB_DEFAULT_GROUP_ID;
    } else if (!(rec.p.ra_props & (CDB_PA_REQD_FOR_DEFINE | CDB_PA_OPT_FOR_DEFINE))) {
        rec.p.ra_props |= CDB_PA_INVAL_FOR_DEFINE;
    }
    size_t size = dynamic_ ? sizeof(rsrc_dattr_t) : sizeof(rsrc_pattr_t);
    std::memcpy(arena.alloc_tble(table, size), record(), size);
    store<uint32_t>(record(), 0);
}

// The default or initial value: the collected values, else the default of
// the type. A structured value is built when its run ends.
void attr_builder::complete_value() {
    zu_data_type_t dt = data_type();
    if (zu_is_sd_type(dt))
        return;
    tbl *st = strings();
    if (uint32_t n = uint32_t(values.size())) {
        body_cursor array;
        for (uint32_t i = 0; i < n; i++) {
            zu_value_t v = values.at(i);
            if (copy_this_type(arena, value_field(), &v, dt, TYPE_SAME, st, &array, n) != 0)
                statement_error(msg::default_not_placed);
        }
        return;
    }
    body_cursor a;
    if (copy_this_type(arena, value_field(), nullptr, dt, dynamic_ ? INIT_DEFAULT : DFLT_DEFAULT, st, &a, 1) != 0)
        statement_error(dynamic_ ? msg::initial_value_not_built : msg::default_value_not_built);
}

// The range of a dynamic attribute: none for an unordered scalar type, the
// given one, or else the default range (for an array type, an array of one
// default element at each end).
void attr_builder::complete_range() {
    zu_data_type_t dt = data_type();
    value_slot lo = value_slot::at(&rec.d.ra_min_value), hi = value_slot::at(&rec.d.ra_max_value);
    bool given = range_given;
    range_given = false;
    if (zu_is_unordered_type(dt) && !zu_is_array_type(dt)) {
        set_none(lo.addr());
        set_none(hi.addr());
        return;
    }
    if (given) {
        // Plain numbers of the element type: the reversal must know.
        if (zu_is_numeric_array(dt)) {
            const tbl *table = class_table(kind_of(stanza).table);
            numeric_ranges.insert({table, tbl_used(table)});
        }
        return;
    }
    tbl *st = strings();
    if (dt == ZU_SD_PTR_ARRAY) {
        body_cursor a[3];
        if (copy_this_sd_type(arena, lo, ZU_INT32, R_LO_DEFAULT, st, &a[0], &a[1], &a[2], 0, ZU_SD_PTR_ARRAY) != 0)
            statement_error(msg::range_low_not_built);
        body_cursor b[3];
        if (copy_this_sd_type(arena, hi, ZU_INT32, R_HI_DEFAULT, st, &b[0], &b[1], &b[2], 0, ZU_SD_PTR_ARRAY) != 0)
            statement_error(msg::range_high_not_built);
        return;
    }
    body_cursor a;
    if (copy_this_type(arena, lo, nullptr, dt, R_LO_DEFAULT, st, &a, 1) != 0)
        statement_error(msg::range_low_not_built);
    body_cursor b;
    if (copy_this_type(arena, hi, nullptr, dt, R_HI_DEFAULT, st, &b, 1) != 0)
        statement_error(msg::range_high_not_built);
}
