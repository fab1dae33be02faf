// Stanza builders: each record kind is built by a builder that owns its
// record while it is open, the rows its stanza has had, its default list and
// its structured-data link. A builder is started by the header of its stanza
// and completed in one place; the compile sequence hands it the statements.
// A builder needs no compile: only the table arena its records and values go
// to (and, for the two that trace, where traces go). Its fatal conditions
// name no line; the sequence, which reads the lines, gives them theirs.
#ifndef QECFG_BUILDERS_H
#define QECFG_BUILDERS_H

#include <cstdio>
#include <set>
#include <string>
#include <vector>

#include "qecfg_fatal.h"
#include "qecfg_keywords.h"
#include "qecfg_tbl.h"
#include "qecfg_value.h"

// The records of the whole source, one table per kind.
struct record_table {
    record_table(const char *name, size_t au) : t(name, au) {}
    tbl t;
    uint32_t count = 0;
    template <typename R> void append(table_arena &arena, const R &rec) {
        std::memcpy(arena.alloc_tble(&t, sizeof(R)), &rec, sizeof(R));
        count++;
    }
};

// The statements of the stanza being read go to the open builder of its kind.
class stanza_builder {
  public:
    explicit stanza_builder(table_arena &arena, const rsrc_class_t *cls = nullptr) : arena(arena), cls(cls) {}
    virtual ~stanza_builder() = default;
    stanza_builder(const stanza_builder &) = delete;
    stanza_builder &operator=(const stanza_builder &) = delete;

    given_rows given; // of the stanza being read; reset at each of its headers

    // Stores one statement whose row passed the order and duplicate rules.
    virtual void store_statement(const keyword_row &row, char *value);

  protected:
    virtual char *record() = 0; // what the rows' fields designate
    virtual tbl *strings() = 0; // where the texts go
    tbl *class_table(cdb_ref_t rsrc_class_t::*field) const;

    void store_variety(char *field, char *value);
    // One valid value (or low,high pair) into the next entry of a section.
    void store_valid_value(uint32_t sec, zu_data_type_t dt, char *value);
    // Converts "low,high" (or one value for both) and places both ends.
    void place_pair(zu_data_type_t dt, char *value, value_slot low, value_slot high);

    table_arena &arena;
    const rsrc_class_t *cls; // the class whose tables hold the sections
    // The display message id of the valid value stored last, by table and
    // offset; none at the start of every attribute, action and element.
    tbl *vvdisp_tbl = nullptr;
    uint32_t vvdisp_off = 0;
};

// Items of one type, an 8-byte slot each, in a table of its own whose growth
// traces like any table's: the default values of an attribute, or the
// element types of a structured attribute.
template <typename T> struct slot_list {
    static_assert(sizeof(T) <= 8);
    static constexpr size_t SLOT = 8;
    tbl t;
    size_t size() const { return tbl_used(&t) / SLOT; }
    T at(size_t i) const { return load<T>(t.tbl_base + i * SLOT); }
    // The next slot, zero-filled; valid until the next one is taken.
    char *take(table_arena &arena) { return static_cast<char *>(arena.alloc_tble(&t, SLOT)); }
};

class class_builder : public stanza_builder {
  public:
    class_builder(table_arena &arena, record_table &classes) : stanza_builder(arena, &rec), classes(classes) {}
    rsrc_class_t rec{};
    bool open() const { return rec.rc_cb_ID != 0; }
    void start();                                          // a fresh class with its thirteen tables
    void name_from_output(const std::string &output_name); // of an unnamed class
    void finish();                                         // the locator resolved, the record appended
    uint32_t new_section(cdb_ref_t rsrc_class_t::*table, size_t size, uint32_t id);
    void store_statement(const keyword_row &row, char *value) override;

  private:
    char *record() override { return reinterpret_cast<char *>(&rec); }
    tbl *strings() override { return ref_table(rec.u_rc_strings); }
    void resolve_locator();
    record_table &classes;
    bool locator_given = false;
    char locator[QECFG_MAX_VALUE_LEN + 1] = {};
};

class map_builder : public stanza_builder {
  public:
    map_builder(table_arena &arena, record_table &maps) : stanza_builder(arena), maps(maps) {}
    rsrc_cmmap_t rec{};
    bool open() const { return rec.rcm_cb_ID != 0; }
    void start();
    void complete();
    void store_statement(const keyword_row &row, char *value) override;
    bool manager_given = false;
    std::string manager;

