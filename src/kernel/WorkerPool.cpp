#include "kernel/WorkerPool.h"

#include "kernel/StageTimer.h"

#include <algorithm>
#include <cstdlib>
#include <stdexcept>

#if defined(__linux__)
#include <pthread.h>
#include <sched.h>
#endif

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>
#define NOCTIVA_PAUSE() _mm_pause()
#else
#define NOCTIVA_PAUSE() ((void)0)
#endif

namespace KERNEL {

namespace {
// Long enough to cover the gap between two phases of a tile; longer spins measured slower here (a
// spinning thread competes with the one it waits for).
constexpr int kSpins = 1 << 8;

// Unwinds the participants after another one failed.
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

int32_t cWorkerPool::claim(int phase, int32_t grain) {
    if (phase >= kMaxPhases) throw std::logic_error("worker pool: too many phases in one section");
    if (broken.load(std::memory_order_acquire)) throw cAborted{};
    return phases[phase].next.fetch_add(grain, std::memory_order_relaxed);
}

void cWorkerPool::complete(int phase, int32_t items, int32_t count) {
    if (phases[phase].done.fetch_add(items, std::memory_order_acq_rel) + items == count) {
        std::lock_guard<std::mutex> lock(mutex);
        phaseDone.notify_all();
    }
}

void cWorkerPool::awaitPhase(int phase, int32_t count) {
    auto finished = [&] {
        return phases[phase].done.load(std::memory_order_acquire) >= count || broken.load(std::memory_order_acquire);
    };
    if (!spinFor(finished)) {
        std::unique_lock<std::mutex> lock(mutex);
        phaseDone.wait(lock, finished);
    }
    if (phases[phase].done.load(std::memory_order_acquire) < count) throw cAborted{};
}

void cWorkerPool::runPart(int index) {
    try {
        cSection section(*this, index);
        (*job)(section);
    } catch (const cAborted&) {
    } catch (...) {
        std::lock_guard<std::mutex> lock(mutex);
        if (!failure) failure = std::current_exception();
        broken.store(true, std::memory_order_release);
        phaseDone.notify_all();
    }
}

void cWorkerPool::workerLoop(int index) {
#if defined(__linux__)
    // A woken worker must not preempt the thread that woke it (the host's thread, which runs its
    // own share of the section): batch threads get no wake-up preference. Failure leaves the
    // default policy.
    sched_param param{};
    param.sched_priority = 0;
    pthread_setschedparam(pthread_self(), SCHED_BATCH, &param);
#endif
    uint64_t seen = 0;
    for (;;) {
        auto posted = [&] { return generation.load(std::memory_order_acquire) != seen || stopping.load(); };
        if (!spinFor(posted)) {
            std::unique_lock<std::mutex> lock(mutex);
            wake.wait(lock, posted);
        }
        bool joined = false;
        {
            std::lock_guard<std::mutex> lock(mutex);
            if (stopping.load()) return;
            seen = generation.load(std::memory_order_acquire);
            if (open) {
                joined = true;
                active.fetch_add(1, std::memory_order_relaxed);
            }
        }
        if (!joined) continue;
        runPart(index);
        if (active.fetch_sub(1, std::memory_order_acq_rel) == 1) {
            std::lock_guard<std::mutex> lock(mutex);
            left.notify_one();
        }
    }
}

void cWorkerPool::parallelSection(const Section& fn) {
    for (cPhase& p : phases) {
        p.next.store(0, std::memory_order_relaxed);
        p.done.store(0, std::memory_order_relaxed);
    }
    broken.store(false, std::memory_order_relaxed);
    failure = nullptr;
    if (workers.empty()) {
        job = &fn;
        runPart(0);
    } else {
        {
            timing::cStageClock clock(timing::kPoolWake);
            {
                std::lock_guard<std::mutex> lock(mutex);
                job = &fn;
                open = true;
                generation.fetch_add(1, std::memory_order_acq_rel);
            }
            wake.notify_all();
        }
        runPart(0);
        timing::cStageClock clock(timing::kPoolEnd);
        {
            std::lock_guard<std::mutex> lock(mutex);
            open = false;
        }
        auto empty = [&] { return active.load(std::memory_order_acquire) == 0; };
        if (!spinFor(empty)) {
            std::unique_lock<std::mutex> lock(mutex);
            left.wait(lock, empty);
        }
    }
    job = nullptr;
    std::exception_ptr error = failure;
    failure = nullptr;
    if (error) std::rethrow_exception(error);
}

void cWorkerPool::parallelFor(int32_t count, const Job& fn, int32_t grain) {
    if (count <= 0) return;
    parallelSection([&](cSection& s) { s.phase(count, grain, fn, false); });
}

}  // namespace KERNEL
