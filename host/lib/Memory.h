// The host's memory as a filter sees it: relocatable handles (master pointers) and lockable
// buffers, with the switches the tests use to provoke failures.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <unordered_map>
#include <vector>

#include "hostapi/HostInterface.h"

namespace noctiva::host {

// Fresh storage is filled with this byte so a module that relies on zeroed memory shows it.
constexpr unsigned char kFreshFill = 0xA5;
// Storage a handle moved away from is overwritten with this before it is released.
constexpr unsigned char kMovedFill = 0xDD;

class HandleTable {
public:
    // Null when out of memory, when `size` is negative, or when the failure switch says so.
    pi::Handle allocate(std::int32_t size, bool hostOwned = false);
    bool dispose(pi::Handle h);  // false for a handle we never gave out
    bool contains(pi::Handle h) const { return entries_.count(h) != 0; }
    std::int32_t size(pi::Handle h) const;
    pi::OSErr resize(pi::Handle h, std::int32_t size);
    pi::Ptr lock(pi::Handle h);
    bool unlock(pi::Handle h);
    void setHostOwned(pi::Handle h);

    // Moves every unlocked handle to new storage; the old storage is poisoned and kept until the
    // next move so stale pointers read the poison rather than recycled memory. Returns the count.
    long relocateUnlocked();

    int moduleOwnedCount() const;
    std::size_t moduleOwnedBytes() const;
    void releaseAll();

    int failAllocationAt = 0;  // 1-based, counting the module's allocations only
    long allocations = 0;

private:
    struct Entry {
        std::unique_ptr<char*> master;
        std::unique_ptr<char[]> data;
        std::size_t size = 0;
        bool locked = false;
        bool hostOwned = false;
    };
    std::unordered_map<pi::Handle, Entry> entries_;
    std::vector<std::unique_ptr<char[]>> quarantine_;
};

class BufferPool {
public:
    pi::OSErr allocate(std::int64_t size, pi::BufferID* id);
    pi::Ptr lock(pi::BufferID id);
    bool unlock(pi::BufferID id);
    bool release(pi::BufferID id);  // false for an unknown id
    std::int64_t space() const;

    int liveCount() const { return int(buffers_.size()); }
    std::size_t liveBytes() const { return liveBytes_; }
    void releaseAll();

    std::optional<std::size_t> cap;
    int failAllocationAt = 0;  // 1-based
    int failLockAt = 0;        // 1-based
    long allocations = 0;
    long locks = 0;

private:
    struct Buffer {
        std::unique_ptr<char[]> data;
        std::size_t size = 0;
        int lockCount = 0;
    };
    std::unordered_map<pi::BufferID, std::unique_ptr<Buffer>> buffers_;
    std::size_t liveBytes_ = 0;
};

}  // namespace noctiva::host
