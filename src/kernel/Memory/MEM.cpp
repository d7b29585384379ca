#include "kernel/Memory/MEM.h"

#include "kernel/Host.h"

namespace KERNEL {

namespace {
cHost* g_memoryHost = nullptr;
cHost* g_conversionHost = nullptr;
}  // namespace

void setMemoryHost(cHost* host) { g_memoryHost = host; }
cHost* memoryHost() { return g_memoryHost; }
void setConversionHost(cHost* host) { g_conversionHost = host; }
cHost* conversionHost() { return g_conversionHost; }

cMEM::cMEM(uint32_t bytes) : size(bytes) {
    buffer = g_memoryHost ? g_memoryHost->AllocateBuffer(bytes) : nullptr;
    if (buffer == nullptr) throw cMEMException("could not allocate mem handle", 18, "kernel/Memory");
}

cMEM::~cMEM() {
    Unlock();
    if (buffer != nullptr) {
        g_memoryHost->FreeBuffer(buffer);
        buffer = nullptr;
    }
}

void* cMEM::Lock() {
    if (locked) return nullptr;
    void* address = g_memoryHost->LockBuffer(buffer);
    locked = 1;
    if (address == nullptr && size != 0) throw cMEMException("could not lock handle", 60, "kernel/Memory");
    return address;
}

void cMEM::Unlock() {
    if (buffer != nullptr && locked) {
        locked = 0;
        g_memoryHost->UnlockBuffer(buffer);
    }
}

}  // namespace KERNEL
