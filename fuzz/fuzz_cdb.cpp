// Fuzz harness of libcdb: any bytes as a CDB, with the format word written in
// each byte order and the checksum made right, so that the input reaches the
// dsects in both. After cdb_open every function of the library runs on every
// item (the sanitizers catch any read outside the buffer); a file the full
// check accepts must be one whose lookups all agree with the walk, that the
// cdbdump walker finds no violation in, and that reads the same through the
// model cdbdump builds.
#include <cstdint>
#include <cstdlib>
#include <vector>

#include "cdb_visit.h"
#include "cdb_walk.h"

namespace {
void fix_checksum(std::vector<uint8_t> &b, bool big) {
    auto word = [&](size_t off) {
        uint32_t v = 0;
        for (int i = 0; i < 4; i++)
            v |= uint32_t(b[off + i]) << (big ? 8 * (3 - i) : 8 * i);
        return v;
    };
    uint32_t sum = word(0);
    for (size_t off = 8; off + 4 <= b.size(); off += 4)
        sum ^= word(off);
    for (int i = 0; i < 4; i++)
        b[4 + i] = uint8_t(sum >> (big ? 8 * (3 - i) : 8 * i));
}

void exercise(const std::vector<uint8_t> &b) {
    cdb_t db;
    if (cdb_open(&db, b.data(), b.size()) != CDB_OK)
        return;
    cdbtest::visitor walk;
    walk.run(db);
    std::vector<unsigned char> scratch(cdb_check_scratch_size(&db));
    size_t bad = 0;
    if (cdb_check(&db, nullptr, 0, &bad) != CDB_OK && bad >= b.size())
        std::abort();
    if (cdb_check(&db, scratch.data(), scratch.size(), &bad) != CDB_OK)
        return;
    if (walk.disagreements() != 0 || cdbdump::annotate_walk(b.data(), b.size()).violations != 0)
        std::abort();
    cdbdump::verify(b.data(), b.size());
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::vector<uint8_t> b(data, data + size);
    exercise(b);
    if (size < 12)
        return 0;
    for (bool big : {false, true}) {
        const uint8_t word[4] = {0x66, 0x6d, 0x74, 0x31}; // the format word, most significant byte first
        for (int i = 0; i < 4; i++)
            b[8 + size_t(i)] = word[big ? i : 3 - i];
        if (size % 4 == 0)
            fix_checksum(b, big);
        exercise(b);
    }
    return 0;
}
