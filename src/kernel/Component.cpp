#include "kernel/Component.h"

#include "kernel/Node.h"
#include "kernel/Syntax.h"

namespace KERNEL {

namespace {
uint32_t componentCounter = 0;
}

uint32_t cFilterComponent::NextId() { return componentCounter++; }

cFilterComponent::cFilterComponent() : id(NextId()) {}

void cFilterComponent::Release() {
    if (--refCount == 0) delete this;
}

__cSyntax__* cPipe::Chain(cPipe* previous) {
    auto* last = new __cPipeO__(nullptr, this);
    return new __cPipeO__(last, previous);
}

__cFilterComponent__* cPipe::CreateNode(__cFilterComponent__* upstream) {
    return new __cPipe__(this, upstream, true);
}

__cFilterComponent__* cInput::ChainInto(cPipe* pipe) { return pipe->CreateNode(CreateNode()); }

__cSyntax__* cInput::Branch(cPipe* pipe) { return new __cBranchL__(CreateNode(), pipe, true); }

}  // namespace KERNEL
