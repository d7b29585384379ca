// The progress bar on standard error, driven by the module's own progress calls.
#pragma once

#include <chrono>
#include <cstdint>
#include <cstdio>
#include <string>

namespace noctiva::cli {

// "[#########...........]  45%": `width` cells between the brackets. Done is clamped to 0..total;
// a total of 0 or less shows an empty bar.
std::string renderBar(std::int64_t done, std::int64_t total, int width);

// "done in 1.25 s, 3.20 megapixels/s"; a run too fast to time shows no rate.
std::string summaryLine(double seconds, double megapixels);

class ProgressBar {
public:
    // Draws on `stream` (a terminal) only when `enabled`; `label` names the file in front of the bar.
    ProgressBar(std::FILE* stream, std::string label, bool enabled);
    ProgressBar(const ProgressBar&) = delete;
    ProgressBar& operator=(const ProgressBar&) = delete;

    void update(std::int32_t done, std::int32_t total);
    // Replaces the bar by its summary line (or clears it when the run failed).
    void finish(bool succeeded, double megapixels);
    double elapsedSeconds() const;

private:
    std::FILE* stream_;
    std::string label_;
    bool enabled_;
    int lastPercent_ = -1;
    std::chrono::steady_clock::time_point start_;
};

}  // namespace noctiva::cli
