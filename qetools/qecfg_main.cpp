// qecfg: compiles one class definition source into a class definition
// database. The only place that prints a fatal message and exits.
#include <cstdio>
#include <cstdlib>
#include <unistd.h>

#include "qecfg.h"

int main(int argc, char **argv) {
    qecfg_options opt;
    int c;
    while ((c = getopt(argc, argv, "nd:s")) != -1) {
        switch (c) {
        case 'n': opt.newline_after_message = 0; break;
        case 'd': opt.debugLevel = std::atoi(optarg); break;
        case 's': opt.swap_endianness = 1; break;
        default: return 1; // getopt has said what is wrong
        }
    }
    try {
        qecfg_compiler compile(opt);
        if (optind >= argc)
            compile.raise_fatal("Usage: ", argv[0],
                                         " [-s] cdefsrc_filename cdef_filename\n    -s Reverse endianness of CDB.\n",
                                         0, 1);
        if (optind + 1 >= argc)
            compile.raise_fatal("usage: ", argv[0], " cdefsrc_filename cdef_filename", 0, 1);
        compile.opt.cdefsrc = argv[optind];
        compile.opt.cdefname = argv[optind + 1];
        compile.run();
    } catch (const qecfg_fatal &f) {
        std::fflush(stdout);
        std::fputs(f.message.c_str(), stderr);
        return f.code;
    }
    return 0;
}
