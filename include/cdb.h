// Glossary of the format's names (the stored files and these headers keep
// them; each is explained here rather than renamed):
//   cdb      class definition database: the one file qecfg writes from a
//            source, mapped by the resource service on machines of either byte order.
//   dsect    one section of a CDB that a header anchor (cdb_dsect_anchor_t)
//            locates: a class, the class-to-manager map, a manager or a variable class.
//   zu, qel  see zu.h (data types and values) and qel.h (identifiers of the
//            resource service); kb_ names the compiler's tables of data-type classes.
//   variety  a number range (VarietyRange=low,high) that an attribute or action
//            applies to; kept as a variety list (variety_list_t, vl_ fields).
//   valid-value set  the values or low,high ranges an attribute or element
//            allows (ValidValue, ValidStateValue); kept as valid_values_t, vv_ fields.
//   locator  the persistent resource attribute that locates a resource of a
//            class (Locator); rc_locator holds its Id, CDB_NO_LOCATOR for none.
//   variable class  a named group of dynamic attributes observed and reported
//            at common intervals; it keeps only their variable IDs (Id, class bit).
//   record prefixes  rc_ resource class, ra_ resource attribute, ac_ action,
//            re_ error, rd_ dependency, rcm_ class-to-manager map, rm_ manager,
//            rvc_ variable class, sd_ structured data, sb_ SBS, vl_ variety list,
//            vv_ valid values, cda_ dsect anchor, cdb_hdr_ header; u_ a reference
//            (cdb_ref_t) to a table or string; cb_ID the record's identifier word.
//
// The class definition database (CDB): header, dsect anchors and the records
// shared by the compiler's memory and the file. Every size and offset here is
// part of the file format.
#ifndef CDB_H
#define CDB_H

#include <cstddef>
#include <cstdint>

#include "qel.h"
#include "zu.h"
#include "zu_qel.h"

// Identifier words: "CDB" followed by the kind letter, read from the most
// significant byte down.
constexpr uint32_t RSRC_CLASS_ID = 0x43444231;          // '1'
constexpr uint32_t RSRC_CMMAP_ID = 0x43444232;          // '2'
constexpr uint32_t RSRC_MGR_ID = 0x43444233;            // '3'
constexpr uint32_t RSRC_VARIABLE_CLASS_ID = 0x43444234; // '4'
constexpr uint32_t VALID_VALUES_ID = 0x43444235;        // '5'
constexpr uint32_t RSRC_PATTR_CLASS_ID = 0x43444237;    // '7'
constexpr uint32_t RSRC_DATTR_CLASS_ID = 0x43444238;    // '8'
constexpr uint32_t RSRC_PATTR_RSRC_ID = 0x43444239;     // '9'
constexpr uint32_t RSRC_DATTR_RSRC_ID = 0x43444261;     // 'a'
constexpr uint32_t RSRC_ACTION_RSRC_ID = 0x43444262;    // 'b'
constexpr uint32_t RSRC_ACTION_CLASS_ID = 0x43444263;   // 'c'
constexpr uint32_t SD_DEF_ID = 0x43444266;              // 'f'
constexpr uint32_t VARIETY_LIST_ID = 0x43444267;        // 'g'

constexpr uint32_t CDB_FORMAT = 0x666D7431;
constexpr uint32_t CDB_NONE = 0xFFFFFFFF; // offset[0] of a reference that designates nothing

#pragma pack(push, 4)

// A reference: in the file offset[0] carries the offset and offset[1] is 0;
// while compiling a table reference holds the table's address in ptr.
typedef union {
    uint32_t offset[2];
    void *ptr;
} cdb_ref_t;

