// The dsects of a verified file, read one at a time: through libcdb from the
// mapped image when its full check accepts it, so that no dsect is held
// longer than its reader needs it, or from the walker's model otherwise.
#ifndef CDBDUMP_CDB_DSECTS_H
#define CDBDUMP_CDB_DSECTS_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "cdb_model.h"

namespace cdbdump {

class dsect_source {
  public:
    virtual ~dsect_source() = default;
    // The header and the anchors (one per dsect); its dsects may be empty.
    const cdb_file &head() const { return head_; }
    size_t count() const { return head_.anchors.size(); }
    // The model of dsect i.
    virtual dsect read(size_t i) const = 0;
    // The name of a class or variable class, and a variable class's alias.
    struct names {
        std::optional<std::string> name, alias;
    };
    virtual names names_of(size_t i) const = 0;

  protected:
    cdb_file head_;
};

// The file whose image is data (which must outlive the source), verified
// whole; throws cdb_invalid at its first violation.
std::unique_ptr<dsect_source> open_verified(const uint8_t *data, size_t size);
// A file already read whole into its model (which must outlive the source).
std::unique_ptr<dsect_source> model_source(const cdb_file &f);

} // namespace cdbdump

#endif
