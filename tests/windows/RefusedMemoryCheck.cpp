// Host memory refused to the Windows module, run under Wine: every run where one buffer allocation,
// handle allocation or buffer lock fails must end with -108 (out of memory), give every handle and
// buffer back and leave the image as it was. Every such point a clean run reaches is tried, on a
// small 16-bit RGBA image and on each image file given.
// Usage: refused-memory-check MODULE IMAGE.pam...
#include <cstdio>
#include <exception>
#include <random>
#include <string>

#include "noctiva/host/ImageFile.h"
#include "noctiva/host/Module.h"
#include "noctiva/host/Session.h"

using namespace noctiva::host;

namespace {

struct Fault {
    const char* name;
    int RunOptions::*failAt;
    long RunResult::*count;
};

const Fault kFaults[] = {
    {"buffer allocation", &RunOptions::failBufferAllocation, &RunResult::bufferAllocations},
    {"handle allocation", &RunOptions::failHandleAllocation, &RunResult::handleAllocations},
    {"buffer lock", &RunOptions::failBufferLock, &RunResult::bufferLocks},
};

// Several tiles (200 pixels and a 50-pixel margin), 16 bits with alpha.
Image patternImage() {
    Image image(260, 230, 4, 16);
    std::mt19937 random(7);
    for (auto& s : image.samples16) s = std::uint16_t(random() % 32769u);
    return image;
}

int failures = 0;
int runs = 0;

void fail(const std::string& what) {
    std::printf("FAIL %s\n", what.c_str());
    ++failures;
}

// A clean run counts the points of each kind; then one run per chosen point, failing there.
void sweep(const Module& module, const std::string& name, const Image& original) {
    RunOptions base;
    base.failOnLeak = true;
    base.parentWindow = false;
    Image clean = original;
    const RunResult reference = runFilter(module, clean, base);
    if (!reference.ok()) return fail(name + ": the clean run failed: " + reference.message());
    if (clean == original) return fail(name + ": the clean run changed nothing");

    std::printf("%s: %ld buffer allocations, %ld handle allocations, %ld buffer locks\n", name.c_str(),
                reference.bufferAllocations, reference.handleAllocations, reference.bufferLocks);
    for (const Fault& fault : kFaults) {
        const long total = reference.*fault.count;
        if (total == 0 && fault.count != &RunResult::bufferLocks) fail(name + ": no " + fault.name + " at all");
        for (long n = 1; n <= total; ++n) {
            RunOptions options = base;
            options.*fault.failAt = int(n);
            Image image = original;
            const RunResult result = runFilter(module, image, options);
            ++runs;
            const std::string where = name + ": " + fault.name + " " + std::to_string(n) + " of " + std::to_string(total);
            if (result.result != pi::memFullErr) fail(where + ": result " + std::to_string(result.result) + ", not -108");
            if (!result.hostError.empty()) fail(where + ": " + result.hostError);
            if (result.leaks.any()) fail(where + ": " + result.leaks.describe());
            if (!(image == original)) fail(where + ": the image was changed");
        }
    }
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: refused-memory-check MODULE [IMAGE.pam...]\n");
        return 2;
    }
    try {
        const Module module = Module::load(argv[1]);
        sweep(module, "260x230 RGBA16 pattern", patternImage());
        for (int i = 2; i < argc; ++i) sweep(module, argv[i], loadImage(argv[i]).image);
    } catch (const std::exception& e) {
        std::printf("FAIL %s\n", e.what());
        return 1;
    }
    std::printf("%d runs with refused memory, %d failures\n", runs, failures);
    return failures == 0 ? 0 : 1;
}
