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
// Long enough to cover the gap between two phases of a tile, short against a tile's host copy.
constexpr int kSpins = 1 << 10;

// Unwinds the parts waiting in a barrier after another part failed.
struct cAborted {};

// Spins until ready() or kSpins; true if ready.
template <class F>
bool spinFor(F ready) {
    for (int i = 0; i < kSpins; ++i) {
        if (ready()) return true;
        NOCTIVA_PAUSE();
    }
    return ready();
}
}  // namespace

int cWorkerPool::DefaultThreads() {
    if (const char* env = std::getenv("NOCTIVA_THREADS"); env != nullptr && *env != '\0') {
        const long v = std::strtol(env, nullptr, 10);
        if (v >= 1) return int(std::min(v, 64L));
    }
    const unsigned hw = std::thread::hardware_concurrency();
    return hw == 0 ? 1 : int(std::min(hw, 8u));
}

std::pair<int32_t, int32_t> cWorkerPool::cSection::share(int32_t count) const {
    if (count <= 0) return {0, 0};
    const int64_t b = int64_t(count) * part / parts, e = int64_t(count) * (part + 1) / parts;
    return {int32_t(b), int32_t(e)};
}

void cWorkerPool::cSection::sync() {
    if (parts > 1) pool.barrier();
}

cWorkerPool::cWorkerPool(int threads) {
    threads = std::clamp(threads, 1, 64);
    workers.reserve(size_t(threads - 1));
    try {
        for (int i = 1; i < threads; ++i) workers.emplace_back([this, i] { workerLoop(i); });
    } catch (...) {
        // Fewer workers than asked is still a working pool; workers started so far wait for a
        // generation that counts them.
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

void cWorkerPool::barrier() {
    if (broken.load(std::memory_order_acquire)) throw cAborted{};
    const uint64_t gen = barrierGeneration.load(std::memory_order_acquire);
    if (arrived.fetch_add(1, std::memory_order_acq_rel) + 1 == Threads()) {
        arrived.store(0, std::memory_order_relaxed);
        {
            std::lock_guard<std::mutex> lock(mutex);
            barrierGeneration.fetch_add(1, std::memory_order_acq_rel);
        }
        barrierWake.notify_all();
        return;
    }
    auto released = [&] {
        return barrierGeneration.load(std::memory_order_acquire) != gen || broken.load(std::memory_order_acquire);
    };
    if (!spinFor(released)) {
        std::unique_lock<std::mutex> lock(mutex);
        barrierWake.wait(lock, released);
    }
    if (barrierGeneration.load(std::memory_order_acquire) == gen) throw cAborted{};
}

void cWorkerPool::runPart(int index) {
    try {
        cSection section(*this, index, Threads());
        (*job)(section);
    } catch (const cAborted&) {
    } catch (...) {
        std::lock_guard<std::mutex> lock(mutex);
        if (!failure) failure = std::current_exception();
        broken.store(true, std::memory_order_release);
        barrierWake.notify_all();
    }
}

void cWorkerPool::workerLoop(int index) {
    uint64_t seen = 0;
    for (;;) {
        auto posted = [&] { return generation.load(std::memory_order_acquire) != seen || stopping.load(); };
        if (!spinFor(posted)) {
            std::unique_lock<std::mutex> lock(mutex);
            wake.wait(lock, posted);
        }
        if (stopping.load()) return;
        seen = generation.load(std::memory_order_acquire);
        runPart(index);
        if (pending.fetch_sub(1, std::memory_order_acq_rel) == 1) {
            std::lock_guard<std::mutex> lock(mutex);
            done.notify_one();
        }
    }
}

void cWorkerPool::parallelSection(const Section& fn) {
    if (workers.empty()) {
        cSection section(*this, 0, 1);
        fn(section);
        return;
    }
    failure = nullptr;
    broken.store(false, std::memory_order_relaxed);
    arrived.store(0, std::memory_order_relaxed);
    pending.store(int(workers.size()), std::memory_order_relaxed);
    {
        std::lock_guard<std::mutex> lock(mutex);
        job = &fn;
        generation.fetch_add(1, std::memory_order_acq_rel);
    }
    wake.notify_all();
    runPart(0);
    auto finished = [&] { return pending.load(std::memory_order_acquire) == 0; };
    if (!spinFor(finished)) {
        std::unique_lock<std::mutex> lock(mutex);
        done.wait(lock, finished);
    }
    job = nullptr;
    std::exception_ptr error = failure;
    failure = nullptr;
    if (error) std::rethrow_exception(error);
}

void cWorkerPool::parallelFor(int32_t count, const Job& fn) {
    if (count <= 0) return;
    if (workers.empty() || count == 1) {
        fn(0, 0, count);
        return;
    }
    parallelSection([&](cSection& s) {
        const auto [b, e] = s.share(count);
        if (b < e) fn(s.part, b, e);
    });
}

}  // namespace KERNEL
