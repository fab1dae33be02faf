// A fatal condition of a compile, as data: the one way every stage ends a
// compile.
#ifndef QECFG_FATAL_H
#define QECFG_FATAL_H

#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "qecfg/messages.h"

using msg = qecfg::message_id;

// Every fatal condition of a compile becomes one of these: a row of the
// message table with its subjects and line. Only the library's boundary
// turns it into the text, and main into the exit status.
struct qecfg_fatal {
    msg id;
    uint64_t line = 0;
    std::vector<std::string> subjects;
    int status = 1; // the row's, or the system's error number

    std::string text(bool newline) const { return qecfg::format_message(id, line, subjects, newline); }
};

// Ends the compile with a message of the table. err is the system's error
// number, the status of the rows that take it.
[[noreturn]] void raise_fatal(msg id, uint64_t line, std::initializer_list<std::string_view> subjects = {},
                              int err = 0);

// A fatal condition at the statement being read. Whoever raises it need not
// know the line: the compile sequence, which reads the lines, gives it to
// every condition of a row whose line is the statement's.
[[noreturn]] inline void statement_error(msg id, std::initializer_list<std::string_view> subjects = {}) {
    raise_fatal(id, 0, subjects);
}

#endif
