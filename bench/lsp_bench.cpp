// Benchmark of the language server on a large source: diagnostics after a
// one-character edit, completion, and the memory an open document holds.
// The server runs in-process, message by message, as the loop drives it.
//
//   qecfg_lsp_bench [--runs N] [SIZE_MB]     (default: 50 runs, 1 MB)
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <malloc.h>
#include <string>
#include <vector>

#include "check_source.h"
#include "server.h"

namespace {

using lsp::json;
using clock_type = std::chrono::steady_clock;

const std::string URI = "file:///bench/input.src";
constexpr int ATTRS_PER_CLASS = 5000;

// Classes of persistent attributes, every eighth a dynamic one in a
// variable class; the map and the variable classes at the end.
std::string source_of(size_t bytes) {
    std::string s;
    char buf[512];
    for (int i = 0; s.size() < bytes; i++) {
        if (i % ATTRS_PER_CLASS == 0) {
            std::snprintf(buf, sizeof buf,
                          "ControlDefinition\n\tFileVersion=1.0\nResourceClass\n\tDescription=1\n\tDisplayName=2\n"
                          "\tProperties=HasResources\n\tClassPermTemplate=t\n\tResourcePermTemplate=t\n"
                          "\tLocator=A%d\n\tName=Bench.C%d\n",
                          i, i / ATTRS_PER_CLASS);
            s += buf;
        }
        if (i % 8 == 7)
            std::snprintf(buf, sizeof buf,
                          "DynamicResourceAttribute\n\tName=D%d\n\tDescription=3\n\tDisplayName=4\n\tId=%d\n"
                          "\tDataType=Float64\n\tVariableType=Quantity\n\tVarietyRange=1,1\n\tVariableClass=VC%d\n",
                          i, i, i % 4);
        else
            std::snprintf(buf, sizeof buf,
                          "PersistentResourceAttribute\n\tName=A%d\n\tDescription=3\n\tDisplayName=4\n\tId=%d\n"
                          "\tDataType=UInt32\n\tVarietyRange=1,1\n\tDefaultValue=%d\n",
                          i, i, i);
        s += buf;
    }
    s += "ClassToManagerMapping\n\tResourceManager=Bench.RM\n\tFirstKey=1\n\tLastKey=10\n\tMessageCatalog=b.cat\n"
         "\tDescriptiveMessageSet=1\n";
    for (int v = 0; v < 4; v++)
        s += "ResourceVariableClass\n\tObservationInterval=60\n\tReportingInterval=60\n\tVariableClass=VC" +
             std::to_string(v) + "\n";
    return s;
}

int id = 1;

json message(const std::string &method, json params, bool request) {
    json m = {{"jsonrpc", "2.0"}, {"method", method}, {"params", std::move(params)}};
    if (request)
        m["id"] = id++;
    return m;
}

json at(int line, int character) {
    return {{"textDocument", {{"uri", URI}}}, {"position", {{"line", line}, {"character", character}}}};
}

// Wall and CPU time of one piece of work, in milliseconds. On a shared
// machine the CPU time is the fairer figure.
struct timing {
    std::vector<double> wall, cpu;
};

double thread_cpu_ms() {
    timespec t{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &t);
    return double(t.tv_sec) * 1e3 + double(t.tv_nsec) / 1e6;
}

template <typename F> void measure(timing &t, F work) {
    double cpu = thread_cpu_ms();
    auto start = clock_type::now();
    work();
    t.wall.push_back(std::chrono::duration<double, std::milli>(clock_type::now() - start).count());
    t.cpu.push_back(thread_cpu_ms() - cpu);
}

void request(timing &t, lsp::server &s, const json &msg) {
    measure(t, [&] { s.handle(msg); });
}

double median(std::vector<double> v) {
    std::sort(v.begin(), v.end());
    return v[v.size() / 2];
}

void report(const char *what, const timing &t) {
    std::printf("%-36s %9.2f %9.2f\n", what, median(t.wall), median(t.cpu));
}

// The first line at or after `from` that starts with `prefix`.
int line_starting(const std::string &text, const std::string &prefix, int from) {
    int line = 0;
    for (size_t pos = 0; pos < text.size(); pos = text.find('\n', pos) + 1, line++)
        if (line >= from && text.compare(pos, prefix.size(), prefix) == 0)
            return line;
    return -1;
}

} // namespace

int main(int argc, char **argv) {
    int runs = 50;
    double mb = 1;
    for (int i = 1; i < argc; i++) {
        std::string a = argv[i];
        if (a == "--runs" && i + 1 < argc)
            runs = std::max(1, std::atoi(argv[++i]));
        else
            mb = std::atof(a.c_str());
    }
    std::string text = source_of(size_t(mb * 1e6));
    int lines = int(std::count(text.begin(), text.end(), '\n'));
    lsp::server s;
    s.handle(message("initialize", json::object(), true));

    size_t heap_before = mallinfo2().uordblks;
    timing open, edit, checker, first_completion, keyword, value, varclasses;
    size_t diagnostics = 0;
    measure(open, [&] {
        std::vector<json> out = s.handle(message(
            "textDocument/didOpen",
            {{"textDocument", {{"uri", URI}, {"languageId", "qecfg"}, {"version", 1}, {"text", text}}}}, false));
        diagnostics = out.at(0)["params"]["diagnostics"].size();
    });
    // The model is read on the first request that needs it.
    s.handle(message("textDocument/documentSymbol", {{"textDocument", {{"uri", URI}}}}, true));
    size_t heap_after = mallinfo2().uordblks;

    int description = line_starting(text, "\tDescription=3", lines / 2);
    int datatype = line_starting(text, "\tDataType=UInt32", lines / 2);
    int varclass = line_starting(text, "\tVariableClass=VC", lines / 2);
    for (int r = 0; r < runs; r++) {
        json change = {{"range",
                        {{"start", {{"line", description}, {"character", 13}}},
                         {"end", {{"line", description}, {"character", 14}}}}},
                       {"text", r % 2 ? "3" : "4"}};
        request(edit, s,
                message("textDocument/didChange",
                        {{"textDocument", {{"uri", URI}, {"version", r + 2}}}, {"contentChanges", {change}}}, false));
        request(first_completion, s, message("textDocument/completion", at(description, 1), true));
        request(keyword, s, message("textDocument/completion", at(description, 1), true));
        request(value, s, message("textDocument/completion", at(datatype, 10), true));
        request(varclasses, s, message("textDocument/completion", at(varclass, 15), true));
        // The checker's own share: one check of the same text.
        measure(checker, [&] { check::check_text("input.src", text, check::check_options{}); });
    }
    std::printf("source: %.2f MB, %d lines, %zu diagnostics; %d runs\n", double(text.size()) / 1e6, lines, diagnostics,
                runs);
    std::printf("%-36s %9s %9s\n", "median ms", "wall", "cpu");
    report("open (diagnostics)", open);
    report("one-char edit -> diagnostics", edit);
    report("  the checker alone (check_text)", checker);
    report("completion, first after the edit", first_completion);
    report("completion of statements", keyword);
    report("completion after DataType=", value);
    report("completion after VariableClass=", varclasses);
    std::printf("memory of the open document %.1f MB (%.1f x the source)\n", double(heap_after - heap_before) / 1e6,
                double(heap_after - heap_before) / double(text.size()));
    return 0;
}
