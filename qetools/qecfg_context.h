// What every part of a compile uses: the options, the line being read, the
// fatal exit and the table arena.
#ifndef QECFG_CONTEXT_H
#define QECFG_CONTEXT_H

#include <cstdio>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "qecfg_fatal.h"
#include "qecfg_tbl.h"
#include "qecfg_value.h"

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

class qecfg_context : public table_arena {
  public:
    explicit qecfg_context(qecfg_options opts)
        : table_arena(table_trace{opts.debugLevel, opts.trace_out, opts.trace_err}), opt(std::move(opts)) {}
    ~qecfg_context();

    qecfg_options opt;
    uint64_t linenum = 0;      // pieces of input read; more than 2^31 is possible
    FILE *source_fp = nullptr; // open while the source is read

    // A fatal condition at the line being read.
    [[noreturn]] void statement_error(msg id, std::initializer_list<std::string_view> subjects = {}) {
        raise_fatal(id, linenum, subjects);
    }
};

// A stream over a source held in memory.
FILE *open_memory_source(std::string_view text);

// Trace output of a compile.
#define QECFG_TRACE(c, ...) std::fprintf((c).opt.trace_out, __VA_ARGS__)

#endif
