#include "e2e_support.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <fstream>
#include <sstream>
#include <sys/wait.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace e2e {

std::string read_file(const fs::path &p) {
    std::ifstream in(p, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    return s.str();
}

std::string read_or(const fs::path &p, const std::string &dflt) { return fs::exists(p) ? read_file(p) : dflt; }

static std::vector<std::string> words(const std::string &text) {
    std::istringstream in(text);
    std::vector<std::string> w;
    for (std::string s; in >> s;)
        w.push_back(s);
    return w;
}

static std::vector<std::string> lines(const std::string &text) {
    std::istringstream in(text);
    std::vector<std::string> l;
    for (std::string s; std::getline(in, s);)
        if (!s.empty())
            l.push_back(s);
    return l;
}

std::vector<fs::path> all_sources() {
    std::vector<fs::path> v;
    for (const auto &e : fs::directory_iterator(fs::path(QECFG_SOURCE_DIR) / "examples"))
        if (e.path().extension() == ".src")
            v.push_back(e.path());
    for (const auto &d : fs::directory_iterator(fs::path(QECFG_SOURCE_DIR) / "tests" / "e2e"))
        if (fs::exists(d.path() / "input.src"))
            v.push_back(d.path() / "input.src");
    std::sort(v.begin(), v.end());
    return v;
}

run_result run(const fs::path &work, const std::string &program, const std::vector<std::string> &args,
               const std::vector<std::string> &env, const std::function<void()> &child_setup) {
    run_result r;
    r.work = work;
    fs::path out = work.string() + ".stdout", err = work.string() + ".stderr";
    pid_t pid = fork();
    if (pid == 0) {
        if (chdir(work.c_str()) != 0)
            _exit(127);
        int o = open(out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        int e = open(err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        int devnull = open("/dev/null", O_RDONLY);
        if (o < 0 || e < 0 || devnull < 0)
            _exit(127);
        dup2(devnull, 0);
        dup2(o, 1);
        dup2(e, 2);
        setenv("ZU_CDB_FORCE_EMPTY_TIMESTAMP", "1", 1);
        unsetenv("SOURCE_DATE_EPOCH");
        for (const std::string &kv : env)
            if (kv[0] == '-')
                unsetenv(kv.c_str() + 1);
            else
                putenv(strdup(kv.c_str()));
        // A fixed program name keeps messages that quote it independent of the build.
        if (child_setup)
            child_setup();
        std::vector<char *> argv{const_cast<char *>("qecfg")};
        for (const std::string &a : args)
            argv.push_back(const_cast<char *>(a.c_str()));
        argv.push_back(nullptr);
        execv(program.c_str(), argv.data());
        _exit(127);
    }
    int st = 0;
    waitpid(pid, &st, 0);
    r.status = WIFEXITED(st) ? WEXITSTATUS(st) : 128 + WTERMSIG(st);
    r.out = read_file(out);
    r.err = read_file(err);
    return r;
}

void remove_run(const run_result &r) {
    std::error_code ec;
    fs::remove_all(r.work, ec);
    fs::remove(r.work.string() + ".stdout", ec);
    fs::remove(r.work.string() + ".stderr", ec);
}

run_result run_case(const fs::path &dir, const std::string &program) {
    char tmpl[] = "/tmp/qecfg-e2e-XXXXXX";
    fs::path work = mkdtemp(tmpl);
    if (fs::exists(dir / "input.src"))
        fs::copy_file(dir / "input.src", work / "input.src");
    std::vector<std::string> args = words(read_or(dir / "args", "input.src out.cdef"));
    return run(work, program, args, lines(read_or(dir / "env", "")));
}

static uint64_t read_le(const std::string &b, size_t off, size_t width) {
    uint64_t v = 0;
    for (size_t i = 0; i < width; i++)
        v |= uint64_t(uint8_t(b[off + i])) << (8 * i);
    return v;
}

static uint64_t read_be(const std::string &b, size_t off, size_t width) {
    uint64_t v = 0;
    for (size_t i = 0; i < width; i++)
        v = (v << 8) | uint8_t(b[off + i]);
    return v;
}

static std::string hex_text_bytes(const std::string &text) {
    std::string bytes, digits;
    for (const std::string &line : lines(text)) {
        std::string l = line.substr(0, line.find('#'));
        for (char c : l)
            if (std::isxdigit(static_cast<unsigned char>(c)))
                digits += c;
    }
    for (size_t i = 0; i + 1 < digits.size(); i += 2)
        bytes += char(std::stoi(digits.substr(i, 2), nullptr, 16));
    return bytes;
}

static void check_line(const std::vector<std::string> &w, const fs::path &work, std::vector<std::string> &f) {
    fs::path file = work / w[0];
    const std::string &what = w[1];
    if (what == "absent") {
        if (fs::exists(file))
            f.push_back(w[0] + " exists");
        return;
    }
    if (!fs::exists(file)) {
        f.push_back(w[0] + " missing");
        return;
    }
    std::string b = read_file(file);
    if (what == "size") {
        if (b.size() != std::stoull(w[2]))
            f.push_back(w[0] + " has " + std::to_string(b.size()) + " bytes, expected " + w[2]);
        return;
    }
    size_t off = std::stoull(w[2], nullptr, 0);
    if (what == "bytes" || what == "str") {
        std::string want = what == "bytes" ? hex_text_bytes(w[3]) : w[3];
        if (what == "str")
            want.push_back('\0');
        if (b.compare(off, want.size(), want) != 0)
            f.push_back(w[0] + " " + what + " at " + w[2] + " differ");
        return;
    }
    size_t width = what == "u8" ? 1 : what == "u16" ? 2 : what == "u32" ? 4 : 8;
    bool be = w.size() > 4 && w[4] == "be";
    if (off + width > b.size()) {
        f.push_back(w[0] + " too short for " + what + " at " + w[2]);
        return;
    }
    uint64_t got = be ? read_be(b, off, width) : read_le(b, off, width);
    if (got != std::stoull(w[3], nullptr, 0))
        f.push_back(w[0] + " " + what + " at " + w[2] + " is " + std::to_string(got) + ", expected " + w[3]);
}

std::vector<std::string> check_outputs(const fs::path &dir, const fs::path &work) {
    std::vector<std::string> f;
    for (const std::string &line : lines(read_or(dir / "checks", ""))) {
        std::vector<std::string> w = words(line);
        if (w.size() >= 2 && w[0][0] != '#')
            check_line(w, work, f);
    }
    for (const auto &e : fs::directory_iterator(dir)) {
        std::string name = e.path().filename().string();
        if (name.size() > 4 && name.substr(name.size() - 4) == ".hex") {
            std::string file = name.substr(0, name.size() - 4);
            if (read_file(work / file) != hex_text_bytes(read_file(e.path())))
                f.push_back(file + " differs from " + name);
        }
    }
    return f;
}

} // namespace e2e
