// Runtime nodes: one per front component in an assembled chain. A node holds its upstream link, its
// cached output, the border it must deliver and the parameter set that watches its front's fields.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

#include "kernel/Parameter.h"

namespace KERNEL {

class cPixelBlock;
class cFilterComponent;
class cPipe;
class cInput;
class cComposite;
class __cSyntax__;

class __cFilterComponent__ {
public:
    __cFilterComponent__();
    virtual ~__cFilterComponent__();
    __cFilterComponent__(const __cFilterComponent__&) = delete;
    __cFilterComponent__& operator=(const __cFilterComponent__&) = delete;

    virtual cPixelBlock* GetOutput() = 0;
    virtual bool HasChanged() = 0;
    virtual void AcceptChanges() = 0;
    virtual void Invalidate() = 0;
    virtual void InvalidateAndFree() = 0;
    virtual __cSyntax__* Branch(cPipe* x);
    virtual __cFilterComponent__* ChainInto(cPipe* pipe);
    // Walks to the source end; no node does anything on the way.
    virtual void Forward() = 0;
    virtual void ReadParameters(const char* text, const char*& cursor, int32_t& counter) = 0;
    virtual void WriteParameters(char* buffer, size_t capacity, char*& cursor, int32_t& counter) = 0;
    // Upper bound of the text WriteParameters produces from here upstream.
    virtual size_t TextLength() = 0;
    // Builds and stores this node's key (its front's id, then the upstream's key).
    virtual const uint32_t* BuildKey(uint32_t& length) = 0;
    virtual const uint32_t* GetKey(uint32_t& length) = 0;
    virtual void ShareWith(__cFilterComponent__* node) = 0;
    // Returns true when the candidate was taken as an upstream somewhere below.
    virtual bool ShareUpstream(__cFilterComponent__* candidate) = 0;
    virtual int32_t Depth() = 0;
    virtual void SetBorder(int32_t bx, int32_t by) = 0;
    virtual void ResetChain() = 0;

    // Registration, used by the components' BindNode.
    void BindInt(int32_t* field);                     // watched, not in the text
    void BindRaw(void* field, uint32_t size);         // watched, not in the text (2 or 8 bytes)
    void BindSerialisedInt(int32_t* field);           // watched and in the text as "ParameterN"

    VEK_STD::cParameterSet& Parameters() { return *parameters; }
    int32_t BorderX() const { return border[0]; }
    int32_t BorderY() const { return border[1]; }
    cPixelBlock* CachedOutput() const { return output; }

protected:
    void FreeOutput();

    cPixelBlock* output = nullptr;
    int32_t border[2] = {0, 0};
    bool ownsOutput = false;
    std::unique_ptr<VEK_STD::cParameterSet> parameters;
};

class __cPipe__ : public __cFilterComponent__ {
public:
    __cPipe__(cPipe* front, __cFilterComponent__* upstream, bool ownsUpstream = true);
    ~__cPipe__() override;

    cPixelBlock* GetOutput() override;
    bool HasChanged() override;
    void AcceptChanges() override;
    void Invalidate() override;
    void InvalidateAndFree() override;
    void Forward() override;
    void ReadParameters(const char* text, const char*& cursor, int32_t& counter) override;
    void WriteParameters(char* buffer, size_t capacity, char*& cursor, int32_t& counter) override;
    size_t TextLength() override;
    const uint32_t* BuildKey(uint32_t& length) override;
    const uint32_t* GetKey(uint32_t& length) override;
    void ShareWith(__cFilterComponent__* node) override;
    bool ShareUpstream(__cFilterComponent__* candidate) override;
    int32_t Depth() override;
    void SetBorder(int32_t bx, int32_t by) override;
    void ResetChain() override;

    __cFilterComponent__* Upstream() const { return upstream; }
    bool OwnsUpstream() const { return ownsUpstream; }
    cPipe* Front() const { return front; }

private:
    __cFilterComponent__* upstream;
    bool ownsUpstream;
    cPipe* front;
    std::vector<uint32_t> key;
    bool dirty = false;
};

class __cInput__ : public __cFilterComponent__ {
public:
    explicit __cInput__(cInput* front);
    ~__cInput__() override;

    cPixelBlock* GetOutput() override;
    bool HasChanged() override;
    void AcceptChanges() override;
    void Invalidate() override;
    void InvalidateAndFree() override;
    void Forward() override {}
    void ReadParameters(const char* text, const char*& cursor, int32_t& counter) override;
    void WriteParameters(char* buffer, size_t capacity, char*& cursor, int32_t& counter) override;
    size_t TextLength() override;
    const uint32_t* BuildKey(uint32_t& length) override;
    const uint32_t* GetKey(uint32_t& length) override;
    void ShareWith(__cFilterComponent__* node) override;
    bool ShareUpstream(__cFilterComponent__*) override { return false; }
    int32_t Depth() override { return 1; }
    void SetBorder(int32_t bx, int32_t by) override;
    void ResetChain() override {}

    cInput* Front() const { return front; }

protected:
    cInput* front;
    std::vector<uint32_t> key;
    bool dirty = true;
};

// An input node over a composite: a whole chain used as the source of another.
class __cComposite__ : public __cInput__ {
public:
    explicit __cComposite__(cComposite* composite);
    ~__cComposite__() override;

    cPixelBlock* GetOutput() override;
    bool HasChanged() override;
    void AcceptChanges() override;
    void Invalidate() override;
    void InvalidateAndFree() override;
    void SetBorder(int32_t bx, int32_t by) override;
    void ResetChain() override;

private:
    cComposite* composite;
};

}  // namespace KERNEL
