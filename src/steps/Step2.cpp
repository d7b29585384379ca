#include "steps/Step2.h"

#include "kernel/Node.h"

cStep2::cStep2(void* user, KERNEL::cHost* host, void* stepValue, void*)
    : cStepComponent(host, stepValue), user(user) {}

void cStep2::BindNode(KERNEL::__cFilterComponent__* node) {
    // Own fields in declaration order, then `mode`: this is their order in the settings text.
    node->BindSerialisedInt(&impulseLevel);
    node->BindSerialisedInt(&impulseFlatness);
    node->BindSerialisedInt(&lumaMedianRadius);
    node->BindSerialisedInt(&lumaMedianKeep);
    node->BindSerialisedInt(&rankPreset3);
    node->BindSerialisedInt(&smoothThreshold4);
    node->BindSerialisedInt(&smoothStrength4);
    node->BindSerialisedInt(&edgeLimit5);
    node->BindSerialisedInt(&lumaKeepPercent5);
    node->BindSerialisedInt(&rankPreset6);
    node->BindSerialisedInt(&colourTolerance7);
    node->BindSerialisedInt(&waveletStrength7);
    node->BindSerialisedInt(&referenceRed7);
    node->BindSerialisedInt(&referenceGreen7);
    node->BindSerialisedInt(&referenceBlue7);
    node->BindSerialisedInt(&preset9);
    cStepComponent::BindNode(node);
}

void cStep2::GetBorder(int32_t& bx, int32_t& by) {
    const int32_t reach = mode == 108 ? 30 : 20;
    bx = reach;
    by = reach;
}
