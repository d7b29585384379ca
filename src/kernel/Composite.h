// Holds the final node of an assembled chain; evaluating it runs the chain.
#pragma once

#include "kernel/Component.h"

namespace KERNEL {

class cComposite : public cInput {
public:
    cComposite() = default;
    ~cComposite() override;

    void BindNode(__cFilterComponent__* node) override {}
    void GetBorder(int32_t& bx, int32_t& by) override {}
    void Reset() override;
    // The chain's result: evaluates it.
    cPixelBlock* GetBlock() override { return Evaluate(); }
    __cFilterComponent__* CreateNode() override;

    // Takes ownership of the final node (deleting the previous one), keys the chain and shares
    // equal upstream parts.
    void SetNode(__cFilterComponent__* final);
    bool HasChanged();
    void AcceptChanges();
    void Invalidate();
    void InvalidateAndFree();
    cPixelBlock* GetOutput();
    void SetBorder(int32_t bx, int32_t by);
    // Borders from the end, every node dirty, output, then the snapshots move on.
    cPixelBlock* Evaluate();

    __cFilterComponent__* Node() const { return node; }

private:
    __cFilterComponent__* node = nullptr;
};

}  // namespace KERNEL
