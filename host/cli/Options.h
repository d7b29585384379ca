// What the user asked for on the command line, and the checks that run before any file is touched.
#pragma once

#include <CLI/CLI.hpp>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "ComparePicture.h"
#include "Settings.h"
#include "noctiva/host/Session.h"

namespace noctiva::cli {

// A mistake in the options: reported as one line before anything is processed.
class UsageError : public std::invalid_argument {
public:
    using std::invalid_argument::invalid_argument;
};

struct CommandOptions {
    std::vector<std::string> inputs;
    std::string output;
    std::string module;
    std::optional<std::string> selection, par1, par1File, savePar1, preset;
    std::vector<std::string> sets;
    std::optional<std::int32_t> dRes;
    std::optional<std::string> compare, compareCrop;
    std::string compareLayout = "side";
    bool inPlace = false;
    bool quiet = false;
    bool progress = false, noProgress = false;
    bool listParameters = false, listPresets = false;
    std::string infoModule;  // the `info` subcommand's MODULE
};

// Declares every option and the `info` subcommand on `app`, bound to `options`. Returns the
// subcommand so the caller can tell whether it was given.
CLI::App* defineOptions(CLI::App& app, CommandOptions& options);

// "X,Y,W,H" with W and H above zero; `what` names the option in the message.
host::Selection parseRectangle(const std::string& text, const std::string& what);

CompareLayout parseCompareLayout(const std::string& text);

// The module to load: `given`, or Noctiva.so beside the running program.
std::filesystem::path modulePathFrom(const std::string& given);

// The settings text for the module: the base (--preset, --par1 or the file of --par1-file) with
// every --set on top, in the order given. Absent when nothing was asked for. Throws UsageError
// (a malformed --set, an unknown preset, a preset together with a text) or host::HostError (the
// --par1-file cannot be read).
std::optional<std::string> settingsFromOptions(const CommandOptions& options);

}  // namespace noctiva::cli
