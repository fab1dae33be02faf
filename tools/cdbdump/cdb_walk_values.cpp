// Variety lists, valid-value lists, structured-data definitions and the
// typed values with their bodies in the class string table.
#include <algorithm>

#include "cdb.h"
#include "cdb_names.h"
#include "cdb_walker.h"

namespace cdbdump {

namespace {
std::string item(const std::string &field, size_t i) { return field + "[" + std::to_string(i) + "]"; }
} // namespace

std::optional<size_t> walker::list_at(size_t at, const region &r, size_t entry, uint32_t id, const std::string &field,
                                      bool none_allowed, const char *prefix, uint32_t &count) {
    count = 0;
    uint32_t off = ref(at, field);
    if (off == CDB_NONE) {
        emit(at, 8, field, "none");
        check(none_allowed, at, field + " holds the none marker but must designate a list in " + r.name);
        return std::nullopt;
    }
    emit(at, 8, field, hex(off) + " -> " + r.name + " at " + hex(r.base + off));
    // A list occupies its declared size (header and one entry) even when empty.
    if (!check(fits(r, off, ZU_ARRAY_HEADER_SIZE + entry), at,
               field + ": a list at " + r.name + "+" + hex(off) + " does not fit in the table (" +
                   std::to_string(r.len) + " bytes)"))
        return std::nullopt;
    size_t list = r.base + off;
    std::string head = field + "->" + prefix;
    if (!expect_id(list, id, head + "_cb_ID"))
        return std::nullopt;
    count = uint32_t(num(list + 4, 4, head + "_count"));
    size_t room = (r.len - off - 8) / entry;
    if (!check(count <= room, list + 4,
               head + "_count is " + std::to_string(count) + ", but only " + std::to_string(room) + " entries fit in " +
                   r.name))
        return std::nullopt;
    if (!claim(list, 8 + entry * std::max<size_t>(count, 1), at, field + ": the list"))
        return std::nullopt;
    if (count == 0)
        emit(list + 8, entry, head + " (room for the first entry)", "unused");
    return list;
}

std::vector<variety> walker::walk_varieties(size_t at, const class_tables &t, const std::string &field) {
    std::vector<variety> out;
    uint32_t count;
    auto list = list_at(at, t.varieties, sizeof(vl_entry), VARIETY_LIST_ID, field, false, "vl", count);
    if (!list)
        return out;
    for (uint32_t i = 0; i < count; i++) {
        size_t e = *list + offsetof(variety_list_t, vl_values) + i * sizeof(vl_entry);
        std::string name = item(field + "->vl_values", i);
        variety v;
        v.low = uint32_t(num(e, 4, name + ".vl_low_val"));
        v.high = uint32_t(num(e + 4, 4, name + ".vl_high_val"));
        out.push_back(v);
    }
    return out;
}

std::optional<valid_values> walker::walk_valid_values(size_t at, uint32_t type, const class_tables &t,
                                                      const std::string &field) {
    uint32_t count;
    auto list = list_at(at, t.valid_values, sizeof(vv_entry), VALID_VALUES_ID, field, true, "vv", count);
    if (!list)
        return std::nullopt;
    valid_values out;
    for (uint32_t i = 0; i < count; i++) {
        size_t e = *list + offsetof(valid_values_t, vv_values) + i * sizeof(vv_entry);
        std::string name = item(field + "->vv_values", i);
        valid_value v;
        v.low = typed_value(e + offsetof(vv_entry, vv_low_val), type, t, name + ".vv_low_val");
        v.high = typed_value(e + offsetof(vv_entry, vv_high_val), type, t, name + ".vv_high_val");
        v.display_msgid = uint16_t(num(e + offsetof(vv_entry, vv_disp_msgid), 2, name + ".vv_disp_msgid"));
        emit(e + offsetof(vv_entry, vv_reserved), 6, name + ".vv_reserved", "");
        out.push_back(std::move(v));
    }
    return out;
}

std::optional<sd_definition> walker::walk_sd_def(size_t at, const class_tables &t, const std::string &field) {
    uint32_t count;
    auto list = list_at(at, t.sd_defs, sizeof(sd_field), SD_DEF_ID, field, true, "sd", count);
    if (!list)
        return std::nullopt;
    sd_definition out;
    for (uint32_t i = 0; i < count; i++) {
        size_t e = *list + offsetof(sd_def_t, sd_fields) + i * sizeof(sd_field);
        std::string name = item(field + "->sd_fields", i);
        sd_element el;
        el.name = string_ref(e + offsetof(sd_field, u_sd_field_name), t.strings, name + ".u_sd_field_name", false)
                      .value_or("");
        size_t type_at = e + offsetof(sd_field, sd_field_type);
        el.type = uint32_t(get(type_at, 4));
        emit(type_at, 4, name + ".sd_field_type", std::to_string(el.type) + " (" + data_type_name(el.type) + ")");
        bool typed = check(el.type < ZU_NUM_DATA_TYPES && !zu_is_sd_type(el.type), type_at,
                           name + ".sd_field_type: " +
                               (el.type < ZU_NUM_DATA_TYPES
                                    ? "an element cannot be of a structured type"
                                    : "data type " + std::to_string(el.type) + " is out of range (0 to 22)"));
        el.display_msgid = uint16_t(num(e + offsetof(sd_field, sd_disp_msgid), 2, name + ".sd_disp_msgid"));
        el.description_msgid = uint16_t(num(e + offsetof(sd_field, sd_dscr_msgid), 2, name + ".sd_dscr_msgid"));
        if (typed)
            el.vv = walk_valid_values(e + offsetof(sd_field, u_sd_valid_vals), zu_element_type(el.type), t,
                                      name + ".u_sd_valid_vals");
        else
            emit(e + offsetof(sd_field, u_sd_valid_vals), 8, name + ".u_sd_valid_vals",
                 "not read: no data type to read it by");
        el.action_id = uint32_t(num(e + offsetof(sd_field, sd_action_id), 4, name + ".sd_action_id"));
        el.valid_type = uint16_t(num(e + offsetof(sd_field, sd_valid_type), 2, name + ".sd_valid_type"));
        emit(e + offsetof(sd_field, sd_reserved), 2, name + ".sd_reserved", "");
        out.push_back(std::move(el));
    }
    return out;
}

// ---------------------------------------------------------------------------
// Typed values

value walker::typed_value(size_t at, uint32_t type, const class_tables &t, const std::string &field) {
    value v;
    if (!check(type < ZU_NUM_DATA_TYPES, at,
               field + ": data type " + std::to_string(type) + " is out of range (0 to 22)"))
        type = ZU_UNKNOWN;
    v.type = type;
    if (zu_is_numeric_type(type)) {
        v.kind = value_kind::number;
        v.bits = get(at, is_wide_type(type) ? 8 : 4);
        emit(at, 8, field, data_type_name(type) + " " + number_text(type, v.bits));
        return v;
    }
    if (type == ZU_UNKNOWN || type == ZU_NONE || type == ZU_SBS_PTR) {
        // Nothing is placed for these types, and the byte-order reversal leaves them as they are.
        v.kind = value_kind::raw;
        for (size_t i = 0; i < 8; i++)
            v.bytes.push_back(uint8_t(get(at + i, 1)));
        emit(at, 8, field, data_type_name(type) + " (raw)");
        return v;
    }
    uint32_t off = uint32_t(get(at, 4));
    if (off == CDB_NONE) {
        emit(at, 8, field, data_type_name(type) + " none");
        return v;
    }
    emit(at, 8, field, data_type_name(type) + " -> ClassStrings+" + hex(off) + " at " + hex(t.strings.base + off));
    if (!check(off < t.strings.len, at,
               field + ": offset " + hex(off) + " is outside ClassStrings (" + std::to_string(t.strings.len) +
                   " bytes)"))
        return v;
    size_t body = t.strings.base + off, room = t.strings.len - off;
    switch (type) {
    case ZU_CHAR_PTR: string_body(off, at, t, field, v); break;
    case ZU_BINARY_PTR: binary_body(body, room, at, field, v); break;
    case ZU_RSRC_HANDLE_PTR: handle_body(body, room, at, field, v); break;
    case ZU_SD_PTR: sd_body(body, room, at, t, field, v); break;
    default: array_body(body, room, at, t, field, v); break;
    }
    return v;
}

void walker::string_body(uint32_t off, size_t at, const class_tables &t, const std::string &field, value &v) {
    auto s = string_at(t.strings, off, at, field);
    if (!s)
        return;
    v.kind = value_kind::string;
    v.text = *s;
}

void walker::binary_body(size_t body, size_t room, size_t at, const std::string &field, value &v) {
    if (!check(room >= ZU_BINARY_DATA_OFFSET, at,
               field + ": a binary body needs " + std::to_string(ZU_BINARY_DATA_OFFSET) + " bytes, only " +
                   std::to_string(room) + " are left in ClassStrings"))
        return;
    uint32_t len = uint32_t(num(body, 4, field + "->length"));
    if (!check(len <= room - ZU_BINARY_DATA_OFFSET, body,
               field + ": a binary of " + std::to_string(len) + " bytes runs past the end of ClassStrings"))
        return;
    if (!claim(body, ZU_BINARY_DATA_OFFSET + len, at, field + ": the binary body"))
        return;
    emit(body + 4, 4, field + "->pad", "");
    v.kind = value_kind::binary;
    v.bytes.assign(d_ + body + ZU_BINARY_DATA_OFFSET, d_ + body + ZU_BINARY_DATA_OFFSET + len);
    if (len)
        emit(body + ZU_BINARY_DATA_OFFSET, len, field + "->data", std::to_string(len) + " bytes");
}

void walker::handle_body(size_t body, size_t room, size_t at, const std::string &field, value &v) {
    const size_t size = sizeof(zu_resource_handle_t);
    if (!check(room >= size, at, field + ": a resource handle runs past the end of ClassStrings"))
        return;
    if (!claim(body, size, at, field + ": the resource handle"))
        return;
    v.kind = value_kind::handle;
    v.bytes.assign(d_ + body, d_ + body + size);
    emit(body, size, field + "->handle", "");
}

void walker::array_body(size_t body, size_t room, size_t at, const class_tables &t, const std::string &field,
                        value &v) {
    if (!check(room >= ZU_ARRAY_HEADER_SIZE, at, field + ": an array header runs past the end of ClassStrings"))
        return;
    uint32_t count = uint32_t(num(body, 4, field + "->element_count"));
    emit(body + 4, 4, field + "->pad", "");
    if (!check(count <= (room - ZU_ARRAY_HEADER_SIZE) / ZU_ARRAY_ELEMENT_SIZE, body,
               field + ": an array of " + std::to_string(count) + " elements runs past the end of ClassStrings"))
        return;
    if (!claim(body, ZU_ARRAY_HEADER_SIZE + ZU_ARRAY_ELEMENT_SIZE * size_t(count), at, field + ": the array body"))
        return;
    v.kind = value_kind::array;
    for (uint32_t i = 0; i < count; i++)
        v.elements.push_back(typed_value(body + ZU_ARRAY_HEADER_SIZE + ZU_ARRAY_ELEMENT_SIZE * i,
                                         zu_element_type(v.type), t, item(field, i)));
}

void walker::sd_body(size_t body, size_t room, size_t at, const class_tables &t, const std::string &field, value &v) {
    if (!check(room >= ZU_SD_HEADER_SIZE, at, field + ": a structured value runs past the end of ClassStrings"))
        return;
    uint32_t count = uint32_t(num(body, 4, field + "->element_count"));
    emit(body + 4, 4, field + "->pad", "");
    // A structured value without elements still has room for one.
    size_t slots = std::max<size_t>(count, 1);
    if (!check(slots <= (room - ZU_SD_HEADER_SIZE) / ZU_SD_ELEMENT_SIZE, body,
               field + ": a structured value of " + std::to_string(count) +
                   " elements runs past the end of ClassStrings"))
        return;
    if (!claim(body, ZU_SD_HEADER_SIZE + ZU_SD_ELEMENT_SIZE * slots, at, field + ": the structured value"))
        return;
    v.kind = value_kind::sd;
    if (count == 0)
        emit(body + ZU_SD_HEADER_SIZE, ZU_SD_ELEMENT_SIZE, field + " (room for one element)", "unused");
    for (uint32_t i = 0; i < count; i++) {
        size_t e = body + ZU_SD_HEADER_SIZE + ZU_SD_ELEMENT_SIZE * i;
        uint32_t dt = uint32_t(get(e, 4));
        emit(e, 4, item(field, i) + ".data_type", std::to_string(dt) + " (" + data_type_name(dt) + ")");
        if (!check(dt < ZU_NUM_DATA_TYPES && !zu_is_sd_type(dt), e,
                   item(field, i) + ".data_type: " +
                       (dt < ZU_NUM_DATA_TYPES ? "an element cannot be of a structured type"
                                               : "data type " + std::to_string(dt) + " is out of range (0 to 22)")))
            dt = ZU_UNKNOWN;
        emit(e + 4, 4, item(field, i) + ".pad", "");
        v.elements.push_back(typed_value(e + offsetof(zu_structured_data_element_t, value), dt, t, item(field, i)));
    }
}

} // namespace cdbdump
