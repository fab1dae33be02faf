// How value text is written so that the compiler's reader and value
// conversion give back exactly the bytes the file holds.
#include <cerrno>
#include <cfloat>
#include <cmath>
#include <cstdlib>
#include <cstring>

#include "cdb_format.h"
#include "cdb_source.h"
#include "cdb_text.h"

namespace cdbdump {

namespace {
// The reader takes at most 254 characters per read, newline included.
constexpr size_t MAX_LINE = 253;
constexpr size_t MAX_VALUE = QECFG_MAX_VALUE_LEN;

bool blank(char c) { return c == ' ' || c == '\t'; }

// The part of a line that survives comment removal and the trailing strip, or
// nothing for a line the reader ignores.
std::optional<std::string> uncommented(const std::string &line) {
    size_t end = line.size();
    int non_blank = 0, quotes = 2;
    for (size_t i = 0; i < line.size(); i++) {
        char c = line[i];
        bool inside = quotes % 2 == 1;
        if (blank(c))
            continue;
        if (c == '\n') {
            end = i;
            break;
        }
        if (c == '"') {
            quotes++;
            continue;
        }
        bool comment_slash = c == '/' && i + 1 < line.size() && (line[i + 1] == '/' || line[i + 1] == '*');
        if (c == '#' || comment_slash) {
            // A '#' before any text makes a comment line even inside quotes; a slash pair does not.
            if (non_blank == 0 && (c == '#' || !inside))
                return std::nullopt;
            if (inside) {
                if (c == '#')
                    non_blank++;
                continue;
            }
            end = i;
            break;
        }
        non_blank++;
    }
    if (non_blank == 0)
        return std::nullopt;
    std::string s = line.substr(0, end);
    while (!s.empty() && (blank(s.back()) || s.back() == '#'))
        s.pop_back();
    return s;
}

// The quote removal of a statement value; nothing for unmatched quotes.
std::optional<std::string> unquoted(const std::string &v) {
    size_t q = v.find_first_not_of(" \t");
    if (q == std::string::npos || v[q] != '"')
        return v;
    if (v.back() != '"' || (v.size() >= 2 && v[v.size() - 2] == '\\'))
        return std::nullopt;
    size_t last = v.size() - 1;
    return last > q ? v.substr(q + 1, last - q - 1) : std::string();
}

bool printable_in_escape_form(uint8_t b, bool first, bool last) {
    if (b < 0x20 || b > 0x7e)
        return false;
    if (b == '"' || b == '#' || b == '/' || b == ',' || b == '\\')
        return false; // comment, quote, value separators
    if (first && b == '0')
        return false; // a leading 0 selects the hexadecimal form
    if (last && b == ' ')
        return false; // trailing blanks are stripped from the line
    return true;
}
} // namespace

std::optional<std::string> statement_value(const std::string &line) {
    if (line.size() > MAX_LINE)
        return std::nullopt;
    auto s = uncommented(line);
    if (!s || s->empty() || !blank((*s)[0]))
        return std::nullopt;
    size_t name = s->find_first_not_of(" \t");
    size_t eq = name == std::string::npos ? std::string::npos : s->find('=', name);
    if (eq == std::string::npos)
        return std::nullopt;
    std::string v = s->substr(eq + 1);
    if (v == "\"\"")
        return std::nullopt; // the statement is ignored
    auto value = unquoted(v);
    if (!value || value->empty() || value->size() > MAX_VALUE)
        return std::nullopt;
    return value;
}

std::optional<std::string> statement_line(const std::string &name, const std::string &text) {
    for (const std::string &form : {text, "\"" + text + "\""}) {
        std::string line = "\t" + name + "=" + form;
        auto back = statement_value(line);
        if (back && *back == text)
            return line;
    }
    return std::nullopt;
}

std::string binary_text(const std::vector<uint8_t> &bytes) {
    std::string hexform = "0x" + hex_digits(bytes.data(), bytes.size());
    if (bytes.empty())
        return hexform;
    std::string esc;
    for (size_t i = 0; i < bytes.size(); i++) {
        uint8_t b = bytes[i];
        if (b == '\\') {
            esc += "\\\\";
        } else if (printable_in_escape_form(b, i == 0, i + 1 == bytes.size())) {
            esc += char(b);
        } else {
            char buf[8];
            std::snprintf(buf, sizeof buf, "\\%03o", b);
            esc += buf;
        }
    }
    return esc.size() < hexform.size() ? esc : hexform;
}

namespace {
// The float conversion's refusal: a range error whose result is zero, positive
// infinity, the largest finite or the smallest normal value.
template <typename F> bool refused(F v, F max, F min) {
    return errno == ERANGE && (v == 0 || (std::isinf(v) && v > 0) || v == max || v == min);
}

template <typename F, typename B> bool reads_back(const std::string &text, B bits) {
    errno = 0;
    char *end = nullptr;
    F v;
    if constexpr (sizeof(F) == 4) {
        v = std::strtof(text.c_str(), &end);
        if (refused<float>(v, FLT_MAX, FLT_MIN))
            return false;
    } else {
        v = std::strtod(text.c_str(), &end);
        if (refused<double>(v, DBL_MAX, DBL_MIN))
            return false;
    }
    B got;
    std::memcpy(&got, &v, sizeof got);
    return *end == 0 && got == bits;
}
} // namespace

namespace {
// A quiet NaN with a payload, in the form nan(0x...) that the conversion reads
// back with its payload and sign; it always sets the quiet bit, so a
// signalling NaN has no text.
template <typename F, typename B> std::optional<std::string> nan_text(B bits) {
    constexpr int mantissa_bits = sizeof(F) == 4 ? 23 : 52;
    constexpr B quiet = B(1) << (mantissa_bits - 1), payload = quiet - 1;
    std::string text = std::string(bits >> (8 * sizeof(B) - 1) ? "-" : "") + "nan(" + hex(bits & payload) + ")";
    return reads_back<F>(text, bits) ? std::optional<std::string>(text) : std::nullopt;
}

template <typename F, typename B> std::optional<std::string> float_source_text(const std::string &text, B bits) {
    if (reads_back<F>(text, bits))
        return text;
    F f;
    std::memcpy(&f, &bits, sizeof f);
    return std::isnan(f) ? nan_text<F>(bits) : std::nullopt;
}
} // namespace

std::optional<std::string> number_source_text(uint32_t type, uint64_t bits) {
    std::string text = number_text(type, bits);
    if (type == 6)
        return float_source_text<float>(text, uint32_t(bits));
    if (type == 7)
        return float_source_text<double>(text, bits);
    return text;
}

} // namespace cdbdump
