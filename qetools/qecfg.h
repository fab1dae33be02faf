// The map of the compiler. One compile is one qecfg_compiler, which only
// sequences the stages, each usable alone:
//
//   source text -> the positioned source model (qecfg_source.h, read a line
//   at a time) -> the stanza builders (qecfg_builders.h), converting and
//   placing values through a table arena (qecfg_value.h, qecfg_tbl.h) ->
//   the image writer with its variable IDs (qecfg_bld.h) -> byte-order
//   reversal (qecfg_swap.h)
#ifndef QECFG_H
#define QECFG_H

#include <cstdio>
#include <initializer_list>
#include <memory>
#include <set>

#include "qecfg_bld.h"
#include "qecfg_context.h"

// Closes the source when the compile ends, however it ends.
struct source_closer {
    void operator()(FILE *fp) const { std::fclose(fp); }
};

class qecfg_compiler {
  public:
    explicit qecfg_compiler(qecfg_options opts);

    // The compile: read the source, complete everything, build the CDB.
    void run();

    uint64_t linenum = 0; // pieces of input read; more than 2^31 is possible

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
    image_target output_target() const;

    qecfg_options opt;
    table_arena arena;
    std::unique_ptr<FILE, source_closer> source_fp; // open while the source is read

    record_table classes{"ResourceClasses", 3584};
    record_table maps{"ResourceCMMaps", 480};
    record_table managers{"ResourceManagers", 192};
    record_table var_classes{"ResourceVariableClasses", 320};
    // Dynamic attribute records of a numeric array type whose range holds
    // plain numbers, by table and offset.
    std::set<std::pair<const tbl *, size_t>> numeric_ranges;

    class_builder cls{arena, classes};
    map_builder map{arena, maps};
    var_class_builder vclass{arena, var_classes};
    attr_builder attrs[4]{{arena, opt.trace_out, cls, ST_PERSISTENT_RESOURCE_ATTRIBUTE, numeric_ranges},
                          {arena, opt.trace_out, cls, ST_PERSISTENT_CLASS_ATTRIBUTE, numeric_ranges},
                          {arena, opt.trace_out, cls, ST_DYNAMIC_RESOURCE_ATTRIBUTE, numeric_ranges},
                          {arena, opt.trace_out, cls, ST_DYNAMIC_CLASS_ATTRIBUTE, numeric_ranges}};
    action_builder actions[2]{{arena, cls, ST_CLASS_ACTION}, {arena, cls, ST_RESOURCE_ACTION}};
    sd_run sd{arena, opt.trace_out, cls, actions};
    int stanza = -1, prev_stanza = -1; // of the last header and the one before
};

#endif
