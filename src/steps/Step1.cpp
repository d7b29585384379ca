#include "steps/Step1.h"

#include "kernel/Node.h"

cStep1::cStep1(void* user, KERNEL::cHost* host, void* stepValue, void*)
    : cStepComponent(host, stepValue), user(user) {}

void cStep1::BindNode(KERNEL::__cFilterComponent__* node) {
    // Own fields in declaration order, then `mode`: this is their order in the settings text.
    node->BindSerialisedInt(&medianRadius1);
    node->BindSerialisedInt(&medianRadius2);
    node->BindSerialisedInt(&chromaLimitPercent);
    node->BindSerialisedInt(&edgeStrength);
    node->BindSerialisedInt(&medianRadius4);
    node->BindSerialisedInt(&preset3);
    cStepComponent::BindNode(node);
}

void cStep1::GetBorder(int32_t& bx, int32_t& by) {
    bx = 10;
    by = 10;
}
