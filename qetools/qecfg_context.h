// What every part of a compile uses: the options, the line being read, the
// fatal exit and the table arena.
#ifndef QECFG_CONTEXT_H
#define QECFG_CONTEXT_H

#include <cstdio>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "qecfg/qecfg.h"
#include "qecfg_fatal.h"
#include "qecfg_tbl.h"
#include "qecfg_value.h"

// The library's options, in its own words, with the source and where the
// image goes (the file output_name when sink is null).
struct qecfg_options : qecfg::options {
    qecfg::source source;
    class image_sink *sink = nullptr;
};

class qecfg_context : public table_arena {
  public:
    explicit qecfg_context(qecfg_options opts)
        : table_arena(table_trace{opts.trace_level, opts.trace_out, opts.trace_err}), opt(std::move(opts)) {}
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
