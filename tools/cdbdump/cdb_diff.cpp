#include "cdb_diff.h"

#include <algorithm>
#include <map>
#include <set>

#include "cdb_dsects.h"
#include "cdb_names.h"
#include "cdb_text.h"
#include "cdb_to_tree.h"

namespace cdbdump {

namespace {
using path_t = std::vector<std::string>;

// Whether the two render the same JSON: numbers and strings compare by their
// text whatever their kind, objects member by member.
bool same(const node &a, const node &b) {
    auto json_kind = [](node::kind k) {
        return k == node::kind::real ? node::kind::integer : k == node::kind::token ? node::kind::string : k;
    };
    if (json_kind(a.type()) != json_kind(b.type()) || a.text() != b.text() ||
        a.members().size() != b.members().size() || a.items().size() != b.items().size())
        return false;
    for (size_t i = 0; i < a.members().size(); i++)
        if (a.members()[i].first != b.members()[i].first || !same(a.members()[i].second, b.members()[i].second))
            return false;
    for (size_t i = 0; i < a.items().size(); i++)
        if (!same(a.items()[i], b.items()[i]))
            return false;
    return true;
}

const node *member(const node &n, const std::string &key) {
    for (const auto &m : n.members())
        if (m.first == key)
            return &m.second;
    return nullptr;
}

std::string raw_name(const node &item) {
    const node *name = member(item, "name");
    return name ? name->text() : "";
}

// The structured form of each path segment that names a dsect or an item,
// by its text, for the JSON output.
using part_map = std::map<std::string, node>;

// Keys made unique by their occurrence: a second "A" is "A" #2. Each key's
// part (the given one, with the occurrence from the second on) goes to parts.
std::vector<std::string> unique(std::vector<std::string> keys, const std::vector<node> &given, part_map &parts) {
    std::map<std::string, int> seen;
    for (size_t i = 0; i < keys.size(); i++) {
        node part = given[i];
        if (int n = ++seen[keys[i]]; n > 1) {
            keys[i] += " #" + std::to_string(n);
            part.add("occurrence", node::uinteger(unsigned(n)));
        }
        parts.emplace(keys[i], std::move(part));
    }
    return keys;
}

// The named items of a list as path segments: quoted names, made unique.
template <typename L> std::vector<std::string> item_keys(const L &list, part_map &parts) {
    std::vector<std::string> keys;
    std::vector<node> given;
    for (size_t i = 0; i < list.size(); i++) {
        std::string name = list.name(i);
        keys.push_back(c_quote(name));
        given.push_back(node::object().add("name", node::string(name)));
    }
    return unique(keys, given, parts);
}

// A list of named items as the differ sees it: a list of a tree, whose
// removed or added items are kept with the change, ...
struct node_items {
    const node &list;
    size_t size() const { return list.items().size(); }
    std::string name(size_t i) const { return raw_name(list.items()[i]); }
    const node &item(size_t i) const { return list.items()[i]; }
    void keep(change &c, size_t i) const { (c.what == change::kind::removed ? c.before : c.after) = item(i); }
};

// ... or the records of a class's model, whose trees are made only when
// they are compared or written.
template <typename T> struct record_items {
    const std::vector<T> &list;
    node (*render)(const T &);
    size_t size() const { return list.size(); }
    std::string name(size_t i) const { return list[i].name; }
    node item(size_t i) const { return render(list[i]); }
    void keep(change &c, size_t i) const {
        c.content = [record = &list[i], r = render](tree_writer &w, std::string_view key) {
            w.member(key, r(*record));
        };
    }
};

// Lists of named records: compared by name. The order of a structured-data
// definition is its content; that of attributes and actions is not.
bool keyed(const node &list) {
    for (const node &i : list.items()) {
        const node *name = i.type() == node::kind::object ? member(i, "name") : nullptr;
        if (!name || name->type() != node::kind::string)
            return false;
    }
    return true;
}

bool order_matters(const std::string &key) {
    for (const char *sd :
         {"define_sd", "undefine_sd", "online_sd", "offline_sd", "reset_sd", "sd", "sd_input", "sd_response"})
        if (key == sd)
            return true;
    return false;
}

path_t with(path_t p, std::string segment) {
    p.push_back(std::move(segment));
    return p;
}

class differ {
  public:
    std::vector<change> changes;
    part_map parts;

