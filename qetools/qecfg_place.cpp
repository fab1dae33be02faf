// Placement of typed values into value fields: numbers in the field itself,
// every other body out of line in a string table, arrays and structured
// values element by element through anchors. Positions inside the string
// table are kept as offsets, so growth of the table never loses a write.
#include "qecfg_fatal.h"
#include "qecfg_value.h"

namespace {

bool valid_code(int type_out) {
    return type_out == TYPE_SAME || (type_out >= INIT_DEFAULT && type_out <= R_HI_DEFAULT);
}

bool is_default_code(int type_out) { return type_out == INIT_DEFAULT || type_out == DFLT_DEFAULT; }

void put_offset(value_slot s, uint32_t off) { store<uint32_t>(s.addr(), off); }

void put_none(value_slot s) { std::memset(s.addr(), 0xFF, sizeof(zu_value_t)); }

// Number placed with a code: the given value, 0 for the defaults and the low
// end of a range, the default high end for the high end.
template <typename T> void put_number(value_slot s, int type_out, T given) {
    store<T>(s.addr(), type_out == TYPE_SAME ? given : type_out == R_HI_DEFAULT ? T(CDB_DEFAULT_RANGE_HIGH) : T(0));
}

uint32_t append_zero_body(table_arena &arena, tbl *st, size_t len) {
    char *p = static_cast<char *>(arena.alloc_tble(st, round8(len)));
    return uint32_t(p - st->tbl_base);
}

// A value of one of the types 2 to 9 into a field (or an array element).
int place_scalar(table_arena &arena, value_slot out, const zu_value_t *in, zu_data_type_t type, int type_out, tbl *st,
                 bool element) {
    bool given = type_out == TYPE_SAME;
    if (given && !in && type != ZU_RSRC_HANDLE_PTR)
        return -1;
    switch (type) {
    // Values are read by copy: a value field need only be 4-byte aligned.
    case ZU_INT32:
    case ZU_UINT32: put_number<uint32_t>(out, type_out, given ? load<uint32_t>(in) : 0); return 0;
    case ZU_INT64:
    case ZU_UINT64: put_number<uint64_t>(out, type_out, given ? load<uint64_t>(in) : 0); return 0;
    case ZU_FLOAT32: put_number<float>(out, type_out, given ? load<float>(in) : 0.0f); return 0;
    case ZU_FLOAT64: put_number<double>(out, type_out, given ? load<double>(in) : 0.0); return 0;
    case ZU_CHAR_PTR:
        if (given) {
            const char *text = load<const char *>(in);
            put_offset(out, arena.add_to_tbl(st, text, std::strlen(text) + 1));
        } else if (is_default_code(type_out)) {
            put_offset(out, append_zero_body(arena, st, 1));
        } else {
            put_none(out);
        }
        return 0;
    case ZU_BINARY_PTR:
        if (given) {
            const char *bin = load<const char *>(in);
            uint32_t len = load<uint32_t>(bin);
            put_offset(out, arena.add_to_tbl(st, &len, sizeof len));
            if (len)
                arena.add_to_tbl(st, bin + offsetof(zu_binary_t, data), len);
            else
                append_zero_body(arena, st, 1);
        } else if (is_default_code(type_out)) {
            // The default binary of an array element keeps one zero data byte.
            put_offset(out, append_zero_body(arena, st, 4));
            if (element)
                append_zero_body(arena, st, 1);
        } else {
            put_none(out);
        }
        return 0;
    case ZU_RSRC_HANDLE_PTR: put_offset(out, append_zero_body(arena, st, sizeof(zu_resource_handle_t))); return 0;
    default: return -1;
    }
}

void init_array(table_arena &arena, tbl *str_tbl, body_cursor *a, uint32_t array_cnt, value_slot out_data,
                uint32_t *elem_idx) {
    if (array_cnt == 0)
        raise_fatal(msg::place_empty_array, 0);
    if (!a->set) {
        uint32_t off =
            append_zero_body(arena, str_tbl, ZU_ARRAY_HEADER_SIZE + ZU_ARRAY_ELEMENT_SIZE * size_t(array_cnt));
        *a = body_cursor{true, off};
        put_offset(out_data, off);
    }
    char *count = str_tbl->tbl_base + a->off;
    *elem_idx = load<uint32_t>(count);
    store<uint32_t>(count, *elem_idx + 1);
}

void init_scalar_sd(table_arena &arena, tbl *str_tbl, body_cursor *a, uint32_t sd_cnt, value_slot out_data,
                    uint32_t *elem_idx) {
    if (sd_cnt == 0) {
        // A structured value without elements keeps room for one.
        uint32_t off = append_zero_body(arena, str_tbl, ZU_SD_HEADER_SIZE + ZU_SD_ELEMENT_SIZE);
        *a = body_cursor{true, off};
        put_offset(out_data, off);
        *elem_idx = 0;
        return;
    }
    if (!a->set) {
        uint32_t off = append_zero_body(arena, str_tbl, ZU_SD_HEADER_SIZE + ZU_SD_ELEMENT_SIZE * size_t(sd_cnt));
        *a = body_cursor{true, off};
        put_offset(out_data, off);
    }
    char *count = str_tbl->tbl_base + a->off;
    *elem_idx = load<uint32_t>(count);
    store<uint32_t>(count, *elem_idx + 1);
}

void init_array_sd(table_arena &arena, tbl *str_tbl, body_cursor *array_anchor, body_cursor *sd_anchor,
                   uint32_t array_cnt, uint32_t sd_cnt, value_slot out_data, uint32_t *sd_elem_idx) {
    if (array_cnt == 0)
        raise_fatal(msg::place_empty_array, 0);
    if (!array_anchor->set) {
        uint32_t off =
            append_zero_body(arena, str_tbl, ZU_ARRAY_HEADER_SIZE + ZU_ARRAY_ELEMENT_SIZE * size_t(array_cnt));
        *array_anchor = body_cursor{true, off};
        put_offset(out_data, off);
    }
    store<uint32_t>(str_tbl->tbl_base + array_anchor->off, 1);
    init_scalar_sd(arena, str_tbl, sd_anchor, sd_cnt, value_slot::in(str_tbl, array_anchor->off + ZU_ARRAY_HEADER_SIZE),
                   sd_elem_idx);
}

} // namespace

