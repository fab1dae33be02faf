// Stanza builders used alone: a table arena and the keyword rows, no source
// and no compile.
#include <gtest/gtest.h>

#include <set>
#include <string>

#include "compile_support.h"
#include "qecfg_builders.h"

namespace {

// One statement as the compile sequence hands it over: counted by the row
// rules, then stored.
void give(stanza_builder &b, int stanza, const char *keyword, std::string value) {
    const keyword_row &row = row_named(stanza, keyword);
    ASSERT_EQ(b.given.admit(row, stanza_defs[stanza].required_mask), msg::none) << keyword;
    b.store_statement(row, value.data());
}

// A class and builders of the attribute kinds it is given here.
struct one_class {
    table_arena arena;
    record_table classes{"ResourceClasses", 3584};
    std::set<std::pair<const tbl *, size_t>> numeric_ranges;
    class_builder cls{arena, classes};
    attr_builder pattr{arena, stdout, cls, ST_PERSISTENT_RESOURCE_ATTRIBUTE, numeric_ranges};
    attr_builder dattr{arena, stdout, cls, ST_DYNAMIC_RESOURCE_ATTRIBUTE, numeric_ranges};

    void attribute(attr_builder &a, int stanza, const char *name, const char *id) {
        a.start();
        give(a, stanza, kw::Name, name);
        give(a, stanza, kw::Description, "3");
        give(a, stanza, kw::DisplayName, "4");
        give(a, stanza, kw::Id, id);
        give(a, stanza, kw::DataType, "Int32");
        if (stanza == ST_DYNAMIC_RESOURCE_ATTRIBUTE)
            give(a, stanza, kw::VariableType, "Counter");
        give(a, stanza, kw::VarietyRange, "1,1");
    }

