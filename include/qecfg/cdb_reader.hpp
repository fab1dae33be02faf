// A thin C++17 layer over <qecfg/cdb_reader.h>: views that read in place,
// std::string_view for strings, std::optional for what may be absent, and a
// choice between error codes (try_open) and exceptions (open, check). The C
// API is the contract; every view here holds one of its handles.
#ifndef QECFG_CDB_READER_HPP
#define QECFG_CDB_READER_HPP

#include <cstddef>
#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "cdb_reader.h"

namespace qecfg::cdb {

// A negative cdb_error code as an exception, with the offset of the first
// violation when a check found one.
class error : public std::runtime_error {
  public:
    error(int code, size_t offset = 0) : std::runtime_error(cdb_strerror(code)), code_(code), offset_(offset) {}
    int code() const { return code_; }
    size_t offset() const { return offset_; }

  private:
    int code_;
    size_t offset_;
};

inline std::string_view text(const char *s) { return s ? std::string_view(s) : std::string_view(); }
inline std::optional<std::string_view> maybe_text(const char *s) {
    return s ? std::optional<std::string_view>(s) : std::nullopt;
}

// A value: read it by its type.
class value {
  public:
    explicit value(const cdb_value_t &v) : v_(v) {}
    uint32_t type() const { return v_.type; }
    bool is_none() const { return cdb_value_is_none(&v_) != 0; }
    std::optional<int64_t> as_int64() const { return get<int64_t>(cdb_value_int64); }
    std::optional<uint64_t> as_uint64() const { return get<uint64_t>(cdb_value_uint64); }
    std::optional<double> as_double() const { return get<double>(cdb_value_double); }
    std::optional<std::string_view> as_string() const {
        const char *s;
        size_t n;
        return cdb_value_string(&v_, &s, &n) == CDB_OK ? std::optional<std::string_view>({s, n}) : std::nullopt;
    }
    std::optional<std::basic_string_view<unsigned char>> as_binary() const {
        const unsigned char *p;
        size_t n;
        if (cdb_value_binary(&v_, &p, &n) != CDB_OK)
            return std::nullopt;
        return std::basic_string_view<unsigned char>(p, n);
    }
    // The elements of an array or structured value (empty for any other).
    std::vector<value> elements() const {
        std::vector<value> out;
        uint32_t n = 0;
        cdb_value_t e;
        if (cdb_value_count(&v_, &n) != CDB_OK)
            return out;
        for (uint32_t i = 0; i < n && cdb_value_element(&v_, i, &e) == CDB_OK; i++)
            out.emplace_back(e);
        return out;
    }
    // The text cdbdump prints for it.
    std::string format() const {
        int n = cdb_format_value(&v_, nullptr, 0);
        if (n < 0)
            throw error(n);
        std::string s(size_t(n) + 1, '\0');
        cdb_format_value(&v_, s.data(), s.size());
        s.resize(size_t(n));
        return s;
    }
    const cdb_value_t &c() const { return v_; }

  private:
    template <typename T, typename F> std::optional<T> get(F f) const {
        T out;
        return f(&v_, &out) == CDB_OK ? std::optional<T>(out) : std::nullopt;
    }
    cdb_value_t v_;
};

struct valid_value {
    value low, high;
    uint16_t display_msgid;
};

inline std::vector<valid_value> valid_values_of(const cdb_valid_values_t &vv) {
    std::vector<valid_value> out;
    cdb_value_t lo, hi;
    uint16_t msg;
    for (uint32_t i = 0; cdb_valid_value_at(&vv, i, &lo, &hi, &msg) == CDB_OK; i++)
        out.push_back({value(lo), value(hi), msg});
    return out;
}

class attribute {
  public:
    explicit attribute(const cdb_attr_t &a) : a_(a) {}
    std::string_view name() const { return text(cdb_attr_name(&a_)); }
    int32_t id() const { return cdb_attr_id(&a_); }
    uint32_t data_type() const { return cdb_attr_data_type(&a_); }
    uint32_t field(int f) const { return cdb_attr_field(&a_, f); }
    std::optional<value> default_value() const {
        cdb_value_t v;
        return cdb_attr_default(&a_, &v) == CDB_OK ? std::optional<value>(value(v)) : std::nullopt;
    }
    // None when the attribute has no valid values.
    std::optional<std::vector<valid_value>> valid_values() const {
        cdb_valid_values_t vv;
        if (cdb_attr_valid_values(&a_, &vv) != CDB_OK)
            return std::nullopt;
        return valid_values_of(vv);
    }
    const cdb_attr_t &c() const { return a_; }