struct rsrc_class_t {
    uint32_t rc_cb_ID;
    uint32_t rc_props;
    cdb_ref_t u_rc_name;
    cdb_ref_t u_rc_alias;
    cdb_ref_t u_rc_pattrsC;
    cdb_ref_t u_rc_dattrsC;
    cdb_ref_t u_rc_pattrs;
    cdb_ref_t u_rc_dattrs;
    cdb_ref_t u_rc_def_input;
    cdb_ref_t u_rc_undef_input;
    cdb_ref_t u_rc_online_input;
    cdb_ref_t u_rc_offline_input;
    cdb_ref_t u_rc_reset_input;
    cdb_ref_t u_rc_actionsC;
    cdb_ref_t u_rc_actions;
    cdb_ref_t u_rc_errors;
    cdb_ref_t u_rc_depends;
    cdb_ref_t u_rc_variety_lists;
    cdb_ref_t u_rc_sbs_defs;
    cdb_ref_t u_rc_sd_defs;
    cdb_ref_t u_rc_valid_vals;
    cdb_ref_t u_rc_strings;
    uint16_t rc_num_pattrsC;
    uint16_t rc_num_dattrsC;
    uint16_t rc_num_pattrs;
    uint16_t rc_num_dattrs;
    uint16_t rc_num_actionsC;
    uint16_t rc_num_actions;
    uint16_t rc_num_errors;
    uint16_t rc_num_depends;
    uint32_t rc_varlist_size;
    uint32_t rc_sbs_size;
    uint32_t rc_sd_size;
    uint32_t rc_valval_size;
    uint32_t rc_perm_temp;
    uint32_t rc_perm_tempC;
    qel_resource_class_id_t rc_class_id;
    uint16_t rc_dscr_msgid;
    uint16_t rc_disp_msgid;
    uint16_t rc_locator;
    uint32_t rc_version;
    uint16_t rc_spare[2];
};

struct rsrc_cmmap_t {
    uint32_t rcm_cb_ID;
    uint16_t rcm_class_ID;
    uint16_t rcm_rm_ID;
    cdb_ref_t u_rcm_msg_file;
    cdb_ref_t u_rcm_strings;
    uint16_t rcm_dscr_msg_set;
    uint16_t rcm_first_key;
    uint16_t rcm_last_key;
    uint16_t rcm_asnno_start;
    uint16_t rcm_num_sctx;
    uint16_t rcm_num_vctx;
    uint16_t rcm_num_stats;
    uint16_t rcm_num_ctx_tmplts;
    uint32_t rcm_static_contexts;
    uint32_t rcm_volatile_contexts;
    uint32_t rcm_stats;
    uint32_t rcm_ctx_tmplts;
    uint16_t rcm_reserved[2];
};

struct rsrc_mgr_t {
    uint32_t rm_cb_ID;
    qel_rm_id_t rm_id;
    uint16_t rm_spare;
    cdb_ref_t u_rm_RMname;
    cdb_ref_t u_rm_strings_table;
};

struct rsrc_variable_class_t {
    uint32_t rvc_cb_ID;
    uint16_t rvc_obsv_interval;
    uint16_t rvc_report_interval;
    cdb_ref_t u_rvc_name;
    cdb_ref_t u_rvc_compat_name;
    uint32_t rvc_var_count;
    cdb_ref_t u_rvc_string_tbl;
    uint16_t rvc_reserved[2];
};

struct rsrc_pattr_t {
    uint32_t ra_cb_ID;
    uint32_t ra_props;
    cdb_ref_t u_ra_name;
    uint16_t ra_dscr_msgid;
    uint16_t ra_disp_msgid;
    uint16_t ra_group_msgid;
    uint16_t ra_group_id;
    zu_value_t ra_dflt_value;
    qel_attribute_id_t ra_attr_id;
    zu_data_type_t ra_data_type;
    cdb_ref_t u_ra_variety_list;
    cdb_ref_t u_ra_valid_vals;
    cdb_ref_t u_ra_sd;
    uint16_t ra_max_sd_idx;
    uint16_t ra_reserved2[3];
};

