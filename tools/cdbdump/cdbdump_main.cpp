#include "cdbdump_main.h"

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "cdb_annotate.h"
#include "cdb_source.h"
#include "cdb_to_tree.h"
#include "cdb_walk.h"

namespace {
const char usage_line[] = "usage: cdbdump [--check | --json | --annotate | --source] [-h|--help] [--version] FILE\n";

const char help_text[] = "NAME\n"
                         "    cdbdump - inspect, verify and decompile a class definition database (CDB)\n"
                         "\n"
                         "SYNOPSIS\n"
                         "    cdbdump [--check | --json | --annotate | --source] [-h|--help] [--version] FILE\n"
                         "\n"
                         "DESCRIPTION\n"
                         "    Reads the CDB in FILE (- for standard input), in either byte order, and\n"
                         "    verifies all of it before printing anything: the length and checksum, the\n"
                         "    anchors, every dsect, record, list, string and value body. The first\n"
                         "    violation is reported as FILE: offset N: what is wrong.\n"
                         "\n"
                         "    Without an option, prints everything the file holds as indented text:\n"
                         "    the header, the layout of the dsects, then each dsect.\n"
                         "\n"
                         "OPTIONS\n"
                         "    --check      print nothing; only set the exit status\n"
                         "    --json       print the same content as one JSON document\n"
                         "    --annotate   print every byte range in order: offset, bytes, field and\n"
                         "                 value; flag each violation where it stands (!!) instead of\n"
                         "                 stopping at the first\n"
                         "    --source     print a class definition source that the compiler turns\n"
                         "                 back into a CDB of the same content; what no source can\n"
                         "                 say is reported as a warning and as a comment in place\n"
                         "    -h, --help   print this text\n"
                         "    --version    print the version\n"
                         "\n"
                         "EXIT STATUS\n"
                         "    0  success\n"
                         "    1  FILE is not a valid CDB (--annotate: violations were flagged)\n"
                         "    2  a usage error, or FILE cannot be read\n";

enum class mode { text, check, json, annotate, source };

int usage_error(FILE *err, const std::string &what) {
    std::fprintf(err, "cdbdump: %s\n%s", what.c_str(), usage_line);
    return 2;
}

bool read_all(FILE *in, std::vector<uint8_t> &bytes) {
    uint8_t buf[65536];
    size_t got;
    while ((got = std::fread(buf, 1, sizeof buf, in)) > 0) bytes.insert(bytes.end(), buf, buf + got);
    return !std::ferror(in);
}

int run(mode m, const std::string &name, const std::vector<uint8_t> &bytes, FILE *out, FILE *err) {
    if (m == mode::annotate) {
        cdbdump::annotation a = cdbdump::annotate_walk(bytes.data(), bytes.size());
        std::fputs(cdbdump::annotation_text(bytes.data(), bytes.size(), a).c_str(), out);
        return a.violations ? 1 : 0;
    }
    cdbdump::cdb_file f;
    try {
        f = cdbdump::verify(bytes.data(), bytes.size());
    } catch (const cdbdump::cdb_invalid &e) {
        std::fprintf(err, "%s: offset %zu: %s\n", name.c_str(), e.offset, e.message.c_str());
        return 1;
    }
    switch (m) {
    case mode::check: break;
    case mode::json: std::fputs(cdbdump::to_json(cdbdump::to_tree(f)).c_str(), out); break;
    case mode::source: {
        cdbdump::decompiled d = cdbdump::decompile(f);
        std::fputs(d.text.c_str(), out);
        for (const std::string &w : d.warnings) std::fprintf(err, "%s: warning: %s\n", name.c_str(), w.c_str());
        break;
    }
    default: std::fputs(cdbdump::to_text(cdbdump::to_tree(f)).c_str(), out); break;
    }
    return 0;
}
} // namespace

int cdbdump_main(int argc, char **argv, FILE *out, FILE *err) {
    const std::pair<const char *, mode> modes[] = {
        {"--check", mode::check}, {"--json", mode::json}, {"--annotate", mode::annotate}, {"--source", mode::source}};
    mode m = mode::text;
    bool mode_given = false, options_done = false;
    std::vector<std::string> operands;
    for (int i = 1; i < argc; i++) {
        std::string a = argv[i];
        if (options_done || a == "-" || a.empty() || a[0] != '-') {
            operands.push_back(a);
            continue;
        }
        if (a == "--") {
            options_done = true;
            continue;
        }
        if (a == "-h" || a == "--help") {
            std::fputs(help_text, out);
            return 0;
        }
        if (a == "--version") {
            std::fputs("cdbdump " QECFG_VERSION "\n", out);
            return 0;
        }
        bool known = false;
        for (const auto &[opt, mm] : modes)
            if (a == opt) {
                if (mode_given) return usage_error(err, "only one of --check, --json, --annotate and --source");
                m = mm;
                mode_given = known = true;
            }
        if (!known) return usage_error(err, "unknown option " + a);
    }
    if (operands.size() != 1) return usage_error(err, operands.empty() ? "no FILE given" : "more than one FILE given");
    std::vector<uint8_t> bytes;
    const std::string &path = operands[0];
    bool from_stdin = path == "-";
    FILE *in = from_stdin ? stdin : std::fopen(path.c_str(), "rb");
    std::string name = from_stdin ? "(standard input)" : path;
    if (!in) {
        std::fprintf(err, "cdbdump: %s: cannot open: %s\n", name.c_str(), std::strerror(errno));
        return 2;
    }
    bool ok = read_all(in, bytes);
    if (!from_stdin) std::fclose(in);
    if (!ok) {
        std::fprintf(err, "cdbdump: %s: cannot read\n", name.c_str());
        return 2;
    }
    return run(m, name, bytes, out, err);
}
