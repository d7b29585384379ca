// Whole-run benchmark: the real module through our host library and ENTRYPOINT on a generated
// 24-megapixel RGB image (8-bit and 16-bit), default settings unless --par1 is given.
//
// Filter time is the Session's run alone: the image is generated and copied into the host before
// the clock starts. Prints the median over the runs, per-stage totals from the module's stage timer
// (NOCTIVA_STAGE_TIMES), the tile count and the process's peak resident memory.
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "noctiva/host/Module.h"
#include "noctiva/host/Session.h"

using namespace noctiva::host;

namespace {

struct Options {
    int width = 6000, height = 4000, runs = 5;
    std::vector<int> depths{8, 16};
    std::vector<std::string> threads{"1", "2"};
    bool reference = true;  // also time NOCTIVA_REFERENCE=1 (one thread) and print the ratios
    bool pair = false;      // also two one-thread runs in two processes at once
    std::string par1;
    std::string module = NOCTIVA_MODULE_PATH;
};

// Smooth gradients, hard-edged shapes and noise from a fixed seed; regenerated for every run so the
// process never holds a third copy of the image.
void generate(Image& image, uint32_t seed) {
    const int w = image.width, h = image.height;
    const uint32_t maxv = image.maxValue();
    uint64_t state = 0x9E3779B97F4A7C15ull ^ seed;
    auto next = [&state]() {
        state ^= state << 13;
        state ^= state >> 7;
        state ^= state << 17;
        return uint32_t(state >> 32);
    };
    struct Disc {
        int cx, cy, r2;
        int colour[3];
    };
    std::vector<Disc> discs;
    for (int i = 0; i < 40; ++i) {
        const int r = 50 + int(next() % 600);
        discs.push_back({int(next() % uint32_t(w)), int(next() % uint32_t(h)), r * r,
                         {int(next() % 256), int(next() % 256), int(next() % 256)}});
    }
    for (int y = 0; y < h; ++y) {
        const size_t row = size_t(y) * size_t(w) * 3;
        for (int x = 0; x < w; ++x) {
            int c[3] = {x * 200 / w + 20, y * 180 / h + 30, (x + y) * 120 / (w + h) + 60};
            for (const Disc& d : discs) {
                const int dx = x - d.cx, dy = y - d.cy;
                if (dx * dx + dy * dy < d.r2) {
                    c[0] = d.colour[0];
                    c[1] = d.colour[1];
                    c[2] = d.colour[2];
                }
            }
            const uint32_t noise = next();
            for (int k = 0; k < 3; ++k) {
                const int n = int((noise >> (8 * k)) & 31) - 16;  // +-16 in 8-bit steps
                const int v8 = std::clamp(c[k] + n, 0, 255);
                const uint32_t v = image.depth == 16 ? (uint32_t(v8) * maxv + int32_t(noise >> 24)) / 256 : uint32_t(v8);
                image.setSample(row + 3 * size_t(x) + size_t(k), uint16_t(std::min<uint32_t>(v, maxv)));
            }
        }
    }
}

double median(std::vector<double> v) {
    std::sort(v.begin(), v.end());
    return v.empty() ? 0.0 : v[v.size() / 2];
}

long peakRssKiB() {
    rusage u{};
    getrusage(RUSAGE_SELF, &u);
    return u.ru_maxrss;
}

std::map<std::string, double> readStages(const std::string& path) {
    std::map<std::string, double> out;
    std::ifstream in(path);
    std::string line, last;
    while (std::getline(in, line))
        if (!line.empty()) last = line;
    std::istringstream words(last);
    std::string name;
    double value;
    while (words >> name >> value) out[name] = value;
    return out;
}

void usage() {
    std::puts(
        "noctiva_bench_run [--width W] [--height H] [--runs N] [--depth 8|16|both] [--threads LIST]\n"
        "                  [--par1 TEXT] [--module PATH] [--no-reference] [--pair]\n"
        "  --threads: comma-separated NOCTIVA_THREADS values (default 1,2)\n"
        "  the reference path (NOCTIVA_REFERENCE=1, one thread) is timed too unless --no-reference\n"
        "  --pair: two processes run one thread each at the same time: what two independent cores\n"
        "          of this machine deliver together, the ceiling for two threads");
}

bool parse(int argc, char** argv, Options& o) {
    for (int i = 1; i < argc; ++i) {
        const std::string a = argv[i];
        auto value = [&]() -> std::string {
            if (i + 1 >= argc) throw std::runtime_error("missing value after " + a);
            return argv[++i];
        };
        if (a == "--width") o.width = std::stoi(value());
        else if (a == "--height") o.height = std::stoi(value());
        else if (a == "--runs") o.runs = std::max(1, std::stoi(value()));
        else if (a == "--par1") o.par1 = value();
        else if (a == "--module") o.module = value();
        else if (a == "--no-reference") o.reference = false;
        else if (a == "--pair") o.pair = true;
        else if (a == "--depth") {
            const std::string d = value();
            o.depths = d == "both" ? std::vector<int>{8, 16} : std::vector<int>{std::stoi(d)};
        } else if (a == "--threads") {
            o.threads.clear();
            std::istringstream s(value());
            for (std::string t; std::getline(s, t, ',');) o.threads.push_back(t);
        } else {
            usage();
            return false;
        }
    }
    return true;
}

// Median filter time of `runs` one-thread runs, the image generated before the clock starts.
double timeOneThread(const Options& o, const Module& module, int depth) {
    Image image(o.width, o.height, 3, depth);
    std::vector<double> times;
    for (int run = 0; run < o.runs; ++run) {
        generate(image, 12345u);
        RunOptions ro;
        if (!o.par1.empty()) ro.par1 = o.par1;
        Session session(image, ro);
        const auto t0 = std::chrono::steady_clock::now();
        if (!session.run(module.entry()).ok()) return -1.0;
        times.push_back(std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - t0).count());
    }
    return median(times);
}

