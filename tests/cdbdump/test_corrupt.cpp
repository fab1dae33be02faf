// Every kind of corruption the verifier claims to catch is reported with its
// message at its offset, in both byte orders; no corruption makes the reader,
// the annotation or the printers fail.
#include <functional>

#include <gtest/gtest.h>

#include "cdb_annotate.h"
#include "cdb_source.h"
#include "cdb_to_tree.h"
#include "cdb_walk.h"
#include "test_images.h"

using namespace cdbdump;

namespace {
// Field positions of the rich image, read with the test writer's own reader.
struct probe {
    cdbtest::buf f;
    size_t dsect(size_t i) const { return size_t(f.get(84 + 16 * i, 4)); }
    size_t table(size_t ref) const { return dsect(0) + size_t(f.get(dsect(0) + ref, 4)); }
    size_t strings() const { return table(160); }
    size_t pattr(size_t i) const { return table(40) + 72 * i; }
    size_t dattr(size_t i) const { return table(48) + 136 * i; }
    size_t body(size_t value_at) const { return strings() + size_t(f.get(value_at, 4)); }
    void add(size_t off, int64_t delta, unsigned w) { f.put(off, f.get(off, w) + uint64_t(delta), w); }
};

struct corruption {
    const char *what;
    std::function<size_t(probe &)> apply; // returns the offset the message names
    const char *message;
    bool keep_checksum = false;
};

// clang-format off
const corruption corruptions[] = {
    {"short file", [](probe &p) { p.f.b.resize(79); return size_t(0); }, "fewer than the 80", true},
    {"truncated", [](probe &p) { p.f.b.resize(p.f.b.size() - 8); return size_t(0); }, "cdb_hdr_length is", true},
    {"flipped byte", [](probe &p) { p.f.b[p.strings()] ^= 1; return size_t(4); }, "the checksum", true},
    {"odd size", [](probe &p) { p.f.add(2); p.add(0, 2, 4); return size_t(0); }, "not a multiple of 4"},
    {"format word", [](probe &p) { p.f.put(8, 0x12345678, 4); return size_t(8); }, "format word"},
    {"record size", [](probe &p) { p.f.put(40, 70, 2); return size_t(40); }, "cdb_hdr_rsrc_pattr_size is 70"},
    {"dsect count", [](probe &p) { p.f.put(24, 1000, 4); return size_t(24); }, "anchors fit"},
    {"dsect type", [](probe &p) { p.f.put(80, 7, 4); return size_t(80); }, "not one this reader knows"},
    {"dsect order", [](probe &p) { p.f.put(96, 6, 4); p.f.put(112, 3, 4); return size_t(112); }, "out of order"},
    {"dsect overlap", [](probe &p) { p.f.put(100, p.dsect(0) + 8, 4); return size_t(100); }, "starts before"},
    {"dsect past end", [](probe &p) { p.add(120, 1000, 4); return size_t(120); }, "past the end of the file"},
    {"class identifier", [](probe &p) { p.f.put(p.dsect(0), 0x43444232, 4); return p.dsect(0); }, "rc_cb_ID is"},
    {"record count", [](probe &p) { p.add(p.dsect(0) + 172, 1, 2); return p.dsect(0) + 48; }, "belongs at"},
    {"table offset", [](probe &p) { p.add(p.dsect(0) + 160, 8, 4); return p.dsect(0) + 160; }, "belongs at"},
    {"offset[1]", [](probe &p) { p.f.put(p.dsect(0) + 12, 1, 4); return p.dsect(0) + 12; }, "offset[1]"},
    {"error count", [](probe &p) { p.f.put(p.dsect(0) + 180, 1, 2); return p.dsect(0) + 180; }, "always empty"},
    {"name offset", [](probe &p) { p.f.put(p.pattr(0) + 8, 0x100000, 4); return p.pattr(0) + 8; },
     "is outside ClassStrings"},
    {"unterminated string", [](probe &p) {
         for (size_t i = p.dsect(1) - 8; i < p.dsect(1); i++) p.f.b[i] = 'A';
         return size_t(p.f.get(p.table(104) + 40, 4)) + p.table(144) + 8; }, // the action's element name
     "is not terminated inside the table"},
    {"variety identifier", [](probe &p) { p.f.put(p.table(128), 0x11, 4); return p.table(128); }, "vl_cb_ID is"},
    {"variety count", [](probe &p) { p.f.put(p.table(128) + 4, 1000, 4); return p.table(128) + 4; },
     "entries fit in ClassVarietyList"},
    {"variety none", [](probe &p) { p.f.put(p.pattr(0) + 40, cdbtest::NONE, 4); return p.pattr(0) + 40; },
     "must designate a list"},
    {"valid values identifier", [](probe &p) { p.f.put(p.table(152), 0, 4); return p.table(152); }, "vv_cb_ID is"},
    {"definition count", [](probe &p) { p.f.put(p.table(144) + 4, 999, 4); return p.table(144) + 4; },
     "entries fit in ClassSDDefs"},
    {"data type", [](probe &p) { p.f.put(p.pattr(0) + 36, 99, 4); return p.pattr(0) + 36; },
     "data type 99 is out of range"},
    {"variable type", [](probe &p) { p.f.put(p.dattr(0) + 108, 9, 4); return p.dattr(0) + 108; }, "variable type 9"},
    {"element type", [](probe &p) { p.f.put(p.table(144) + 16, 11, 4); return p.table(144) + 16; }, "structured type"},
    {"array count", [](probe &p) { p.f.put(p.body(p.pattr(4) + 24), 100000, 4); return p.body(p.pattr(4) + 24); },
     "runs past the end of ClassStrings"},
    {"binary length", [](probe &p) { p.f.put(p.body(p.pattr(2) + 24), 100000, 4); return p.body(p.pattr(2) + 24); },
     "runs past the end of ClassStrings"},
    {"shared body", [](probe &p) { p.f.put(p.pattr(4) + 24, p.f.get(p.pattr(5) + 24, 4), 4); return p.pattr(5) + 24; },
     "referred to once"},
    {"cycle", [](probe &p) { // the element designates its own array
         size_t array = p.body(p.pattr(7) + 24);
         p.f.put(array + 8, p.f.get(p.pattr(7) + 24, 4), 4);
         return array + 8; },
     "referred to once"},
    {"structured value without definition",
     [](probe &p) { p.f.put(p.pattr(6) + 56, cdbtest::NONE, 4); return p.pattr(6) + 24; }, "must be 0"},
    {"variable class reference", [](probe &p) { p.f.put(p.dattr(0) + 16, 5, 4); return p.dattr(0) + 16; }, "keeps 0"},
    {"variable ID count", [](probe &p) { p.f.put(p.dsect(3) + 24, 100, 4); return p.dsect(3) + 24; }, "IDs fit"},
    {"variable class strings", [](probe &p) { p.f.put(p.dsect(3) + 28, 4, 4); return p.dsect(3) + 28; },
     "multiple of 8"},
    {"manager strings", [](probe &p) { p.f.put(p.dsect(1) + 16, 8, 4); return p.dsect(1) + 16; }, "must be 0"},
    {"map strings", [](probe &p) { p.f.put(p.dsect(2) + 16, 64, 4); return p.dsect(2) + 16; }, "must be 60"},
    {"largest manager id", [](probe &p) { p.f.put(28, 3, 2); return size_t(28); }, "cdb_hdr_max_rm_id"},
};
// clang-format on

// Everything a caller may do with any input: none of it may fail. The
// printers, which only see verified files, run on every fourth input.
// The streamed renderings are compared with those of the whole tree, the
// listing in windows of a few bytes with the one of the whole walk.
void exercise(const std::vector<uint8_t> &b, bool print) {
    annotation a = annotate_walk(b.data(), b.size());
    try {
        cdb_file f = verify(b.data(), b.size());
        if (!print)
            return;
        EXPECT_EQ(cdbtest::streamed(b, tree_writer::style::json), to_json(to_tree(f)));
        EXPECT_EQ(cdbtest::streamed(b, tree_writer::style::text), to_text(to_tree(f)));
        (void)decompile(f);
    } catch (const cdb_invalid &) {
    }
    if (print) {
        EXPECT_EQ(cdbtest::streamed_annotation(b, 700), annotation_text(b.data(), b.size(), a));
    }
}
} // namespace

