// Private declarations of the class definition compiler: the keyword table
// records, growable tables, placement codes and the state of one compile.
#ifndef QECFG_H
#define QECFG_H

#include <cstdint>
#include <cstdio>
#include <cstring>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "cdb.h"

// ---------------------------------------------------------------------------
// Fatal conditions. Every fatal condition of a compile becomes one of these;
// only main turns it into the message on standard error and the exit status.
struct qecfg_fatal {
    std::string message; // the full text, terminator included
    int code;            // the exit status
};

// ---------------------------------------------------------------------------
// Growable tables: zero-filled, append-only, referred to by offsets.
struct tbl {
    char *tbl_base = nullptr;
    char *tbl_prev_base = nullptr;
    char *tbl_next = nullptr;
    size_t tbl_size = 0; // the size in whole allocation units, as the traces report it
    size_t tbl_au = 0;
    const char *tbl_name = nullptr;
    // Room actually reserved behind tbl_base: what is used, grown
    // geometrically so that a table of any size is copied a bounded number
    // of times; room past tbl_next is not touched until it is handed out.
    size_t tbl_cap = 0;
};

inline size_t tbl_used(const tbl *t) { return t && t->tbl_base ? size_t(t->tbl_next - t->tbl_base) : 0; }
inline size_t round8(size_t n) { return (n + 7) & ~size_t(7); }

void memcpy_8_rounded(void *dst, const void *src, size_t len);

// Loads and stores of fields inside packed records and tables.
template <typename T> inline T load(const void *p) {
    T v;
    std::memcpy(&v, p, sizeof v);
    return v;
}
template <typename T> inline void store(void *p, T v) { std::memcpy(p, &v, sizeof v); }

// ---------------------------------------------------------------------------
// Keyword tables.
struct table_attrs {
    const char *ta_name;
    int ta_type;
    int ta_offset;
    uint32_t req_bit;
    int dup_allowed;
};

constexpr uint32_t OPTIONAL_BIT = 0x80000000;
inline constexpr const char *DEFAULT_VALUES_TBL = "DefaultValues";
constexpr int MAX_ATTRS_PER_STANZA = 25;

struct dflt_tbl {
    struct tbl *tbl = nullptr;
    size_t num_elems = 0;
};

class qecfg_compiler;
typedef void (qecfg_compiler::*init_rtn_t)();

struct srtable_ctrl {
    const char *sc_name;
    void *sc_cb;
    int sc_num_attrs_in_table;
    init_rtn_t sc_init_tbl;
    cdb_ref_t *sc_str_tbl; // the reference fields that hold the tables
    cdb_ref_t *sc_vty_tbl;
    cdb_ref_t *sc_vv_tbl;
    cdb_ref_t *sc_sd_tbl;
    uint32_t req_mask;
    uint32_t req_mask_cmplt;
    uint32_t opt_mask;
    dflt_tbl dflt;
    int dt_offset;
    const table_attrs *sc_attrs;
};

// Stanza types, in the order of sc_tables.
enum stanza_idx {
    ST_CONTROL_DEFINITION,
    ST_CLASS_TO_MANAGER_MAPPING,
    ST_RESOURCE_VARIABLE_CLASS,
    ST_RESOURCE_CLASS,
    ST_PERSISTENT_RESOURCE_ATTRIBUTE,
    ST_PERSISTENT_CLASS_ATTRIBUTE,
    ST_DYNAMIC_RESOURCE_ATTRIBUTE,
    ST_DYNAMIC_CLASS_ATTRIBUTE,
    ST_CLASS_ACTION,
    ST_RESOURCE_ACTION,
    ST_PATTR_SD,
    ST_DATTR_SD,
    ST_DEFINE_SD,
    ST_UNDEFINE_SD,
    ST_ONLINE_SD,
    ST_OFFLINE_SD,
    ST_RESET_SD,
    ST_ACTION_IN_SD,
    ST_ACTION_OUT_SD,
    NUM_STANZA_TYPES
};

