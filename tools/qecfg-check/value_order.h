// Numeric values of the source as the compiler converts them, and their
// order, for the warnings that compare values with ranges.
#ifndef QECFG_CHECK_VALUE_ORDER_H
#define QECFG_CHECK_VALUE_ORDER_H

#include <optional>
#include <string>

#include "lang.h"

namespace check {

// A converted number of one of the numeric types.
class number {
  public:
    number(zu_data_type_t type, const zu_value_t &v, std::string text);
    bool unordered() const; // a NaN
    bool less(const number &o) const;
    const std::string &text() const { return text_; }

  private:
    enum { SIGNED, UNSIGNED, FLOATING } kind_;
    long long s_ = 0;
    unsigned long long u_ = 0;
    double f_ = 0;
    std::string text_;
};

struct value_range {
    number low, high;
    // A range with a NaN end holds no value: every comparison with it fails.
    bool has_nan_end() const { return low.unordered() || high.unordered(); }
    bool holds(const number &n) const { return !has_nan_end() && !n.less(low) && !high.less(n); }
    bool reversed() const { return high.less(low); }
};

// Converts like the compiler; nothing for text it refuses or a type that is
// not numeric.
std::optional<number> parse_number(zu_data_type_t type, const std::string &text);
// "low,high", or a single value for both ends unless `pair_only`.
std::optional<value_range> parse_range(zu_data_type_t type, const std::string &text, bool pair_only);

// How the compiler stores what it reads: a FileVersion as a.b.c.d, and the
// number of a statement of a number kind.
std::string version_text(const std::string &text);
std::string stored_number(lang::value_kind kind, const std::string &text);

} // namespace check

#endif
