// Small text helpers shared by the reader's labels and the printers.
#ifndef CDBDUMP_CDB_TEXT_H
#define CDBDUMP_CDB_TEXT_H

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace cdbdump {

std::string hex(uint64_t v);                        // 0x2a
std::string hexdec(uint64_t v);                     // 0x2a (42)
std::string hex_digits(const uint8_t *p, size_t n); // 00ff10, no prefix
std::string c_quote(const std::string &s);          // "a\tb", with C escapes
// "a\tb", with JSON escapes; always UTF-8: a byte that is not part of a
// well-formed UTF-8 sequence becomes the private-use character
// JSON_BYTE_ESCAPE_BASE + byte (U+F780 to U+F7FF), written as an escape.
std::string json_quote(const std::string &s);
constexpr unsigned JSON_BYTE_ESCAPE_BASE = 0xf700;
// hex, hex_digits, c_quote and json_quote appended to out.
void append_hex(std::string &out, uint64_t v);
void append_hex_digits(std::string &out, const uint8_t *p, size_t n);
void append_c_quoted(std::string &out, std::string_view s);
void append_json_quoted(std::string &out, std::string_view s);
// The float text that reads back to the same bits: %.9g / %.17g, inf, nan.
std::string float32_text(uint32_t bits);
std::string float64_text(uint64_t bits);
// A number of data type 2 to 7 from its 32- or 64-bit pattern.
std::string number_text(uint32_t type, uint64_t bits);
// A version word as its four dotted parts.
std::string version_text(uint32_t v);

} // namespace cdbdump

#endif
