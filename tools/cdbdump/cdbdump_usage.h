// cdbdump's command line as data: `cdbdump --help` prints it, and the
// synopsis, options and exit statuses of cdbdump(1) are generated from it.
#ifndef CDBDUMP_USAGE_H
#define CDBDUMP_USAGE_H

#include "command_usage.h"

namespace cdbdump_usage {

inline constexpr const char *synopsis[] = {
    "[--check | --json | --annotate | --source | --header] [-h | --help] [--version] {FILE}",
    "--diff | --compat [--json] {OLD} {NEW}",
};

inline constexpr command_usage::item options[] = {
    {"--check", "Print nothing; only set the exit status."},
    {"--json", "Print the same content as one JSON document; all positions are under layout. Beside --diff or "
               "--compat, print the differences as one JSON document."},
    {"--annotate", "Print every byte range in file order: offset, bytes, field and value; flag each violation "
                   "where it stands (!!) instead of stopping at the first."},
    {"--source", "Print a class definition source that qecfg compiles back into a CDB of the same content; "
                 "what no source can say is reported as a warning and as a comment in place."},
    {"--header", "Print a C header of the class names, class ids, attribute and action ids as constants, for "
                 "service code that reads the CDB."},
    {"--diff", "Print the content differences of the CDBs {OLD} and {NEW}, keyed by names, one per line; "
               "layout, timestamp, checksum and byte order are ignored."},
    {"--compat", "Print the same differences, each marked breaking (when {NEW} would break what was stored or "
                 "called with {OLD}) or compatible, with its reason."},
    {"-h, --help", "Print the usage and exit."},
    {"--version", "Print the version and exit."},
};

inline constexpr command_usage::item operands[] = {
    {"{FILE}", "The CDB to read, in either byte order; - for standard input."},
    {"{OLD} {NEW}", "The two CDBs to compare."},
};

inline constexpr command_usage::item exit_statuses[] = {
    {"0", "Success (--diff: no difference; --compat: nothing breaks)."},
    {"1", "{FILE} is not a valid CDB (--annotate: violations were flagged; --diff: the contents differ; "
          "--compat: a change breaks)."},
    {"2", "A usage error, a file that cannot be read (or, with --diff and --compat, is no valid CDB), output "
          "that cannot be written, or memory exhausted."},
};

inline constexpr command_usage::usage usage = {
    "cdbdump",
    synopsis,
    "Reads the CDB in {FILE}, in either byte order, and verifies all of it before printing anything: the "
    "length and checksum, the anchors, every dsect, record, list, string and value body. The first violation "
    "is reported as {FILE}: offset {N}: what is wrong. Without an option, prints everything the file holds "
    "as indented text: the header, the layout of the dsects, then each dsect.",
    options,
    operands,
    {},
    exit_statuses,
};

} // namespace cdbdump_usage

#endif
