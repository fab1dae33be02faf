#include "cdb_read.h"

#include <algorithm>
#include <vector>

#include "cdb_names.h"

namespace cdbdump {

namespace {

std::optional<std::string> maybe(const char *s) { return s ? std::optional<std::string>(s) : std::nullopt; }

value read_value(const cdb_value_t &v, bool big_endian) {
    value out;
    out.type = v.type;
    if (cdb_value_is_none(&v))
        return out;
    const unsigned char *data = v.cls->db->data;
    if (is_number_type(v.type)) {
        out.kind = value_kind::number;
        cdb_value_bits(&v, &out.bits);
        return out;
    }
    switch (v.type) {
    case CDB_UNKNOWN:
    case CDB_NONE_TYPE:
    case CDB_SBS:
        out.kind = value_kind::raw; // the 8 bytes as stored
        out.bytes.assign(data + v.at, data + v.at + 8);
        return out;
    case CDB_STRING: {
        const char *s;
        size_t n;
        cdb_value_string(&v, &s, &n);
        out.kind = value_kind::string;
        out.text.assign(s, n);
        return out;
    }
    case CDB_BINARY: {
        const unsigned char *p;
        size_t n;
        cdb_value_binary(&v, &p, &n);
        out.kind = value_kind::binary;
        out.bytes.assign(p, p + n);
        return out;
    }
    case CDB_RH:
        out.kind = value_kind::handle;
        out.bytes.resize(HANDLE_SIZE);
        handle_bytes(v, big_endian, out.bytes.data());
        return out;
    default: {
        out.kind = v.type == CDB_SD ? value_kind::sd : value_kind::array;
        uint32_t n = 0;
        cdb_value_t e;
        cdb_value_count(&v, &n);
        for (uint32_t i = 0; i < n && cdb_value_element(&v, i, &e) == CDB_OK; i++)
            out.elements.push_back(read_value(e, big_endian));
        return out;
    }
    }
}

class model_reader {
  public:
    explicit model_reader(const cdb_t &db) : db_(db) {}

    dsect read(uint32_t i, const cdb_dsect_t &d) const {
        switch (d.type) {
        case CDB_CLASS_DSECT: return read_class(i);
        case CDB_MANAGER_DSECT: return read_manager();
        case CDB_MAP_DSECT: return read_map();
        default: return read_var_class(i);
        }
    }

  private:
    value val(const cdb_value_t &v) const { return read_value(v, db_.big_endian != 0); }

    std::optional<valid_values> vv(int found, const cdb_valid_values_t &list) const {
        if (found != CDB_OK)
            return std::nullopt;
        valid_values out;
        cdb_value_t lo, hi;
        uint16_t msg;
        for (uint32_t i = 0; cdb_valid_value_at(&list, i, &lo, &hi, &msg) == CDB_OK; i++)
            out.push_back(valid_value{val(lo), val(hi), msg});
        return out;
    }

    std::optional<sd_definition> sd(int found, const cdb_sd_def_t &def) const {
        if (found != CDB_OK)
            return std::nullopt;
        sd_definition out;
        cdb_sd_element_t e;
        cdb_valid_values_t list;
        for (uint32_t i = 0; cdb_sd_element_at(&def, i, &e) == CDB_OK; i++) {
            sd_element el;
            el.name = e.name;
            el.type = e.type;
            el.display_msgid = e.disp_msgid;
            el.description_msgid = e.dscr_msgid;
            el.vv = vv(cdb_sd_element_valid_values(&e, &list), list);
            el.action_id = e.action_id;
            el.valid_type = e.valid_type;
            out.push_back(std::move(el));
        }
        return out;
    }

    static std::vector<variety> varieties(const cdb_varieties_t &list) {
        std::vector<variety> out(list.count);
        for (uint32_t i = 0; i < list.count; i++)
            cdb_variety_at(&list, i, &out[i].low, &out[i].high);
        return out;
    }

    void attr_common(const cdb_attr_t &a, attr_common &out) const {
        cdb_varieties_t vl;
        cdb_valid_values_t list;
        cdb_sd_def_t def;
        out.of_class = a.kind == CDB_PATTR_CLASS || a.kind == CDB_DATTR_CLASS;
        out.props = cdb_attr_field(&a, CDB_ATTR_PROPS);
        out.name = cdb_attr_name(&a);
        out.description_msgid = uint16_t(cdb_attr_field(&a, CDB_ATTR_DSCR_MSGID));
        out.display_msgid = uint16_t(cdb_attr_field(&a, CDB_ATTR_DISP_MSGID));
        out.group_msgid = uint16_t(cdb_attr_field(&a, CDB_ATTR_GROUP_MSGID));
        out.group_id = uint16_t(cdb_attr_field(&a, CDB_ATTR_GROUP_ID));
        out.id = cdb_attr_id(&a);
        out.data_type = cdb_attr_data_type(&a);
        cdb_attr_varieties(&a, &vl);
        out.varieties = varieties(vl);
        out.vv = vv(cdb_attr_valid_values(&a, &list), list);
        out.sd = sd(cdb_attr_sd(&a, &def), def);
        out.max_sd_idx = uint16_t(cdb_attr_field(&a, CDB_ATTR_MAX_SD_IDX));
    }

