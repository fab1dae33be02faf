// The decompiler: stanzas and statements that reproduce a verified CDB.
// Where the file does not keep what the source said (permission template
// texts, ListAction statements, VariableClass names, defaults that completion
// supplied), it writes statements that give the same content.
#include <algorithm>
#include <map>
#include <set>

#include "cdb_format.h"
#include "cdb_names.h"
#include "cdb_source.h"
#include "cdb_text.h"
#include "qecfg_language.h"

namespace cdbdump {

namespace {

std::string n(uint64_t v) { return std::to_string(v); }

class writer {
  public:
    void stanza(const std::string &name) { out_ += (out_.empty() ? "" : "\n") + name + "\n"; }
    void stmt(const std::string &name, const std::string &value) { out_ += "\t" + name + "=" + value + "\n"; }
    // A statement whose value is text that must read back exactly.
    void text(const std::string &name, const std::string &value) {
        auto line = statement_line(name, value);
        if (!line) {
            warn("the value " + c_quote(value) + " of " + name + " cannot be written so that it reads back");
            line = "\t" + name + "=\"" + value + "\"";
        }
        out_ += *line + "\n";
    }
    void comment(const std::string &c) { out_ += "# " + c + "\n"; }
    void warn(const std::string &w) {
        warnings_.push_back(w);
        comment("cdbdump: " + w);
    }
    decompiled finish() { return decompiled{std::move(out_), std::move(warnings_)}; }

  private:
    std::string out_;
    std::vector<std::string> warnings_;
};

bool all_zero(const std::vector<uint8_t> &b) {
    for (uint8_t x : b)
        if (x)
            return false;
    return true;
}

// What the compiler places when the source gives no value of the type.
bool is_type_default(const value &v) {
    switch (v.kind) {
    case value_kind::number: return v.bits == 0;
    case value_kind::string: return v.text.empty();
    case value_kind::binary: return v.bytes.empty();
    case value_kind::handle:
    case value_kind::raw: return all_zero(v.bytes);
    default: return false;
    }
}

bool is_default_range(const dattr &d) { return d.min.bits == 0 && d.max.bits == hundred_bits(d.min.type); }

std::string props_text(const prop_table &t, uint32_t bits) {
    std::string s;
    for (const std::string &name : prop_names(t, bits))
        s += (s.empty() ? "" : ",") + name;
    return s;
}

class decompiler {
  public:
    explicit decompiler(const cdb_file &f) : f_(f) {}
    decompiled run();

  private:
    std::optional<std::string> value_text(const value &v, const std::string &what);
    void class_stanzas(const class_dsect &c);
    void resource_class(const class_dsect &c);
    std::optional<std::string> locator_name(const class_dsect &c);
    void sd_run(const char *stanza, const sd_definition &def, bool indexes, bool valid_values_allowed);
    void attr_sd_run(const char *stanza, const attr_common &a);
    void attr_required(const attr_common &a);
    void attr_groups_and_props(const attr_common &a, uint16_t no_group, const prop_table &props);
    void valid_value_stmts(const char *name, const std::optional<valid_values> &vv);
    void value_stmts(const char *name, const value &v, const std::string &attr, bool repeatable);
    void pattr_stanza(const pattr &p);
    void dattr_stanza(const dattr &d);
    void range_stmt(const dattr &d);
    void action_stanza(const action &x);
    void map_stanza(const map_dsect &m);
    void var_class_stanza(const var_class_dsect &v);
    void assign_variable_classes();