// Two processes, one thread each, started together: no sharing and no synchronisation between
// them, so their combined rate bounds what two threads of one run can reach here.
void pairProbe(const Options& o, const Module& module, int depth) {
    setenv("NOCTIVA_THREADS", "1", 1);
    unsetenv("NOCTIVA_REFERENCE");
    unsetenv("NOCTIVA_STAGE_TIMES");
    int go[2], results[2];
    if (pipe(go) != 0 || pipe(results) != 0) return;
    pid_t children[2];
    for (pid_t& child : children) {
        child = fork();
        if (child == 0) {
            char start;
            close(go[1]);
            if (read(go[0], &start, 1) != 1) _exit(1);
            const double ms = timeOneThread(o, module, depth);
            if (write(results[1], &ms, sizeof ms) != sizeof ms) _exit(1);
            _exit(0);
        }
    }
    close(go[0]);
    const char start[2] = {1, 1};
    if (write(go[1], start, 2) != 2) return;
    close(go[1]);
    double ms[2] = {0, 0};
    for (double& m : ms)
        if (read(results[0], &m, sizeof m) != sizeof m) m = -1.0;
    for (pid_t child : children) waitpid(child, nullptr, 0);
    close(results[0]);
    close(results[1]);
    const double mpix = double(o.width) * o.height / 1e6;
    const double solo = timeOneThread(o, module, depth);
    if (ms[0] <= 0 || ms[1] <= 0 || solo <= 0) {
        std::printf("pair probe failed\n");
        return;
    }
    const double together = mpix / (ms[0] / 1000.0) + mpix / (ms[1] / 1000.0);
    std::printf("%2d-bit pair probe: one process alone %.1f ms (%.1f Mpix/s); two at once %.1f and %.1f ms, "
                "%.1f Mpix/s together, %.2fx one alone\n",
                depth, solo, mpix / (solo / 1000.0), ms[0], ms[1], together, together / (mpix / (solo / 1000.0)));
}

}  // namespace

