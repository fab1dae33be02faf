// Numbers of the source compared as the compiler stores them.
#include "value_order.h"

#include <cmath>
#include <cstdint>
#include <cstdlib>

namespace check {

number::number(zu_data_type_t type, const zu_value_t &v, std::string text) : text_(std::move(text)) {
    switch (type) {
    case ZU_INT32: kind_ = SIGNED, s_ = v.val_int32; break;
    case ZU_INT64: kind_ = SIGNED, s_ = v.val_int64; break;
    case ZU_UINT32: kind_ = UNSIGNED, u_ = v.val_uint32; break;
    case ZU_UINT64: kind_ = UNSIGNED, u_ = v.val_uint64; break;
    case ZU_FLOAT32: kind_ = FLOATING, f_ = v.val_float32; break;
    default: kind_ = FLOATING, f_ = v.val_float64; break;
    }
}

bool number::unordered() const { return kind_ == FLOATING && std::isnan(f_); }

bool number::less(const number &o) const {
    switch (kind_) {
    case SIGNED: return s_ < o.s_;
    case UNSIGNED: return u_ < o.u_;
    default: return f_ < o.f_;
    }
}

std::optional<number> parse_number(zu_data_type_t type, const std::string &text) {
    zu_value_t v{};
    if (!zu_is_numeric_type(type) || !lang::value_converts(type, text, &v))
        return std::nullopt;
    return number(type, v, text);
}

std::optional<value_range> parse_range(zu_data_type_t type, const std::string &text, bool pair_only) {
    size_t comma = text.find(',');
    if (comma == std::string::npos && pair_only)
        return std::nullopt;
    std::optional<number> low = parse_number(type, text.substr(0, comma));
    std::optional<number> high = comma == std::string::npos ? low : parse_number(type, text.substr(comma + 1));
    if (!low || !high)
        return std::nullopt;
    return value_range{*low, *high};
}

std::string version_text(const std::string &text) {
    uint32_t n = lang::version_number(text);
    return std::to_string(n >> 24) + "." + std::to_string((n >> 16) & 0xFF) + "." + std::to_string((n >> 8) & 0xFF) +
           "." + std::to_string(n & 0xFF);
}

namespace {

// A statement's number: strtol with base 0, truncated to the field.
std::string truncated(const std::string &text, bool wide) {
    long v = std::strtol(text.c_str(), nullptr, 0);
    return wide ? std::to_string(uint32_t(v)) : std::to_string(uint16_t(v));
}

} // namespace

std::string stored_number(lang::value_kind kind, const std::string &text) {
    if (kind != lang::value_kind::variety)
        return truncated(text, kind == lang::value_kind::identifier);
    size_t comma = text.find(',');
    return truncated(text.substr(0, comma), true) + "," + truncated(text.substr(comma + 1), true);
}

} // namespace check
