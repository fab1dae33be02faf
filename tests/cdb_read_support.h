// A compiled image read back through libcdb, as a service reads it: opened
// and fully checked first (checksum, identifier words, bounds, types), so a
// test sees only what a valid CDB holds, then read through the accessors.
#ifndef CDB_READ_SUPPORT_H
#define CDB_READ_SUPPORT_H

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "qecfg/cdb_reader.h"

class read_cdb {
  public:
    explicit read_cdb(std::string image) : image_(std::move(image)) {
        if ((error_ = cdb_open(&db_, image_.data(), image_.size())) != CDB_OK)
            return;
        std::vector<unsigned char> scratch(cdb_check_scratch_size(&db_));
        if ((error_ = cdb_check(&db_, scratch.data(), scratch.size(), &bad_offset_)) != CDB_OK)
            return;
        int first = cdb_find_dsect(&db_, CDB_CLASS_DSECT, 0);
        error_ = first < 0 ? first : cdb_class_at(&db_, uint32_t(first), &class_);
    }
    // The handles point into this object.
    read_cdb(const read_cdb &) = delete;
    read_cdb &operator=(const read_cdb &) = delete;

    // Whether the image opened, passed the full check and has a class.
    testing::AssertionResult valid() const {
        if (error_ == CDB_OK)
            return testing::AssertionSuccess();
        testing::AssertionResult failure = testing::AssertionFailure() << cdb_strerror(error_);
        if (bad_offset_ != NO_OFFSET)
            failure << " (first violation at offset " << bad_offset_ << ")";
        return failure;
    }
    const cdb_t &db() const { return db_; }
    // The first class of the file.
    const cdb_class_t &cls() const { return class_; }

    // Record i of an attribute kind or of the (class) actions of the first
    // class of a valid image.
    testing::AssertionResult attr(int kind, uint32_t i, cdb_attr_t &a) const {
        return error_ != CDB_OK ? valid() : found(cdb_attr_at(&class_, kind, i, &a), "attribute", i);
    }
    testing::AssertionResult action(int of_class, uint32_t i, cdb_action_t &x) const {
        return error_ != CDB_OK ? valid() : found(cdb_action_at(&class_, of_class, i, &x), "action", i);
    }

  private:
    static testing::AssertionResult found(int err, const char *what, uint32_t i) {
        if (err == CDB_OK)
            return testing::AssertionSuccess();
        return testing::AssertionFailure() << what << " " << i << ": " << cdb_strerror(err);
    }

    std::string image_;
    cdb_t db_{};
    cdb_class_t class_{};
    int error_ = CDB_OK;
    static constexpr size_t NO_OFFSET = ~size_t(0);
    size_t bad_offset_ = NO_OFFSET; // set by a failed full check
};

// A text of the file, or a mark for one the reader could not give.
inline std::string text_or_none(const char *s) { return s ? s : "<none>"; }

// A value as cdbdump prints it ("5", "\"text\"", "[1, 2]"), or the error.
inline std::string text_of(const cdb_value_t &v) {
    int n = cdb_format_value(&v, nullptr, 0);
    if (n < 0)
        return std::string("<") + cdb_strerror(n) + ">";
    std::string s(size_t(n) + 1, '\0');
    cdb_format_value(&v, s.data(), s.size());
    s.resize(size_t(n));
    return s;
}

// The elements of an array or structured value, each as text.
inline std::vector<std::string> elements_of(const cdb_value_t &v) {
    std::vector<std::string> out;
    uint32_t count = 0;
    cdb_value_t e;
    if (cdb_value_count(&v, &count) == CDB_OK)
        for (uint32_t i = 0; i < count && cdb_value_element(&v, i, &e) == CDB_OK; i++)
            out.push_back(text_of(e));
    return out;
}

using variety_list = std::vector<std::pair<uint32_t, uint32_t>>;
inline variety_list varieties_of(const cdb_attr_t &a) {
    variety_list out;
    cdb_varieties_t v;
    uint32_t low, high;
    if (cdb_attr_varieties(&a, &v) == CDB_OK)
        for (uint32_t i = 0; cdb_variety_at(&v, i, &low, &high) == CDB_OK; i++)
            out.emplace_back(low, high);
    return out;
}

// Each valid value as its low and high ends in text and its display message.
using valid_list = std::vector<std::tuple<std::string, std::string, uint16_t>>;
inline valid_list valid_values_of(const cdb_attr_t &a) {
    valid_list out;
    cdb_valid_values_t vv;
    cdb_value_t low, high;
    uint16_t msg;
    if (cdb_attr_valid_values(&a, &vv) == CDB_OK)
        for (uint32_t i = 0; cdb_valid_value_at(&vv, i, &low, &high, &msg) == CDB_OK; i++)
            out.emplace_back(text_of(low), text_of(high), msg);
    return out;
}

inline std::string default_of(const cdb_attr_t &a) {
    cdb_value_t v;
    int err = cdb_attr_default(&a, &v);
    return err == CDB_OK ? text_of(v) : std::string("<") + cdb_strerror(err) + ">";
}

#endif
