#include "cdb_print.h"

#include <cstring>
#include <string_view>

#include "cdb_names.h"
#include "cdb_read.h"
#include "cdb_text.h"
#include "cdb_to_tree.h"

namespace cdbdump {

namespace {
std::string_view view(const char *s) { return s ? std::string_view(s) : std::string_view(); }

// The parts of a class as documents; each function adds one member (or item
// when key is empty) to the document being built.
class class_printer {
  public:
    class_printer(const cdb_t &db, flat_doc &d) : db_(db), d_(d) {}

    void fields(const cdb_class_t &c, const cdb_dsect_t &anchor) {
        d_.begin_object();
        d_.token("dsect", "class");
        d_.uinteger("revision", anchor.revision);
        d_.string("name", view(cdb_class_name(&c)));
        opt_string("alias", cdb_class_alias(&c));
        d_.uinteger("class_id", cdb_class_id(&c));
        d_.uinteger("description", uint16_t(cdb_class_field(&c, CDB_CLASS_DSCR_MSGID)));
        d_.uinteger("display_name", uint16_t(cdb_class_field(&c, CDB_CLASS_DISP_MSGID)));
        props("properties", "names", class_props, cdb_class_field(&c, CDB_CLASS_PROPS));
        d_.flags("class_perm_template", cdb_class_field(&c, CDB_CLASS_PERM_TEMPLATE_CLASS));
        d_.flags("resource_perm_template", cdb_class_field(&c, CDB_CLASS_PERM_TEMPLATE));
        d_.uinteger("locator", uint16_t(cdb_class_field(&c, CDB_CLASS_LOCATOR)));
        d_.token("file_version", version_text(cdb_class_field(&c, CDB_CLASS_VERSION)));
        static const char *const inputs[] = {"define_sd", "undefine_sd", "online_sd", "offline_sd", "reset_sd"};
        cdb_sd_def_t def;
        for (int k = 0; k < 5; k++)
            sd(inputs[k], cdb_class_input(&c, k, &def), def);
        d_.end();
    }

    void attribute(const cdb_attr_t &a) {
        bool dynamic = a.kind == CDB_DATTR_CLASS || a.kind == CDB_DATTR;
        uint32_t type = cdb_attr_data_type(&a);
        d_.begin_object();
        d_.string("name", view(cdb_attr_name(&a)));
        d_.integer("id", cdb_attr_id(&a));
        d_.token("data_type", data_type_name(type));
        if (dynamic)
            d_.token("variable_type", var_type_name(cdb_attr_field(&a, CDB_ATTR_VAR_TYPE)));
        d_.uinteger("description", uint16_t(cdb_attr_field(&a, CDB_ATTR_DSCR_MSGID)));
        d_.uinteger("display_name", uint16_t(cdb_attr_field(&a, CDB_ATTR_DISP_MSGID)));
        d_.uinteger("group_id", uint16_t(cdb_attr_field(&a, CDB_ATTR_GROUP_ID)));
        d_.uinteger("group_name", uint16_t(cdb_attr_field(&a, CDB_ATTR_GROUP_MSGID)));
        props("properties", "names", dynamic ? dattr_props : pattr_props, cdb_attr_field(&a, CDB_ATTR_PROPS));
        cdb_varieties_t vl{};
        cdb_attr_varieties(&a, &vl);
        varieties(vl);
        cdb_valid_values_t list;
        valid_values("valid_values", cdb_attr_valid_values(&a, &list), list);
        cdb_sd_def_t def;
        sd("sd", cdb_attr_sd(&a, &def), def);
        d_.uinteger("max_sd_index", uint16_t(cdb_attr_field(&a, CDB_ATTR_MAX_SD_IDX)));
        cdb_value_t v, low, high;
        cdb_attr_default(&a, &v);
        value(dynamic ? "initial_value" : "default_value", v);
        if (dynamic) {
            cdb_attr_range(&a, &low, &high);
            d_.begin_object("range");
            value("low", low);
            value("high", high);
            d_.end();
            opt_string("expression", cdb_attr_expression(&a));
            d_.uinteger("expression_description", uint16_t(cdb_attr_field(&a, CDB_ATTR_EXPR_DESC)));
            opt_string("rearm_expression", cdb_attr_rearm_expression(&a));
            d_.uinteger("rearm_description", uint16_t(cdb_attr_field(&a, CDB_ATTR_REARM_DESC)));
            d_.uinteger("range_description", uint16_t(cdb_attr_field(&a, CDB_ATTR_RANGE_DESC)));
        }
        d_.end();
    }

