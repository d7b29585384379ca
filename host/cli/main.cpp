// noctiva: runs the filter module over image files, lists its settings, describes a module file.
#include <CLI/CLI.hpp>
#include <iostream>

#include "Batch.h"
#include "Info.h"
#include "Options.h"
#include "Presets.h"
#include "Settings.h"
#include "noctiva/host/Error.h"

using namespace noctiva::cli;

int main(int argc, char** argv) {
    CLI::App app{"Runs the Noctiva filter module over images (PNG or TIFF, 8 or 16 bits, RGB or RGBA)."};
    app.name("noctiva");
    CommandOptions options;
    CLI::App* info = defineOptions(app, options);
    try {
        app.parse(argc, argv);
    } catch (const CLI::CallForHelp& e) {
        return app.exit(e);
    } catch (const CLI::ParseError& e) {
        std::cerr << "noctiva: " << e.what() << "\n";
        return 1;
    }
    try {
        if (options.listParameters) {
            listParameters(std::cout);
            return 0;
        }
        if (options.listPresets) {
            listPresets(std::cout);
            return 0;
        }
        if (*info) return printModuleInfo(modulePathFrom(options.infoModule), std::cout);
        return runJobs(options, std::cout, std::cerr);
    } catch (const noctiva::host::HostError& e) {
        std::cerr << "noctiva: " << e.what() << "\n";
    } catch (const std::exception& e) {
        std::cerr << "noctiva: " << e.what() << "\n";
    }
    return 1;
}
