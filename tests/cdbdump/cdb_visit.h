// Reads every item of a CDB through every function of libcdb and writes what
// it found as text, so that two byte orders can be compared and a damaged
// file can be walked as far as the accessors allow. It also counts lookups
// that disagree with the walk (an item found by its name or id that does not
// carry it, the index and the scan finding different classes), which a file
// that passed the full check must not have. Shared by the tests and the fuzz
// harness.
#ifndef CDBTEST_CDB_VISIT_H
#define CDBTEST_CDB_VISIT_H

#include <qecfg/cdb_reader.h>

#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

namespace cdbtest {

class visitor {
  public:
    std::string run(const cdb_t &db) {
        cdb_header_t h;
        cdb_get_header(&db, &h);
        line("dsects %u max %u %u checksum %d", h.dsect_count, h.max_rm_id, h.max_class_id,
             cdb_check_checksum(&db) != 0);
        for (uint32_t type = CDB_MANAGER_DSECT; type <= CDB_MAP_DSECT; type++) {
            unsigned n = 0;
            for (int i = cdb_find_dsect(&db, type, 0); i >= 0; i = cdb_find_dsect(&db, type, uint32_t(i) + 1))
                n++;
            line("dsects of type %u: %u", type, n);
        }
        index_mem_.assign(cdb_index_size(&db) / sizeof(uint32_t), 0);
        has_index_ = cdb_index_build(&index_, &db, index_mem_.data(), index_mem_.size() * sizeof(uint32_t)) == CDB_OK;
        cdb_manager_t m;
        if (cdb_get_manager(&db, &m) == CDB_OK)
            line("manager %u %s", m.id, str(m.name));
        cdb_map_t map;
        if (cdb_get_map(&db, &map) == CDB_OK)
            line("map %u %u %s %u", map.class_id, map.rm_id, str(map.message_catalog), map.last_key);
        cdb_dsect_t d;
        for (uint32_t i = 0; cdb_dsect_at(&db, i, &d) == CDB_OK; i++) {
            cdb_class_t c;
            cdb_var_class_t vc;
            line("dsect %u type %u rev %u", i, d.type, d.revision);
            if (cdb_class_at(&db, i, &c) == CDB_OK)
                klass(c);
            if (cdb_var_class_at(&db, i, &vc) == CDB_OK) {
                line("varclass %s %s %u %u", str(vc.name), str(vc.alias), vc.obsv_interval, vc.report_interval);
                cdb_var_class_t named;
                if (vc.name)
                    agree(cdb_find_var_class(&db, vc.name, &named) == CDB_OK && !std::strcmp(named.name, vc.name));
                for (uint32_t k = 0; k < vc.var_count; k++)
                    line("  id %#x", cdb_var_id(&vc, k));
            }
        }
        return out_;
    }

    // Lookups that disagreed with the walk.
    unsigned disagreements() const { return disagreements_; }

  private:
    void agree(bool ok) { disagreements_ += !ok; }

    template <typename... A> void line(const char *fmt, A... a) {
        char b[512];
        std::snprintf(b, sizeof b, fmt, a...);
        out_ += b;
        out_ += '\n';
    }
    static const char *str(const char *s) { return s ? s : "(null)"; }
    static bool same(const char *found, const char *name) { return found && !std::strcmp(found, name); }

    // The words of the bits: their text, cut to a small buffer, and how many
    // of the table's words are set.
    void words(int table, uint32_t bits) {
        char b[24];
        int n = cdb_format_words(table, bits, b, sizeof b);
        unsigned set = 0;
        uint32_t bit;
        for (unsigned i = 0; cdb_word(table, i, &bit); i++)
            set += (bits & bit) != 0;
        line("  words %s (%d) %u", n >= 0 ? b : cdb_strerror(n), n, set);
    }

