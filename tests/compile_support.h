// Compiling a source given as a string in-process, with its traces, its
// fatal message and its image captured.
#ifndef COMPILE_SUPPORT_H
#define COMPILE_SUPPORT_H

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "qecfg.h"
#include "qecfg/qecfg.h"

struct compile_result {
    int code = 0;        // 0, or the exit status of the fatal condition
    std::string message; // the fatal message
    std::string out;     // traces on standard output
    std::string err;     // traces on standard error
    std::string cdb;     // the image, when there is one
    bool has_output = false;
};

class captured_stream {
  public:
    captured_stream() : f_(open_memstream(&buf_, &len_)) {}
    ~captured_stream() {
        if (f_)
            std::fclose(f_);
        std::free(buf_);
    }
    FILE *file() { return f_; }
    std::string text() {
        std::fflush(f_);
        return std::string(buf_, len_);
    }

  private:
    char *buf_ = nullptr;
    size_t len_ = 0;
    FILE *f_;
};

// Compiles `source` in memory, as a source named "input.src" whose unnamed
// class is named after `out_name`; `setup` may change the options.
template <typename F = void (*)(qecfg::options &)> compile_result compile_text(
    const std::string &source, F setup = [](qecfg::options &) {}, const std::string &out_name = "out.cdef") {
    captured_stream so, se;
    qecfg::options opt;
    opt.output_name = out_name;
    opt.trace_out = so.file();
    opt.trace_err = se.file();
    setup(opt);
    setenv("ZU_CDB_FORCE_EMPTY_TIMESTAMP", "1", 1);
    std::vector<std::uint8_t> image;
    qecfg::result res = qecfg::compile_to_memory(qecfg::source::bytes("input.src", source), image, opt);
    compile_result r;
    r.code = res.status;
    r.message = res.message;
    r.out = so.text();
    r.err = se.text();
    r.cdb.assign(image.begin(), image.end());
    r.has_output = res.status == 0;
    return r;
}

// A class and a map, to which a test appends its stanzas (15 lines).
inline const std::string BASE_SOURCE = "ControlDefinition\n"
                                       "    FileVersion=1.0\n"
                                       "ResourceClass\n"
                                       "    Description=1\n"
                                       "    DisplayName=2\n"
                                       "    Properties=HasResources\n"
                                       "    ClassPermTemplate=t\n"
                                       "    ResourcePermTemplate=t\n"
                                       "    Name=Test.Class\n"
                                       "ClassToManagerMapping\n"
                                       "    ResourceManager=Test.RM\n"
                                       "    FirstKey=1\n"
                                       "    LastKey=5\n"
                                       "    MessageCatalog=test.cat\n"
                                       "    DescriptiveMessageSet=1\n";

#endif
