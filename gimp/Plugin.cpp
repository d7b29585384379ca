// The GIMP 2.10 plug-in: registers "Noctiva..." under Filters > Noise and runs the module through
// our host library on the active drawable.
#include <libgimp/gimp.h>

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "Choice.h"
#include "Dialog.h"
#include "Pixels.h"
#include "noctiva/host/Error.h"
#include "noctiva/host/Module.h"
#include "noctiva/host/Session.h"

namespace {

namespace host = noctiva::host;
namespace ng = noctiva::gimp;

constexpr const char* kProcedure = "plug-in-noctiva";

// Failures shown to the user or returned to the calling script.
struct PluginError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

struct GObjectUnref {
    void operator()(gpointer object) const { g_object_unref(object); }
};
using BufferPtr = std::unique_ptr<GeglBuffer, GObjectUnref>;

std::filesystem::path modulePath() {
    std::error_code ec;
    const std::filesystem::path self = std::filesystem::read_symlink("/proc/self/exe", ec);
    if (ec) throw PluginError("cannot find the plug-in's own folder: " + ec.message());
    return self.parent_path() / "Noctiva.so";
}

std::optional<ng::Choice> lastChoice() {
    const gint size = gimp_get_data_size(kProcedure);
    if (size <= 0) return std::nullopt;
    std::vector<char> bytes(static_cast<std::size_t>(size));
    if (!gimp_get_data(kProcedure, bytes.data())) return std::nullopt;
    return ng::decodeChoice(bytes);
}

void rememberChoice(const ng::Choice& choice) {
    const std::vector<char> bytes = ng::encodeChoice(choice);
    gimp_set_data(kProcedure, bytes.data(), guint32(bytes.size()));
}

std::string text(const GimpParam& p) { return p.data.d_string ? p.data.d_string : ""; }

// The drawable in the layout the module gets, in the precision it has.
struct DrawableFormat {
    int channels = 3;
    int depth = 8;
    const Babl* babl = nullptr;
};

DrawableFormat drawableFormat(gint32 image, gint32 drawable) {
    if (!gimp_drawable_is_rgb(drawable)) throw PluginError("the layer is not RGB or RGBA");
    DrawableFormat f;
    f.channels = gimp_drawable_has_alpha(drawable) ? 4 : 3;
    switch (gimp_image_get_precision(image)) {
        case GIMP_PRECISION_U8_GAMMA: f.depth = 8; break;
        case GIMP_PRECISION_U16_GAMMA: f.depth = 16; break;
        default:
            // Any other storage would be rounded on the way through the module, untouched pixels too.
            throw PluginError(
                "the image is not 8-bit or 16-bit integer with perceptual gamma; convert it with Image > "
                "Precision");
    }
    const char* name = f.depth == 8 ? (f.channels == 4 ? "R'G'B'A u8" : "R'G'B' u8")
                                    : (f.channels == 4 ? "R'G'B'A u16" : "R'G'B' u16");
    f.babl = babl_format(name);
    return f;
}

// A progress bar update per permille at most: each one is a round trip to GIMP.
class Progress {
public:
    Progress() { gimp_progress_init("Noctiva"); }
    void operator()(std::int32_t done, std::int32_t total) {
        if (total <= 0) return;
        const int permille = int(std::int64_t(std::max(0, std::min(done, total))) * 1000 / total);
        if (permille == last_) return;
        last_ = permille;
        gimp_progress_update(permille / 1000.0);
    }
    ~Progress() { gimp_progress_end(); }

private:
    int last_ = -1;
};

// Runs the module on the selected part of the drawable; returns the settings text it wrote back.
std::string filterDrawable(gint32 image, gint32 drawable, const std::optional<std::string>& par1,
                           std::optional<std::int32_t> dRes) {
    const DrawableFormat format = drawableFormat(image, drawable);
    gint x = 0, y = 0, w = 0, h = 0;
    if (!gimp_drawable_mask_intersect(drawable, &x, &y, &w, &h)) return "none";  // nothing selected here

    BufferPtr buffer(gimp_drawable_get_buffer(drawable));
    if (!buffer) throw PluginError("cannot read the layer's pixels");
    const int width = gegl_buffer_get_width(buffer.get());
    const int height = gegl_buffer_get_height(buffer.get());
    if (width > host::kMaxImageExtent || height > host::kMaxImageExtent)
        throw PluginError("the layer is larger than " + std::to_string(host::kMaxImageExtent) +
                          " pixels on a side, which the filter interface cannot describe");
    const std::size_t count = std::size_t(width) * std::size_t(height) * std::size_t(format.channels);
    const GeglRectangle whole{0, 0, width, height};

    std::vector<std::uint8_t> original8;
    std::vector<std::uint16_t> original16;
    host::Image picture;
    if (format.depth == 8) {
        original8.resize(count);
        gegl_buffer_get(buffer.get(), &whole, 1.0, format.babl, original8.data(), GEGL_AUTO_ROWSTRIDE,
                        GEGL_ABYSS_NONE);
        picture = ng::hostImageFrom8(original8, width, height, format.channels);
        original8 = {};
    } else {
        original16.resize(count);
        gegl_buffer_get(buffer.get(), &whole, 1.0, format.babl, original16.data(), GEGL_AUTO_ROWSTRIDE,
                        GEGL_ABYSS_NONE);
        picture = ng::hostImageFrom16(original16, width, height, format.channels);
    }
    buffer.reset();

    host::RunOptions options;
    options.selection = host::Selection{x, y, w, h};
    options.par1 = par1;
    options.dRes = dRes;
    gdouble xres = 72, yres = 72;
    if (gimp_image_get_resolution(image, &xres, &yres) && xres >= 1 && xres < 1e6) options.resolutionDpi = int(xres + 0.5);

    host::RunResult result;
    {
        Progress progress;
        options.onProgress = [&progress](std::int32_t done, std::int32_t total) { progress(done, total); };
        const host::Module module(modulePath());
        result = host::runFilter(module.entry(), picture, options);
    }
    if (!result.ok()) throw PluginError("the filter failed: " + result.message());

    const host::Selection area{x, y, w, h};
    const GeglRectangle rect{x, y, w, h};
    BufferPtr shadow(gimp_drawable_get_shadow_buffer(drawable));
    if (!shadow) throw PluginError("cannot write the layer's pixels");
    if (format.depth == 8) {
        const std::vector<std::uint8_t> out = ng::areaSamples8(picture, area);
        gegl_buffer_set(shadow.get(), &rect, 0, format.babl, out.data(), GEGL_AUTO_ROWSTRIDE);
    } else {
        const std::vector<std::uint16_t> out = ng::areaSamples16(picture, original16, area);
        gegl_buffer_set(shadow.get(), &rect, 0, format.babl, out.data(), GEGL_AUTO_ROWSTRIDE);
    }
    gegl_buffer_flush(shadow.get());
    shadow.reset();

    // Merging the shadow applies the selection mask and makes the one undo step.
    gimp_image_undo_group_start(image);
    gimp_drawable_merge_shadow(drawable, TRUE);
    gimp_drawable_update(drawable, x, y, w, h);
    gimp_image_undo_group_end(image);
    return result.par1Out;
}

void query() {
    static const GimpParamDef args[] = {
        {GIMP_PDB_INT32, const_cast<gchar*>("run-mode"),
         const_cast<gchar*>("The run mode { RUN-INTERACTIVE (0), RUN-NONINTERACTIVE (1), RUN-WITH-LAST-VALS (2) }")},
        {GIMP_PDB_IMAGE, const_cast<gchar*>("image"), const_cast<gchar*>("Input image")},
        {GIMP_PDB_DRAWABLE, const_cast<gchar*>("drawable"), const_cast<gchar*>("Input drawable (RGB or RGBA)")},
        {GIMP_PDB_STRING, const_cast<gchar*>("settings"),
         const_cast<gchar*>("Settings text (\"vek  Parameter0 0 ...\"); empty: none")},
        {GIMP_PDB_STRING, const_cast<gchar*>("preset"),
         const_cast<gchar*>("Preset name (default, chroma-strong, impulse, rank, wavelet, grade-grain); empty: "
                            "none. Give a preset or a settings text, not both; neither: the module's defaults")},
        {GIMP_PDB_INT32, const_cast<gchar*>("dres"),
         const_cast<gchar*>("3 asks the module to show its error message; 0: nothing")},
    };
    static const GimpParamDef results[] = {
        {GIMP_PDB_STRING, const_cast<gchar*>("settings-out"),
         const_cast<gchar*>("The settings text the module wrote back at the end of the run")},
    };
    gimp_install_procedure(kProcedure, "Reduce colour and luminance noise with the Noctiva filter module",
                           "Runs the Noctiva filter module over the selected part of the layer. A preset or a "
                           "settings text picks the processing; without either the module's defaults apply: "
                           "colour noise is smoothed strongly and luminance noise mildly.",
                           "Noctiva developers", "Noctiva developers", "2024", "Noctiva...", "RGB*",
                           GIMP_PLUGIN, G_N_ELEMENTS(args), G_N_ELEMENTS(results), args, results);
    gimp_plugin_menu_register(kProcedure, "<Image>/Filters/Noise");
}

void run(const gchar* name, gint nparams, const GimpParam* param, gint* nreturn_vals, GimpParam** return_vals) {
    static GimpParam values[2];
    static std::string returned;  // storage for the string handed back to GIMP
    *nreturn_vals = 1;
    *return_vals = values;
    values[0].type = GIMP_PDB_STATUS;
    values[0].data.d_status = GIMP_PDB_CALLING_ERROR;
    if (nparams < 3) return;

    const auto mode = GimpRunMode(param[0].data.d_int32);
    const gint32 image = param[1].data.d_image;
    const gint32 drawable = param[2].data.d_drawable;
    gegl_init(nullptr, nullptr);

    GimpPDBStatusType status = GIMP_PDB_SUCCESS;
    try {
        ng::Choice choice;
        std::optional<std::int32_t> dRes;
        switch (mode) {
            case GIMP_RUN_INTERACTIVE: {
                const std::optional<ng::Choice> picked = ng::runDialog(lastChoice().value_or(ng::Choice{}));
                if (!picked) {
                    values[0].data.d_status = GIMP_PDB_CANCEL;
                    return;
                }
                choice = *picked;
                break;
            }
            case GIMP_RUN_NONINTERACTIVE:
                if (nparams < 5) return;  // calling error
                choice.settings = text(param[3]);
                choice.preset = text(param[4]);
                if (nparams >= 6 && param[5].data.d_int32 != 0) dRes = param[5].data.d_int32;
                break;
            case GIMP_RUN_WITH_LAST_VALS: choice = lastChoice().value_or(ng::Choice{}); break;
        }

        std::optional<std::string> par1;
        try {
            par1 = ng::settingsTextFor(choice);
        } catch (const std::invalid_argument& e) {
            throw PluginError(e.what());
        }
        returned = filterDrawable(image, drawable, par1, dRes);
        rememberChoice(choice);
        if (mode != GIMP_RUN_NONINTERACTIVE) gimp_displays_flush();
        *nreturn_vals = 2;
        values[1].type = GIMP_PDB_STRING;
        values[1].data.d_string = const_cast<gchar*>(returned.c_str());
    } catch (const std::exception& e) {
        // A second string value on failure is the error message GIMP shows or hands to the script.
        returned = std::string("Noctiva: ") + e.what();
        status = GIMP_PDB_EXECUTION_ERROR;
        if (mode == GIMP_RUN_INTERACTIVE) gimp_message(returned.c_str());
        *nreturn_vals = 2;
        values[1].type = GIMP_PDB_STRING;
        values[1].data.d_string = const_cast<gchar*>(returned.c_str());
    }
    values[0].data.d_status = status;
}

}  // namespace

const GimpPlugInInfo PLUG_IN_INFO = {nullptr, nullptr, query, run};

MAIN()
