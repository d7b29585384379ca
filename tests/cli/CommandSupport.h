// Running the built noctiva command as a process, and small image files for it.
#pragma once

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "lib/TestFiles.h"

namespace clitest {

struct Outcome {
    int status = -1;
    std::string out, err;
};

using vek::testing::readFile;

inline std::string q(const std::filesystem::path& p) { return "'" + p.string() + "'"; }

// Runs `noctiva ARGUMENTS` with stdout and stderr captured in files of a folder of this process,
// apart from the test's own files.
inline Outcome run(const std::string& arguments) {
    const auto scratch =
        std::filesystem::temp_directory_path() / ("noctiva-cli-tests-output-" + std::to_string(::getpid()));
    std::filesystem::create_directories(scratch);
    const auto out = scratch / "stdout", err = scratch / "stderr";
    const std::string command =
        q(NOCTIVA_COMMAND_PATH) + " " + arguments + " </dev/null >" + q(out) + " 2>" + q(err);
    const int status = std::system(command.c_str());
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, readFile(out), readFile(err)};
}

}  // namespace clitest