// The static part of one stanza type: everything but the bindings into the
// control blocks of a compile.
struct stanza_def {
    const char *name;
    int num_attrs;
    const table_attrs *attrs;
    uint32_t req_mask_cmplt;
};
extern const stanza_def stanza_defs[NUM_STANZA_TYPES];

// ---------------------------------------------------------------------------
// Values and placement.
enum placement_code {
    TYPE_SAME = 1,
    TYPE_16 = 2,
    TYPE_INIT = 3,
    INIT_DEFAULT = 4,
    DFLT_DEFAULT = 5,
    R_LO_DEFAULT = 6,
    R_HI_DEFAULT = 7,
};

typedef enum {
    SD_TYPE_ONLINE = 0,
    SD_TYPE_OFFLINE = 1,
    SD_TYPE_DEFINE = 2,
    SD_TYPE_UNDEFINE = 3,
    SD_TYPE_RESET = 4,
    SD_TYPE_ACT_IN = 5,
    SD_TYPE_ACT_RESP = 6,
    SD_TYPE_PATTR = 7,
    SD_TYPE_DATTR = 8,
    SD_TYPE_UNKNOWN = 9,
} sd_type_t;

// A value field that survives growth of the table that may hold it: either a
// fixed address (a control block) or an offset into a table.
struct value_slot {
    char *fixed = nullptr;
    const tbl *t = nullptr;
    uint32_t off = 0;
    char *addr() const { return fixed ? fixed : t->tbl_base + off; }
    static value_slot at(void *p) { return value_slot{static_cast<char *>(p), nullptr, 0}; }
    static value_slot in(const tbl *t, uint32_t off) { return value_slot{nullptr, t, off}; }
};

// Designates an array or structured value being filled, by its offset.
struct anchor {
    bool set = false;
    uint32_t off = 0;
};

// Cuts comments and the newline off a piece of a source line; false when
// nothing is left to process (a comment line or a line of blanks, tabs and
// quotes). The checker reads sources through it too.
bool strip_comments(char *line);

// Conversions of value text (no compile state involved).
zu_data_type_t strToZuDt(const char *s);
int strToVar(const char *s, qel_variable_type_t *t);
zu_data_type_t scalar_zu(zu_data_type_t dt);
int is_zu_array(zu_data_type_t dt);
char *strip_quotes(char *s);
int ver_str_convert(const char *ver_str, uint32_t *n);
int hex_convert(char *zu_out, const char *str_in);
int oct_convert(const char *p, int type, char *out_buf);
// Bytes that hex_convert and oct_convert may write for a text of len chars.
inline size_t binary_image_size(size_t len) { return 4 + len + 1; }

// ---------------------------------------------------------------------------
struct qecfg_options {
    int interactive = 1;
    int debugLevel = 0;
    int swap_endianness = 0;
    std::string cdefsrc;
    std::string cdefname;
    FILE *trace_out = stdout; // traces
    FILE *trace_err = stderr; // the table growth trace
    // A source held in memory (cdefsrc is then only its name).
    bool source_in_memory = false;
    std::string_view source_text;
    // Where the image goes; the file cdefname when null.
    class image_sink *sink = nullptr;
};

// The class locator given by a ResourceClass statement, pending until the
// class is completed.
struct rc_locator_t {
    bool given = false;
    char name[1798] = {};
};

// One compile: every table, control block and flag of it. Nothing outlives it.
class qecfg_compiler {
  public:
    explicit qecfg_compiler(qecfg_options opts);
    ~qecfg_compiler();
    qecfg_compiler(const qecfg_compiler &) = delete;
    qecfg_compiler &operator=(const qecfg_compiler &) = delete;

    // The compile sequence: read the source, complete everything, build the CDB.
    void run();

    // --- error exits
    [[noreturn]] void qecfg_error_exit_rtn(const char *msg, const char *v1, const char *v2, int line, int code);
    [[noreturn]] void bld_error_exit(const char *msg, const char *v1, const char *v2, int code);

