// What the filter driver holds: a composite (the chain) plus how a tile goes through it.
#pragma once

#include <cstddef>
#include <cstdint>

#include "kernel/Composite.h"

namespace KERNEL {
class cPixelBlock;
class cRGB32PixelBlock;
class __cFilterComponent__;
}  // namespace KERNEL

namespace GUI {

class cAction {
public:
    explicit cAction(bool enabled) : enabled(enabled) {}
    virtual ~cAction() = default;
    virtual void Enable() { enabled = true; }
    virtual void Disable() { enabled = false; }
    bool IsEnabled() const { return enabled; }

protected:
    bool enabled;
    int32_t tag = 0;
};

}  // namespace GUI

class cFilterAction : public GUI::cAction {
public:
    cFilterAction();
    ~cFilterAction() override = default;
    cFilterAction(const cFilterAction&) = delete;
    cFilterAction& operator=(const cFilterAction&) = delete;

    // Runs the chain on the source tile and writes the tile's core into the destination.
    virtual void Apply(KERNEL::cPixelBlock* source, KERNEL::cPixelBlock* destination) = 0;
    virtual void Reset() { composite.Reset(); }
    virtual KERNEL::cPixelBlock* GetSourceBlock() = 0;
    virtual int32_t GetPixelMode() = 0;
    virtual bool HasChanged() { return composite.HasChanged(); }
    virtual void InvalidateAndFree() { composite.InvalidateAndFree(); }

    // Takes ownership of the chain's final node.
    void SetNode(KERNEL::__cFilterComponent__* final) { composite.SetNode(final); }
    KERNEL::cComposite& Composite() { return composite; }

    // Reads the settings text (zero-terminated) into every stage, from the final node upstream, with
    // the module-wide counter reset to 0.
    void ReadParameters(const char* text);
    // Writes the settings text into buffer[0, capacity), always zero-terminated (when capacity > 0);
    // entries that do not fit are left out. Returns the text's length.
    size_t WriteParameters(char* buffer, size_t capacity);
    // Upper bound of the text WriteParameters produces, terminator not included.
    size_t ParameterTextLength();

protected:
    KERNEL::cComposite composite;
};

class cRGB32FilterAction : public cFilterAction {
public:
    cRGB32FilterAction();
    ~cRGB32FilterAction() override;

    void Apply(KERNEL::cPixelBlock* source, KERNEL::cPixelBlock* destination) override;
    KERNEL::cPixelBlock* GetSourceBlock() override;
    int32_t GetPixelMode() override;

private:
    // A descriptor block: during Apply it borrows the working block's pixels, otherwise it is empty.
    KERNEL::cRGB32PixelBlock* sourceBlock;
};
