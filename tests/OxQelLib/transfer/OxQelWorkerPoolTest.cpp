#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <set>

#include "OxQelLib/transfer/OxQelWorkerPool.h"

namespace {
TEST(WorkerPoolTest, EveryQueuedTaskRunsBeforeStopReturns) {
    std::atomic<int> ran{0};
    {
        OxQelWorkerPool pool(2);
        for (int i = 0; i < 200; ++i)
            pool.enqueue([&](int) {
                std::this_thread::sleep_for(std::chrono::microseconds(50));
                ++ran;
            });
        pool.stop();
        EXPECT_EQ(ran.load(), 200);
        pool.stop();  // a second stop is harmless
    }
    EXPECT_EQ(ran.load(), 200);
}

TEST(WorkerPoolTest, ResultsAndWorkerNumbers) {
    OxQelWorkerPool pool(3);
    std::vector<std::future<int>> results;
    for (int i = 0; i < 50; ++i)
        results.push_back(pool.enqueue([i](int worker) {
            EXPECT_GE(worker, 0);
            EXPECT_LT(worker, 3);
            return i * i;
        }));
    for (int i = 0; i < 50; ++i) EXPECT_EQ(results[static_cast<size_t>(i)].get(), i * i);
}

TEST(WorkerPoolTest, OneWorkerRunsInQueueOrder) {
    OxQelWorkerPool pool(1);
    std::vector<int> order;
    for (int i = 0; i < 20; ++i) pool.enqueue([&order, i](int) { order.push_back(i); });
    pool.stop();
    for (int i = 0; i < 20; ++i) EXPECT_EQ(order[static_cast<size_t>(i)], i);
}

TEST(WorkerPoolTest, NoThreadsStillGivesAWorker) {
    OxQelWorkerPool pool(0);
    EXPECT_EQ(pool.size(), 1u);
    EXPECT_EQ(pool.enqueue([](int) { return 7; }).get(), 7);
    EXPECT_GE(OxQelWorkerPool::hardwareThreads(), 1u);
}

TEST(WorkerPoolTest, ExceptionsReachTheResultNotTheWorker) {
    OxQelWorkerPool pool(2);
    auto failing = pool.enqueue([](int) -> int { throw std::runtime_error("task failed"); });
    EXPECT_THROW(failing.get(), std::runtime_error);
    EXPECT_EQ(pool.enqueue([](int) { return 1; }).get(), 1);
}
}  // namespace
