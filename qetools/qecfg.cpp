// One compile: the source's lines handed to the builders, the order in
// which open records are completed, and the sequence after the source.
#include <cerrno>
#include <cstdlib>
#include <new>

#include "qecfg.h"
#include "qecfg_sink.h"
#include "qecfg_source.h"

void raise_fatal(msg id, uint64_t line, std::initializer_list<std::string_view> subjects, int err) {
    int status = qecfg::message(id).status;
    throw qecfg_fatal{id, line, std::vector<std::string>(subjects.begin(), subjects.end()), status ? status : err};
}

qecfg_compiler::qecfg_compiler(qecfg_options opts)
    : opt(std::move(opts)), arena(table_trace{opt.trace_level, opt.trace_out, opt.trace_err}) {}

void qecfg_compiler::read_source(const char *filename) {
    source_fp.reset(opt.source.in_memory ? open_memory_source(opt.source.text) : std::fopen(filename, "r"));
    if (!source_fp) {
        int e = errno;
        raise_fatal(msg::cannot_open, 0, {filename, std::strerror(e)}, e);
    }
    source_reader reader(source_fp.get(), linenum);
    source_line line;
    while (reader.next(line)) {
        linenum = line.line;
        if (line.header)
            read_header(line);
        else
            read_statement(line);
    }
    linenum = reader.last_line();
    const source_stop &stop = reader.stop();
    if (stop.id == msg::cannot_read)
        raise_fatal(stop.id, 0, {filename, std::strerror(stop.err)}, stop.err);
    if (stop.id != msg::none)
        raise_fatal(stop.id, stop.line);
    source_fp.reset();
}

stanza_builder &qecfg_compiler::builder_of(int t) {
    switch (t) {
    case ST_CONTROL_DEFINITION:
    case ST_RESOURCE_CLASS: return cls;
    case ST_CLASS_TO_MANAGER_MAPPING: return map;
    case ST_RESOURCE_VARIABLE_CLASS: return vclass;
    case ST_CLASS_ACTION: return actions[0];
    case ST_RESOURCE_ACTION: return actions[1];
    default: return is_sd_stanza(t) ? static_cast<stanza_builder &>(sd) : attrs[t - ST_PERSISTENT_RESOURCE_ATTRIBUTE];
    }
}

// A header completes the open structured-data run and the open actions,
// then starts its own builder, which completes the open record of its kind.
// Records of other kinds stay open until the next stanza of their kind or
// the end of the source.
void qecfg_compiler::read_header(const source_line &header) {
    int t = header.stanza;
    if (t < 0)
        statement_error(msg::invalid_stanza, {header.name});
    prev_stanza = stanza;
    stanza = t;
    if (is_sd_stanza(t)) {
        sd.start_stanza(t, prev_stanza);
        sd.given = given_rows{};
        return;
    }
    if (sd.pending())
        sd.complete();
    complete_open_actions();
    start_stanza(t);
    builder_of(t).given = given_rows{};
    sd.link_attribute(nullptr);
}

void qecfg_compiler::start_stanza(int t) {
    switch (t) {
    case ST_CONTROL_DEFINITION:
        if (cls.open())
            complete_class();
        cls.start();
        break;
    case ST_RESOURCE_CLASS: break; // fills the class its ControlDefinition opened
    case ST_CLASS_TO_MANAGER_MAPPING: map.start(); break;
    case ST_RESOURCE_VARIABLE_CLASS: vclass.start(); break;
    case ST_CLASS_ACTION: actions[0].start(); break;
    case ST_RESOURCE_ACTION: actions[1].start(); break;
    default: attrs[t - ST_PERSISTENT_RESOURCE_ATTRIBUTE].start(); break;
    }
}

void qecfg_compiler::complete_open_actions() {
    for (action_builder *a : {&actions[1], &actions[0]})
        if (a->open())
            a->complete();
}

