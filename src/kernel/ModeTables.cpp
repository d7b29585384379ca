#include "kernel/Types.h"

namespace KERNEL {

namespace {

struct ModeRow {
    int32_t colorSpace, channels, bytesPerPixel, bytesPerSample;
};

// One row per mode number. Modes 2, 5-8 and 14-16 have no bytes per sample: the kernel does not
// convert them. Gray 16 (mode 10) keeps two colour components on purpose: its colour tables key on two bytes.
constexpr ModeRow kModeRows[kModeCount] = {
    /*  0 bitmap    */ {1, 1, 1, 1},
    /*  1 gray      */ {4, 1, 1, 1},
    /*  2 indexed   */ {-1, 3, 3, 0},
    /*  3 RGB       */ {0, 3, 3, 1},
    /*  4 CMYK      */ {2, 4, 4, 1},
    /*  5 HSL       */ {5, 3, 3, 0},
    /*  6 HSB       */ {1, 3, 3, 0},
    /*  7 multichan */ {-1, 0, 0, 0},
    /*  8 duotone   */ {4, 1, 1, 0},
    /*  9 Lab       */ {3, 3, 3, 1},
    /* 10 gray 16   */ {4, 2, 2, 2},
    /* 11 RGB 16    */ {0, 3, 6, 2},
    /* 12 Lab 16    */ {3, 3, 6, 2},
    /* 13 CMYK 16   */ {2, 4, 8, 2},
    /* 14 */ {0, 0, 0, 0},
    /* 15 */ {0, 0, 0, 0},
    /* 16 */ {0, 0, 0, 0},
    /* 17 RGB 32    */ {0, 3, 12, 4},
};

}  // namespace

// The tables start out filled, so code that runs before the first dispatch never sees zeros.
#define NOCTIVA_MODE_COLUMN(field)                                                                      \
    {kModeRows[0].field,  kModeRows[1].field,  kModeRows[2].field,  kModeRows[3].field,  kModeRows[4].field,  \
     kModeRows[5].field,  kModeRows[6].field,  kModeRows[7].field,  kModeRows[8].field,  kModeRows[9].field,  \
     kModeRows[10].field, kModeRows[11].field, kModeRows[12].field, kModeRows[13].field, kModeRows[14].field, \
     kModeRows[15].field, kModeRows[16].field, kModeRows[17].field}

int32_t modeColorSpace[kModeCount] = NOCTIVA_MODE_COLUMN(colorSpace);
int32_t modeChannels[kModeCount] = NOCTIVA_MODE_COLUMN(channels);
int32_t modeBytesPerPixel[kModeCount] = NOCTIVA_MODE_COLUMN(bytesPerPixel);
int32_t modeBytesPerSample[kModeCount] = NOCTIVA_MODE_COLUMN(bytesPerSample);

#undef NOCTIVA_MODE_COLUMN

void initModeTables() {
    for (int m = 0; m < kModeCount; ++m) {
        modeColorSpace[m] = kModeRows[m].colorSpace;
        modeChannels[m] = kModeRows[m].channels;
        modeBytesPerPixel[m] = kModeRows[m].bytesPerPixel;
        modeBytesPerSample[m] = kModeRows[m].bytesPerSample;
    }
}

}  // namespace KERNEL
