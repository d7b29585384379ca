// Running the module over one file or a batch of files, with everything the command writes.
#pragma once

#include <filesystem>
#include <ostream>
#include <vector>

#include "Options.h"

namespace noctiva::cli {

struct Job {
    std::filesystem::path input, output;
};

// Which file goes where. One input: -o names the file (or an existing folder); several inputs:
// -o names an existing folder and each output keeps its input's file name; --in-place writes
// each input over itself. Throws UsageError when an output would overwrite an input without
// --in-place, when two inputs would share one output, or when the options do not fit together.
std::vector<Job> planJobs(const CommandOptions& options);

// Processes every job in turn and reports each on `out` (results) and `err` (one line per
// failure); a failed file does not stop the others. Returns 0 when every file succeeded, else 1.
int runJobs(const CommandOptions& options, std::ostream& out, std::ostream& err);

}  // namespace noctiva::cli
