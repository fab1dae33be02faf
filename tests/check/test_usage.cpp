// Each command's --help against its manual page: the same synopsis and the
// same options, operands, environment variables and exit statuses with the
// same words, read back from what the built command prints and from the
// roff of the page. Also qecfg's --help and --version themselves.
#include <gtest/gtest.h>

#include <fcntl.h>
#include <filesystem>
#include <map>
#include <regex>
#include <sstream>
#include <unistd.h>

#include "e2e_support.h"

namespace fs = std::filesystem;

namespace {

struct command_text {
    std::vector<std::string> synopsis;
    std::map<std::string, std::string> items; // term -> its text, blanks collapsed
};

std::string collapsed(const std::string &s) {
    std::string o = std::regex_replace(s, std::regex("\\s+"), " ");
    size_t start = o.find_first_not_of(' '), end = o.find_last_not_of(' ');
    return start == std::string::npos ? "" : o.substr(start, end + 1 - start);
}

// The help text: "usage:" lines, then sections whose items start at column
// 2 and whose continuation lines are indented further.
command_text parse_help(const std::string &help) {
    command_text t;
    std::istringstream in(help);
    std::string term;
    bool in_items = false;
    for (std::string line; std::getline(in, line);) {
        std::smatch m;
        if (std::regex_match(line, m, std::regex(R"((?:usage:| {6}) (\S+ .*))")) && !in_items)
            t.synopsis.push_back(m[1]);
        else if (std::regex_match(line, std::regex(R"((options|operands|environment|exit status):)")))
            in_items = true, term.clear();
        else if (in_items && std::regex_match(line, m, std::regex(R"(  (\S(?:\S| \S)*)(?:  +(.*))?)")))
            t.items[term = m[1]] = m[2];
        else if (in_items && !term.empty() && line.rfind("   ", 0) == 0)
            t.items[term] = collapsed(t.items[term] + " " + line);
        else if (line.empty() || line.rfind("output:", 0) == 0)
            term.clear(), in_items = line.empty() && in_items;
    }
    return t;
}

std::string roff_text(std::string s) {
    s = std::regex_replace(s, std::regex(R"(\\f[BIR])"), "");
    s = std::regex_replace(s, std::regex(R"(\\-)"), "-");
    s = std::regex_replace(s, std::regex(R"(\\&)"), "");
    return std::regex_replace(s, std::regex(R"(\\e)"), "\\");
}

// The page's SYNOPSIS lines (each form ".B name" and its arguments) and its
// tagged paragraphs (.TP, term, text up to the next request).
command_text parse_page(const std::string &page) {
    command_text t;
    std::istringstream in(page);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);)
        lines.push_back(line);
    bool synopsis = false;
    for (size_t i = 0; i < lines.size(); i++) {
        if (lines[i].rfind(".SH", 0) == 0)
            synopsis = lines[i] == ".SH SYNOPSIS";
        if (synopsis && lines[i].rfind(".B ", 0) == 0 && i + 1 < lines.size())
            t.synopsis.push_back(lines[i].substr(3) + " " + roff_text(lines[i + 1]));
        if (lines[i] != ".TP" || i + 1 >= lines.size())
            continue;
        std::string text;
        for (size_t j = i + 2; j < lines.size() && lines[j][0] != '.'; j++)
            text += " " + roff_text(lines[j]);
        t.items[roff_text(lines[i + 1])] = collapsed(text);
    }
    return t;
}

std::string read_source_file(const std::string &rel) { return e2e::read_file(fs::path(QECFG_SOURCE_DIR) / rel); }

e2e::run_result run_in_temp(const std::string &program, const std::vector<std::string> &args) {
    fs::path work = fs::temp_directory_path() / ("qecfg-usage-" + std::to_string(::getpid()));
    fs::create_directories(work);
    return e2e::run(work, program, args, {});
}

TEST(Usage, EveryManualPageSaysWhatItsCommandsHelpSays) {
    const std::pair<const char *, const char *> commands[] = {
        {QECFG_BIN, "man/qecfg.1.in"}, {CDBDUMP_BIN, "man/cdbdump.1.in"}, {QECFG_CHECK_BIN, "man/qecfg-check.1.in"}};
    for (const auto &[program, page] : commands) {
        e2e::run_result r = run_in_temp(program, {"--help"});
        EXPECT_EQ(r.status, 0) << program;
        EXPECT_EQ(r.err, "") << program;
        command_text help = parse_help(r.out), man = parse_page(read_source_file(page));
        EXPECT_GE(help.items.size(), 6u) << program;
        ASSERT_FALSE(help.synopsis.empty()) << program;
        EXPECT_EQ(help.synopsis, man.synopsis) << page;
        EXPECT_EQ(help.items, man.items) << page;
        // Filled text fits a terminal; a synopsis line stays whole.
        std::istringstream lines(r.out);
        for (std::string line; std::getline(lines, line);)
            if (line.find(" " + help.synopsis.front()) == std::string::npos &&
                line.find(" " + help.synopsis.back()) == std::string::npos) {
                EXPECT_LE(line.size(), 79u) << program << ": " << line;
            }
        remove_run(r);
    }
}

TEST(Usage, QecfgHelpAndVersionOnlyAsTheFirstArgument) {
    e2e::run_result help = run_in_temp(QECFG_BIN, {"--help"});
    EXPECT_EQ(help.status, 0);
    EXPECT_EQ(help.out.rfind("usage: qecfg [-n] [-d level] [-s] cdefsrc_filename cdef_filename\n", 0), 0u);
    for (const char *part : {"ZU_CDB_FORCE_EMPTY_TIMESTAMP", "SOURCE_DATE_EPOCH", "exit status:", "output:"})
        EXPECT_NE(help.out.find(part), std::string::npos) << part;
    remove_run(help);

    std::smatch version;
    std::string cmake = read_source_file("CMakeLists.txt");
    ASSERT_TRUE(std::regex_search(cmake, version, std::regex(R"(project\(qecfg VERSION ([0-9.]+))")));
    e2e::run_result v = run_in_temp(QECFG_BIN, {"--version", "ignored"});
    EXPECT_EQ(v.status, 0);
    EXPECT_EQ(v.out, "qecfg " + version[1].str() + "\n");
    EXPECT_EQ(v.err, "");
    remove_run(v);
}

TEST(Usage, QecfgHelpThatCannotBeWrittenFails) {
    fs::path work = fs::temp_directory_path() / ("qecfg-usage-full-" + std::to_string(::getpid()));
    fs::create_directories(work);
    // Standard output on a full device: the text is lost, so is success.
    e2e::run_result r = e2e::run(work, QECFG_BIN, {"--help"}, {}, [] {
        int fd = ::open("/dev/full", O_WRONLY);
        ::dup2(fd, 1);
    });
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "qecfg: cannot write the output: No space left on device\n");
    remove_run(r);
}

} // namespace