    // --- growable tables
    void *cfg_malloc(size_t s);
    tbl *new_tbl(const char *name, size_t au);
    void *alloc_tble(tbl *t, size_t s);
    zu_uint32_t save_tbl_val_round(tbl *tp, const void *val, size_t len);
    zu_uint32_t add_to_tbl(tbl *tp, const void *data, size_t len) { return save_tbl_val_round(tp, data, len); }
    void release_if_empty(cdb_ref_t &ref);

    // --- value text
    int str_to_zu(zu_value_t *zu_out, zu_data_type_t zu_type, const char *str_in);
    void set_props(uint32_t *dest, const props_t *props, int len, char *vnoq);

    // --- value placement
    int copy_this_type(value_slot out_data, const zu_value_t *in_data, zu_data_type_t type_in, int type_out,
                       tbl *str_tbl, anchor *array_anchor, uint32_t array_cnt);
    int copy_this_sd_type(value_slot out_data, zu_data_type_t type_in, int type_out, tbl *str_tbl,
                          anchor *array_anchor, anchor *sd_array_anchor, anchor *sd_element_anchor,
                          uint32_t array_cnt, zu_data_type_t sd_type);
    void init_array(tbl *str_tbl, anchor *a, uint32_t array_cnt, value_slot out_data, uint32_t *elem_idx);
    void init_scalar_sd(tbl *str_tbl, anchor *a, uint32_t sd_cnt, value_slot out_data, uint32_t *elem_idx);
    void init_array_sd(tbl *str_tbl, anchor *array_anchor, anchor *sd_anchor, uint32_t array_cnt, uint32_t sd_cnt,
                       value_slot out_data, uint32_t *sd_elem_idx);

    // --- reader
    void cache_input_data(const char *filename);
    int set_table_id(const char *name) const;
    static bool is_SD_stanza(int table_id);
    static bool is_attr_SD(int table_id);
    static sd_type_t SD_stanza_type(int table_id);

    // --- statements
    void save_attr(char *il, int table_id);

    // --- class, map, manager, variable class
    void init_class_tbl();
    void init_class_tbl_fake() {}
    void cmplt_class_tbl();
    void init_cmmap_tbl();
    void cmplt_cmmap_tbl();
    void init_var_class_tbl();
    void cmplt_var_class_tbl();
    void init_mgr_tbl();
    void cmplt_mgr_tbl();
    zu_uint32_t mk_vty_sec();
    zu_uint32_t mk_vv_sec();
    zu_uint32_t mk_sd_sec();

    // --- attributes
    void init_pattr_tbl();
    void init_pattrC_tbl();
    void init_dattr_tbl();
    void init_dattrC_tbl();
    void cmplt_pattr_tbl();
    void cmplt_pattrC_tbl();
    void cmplt_dattr_tbl();
    void cmplt_dattrC_tbl();
    void dump_dflt(tbl *str_tbl, const dflt_tbl &vtbl, value_slot lval, zu_data_type_t dt);

    // --- actions
    void init_action_tbl();
    void init_actionC_tbl();
    void cmplt_action_tbl();
    void cmplt_actionC_tbl();

    // --- structured data
    void init_sd_tbl();
    void cmplt_sd_tbl(srtable_ctrl *scp);

    // --- variable IDs and the builder
    void bld_var_id_tbls();
    void add_varID_to_var_class(const char *srch_name, uint32_t varID);
    tbl *find_tbl_entry(const void *rvcp) const;
    void bld_cdb();
    size_t cdb_size();

    // --- state, public so that tests can look at a compile
    qecfg_options opt;
    srtable_ctrl sc_tables[NUM_STANZA_TYPES + 1];
    int linenum = 0;
    FILE *cdb_fp = nullptr;
    std::string rm_name;
    bool rm_name_given = false;
    rc_locator_t _rc_locator;

