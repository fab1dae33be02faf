// The command line: modes, usage errors, exit statuses, standard input.
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include <gtest/gtest.h>

#include "cdbdump_main.h"
#include "test_images.h"

namespace {
struct cli_result {
    int status;
    std::string out, err;
};

std::string slurp(FILE *f) {
    std::rewind(f);
    std::string s;
    for (int c; (c = std::fgetc(f)) != EOF;) s += char(c);
    std::fclose(f);
    return s;
}

cli_result cli(std::vector<std::string> args) {
    args.insert(args.begin(), "cdbdump");
    std::vector<char *> argv;
    for (std::string &a : args) argv.push_back(a.data());
    FILE *out = std::tmpfile(), *err = std::tmpfile();
    int status = cdbdump_main(int(argv.size()), argv.data(), out, err);
    return cli_result{status, slurp(out), slurp(err)};
}

// A file holding the bytes, removed with the object.
struct temp_file {
    std::string path;
    explicit temp_file(const std::vector<uint8_t> &bytes, const char *name = "_cdbdump_cli.cdef")
        : path((std::filesystem::temp_directory_path() / (std::to_string(getpid()) + name)).string()) {
        std::ofstream(path, std::ios::binary).write(reinterpret_cast<const char *>(bytes.data()), long(bytes.size()));
    }
    ~temp_file() { std::filesystem::remove(path); }
};

std::vector<uint8_t> corrupt_image() {
    std::vector<uint8_t> b = cdbtest::one_attribute_class(false);
    b[200] ^= 1; // the checksum no longer matches
    return b;
}

int run_binary(const std::string &args) {
    int status = std::system((std::string(CDBDUMP_BIN) + " " + args + " >/dev/null 2>&1").c_str());
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}
} // namespace

TEST(Cli, UsageErrorsExitWithTwo) {
    const std::pair<std::vector<std::string>, const char *> cases[] = {
        {{}, "no FILE given"},
        {{"--json", "--check", "x"}, "only one of"},
        {{"--frob", "x"}, "unknown option --frob"},
        {{"a", "b"}, "more than one FILE"},
        {{"/nonexistent/x.cdef"}, "cannot open"},
    };
    for (const auto &[args, message] : cases) {
        cli_result r = cli(args);
        EXPECT_EQ(r.status, 2) << message;
        EXPECT_NE(r.err.find(message), std::string::npos) << r.err;
        EXPECT_TRUE(r.out.empty());
    }
    EXPECT_NE(cli({}).err.find("usage: cdbdump [--check | --json | --annotate | --source]"), std::string::npos);
}

TEST(Cli, HelpAndVersion) {
    cli_result help = cli({"-h"});
    EXPECT_EQ(help.status, 0);
    for (const char *part : {"usage: cdbdump", "--annotate", "exit status:"})
        EXPECT_NE(help.out.find(part), std::string::npos);
    EXPECT_EQ(cli({"--version"}).out.rfind("cdbdump ", 0), 0u);
}

TEST(Cli, ModesAndExitStatuses) {
    temp_file good(cdbtest::one_attribute_class(true)), bad(corrupt_image(), "_cdbdump_cli_bad.cdef");
    cli_result check = cli({"--check", good.path});
    EXPECT_EQ(check.status, 0);
    EXPECT_TRUE(check.out.empty() && check.err.empty());
    EXPECT_EQ(cli({good.path}).out.rfind("byte_order: big\n", 0), 0u);
    EXPECT_EQ(cli({"--json", good.path}).out.rfind("{\n  \"byte_order\": \"big\",", 0), 0u);
    EXPECT_NE(cli({"--source", good.path}).out.find("\tName=Size\n"), std::string::npos);
    EXPECT_EQ(cli({"--annotate", good.path}).status, 0);

    cli_result invalid = cli({"--json", bad.path});
    EXPECT_EQ(invalid.status, 1);
    EXPECT_TRUE(invalid.out.empty());
    EXPECT_EQ(invalid.err.rfind(bad.path + ": offset 4: the checksum", 0), 0u) << invalid.err;
    cli_result annotated = cli({"--annotate", bad.path});
    EXPECT_EQ(annotated.status, 1);
    EXPECT_NE(annotated.out.find("00000004  !! the checksum"), std::string::npos);
}

TEST(Cli, ReadsStandardInput) {
    temp_file good(cdbtest::one_attribute_class(false)), bad(corrupt_image(), "_cdbdump_cli_bad.cdef");
    EXPECT_EQ(run_binary("--check - < " + good.path), 0);
    EXPECT_EQ(run_binary("--check - < " + bad.path), 1);
    EXPECT_EQ(run_binary("--check"), 2);
}
