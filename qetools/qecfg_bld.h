// The image writer: the variable ID tables that group dynamic attributes by
// variable class, then the records of a whole source laid into one CDB image
// taken from its sink, reversed when asked, and committed. An image that is
// not committed is abandoned when the writer ends.
#ifndef QECFG_BLD_H
#define QECFG_BLD_H

#include <memory>
#include <set>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "qecfg_builders.h"
#include "qecfg_sink.h"

// What the builders completed, as the writer takes it.
struct compiled_records {
    record_table &classes, &maps, &managers, &var_classes;
    const std::vector<bool> &var_class_named; // by record: a VariableClass statement was given
    // Dynamic attribute records of a numeric array type whose range holds
    // plain numbers, by table and offset.
    const std::set<std::pair<const tbl *, size_t>> &numeric_ranges;
};

// Where the image goes: the given sink, or else the file `path`, which must
// not be the source file.
struct image_target {
    image_sink *given = nullptr;
    std::string path;
    file_identity source;
};

class cdb_writer {
  public:
    cdb_writer(table_arena &arena, image_target target, bool reverse_byte_order);
    ~cdb_writer();
    cdb_writer(const cdb_writer &) = delete;
    cdb_writer &operator=(const cdb_writer &) = delete;

    // Spends the records' tables as it copies them.
    void write(const compiled_records &records);

  private:
    // variable IDs: the first variable class of each name by record offset,
    // the ID tables by record offset
    void bld_var_id_tbls();
    void add_varID_to_var_class(const char *srch_name, uint32_t varID);
    tbl *find_tbl_entry(const void *rvcp) const;
    // the image
    size_t cdb_size();
    uint64_t class_dsect_size(rsrc_class_t *rc);
    [[noreturn]] void output_failed(const sink_failure &f);
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
    void write_header();
    void commit_image();

    table_arena &arena;
    const image_target target;
    const bool reverse;
    const compiled_records *in = nullptr;
    std::unordered_map<std::string, uint32_t> var_class_index;
    std::unordered_map<uint32_t, tbl *> var_id_tbls;
    std::unordered_set<uint32_t> numeric_range_offsets; // in the image
    char *chp = nullptr;                                // the image's start
    char *dsp = nullptr;                                // where the next dsect's bytes go
    uint32_t dsect_count = 0, dsect_idx = 0;
    uint16_t hdr_max_class_id = 0, hdr_max_rm_id = 0;
    image_sink *sink = nullptr;
    std::unique_ptr<image_sink> own_sink; // the file sink, when none is given
    bool image_pending = false;           // acquired, neither committed nor abandoned
};

#endif
