// One run of a filter module over an image, the way a scripting host runs a hidden filter:
// Prepare, Start, Continue while a rectangle is requested, Finish.
//
// The Session owns the FilterRecord, every callback suite and the tile buffers. Callbacks are
// plain C function pointers; they reach the running session through a thread-local pointer, so
// one session runs at a time per thread.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "hostapi/HostInterface.h"
#include "noctiva/host/Image.h"

namespace noctiva::host {

class Module;

struct Selection {
    int x = 0, y = 0, width = 0, height = 0;
};

struct RunOptions {
    std::optional<Selection> selection;  // default: the whole image
    std::optional<std::string> par1;     // scripting text handed in under 'par1'
    std::optional<std::int32_t> dRes;    // integer handed in under 'dRes'
    int resolutionDpi = 72;
    // With a display, a window of the host's own is the parent of the module's dialogs
    // (platformData->hwnd) for the run; without one, or when false, hwnd is 0.
    bool parentWindow = true;

    // Fault provocation and checking.
    bool relocateHandles = false;              // move every unlocked handle between entry calls
    std::optional<std::size_t> bufferCap;      // total live bytes the buffer suite hands out
    int failBufferAllocation = 0;              // 1-based: this allocation fails (0 = never)
    int failBufferLock = 0;                    // 1-based: this lock fails (0 = never)
    int failHandleAllocation = 0;              // 1-based: this newProc returns null (0 = never)
    bool failOnLeak = false;                   // a handle or buffer left behind fails the run
    long maxContinueCalls = 1'000'000;         // a module that never empties its rectangles
    // Serve every request from copied buffers with padded rows, never by pointing into the image
    // (which a request for whole pixels inside the image and the selection otherwise gets).
    bool copyTiles = false;

    std::function<void(std::int32_t done, std::int32_t total)> onProgress;
};

struct LeakReport {
    int handles = 0;
    std::size_t handleBytes = 0;
    int buffers = 0;
    std::size_t bufferBytes = 0;
    int readTokens = 0;
    int writeTokens = 0;
    bool any() const { return handles || buffers || readTokens || writeTokens; }
    std::string describe() const;
};

struct RunResult {
    pi::OSErr result = pi::noErr;  // first non-zero module result
    std::string failedSelector;    // where `result` came from
    std::string hostError;         // a fault the host detected (bad request, endless run, leak)
    std::string par1Out = "none";  // the 'par1' text the module recorded at Finish
    LeakReport leaks;

    std::vector<std::pair<std::int32_t, std::int32_t>> progress;
    long continueCalls = 0;
    long advanceStateCalls = 0;
    long colorServiceCalls = 0;
    long handleMoves = 0;          // relocations performed
    long tilesServed = 0;          // rectangles filled for the module
    std::vector<pi::Rect16> requestedInRects;  // every non-empty inRect served, in order
    long protocolWarnings = 0;     // unknown handles/buffers passed back, double frees
    std::intptr_t parentWindow = 0;  // the hwnd the module was given (0: none)
    // What the module asked of the memory suites; the failure switches count the same way.
    long handleAllocations = 0;
    long bufferAllocations = 0;
    long bufferLocks = 0;

    bool ok() const { return result == pi::noErr && hostError.empty(); }
    // One line: the module code with its meaning, or the host's finding.
    std::string message() const;
};

// Short meaning of a result code ("out of memory" for -108, ...).
std::string describeResult(pi::OSErr code);

class Session {
public:
    // `image` is the destination: the filter's output is written into it. A run that does not
    // end ok leaves it exactly as it was, so nothing half-processed passes for a result.
    Session(Image& image, RunOptions options);
    ~Session();
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;

    // Runs the module once; a session cannot be run again (its source snapshot is spent).
    RunResult run(PluginEntryProc entry);
    // As above, but first refuses an image the module's resources do not accept, without calling
    // the module: throws HostError(<module name>, "this filter does not support ...").
    RunResult run(const Module& module);

    // The About selector: an about record only, no filter record, no data cell kept.
    static pi::OSErr about(PluginEntryProc entry);

    class Impl;

private:
    std::unique_ptr<Impl> impl_;
};

// Convenience: one Session, one run.
RunResult runFilter(PluginEntryProc entry, Image& image, const RunOptions& options = {});
RunResult runFilter(const Module& module, Image& image, const RunOptions& options = {});

// The mode the host serves an image in: RGB for 8 bits, RGB48 for 16.
pi::int16 hostImageMode(const Image& image);

}  // namespace noctiva::host
