// The source language as data: the stanza types with their keyword rows.
// The property keywords and permission letters are shared with every reader
// of a CDB (cdb.h).
#include <cstddef>
#include <cstring>

#include "cdb.h"
#include "qecfg_keywords.h"

#define ROW(rec, name, what, field, bit, optional, repeatable)                                                         \
    { name, statement::what, uint16_t(offsetof(rec, field)), bit, optional, repeatable }
constexpr bool REQ = false, OPT = true, ONCE = false, DUP = true;

static const keyword_row control_definition_rows[] = {
    ROW(rsrc_class_t, kw::FileVersion, version, rc_version, 0x1, REQ, ONCE),
};

static const keyword_row cmmap_rows[] = {
    ROW(rsrc_cmmap_t, kw::ResourceManager, resource_manager, rcm_rm_ID, 0x1, REQ, ONCE),
    ROW(rsrc_cmmap_t, kw::FirstKey, number16, rcm_first_key, 0x2, REQ, ONCE),
    ROW(rsrc_cmmap_t, kw::LastKey, number16, rcm_last_key, 0x4, REQ, ONCE),
    ROW(rsrc_cmmap_t, kw::MessageCatalog, text, u_rcm_msg_file, 0x8, REQ, ONCE),
    ROW(rsrc_cmmap_t, kw::DescriptiveMessageSet, number16, rcm_dscr_msg_set, 0x10, REQ, ONCE),
};

static const keyword_row variable_class_rows[] = {
    ROW(rsrc_variable_class_t, kw::ObservationInterval, number16, rvc_obsv_interval, 0x2, REQ, ONCE),
    ROW(rsrc_variable_class_t, kw::ReportingInterval, number16, rvc_report_interval, 0x4, REQ, ONCE),
    ROW(rsrc_variable_class_t, kw::VariableClass, text, u_rvc_name, 0x1, REQ, ONCE),
    ROW(rsrc_variable_class_t, kw::Alias, text, u_rvc_compat_name, 0x1, OPT, ONCE),
};

static const keyword_row resource_class_rows[] = {
    ROW(rsrc_class_t, kw::Properties, class_properties, rc_props, 0x4, REQ, ONCE),
    ROW(rsrc_class_t, kw::ClassPermTemplate, permission_template, rc_perm_tempC, 0x8, REQ, ONCE),
    ROW(rsrc_class_t, kw::ResourcePermTemplate, permission_template, rc_perm_temp, 0x10, REQ, ONCE),
    ROW(rsrc_class_t, kw::Locator, locator, rc_locator, 0x2, OPT, ONCE),
    ROW(rsrc_class_t, kw::Description, number16, rc_dscr_msgid, 0x1, REQ, ONCE),
    ROW(rsrc_class_t, kw::DisplayName, number16, rc_disp_msgid, 0x2, REQ, ONCE),
    ROW(rsrc_class_t, kw::Name, text, u_rc_name, 0x10, OPT, ONCE),
};

static const keyword_row pattr_rows[] = {
    ROW(rsrc_pattr_t, kw::Name, text, u_ra_name, 0x1, REQ, ONCE),
    ROW(rsrc_pattr_t, kw::Description, number16, ra_dscr_msgid, 0x2, REQ, ONCE),
    ROW(rsrc_pattr_t, kw::DisplayName, number16, ra_disp_msgid, 0x4, REQ, ONCE),
    ROW(rsrc_pattr_t, kw::Id, identifier, ra_attr_id, 0x8, REQ, ONCE),
    ROW(rsrc_pattr_t, kw::DataType, data_type, ra_data_type, 0x10, REQ, ONCE),
    ROW(rsrc_pattr_t, kw::VarietyRange, variety_range, u_ra_variety_list, 0x20, REQ, DUP),
    ROW(rsrc_pattr_t, kw::GroupID, number16, ra_group_id, 0x1, OPT, ONCE),
    ROW(rsrc_pattr_t, kw::GroupName, number16, ra_group_msgid, 0x2, OPT, ONCE),
    ROW(rsrc_pattr_t, kw::Properties, pattr_properties, ra_props, 0x4, OPT, ONCE),
    ROW(rsrc_pattr_t, kw::ValidValue, valid_value, u_ra_valid_vals, 0x10, OPT, DUP),
    ROW(rsrc_pattr_t, kw::ValueDisplayName, value_display_name, u_ra_valid_vals, 0x20, OPT, DUP),
    ROW(rsrc_pattr_t, kw::DefaultValue, default_value, ra_dflt_value, 0x8, OPT, DUP),
    ROW(rsrc_pattr_t, kw::ListActionRsrc, list_action, ra_dflt_value, 0x40, OPT, ONCE),
    ROW(rsrc_pattr_t, kw::ListActionClass, list_action, ra_dflt_value, 0x80, OPT, ONCE),
};

