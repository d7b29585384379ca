#include "steps/ShadowChain.h"

#include <cstddef>
#include <cstdlib>
#include <memory>

#include "kernel/FilterAction.h"
#include "kernel/Lab.h"
#include "kernel/Node.h"
#include "kernel/PixelBlock.h"
#include "kernel/StageTimer.h"
#include "kernel/Syntax.h"
#include "kernel/WorkerPool.h"
#include "steps/ShadowChainFast.h"
#include "steps/Step1.h"
#include "steps/Step2.h"
#include "steps/Step3.h"
#include "steps/Step4.h"

namespace {

// The shadow chain's action: tiles of the default settings take the fused path, everything else
// (and every tile when NOCTIVA_REFERENCE=1) goes through the chain's blocks stage by stage, which
// stays the reference the fused path is tested against.
class cShadowFilterAction : public cRGB32FilterAction {
public:
    cShadowFilterAction(cStep1* step1, cStep2* step2, cStep3* step3, cStep4* step4)
        : step1(step1), step2(step2), step3(step3), step4(step4) {
        const char* reference = std::getenv("NOCTIVA_REFERENCE");
        referenceOnly = reference != nullptr && reference[0] == '1';
    }

    void Apply(KERNEL::cPixelBlock* source, KERNEL::cPixelBlock* destination) override {
        KERNEL::timing::tile();
        KERNEL::timing::cStageClock clock(KERNEL::timing::kApply);
        if (enabled && !referenceOnly && source != nullptr && destination != nullptr && defaultChain() &&
            cDefaultChainTile::Accepts(*source, *destination)) {
            if (!pool) pool = std::make_unique<KERNEL::cWorkerPool>(KERNEL::cWorkerPool::DefaultThreads());
            fast.Run(*source, *destination, *pool);
            return;
        }
        cRGB32FilterAction::Apply(source, destination);
    }

private:
    bool defaultChain() const { return step1->mode == 0 && step2->mode == 104 && step3->mode == 0 && step4->mode == 0; }

    // Held by the chain's nodes, which this action owns.
    cStep1* step1;
    cStep2* step2;
    cStep3* step3;
    cStep4* step4;
    bool referenceOnly = false;
    cDefaultChainTile fast;
    std::unique_ptr<KERNEL::cWorkerPool> pool;  // started at the first tile, joined with the action
};

}  // namespace

cRGB32FilterAction* buildShadowAction(cStep1* step1, cStep2* step2, cStep3* step3, cStep4* step4) {
    auto action = std::make_unique<cShadowFilterAction>(step1, step2, step3, step4);
    auto* rgb2lab = new cRGB2LAB();
    auto* lab2rgb = new cLAB2RGB();
    // Named from the last stage back to the source; the nodes take the references.
    KERNEL::__cFilterComponent__* final = step4->Chain(step3)
                                              ->Append(lab2rgb)
                                              ->Append(step2)
                                              ->Append(step1)
                                              ->Append(rgb2lab)
                                              ->Terminate(action->GetSourceBlock());
    action->SetNode(final);
    return action.release();
}

std::string writeShadowParameters(cRGB32FilterAction& action) {
    const size_t capacity = action.ParameterTextLength() + 1;
    std::string text(capacity, '\0');
    const size_t length = action.WriteParameters(text.data(), capacity);
    text.resize(length);
    return text;
}

size_t writeShadowParameters(cRGB32FilterAction& action, char* buffer, size_t capacity) {
    return action.WriteParameters(buffer, capacity);
}

void readShadowParameters(cRGB32FilterAction& action, const char* text) { action.ReadParameters(text); }