struct rsrc_dattr_t {
    uint32_t ra_cb_ID;
    uint32_t ra_props;
    cdb_ref_t u_ra_name;
    cdb_ref_t u_ra_vclass;
    cdb_ref_t u_ra_next_in_vclass;
    zu_value_t ra_init_value;
    zu_value_t ra_min_value;
    zu_value_t ra_max_value;
    cdb_ref_t u_ra_variety_list;
    cdb_ref_t u_ra_valid_vals;
    cdb_ref_t u_ra_sd;
    cdb_ref_t u_ra_express;
    cdb_ref_t u_ra_rearm_expr;
    cdb_ref_t u_ra_XAV_name;
    zu_data_type_t ra_data_type;
    qel_variable_type_t ra_var_type;
    uint16_t ra_dscr_msgid;
    uint16_t ra_disp_msgid;
    uint16_t ra_group_msgid;
    uint16_t ra_group_id;
    qel_attribute_id_t ra_attr_id;
    uint16_t ra_max_sd_idx;
    uint16_t ra_expr_desc;
    uint16_t ra_rearm_desc;
    uint16_t ra_range_desc;
    uint16_t ra_report_interval;
    uint16_t ra_reserved;
};

struct rsrc_action_t {
    uint32_t ac_cb_ID;
    qel_action_id_t ac_action_id;
    uint32_t ac_props;
    uint16_t ac_dscr_msgid;
    uint16_t ac_disp_msgid;
    uint16_t ac_confirm_msgid;
    uint16_t ac_timeout;
    uint32_t ac_perms;
    cdb_ref_t u_ac_name;
    cdb_ref_t u_ac_variety_list;
    cdb_ref_t u_ac_sd_input;
    cdb_ref_t u_ac_sd_resp;
};

struct rsrc_error_t {
    uint32_t re_cb_ID;
    qel_error_id_t re_error_id;
    uint32_t re_props;
    uint16_t re_dscr_msgid;
    uint16_t re_disp_msgid;
    cdb_ref_t u_re_name;
    cdb_ref_t u_re_variety_list;
    cdb_ref_t u_re_sd_input;
    uint32_t re_perms;
    uint16_t re_reserved[2];
};

struct rsrc_depend_t {
    uint32_t rd_cb_ID;
    qel_resource_class_id_t rd_class_ID;
    uint16_t rd_reserved;
};

struct vl_entry {
    uint32_t vl_low_val;
    uint32_t vl_high_val;
};

struct variety_list_t {
    uint32_t vl_cb_ID;
    uint32_t vl_count;
    vl_entry vl_values[1];
};

struct vv_entry {
    zu_value_t vv_low_val;
    zu_value_t vv_high_val;
    uint16_t vv_disp_msgid;
    uint16_t vv_reserved[3];
};

struct valid_values_t {
    uint32_t vv_cb_ID;
    uint32_t vv_count;
    vv_entry vv_values[1];
};

struct sd_field {
    cdb_ref_t u_sd_field_name;
    zu_data_type_t sd_field_type;
    uint16_t sd_disp_msgid;
    uint16_t sd_dscr_msgid;
    cdb_ref_t u_sd_valid_vals;
    uint32_t sd_action_id;
    uint16_t sd_valid_type;
    uint16_t sd_reserved;
};

struct sd_def_t {
    uint32_t sd_cb_ID;
    zu_uint32_t sd_count;
    sd_field sd_fields[1];
};

struct sbs_field {
    cdb_ref_t u_sb_field_name;
    uint32_t sb_field_type; // zu_sbs_field_data_type_t
    uint16_t sb_disp_msgid;
    uint16_t sb_dscr_msgid;
    zu_value_t sb_min_value;
    zu_value_t sb_max_value;
};

struct sbs_def_t {
    uint32_t sb_cb_ID;
    uint16_t sb_count;
    uint16_t sb_reserved;
    sbs_field sbs_fields[1];
};

struct ctx_tmplt_t {
    union {
        int32_t u_offset[2];
        void *u_ctxt_name;
        uint16_t u_ctxt_pattr_id;
    } u;
    uint16_t ctxt_tbl_index;
    uint16_t ctxt_type;
    uint16_t ctxt_class_id;
    uint16_t ctxt_dattr_id;
};

