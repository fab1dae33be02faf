// Every example and end-to-end source compiled with and without -s: the
// reversed image has the same length, the same anchors read the other way
// round, identifiers that read "CDB" and the kind letter, and a checksum
// that holds in the foreign order.
#include <gtest/gtest.h>

#include "compile_support.h"
#include "e2e_support.h"

namespace fs = std::filesystem;

namespace {

// The sources that compile with the default command line.
std::vector<std::string> compiling_sources() {
    std::vector<std::string> v;
    for (const fs::path &p : e2e::all_sources()) {
        fs::path dir = p.parent_path();
        if (p.filename() != "input.src" || (!fs::exists(dir / "status") && !fs::exists(dir / "args")))
            v.push_back(p.string());
    }
    return v;
}

uint32_t be32(const std::string &b, size_t off) {
    return uint32_t(uint8_t(b[off])) << 24 | uint32_t(uint8_t(b[off + 1])) << 16 | uint32_t(uint8_t(b[off + 2])) << 8 |
           uint8_t(b[off + 3]);
}

class SwapE2E : public ::testing::TestWithParam<std::string> {};

TEST_P(SwapE2E, ReversedImageMatchesThePlainOne) {
    std::string src = e2e::read_file(GetParam());
    compile_result plain = compile_text(src);
    compile_result swapped = compile_text(src, [](qecfg::options &o) { o.reverse_byte_order = true; });
    ASSERT_EQ(plain.message, "");
    ASSERT_EQ(swapped.message, "");
    const std::string &a = plain.cdb, &b = swapped.cdb;
    ASSERT_EQ(a.size(), b.size());
    EXPECT_TRUE(e2e::check_cdb(b, true).empty());
    EXPECT_EQ(std::string(b, 8, 4), "fmt1");
    uint32_t n = u32_at(a, 24);
    EXPECT_EQ(be32(b, 24), n);
    for (uint32_t i = 0; i < n; i++) {
        size_t anchor = 80 + 16 * size_t(i);
        for (size_t f = 0; f < 16; f += 4)
            EXPECT_EQ(be32(b, anchor + f), u32_at(a, anchor + f)) << "anchor " << i;
        size_t dsect = u32_at(a, anchor + 4);
        EXPECT_EQ(std::string(b, dsect, 3), "CDB");
        EXPECT_EQ(be32(b, dsect), u32_at(a, dsect));
    }
}

INSTANTIATE_TEST_SUITE_P(Sources, SwapE2E, ::testing::ValuesIn(compiling_sources()),
                         [](const ::testing::TestParamInfo<std::string> &i) {
                             fs::path p(i.param);
                             std::string name = p.filename() == "input.src" ? p.parent_path().filename().string()
                                                                            : p.stem().string();
                             for (char &c : name)
                                 if (!std::isalnum(static_cast<unsigned char>(c)))
                                     c = '_';
                             return name;
                         });

} // namespace
