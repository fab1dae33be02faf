// Conversion of value text into typed values: data type and variable type
// names, numbers, strings and binaries, property lists, version numbers and
// the quotes around a value.
#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "qecfg_fatal.h"
#include "qecfg_value.h"

namespace {

// The binary form code of oct_convert.
constexpr int OCT_FORM_BINARY = 2;

// At most this many characters after a backslash make up an octal escape.
constexpr size_t OCT_ESCAPE_MAX_DIGITS = 3;

// A conversion is usable only when it read something and stopped at the end
// of the text: trailing blanks are refused like any other leftover.
bool consumed_whole(const char *s, const char *end) { return end != s && *end == '\0'; }

int convert_int32(const char *s, zu_value_t *out) {
    char *end = nullptr;
    errno = 0;
    long v = std::strtol(s, &end, 10);
    if (errno == ERANGE || !consumed_whole(s, end) || v < std::numeric_limits<zu_int32_t>::min() ||
        v > std::numeric_limits<zu_int32_t>::max())
        return -1;
    out->val_int32 = static_cast<zu_int32_t>(v);
    return 0;
}

// A 32-bit unsigned conversion: the digits must fit in 32 bits; a minus sign
// negates modulo 2^32.
int convert_uint32(const char *s, zu_value_t *out) {
    char *end = nullptr;
    errno = 0;
    unsigned long long v = std::strtoull(s, &end, 10);
    if (errno == ERANGE || !consumed_whole(s, end))
        return -1;
    const char *sign = s;
    while (std::isspace(static_cast<unsigned char>(*sign)))
        ++sign;
    unsigned long long magnitude = *sign == '-' ? 0ULL - v : v;
    if (magnitude > std::numeric_limits<zu_uint32_t>::max())
        return -1;
    out->val_uint32 = static_cast<zu_uint32_t>(v);
    return 0;
}

int convert_int64(const char *s, zu_value_t *out) {
    char *end = nullptr;
    errno = 0;
    long long v = std::strtoll(s, &end, 10);
    if (errno == ERANGE || !consumed_whole(s, end))
        return -1;
    out->val_int64 = static_cast<zu_int64_t>(v);
    return 0;
}

int convert_uint64(const char *s, zu_value_t *out) {
    char *end = nullptr;
    errno = 0;
    unsigned long long v = std::strtoull(s, &end, 10);
    if (errno == ERANGE || !consumed_whole(s, end))
        return -1;
    out->val_uint64 = static_cast<zu_uint64_t>(v);
    return 0;
}

// The results by which a range error shows positive overflow or complete
// underflow; negative overflow and subnormal results are kept.
template <typename T> bool float_range_refused(T v) {
    using lim = std::numeric_limits<T>;
    return v == 0 || v == lim::infinity() || v == lim::max() || v == lim::min();
}

int convert_float32(const char *s, zu_value_t *out) {
    char *end = nullptr;
    errno = 0;
    float v = std::strtof(s, &end);
    if (!consumed_whole(s, end) || (errno == ERANGE && float_range_refused(v)))
        return -1;
    out->val_float32 = v;
    return 0;
}

int convert_float64(const char *s, zu_value_t *out) {
    char *end = nullptr;
    errno = 0;
    double v = std::strtod(s, &end);
    if (!consumed_whole(s, end) || (errno == ERANGE && float_range_refused(v)))
        return -1;
    out->val_float64 = v;
    return 0;
}

int hex_nibble(char c) {
    if (c >= '0' && c <= '9')
        return c - '0';
    if (c >= 'a' && c <= 'f')
        return c - 'a' + 10;
    if (c >= 'A' && c <= 'F')
        return c - 'A' + 10;
    return -1;
}

// The length word leads the image; the bytes start right after it.
char *binary_data(char *image) { return image + offsetof(zu_binary_t, data); }
void set_binary_length(char *image, size_t n) { store<zu_uint32_t>(image, static_cast<zu_uint32_t>(n)); }

// Reads the octal escape that follows a backslash at *p, advancing *p past
// the characters it used. Returns the byte value, or -1 when there is no
// octal digit or the value does not fit in a byte.
int read_oct_escape(const char **p) {
    char digits[OCT_ESCAPE_MAX_DIGITS + 1] = {};
    size_t n = 0;
    while (n < OCT_ESCAPE_MAX_DIGITS && (*p)[n] != '\0') {
        digits[n] = (*p)[n];
        ++n;
    }
    char *end = nullptr;
    long v = std::strtol(digits, &end, 8);
    if (end == digits || v > 255)
        return -1;
    *p += end - digits;
    return static_cast<int>(v & 0xFF);
}

// Length of the part of a version text that starts at s: up to the next dot
// or the end.
size_t version_part_len(const char *s) { return std::strcspn(s, "."); }

} // namespace

zu_data_type_t strToZuDt(const char *s) {
    if (!s)
        return ZU_UNKNOWN;
    for (unsigned i = 0; i < ZU_NUM_DATA_TYPES; ++i)
        if (s[0] == zuTypeStr[i][0] && std::strcmp(s, zuTypeStr[i]) == 0)
            return static_cast<zu_data_type_t>(i);
    return ZU_UNKNOWN;
}

