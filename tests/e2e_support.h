// Running qecfg as a separate process on a case directory, and the checks of
// its output files; shared by the end-to-end and the fault tests.
#ifndef E2E_SUPPORT_H
#define E2E_SUPPORT_H

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

namespace e2e {

struct run_result {
    int status = -1;
    std::string out, err;
    std::filesystem::path work; // the working directory of the run
};

std::string read_file(const std::filesystem::path &p);
std::string read_or(const std::filesystem::path &p, const std::string &dflt);

// Runs the program in a fresh directory holding a copy of the case's
// input.src, with the case's args and env.
run_result run_case(const std::filesystem::path &dir, const std::string &program);

// Runs a program with arguments in a directory; environment additions are
// NAME=VALUE strings; child_setup runs in the child just before the program.
run_result run(const std::filesystem::path &work, const std::string &program, const std::vector<std::string> &args,
               const std::vector<std::string> &env, const std::function<void()> &child_setup = {});

// Removes the working directory of a run and its captured output.
void remove_run(const run_result &r);

// Failures of the case's checks and expected files.
std::vector<std::string> check_outputs(const std::filesystem::path &dir, const std::filesystem::path &work);

// Every example source and every case's input.src, in order of their paths.
std::vector<std::filesystem::path> all_sources();

} // namespace e2e

#endif
