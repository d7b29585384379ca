#include "kernel/Node.h"

#include <algorithm>

#include "kernel/Component.h"
#include "kernel/Composite.h"
#include "kernel/PixelBlock.h"
#include "kernel/Syntax.h"

namespace KERNEL {

namespace {

void widen(cRect& r, int32_t bx, int32_t by) {
    r.x0 = int16_t(r.x0 - bx);
    r.x1 = int16_t(r.x1 + bx);
    r.y0 = int16_t(r.y0 - by);
    r.y1 = int16_t(r.y1 + by);
}

// Widens two inner rectangles for one Process and narrows them back however it ends.
class cBorderScope {
public:
    cBorderScope(cPixelBlock* a, cPixelBlock* b, int32_t bx, int32_t by) : a(a), b(b), bx(bx), by(by) {
        widen(a->innerRect, bx, by);
        if (b != a) widen(b->innerRect, bx, by);
    }
    ~cBorderScope() {
        widen(a->innerRect, -bx, -by);
        if (b != a) widen(b->innerRect, -bx, -by);
    }
    cBorderScope(const cBorderScope&) = delete;
    cBorderScope& operator=(const cBorderScope&) = delete;

private:
    cPixelBlock* a;
    cPixelBlock* b;
    int32_t bx, by;
};

}  // namespace

// ---- __cFilterComponent__

__cFilterComponent__::__cFilterComponent__() : parameters(std::make_unique<VEK_STD::cParameterSet>()) {}

__cFilterComponent__::~__cFilterComponent__() { FreeOutput(); }

void __cFilterComponent__::FreeOutput() {
    if (ownsOutput) delete output;
    output = nullptr;
    ownsOutput = false;
}

__cSyntax__* __cFilterComponent__::Branch(cPipe* x) { return new __cBranchL__(this, x, false); }

__cFilterComponent__* __cFilterComponent__::ChainInto(cPipe* pipe) { return pipe->CreateNode(this); }

void __cFilterComponent__::BindInt(int32_t* field) { parameters->Add(new VEK_STD::cIntParameter(field, false)); }

void __cFilterComponent__::BindRaw(void* field, uint32_t size) {
    parameters->Add(new VEK_STD::cParameter(field, size, false));
}

void __cFilterComponent__::BindSerialisedInt(int32_t* field) {
    parameters->Add(new VEK_STD::cIntParameter(field, true));
}

// ---- __cPipe__

__cPipe__::__cPipe__(cPipe* front, __cFilterComponent__* upstream, bool ownsUpstream)
    : upstream(upstream), ownsUpstream(ownsUpstream), front(front) {
    front->AddRef();
    front->BindNode(this);
}

__cPipe__::~__cPipe__() {
    // The source end goes first, so a whole chain is deleted through its final node.
    if (ownsUpstream) delete upstream;
    upstream = nullptr;
    FreeOutput();
    front->Release();
}

cPixelBlock* __cPipe__::GetOutput() {
    if (output != nullptr && !(HasChanged() && dirty)) return output;
    FreeOutput();
    cPixelBlock* src = upstream->GetOutput();
    if (src == nullptr) return nullptr;
    if (!front->ProducesOutput()) {
        // Pass-through: hand the upstream's block on, allocate nothing.
        output = src;
        ownsOutput = false;
        dirty = false;
        return output;
    }
    std::unique_ptr<cPixelBlock> out(src->clone());
    out->lock();
    {
        cBorderScope scope(src, out.get(), border[0], border[1]);
        front->Process(src, out.get());
    }
    output = out.release();
    ownsOutput = true;
    dirty = false;
    return output;
}

bool __cPipe__::HasChanged() { return upstream->HasChanged() || parameters->HasChanged(); }

void __cPipe__::AcceptChanges() {
    parameters->AcceptChanges();
    upstream->AcceptChanges();
}

void __cPipe__::Invalidate() {
    dirty = true;
    upstream->Invalidate();
}

void __cPipe__::InvalidateAndFree() {
    dirty = true;
    upstream->InvalidateAndFree();
    FreeOutput();
}

void __cPipe__::Forward() { upstream->Forward(); }

void __cPipe__::ReadParameters(const char* text, const char*& cursor, int32_t& counter) {
    parameters->Read(text, cursor, counter);
    upstream->ReadParameters(text, cursor, counter);
}

void __cPipe__::WriteParameters(char* buffer, size_t capacity, char*& cursor, int32_t& counter) {
    parameters->Write(buffer, capacity, cursor, counter);
    upstream->WriteParameters(buffer, capacity, cursor, counter);
}

size_t __cPipe__::TextLength() { return parameters->TextLength() + upstream->TextLength(); }

const uint32_t* __cPipe__::BuildKey(uint32_t& length) {
    uint32_t upLength = 0;
    const uint32_t* upKey = upstream->BuildKey(upLength);
    key.assign(1, front->Id());
    key.insert(key.end(), upKey, upKey + upLength);
    length = uint32_t(key.size());
    return key.data();
}

const uint32_t* __cPipe__::GetKey(uint32_t& length) {
    length = uint32_t(key.size());
    return key.data();
}

void __cPipe__::ShareWith(__cFilterComponent__* node) {
    node->ShareUpstream(this);
    upstream->ShareWith(node);
}

bool __cPipe__::ShareUpstream(__cFilterComponent__* candidate) {
    // Nothing below this node or its upstream can carry the same key.
    if (candidate == upstream || candidate == this) return false;
    uint32_t candidateLength = 0, upstreamLength = 0;
    const uint32_t* candidateKey = candidate->GetKey(candidateLength);
    const uint32_t* upstreamKey = upstream->GetKey(upstreamLength);
    if (candidateLength != 0 && candidateLength == upstreamLength &&
        std::equal(candidateKey, candidateKey + candidateLength, upstreamKey)) {
        if (ownsUpstream) delete upstream;
        upstream = candidate;
        ownsUpstream = false;
        return true;
    }
    return upstream->ShareUpstream(candidate);
}

int32_t __cPipe__::Depth() { return upstream->Depth() + 1; }

void __cPipe__::SetBorder(int32_t bx, int32_t by) {
    int32_t ox = 0, oy = 0;
    front->GetBorder(ox, oy);
    bx += ox;
    by += oy;
    upstream->SetBorder(bx, by);
    border[0] = bx;
    border[1] = by;
}

void __cPipe__::ResetChain() {
    front->Reset();
    upstream->ResetChain();
}

// ---- __cInput__

__cInput__::__cInput__(cInput* front) : front(front) {
    front->AddRef();
    front->BindNode(this);
}

__cInput__::~__cInput__() {
    FreeOutput();
    front->Release();
}

cPixelBlock* __cInput__::GetOutput() {
    if (!dirty && output != nullptr) return output;
    FreeOutput();
    cPixelBlock* block = front->GetBlock();
    if (block == nullptr) return nullptr;
    output = block->createView();
    ownsOutput = true;
    dirty = false;
    return output;
}

bool __cInput__::HasChanged() { return parameters->HasChanged(); }

void __cInput__::AcceptChanges() { parameters->AcceptChanges(); }

void __cInput__::Invalidate() { dirty = true; }

void __cInput__::InvalidateAndFree() {
    dirty = true;
    FreeOutput();
}

void __cInput__::ReadParameters(const char* text, const char*& cursor, int32_t& counter) {
    parameters->Read(text, cursor, counter);
}

void __cInput__::WriteParameters(char* buffer, size_t capacity, char*& cursor, int32_t& counter) {
    parameters->Write(buffer, capacity, cursor, counter);
}

size_t __cInput__::TextLength() { return parameters->TextLength(); }

const uint32_t* __cInput__::BuildKey(uint32_t& length) {
    key.assign(1, front->Id());
    length = 1;
    return key.data();
}

const uint32_t* __cInput__::GetKey(uint32_t& length) {
    length = uint32_t(key.size());
    return key.data();
}

void __cInput__::ShareWith(__cFilterComponent__* node) { node->ShareUpstream(this); }

void __cInput__::SetBorder(int32_t bx, int32_t by) {
    border[0] = bx;
    border[1] = by;
}

// ---- __cComposite__

__cComposite__::__cComposite__(cComposite* composite) : __cInput__(composite), composite(composite) {
    composite->AddRef();
}

__cComposite__::~__cComposite__() { composite->Release(); }

cPixelBlock* __cComposite__::GetOutput() { return composite->GetOutput(); }

bool __cComposite__::HasChanged() { return composite->HasChanged() || parameters->HasChanged(); }

void __cComposite__::AcceptChanges() {
    parameters->AcceptChanges();
    composite->AcceptChanges();
}

void __cComposite__::Invalidate() {
    dirty = true;
    composite->Invalidate();
}

void __cComposite__::InvalidateAndFree() {
    dirty = true;
    composite->InvalidateAndFree();
}

void __cComposite__::SetBorder(int32_t bx, int32_t by) {
    __cInput__::SetBorder(bx, by);
    composite->SetBorder(bx, by);
}

void __cComposite__::ResetChain() { composite->Reset(); }

}  // namespace KERNEL
