// Front components of the processing graph: reference-counted objects that process one block into
// another and declare which of their fields are parameters. Runtime nodes (Node.h) are built over them.
#pragma once

#include <cstdint>

namespace KERNEL {

class cPixelBlock;
class __cFilterComponent__;
class __cSyntax__;

class cFilterComponent {
public:
    cFilterComponent();
    virtual ~cFilterComponent() = default;
    cFilterComponent(const cFilterComponent&) = delete;
    cFilterComponent& operator=(const cFilterComponent&) = delete;

    // Registers the component's parameter fields in the node's parameter set.
    virtual void BindNode(__cFilterComponent__* node) = 0;
    // Margin in pixels this stage needs around the area it must deliver (added to bx, by).
    virtual void GetBorder(int32_t& bx, int32_t& by) = 0;
    virtual void Reset() = 0;
    virtual bool ProducesOutput() { return true; }
    // Deletes this when the last reference goes.
    void Release();
    void AddRef() { ++refCount; }

    int32_t RefCount() const { return refCount; }
    uint32_t Id() const { return id; }
    // Ids come from a module-wide counter, one per constructed component.
    static uint32_t NextId();

protected:
    int32_t refCount = 0;
    uint32_t id;
};

// A stage that consumes its upstream's block.
class cPipe : public cFilterComponent {
public:
    virtual void Process(cPixelBlock* src, cPixelBlock* dst) = 0;
    // Starts a chain expression: this pipe last, `previous` before it.
    virtual __cSyntax__* Chain(cPipe* previous);
    __cFilterComponent__* NewNode(__cFilterComponent__* upstream) { return CreateNode(upstream); }
    // A node over this pipe; it owns `upstream`.
    virtual __cFilterComponent__* CreateNode(__cFilterComponent__* upstream);
};

// The source side of a chain.
class cInput : public cFilterComponent {
public:
    __cFilterComponent__* NewNode() { return CreateNode(); }
    // The pipe's node over a new input node of this source.
    __cFilterComponent__* ChainInto(cPipe* pipe);
    __cSyntax__* Branch(cPipe* pipe);
    virtual cPixelBlock* GetBlock() = 0;
    virtual __cFilterComponent__* CreateNode() = 0;
};

}  // namespace KERNEL
