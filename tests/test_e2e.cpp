// End-to-end cases: each directory under tests/e2e holds a source and the
// expected results of running the built qecfg on it.
//
//   input.src   the source, copied into a fresh working directory
//   args        the command line after the program name (default
//               "input.src out.cdef"); one argument per word
//   status      expected exit status (default 0)
//   stdout      expected standard output, exactly (default empty)
//   stderr      expected standard error, exactly (default empty)
//   env         NAME=VALUE lines added to the environment, -NAME lines
//               removing a variable (ZU_CDB_FORCE_EMPTY_TIMESTAMP=1 is set
//               unless removed)
//   checks      lines "FILE u8|u16|u32|u64 OFFSET VALUE", "FILE bytes OFFSET HEX",
//               "FILE size N", "FILE absent", "FILE str OFFSET TEXT"
//   FILE.hex    the whole expected content of FILE, as hexadecimal
//               (whitespace and text after '#' on a line are ignored)
// The checks read fields at fixed offsets on purpose: they pin where the
// compiler lays each byte, which a reader following the file's references
// would not see. Every CDB a run leaves must also open in libcdb and pass its
// full check.
#include <gtest/gtest.h>

#include <filesystem>

#include "cdb_read_support.h"
#include "e2e_support.h"

namespace fs = std::filesystem;

namespace {

std::vector<std::string> case_names() {
    std::vector<std::string> names;
    for (const auto &d : fs::directory_iterator(fs::path(QECFG_SOURCE_DIR) / "tests" / "e2e"))
        if (d.is_directory())
            names.push_back(d.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}

class E2E : public ::testing::TestWithParam<std::string> {};

TEST_P(E2E, Case) {
    fs::path dir = fs::path(QECFG_SOURCE_DIR) / "tests" / "e2e" / GetParam();
    e2e::run_result r = e2e::run_case(dir, QECFG_BIN);
    EXPECT_EQ(r.status, std::stoi(e2e::read_or(dir / "status", "0")));
    EXPECT_EQ(r.out, e2e::read_or(dir / "stdout", ""));
    EXPECT_EQ(r.err, e2e::read_or(dir / "stderr", ""));
    for (const std::string &failure : e2e::check_outputs(dir, r.work))
        ADD_FAILURE() << failure;
    for (const auto &e : fs::directory_iterator(r.work))
        if (e.path().extension() == ".cdef") {
            EXPECT_TRUE(read_cdb(e2e::read_file(e.path())).valid()) << e.path().filename();
        }
    e2e::remove_run(r);
}

INSTANTIATE_TEST_SUITE_P(Cases, E2E, ::testing::ValuesIn(case_names()),
                         [](const ::testing::TestParamInfo<std::string> &i) { return i.param; });

} // namespace
