// The compiler as a library: every example and end-to-end source, compiled
// to a file, to memory, and from memory to memory, gives the same image (or
// the same message and status) and the same traces, plain and reversed.
#include <gtest/gtest.h>

#include "compile_support.h"
#include "e2e_support.h"

namespace fs = std::filesystem;

namespace {

struct outcome {
    int status;
    std::string message, image, out, err;
    bool operator==(const outcome &) const = default;
};

template <typename F> outcome traced(qecfg::options opt, F compile) {
    captured_stream so, se;
    opt.trace_out = so.file();
    opt.trace_err = se.file();
    std::string image;
    qecfg::result r = compile(opt, image);
    return outcome{r.status, r.message, image, so.text(), se.text()};
}

struct Library : ::testing::TestWithParam<int> {
    fs::path work;
    void SetUp() override {
        setenv("ZU_CDB_FORCE_EMPTY_TIMESTAMP", "1", 1);
        char tmpl[] = "/tmp/qecfg-library-XXXXXX";
        work = mkdtemp(tmpl);
    }
    void TearDown() override { fs::remove_all(work); }
};

TEST_P(Library, FileAndMemorySinksAgree) {
    qecfg::options opt;
    opt.reverse_byte_order = GetParam() == 1;
    opt.trace_level = GetParam() == 2 ? 3 : 0;
    const std::string out = (work / "out.cdef").string();
    for (const fs::path &src : e2e::all_sources()) {
        SCOPED_TRACE(src.string());
        outcome to_file = traced(opt, [&](const qecfg::options &o, std::string &image) {
            fs::remove(out);
            qecfg::result r = qecfg::compile_to_file(qecfg::source::file(src.string()), out, o);
            image = e2e::read_or(out, "");
            return r;
        });
        auto to_memory = [&](const qecfg::source &s) {
            return traced(opt, [&](qecfg::options o, std::string &image) {
                o.output_name = out;
                std::vector<std::uint8_t> bytes{1, 2, 3}; // replaced, whatever it held
                qecfg::result r = qecfg::compile_to_memory(s, bytes, o);
                image.assign(bytes.begin(), bytes.end());
                return r;
            });
        };
        const std::string text = e2e::read_file(src);
        EXPECT_EQ(to_memory(qecfg::source::file(src.string())), to_file);
        EXPECT_EQ(to_memory(qecfg::source::bytes(src.string(), text)), to_file);
        EXPECT_EQ(to_file.status != 0, to_file.image.empty());
    }
}

INSTANTIATE_TEST_SUITE_P(Options, Library, ::testing::Values(0, 1, 2), [](const ::testing::TestParamInfo<int> &i) {
    return std::string(i.param == 0 ? "plain" : i.param == 1 ? "reversed" : "traced");
});

TEST(LibrarySource, MessagesNameAnInMemorySourceByItsName) {
    std::vector<std::uint8_t> image;
    qecfg::options opt;
    opt.message_newline = false;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::file("/no/such.src"), image, opt);
    EXPECT_EQ(r.status, ENOENT);
    EXPECT_EQ(r.message, "/no/such.src: cannot open because: No such file or directory");
    EXPECT_FALSE(r);
    // An empty source held in memory is read like an empty file.
    r = qecfg::compile_to_memory(qecfg::source::bytes("empty.src", ""), image, opt);
    EXPECT_EQ(r.message, "No classes defined");
    // A NUL byte is read as it is from a file, and refused.
    std::string nul = BASE_SOURCE + std::string("\0", 1) + "\nBogus\n";
    EXPECT_EQ(compile_text(nul).message, "16: NUL character in source\n");
}

} // namespace
