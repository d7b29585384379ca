#include "plugin/Filter.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>
#include <string>
#include <vector>

#include "kernel/ColorTable.h"
#include "kernel/FilterAction.h"
#include "kernel/Memory/MEM.h"
#include "kernel/PixelBlock.h"
#include "kernel/StageTimer.h"
#include "plugin/CreateLayerReport.h"
#include "plugin/PhotoshopPluginHost.h"
#include "plugin/PluginState.h"
#include "steps/ShadowChain.h"
#include "steps/Step1.h"
#include "steps/Step2.h"
#include "steps/Step3.h"
#include "steps/Step4.h"

using plugin::gData;
using plugin::gFilterRecord;
using plugin::gResult;

namespace {

constexpr int32_t kTileSize = 200;
constexpr int32_t kTileOverlap = 50;

const pi::HandleProcs* handleSuite() {
    const pi::HandleProcs* procs = gFilterRecord ? gFilterRecord->handleProcs : nullptr;
    if (procs == nullptr || procs->numHandleProcs < 6 || !procs->newProc || !procs->disposeProc ||
        !procs->lockProc || !procs->unlockProc)
        return nullptr;
    return procs;
}

uint32_t byteSwap(uint32_t v) {
    return (v >> 24) | ((v >> 8) & 0xFF00u) | ((v << 8) & 0xFF0000u) | (v << 24);
}

// Copies a host text handle into a zero-terminated string, never reading past the handle's size:
// a text handle carries no terminator of its own.
std::string readTextHandle(const pi::HandleProcs* procs, pi::Handle text) {
    std::string out;
    const char* p = procs->lockProc(text, true);
    if (p == nullptr) return out;
    int32_t size = -1;
    if (procs->numHandleProcs >= 3 && procs->getSizeProc) size = procs->getSizeProc(text);
    if (size >= 0) {
        out.assign(p, strnlen(p, size_t(size)));
    } else {
        out.assign(p);  // no way to learn the size: trust the terminator our own writer puts there
    }
    procs->unlockProc(text);
    return out;
}

}  // namespace

void* cFilter::operator new(std::size_t size) noexcept {
    const pi::HandleProcs* procs = handleSuite();
    if (procs == nullptr || gData == nullptr || size > std::size_t(INT32_MAX)) return nullptr;
    pi::Handle handle = procs->newProc(int32_t(size));
    if (handle == nullptr) return nullptr;
    void* address = procs->lockProc(handle, true);
    if (address == nullptr) {
        procs->disposeProc(handle);
        return nullptr;
    }
    *gData = reinterpret_cast<intptr_t>(handle);
    return address;
}

void cFilter::operator delete(void*) noexcept {
    const pi::HandleProcs* procs = handleSuite();
    if (gData == nullptr || *gData == 0) return;
    if (procs != nullptr) procs->disposeProc(reinterpret_cast<pi::Handle>(*gData));
    *gData = 0;
}

cFilter::cFilter(const pi::Rect16& filterRect) : segmentation(filterRect, kTileSize, kTileSize, kTileOverlap) {}

cFilter::~cFilter() {
    delete inputBlock;
    delete outputBlock;
    delete colorTableFactory;
    if (KERNEL::memoryHost() == host) KERNEL::setMemoryHost(nullptr);
    if (KERNEL::conversionHost() == host) KERNEL::setConversionHost(nullptr);
    delete host;
}

void cFilter::Dispatch(int16_t selector, pi::FilterRecord* filterRecord, intptr_t* data, int16_t* result) {
    gFilterRecord = filterRecord;
    if (host == nullptr) host = new cPhotoshopPluginHost;
    KERNEL::setMemoryHost(host);
    KERNEL::setConversionHost(host);
    std::srand(unsigned(std::time(nullptr)));
    KERNEL::initModeTables();
    switch (selector) {
        case pi::filterSelectorParameters: OnParameters(); break;
        case pi::filterSelectorPrepare: OnPrepare(); break;
        case pi::filterSelectorStart: OnStart(); break;
        case pi::filterSelectorContinue: OnContinue(); break;
        case pi::filterSelectorFinish:
            OnFinish();
            delete this;  // disposes the handle and clears the data cell
            break;
        default: break;
    }
}

