#include "kernel/FilterAction.h"

#include <memory>

#include "kernel/Node.h"
#include "kernel/Parameter.h"
#include "kernel/PixelBlock.h"
#include "kernel/StageTimer.h"

cFilterAction::cFilterAction() : GUI::cAction(true) {
    // The composite lives inside the action, not on the heap: this reference keeps a node that might
    // be built over it from ever deleting it.
    composite.AddRef();
}

void cFilterAction::ReadParameters(const char* text) {
    KERNEL::__cFilterComponent__* node = composite.Node();
    if (node == nullptr || text == nullptr) return;
    VEK_STD::parameterCounter = 0;
    const char* cursor = text;
    node->ReadParameters(text, cursor, VEK_STD::parameterCounter);
}

size_t cFilterAction::WriteParameters(char* buffer, size_t capacity) {
    if (buffer == nullptr || capacity == 0) return 0;
    buffer[0] = '\0';
    KERNEL::__cFilterComponent__* node = composite.Node();
    if (node == nullptr) return 0;
    VEK_STD::parameterCounter = 0;
    char* cursor = buffer;
    node->WriteParameters(buffer, capacity, cursor, VEK_STD::parameterCounter);
    return size_t(cursor - buffer);
}

size_t cFilterAction::ParameterTextLength() {
    KERNEL::__cFilterComponent__* node = composite.Node();
    return node ? node->TextLength() : 0;
}

cRGB32FilterAction::cRGB32FilterAction() : sourceBlock(new KERNEL::cRGB32PixelBlock()) { sourceBlock->AddRef(); }

cRGB32FilterAction::~cRGB32FilterAction() {
    // The chain's input node may hold the other reference; whichever goes last deletes the block.
    sourceBlock->Release();
}

KERNEL::cPixelBlock* cRGB32FilterAction::GetSourceBlock() { return sourceBlock; }

int32_t cRGB32FilterAction::GetPixelMode() { return KERNEL::kModeRGB32; }

namespace {

// Lends the working block's pixels to the descriptor and takes them back however Apply ends, so
// the storage is freed once, by the working block.
class cBorrowedPixels {
public:
    cBorrowedPixels(KERNEL::cPixelBlock* descriptor, const KERNEL::cPixelBlock& work) : descriptor(descriptor) {
        descriptor->outerRect = work.outerRect;
        descriptor->innerRect = work.innerRect;
        descriptor->sampling = work.sampling;
        descriptor->mode = work.mode;
        descriptor->data = work.data;
        descriptor->bytesPerSample = work.bytesPerSample;
        descriptor->bytesPerPixel = work.bytesPerPixel;
        descriptor->rowBytes = work.rowBytes;
        // The storage handle stays with the working block: the descriptor never owns it.
        descriptor->memory = nullptr;
    }
    ~cBorrowedPixels() { descriptor->detach(); }
    cBorrowedPixels(const cBorrowedPixels&) = delete;
    cBorrowedPixels& operator=(const cBorrowedPixels&) = delete;

private:
    KERNEL::cPixelBlock* descriptor;
};

}  // namespace

void cRGB32FilterAction::Apply(KERNEL::cPixelBlock* source, KERNEL::cPixelBlock* destination) {
    if (!enabled || source == nullptr || destination == nullptr) return;
    std::unique_ptr<KERNEL::cPixelBlock> work, result;
    {
        KERNEL::timing::cStageClock clock(KERNEL::timing::kConvertIn);
        work.reset(source->convertedTo(KERNEL::kModeRGB32));
        if (!work) return;
        work->lock();
        result.reset(work->clone());
        if (!result) return;
        result->lock();
    }
    {
        cBorrowedPixels borrowed(sourceBlock, *work);
        result->copyInnerFrom(&composite);
        KERNEL::timing::cStageClock clock(KERNEL::timing::kConvertOut);
        const KERNEL::cRect inner = result->innerRect;
        KERNEL::cPixelBlock::copyRegion(result.get(), destination, inner.x0, inner.y0, inner.x0, inner.y0, inner);
    }
}
