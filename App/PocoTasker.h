#pragma once

#include <new>

#include <Poco/AutoPtr.h>
#include <Poco/Notification.h>
#include <Poco/NotificationQueue.h>
#include <Poco/Runnable.h>
#include <Poco/Thread.h>

/// A value on its way through the queue.
template <typename T>
class WorkNotification : public Poco::Notification {
public:
    explicit WorkNotification(const T& data) : m_data(data) {}

    T m_data;
};

/// Ends the consumer's loop when it arrives.
class StopNotification : public Poco::Notification {};

/// Takes values from any thread and passes them to Consume, in the order of their arrival and one at a time,
/// on a thread of its own. The queue has no bound.
///
/// Life: constructed → running (the derived class starts m_thread with this object) → stopped by StopThread.
/// There is no restart. Values that are produced before the start wait for it. Values that wait when the
/// thread is stopped are dropped. A derived class must call StopThread in its own destructor: the destructor
/// of this class would be too late, because Consume no longer exists then.
template <typename T>
class PocoTasker : public Poco::Runnable {
public:
    /// The consumer's loop. It catches no exception of Consume, which must not throw.
    void run() override {
        for (;;) {
            const Poco::AutoPtr<Poco::Notification> item(Next());
            if (!item)
                continue; // woken without an item, or without the memory to wait
            if (dynamic_cast<const StopNotification*>(item.get()) != nullptr)
                return;
            if (const auto* work = dynamic_cast<const WorkNotification<T>*>(item.get()))
                Consume(work->m_data);
        }
    }

    /// Queues a copy of `data` without waiting. Any thread may call it. Throws std::bad_alloc, and the
    /// exceptions that copying `data` throws.
    void Produce(const T& data) { m_queue.enqueueNotification(new WorkNotification<T>(data)); }

    /// Drops the waiting values, lets the consumer finish its current value, and joins the thread. Returns at
    /// once when the thread is not running. Any thread except the consuming one may call it.
    void StopThread() {
        if (!m_thread.isRunning())
            return;
        m_queue.clear();
        m_queue.wakeUpAll();
        m_queue.enqueueNotification(new StopNotification);
        m_thread.join();
    }

protected:
    /// Called on the consuming thread once for each value. The result is ignored. Must not throw.
    virtual bool Consume(const T& data) = 0;

    Poco::NotificationQueue m_queue;
    Poco::Thread m_thread;

private:
    /// Waits for the next item. Waiting needs memory. Without memory, this pauses and returns null, so that
    /// the thread tries again and does not end.
    Poco::Notification* Next() {
        constexpr long NO_MEMORY_PAUSE_MS = 10;
        try {
            return m_queue.waitDequeueNotification();
        } catch (const std::bad_alloc&) {
            Poco::Thread::sleep(NO_MEMORY_PAUSE_MS);
            return nullptr;
        }
    }
};
