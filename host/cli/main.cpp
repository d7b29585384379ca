// noctiva: runs the filter module over image files, lists its settings, describes a module file.
#include <CLI/CLI.hpp>
#include <iostream>

#include "Batch.h"
#include "Info.h"
#include "Options.h"
#include "Presets.h"
#include "Settings.h"
#include "noctiva/host/Error.h"

#ifdef _WIN32
#include <windows.h>

#include <cstdio>
#endif

using namespace noctiva::cli;

#ifdef _WIN32
namespace {
// A module that crashes must fail the run with a message, never leave a dialog waiting for a click.
LONG WINAPI reportCrash(EXCEPTION_POINTERS* e) {
    std::fprintf(stderr, "noctiva: crashed with exception 0x%08lX\n",
                 static_cast<unsigned long>(e->ExceptionRecord->ExceptionCode));
    std::fflush(stderr);
    TerminateProcess(GetCurrentProcess(), 3);
    return EXCEPTION_EXECUTE_HANDLER;
}
}  // namespace
#endif

int main(int argc, char** argv) {
#ifdef _WIN32
    SetErrorMode(SEM_FAILCRITICALERRORS | SEM_NOGPFAULTERRORBOX);
    SetUnhandledExceptionFilter(reportCrash);
#endif
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