    rsrc_class_t cb_rsrc_class{};
    rsrc_cmmap_t cb_rsrc_cmmap{};
    rsrc_mgr_t cb_rsrc_mgr{};
    rsrc_variable_class_t cb_rsrc_variable_class{};
    rsrc_pattr_t cb_rsrc_pattr{};
    rsrc_pattr_t cb_rsrc_pattrC{};
    rsrc_dattr_t cb_rsrc_dattr{};
    rsrc_dattr_t cb_rsrc_dattrC{};
    rsrc_action_t cb_rsrc_action{};
    rsrc_action_t cb_rsrc_actionC{};
    sd_def_t cb_sd_def{};

    tbl rsrc_class_tbl{nullptr, nullptr, nullptr, 0, 3584, "ResourceClasses", 0};
    tbl rsrc_cmmap_tbl{nullptr, nullptr, nullptr, 0, 480, "ResourceCMMaps", 0};
    tbl rsrc_mgr_tbl{nullptr, nullptr, nullptr, 0, 192, "ResourceManagers", 0};
    tbl rsrc_var_class_tbl{nullptr, nullptr, nullptr, 0, 320, "ResourceVariableClasses", 0};
    uint32_t rsrc_class_count = 0, rsrc_cmmap_count = 0, rsrc_mgr_count = 0, rsrc_var_class_count = 0;

  private:
    void compile();
    void bind_sc_tables();
    tbl *entry_tbl(const cdb_ref_t *field) const;
    [[noreturn]] void statement_error(const char *msg, const char *v1 = nullptr, const char *v2 = nullptr);

    // reader
    void handle_header(char *line, int &table_id);
    void complete_open_actions();
    void drop_dflt(dflt_tbl &d);
    void finish_open_records();
    void build_manager();

    // statements
    void apply_masks(srtable_ctrl *e, const table_attrs *row, const char *name);
    void dispatch_statement(srtable_ctrl *e, int table_id, int code, char *target, char *v);
    void store_string(srtable_ctrl *e, char *target, const char *v);
    void store_props(char *target, const props_t *props, int cnt, char *v);
    void store_permission(char *target, const char *v);
    void store_variety(srtable_ctrl *e, char *target, char *v);
    uint32_t next_list_entry(tbl *t, uint32_t sec, size_t entry_size);
    uint16_t *vv_found_flag(int table_id);
    zu_data_type_t attr_data_type(const srtable_ctrl *e) const;
    void store_attr_valid_value(srtable_ctrl *e, int table_id, char *target, char *v);
    void store_valid_value(srtable_ctrl *e, uint32_t sec, zu_data_type_t dt, char *v);
    void place_pair(zu_data_type_t dt, char *v, value_slot low, value_slot high, tbl *st);
    void store_default(srtable_ctrl *e, const char *v);
    void store_display_name(const char *v);
    void store_data_type(srtable_ctrl *e, int table_id, char *target, const char *v);
    void store_range(srtable_ctrl *e, int table_id, char *target, char *v);
    void save_element_attr(srtable_ctrl *e, int code, char *v);
    void store_element_index(const char *v);
    void store_element_type(srtable_ctrl *e, const char *v);

    // stanzas
    template <typename R> void append_record(tbl *t, const R &rec, uint32_t &count);
    void name_class_from_output();
    void resolve_locator();
    uint32_t mk_section(cdb_ref_t rsrc_class_t::*field, size_t size, uint32_t id);
    char *attr_cb(int stanza);
    void init_attr(int stanza);
    void cmplt_attr(int stanza);
    void complete_range(int stanza, zu_data_type_t dt, tbl *st, const tbl *table);
    rsrc_action_t &action_cb(int stanza);
    void init_action(int stanza);
    void cmplt_action(int stanza);
    cdb_ref_t *sd_owner_field(int table_id);
    void start_sd_header(int table_id);
    void check_new_definition(int table_id);
    void append_pending_element();

    // placement
    uint32_t append_zero_body(tbl *st, size_t len);
    int place_scalar(value_slot out, const zu_value_t *in, zu_data_type_t type, int type_out, tbl *st, bool element);

