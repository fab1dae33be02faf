// Value conversion and placement as free functions over a table arena: the
// text of a value into its typed form, and a typed value (or a default) into
// a value field, its bodies into a string table. Nothing here needs a compile.
#ifndef QECFG_VALUE_H
#define QECFG_VALUE_H

#include <cstddef>
#include <cstdint>

#include "qecfg_tbl.h"

// How copy_this_type places a value: the given one, or a default.
enum placement_code {
    TYPE_SAME = 1,
    INIT_DEFAULT = 4,
    DFLT_DEFAULT = 5,
    R_LO_DEFAULT = 6,
    R_HI_DEFAULT = 7,
};

// Conversions of value text.
zu_data_type_t strToZuDt(const char *s);
int strToVar(const char *s, qel_variable_type_t *t);
zu_data_type_t scalar_zu(zu_data_type_t dt);
char *strip_quotes(char *s);
int ver_str_convert(const char *ver_str, uint32_t *n);
int hex_convert(char *zu_out, const char *str_in);
int oct_convert(const char *p, int type, char *out_buf);
// Bytes that hex_convert and oct_convert may write for a text of len chars.
inline size_t binary_image_size(size_t len) { return 4 + len + 1; }
// 0, or -1 for a text that is no value of the type. Texts and binaries are
// copied into the arena.
int str_to_zu(table_arena &a, zu_value_t *zu_out, zu_data_type_t zu_type, const char *str_in);
// The bits of the comma-separated property words; an unknown word is fatal.
void set_props(uint32_t *dest, const props_t *props, int len, char *vnoq);

// Placement. 0, or -1 for a type or code that cannot be placed.
int copy_this_type(table_arena &a, value_slot out_data, const zu_value_t *in_data, zu_data_type_t type_in, int type_out,
                   tbl *str_tbl, body_cursor *array_anchor, uint32_t array_cnt);
int copy_this_sd_type(table_arena &a, value_slot out_data, zu_data_type_t type_in, int type_out, tbl *str_tbl,
                      body_cursor *array_anchor, body_cursor *sd_array_anchor, body_cursor *sd_element_anchor,
                      uint32_t array_cnt, zu_data_type_t sd_type);

#endif