int copy_this_type(table_arena &arena, value_slot out_data, const zu_value_t *in_data, zu_data_type_t type_in,
                   int type_out, tbl *str_tbl, body_cursor *array_anchor, uint32_t array_cnt) {
    switch (type_in) {
    case ZU_NONE: return 0;
    case ZU_SD_PTR: raise_fatal(msg::place_structured, 0);
    case ZU_SBS_PTR: raise_fatal(msg::place_sbs, 0);
    case ZU_SD_PTR_ARRAY: raise_fatal(msg::place_structured_array, 0);
    case ZU_RSRC_HANDLE_PTR: return place_scalar(arena, out_data, nullptr, type_in, TYPE_SAME, str_tbl, false);
    default: break;
    }
    if (zu_is_array_type(type_in)) {
        body_cursor local;
        body_cursor *a = array_anchor ? array_anchor : &local;
        uint32_t idx = 0;
        init_array(arena, str_tbl, a, array_cnt, out_data, &idx);
        if (!valid_code(type_out))
            return -1;
        value_slot element =
            value_slot::in(str_tbl, a->off + uint32_t(ZU_ARRAY_HEADER_SIZE + ZU_ARRAY_ELEMENT_SIZE * idx));
        return place_scalar(arena, element, in_data, scalar_zu(type_in), type_out, str_tbl, true);
    }
    if (type_in < ZU_INT32 || type_in > ZU_BINARY_PTR || !valid_code(type_out))
        return -1;
    return place_scalar(arena, out_data, in_data, type_in, type_out, str_tbl, false);
}

int copy_this_sd_type(table_arena &arena, value_slot out_data, zu_data_type_t type_in, int type_out, tbl *str_tbl,
                      body_cursor *array_anchor, body_cursor *sd_array_anchor, body_cursor *sd_element_anchor,
                      uint32_t array_cnt, zu_data_type_t sd_type) {
    uint32_t idx = 0;
    if (sd_type == ZU_SD_PTR)
        init_scalar_sd(arena, str_tbl, sd_element_anchor, array_cnt, out_data, &idx);
    else if (sd_type == ZU_SD_PTR_ARRAY)
        init_array_sd(arena, str_tbl, sd_array_anchor, sd_element_anchor, 1, array_cnt, out_data, &idx);
    else
        raise_fatal(msg::place_structured_only, 0);
    if (array_cnt == 0)
        return 0;
    uint32_t element = sd_element_anchor->off + uint32_t(ZU_SD_HEADER_SIZE + ZU_SD_ELEMENT_SIZE * idx);
    int r = copy_this_type(arena, value_slot::in(str_tbl, element + offsetof(zu_structured_data_element_t, value)),
                           nullptr, type_in, type_out, str_tbl, array_anchor, 1);
    store<uint32_t>(str_tbl->tbl_base + element, type_in);
    return r;
}
