#include "steps/Step3.h"

#include "kernel/Node.h"

cStep3::cStep3(void* user, KERNEL::cHost* host, void* stepValue, void*)
    : cStepComponent(host, stepValue), user(user) {}

void cStep3::BindNode(KERNEL::__cFilterComponent__* node) {
    // Own fields in declaration order, then `mode`: this is their order in the settings text.
    node->BindSerialisedInt(&gradeMix);
    node->BindSerialisedInt(&saturationPercent);
    node->BindSerialisedInt(&warmthPercent);
    node->BindSerialisedInt(&shiftStrength3);
    node->BindSerialisedInt(&shiftBase3);
    node->BindSerialisedInt(&shiftLevelR3);
    node->BindSerialisedInt(&shiftLevelG3);
    node->BindSerialisedInt(&shiftLevelB3);
    node->BindSerialisedInt(&shiftStrength4);
    node->BindSerialisedInt(&shiftBase4);
    node->BindSerialisedInt(&shiftLevelR4);
    node->BindSerialisedInt(&shiftLevelG4);
    node->BindSerialisedInt(&shiftLevelB4);
    node->BindSerialisedInt(&toneSelector);
    node->BindSerialisedInt(&toneAmount0);
    node->BindSerialisedInt(&toneAmount1);
    node->BindSerialisedInt(&toneAmount2);
    node->BindSerialisedInt(&toneAmount3);
    cStepComponent::BindNode(node);
}
