// A small pool of worker threads owned by the module for the duration of a run. The host calls us
// from one thread; a parallel section splits an index range over that thread and the workers and
// returns when every part is done, so no pixel work outlives the call that started it.
#pragma once

#include <atomic>
#include <condition_variable>
#include <exception>
#include <cstdint>
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

    // Calls fn(part, begin, end) on disjoint consecutive parts of [0, count), one part per thread
    // (part < Threads(), so it can index per-thread scratch), and waits for all of them. An
    // exception in any part is rethrown here after all parts finished.
    using Job = std::function<void(int, int32_t, int32_t)>;
    void parallelFor(int32_t count, const Job& fn);

    // NOCTIVA_THREADS if set (1 .. 64), else the machine's hardware threads (at most 8).
    static int DefaultThreads();

private:
    void workerLoop(int index);

    std::vector<std::thread> workers;
    std::mutex mutex;
    std::condition_variable wake;
    const Job* job = nullptr;
    int32_t jobCount = 0;
    // Workers spin briefly on `generation` before they sleep: a tile posts a few short jobs in a
    // row, and a condition-variable wake per job would cost more than the job.
    std::atomic<uint64_t> generation{0};
    std::atomic<int> pending{0};
    std::atomic<int> sleepers{0};
    std::atomic<bool> stopping{false};
    std::exception_ptr failure;
};

}  // namespace KERNEL