void qecfg_compiler::read_statement(const source_line &s) {
    if (s.skipped)
        return;
    if (s.problem != msg::none)
        statement_error(s.problem, {s.name});
    const stanza_def &def = stanza_defs[stanza];
    if (!s.row)
        statement_error(msg::unknown_keyword, {s.name, def.name});
    if (s.value_length == 0) {
        std::fprintf(opt.trace_out, "In file %s: ", opt.source.name.c_str());
        statement_error(msg::missing_value, {s.name});
    }
    if (opt.trace_level > 1)
        std::fprintf(opt.trace_out, "%s: found attr: \"%s\", value: \"%s\",length: %d\n", def.name, s.name, s.value,
                     int(s.value_length));
    // The given rows change before the value is converted; a value then
    // refused ends the compile.
    stanza_builder &b = builder_of(stanza);
    msg refusal = b.given.admit(*s.row, def.required_mask);
    if (refusal != msg::none)
        statement_error(refusal, {s.name});
    if (!s.row->optional && opt.trace_level > 1)
        std::fprintf(opt.trace_out, "Added %x to mask, which is now %x\n", s.row->bit, b.given.required);
    b.store_statement(*s.row, s.value);
    // A structured attribute owns the definition of the run that follows.
    if (s.row->what == statement::data_type) {
        attr_builder &a = attrs[stanza - ST_PERSISTENT_RESOURCE_ATTRIBUTE];
        if (zu_is_sd_type(a.data_type()))
            sd.link_attribute(&a);
    }
}

// Everything still open at the end of the source. Each completion appends
// bodies to "ClassStrings", so this order decides the string layout: the
// structured-data run first (it writes into its attribute's record), then the
// attributes and the actions of the last class.
void qecfg_compiler::finish_open_records() {
    if (sd.pending())
        sd.complete();
    complete_open_attributes({ST_PERSISTENT_RESOURCE_ATTRIBUTE, ST_DYNAMIC_RESOURCE_ATTRIBUTE,
                              ST_PERSISTENT_CLASS_ATTRIBUTE, ST_DYNAMIC_CLASS_ATTRIBUTE});
    complete_open_actions();
}

void qecfg_compiler::complete_open_attributes(std::initializer_list<int> order) {
    for (int k : order) {
        attr_builder &a = attrs[k - ST_PERSISTENT_RESOURCE_ATTRIBUTE];
        if (a.open())
            a.complete();
    }
}

// A class completed at the next ControlDefinition takes its name first and
// completes its attributes in an order of its own (class attributes first),
// which decides the string layout of such a class as finish_open_records
// decides that of the last one. The actions are already complete: every
// header completes them.
void qecfg_compiler::complete_class() {
    if (cls.rec.u_rc_name.offset[0] == CDB_NONE)
        cls.name_from_output(opt.output_name);
    complete_open_attributes({ST_PERSISTENT_CLASS_ATTRIBUTE, ST_DYNAMIC_CLASS_ATTRIBUTE,
                              ST_PERSISTENT_RESOURCE_ATTRIBUTE, ST_DYNAMIC_RESOURCE_ATTRIBUTE});
    cls.finish();
}

// The map's ResourceManager statement is the only source of the manager.
void qecfg_compiler::build_manager() {
    if (!map.manager_given)
        raise_fatal(msg::no_manager, 0);
    rsrc_mgr_t m{};
    m.rm_cb_ID = RSRC_MGR_ID;
    tbl *strings = arena.new_tbl("ManagerStrings", 8192);
    m.u_rm_strings_table = table_ref(strings);
    m.u_rm_RMname.offset[0] = arena.add_to_tbl(strings, map.manager.c_str(), map.manager.size() + 1);
    m.rm_id = qel_rm_id_t(managers.count);
    managers.append(arena, m);
}

void qecfg_compiler::run() {
    try {
        compile();
    } catch (qecfg_fatal &f) {
        // A condition at the statement being read takes its line here.
        if (f.line == 0 && qecfg::message(f.id).line == qecfg::line_source::statement)
            f.line = linenum;
        throw;
    } catch (const std::bad_alloc &) {
        // Memory taken by the library's containers runs out like a table's.
        raise_fatal(msg::out_of_memory, 0, {std::strerror(ENOMEM)}, ENOMEM);
    }
}

void qecfg_compiler::compile() {
    read_source(opt.source.name.c_str());
    finish_open_records();
    if (!cls.open())
        raise_fatal(msg::no_classes, 0);
    complete_class();
    if (vclass.open())
        vclass.complete();
    if (!map.open())
        raise_fatal(msg::no_maps, 0);
    map.complete();
    build_manager();
    cdb_writer writer(arena, output_target(), opt.reverse_byte_order);
    writer.write(compiled_records{classes, maps, managers, var_classes, vclass.named, numeric_ranges});
}

image_target qecfg_compiler::output_target() const {
    return image_target{opt.sink, opt.output_name,
                        opt.source.in_memory ? file_identity{} : identity_of(opt.source.name)};
}
