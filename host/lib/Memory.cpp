#include "Memory.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <new>

namespace noctiva::host {

namespace {
// Zero-sized requests still get a real address: callers test the address for failure.
std::unique_ptr<char[]> freshStorage(std::size_t size) {
    const std::size_t n = std::max<std::size_t>(size, 1);
    std::unique_ptr<char[]> p(new (std::nothrow) char[n]);
    if (p) std::memset(p.get(), kFreshFill, n);
    return p;
}

constexpr std::int64_t kUncappedSpace = std::int64_t(1) << 30;
}  // namespace

pi::Handle HandleTable::allocate(std::int32_t size, bool hostOwned) {
    // The failure switch targets the module's requests, not the host's own descriptors.
    if (!hostOwned && ++allocations == failAllocationAt) return nullptr;
    if (size < 0) return nullptr;
    Entry e;
    e.data = freshStorage(std::size_t(size));
    e.master.reset(new (std::nothrow) char*(nullptr));
    if (!e.data || !e.master) return nullptr;
    *e.master = e.data.get();
    e.size = std::size_t(size);
    e.hostOwned = hostOwned;
    pi::Handle h = e.master.get();
    entries_.emplace(h, std::move(e));
    return h;
}

bool HandleTable::dispose(pi::Handle h) { return entries_.erase(h) != 0; }

std::int32_t HandleTable::size(pi::Handle h) const {
    auto it = entries_.find(h);
    return it == entries_.end() ? 0 : std::int32_t(it->second.size);
}

pi::OSErr HandleTable::resize(pi::Handle h, std::int32_t newSize) {
    auto it = entries_.find(h);
    if (it == entries_.end()) return pi::nilHandleErr;
    if (newSize < 0) return pi::paramErr;
    auto data = freshStorage(std::size_t(newSize));
    if (!data) return pi::memFullErr;
    Entry& e = it->second;
    std::memcpy(data.get(), e.data.get(), std::min(e.size, std::size_t(newSize)));
    e.data = std::move(data);
    e.size = std::size_t(newSize);
    *e.master = e.data.get();
    return pi::noErr;
}

pi::Ptr HandleTable::lock(pi::Handle h) {
    auto it = entries_.find(h);
    if (it == entries_.end()) return nullptr;
    it->second.locked = true;
    return *it->second.master;
}

bool HandleTable::unlock(pi::Handle h) {
    auto it = entries_.find(h);
    if (it == entries_.end()) return false;
    it->second.locked = false;  // not reference-counted
    return true;
}

void HandleTable::setHostOwned(pi::Handle h) {
    auto it = entries_.find(h);
    if (it != entries_.end()) it->second.hostOwned = true;
}

long HandleTable::relocateUnlocked() {
    quarantine_.clear();
    long moved = 0;
    for (auto& [h, e] : entries_) {
        if (e.locked) continue;
        auto data = freshStorage(e.size);
        if (!data) continue;  // no room to move: staying put is always allowed
        std::memcpy(data.get(), e.data.get(), e.size);
        std::memset(e.data.get(), kMovedFill, std::max<std::size_t>(e.size, 1));
        quarantine_.push_back(std::move(e.data));
        e.data = std::move(data);
        *e.master = e.data.get();
        ++moved;
    }
    return moved;
}

int HandleTable::moduleOwnedCount() const {
    return int(std::count_if(entries_.begin(), entries_.end(), [](const auto& kv) { return !kv.second.hostOwned; }));
}

std::size_t HandleTable::moduleOwnedBytes() const {
    std::size_t bytes = 0;
    for (const auto& [h, e] : entries_)
        if (!e.hostOwned) bytes += e.size;
    return bytes;
}

void HandleTable::releaseAll() {
    entries_.clear();
    quarantine_.clear();
}

pi::OSErr BufferPool::allocate(std::int64_t size, pi::BufferID* id) {
    if (!id) return pi::paramErr;
    *id = nullptr;
    ++allocations;
    if (size < 0) return pi::paramErr;
    if (failAllocationAt > 0 && allocations == failAllocationAt) return pi::memFullErr;
    const auto bytes = std::uint64_t(size);
    if (cap && (liveBytes_ > *cap || bytes > *cap - liveBytes_)) return pi::memFullErr;
    auto buffer = std::make_unique<Buffer>();
    buffer->data = freshStorage(std::size_t(bytes));
    if (!buffer->data) return pi::memFullErr;
    buffer->size = std::size_t(bytes);
    auto key = reinterpret_cast<pi::BufferID>(buffer.get());
    liveBytes_ += buffer->size;
    buffers_.emplace(key, std::move(buffer));
    *id = key;
    return pi::noErr;
}

pi::Ptr BufferPool::lock(pi::BufferID id) {
    ++locks;
    if (failLockAt > 0 && locks == failLockAt) return nullptr;
    auto it = buffers_.find(id);
    if (it == buffers_.end()) return nullptr;
    ++it->second->lockCount;
    return it->second->data.get();
}

bool BufferPool::unlock(pi::BufferID id) {
    auto it = buffers_.find(id);
    if (it == buffers_.end()) return false;
    if (it->second->lockCount > 0) --it->second->lockCount;
    return true;
}

bool BufferPool::release(pi::BufferID id) {
    auto it = buffers_.find(id);
    if (it == buffers_.end()) return false;
    liveBytes_ -= it->second->size;
    buffers_.erase(it);
    return true;
}

std::int64_t BufferPool::space() const {
    if (!cap) return kUncappedSpace;
    return *cap > liveBytes_ ? std::int64_t(*cap - liveBytes_) : 0;
}

void BufferPool::releaseAll() {
    buffers_.clear();
    liveBytes_ = 0;
}

}  // namespace noctiva::host