    void action(const cdb_action_t &x) {
        d_.begin_object();
        d_.string("name", view(cdb_action_name(&x)));
        d_.integer("id", cdb_action_id(&x));
        d_.uinteger("description", uint16_t(cdb_action_field(&x, CDB_ACTION_DSCR_MSGID)));
        d_.uinteger("display_name", uint16_t(cdb_action_field(&x, CDB_ACTION_DISP_MSGID)));
        d_.uinteger("confirmation_message", uint16_t(cdb_action_field(&x, CDB_ACTION_CONFIRM_MSGID)));
        d_.uinteger("timeout", uint16_t(cdb_action_field(&x, CDB_ACTION_TIMEOUT)));
        props("properties", "names", action_props, cdb_action_field(&x, CDB_ACTION_PROPS));
        props("permission", "letters", perm_letters, cdb_action_field(&x, CDB_ACTION_PERMS));
        cdb_varieties_t vl{};
        cdb_action_varieties(&x, &vl);
        varieties(vl);
        cdb_sd_def_t def;
        sd("sd_input", cdb_action_sd_input(&x, &def), def);
        sd("sd_response", cdb_action_sd_response(&x, &def), def);
        d_.end();
    }

  private:
    void opt_string(std::string_view key, const char *s) {
        if (s)
            d_.string(key, s);
        else
            d_.null(key);
    }

    void props(std::string_view key, std::string_view list, const prop_table &t, uint32_t bits) {
        d_.begin_object(key);
        d_.flags("bits", bits);
        d_.begin_array(list);
        for (int i = 0; i < t.count; i++)
            if (bits & t.entries[i].p)
                d_.token({}, t.entries[i].s);
        d_.end();
        d_.end();
    }

    void varieties(const cdb_varieties_t &list) {
        d_.begin_array("varieties");
        uint32_t low = 0, high = 0;
        for (uint32_t i = 0; i < list.count; i++) {
            cdb_variety_at(&list, i, &low, &high);
            d_.begin_array();
            d_.uinteger({}, low);
            d_.uinteger({}, high);
            d_.end();
        }
        d_.end();
    }

    void valid_values(std::string_view key, int found, const cdb_valid_values_t &list) {
        if (found != CDB_OK)
            return d_.null(key);
        d_.begin_array(key);
        cdb_value_t low, high;
        uint16_t msg;
        for (uint32_t i = 0; cdb_valid_value_at(&list, i, &low, &high, &msg) == CDB_OK; i++) {
            d_.begin_object();
            value("low", low);
            value("high", high);
            d_.uinteger("display_name", msg);
            d_.end();
        }
        d_.end();
    }

    void sd(std::string_view key, int found, const cdb_sd_def_t &def) {
        if (found != CDB_OK)
            return d_.null(key);
        d_.begin_array(key);
        cdb_sd_element_t e;
        cdb_valid_values_t list;
        for (uint32_t i = 0; cdb_sd_element_at(&def, i, &e) == CDB_OK; i++) {
            d_.begin_object();
            d_.string("name", view(e.name));
            d_.token("data_type", data_type_name(e.type));
            d_.uinteger("description", e.dscr_msgid);
            d_.uinteger("display_name", e.disp_msgid);
            valid_values("valid_values", cdb_sd_element_valid_values(&e, &list), list);
            d_.flags("action_id", e.action_id);
            d_.uinteger("valid_type", e.valid_type);
            d_.end();
        }
        d_.end();
    }

    void number(std::string_view key, uint32_t type, uint64_t bits) {
        switch (type) {
        case CDB_INT32: return d_.integer(key, int32_t(uint32_t(bits)));
        case CDB_UINT32: return d_.uinteger(key, uint32_t(bits));
        case CDB_INT64: return d_.integer(key, int64_t(bits));
        case CDB_UINT64: return d_.uinteger(key, bits);
        default: {
            std::string text = type == CDB_FLOAT32 ? float32_text(uint32_t(bits)) : float64_text(bits);
            // JSON has no infinity or NaN: those are strings.
            if (text.find_first_of("0123456789") == std::string::npos)
                return d_.token(key, text);
            return d_.real(key, text);
        }
        }
    }

