// GIMP itself, headless, with the plug-in installed into a fresh profile: every case loads a PNG,
// runs "plug-in-noctiva" and saves; the result is compared with the `noctiva` command's output on
// the same file. One GIMP run serves every case (a start costs seconds), so this executable runs
// as one test.
#include <gtest/gtest.h>
#include <png.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <optional>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

#include "noctiva/host/ImageFile.h"
#include "Presets.h"

namespace fs = std::filesystem;
namespace host = noctiva::host;

namespace {

std::string quote(const std::string& s) {
    std::string q = "'";
    for (char c : s) q += c == '\'' ? std::string("'\\''") : std::string(1, c);
    return q + "'";
}

std::string readFile(const fs::path& p) {
    std::ifstream in(p, std::ios::binary);
    std::ostringstream s;
    s << in.rdbuf();
    return s.str();
}

// Smooth ramps with noise, so the filter has something to remove; 16-bit samples use the full
// range (not multiples of 257) so a lossy round trip would show.
host::Image noisyImage(int w, int h, int channels, int depth, unsigned seed) {
    host::Image image(w, h, channels, depth);
    std::uint32_t state = seed;
    auto next = [&state] { return (state = state * 1664525u + 1013904223u) >> 8; };
    const int max = depth == 16 ? 65535 : 255;
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x)
            for (int c = 0; c < channels; ++c) {
                const int base = c == 3 ? (x * 7 + y * 3) % (max + 1) : (max * ((x + c * 40) % w)) / w;
                const int noise = c == 3 ? 0 : int(next() % std::uint32_t(max / 5 + 1)) - max / 10;
                image.set(x, y, c, std::uint16_t(std::clamp(base + noise, 0, max)));
            }
    return image;
}

// File samples: 8-bit as loaded, 16-bit the file's own values.
struct FilePixels {
    int width = 0, height = 0, channels = 0, depth = 0;
    std::vector<std::uint16_t> samples;
    std::uint16_t at(int x, int y, int c) const { return samples[(std::size_t(y) * width + x) * channels + c]; }
};

FilePixels loadPixels(const fs::path& path) {
    host::LoadedImage loaded = host::loadImage(path);
    FilePixels p{loaded.image.width, loaded.image.height, loaded.image.channels, loaded.image.depth, {}};
    p.samples = loaded.image.depth == 16 ? loaded.original16 : loaded.image.widened();
    return p;
}

// The selection mask GIMP saved: a grey PNG of 8 or 16 bits, read without any conversion.
FilePixels loadGreyMask(const fs::path& path) {
    std::unique_ptr<FILE, int (*)(FILE*)> file(std::fopen(path.c_str(), "rb"), &std::fclose);
    if (!file) throw std::runtime_error(path.string() + ": cannot open");
    png_structp png = png_create_read_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png_create_info_struct(png);
    FilePixels p;
    if (setjmp(png_jmpbuf(png))) {
        png_destroy_read_struct(&png, &info, nullptr);
        throw std::runtime_error(path.string() + ": broken PNG");
    }
    png_init_io(png, file.get());
    png_read_png(png, info, PNG_TRANSFORM_STRIP_ALPHA, nullptr);
    p.width = int(png_get_image_width(png, info));
    p.height = int(png_get_image_height(png, info));
    p.depth = png_get_bit_depth(png, info);
    p.channels = 1;
    const bool grey = png_get_color_type(png, info) == PNG_COLOR_TYPE_GRAY;
    png_bytepp rows = png_get_rows(png, info);
    for (int y = 0; grey && y < p.height; ++y)
        for (int x = 0; x < p.width; ++x)
            p.samples.push_back(p.depth == 16 ? std::uint16_t(rows[y][2 * x] << 8 | rows[y][2 * x + 1]) : rows[y][x]);
    png_destroy_read_struct(&png, &info, nullptr);
    if (!grey || (p.depth != 8 && p.depth != 16)) throw std::runtime_error(path.string() + ": not an 8/16-bit grey mask");
    return p;
}

enum class Selecting { None, Rectangle, Ellipse };

struct Case {
    std::string name;
    std::string input;  // key into the inputs below
    Selecting selecting = Selecting::None;
    int sx = 0, sy = 0, sw = 0, sh = 0;
    std::string settings, preset;  // procedure arguments
    int runMode = 1;               // RUN-NONINTERACTIVE; 2 = RUN-WITH-LAST-VALS
    std::optional<std::string> commandPar1;
};