    void value(const char *what, const cdb_value_t &v) {
        char b[256];
        int n = cdb_format_value(&v, b, sizeof b);
        int64_t i;
        uint64_t u;
        double f;
        const char *s;
        const unsigned char *p;
        size_t len;
        cdb_handle_t h;
        uint32_t count = 0;
        cdb_value_t e;
        line("  %s %s %s (%d) element type %u none %d", what, str(cdb_data_type_name(v.type)),
             n >= 0 ? b : cdb_strerror(n), n, cdb_element_type(v.type), cdb_value_is_none(&v) != 0);
        if (cdb_value_bits(&v, &u) == CDB_OK)
            line("    bits %#" PRIx64, u);
        if (cdb_value_int64(&v, &i) == CDB_OK)
            line("    int64 %" PRId64, i);
        if (cdb_value_uint64(&v, &u) == CDB_OK)
            line("    uint64 %" PRIu64, u);
        if (cdb_value_double(&v, &f) == CDB_OK)
            line("    double %g", f);
        if (cdb_value_string(&v, &s, &len) == CDB_OK)
            line("    string %zu", len);
        if (cdb_value_binary(&v, &p, &len) == CDB_OK)
            line("    binary %zu", len);
        if (cdb_value_handle(&v, &h) == CDB_OK)
            line("    handle %#x %#x", h.header, h.id[3]);
        if (cdb_value_count(&v, &count) == CDB_OK)
            for (uint32_t k = 0; k < count && cdb_value_element(&v, k, &e) == CDB_OK; k++)
                value("element", e);
    }

    void valid_values(const cdb_valid_values_t &vv) {
        cdb_value_t lo, hi;
        uint16_t msg;
        for (uint32_t k = 0; cdb_valid_value_at(&vv, k, &lo, &hi, &msg) == CDB_OK; k++) {
            line("  valid %u", msg);
            value("low", lo);
            value("high", hi);
        }
    }

    void sd(const char *what, int found, const cdb_sd_def_t &def) {
        cdb_sd_element_t e;
        cdb_valid_values_t vv;
        if (found != CDB_OK)
            return;
        line("  sd %s %u", what, def.count);
        for (uint32_t k = 0; cdb_sd_element_at(&def, k, &e) == CDB_OK; k++) {
            line("    element %s %u %u %u %u %u", str(e.name), e.type, e.dscr_msgid, e.disp_msgid, e.action_id,
                 e.valid_type);
            cdb_sd_element_t named;
            if (e.name)
                agree(cdb_find_sd_element(&def, e.name, &named) == CDB_OK && !std::strcmp(named.name, e.name));
            if (cdb_sd_element_valid_values(&e, &vv) == CDB_OK)
                valid_values(vv);
        }
    }

    void varieties(int found, const cdb_varieties_t &v) {
        uint32_t lo, hi;
        for (uint32_t k = 0; found == CDB_OK && cdb_variety_at(&v, k, &lo, &hi) == CDB_OK; k++)
            line("  variety %u %u", lo, hi);
    }

    void attr(const cdb_attr_t &a) {
        cdb_value_t v, lo, hi;
        cdb_varieties_t vl;
        cdb_valid_values_t vv;
        cdb_sd_def_t def;
        line(" attr %d %s %d type %u", a.kind, str(cdb_attr_name(&a)), cdb_attr_id(&a), cdb_attr_data_type(&a));
        for (int f = CDB_ATTR_PROPS; f <= CDB_ATTR_REPORT_INTERVAL; f++)
            line("  field %u", cdb_attr_field(&a, f));
        bool dynamic = a.kind == CDB_DATTR || a.kind == CDB_DATTR_CLASS;
        words(dynamic ? CDB_WORDS_DATTR : CDB_WORDS_PATTR, cdb_attr_field(&a, CDB_ATTR_PROPS));
        if (dynamic)
            line("  variable type %s", str(cdb_var_type_name(cdb_attr_field(&a, CDB_ATTR_VAR_TYPE))));
        line("  expr %s %s", str(cdb_attr_expression(&a)), str(cdb_attr_rearm_expression(&a)));
        varieties(cdb_attr_varieties(&a, &vl), vl);
        if (cdb_attr_valid_values(&a, &vv) == CDB_OK)
            valid_values(vv);
        sd("attr", cdb_attr_sd(&a, &def), def);
        if (cdb_attr_default(&a, &v) == CDB_OK)
            value("default", v);
        if (cdb_attr_range(&a, &lo, &hi) == CDB_OK) {
            value("min", lo);
            value("max", hi);
        }
    }

