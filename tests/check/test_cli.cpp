// The checker's command line, and its agreement with qecfg: on every
// end-to-end case that compiles a source, both succeed or both fail alike.
#include <gtest/gtest.h>

#include <filesystem>
#include <optional>
#include <regex>

#include "check_support.h"
#include "e2e_support.h"
#include "warnings.h"

namespace fs = std::filesystem;

namespace {

struct cli_case {
    std::vector<std::string> args;
    int status;
    std::string out_start, err_start;
};

TEST(CommandLine, OptionsAndStatuses) {
    const cli_case cases[] = {
        {{"--help"}, 0, "usage: qecfg-check [-W NAME", ""},
        {{"-h"}, 0, "usage: qecfg-check", ""},
        {{"--version"}, 0, "qecfg-check ", ""},
        {{"-W", "list"}, 0, "locator                on   ", ""},
        {{"-Wno-locator", "-W", "list"}, 0, "locator                off  ", ""},
        {{}, 2, "", "qecfg-check: no source given\n"},
        {{"-W", "bogus", "x.src"}, 2, "", "qecfg-check: unknown warning 'bogus' (see -W list)\n"},
        {{"-Wbogus", "x.src"}, 2, "", "qecfg-check: unknown warning 'bogus'"},
        {{"-o"}, 2, "", "qecfg-check: option -o needs an argument\n"},
        {{"--frobnicate", "x.src"}, 2, "", "qecfg-check: unknown option --frobnicate\n"},
        {{"no-such-dir/missing.src"}, 2, "", "no-such-dir/missing.src: error: cannot open because: No such file"},
    };
    for (const cli_case &c : cases) {
        check_run r = run_checker(c.args);
        std::string line = c.args.empty() ? "(none)" : c.args[0];
        EXPECT_EQ(r.status, c.status) << line;
        EXPECT_EQ(r.out.rfind(c.out_start, 0), 0u) << line << ": " << r.out;
        EXPECT_EQ(r.err.rfind(c.err_start, 0), 0u) << line << ": " << r.err;
        if (c.err_start.empty()) {
            EXPECT_EQ(r.err, "");
        }
    }
}

TEST(CommandLine, ListNamesEveryWarning) {
    check_run r = run_checker({"-W", "list"});
    for (const check::warning_check &w : check::warning_checks())
        EXPECT_NE(r.out.find(std::string(w.name) + " "), std::string::npos) << w.name;
}

TEST(CommandLine, ReadmeExplainsEveryWarning) {
    std::ifstream in(fs::path(QECFG_SOURCE_DIR) / "README.md");
    std::string readme((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    for (const check::warning_check &w : check::warning_checks())
        EXPECT_NE(readme.find("| `" + std::string(w.name) + "` | "), std::string::npos) << w.name;
}

TEST(CommandLine, AFailedWriteIsAnError) {
    std::FILE *full = std::fopen("/dev/full", "w");
    ASSERT_NE(full, nullptr);
    captured_stream err;
    EXPECT_EQ(check::checker_main({"--help"}, full, err.file()), 2);
    std::fclose(full);
}

TEST(CommandLine, EverySourceIsCheckedAndTheWorstStatusWins) {
    fs::path dir = fs::temp_directory_path() / ("qecfg-check-multi-" + std::to_string(getpid()));
    fs::create_directories(dir);
    fs::copy_file(fs::path(QECFG_SOURCE_DIR) / "examples" / "disk.src", dir / "good.src");
    std::ofstream(dir / "bad.src") << "Bogus\n";
    check_run r = run_checker({(dir / "bad.src").string(), (dir / "good.src").string()});
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, (dir / "bad.src").string() + ":1: error: Invalid table name: Bogus: no such stanza type "
                                                  "(statements must be indented)\n");
    fs::remove_all(dir);
}

TEST(Examples, CheckCleanly) {
    for (const auto &f : fs::recursive_directory_iterator(fs::path(QECFG_SOURCE_DIR) / "examples")) {
        if (f.path().extension() != ".src")
            continue;
        check_run r = run_checker({"-Werror", f.path().string()});
        EXPECT_EQ(r.status, 0) << f.path();
        EXPECT_EQ(r.err, "");
    }
}

// The operands of a qecfg command line as its getopt("nd:s") sees them, or
// nothing when qecfg stops before compiling (an option error, fewer than two
// operands).
std::optional<std::pair<std::string, std::string>> compile_operands(const std::vector<std::string> &args) {
    std::vector<std::string> operands;
    for (size_t i = 0; i < args.size(); i++) {
        const std::string &a = args[i];
        if (a == "--") {
            operands.insert(operands.end(), args.begin() + long(i) + 1, args.end());
            break;
        }
        if (a.size() < 2 || a[0] != '-') {
            operands.push_back(a);
            continue;
        }
        for (size_t k = 1; k < a.size(); k++) {
            if (a[k] == 'd') {
                if (k + 1 == a.size() && ++i == args.size())
                    return std::nullopt;
                break;
            }
            if (a[k] != 'n' && a[k] != 's')
                return std::nullopt;
        }
    }
    if (operands.size() < 2)
        return std::nullopt;
    return std::make_pair(operands[0], operands[1]);
}

std::vector<std::string> words_of(const std::string &text) {
    std::istringstream in(text);
    std::vector<std::string> w;
    for (std::string s; in >> s;)
        w.push_back(s);
    return w;
}

// The checker's status for qecfg's: 0 and 1 alike, any system error 2.
int checker_status_for(int qecfg_status) { return qecfg_status == 0 ? 0 : qecfg_status == 1 ? 1 : 2; }

TEST(Agreement, SameOutcomeAsQecfgOnEveryFuzzSeedSource) {
    int compared = 0;
    for (const auto &f : fs::directory_iterator(fs::path(QECFG_SOURCE_DIR) / "fuzz" / "corpus" / "qecfg")) {
        fs::path work = fs::temp_directory_path() / ("qecfg-check-seed-" + std::to_string(getpid()));
        fs::create_directories(work);
        e2e::run_result q = e2e::run(work, QECFG_BIN, {f.path().string(), "out.cdef"}, {});
        check_run c = run_checker({"-o", "out.cdef", f.path().string()});
        EXPECT_EQ(c.status, checker_status_for(q.status)) << f.path() << ": " << q.err << c.err;
        e2e::remove_run(q);
        compared++;
    }
    EXPECT_GT(compared, 50);
}

TEST(Agreement, SameOutcomeAsQecfgOnEveryEndToEndCase) {
    int compared = 0;
    for (const auto &d : fs::directory_iterator(fs::path(QECFG_SOURCE_DIR) / "tests" / "e2e")) {
        auto operands = compile_operands(words_of(e2e::read_or(d.path() / "args", "input.src out.cdef")));
        if (!operands)
            continue;
        e2e::run_result q = e2e::run_case(d.path(), QECFG_BIN);
        e2e::run_result c = e2e::run(q.work, QECFG_CHECK_BIN, {"-o", operands->second, operands->first}, {});
        EXPECT_EQ(c.status, checker_status_for(q.status)) << d.path().filename() << ": " << c.err;
        if (q.status == 1) {
            // The checker reports qecfg's own message, after its location.
            std::string message = std::regex_replace(q.err, std::regex("^[0-9]+: "), "");
            message = message.substr(0, std::min<size_t>(message.find('\n'), 20));
            EXPECT_NE(c.err.find(": error: " + message), std::string::npos) << q.err << c.err;
        }
        e2e::remove_run(q);
        e2e::remove_run(c);
        compared++;
    }
    EXPECT_GT(compared, 80);
}

} // namespace