KERNEL::cColorTableFactory* cFilter::CreateColorTableFactory() { return new KERNEL::cColorTableFactory; }

void cFilter::OnPrepare() {
    if (colorTableFactory == nullptr) colorTableFactory = CreateColorTableFactory();
    host->SetColorTableFactory(colorTableFactory);
    delete inputBlock;
    inputBlock = nullptr;
    delete outputBlock;
    outputBlock = nullptr;
    inputBlock = KERNEL::cPixelBlock::createForMode(uint16_t(gFilterRecord->imageMode));
    outputBlock = KERNEL::cPixelBlock::createForMode(uint16_t(gFilterRecord->imageMode));
    BindInputBlock();
    BindOutputBlock();
    ReadDescriptor();
}

void cFilter::OnStart() {
    KERNEL::timing::begin();
    ProcessAllTiles();
    BeginTiles();
    *gResult = pi::noErr;
}

void cFilter::OnContinue() {
    BindInputBlock();
    BindOutputBlock();
    if (cFilterAction* a = GetAction(); a != nullptr && inputBlock != nullptr && outputBlock != nullptr)
        a->Apply(inputBlock, outputBlock);
    if (!NextTile()) EndTiles();
    ReportProgress();
    *gResult = pi::noErr;
}

void cFilter::OnFinish() {
    KERNEL::timing::finish();
    if (*gResult == pi::noErr) WriteDescriptor();
    delete inputBlock;
    inputBlock = nullptr;
    delete outputBlock;
    outputBlock = nullptr;
}

void cFilter::ProcessAllTiles() {
    gFilterRecord->inLoPlane = gFilterRecord->outLoPlane = 0;
    gFilterRecord->inHiPlane = gFilterRecord->outHiPlane = int16_t(gFilterRecord->planes - 1);
    gFilterRecord->inputPadding = gFilterRecord->outputPadding = 255;
    gFilterRecord->maskPadding = gFilterRecord->inputPadding;
    gFilterRecord->inputRate = 1;
    gFilterRecord->maskRate = 1;
    segmentation.Reset();
    // A hidden filter has no batch action: BeginTiles publishes the tiles one per host call instead.
    GetBatchAction();
}

void cFilter::PublishTile() {
    segmentation.CopyPadded(gFilterRecord->inRect);
    gFilterRecord->outRect = gFilterRecord->inRect;
    if (inputBlock) segmentation.CopyToBlock(*inputBlock);
    if (outputBlock) segmentation.CopyToBlock(*outputBlock);
    BindInputBlock();
    BindOutputBlock();
}

void cFilter::BeginTiles() {
    if (cFilterAction* a = GetAction()) a->Reset();
    if (gFilterRecord->progressProc) gFilterRecord->progressProc(1, 100);
    gFilterRecord->inLoPlane = gFilterRecord->outLoPlane = 0;
    gFilterRecord->inHiPlane = gFilterRecord->outHiPlane = int16_t(gFilterRecord->planes - 1);
    gFilterRecord->inputPadding = gFilterRecord->outputPadding = 255;
    gFilterRecord->maskPadding = gFilterRecord->inputPadding;
    segmentation.Reset();
    PublishTile();
    gFilterRecord->maskRect = pi::Rect16{0, 0, 0, 0};
    gFilterRecord->inputRate = 0;
    gFilterRecord->maskRate = 0;
    ReportProgress();
}

bool cFilter::NextTile() {
    const bool more = segmentation.Next();
    PublishTile();
    gFilterRecord->inLoPlane = gFilterRecord->outLoPlane = 0;
    gFilterRecord->inHiPlane = gFilterRecord->outHiPlane = int16_t(gFilterRecord->planes - 1);
    gFilterRecord->inputPadding = gFilterRecord->outputPadding = 255;
    gFilterRecord->maskPadding = gFilterRecord->inputPadding;
    return more;
}