    void action(const cdb_action_t &x) {
        cdb_varieties_t vl;
        cdb_sd_def_t def;
        line(" action %s %d", str(cdb_action_name(&x)), cdb_action_id(&x));
        for (int f = CDB_ACTION_PROPS; f <= CDB_ACTION_PERMS; f++)
            line("  field %u", cdb_action_field(&x, f));
        words(CDB_WORDS_ACTION, cdb_action_field(&x, CDB_ACTION_PROPS));
        words(CDB_WORDS_PERMISSION, cdb_action_field(&x, CDB_ACTION_PERMS));
        varieties(cdb_action_varieties(&x, &vl), vl);
        sd("input", cdb_action_sd_input(&x, &def), def);
        sd("response", cdb_action_sd_response(&x, &def), def);
    }

    // The class found again by its name and id, by a scan and by the index:
    // the scan finds the first class of that name (id), the index the same.
    void lookups(const cdb_class_t &c) {
        cdb_class_t scanned, indexed;
        const char *name = cdb_class_name(&c);
        if (name) {
            int err = cdb_find_class(c.db, name, &scanned);
            agree(err == CDB_OK && scanned.dsect <= c.dsect && same(cdb_class_name(&scanned), name));
            agree(!has_index_ || (cdb_index_find_class(&index_, name, &indexed) == CDB_OK && err == CDB_OK &&
                                  indexed.dsect == scanned.dsect));
        }
        int err = cdb_find_class_by_id(c.db, cdb_class_id(&c), &scanned);
        agree(err == CDB_OK && scanned.dsect <= c.dsect && cdb_class_id(&scanned) == cdb_class_id(&c));
        agree(!has_index_ || (cdb_index_find_class_by_id(&index_, cdb_class_id(&c), &indexed) == CDB_OK &&
                              err == CDB_OK && indexed.dsect == scanned.dsect));
    }

    void klass(const cdb_class_t &c) {
        cdb_sd_def_t def;
        cdb_attr_t a, found;
        cdb_action_t x, fx;
        line("class %s %s %u", str(cdb_class_name(&c)), str(cdb_class_alias(&c)), cdb_class_id(&c));
        for (int f = CDB_CLASS_PROPS; f <= CDB_CLASS_VERSION; f++)
            line(" field %u", cdb_class_field(&c, f));
        words(CDB_WORDS_CLASS, cdb_class_field(&c, CDB_CLASS_PROPS));
        lookups(c);
        for (int k = CDB_INPUT_DEFINE; k <= CDB_INPUT_RESET; k++)
            sd("input", cdb_class_input(&c, k, &def), def);
        for (int kind = CDB_PATTR_CLASS; kind <= CDB_DATTR; kind++)
            for (uint32_t n = 0; n < cdb_attr_count(&c, kind); n++) {
                if (cdb_attr_at(&c, kind, n, &a) != CDB_OK)
                    continue;
                attr(a);
                const char *name = cdb_attr_name(&a);
                int by_id = cdb_find_attr(&c, kind, cdb_attr_id(&a), &found);
                agree(by_id == CDB_OK && cdb_attr_id(&found) == cdb_attr_id(&a));
                int by_name = name ? cdb_find_attr_by_name(&c, kind, name, &found) : 0;
                agree(!name || (by_name == CDB_OK && same(cdb_attr_name(&found), name)));
                line("  found %d %d", by_id, by_name);
            }
        for (int of_class = 1; of_class >= 0; of_class--)
            for (uint32_t n = 0; n < cdb_action_count(&c, of_class); n++) {
                if (cdb_action_at(&c, of_class, n, &x) != CDB_OK)
                    continue;
                action(x);
                const char *name = cdb_action_name(&x);
                int by_id = cdb_find_action(&c, of_class, cdb_action_id(&x), &fx);
                agree(by_id == CDB_OK && cdb_action_id(&fx) == cdb_action_id(&x));
                int by_name = name ? cdb_find_action_by_name(&c, of_class, name, &fx) : 0;
                agree(!name || (by_name == CDB_OK && same(cdb_action_name(&fx), name)));
                line("  found %d %d", by_id, by_name);
            }
    }

    std::string out_;
    std::vector<uint32_t> index_mem_;
    cdb_index_t index_{};
    bool has_index_ = false;
    unsigned disagreements_ = 0;
};

// Opens the image and visits it; the empty string when it does not open.
inline std::string visit(const void *data, size_t size) {
    cdb_t db;
    if (cdb_open(&db, data, size) != CDB_OK)
        return "";
    return visitor().run(db);
}

} // namespace cdbtest

#endif
