// The module's worker pool: every index exactly once, parts bounded by the thread count, phases in
// order, exceptions carried back, and many short sections in a row (the tile loop's pattern)
// without loss or hang.
#include <gtest/gtest.h>

#include <atomic>
#include <stdexcept>
#include <vector>

#include "kernel/WorkerPool.h"

using KERNEL::cWorkerPool;

TEST(WorkerPool, CoversEveryIndexOnceWithPartsPerThread) {
    for (int threads : {1, 2, 3, 7}) {
        cWorkerPool pool(threads);
        EXPECT_EQ(pool.Threads(), threads);
        for (int32_t grain : {1, 3, 8, 1000}) {
            for (int32_t count : {0, 1, 2, 5, 7, 8, 100, 1001}) {
                std::vector<std::atomic<int>> hits(static_cast<size_t>(count));
                std::atomic<int> badPart{0}, badRange{0};
                pool.parallelFor(
                    count,
                    [&](int part, int32_t b, int32_t e) {
                        if (part < 0 || part >= threads) ++badPart;
                        if (b < 0 || e > count || e <= b || e - b > grain) ++badRange;
                        for (int32_t i = b; i < e; ++i) ++hits[size_t(i)];
                    },
                    grain);
                EXPECT_EQ(badPart.load(), 0);
                EXPECT_EQ(badRange.load(), 0) << threads << " " << grain << " " << count;
                for (int32_t i = 0; i < count; ++i)
                    ASSERT_EQ(hits[size_t(i)].load(), 1) << threads << " " << grain << " " << count << " " << i;
            }
        }
    }
}

TEST(WorkerPool, ManyShortJobsInARow) {
    cWorkerPool pool(3);
    std::atomic<long> sum{0};
    for (int job = 0; job < 2000; ++job)
        pool.parallelFor(6, [&](int, int32_t b, int32_t e) { sum += e - b; });
    EXPECT_EQ(sum.load(), 6L * 2000);
}

// A phase starts only after every grain of the one before it is done, whoever did them, over many
// sections in a row and for thread counts above the core count.
TEST(WorkerPool, PhasesRunInOrder) {
    for (int threads : {1, 2, 3, 7}) {
        cWorkerPool pool(threads);
        constexpr int32_t kCount = 40;
        std::atomic<int> wrong{0};
        for (int section = 0; section < 300; ++section) {
            std::vector<std::atomic<int>> stage(kCount);
            pool.parallelSection([&](cWorkerPool::cSection& s) {
                for (int phase = 1; phase <= 3; ++phase) {
                    s.phase(kCount, phase, [&](int, int32_t b, int32_t e) {
                        // Every item must have finished the previous phase.
                        for (int32_t i = 0; i < kCount; ++i)
                            if (stage[size_t(i)].load() < phase - 1) ++wrong;
                        for (int32_t i = b; i < e; ++i) stage[size_t(i)].store(phase);
                    });
                }
            });
            for (int32_t i = 0; i < kCount; ++i) ASSERT_EQ(stage[size_t(i)].load(), 3);
        }
        EXPECT_EQ(wrong.load(), 0) << threads << " threads";
    }
}

// A failing grain: the caller gets its exception after the section emptied, later phases never
// start, no grain runs twice, and the pool stays usable.
TEST(WorkerPool, AFailureEndsTheSectionAndReachesTheCaller) {
    for (int threads : {1, 2, 3}) {
        cWorkerPool pool(threads);
        std::vector<std::atomic<int>> hits(100);
        std::atomic<int> laterPhase{0};
        EXPECT_THROW(pool.parallelSection([&](cWorkerPool::cSection& s) {
            s.phase(100, 1, [&](int, int32_t b, int32_t) {
                ++hits[size_t(b)];
                if (b == 37) throw std::runtime_error("grain fails");
            });
            s.phase(10, 1, [&](int, int32_t, int32_t) { ++laterPhase; });
        }),
                     std::runtime_error);
        EXPECT_EQ(laterPhase.load(), 0);
        for (auto& h : hits) EXPECT_LE(h.load(), 1);
        std::atomic<int> n{0};
        pool.parallelFor(9, [&](int, int32_t b, int32_t e) { n += e - b; });
        EXPECT_EQ(n.load(), 9);
    }
}

// A last phase that does not wait still has all its grains done when the section returns.
TEST(WorkerPool, ALastPhaseWithoutWaitIsDoneWhenTheSectionReturns) {
    for (int threads : {2, 3, 7}) {
        cWorkerPool pool(threads);
        for (int section = 0; section < 200; ++section) {
            std::vector<std::atomic<int>> hits(64);
            pool.parallelSection([&](cWorkerPool::cSection& s) {
                s.phase(64, 1, [&](int, int32_t b, int32_t) { ++hits[size_t(b)]; });
                s.phase(64, 3, [&](int, int32_t b, int32_t e) {
                    for (int32_t i = b; i < e; ++i) ++hits[size_t(i)];
                }, false);
            });
            for (auto& h : hits) ASSERT_EQ(h.load(), 2) << threads << " threads";
        }
    }
}
