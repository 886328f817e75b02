#pragma once

#include <atomic>
#include <condition_variable>
#include <deque>
#include <functional>
#include <future>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "platform/core/OxExport.h"

// A fixed pool of worker threads with a first-in-first-out task queue. A task receives
// the number of the worker that runs it. Stopping waits: every queued task runs first.
class OX_EXPORT OxQelWorkerPool {
public:
    using Task = std::function<void(int worker)>;

    // At least one worker, also when asked for none.
    explicit OxQelWorkerPool(unsigned threads);
    ~OxQelWorkerPool();
    OxQelWorkerPool(const OxQelWorkerPool&) = delete;
    OxQelWorkerPool& operator=(const OxQelWorkerPool&) = delete;

    // Queues f(worker) and returns the handle of its result.
    template <class F>
    auto enqueue(F f) -> std::future<decltype(f(0))> {
        using Result = decltype(f(0));
        auto task = std::make_shared<std::packaged_task<Result(int)>>(std::move(f));
        std::future<Result> result = task->get_future();
        push([task](int worker) { (*task)(worker); });
        return result;
    }

    // Runs what is queued, then joins the workers. Called by the destructor too.
    void stop();
    size_t size() const { return m_workers.size(); }

    // The machine's hardware threads, at least 1.
    static unsigned hardwareThreads();

private:
    void push(Task task);
    bool pop(Task& task);
    void work(int worker);

    std::vector<std::thread> m_workers;
    std::deque<Task> m_queue;
    std::mutex m_queueMutex;
    std::mutex m_poolMutex;
    std::condition_variable m_wake;
    std::atomic<int> m_waiting{0};
    std::atomic<bool> m_done{false};
};
