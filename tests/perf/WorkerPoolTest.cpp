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