int main(int argc, char** argv) {
    Options o;
    try {
        if (!parse(argc, argv, o)) return 2;
    } catch (const std::exception& e) {
        std::fprintf(stderr, "%s\n", e.what());
        return 2;
    }
    const Module module(o.module);
    const std::string stageFile = "/tmp/noctiva_stages_" + std::to_string(getpid()) + ".txt";
    setenv("NOCTIVA_STAGE_TIMES", stageFile.c_str(), 1);
    const double mpix = double(o.width) * o.height / 1e6;
    std::printf("image %d x %d (%.1f MP), %d runs per configuration, settings: %s\n", o.width, o.height, mpix,
                o.runs, o.par1.empty() ? "default" : o.par1.c_str());

    // Runs go round the configurations (run 1 of each, then run 2 of each ...), so a slow spell of a
    // shared machine falls on all of them alike.
    struct Measurement {
        int depth;
        std::string configuration;
        std::vector<double> times;
        std::map<std::string, std::vector<double>> stages;
        long tiles = 0;
    };
    std::vector<Measurement> measurements;
    for (int depth : o.depths) {
        if (o.reference) measurements.push_back({depth, "reference", {}, {}, 0});
        for (const std::string& t : o.threads) measurements.push_back({depth, t, {}, {}, 0});
    }
    Image image(o.width, o.height, 3, 8);
    for (int run = 0; run < o.runs; ++run) {
        for (Measurement& m : measurements) {
            const bool isReference = m.configuration == "reference";
            setenv("NOCTIVA_THREADS", isReference ? "1" : m.configuration.c_str(), 1);
            if (isReference)
                setenv("NOCTIVA_REFERENCE", "1", 1);
            else
                unsetenv("NOCTIVA_REFERENCE");
            if (image.depth != m.depth) {
                image = Image();  // the old storage goes before the new one is made
                image = Image(o.width, o.height, 3, m.depth);
            }
            generate(image, 12345u);
            std::remove(stageFile.c_str());
            RunOptions ro;
            if (!o.par1.empty()) ro.par1 = o.par1;
            Session session(image, ro);
            const auto t0 = std::chrono::steady_clock::now();
            const RunResult r = session.run(module.entry());
            const auto t1 = std::chrono::steady_clock::now();
            if (!r.ok()) {
                std::fprintf(stderr, "run failed: %s\n", r.message().c_str());
                return 1;
            }
            m.times.push_back(std::chrono::duration<double, std::milli>(t1 - t0).count());
            m.tiles = r.tilesServed;
            for (const auto& [name, v] : readStages(stageFile)) m.stages[name].push_back(v);
        }
    }
    double referenceMs = 0.0;
    for (Measurement& m : measurements) {
        const bool isReference = m.configuration == "reference";
        const double ms = median(m.times);
        if (isReference) referenceMs = ms;
        std::printf("%2d-bit %-10s  filter %8.1f ms  %7.1f Mpix/s  (min %.1f ms)  tiles %ld", m.depth,
                    isReference ? "reference" : ("threads " + m.configuration).c_str(), ms, mpix / (ms / 1000.0),
                    *std::min_element(m.times.begin(), m.times.end()), m.tiles);
        if (!isReference && referenceMs > 0.0) std::printf("  %.2fx the reference", referenceMs / ms);
        std::printf("\n");
        if (!m.stages.empty()) {
            std::printf("    stages (median ms):");
            for (const char* name : {"convertIn", "lab", "step2", "labBack", "convertOut", "rows", "columns", "mix",
                                     "poolWake", "poolEnd", "apply"})
                if (m.stages.count(name) && median(m.stages[name]) > 0.0)
                    std::printf(" %s %.1f", name, median(m.stages[name]));
            if (m.stages.count("apply")) std::printf("  host+rest %.1f", ms - median(m.stages["apply"]));
            std::printf("\n");
        }
    }
    std::remove(stageFile.c_str());
    // The host keeps an image at its depth: the widest depth run sets the process's peak.
    const int widestBytes = *std::max_element(o.depths.begin(), o.depths.end()) / 8;
    const double imageMiB = 2.0 * double(o.width) * o.height * 3 * widestBytes / (1024.0 * 1024.0);
    const double peakMiB = double(peakRssKiB()) / 1024.0;
    std::printf("peak resident %.1f MiB; host's two image buffers %.1f MiB; budget %.1f MiB -> %s\n", peakMiB,
                imageMiB, imageMiB + 64.0, peakMiB <= imageMiB + 64.0 ? "within" : "OVER");
    // After the memory figure: the probe's own image would count in it.
    if (o.pair)
        for (int depth : o.depths) pairProbe(o, module, depth);
    return 0;
}