  private:
    char *record() override { return reinterpret_cast<char *>(&rec); }
    tbl *strings() override { return ref_table(rec.u_rcm_strings); }
    record_table &maps;
};

class var_class_builder : public stanza_builder {
  public:
    var_class_builder(table_arena &arena, record_table &var_classes)
        : stanza_builder(arena), var_classes(var_classes) {}
    rsrc_variable_class_t rec{};
    bool open() const { return rec.rvc_cb_ID != 0; }
    void start();
    void complete();
    void store_statement(const keyword_row &row, char *value) override;
    std::vector<bool> named; // by record: a VariableClass statement was given

  private:
    char *record() override { return reinterpret_cast<char *>(&rec); }
    tbl *strings() override { return ref_table(rec.u_rvc_string_tbl); }
    record_table &var_classes;
    bool name_given = false;
};

class attr_builder : public stanza_builder {
  public:
    attr_builder(table_arena &arena, FILE *trace, class_builder &owner, int stanza,
                 std::set<std::pair<const tbl *, size_t>> &numeric_ranges);
    bool open() const { return load<uint32_t>(&rec) != 0; }
    void start();
    void complete();
    void store_statement(const keyword_row &row, char *value) override;

    // The structured-data definition of a structured attribute: its owner
    // field, its highest element index, and the element types of its run.
    bool dynamic() const { return dynamic_; }
    zu_data_type_t data_type() const;
    cdb_ref_t &sd_ref();
    void set_max_sd_idx(uint16_t idx);
    void add_element_type(zu_data_type_t type);
    void build_structured_value(); // from the element types, once its run ends

  private:
    char *record() override { return reinterpret_cast<char *>(&rec); }
    tbl *strings() override { return class_table(&rsrc_class_t::u_rc_strings); }
    char *field(size_t pattr_off, size_t dattr_off) { return record() + (dynamic_ ? dattr_off : pattr_off); }
    value_slot value_field();
    void store_valid_value_statement(char *field, char *value);
    void store_default(const char *value);
    void store_data_type(char *field, const char *value);
    void store_range(char *field, char *value);
    void complete_range();
    void complete_value();

    FILE *trace;
    class_builder &owner;
    const int stanza;
    const bool dynamic_;
    std::set<std::pair<const tbl *, size_t>> &numeric_ranges;
    union {
        rsrc_pattr_t p;
        rsrc_dattr_t d;
    } rec{};
    bool valid_values_started = false, range_given = false;
    slot_list<zu_value_t> values;            // DefaultValue or InitialValue statements
    slot_list<zu_data_type_t> element_types; // of a structured attribute: one per element
};

class action_builder : public stanza_builder {
  public:
    action_builder(table_arena &arena, class_builder &owner, int stanza);
    rsrc_action_t rec{};
    bool open() const { return rec.ac_cb_ID != 0; }
    void start();
    void complete();

  private:
    char *record() override { return reinterpret_cast<char *>(&rec); }
    tbl *strings() override { return class_table(&rsrc_class_t::u_rc_strings); }
    class_builder &owner;
    const int stanza;
};

// A run of consecutive structured-data stanzas of one kind: one definition
// in "ClassSDDefs", one element per stanza, attached to its owner.
class sd_run : public stanza_builder {
  public:
    sd_run(table_arena &arena, FILE *trace, class_builder &owner, action_builder (&actions)[2]);
    bool pending() const { return element_open; } // an element is being read
    void start_stanza(int kind, int prev_stanza);
    void complete(); // the run ends
    void link_attribute(attr_builder *a) { attr = a; }
    void store_statement(const keyword_row &row, char *value) override;

  private:
    char *record() override { return reinterpret_cast<char *>(&element); }
    tbl *strings() override { return class_table(&rsrc_class_t::u_rc_strings); }
    cdb_ref_t *class_owner(int kind);
    void check_new_definition(int kind);
    void begin_definition(int kind);
    void next_element();
    void append_pending_element();
    void store_element_index(const char *value);
    void store_element_type(const char *value);

    FILE *trace;
    class_builder &owner;
    action_builder (&actions)[2];
    attr_builder *attr = nullptr; // the structured attribute the run belongs to
    sd_field element{};
    bool element_open = false, element_valid_values = false;
    uint32_t def_off = 0;                    // the definition in "ClassSDDefs"
    int curr_sdeli = -1, expected_sdeli = 0; // last ElementIndex, next expected
};

#endif