    pattr read_pattr(const cdb_attr_t &a) const {
        pattr p;
        cdb_value_t v;
        attr_common(a, p);
        cdb_attr_default(&a, &v);
        p.dflt = val(v);
        return p;
    }

    dattr read_dattr(const cdb_attr_t &a) const {
        dattr d;
        cdb_value_t v, lo, hi;
        attr_common(a, d);
        cdb_attr_default(&a, &v);
        d.init = val(v);
        cdb_attr_range(&a, &lo, &hi);
        d.min = val(lo);
        d.max = val(hi);
        d.expression = maybe(cdb_attr_expression(&a));
        d.rearm_expression = maybe(cdb_attr_rearm_expression(&a));
        d.var_type = cdb_attr_field(&a, CDB_ATTR_VAR_TYPE);
        d.expr_desc = uint16_t(cdb_attr_field(&a, CDB_ATTR_EXPR_DESC));
        d.rearm_desc = uint16_t(cdb_attr_field(&a, CDB_ATTR_REARM_DESC));
        d.range_desc = uint16_t(cdb_attr_field(&a, CDB_ATTR_RANGE_DESC));
        return d;
    }

    action read_action(const cdb_action_t &x) const {
        action out;
        cdb_varieties_t vl;
        cdb_sd_def_t def;
        out.of_class = x.of_class != 0;
        out.id = cdb_action_id(&x);
        out.props = cdb_action_field(&x, CDB_ACTION_PROPS);
        out.description_msgid = uint16_t(cdb_action_field(&x, CDB_ACTION_DSCR_MSGID));
        out.display_msgid = uint16_t(cdb_action_field(&x, CDB_ACTION_DISP_MSGID));
        out.confirm_msgid = uint16_t(cdb_action_field(&x, CDB_ACTION_CONFIRM_MSGID));
        out.timeout = uint16_t(cdb_action_field(&x, CDB_ACTION_TIMEOUT));
        out.perms = cdb_action_field(&x, CDB_ACTION_PERMS);
        out.name = cdb_action_name(&x);
        cdb_action_varieties(&x, &vl);
        out.varieties = varieties(vl);
        out.sd_input = sd(cdb_action_sd_input(&x, &def), def);
        out.sd_response = sd(cdb_action_sd_response(&x, &def), def);
        return out;
    }

    class_dsect read_class(uint32_t i) const {
        class_dsect c;
        cdb_class_t cls;
        cdb_sd_def_t def;
        cdb_class_at(&db_, i, &cls);
        c.props = cdb_class_field(&cls, CDB_CLASS_PROPS);
        c.name = cdb_class_name(&cls);
        c.alias = maybe(cdb_class_alias(&cls));
        std::optional<sd_definition> *inputs[] = {&c.define_sd, &c.undefine_sd, &c.online_sd, &c.offline_sd,
                                                  &c.reset_sd};
        for (int k = 0; k < 5; k++)
            *inputs[k] = sd(cdb_class_input(&cls, k, &def), def);
        std::vector<pattr> *pattrs[] = {&c.pattrs_class, &c.pattrs};
        std::vector<dattr> *dattrs[] = {&c.dattrs_class, &c.dattrs};
        cdb_attr_t a;
        for (int k = 0; k < 2; k++) {
            pattrs[k]->reserve(cdb_attr_count(&cls, CDB_PATTR_CLASS + 2 * k));
            dattrs[k]->reserve(cdb_attr_count(&cls, CDB_DATTR_CLASS + 2 * k));
            for (uint32_t n = 0; cdb_attr_at(&cls, CDB_PATTR_CLASS + 2 * k, n, &a) == CDB_OK; n++)
                pattrs[k]->push_back(read_pattr(a));
            for (uint32_t n = 0; cdb_attr_at(&cls, CDB_DATTR_CLASS + 2 * k, n, &a) == CDB_OK; n++)
                dattrs[k]->push_back(read_dattr(a));
        }
        cdb_action_t x;
        c.actions_class.reserve(cdb_action_count(&cls, 1));
        c.actions.reserve(cdb_action_count(&cls, 0));
        for (uint32_t n = 0; cdb_action_at(&cls, 1, n, &x) == CDB_OK; n++)
            c.actions_class.push_back(read_action(x));
        for (uint32_t n = 0; cdb_action_at(&cls, 0, n, &x) == CDB_OK; n++)
            c.actions.push_back(read_action(x));
        c.perm_temp = cdb_class_field(&cls, CDB_CLASS_PERM_TEMPLATE);
        c.perm_temp_class = cdb_class_field(&cls, CDB_CLASS_PERM_TEMPLATE_CLASS);
        c.class_id = cdb_class_id(&cls);
        c.description_msgid = uint16_t(cdb_class_field(&cls, CDB_CLASS_DSCR_MSGID));
        c.display_msgid = uint16_t(cdb_class_field(&cls, CDB_CLASS_DISP_MSGID));
        c.locator = uint16_t(cdb_class_field(&cls, CDB_CLASS_LOCATOR));
        c.version = cdb_class_field(&cls, CDB_CLASS_VERSION);
        return c;
    }