int strToVar(const char *s, qel_variable_type_t *t) {
    if (!s)
        return 1;
    for (unsigned i = 0; i < QEL_NUM_VARIABLE_TYPES; ++i) {
        if (std::strcmp(s, zuVarStr[i]) == 0) {
            *t = static_cast<qel_variable_type_t>(i);
            return 0;
        }
    }
    return 1;
}

zu_data_type_t scalar_zu(zu_data_type_t dt) { return zu_data_type_t(zu_element_type(dt)); }

char *strip_quotes(char *s) {
    if (!s)
        return nullptr;
    char *open = s;
    while (*open == ' ' || *open == '\t')
        ++open;
    if (*open != '"')
        return s;
    size_t len = std::strlen(open);
    // A lone quote is both the opening and the closing one.
    if (len >= 2 && (open[len - 1] != '"' || open[len - 2] == '\\'))
        return nullptr;
    open[len - 1] = '\0';
    return open + 1;
}

int ver_str_convert(const char *ver_str, uint32_t *n) {
    // strtoul stops at the dot that ends a part, so each part converts in place.
    uint32_t part[4] = {};
    const char *p = ver_str;
    for (int i = 0; i < 4; ++i) {
        part[i] = static_cast<uint32_t>(std::strtoul(p, nullptr, 10));
        p += version_part_len(p);
        if (*p == '\0')
            break;
        ++p;
    }
    *n = (part[0] << 24) | ((part[1] & 0xFF) << 16) | ((part[2] & 0xFF) << 8) | part[3];
    return 0;
}

int hex_convert(char *zu_out, const char *str_in) {
    if (!str_in || str_in[0] != '0' || str_in[1] != 'x')
        return -1;
    size_t len = std::strlen(str_in);
    if (len % 2 != 0)
        return -1;
    char *data = binary_data(zu_out);
    size_t count = 0;
    for (const char *d = str_in + 2; *d != '\0'; d += 2) {
        int hi = hex_nibble(d[0]);
        int lo = hex_nibble(d[1]);
        if (hi < 0 || lo < 0)
            return -1;
        data[count++] = static_cast<char>((hi << 4) | lo);
    }
    set_binary_length(zu_out, count);
    return 0;
}

int oct_convert(const char *p, int type, char *out_buf) {
    if (!p || type != OCT_FORM_BINARY)
        return -1;
    char *data = binary_data(out_buf);
    size_t count = 0;
    while (*p != '\0') {
        if (*p != '\\') {
            data[count++] = *p++;
        } else if (p[1] == '\\') {
            data[count++] = '\\';
            p += 2;
        } else {
            ++p;
            int byte = read_oct_escape(&p);
            if (byte < 0)
                return -1;
            data[count++] = static_cast<char>(byte);
        }
    }
    set_binary_length(out_buf, count);
    return 0;
}

int str_to_zu(table_arena &arena, zu_value_t *zu_out, zu_data_type_t zu_type, const char *str_in) {
    if (!str_in || *str_in == '\0')
        return -1;
    switch (scalar_zu(zu_type)) {
    case ZU_INT32: return convert_int32(str_in, zu_out);
    case ZU_UINT32: return convert_uint32(str_in, zu_out);
    case ZU_INT64: return convert_int64(str_in, zu_out);
    case ZU_UINT64: return convert_uint64(str_in, zu_out);
    case ZU_FLOAT32: return convert_float32(str_in, zu_out);
    case ZU_FLOAT64: return convert_float64(str_in, zu_out);
    case ZU_CHAR_PTR: {
        size_t size = std::strlen(str_in) + 1;
        zu_out->ptr_char = static_cast<char *>(std::memcpy(arena.cfg_malloc(size), str_in, size));
        return 0;
    }
    case ZU_BINARY_PTR: {
        if (str_in[0] == '0' && str_in[1] != 'x')
            return -1;
        char *image = static_cast<char *>(arena.cfg_malloc(binary_image_size(std::strlen(str_in))));
        int rc = str_in[0] == '0' ? hex_convert(image, str_in) : oct_convert(str_in, OCT_FORM_BINARY, image);
        if (rc != 0)
            return -1;
        zu_out->ptr_binary = reinterpret_cast<zu_binary_t *>(image);
        return 0;
    }
    default: return -1;
    }
}

void set_props(uint32_t *dest, const props_t *props, int len, char *vnoq) {
    if (!vnoq)
        return;
    char *save = nullptr;
    for (char *name = strtok_r(vnoq, ",", &save); name; name = strtok_r(nullptr, ",", &save)) {
        const props_t *found = nullptr;
        for (int i = 0; i < len && !found; ++i)
            if (std::strcmp(name, props[i].s) == 0)
                found = &props[i];
        if (!found)
            raise_fatal(msg::invalid_property, 0, {name});
        *dest |= found->p;
    }
}
