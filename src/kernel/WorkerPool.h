// A small pool of worker threads owned by the module for the duration of a run. The host calls us
// from one thread; a parallel section runs on that thread and on every worker that wakes in time,
// and returns when its work is done and no worker is left inside, so no pixel work outlives the
// call that started it.
//
// Work is claimed in grains: the calling thread alone can finish a section, so a worker that the
// machine does not schedule delays nothing but the grain it holds (no barrier waits for a thread
// that has not started).
#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <exception>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace KERNEL {

class cWorkerPool {
public:
    // `threads` counts the calling thread: 1 runs everything inline and starts no worker.
    explicit cWorkerPool(int threads);
    ~cWorkerPool();
    cWorkerPool(const cWorkerPool&) = delete;
    cWorkerPool& operator=(const cWorkerPool&) = delete;

    int Threads() const { return int(workers.size()) + 1; }

    static constexpr int kMaxPhases = 8;

    // One thread's view of a parallel section.
    class cSection {
    public:
        const int part;  // 0 is the calling thread; < Threads(), so it can index per-thread scratch

        // The section's next phase (every participant calls the same phases in the same order,
        // with the same count and grain): calls body(part, begin, end) on the grains of
        // [0, count) this thread claims, then waits until every grain of the phase is done.
        // The section's last phase need not wait (`wait` false): the section ends when every
        // participant has left, so after every grain.
        template <class F>
        void phase(int32_t count, int32_t grain, const F& body, bool wait = true) {
            const int k = next++;
            const int32_t g = grain < 1 ? 1 : grain;
            for (;;) {
                const int32_t b = pool.claim(k, g);
                if (b >= count) break;
                const int32_t e = count - b < g ? count : b + g;
                body(part, b, e);
                pool.complete(k, e - b, count);
            }
            if (wait) pool.awaitPhase(k, count);
        }

    private:
        friend class cWorkerPool;
        cSection(cWorkerPool& pool, int part) : part(part), pool(pool) {}
        cWorkerPool& pool;
        int next = 0;
    };

    // Runs fn on the calling thread and on the workers that join. An exception in any participant
    // is rethrown here once the section has emptied; the others leave at their next grain.
    using Section = std::function<void(cSection&)>;
    void parallelSection(const Section& fn);

    // One phase: fn(part, begin, end) over grains of [0, count).
    using Job = std::function<void(int, int32_t, int32_t)>;
    void parallelFor(int32_t count, const Job& fn, int32_t grain = 1);

    // NOCTIVA_THREADS if set (1 .. 64), else the machine's hardware threads (at most 8).
    static int DefaultThreads();

private:
    void workerLoop(int index);
    void runPart(int index);
    int32_t claim(int phase, int32_t grain);
    void complete(int phase, int32_t items, int32_t count);
    void awaitPhase(int phase, int32_t count);

    struct alignas(64) cPhase {
        std::atomic<int32_t> next{0};
        std::atomic<int32_t> done{0};
    };

    std::vector<std::thread> workers;
    // Every wait spins briefly, then blocks: on a loaded machine a spinning thread takes the core
    // from the thread it waits for.
    std::mutex mutex;
    std::condition_variable wake;       // workers: a new section or stop
    std::condition_variable left;       // caller: the last participant left
    std::condition_variable phaseDone;  // participants waiting for a phase's last grain
    const Section* job = nullptr;
    bool open = false;  // under `mutex`: workers may still join the current section
    std::atomic<uint64_t> generation{0};
    std::atomic<int> active{0};
    std::atomic<bool> stopping{false};
    std::atomic<bool> broken{false};
    cPhase phases[kMaxPhases];
    std::exception_ptr failure;
};

}  // namespace KERNEL
