#include "OxQelLib/transfer/OxQelWorkerPool.h"

OxQelWorkerPool::OxQelWorkerPool(unsigned threads) {
    const unsigned n = threads == 0 ? 1 : threads;
    m_workers.reserve(n);
    for (unsigned i = 0; i < n; ++i)
        m_workers.emplace_back([this, i] { work(static_cast<int>(i)); });
}

OxQelWorkerPool::~OxQelWorkerPool() {
    stop();
}

unsigned OxQelWorkerPool::hardwareThreads() {
    const unsigned n = std::thread::hardware_concurrency();
    return n == 0 ? 1 : n;
}

void OxQelWorkerPool::push(Task task) {
    {
        std::lock_guard lock(m_queueMutex);
        m_queue.push_back(std::move(task));
    }
    std::lock_guard lock(m_poolMutex);
    m_wake.notify_one();
}

bool OxQelWorkerPool::pop(Task& task) {
    std::lock_guard lock(m_queueMutex);
    if (m_queue.empty())
        return false;
    task = std::move(m_queue.front());
    m_queue.pop_front();
    return true;
}

void OxQelWorkerPool::work(int worker) {
    for (;;) {
        Task task;
        if (!pop(task)) {
            // The predicate pops under the pool mutex, which every push notifies under,
            // so no task queued between the check and the wait is missed.
            std::unique_lock lock(m_poolMutex);
            ++m_waiting;
            m_wake.wait(lock, [&] { return pop(task) || m_done; });
            --m_waiting;
            if (!task)
                return;
        }
        task(worker);
    }
}

void OxQelWorkerPool::stop() {
    if (m_done.exchange(true))
        return;
    {
        std::lock_guard lock(m_poolMutex);
        m_wake.notify_all();
    }
    for (auto& t : m_workers)
        if (t.joinable())
            t.join();
    std::lock_guard lock(m_queueMutex);
    m_queue.clear();
}
