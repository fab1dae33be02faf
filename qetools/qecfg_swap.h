// Byte-order reversal of a finished CDB image: the walkers behind
// qecfg_cdef_swap, one per record, list and value kind.
#ifndef QECFG_SWAP_H
#define QECFG_SWAP_H

#include <cstddef>
#include <cstdint>
#include <unordered_set>

#include "cdb.h"

// The byte-order reversal of a finished image, in place. Records named in
// numeric_ranges (file offsets of dynamic attribute records) hold plain
// numbers in their range fields.
void qecfg_cdef_swap(qel_cdb_header_t *cdb_hdr_p, const std::unordered_set<uint32_t> &numeric_ranges);

// The image being reversed. Positions are byte offsets from the header, the
// same numbers as the file offsets. Every access goes through at(), so a
// damaged offset or count ends a walk instead of leaving the image.
struct swap_image {
    char *base;
    size_t size;
    // Dynamic attribute records (by position) whose range holds plain values
    // of the element type rather than array bodies; may be null.
    const std::unordered_set<uint32_t> *numeric_ranges = nullptr;

    // Address of the n bytes at pos, or null unless all of them are inside.
    char *at(size_t pos, size_t n) const { return pos <= size && n <= size - pos ? base + pos : nullptr; }
};

// Where the tables of one class start, as image positions.
struct swap_bases {
    size_t sbase;  // ClassStrings
    size_t vvbase; // ClassValidVals
    size_t vlbase; // ClassVarietyList
    size_t sdbase; // ClassSDDefs
};

// Reverses 2, 4 or 8 bytes in place; any other size does nothing.
void swap_any(void *enum_p, int size);

// A typed value at value_pos and the body it designates in the string table.
void swap_value(const swap_image &img, size_t value_pos, zu_data_type_t type, size_t sbase);

// One list with its entries.
void swap_var_list(const swap_image &img, size_t vlist_pos);
void swap_valid_vals(const swap_image &img, size_t vv_pos, zu_data_type_t type, size_t sbase);
void swap_sd_def(const swap_image &img, size_t sd_pos, size_t vvbase, size_t sbase);

// count consecutive records from first, with everything they refer to.
void swap_pattr(const swap_image &img, size_t first, uint32_t count, const swap_bases &b);
void swap_dattr(const swap_image &img, size_t first, uint32_t count, const swap_bases &b);
void swap_action(const swap_image &img, size_t first, uint32_t count, const swap_bases &b);
void swap_errors(const swap_image &img, size_t first, uint32_t count, const swap_bases &b);
void swap_depends(const swap_image &img, size_t first, uint32_t count, const swap_bases &b);

#endif
