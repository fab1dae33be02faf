// What a compile is given: the library's options, the source and where the
// image goes.
#ifndef QECFG_CONTEXT_H
#define QECFG_CONTEXT_H

#include <cstdio>
#include <string_view>

#include "qecfg/qecfg.h"

// The library's options, in its own words, with the source and where the
// image goes (the file output_name when sink is null).
struct qecfg_options : qecfg::options {
    qecfg::source source;
    class image_sink *sink = nullptr;
};

// A stream over a source held in memory.
FILE *open_memory_source(std::string_view text);

#endif