    mgr_dsect read_manager() const {
        cdb_manager_t m;
        cdb_get_manager(&db_, &m);
        return mgr_dsect{m.id, m.name};
    }

    map_dsect read_map() const {
        cdb_map_t m;
        cdb_get_map(&db_, &m);
        return map_dsect{m.class_id,          m.rm_id,          maybe(m.message_catalog),
                         m.dscr_msg_set,      m.first_key,      m.last_key,
                         m.asnno_start,       m.num_sctx,       m.num_vctx,
                         m.num_stats,         m.num_ctx_tmplts, m.static_contexts,
                         m.volatile_contexts, m.stats,          m.ctx_tmplts};
    }

    var_class_dsect read_var_class(uint32_t i) const {
        cdb_var_class_t vc;
        cdb_var_class_at(&db_, i, &vc);
        var_class_dsect v;
        v.obsv_interval = vc.obsv_interval;
        v.report_interval = vc.report_interval;
        v.name = maybe(vc.name);
        v.alias = maybe(vc.alias);
        for (uint32_t k = 0; k < vc.var_count; k++)
            v.var_ids.push_back(cdb_var_id(&vc, k));
        return v;
    }

    const cdb_t &db_;
};

} // namespace

void handle_bytes(const cdb_value_t &v, bool big_endian, uint8_t *out) {
    cdb_handle_t h;
    cdb_value_handle(&v, &h);
    const uint32_t words[5] = {h.header, h.id[0], h.id[1], h.id[2], h.id[3]};
    for (int w = 0; w < 5; w++)
        for (int i = 0; i < 4; i++)
            out[4 * w + i] = uint8_t(words[w] >> (big_endian ? 8 * (3 - i) : 8 * i));
}

bool open_checked(const uint8_t *data, size_t size, cdb_t &db) {
    if (cdb_open(&db, data, size) != CDB_OK)
        return false;
    std::vector<unsigned char> scratch(cdb_check_scratch_size(&db));
    return cdb_check(&db, scratch.data(), scratch.size(), nullptr) == CDB_OK;
}

bool library_accepts(const uint8_t *data, size_t size) {
    cdb_t db;
    return open_checked(data, size, db);
}

cdb_file read_head(const cdb_t &db) {
    cdb_file head;
    cdb_header_t h;
    cdb_get_header(&db, &h);
    head.big_endian = db.big_endian != 0;
    head.length = h.length;
    head.checksum = h.checksum;
    head.seqno = h.seqno;
    head.tv_sec = h.tv_sec;
    head.tv_usec = h.tv_usec;
    head.max_rm_id = h.max_rm_id;
    head.max_class_id = h.max_class_id;
    std::copy(record_sizes, record_sizes + NUM_RECORD_SIZES, head.record_sizes); // cdb_open checked them
    cdb_dsect_t d;
    for (uint32_t i = 0; cdb_dsect_at(&db, i, &d) == CDB_OK; i++)
        head.anchors.push_back(anchor{d.type, d.offset, d.length, d.revision});
    return head;
}

dsect read_dsect(const cdb_t &db, uint32_t i, const cdb_dsect_t &d) { return model_reader(db).read(i, d); }

bool read_checked(const uint8_t *data, size_t size, cdb_file &head, const dsect_consumer &each) {
    cdb_t db;
    if (!open_checked(data, size, db))
        return false;
    head = read_head(db);
    cdb_dsect_t d;
    for (uint32_t i = 0; cdb_dsect_at(&db, i, &d) == CDB_OK; i++) {
        if (each)
            each(i, read_dsect(db, i, d));
        else
            head.dsects.push_back(read_dsect(db, i, d));
    }
    return true;
}

} // namespace cdbdump
