#include "cdb_to_tree.h"

#include <type_traits>

#include "cdb_names.h"
#include "cdb_print.h"
#include "cdb_text.h"
#include "cdb_walk.h"

namespace cdbdump {

namespace {
node opt_string(const std::optional<std::string> &s) { return s ? node::string(*s) : node::null(); }

node names_node(const std::vector<std::string> &names) {
    node a = node::array();
    for (const auto &n : names)
        a.push(node::token(n));
    return a;
}

node props_node(const prop_table &t, uint32_t bits) {
    return node::object().add("bits", node::flags(bits)).add("names", names_node(prop_names(t, bits)));
}

node float_node(const std::string &text) {
    // JSON has no infinity or NaN: those are strings.
    bool special = text.find_first_of("0123456789") == std::string::npos;
    return special ? node::token(text) : node::real(text);
}

node number_node(uint32_t type, uint64_t bits) {
    switch (type) {
    case 2: return node::integer(int32_t(uint32_t(bits)));
    case 3: return node::uinteger(uint32_t(bits));
    case 4: return node::integer(int64_t(bits));
    case 5: return node::uinteger(bits);
    case 6: return float_node(float32_text(uint32_t(bits)));
    default: return float_node(float64_text(bits));
    }
}

node bytes_node(const std::vector<uint8_t> &b) { return node::token("0x" + hex_digits(b.data(), b.size())); }

node varieties_node(const std::vector<variety> &vs) {
    node a = node::array();
    for (const variety &v : vs)
        a.push(node::array().push(node::uinteger(v.low)).push(node::uinteger(v.high)));
    return a;
}

node valid_values_node(const std::optional<valid_values> &vv) {
    if (!vv)
        return node::null();
    node a = node::array();
    for (const valid_value &v : *vv)
        a.push(node::object()
                   .add("low", value_node(v.low))
                   .add("high", value_node(v.high))
                   .add("display_name", node::uinteger(v.display_msgid)));
    return a;
}

node sd_node(const std::optional<sd_definition> &sd) {
    if (!sd)
        return node::null();
    node a = node::array();
    for (const sd_element &e : *sd)
        a.push(node::object()
                   .add("name", node::string(e.name))
                   .add("data_type", node::token(data_type_name(e.type)))
                   .add("description", node::uinteger(e.description_msgid))
                   .add("display_name", node::uinteger(e.display_msgid))
                   .add("valid_values", valid_values_node(e.vv))
                   .add("action_id", node::flags(e.action_id))
                   .add("valid_type", node::uinteger(e.valid_type)));
    return a;
}

node attr_head(const attr_common &a) {
    return node::object()
        .add("name", node::string(a.name))
        .add("id", node::integer(a.id))
        .add("data_type", node::token(data_type_name(a.data_type)));
}

void attr_tail(const attr_common &a, const prop_table &props, node &n) {
    n.add("description", node::uinteger(a.description_msgid))
        .add("display_name", node::uinteger(a.display_msgid))
        .add("group_id", node::uinteger(a.group_id))
        .add("group_name", node::uinteger(a.group_msgid))
        .add("properties", props_node(props, a.props))
        .add("varieties", varieties_node(a.varieties))
        .add("valid_values", valid_values_node(a.vv))
        .add("sd", sd_node(a.sd))
        .add("max_sd_index", node::uinteger(a.max_sd_idx));
}

} // namespace

node pattr_node(const pattr &p) {
    node n = attr_head(p);
    attr_tail(p, pattr_props, n);
    n.add("default_value", value_node(p.dflt));
    return n;
}

node dattr_node(const dattr &d) {
    node n = attr_head(d);
    n.add("variable_type", node::token(var_type_name(d.var_type)));
    attr_tail(d, dattr_props, n);
    n.add("initial_value", value_node(d.init))
        .add("range", node::object().add("low", value_node(d.min)).add("high", value_node(d.max)))
        .add("expression", opt_string(d.expression))
        .add("expression_description", node::uinteger(d.expr_desc))
        .add("rearm_expression", opt_string(d.rearm_expression))
        .add("rearm_description", node::uinteger(d.rearm_desc))
        .add("range_description", node::uinteger(d.range_desc));
    return n;
}

node action_node(const action &x) {
    return node::object()
        .add("name", node::string(x.name))
        .add("id", node::integer(x.id))
        .add("description", node::uinteger(x.description_msgid))
        .add("display_name", node::uinteger(x.display_msgid))
        .add("confirmation_message", node::uinteger(x.confirm_msgid))
        .add("timeout", node::uinteger(x.timeout))
        .add("properties", props_node(action_props, x.props))
        .add("permission", node::object()
                               .add("bits", node::flags(x.perms))
                               .add("letters", names_node(prop_names(perm_letters, x.perms))))
        .add("varieties", varieties_node(x.varieties))
        .add("sd_input", sd_node(x.sd_input))
        .add("sd_response", sd_node(x.sd_response));
}

namespace {

template <typename T, typename F> node list_node(const std::vector<T> &items, F f) {
    node a = node::array();
    for (const T &i : items)
        a.push(f(i));
    return a;
}

} // namespace

// Everything of a class but its record lists.
node class_fields(const class_dsect &c) {
    return node::object()
        .add("name", node::string(c.name))
        .add("alias", opt_string(c.alias))
        .add("class_id", node::uinteger(c.class_id))
        .add("description", node::uinteger(c.description_msgid))
        .add("display_name", node::uinteger(c.display_msgid))
        .add("properties", props_node(class_props, c.props))
        .add("class_perm_template", node::flags(c.perm_temp_class))
        .add("resource_perm_template", node::flags(c.perm_temp))
        .add("locator", node::uinteger(c.locator))
        .add("file_version", node::token(version_text(c.version)))
        .add("define_sd", sd_node(c.define_sd))
        .add("undefine_sd", sd_node(c.undefine_sd))
        .add("online_sd", sd_node(c.online_sd))
        .add("offline_sd", sd_node(c.offline_sd))
        .add("reset_sd", sd_node(c.reset_sd));
}

namespace {

node class_node(const class_dsect &c) {
    node n = class_fields(c);
    class_lists(c, c, [&](const char *key, const auto &items, const auto &, auto render) {
        n.add(key, list_node(items, render));
    });
    return n;
}

node manager_node(const mgr_dsect &m) {
    return node::object().add("id", node::uinteger(m.id)).add("name", node::string(m.name));
}

node map_node(const map_dsect &m) {
    return node::object()
        .add("class_id", node::uinteger(m.class_id))
        .add("rm_id", node::uinteger(m.rm_id))
        .add("message_catalog", opt_string(m.message_catalog))
        .add("descriptive_message_set", node::uinteger(m.dscr_msg_set))
        .add("first_key", node::uinteger(m.first_key))
        .add("last_key", node::uinteger(m.last_key))
        .add("asnno_start", node::uinteger(m.asnno_start))
        .add("num_sctx", node::uinteger(m.num_sctx))
        .add("num_vctx", node::uinteger(m.num_vctx))
        .add("num_stats", node::uinteger(m.num_stats))
        .add("num_ctx_tmplts", node::uinteger(m.num_ctx_tmplts))
        .add("static_contexts", node::uinteger(m.static_contexts))
        .add("volatile_contexts", node::uinteger(m.volatile_contexts))
        .add("stats", node::uinteger(m.stats))
        .add("ctx_tmplts", node::uinteger(m.ctx_tmplts));
}

node var_class_node(const var_class_dsect &v) {
    node ids = node::array();
    for (uint32_t id : v.var_ids)
        ids.push(node::uinteger(id));
    return node::object()
        .add("name", opt_string(v.name))
        .add("alias", opt_string(v.alias))
        .add("observation_interval", node::uinteger(v.obsv_interval))
        .add("reporting_interval", node::uinteger(v.report_interval))
        .add("variable_ids", ids);
}

} // namespace

node dsect_head(const anchor &a) {
    return node::object()
        .add("dsect", node::token(dsect_kind_name(a.type)))
        .add("revision", node::uinteger(a.revision));
}

node dsect_node(const dsect &d, const anchor &a) {
    node head = dsect_head(a);
    node body = std::visit(
        [](const auto &x) -> node {
            using T = std::decay_t<decltype(x)>;
            if constexpr (std::is_same_v<T, class_dsect>)
                return class_node(x);
            else if constexpr (std::is_same_v<T, mgr_dsect>)
                return manager_node(x);
            else if constexpr (std::is_same_v<T, map_dsect>)
                return map_node(x);
            else
                return var_class_node(x);
        },
        d);
    for (const auto &m : body.members())
        head.add(m.first, m.second);
    return head;
}

namespace {
const char *const record_size_names[NUM_RECORD_SIZES] = {
    "class", "cmmap", "manager", "variable_class", "pattr", "dattr", "action", "error", "depend",
};
} // namespace

node value_node(const value &v) {
    switch (v.kind) {
    case value_kind::absent: return node::null();
    case value_kind::number: return number_node(v.type, v.bits);
    case value_kind::string: return node::string(v.text);
    case value_kind::raw:
    case value_kind::binary:
    case value_kind::handle: return bytes_node(v.bytes);
    case value_kind::array: return list_node(v.elements, value_node);
    case value_kind::sd:
        return list_node(v.elements, [](const value &e) {
            return node::object().add("type", node::token(data_type_name(e.type))).add("value", value_node(e));
        });
    }
    return node::null();
}

node file_head(const cdb_file &f) {
    node sizes = node::object();
    for (int i = 0; i < NUM_RECORD_SIZES; i++)
        sizes.add(record_size_names[i], node::uinteger(f.record_sizes[i]));
    node header = node::object()
                      .add("seqno", node::uinteger(f.seqno))
                      .add("timestamp",
                           node::object().add("sec", node::uinteger(f.tv_sec)).add("usec", node::uinteger(f.tv_usec)))
                      .add("max_rm_id", node::uinteger(f.max_rm_id))
                      .add("max_class_id", node::uinteger(f.max_class_id))
                      .add("record_sizes", sizes);
    node anchors = node::array();
    for (const anchor &a : f.anchors)
        anchors.push(node::object()
                         .add("type", node::token(dsect_kind_name(a.type)))
                         .add("offset", node::flags(a.offset))
                         .add("length", node::uinteger(a.length)));
    node layout = node::object()
                      .add("length", node::uinteger(f.length))
                      .add("checksum", node::flags(f.checksum))
                      .add("anchors", anchors);
    return node::object()
        .add("byte_order", node::token(f.big_endian ? "big" : "little"))
        .add("header", header)
        .add("layout", layout);
}

node to_tree(const cdb_file &f) {
    node dsects = node::array();
    for (size_t i = 0; i < f.dsects.size() && i < f.anchors.size(); i++)
        dsects.push(dsect_node(f.dsects[i], f.anchors[i]));
    return file_head(f).add("dsects", dsects);
}

// A class is written record by record, so that only one record's tree is held.
void write_dsect_members(tree_writer &w, const dsect &d, const anchor &a, bool with_kind) {
    const auto *c = std::get_if<class_dsect>(&d);
    node head = c ? dsect_head(a) : dsect_node(d, a);
    if (!with_kind)
        head.erase("dsect");
    w.members(head);
    if (!c)
        return;
    w.members(class_fields(*c));
    class_lists(*c, *c, [&](const char *key, const auto &items, const auto &, auto render) {
        w.begin_array(key, items.size());
        for (const auto &x : items)
            w.item(render(x));
        w.end();
    });
}

namespace {
void begin_file(tree_writer &w, const cdb_file &f) {
    w.begin_object();
    w.members(file_head(f));
    w.begin_array("dsects", f.anchors.size());
}

void write_dsect(tree_writer &w, const dsect &d, const anchor &a) {
    w.begin_object();
    write_dsect_members(w, d, a, true);
    w.end();
}

void end_file(tree_writer &w) {
    w.end();
    w.end();
}
} // namespace

void write_file(const uint8_t *data, size_t size, const cdb_file &head, tree_writer::style style, text_sink &out) {
    if (print_checked(data, size, style, out))
        return;
    tree_writer w(style, out);
    begin_file(w, head);
    verify_each(data, size, [&](size_t i, dsect &&d) { write_dsect(w, d, head.anchors[i]); });
    end_file(w);
}

} // namespace cdbdump