void cFilter::EndTiles() {
    gFilterRecord->inRect = gFilterRecord->outRect = gFilterRecord->maskRect = pi::Rect16{0, 0, 0, 0};
    gFilterRecord->inLoPlane = gFilterRecord->inHiPlane = 0;
    gFilterRecord->outLoPlane = gFilterRecord->outHiPlane = 0;
}

void cFilter::ReportProgress() {
    if (!gFilterRecord->progressProc) return;
    const KERNEL::cRect r = inputBlock ? inputBlock->innerRect : segmentation.CoreRect();
    const int32_t bottom = gFilterRecord->filterRect.bottom, right = gFilterRecord->filterRect.right;
    gFilterRecord->progressProc(int32_t(r.y0) * right + (int32_t(r.y1) - r.y0) * int32_t(r.x1), bottom * right);
}

namespace {
void bindBlock(KERNEL::cPixelBlock* block, void* data, int32_t rowBytes, int32_t planeBytes, int16_t hiPlane) {
    if (block == nullptr) return;
    const cHostLayout layout = hostLayout(planeBytes, hiPlane);
    block->bytesPerSample = layout.bytesPerSample;
    block->bytesPerPixel = layout.bytesPerPixel;
    block->mode = uint16_t(gFilterRecord->imageMode);
    block->data = static_cast<uint8_t*>(data);
    block->rowBytes = uint32_t(rowBytes);
    block->sampling = 1;
    block->memory = nullptr;
}
}  // namespace

void cFilter::BindInputBlock() {
    bindBlock(inputBlock, gFilterRecord->inData, gFilterRecord->inRowBytes, gFilterRecord->inPlaneBytes,
              gFilterRecord->inHiPlane);
}

void cFilter::BindOutputBlock() {
    bindBlock(outputBlock, gFilterRecord->outData, gFilterRecord->outRowBytes, gFilterRecord->outPlaneBytes,
              gFilterRecord->outHiPlane);
}

void cFilter::ReadDescriptor() {
    pi::PIDescriptorParameters* dp = gFilterRecord->descriptorParameters;
    if (dp == nullptr) return;
    const pi::ReadDescriptorProcs* rp = dp->readDescriptorProcs;
    if (rp == nullptr || rp->numReadDescriptorProcs < 6 || !rp->openReadDescriptorProc ||
        !rp->closeReadDescriptorProc || !rp->getKeyProc || !rp->getIntegerProc || !rp->getTextProc)
        return;
    pi::uint32 keys[] = {pi::keyPar1, 0};
    pi::PIReadDescriptor token = rp->openReadDescriptorProc(dp->descriptor, keys);
    if (token == nullptr) return;
    pi::uint32 key = 0, type = 0;
    pi::int32 flags = 0;
    bool textLost = false;
    while (rp->getKeyProc(token, &key, &type, &flags)) {
        if (key == pi::keyDRes) {
            pi::int32 value = 0;
            rp->getIntegerProc(token, &value);
            dialogFlag = value == 3 ? 1 : 0;
        } else if (key == pi::keyPar1) {
            pi::Handle text = nullptr;
            const pi::OSErr error = rp->getTextProc(token, &text);
            const pi::HandleProcs* procs = handleSuite();
            if (text != nullptr && procs != nullptr) {
                std::string copy = readTextHandle(procs, text);
                procs->disposeProc(text);
                SetParameterText(copy.data());
            } else if (error == pi::memFullErr) {
                // Running on the defaults instead of the given settings would pass for success.
                textLost = true;
                break;
            }
        }
    }
    rp->closeReadDescriptorProc(token);
    if (textLost) throw std::bad_alloc();
}

