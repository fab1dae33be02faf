// The source language as data: the stanza types with their attribute rows.
// The property keywords and permission letters are shared with every reader
// of a CDB (cdb.h).
#include <cstddef>

#include "qecfg.h"

#define ROW(rec, name, code, field, bit, dup) {name, code, int(offsetof(rec, field)), bit, dup}

static const table_attrs control_definition_attrs[] = {
    ROW(rsrc_class_t, "FileVersion", 5, rc_version, 0x1, 0),
};

static const table_attrs cmmap_attrs[] = {
    ROW(rsrc_cmmap_t, "ResourceManager", 7, rcm_rm_ID, 0x1, 0),
    ROW(rsrc_cmmap_t, "FirstKey", 1, rcm_first_key, 0x2, 0),
    ROW(rsrc_cmmap_t, "LastKey", 1, rcm_last_key, 0x4, 0),
    ROW(rsrc_cmmap_t, "MessageCatalog", 3, u_rcm_msg_file, 0x8, 0),
    ROW(rsrc_cmmap_t, "DescriptiveMessageSet", 1, rcm_dscr_msg_set, 0x10, 0),
};

static const table_attrs variable_class_attrs[] = {
    ROW(rsrc_variable_class_t, "ObservationInterval", 1, rvc_obsv_interval, 0x2, 0),
    ROW(rsrc_variable_class_t, "ReportingInterval", 1, rvc_report_interval, 0x4, 0),
    ROW(rsrc_variable_class_t, "VariableClass", 3, u_rvc_name, 0x1, 0),
    ROW(rsrc_variable_class_t, "Alias", 3, u_rvc_compat_name, 0x80000001, 0),
};

static const table_attrs resource_class_attrs[] = {
    ROW(rsrc_class_t, "Properties", 4, rc_props, 0x4, 0),
    ROW(rsrc_class_t, "ClassPermTemplate", 6, rc_perm_tempC, 0x8, 0),
    ROW(rsrc_class_t, "ResourcePermTemplate", 6, rc_perm_temp, 0x10, 0),
    ROW(rsrc_class_t, "Locator", 8, rc_locator, 0x80000002, 0),
    ROW(rsrc_class_t, "Description", 1, rc_dscr_msgid, 0x1, 0),
    ROW(rsrc_class_t, "DisplayName", 1, rc_disp_msgid, 0x2, 0),
    ROW(rsrc_class_t, "Name", 3, u_rc_name, 0x80000010, 0),
};

static const table_attrs pattr_attrs[] = {
    ROW(rsrc_pattr_t, "Name", 3, u_ra_name, 0x1, 0),
    ROW(rsrc_pattr_t, "Description", 1, ra_dscr_msgid, 0x2, 0),
    ROW(rsrc_pattr_t, "DisplayName", 1, ra_disp_msgid, 0x4, 0),
    ROW(rsrc_pattr_t, "Id", 9, ra_attr_id, 0x8, 0),
    ROW(rsrc_pattr_t, "DataType", 17, ra_data_type, 0x10, 0),
    ROW(rsrc_pattr_t, "VarietyRange", 10, u_ra_variety_list, 0x20, 1),
    ROW(rsrc_pattr_t, "GroupID", 1, ra_group_id, 0x80000001, 0),
    ROW(rsrc_pattr_t, "GroupName", 1, ra_group_msgid, 0x80000002, 0),
    ROW(rsrc_pattr_t, "Properties", 11, ra_props, 0x80000004, 0),
    ROW(rsrc_pattr_t, "ValidValue", 14, u_ra_valid_vals, 0x80000010, 1),
    ROW(rsrc_pattr_t, "ValueDisplayName", 16, u_ra_valid_vals, 0x80000020, 1),
    ROW(rsrc_pattr_t, "DefaultValue", 15, ra_dflt_value, 0x80000008, 1),
    ROW(rsrc_pattr_t, "ListActionRsrc", 30, ra_dflt_value, 0x80000040, 0),
    ROW(rsrc_pattr_t, "ListActionClass", 29, ra_dflt_value, 0x80000080, 0),
};

