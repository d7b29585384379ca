#include <cstddef>

#include "kernel/PixelBlock.h"
#include "steps/Step3.h"

// Stand-in until the step's variants are written: the step passes its input through.
void cStep3::Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) { src->copyTo(dst); }
