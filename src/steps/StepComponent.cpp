#include "steps/StepComponent.h"

#include "kernel/Node.h"

void cStepComponent::BindNode(KERNEL::__cFilterComponent__* node) { node->BindSerialisedInt(&mode); }
