#include "kernel/Syntax.h"

#include <memory>

#include "kernel/Component.h"
#include "kernel/Node.h"

namespace KERNEL {

__cSyntax__* __cSyntax__::Append(cPipe* pipe) { return new __cPipeO__(this, pipe); }

__cFilterComponent__* __cSyntax__::Terminate(cInput* source) { return Build(source->CreateNode()); }

__cFilterComponent__* __cPipeO__::Build(__cFilterComponent__* upstream) {
    std::unique_ptr<__cPipeO__> self(this);
    __cFilterComponent__* node = component->CreateNode(upstream);
    return previous ? previous->Build(node) : node;
}

__cBranchL__::~__cBranchL__() {
    if (ownsNode) delete node;
}

__cFilterComponent__* __cBranchL__::Build(__cFilterComponent__* upstream) {
    std::unique_ptr<__cBranchL__> self(this);
    if (upstream != nullptr && upstream != node) return component->CreateNode(upstream);
    __cFilterComponent__* base = node;
    const bool owned = ownsNode;
    ownsNode = false;
    if (owned) return component->CreateNode(base);
    return new __cPipe__(component, base, false);
}

__cFilterComponent__* __cBranchL__::Terminate(cInput* source) {
    return Build(source ? source->CreateNode() : nullptr);
}

}  // namespace KERNEL
