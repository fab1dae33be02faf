// qecfg-check: compiles sources in memory exactly as qecfg does and reports
// their error with its detail, and the warnings, in the common
// FILE:LINE: error|warning: form.
#ifndef QECFG_CHECK_CHECKER_H
#define QECFG_CHECK_CHECKER_H

#include <cstdio>
#include <string>
#include <vector>

namespace check {

// The whole command line after the program name; diagnostics go to `err`,
// help and lists to `out`. Returns the exit status.
int checker_main(const std::vector<std::string> &args, std::FILE *out, std::FILE *err);

} // namespace check

#endif
