// Compiles a class definition source in memory, checks the image with libcdb
// and prints a line per dsect.
//
//   cdb_summary SOURCE
#include <qecfg/cdb_reader.hpp>
#include <qecfg/qecfg.h>

#include <cstdio>
#include <optional>
#include <string>

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
        qecfg::cdb::database db(image.data(), image.size());
        db.check();
        std::printf("%zu bytes, %u dsects\n", image.size(), unsigned(db.dsect_count()));
        for (uint32_t i = 0; i < db.dsect_count(); i++) {
            std::optional<qecfg::cdb::resource_class> c;
            cdb_var_class_t vc;
            if (db.class_at(i, c)) {
                size_t p = c->attributes(CDB_PATTR).size() + c->attributes(CDB_PATTR_CLASS).size();
                size_t d = c->attributes(CDB_DATTR).size() + c->attributes(CDB_DATTR_CLASS).size();
                size_t a = cdb_action_count(&c->c(), 0) + cdb_action_count(&c->c(), 1);
                std::printf("class %s: id %u, %zu persistent and %zu dynamic attributes, %zu actions\n",
                            std::string(c->name()).c_str(), unsigned(c->id()), p, d, a);
            } else if (cdb_var_class_at(&db.c(), i, &vc) == CDB_OK) {
                std::printf("variable class %s: %u variables\n", vc.name ? vc.name : "(unnamed)",
                            unsigned(vc.var_count));
            }
        }
        cdb_manager_t m;
        cdb_map_t map;
        if (cdb_get_manager(&db.c(), &m) == CDB_OK)
            std::printf("manager %s: id %u\n", m.name, unsigned(m.id));
        if (cdb_get_map(&db.c(), &map) == CDB_OK)
            std::printf("map: class %u to manager %u\n", unsigned(map.class_id), unsigned(map.rm_id));
    } catch (const qecfg::cdb::error &e) {
        std::fprintf(stderr, "offset %zu: %s\n", e.offset(), e.what());
        return 1;
    }
    return 0;
}
