// What every part of a compile uses: the options, the line being read, the
// fatal exit, table storage, value text and value placement.
#ifndef QECFG_CONTEXT_H
#define QECFG_CONTEXT_H

#include <cstdio>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "qecfg/messages.h"
#include "qecfg_tbl.h"

using msg = qecfg::message_id;

// Every fatal condition of a compile becomes one of these: a row of the
// message table with its subjects and line. Only the library's boundary
// turns it into the text, and main into the exit status.
struct qecfg_fatal {
    msg id;
    uint64_t line = 0;
    std::vector<std::string> subjects;
    int status = 1; // the row's, or the system's error number

    std::string text(bool newline) const { return qecfg::format_message(id, line, subjects, newline); }
};

// Ends the compile with a message of the table. err is the system's error
// number, the status of the rows that take it.
[[noreturn]] void raise_fatal(msg id, uint64_t line, std::initializer_list<std::string_view> subjects = {},
                              int err = 0);

struct qecfg_options {
    int newline_after_message = 1; // -n clears it
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

// How copy_this_type places a value: the given one, or a default.
enum placement_code {
    TYPE_SAME = 1,
    TYPE_16 = 2,   // declared; no placement uses it
    TYPE_INIT = 3, // declared; no placement uses it
    INIT_DEFAULT = 4,
    DFLT_DEFAULT = 5,
    R_LO_DEFAULT = 6,
    R_HI_DEFAULT = 7,
};

// Conversions of value text (no compile state involved).
zu_data_type_t strToZuDt(const char *s);
int strToVar(const char *s, qel_variable_type_t *t);
zu_data_type_t scalar_zu(zu_data_type_t dt);
char *strip_quotes(char *s);
int ver_str_convert(const char *ver_str, uint32_t *n);
int hex_convert(char *zu_out, const char *str_in);
int oct_convert(const char *p, int type, char *out_buf);
// Bytes that hex_convert and oct_convert may write for a text of len chars.
inline size_t binary_image_size(size_t len) { return 4 + len + 1; }

class qecfg_context {
  public:
    explicit qecfg_context(qecfg_options opts) : opt(std::move(opts)) {}
    ~qecfg_context();
    qecfg_context(const qecfg_context &) = delete;
    qecfg_context &operator=(const qecfg_context &) = delete;

    qecfg_options opt;
    uint64_t linenum = 0;      // pieces of input read; more than 2^31 is possible
    FILE *source_fp = nullptr; // open while the source is read

    // A fatal condition at the line being read.
    [[noreturn]] void statement_error(msg id, std::initializer_list<std::string_view> subjects = {}) {
        raise_fatal(id, linenum, subjects);
    }

    // growable tables
    void *cfg_malloc(size_t s);
    tbl *new_tbl(const char *name, size_t au);
    void *alloc_tble(tbl *t, size_t s);
    zu_uint32_t save_tbl_val_round(tbl *tp, const void *val, size_t len);
    zu_uint32_t add_to_tbl(tbl *tp, const void *data, size_t len) { return save_tbl_val_round(tp, data, len); }
    void release_storage(tbl *t);
    void release_if_empty(cdb_ref_t &ref);

    // value text
    int str_to_zu(zu_value_t *zu_out, zu_data_type_t zu_type, const char *str_in);
    void set_props(uint32_t *dest, const props_t *props, int len, char *vnoq);

    // value placement
    int copy_this_type(value_slot out_data, const zu_value_t *in_data, zu_data_type_t type_in, int type_out,
                       tbl *str_tbl, body_cursor *array_anchor, uint32_t array_cnt);
    int copy_this_sd_type(value_slot out_data, zu_data_type_t type_in, int type_out, tbl *str_tbl,
                          body_cursor *array_anchor, body_cursor *sd_array_anchor, body_cursor *sd_element_anchor,
                          uint32_t array_cnt, zu_data_type_t sd_type);
    void init_array(tbl *str_tbl, body_cursor *a, uint32_t array_cnt, value_slot out_data, uint32_t *elem_idx);
    void init_scalar_sd(tbl *str_tbl, body_cursor *a, uint32_t sd_cnt, value_slot out_data, uint32_t *elem_idx);
    void init_array_sd(tbl *str_tbl, body_cursor *array_anchor, body_cursor *sd_anchor, uint32_t array_cnt,
                       uint32_t sd_cnt, value_slot out_data, uint32_t *sd_elem_idx);

  private:
    uint32_t append_zero_body(tbl *st, size_t len);
    int place_scalar(value_slot out, const zu_value_t *in, zu_data_type_t type, int type_out, tbl *st, bool element);

    // Zero-filled memory of the compile, handed out from large chunks: the
    // copies of value texts and the table objects. Table storage itself is
    // reallocated as tables grow and freed through owned_tbls.
    std::vector<void *> owned_blocks;
    char *chunk_next = nullptr;
    size_t chunk_left = 0;
    std::vector<tbl *> owned_tbls;
    std::vector<tbl *> free_tbls; // given back empty, for new_tbl to reuse
};

// A stream over a source held in memory.
FILE *open_memory_source(std::string_view text);

// Trace output of a compile.
#define QECFG_TRACE(c, ...) std::fprintf((c).opt.trace_out, __VA_ARGS__)

#endif