    const cdb_file &f_;
    writer w_;
    std::map<const dattr *, std::string> vclass_of_;
    // Why an attribute's variable class was a choice: its variable ID is
    // also that of a dynamic attribute of another class.
    std::map<const dattr *, std::string> vclass_choice_;
};

std::optional<std::string> decompiler::value_text(const value &v, const std::string &what) {
    switch (v.kind) {
    case value_kind::number: {
        auto t = number_source_text(v.type, v.bits);
        if (!t)
            w_.warn(what + ": the value " + number_text(v.type, v.bits) + " cannot be given as text");
        return t;
    }
    case value_kind::string:
        if (v.text.empty())
            w_.warn(what + ": an empty text cannot be given");
        return v.text.empty() ? std::nullopt : std::optional<std::string>(v.text);
    case value_kind::binary: return binary_text(v.bytes);
    default: w_.warn(what + ": a " + data_type_name(v.type) + " value cannot be given in source"); return std::nullopt;
    }
}

// ---------------------------------------------------------------------------
// Classes

std::optional<std::string> decompiler::locator_name(const class_dsect &c) {
    if (c.locator == CDB_NO_LOCATOR)
        return std::nullopt;
    for (const pattr &p : c.pattrs) {
        if (uint16_t(p.id) != c.locator)
            continue;
        // The compiler takes the first persistent resource attribute of the given name.
        auto first = std::find_if(c.pattrs.begin(), c.pattrs.end(), [&](const pattr &q) { return q.name == p.name; });
        if (uint16_t(first->id) == c.locator)
            return p.name;
    }
    w_.warn("class " + c_quote(c.name) + ": locator " + n(c.locator) + " names no attribute that a Locator finds");
    return std::nullopt;
}

void decompiler::resource_class(const class_dsect &c) {
    w_.stanza(stanza_names[ST_RESOURCE_CLASS]);
    w_.stmt(kw::Description, n(c.description_msgid));
    w_.stmt(kw::DisplayName, n(c.display_msgid));
    if (unnamed_bits(class_props, c.props))
        w_.warn("class properties " + hex(c.props) + " have bits without a keyword");
    std::string props = props_text(class_props, c.props);
    w_.stmt(kw::Properties, props.empty() ? "," : props); // a list of no keyword sets nothing
    bool templates = true;
    const std::pair<const char *, uint32_t> perm_templates[] = {{kw::ClassPermTemplate, c.perm_temp_class},
                                                                {kw::ResourcePermTemplate, c.perm_temp}};
    for (const auto &[name, v] : perm_templates) {
        if (v == CDB_PERM_TEMPLATE_GIVEN)
            w_.stmt(name, "template");
        else if (v != 0)
            w_.warn(std::string(name) + " " + hex(v) + " cannot be given: a template statement stores " +
                    hex(CDB_PERM_TEMPLATE_GIVEN));
        templates = templates && v == CDB_PERM_TEMPLATE_GIVEN;
    }
    if (c.alias)
        w_.warn("class alias " + c_quote(*c.alias) + " cannot be given in source");
    if (c.class_id)
        w_.warn("class id " + n(c.class_id) + " cannot be given in source");
    auto locator = locator_name(c);
    // Locator and Name are optional: they may only follow every required statement.
    if (!templates) {
        if (locator)
            w_.warn("the locator needs both permission templates before it and is left out");
        w_.warn("the class name " + c_quote(c.name) + " can only come from the output file name: compile to " + c.name +
                ".cdef");
        return;
    }
    if (locator)
        w_.text(kw::Locator, *locator);
    w_.text(kw::Name, c.name);
}

void decompiler::class_stanzas(const class_dsect &c) {
    w_.stanza(stanza_names[ST_CONTROL_DEFINITION]);
    w_.stmt(kw::FileVersion, version_text(c.version));
    resource_class(c);
    const std::pair<const char *, const std::optional<sd_definition> *> runs[] = {
        {stanza_names[ST_DEFINE_SD], &c.define_sd},
        {stanza_names[ST_UNDEFINE_SD], &c.undefine_sd},
        {stanza_names[ST_ONLINE_SD], &c.online_sd},
        {stanza_names[ST_OFFLINE_SD], &c.offline_sd},
        {stanza_names[ST_RESET_SD], &c.reset_sd}};
    for (const auto &[stanza, def] : runs)
        if (*def)
            sd_run(stanza, **def, true, true);
    for (const pattr &p : c.pattrs_class)
        pattr_stanza(p);
    for (const dattr &d : c.dattrs_class)
        dattr_stanza(d);
    for (const pattr &p : c.pattrs)
        pattr_stanza(p);
    for (const dattr &d : c.dattrs)
        dattr_stanza(d);
    for (const action &x : c.actions_class)
        action_stanza(x);
    for (const action &x : c.actions)
        action_stanza(x);
}

// ---------------------------------------------------------------------------
// Structured-data definitions

void decompiler::sd_run(const char *stanza, const sd_definition &def, bool indexes, bool valid_values_allowed) {
    if (def.empty())
        w_.warn(std::string(stanza) + ": a definition without elements cannot be given");
    for (size_t i = 0; i < def.size(); i++) {
        const sd_element &e = def[i];
        w_.stanza(stanza);
        w_.text(kw::ElementName, e.name);
        w_.stmt(kw::Description, n(e.description_msgid));
        w_.stmt(kw::DisplayName, n(e.display_msgid));
        if (indexes)
            w_.stmt(kw::ElementIndex, n(i));
        w_.stmt(kw::DataType, data_type_name(e.type));
        if (e.action_id != CDB_SD_ELEMENT_ACTION_ID || e.valid_type != CDB_SD_ELEMENT_VALID_TYPE)
            w_.warn("element " + c_quote(e.name) + ": action id " + hex(e.action_id) + " and valid type " +
                    n(e.valid_type) + " cannot be given (the compiler writes 0xffff and 1)");
        if (e.vv && !(indexes && valid_values_allowed))
            w_.warn("element " + c_quote(e.name) + ": valid values cannot be given in this stanza");
        else
            valid_value_stmts(kw::ValidValue, e.vv);
    }
}

void decompiler::attr_sd_run(const char *stanza, const attr_common &a) {
    if (!a.sd) {
        if (a.max_sd_idx != CDB_NO_SD_INDEX)
            w_.warn(c_quote(a.name) + ": highest element index " + n(a.max_sd_idx) + " without a definition");
        return;
    }
    // The highest element index is the last ElementIndex given, or none without them.
    bool indexes = a.max_sd_idx != CDB_NO_SD_INDEX;
    if (indexes && a.max_sd_idx + size_t(1) != a.sd->size())
        w_.warn(c_quote(a.name) + ": highest element index " + n(a.max_sd_idx) + " does not match " + n(a.sd->size()) +
                " elements");
    sd_run(stanza, *a.sd, indexes, true);
}

// ---------------------------------------------------------------------------
// Attributes

void decompiler::attr_required(const attr_common &a) {
    w_.text(kw::Name, a.name);
    w_.stmt(kw::Description, n(a.description_msgid));
    w_.stmt(kw::DisplayName, n(a.display_msgid));
    w_.stmt(kw::Id, std::to_string(a.id));
    if (a.data_type == ZU_UNKNOWN || a.data_type == ZU_SBS_PTR)
        w_.warn(c_quote(a.name) + ": data type " + data_type_name(a.data_type) + " does not compile");
    w_.stmt(kw::DataType, data_type_name(a.data_type));
    if (a.varieties.empty())
        w_.warn(c_quote(a.name) + ": at least one VarietyRange is required");
    for (const variety &v : a.varieties)
        w_.stmt(kw::VarietyRange, n(v.low) + "," + n(v.high));
}

void decompiler::attr_groups_and_props(const attr_common &a, uint16_t no_group, const prop_table &props) {
    if (a.group_id != no_group)
        w_.stmt(kw::GroupID, n(a.group_id));
    if (a.group_msgid)
        w_.stmt(kw::GroupName, n(a.group_msgid));
    if (unnamed_bits(props, a.props))
        w_.warn(c_quote(a.name) + ": properties " + hex(a.props) + " have bits without a keyword");
    if (!prop_names(props, a.props).empty())
        w_.stmt(kw::Properties, props_text(props, a.props));
}

void decompiler::valid_value_stmts(const char *name, const std::optional<valid_values> &vv) {
    if (!vv)
        return;
    if (vv->empty())
        w_.warn(std::string(name) + ": an empty list of valid values cannot be given");
    for (const valid_value &v : *vv) {
        auto lo = value_text(v.low, name), hi = value_text(v.high, name);
        if (!lo || !hi)
            continue;
        // The two ends are split at the first comma; one value is a range of one.
        if (lo->find(',') != std::string::npos)
            w_.warn(std::string(name) + ": the value " + c_quote(*lo) + " holds a comma, which splits it");
        w_.text(name, *lo == *hi ? *lo : *lo + "," + *hi);
        if (v.display_msgid)
            w_.stmt(kw::ValueDisplayName, n(v.display_msgid));
    }
}

// A default or initial value: nothing when it is what completion supplies,
// else one statement per array element (DefaultValue) or one value.
void decompiler::value_stmts(const char *name, const value &v, const std::string &attr, bool repeatable) {
    if (zu_is_sd_type(v.type))
        return; // built from the definition
    if (v.kind == value_kind::array) {
        if (v.elements.size() == 1 && is_type_default(v.elements[0]))
            return;
        if (v.elements.empty() || (!repeatable && v.elements.size() != 1))
            w_.warn(c_quote(attr) + ": an array of " + n(v.elements.size()) + " elements cannot be given as " + name);
        if (!repeatable && v.elements.size() != 1)
            return;
        for (const value &e : v.elements)
            if (auto t = value_text(e, attr))
                w_.text(name, *t);
        return;
    }
    if (is_type_default(v))
        return;
    if (auto t = value_text(v, attr))
        w_.text(name, *t);
}

void decompiler::pattr_stanza(const pattr &p) {
    w_.stanza(p.of_class ? stanza_names[ST_PERSISTENT_CLASS_ATTRIBUTE]
                         : stanza_names[ST_PERSISTENT_RESOURCE_ATTRIBUTE]);
    attr_required(p);
    if (!(p.props & 0xe))
        w_.warn(c_quote(p.name) + ": properties without ReqdForDefine, OptForDefine or InvalForDefine");
    attr_groups_and_props(p, 0, pattr_props);
    valid_value_stmts(kw::ValidValue, p.vv);
    value_stmts(kw::DefaultValue, p.dflt, p.name, true);
    attr_sd_run(stanza_names[ST_PATTR_SD], p);
}

void decompiler::range_stmt(const dattr &d) {
    bool numbers = d.min.kind == value_kind::number && d.max.kind == value_kind::number;
    if (!numbers || (!zu_is_array_type(d.data_type) && is_default_range(d)))
        return;
    auto lo = value_text(d.min, d.name), hi = value_text(d.max, d.name);
    if (lo && hi)
        w_.stmt(kw::Range, *lo + "," + *hi);
}

void decompiler::dattr_stanza(const dattr &d) {
    w_.stanza(d.of_class ? stanza_names[ST_DYNAMIC_CLASS_ATTRIBUTE] : stanza_names[ST_DYNAMIC_RESOURCE_ATTRIBUTE]);
    attr_required(d);
    w_.stmt(kw::VariableType, var_type_name(d.var_type));
    attr_groups_and_props(d, CDB_DEFAULT_GROUP_ID, dattr_props);
    valid_value_stmts(kw::ValidStateValue, d.vv);
    auto vclass = vclass_of_.find(&d);
    auto choice = vclass_choice_.find(&d);
    if (choice != vclass_choice_.end())
        w_.comment(choice->second);
    if (vclass != vclass_of_.end())
        w_.text(kw::VariableClass, vclass->second);
    value_stmts(kw::InitialValue, d.init, d.name, false);
    if (d.expression)
        w_.text(kw::Expression, *d.expression);
    if (d.expr_desc)
        w_.stmt(kw::ExpressionDescription, n(d.expr_desc));
    if (d.rearm_expression)
        w_.text(kw::ReArmExpression, *d.rearm_expression);
    if (d.rearm_desc)
        w_.stmt(kw::ReArmDescription, n(d.rearm_desc));
    if (d.range_desc)
        w_.warn(c_quote(d.name) + ": range description " + n(d.range_desc) + " cannot be given");
    range_stmt(d);
    attr_sd_run(stanza_names[ST_DATTR_SD], d);
}

// ---------------------------------------------------------------------------
// Actions, map, variable classes

void decompiler::action_stanza(const action &x) {
    w_.stanza(x.of_class ? stanza_names[ST_CLASS_ACTION] : stanza_names[ST_RESOURCE_ACTION]);
    w_.text(kw::Name, x.name);
    w_.stmt(kw::Description, n(x.description_msgid));
    w_.stmt(kw::DisplayName, n(x.display_msgid));
    w_.stmt(kw::Id, std::to_string(x.id));
    if (x.varieties.empty())
        w_.warn(c_quote(x.name) + ": at least one VarietyRange is required");
    for (const variety &v : x.varieties)
        w_.stmt(kw::VarietyRange, n(v.low) + "," + n(v.high));
    if (unnamed_bits(action_props, x.props))
        w_.warn(c_quote(x.name) + ": properties " + hex(x.props) + " have bits without a keyword");
    if (x.props)
        w_.stmt(kw::Properties, props_text(action_props, x.props));
    // Only the first letter counts; one that is no permission letter stores nothing.
    auto letters = prop_names(perm_letters, x.perms);
    if (x.perms == 0)
        w_.stmt(kw::Permission, "-");
    else if (letters.size() == 1 && unnamed_bits(perm_letters, x.perms) == 0) {
        if (x.perms != CDB_DEFAULT_PERMISSION)
            w_.stmt(kw::Permission, letters[0]);
    } else
        w_.warn(c_quote(x.name) + ": permission " + hex(x.perms) + " is not one letter");
    if (x.confirm_msgid)
        w_.stmt(kw::ConfirmationMsg, n(x.confirm_msgid));
    if (x.timeout)
        w_.stmt(kw::TimeOut, n(x.timeout));
    if (x.sd_input)
        sd_run(stanza_names[ST_ACTION_IN_SD], *x.sd_input, true, true);
    if (x.sd_response)
        sd_run(stanza_names[ST_ACTION_OUT_SD], *x.sd_response, true, false);
}

void decompiler::map_stanza(const map_dsect &m) {
    w_.stanza(stanza_names[ST_CLASS_TO_MANAGER_MAPPING]);
    for (const dsect &d : f_.dsects)
        if (auto *mgr = std::get_if<mgr_dsect>(&d)) {
            w_.text(kw::ResourceManager, mgr->name);
            if (mgr->id)
                w_.warn("manager id " + n(mgr->id) + " cannot be given");
        }
    w_.stmt(kw::FirstKey, n(m.first_key));
    w_.stmt(kw::LastKey, n(m.last_key));
    if (m.first_key > m.last_key)
        w_.warn("FirstKey is greater than LastKey, which the compiler refuses");
    if (m.message_catalog)
        w_.text(kw::MessageCatalog, *m.message_catalog);
    w_.stmt(kw::DescriptiveMessageSet, n(m.dscr_msg_set));
    uint32_t others = m.class_id | m.rm_id | m.asnno_start | m.num_sctx | m.num_vctx | m.num_stats | m.num_ctx_tmplts |
                      m.static_contexts | m.volatile_contexts | m.stats | m.ctx_tmplts;
    if (others)
        w_.warn("the map's ids, contexts and statistics cannot be given; the compiler writes 0");
}

void decompiler::var_class_stanza(const var_class_dsect &v) {
    w_.stanza(stanza_names[ST_RESOURCE_VARIABLE_CLASS]);
    if (v.name)
        w_.text(kw::VariableClass, *v.name);
    w_.stmt(kw::ObservationInterval, n(v.obsv_interval));
    w_.stmt(kw::ReportingInterval, n(v.report_interval));
    if (v.alias)
        w_.text(kw::Alias, *v.alias);
}

// The file keeps, per variable class, the IDs of the dynamic attributes that
// named it, in the order the compiler meets them: by class, class attributes
// first. Walking the attributes in that order, each takes the variable class
// whose next ID is its own.
void decompiler::assign_variable_classes() {
    struct cursor {
        const var_class_dsect *v;
        size_t next = 0;
    };
    std::vector<cursor> vcs;
    for (const dsect &d : f_.dsects)
        if (auto *v = std::get_if<var_class_dsect>(&d))
            vcs.push_back(cursor{v});
    // The classes whose dynamic attributes have each variable ID.
    std::map<uint32_t, std::vector<std::string>> classes_of;
    for (const dsect &d : f_.dsects)
        if (auto *c = std::get_if<class_dsect>(&d)) {
            for (const dattr &a : c->dattrs_class)
                classes_of[uint32_t(a.id) | CDB_CLASS_VAR_ID_BIT].push_back(c->name);
            for (const dattr &a : c->dattrs)
                classes_of[uint32_t(a.id)].push_back(c->name);
        }
    // How often each ID stands in the variable classes, and in how many.
    std::map<uint32_t, size_t> occurrences;
    std::map<uint32_t, std::set<const var_class_dsect *>> holders;
    for (const cursor &c : vcs)
        for (uint32_t id : c.v->var_ids) {
            occurrences[id]++;
            holders[id].insert(c.v);
        }
    // A choice, when attributes of several classes have the ID and either
    // several variable classes hold it or it stands fewer times than they are.
    auto note_choice = [&](const dattr &a, uint32_t id, const std::string &vclass) {
        std::vector<std::string> names = classes_of[id];
        bool too_few = names.size() > occurrences[id];
        names.erase(std::unique(names.begin(), names.end()), names.end());
        if (names.size() < 2 || (holders[id].size() < 2 && !too_few))
            return;
        std::string list;
        for (const std::string &name : names)
            list += (list.empty() ? "" : ", ") + c_quote(name);
        vclass_choice_[&a] = "cdbdump: variable ID " + n(id) + " of variable class " + c_quote(vclass) +
                             " is that of dynamic attributes of the classes " + list +
                             "; the IDs cannot say which class named it, so the first in order is given it here";
    };
    auto take = [&](const dattr &a, uint32_t id) {
        for (cursor &c : vcs) {
            if (c.next >= c.v->var_ids.size() || c.v->var_ids[c.next] != id)
                continue;
            c.next++;
            // The compiler gives an ID to the first variable class of the name.
            auto first = std::find_if(vcs.begin(), vcs.end(), [&](const cursor &x) { return x.v->name == c.v->name; });
            if (!c.v->name || first->v != c.v) {
                w_.warn("variable class " + c_quote(c.v->name.value_or("")) +
                        " holds IDs that no VariableClass statement gives it");
                return;
            }
            vclass_of_[&a] = *c.v->name;
            note_choice(a, id, *c.v->name);
            return;
        }
    };
    for (const dsect &d : f_.dsects) {
        auto *c = std::get_if<class_dsect>(&d);
        if (!c)
            continue;
        for (const dattr &a : c->dattrs_class)
            take(a, uint32_t(a.id) | CDB_CLASS_VAR_ID_BIT);
        for (const dattr &a : c->dattrs)
            take(a, uint32_t(a.id));
    }
    for (const cursor &c : vcs)
        if (c.next != c.v->var_ids.size())
            w_.warn("variable class " + c_quote(c.v->name.value_or("")) + ": " + n(c.v->var_ids.size() - c.next) +
                    " variable IDs match no dynamic attribute in order");
}

decompiled decompiler::run() {
    w_.comment(std::string("Class definition source decompiled by cdbdump from a ") +
               (f_.big_endian ? "big" : "little") + "-endian CDB.");
    assign_variable_classes();
    for (const dsect &d : f_.dsects)
        if (auto *c = std::get_if<class_dsect>(&d))
            class_stanzas(*c);
    for (const dsect &d : f_.dsects)
        if (auto *m = std::get_if<map_dsect>(&d))
            map_stanza(*m);
    for (const dsect &d : f_.dsects)
        if (auto *v = std::get_if<var_class_dsect>(&d))
            var_class_stanza(*v);
    return w_.finish();
}
} // namespace

decompiled decompile(const cdb_file &f) { return decompiler(f).run(); }

} // namespace cdbdump