    const rsrc_class_t &record() const { return *reinterpret_cast<const rsrc_class_t *>(classes.t.tbl_base); }
    std::string text(uint32_t off) const { return ref_table(record().u_rc_strings)->tbl_base + off; }
};

TEST(Builders, OneClassWithAttributesIsBuiltFromItsStatementsAlone) {
    one_class c;
    c.cls.start();
    give(c.cls, ST_CONTROL_DEFINITION, kw::FileVersion, "1.2.3.4");
    c.cls.given = given_rows{};
    for (const char *k : {kw::Description, kw::DisplayName})
        give(c.cls, ST_RESOURCE_CLASS, k, "1");
    give(c.cls, ST_RESOURCE_CLASS, kw::Properties, "HasResources");
    give(c.cls, ST_RESOURCE_CLASS, kw::ClassPermTemplate, "t");
    give(c.cls, ST_RESOURCE_CLASS, kw::ResourcePermTemplate, "t");
    give(c.cls, ST_RESOURCE_CLASS, kw::Locator, "Size");
    give(c.cls, ST_RESOURCE_CLASS, kw::Name, "Demo.Disk");
    c.attribute(c.pattr, ST_PERSISTENT_RESOURCE_ATTRIBUTE, "Size", "7");
    give(c.pattr, ST_PERSISTENT_RESOURCE_ATTRIBUTE, kw::DefaultValue, "42");
    c.pattr.complete();
    c.attribute(c.dattr, ST_DYNAMIC_RESOURCE_ATTRIBUTE, "Load", "9");
    c.dattr.complete();
    c.cls.finish();

    ASSERT_EQ(c.classes.count, 1u);
    const rsrc_class_t &rc = c.record();
    EXPECT_EQ(rc.rc_version, 0x01020304u);
    EXPECT_EQ(c.text(rc.u_rc_name.offset[0]), "Demo.Disk");
    EXPECT_EQ(rc.rc_locator, 7); // the Id of the attribute the Locator names

    const tbl *pattrs = ref_table(rc.u_rc_pattrs);
    ASSERT_EQ(tbl_used(pattrs), sizeof(rsrc_pattr_t));
    rsrc_pattr_t p = load<rsrc_pattr_t>(pattrs->tbl_base);
    EXPECT_EQ(c.text(p.u_ra_name.offset[0]), "Size");
    EXPECT_EQ(p.ra_attr_id, 7u);
    EXPECT_EQ(p.ra_data_type, ZU_INT32);
    EXPECT_EQ(p.ra_dflt_value.val_int32, 42);
    EXPECT_EQ(p.ra_props, CDB_PA_INVAL_FOR_DEFINE); // neither required nor optional for define
    EXPECT_EQ(p.u_ra_valid_vals.offset[0], CDB_NONE);
    const tbl *varieties = ref_table(rc.u_rc_variety_lists);
    variety_list_t vl = load<variety_list_t>(varieties->tbl_base + p.u_ra_variety_list.offset[0]);
    EXPECT_EQ(vl.vl_count, 1u);
    EXPECT_EQ(vl.vl_values[0].vl_low_val, 1u);
    EXPECT_EQ(vl.vl_values[0].vl_high_val, 1u);

    // Completion supplies what the dynamic attribute left out.
    const tbl *dattrs = ref_table(rc.u_rc_dattrs);
    ASSERT_EQ(tbl_used(dattrs), sizeof(rsrc_dattr_t));
    rsrc_dattr_t d = load<rsrc_dattr_t>(dattrs->tbl_base);
    EXPECT_EQ(d.ra_group_id, CDB_DEFAULT_GROUP_ID);
    EXPECT_EQ(d.ra_var_type, QEL_COUNTER);
    EXPECT_EQ(d.ra_init_value.val_int32, 0);
    EXPECT_EQ(d.ra_min_value.val_int32, 0);
    EXPECT_EQ(uint32_t(d.ra_max_value.val_int32), CDB_DEFAULT_RANGE_HIGH);
    // Tables the class left empty are given back.
    EXPECT_EQ(ref_table(rc.u_rc_actions), nullptr);
}

// A Range is ignored for the unordered types, whatever its text, and refused
// without its two ends for every other type.
TEST(Builders, RangeOnlyForOrderedTypes) {
    for (const char *type : {"String", "Binary", "RH", "SD", "StringArray", "BinaryArray", "RHArray", "SDArray",
                             "Int32", "UInt64Array", "Float32"}) {
        one_class c;
        c.cls.start();
        c.dattr.start();
        const keyword_row &range = row_named(ST_DYNAMIC_RESOURCE_ATTRIBUTE, kw::Range);
        give(c.dattr, ST_DYNAMIC_RESOURCE_ATTRIBUTE, kw::DataType, type);
        std::string value = "7";
        msg refusal = msg::none;
        try {
            c.dattr.store_statement(range, value.data());
        } catch (const qecfg_fatal &f) {
            refusal = f.id;
        }
        bool ordered = type[0] == 'I' || type[0] == 'U' || type[0] == 'F';
        EXPECT_EQ(refusal, ordered ? msg::range_needs_two_values : msg::none) << type;
    }
}

msg refusal_of(void (*build)(one_class &), uint64_t *line) {
    one_class c;
    try {
        build(c);
    } catch (const qecfg_fatal &f) {
        *line = f.line;
        return f.id;
    }
    return msg::none;
}

TEST(Builders, RefuseWhatTheirStanzaCannotHoldWithoutKnowingTheLine) {
    uint64_t line = 99;
    EXPECT_EQ(refusal_of([](one_class &c) { c.pattr.start(); }, &line), msg::no_class_for_persistent_attribute);
    EXPECT_EQ(line, 0u);
    EXPECT_EQ(refusal_of(
                  [](one_class &c) {
                      c.cls.start();
                      c.pattr.start();
                      give(c.pattr, ST_PERSISTENT_RESOURCE_ATTRIBUTE, kw::Name, "Half");
                      c.pattr.complete();
                  },
                  &line),
              msg::incomplete_stanza);
    EXPECT_EQ(refusal_of(
                  [](one_class &c) {
                      c.cls.start();
                      c.attribute(c.pattr, ST_PERSISTENT_RESOURCE_ATTRIBUTE, "Size", "7");
                      give(c.pattr, ST_PERSISTENT_RESOURCE_ATTRIBUTE, kw::DefaultValue, "12abc");
                  },
                  &line),
              msg::invalid_data);
}

TEST(Builders, RowRulesRefuseOptionalBeforeRequiredAndDuplicates) {
    given_rows g;
    const keyword_row &name = row_named(ST_PERSISTENT_RESOURCE_ATTRIBUTE, kw::Name);
    const keyword_row &group = row_named(ST_PERSISTENT_RESOURCE_ATTRIBUTE, kw::GroupID);
    const keyword_row &variety = row_named(ST_PERSISTENT_RESOURCE_ATTRIBUTE, kw::VarietyRange);
    uint32_t mask = stanza_defs[ST_PERSISTENT_RESOURCE_ATTRIBUTE].required_mask;
    EXPECT_EQ(g.admit(name, mask), msg::none);
    EXPECT_EQ(g.admit(name, mask), msg::duplicate_statement);
    EXPECT_EQ(g.admit(group, mask), msg::optional_before_required);
    EXPECT_EQ(g.admit(variety, mask), msg::none);
    EXPECT_EQ(g.admit(variety, mask), msg::none); // repeatable
    g.required = mask;
    EXPECT_EQ(g.admit(group, mask), msg::none);
    EXPECT_EQ(g.admit(group, mask), msg::duplicate_statement);
}

// The compile gives a builder's refusal the line being read, and none to a
// row without a line.
TEST(Builders, TheCompileGivesRefusalsTheLineBeingRead) {
    std::vector<std::uint8_t> image;
    std::string half = BASE_SOURCE + "PersistentResourceAttribute\n    Name=Half\n\nClassAction\n";
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::bytes("s.src", half), image);
    EXPECT_EQ(r.id, msg::incomplete_stanza);
    EXPECT_EQ(r.line, 19u);
    EXPECT_EQ(r.message, "19: Previous stanza incomplete\n");
    r = qecfg::compile_to_memory(qecfg::source::bytes("s.src", BASE_SOURCE + "ClassToManagerMapping\n"), image);
    EXPECT_EQ(r.id, msg::second_map);
    EXPECT_EQ(r.line, 0u);
}

} // namespace