static const table_attrs dattr_attrs[] = {
    ROW(rsrc_dattr_t, "Name", 3, u_ra_name, 0x1, 0),
    ROW(rsrc_dattr_t, "VariableClass", 3, u_ra_vclass, 0x80000100, 0),
    ROW(rsrc_dattr_t, "Description", 1, ra_dscr_msgid, 0x2, 0),
    ROW(rsrc_dattr_t, "DisplayName", 1, ra_disp_msgid, 0x4, 0),
    ROW(rsrc_dattr_t, "Id", 9, ra_attr_id, 0x8, 0),
    ROW(rsrc_dattr_t, "DataType", 17, ra_data_type, 0x10, 0),
    ROW(rsrc_dattr_t, "VariableType", 18, ra_var_type, 0x40, 0),
    ROW(rsrc_dattr_t, "VarietyRange", 10, u_ra_variety_list, 0x20, 1),
    ROW(rsrc_dattr_t, "GroupID", 1, ra_group_id, 0x80000001, 0),
    ROW(rsrc_dattr_t, "GroupName", 1, ra_group_msgid, 0x80000002, 0),
    ROW(rsrc_dattr_t, "Properties", 12, ra_props, 0x80000004, 0),
    ROW(rsrc_dattr_t, "InitialValue", 20, ra_init_value, 0x80000008, 0),
    ROW(rsrc_dattr_t, "ValidStateValue", 14, u_ra_valid_vals, 0x80000010, 1),
    ROW(rsrc_dattr_t, "ValueDisplayName", 16, ra_max_value, 0x80000020, 1),
    ROW(rsrc_dattr_t, "Expression", 3, u_ra_express, 0x80000400, 0),
    ROW(rsrc_dattr_t, "ExpressionDescription", 1, ra_expr_desc, 0x80000800, 0),
    ROW(rsrc_dattr_t, "ReArmExpression", 3, u_ra_rearm_expr, 0x80001000, 0),
    ROW(rsrc_dattr_t, "ReArmDescription", 1, ra_rearm_desc, 0x80002000, 0),
    ROW(rsrc_dattr_t, "Range", 19, ra_min_value, 0x80000200, 0),
    ROW(rsrc_dattr_t, "ListActionRsrc", 30, ra_init_value, 0x80000040, 0),
    ROW(rsrc_dattr_t, "ListActionClass", 29, ra_init_value, 0x80000080, 0),
};

static const table_attrs action_attrs[] = {
    ROW(rsrc_action_t, "Name", 3, u_ac_name, 0x1, 0),
    ROW(rsrc_action_t, "Description", 1, ac_dscr_msgid, 0x2, 0),
    ROW(rsrc_action_t, "DisplayName", 1, ac_disp_msgid, 0x4, 0),
    ROW(rsrc_action_t, "Id", 9, ac_action_id, 0x8, 0),
    ROW(rsrc_action_t, "VarietyRange", 10, u_ac_variety_list, 0x10, 1),
    ROW(rsrc_action_t, "Properties", 13, ac_props, 0x80000001, 0),
    ROW(rsrc_action_t, "Permission", 31, ac_perms, 0x80000004, 0),
    ROW(rsrc_action_t, "ConfirmationMsg", 1, ac_confirm_msgid, 0x80000008, 0),
    ROW(rsrc_action_t, "TimeOut", 1, ac_timeout, 0x80000002, 0),
};

// The element statements store into the element being built, not through the
// row's offset, which designates sd_count in every row.
static const table_attrs sd_attrs[] = {
    ROW(sd_def_t, "ElementName", 22, sd_count, 0x1, 0),
    ROW(sd_def_t, "Description", 23, sd_count, 0x2, 0),
    ROW(sd_def_t, "DisplayName", 24, sd_count, 0x4, 0),
    ROW(sd_def_t, "ElementIndex", 21, sd_count, 0x8, 0),
    ROW(sd_def_t, "DataType", 25, sd_count, 0x10, 0),
    ROW(sd_def_t, "ValidValue", 26, sd_count, 0x80000002, 1),
    ROW(sd_def_t, "ValueDisplayName", 27, sd_count, 0x80000004, 1),
    ROW(sd_def_t, "DefaultValue", 28, sd_count, 0x80000001, 1),
};

#undef ROW

#define ATTRS(a) int(sizeof(a) / sizeof(a[0])), a

const stanza_def stanza_defs[NUM_STANZA_TYPES] = {
    {"ControlDefinition", ATTRS(control_definition_attrs), 0x1},
    {"ClassToManagerMapping", ATTRS(cmmap_attrs), 0x1f},
    {"ResourceVariableClass", ATTRS(variable_class_attrs), 0x7},
    {"ResourceClass", ATTRS(resource_class_attrs), 0x1f},
    {"PersistentResourceAttribute", ATTRS(pattr_attrs), 0x3f},
    {"PersistentClassAttribute", ATTRS(pattr_attrs), 0x3f},
    {"DynamicResourceAttribute", ATTRS(dattr_attrs), 0x7f},
    {"DynamicClassAttribute", ATTRS(dattr_attrs), 0x7f},
    {"ClassAction", ATTRS(action_attrs), 0x1f},
    {"ResourceAction", ATTRS(action_attrs), 0x1f},
    {"PAttrSDDefinition", ATTRS(sd_attrs), 0x1f},
    {"DAttrSDDefinition", ATTRS(sd_attrs), 0x1f},
    {"DefineSDDefinition", ATTRS(sd_attrs), 0x1f},
    {"UndefineSDDefinition", ATTRS(sd_attrs), 0x1f},
    {"OnlineSDDefinition", ATTRS(sd_attrs), 0x1f},
    {"OfflineSDDefinition", ATTRS(sd_attrs), 0x1f},
    {"ResetSDDefinition", ATTRS(sd_attrs), 0x1f},
    {"ActionInSDDefinition", ATTRS(sd_attrs), 0x1f},
    // Its required rows carry only 0x1 to 0x10, so no optional statement is
    // ever accepted in a response definition.
    {"ActionOutSDDefinition", ATTRS(sd_attrs), 0x7f},
};

#undef ATTRS
