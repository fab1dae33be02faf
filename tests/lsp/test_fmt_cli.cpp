// qecfg-fmt's command line: standard output, --check and -i; both commands'
// help and version.
#include <fstream>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "e2e_support.h"
#include "lsp_support.h"

namespace {

namespace fs = std::filesystem;

const std::string MESSY = "ControlDefinition \n    FileVersion=1.0\n";
const std::string TIDY = "ControlDefinition\n\tFileVersion=1.0\n";

fs::path work_dir() {
    static int serial = 0;
    fs::path dir =
        fs::temp_directory_path() / ("qecfg-fmt-" + std::to_string(getpid()) + "-" + std::to_string(serial++));
    fs::create_directories(dir);
    return dir;
}

void write(const fs::path &p, const std::string &text) { std::ofstream(p, std::ios::binary) << text; }

TEST(FmtCli, PrintsChecksAndRewrites) {
    fs::path dir = work_dir();
    write(dir / "a.src", MESSY);
    write(dir / "b.src", TIDY);
    chmod((dir / "a.src").c_str(), 0640);
    e2e::run_result r = e2e::run(dir, QECFG_FMT_BIN, {"a.src"}, {});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.out, TIDY);
    r = e2e::run(dir, QECFG_FMT_BIN, {"--check", "a.src", "b.src"}, {});
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.out, "a.src\n");
    r = e2e::run(dir, QECFG_FMT_BIN, {"-i", "a.src", "b.src"}, {});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(slurp((dir / "a.src").string()), TIDY);
    struct stat st {};
    stat((dir / "a.src").c_str(), &st);
    EXPECT_EQ(st.st_mode & 0777, 0640u);
    EXPECT_EQ(e2e::run(dir, QECFG_FMT_BIN, {"--check", "a.src", "b.src"}, {}).status, 0);
    EXPECT_EQ(e2e::run(dir, QECFG_FMT_BIN, {"missing.src"}, {}).status, 2);
    EXPECT_EQ(e2e::run(dir, QECFG_FMT_BIN, {"--bogus"}, {}).status, 2);
    fs::remove_all(dir);
}

// Help and version go to standard output with status 0, for both commands.
TEST(FmtCli, HelpAndVersionOfBothCommands) {
    fs::path dir = work_dir();
    for (const char *bin : {QECFG_FMT_BIN, QECFG_LSP_BIN}) {
        std::string name = fs::path(bin).filename().string();
        e2e::run_result r = e2e::run(dir, bin, {"--version"}, {});
        EXPECT_EQ(r.status, 0) << name;
        EXPECT_EQ(r.out, name + " " QECFG_VERSION "\n");
        r = e2e::run(dir, bin, {"--help"}, {});
        EXPECT_EQ(r.status, 0) << name;
        EXPECT_EQ(r.out.rfind("usage: " + name + " ", 0), 0u) << r.out;
        EXPECT_EQ(r.err, "");
    }
    fs::remove_all(dir);
}

} // namespace