static const keyword_row dattr_rows[] = {
    ROW(rsrc_dattr_t, kw::Name, text, u_ra_name, 0x1, REQ, ONCE),
    ROW(rsrc_dattr_t, kw::VariableClass, text, u_ra_vclass, 0x100, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::Description, number16, ra_dscr_msgid, 0x2, REQ, ONCE),
    ROW(rsrc_dattr_t, kw::DisplayName, number16, ra_disp_msgid, 0x4, REQ, ONCE),
    ROW(rsrc_dattr_t, kw::Id, identifier, ra_attr_id, 0x8, REQ, ONCE),
    ROW(rsrc_dattr_t, kw::DataType, data_type, ra_data_type, 0x10, REQ, ONCE),
    ROW(rsrc_dattr_t, kw::VariableType, variable_type, ra_var_type, 0x40, REQ, ONCE),
    ROW(rsrc_dattr_t, kw::VarietyRange, variety_range, u_ra_variety_list, 0x20, REQ, DUP),
    ROW(rsrc_dattr_t, kw::GroupID, number16, ra_group_id, 0x1, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::GroupName, number16, ra_group_msgid, 0x2, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::Properties, dattr_properties, ra_props, 0x4, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::InitialValue, initial_value, ra_init_value, 0x8, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::ValidStateValue, valid_value, u_ra_valid_vals, 0x10, OPT, DUP),
    ROW(rsrc_dattr_t, kw::ValueDisplayName, value_display_name, ra_max_value, 0x20, OPT, DUP),
    ROW(rsrc_dattr_t, kw::Expression, text, u_ra_express, 0x400, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::ExpressionDescription, number16, ra_expr_desc, 0x800, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::ReArmExpression, text, u_ra_rearm_expr, 0x1000, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::ReArmDescription, number16, ra_rearm_desc, 0x2000, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::Range, range, ra_min_value, 0x200, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::ListActionRsrc, list_action, ra_init_value, 0x40, OPT, ONCE),
    ROW(rsrc_dattr_t, kw::ListActionClass, list_action, ra_init_value, 0x80, OPT, ONCE),
};

static const keyword_row action_rows[] = {
    ROW(rsrc_action_t, kw::Name, text, u_ac_name, 0x1, REQ, ONCE),
    ROW(rsrc_action_t, kw::Description, number16, ac_dscr_msgid, 0x2, REQ, ONCE),
    ROW(rsrc_action_t, kw::DisplayName, number16, ac_disp_msgid, 0x4, REQ, ONCE),
    ROW(rsrc_action_t, kw::Id, identifier, ac_action_id, 0x8, REQ, ONCE),
    ROW(rsrc_action_t, kw::VarietyRange, variety_range, u_ac_variety_list, 0x10, REQ, DUP),
    ROW(rsrc_action_t, kw::Properties, action_properties, ac_props, 0x1, OPT, ONCE),
    ROW(rsrc_action_t, kw::Permission, permission, ac_perms, 0x4, OPT, ONCE),
    ROW(rsrc_action_t, kw::ConfirmationMsg, number16, ac_confirm_msgid, 0x8, OPT, ONCE),
    ROW(rsrc_action_t, kw::TimeOut, number16, ac_timeout, 0x2, OPT, ONCE),
};

