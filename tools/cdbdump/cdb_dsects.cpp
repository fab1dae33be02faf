#include "cdb_dsects.h"

#include "cdb_read.h"
#include "cdb_walk.h"

namespace cdbdump {

namespace {
std::optional<std::string> maybe(const char *s) { return s ? std::optional<std::string>(s) : std::nullopt; }

class library_dsects : public dsect_source {
  public:
    explicit library_dsects(const cdb_t &db) : db_(db) { head_ = read_head(db_); }

    dsect read(size_t i) const override {
        cdb_dsect_t d;
        cdb_dsect_at(&db_, uint32_t(i), &d);
        return read_dsect(db_, uint32_t(i), d);
    }

    names names_of(size_t i) const override {
        cdb_class_t c;
        cdb_var_class_t vc;
        if (cdb_class_at(&db_, uint32_t(i), &c) == CDB_OK)
            return names{maybe(cdb_class_name(&c)), std::nullopt};
        if (cdb_var_class_at(&db_, uint32_t(i), &vc) == CDB_OK)
            return names{maybe(vc.name), maybe(vc.alias)};
        return names{};
    }

  private:
    cdb_t db_;
};

class model_dsects : public dsect_source {
  public:
    explicit model_dsects(const cdb_file &f) : f_(f) {
        head_ = f;
        head_.dsects.clear();
        head_.anchors.resize(std::min(f.anchors.size(), f.dsects.size()));
    }

    dsect read(size_t i) const override { return f_.dsects[i]; }

    names names_of(size_t i) const override {
        if (const auto *c = std::get_if<class_dsect>(&f_.dsects[i]))
            return names{c->name, std::nullopt};
        if (const auto *v = std::get_if<var_class_dsect>(&f_.dsects[i]))
            return names{v->name, v->alias};
        return names{};
    }

  private:
    const cdb_file &f_;
};

// A file the walker accepts but the library does not keeps its model.
class owning_model_dsects : public model_dsects {
  public:
    explicit owning_model_dsects(std::unique_ptr<cdb_file> f) : model_dsects(*f), owned_(std::move(f)) {}

  private:
    std::unique_ptr<cdb_file> owned_;
};
} // namespace

std::unique_ptr<dsect_source> open_verified(const uint8_t *data, size_t size) {
    cdb_t db;
    if (open_checked(data, size, db))
        return std::make_unique<library_dsects>(db);
    return std::make_unique<owning_model_dsects>(std::make_unique<cdb_file>(verify(data, size)));
}

std::unique_ptr<dsect_source> model_source(const cdb_file &f) { return std::make_unique<model_dsects>(f); }

} // namespace cdbdump
