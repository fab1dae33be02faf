// qecfg-check: see checker.h.
#include "checker.h"

int main(int argc, char **argv) {
    return check::checker_main(std::vector<std::string>(argv + 1, argv + argc), stdout, stderr);
}
