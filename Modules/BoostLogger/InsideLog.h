#pragma once

namespace BoostLogger {

/// Marks the thread that makes this object as being inside the log, until the object is destroyed. A thread
/// is inside the log while it waits for the log's lock or holds it. The crash handler logs on the thread that
/// crashed. If that thread crashed inside the log, it would wait for the lock for ever. So its records are
/// counted as lost.
class InsideLog {
public:
    InsideLog() { t_isInside = true; }
    ~InsideLog() { t_isInside = false; }
    InsideLog(const InsideLog&) = delete;
    InsideLog& operator=(const InsideLog&) = delete;

    /// Whether the calling thread is inside the log.
    static bool IsThisThread() { return t_isInside; }

private:
    static inline thread_local bool t_isInside = false;
};

} // namespace BoostLogger