void PrintTo(const Case& c, std::ostream* os) { *os << c.name; }

struct InputSpec {
    int width, height, channels, depth;
    unsigned seed;
};

const std::map<std::string, InputSpec> kInputs{
    {"rgb8", {263, 181, 3, 8, 11}},
    {"rgba8", {263, 181, 4, 8, 12}},
    {"rgb16", {237, 203, 3, 16, 13}},
    {"rgba16", {237, 203, 4, 16, 14}},
};

std::string presetText(const char* name) { return noctiva::cli::presetSettingsText(*noctiva::cli::findPreset(name)); }

// Not a preset: step 1's chroma limit and step 2's impulse pass.
std::string handWrittenText() {
    std::string text = presetText("default");
    for (auto [from, to] : {std::pair{" Parameter50 104 ", " Parameter50 1 "}, {" Parameter57 0 ", " Parameter57 2 "}}) {
        const std::size_t at = text.find(from);
        if (at == std::string::npos) throw std::logic_error("default text lacks " + std::string(from));
        text.replace(at, std::string(from).size(), to);
    }
    return text;
}

std::vector<Case> cases() {
    const Selecting R = Selecting::Rectangle, E = Selecting::Ellipse;
    return {
        {.name = "rgb8-defaults", .input = "rgb8"},
        {.name = "rgba8-defaults", .input = "rgba8"},
        {.name = "rgb16-defaults", .input = "rgb16"},
        {.name = "rgba16-defaults", .input = "rgba16"},
        {.name = "rgb8-rectangle", .input = "rgb8", .selecting = R, .sx = 41, .sy = 17, .sw = 150, .sh = 121},
        {.name = "rgba16-rectangle", .input = "rgba16", .selecting = R, .sx = 5, .sy = 60, .sw = 200, .sh = 90},
        {.name = "rgb8-ellipse", .input = "rgb8", .selecting = E, .sx = 30, .sy = 20, .sw = 170, .sh = 130},
        {.name = "rgba16-ellipse", .input = "rgba16", .selecting = E, .sx = 60, .sy = 40, .sw = 150, .sh = 140},
        {.name = "rgb8-settings", .input = "rgb8", .settings = handWrittenText(), .commandPar1 = handWrittenText()},
        {.name = "rgb16-settings", .input = "rgb16", .settings = presetText("chroma-strong"),
         .commandPar1 = presetText("chroma-strong")},
        // Not a grain preset: the module seeds its grain with the time in seconds, so two processes agree
        // only within one second.
        {.name = "rgba8-preset", .input = "rgba8", .preset = "rank", .commandPar1 = presetText("rank")},
        // Right after the preset run: "Repeat" must pick up what that run used.
        {.name = "rgba8-last-values", .input = "rgba8", .runMode = 2, .commandPar1 = presetText("rank")},
    };
}

// Runs that must fail, each its own batch command; the expected text of GIMP's error report.
struct FailingRun {
    std::string script;
    std::string expected;
};

class Gimp {
public:
    Gimp() {
        char pattern[] = "/tmp/noctiva-gimp-XXXXXX";
        if (!mkdtemp(pattern)) throw std::runtime_error("mkdtemp failed");
        dir_ = pattern;
        for (const auto& [name, spec] : kInputs)
            host::saveImage(input(name), noisyImage(spec.width, spec.height, spec.channels, spec.depth, spec.seed),
                            host::FileFormat::Png);
        install();
        // The profile exists once the plug-in is in it, so GIMP skips creating its data folders.
        fs::create_directories(dir_ / "profile/gradients");
        run();
    }
    ~Gimp() {
        if (::testing::UnitTest::GetInstance()->Passed()) {
            std::error_code ec;
            fs::remove_all(dir_, ec);
        } else {
            std::fprintf(stderr, "GIMP test files kept in %s\n", dir_.c_str());
        }
    }

    fs::path input(const std::string& key) const { return dir_ / (key + ".png"); }
    fs::path output(const Case& c) const { return dir_ / ("gimp-" + c.name + ".png"); }
    fs::path mask(const Case& c) const { return dir_ / ("mask-" + c.name + ".png"); }
    const fs::path& dir() const { return dir_; }
    const std::string& log() const { return log_; }
    int status() const { return status_; }