void cFilter::WriteDescriptor() {
    std::vector<char> buffer(kParameterTextCapacity, '\0');
    std::snprintf(buffer.data(), buffer.size(), "%s", "empty");
    GetParameterText(buffer.data(), buffer.size());
    pi::PIDescriptorParameters* dp = gFilterRecord->descriptorParameters;
    if (dp == nullptr) return;
    const pi::WriteDescriptorProcs* wp = dp->writeDescriptorProcs;
    const pi::HandleProcs* procs = handleSuite();
    if (wp == nullptr || procs == nullptr || wp->numWriteDescriptorProcs < 7 || !wp->openWriteDescriptorProc ||
        !wp->closeWriteDescriptorProc || !wp->putTextProc)
        return;
    pi::PIWriteDescriptor token = wp->openWriteDescriptorProc();
    if (token == nullptr) return;
    const std::size_t length = strnlen(buffer.data(), buffer.size() - 1);
    bool recorded = false;
    if (pi::Handle text = procs->newProc(int32_t(length + 1)); text != nullptr) {
        if (char* p = procs->lockProc(text, true); p != nullptr) {
            std::memcpy(p, buffer.data(), length);
            p[length] = '\0';
            procs->unlockProc(text);
            // The host takes the handle over with the descriptor.
            wp->putTextProc(token, pi::keyPar1, text);
            recorded = true;
        } else {
            procs->disposeProc(text);
        }
    }
    pi::Handle descriptor = nullptr;
    wp->closeWriteDescriptorProc(token, &descriptor);
    dp->descriptor = descriptor;
    // A run whose settings could not be recorded cannot be played back: not a success.
    if (!recorded) *gResult = pi::memFullErr;
}

void cFilter::SetParameterText(char* text) {
    if (text == nullptr || strnlen(text, 4) < 4) return;
    uint32_t head = 0;
    std::memcpy(&head, text, 4);
    if (head != byteSwap(signature) && head != signature) return;
    std::memmove(text, text + 4, std::strlen(text + 4) + 1);
    if (cFilterAction* a = GetAction()) a->ReadParameters(text);
}

void cFilter::GetParameterText(char* buffer, std::size_t capacity) {
    cFilterAction* a = GetAction();
    if (a == nullptr || capacity < 5) return;
    a->WriteParameters(buffer + 4, capacity - 4);
    // "vek " in text order is the signature stored byte-swapped on this little-endian machine.
    const uint32_t head = byteSwap(signature);
    std::memcpy(buffer, &head, 4);
}

cHiddenFilter::~cHiddenFilter() {
    delete action;  // releases the graph, and through it the steps and converters
    action = nullptr;
    step1 = step2 = step3 = step4 = nullptr;
}

void cHiddenFilter::OnPrepare() {
    cFilter::OnPrepare();
    if (dialogFlag) plugin::ReportCreateLayerError(gFilterRecord);
}

cFilterAction* cHiddenFilter::GetAction() {
    if (action != nullptr) return action;
    try {
        if (step1 == nullptr) step1 = CreateStep1();
        if (step2 == nullptr) step2 = CreateStep2();
        if (step3 == nullptr) step3 = CreateStep3();
        if (step4 == nullptr) step4 = CreateStep4();
        action = buildShadowAction(static_cast<cStep1*>(step1), static_cast<cStep2*>(step2),
                                   static_cast<cStep3*>(step3), static_cast<cStep4*>(step4));
    } catch (...) {
        // Steps that never reached the graph have no owner yet.
        for (cStepComponent** s : {&step1, &step2, &step3, &step4}) {
            if (*s != nullptr && (*s)->RefCount() == 0) delete *s;
            *s = nullptr;
        }
        throw;
    }
    return action;
}

namespace {
// A step with reference count 0: the graph takes the first reference.
template <typename Step>
cStepComponent* makeStep(KERNEL::cHost* host, int32_t mode) {
    auto* step = new Step(nullptr, host, nullptr, nullptr);
    step->mode = mode;
    return step;
}
}  // namespace

// Only step 2 works by default (mode 104); the others pass their input on until a settings text
// sets their mode.
cStepComponent* cNoctiva::CreateStep1() { return makeStep<cStep1>(host, 0); }
cStepComponent* cNoctiva::CreateStep2() { return makeStep<cStep2>(host, 104); }
cStepComponent* cNoctiva::CreateStep3() { return makeStep<cStep3>(host, 0); }
cStepComponent* cNoctiva::CreateStep4() { return makeStep<cStep4>(host, 0); }
