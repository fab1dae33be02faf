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
    for (int c; (c = std::fgetc(f)) != EOF;)
        s += char(c);
    std::fclose(f);
    return s;
}

cli_result cli(std::vector<std::string> args) {
    args.insert(args.begin(), "cdbdump");
    std::vector<char *> argv;
    for (std::string &a : args)
        argv.push_back(a.data());
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
    EXPECT_NE(cli({}).err.find("usage: cdbdump [--check | --json | --annotate | --source | --header]"),
              std::string::npos);
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

// The header names every identifier of the image by its source name; a C
// compiler checks the values against those the image was written with.
TEST(Cli, HeaderDefinesTheIdentifiersForC) {
    temp_file f(cdbtest::rich_image(true), "_cdbdump_rich.cdef");
    cli_result r = cli({"--header", f.path});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_NE(r.out.find("#define RICH_CLASS_CLASS_NAME \"Rich.Class\"\n"), std::string::npos) << r.out;
    temp_file header(std::vector<uint8_t>(r.out.begin(), r.out.end()), "_rich_cdb.h");
    std::string check = header.path + ".c";
    std::ofstream(check) << "#include \"" << header.path << "\"\n"
                         << "typedef char level[RICH_CLASS_PATTR_LEVEL == 2 ? 1 : -1];\n"
                         << "typedef char vendor[RICH_CLASS_PATTR_CLASS_VENDOR == 1 ? 1 : -1];\n"
                         << "typedef char load[RICH_CLASS_DATTR_LOAD == 5 ? 1 : -1];\n"
                         << "typedef char count[RICH_CLASS_DATTR_CLASS_COUNT == 1 ? 1 : -1];\n"
                         << "typedef char reset[RICH_CLASS_ACTION_RESET == 3 ? 1 : -1];\n"
                         << "typedef char id[RICH_CLASS_CLASS_ID == 0 ? 1 : -1];\n"
                         << "#include \"" << header.path << "\"\n"; // the guard keeps a second inclusion harmless
    int status = std::system(("cc -std=c99 -pedantic -Werror -fsyntax-only " + check).c_str());
    std::filesystem::remove(check);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(cli({"--header", "--json", f.path}).status, 2);
}

TEST(Cli, HeaderIdentifiersAreCNames) {
    cdbtest::test_class c(false, "9lives.Cl-ass");
    c.pattr(false, "a.b", 1, 2);
    c.pattr(false, "A_B", 2, 2); // the same C name: left out with a comment
    temp_file f(cdbtest::image({c}));
    cli_result r = cli({"--header", f.path});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_NE(r.out.find("#define _9LIVES_CL_ASS_PATTR_A_B 1\n"), std::string::npos) << r.out;
    EXPECT_NE(r.out.find("/* attribute: _9LIVES_CL_ASS_PATTR_A_B is already defined above */"), std::string::npos);
    EXPECT_EQ(cli({"--header", temp_file(corrupt_image()).path}).status, 1);
}
