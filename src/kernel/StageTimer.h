// Optional per-stage wall-clock totals for one run, switched on by NOCTIVA_STAGE_TIMES=<file>.
// Off by default: a stage clock then costs one test of a flag and reads no clock.
#pragma once

#include <chrono>
#include <cstdint>

namespace KERNEL::timing {

// The fused default-chain path reports its three phases: rows (host samples in, Lab, the row
// passes), columns (the column passes) and mix (the mix, Lab back, host samples out); the worker
// pool reports waking its workers and waiting for them to leave a section.
enum Stage : int { kConvertIn, kLab, kStep2, kLabBack, kConvertOut, kFastRows, kFastColumns, kFastMix, kPoolWake, kPoolEnd, kApply, kStageCount };

// Reads the environment and clears the totals; the filter calls it when a run starts.
void begin();
// Appends one line of totals (milliseconds) to the file named by the environment, if enabled.
void finish();
// Counts one processed tile (when enabled).
void tile();
bool enabled();
void add(Stage stage, std::chrono::steady_clock::duration d);

class cStageClock {
public:
    explicit cStageClock(Stage stage) : stage(stage), on(enabled()) {
        if (on) start = std::chrono::steady_clock::now();
    }
    ~cStageClock() {
        if (on) add(stage, std::chrono::steady_clock::now() - start);
    }
    cStageClock(const cStageClock&) = delete;
    cStageClock& operator=(const cStageClock&) = delete;

private:
    Stage stage;
    bool on;
    std::chrono::steady_clock::time_point start{};
};

}  // namespace KERNEL::timing
