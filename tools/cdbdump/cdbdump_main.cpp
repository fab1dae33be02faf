#include "cdbdump_main.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <memory>
#include <new>
#include <optional>
#include <string>
#include <vector>

#include "cdb_annotate.h"
#include "cdb_diff.h"
#include "cdb_header.h"
#include "cdb_input.h"
#include "cdb_print.h"
#include "cdb_read.h"
#include "cdb_sink.h"
#include "cdb_source.h"
#include "cdb_to_tree.h"
#include "cdb_walk.h"
#include "cdbdump_usage.h"

using namespace cdbdump;

namespace {
const char usage_line[] =
    "usage: cdbdump [--check | --json | --annotate | --source | --header] [-h|--help] [--version] FILE\n"
    "       cdbdump --diff | --compat [--json] OLD NEW\n";

enum class mode { text, check, json, annotate, source, header, diff, compat };

struct command {
    mode m = mode::text;
    bool json = false; // --json beside --diff or --compat
    std::vector<std::string> operands;
};

int usage_error(FILE *err, const std::string &what) {
    std::fprintf(err, "cdbdump: %s\n%s", what.c_str(), usage_line);
    return 2;
}

std::string display_name(const std::string &path) { return path == "-" ? "(standard input)" : path; }

// Text such as a source file: printable bytes, tabs and line ends only.
bool looks_like_text(const uint8_t *data, size_t size) {
    size_t n = std::min<size_t>(size, 512);
    for (size_t i = 0; i < n; i++)
        if (!(data[i] >= 0x20 && data[i] < 0x7f) && data[i] != '\t' && data[i] != '\n' && data[i] != '\r')
            return false;
    return n > 0;
}

int report_invalid(FILE *err, const std::string &name, size_t offset, const std::string &message,
                   const input_file &in) {
    std::fprintf(err, "%s: offset %zu: %s\n", name.c_str(), offset, message.c_str());
    if (looks_like_text(in.data(), in.size()))
        std::fprintf(err, "%s: this looks like a class definition source, not a CDB; qecfg compiles it into one\n",
                     name.c_str());
    return 1;
}

// Loads the file; on failure reports it and gives the exit status.
std::optional<int> load(input_file &in, const std::string &path, FILE *err) {
    std::string name = display_name(path);
    switch (in.load(path)) {
    case input_file::outcome::loaded: return std::nullopt;
    case input_file::outcome::unreadable:
        std::fprintf(err, "cdbdump: %s: %s\n", name.c_str(), in.error().c_str());
        return 2;
    default: return report_invalid(err, name, in.refused_at(), in.error(), in);
    }
}

int inspect(mode m, const std::string &path, text_sink &out, FILE *err) {
    input_file in;
    if (auto status = load(in, path, err))
        return *status;
    if (m == mode::annotate)
        return write_annotation(in.data(), in.size(), out) ? 1 : 0;
    std::string name = display_name(path);
    try {
        if (m == mode::source) {
            decompiled d = decompile(verify(in.data(), in.size()));
            out << d.text;
            for (const std::string &w : d.warnings)
                std::fprintf(err, "%s: warning: %s\n", name.c_str(), w.c_str());
            return 0;
        }
        if (m == mode::check && library_accepts(in.data(), in.size()))
            return 0;
        // One full check; only a file the library refuses is walked.
        if ((m == mode::text || m == mode::json) &&
            print_checked(in.data(), in.size(), m == mode::json ? tree_writer::style::json : tree_writer::style::text,
                          out))
            return 0;
        cdb_file head = verify_each(in.data(), in.size(), [](size_t, dsect &&) {});
        if (m == mode::header) {
            write_c_header(in.data(), in.size(), name, out);
            return 0;
        }
        if (m != mode::check)
            write_file(in.data(), in.size(), head,
                       m == mode::json ? tree_writer::style::json : tree_writer::style::text, out);
    } catch (const cdb_invalid &e) {
        return report_invalid(err, name, e.offset, e.message, in);
    }
    return 0;
}

// Both files verified whole; their dsects are compared pair by pair.
int compare(const command &c, text_sink &out, FILE *err) {
    input_file in[2];
    std::unique_ptr<dsect_source> files[2];
    for (int i = 0; i < 2; i++) {
        if (auto status = load(in[i], c.operands[size_t(i)], err))
            return *status;
        try {
            files[i] = open_verified(in[i].data(), in[i].size());
        } catch (const cdb_invalid &e) {
            report_invalid(err, display_name(c.operands[size_t(i)]), e.offset, e.message, in[i]);
            return 2;
        }
    }
    return report_changes(*files[0], *files[1], c.json, c.m == mode::compat, out);
}

// Parses the options; a status when the command ends here (help, version, usage error).
std::optional<int> parse(int argc, char **argv, command &c, text_sink &out, FILE *err) {
    const std::pair<const char *, mode> modes[] = {
        {"--check", mode::check},   {"--json", mode::json}, {"--annotate", mode::annotate}, {"--source", mode::source},
        {"--header", mode::header}, {"--diff", mode::diff}, {"--compat", mode::compat}};
    bool mode_given = false, options_done = false;
    for (int i = 1; i < argc; i++) {
        std::string a = argv[i];
        if (options_done || a == "-" || a.empty() || a[0] != '-') {
            c.operands.push_back(a);
            continue;
        }
        if (a == "--") {
            options_done = true;
            continue;
        }
        if (a == "-h" || a == "--help") {
            out << command_usage::help_text(cdbdump_usage::usage);
            return 0;
        }
        if (a == "--version") {
            out << "cdbdump " QECFG_VERSION "\n";
            return 0;
        }
        const auto *known =
            std::find_if(std::begin(modes), std::end(modes), [&](const auto &x) { return a == x.first; });
        if (known == std::end(modes))
            return usage_error(err, "unknown option " + a);
        mode mm = known->second;
        bool comparing = c.m == mode::diff || c.m == mode::compat || mm == mode::diff || mm == mode::compat;
        if (mode_given && comparing && (mm == mode::json || c.m == mode::json) && !c.json) {
            c.json = true;
            if (mm != mode::json)
                c.m = mm;
            continue;
        }
        if (mode_given)
            return usage_error(err, "only one of --check, --json, --annotate, --source, --header, --diff and --compat "
                                    "(--json may go with --diff or --compat)");
        c.m = mm;
        mode_given = true;
    }
    size_t wanted = c.m == mode::diff || c.m == mode::compat ? 2 : 1;
    if (c.operands.size() < wanted)
        return usage_error(err, c.operands.empty() ? "no FILE given" : "too few FILEs given");
    if (c.operands.size() > wanted)
        return usage_error(err, wanted == 1 ? "more than one FILE given" : "more than two FILEs given");
    return std::nullopt;
}

int run(int argc, char **argv, text_sink &out, FILE *err) {
    command c;
    if (auto status = parse(argc, argv, c, out, err))
        return *status;
    if (c.m == mode::diff || c.m == mode::compat)
        return compare(c, out, err);
    return inspect(c.m, c.operands[0], out, err);
}
} // namespace

int cdbdump_main(int argc, char **argv, FILE *out, FILE *err) {
    text_sink sink(out);
    int status;
    try {
        status = run(argc, argv, sink, err);
    } catch (const std::bad_alloc &) {
        std::fputs("cdbdump: out of memory\n", err);
        return 2;
    }
    if (!sink.finish()) {
        std::fprintf(err, "cdbdump: cannot write the output: %s\n", std::strerror(sink.error()));
        return 2;
    }
    return status;
}
