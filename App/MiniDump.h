#pragma once

#include <string>

/// Turns a segmentation fault into a stack trace in the log, and keeps the service to one running instance.
/// Static members only; no object is needed.
class MiniDump {
public:
    /// Keeps both texts and installs the handler of SIGSEGV. Every other signal keeps its default action.
    static void EnableAutoStack(const std::string& logPath, const std::string& logName);

    /// True when another process holds the instance lock; this process must end then. False when this process
    /// has the lock, which it keeps until it ends, also by a crash; false also when the file system has no
    /// locks. Ends the process with exit code 1 when the pid file cannot be opened or written.
    ///
    /// Sets the process's umask to 0 and does not restore it. The next instance may belong to another user,
    /// who must be able to write the pid file. Every file that the process makes later gets exactly the mode
    /// that the code asks for.
    ///
    /// The lock is a POSIX record lock: nothing else in the process may open and close the pid file, because
    /// closing it would release the lock. Call this once, before the service starts a thread.
    static bool IsAlreadyRun();

    /// The signal handler: logs the signal and the frames, and ends the process with exit(0). It calls
    /// functions that are not safe in a signal handler. That is accepted, because the process is lost anyway.
    /// When the handler hangs, SIGALRM ends the process after a few seconds.
    static void OnStackCallBack(int signal);

private:
    /// Nothing reads it; it is there for a debugger. The trace goes to the logger.
    static std::string m_strLogPath;
    static std::string m_strLogName; ///< Also the name of the pid file, without ".pid".
};
