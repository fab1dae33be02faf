// The map of the compiler. One compile is one qecfg_compiler: the services
// every part uses (qecfg_context: options, the current line, the fatal exit,
// table storage, value text and placement), the stanza builders that turn
// statements into records (qecfg_builders.h), the records that span the
// source, and the CDB builder that writes them out.
//
//   source text -> reader (qecfg_reader.cpp) -> statements of the open
//   builder (qecfg_stmt.cpp) -> completed records (qecfg_class.cpp,
//   qecfg_attr.cpp, qecfg_action.cpp, qecfg_sd.cpp) -> variable IDs and the
//   image (qecfg_bld.cpp) -> byte-order reversal (qecfg_swap.cpp)
#ifndef QECFG_H
#define QECFG_H

#include <cstdio>
#include <initializer_list>
#include <memory>
#include <set>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "qecfg_builders.h"

class qecfg_compiler : public qecfg_context {
  public:
    explicit qecfg_compiler(qecfg_options opts);
    ~qecfg_compiler();

    // The compile: read the source, complete everything, build the CDB.
    void run();

    record_table classes{"ResourceClasses", 3584};
    record_table maps{"ResourceCMMaps", 480};
    record_table managers{"ResourceManagers", 192};
    record_table var_classes{"ResourceVariableClasses", 320};

  private:
    void compile();
    // reader and stanza framing
    void read_source(const char *filename);
    void read_header(const struct source_line &header);
    void read_statement(const struct source_line &statement);
    stanza_builder &builder_of(int stanza);
    void start_stanza(int stanza);
    void complete_open_actions();
    void finish_open_records();
    void complete_open_attributes(std::initializer_list<int> order);
    void complete_class();
    void build_manager();

    // Dynamic attribute records of a numeric array type whose range holds
    // plain numbers, by table and offset; in the image, by file offset.
    std::set<std::pair<const tbl *, size_t>> numeric_ranges;
    std::unordered_set<uint32_t> numeric_range_offsets;

    class_builder cls{*this, classes};
    map_builder map{*this, maps};
    var_class_builder vclass{*this, var_classes};
    attr_builder attrs[4]{{*this, cls, ST_PERSISTENT_RESOURCE_ATTRIBUTE, numeric_ranges},
                          {*this, cls, ST_PERSISTENT_CLASS_ATTRIBUTE, numeric_ranges},
                          {*this, cls, ST_DYNAMIC_RESOURCE_ATTRIBUTE, numeric_ranges},
                          {*this, cls, ST_DYNAMIC_CLASS_ATTRIBUTE, numeric_ranges}};
    action_builder actions[2]{{*this, cls, ST_CLASS_ACTION}, {*this, cls, ST_RESOURCE_ACTION}};
    sd_run sd{*this, cls, actions};
    int stanza = -1, prev_stanza = -1; // of the last header and the one before

    // variable IDs: the first variable class of each name by record offset,
    // the ID tables by record offset
    void bld_var_id_tbls();
    void add_varID_to_var_class(const char *srch_name, uint32_t varID);
    tbl *find_tbl_entry(const void *rvcp) const;
    std::unordered_map<std::string, uint32_t> var_class_index;
    std::unordered_map<uint32_t, tbl *> var_id_tbls;

    // the image
    void bld_cdb();
    size_t cdb_size();
    uint64_t class_dsect_size(rsrc_class_t *rc);
    void release_output();
    [[noreturn]] void output_failed(const struct sink_failure &f);
    char *acquire_image(size_t cdb_file_size);
    void begin_dsect(cdb_dsect_type_t type);
    char *copy_record(cdb_dsect_type_t type, const char *src, size_t size);
    void grow_dsect(size_t len);
    void copy_table(char *rec, size_t ref_field, tbl *t, bool rounded);
    void note_numeric_ranges(const tbl *t);
    void add_rsrc_class_tbls();
    void add_rsrc_mgr_tbls();
    void add_rsrc_cmmap_tbls();
    void add_rsrc_var_class_tbls();
    void commit_image();
    char *chp = nullptr; // the image's start
    char *dsp = nullptr; // where the next dsect's bytes go
    uint32_t dsect_count = 0, dsect_idx = 0;
    uint16_t hdr_max_class_id = 0, hdr_max_rm_id = 0;
    image_sink *sink = nullptr;
    std::unique_ptr<image_sink> own_sink; // the file sink, when none is given
    bool image_pending = false;           // acquired, neither committed nor abandoned
};

// The byte-order reversal of a finished image, in place. Records named in
// numeric_ranges (file offsets of dynamic attribute records) hold plain
// numbers in their range fields.
void qecfg_cdef_swap(qel_cdb_header_t *cdb_hdr_p, const std::unordered_set<uint32_t> &numeric_ranges);

#endif
