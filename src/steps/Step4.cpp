#include "steps/Step4.h"

#include "kernel/Node.h"

cStep4::cStep4(void* user, KERNEL::cHost* host, void* stepValue, void*)
    : cStepComponent(host, stepValue), user(user) {}

void cStep4::BindNode(KERNEL::__cFilterComponent__* node) {
    // Own fields in declaration order, then `mode`: this is their order in the settings text.
    node->BindSerialisedInt(&blackLevel1);
    node->BindSerialisedInt(&whiteLevel1);
    node->BindSerialisedInt(&curveStrength2);
    node->BindSerialisedInt(&blackLevel2);
    node->BindSerialisedInt(&whiteLevel2);
    node->BindSerialisedInt(&gradientLevel3);
    node->BindSerialisedInt(&curveStrength3);
    node->BindSerialisedInt(&blackPoint5);
    node->BindSerialisedInt(&whitePoint5);
    node->BindSerialisedInt(&toneRed5);
    node->BindSerialisedInt(&toneBlue5);
    node->BindSerialisedInt(&toneSelector4);
    node->BindSerialisedInt(&liftAmount4);
    node->BindSerialisedInt(&darkenAmount4);
    cStepComponent::BindNode(node);
}
