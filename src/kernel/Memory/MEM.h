// A lockable buffer of host memory: the storage of every pixel block that owns its pixels.
#pragma once

#include <cstdint>
#include <string>

#include "kernel/Exception.h"

namespace KERNEL {

class cHost;

// Raised when the host refuses memory (allocation or lock); caught at the module's entry.
class cMEMException : public VEK_STD::cMessageException {
public:
    using VEK_STD::cMessageException::cMessageException;
};

// The host that cMEM allocates from; the entry sets it at every dispatch.
void setMemoryHost(cHost* host);
cHost* memoryHost();

class cMEM {
public:
    explicit cMEM(uint32_t size);
    virtual ~cMEM();
    cMEM(const cMEM&) = delete;
    cMEM& operator=(const cMEM&) = delete;

    // Returns null when already locked (a second lock is refused, not counted).
    void* Lock();
    void Unlock();
    bool IsLocked() const { return locked != 0; }
    uint32_t Size() const { return size; }

private:
    void* buffer = nullptr;  // host's buffer-id holder
    uint8_t locked = 0;
    uint32_t size = 0;
};

}  // namespace KERNEL
