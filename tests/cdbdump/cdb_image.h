// A test-only CDB writer, independent of the reader and of include/cdb.h:
// every offset and size below is written by hand from the record layouts.
#ifndef CDBDUMP_TEST_CDB_IMAGE_H
#define CDBDUMP_TEST_CDB_IMAGE_H

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace cdbtest {

constexpr uint32_t NONE = 0xFFFFFFFF;

// Bytes in one byte order.
struct buf {
    bool big = false;
    std::vector<uint8_t> b;

    void put(size_t off, uint64_t v, unsigned width) {
        if (b.size() < off + width)
            b.resize(off + width);
        for (unsigned i = 0; i < width; i++)
            b[off + i] = uint8_t(v >> 8 * (big ? width - 1 - i : i));
    }
    uint64_t get(size_t off, unsigned width) const {
        uint64_t v = 0;
        for (unsigned i = 0; i < width; i++)
            v |= uint64_t(b[off + i]) << 8 * (big ? width - 1 - i : i);
        return v;
    }
    size_t add(size_t n) {
        size_t off = b.size();
        b.resize(off + n);
        return off;
    }
    void pad8() { b.resize((b.size() + 7) / 8 * 8); }
    uint32_t text(const std::string &s) {
        size_t off = add(s.size() + 1);
        for (size_t i = 0; i < s.size(); i++)
            b[off + i] = uint8_t(s[i]);
        pad8();
        return uint32_t(off);
    }
};

inline buf record(bool big, size_t size) {
    buf r{big, {}};
    r.add(size);
    return r;
}

// Record sizes and field offsets.
enum : size_t { CLASS = 224, PATTR = 72, DATTR = 136, ACTION = 56, MGR = 24, MAP = 60, VARCLASS = 40 };

struct test_class {
    test_class(bool big_order, const std::string &name) : big(big_order), rec(record(big_order, CLASS)) {
        strings.big = vl.big = vv.big = sd.big = big;
        rec.put(0, 0x43444231, 4);
        rec.put(8, strings.text(name), 4);
        for (size_t f : {16, 56, 64, 72, 80, 88})
            rec.put(f, NONE, 4);
        rec.put(214, 0xFFFF, 2);
    }

    // A list header with room for count entries (at least one); its offset.
    static uint32_t list(buf &t, uint32_t id, size_t entry, uint32_t count) {
        size_t off = t.add(8 + entry * (count ? count : 1));
        t.put(off, id, 4);
        t.put(off + 4, count, 4);
        return uint32_t(off);
    }
    uint32_t varieties(const std::vector<std::pair<uint32_t, uint32_t>> &v) {
        uint32_t off = list(vl, 0x43444267, 8, uint32_t(v.size()));
        for (size_t i = 0; i < v.size(); i++) {
            vl.put(off + 8 + 8 * i, v[i].first, 4);
            vl.put(off + 12 + 8 * i, v[i].second, 4);
        }
        return off;
    }
    // A valid-value list of 32-bit numbers (low, high, display id).
    uint32_t valid_values(const std::vector<std::array<uint32_t, 3>> &v) {
        uint32_t off = list(vv, 0x43444235, 24, uint32_t(v.size()));
        for (size_t i = 0; i < v.size(); i++)
            for (size_t k = 0; k < 3; k++)
                vv.put(off + 8 + 24 * i + 8 * k, v[i][k], k < 2 ? 4 : 2);
        return off;
    }
    // A structured-data definition of (name, data type) elements.
    uint32_t sd_def(const std::vector<std::pair<std::string, uint32_t>> &els) {
        uint32_t off = list(sd, 0x43444266, 32, uint32_t(els.size()));
        for (size_t i = 0; i < els.size(); i++) {
            size_t e = off + 8 + 32 * i;
            sd.put(e, strings.text(els[i].first), 4);
            sd.put(e + 8, els[i].second, 4);
            sd.put(e + 16, NONE, 4);
            sd.put(e + 24, 0xFFFF, 4);
            sd.put(e + 28, 1, 2);
        }
        return off;
    }
    // Bodies in the string table.
    uint32_t binary(const std::vector<uint8_t> &data) {
        uint32_t off = uint32_t(strings.add(8));
        strings.put(off, data.size(), 4);
        strings.b.insert(strings.b.end(), data.begin(), data.end());
        strings.pad8();
        return off;
    }
    uint32_t array(const std::vector<uint64_t> &elements, unsigned width) {
        uint32_t off = uint32_t(strings.add(8 + 8 * elements.size()));
        strings.put(off, elements.size(), 4);
        for (size_t i = 0; i < elements.size(); i++)
            strings.put(off + 8 + 8 * i, elements[i], width);
        return off;
    }
    // A structured value of (data type, 32-bit value) elements.
    uint32_t sd_value(const std::vector<std::pair<uint32_t, uint32_t>> &els) {
        uint32_t off = uint32_t(strings.add(8 + 16 * (els.empty() ? 1 : els.size())));
        strings.put(off, els.size(), 4);
        for (size_t i = 0; i < els.size(); i++) {
            strings.put(off + 8 + 16 * i, els[i].first, 4);
            strings.put(off + 16 + 16 * i, els[i].second, 4);
        }
        return off;
    }

    // Records with a name, an id, a data type and a variety list of [1, 1].
    buf &pattr(bool of_class, const std::string &name, int32_t id, uint32_t dt) {
        buf &r = (of_class ? pattrsC : pattrs).emplace_back(record(big, PATTR));
        r.put(0, of_class ? 0x43444237 : 0x43444239, 4);
        r.put(4, 0x4, 4);
        r.put(8, strings.text(name), 4);
        r.put(32, uint32_t(id), 4);
        r.put(36, dt, 4);
        r.put(40, varieties({{1, 1}}), 4);
        r.put(48, NONE, 4);
        r.put(56, NONE, 4);
        r.put(64, 0xFFFF, 2);
        return r;
    }
    // A dynamic attribute; a numeric one gets the range 0 to 100.
    buf &dattr(bool of_class, const std::string &name, int32_t id, uint32_t dt) {
        buf &r = (of_class ? dattrsC : dattrs).emplace_back(record(big, DATTR));
        r.put(0, of_class ? 0x43444238 : 0x43444261, 4);
        r.put(8, strings.text(name), 4);
        if (dt == 2 || dt == 3)
            r.put(48, 100, 4);
        r.put(56, varieties({{1, 1}}), 4);
        for (size_t f : {64, 72, 80, 88})
            r.put(f, NONE, 4);
        r.put(104, dt, 4);
        r.put(118, 255, 2);
        r.put(120, uint32_t(id), 4);
        r.put(124, 0xFFFF, 2);
        return r;
    }
    buf &action(bool of_class, const std::string &name, int32_t id) {
        buf &r = (of_class ? actionsC : actions).emplace_back(record(big, ACTION));
        r.put(0, of_class ? 0x43444263 : 0x43444262, 4);
        r.put(4, uint32_t(id), 4);
        r.put(20, 0x40, 4);
        r.put(24, strings.text(name), 4);
        r.put(32, varieties({{1, 1}}), 4);
        r.put(40, NONE, 4);
        r.put(48, NONE, 4);
        return r;
    }

    // The dsect: record, the six record tables, variety lists, SD definitions,
    // valid values, then the strings rounded to 8.
    std::vector<uint8_t> dsect() const {
        buf d = rec;
        const std::vector<buf> *tables[] = {&pattrsC, &dattrsC, &pattrs, &dattrs, &actionsC, &actions};
        const size_t ref_at[] = {24, 32, 40, 48, 96, 104};
        for (size_t i = 0; i < 6; i++) {
            d.put(ref_at[i], d.b.size(), 4);
            d.put(168 + 2 * i, tables[i]->size(), 2);
            for (const buf &r : *tables[i])
                d.b.insert(d.b.end(), r.b.begin(), r.b.end());
        }
        const std::pair<const buf *, std::pair<size_t, size_t>> lists[] = {
            {&vl, {128, 184}}, {&sd, {144, 192}}, {&vv, {152, 196}}};
        for (const auto &[t, at] : lists) {
            d.put(at.first, d.b.size(), 4);
            d.put(at.second, t->b.size(), 4);
            d.b.insert(d.b.end(), t->b.begin(), t->b.end());
        }
        d.put(160, d.b.size(), 4);
        d.b.insert(d.b.end(), strings.b.begin(), strings.b.end());
        d.pad8();
        return d.b;
    }

    bool big;
    buf rec;
    buf strings, vl, vv, sd;
    std::vector<buf> pattrsC, dattrsC, pattrs, dattrs, actionsC, actions;
};

struct test_var_class {
    std::string name;
    std::optional<std::string> alias;
    std::vector<uint32_t> ids;
};

// The XOR checksum over the image as it stands.
inline void fix_checksum(std::vector<uint8_t> &image, bool big) {
    buf f{big, std::move(image)};
    uint32_t sum = uint32_t(f.get(0, 4));
    for (size_t off = 8; off + 4 <= f.b.size(); off += 4)
        sum ^= uint32_t(f.get(off, 4));
    f.put(4, sum, 4);
    image = std::move(f.b);
}

// The whole file: header, anchors, the class dsects, the manager, the map
// (catalog and manager name as given) and the variable classes.
inline std::vector<uint8_t> image(const std::vector<test_class> &classes, const std::string &manager = "Test.RM",
                                  const std::vector<test_var_class> &vcs = {}) {
    bool big = classes.at(0).big;
    std::vector<std::pair<uint32_t, std::vector<uint8_t>>> dsects;
    for (const test_class &c : classes)
        dsects.emplace_back(5, c.dsect());
    // Each string table is rounded from its own start.
    auto with_strings = [](buf r, const buf &strings) {
        r.b.insert(r.b.end(), strings.b.begin(), strings.b.end());
        return r.b;
    };
    buf mgr = record(big, MGR), mgr_strings{big, {}};
    mgr.put(0, 0x43444233, 4);
    mgr.put(8, mgr_strings.text(manager), 4);
    dsects.emplace_back(3, with_strings(mgr, mgr_strings));
    buf map = record(big, MAP), map_strings{big, {}};
    map.put(0, 0x43444232, 4);
    map.put(8, map_strings.text("test.cat"), 4);
    map.put(16, MAP, 4);
    map.put(24, 1, 2);
    map.put(26, 1, 2);
    map.put(28, 5, 2);
    dsects.emplace_back(6, with_strings(map, map_strings));
    for (const test_var_class &v : vcs) {
        buf strings{big, {}};
        buf r = record(big, VARCLASS);
        r.put(0, 0x43444234, 4);
        r.put(8, strings.text(v.name), 4);
        r.put(16, v.alias ? strings.text(*v.alias) : NONE, 4);
        r.put(24, v.ids.size(), 4);
        r.put(28, strings.b.size(), 4);
        r.b.insert(r.b.end(), strings.b.begin(), strings.b.end());
        for (uint32_t id : v.ids)
            r.put(r.b.size(), id, 4);
        r.pad8();
        dsects.emplace_back(4, r.b);
    }
    buf f = record(big, 80 + 16 * dsects.size());
    f.put(8, 0x666D7431, 4);
    f.put(24, dsects.size(), 4);
    const uint16_t sizes[] = {224, 60, 24, 40, 72, 136, 56, 48, 8};
    for (size_t i = 0; i < 9; i++)
        f.put(32 + 2 * i, sizes[i], 2);
    for (size_t i = 0; i < dsects.size(); i++) {
        f.put(80 + 16 * i, dsects[i].first, 4);
        f.put(84 + 16 * i, f.b.size(), 4);
        f.put(88 + 16 * i, dsects[i].second.size(), 4);
        f.b.insert(f.b.end(), dsects[i].second.begin(), dsects[i].second.end());
    }
    f.put(0, f.b.size() - 4, 4);
    fix_checksum(f.b, big);
    return f.b;
}

} // namespace cdbtest

#endif