typedef enum : uint32_t {
    CDB_DSECT_UNUSED = 0,
    CDB_DSECT_EMPTY = 1,
    CDB_DSECT_TBL_CNTRS = 2,
    CDB_DSECT_RSRC_MGR = 3,
    CDB_DSECT_VAR_CLASS = 4,
    CDB_DSECT_CLASS = 5,
    CDB_DSECT_CMMAP = 6,
    CDB_DSECT_CLASS_HASH = 7,
} cdb_dsect_type_t;

struct qel_cdb_header_t {
    uint32_t cdb_hdr_length; // file length minus 4
    uint32_t cdb_hdr_checksum;
    uint32_t cdb_hdr_format;
    uint32_t cdb_hdr_seqno;
    qel_timeval32_t cdb_hdr_timestamp;
    uint32_t cdb_hdr_dsect_count;
    uint16_t cdb_hdr_max_rm_id;
    uint16_t cdb_hdr_max_class_id;
    uint16_t cdb_hdr_rsrc_class_size;
    uint16_t cdb_hdr_rsrc_cmmap_size;
    uint16_t cdb_hdr_rsrc_mgr_size;
    uint16_t cdb_hdr_rsrc_variable_class_size;
    uint16_t cdb_hdr_rsrc_pattr_size;
    uint16_t cdb_hdr_rsrc_dattr_size;
    uint16_t cdb_hdr_rsrc_action_size;
    uint16_t cdb_hdr_rsrc_error_size;
    uint16_t cdb_hdr_rsrc_depend_size;
    uint16_t cdb_hdr_spares[15];
};

struct cdb_dsect_anchor_t {
    cdb_dsect_type_t cda_type;
    uint32_t cda_offset;
    uint32_t cda_length;
    uint32_t cda_revision;
};

#pragma pack(pop)

static_assert(sizeof(cdb_ref_t) == 8);

static_assert(sizeof(rsrc_class_t) == 224);
static_assert(offsetof(rsrc_class_t, rc_props) == 4);
static_assert(offsetof(rsrc_class_t, u_rc_name) == 8);
static_assert(offsetof(rsrc_class_t, u_rc_alias) == 16);
static_assert(offsetof(rsrc_class_t, u_rc_pattrsC) == 24);
static_assert(offsetof(rsrc_class_t, u_rc_dattrsC) == 32);
static_assert(offsetof(rsrc_class_t, u_rc_pattrs) == 40);
static_assert(offsetof(rsrc_class_t, u_rc_dattrs) == 48);
static_assert(offsetof(rsrc_class_t, u_rc_def_input) == 56);
static_assert(offsetof(rsrc_class_t, u_rc_undef_input) == 64);
static_assert(offsetof(rsrc_class_t, u_rc_online_input) == 72);
static_assert(offsetof(rsrc_class_t, u_rc_offline_input) == 80);
static_assert(offsetof(rsrc_class_t, u_rc_reset_input) == 88);
static_assert(offsetof(rsrc_class_t, u_rc_actionsC) == 96);
static_assert(offsetof(rsrc_class_t, u_rc_actions) == 104);
static_assert(offsetof(rsrc_class_t, u_rc_errors) == 112);
static_assert(offsetof(rsrc_class_t, u_rc_depends) == 120);
static_assert(offsetof(rsrc_class_t, u_rc_variety_lists) == 128);
static_assert(offsetof(rsrc_class_t, u_rc_sbs_defs) == 136);
static_assert(offsetof(rsrc_class_t, u_rc_sd_defs) == 144);
static_assert(offsetof(rsrc_class_t, u_rc_valid_vals) == 152);
static_assert(offsetof(rsrc_class_t, u_rc_strings) == 160);
static_assert(offsetof(rsrc_class_t, rc_num_pattrsC) == 168);
static_assert(offsetof(rsrc_class_t, rc_num_dattrsC) == 170);
static_assert(offsetof(rsrc_class_t, rc_num_pattrs) == 172);
static_assert(offsetof(rsrc_class_t, rc_num_dattrs) == 174);
static_assert(offsetof(rsrc_class_t, rc_num_actionsC) == 176);
static_assert(offsetof(rsrc_class_t, rc_num_actions) == 178);
static_assert(offsetof(rsrc_class_t, rc_num_errors) == 180);
static_assert(offsetof(rsrc_class_t, rc_num_depends) == 182);
static_assert(offsetof(rsrc_class_t, rc_varlist_size) == 184);
static_assert(offsetof(rsrc_class_t, rc_sbs_size) == 188);
static_assert(offsetof(rsrc_class_t, rc_sd_size) == 192);
static_assert(offsetof(rsrc_class_t, rc_valval_size) == 196);
static_assert(offsetof(rsrc_class_t, rc_perm_temp) == 200);
static_assert(offsetof(rsrc_class_t, rc_perm_tempC) == 204);
static_assert(offsetof(rsrc_class_t, rc_class_id) == 208);
static_assert(offsetof(rsrc_class_t, rc_dscr_msgid) == 210);
static_assert(offsetof(rsrc_class_t, rc_disp_msgid) == 212);
static_assert(offsetof(rsrc_class_t, rc_locator) == 214);
static_assert(offsetof(rsrc_class_t, rc_version) == 216);
static_assert(offsetof(rsrc_class_t, rc_spare) == 220);