    void compare(const node &a, const node &b, const path_t &path, const std::string &key) {
        if (a.type() == node::kind::object && b.type() == node::kind::object)
            return objects(a, b, path);
        if (a.type() == node::kind::array && b.type() == node::kind::array && keyed(a) && keyed(b))
            return lists(node_items{a}, node_items{b}, path, order_matters(key));
        if (!same(a, b))
            changes.push_back(change{change::kind::changed, path, a, b, false, ""});
    }

    void objects(const node &a, const node &b, const path_t &path) {
        for (const auto &[key, v] : a.members()) {
            const node *w = member(b, key);
            if (w)
                compare(v, *w, with(path, key), key);
            else
                changes.push_back(change{change::kind::removed, with(path, key), v, node::null(), false, ""});
        }
        for (const auto &[key, w] : b.members())
            if (!member(a, key))
                changes.push_back(change{change::kind::added, with(path, key), node::null(), w, false, ""});
    }

    // Named items matched by name; path ends with the list's key.
    template <typename L> void lists(const L &a, const L &b, const path_t &path, bool ordered) {
        std::vector<std::string> keys_a = item_keys(a, parts), keys_b = item_keys(b, parts);
        std::map<std::string, size_t> in_a, in_b;
        for (size_t i = 0; i < keys_a.size(); i++)
            in_a[keys_a[i]] = i;
        for (size_t i = 0; i < keys_b.size(); i++)
            in_b[keys_b[i]] = i;
        node common_a = node::array(), common_b = node::array();
        for (size_t i = 0; i < keys_a.size(); i++) {
            auto found = in_b.find(keys_a[i]);
            if (found == in_b.end()) {
                changes.push_back(
                    change{change::kind::removed, with(path, keys_a[i]), node::null(), node::null(), false, ""});
                a.keep(changes.back(), i);
                continue;
            }
            common_a.push(node::string(a.name(i)));
            compare(a.item(i), b.item(found->second), with(path, keys_a[i]), "");
        }
        for (size_t i = 0; i < keys_b.size(); i++) {
            if (in_a.count(keys_b[i])) {
                common_b.push(node::string(b.name(i)));
                continue;
            }
            changes.push_back(
                change{change::kind::added, with(path, keys_b[i]), node::null(), node::null(), false, ""});
            b.keep(changes.back(), i);
        }
        if (ordered && !same(common_a, common_b))
            changes.push_back(change{change::kind::reordered, path, common_a, common_b, false, ""});
    }

    // Two dsects of one key: two classes field by field and then record list
    // by record list, one pair of records' trees at a time; others whole.
    void dsects(const dsect &a, const anchor &at_a, const dsect &b, const anchor &at_b, const std::string &key) {
        const auto *ca = std::get_if<class_dsect>(&a), *cb = std::get_if<class_dsect>(&b);
        if (!ca || !cb)
            return compare(dsect_body(a, at_a), dsect_body(b, at_b), {key}, key);
        objects(class_head(*ca, at_a), class_head(*cb, at_b), {key});
        class_lists(*ca, *cb, [&](const char *list, const auto &items_a, const auto &items_b, auto render) {
            using items = record_items<typename std::decay_t<decltype(items_a)>::value_type>;
            lists(items{items_a, render}, items{items_b, render}, {key, list}, false);
        });
    }

  private:
    // A class's members before its record lists, without its kind.
    static node class_head(const class_dsect &c, const anchor &a) {
        node n = dsect_head(a);
        n.erase("dsect");
        node fields = class_fields(c);
        for (const auto &m : fields.members())
            n.add(m.first, m.second);
        return n;
    }
};

// The dsect's key: its kind, and the name of a class or variable class; and
// the same as a part: {"dsect": kind, "name": name or null}.
std::string dsect_key(const node &d, node &part) {
    std::string kind = member(d, "dsect")->text();
    const node *name = member(d, "name");
    if (kind == "variable_class" && name->type() == node::kind::null)
        name = member(d, "alias");
    part = node::object().add("dsect", node::string(kind));
    if (kind == "manager" || kind == "map" || !name)
        return kind;
    part.add("name", name->type() == node::kind::null ? node::null() : node::string(name->text()));
    return kind + " " + (name->type() == node::kind::null ? "(unnamed)" : c_quote(name->text()));
}

// A file's dsects under their keys (dsect_key, made unique); each dsect is
// read and made into its tree only when it is compared, so that the trees of
// one pair are held at a time.
struct keyed_dsects {
    const dsect_source &f;
    std::vector<std::string> keys;

