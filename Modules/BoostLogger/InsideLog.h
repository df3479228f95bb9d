#pragma once

namespace BoostLogger {

/// Held while a thread waits for the log's lock or has it. The crash handler logs on the thread that crashed:
/// should that ever be in here, its records must be lost and not wait for ever.
class InsideLog {
public:
    InsideLog() { t_isInside = true; }
    ~InsideLog() { t_isInside = false; }
    InsideLog(const InsideLog&) = delete;
    InsideLog& operator=(const InsideLog&) = delete;

    /// Whether this thread is.
    static bool IsThisThread() { return t_isInside; }

private:
    static inline thread_local bool t_isInside = false;
};

} // namespace BoostLogger