static_assert(sizeof(rsrc_cmmap_t) == 60);
static_assert(offsetof(rsrc_cmmap_t, rcm_class_ID) == 4);
static_assert(offsetof(rsrc_cmmap_t, rcm_rm_ID) == 6);
static_assert(offsetof(rsrc_cmmap_t, u_rcm_msg_file) == 8);
static_assert(offsetof(rsrc_cmmap_t, u_rcm_strings) == 16);
static_assert(offsetof(rsrc_cmmap_t, rcm_dscr_msg_set) == 24);
static_assert(offsetof(rsrc_cmmap_t, rcm_first_key) == 26);
static_assert(offsetof(rsrc_cmmap_t, rcm_last_key) == 28);
static_assert(offsetof(rsrc_cmmap_t, rcm_asnno_start) == 30);
static_assert(offsetof(rsrc_cmmap_t, rcm_num_sctx) == 32);
static_assert(offsetof(rsrc_cmmap_t, rcm_num_vctx) == 34);
static_assert(offsetof(rsrc_cmmap_t, rcm_num_stats) == 36);
static_assert(offsetof(rsrc_cmmap_t, rcm_num_ctx_tmplts) == 38);
static_assert(offsetof(rsrc_cmmap_t, rcm_static_contexts) == 40);
static_assert(offsetof(rsrc_cmmap_t, rcm_volatile_contexts) == 44);
static_assert(offsetof(rsrc_cmmap_t, rcm_stats) == 48);
static_assert(offsetof(rsrc_cmmap_t, rcm_ctx_tmplts) == 52);
static_assert(offsetof(rsrc_cmmap_t, rcm_reserved) == 56);

static_assert(sizeof(rsrc_mgr_t) == 24);
static_assert(offsetof(rsrc_mgr_t, rm_id) == 4);
static_assert(offsetof(rsrc_mgr_t, rm_spare) == 6);
static_assert(offsetof(rsrc_mgr_t, u_rm_RMname) == 8);
static_assert(offsetof(rsrc_mgr_t, u_rm_strings_table) == 16);

static_assert(sizeof(rsrc_variable_class_t) == 40);
static_assert(offsetof(rsrc_variable_class_t, rvc_obsv_interval) == 4);
static_assert(offsetof(rsrc_variable_class_t, rvc_report_interval) == 6);
static_assert(offsetof(rsrc_variable_class_t, u_rvc_name) == 8);
static_assert(offsetof(rsrc_variable_class_t, u_rvc_compat_name) == 16);
static_assert(offsetof(rsrc_variable_class_t, rvc_var_count) == 24);
static_assert(offsetof(rsrc_variable_class_t, u_rvc_string_tbl) == 28);
static_assert(offsetof(rsrc_variable_class_t, rvc_reserved) == 36);

