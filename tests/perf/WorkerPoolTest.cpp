// The module's worker pool: every index exactly once, parts bounded by the thread count, exceptions
// carried back, and many short jobs in a row (the tile loop's pattern) without loss or hang.
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
        for (int32_t count : {0, 1, 2, 5, 7, 8, 100, 1001}) {
            std::vector<std::atomic<int>> hits(static_cast<size_t>(count));
            std::atomic<int> badPart{0};
            pool.parallelFor(count, [&](int part, int32_t b, int32_t e) {
                if (part < 0 || part >= threads) ++badPart;
                for (int32_t i = b; i < e; ++i) ++hits[size_t(i)];
            });
            EXPECT_EQ(badPart.load(), 0);
            for (int32_t i = 0; i < count; ++i) ASSERT_EQ(hits[size_t(i)].load(), 1) << threads << " " << count << " " << i;
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

TEST(WorkerPool, AnExceptionInAnyPartReachesTheCallerAfterAllParts) {
    cWorkerPool pool(3);
    std::atomic<int> finished{0};
    EXPECT_THROW(pool.parallelFor(3,
                                  [&](int part, int32_t, int32_t) {
                                      if (part == 2) throw std::runtime_error("part 2");
                                      ++finished;
                                  }),
                 std::runtime_error);
    EXPECT_EQ(finished.load(), 2);
    // The pool stays usable.
    std::atomic<int> n{0};
    pool.parallelFor(9, [&](int, int32_t b, int32_t e) { n += e - b; });
    EXPECT_EQ(n.load(), 9);
}

// A section's barrier: no part starts phase k + 1 before every part finished phase k, over many
// sections in a row (one per tile) and for thread counts above the core count.
TEST(WorkerPool, SectionBarrierSeparatesPhases) {
    for (int threads : {1, 2, 3, 7}) {
        cWorkerPool pool(threads);
        std::vector<int> slots(size_t(threads), 0);
        std::atomic<int> wrong{0};
        for (int section = 0; section < 300; ++section) {
            pool.parallelSection([&](cWorkerPool::cSection& s) {
                EXPECT_EQ(s.parts, threads);
                for (int phase = 1; phase <= 3; ++phase) {
                    slots[size_t(s.part)] = phase;
                    s.sync();
                    for (int other : slots)
                        if (other != phase) ++wrong;
                    s.sync();
                }
            });
        }
        EXPECT_EQ(wrong.load(), 0) << threads << " threads";
    }
}

TEST(WorkerPool, SharesCoverTheRangeInOrder) {
    cWorkerPool pool(3);
    for (int32_t count : {0, 1, 2, 3, 4, 200, 201}) {
        std::vector<std::pair<int32_t, int32_t>> shares(3);
        pool.parallelSection([&](cWorkerPool::cSection& s) { shares[size_t(s.part)] = s.share(count); });
        int32_t next = 0;
        for (const auto& [b, e] : shares) {
            EXPECT_EQ(b, next) << count;
            EXPECT_LE(e - b, count / 3 + 1) << count;
            next = e;
        }
        EXPECT_EQ(next, count);
    }
}

// A part that throws while the others wait in the barrier: they leave, the caller gets the error,
// and the pool stays usable.
TEST(WorkerPool, AFailureReleasesPartsWaitingInTheBarrier) {
    for (int thrower : {0, 1, 2}) {
        cWorkerPool pool(3);
        std::atomic<int> afterBarrier{0};
        EXPECT_THROW(pool.parallelSection([&](cWorkerPool::cSection& s) {
            if (s.part == thrower) throw std::runtime_error("part fails");
            s.sync();
            ++afterBarrier;
        }),
                     std::runtime_error);
        EXPECT_EQ(afterBarrier.load(), 0) << "thrower " << thrower;
        std::atomic<int> n{0};
        pool.parallelSection([&](cWorkerPool::cSection& s) {
            s.sync();
            ++n;
        });
        EXPECT_EQ(n.load(), 3);
    }
}