    // The value a case printed as "noctiva-case NAME KEY:VALUE".
    std::optional<std::string> printed(const Case& c, const std::string& key) const {
        const std::string marker = "noctiva-case " + c.name + " " + key + ":";
        const std::size_t at = log_.find(marker);
        if (at == std::string::npos) return std::nullopt;
        const std::size_t start = at + marker.size();
        return log_.substr(start, log_.find('\n', start) - start);
    }

    static std::vector<FailingRun> failingRuns() {
        const auto image = [](const char* type, const char* precision, const char* layerType) {
            return std::string("(let* ((image (car (gimp-image-new-with-precision 16 16 ") + type + " " + precision +
                   "))) (drawable (car (gimp-layer-new image 16 16 " + layerType +
                   " \"l\" 100 LAYER-MODE-NORMAL)))) (gimp-image-insert-layer image drawable 0 0) ";
        };
        const std::string rgb = image("RGB", "PRECISION-U8-GAMMA", "RGB-IMAGE");
        return {
            {rgb + "(plug-in-noctiva RUN-NONINTERACTIVE image drawable \"\" \"no-such-preset\" 0))",
             "Noctiva: unknown preset \"no-such-preset\""},
            {rgb + "(plug-in-noctiva RUN-NONINTERACTIVE image drawable \"vek \" \"impulse\" 0))",
             "Noctiva: give either a preset or a settings text, not both"},
            {image("GRAY", "PRECISION-U8-GAMMA", "GRAY-IMAGE") +
                 "(plug-in-noctiva RUN-NONINTERACTIVE image drawable \"\" \"\" 0))",
             "Noctiva: the layer is not RGB or RGBA"},
            {image("RGB", "PRECISION-FLOAT-LINEAR", "RGB-IMAGE") +
                 "(plug-in-noctiva RUN-NONINTERACTIVE image drawable \"\" \"\" 0))",
             "Noctiva: the image is not 8-bit or 16-bit integer"},
        };
    }

private:
    void install() {
        const std::string command = "bash " + quote(NOCTIVA_INSTALL_SCRIPT) + " --no-build --build " +
                                    quote(NOCTIVA_BINARY_DIR) + " --dest " + quote((dir_ / "profile/plug-ins/noctiva").string()) +
                                    " > " + quote((dir_ / "install.log").string()) + " 2>&1";
        if (std::system(command.c_str()) != 0)
            throw std::runtime_error("install.sh failed: " + readFile(dir_ / "install.log"));
    }

    // Each input is loaded once (a load starts a plug-in process) and every case works on a copy.
    std::string script() const {
        std::string s = "(begin\n";
        for (const auto& [key, spec] : kInputs)
            s += "(define noctiva-" + key + " (car (gimp-file-load RUN-NONINTERACTIVE \"" + input(key).string() +
                 "\" \"" + input(key).string() + "\")))\n";
        for (const Case& c : cases()) {
            const std::string out = output(c).string();
            s += "(let* ((image (car (gimp-image-duplicate noctiva-" + c.input + ")))\n"
                 "       (drawable (car (gimp-image-get-active-drawable image))))\n";
            const std::string box = std::to_string(c.sx) + " " + std::to_string(c.sy) + " " + std::to_string(c.sw) +
                                    " " + std::to_string(c.sh);
            if (c.selecting == Selecting::Rectangle)
                s += "  (gimp-image-select-rectangle image CHANNEL-OP-REPLACE " + box + ")\n";
            if (c.selecting == Selecting::Ellipse)
                s += "  (gimp-context-set-antialias TRUE)\n"
                     "  (gimp-image-select-ellipse image CHANNEL-OP-REPLACE " + box + ")\n";
            s += "  (let ((b (gimp-selection-bounds image)))\n"
                 "    (gimp-message (string-append \"noctiva-case " + c.name + " bounds:\" (number->string (cadr b)) \",\" "
                 "(number->string (caddr b)) \",\" (number->string (- (cadddr b) (cadr b))) \",\" "
                 "(number->string (- (car (cddddr b)) (caddr b))))))\n";
            s += "  (gimp-message (string-append \"noctiva-case " + c.name + " settings-out:\" (car (plug-in-noctiva " +
                 std::to_string(c.runMode) + " image drawable \"" + c.settings + "\" \"" + c.preset + "\" 0))))\n";
            if (c.selecting == Selecting::Ellipse)
                s += "  (file-png-save2 RUN-NONINTERACTIVE image (car (gimp-selection-save image)) \"" + mask(c).string() +
                     "\" \"" + mask(c).string() + "\" 0 1 0 0 0 0 0 0 1)\n";
            // The last 1 keeps the colour of transparent pixels.
            s += "  (file-png-save2 RUN-NONINTERACTIVE image drawable \"" + out + "\" \"" + out + "\" 0 1 0 0 0 0 0 0 1)\n"
                 "  (gimp-image-delete image))\n";
        }
        for (const auto& [key, spec] : kInputs) s += "(gimp-image-delete noctiva-" + key + ")\n";
        return s + ")\n";
    }