    void value(std::string_view key, const cdb_value_t &v) {
        if (cdb_value_is_none(&v))
            return d_.null(key);
        if (is_number_type(v.type)) {
            uint64_t bits = 0;
            cdb_value_bits(&v, &bits);
            return number(key, v.type, bits);
        }
        switch (v.type) {
        case CDB_UNKNOWN:
        case CDB_NONE_TYPE:
        case CDB_SBS: return d_.bytes(key, db_.data + v.at, 8); // the 8 bytes as stored
        case CDB_STRING: {
            const char *s = "";
            size_t n = 0;
            cdb_value_string(&v, &s, &n);
            return d_.string(key, std::string_view(s, n));
        }
        case CDB_BINARY: {
            const unsigned char *p = nullptr;
            size_t n = 0;
            cdb_value_binary(&v, &p, &n);
            return d_.bytes(key, p, n);
        }
        case CDB_RH: return handle(key, v);
        default: return elements(key, v);
        }
    }

    void handle(std::string_view key, const cdb_value_t &v) {
        uint8_t bytes[HANDLE_SIZE];
        handle_bytes(v, db_.big_endian != 0, bytes);
        d_.bytes(key, bytes, sizeof bytes);
    }

    // An array's elements, or a structured value's elements with their types.
    void elements(std::string_view key, const cdb_value_t &v) {
        uint32_t n = 0;
        cdb_value_t e;
        cdb_value_count(&v, &n);
        d_.begin_array(key);
        for (uint32_t i = 0; i < n && cdb_value_element(&v, i, &e) == CDB_OK; i++) {
            if (v.type != CDB_SD) {
                value({}, e);
                continue;
            }
            d_.begin_object();
            d_.token("type", data_type_name(e.type));
            value("value", e);
            d_.end();
        }
        d_.end();
    }

    const cdb_t &db_;
    flat_doc &d_;
};

// A class: its fields member by member, then each list item by item.
void print_class(const cdb_t &db, uint32_t i, const cdb_dsect_t &anchor, tree_writer &w, flat_doc &d) {
    cdb_class_t c;
    cdb_class_at(&db, i, &c);
    class_printer p(db, d);
    w.begin_object();
    d.clear();
    p.fields(c, anchor);
    w.members(d, 0);
    static const char *const attr_lists[] = {"persistent_class_attributes", "dynamic_class_attributes",
                                             "persistent_resource_attributes", "dynamic_resource_attributes"};
    cdb_attr_t a;
    for (int kind = CDB_PATTR_CLASS; kind <= CDB_DATTR; kind++) {
        w.begin_array(attr_lists[kind], cdb_attr_count(&c, kind));
        for (uint32_t n = 0; cdb_attr_at(&c, kind, n, &a) == CDB_OK; n++) {
            d.clear();
            p.attribute(a);
            w.item(d, 0);
        }
        w.end();
    }
    cdb_action_t x;
    for (int of_class : {1, 0}) {
        w.begin_array(of_class ? "class_actions" : "resource_actions", cdb_action_count(&c, of_class));
        for (uint32_t n = 0; cdb_action_at(&c, of_class, n, &x) == CDB_OK; n++) {
            d.clear();
            p.action(x);
            w.item(d, 0);
        }
        w.end();
    }
    w.end();
}
} // namespace

bool print_checked(const uint8_t *data, size_t size, tree_writer::style style, text_sink &out) {
    cdb_t db;
    if (!open_checked(data, size, db))
        return false;
    tree_writer w(style, out);
    cdb_file head = read_head(db);
    node head_tree = file_head(head);
    flat_doc d;
    to_flat(head_tree, d);
    w.begin_object();
    w.members(d, 0);
    w.begin_array("dsects", head.anchors.size());
    cdb_dsect_t anchor;
    for (uint32_t i = 0; cdb_dsect_at(&db, i, &anchor) == CDB_OK; i++) {
        if (anchor.type == CDB_CLASS_DSECT) {
            print_class(db, i, anchor, w, d);
            continue;
        }
        // Managers, maps and variable classes are small: through the model.
        node n = dsect_node(read_dsect(db, i, anchor), head.anchors[i]);
        d.clear();
        to_flat(n, d);
        w.item(d, 0);
    }
    w.end();
    w.end();
    return true;
}

} // namespace cdbdump
