#include "plugin/PhotoshopPluginHost.h"

#include "kernel/ColorTable.h"
#include "kernel/PixelBlock.h"
#include "plugin/PluginState.h"
#include "plugin/Segmentation.h"

using plugin::gFilterRecord;

namespace {

bool bufferSuiteUsable() {
    const pi::BufferProcs* procs = gFilterRecord ? gFilterRecord->bufferProcs : nullptr;
    return procs != nullptr && procs->numBufferProcs >= 4 && procs->allocateProc && procs->lockProc &&
           procs->unlockProc && procs->freeProc;
}

}  // namespace

cHostLayout hostLayout(int32_t planeBytes, int16_t hiPlane) {
    const int32_t mode = gFilterRecord->imageMode;
    const bool known = mode >= 0 && mode < KERNEL::kModeCount;
    cHostLayout layout{};
    layout.bytesPerSample =
        planeBytes != 0 ? uint32_t(planeBytes) : (known ? uint32_t(KERNEL::modeBytesPerSample[mode]) : 0);
    layout.bytesPerPixel = uint32_t(hiPlane + 1) * layout.bytesPerSample;
    if (layout.bytesPerPixel == 0 && known) layout.bytesPerPixel = uint32_t(KERNEL::modeBytesPerPixel[mode]);
    return layout;
}

cPhotoshopPluginHost::~cPhotoshopPluginHost() = default;

void* cPhotoshopPluginHost::AllocateBuffer(uint32_t size) {
    if (!bufferSuiteUsable() || size > uint32_t(INT32_MAX)) return nullptr;
    auto cell = std::make_unique<pi::BufferID>(nullptr);
    if (gFilterRecord->bufferProcs->allocateProc(int32_t(size), cell.get()) != pi::noErr) return nullptr;
    return cell.release();
}

void cPhotoshopPluginHost::FreeBuffer(void* holder) {
    std::unique_ptr<pi::BufferID> cell(static_cast<pi::BufferID*>(holder));
    if (cell && bufferSuiteUsable()) gFilterRecord->bufferProcs->freeProc(*cell);
}

void* cPhotoshopPluginHost::LockBuffer(void* holder) {
    if (holder == nullptr || !bufferSuiteUsable()) return nullptr;
    return gFilterRecord->bufferProcs->lockProc(*static_cast<pi::BufferID*>(holder), true);
}

void cPhotoshopPluginHost::UnlockBuffer(void* holder) {
    if (holder != nullptr && bufferSuiteUsable())
        gFilterRecord->bufferProcs->unlockProc(*static_cast<pi::BufferID*>(holder));
}

KERNEL::cColorConversion* cPhotoshopPluginHost::GetColorConversion(int32_t sourceMode, int32_t resultMode) {
    if (!colorConversion) {
        colorConversion =
            std::make_unique<cPhotoshopColorConversion>(sourceMode, resultMode, colorTableFactory, this);
    }
    colorConversion->Prepare(sourceMode, resultMode);
    return colorConversion.get();
}

void cPhotoshopPluginHost::GetFilterRect(KERNEL::cRect& out) { out = toKernelRect(gFilterRecord->filterRect); }

int32_t cPhotoshopPluginHost::GetImageMode() { return gFilterRecord->imageMode; }

void cPhotoshopPluginHost::GetImageSize(int32_t& width, int32_t& height) {
    width = gFilterRecord->imageSize.h;
    height = gFilterRecord->imageSize.v;
}

void cPhotoshopPluginHost::GetResolution(float& h, float& v) {
    h = float(gFilterRecord->imageHRes) * (1.0f / 65536.0f);
    v = float(gFilterRecord->imageVRes) * (1.0f / 65536.0f);
}

bool cPhotoshopPluginHost::HasMask() { return gFilterRecord->haveMask != 0; }

KERNEL::cPixelBlock* cPhotoshopPluginHost::wrapRequested(void* data, int32_t rowBytes, cHostLayout layout,
                                                         uint16_t mode) const {
    // The block's rectangles start at (0, 0), not at the requested area's position.
    return KERNEL::cPixelBlock::create(static_cast<uint8_t*>(data), (requestRect.right - requestRect.left) * sampleRate,
                                       (requestRect.bottom - requestRect.top) * sampleRate, layout.bytesPerSample,
                                       layout.bytesPerPixel, 0, sampleRate, mode, uint32_t(rowBytes), 0, 0);
}

void cPhotoshopPluginHost::CreateInputBlock(KERNEL::cPixelBlock*& out) {
    out = wrapRequested(gFilterRecord->inData, gFilterRecord->inRowBytes,
                        hostLayout(gFilterRecord->inPlaneBytes, gFilterRecord->inHiPlane),
                        uint16_t(gFilterRecord->imageMode));
}

void cPhotoshopPluginHost::CreateOutputBlock(KERNEL::cPixelBlock*& out) {
    out = wrapRequested(gFilterRecord->outData, gFilterRecord->outRowBytes,
                        hostLayout(gFilterRecord->outPlaneBytes, gFilterRecord->outHiPlane),
                        uint16_t(gFilterRecord->imageMode));
}

void cPhotoshopPluginHost::CreateMaskBlock(KERNEL::cPixelBlock*& out) {
    out = wrapRequested(gFilterRecord->maskData, gFilterRecord->maskRowBytes, cHostLayout{1, 1}, 0);
}

int16_t cPhotoshopPluginHost::RequestArea(const KERNEL::cRect& area, int32_t rate) {
    sampleRate = rate;
    requestRect = toHostRect(area);
    gFilterRecord->inRect = gFilterRecord->outRect = gFilterRecord->maskRect = requestRect;
    gFilterRecord->inputRate = gFilterRecord->maskRate = rate * 65536;
    gFilterRecord->inLoPlane = gFilterRecord->outLoPlane = 0;
    gFilterRecord->inHiPlane = gFilterRecord->outHiPlane = int16_t(gFilterRecord->planes - 1);
    gFilterRecord->inputPadding = gFilterRecord->outputPadding = 0;
    gFilterRecord->maskPadding = gFilterRecord->inputPadding;
    if (!gFilterRecord->advanceState) return pi::errPlugInHostInsufficient;
    return gFilterRecord->advanceState();
}

cPhotoshopColorConversion::cPhotoshopColorConversion(int32_t s, int32_t r, KERNEL::cColorTableFactory* factory,
                                                     cPhotoshopPluginHost* owner)
    : host(owner), colorTableFactory(factory) {
    Prepare(s, r);
}

void cPhotoshopColorConversion::Prepare(int32_t s, int32_t r) {
    sourceMode = s;
    resultMode = r;
    info.infoSize = sizeof(pi::ColorServicesInfo);
    info.selector = pi::plugIncolorServicesConvertColor;
    const auto space = [](int32_t mode) {
        return int16_t(mode >= 0 && mode < KERNEL::kModeCount ? KERNEL::modeColorSpace[mode] : -1);
    };
    info.sourceSpace = space(s);
    info.resultSpace = space(r);
    info.reservedSourceSpaceInfo = nullptr;
    info.reservedResultSpaceInfo = nullptr;
    info.reserved = nullptr;
    colorTable = colorTableFactory ? colorTableFactory->getTable(uint32_t(s), uint32_t(r), info.colorComponents)
                                   : nullptr;
}

void cPhotoshopColorConversion::Convert() {
    if (colorTable && colorTable->lookup()) return;
    if (gFilterRecord && gFilterRecord->colorServices) gFilterRecord->colorServices(&info);
    if (colorTable) colorTable->store();
}