    void run() {
        const fs::path scriptFile = dir_ / "cases.scm";
        std::ofstream(scriptFile) << script();
        std::string command = "cd " + quote(dir_.string()) + " && GIMP2_DIRECTORY=" + quote((dir_ / "profile").string()) +
                              " timeout 300 " + quote(NOCTIVA_GIMP_EXECUTABLE) +
                              " -i -d -f --batch-interpreter plug-in-script-fu-eval -b " +
                              quote("(load \"" + scriptFile.string() + "\")");
        for (const FailingRun& f : failingRuns()) command += " -b " + quote(f.script);
        command += " -b " + quote("(gimp-quit 0)") + " > gimp.log 2>&1 < /dev/null";
        status_ = std::system(command.c_str());
        log_ = readFile(dir_ / "gimp.log");
    }

    fs::path dir_;
    std::string log_;
    int status_ = -1;
};

Gimp& gimp() {
    static Gimp instance;
    return instance;
}

// The command on the same input; `selection` "X,Y,W,H" or empty.
fs::path commandOutput(const Case& c, const std::string& selection) {
    const fs::path out = gimp().dir() / ("command-" + c.name + ".png");
    const fs::path par1 = gimp().dir() / ("command-" + c.name + ".par1");
    std::string command = quote(NOCTIVA_COMMAND) + " " + quote(gimp().input(c.input).string()) + " -o " +
                          quote(out.string()) + " --save-par1 " + quote(par1.string()) + " --quiet";
    if (!selection.empty()) command += " --selection " + selection;
    if (c.commandPar1) command += " --par1 " + quote(*c.commandPar1);
    if (std::system(command.c_str()) != 0) throw std::runtime_error("noctiva command failed: " + command);
    return out;
}

TEST(GimpPlugin, GimpRanEveryBatchCommand) {
    const Gimp& g = gimp();
    EXPECT_EQ(g.status(), 0) << g.log();
    std::size_t ok = 0, failed = 0;
    for (std::size_t at = 0; (at = g.log().find("batch command executed successfully", at)) != std::string::npos; ++at) ++ok;
    for (std::size_t at = 0; (at = g.log().find("batch command experienced an execution error", at)) != std::string::npos; ++at)
        ++failed;
    // The case script, then the failing runs one by one, then the quit (which prints nothing).
    EXPECT_EQ(ok, 1u) << g.log();
    EXPECT_EQ(failed, Gimp::failingRuns().size()) << g.log();
    for (const FailingRun& f : Gimp::failingRuns())
        EXPECT_NE(g.log().find("plug-in-noctiva failed: " + f.expected), std::string::npos)
            << "expected: " << f.expected << "\n" << g.log();
}

class GimpCase : public ::testing::TestWithParam<Case> {};

