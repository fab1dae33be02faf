// The cdbdump command, callable in-process (tests, fuzzing).
#ifndef CDBDUMP_MAIN_H
#define CDBDUMP_MAIN_H

#include <cstdio>

// Exit status: 0 success, 1 a file that is not a valid CDB (with --annotate:
// one with violations), 2 a usage error or a file that cannot be read.
int cdbdump_main(int argc, char **argv, FILE *out, FILE *err);

#endif
