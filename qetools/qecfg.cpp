// One compile: the sequence after the source has been read, the order in
// which open records are completed, and the fatal exit.
#include <cerrno>
#include <cstdlib>
#include <new>

#include "qecfg.h"
#include "qecfg_sink.h"

qecfg_context::~qecfg_context() {
    if (source_fp)
        std::fclose(source_fp);
    for (tbl *t : owned_tbls)
        std::free(t->tbl_base);
    for (void *p : owned_blocks)
        std::free(p);
}

void raise_fatal(msg id, uint64_t line, std::initializer_list<std::string_view> subjects, int err) {
    int status = qecfg::message(id).status;
    throw qecfg_fatal{id, line, std::vector<std::string>(subjects.begin(), subjects.end()), status ? status : err};
}

qecfg_compiler::qecfg_compiler(qecfg_options opts) : qecfg_context(std::move(opts)) {
    for (int i = 0; i < NUM_STANZA_TYPES; i++)
        for (int r = 0; r < stanza_defs[i].num_rows; r++)
            row_name_len[i][r] = std::strlen(stanza_defs[i].rows[r].name);
}

qecfg_compiler::~qecfg_compiler() {
    release_output();
    for (record_table *r : {&classes, &maps, &managers, &var_classes})
        std::free(r->t.tbl_base);
    // The lists of the builders are tables of their own.
    for (attr_builder &a : attrs)
        a.release_lists();
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
        cls.name_from_output();
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
    tbl *strings = new_tbl("ManagerStrings", 8192);
    m.u_rm_strings_table = table_ref(strings);
    m.u_rm_RMname.offset[0] = add_to_tbl(strings, map.manager.c_str(), map.manager.size() + 1);
    m.rm_id = qel_rm_id_t(managers.count);
    managers.append(*this, m);
}

void qecfg_compiler::run() {
    try {
        compile();
    } catch (const std::bad_alloc &) {
        // Memory taken by the library's containers runs out like a table's.
        release_output();
        raise_fatal(msg::out_of_memory, 0, {std::strerror(ENOMEM)}, ENOMEM);
    }
}

void qecfg_compiler::compile() {
    read_source(opt.cdefsrc.c_str());
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
    bld_var_id_tbls();
    bld_cdb();
}
