// noctiva: runs the filter module over one image file.
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <optional>
#include <sstream>
#include <string>

#include "noctiva/host/Error.h"
#include "noctiva/host/ImageFile.h"
#include "noctiva/host/Module.h"
#include "noctiva/host/Session.h"

namespace fs = std::filesystem;
using namespace noctiva::host;

namespace {

fs::path defaultModulePath() {
    std::error_code ec;
    const fs::path self = fs::read_symlink("/proc/self/exe", ec);
    return (ec ? fs::current_path() : self.parent_path()) / "Noctiva.so";
}

Selection parseSelection(const std::string& text, const std::string& input) {
    Selection s;
    char c1 = 0, c2 = 0, c3 = 0;
    std::istringstream in(text);
    if (!(in >> s.x >> c1 >> s.y >> c2 >> s.width >> c3 >> s.height) || c1 != ',' || c2 != ',' || c3 != ',' ||
        !(in >> std::ws).eof())
        throw HostError(input, "selection \"" + text + "\" is not X,Y,W,H");
    return s;
}

void checkSelection(const Selection& s, const Image& image, const std::string& input) {
    const auto fits = [](long start, long size, long extent) { return start >= 0 && size > 0 && start + size <= extent; };
    if (!fits(s.x, s.width, image.width) || !fits(s.y, s.height, image.height))
        throw HostError(input, "selection " + std::to_string(s.x) + "," + std::to_string(s.y) + "," +
                                   std::to_string(s.width) + "," + std::to_string(s.height) + " lies outside the " +
                                   std::to_string(image.width) + " x " + std::to_string(image.height) + " image");
}

std::string readTextFile(const fs::path& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw HostError(path.string(), "cannot read file");
    std::ostringstream text;
    text << in.rdbuf();
    if (in.bad()) throw HostError(path.string(), "cannot read file");
    return text.str();
}

// A text file written beside its target and moved into place only on commit, so a failed run
// leaves neither it nor a half-written file behind.
class PendingTextFile {
public:
    PendingTextFile(const fs::path& target, const std::string& text)
        : target_(target), temporary_(target.string() + ".tmp") {
        std::ofstream out(temporary_, std::ios::binary | std::ios::trunc);
        out << text;
        out.close();
        if (!out) {
            discard();
            throw HostError(target.string(), "cannot write file");
        }
    }
    ~PendingTextFile() {
        if (!committed_) discard();
    }
    PendingTextFile(const PendingTextFile&) = delete;
    PendingTextFile& operator=(const PendingTextFile&) = delete;

    void commit() {
        std::error_code ec;
        fs::rename(temporary_, target_, ec);
        if (ec) throw HostError(target_.string(), "cannot write file: " + ec.message());
        committed_ = true;
    }

private:
    void discard() {
        std::error_code ec;
        fs::remove(temporary_, ec);
    }
    fs::path target_, temporary_;
    bool committed_ = false;
};

struct Arguments {
    std::string input, output, module;
    std::optional<std::string> selection, par1, par1File, savePar1;
    std::optional<std::int32_t> dRes;
    bool quiet = false;
};

int run(const Arguments& args) {
    const fs::path modulePath = args.module.empty() ? defaultModulePath() : fs::path(args.module);

    FileFormat outputFormat{};
    const bool namedFormat = formatFromExtension(args.output, outputFormat);
    if (!namedFormat && fs::path(args.output).has_extension())
        throw HostError(args.output, "unsupported output format (use .png, .tif or .tiff)");

    RunOptions options;
    if (args.par1) options.par1 = *args.par1;
    if (args.par1File) options.par1 = readTextFile(*args.par1File);
    options.dRes = args.dRes;

    LoadedImage loaded = loadImage(args.input);
    if (!namedFormat) outputFormat = loaded.format;
    if (args.selection) {
        options.selection = parseSelection(*args.selection, args.input);
        checkSelection(*options.selection, loaded.image, args.input);
    }

    Module module(modulePath);
    Image image = loaded.image;
    const RunResult result = runFilter(module.entry(), image, options);
    if (!result.ok()) throw HostError(args.input, result.message());
    if (result.leaks.any()) std::cerr << "noctiva: warning: the module left " << result.leaks.describe() << "\n";

    std::optional<PendingTextFile> par1Out;
    if (args.savePar1) par1Out.emplace(*args.savePar1, result.par1Out);
    saveImage(args.output, image, outputFormat, &loaded);
    if (par1Out) {
        try {
            par1Out->commit();
        } catch (...) {
            std::error_code ec;
            fs::remove(args.output, ec);  // all or nothing
            throw;
        }
    }
    if (!args.quiet)
        std::cout << args.output << ": " << image.width << " x " << image.height << ", " << image.depth << "-bit "
                  << (image.hasAlpha() ? "RGBA" : "RGB") << ", " << result.tilesServed << " tile(s)\n";
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    CLI::App app{"Runs the Noctiva filter module over an image (PNG or TIFF, 8 or 16 bits, RGB or RGBA)."};
    Arguments args;
    app.add_option("input", args.input, "input image")->required();
    app.add_option("-o,--output", args.output, "output image (.png, .tif, .tiff; default: the input's format)")
        ->required();
    app.add_option("--module", args.module, "filter module (default: Noctiva.so beside this program)");
    app.add_option("--selection", args.selection, "filter rectangle X,Y,W,H (default: the whole image)");
    auto* par1 = app.add_option("--par1", args.par1, "settings text passed as 'par1'");
    auto* par1File = app.add_option("--par1-file", args.par1File, "file whose content is passed as 'par1'");
    par1->excludes(par1File);
    app.add_option("--save-par1", args.savePar1, "write the 'par1' text the module returns to this file");
    app.add_option("--dres", args.dRes, "integer passed as 'dRes'");
    app.add_flag("-q,--quiet", args.quiet, "print nothing on success");

    try {
        app.parse(argc, argv);
    } catch (const CLI::CallForHelp& e) {
        return app.exit(e);
    } catch (const CLI::ParseError& e) {
        std::cerr << "noctiva: " << e.what() << "\n";
        return 1;
    }
    try {
        return run(args);
    } catch (const HostError& e) {
        std::cerr << "noctiva: " << e.what() << "\n";
    } catch (const std::exception& e) {
        std::cerr << "noctiva: " << args.input << ": " << e.what() << "\n";
    }
    return 1;
}
