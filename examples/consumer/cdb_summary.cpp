// Compiles a class definition source in memory, verifies the image with the
// bounds-checked reader and prints a line per dsect.
//
//   cdb_summary SOURCE
#include <cdbdump/cdb_walk.h>
#include <qecfg/qecfg.h>

#include <cstdio>
#include <variant>

namespace {

struct summary {
    void operator()(const cdbdump::class_dsect &c) const {
        std::printf("class %s: id %u, %zu persistent and %zu dynamic attributes, %zu actions\n", c.name.c_str(),
                    unsigned(c.class_id), c.pattrs.size() + c.pattrs_class.size(),
                    c.dattrs.size() + c.dattrs_class.size(), c.actions.size() + c.actions_class.size());
    }
    void operator()(const cdbdump::mgr_dsect &m) const { std::printf("manager %s: id %u\n", m.name.c_str(), unsigned(m.id)); }
    void operator()(const cdbdump::map_dsect &m) const {
        std::printf("map: class %u to manager %u\n", unsigned(m.class_id), unsigned(m.rm_id));
    }
    void operator()(const cdbdump::var_class_dsect &v) const {
        std::printf("variable class %s: %zu variables\n", v.name ? v.name->c_str() : "(unnamed)", v.var_ids.size());
    }
};

} // namespace

int main(int argc, char **argv) {
    if (argc != 2) {
        std::fputs("usage: cdb_summary SOURCE\n", stderr);
        return 2;
    }
    qecfg::options opt;
    opt.output_name = "summary.cdef";
    std::vector<std::uint8_t> image;
    qecfg::result r = qecfg::compile_to_memory(qecfg::source::file(argv[1]), image, opt);
    if (!r) {
        std::fputs(r.message.c_str(), stderr);
        return 1;
    }
    try {
        cdbdump::cdb_file f = cdbdump::verify(image.data(), image.size());
        std::printf("%zu bytes, %zu dsects\n", image.size(), f.dsects.size());
        for (const cdbdump::dsect &d : f.dsects)
            std::visit(summary{}, d);
    } catch (const cdbdump::cdb_invalid &e) {
        std::fprintf(stderr, "offset %zu: %s\n", e.offset, e.what());
        return 1;
    }
    return 0;
}