    keyed_dsects(const dsect_source &file, part_map &parts) : f(file) {
        std::vector<node> given;
        for (size_t i = 0; i < f.count(); i++) {
            node part = node::null(),
                 key = node::object().add("dsect", node::token(dsect_kind_name(f.head().anchors[i].type)));
            auto opt = [](const std::optional<std::string> &s) { return s ? node::string(*s) : node::null(); };
            dsect_source::names names = f.names_of(i);
            if (f.head().anchors[i].type == CDB_DSECT_CLASS)
                key.add("name", opt(names.name));
            if (f.head().anchors[i].type == CDB_DSECT_VAR_CLASS)
                key.add("name", opt(names.name)).add("alias", opt(names.alias));
            keys.push_back(dsect_key(key, part));
            given.push_back(std::move(part));
        }
        keys = unique(keys, given, parts);
    }
    // The header without its timestamp.
    node header() const {
        node h = *file_head(f.head()).find("header");
        h.erase("timestamp");
        return h;
    }
};

// A dsect removed or added whole, read again and written record by record.
std::function<void(tree_writer &, std::string_view)> whole_dsect(const dsect_source &f, size_t i) {
    return [&f, i](tree_writer &w, std::string_view key) {
        w.begin_object(key);
        write_dsect_members(w, f.read(i), f.head().anchors[i], false);
        w.end();
    };
}

// The two files compared as objects of the header and one member per dsect
// (as differ::objects compares objects), one pair of dsects at a time; the
// changes of the header and of each dsect go to `each` as one batch. A dsect
// removed or added whole is only referred to.
template <typename F> void compare_files(differ &d, const keyed_dsects &a, const keyed_dsects &b, F flush) {
    d.compare(a.header(), b.header(), {"header"}, "header");
    flush();
    std::map<std::string, size_t> in_b;
    for (size_t i = 0; i < b.keys.size(); i++)
        in_b.emplace(b.keys[i], i);
    std::set<std::string> in_a(a.keys.begin(), a.keys.end());
    for (size_t i = 0; i < a.keys.size(); i++) {
        auto found = in_b.find(a.keys[i]);
        if (found == in_b.end()) {
            d.changes.push_back(change{change::kind::removed, {a.keys[i]}, node::null(), node::null(), false, ""});
            d.changes.back().content = whole_dsect(a.f, i);
            flush();
            continue;
        }
        size_t j = found->second;
        dsect old_dsect = a.f.read(i), new_dsect = b.f.read(j);
        d.dsects(old_dsect, a.f.head().anchors[i], new_dsect, b.f.head().anchors[j], a.keys[i]);
        flush(); // while the records its changes refer to are there
    }
    for (size_t i = 0; i < b.keys.size(); i++) {
        if (in_a.count(b.keys[i]))
            continue;
        d.changes.push_back(change{change::kind::added, {b.keys[i]}, node::null(), node::null(), false, ""});
        d.changes.back().content = whole_dsect(b.f, i);
        flush();
    }
}
} // namespace

node dsect_body(const dsect &d, const anchor &a) {
    node b = dsect_node(d, a);
    b.erase("dsect");
    return b;
}

std::vector<change> diff(const cdb_file &old_file, const cdb_file &new_file) {
    return diff(*model_source(old_file), *model_source(new_file));
}

void diff_each(const dsect_source &old_file, const dsect_source &new_file, const change_consumer &each) {
    differ d;
    auto flush = [&] {
        if (d.changes.empty())
            return;
        // The first segment names a dsect (or is the header), a quoted one an
        // item; any other is a member's key.
        for (change &c : d.changes)
            for (size_t i = 0; i < c.path.size(); i++) {
                auto part = i == 0 || c.path[i][0] == '"' ? d.parts.find(c.path[i]) : d.parts.end();
                c.parts.push_back(part == d.parts.end() ? node::string(c.path[i]) : part->second);
            }
        each(std::move(d.changes));
        d.changes.clear();
    };
    compare_files(d, keyed_dsects(old_file, d.parts), keyed_dsects(new_file, d.parts), flush);
}

std::vector<change> diff(const dsect_source &old_file, const dsect_source &new_file) {
    std::vector<change> all;
    diff_each(old_file, new_file, [&](std::vector<change> &&batch) {
        for (change &c : batch) {
            c.content = nullptr; // it refers to records of this batch only
            all.push_back(std::move(c));
        }
    });
    return all;
}

namespace {
enum class family { other, attribute, action, sd_element };

family family_of(const std::string &list) {
    if (list.find("_attributes") != std::string::npos)
        return family::attribute;
    if (list.find("_actions") != std::string::npos)
        return family::action;
    return order_matters(list) ? family::sd_element : family::other;
}

bool is_name(const std::string &segment) { return !segment.empty() && segment[0] == '"'; }

// The family of the named item the path ends in, or that owns its last member.
family owner(const path_t &p, size_t name_at) {
    return name_at >= 1 && name_at < p.size() && is_name(p[name_at]) ? family_of(p[name_at - 1]) : family::other;
}

void verdict(change &c, bool breaking, std::string reason) {
    c.breaking = breaking;
    c.reason = std::move(reason);
}

void judge_removal(change &c) {
    const path_t &p = c.path;
    if (p.size() == 1)
        return verdict(c, true,
                       p[0].rfind("class ", 0) == 0 ? "a class was removed" : "a dsect and what it held were removed");
    switch (owner(p, p.size() - 1)) {
    case family::attribute: return verdict(c, true, "an attribute was removed");
    case family::action: return verdict(c, true, "an action was removed");
    case family::sd_element: return verdict(c, true, "a structured-data element was removed");
    default: return verdict(c, true, "an item was removed");
    }
}

// Every old ID keeps its place; new ones may follow.
bool ids_kept(const node &before, const node &after) {
    if (before.type() != node::kind::array || after.type() != node::kind::array)
        return false;
    const auto &a = before.items(), &b = after.items();
    if (b.size() < a.size())
        return false;
    for (size_t i = 0; i < a.size(); i++)
        if (!same(a[i], b[i]))
            return false;
    return true;
}

void judge_change(change &c) {
    // The member of the innermost named record (or of the dsect) that changed.
    size_t record = 0;
    for (size_t i = 1; i + 1 < c.path.size(); i++)
        if (is_name(c.path[i]))
            record = i;
    const std::string &field = c.path[std::min(record + 1, c.path.size() - 1)];
    family f = owner(c.path, record);
    if (field == "class_id")
        return verdict(c, true, "the class id changed");
    if (field == "id" && f == family::attribute)
        return verdict(c, true, "an attribute id changed");
    if (field == "id" && f == family::action)
        return verdict(c, true, "an action id changed");
    if (field == "data_type" && f == family::attribute)
        return verdict(c, true, "a data type changed");
    if (field == "data_type" && f == family::sd_element)
        return verdict(c, true, "a structured-data element was retyped");
    if (field == "variable_type")
        return verdict(c, true, "a variable type changed");
    if (field == "variable_ids")
        return ids_kept(c.before, c.after) ? verdict(c, false, "variable IDs were added")
                                           : verdict(c, true, "a variable ID moved");
    for (const char *text : {"description", "display_name", "group_name", "expression_description", "rearm_description",
                             "range_description", "confirmation_message"})
        if (field == text)
            return verdict(c, false, "a description or display name changed");
    for (const char *value : {"default_value", "initial_value", "range", "valid_values"})
        if (field == value)
            return verdict(c, false, "a default or range changed");
    verdict(c, false, "nothing stored or called depends on it");
}

// The lists of a class an item left and joined tell what changed.
std::string move_reason(const std::string &from, const std::string &to) {
    bool persistence = (from.find("persistent") == 0) != (to.find("persistent") == 0);
    bool scope = (from.find("class_") != std::string::npos) != (to.find("class_") != std::string::npos);
    if (persistence && scope)
        return "persistence and class/resource scope changed";
    return persistence ? "persistence changed" : "class/resource scope changed";
}

// A removed attribute or action whose name was added to another list of the
// same class: one move.
void pair_moves(std::vector<change> &changes) {
    std::vector<bool> merged(changes.size(), false);
    for (change &r : changes) {
        if (r.what != change::kind::removed || r.path.size() != 3)
            continue;
        family f = owner(r.path, 2);
        if (f != family::attribute && f != family::action)
            continue;
        for (size_t i = 0; i < changes.size(); i++) {
            const path_t &q = changes[i].path;
            if (merged[i] || changes[i].what != change::kind::added || q.size() != 3 || q[0] != r.path[0] ||
                q[2] != r.path[2] || owner(q, 2) != f)
                continue;
            r.what = change::kind::moved;
            r.before = node::token(r.path[1]);
            r.after = node::token(q[1]);
            verdict(r, true, move_reason(r.path[1], q[1]));
            merged[i] = true;
            break;
        }
    }
    size_t kept = 0;
    for (size_t i = 0; i < changes.size(); i++) {
        if (merged[i])
            continue;
        if (kept != i)
            changes[kept] = std::move(changes[i]);
        kept++;
    }
    changes.resize(kept);
}

const char *kind_name(change::kind k) {
    switch (k) {
    case change::kind::added: return "added";
    case change::kind::removed: return "removed";
    case change::kind::moved: return "moved";
    case change::kind::reordered: return "reordered";
    default: return "changed";
    }
}

std::string path_text(const path_t &p) {
    std::string s;
    for (const std::string &segment : p)
        s += (s.empty() ? "" : " / ") + segment;
    return s;
}

std::string change_line(const change &c, bool compat) {
    std::string s = compat ? std::string(c.breaking ? "breaking: " : "compatible: ") : "";
    s += std::string(kind_name(c.what)) + " " + path_text(c.path);
    if (c.what != change::kind::added && c.what != change::kind::removed)
        s += ": " + to_json_line(c.before) + " -> " + to_json_line(c.after);
    return s + (compat ? " (" + c.reason + ")" : "") + "\n";
}

// One change as an item of the document's list; what was removed or added
// whole is written as it is read.
void write_change(tree_writer &w, const change &c, bool compat) {
    node path = node::array();
    for (const node &part : c.parts)
        path.push(part);
    w.begin_object();
    w.members(node::object().add("change", node::token(kind_name(c.what))).add("path", path));
    if (c.content && c.what == change::kind::removed)
        c.content(w, "old");
    else
        w.member("old", c.before);
    if (c.content && c.what == change::kind::added)
        c.content(w, "new");
    else
        w.member("new", c.after);
    if (compat)
        w.members(node::object()
                      .add("breaking", node::real(c.breaking ? "true" : "false"))
                      .add("reason", node::string(c.reason)));
    w.end();
}
} // namespace

void judge(std::vector<change> &changes) {
    pair_moves(changes);
    for (change &c : changes) {
        switch (c.what) {
        case change::kind::removed: judge_removal(c); break;
        case change::kind::added: verdict(c, false, "an addition"); break;
        case change::kind::reordered: verdict(c, true, "structured-data elements were reordered"); break;
        case change::kind::changed: judge_change(c); break;
        case change::kind::moved: break;
        }
    }
}

int report_changes(const dsect_source &old_file, const dsect_source &new_file, bool json, bool compat, text_sink &out) {
    size_t count = 0;
    bool breaks = false;
    auto judged = [&](std::vector<change> &batch) {
        if (compat)
            judge(batch);
        count += batch.size();
        breaks = breaks || std::any_of(batch.begin(), batch.end(), [](const change &c) { return c.breaking; });
    };
    if (!json) {
        diff_each(old_file, new_file, [&](std::vector<change> &&batch) {
            judged(batch);
            for (const change &c : batch)
                out << change_line(c, compat);
        });
        return (compat ? breaks : count > 0) ? 1 : 0;
    }
    // The verdict comes before the changes in the document: a first pass
    // finds it, a second writes the changes batch by batch, as to_json of the
    // whole document would.
    diff_each(old_file, new_file, [&](std::vector<change> &&batch) { judged(batch); });
    tree_writer w(tree_writer::style::json, out);
    w.begin_object();
    if (compat)
        w.members(node::object().add("compatible", node::real(breaks ? "false" : "true")));
    else
        w.members(node::object().add("equal", node::real(count ? "false" : "true")));
    w.begin_array("changes", count);
    diff_each(old_file, new_file, [&](std::vector<change> &&batch) {
        if (compat)
            judge(batch);
        for (const change &c : batch)
            write_change(w, c, compat);
    });
    w.end();
    w.end();
    return (compat ? breaks : count > 0) ? 1 : 0;
}

} // namespace cdbdump
