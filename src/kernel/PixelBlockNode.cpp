// The pixel block as the source of a chain: its geometry is watched, so a new tile recomputes.
#include "kernel/Node.h"
#include "kernel/PixelBlock.h"

namespace KERNEL {

void cPixelBlock::BindNode(__cFilterComponent__* node) {
    node->BindInt(&sampling);
    node->BindRaw(&mode, sizeof(mode));
    node->BindRaw(&rowBytes, sizeof(rowBytes));
    node->BindRaw(&innerRect, sizeof(innerRect));
    node->BindRaw(&outerRect, sizeof(outerRect));
}

void cPixelBlock::GetBorder(int32_t& bx, int32_t& by) {
    bx = 0;
    by = 0;
}

__cFilterComponent__* cPixelBlock::CreateNode() { return new __cInput__(this); }

}  // namespace KERNEL
