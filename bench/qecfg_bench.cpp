// Benchmark of the compiler at scale: generates valid sources of chosen sizes
// and shapes, compiles each with the qecfg binary to a new name and over an
// existing file, and in-process to memory, and reports the best wall and CPU
// (user + system) times of each, throughput, peak memory and the ratio of the
// compile time to the floor: reading the same file once in pieces of at most
// 254 characters, touching every byte; and the time that flushing the output
// file and its directory to disk adds, for a new name and a replacement.
//
// Shapes: mixed (classes with attributes of every data type and their
// values, actions, structured data and variable classes), classes (many bare
// classes), varclasses (many variable classes).
//
//   qecfg_bench [--qecfg PATH] [--dir DIR] [--runs N] [--shape SHAPE] SIZE_MB...
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <string>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

#include "qecfg/qecfg.h"

namespace {

using clock_type = std::chrono::steady_clock;

constexpr int ATTRS_PER_CLASS = 6000; // well below the 65535 records a table may hold

const char *const SCALAR_VALUES[][2] = {
    {"Int32", "-123456"}, {"UInt32", "4000000000"}, {"Int64", "-9000000000"},    {"UInt64", "18000000000"},
    {"Float32", "1.5e3"}, {"Float64", "0x1p-3"},    {"String", "\"some text\""}, {"Binary", "0x00ff10aa"},
    {"Int32Array", "7"},  {"StringArray", "elem"},  {"BinaryArray", "ab\\101"},  {"RH", nullptr},
};

struct generator {
    FILE *f;
    int cls = 0, attr = 0;

    void element(const char *kind, const char *name, int idx, const char *type) {
        std::fprintf(
            f, "%s\n    ElementName=%s\n    Description=1\n    DisplayName=2\n    ElementIndex=%d\n    DataType=%s\n",
            kind, name, idx, type);
    }

    void start_class() {
        std::fprintf(f,
                     "ControlDefinition\n    FileVersion=1.0.%d\nResourceClass\n    Description=1\n    DisplayName=2\n"
                     "    Properties=HasResources,CanDefine\n    ClassPermTemplate=t\n    ResourcePermTemplate=t\n"
                     "    Name=Bench.Class%d\n",
                     cls, cls);
        element("DefineSDDefinition", "Input", 0, "String");
        element("DefineSDDefinition", "Size", 1, "UInt64");
        std::fprintf(
            f,
            "ResourceAction\n    Name=Act%d\n    Description=1\n    DisplayName=2\n    Id=1\n    VarietyRange=1,1\n"
            "    Permission=x\n",
            cls);
        element("ActionInSDDefinition", "Arg", 0, "Int32");
        cls++;
        attr = 0;
    }

    void persistent(int i) {
        const char *const *tv = SCALAR_VALUES[i % (sizeof SCALAR_VALUES / sizeof SCALAR_VALUES[0])];
        std::fprintf(f,
                     "PersistentResourceAttribute\n    Name=Attr%d\n    Description=%d\n    DisplayName=%d\n    Id=%d\n"
                     "    DataType=%s\n    VarietyRange=1,1\n    Properties=Public,ReqdForDefine\n",
                     i, i & 0x7fff, i & 0x7fff, i, tv[0]);
        if (tv[1]) {
            std::fprintf(f, "    ValidValue=%s\n    ValueDisplayName=3\n", tv[1]);
            std::fprintf(f, "    DefaultValue=%s\n", tv[1]);
        }
    }

    void dynamic(int i) {
        std::fprintf(f,
                     "DynamicResourceAttribute\n    Name=Dyn%d\n    Description=1\n    DisplayName=2\n    Id=%d\n"
                     "    DataType=Float64\n    VariableType=Quantity\n    VarietyRange=1,1\n    VariableClass=VC%d\n"
                     "    Range=0,1000\n    InitialValue=1.25\n",
                     i, i, i % 4);
    }

