#include "noctiva/host/Session.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <stdexcept>
#include <utility>

#include "SessionImpl.h"
#include "noctiva/host/Module.h"
#include "noctiva/host/ParentWindow.h"

namespace noctiva::host {

namespace {

thread_local Session::Impl* tCurrent = nullptr;

// Makes a session current for the length of its run; one run at a time per thread.
class CurrentSession {
public:
    explicit CurrentSession(Session::Impl* s) {
        if (tCurrent) throw std::logic_error("a filter session is already running on this thread");
        tCurrent = s;
    }
    ~CurrentSession() { tCurrent = nullptr; }
    CurrentSession(const CurrentSession&) = delete;
    CurrentSession& operator=(const CurrentSession&) = delete;
};

const char* selectorName(pi::int16 selector) {
    switch (selector) {
        case pi::filterSelectorAbout: return "About";
        case pi::filterSelectorParameters: return "Parameters";
        case pi::filterSelectorPrepare: return "Prepare";
        case pi::filterSelectorStart: return "Start";
        case pi::filterSelectorContinue: return "Continue";
        case pi::filterSelectorFinish: return "Finish";
        default: return "unknown selector";
    }
}

constexpr pi::Fixed kFixedOne = 1 << 16;
constexpr pi::Fixed fixed(double v) { return pi::Fixed(v * kFixedOne); }

// The layout of the record passed with the About selector (natural alignment, 272 bytes).

}  // namespace

std::string describeResult(pi::OSErr code) {
    switch (code) {
        case pi::noErr: return "no error";
        case pi::readErr: return "read error";
        case pi::writErr: return "write error";
        case pi::paramErr: return "bad parameter";
        case pi::memFullErr: return "out of memory";
        case pi::nilHandleErr: return "invalid handle";
        case pi::userCanceledErr: return "cancelled";
        case pi::errMissingParameter: return "missing parameter";
        case pi::filterBadParameters: return "bad filter parameters";
        case pi::filterBadMode: return "image mode not supported by the filter";
        case pi::errPlugInHostInsufficient: return "host lacks a service the filter needs";
        case pi::errReportString: return "filter error";
        default: return code > 0 ? "error already reported by the filter" : "unknown error";
    }
}

std::string LeakReport::describe() const {
    std::string s;
    auto add = [&s](const std::string& part) { s += (s.empty() ? "" : ", ") + part; };
    if (handles) add(std::to_string(handles) + " handle(s) of " + std::to_string(handleBytes) + " bytes");
    if (buffers) add(std::to_string(buffers) + " buffer(s) of " + std::to_string(bufferBytes) + " bytes");
    if (readTokens) add(std::to_string(readTokens) + " open read descriptor(s)");
    if (writeTokens) add(std::to_string(writeTokens) + " open write descriptor(s)");
    return s.empty() ? "nothing" : s;
}

std::string RunResult::message() const {
    if (result != pi::noErr) {
        std::string m = "module failed in " + failedSelector + " with " + std::to_string(result) + " (" +
                        describeResult(result) + ")";
        if (!hostError.empty()) m += "; " + hostError;
        return m;
    }
    return hostError;
}

Session::Impl* Session::Impl::current() { return tCurrent; }

Session::Impl::Impl(Image& image, RunOptions options)
    : dest_(image), options_(std::move(options)) {
    if ((image.channels != 3 && image.channels != 4) || (image.depth != 8 && image.depth != 16))
        throw std::invalid_argument("the host serves RGB or RGBA images of 8 or 16 bits");
    if (image.width <= 0 || image.height <= 0 || image.width > kMaxImageExtent || image.height > kMaxImageExtent)
        throw std::invalid_argument("image size outside 1..32767");
    filterArea_ = {0, 0, image.height, image.width};
    if (options_.selection) {
        const Selection& s = *options_.selection;
        const Area a{s.y, s.x, s.y + s.height, s.x + s.width};
        if (s.width <= 0 || s.height <= 0 || !a.within(filterArea_))
            throw std::invalid_argument("selection outside the image");
        filterArea_ = a;
    }
    // The source snapshot at the image's depth, and the image's own samples for the output: tiles
    // are served by pointing into them, with no conversion per tile.
    const int bytesPerSample = image.depth / 8;
    const std::size_t count = std::size_t(image.width) * std::size_t(image.height) * std::size_t(image.channels);
    if (!image.samplesMatchSize())
        throw std::invalid_argument("image samples do not match its size");
    std::uint8_t* const own = image.depth == 16 ? reinterpret_cast<std::uint8_t*>(image.samples16.data()) : image.samples8.data();
    sourceStore_.assign(own, own + count * std::size_t(bytesPerSample));
    const std::size_t rowBytes = std::size_t(image.width) * std::size_t(image.channels * bytesPerSample);
    source_ = {sourceStore_.data(), image.width, image.height, image.channels, bytesPerSample, rowBytes};
    target_ = source_;
    target_.data = own;
    handles.failAllocationAt = options_.failHandleAllocation;
    buffers.cap = options_.bufferCap;
    buffers.failAllocationAt = options_.failBufferAllocation;
    buffers.failLockAt = options_.failBufferLock;
}

void Session::Impl::setUpRecord() {
    const CallbackTables& cb = callbackTables();
    handleProcs_ = cb.handleProcs;
    bufferProcs_ = cb.bufferProcs;
    readProcs_ = cb.readProcs;
    writeProcs_ = cb.writeProcs;

    pi::FilterRecord& r = record_;
    r = pi::FilterRecord{};
    r.abortProc = cb.abort;
    r.progressProc = cb.progress;
    r.parameters = nullptr;
    r.imageSize = {pi::int16(dest_.height), pi::int16(dest_.width)};
    r.planes = pi::int16(dest_.channels);
    r.filterRect = {pi::int16(filterArea_.top), pi::int16(filterArea_.left), pi::int16(filterArea_.bottom),
                    pi::int16(filterArea_.right)};
    r.background = {0xFFFF, 0xFFFF, 0xFFFF};
    r.foreground = {0, 0, 0};
    const std::int64_t space = buffers.space();
    r.maxSpace = std::int32_t(std::min<std::int64_t>(space, INT32_MAX));
    r.maxSpace64 = space;
    r.isFloating = 0;
    r.haveMask = 0;
    r.autoMask = options_.selection ? 1 : 0;
    r.backColor[0] = r.backColor[1] = r.backColor[2] = 255;
    r.hostSig = pi::fourCC("NCTV");
    r.imageMode = hostImageMode(dest_);
    r.imageHRes = r.imageVRes = pi::Fixed(options_.resolutionDpi) << 16;
    r.floatCoord = {pi::int16(filterArea_.top), pi::int16(filterArea_.left)};
    r.wholeSize = r.imageSize;
    // sRGB primaries and D65 white, gamma 2.2.
    r.monitor = {fixed(2.2),  fixed(0.64), fixed(0.33),   fixed(0.30), fixed(0.60),
                 fixed(0.15), fixed(0.06), fixed(0.3127), fixed(0.3290), fixed(0.0)};
    platformData_.hwnd = 0;
    r.platformData = &platformData_;
    r.bufferProcs = &bufferProcs_;
    r.handleProcs = &handleProcs_;
    r.filterCase = options_.selection ? 2 : 1;
    r.dummyPlaneValue = -1;
    r.advanceState = cb.advanceState;
    r.supportsPadding = 1;
    r.inputPadding = r.outputPadding = r.maskPadding = kPadError;
    r.samplingSupport = 0;
    r.inputRate = r.maskRate = kFixedOne;
    r.colorServices = cb.colorServices;
    const pi::int16 colourPlanes = 3, transparency = dest_.hasAlpha() ? 1 : 0;
    r.inLayerPlanes = r.outLayerPlanes = r.absLayerPlanes = colourPlanes;
    r.inTransparencyMask = r.outTransparencyMask = r.absTransparencyMask = transparency;
    const pi::int32 bytesPerSample = dest_.depth / 8;
    r.inPlaneBytes = r.outPlaneBytes = bytesPerSample;
    r.inColumnBytes = r.outColumnBytes = bytesPerSample * dest_.channels;
    r.descriptorParameters = &descriptorParameters_;
    r.errorString = &errorString_;
    r.depth = dest_.depth;
}

void Session::Impl::setUpDescriptor() {
    descriptorParameters_ = pi::PIDescriptorParameters{};
    descriptorParameters_.descriptorParametersVersion = 0;
    descriptorParameters_.playInfo = 0;
    descriptorParameters_.recordInfo = 0;
    descriptorParameters_.readDescriptorProcs = &readProcs_;
    descriptorParameters_.writeDescriptorProcs = &writeProcs_;
    std::vector<DescriptorItem> items;
    if (options_.par1) items.push_back({pi::keyPar1, pi::typeText, 0, *options_.par1});
    if (options_.dRes) items.push_back({pi::keyDRes, pi::typeInteger, *options_.dRes, {}});
    if (items.empty()) return;
    inputDescriptor_ = makeDescriptor(handles, items);
    if (!inputDescriptor_) throw std::bad_alloc();
    descriptorParameters_.descriptor = inputDescriptor_;
}

pi::OSErr Session::Impl::hostFault(const std::string& message, pi::OSErr code) {
    if (result_.hostError.empty()) result_.hostError = message;
    return code;
}

bool Session::Impl::call(pi::int16 selector) {
    if (options_.relocateHandles) result_.handleMoves += handles.relocateUnlocked();
    const bool failedBefore = resultCell_ != pi::noErr;
    try {
        entry_(selector, &record_, &dataCell_, &resultCell_);
    } catch (...) {
        hostFault(std::string("module let an exception escape from ") + selectorName(selector));
        return false;
    }
    if (resultCell_ != pi::noErr && !failedBefore && result_.result == pi::noErr) {
        result_.result = resultCell_;
        result_.failedSelector = selectorName(selector);
        if (resultCell_ == pi::errReportString && errorString_[0] > 0)
            hostFault(std::string(reinterpret_cast<const char*>(errorString_ + 1), errorString_[0]));
    }
    return resultCell_ == pi::noErr && result_.hostError.empty();
}

bool Session::Impl::anyRectRequested() const {
    return !Area::of(record_.inRect).empty() || !Area::of(record_.outRect).empty() ||
           !Area::of(record_.maskRect).empty();
}

Session::Impl::Served Session::Impl::serve(const Raster& image, const Area& area, int lo, int hi, int padding,
                                           bool inPlaceAllowed, std::vector<std::uint8_t>& buffer) const {
    Served s;
    if (s.error = checkRequest(image, area, lo, hi, padding); !s.error.empty()) return s;
    if (inPlaceAllowed && !options_.copyTiles && servedInPlace(image, area, lo, hi)) {
        s.data = image.at(area.left, area.top);
        s.rowBytes = std::int32_t(image.rowBytes);
        return s;
    }
    if (s.error = fillArea(image, area, lo, hi, padding, buffer, s.rowBytes); !s.error.empty()) return s;
    s.data = buffer.data();
    s.copied = true;
    return s;
}

pi::OSErr Session::Impl::serveRequest() {
    pi::FilterRecord& r = record_;
    if (r.inputRate > kFixedOne)
        return hostFault("sub-sampled input (inputRate " + std::to_string(r.inputRate) + ") is not supported");
    const int bytesPerSample = dest_.depth / 8;

    const Area in = Area::of(r.inRect);
    r.inData = nullptr;
    r.inRowBytes = 0;
    if (!in.empty()) {
        const Served s = serve(source_, in, r.inLoPlane, r.inHiPlane, r.inputPadding, true, inBuffer_);
        if (!s.error.empty()) return hostFault("input: " + s.error);
        r.inData = s.data;
        r.inRowBytes = s.rowBytes;
        r.inPlaneBytes = bytesPerSample;
        r.inColumnBytes = (r.inHiPlane - r.inLoPlane + 1) * bytesPerSample;
    }

    const Area out = Area::of(r.outRect);
    r.outData = nullptr;
    r.outRowBytes = 0;
    pending_.active = false;
    if (!out.empty()) {
        // In place only inside the selection: pixels outside it must never change.
        const Served s = serve(target_, out, r.outLoPlane, r.outHiPlane, r.outputPadding, out.within(filterArea_),
                               outBuffer_);
        if (!s.error.empty()) return hostFault("output: " + s.error);
        r.outData = s.data;
        r.outRowBytes = s.rowBytes;
        if (s.copied) pending_ = {out, r.outLoPlane, r.outHiPlane, r.outRowBytes, true};
        r.outPlaneBytes = bytesPerSample;
        r.outColumnBytes = (r.outHiPlane - r.outLoPlane + 1) * bytesPerSample;
    }

    // No mask: the selection is a plain rectangle.
    r.maskData = nullptr;
    r.maskRowBytes = 0;
    if (!in.empty() || !out.empty()) ++result_.tilesServed;
    if (!in.empty()) result_.requestedInRects.push_back(r.inRect);
    return pi::noErr;
}

void Session::Impl::commitPending() {
    if (!pending_.active) return;
    // Only the filter rectangle changes: pixels outside the selection are never written.
    storeArea(target_, pending_.area, filterArea_, pending_.lo, pending_.hi, outBuffer_.data(), pending_.rowBytes);
    pending_.active = false;
}

pi::OSErr Session::Impl::advanceState() {
    ++result_.advanceStateCalls;
    commitPending();
    return serveRequest();
}

void Session::Impl::progress(std::int32_t done, std::int32_t total) {
    result_.progress.emplace_back(done, total);
    if (options_.onProgress) options_.onProgress(done, total);
}

void Session::Impl::collectPar1() {
    pi::Handle h = descriptorParameters_.descriptor;
    if (!h || h == inputDescriptor_) return;
    const auto items = readDescriptor(handles, h);
    if (!items) {
        protocolWarning();
        return;
    }
    for (const auto& item : *items)
        if (item.key == pi::keyPar1 && item.type == pi::typeText) result_.par1Out = item.text;
}

void Session::Impl::releaseEverything() {
    // The parameter block a module leaves in the record belongs to the host from then on.
    if (record_.parameters) handles.setHostOwned(record_.parameters);
    LeakReport& leaks = result_.leaks;
    leaks.handles = handles.moduleOwnedCount();
    leaks.handleBytes = handles.moduleOwnedBytes();
    leaks.buffers = buffers.liveCount();
    leaks.bufferBytes = buffers.liveBytes();
    leaks.readTokens = tokens.openReads();
    leaks.writeTokens = tokens.openWrites();
    result_.handleAllocations = handles.allocations;
    result_.bufferAllocations = buffers.allocations;
    result_.bufferLocks = buffers.locks;
    handles.releaseAll();
    buffers.releaseAll();
    tokens.clear();
    if (options_.failOnLeak && leaks.any()) hostFault("module leaked " + leaks.describe());
}

RunResult Session::Impl::run(PluginEntryProc entry) {
    // The source snapshot is the image as it was before the first run.
    if (ran_) throw std::logic_error("a session runs once");
    ran_ = true;
    CurrentSession guard(this);
    entry_ = entry;
    result_ = RunResult{};
    // Outlives Finish: a dialog may be open on it until the module returns.
    ParentWindow parent;
    try {
        if (options_.parentWindow) parent = ParentWindow::open();
        setUpRecord();
        platformData_.hwnd = parent.id();
        result_.parentWindow = parent.id();
        setUpDescriptor();
        if (call(pi::filterSelectorPrepare)) {
            if (call(pi::filterSelectorStart)) {
                commitPending();  // whatever the module produced through advanceState
                while (anyRectRequested()) {
                    if (++result_.continueCalls > options_.maxContinueCalls) {
                        hostFault("module never finished: still requesting pixels after " +
                                  std::to_string(options_.maxContinueCalls) + " Continue calls");
                        break;
                    }
                    if (serveRequest() != pi::noErr) break;
                    if (!call(pi::filterSelectorContinue)) break;
                    commitPending();
                }
            }
            pending_.active = false;  // output of a failed call is discarded
            call(pi::filterSelectorFinish);
            collectPar1();
        }
    } catch (const std::bad_alloc&) {
        hostFault("host out of memory", pi::memFullErr);
    }
    releaseEverything();
    settleImage();
    return std::move(result_);
}

void Session::Impl::settleImage() {
    // Tiles already stored by a run that then failed must not pass for a result.
    if (!result_.ok()) std::memcpy(target_.data, sourceStore_.data(), sourceStore_.size());
}

Session::Session(Image& image, RunOptions options) : impl_(std::make_unique<Impl>(image, std::move(options))) {}
Session::~Session() = default;

RunResult Session::run(PluginEntryProc entry) { return impl_->run(entry); }

RunResult Session::run(const Module& module) {
    if (const ModuleInfo* info = module.info())
        if (auto refusal = checkImageSupported(*info, impl_->imageMode(), impl_->depth())) throw *refusal;
    return impl_->run(module.entry());
}

pi::int16 hostImageMode(const Image& image) {
    return image.depth == 16 ? pi::plugInModeRGB48 : pi::plugInModeRGBColor;
}

pi::OSErr Session::about(PluginEntryProc entry) {
    const ParentWindow parent = ParentWindow::open();
    pi::PlatformData platform{parent.id()};
    pi::AboutRecord about{};
    about.platformData = &platform;
    intptr_t data = 0;
    pi::int16 result = pi::noErr;
    entry(pi::filterSelectorAbout, reinterpret_cast<pi::FilterRecord*>(&about), &data, &result);
    return result;
}

RunResult runFilter(PluginEntryProc entry, Image& image, const RunOptions& options) {
    Session session(image, options);
    return session.run(entry);
}

RunResult runFilter(const Module& module, Image& image, const RunOptions& options) {
    Session session(image, options);
    return session.run(module);
}

}  // namespace noctiva::host