TEST_P(GimpCase, MatchesTheCommand) {
    const Case& c = GetParam();
    const Gimp& g = gimp();
    const std::optional<std::string> bounds = g.printed(c, "bounds");
    const std::optional<std::string> settingsOut = g.printed(c, "settings-out");
    ASSERT_TRUE(bounds && settingsOut) << g.log();
    ASSERT_TRUE(fs::exists(g.output(c))) << g.log();

    const bool selected = c.selecting != Selecting::None;
    const fs::path expectedFile = commandOutput(c, selected ? *bounds : std::string());
    if (c.selecting == Selecting::Rectangle) {
        EXPECT_EQ(*bounds, std::to_string(c.sx) + "," + std::to_string(c.sy) + "," + std::to_string(c.sw) + "," +
                               std::to_string(c.sh));
    }
    const FilePixels in = loadPixels(g.input(c.input));
    const FilePixels expected = loadPixels(expectedFile);
    const FilePixels out = loadPixels(g.output(c));
    ASSERT_EQ(out.width, in.width);
    ASSERT_EQ(out.height, in.height);
    ASSERT_EQ(out.channels, in.channels) << "GIMP saved another layout";
    ASSERT_EQ(out.depth, in.depth) << "GIMP saved another depth";
    ASSERT_NE(expected.samples, in.samples) << "the filter changed nothing: the comparison would prove nothing";
    EXPECT_EQ(*settingsOut, readFile(gimp().dir() / ("command-" + c.name + ".par1")))
        << "the settings text the module wrote back";

    if (c.selecting != Selecting::Ellipse) {
        // Outside a rectangle the command leaves the file alone too, so equality covers it.
        std::size_t differing = 0;
        for (std::size_t i = 0; i < out.samples.size(); ++i) differing += out.samples[i] != expected.samples[i];
        EXPECT_EQ(differing, 0u) << "samples differing from the command's output";
        if (c.selecting == Selecting::Rectangle)
            for (int y = 0; y < in.height; ++y)
                for (int x = 0; x < in.width; ++x)
                    if (x < c.sx || y < c.sy || x >= c.sx + c.sw || y >= c.sy + c.sh)
                        for (int ch = 0; ch < in.channels; ++ch) {
                            ASSERT_EQ(out.at(x, y, ch), in.at(x, y, ch)) << "outside the selection at " << x << "," << y;
                        }
        return;
    }

    // Ellipse: unselected pixels are the input's, fully selected the command's, the antialiased rim
    // lies between the two.
    const FilePixels m = loadGreyMask(g.mask(c));
    ASSERT_EQ(m.width, in.width);
    ASSERT_EQ(m.height, in.height);
    const std::uint16_t full = m.depth == 16 ? 65535 : 255;
    std::size_t outsideChanged = 0, rim = 0, inside = 0;
    for (int y = 0; y < in.height; ++y)
        for (int x = 0; x < in.width; ++x) {
            const std::uint16_t mv = m.at(x, y, 0);
            for (int ch = 0; ch < in.channels; ++ch) {
                const int o = out.at(x, y, ch), i = in.at(x, y, ch), e = expected.at(x, y, ch);
                if (mv == 0) {
                    ASSERT_EQ(o, i) << "unselected pixel changed at " << x << "," << y;
                    outsideChanged += e != i;  // the command, given only the bounds, did change it
                } else if (mv == full) {
                    ASSERT_EQ(o, e) << "selected pixel differs from the command's at " << x << "," << y;
                    ++inside;
                } else {
                    ASSERT_GE(o, std::min(i, e) - 1) << x << "," << y;
                    ASSERT_LE(o, std::max(i, e) + 1) << x << "," << y;
                    ++rim;
                }
            }
        }
    EXPECT_GT(outsideChanged, 0u) << "no pixel inside the bounds but outside the ellipse would have changed";
    EXPECT_GT(rim, 0u) << "no antialiased rim";
    EXPECT_GT(inside, 0u);
}

INSTANTIATE_TEST_SUITE_P(Cases, GimpCase, ::testing::ValuesIn(cases()), [](const auto& info) {
    std::string name = info.param.name;
    for (char& ch : name) {
        if (ch == '-') ch = '_';
    }
    return name;
});

// The same settings given to the procedure and to the command change the picture the same way,
// and differently from the defaults.
TEST(GimpPlugin, SettingsAndPresetsChangeTheResult) {
    const Gimp& g = gimp();
    const auto all = cases();
    auto find = [&](const std::string& name) { return *std::find_if(all.begin(), all.end(), [&](const Case& c) { return c.name == name; }); };
    for (auto [withSettings, defaults] : {std::pair{"rgb8-settings", "rgb8-defaults"}, {"rgb16-settings", "rgb16-defaults"},
                                          {"rgba8-preset", "rgba8-defaults"}, {"rgba8-last-values", "rgba8-defaults"}}) {
        ASSERT_TRUE(fs::exists(g.output(find(withSettings))) && fs::exists(g.output(find(defaults)))) << g.log();
        EXPECT_NE(loadPixels(g.output(find(withSettings))).samples, loadPixels(g.output(find(defaults))).samples)
            << withSettings << " looks like " << defaults;
    }
}

}  // namespace
