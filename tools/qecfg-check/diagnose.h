// The compiler's fatal message made precise: where it happened and the
// detail the message leaves out, found in the source model.
#ifndef QECFG_CHECK_DIAGNOSE_H
#define QECFG_CHECK_DIAGNOSE_H

#include <string>
#include <string_view>
#include <vector>

#include "qecfg/qecfg.h"
#include "source_model.h"

namespace check {

struct diagnostic {
    int line = 0; // 0: the whole file
    std::string text;
};

// The error with its related places (a stanza's header, a statement that
// caused it), which are printed as notes.
struct explained {
    diagnostic where;
    std::vector<diagnostic> notes;
};

// `failure` is the compiler's result, its message without a final newline.
// Its message identity says which explanation applies; its line is the
// error's line.
explained explain_failure(const qecfg::result &failure, const source_model &m);

// The closest of `candidates` to a misspelt word, or empty.
std::string nearest(std::string_view word, const std::vector<std::string> &candidates);

// Text in single quotes; "line N".
std::string quoted(std::string_view s);
std::string on_line(int line);

// Names joined by ", ".
std::string listing(const std::vector<std::string> &names);

} // namespace check

#endif
