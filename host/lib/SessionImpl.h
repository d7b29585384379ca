// The state behind a Session: the record, the suites it points to, and the tile buffers.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "Descriptors.h"
#include "Memory.h"
#include "Tiles.h"
#include "hostapi/HostInterface.h"
#include "noctiva/host/Session.h"

namespace noctiva::host {

// Filled by Callbacks.cpp: the suites and direct callbacks, all C-compatible and non-throwing.
struct CallbackTables {
    pi::HandleProcs handleProcs;
    pi::BufferProcs bufferProcs;
    pi::ReadDescriptorProcs readProcs;
    pi::WriteDescriptorProcs writeProcs;
    pi::TestAbortProc abort;
    pi::ProgressProc progress;
    pi::AdvanceStateProc advanceState;
    pi::ColorServicesProc colorServices;
};
const CallbackTables& callbackTables();

class Session::Impl {
public:
    Impl(Image& image, RunOptions options);
    RunResult run(PluginEntryProc entry);

    // The session whose run is in progress on this thread, or null.
    static Impl* current();

    pi::int16 imageMode() const { return hostImageMode(dest_); }
    int depth() const { return dest_.depth; }

    // Services for the callbacks.
    pi::OSErr advanceState();
    void progress(std::int32_t done, std::int32_t total);
    void protocolWarning() { ++result_.protocolWarnings; }
    void countColorService() { ++result_.colorServiceCalls; }

    HandleTable handles;
    BufferPool buffers;
    DescriptorTokens tokens;

private:
    struct Pending {
        Area area;
        int lo = 0, hi = 0;
        std::int32_t rowBytes = 0;
        bool active = false;
    };

    void setUpRecord();
    void setUpDescriptor();
    bool call(pi::int16 selector);
    bool anyRectRequested() const;
    pi::OSErr serveRequest();
    // A request served: pointing into the image, or into `buffer` filled with it (`copied`); or
    // the error that refuses it.
    struct Served {
        std::string error;
        void* data = nullptr;
        std::int32_t rowBytes = 0;
        bool copied = false;
    };
    Served serve(const Raster& image, const Area& area, int lo, int hi, int padding, bool inPlaceAllowed,
                 std::vector<std::uint8_t>& buffer) const;
    void commitPending();
    pi::OSErr hostFault(const std::string& message, pi::OSErr code = pi::paramErr);
    void collectPar1();
    void releaseEverything();
    void settleImage();

    Image& dest_;
    // The run's pixels at the image's depth. `source_` is the unchanged image every inData is read
    // from; `target_` is the caller's own samples, which receive the output (and get the source
    // back when the run fails).
    std::vector<std::uint8_t> sourceStore_;
    Raster source_, target_;
    RunOptions options_;
    RunResult result_;
    Area filterArea_;
    PluginEntryProc entry_ = nullptr;
    bool ran_ = false;

    alignas(8) pi::FilterRecord record_{};  // pointer fields at 8-aligned offsets stay aligned
    pi::HandleProcs handleProcs_{};
    pi::BufferProcs bufferProcs_{};
    pi::ReadDescriptorProcs readProcs_{};
    pi::WriteDescriptorProcs writeProcs_{};
    pi::PIDescriptorParameters descriptorParameters_{};
    pi::PlatformData platformData_{};
    pi::uint8 errorString_[256] = {};
    intptr_t dataCell_ = 0;
    // One result cell for the whole run: Finish sees whether an earlier call failed.
    pi::int16 resultCell_ = 0;
    pi::Handle inputDescriptor_ = nullptr;

    std::vector<std::uint8_t> inBuffer_, outBuffer_;
    Pending pending_;
};

}  // namespace noctiva::host
