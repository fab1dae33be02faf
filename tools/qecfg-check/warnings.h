// The checker's warnings: likely mistakes in a source that compiles, as a
// table of checks. Each row has the name by which it is switched on and off,
// its state when no option names it, a summary and the function that runs it.
#ifndef QECFG_CHECK_WARNINGS_H
#define QECFG_CHECK_WARNINGS_H

#include <string>
#include <vector>

#include "diagnose.h"
#include "source_model.h"

namespace check {

// What a check sees: the source and what the compile was given.
struct check_input {
    const source_model &model;
    std::string output_name;                          // what an unnamed class is named after
    std::vector<std::vector<const stanza *>> classes; // of the model
};

using check_function = void (*)(const check_input &, std::vector<explained> &);

struct warning_check {
    const char *name;
    bool on_by_default;
    std::string summary;
    check_function run;
};

const std::vector<warning_check> &warning_checks();

// The state of each warning by index of warning_checks() when no option
// names it.
std::vector<bool> default_warnings();

struct warning_finding {
    explained found;
    const char *name;
};

// The findings of the enabled checks, in source order.
std::vector<warning_finding> run_warnings(const check_input &in, const std::vector<bool> &enabled);

} // namespace check

#endif