static_assert(sizeof(rsrc_pattr_t) == 72);
static_assert(offsetof(rsrc_pattr_t, ra_props) == 4);
static_assert(offsetof(rsrc_pattr_t, u_ra_name) == 8);
static_assert(offsetof(rsrc_pattr_t, ra_dscr_msgid) == 16);
static_assert(offsetof(rsrc_pattr_t, ra_disp_msgid) == 18);
static_assert(offsetof(rsrc_pattr_t, ra_group_msgid) == 20);
static_assert(offsetof(rsrc_pattr_t, ra_group_id) == 22);
static_assert(offsetof(rsrc_pattr_t, ra_dflt_value) == 24);
static_assert(offsetof(rsrc_pattr_t, ra_attr_id) == 32);
static_assert(offsetof(rsrc_pattr_t, ra_data_type) == 36);
static_assert(offsetof(rsrc_pattr_t, u_ra_variety_list) == 40);
static_assert(offsetof(rsrc_pattr_t, u_ra_valid_vals) == 48);
static_assert(offsetof(rsrc_pattr_t, u_ra_sd) == 56);
static_assert(offsetof(rsrc_pattr_t, ra_max_sd_idx) == 64);
static_assert(offsetof(rsrc_pattr_t, ra_reserved2) == 66);

static_assert(sizeof(rsrc_dattr_t) == 136);
static_assert(offsetof(rsrc_dattr_t, ra_props) == 4);
static_assert(offsetof(rsrc_dattr_t, u_ra_name) == 8);
static_assert(offsetof(rsrc_dattr_t, u_ra_vclass) == 16);
static_assert(offsetof(rsrc_dattr_t, u_ra_next_in_vclass) == 24);
static_assert(offsetof(rsrc_dattr_t, ra_init_value) == 32);
static_assert(offsetof(rsrc_dattr_t, ra_min_value) == 40);
static_assert(offsetof(rsrc_dattr_t, ra_max_value) == 48);
static_assert(offsetof(rsrc_dattr_t, u_ra_variety_list) == 56);
static_assert(offsetof(rsrc_dattr_t, u_ra_valid_vals) == 64);
static_assert(offsetof(rsrc_dattr_t, u_ra_sd) == 72);
static_assert(offsetof(rsrc_dattr_t, u_ra_express) == 80);
static_assert(offsetof(rsrc_dattr_t, u_ra_rearm_expr) == 88);
static_assert(offsetof(rsrc_dattr_t, u_ra_XAV_name) == 96);
static_assert(offsetof(rsrc_dattr_t, ra_data_type) == 104);
static_assert(offsetof(rsrc_dattr_t, ra_var_type) == 108);
static_assert(offsetof(rsrc_dattr_t, ra_dscr_msgid) == 112);
static_assert(offsetof(rsrc_dattr_t, ra_disp_msgid) == 114);
static_assert(offsetof(rsrc_dattr_t, ra_group_msgid) == 116);
static_assert(offsetof(rsrc_dattr_t, ra_group_id) == 118);
static_assert(offsetof(rsrc_dattr_t, ra_attr_id) == 120);
static_assert(offsetof(rsrc_dattr_t, ra_max_sd_idx) == 124);
static_assert(offsetof(rsrc_dattr_t, ra_expr_desc) == 126);
static_assert(offsetof(rsrc_dattr_t, ra_rearm_desc) == 128);
static_assert(offsetof(rsrc_dattr_t, ra_range_desc) == 130);
static_assert(offsetof(rsrc_dattr_t, ra_report_interval) == 132);
static_assert(offsetof(rsrc_dattr_t, ra_reserved) == 134);

