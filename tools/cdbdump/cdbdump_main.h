// The cdbdump command, callable in-process (tests, fuzzing).
#ifndef CDBDUMP_MAIN_H
#define CDBDUMP_MAIN_H

#include <cstdio>

// Exit status: 0 success, 1 a file that is not a valid CDB (with --annotate:
// one with violations; --diff: contents that differ; --compat: a change that
// breaks), 2 a usage error, a file that cannot be read, output that cannot be
// written (every write to `out` is checked, and its final flush), or memory
// exhausted.
int cdbdump_main(int argc, char **argv, FILE *out, FILE *err);

#endif
