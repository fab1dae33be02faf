// The table of warnings, and the checks of the parts of classes: what
// compiles but is most likely not what the author meant.
#include "warnings.h"

#include <algorithm>
#include <cstdlib>
#include <map>
#include <set>
#include <unordered_map>

#include "checks.h"

namespace check {

std::uint32_t stored_identifier(const statement &st) {
    return std::uint32_t(std::strtol(st.text().c_str(), nullptr, 0));
}

namespace {

std::string did_you_mean(std::string_view word, const std::vector<std::string> &candidates) {
    std::string hint = nearest(word, candidates);
    return hint.empty() ? "" : " (did you mean " + quoted(hint) + "?)";
}

// The name a class is stored under: its Name, or the output file's name.
std::string class_name(const std::vector<const stanza *> &cls, const std::string &output_name) {
    for (const stanza *s : cls)
        if (const statement *n = s->is(ST_RESOURCE_CLASS) ? s->first(kw::Name) : nullptr)
            return n->text();
    return output_name.substr(0, output_name.find(".cdef"));
}

} // namespace

// The last Locator of a class is the one resolved when the class is
// completed, against all its persistent resource attributes.
void locator(const check_input &in, std::vector<explained> &out) {
    for (const auto &cls : in.classes) {
        std::vector<std::string> names;
        std::map<std::string, std::string> other_kinds;
        const statement *loc = nullptr;
        for (const stanza *s : cls) {
            if (const statement *n = s->first(kw::Name); n && s->is_attribute()) {
                if (s->is(ST_PERSISTENT_RESOURCE_ATTRIBUTE))
                    names.push_back(n->text());
                else
                    other_kinds.emplace(n->text(), s->type->name);
            }
            if (const statement *l = s->is(ST_RESOURCE_CLASS) ? s->last(kw::Locator) : nullptr)
                loc = l;
        }
        if (!loc || std::find(names.begin(), names.end(), loc->value()) != names.end())
            continue;
        auto other = other_kinds.find(loc->text());
        std::string why =
            other != other_kinds.end()
                ? " is a " + other->second + ", not a " + stanza_names[ST_PERSISTENT_RESOURCE_ATTRIBUTE]
                : std::string(" names no ") + stanza_names[ST_PERSISTENT_RESOURCE_ATTRIBUTE] + " of this class";
        out.push_back({{loc->line, std::string(kw::Locator) + " " + quoted(loc->value()) + why +
                                       did_you_mean(loc->value(), names) + "; the class is stored without a locator"},
                       {}});
    }
}

namespace {

// Reports the second of two stanzas of one group with the same key.
template <typename Key> void report_repeats(const std::vector<std::pair<Key, const statement *>> &keyed,
                                            const std::string &what, std::vector<explained> &out) {
    if (keyed.size() < 2)
        return;
    std::unordered_map<Key, const statement *> first(keyed.size());
    for (const auto &[key, st] : keyed)
        if (auto [it, fresh] = first.emplace(key, st); !fresh)
            out.push_back(
                {{st->line, what + " " + quoted(st->value()) + " is already given on " + on_line(it->second->line)},
                 {}});
}

// The groups of stanzas of a class whose members must differ: each attribute
// and action kind by Id; resource attributes, class attributes and each action
// kind by Name.
const std::vector<std::vector<int>> id_groups = {{ST_PERSISTENT_RESOURCE_ATTRIBUTE},
                                                 {ST_PERSISTENT_CLASS_ATTRIBUTE},
                                                 {ST_DYNAMIC_RESOURCE_ATTRIBUTE},
                                                 {ST_DYNAMIC_CLASS_ATTRIBUTE},
                                                 {ST_RESOURCE_ACTION},
                                                 {ST_CLASS_ACTION}};
const std::vector<std::vector<int>> name_groups = {{ST_PERSISTENT_RESOURCE_ATTRIBUTE, ST_DYNAMIC_RESOURCE_ATTRIBUTE},
                                                   {ST_PERSISTENT_CLASS_ATTRIBUTE, ST_DYNAMIC_CLASS_ATTRIBUTE},
                                                   {ST_RESOURCE_ACTION},
                                                   {ST_CLASS_ACTION}};

bool in_group(const stanza &s, const std::vector<int> &group) {
    return std::find(group.begin(), group.end(), s.kind) != group.end();
}

} // namespace

void duplicate_id(const check_input &in, std::vector<explained> &out) {
    for (const auto &cls : in.classes)
        for (const auto &group : id_groups) {
            std::vector<std::pair<std::uint32_t, const statement *>> ids;
            for (const stanza *s : cls)
                if (const statement *id = in_group(*s, group) ? s->first(kw::Id) : nullptr)
                    ids.emplace_back(stored_identifier(*id), id);
            report_repeats(ids, std::string(stanza_names[group[0]]) + " " + kw::Id, out);
        }
}

void duplicate_name(const check_input &in, std::vector<explained> &out) {
    for (const auto &cls : in.classes)
        for (const auto &group : name_groups) {
            std::vector<std::pair<std::string_view, const statement *>> names;
            for (const stanza *s : cls)
                if (const statement *n = in_group(*s, group) ? s->first(kw::Name) : nullptr)
                    names.emplace_back(n->value(), n);
            report_repeats(names, "name", out);
        }
    // The elements of one structured-data definition: a run of one type.
    std::vector<std::pair<std::string_view, const statement *>> elements;
    int run = NO_STANZA_TYPE;
    for (const stanza &s : in.model.stanzas) {
        if (s.kind != run) {
            report_repeats(elements, "element name", out);
            elements.clear();
        }
        run = s.is_element() ? s.kind : NO_STANZA_TYPE;
        if (const statement *n = s.first(kw::ElementName); n && s.is_element())
            elements.emplace_back(n->value(), n);
    }
    report_repeats(elements, "element name", out);
}

namespace {

std::set<std::string, std::less<>> defined_variable_classes(const source_model &m) {
    std::set<std::string, std::less<>> defined;
    for (const stanza &s : m.stanzas)
        if (const statement *v = s.is(ST_RESOURCE_VARIABLE_CLASS) ? s.first(kw::VariableClass) : nullptr)
            defined.insert(v->text());
    return defined;
}

} // namespace

void variable_class(const check_input &in, std::vector<explained> &out) {
    std::set<std::string, std::less<>> defined = defined_variable_classes(in.model);
    std::vector<std::string> names(defined.begin(), defined.end());
    for (const stanza &s : in.model.stanzas) {
        const statement *v = s.is_dynamic() ? s.first(kw::VariableClass) : nullptr;
        if (!v || defined.count(v->value()))
            continue;
        out.push_back(
            {{v->line, std::string(kw::VariableClass) + " " + quoted(v->value()) + " is defined by no " +
                           stanza_names[ST_RESOURCE_VARIABLE_CLASS] + " stanza" + did_you_mean(v->value(), names)},
             {}});
    }
}

namespace {

// A dynamic attribute as a variable class records it: by its variable ID,
// which is its Id (with a bit for class attributes) and nothing of its class.
struct variable_member {
    const stanza *attribute;
    size_t class_index;
    std::uint32_t variable_id;
    const statement *variable_class; // null when it names none that is defined
};

// The dynamic attributes in the order the compiler records their IDs: by
// class, class attributes first.
std::vector<variable_member> variable_members(const std::vector<std::vector<const stanza *>> &classes,
                                              const std::set<std::string, std::less<>> &defined) {
    std::vector<variable_member> v;
    for (size_t k = 0; k < classes.size(); k++)
        for (int kind : {ST_DYNAMIC_CLASS_ATTRIBUTE, ST_DYNAMIC_RESOURCE_ATTRIBUTE})
            for (const stanza *s : classes[k])
                if (const statement *id = s->is(kind) ? s->first(kw::Id) : nullptr) {
                    const statement *vc = s->first(kw::VariableClass);
                    v.push_back(
                        {s, k, stored_identifier(*id) | (kind == ST_DYNAMIC_CLASS_ATTRIBUTE ? CDB_CLASS_VAR_ID_BIT : 0),
                         vc && defined.count(vc->value()) ? vc : nullptr});
                }
    return v;
}

// A variable class as a CDB keeps it: its name and the members whose IDs
// it holds, in order, and how many of them a reader has matched.
struct variable_ids {
    std::string name;
    std::vector<const variable_member *> members;
    size_t next = 0;
};

} // namespace

// A CDB keeps per variable class only the variable IDs of its dynamic
// attributes. A reader gives each attribute, walking them in the compiler's
// order, the first variable class whose next ID is its own; where an ID
// that came from another class matches first, the reader's choice is not
// what the source wrote.
void variable_class_shared(const check_input &in, std::vector<explained> &out) {
    const std::vector<std::vector<const stanza *>> &classes = in.classes;
    std::vector<variable_ids> tables;
    for (const stanza &s : in.model.stanzas)
        if (const statement *v = s.is(ST_RESOURCE_VARIABLE_CLASS) ? s.first(kw::VariableClass) : nullptr)
            tables.push_back({v->text(), {}});
    std::set<std::string, std::less<>> defined = defined_variable_classes(in.model);
    std::vector<variable_member> members = variable_members(classes, defined);
    for (const variable_member &m : members)
        if (m.variable_class) // the first variable class of the name gets the ID
            std::find_if(tables.begin(), tables.end(), [&](const variable_ids &t) {
                return t.name == m.variable_class->value();
            })->members.push_back(&m);
    for (const variable_member &m : members) {
        auto taken = std::find_if(tables.begin(), tables.end(), [&](const variable_ids &t) {
            return t.next < t.members.size() && t.members[t.next]->variable_id == m.variable_id;
        });
        if (taken == tables.end())
            continue;
        const variable_member &owner = *taken->members[taken->next++];
        if (&owner == &m)
            continue;
        std::string written = m.variable_class ? ", not to " + quoted(m.variable_class->value())
                                               : ", although it names no variable class";
        std::string name = quoted(m.attribute->value_of(kw::Name));
        out.push_back({{m.variable_class ? m.variable_class->line : m.attribute->line,
                        "the variable ID " + std::to_string(m.variable_id) + " of " + name + " (class " +
                            quoted(class_name(classes[m.class_index], in.output_name)) + ") is also that of " +
                            quoted(owner.attribute->value_of(kw::Name)) + " (class " +
                            quoted(class_name(classes[owner.class_index], in.output_name)) +
                            ") in the variable class " + quoted(taken->name) +
                            ": the stored IDs cannot say which class they came from, and a reader of "
                            "the CDB gives " +
                            name + " to " + quoted(taken->name) + written},
                       {{owner.attribute->line, "the other " + owner.attribute->type->name + " with variable ID " +
                                                    std::to_string(m.variable_id)}}});
    }
}

void unnamed_class(const check_input &in, std::vector<explained> &out) {
    std::string name = in.output_name.substr(0, in.output_name.find(".cdef"));
    for (const auto &cls : in.classes)
        if (std::none_of(cls.begin(), cls.end(),
                         [](const stanza *s) { return s->is(ST_RESOURCE_CLASS) && s->first(kw::Name); }))
            out.push_back({{cls.front()->line, std::string("the class has no ") + kw::Name +
                                                   " statement and is named after the output file (" + quoted(name) +
                                                   " for output " + quoted(in.output_name) + ")"},
                           {}});
}

namespace {

std::string words(std::initializer_list<std::string_view> parts) {
    std::string s;
    for (std::string_view p : parts)
        s += p;
    return s;
}

} // namespace

const std::vector<warning_check> &warning_checks() {
    const char *pra = stanza_names[ST_PERSISTENT_RESOURCE_ATTRIBUTE];
    static const std::vector<warning_check> checks = {
        {"locator", true, words({"a ", kw::Locator, " that names no ", pra, " of its class"}), locator},
        {"duplicate-id", true, words({"two attributes or actions of one kind in a class with the same ", kw::Id}),
         duplicate_id},
        {"duplicate-name", true, "two attributes, actions or elements of one definition with the same name",
         duplicate_name},
        {"variable-class", true,
         words({"a ", kw::VariableClass, " that no ", stanza_names[ST_RESOURCE_VARIABLE_CLASS], " defines"}),
         variable_class},
        {"variable-class-shared", true,
         "dynamic attributes of several classes whose variable IDs a reader assigns to another variable class",
         variable_class_shared},
        {"default-range", true, "a stored default or initial value outside the valid values or the range",
         default_range},
        {"file-version", true, words({"a ", kw::FileVersion, " that is not up to four numbers of 0 to 255"}),
         file_version},
        {"unnamed-class", true, words({"a class without ", kw::Name, ", named after the output file"}), unnamed_class},
        {"number-text", true, "a number statement that is no plain number or does not fit its field", number_text},
        {"permission", true, words({"a ", kw::Permission, " whose letter is ignored"}), permission},
        {"element-type", true, words({"a structured-data element ", kw::DataType, " that names no data type"}),
         element_type},
        {"ignored-range", true, words({"a ", kw::Range, " for a data type that has none"}), ignored_range},
        {"reversed-range", true, "a low,high pair whose low end is above its high end", reversed_range},
        {"repeated-default", true, words({"several ", kw::DefaultValue, " statements for a scalar type"}),
         repeated_default},
        {"binary-text", true, "a Binary value of hex digits without 0x, stored as their characters", binary_text},
    };
    return checks;
}

std::vector<bool> default_warnings() {
    std::vector<bool> v;
    for (const warning_check &c : warning_checks())
        v.push_back(c.on_by_default);
    return v;
}

std::vector<warning_finding> run_warnings(const check_input &in, const std::vector<bool> &enabled) {
    std::vector<warning_finding> found;
    const std::vector<warning_check> &checks = warning_checks();
    for (size_t i = 0; i < checks.size(); i++) {
        if (!enabled[i])
            continue;
        std::vector<explained> out;
        checks[i].run(in, out);
        for (explained &e : out)
            found.push_back({std::move(e), checks[i].name});
    }
    std::stable_sort(found.begin(), found.end(), [](const warning_finding &a, const warning_finding &b) {
        return a.found.where.line < b.found.where.line;
    });
    return found;
}

} // namespace check
