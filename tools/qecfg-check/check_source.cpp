// The check of one source: one compile in memory, then the source model.
#include "check_source.h"

#include <cstdlib>
#include <new>

#include "qecfg/qecfg.h"
#include "warnings.h"

namespace check {

namespace {

// Compiles one source in memory, its traces discarded.
qecfg::result compile(const std::string &name, const std::string &text, const std::string &output_name) {
    char *buf = nullptr;
    size_t len = 0;
    std::FILE *traces = open_memstream(&buf, &len);
    qecfg::options opt;
    opt.message_newline = false;
    opt.output_name = output_name;
    if (traces)
        opt.trace_out = opt.trace_err = traces;
    std::vector<std::uint8_t> image;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::bytes(name, text), image, opt);
    if (traces)
        std::fclose(traces);
    std::free(buf);
    return r;
}

// A compile that fails for want of memory says nothing about the source: an
// image held in memory fails to be mapped only when it cannot be allocated.
bool ran_out_of_memory(const qecfg::result &r) { return r.id == qecfg::message_id::cannot_map; }

} // namespace

std::string without_source_name(const qecfg::result &r, const std::string &name) {
    bool names_source = r.id == qecfg::message_id::cannot_open || r.id == qecfg::message_id::cannot_read;
    return names_source ? r.message.substr(name.size() + 2) : r.message;
}

std::string default_output_name(const std::string &source) {
    std::string base = source.substr(source.find_last_of('/') + 1);
    size_t dot = base.find_last_of('.');
    return (dot == std::string::npos || dot == 0 ? base : base.substr(0, dot)) + ".cdef";
}

namespace {

// The finding of the whole source when the check itself cannot go on.
check_report trouble(std::string why) { return {2, {finding{severity::error, diagnostic{0, std::move(why)}, "", {}}}}; }

// `model` is the model of `text`, or null to read it after the compile, when
// the compile's memory is given back.
check_report check_with(const std::string &name, const std::string &text, const check_options &opt,
                        const source_model *model) try {
    std::string output_name = opt.output_name.empty() ? default_output_name(name) : opt.output_name;
    qecfg::result r = compile(name, text, output_name);
    if (r.status != 0 && (r.status != 1 || ran_out_of_memory(r)))
        return trouble(without_source_name(r, name));
    check_report report;
    report.status = r.status;
    source_model read;
    const source_model &m = model ? *model : (read = read_model(text));
    if (r.status == 1) {
        explained e = explain_failure(r, m);
        report.findings.push_back(finding{severity::error, std::move(e.where), "", std::move(e.notes)});
        return report;
    }
    std::vector<bool> enabled = opt.enabled.empty() ? default_warnings() : opt.enabled;
    enabled.resize(warning_checks().size(), false);
    for (warning_finding &f : run_warnings(check_input{m, output_name, m.classes()}, enabled))
        report.findings.push_back(
            finding{severity::warning, std::move(f.found.where), f.name, std::move(f.found.notes)});
    return report;
} catch (const std::bad_alloc &) {
    return trouble(OUT_OF_MEMORY);
}

} // namespace

check_report check_text(const std::string &name, const std::string &text, const check_options &opt) {
    return check_with(name, text, opt, nullptr);
}

check_report check_text(const std::string &name, const std::string &text, const check_options &opt,
                        const source_model &model) {
    return check_with(name, text, opt, &model);
}

} // namespace check
