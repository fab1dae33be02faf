// The checker's command line and the check of one source.
#include "checker.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>
#include <sys/stat.h>

#include "check_source.h"
#include "check_usage.h"
#include "qecfg/qecfg.h"
#include "warnings.h"

namespace check {

namespace {

const char *VERSION = "qecfg-check " QECFG_VERSION "\n";
enum status { CLEAN = 0, FINDING = 1, TROUBLE = 2 };

struct settings {
    std::vector<bool> enabled = default_warnings();
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
    size_t width = 0;
    for (const warning_check &c : checks)
        width = std::max(width, std::strlen(c.name) + 2);
    for (size_t i = 0; i < checks.size(); i++) {
        std::string name = checks[i].name;
        text += name + std::string(width - name.size(), ' ') + (s.enabled[i] ? "on   " : "off  ") + checks[i].summary +
                "\n";
    }
    return text;
}

std::string located(const std::string &file, const diagnostic &d) {
    return file + (d.line ? ":" + std::to_string(d.line) : "") + ": ";
}

// Reads a whole file; a regular file's size is reserved at once, so that
// the text takes its size and no more.
bool read_text(const std::string &path, std::string &text) {
    std::FILE *f = std::fopen(path.c_str(), "rb");
    if (!f)
        return false;
    struct stat st {};
    if (fstat(fileno(f), &st) == 0 && S_ISREG(st.st_mode))
        text.reserve(size_t(st.st_size));
    char piece[65536];
    size_t n;
    while ((n = std::fread(piece, 1, sizeof piece, f)) > 0)
        text.append(piece, n);
    bool ok = !std::ferror(f);
    std::fclose(f);
    return ok;
}

// Why a source that cannot be read was refused, in the compiler's words.
std::string unreadable(const std::string &path) {
    int read_errno = errno;
    std::vector<std::uint8_t> image;
    qecfg::options opt;
    opt.message_newline = false;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::file(path), image, opt);
    if (r.status == 0 || r.status == 1)
        return std::string("cannot read because: ") + std::strerror(read_errno);
    return without_source_name(r, path);
}

// Reads and checks one source; exhausted memory is a finding like any other.
check_report check_path(const std::string &path, const settings &s) {
    try {
        std::string text;
        if (!read_text(path, text))
            return {TROUBLE, {finding{severity::error, {0, unreadable(path)}, "", {}}}};
        return check_text(path, text, check_options{s.output_name, s.enabled});
    } catch (const std::bad_alloc &) {
        return {TROUBLE, {finding{severity::error, {0, OUT_OF_MEMORY}, "", {}}}};
    }
}

status check_file(const std::string &path, const settings &s, writer &err) {
    check_report report = check_path(path, s);
    for (const finding &f : report.findings) {
        bool error = f.level == severity::error || s.werror;
        err.put(located(path, f.where) + (error ? "error: " : "warning: ") + f.where.text +
                (f.name.empty() ? "" : " [" + f.name + "]") + "\n");
        for (const diagnostic &note : f.notes)
            err.put(located(path, note) + "note: " + note.text + "\n");
    }
    if (report.status != 0)
        return report.status == 1 ? FINDING : TROUBLE;
    return s.werror && !report.findings.empty() ? FINDING : CLEAN;
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
            result = std::max<int>(result, check_file(path, s, err));
    }
    bool written = out.finish();
    if (!err.finish() || !written)
        return TROUBLE;
    return result;
}

} // namespace check
