// qecfg-check's command line as data: `qecfg-check --help` prints it, and
// the synopsis, options and exit statuses of qecfg-check(1) are generated
// from it.
#ifndef QECFG_CHECK_USAGE_H
#define QECFG_CHECK_USAGE_H

#include "command_usage.h"

namespace check_usage {

inline constexpr const char *synopsis[] = {
    "[-W {NAME} | -W no-{NAME} | -Werror | -W list] [-o {NAME}] [-h | --help] [--version] {SOURCE}...",
};

inline constexpr command_usage::item options[] = {
    {"-W {NAME}", "Enable the warning {NAME}; all warnings are enabled at first."},
    {"-W no-{NAME}", "Disable the warning {NAME}."},
    {"-Werror", "Report warnings as errors."},
    {"-W list", "List the warnings, whether each is on, and what each catches, and exit."},
    {"-o {NAME}", "The output file name qecfg would be given: a class without a Name statement is named after "
                  "it, up to its first .cdef (default: the source's name ending in .cdef)."},
    {"-h, --help", "Print the usage and exit."},
    {"--version", "Print the version and exit."},
};

inline constexpr command_usage::item operands[] = {
    {"{SOURCE}", "A class definition source to check; each is checked on its own."},
};

inline constexpr command_usage::item exit_statuses[] = {
    {"0", "No error (warnings allowed)."},
    {"1", "An error or, with -Werror, a warning."},
    {"2", "A usage error, a source that cannot be read, or exhausted memory (\"out of memory\")."},
};

inline constexpr command_usage::usage usage = {
    "qecfg-check",
    synopsis,
    "Compiles each class definition source in memory with exactly qecfg's rules, writes no file, and reports "
    "the error that stops the compile, with the detail qecfg's message leaves out, then warnings about "
    "mistakes that compile silently, on standard error as {FILE}:{LINE}: error: message and "
    "{FILE}:{LINE}: warning: message [name], each followed by the related places as {FILE}:{LINE}: note: text.",
    options,
    operands,
    {},
    exit_statuses,
};

} // namespace check_usage

#endif
