#include "kernel/Composite.h"

#include "kernel/Node.h"

namespace KERNEL {

cComposite::~cComposite() { delete node; }

void cComposite::Reset() {
    if (node) node->ResetChain();
}

__cFilterComponent__* cComposite::CreateNode() { return new __cComposite__(this); }

void cComposite::SetNode(__cFilterComponent__* final) {
    if (final == node) return;
    delete node;
    node = final;
    if (!node) return;
    uint32_t length = 0;
    node->BuildKey(length);
    node->ShareWith(node);
}

bool cComposite::HasChanged() { return node ? node->HasChanged() : false; }

void cComposite::AcceptChanges() {
    if (node) node->AcceptChanges();
}

void cComposite::Invalidate() {
    if (node) node->Invalidate();
}

void cComposite::InvalidateAndFree() {
    if (node) node->InvalidateAndFree();
}

cPixelBlock* cComposite::GetOutput() { return node ? node->GetOutput() : nullptr; }

void cComposite::SetBorder(int32_t bx, int32_t by) {
    if (node) node->SetBorder(bx, by);
}

cPixelBlock* cComposite::Evaluate() {
    if (!node) return nullptr;
    node->SetBorder(0, 0);
    node->Invalidate();
    cPixelBlock* out = node->GetOutput();
    node->AcceptChanges();
    return out;
}

}  // namespace KERNEL
