#pragma once

#include <string>

/// Turns a segmentation fault into a stack trace in the log, and keeps the service to one running instance.
/// Static members only; no object is needed.
class MiniDump {
public:
    /// Keeps both texts and installs the handler of SIGSEGV. Every other signal keeps its default action.
    static void EnableAutoStack(const std::string& logPath, const std::string& logName);

    /// True when another process holds the instance lock; this one must end then. False when this process
    /// holds it now, until it ends, however it ends. Ends the process with 1 when the pid file cannot be
    /// opened or written.
    ///
    /// Sets the process's umask to 0 and leaves it so: the pid file must be writable by whichever user runs
    /// the next instance, and everything made later gets exactly the mode that its maker asks for.
    ///
    /// The lock is a POSIX record lock: nothing else in the process may open and close the pid file, which
    /// would drop it. Called once, before any thread is started.
    static bool IsAlreadyRun();

    /// The handler: logs the signal and the frames, and ends the process with exit(0). None of what it does
    /// is safe in a signal handler; a process that is lost anyway has nothing to lose by trying. When it
    /// hangs, SIGALRM ends the process after a few seconds.
    static void OnStackCallBack(int signal);

private:
    static std::string
        m_strLogPath; ///< Kept for who looks at the process with a debugger; the trace goes to the logger.
    static std::string m_strLogName; ///< Also the base name of the pid file.
};
