// The compiler's fatal message made precise: where it happened and the
// detail the message leaves out, found in the source model.
#ifndef QECFG_CHECK_DIAGNOSE_H
#define QECFG_CHECK_DIAGNOSE_H

#include <string>
#include <string_view>
#include <vector>

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

// `message` is the compiler's message without its final newline. This is
// the one place that recognises the compiler's messages by their text.
explained explain_failure(const std::string &message, const source_model &m);

// The closest of `candidates` to a misspelt word, or empty.
std::string nearest(std::string_view word, const std::vector<std::string> &candidates);

// Text in single quotes; "line N".
std::string quoted(std::string_view s);
std::string on_line(int line);

// Names joined by ", ".
std::string listing(const std::vector<std::string> &names);

} // namespace check

#endif
