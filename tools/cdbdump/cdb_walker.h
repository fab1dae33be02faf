// The walker shared by verify and annotate_walk (private to the reader).
#ifndef CDBDUMP_CDB_WALKER_H
#define CDBDUMP_CDB_WALKER_H

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "cdb_text.h"
#include "cdb_walk.h"

namespace cdbdump {

// A table inside the file: absolute start, length, and its name for messages.
struct region {
    size_t base = 0, len = 0;
    const char *name = "";
};

// The tables of one class that lists and value bodies live in.
struct class_tables {
    region strings, varieties, valid_values, sd_defs;
};

// Where the fields that persistent and dynamic attributes share sit in each record.
struct attr_layout {
    size_t msgids, attr_id, data_type, varieties, valid_values, sd, max_sd_idx;
};

// A dynamic attribute of a numeric array type whose range is decided once
// every other body of its class has been reached.
struct pending_range {
    dattr *target;
    size_t record;
    std::string path;
};

class walker {
  public:
    walker(const uint8_t *data, size_t size, bool annotating) : d_(data), n_(size), annotating_(annotating) {}
    // Each dsect goes to the consumer as soon as it is read instead of into the file's model.
    void hand_dsects_to(dsect_consumer each) { each_ = std::move(each); }
    // Spans go to the consumer in batches, each batch before the walk reaches the offset given with
    // it, instead of being kept.
    void hand_spans_to(span_consumer each) { each_spans_ = std::move(each); }
    // The largest ids found by an earlier walk of the same image, so that the header's maxima are
    // checked before the dsects are walked.
    void know_maxima(const dsect_maxima &m) { known_maxima_ = m; }
    // Keeps only the spans that start in [start, end), and walks only the dsects that reach into it.
    void set_window(size_t start, size_t end) {
        window_start_ = start;
        window_end_ = end;
    }
    cdb_file run();
    annotation take_annotation();
    dsect_maxima maxima() const { return maxima_; }

  private:
    // --- basics (cdb_walk.cpp)
    uint64_t get(size_t off, unsigned width) const;
    bool check(bool ok, size_t off, const std::string &what);
    void emit(size_t off, size_t len, std::string field, std::string value);
    uint64_t num(size_t off, unsigned width, const std::string &field);
    bool expect_id(size_t off, uint32_t id, const std::string &field);
    bool dsect_record(const anchor &a, size_t size, uint32_t id, const char *kind, const std::string &path,
                      const char *id_field);
    uint32_t ref(size_t off, const std::string &field);
    bool fits(const region &r, uint64_t off, uint64_t len) const { return off <= r.len && len <= r.len - off; }
    bool claimed(size_t off, size_t len) const;
    bool in_window(size_t off) const { return off >= window_start_ && off < window_end_; }
    bool claim(size_t off, size_t len, size_t at, const std::string &what);
    std::optional<std::string> string_at(const region &r, uint32_t off, size_t at, const std::string &field);
    std::optional<std::string> string_ref(size_t at, const region &r, const std::string &field, bool none_allowed);
    std::optional<std::string> unset_string_ref(size_t at, const region &r, const std::string &field);

    // --- header, anchors and the small dsects (cdb_walk.cpp)
    bool detect_order();
    void walk_header(cdb_file &f);
    std::vector<bool> walk_anchors(cdb_file &f);
    void walk_dsects(cdb_file &f, const std::vector<bool> &walkable);
    void check_maxima(const cdb_file &f, const dsect_maxima &m);
    void keep(cdb_file &f, dsect d);
    void pass_spans(size_t below);
    mgr_dsect walk_manager(const anchor &a, const std::string &path);
    map_dsect walk_map(const anchor &a, const std::string &path);
    var_class_dsect walk_var_class(const anchor &a, const std::string &path);

    // --- class dsect and its records (cdb_walk_class.cpp)
    class_dsect walk_class(const anchor &a, const std::string &path);
    bool walk_class_layout(const anchor &a, const std::string &path, class_tables &t, region tables[]);
    void walk_empty_tables(size_t b, const std::string &path);
    void walk_class_fields(size_t b, const std::string &path, const class_tables &t, class_dsect &c);
    void walk_attr_common(size_t rec, const std::string &path, const class_tables &t, const attr_layout &l,
                          attr_common &a);
    void walk_pattr(size_t rec, const std::string &path, const class_tables &t, uint32_t id, pattr &p);
    void walk_dattr(size_t rec, const std::string &path, const class_tables &t, uint32_t id, dattr &d,
                    std::vector<pending_range> &pending);
    void walk_action(size_t rec, const std::string &path, const class_tables &t, uint32_t id, action &x);
    void walk_zero_ref(size_t at, const std::string &field);
    void attr_value(size_t at, const attr_common &a, const std::string &field, const class_tables &t, value &out);
    void decide_range(const pending_range &p, const class_tables &t);
    bool is_default_range_array(size_t at, uint32_t elem_type, uint64_t expected, const class_tables &t) const;

    // --- lists and typed values (cdb_walk_values.cpp)
    std::vector<variety> walk_varieties(size_t at, const class_tables &t, const std::string &field);
    std::optional<valid_values> walk_valid_values(size_t at, uint32_t type, const class_tables &t,
                                                  const std::string &field);
    std::optional<sd_definition> walk_sd_def(size_t at, const class_tables &t, const std::string &field);
    std::optional<size_t> list_at(size_t at, const region &r, size_t entry, uint32_t id, const std::string &field,
                                  bool none_allowed, const char *prefix, uint32_t &count);
    value typed_value(size_t at, uint32_t type, const class_tables &t, const std::string &field);
    void string_body(uint32_t off, size_t at, const class_tables &t, const std::string &field, value &v);
    void binary_body(size_t body, size_t room, size_t at, const std::string &field, value &v);
    void handle_body(size_t body, size_t room, size_t at, const std::string &field, value &v);
    void array_body(size_t body, size_t room, size_t at, const class_tables &t, const std::string &field, value &v);
    void sd_body(size_t body, size_t room, size_t at, const class_tables &t, const std::string &field, value &v);

    const uint8_t *d_;
    size_t n_;
    bool annotating_;
    bool big_ = false;
    std::vector<span> spans_;
    size_t violations_ = 0;
    std::map<size_t, size_t> claims_;                   // start -> end of every list and value body reached
    std::unordered_map<size_t, size_t> string_lengths_; // strings already read, by file offset
    dsect_consumer each_;
    span_consumer each_spans_;
    std::optional<dsect_maxima> known_maxima_;
    dsect_maxima maxima_;
    size_t window_start_ = 0, window_end_ = SIZE_MAX;
};

} // namespace cdbdump

#endif
