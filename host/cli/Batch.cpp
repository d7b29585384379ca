#include "Batch.h"

#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <iomanip>
#include <optional>
#include <sstream>

#include "Progress.h"
#include "noctiva/host/Error.h"
#include "noctiva/host/ImageFile.h"
#include "noctiva/host/Module.h"
#include "noctiva/host/ModuleInfo.h"

namespace fs = std::filesystem;

namespace noctiva::cli {

using host::HostError;
using host::Image;
using host::Selection;

namespace {

bool sameFile(const fs::path& a, const fs::path& b) {
    std::error_code ec;
    if (fs::equivalent(a, b, ec)) return true;
    const fs::path ca = fs::weakly_canonical(a, ec);
    if (ec) return false;
    const fs::path cb = fs::weakly_canonical(b, ec);
    return !ec && ca == cb;
}

std::string rectangleText(const Selection& s) {
    return std::to_string(s.x) + "," + std::to_string(s.y) + "," + std::to_string(s.width) + "," +
           std::to_string(s.height);
}

void checkInside(const Selection& s, const Image& image, const fs::path& input, const std::string& what) {
    const auto fits = [](long start, long size, long extent) { return start >= 0 && size > 0 && start + size <= extent; };
    if (!fits(s.x, s.width, image.width) || !fits(s.y, s.height, image.height))
        throw HostError(input.string(), what + " " + rectangleText(s) + " lies outside the " +
                                            std::to_string(image.width) + " x " + std::to_string(image.height) +
                                            " image");
}

// A file first written beside its target under a temporary name and renamed into place only on
// commit: a failed run leaves neither the file nor a partial one, and never harms the target
// (which may be the input itself).
class StagedFile {
public:
    explicit StagedFile(fs::path target) : target_(std::move(target)), temporary_(target_.string() + ".part") {}
    ~StagedFile() {
        if (!committed_) {
            std::error_code ec;
            fs::remove(temporary_, ec);
        }
    }
    StagedFile(const StagedFile&) = delete;
    StagedFile& operator=(const StagedFile&) = delete;

