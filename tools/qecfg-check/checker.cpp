// The checker's command line and the check of one source.
#include "checker.h"

#include <cerrno>
#include <cstring>
#include <fstream>
#include <sstream>

#include "check_usage.h"
#include "qecfg/qecfg.h"
#include "warnings.h"

namespace check {

namespace {

const char *VERSION = "qecfg-check " QECFG_VERSION "\n";
enum status { CLEAN = 0, FINDING = 1, TROUBLE = 2 };

struct settings {
    std::vector<bool> enabled = std::vector<bool>(warning_checks().size(), true);
    bool werror = false;
    bool list = false;
    std::string output_name;
    std::vector<std::string> sources;
};

// Writes and remembers whether every write succeeded.
class writer {
  public:
    explicit writer(std::FILE *f) : f_(f) {}
    void put(const std::string &s) { ok_ = std::fputs(s.c_str(), f_) >= 0 && ok_; }
    bool finish() { return std::fflush(f_) == 0 && ok_ && !std::ferror(f_); }

  private:
    std::FILE *f_;
    bool ok_ = true;
};

bool set_warning(settings &s, const std::string &arg) {
    if (arg == "error" || arg == "list") {
        (arg == "error" ? s.werror : s.list) = true;
        return true;
    }
    bool off = arg.rfind("no-", 0) == 0;
    std::string name = off ? arg.substr(3) : arg;
    const std::vector<warning_check> &checks = warning_checks();
    for (size_t i = 0; i < checks.size(); i++)
        if (name == checks[i].name) {
            s.enabled[i] = !off;
            return true;
        }
    return false;
}

// Parses the options; an empty result with `usage` set is a usage error.
bool parse_args(const std::vector<std::string> &args, settings &s, std::string &problem, bool &exit_now, writer &out) {
    bool options_done = false;
    for (size_t i = 0; i < args.size(); i++) {
        const std::string &a = args[i];
        if (options_done || a.empty() || a[0] != '-' || a == "-") {
            s.sources.push_back(a);
        } else if (a == "--") {
            options_done = true;
        } else if (a == "-h" || a == "--help") {
            out.put(command_usage::help_text(check_usage::usage));
            exit_now = true;
            return true;
        } else if (a == "--version") {
            out.put(VERSION);
            exit_now = true;
            return true;
        } else if (a == "-W" || a == "-o") {
            if (i + 1 == args.size()) {
                problem = "option " + a + " needs an argument";
                return false;
            }
            if (a == "-o")
                s.output_name = args[++i];
            else if (!set_warning(s, args[++i]))
                problem = "unknown warning '" + args[i] + "' (see -W list)";
        } else if (a.rfind("-W", 0) == 0) {
            if (!set_warning(s, a.substr(2)))
                problem = "unknown warning '" + a.substr(2) + "' (see -W list)";
        } else {
            problem = "unknown option " + a;
        }
        if (!problem.empty())
            return false;
    }
    if (!s.list && s.sources.empty())
        problem = "no source given";
    return problem.empty();
}

std::string list_warnings(const settings &s) {
    std::string text;
    const std::vector<warning_check> &checks = warning_checks();
    for (size_t i = 0; i < checks.size(); i++) {
        std::string name = checks[i].name;
        text += name + std::string(name.size() < 18 ? 18 - name.size() : 1, ' ') + (s.enabled[i] ? "on   " : "off  ") +
                checks[i].summary + "\n";
    }
    return text;
}

// The output name qecfg is assumed to be given: the source's file name with
// its extension replaced by .cdef.
std::string default_output_name(const std::string &source) {
    std::string base = source.substr(source.find_last_of('/') + 1);
    size_t dot = base.find_last_of('.');
    return (dot == std::string::npos || dot == 0 ? base : base.substr(0, dot)) + ".cdef";
}

std::string located(const std::string &file, const diagnostic &d) {
    return file + (d.line ? ":" + std::to_string(d.line) : "") + ": ";
}

bool read_text(const std::string &path, std::string &text) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    text = s.str();
    return in.good() || in.eof();
}

// Compiles one source in memory, its traces discarded.
qecfg::result compile(const std::string &path, const std::string &output_name) {
    char *buf = nullptr;
    size_t len = 0;
    std::FILE *traces = open_memstream(&buf, &len);
    qecfg::options opt;
    opt.message_newline = false;
    opt.output_name = output_name;
    if (traces)
        opt.trace_out = opt.trace_err = traces;
    std::vector<std::uint8_t> image;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::file(path), image, opt);
    if (traces)
        std::fclose(traces);
    std::free(buf);
    return r;
}

status check_source(const std::string &path, const settings &s, writer &err) {
    std::string output_name = s.output_name.empty() ? default_output_name(path) : s.output_name;
    qecfg::result r = compile(path, output_name);
    if (r.status != 0 && r.status != 1) { // the source cannot be read, or memory ran out
        std::string why = r.message.rfind(path + ": ", 0) == 0 ? r.message.substr(path.size() + 2) : r.message;
        err.put(path + ": error: " + why + "\n");
        return TROUBLE;
    }
    std::string text;
    if (!read_text(path, text)) {
        err.put(path + ": error: cannot read because: " + std::strerror(errno) + "\n");
        return TROUBLE;
    }
    source_model m = read_model(text);
    if (r.status == 1) {
        diagnostic d = explain_failure(r.message, m);
        err.put(located(path, d) + "error: " + d.text + "\n");
        return FINDING;
    }
    std::vector<warning_finding> found = run_warnings(m, warning_context{output_name}, s.enabled);
    for (const warning_finding &f : found)
        err.put(located(path, f.where) + (s.werror ? "error: " : "warning: ") + f.where.text + " [" + f.name + "]\n");
    return s.werror && !found.empty() ? FINDING : CLEAN;
}

} // namespace

int checker_main(const std::vector<std::string> &args, std::FILE *out_file, std::FILE *err_file) {
    writer out(out_file), err(err_file);
    settings s;
    std::string problem;
    bool exit_now = false;
    int result = CLEAN;
    if (!parse_args(args, s, problem, exit_now, out)) {
        err.put("qecfg-check: " + problem + "\n" + "usage: qecfg-check [options] SOURCE... (see --help)\n");
        result = TROUBLE;
    } else if (s.list) {
        out.put(list_warnings(s));
    } else if (!exit_now) {
        for (const std::string &path : s.sources)
            result = std::max<int>(result, check_source(path, s, err));
    }
    bool written = out.finish();
    if (!err.finish() || !written)
        return TROUBLE;
    return result;
}

} // namespace check
