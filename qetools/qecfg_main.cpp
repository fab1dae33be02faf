// qecfg: compiles one class definition source into a class definition
// database. The only place that prints a fatal message and exits.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <unistd.h>

#include "qecfg/qecfg.h"
#include "qecfg_usage.h"

namespace {

int report(const std::string &message, int status) {
    std::fflush(stdout);
    std::fputs(message.c_str(), stderr);
    return status;
}

// Standard output that cannot be written (a full disk, a closed pipe) is a
// failure, not a silent success.
int print(const std::string &text) {
    std::fputs(text.c_str(), stdout);
    if (std::fflush(stdout) == 0 && !std::ferror(stdout))
        return 0;
    return report(std::string("qecfg: cannot write the output: ") + std::strerror(errno) + "\n", 1);
}

std::string usage(std::string text, const qecfg::options &opt) { return opt.message_newline ? text + "\n" : text; }

} // namespace

int main(int argc, char **argv) {
    // Only as the whole first argument: any other command line keeps the
    // meaning getopt gives it.
    if (argc > 1 && std::string(argv[1]) == "--help")
        return print(command_usage::help_text(qecfg_usage::usage));
    if (argc > 1 && std::string(argv[1]) == "--version")
        return print("qecfg " QECFG_VERSION "\n");
    qecfg::options opt;
    int c;
    while ((c = getopt(argc, argv, "nd:s")) != -1) {
        switch (c) {
        case 'n': opt.message_newline = false; break;
        case 'd': opt.trace_level = std::atoi(optarg); break;
        case 's': opt.reverse_byte_order = true; break;
        default: return 1; // getopt has said what is wrong
        }
    }
    if (optind >= argc)
        return report(usage(std::string("Usage: ") + argv[0] +
                                " [-s] cdefsrc_filename cdef_filename\n    -s Reverse endianness of CDB.\n",
                            opt),
                      1);
    if (optind + 1 >= argc)
        return report(usage(std::string("usage: ") + argv[0] + " cdefsrc_filename cdef_filename", opt), 1);
    qecfg::remove_temporary_files_on_signals();
    qecfg::result r = qecfg::compile_to_file(qecfg::source::file(argv[optind]), argv[optind + 1], opt);
    return r ? 0 : report(r.message, r.status);
}
