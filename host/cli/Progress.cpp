#include "Progress.h"

#include <algorithm>
#include <cstdio>

namespace noctiva::cli {

std::string renderBar(std::int64_t done, std::int64_t total, int width) {
    int percent = 0;
    int filled = 0;
    if (total > 0) {
        const std::int64_t d = std::clamp<std::int64_t>(done, 0, total);
        percent = int(d * 100 / total);
        filled = int(d * width / total);
    }
    char tail[8];
    std::snprintf(tail, sizeof tail, " %3d%%", percent);
    std::string bar(1, '[');
    bar.append(std::size_t(filled), '#').append(std::size_t(width - filled), '.').append(1, ']').append(tail);
    return bar;
}

std::string summaryLine(double seconds, double megapixels) {
    char line[96];
    if (seconds >= 0.0005)
        std::snprintf(line, sizeof line, "done in %.2f s, %.2f megapixels/s", seconds, megapixels / seconds);
    else
        std::snprintf(line, sizeof line, "done in %.2f s", seconds);
    return line;
}

ProgressBar::ProgressBar(std::FILE* stream, std::string label, bool enabled)
    : stream_(stream), label_(std::move(label)), enabled_(enabled), start_(std::chrono::steady_clock::now()) {}

void ProgressBar::update(std::int32_t done, std::int32_t total) {
    if (!enabled_ || total <= 0) return;
    const int percent = int(std::clamp<std::int64_t>(done, 0, total) * 100 / total);
    if (percent == lastPercent_) return;  // a terminal needs no redraw per tile
    lastPercent_ = percent;
    std::fprintf(stream_, "\r%s %s", label_.c_str(), renderBar(done, total, 30).c_str());
    std::fflush(stream_);
}

void ProgressBar::finish(bool succeeded, double megapixels) {
    if (!enabled_) return;
    if (succeeded)
        std::fprintf(stream_, "\r\033[K%s %s\n", label_.c_str(), summaryLine(elapsedSeconds(), megapixels).c_str());
    else if (lastPercent_ >= 0)
        std::fprintf(stream_, "\r\033[K");
    std::fflush(stream_);
}

double ProgressBar::elapsedSeconds() const {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
}

}  // namespace noctiva::cli
