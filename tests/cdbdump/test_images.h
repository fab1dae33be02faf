// The CDB images the tests share, made with the test-only writer.
#ifndef CDBDUMP_TEST_IMAGES_H
#define CDBDUMP_TEST_IMAGES_H

#include "cdb_annotate.h"
#include "cdb_image.h"
#include "cdb_to_tree.h"

namespace cdbtest {

// A sweep over every byte of an image takes this step. The sanitizers run
// each case many times slower, so there it takes every third byte (a step
// prime to the word size still reaches every byte of a word), and the fuzz
// harnesses cover the rest.
#if defined(__SANITIZE_ADDRESS__)
inline constexpr size_t SWEEP_STEP = 3;
#else
inline constexpr size_t SWEEP_STEP = 1;
#endif

// One class with one persistent resource attribute, 40 bytes of class
// strings, 8 of manager strings and 16 of map strings.
inline std::vector<uint8_t> one_attribute_class(bool big) {
    test_class c(big, "One.Attribute.Class");
    buf &p = c.pattr(false, "Size", 1, 8);
    p.put(24, c.strings.text(""), 4);
    return image({c});
}

constexpr uint64_t DOUBLE_2_5 = 0x4004000000000000ull;

// One class with a value of every kind of body, lists of every kind, two
// dynamic array attributes whose ranges are arrays and numbers, an action and
// a variable class.
inline std::vector<uint8_t> rich_image(bool big) {
    test_class c(big, "Rich.Class");
    c.rec.put(4, 0x2e, 4);
    c.rec.put(200, 0xEEEEEEEE, 4);
    c.rec.put(204, 0xEEEEEEEE, 4);
    c.rec.put(56, c.sd_def({{"Dev", 8}, {"Size", 5}}), 4);

    c.pattr(true, "Vendor", 1, 8).put(24, c.strings.text("Acme"), 4);
    c.dattr(true, "Count", 1, 3);

    c.pattr(false, "Size", 1, 4).put(24, uint64_t(-5), 8);
    buf &level = c.pattr(false, "Level", 2, 2);
    level.put(24, 3, 4);
    level.put(48, c.valid_values({{0, 9, 5}}), 4);
    c.pattr(false, "Serial", 3, 9).put(24, c.binary({0x00, 0xff, 0x10}), 4);
    c.pattr(false, "Owner", 4, 10).put(24, c.strings.add(24), 4);
    c.pattr(false, "Nums", 5, 13).put(24, c.array({1, 2, 3}, 4), 4);
    uint32_t names = c.array({0, 0}, 4);
    c.strings.put(names + 8, c.strings.text("x"), 4);
    c.strings.put(names + 16, c.strings.text("y"), 4);
    c.pattr(false, "Names", 6, 19).put(24, names, 4);
    buf &layout = c.pattr(false, "Layout", 7, 11);
    layout.put(56, c.sd_def({{"A", 2}, {"B", 3}}), 4);
    layout.put(64, 1, 2);
    layout.put(24, c.sd_value({{2, 7}, {3, 9}}), 4);
    buf &hist = c.pattr(false, "Hist", 8, 22);
    hist.put(56, c.sd_def({{"W", 2}}), 4);
    hist.put(64, 0, 2);
    uint32_t hist_array = c.array({0}, 4);
    c.strings.put(hist_array + 8, c.sd_value({{2, 0}}), 4);
    hist.put(24, hist_array, 4);
    c.pattr(false, "Ratio", 9, 7).put(24, DOUBLE_2_5, 8);

    buf &temp = c.dattr(false, "Temp", 4, 13);
    temp.put(32, c.array({0}, 4), 4);
    temp.put(40, c.array({0}, 4), 4);
    temp.put(48, c.array({100}, 4), 4);
    buf &load = c.dattr(false, "Load", 5, 13);
    load.put(32, c.array({0}, 4), 4);
    load.put(40, 5, 4);
    load.put(48, 9, 4);

    c.action(false, "Reset", 3).put(40, c.sd_def({{"How", 2}}), 4);
    return image({c}, "Test.RM", {{"VC1", std::nullopt, {0x8001, 4}}});
}

// The renderings written while the image is walked, which must equal those
// of the whole tree (and, for the listing, those of the unwindowed walk).
inline std::string streamed(const std::vector<uint8_t> &b, cdbdump::tree_writer::style style) {
    cdbdump::text_sink out;
    cdbdump::write_file(b.data(), b.size(), cdbdump::verify(b.data(), b.size()), style, out);
    return out.take();
}

inline std::string streamed_annotation(const std::vector<uint8_t> &b, size_t window) {
    cdbdump::text_sink out;
    cdbdump::write_annotation(b.data(), b.size(), out, window);
    return out.take();
}

} // namespace cdbtest

#endif
