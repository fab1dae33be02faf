// The check functions of the warnings table and what several of them share.
#ifndef QECFG_CHECK_CHECKS_H
#define QECFG_CHECK_CHECKS_H

#include <cstdint>
#include <string>
#include <vector>

#include "warnings.h"

namespace check {

// The data type a stanza's DataType names (ZU_UNKNOWN when it names none).
inline zu_data_type_t type_of(const stanza &s) { return s.data_type; }
// A 32-bit number statement as the compiler stores it (strtol, base 0).
std::uint32_t stored_identifier(const statement &st);

// Checks of the classes' parts: names, ids, locators, variable classes.
void locator(const check_input &in, std::vector<explained> &out);
void duplicate_id(const check_input &in, std::vector<explained> &out);
void duplicate_name(const check_input &in, std::vector<explained> &out);
void variable_class(const check_input &in, std::vector<explained> &out);
void variable_class_shared(const check_input &in, std::vector<explained> &out);
void unnamed_class(const check_input &in, std::vector<explained> &out);

// Checks of values: what a statement's text stores.
void default_range(const check_input &in, std::vector<explained> &out);
void file_version(const check_input &in, std::vector<explained> &out);
void number_text(const check_input &in, std::vector<explained> &out);
void permission(const check_input &in, std::vector<explained> &out);
void element_type(const check_input &in, std::vector<explained> &out);
void ignored_range(const check_input &in, std::vector<explained> &out);
void reversed_range(const check_input &in, std::vector<explained> &out);
void repeated_default(const check_input &in, std::vector<explained> &out);
void binary_text(const check_input &in, std::vector<explained> &out);

} // namespace check

#endif
