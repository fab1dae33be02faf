// The compiler's fatal message made precise: where it happened and the
// detail the message leaves out, found in the source model.
#ifndef QECFG_CHECK_DIAGNOSE_H
#define QECFG_CHECK_DIAGNOSE_H

#include <string>
#include <vector>

#include "source_model.h"

namespace check {

struct diagnostic {
    int line = 0; // 0: the whole file
    std::string text;
};

// `message` is the compiler's message without its final newline.
diagnostic explain_failure(const std::string &message, const source_model &m);

// The closest of `candidates` to a misspelt word, or empty.
std::string nearest(const std::string &word, const std::vector<std::string> &candidates);

// Names joined by ", ".
std::string listing(const std::vector<std::string> &names);

} // namespace check

#endif