static_assert(sizeof(rsrc_action_t) == 56);
static_assert(offsetof(rsrc_action_t, ac_action_id) == 4);
static_assert(offsetof(rsrc_action_t, ac_props) == 8);
static_assert(offsetof(rsrc_action_t, ac_dscr_msgid) == 12);
static_assert(offsetof(rsrc_action_t, ac_disp_msgid) == 14);
static_assert(offsetof(rsrc_action_t, ac_confirm_msgid) == 16);
static_assert(offsetof(rsrc_action_t, ac_timeout) == 18);
static_assert(offsetof(rsrc_action_t, ac_perms) == 20);
static_assert(offsetof(rsrc_action_t, u_ac_name) == 24);
static_assert(offsetof(rsrc_action_t, u_ac_variety_list) == 32);
static_assert(offsetof(rsrc_action_t, u_ac_sd_input) == 40);
static_assert(offsetof(rsrc_action_t, u_ac_sd_resp) == 48);

static_assert(sizeof(rsrc_error_t) == 48);
static_assert(offsetof(rsrc_error_t, re_error_id) == 4);
static_assert(offsetof(rsrc_error_t, re_props) == 8);
static_assert(offsetof(rsrc_error_t, re_dscr_msgid) == 12);
static_assert(offsetof(rsrc_error_t, re_disp_msgid) == 14);
static_assert(offsetof(rsrc_error_t, u_re_name) == 16);
static_assert(offsetof(rsrc_error_t, u_re_variety_list) == 24);
static_assert(offsetof(rsrc_error_t, u_re_sd_input) == 32);
static_assert(offsetof(rsrc_error_t, re_perms) == 40);
static_assert(offsetof(rsrc_error_t, re_reserved) == 44);

static_assert(sizeof(rsrc_depend_t) == 8);
static_assert(offsetof(rsrc_depend_t, rd_class_ID) == 4);
static_assert(offsetof(rsrc_depend_t, rd_reserved) == 6);

static_assert(sizeof(vl_entry) == 8);
static_assert(sizeof(variety_list_t) == 16);
static_assert(offsetof(variety_list_t, vl_count) == 4);
static_assert(offsetof(variety_list_t, vl_values) == 8);

static_assert(sizeof(vv_entry) == 24);
static_assert(offsetof(vv_entry, vv_high_val) == 8);
static_assert(offsetof(vv_entry, vv_disp_msgid) == 16);
static_assert(offsetof(vv_entry, vv_reserved) == 18);
static_assert(sizeof(valid_values_t) == 32);
static_assert(offsetof(valid_values_t, vv_count) == 4);
static_assert(offsetof(valid_values_t, vv_values) == 8);

static_assert(sizeof(sd_field) == 32);
static_assert(offsetof(sd_field, sd_field_type) == 8);
static_assert(offsetof(sd_field, sd_disp_msgid) == 12);
static_assert(offsetof(sd_field, sd_dscr_msgid) == 14);
static_assert(offsetof(sd_field, u_sd_valid_vals) == 16);
static_assert(offsetof(sd_field, sd_action_id) == 24);
static_assert(offsetof(sd_field, sd_valid_type) == 28);
static_assert(offsetof(sd_field, sd_reserved) == 30);
static_assert(sizeof(sd_def_t) == 40);
static_assert(offsetof(sd_def_t, sd_count) == 4);
static_assert(offsetof(sd_def_t, sd_fields) == 8);

static_assert(sizeof(sbs_field) == 32);
static_assert(offsetof(sbs_field, sb_field_type) == 8);
static_assert(offsetof(sbs_field, sb_disp_msgid) == 12);
static_assert(offsetof(sbs_field, sb_dscr_msgid) == 14);
static_assert(offsetof(sbs_field, sb_min_value) == 16);
static_assert(offsetof(sbs_field, sb_max_value) == 24);
static_assert(sizeof(sbs_def_t) == 40);
static_assert(offsetof(sbs_def_t, sb_count) == 4);
static_assert(offsetof(sbs_def_t, sb_reserved) == 6);
static_assert(offsetof(sbs_def_t, sbs_fields) == 8);

