// The checker's warnings: likely mistakes in a source that compiles. Each has
// a name by which it is switched on and off.
#ifndef QECFG_CHECK_WARNINGS_H
#define QECFG_CHECK_WARNINGS_H

#include <string>
#include <vector>

#include "diagnose.h"
#include "source_model.h"

namespace check {

struct warning_context {
    std::string output_name; // what an unnamed class is named after
};

struct warning_finding {
    diagnostic where;
    const char *name;
};

struct warning_check {
    const char *name;
    const char *summary;
    void (*run)(const source_model &, const warning_context &, std::vector<diagnostic> &);
};

const std::vector<warning_check> &warning_checks();

// The findings of the enabled checks, in source order.
std::vector<warning_finding> run_warnings(const source_model &m, const warning_context &ctx,
                                          const std::vector<bool> &enabled);

} // namespace check

#endif
