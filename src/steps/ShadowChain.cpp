#include "steps/ShadowChain.h"

#include <cstddef>
#include <memory>

#include "kernel/FilterAction.h"
#include "kernel/Lab.h"
#include "kernel/Node.h"
#include "kernel/PixelBlock.h"
#include "kernel/Syntax.h"
#include "steps/Step1.h"
#include "steps/Step2.h"
#include "steps/Step3.h"
#include "steps/Step4.h"

cRGB32FilterAction* buildShadowAction(cStep1* step1, cStep2* step2, cStep3* step3, cStep4* step4) {
    auto action = std::make_unique<cRGB32FilterAction>();
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
