// The filter object: lives in a host handle between entry calls and routes each selector to its
// handler. It is relocated by the host between calls, so it holds no pointers into itself.
#pragma once

#include <cstddef>
#include <cstdint>

#include "hostapi/HostInterface.h"
#include "plugin/Segmentation.h"

namespace KERNEL {
class cColorTableFactory;
class cPixelBlock;
}  // namespace KERNEL
class cPhotoshopPluginHost;
class cFilterAction;
class cRGB32FilterAction;
class cStepComponent;

class cFilter {
public:
    explicit cFilter(const pi::Rect16& filterRect);
    virtual ~cFilter();
    cFilter(const cFilter&) = delete;
    cFilter& operator=(const cFilter&) = delete;

    // Class allocation goes through the host's handle suite: the handle is stored in the data cell.
    static void* operator new(std::size_t size) noexcept;
    static void operator delete(void* object) noexcept;

    virtual void Dispatch(int16_t selector, pi::FilterRecord* filterRecord, intptr_t* data, int16_t* result);
    virtual void OnParameters() {}
    virtual void OnPrepare();
    virtual void OnStart();
    virtual void OnContinue();
    virtual void OnFinish();
    // Writes the parameter text (signature first) into a buffer of `capacity` bytes.
    virtual void GetParameterText(char* buffer, std::size_t capacity);
    // Applies a zero-terminated text; ignored unless it starts with the signature.
    virtual void SetParameterText(char* text);
    virtual void ProcessAllTiles();
    virtual cFilterAction* GetAction() = 0;
    virtual cFilterAction* GetBatchAction() = 0;
    virtual void* GetUnused() = 0;
    virtual KERNEL::cColorTableFactory* CreateColorTableFactory();

    // The four bytes "vek " as a multi-character constant (first character in the top byte).
    static constexpr uint32_t kSignature = pi::fourCC("vek ");
    // Size of the text buffer written back at Finish.
    static constexpr std::size_t kParameterTextCapacity = 10096;

protected:
    void ReadDescriptor();
    void WriteDescriptor();
    void BeginTiles();
    bool NextTile();
    void EndTiles();
    void BindInputBlock();
    void BindOutputBlock();
    void PublishTile();
    void ReportProgress();

    KERNEL::cColorTableFactory* colorTableFactory = nullptr;
    KERNEL::cPixelBlock* inputBlock = nullptr;
    KERNEL::cPixelBlock* outputBlock = nullptr;
    cSegmentation segmentation;
    uint8_t dialogFlag = 0;
    uint32_t signature = kSignature;
    cPhotoshopPluginHost* host = nullptr;
};

class cHiddenFilter : public cFilter {
public:
    using cFilter::cFilter;
    ~cHiddenFilter() override;

    void OnPrepare() override;
    cFilterAction* GetAction() override;
    cFilterAction* GetBatchAction() override { return nullptr; }
    void* GetUnused() override { return nullptr; }

    virtual cStepComponent* CreateStep1() = 0;
    virtual cStepComponent* CreateStep2() = 0;
    virtual cStepComponent* CreateStep3() = 0;
    virtual cStepComponent* CreateStep4() = 0;

protected:
    cStepComponent* step1 = nullptr;  // held by the graph, not owned
    cStepComponent* step2 = nullptr;
    cStepComponent* step3 = nullptr;
    cStepComponent* step4 = nullptr;
    cRGB32FilterAction* action = nullptr;  // owns the graph
};

class cNoctiva : public cHiddenFilter {
public:
    using cHiddenFilter::cHiddenFilter;
    cStepComponent* CreateStep1() override;
    cStepComponent* CreateStep2() override;
    cStepComponent* CreateStep3() override;
    cStepComponent* CreateStep4() override;
};