    // builder
    uint64_t class_dsect_size(rsrc_class_t *rc);
    void release_output();
    [[noreturn]] void output_failed(const struct sink_failure &f);
    char *acquire_image(size_t cdb_file_size);
    void begin_dsect(cdb_dsect_type_t type);
    char *copy_record(cdb_dsect_type_t type, const char *src, size_t size);
    void grow_dsect(size_t len);
    void copy_table(char *rec, size_t ref_field, tbl *t, bool rounded);
    void release_storage(tbl *t);
    void note_numeric_ranges(const tbl *t);
    void add_rsrc_class_tbls();
    void add_rsrc_mgr_tbls();
    void add_rsrc_cmmap_tbls();
    void add_rsrc_var_class_tbls();
    void commit_image();

    // Lengths of the attribute keywords, by stanza type and row.
    size_t attr_name_len[NUM_STANZA_TYPES][MAX_ATTRS_PER_STANZA] = {};

    // reader state
    srtable_ctrl *scp = nullptr;
    srtable_ctrl *prev_scp = nullptr;

    // statement bookkeeping
    tbl *vvdisp_tbl = nullptr; // the valid-value entry stored last, by table and offset
    uint32_t vvdisp_off = 0;
    uint16_t pattr_vv_found = 0, pattrC_vv_found = 0, dattr_vv_found = 0, dattrC_vv_found = 0;
    uint16_t dattr_range_found = 0, dattrC_range_found = 0;
    int sd_attr_type = 0;
    bool rvc_name_given = false;

    // structured-data bookkeeping: fields of control blocks
    srtable_ctrl *curr_sd_scp = nullptr;
    cdb_ref_t *curr_sd_tbl = nullptr;
    char *attr_dflt_val = nullptr; // a zu_value_t field
    char *max_sd_idx = nullptr;    // a uint16_t field
    size_t sd_num_elems = 0;
    int sd_name_found = 0, sd_desc_found = 0, sd_disp_found = 0, sd_dt_found = 0, sd_vv_found = 0;
    int curr_sdeli = -1, expected_sdeli = 0;

    // Variable classes given a VariableClass name, by record index; the first
    // of each name by record offset; their ID tables by record offset.
    std::vector<bool> rvc_named;
    std::unordered_map<std::string, uint32_t> var_class_index;
    std::unordered_map<uint32_t, tbl *> var_id_tbls;
    // Dynamic attribute records of a numeric array type whose range holds
    // plain numbers, by table and offset; in the image, by file offset.
    std::set<std::pair<const tbl *, size_t>> numeric_ranges;
    std::unordered_set<uint32_t> numeric_range_offsets;

    // builder state
    char *chp = nullptr;
    char *dsp = nullptr;
    uint32_t dsect_count = 0, dsect_idx = 0;
    uint16_t hdr_max_class_id = 0, hdr_max_rm_id = 0;
    image_sink *sink = nullptr;
    std::unique_ptr<image_sink> own_sink; // the file sink, when none is given
    bool image_pending = false;           // acquired, neither committed nor abandoned

    // Zero-filled memory of the compile, handed out from large chunks: the
    // copies of value texts and the table objects. Table storage itself is
    // reallocated as tables grow and freed through owned_tbls.
    std::vector<void *> owned_blocks;
    char *chunk_next = nullptr;
    size_t chunk_left = 0;
    std::vector<tbl *> owned_tbls;
    std::vector<tbl *> free_tbls; // emptied default lists, for new_tbl to reuse
};

// A stream over a source held in memory.
FILE *open_memory_source(std::string_view text);

// Trace output of a compile.
#define QECFG_TRACE(c, ...) std::fprintf((c).opt.trace_out, __VA_ARGS__)

// The byte-order reversal of a finished image, in place. Records named in
// numeric_ranges (file offsets of dynamic attribute records) hold plain
// numbers in their range fields.
void qecfg_cdef_swap(qel_cdb_header_t *cdb_hdr_p, const std::unordered_set<uint32_t> &numeric_ranges);

#endif