    void structured(int i) {
        std::fprintf(f,
                     "PersistentClassAttribute\n    Name=Sd%d\n    Description=1\n    DisplayName=2\n    Id=%d\n"
                     "    DataType=SD\n    VarietyRange=1,1\n",
                     i, i);
        element("PAttrSDDefinition", "A", 0, "Int32");
        element("PAttrSDDefinition", "B", 1, "String");
    }

    void stanza() {
        if (cls == 0 || attr >= ATTRS_PER_CLASS)
            start_class();
        int i = attr++;
        switch (i % 8) {
        case 6: dynamic(i); break;
        case 7: structured(i); break;
        default: persistent(i); break;
        }
    }

    void finish() {
        std::fprintf(f, "ClassToManagerMapping\n    ResourceManager=Bench.RM\n    FirstKey=1\n    LastKey=100\n"
                        "    MessageCatalog=bench.cat\n    DescriptiveMessageSet=1\n");
        for (int v = 0; v < 4; v++)
            std::fprintf(f,
                         "ResourceVariableClass\n    VariableClass=VC%d\n    ObservationInterval=60\n"
                         "    ReportingInterval=60\n",
                         v);
    }
};

void generate(const std::string &path, size_t bytes, const std::string &shape) {
    FILE *f = std::fopen(path.c_str(), "w");
    if (!f) {
        std::perror(path.c_str());
        std::exit(2);
    }
    generator g{f};
    if (shape == "classes") {
        while (size_t(std::ftell(f)) < bytes)
            std::fputs("ControlDefinition\n", f);
    } else if (shape == "varclasses") {
        g.start_class();
        for (int v = 4; size_t(std::ftell(f)) < bytes; v++)
            std::fprintf(f,
                         "ResourceVariableClass\n    VariableClass=VC%d\n    ObservationInterval=60\n"
                         "    ReportingInterval=60\n",
                         v);
    } else {
        while (size_t(std::ftell(f)) < bytes)
            g.stanza();
    }
    g.finish();
    std::fclose(f);
}

// Reading the file as the compiler's reader does, touching every byte.
double floor_seconds(const std::string &path) {
    auto t0 = clock_type::now();
    FILE *f = std::fopen(path.c_str(), "r");
    char buf[256];
    unsigned long sum = 0;
    while (std::fgets(buf, 255, f))
        for (const char *p = buf; *p; p++)
            sum += static_cast<unsigned char>(*p);
    std::fclose(f);
    double s = std::chrono::duration<double>(clock_type::now() - t0).count();
    if (sum == 1) // keeps the loop
        std::puts("");
    return s;
}

struct measure {
    double wall = 1e30, cpu = 1e30;
    long max_rss_kb = 0;
};

// Runs `work` in a child process and keeps the best times of the runs so far.
template <typename F> void run_child(measure &m, F work) {
    auto t0 = clock_type::now();
    pid_t pid = fork();
    if (pid == 0)
        _exit(work());
    int st = 0;
    struct rusage ru {};
    wait4(pid, &st, 0, &ru);
    double wall = std::chrono::duration<double>(clock_type::now() - t0).count();
    if (!WIFEXITED(st) || WEXITSTATUS(st) != 0) {
        std::fprintf(stderr, "the compile failed with status %d\n", WIFEXITED(st) ? WEXITSTATUS(st) : 128);
        std::exit(1);
    }
    auto seconds = [](const timeval &tv) { return double(tv.tv_sec) + double(tv.tv_usec) / 1e6; };
    m.wall = std::min(m.wall, wall);
    m.cpu = std::min(m.cpu, seconds(ru.ru_utime) + seconds(ru.ru_stime));
    m.max_rss_kb = std::max(m.max_rss_kb, long(ru.ru_maxrss));
}

int exec_qecfg(const std::string &qecfg, const std::string &src, const std::string &out) {
    execl(qecfg.c_str(), "qecfg", src.c_str(), out.c_str(), static_cast<char *>(nullptr));
    return 127;
}

int compile_to_memory(const std::string &src, const std::string &out) {
    qecfg::options opt;
    opt.output_name = out;
    std::vector<std::uint8_t> image;
    return qecfg::compile_to_memory(qecfg::source::file(src), image, opt).status;
}

// The time flushing adds to a compile to a file, new or replaced: the
// output compiled without flushes is flushed as the compiler would (the file,
// then its directory), timed alone so that the compile's CPU time, noisy on a
// shared machine, does not blur it. The best of the runs.
struct flush_cost {
    double best = 1e30;

