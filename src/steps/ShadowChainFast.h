// The default chain (step 2 in mode 104, every other step bypassed) for one tile, fused: host
// samples to Lab, the two row passes of the box blur, the two column passes, the luminance mix,
// Lab back to RGB and the host's depth, without intermediate blocks. It computes only what the
// tile's core depends on, with the same edge rules as the block operations (clamped reads, and on
// a clamped write the last position wins), so the core comes out bit-identical to the chain.
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "kernel/Memory/MEM.h"

namespace KERNEL {
class cPixelBlock;
class cWorkerPool;
}  // namespace KERNEL

class cDefaultChainTile {
public:
    // True when the tile can take this path: RGB 8 or 16 bits, full resolution, source and
    // destination over the same padded rectangle, core inside it.
    static bool Accepts(const KERNEL::cPixelBlock& source, const KERNEL::cPixelBlock& destination);

    // Writes the core of `destination`; working memory is kept for the next tile.
    void Run(const KERNEL::cPixelBlock& source, KERNEL::cPixelBlock& destination, KERNEL::cWorkerPool& pool);

private:
    // The row passes' result, tile-sized: host buffer memory like every working block, taken at the
    // first tile and kept locked for the next ones.
    std::unique_ptr<KERNEL::cMEM> rowsMemory;
    uint16_t* rows = nullptr;
    std::vector<std::vector<int32_t>> lines;  // per-thread lines and column sweeps
};
