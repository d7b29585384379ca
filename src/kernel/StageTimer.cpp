#include "kernel/StageTimer.h"

#include <cstdio>
#include <cstdlib>
#include <string>

namespace KERNEL::timing {
namespace {
bool gEnabled = false;
std::string gPath;
std::chrono::steady_clock::duration gTotals[kStageCount]{};
int32_t gTiles = 0;
constexpr const char* kNames[kStageCount] = {"convertIn", "lab",  "step2",   "labBack",
                                                    "convertOut", "rows", "columns", "mix", "poolWake", "poolEnd", "apply"};
}  // namespace

void begin() {
    const char* path = std::getenv("NOCTIVA_STAGE_TIMES");
    gEnabled = path != nullptr && *path != '\0';
    gPath = gEnabled ? path : "";
    for (auto& t : gTotals) t = {};
    gTiles = 0;
}

bool enabled() { return gEnabled; }

void add(Stage stage, std::chrono::steady_clock::duration d) { gTotals[stage] += d; }

void tile() {
    if (gEnabled) ++gTiles;
}

void finish() {
    if (!gEnabled) return;
    if (std::FILE* f = std::fopen(gPath.c_str(), "a")) {
        for (int i = 0; i < kStageCount; ++i)
            std::fprintf(f, "%s %.3f ", kNames[i], std::chrono::duration<double, std::milli>(gTotals[i]).count());
        std::fprintf(f, "tiles %d\n", gTiles);
        std::fclose(f);
    }
    gEnabled = false;
}

}  // namespace KERNEL::timing
