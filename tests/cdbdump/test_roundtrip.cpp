// With the compiler: every example, every end-to-end source that compiles and
// a source of awkward values decode; source -> CDB -> --source -> CDB keeps
// the content; a reversed-byte-order CDB holds the same content; the streamed
// renderings equal those of the whole tree.
#include <sys/wait.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include <gtest/gtest.h>

#include "cdb_source.h"
#include "cdb_to_tree.h"
#include "cdb_walk.h"
#include "test_dirs.h"
#include "test_images.h"

namespace fs = std::filesystem;
using namespace cdbdump;

namespace {
std::vector<fs::path> sources() {
    std::vector<fs::path> found;
    fs::path root = QECFG_SOURCE_DIR;
    for (const char *dir : {"examples", "tests/e2e", "tests/cdbdump"})
        if (fs::exists(root / dir))
            for (const auto &e : fs::recursive_directory_iterator(root / dir))
                if (e.path().extension() == ".src")
                    found.push_back(e.path());
    std::sort(found.begin(), found.end());
    return found;
}

using cdbtest::work_dir;

// Compiles in the work directory; the class name of an unnamed class then
// comes from the same output name every time.
bool compile(const fs::path &dir, const std::string &args) {
    std::string cmd = "cd '" + dir.string() + "' && " QECFG_BIN " " + args + " >/dev/null 2>&1";
    int status = std::system(cmd.c_str());
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

std::vector<uint8_t> bytes_of(const fs::path &p) {
    std::ifstream in(p, std::ios::binary);
    return std::vector<uint8_t>(std::istreambuf_iterator<char>(in), {});
}

// The content that must survive, without positions, timestamp and, when
// asked, byte order.
std::string content(const cdb_file &f, bool with_order) {
    node t = to_tree(f);
    t.erase("layout");
    t.find("header")->erase("timestamp");
    if (!with_order)
        t.erase("byte_order");
    return to_json(t);
}

cdb_file read(const fs::path &p) {
    std::vector<uint8_t> b = bytes_of(p);
    return verify(b.data(), b.size());
}
} // namespace

TEST(RoundTrip, SourceToCdbToSourceKeepsTheContent) {
    setenv("ZU_CDB_FORCE_EMPTY_TIMESTAMP", "1", 1);
    size_t compiled = 0;
    for (const fs::path &src : sources()) {
        SCOPED_TRACE(src.string());
        work_dir w;
        fs::copy_file(src, w.path / "in.src");
        if (!compile(w.path, "in.src out.cdef"))
            continue; // a source the compiler refuses
        compiled++;
        cdb_file original;
        ASSERT_NO_THROW(original = read(w.path / "out.cdef"));
        std::vector<uint8_t> bytes = bytes_of(w.path / "out.cdef");
        EXPECT_EQ(cdbtest::streamed(bytes, tree_writer::style::json), to_json(to_tree(original)));
        EXPECT_EQ(cdbtest::streamed(bytes, tree_writer::style::text), to_text(to_tree(original)));
        EXPECT_EQ(cdbtest::streamed_annotation(bytes, 256), cdbtest::streamed_annotation(bytes, bytes.size()));

        decompiled d = decompile(original);
        for (const std::string &warning : d.warnings)
            EXPECT_NE(warning.find("can only come from the output file name"), std::string::npos) << warning;
        std::ofstream(w.path / "back.src") << d.text;
        ASSERT_TRUE(compile(w.path, "back.src out.cdef")) << d.text;
        EXPECT_EQ(content(read(w.path / "out.cdef"), true), content(original, true)) << d.text;

        fs::create_directory(w.path / "s");
        ASSERT_TRUE(compile(w.path / "s", "-s ../in.src out.cdef"));
        cdb_file swapped = read(w.path / "s" / "out.cdef");
        EXPECT_NE(swapped.big_endian, original.big_endian);
        EXPECT_EQ(content(swapped, false), content(original, false));
    }
    EXPECT_GE(compiled, 2u); // at least the example and the awkward source
}