    void run(const std::string &src, const std::string &out, const std::string &dir, bool replace) {
        if (!replace)
            std::remove(out.c_str());
        qecfg::options opt;
        opt.skip_disk_flush = true;
        if (qecfg::compile_to_file(qecfg::source::file(src), out, opt).status != 0) {
            std::fprintf(stderr, "the compile to %s failed\n", out.c_str());
            std::exit(1);
        }
        auto t0 = clock_type::now();
        int file = open(out.c_str(), O_RDONLY), directory = open(dir.c_str(), O_RDONLY | O_DIRECTORY);
        if (file < 0 || directory < 0 || fsync(file) != 0 || fsync(directory) != 0) {
            std::perror(out.c_str());
            std::exit(1);
        }
        close(file);
        close(directory);
        best = std::min(best, std::chrono::duration<double>(clock_type::now() - t0).count());
    }
};

} // namespace

int main(int argc, char **argv) {
    std::string qecfg = "./qecfg", dir = "/tmp";
    std::string shape = "mixed";
    int runs = 3;
    std::vector<double> sizes;
    for (int i = 1; i < argc; i++) {
        std::string a = argv[i];
        if (a == "--qecfg" && i + 1 < argc)
            qecfg = argv[++i];
        else if (a == "--dir" && i + 1 < argc)
            dir = argv[++i];
        else if (a == "--shape" && i + 1 < argc)
            shape = argv[++i];
        else if (a == "--runs" && i + 1 < argc)
            runs = std::atoi(argv[++i]);
        else
            sizes.push_back(std::atof(a.c_str()));
    }
    if (sizes.empty())
        sizes = {1, 10, 100};
    std::printf("%-10s %9s %9s | %8s %8s %8s %9s | %8s %8s | %8s %8s %9s | %8s %9s %10s | %9s %10s\n", "shape",
                "source MB", "output MB", "new s", "cpu s", "MB/s", "RSS MB", "replace", "cpu s", "memory", "cpu s",
                "RSS MB", "floor s", "new/floor", "cpu/floor", "flush new", "flush repl");
    for (double mb : sizes) {
        std::string src = dir + "/qecfg-bench.src", out = dir + "/qecfg-bench.cdef";
        generate(src, size_t(mb * 1e6), shape);
        measure fresh, replace, memory;
        flush_cost flush_new, flush_replace;
        double fl = 1e30;
        for (int k = 0; k < runs; k++) {
            fl = std::min(fl, floor_seconds(src));
            std::remove(out.c_str());
            run_child(fresh, [&] { return exec_qecfg(qecfg, src, out); });
            run_child(replace, [&] { return exec_qecfg(qecfg, src, out); });
            run_child(memory, [&] { return compile_to_memory(src, out); });
            flush_new.run(src, out, dir, false);
            flush_replace.run(src, out, dir, true);
        }
        struct stat sb {
        }, ob{};
        stat(src.c_str(), &sb);
        stat(out.c_str(), &ob);
        double src_mb = double(sb.st_size) / 1e6;
        std::printf(
            "%-10s %9.1f %9.1f | %8.3f %8.3f %8.1f %9.1f | %8.3f %8.3f | %8.3f %8.3f %9.1f | %8.3f %9.2f %10.2f | "
            "%9.3f %10.3f\n",
            shape.c_str(), src_mb, double(ob.st_size) / 1e6, fresh.wall, fresh.cpu, src_mb / fresh.wall,
            double(fresh.max_rss_kb) / 1024.0, replace.wall, replace.cpu, memory.wall, memory.cpu,
            double(memory.max_rss_kb) / 1024.0, fl, fresh.wall / fl, fresh.cpu / fl, flush_new.best,
            flush_replace.best);
        std::remove(src.c_str());
        std::remove(out.c_str());
    }
    return 0;
}
