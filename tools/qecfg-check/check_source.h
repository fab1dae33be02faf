// The check of one source held in memory, as data: what qecfg-check prints
// for it and what a language server shows, before either formats it.
#ifndef QECFG_CHECK_CHECK_SOURCE_H
#define QECFG_CHECK_CHECK_SOURCE_H

#include <string>
#include <vector>

#include "diagnose.h"

namespace check {

enum class severity { error, warning };

struct finding {
    severity level = severity::error;
    diagnostic where;              // line 0: the whole file
    std::string name;              // the warning's name; empty for the error
    std::vector<diagnostic> notes; // related places, printed as FILE:LINE: note: text
};

struct check_options {
    std::string output_name;   // after which a class without Name is named
    std::vector<bool> enabled; // by index of warning_checks(); empty: each in its default state
};

struct check_report {
    int status = 0;                // 0 compiles, 1 the compile fails, 2 memory ran out
    std::vector<finding> findings; // the error, or the warnings in source order
};

// The finding when memory runs out during a check (status 2).
inline constexpr const char OUT_OF_MEMORY[] = "out of memory";

// Compiles `text` in memory with qecfg's rules (messages naming the source
// `name`) and explains its failure or runs the enabled warnings.
check_report check_text(const std::string &name, const std::string &text, const check_options &opt);
// The same with the model of `text` read already (read_model(text)).
check_report check_text(const std::string &name, const std::string &text, const check_options &opt,
                        const source_model &model);

// The compiler's message without the source's name where its row begins with
// it: the checker puts the name in front itself.
std::string without_source_name(const qecfg::result &r, const std::string &name);

// The output name qecfg is assumed to be given: the source's file name with
// its extension replaced by .cdef.
std::string default_output_name(const std::string &source);

} // namespace check

#endif
