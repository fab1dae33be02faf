#include "cdb_text.h"

#include <charconv>
#include <cmath>
#include <cstdio>
#include <cstring>

namespace cdbdump {

namespace {
const char hex_chars[] = "0123456789abcdef";
}

void append_hex(std::string &out, uint64_t v) {
    char buf[16];
    size_t n = 0;
    do {
        buf[sizeof buf - ++n] = hex_chars[v & 15];
        v >>= 4;
    } while (v);
    out += "0x";
    out.append(buf + sizeof buf - n, n);
}

std::string hex(uint64_t v) {
    std::string s;
    append_hex(s, v);
    return s;
}

std::string hexdec(uint64_t v) { return hex(v) + " (" + std::to_string(v) + ")"; }

void append_hex_digits(std::string &out, const uint8_t *p, size_t n) {
    size_t at = out.size();
    out.resize(at + 2 * n);
    for (size_t i = 0; i < n; i++) {
        out[at + 2 * i] = hex_chars[p[i] >> 4];
        out[at + 2 * i + 1] = hex_chars[p[i] & 15];
    }
}

std::string hex_digits(const uint8_t *p, size_t n) {
    std::string s;
    append_hex_digits(s, p, n);
    return s;
}

namespace {
// The length of the well-formed UTF-8 sequence at p (n bytes left), 0 when
// there is none: no overlong forms, no surrogates, nothing above U+10FFFF.
size_t utf8_length(const unsigned char *p, size_t n) {
    unsigned char c = p[0];
    size_t len = c >= 0xf0 ? 4 : c >= 0xe0 ? 3 : 2;
    if (c < 0xc2 || c > 0xf4 || len > n)
        return 0;
    for (size_t i = 1; i < len; i++)
        if ((p[i] & 0xc0) != 0x80)
            return 0;
    unsigned char second = p[1];
    if ((c == 0xe0 && second < 0xa0) || (c == 0xed && second > 0x9f) || (c == 0xf0 && second < 0x90) ||
        (c == 0xf4 && second > 0x8f))
        return 0;
    return len;
}

// Escapes shared by both quoting styles; the rest differs in how a control
// byte is spelled and in whether bytes from 0x80 up must form UTF-8.
void quote_with(std::string &out, std::string_view s, const char *control_fmt, bool utf8_only) {
    out += '"';
    const auto *p = reinterpret_cast<const unsigned char *>(s.data());
    for (size_t i = 0; i < s.size(); i++) {
        unsigned char c = p[i];
        switch (c) {
        case '"': out += "\\\""; break;
        case '\\': out += "\\\\"; break;
        case '\n': out += "\\n"; break;
        case '\t': out += "\\t"; break;
        case '\r': out += "\\r"; break;
        default:
            if (c < 0x20 || c == 0x7f) {
                char buf[8];
                std::snprintf(buf, sizeof buf, control_fmt, c);
                out += buf;
            } else if (c < 0x80 || !utf8_only) {
                out += char(c);
            } else if (size_t len = utf8_length(p + i, s.size() - i)) {
                out.append(s, i, len);
                i += len - 1;
            } else {
                char buf[8];
                std::snprintf(buf, sizeof buf, "\\u%04x", JSON_BYTE_ESCAPE_BASE + c);
                out += buf;
            }
        }
    }
    out += '"';
}
} // namespace

void append_c_quoted(std::string &out, std::string_view s) { quote_with(out, s, "\\x%02x", false); }

void append_json_quoted(std::string &out, std::string_view s) { quote_with(out, s, "\\u%04x", true); }

std::string c_quote(const std::string &s) {
    std::string out;
    append_c_quoted(out, s);
    return out;
}

std::string json_quote(const std::string &s) {
    std::string out;
    append_json_quoted(out, s);
    return out;
}

namespace {
template <typename F> std::string special_float(F f) {
    if (std::isnan(f))
        return std::signbit(f) ? "-nan" : "nan";
    return std::signbit(f) ? "-inf" : "inf";
}
} // namespace

std::string float32_text(uint32_t bits) {
    float f;
    std::memcpy(&f, &bits, sizeof f);
    if (!std::isfinite(f))
        return special_float(f);
    char buf[48];
    // As %.9g would write it.
    return std::string(buf, std::to_chars(buf, buf + sizeof buf, double(f), std::chars_format::general, 9).ptr);
}

std::string float64_text(uint64_t bits) {
    double d;
    std::memcpy(&d, &bits, sizeof d);
    if (!std::isfinite(d))
        return special_float(d);
    char buf[48];
    // As %.17g would write it.
    return std::string(buf, std::to_chars(buf, buf + sizeof buf, d, std::chars_format::general, 17).ptr);
}

std::string number_text(uint32_t type, uint64_t bits) {
    switch (type) {
    case 2: return std::to_string(int32_t(uint32_t(bits)));
    case 3: return std::to_string(uint32_t(bits));
    case 4: return std::to_string(int64_t(bits));
    case 5: return std::to_string(bits);
    case 6: return float32_text(uint32_t(bits));
    default: return float64_text(bits);
    }
}

std::string version_text(uint32_t v) {
    return std::to_string(v >> 24) + "." + std::to_string((v >> 16) & 0xff) + "." + std::to_string((v >> 8) & 0xff) +
           "." + std::to_string(v & 0xff);
}

} // namespace cdbdump