// The element statements store into the element being built.
static const keyword_row sd_rows[] = {
    ROW(sd_field, kw::ElementName, text, u_sd_field_name, 0x1, REQ, ONCE),
    ROW(sd_field, kw::Description, number16, sd_dscr_msgid, 0x2, REQ, ONCE),
    ROW(sd_field, kw::DisplayName, number16, sd_disp_msgid, 0x4, REQ, ONCE),
    ROW(sd_field, kw::ElementIndex, element_index, sd_field_type, 0x8, REQ, ONCE),
    ROW(sd_field, kw::DataType, element_data_type, sd_field_type, 0x10, REQ, ONCE),
    ROW(sd_field, kw::ValidValue, element_valid_value, u_sd_valid_vals, 0x2, OPT, DUP),
    ROW(sd_field, kw::ValueDisplayName, value_display_name, u_sd_valid_vals, 0x4, OPT, DUP),
    ROW(sd_field, kw::DefaultValue, element_default_value, sd_field_type, 0x1, OPT, DUP),
};

#undef ROW

template <size_t N> constexpr bool fits(const keyword_row (&)[N]) { return N <= MAX_ROWS_PER_STANZA; }
static_assert(fits(control_definition_rows) && fits(cmmap_rows) && fits(variable_class_rows) &&
              fits(resource_class_rows) && fits(pattr_rows) && fits(dattr_rows) && fits(action_rows) && fits(sd_rows));

#define ROWS(a) int(sizeof(a) / sizeof(a[0])), a

const stanza_def stanza_defs[NUM_STANZA_TYPES] = {
    {stanza_names[ST_CONTROL_DEFINITION], ROWS(control_definition_rows), 0x1, SD_TYPE_UNKNOWN},
    {stanza_names[ST_CLASS_TO_MANAGER_MAPPING], ROWS(cmmap_rows), 0x1f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_RESOURCE_VARIABLE_CLASS], ROWS(variable_class_rows), 0x7, SD_TYPE_UNKNOWN},
    {stanza_names[ST_RESOURCE_CLASS], ROWS(resource_class_rows), 0x1f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_PERSISTENT_RESOURCE_ATTRIBUTE], ROWS(pattr_rows), 0x3f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_PERSISTENT_CLASS_ATTRIBUTE], ROWS(pattr_rows), 0x3f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_DYNAMIC_RESOURCE_ATTRIBUTE], ROWS(dattr_rows), 0x7f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_DYNAMIC_CLASS_ATTRIBUTE], ROWS(dattr_rows), 0x7f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_CLASS_ACTION], ROWS(action_rows), 0x1f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_RESOURCE_ACTION], ROWS(action_rows), 0x1f, SD_TYPE_UNKNOWN},
    {stanza_names[ST_PATTR_SD], ROWS(sd_rows), 0x1f, SD_TYPE_PATTR},
    {stanza_names[ST_DATTR_SD], ROWS(sd_rows), 0x1f, SD_TYPE_DATTR},
    {stanza_names[ST_DEFINE_SD], ROWS(sd_rows), 0x1f, SD_TYPE_DEFINE},
    {stanza_names[ST_UNDEFINE_SD], ROWS(sd_rows), 0x1f, SD_TYPE_UNDEFINE},
    {stanza_names[ST_ONLINE_SD], ROWS(sd_rows), 0x1f, SD_TYPE_ONLINE},
    {stanza_names[ST_OFFLINE_SD], ROWS(sd_rows), 0x1f, SD_TYPE_OFFLINE},
    {stanza_names[ST_RESET_SD], ROWS(sd_rows), 0x1f, SD_TYPE_RESET},
    {stanza_names[ST_ACTION_IN_SD], ROWS(sd_rows), 0x1f, SD_TYPE_ACT_IN},
    // Its required rows carry only 0x1 to 0x10, so no optional statement is
    // ever accepted in a response definition.
    {stanza_names[ST_ACTION_OUT_SD], ROWS(sd_rows), 0x7f, SD_TYPE_ACT_RESP},
};

#undef ROWS

const keyword_row &row_named(int stanza, const char *name) {
    const keyword_row *row = stanza_defs[stanza].rows;
    while (std::strcmp(row->name, name) != 0)
        row++;
    return *row;
}
