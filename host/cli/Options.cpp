#include "Options.h"

#include <fstream>
#include <sstream>

#include "Presets.h"
#include "noctiva/host/Error.h"

#ifdef _WIN32
#include <windows.h>
#endif

namespace noctiva::cli {

namespace {

#ifdef _WIN32
constexpr const char* kModuleFile = "Noctiva.8bf";
#else
constexpr const char* kModuleFile = "Noctiva.so";
#endif

std::string readTextFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw host::HostError(path, "cannot read file");
    std::ostringstream text;
    text << in.rdbuf();
    if (in.bad()) throw host::HostError(path, "cannot read file");
    return text.str();
}

// One line per option: its name, the form of its value, its description. The exclusions are
// stated in the descriptions instead of pushing them onto a line of their own.
class HelpFormatter : public CLI::Formatter {
public:
    std::string make_option_opts(const CLI::Option* option) const override {
        if (!option->get_option_text().empty()) return " " + option->get_option_text();
        if (option->get_type_size() == 0) return "";
        return option->get_type_name().empty() ? "" : " " + option->get_type_name();
    }
};

}  // namespace

CLI::App* defineOptions(CLI::App& app, CommandOptions& o) {
    app.formatter(std::make_shared<HelpFormatter>());
    app.get_formatter()->column_width(26);
    app.add_option("inputs", o.inputs, "input images (PNG or TIFF, 8 or 16 bits, RGB or RGBA)");
    app.add_option("-o,--output", o.output,
                   "output image (.png, .tif, .tiff; no extension: the input's format), or a folder for several inputs")
        ->option_text("OUT");
    app.add_flag("--in-place", o.inPlace, "overwrite each input with its result (instead of -o)");
    app.add_option("--module", o.module,
                   std::string("filter module (default: ") + kModuleFile + " beside this program)")
        ->option_text("PATH");
    app.add_option("--selection", o.selection, "filter only the rectangle X,Y,W,H (default: the whole image)")
        ->option_text("X,Y,W,H");

    auto* preset = app.add_option("--preset", o.preset,
                                  "start from a named preset (see --list-presets); not with --par1 or --par1-file");
    preset->option_text("NAME");
    auto* par1 = app.add_option("--par1", o.par1, "start from this settings text, passed as 'par1'");
    par1->option_text("TEXT");
    auto* par1File = app.add_option("--par1-file", o.par1File, "start from the settings text in this file");
    par1File->option_text("FILE");
    par1->excludes(par1File);
    preset->excludes(par1)->excludes(par1File);
    app.add_option("--set", o.sets,
                   "set one parameter, NAME=VALUE (e.g. step2.mode=102), after the preset or text; repeatable")
        ->allow_extra_args(false)
        ->option_text("NAME=VALUE");
    app.add_option("--save-par1", o.savePar1, "write the settings text the module returns to this file")
        ->option_text("FILE");
    app.add_option("--dres", o.dRes, "integer passed as 'dRes' (3 asks for the create-layer message)")
        ->option_text("N");

    app.add_option("--compare", o.compare, "also write a before/after PNG picture to this file")
        ->option_text("FILE");
    app.add_option("--compare-crop", o.compareCrop, "show only the rectangle X,Y,W,H in the compare picture")
        ->option_text("X,Y,W,H");
    app.add_option("--compare-layout", o.compareLayout,
                   "compare picture layout: side (two images side by side) or split (one image, left before, right after)")
        ->check(CLI::IsMember({"side", "split"}))
        ->option_text("MODE");

    auto* quiet = app.add_flag("-q,--quiet", o.quiet, "print only errors (no progress bar)");
    auto* progress = app.add_flag("--progress", o.progress, "show the progress bar even when stderr is no terminal; not with --quiet");
    auto* noProgress = app.add_flag("--no-progress", o.noProgress, "never show the progress bar");
    progress->excludes(noProgress)->excludes(quiet);
    app.add_flag("--list-parameters", o.listParameters, "print the table of the 58 parameters and exit");
    app.add_flag("--list-presets", o.listPresets, "print the presets and what they change, and exit");

    CLI::App* info = app.add_subcommand("info", "print what a module file declares (PIPL and AETE) and exit");
    info->add_option("module", o.infoModule,
                     std::string("module file (default: ") + kModuleFile + " beside this program)");
    return info;
}

host::Selection parseRectangle(const std::string& text, const std::string& what) {
    host::Selection s;
    char c1 = 0, c2 = 0, c3 = 0;
    std::istringstream in(text);
    if (!(in >> s.x >> c1 >> s.y >> c2 >> s.width >> c3 >> s.height) || c1 != ',' || c2 != ',' || c3 != ',' ||
        !(in >> std::ws).eof())
        throw UsageError(what + " \"" + text + "\" is not X,Y,W,H");
    if (s.width <= 0 || s.height <= 0) throw UsageError(what + " \"" + text + "\" has no area");
    return s;
}

std::filesystem::path modulePathFrom(const std::string& given) {
    if (!given.empty()) return given;
#ifdef _WIN32
    wchar_t self[32768];
    const DWORD length = GetModuleFileNameW(nullptr, self, DWORD(std::size(self)));
    const bool found = length > 0 && length < std::size(self);
    return (found ? std::filesystem::path(self).parent_path() : std::filesystem::current_path()) / kModuleFile;
#else
    std::error_code ec;
    const std::filesystem::path self = std::filesystem::read_symlink("/proc/self/exe", ec);
    return (ec ? std::filesystem::current_path() : self.parent_path()) / kModuleFile;
#endif
}

CompareLayout parseCompareLayout(const std::string& text) {
    if (text == "side") return CompareLayout::SideBySide;
    if (text == "split") return CompareLayout::Split;
    throw UsageError("--compare-layout \"" + text + "\" is neither side nor split");
}

std::optional<std::string> settingsFromOptions(const CommandOptions& o) {
    std::vector<Assignment> assignments;
    for (const std::string& s : o.sets) {
        try {
            assignments.push_back(parseAssignment(s));
        } catch (const std::invalid_argument& e) {
            throw UsageError(e.what());
        }
    }
    std::optional<std::string> base;
    if (o.preset) {
        if (o.par1 || o.par1File) throw UsageError("--preset cannot be combined with --par1 or --par1-file");
        const Preset* preset = findPreset(*o.preset);
        if (preset == nullptr) throw UsageError("unknown preset \"" + *o.preset + "\" (see --list-presets)");
        base = presetSettingsText(*preset);
    } else if (o.par1) {
        base = *o.par1;
    } else if (o.par1File) {
        base = readTextFile(*o.par1File);
    }
    try {
        return composeSettingsText(base, assignments);
    } catch (const std::invalid_argument& e) {
        throw UsageError(e.what());
    }
}

}  // namespace noctiva::cli
