// The reader's C++ layer needs no more than C++17: this file includes it and
// uses it under -std=c++17 (the build fails otherwise).
#include "qecfg/cdb_reader.hpp"

std::string_view cpp17_header_type_name(uint32_t type) { return qecfg::cdb::text(cdb_data_type_name(type)); }
