/* Names the file does not hold: error texts, data and variable type names,
 * property words and permission letters. */
#include <stdio.h>

#include "cdb_internal.h"

const char *cdb_strerror(int err) {
    static const char *const texts[] = {
        "success",
        "the file is shorter than a header or not a multiple of 4 bytes",
        "the format word is wrong in both byte orders",
        "the header's length does not match the file",
        "the checksum does not match",
        "a record size or a maximum id of the header is wrong",
        "the anchor table is damaged",
        "a record or list has the wrong identifier word",
        "an offset or a count leads outside its table",
        "a table is not where the layout puts it, or a fixed field is wrong",
        "a string is missing or not terminated inside its table",
        "a data type or variable type is out of range",
        "a list or value body is referred to twice",
        "no such item",
        "the value is not of the kind asked for",
        "the buffer is too small",
        "an argument is out of range",
    };
    if (err > 0 || err < -(int)(sizeof texts / sizeof texts[0] - 1))
        return "unknown error";
    return texts[-err];
}

const char *cdb_data_type_name(uint32_t type) {
    static const char *const names[CDB_NUM_DATA_TYPES] = {
        "UNKNOWN",      "None",        "Int32",       "UInt32",     "Int64",       "UInt64",
        "Float32",      "Float64",     "String",      "Binary",     "RH",          "SD",
        "SBS",          "Int32Array",  "UInt32Array", "Int64Array", "UInt64Array", "Float32Array",
        "Float64Array", "StringArray", "BinaryArray", "RHArray",    "SDArray",
    };
    return type < CDB_NUM_DATA_TYPES ? names[type] : NULL;
}

const char *cdb_var_type_name(uint32_t type) {
    static const char *const names[CDB_NUM_VAR_TYPES] = {"Counter", "Quantity", "State", "Quantum"};
    return type < CDB_NUM_VAR_TYPES ? names[type] : NULL;
}

uint32_t cdb_element_type(uint32_t type) {
    return type >= CDB_INT32_ARRAY && type <= CDB_SD_ARRAY ? type - (CDB_INT32_ARRAY - CDB_INT32) : type;
}

typedef struct word {
    const char *name;
    uint32_t bit;
} word_t;

static const word_t class_words[] = {{"MtypDivided", 0x2000},     {"MtypCentral", 0x4000},
                                     {"MtypGlobal", 0x8000},      {"QELElectCoord", 0x100},
                                     {"HasResources", 0x2},       {"HasConstraints", 0x80},
                                     {"CanControl", 0x4},         {"CanDefine", 0x8},
                                     {"JoinPhase0", 0x10},        {"JoinPhase1", 0x20},
                                     {"SupportsMove", 0x200},     {"CanBatchDefine", 0x400},
                                     {"CanBatchUndefine", 0x800}, {"CanBatchSetAttr", 0x1000},
                                     {"HasIWAccess", 0x1},        {"QryReqsMonitoring", 0x20000},
                                     {"CanLiveUpdate", 0x40000},  {NULL, 0}};
static const word_t pattr_words[] = {
    {"Public", 0x20},  {"Select", 0x10}, {"ReqdForDefine", 0x2}, {"OptForDefine", 0x8}, {"InvalForDefine", 0x4},
    {"ReadOnly", 0x1}, {NULL, 0}};
static const word_t dattr_words[] = {{"Public", 0x20}, {"QryReqsMonitoring", 0x40}, {NULL, 0}};
static const word_t action_words[] = {{"Public", 0x2}, {"LongRun", 0x1}, {NULL, 0}};
static const word_t permission_words[] = {{"q", 0x1},   {"l", 0x2},   {"e", 0x4},  {"v", 0x8},
                                          {"d", 0x10},  {"c", 0x20},  {"s", 0x40}, {"o", 0x80},
                                          {"a", 0x100}, {"x", 0x200}, {NULL, 0}};

static const word_t *words_of(int table) {
    static const word_t *const tables[] = {class_words, pattr_words, dattr_words, action_words, permission_words};
    return table >= 0 && table <= CDB_WORDS_PERMISSION ? tables[table] : NULL;
}

const char *cdb_word(int table, unsigned i, uint32_t *bit) {
    const word_t *w = words_of(table);
    unsigned k;
    if (!w)
        return NULL;
    for (k = 0; k < i && w[k].name; k++)
        continue;
    if (!w[k].name)
        return NULL;
    if (bit)
        *bit = w[k].bit;
    return w[k].name;
}

int cdb_format_words(int table, uint32_t bits, char *buf, size_t size) {
    const word_t *w = words_of(table);
    size_t len = 0;
    if (!w)
        return CDB_ERR_BADARG;
    if (buf && size)
        buf[0] = '\0';
    for (; w->name; w++) {
        if (!(bits & w->bit))
            continue;
        if (buf && len < size)
            snprintf(buf + len, size - len, "%s%s", len ? "," : "", w->name);
        len += strlen(w->name) + (len ? 1 : 0);
    }
    return (int)len;
}
