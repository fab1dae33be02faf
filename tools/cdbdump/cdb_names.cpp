#include "cdb_names.h"

#include <array>

#include "cdb.h"

namespace cdbdump {

namespace {
// The permission letters as one-letter keywords.
constexpr auto perm_letter_list = [] {
    std::array<props_t, num_perm_list> a{};
    for (int i = 0; i < num_perm_list; i++)
        a[i] = props_t{{perm_list[i].permission, '\0'}, perm_list[i].mask};
    return a;
}();
} // namespace

const prop_table class_props{rc_props, rc_props_cnt};
const prop_table pattr_props{pa_props, pa_props_cnt};
const prop_table dattr_props{da_props, da_props_cnt};
const prop_table action_props{act_props, act_props_cnt};
const prop_table perm_letters{perm_letter_list.data(), num_perm_list};

std::vector<std::string> prop_names(const prop_table &t, uint32_t bits) {
    std::vector<std::string> names;
    for (int i = 0; i < t.count; i++)
        if (bits & t.entries[i].p)
            names.emplace_back(t.entries[i].s);
    return names;
}

uint32_t unnamed_bits(const prop_table &t, uint32_t bits) {
    for (int i = 0; i < t.count; i++)
        bits &= ~t.entries[i].p;
    return bits;
}

std::string data_type_name(uint32_t dt) {
    return dt < ZU_NUM_DATA_TYPES ? zuTypeStr[dt] : "type " + std::to_string(dt);
}

std::string var_type_name(uint32_t vt) {
    return vt < QEL_NUM_VARIABLE_TYPES ? zuVarStr[vt] : "type " + std::to_string(vt);
}

std::string dsect_kind_name(uint32_t type) {
    switch (type) {
    case CDB_DSECT_CLASS: return "class";
    case CDB_DSECT_RSRC_MGR: return "manager";
    case CDB_DSECT_CMMAP: return "map";
    case CDB_DSECT_VAR_CLASS: return "variable_class";
    default: return "type " + std::to_string(type);
    }
}

} // namespace cdbdump