  private:
    cdb_attr_t a_;
};

// A class. The views taken from it point at it: keep it alive (and in place)
// while they are used.
class resource_class {
  public:
    explicit resource_class(const cdb_class_t &c) : c_(c) {}
    resource_class(const resource_class &) = delete;
    resource_class &operator=(const resource_class &) = delete;
    std::string_view name() const { return text(cdb_class_name(&c_)); }
    uint16_t id() const { return cdb_class_id(&c_); }
    uint32_t field(int f) const { return cdb_class_field(&c_, f); }
    std::optional<attribute> find_attribute(int kind, int32_t id) const {
        cdb_attr_t a;
        return cdb_find_attr(&c_, kind, id, &a) == CDB_OK ? std::optional<attribute>(attribute(a)) : std::nullopt;
    }
    std::optional<attribute> find_attribute(int kind, const std::string &name) const {
        cdb_attr_t a;
        return cdb_find_attr_by_name(&c_, kind, name.c_str(), &a) == CDB_OK ? std::optional<attribute>(attribute(a))
                                                                            : std::nullopt;
    }
    std::vector<attribute> attributes(int kind) const {
        std::vector<attribute> out;
        cdb_attr_t a;
        for (uint32_t i = 0; cdb_attr_at(&c_, kind, i, &a) != CDB_ERR_NOTFOUND; i++)
            out.emplace_back(a);
        return out;
    }
    const cdb_class_t &c() const { return c_; }

  private:
    cdb_class_t c_;
};

// An open CDB over a buffer the caller keeps.
class database {
  public:
    // Opens, throwing error on a damaged header or anchor table.
    database(const void *data, size_t size) {
        int err = cdb_open(&db_, data, size);
        if (err)
            throw error(err);
    }
    database(const database &) = delete;
    database &operator=(const database &) = delete;
    // The error code instead of an exception.
    static int try_open(const void *data, size_t size, std::optional<database> &out) {
        cdb_t probe;
        int err = cdb_open(&probe, data, size);
        if (err == CDB_OK)
            out.emplace(data, size);
        return err;
    }
    // The full check (with the overlap map); throws error with the offset of the first violation.
    void check() const {
        std::vector<unsigned char> scratch(cdb_check_scratch_size(&db_));
        size_t bad = 0;
        int err = cdb_check(&db_, scratch.data(), scratch.size(), &bad);
        if (err)
            throw error(err, bad);
    }
    uint32_t dsect_count() const { return db_.dsect_count; }
    // The class of dsect i, filled into `out`; false when dsect i is no class.
    bool class_at(uint32_t i, std::optional<resource_class> &out) const {
        cdb_class_t c;
        if (cdb_class_at(&db_, i, &c) != CDB_OK)
            return false;
        out.emplace(c);
        return true;
    }
    // The class of that name or id, filled into `out` (which its views point at).
    bool find_class(const std::string &name, std::optional<resource_class> &out) const {
        cdb_class_t c;
        if (cdb_find_class(&db_, name.c_str(), &c) != CDB_OK)
            return false;
        out.emplace(c);
        return true;
    }
    bool find_class(uint16_t id, std::optional<resource_class> &out) const {
        cdb_class_t c;
        if (cdb_find_class_by_id(&db_, id, &c) != CDB_OK)
            return false;
        out.emplace(c);
        return true;
    }
    const cdb_t &c() const { return db_; }

  private:
    cdb_t db_;
};

} // namespace qecfg::cdb

#endif
