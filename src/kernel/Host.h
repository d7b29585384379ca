// The kernel's view of the host: memory, geometry, colour conversion and area requests.
#pragma once

#include <cstdint>

#include "kernel/Types.h"

namespace KERNEL {

class cPixelBlock;
class cColorTableFactory;

// Converts one colour at a time between two modes through the host's colour services.
class cColorConversion {
public:
    virtual ~cColorConversion() = default;
    // Converts the four components in place (see GetComponents).
    virtual void Convert() = 0;
    virtual int16_t* GetComponents() = 0;
};

class cHost {
public:
    virtual ~cHost() = default;
    virtual void* AllocateBuffer(uint32_t size) = 0;  // buffer-id holder, or null
    virtual void FreeBuffer(void* holder) = 0;
    virtual void* LockBuffer(void* holder) = 0;
    virtual void UnlockBuffer(void* holder) = 0;
    virtual cColorConversion* GetColorConversion(int32_t sourceMode, int32_t resultMode) = 0;
    virtual void SetColorTableFactory(cColorTableFactory* factory) = 0;
    virtual void GetFilterRect(cRect& out) = 0;
    virtual int32_t GetImageMode() = 0;
    virtual void GetImageSize(int32_t& width, int32_t& height) = 0;
    virtual void GetResolution(float& h, float& v) = 0;
    virtual bool HasMask() = 0;
    virtual void CreateInputBlock(cPixelBlock*& out) = 0;
    virtual void CreateOutputBlock(cPixelBlock*& out) = 0;
    virtual void CreateMaskBlock(cPixelBlock*& out) = 0;
    virtual int16_t RequestArea(const cRect& area, int32_t rate) = 0;
    virtual bool Query() { return false; }
};

// The host whose colour conversion the mode converters of pixel blocks use; set at every dispatch.
void setConversionHost(cHost* host);
cHost* conversionHost();

}  // namespace KERNEL
