// Glossary: qel_ names the identifiers and types of the resource service that
//   maps a CDB (attribute, action, class and manager ids, its timestamp).
//   The other names of the format are explained at the top of cdb.h.
//
// Identifier types of the resource service that CDB records carry.
#ifndef QEL_H
#define QEL_H

#include <cstdint>

typedef int32_t qel_attribute_id_t;
typedef int32_t qel_action_id_t;
typedef int32_t qel_error_id_t;
typedef uint16_t qel_resource_class_id_t;
typedef uint16_t qel_rm_id_t;

// The CDB timestamp: 32-bit seconds and microseconds, whatever the host's time_t.
struct qel_timeval32_t {
    uint32_t tv_sec;
    uint32_t tv_usec;
};
static_assert(sizeof(qel_timeval32_t) == 8);

#endif
