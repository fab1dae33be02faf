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
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "qecfg_bld.h"

class qecfg_compiler : public qecfg_context {
  public:
    explicit qecfg_compiler(qecfg_options opts);

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
    // plain numbers, by table and offset.
    std::set<std::pair<const tbl *, size_t>> numeric_ranges;

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

    image_target output_target() const;
};

#endif
