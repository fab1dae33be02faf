// The message loop: reads framed messages, answers them, and answers a
// request whose cancellation is already waiting without running it.
#ifndef QECFG_LSP_LOOP_H
#define QECFG_LSP_LOOP_H

#include <functional>
#include <string>

#include "transport.h"

namespace lsp {

// The largest message body read; a larger one is skipped with an error.
constexpr size_t MAX_BODY = size_t(32) << 20;

// Serves until the exit notification or the end of the input; returns the
// exit status. `send` receives each outgoing message body.
int serve(byte_input &in, const std::function<void(const std::string &)> &send, size_t max_body = MAX_BODY);

} // namespace lsp

#endif
