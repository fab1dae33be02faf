// qecfg's command line as data: `qecfg --help` prints it, and the synopsis,
// options, environment, exit statuses and output of qecfg(1) are generated
// from it.
#ifndef QECFG_USAGE_H
#define QECFG_USAGE_H

#include "command_usage.h"

namespace qecfg_usage {

inline constexpr const char *synopsis[] = {
    "[-n] [-d {level}] [-s] {cdefsrc_filename} {cdef_filename}",
    "--help | --version",
};

inline constexpr command_usage::item options[] = {
    {"-n", "Error messages get no final newline."},
    {"-d {level}", "Traces on standard output: above 1 every statement and mask change, above 2 every table "
                   "allocation. The last -d wins; a level that is no number is 0."},
    {"-s", "Write the CDB in the byte order opposite to this machine's."},
    {"--help", "Print the usage and exit (only as the first argument)."},
    {"--version", "Print the version and exit (only as the first argument)."},
};

inline constexpr command_usage::item operands[] = {
    {"{cdefsrc_filename}", "The class definition source to compile."},
    {"{cdef_filename}", "The CDB to write (see output). A class without a Name statement is named after it, "
                        "up to its first .cdef."},
};

inline constexpr command_usage::item environment[] = {
    {"ZU_CDB_FORCE_EMPTY_TIMESTAMP", "When set (to any value), the timestamp in the CDB header is zero."},
    {"SOURCE_DATE_EPOCH", "Otherwise, when a plain count of seconds (1 to 19 digits), the timestamp; without "
                          "either, the current time."},
};

inline constexpr command_usage::item exit_statuses[] = {
    {"0", "The CDB has been written."},
    {"1", "A usage error, an invalid option, an error in the source or an output that cannot be written: "
          "one message on standard error."},
    {"other", "The system's error number when the source cannot be opened or read, or memory runs out."},
};

inline constexpr command_usage::usage usage = {
    "qecfg",
    synopsis,
    "Compiles one class definition source (stanzas of Name=value statements describing resource classes, "
    "their attributes, actions, structured data, the class-to-manager map and the variable classes) into "
    "one binary class definition database (CDB). The first error ends the compile with one message on "
    "standard error.",
    options,
    operands,
    environment,
    exit_statuses,
    "An existing regular output file, or the file a symbolic link names, is replaced atomically: the CDB is "
    "written to a new temporary file in the same directory that nobody else can open (unnamed where the file "
    "system allows), given its final mode before any byte (the old file's permission bits without set-user-ID "
    "and set-group-ID, and owner and group where allowed), flushed to disk and renamed over the name; the "
    "directory is flushed after. Readers of the old file keep a consistent old image; a new open sees the "
    "complete new one. Any failure, and every signal that ends the process and can be caught, remove the "
    "temporary file and leave the output as it was. SIGKILL may leave a named temporary file, whose name "
    "starts with a dot and never is the output's; the next compile of that output removes it. In a sticky, "
    "world-writable directory (such as /tmp) a symbolic link of another user than the compiling one and the "
    "directory's owner is not followed, and nothing is given to another user. Where no temporary file can be "
    "created in the directory, or the output is no regular file (a FIFO, a device), the output is written in "
    "place; a failure then removes a regular output file. An output that is the source file itself is "
    "refused, and so is an existing output that the process may not write or, in a sticky directory, "
    "replace.",
};

} // namespace qecfg_usage

#endif
