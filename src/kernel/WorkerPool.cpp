#include "kernel/WorkerPool.h"

#include <algorithm>
#include <cstdlib>

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>
#define NOCTIVA_PAUSE() _mm_pause()
#else
#define NOCTIVA_PAUSE() ((void)0)
#endif

namespace KERNEL {

namespace {
// Part `i` of `parts` over [0, count): sizes differ by at most one.
std::pair<int32_t, int32_t> part(int32_t count, int parts, int i) {
    const int64_t b = int64_t(count) * i / parts, e = int64_t(count) * (i + 1) / parts;
    return {int32_t(b), int32_t(e)};
}
constexpr int kSpins = 1 << 14;
}  // namespace

int cWorkerPool::DefaultThreads() {
    if (const char* env = std::getenv("NOCTIVA_THREADS"); env != nullptr && *env != '\0') {
        const long v = std::strtol(env, nullptr, 10);
        if (v >= 1) return int(std::min(v, 64L));
    }
    const unsigned hw = std::thread::hardware_concurrency();
    return hw == 0 ? 1 : int(std::min(hw, 8u));
}

cWorkerPool::cWorkerPool(int threads) {
    threads = std::clamp(threads, 1, 64);
    workers.reserve(size_t(threads - 1));
    try {
        for (int i = 1; i < threads; ++i) workers.emplace_back([this, i] { workerLoop(i); });
    } catch (...) {
        // Fewer workers than asked is still a working pool.
    }
}

cWorkerPool::~cWorkerPool() {
    {
        std::lock_guard<std::mutex> lock(mutex);
        stopping = true;
    }
    wake.notify_all();
    for (std::thread& t : workers) t.join();
}

void cWorkerPool::workerLoop(int index) {
    uint64_t seen = 0;
    for (;;) {
        int spins = 0;
        while (generation.load(std::memory_order_acquire) == seen && !stopping.load(std::memory_order_relaxed) &&
               spins < kSpins) {
            NOCTIVA_PAUSE();
            ++spins;
        }
        if (generation.load(std::memory_order_acquire) == seen && !stopping.load()) {
            std::unique_lock<std::mutex> lock(mutex);
            sleepers.fetch_add(1);
            wake.wait(lock, [&] { return stopping.load() || generation.load() != seen; });
            sleepers.fetch_sub(1);
        }
        if (stopping.load()) return;
        seen = generation.load(std::memory_order_acquire);
        std::exception_ptr error;
        try {
            const auto [b, e] = part(jobCount, Threads(), index);
            if (b < e) (*job)(index, b, e);
        } catch (...) {
            error = std::current_exception();
        }
        if (error) {
            std::lock_guard<std::mutex> lock(mutex);
            if (!failure) failure = error;
        }
        pending.fetch_sub(1, std::memory_order_acq_rel);
    }
}

void cWorkerPool::parallelFor(int32_t count, const Job& fn) {
    if (count <= 0) return;
    if (workers.empty() || count == 1) {
        fn(0, 0, count);
        return;
    }
    job = &fn;
    jobCount = count;
    failure = nullptr;
    pending.store(int(workers.size()), std::memory_order_relaxed);
    generation.fetch_add(1);  // publishes job and count to the spinning workers
    if (sleepers.load() > 0) {
        std::lock_guard<std::mutex> lock(mutex);
        wake.notify_all();
    }
    std::exception_ptr error;
    try {
        const auto [b, e] = part(count, Threads(), 0);
        if (b < e) fn(0, b, e);
    } catch (...) {
        error = std::current_exception();
    }
    // More threads than cores: let a descheduled worker run instead of spinning against it.
    for (int spins = 0; pending.load(std::memory_order_acquire) != 0; ++spins) {
        if (spins < 4096)
            NOCTIVA_PAUSE();
        else
            std::this_thread::yield();
    }
    job = nullptr;
    if (!error) error = failure;
    failure = nullptr;
    if (error) std::rethrow_exception(error);
}

}  // namespace KERNEL
