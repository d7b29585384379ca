// A kernel host for unit tests: buffers from the heap, with counters for leaks, locks and colour
// conversions, and switches that make allocation or locking fail.
#pragma once

#include <cstdlib>
#include <cstring>
#include <functional>
#include <memory>
#include <set>

#include "kernel/Host.h"
#include "kernel/Memory/MEM.h"

namespace testsupport {

struct MallocBuffer {
    void* address = nullptr;
    uint32_t size = 0;
    int locks = 0;
};

class MallocHost : public KERNEL::cHost {
public:
    // Colour conversion for the tests: applies `convert` to the four components (defaults to
    // identity) and counts the calls.
    class Conversion : public KERNEL::cColorConversion {
    public:
        void Convert() override {
            ++calls;
            if (convert) convert(sourceMode, resultMode, components);
        }
        int16_t* GetComponents() override { return components; }
        int32_t sourceMode = 0, resultMode = 0;
        int16_t components[4] = {0, 0, 0, 0};
        int calls = 0;
        std::function<void(int32_t, int32_t, int16_t*)> convert;
    };

    MallocHost() {
        KERNEL::setMemoryHost(this);
        KERNEL::setConversionHost(this);
    }
    ~MallocHost() override {
        for (auto* b : live) {
            std::free(b->address);
            delete b;
        }
        if (KERNEL::memoryHost() == this) KERNEL::setMemoryHost(nullptr);
        if (KERNEL::conversionHost() == this) KERNEL::setConversionHost(nullptr);
    }

    void* AllocateBuffer(uint32_t size) override {
        ++allocations;
        if (failAllocationAt > 0 && allocations == failAllocationAt) return nullptr;
        if (failAllocationsAbove > 0 && size > failAllocationsAbove) return nullptr;
        auto* b = new MallocBuffer;
        b->address = std::calloc(size ? size : 1, 1);
        b->size = size;
        live.insert(b);
        return b;
    }
    void FreeBuffer(void* holder) override {
        auto* b = static_cast<MallocBuffer*>(holder);
        live.erase(b);
        std::free(b->address);
        delete b;
    }
    void* LockBuffer(void* holder) override {
        ++lockCalls;
        if (failLocks) return nullptr;
        auto* b = static_cast<MallocBuffer*>(holder);
        ++b->locks;
        return b->address;
    }
    void UnlockBuffer(void* holder) override { --static_cast<MallocBuffer*>(holder)->locks; }
    KERNEL::cColorConversion* GetColorConversion(int32_t s, int32_t r) override {
        conversion.sourceMode = s;
        conversion.resultMode = r;
        return &conversion;
    }
    void SetColorTableFactory(KERNEL::cColorTableFactory* f) override { factory = f; }
    void GetFilterRect(KERNEL::cRect& out) override { out = filterRect; }
    int32_t GetImageMode() override { return imageMode; }
    void GetImageSize(int32_t& w, int32_t& h) override {
        w = filterRect.width();
        h = filterRect.height();
    }
    void GetResolution(float& h, float& v) override { h = v = 72.0f; }
    bool HasMask() override { return false; }
    void CreateInputBlock(KERNEL::cPixelBlock*& out) override { out = nullptr; }
    void CreateOutputBlock(KERNEL::cPixelBlock*& out) override { out = nullptr; }
    void CreateMaskBlock(KERNEL::cPixelBlock*& out) override { out = nullptr; }
    int16_t RequestArea(const KERNEL::cRect&, int32_t) override { return 0; }

    size_t liveBuffers() const { return live.size(); }

    std::set<MallocBuffer*> live;
    int allocations = 0;
    int failAllocationAt = 0;         // 1-based index of the allocation to refuse; 0 = none
    uint32_t failAllocationsAbove = 0;  // refuse any allocation larger than this; 0 = none
    bool failLocks = false;
    int lockCalls = 0;
    Conversion conversion;
    KERNEL::cColorTableFactory* factory = nullptr;
    KERNEL::cRect filterRect{0, 100, 0, 100};
    int32_t imageMode = 3;
};

}  // namespace testsupport
