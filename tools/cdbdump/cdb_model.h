// The in-memory model of a verified CDB: what the file holds, without the
// offsets at which it is stored (those are kept only in the layout part).
#ifndef CDBDUMP_CDB_MODEL_H
#define CDBDUMP_CDB_MODEL_H

#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

namespace cdbdump {

// How the 8 bytes of a value field, or of an array or structured element, were read.
enum class value_kind {
    absent, // the none marker 0xFFFFFFFF, or a structured value of an attribute without definition
    number, // types 2 to 7: bits holds the 32- or 64-bit pattern
    raw,    // types 0, 1 and 12, which carry no decodable value: bytes holds the 8 bytes as stored
    string,
    binary, // bytes holds the data
    handle, // bytes holds the 20 bytes of the handle body as stored
    array,  // elements, each of the element type
    sd,     // elements, each with its own type
};

struct value {
    uint32_t type = 0; // zu_data_type_t the value was read as
    value_kind kind = value_kind::absent;
    uint64_t bits = 0;
    std::string text;
    std::vector<uint8_t> bytes;
    std::vector<value> elements;
};

struct variety {
    uint32_t low = 0, high = 0;
};

struct valid_value {
    value low, high;
    uint16_t display_msgid = 0;
};
using valid_values = std::vector<valid_value>;

struct sd_element {
    std::string name;
    uint32_t type = 0;
    uint16_t display_msgid = 0, description_msgid = 0;
    std::optional<valid_values> vv;
    uint32_t action_id = 0;
    uint16_t valid_type = 0;
};
using sd_definition = std::vector<sd_element>;

// Fields shared by persistent and dynamic attributes.
struct attr_common {
    bool of_class = false;
    uint32_t props = 0;
    std::string name;
    uint16_t description_msgid = 0, display_msgid = 0, group_msgid = 0, group_id = 0;
    int32_t id = 0;
    uint32_t data_type = 0;
    std::vector<variety> varieties;
    std::optional<valid_values> vv;
    std::optional<sd_definition> sd;
    uint16_t max_sd_idx = 0;
};

struct pattr : attr_common {
    value dflt;
};

struct dattr : attr_common {
    value init, min, max; // min and max of a numeric array type are arrays or plain numbers
    std::optional<std::string> expression, rearm_expression;
    uint32_t var_type = 0;
    uint16_t expr_desc = 0, rearm_desc = 0, range_desc = 0;
};

struct action {
    bool of_class = false;
    int32_t id = 0;
    uint32_t props = 0;
    uint16_t description_msgid = 0, display_msgid = 0, confirm_msgid = 0, timeout = 0;
    uint32_t perms = 0;
    std::string name;
    std::vector<variety> varieties;
    std::optional<sd_definition> sd_input, sd_response;
};

struct class_dsect {
    uint32_t props = 0;
    std::string name;
    std::optional<std::string> alias;
    std::optional<sd_definition> define_sd, undefine_sd, online_sd, offline_sd, reset_sd;
    std::vector<pattr> pattrs_class, pattrs;
    std::vector<dattr> dattrs_class, dattrs;
    std::vector<action> actions_class, actions;
    uint32_t perm_temp = 0, perm_temp_class = 0;
    uint16_t class_id = 0, description_msgid = 0, display_msgid = 0, locator = 0;
    uint32_t version = 0;
};

struct mgr_dsect {
    uint16_t id = 0;
    std::string name;
};

struct map_dsect {
    uint16_t class_id = 0, rm_id = 0;
    std::optional<std::string> message_catalog; // none without a MessageCatalog statement
    uint16_t dscr_msg_set = 0, first_key = 0, last_key = 0, asnno_start = 0;
    uint16_t num_sctx = 0, num_vctx = 0, num_stats = 0, num_ctx_tmplts = 0;
    uint32_t static_contexts = 0, volatile_contexts = 0, stats = 0, ctx_tmplts = 0;
};

struct var_class_dsect {
    uint16_t obsv_interval = 0, report_interval = 0;
    std::optional<std::string> name; // none without a VariableClass statement
    std::optional<std::string> alias;
    std::vector<uint32_t> var_ids;
};

using dsect = std::variant<class_dsect, mgr_dsect, map_dsect, var_class_dsect>;

struct anchor {
    uint32_t type = 0, offset = 0, length = 0, revision = 0;
};

// The record sizes of the header, in header order.
constexpr int NUM_RECORD_SIZES = 9;
extern const uint16_t record_sizes[NUM_RECORD_SIZES];

struct cdb_file {
    bool big_endian = false;
    uint32_t length = 0, checksum = 0, seqno = 0, tv_sec = 0, tv_usec = 0;
    uint16_t max_rm_id = 0, max_class_id = 0;
    uint16_t record_sizes[NUM_RECORD_SIZES] = {};
    std::vector<anchor> anchors;
    std::vector<dsect> dsects; // one per anchor, same order
};

} // namespace cdbdump

#endif