static_assert(sizeof(ctx_tmplt_t) == 16);
static_assert(offsetof(ctx_tmplt_t, ctxt_tbl_index) == 8);
static_assert(offsetof(ctx_tmplt_t, ctxt_type) == 10);
static_assert(offsetof(ctx_tmplt_t, ctxt_class_id) == 12);
static_assert(offsetof(ctx_tmplt_t, ctxt_dattr_id) == 14);

static_assert(sizeof(qel_cdb_header_t) == 80);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_checksum) == 4);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_format) == 8);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_seqno) == 12);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_timestamp) == 16);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_dsect_count) == 24);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_max_rm_id) == 28);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_max_class_id) == 30);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_class_size) == 32);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_cmmap_size) == 34);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_mgr_size) == 36);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_variable_class_size) == 38);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_pattr_size) == 40);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_dattr_size) == 42);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_action_size) == 44);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_error_size) == 46);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_rsrc_depend_size) == 48);
static_assert(offsetof(qel_cdb_header_t, cdb_hdr_spares) == 50);

static_assert(sizeof(cdb_dsect_anchor_t) == 16);
static_assert(offsetof(cdb_dsect_anchor_t, cda_offset) == 4);
static_assert(offsetof(cdb_dsect_anchor_t, cda_length) == 8);
static_assert(offsetof(cdb_dsect_anchor_t, cda_revision) == 12);

// The source keywords of the property bits and the permission letters that
// records carry (rc_props, ra_props, ac_props, ac_perms), in the order the
// source language lists them.
struct props_t {
    char s[20];
    uint32_t p;
};

inline constexpr props_t rc_props[] = {
    {"MtypDivided", 0x2000},     {"MtypCentral", 0x4000},     {"MtypGlobal", 0x8000},  {"QELElectCoord", 0x100},
    {"HasResources", 0x2},       {"HasConstraints", 0x80},    {"CanControl", 0x4},     {"CanDefine", 0x8},
    {"JoinPhase0", 0x10},        {"JoinPhase1", 0x20},        {"SupportsMove", 0x200}, {"CanBatchDefine", 0x400},
    {"CanBatchUndefine", 0x800}, {"CanBatchSetAttr", 0x1000}, {"HasIWAccess", 0x1},    {"QryReqsMonitoring", 0x20000},
    {"CanLiveUpdate", 0x40000},
};
inline constexpr props_t pa_props[] = {
    {"Public", 0x20},      {"Select", 0x10},        {"ReqdForDefine", 0x2},
    {"OptForDefine", 0x8}, {"InvalForDefine", 0x4}, {"ReadOnly", 0x1},
};
inline constexpr props_t da_props[] = {{"Public", 0x20}, {"QryReqsMonitoring", 0x40}};
inline constexpr props_t act_props[] = {{"Public", 0x2}, {"LongRun", 0x1}};
inline constexpr int rc_props_cnt = 17, pa_props_cnt = 6, da_props_cnt = 2, act_props_cnt = 2;

struct valid_perms_t {
    char permission;
    uint32_t mask;
};

inline constexpr valid_perms_t perm_list[] = {
    {'q', 0x1},  {'l', 0x2},  {'e', 0x4},  {'v', 0x8},   {'d', 0x10},
    {'c', 0x20}, {'s', 0x40}, {'o', 0x80}, {'a', 0x100}, {'x', 0x200},
};
inline constexpr int num_perm_list = 10;

static_assert(sizeof(rc_props) / sizeof(rc_props[0]) == rc_props_cnt);
static_assert(sizeof(pa_props) / sizeof(pa_props[0]) == pa_props_cnt);
static_assert(sizeof(perm_list) / sizeof(perm_list[0]) == num_perm_list);

constexpr size_t CDB_HEADER_SIZE = sizeof(qel_cdb_header_t);
constexpr size_t CDB_ANCHOR_SIZE = sizeof(cdb_dsect_anchor_t);

#endif
