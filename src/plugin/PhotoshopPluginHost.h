// The kernel's host, implemented over the current FilterRecord.
#pragma once

#include <cstdint>
#include <memory>

#include "hostapi/HostInterface.h"
#include "kernel/Host.h"

namespace KERNEL {
class cColorTable;
class cColorTableFactory;
}  // namespace KERNEL

class cPhotoshopPluginHost;

// Bytes per sample and per pixel of a host buffer of the current record, with the kernel's defaults
// for the image mode where the host leaves the plane step unset.
struct cHostLayout {
    uint32_t bytesPerSample;
    uint32_t bytesPerPixel;
};
cHostLayout hostLayout(int32_t planeBytes, int16_t hiPlane);

// Converts single colours through the host's colour services, with a colour table in front.
class cPhotoshopColorConversion : public KERNEL::cColorConversion {
public:
    cPhotoshopColorConversion(int32_t sourceMode, int32_t resultMode, KERNEL::cColorTableFactory* factory,
                              cPhotoshopPluginHost* host);
    void Convert() override;
    int16_t* GetComponents() override { return info.colorComponents; }
    void Prepare(int32_t sourceMode, int32_t resultMode);

private:
    int32_t sourceMode = 0;
    int32_t resultMode = 0;
    cPhotoshopPluginHost* host;
    pi::ColorServicesInfo info{};
    KERNEL::cColorTableFactory* colorTableFactory;
    KERNEL::cColorTable* colorTable = nullptr;
};

class cPhotoshopPluginHost : public KERNEL::cHost {
public:
    cPhotoshopPluginHost() = default;
    ~cPhotoshopPluginHost() override;

    void* AllocateBuffer(uint32_t size) override;
    void FreeBuffer(void* holder) override;
    void* LockBuffer(void* holder) override;
    void UnlockBuffer(void* holder) override;
    KERNEL::cColorConversion* GetColorConversion(int32_t sourceMode, int32_t resultMode) override;
    void SetColorTableFactory(KERNEL::cColorTableFactory* factory) override { colorTableFactory = factory; }
    void GetFilterRect(KERNEL::cRect& out) override;
    int32_t GetImageMode() override;
    void GetImageSize(int32_t& width, int32_t& height) override;
    void GetResolution(float& h, float& v) override;
    bool HasMask() override;
    void CreateInputBlock(KERNEL::cPixelBlock*& out) override;
    void CreateOutputBlock(KERNEL::cPixelBlock*& out) override;
    void CreateMaskBlock(KERNEL::cPixelBlock*& out) override;
    int16_t RequestArea(const KERNEL::cRect& area, int32_t rate) override;

private:
    // A block over a host buffer of the last requested area.
    KERNEL::cPixelBlock* wrapRequested(void* data, int32_t rowBytes, cHostLayout layout, uint16_t mode) const;

    KERNEL::cColorTableFactory* colorTableFactory = nullptr;  // not owned
    std::unique_ptr<cPhotoshopColorConversion> colorConversion;
    int32_t sampleRate = 0;
    pi::Rect16 requestRect{};
};
