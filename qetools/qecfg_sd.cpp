// Structured-data definitions: runs of element stanzas framed into one
// definition in "ClassSDDefs", attached to their owner, and the structured
// value of an attribute built from the element types.
#include "qecfg_builders.h"

namespace {

// The rows an element must have had: ElementIndex, ValidValue and
// ValueDisplayName are not required of it.
uint32_t element_required_rows() {
    static const uint32_t mask = [] {
        uint32_t m = 0;
        for (const char *name : {kw::ElementName, kw::Description, kw::DisplayName, kw::DataType})
            m |= row_named(ST_DEFINE_SD, name).bit;
        return m;
    }();
    return mask;
}

} // namespace

sd_run::sd_run(table_arena &arena, FILE *trace, class_builder &owner, action_builder (&actions)[2])
    : stanza_builder(arena, &owner.rec), trace(trace), owner(owner), actions(actions) {}

// The owner field of a class or action kind: an action run belongs to the
// open ClassAction, else to the ResourceAction.
cdb_ref_t *sd_run::class_owner(int k) {
    rsrc_class_t &cr = owner.rec;
    rsrc_action_t &a = actions[0].open() ? actions[0].rec : actions[1].rec;
    switch (stanza_defs[k].sd_kind) {
    case SD_TYPE_ONLINE: return &cr.u_rc_online_input;
    case SD_TYPE_OFFLINE: return &cr.u_rc_offline_input;
    case SD_TYPE_DEFINE: return &cr.u_rc_def_input;
    case SD_TYPE_UNDEFINE: return &cr.u_rc_undef_input;
    case SD_TYPE_RESET: return &cr.u_rc_reset_input;
    case SD_TYPE_ACT_IN: return &a.u_ac_sd_input;
    default: return &a.u_ac_sd_resp;
    }
}

// The header of an element stanza of kind k. A run of another kind ends
// first; a new run begins a definition for its owner.
void sd_run::start_stanza(int k, int prev_stanza) {
    bool attr_kind = is_attr_sd_stanza(k);
    // Without a class there is no structured attribute either: an attribute
    // run is refused for its missing owner, as after a ResourceClass.
    if (!owner.open())
        statement_error(attr_kind ? msg::attribute_sd_without_attribute : msg::no_class_for_sd);
    bool completed = false;
    if (element_open && prev_stanza != k) {
        complete();
        completed = true;
    }
    if (!element_open)
        check_new_definition(k);
    if (completed && !attr_kind)
        attr = nullptr; // the definition that follows no longer belongs to it
    if (!element_open)
        begin_definition(k);
    next_element();
}

// Refuses owners that are missing, that still wait for their own
// definition, or that already have one.
void sd_run::check_new_definition(int k) {
    sd_type_t sk = stanza_defs[k].sd_kind;
    if ((sk == SD_TYPE_ACT_IN || sk == SD_TYPE_ACT_RESP) && !actions[0].open() && !actions[1].open())
        statement_error(msg::no_action_for_sd);
    bool attr_has_definition = attr && load<uint32_t>(&attr->sd_ref()) != CDB_NONE;
    if (is_attr_sd_stanza(k)) {
        if (attr_has_definition)
            statement_error(msg::one_sd_per_attribute);
        return;
    }
    if (attr && !attr_has_definition)
        statement_error(msg::attribute_sd_expected);
    if (load<uint32_t>(class_owner(k)) != CDB_NONE)
        statement_error(msg::one_sd_per_kind);
}

void sd_run::begin_definition(int k) {
    bool attr_kind = is_attr_sd_stanza(k);
    if (attr_kind && !attr)
        statement_error(msg::attribute_sd_without_attribute);
    cdb_ref_t *ref = attr_kind ? &attr->sd_ref() : class_owner(k);
    def_off = owner.new_section(&rsrc_class_t::u_rc_sd_defs, sizeof(sd_def_t), SD_DEF_ID);
    store<uint32_t>(ref, def_off);
}

void sd_run::next_element() {
    if (element_open)
        append_pending_element();
    element = sd_field{};
    element_open = true;
    vvdisp_tbl = nullptr;
    element_valid_values = false;
}

// The first element goes into the room of the definition's header, later
// ones behind it.
void sd_run::append_pending_element() {
    uint32_t required = element_required_rows();
    if ((given.required & required) != required)
        statement_error(msg::incomplete_stanza);
    tbl *sdt = class_table(&rsrc_class_t::u_rc_sd_defs);
    uint32_t count = load<uint32_t>(sdt->tbl_base + def_off + offsetof(sd_def_t, sd_count));
    uint32_t field = def_off + offsetof(sd_def_t, sd_fields);
    if (count != 0)
        field = uint32_t(static_cast<char *>(arena.alloc_tble(sdt, sizeof(sd_field))) - sdt->tbl_base);
    sd_field el = element;
    el.sd_action_id = CDB_SD_ELEMENT_ACTION_ID;
    el.sd_valid_type = CDB_SD_ELEMENT_VALID_TYPE;
    if (!element_valid_values)
        el.u_sd_valid_vals = none_ref();
    element_valid_values = false;
    std::memcpy(sdt->tbl_base + field, &el, sizeof el);
    store<uint32_t>(sdt->tbl_base + def_off + offsetof(sd_def_t, sd_count), count + 1);
}

// The attribute a run belongs to is still open when the run ends: every
// header completes the run before any attribute.
void sd_run::complete() {
    next_element();
    if (attr) {
        attr->build_structured_value();
        attr->set_max_sd_idx(uint16_t(curr_sdeli));
    }
    curr_sdeli = -1;
    expected_sdeli = 0;
    element_open = false;
}

void sd_run::store_statement(const keyword_row &row, char *v) {
    switch (row.what) {
    case statement::element_index: store_element_index(v); break;
    case statement::element_data_type: store_element_type(v); break;
    case statement::element_valid_value:
        if (!element_valid_values) {
            element.u_sd_valid_vals = cdb_ref_t{};
            element.u_sd_valid_vals.offset[0] =
                owner.new_section(&rsrc_class_t::u_rc_valid_vals, sizeof(valid_values_t), VALID_VALUES_ID);
            element_valid_values = true;
        }
        store_valid_value(element.u_sd_valid_vals.offset[0], zu_data_type_t(element.sd_field_type), v);
        break;
    case statement::element_default_value: statement_error(msg::element_default_refused);
    default: stanza_builder::store_statement(row, v); break;
    }
}

void sd_run::store_element_index(const char *v) {
    zu_value_t val{};
    if (str_to_zu(arena, &val, ZU_UINT32, v) != 0)
        statement_error(msg::invalid_data);
    curr_sdeli = int(val.val_uint32);
    if (curr_sdeli != expected_sdeli) {
        std::fprintf(trace, "curr_sdel = %d, expected_sdeli = %d\n", curr_sdeli, expected_sdeli);
        statement_error(msg::element_index_order);
    }
    expected_sdeli = int(unsigned(curr_sdeli) + 1);
}

void sd_run::store_element_type(const char *v) {
    zu_data_type_t type = strToZuDt(v);
    if (zu_is_sd_type(type))
        statement_error(msg::structured_element_type);
    element.sd_field_type = type;
    if (attr)
        attr->add_element_type(type);
}