    void writeImage(const Image& image, host::FileFormat format, const host::LoadedImage* source) {
        try {
            host::saveImage(temporary_, image, format, source);
        } catch (const HostError& e) {
            throw HostError(target_.string(), e.reason());
        }
    }
    void writeText(const std::string& text) {
        std::ofstream out(temporary_, std::ios::binary | std::ios::trunc);
        out << text;
        out.close();
        if (!out) throw HostError(target_.string(), "cannot write file");
    }
    void commit() {
        std::error_code ec;
        fs::rename(temporary_, target_, ec);
        if (ec) throw HostError(target_.string(), "cannot write file: " + ec.message());
        committed_ = true;
    }
    const fs::path& target() const { return target_; }

private:
    fs::path target_, temporary_;
    bool committed_ = false;
};

// What every file of the run shares, worked out once before the first file.
struct Plan {
    std::optional<std::string> par1;
    std::optional<std::int32_t> dRes;
    std::optional<Selection> selection;
    std::optional<Selection> compareCrop;
    CompareLayout compareLayout = CompareLayout::SideBySide;
    std::optional<fs::path> compare, savePar1;
    bool progress = false;
    bool quiet = false;
};

std::string describeImage(const Image& image) {
    return std::to_string(image.width) + " x " + std::to_string(image.height) + ", " + std::to_string(image.depth) +
           "-bit " + (image.hasAlpha() ? "RGBA" : "RGB");
}

void processJob(const Job& job, const host::Module& module, const Plan& plan, const std::string& label,
                std::ostream& out, std::ostream& err) {
    host::FileFormat outputFormat{};
    const bool namedFormat = host::formatFromExtension(job.output, outputFormat);
    std::error_code ec;
    const fs::path folder = job.output.parent_path().empty() ? fs::path(".") : job.output.parent_path();
    if (!fs::is_directory(folder, ec)) throw HostError(job.output.string(), "cannot create file: no such folder");

    const host::LoadedImage loaded = host::loadImage(job.input);
    if (!namedFormat) outputFormat = loaded.format;
    if (plan.selection) checkInside(*plan.selection, loaded.image, job.input, "selection");
    if (plan.compareCrop) checkInside(*plan.compareCrop, loaded.image, job.input, "compare crop");
    if (const host::ModuleInfo* info = module.info())
        if (auto refusal = host::checkImageSupported(*info, host::hostImageMode(loaded.image), loaded.image.depth))
            throw HostError(job.input.string(), refusal->what());

    host::RunOptions options;
    options.par1 = plan.par1;
    options.dRes = plan.dRes;
    options.selection = plan.selection;
    ProgressBar bar(stderr, label, plan.progress);
    options.onProgress = [&bar](std::int32_t done, std::int32_t total) { bar.update(done, total); };

    Image image = loaded.image;
    const host::RunResult result = host::runFilter(module, image, options);
    const Selection area = plan.selection.value_or(Selection{0, 0, image.width, image.height});
    const double megapixels = double(area.width) * double(area.height) / 1e6;
    bar.finish(result.ok(), megapixels);
    const double seconds = bar.elapsedSeconds();
    if (!result.ok()) throw HostError(job.input.string(), result.message());
    if (result.leaks.any())
        err << "noctiva: " << job.input.string() << ": warning: the module left " << result.leaks.describe() << "\n";

    // Everything is staged first and renamed into place last, so a failure leaves no output.
    std::optional<StagedFile> comparePicture, par1Text;
    if (plan.compare) {
        comparePicture.emplace(*plan.compare);
        comparePicture->writeImage(cli::comparePicture(loaded.image, image, plan.compareCrop, plan.compareLayout),
                                   host::FileFormat::Png, nullptr);
    }
    if (plan.savePar1) {
        par1Text.emplace(*plan.savePar1);
        par1Text->writeText(result.par1Out);
    }
    StagedFile output(job.output);
    output.writeImage(image, outputFormat, &loaded);
    if (comparePicture) comparePicture->commit();
    if (par1Text) par1Text->commit();
    output.commit();

    if (!plan.quiet) {
        std::ostringstream line;
        line << job.output.string() << ": " << describeImage(image) << ", " << result.tilesServed << " tile(s), "
             << std::fixed << std::setprecision(2) << seconds << " s";
        if (comparePicture) line << ", compare picture " << comparePicture->target().string();
        out << line.str() << "\n";
    }
}

// Read as an image editor reads it: resources first, then the entry the PIPL names. A library
// with no PIPL at all (a bare test module) is still run through its ENTRYPOINT.
host::Module loadModule(const fs::path& path) {
    std::error_code ec;
    if (!fs::exists(path, ec)) throw HostError(path.string(), "cannot load module: no such file");
    try {
        return host::Module::load(path);
    } catch (const HostError& e) {
        if (!e.reason().starts_with("no PIPL resource")) throw;
    }
    return host::Module(path);
}

bool isPngName(const fs::path& path) {
    host::FileFormat format{};
    return host::formatFromExtension(path, format) && format == host::FileFormat::Png;
}

}  // namespace

std::vector<Job> planJobs(const CommandOptions& o) {
    if (o.inputs.empty()) throw UsageError("no input image given (see --help)");
    std::vector<Job> jobs;
    if (o.inPlace) {
        if (!o.output.empty()) throw UsageError("--in-place and -o exclude each other");
        for (const std::string& input : o.inputs) jobs.push_back({input, input});
    } else {
        if (o.output.empty()) throw UsageError("-o OUT is required (or --in-place)");
        std::error_code ec;
        const bool folder = fs::is_directory(o.output, ec) || o.output.ends_with('/');
        if (folder && !fs::is_directory(o.output, ec)) throw UsageError(o.output + ": no such folder");
        if (o.inputs.size() > 1 && !folder)
            throw UsageError(o.output + ": several inputs need -o to name an existing folder");
        for (const std::string& input : o.inputs)
            jobs.push_back({input, folder ? fs::path(o.output) / fs::path(input).filename() : fs::path(o.output)});
        for (const Job& job : jobs)
            if (sameFile(job.input, job.output))
                throw UsageError(job.output.string() + ": this is the input; use --in-place to overwrite it");
    }
    for (std::size_t i = 0; i < jobs.size(); ++i)
        for (std::size_t j = i + 1; j < jobs.size(); ++j)
            if (sameFile(jobs[i].output, jobs[j].output))
                throw UsageError(jobs[j].output.string() + ": two inputs would both be written here");
    if (jobs.size() > 1 && (o.compare || o.savePar1))
        throw UsageError("--compare and --save-par1 take a single input");
    return jobs;
}

int runJobs(const CommandOptions& o, std::ostream& out, std::ostream& err) {
    Plan plan;
    plan.par1 = settingsFromOptions(o);
    plan.dRes = o.dRes;
    if (o.selection) plan.selection = parseRectangle(*o.selection, "selection");
    if (o.compareCrop) plan.compareCrop = parseRectangle(*o.compareCrop, "compare crop");
    plan.compareLayout = parseCompareLayout(o.compareLayout);
    if (o.compareCrop && !o.compare) throw UsageError("--compare-crop needs --compare FILE");
    if (o.compare) {
        if (fs::path(*o.compare).has_extension() && !isPngName(*o.compare))
            throw UsageError(*o.compare + ": the compare picture is a PNG file (use .png)");
        plan.compare = *o.compare;
    }
    if (o.savePar1) plan.savePar1 = *o.savePar1;
    plan.quiet = o.quiet;
    plan.progress = o.progress || (!o.noProgress && !o.quiet && ::isatty(STDERR_FILENO));

    const std::vector<Job> jobs = planJobs(o);
    if (jobs.size() == 1) {
        host::FileFormat format{};
        if (!host::formatFromExtension(jobs[0].output, format) && jobs[0].output.has_extension())
            throw HostError(jobs[0].output.string(), "unsupported output format (use .png, .tif or .tiff)");
    }
    const host::Module module = loadModule(modulePathFrom(o.module));

    std::size_t failed = 0;
    for (std::size_t i = 0; i < jobs.size(); ++i) {
        const std::string name = jobs[i].input.filename().string();
        const std::string label =
            jobs.size() > 1 ? "[" + std::to_string(i + 1) + "/" + std::to_string(jobs.size()) + "] " + name : name;
        try {
            processJob(jobs[i], module, plan, label, out, err);
        } catch (const HostError& e) {
            err << "noctiva: " << e.what() << "\n";
            ++failed;
        } catch (const std::exception& e) {
            err << "noctiva: " << jobs[i].input.string() << ": " << e.what() << "\n";
            ++failed;
        }
        out.flush();
        err.flush();
    }
    if (jobs.size() > 1 && !o.quiet)
        out << jobs.size() - failed << " of " << jobs.size() << " files processed" << (failed ? ", " : "")
            << (failed ? std::to_string(failed) + " failed" : "") << "\n";
    return failed == 0 ? 0 : 1;
}

}  // namespace noctiva::cli
