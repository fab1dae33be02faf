/* What a service does with a CDB: map it read-only, verify it once, find a
 * class by name and an attribute by id, and read its default and valid
 * values. Plain C99 against the installed libcdb.
 *
 *   cdb_service FILE CLASS ATTRIBUTE_ID
 *   cdb_service FILE        (the demonstration's disk.cdef: its Capacity)
 *
 * Built with CMake, the generated disk_cdb.h names the demonstration's class
 * and attribute ids instead of numbers.
 */
#include <fcntl.h>
#include <stdio.h>
#include <stdlib.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <qecfg/cdb_reader.h>

#ifdef __has_include
#if __has_include("disk_cdb.h")
#include "disk_cdb.h"
#endif
#endif
#ifndef DEMO_DISK_CLASS_NAME
#define DEMO_DISK_CLASS_NAME "Demo.Disk"
#define DEMO_DISK_PATTR_CAPACITY 3
#endif
#define STRINGIFY(x) #x
#define TEXT_OF(x) STRINGIFY(x)

static int fail(const char *what, int err) {
    fprintf(stderr, "cdb_service: %s: %s\n", what, cdb_strerror(err));
    return 1;
}

static void print_value(const char *label, const cdb_value_t *v) {
    char text[256];
    int n = cdb_format_value(v, text, sizeof text);
    printf("%s: %s%s\n", label, n < 0 ? cdb_strerror(n) : text, n >= (int)sizeof text ? "..." : "");
}

int main(int argc, char **argv) {
    struct stat st;
    void *map, *scratch;
    size_t scratch_size, bad = 0;
    cdb_t db;
    cdb_class_t cls;
    cdb_attr_t attr;
    cdb_value_t dflt, low, high;
    cdb_valid_values_t vv;
    uint32_t i;
    uint16_t msg;
    int fd, err;

    const char *class_name = argc == 4 ? argv[2] : DEMO_DISK_CLASS_NAME;
    const char *attr_id = argc == 4 ? argv[3] : TEXT_OF(DEMO_DISK_PATTR_CAPACITY);

    if (argc != 2 && argc != 4) {
        fputs("usage: cdb_service FILE [CLASS ATTRIBUTE_ID]\n", stderr);
        return 2;
    }
    fd = open(argv[1], O_RDONLY);
    if (fd < 0 || fstat(fd, &st) != 0 || st.st_size == 0) {
        perror(argv[1]);
        return 1;
    }
    map = mmap(NULL, (size_t)st.st_size, PROT_READ, MAP_PRIVATE, fd, 0);
    close(fd);
    if (map == MAP_FAILED) {
        perror(argv[1]);
        return 1;
    }

    /* Open (cheap), then verify once: after that every accessor succeeds. */
    if ((err = cdb_open(&db, map, (size_t)st.st_size)) != CDB_OK)
        return fail("open", err);
    scratch_size = cdb_check_scratch_size(&db);
    scratch = calloc(1, scratch_size ? scratch_size : 1);
    err = cdb_check(&db, scratch, scratch_size, &bad);
    free(scratch);
    if (err != CDB_OK) {
        fprintf(stderr, "cdb_service: offset %lu: %s\n", (unsigned long)bad, cdb_strerror(err));
        return 1;
    }

    if ((err = cdb_find_class(&db, class_name, &cls)) != CDB_OK)
        return fail(class_name, err);
    if ((err = cdb_find_attr(&cls, CDB_PATTR, (int32_t)atoi(attr_id), &attr)) != CDB_OK)
        return fail(attr_id, err);
    printf("%s.%s: %s\n", cdb_class_name(&cls), cdb_attr_name(&attr), cdb_data_type_name(cdb_attr_data_type(&attr)));
    if (cdb_attr_default(&attr, &dflt) == CDB_OK)
        print_value("default", &dflt);
    if (cdb_attr_valid_values(&attr, &vv) == CDB_OK)
        for (i = 0; cdb_valid_value_at(&vv, i, &low, &high, &msg) == CDB_OK; i++) {
            print_value("valid from", &low);
            print_value("        to", &high);
        }
    munmap(map, (size_t)st.st_size);
    return 0;
}
