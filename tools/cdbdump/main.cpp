#include "cdbdump_main.h"

int main(int argc, char **argv) { return cdbdump_main(argc, argv, stdout, stderr); }
