/* The reader's header is plain C99: this file includes it and calls into it
 * under -std=c99 -pedantic (the build fails otherwise). */
#include <qecfg/cdb_reader.h>

const char *c99_header_first_type_name(void);
const char *c99_header_first_type_name(void) { return cdb_data_type_name(CDB_INT32); }
