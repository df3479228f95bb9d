#pragma once

#include <functional>
#include <iostream>
#include <map>
#include <mutex>
#include <ostream>
#include <string>
#include <vector>

#include <unistd.h>

#include "tests/fakes/FakePlugin.h"

/// One call of WriteLog.
struct LogRecord {
    int level;
    std::string file;
    std::string function;
    int line;
    std::string message;
    std::string tag{};
    int reserved = 0;

    bool operator==(const LogRecord&) const = default;

    friend std::ostream& operator<<(std::ostream& out, const LogRecord& r) {
        return out << r.level << " [" << r.file << ':' << r.line << ' ' << r.function << "] tag=" << r.tag
                   << ' ' << r.message << " reserved=" << r.reserved;
    }
};

/// What all instances of the fake logger recorded, and what a test tells them to do.
struct FakeLoggerState {
    void Write(LogRecord record, const void* instance) {
        ThrowIf(throws);
        if (echoes)
            std::cerr << record << std::endl;
        while (hangs)
            ::pause();
        if (onWrite)
            onWrite(record);
        const std::lock_guard lock(mutex);
        instanceOfFile[record.file] = instance;
        records.push_back(std::move(record));
    }
    std::vector<LogRecord> Records() {
        const std::lock_guard lock(mutex);
        return records;
    }
    /// The records of one function, for a test that does not look at other records.
    std::vector<LogRecord> RecordsOf(const std::string& function) {
        auto all = Records();
        std::erase_if(all, [&function](const LogRecord& record) { return record.function != function; });
        return all;
    }
    /// The logger that wrote the last record of each source file.
    std::map<std::string, const void*> InstanceOfFile() {
        const std::lock_guard lock(mutex);
        return instanceOfFile;
    }
    void Clear() {
        const std::lock_guard lock(mutex);
        records.clear();
    }

    std::function<void(const LogRecord&)> onWrite; ///< Called with each record before it is kept.
    int created = 0;                               ///< Instances that "CreateModule" made.
    Throws throws = Throws::Nothing;
    /// Copies each record to standard error. Some tests see nothing else of a child process.
    bool echoes = false;
    bool hangs = false; ///< Never returns from a write.

private:
    std::mutex mutex; ///< Guards the records and the instances.
    std::vector<LogRecord> records;
    std::map<std::string, const void*> instanceOfFile;
};

inline FakeLoggerState& FakeLogger() {
    return FakeState<FakeLoggerState>("libBoostLogger.dylib");
}
