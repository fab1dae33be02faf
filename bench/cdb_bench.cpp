// libcdb's benchmark: the full check of a large CDB, opening it, and finding
// an attribute by class name and id in a CDB of 1,000 classes, beside the
// floor: reading the file once. The CDBs are compiled in memory from
// generated sources and written to files, which the reads map.
//
//   cdb_bench [--mb N] [--dir DIR] [--keep] [benchmark flags]
//
// --keep leaves the two CDBs in DIR (cdb-bench-big.cdef, cdb-bench-1000.cdef).
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "qecfg/cdb_reader.h"
#include "qecfg/qecfg.h"

namespace {

// Classes of `attrs` persistent attributes of a few types, with defaults and
// valid values, and dynamic attributes with ranges.
std::string source(int classes, int attrs) {
    static const char *const types[][2] = {
        {"Int32", "7"}, {"String", "\"text\""}, {"Int32Array", "5"}, {"UInt64", "99"}};
    std::string s;
    char b[512];
    for (int c = 0; c < classes; c++) {
        std::snprintf(b, sizeof b,
                      "ControlDefinition\n    FileVersion=1.0\nResourceClass\n    Description=1\n    DisplayName=2\n"
                      "    Properties=HasResources\n    ClassPermTemplate=t\n    ResourcePermTemplate=t\n    "
                      "Name=Bench.Class%d\n",
                      c);
        s += b;
        for (int a = 0; a < attrs; a++) {
            const char *const *t = types[a % 4];
            if (a % 5 == 4)
                std::snprintf(b, sizeof b,
                              "DynamicResourceAttribute\n    Name=Dyn%d\n    Description=1\n    DisplayName=2\n"
                              "    Id=%d\n    DataType=Float64\n    VariableType=Quantity\n    VarietyRange=1,1\n"
                              "    Range=0,1000\n    InitialValue=1.25\n",
                              a, a);
            else
                std::snprintf(b, sizeof b,
                              "PersistentResourceAttribute\n    Name=Attr%d\n    Description=1\n    DisplayName=2\n"
                              "    Id=%d\n    DataType=%s\n    VarietyRange=1,1\n    Properties=Public\n"
                              "    ValidValue=%s\n    DefaultValue=%s\n",
                              a, a, t[0], t[1], t[1]);
            s += b;
        }
    }
    return s + "ClassToManagerMapping\n    ResourceManager=Bench.RM\n    FirstKey=1\n    LastKey=9\n";
}

struct mapped {
    const unsigned char *data = nullptr;
    size_t size = 0;
    std::string path;
};

mapped make_cdb(const std::string &dir, const char *name, int classes, int attrs) {
    std::string text = source(classes, attrs);
    std::vector<std::uint8_t> image;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::bytes("bench.src", text), image);
    if (!r) {
        std::fprintf(stderr, "%s", r.message.c_str());
        std::exit(2);
    }
    mapped m;
    m.path = dir + "/" + name;
    FILE *f = std::fopen(m.path.c_str(), "wb");
    if (!f || std::fwrite(image.data(), 1, image.size(), f) != image.size() || std::fclose(f) != 0) {
        std::perror(m.path.c_str());
        std::exit(2);
    }
    int fd = open(m.path.c_str(), O_RDONLY);
    m.size = image.size();
    m.data = static_cast<const unsigned char *>(mmap(nullptr, m.size, PROT_READ, MAP_PRIVATE, fd, 0));
    close(fd);
    return m;
}

mapped big, many;

void open_db(benchmark::State &state, const mapped &m, cdb_t &db) {
    if (cdb_open(&db, m.data, m.size) != CDB_OK)
        state.SkipWithError("the CDB does not open");
}

// The floor: reading the file once into memory.
void read_file(benchmark::State &state) {
    std::vector<char> buf(1 << 20);
    for (auto _ : state) {
        int fd = open(big.path.c_str(), O_RDONLY);
        size_t total = 0;
        for (ssize_t n; (n = read(fd, buf.data(), buf.size())) > 0;)
            total += size_t(n);
        close(fd);
        benchmark::DoNotOptimize(total);
    }
    state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(big.size));
}

void full_check(benchmark::State &state) {
    cdb_t db;
    open_db(state, big, db);
    std::vector<unsigned char> scratch(state.range(0) ? cdb_check_scratch_size(&db) : 0);
    for (auto _ : state)
        if (cdb_check(&db, scratch.empty() ? nullptr : scratch.data(), scratch.size(), nullptr) != CDB_OK)
            state.SkipWithError("the check fails");
    state.SetBytesProcessed(int64_t(state.iterations()) * int64_t(big.size));
    state.SetLabel(state.range(0) ? "with the overlap map" : "without the overlap map");
}

void open_only(benchmark::State &state) {
    cdb_t db;
    for (auto _ : state)
        benchmark::DoNotOptimize(cdb_open(&db, big.data, big.size));
}

// An attribute by class name and id, the classes and ids taken in turn.
void find_attribute(benchmark::State &state) {
    cdb_t db;
    open_db(state, many, db);
    std::vector<uint32_t> mem(cdb_index_size(&db) / 4);
    cdb_index_t ix;
    cdb_index_build(&ix, &db, mem.data(), mem.size() * 4);
    std::vector<std::string> names;
    for (int c = 0; c < 1000; c++)
        names.push_back("Bench.Class" + std::to_string(c));
    size_t k = 0;
    bool indexed = state.range(0) != 0;
    for (auto _ : state) {
        cdb_class_t c;
        cdb_attr_t a;
        const char *name = names[k % names.size()].c_str();
        int err = indexed ? cdb_index_find_class(&ix, name, &c) : cdb_find_class(&db, name, &c);
        if (err == CDB_OK)
            err = cdb_find_attr(&c, CDB_PATTR, int32_t(k % 8 == 4 ? 3 : k % 8), &a);
        if (err != CDB_OK)
            state.SkipWithError("not found");
        k++;
    }
    state.SetLabel(indexed ? "with the index" : "by scanning the anchors");
}

} // namespace

BENCHMARK(read_file)->Unit(benchmark::kMillisecond);
BENCHMARK(full_check)->Arg(1)->Arg(0)->Unit(benchmark::kMillisecond);
BENCHMARK(open_only)->Unit(benchmark::kMicrosecond);
BENCHMARK(find_attribute)->Arg(1)->Arg(0)->Unit(benchmark::kNanosecond);

int main(int argc, char **argv) {
    int mb = 70;
    bool keep = false;
    std::string dir = "/tmp";
    std::vector<char *> rest{argv[0]};
    for (int i = 1; i < argc; i++) {
        std::string a = argv[i];
        if (a == "--mb" && i + 1 < argc)
            mb = std::atoi(argv[++i]);
        else if (a == "--dir" && i + 1 < argc)
            dir = argv[++i];
        else if (a == "--keep")
            keep = true;
        else
            rest.push_back(argv[i]);
    }
    // About 150 bytes of CDB per attribute.
    big = make_cdb(dir, "cdb-bench-big.cdef", std::max(1, mb * 1000000 / 150 / 6000), 6000);
    many = make_cdb(dir, "cdb-bench-1000.cdef", 1000, 8);
    std::printf("big CDB: %.1f MB; CDB of 1000 classes: %.1f MB\n", double(big.size) / 1e6, double(many.size) / 1e6);
    int n = int(rest.size());
    benchmark::Initialize(&n, rest.data());
    benchmark::RunSpecifiedBenchmarks();
    if (!keep) {
        std::remove(big.path.c_str());
        std::remove(many.path.c_str());
    }
    return 0;
}
