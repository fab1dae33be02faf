// Glossary: zu_qel names what the data-type model (zu) shares with the
//   resource service (qel). The other names are explained at the top of cdb.h.
//
// Types that the data type model shares with the resource service: the
// variable type of a dynamic attribute.
#ifndef ZU_QEL_H
#define ZU_QEL_H

#include <cstdint>

typedef enum : uint32_t {
    QEL_COUNTER = 0,
    QEL_QUANTITY = 1,
    QEL_STATE = 2,
    QEL_QUANTUM = 3,
} qel_variable_type_t;

constexpr unsigned QEL_NUM_VARIABLE_TYPES = 4;

// Names of the variable types in source text (zuVarMap maps entry i to i).
inline constexpr const char *zuVarStr[QEL_NUM_VARIABLE_TYPES] = {"Counter", "Quantity", "State", "Quantum"};

static_assert(sizeof(qel_variable_type_t) == 4);

#endif