TEST(Corruption, EachIsReportedWithItsMessageAndOffset) {
    for (bool big : {false, true})
        for (const corruption &c : corruptions) {
            SCOPED_TRACE(std::string(c.what) + (big ? ", big-endian" : ", little-endian"));
            probe p{cdbtest::buf{big, cdbtest::rich_image(big)}};
            size_t at = c.apply(p);
            if (!c.keep_checksum)
                cdbtest::fix_checksum(p.f.b, big);
            try {
                verify(p.f.b.data(), p.f.b.size());
                ADD_FAILURE() << "not caught";
            } catch (const cdb_invalid &e) {
                EXPECT_NE(e.message.find(c.message), std::string::npos) << e.message;
                EXPECT_EQ(e.offset, at) << e.message;
            }
            // The annotation flags it too, where it stands.
            annotation a = annotate_walk(p.f.b.data(), p.f.b.size());
            EXPECT_GE(a.violations, 1u);
        }
}

TEST(Corruption, AnnotationFlagsEveryViolationInsteadOfStopping) {
    probe p{cdbtest::buf{false, cdbtest::rich_image(false)}};
    p.f.put(p.pattr(0) + 36, 99, 4);
    p.f.put(p.dattr(0) + 108, 9, 4);
    p.f.put(40, 70, 2);
    annotation a = annotate_walk(p.f.b.data(), p.f.b.size()); // the checksum is wrong too
    EXPECT_EQ(a.violations, 4u);
    std::string text = annotation_text(p.f.b.data(), p.f.b.size(), a);
    for (const char *m : {"!! the checksum", "!! cdb_hdr_rsrc_pattr_size is 70", "data type 99", "variable type 9"})
        EXPECT_NE(text.find(m), std::string::npos) << m;
}

TEST(Corruption, NoFlippedByteOrTruncationMakesTheReaderFail) {
    for (bool big : {false, true}) {
        std::vector<uint8_t> good = cdbtest::rich_image(big);
        // Every other byte of one byte order, every fifth of the other, so
        // that each byte of a 4-byte word is reached in one of them.
        for (size_t i = 0, n = 0; i < good.size(); i += big ? 5 : 2, n++) {
            std::vector<uint8_t> b = good;
            b[i] ^= uint8_t(n % 2 ? 0xff : 0x80);
            cdbtest::fix_checksum(b, big);
            exercise(b, n % 4 == 0);
        }
        for (size_t len = 0; len < good.size(); len += 7)
            exercise(std::vector<uint8_t>(good.begin(), good.begin() + long(len)), true);
    }
}
