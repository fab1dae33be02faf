// The compiler as a library: a source and the command line's options in, an
// image or the fatal message and status out.
#include <cstring>

#include "qecfg.h"
#include "qecfg/qecfg.h"
#include "qecfg_sink.h"

namespace {

qecfg_options compile_options(const qecfg::source &src, const qecfg::options &o, const std::string &output_name) {
    qecfg_options opt;
    static_cast<qecfg::options &>(opt) = o;
    opt.output_name = output_name;
    opt.source = src;
    return opt;
}

qecfg::result run(qecfg_options opt) {
    bool newline = opt.message_newline;
    try {
        qecfg_compiler c(std::move(opt));
        c.run();
    } catch (const qecfg_fatal &f) {
        return qecfg::result{f.status, f.text(newline), f.id, qecfg::message(f.id).name, f.line};
    }
    return {};
}

} // namespace

FILE *open_memory_source(std::string_view text) {
    // Reading never writes into the buffer; an empty one still needs an address.
    return fmemopen(const_cast<char *>(text.empty() ? "" : text.data()), text.size(), "r");
}

qecfg::result qecfg::compile_to_memory(const source &src, std::vector<std::uint8_t> &image, const options &o) {
    image.clear();
    memory_sink sink(image);
    qecfg_options opt = compile_options(src, o, o.output_name);
    opt.sink = &sink;
    return run(std::move(opt));
}

qecfg::result qecfg::compile_to_file(const source &src, const std::string &output_path, const options &o) {
    qecfg_options opt = compile_options(src, o, o.output_name.empty() ? output_path : o.output_name);
    std::unique_ptr<image_sink> sink =
        make_file_sink(output_path, src.in_memory ? file_identity{} : identity_of(src.name), !o.skip_disk_flush);
    // The output is checked where the image is first asked for, after the
    // source compiled: an error of the source is reported before one of the
    // output, as it always was.
    opt.sink = sink.get();
    return run(std::move(opt));
}
