// A small pool of worker threads owned by the module for the duration of a run. The host calls us
// from one thread; a parallel section runs on that thread and every worker and returns when every
// part is done, so no pixel work outlives the call that started it.
#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <exception>
#include <functional>
#include <mutex>
#include <thread>
#include <utility>
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

    // One participant of a parallel section.
    class cSection {
    public:
        const int part;   // 0 is the calling thread; < Threads(), so it can index per-thread scratch
        const int parts;  // Threads()
        // This part's share of [0, count): consecutive, disjoint, sizes differ by at most one.
        std::pair<int32_t, int32_t> share(int32_t count) const;
        // Waits until every part has called sync() as often as this one (a barrier).
        void sync();

    private:
        friend class cWorkerPool;
        cSection(cWorkerPool& pool, int part, int parts) : part(part), parts(parts), pool(pool) {}
        cWorkerPool& pool;
    };

    // Runs fn once per thread. An exception in any part is rethrown here after all parts ended;
    // parts waiting in sync() then leave the section.
    using Section = std::function<void(cSection&)>;
    void parallelSection(const Section& fn);

    // Calls fn(part, begin, end) on the shares of [0, count) and waits for all of them.
    using Job = std::function<void(int, int32_t, int32_t)>;
    void parallelFor(int32_t count, const Job& fn);

    // NOCTIVA_THREADS if set (1 .. 64), else the machine's hardware threads (at most 8).
    static int DefaultThreads();

private:
    void workerLoop(int index);
    void runPart(int index);
    void barrier();

    std::vector<std::thread> workers;
    // Every wait spins briefly, then blocks: on a loaded machine a spinning thread takes the core
    // from the thread it waits for.
    std::mutex mutex;
    std::condition_variable wake;         // workers: a new section or stop
    std::condition_variable done;         // caller: the last worker finished
    std::condition_variable barrierWake;  // parts in sync()
    const Section* job = nullptr;
    std::atomic<uint64_t> generation{0};
    std::atomic<int> pending{0};
    std::atomic<bool> stopping{false};
    std::atomic<int> arrived{0};
    std::atomic<uint64_t> barrierGeneration{0};
    std::atomic<bool> broken{false};
    std::exception_ptr failure;
};

}  // namespace KERNEL
