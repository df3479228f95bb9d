#include "Modules/BoostLogger/RecordLine.h"

#include <charconv>
#include <cstdio>
#include <ctime>
#include <string>

#include <pthread.h>
#include <unistd.h>

#include "SystemTool/Platform.h"
#include "SystemTool/Text/EscapedText.h"
#include "SystemTool/Text/Utf8.h"

namespace BoostLogger {

using SystemTool::Text::Append;
using SystemTool::Text::AppendEscaped;

namespace {

/// A short text that a thread keeps from record to record. No member needs a destructor, because threads
/// still log during exit(), after their thread-local objects are destroyed.
struct CachedText {
    char text[48];
    std::size_t size;
};

thread_local CachedText t_second; ///< The text of t_secondTime: "2026-11-20 10:15:30".
thread_local std::time_t t_secondTime;
thread_local CachedText t_thread; ///< "[pid:tid] "

void AppendNumber(LineBuffer& line, long long number) {
    char digits[24];
    const auto end = std::to_chars(digits, digits + sizeof digits, number).ptr;
    Append(line, {digits, static_cast<std::size_t>(end - digits)});
}

void FillSecond(std::time_t second) {
    std::tm local{};
    if (localtime_r(&second, &local) == nullptr) // the year does not fit into an int
        local = std::tm{};
    t_second.size = std::strftime(t_second.text, sizeof t_second.text, "%Y-%m-%d %H:%M:%S", &local);
    t_secondTime = second;
}

/// localtime_r takes a lock of the whole process and needs more time than the rest of the line. So a thread
/// calls it only when the second has changed.
void AppendTime(LineBuffer& line, std::chrono::system_clock::time_point now) {
    const auto second = std::chrono::floor<std::chrono::seconds>(now);
    const auto milliseconds = std::chrono::floor<std::chrono::milliseconds>(now - second).count();
    const std::time_t time = std::chrono::system_clock::to_time_t(second);
    if (t_second.size == 0 || time != t_secondTime)
        FillSecond(time);
    Append(line, {t_second.text, t_second.size});
    const char fraction[] = {'.', static_cast<char>('0' + milliseconds / 100),
                             static_cast<char>('0' + milliseconds / 10 % 10),
                             static_cast<char>('0' + milliseconds % 10), ' '};
    Append(line, {fraction, sizeof fraction});
}

void AppendLevel(LineBuffer& line, int level) {
    static constexpr std::string_view WORDS[] = {"DEBUG ", "INFO  ", "WARN  ", "ERROR ", "FATAL "};
    if (level >= 1 && level <= 5)
        return Append(line, WORDS[level - 1]);
    const std::size_t start = line.size();
    AppendNumber(line, level);
    while (line.size() < start + 5)
        line.push_back(' ');
    line.push_back(' ');
}

/// Runs in the child after a fork, on its only thread. The ids of the child are new, so the text is
/// forgotten.
void ForgetThread() {
    t_thread.size = 0;
}

[[maybe_unused]] const int g_forkHandler = pthread_atfork(nullptr, nullptr, ForgetThread);

/// Asking for an id takes a system call. A record should make only one system call, so the text is kept.
void AppendThread(LineBuffer& line) {
    if (t_thread.size == 0) {
        const auto thread = static_cast<unsigned long long>(SystemTool::Platform::CurrentThreadId());
        const int size = std::snprintf(t_thread.text, sizeof t_thread.text, "[%ld:%llu] ",
                                       static_cast<long>(getpid()), thread);
        t_thread.size = static_cast<std::size_t>(size);
    }
    Append(line, {t_thread.text, t_thread.size});
}

void AppendSite(LineBuffer& line, const LogRecord& record) {
    line.push_back('[');
    AppendEscaped(line, record.file);
    line.push_back(':');
    AppendNumber(line, record.line);
    line.push_back(' ');
    AppendEscaped(line, record.function);
    if (!record.tag.empty()) {
        Append(line, " #");
        AppendEscaped(line, record.tag);
    }
    Append(line, "] ");
}

void AppendMessage(LineBuffer& line, std::string_view message) {
    AppendEscaped(line, SystemTool::Text::CutUtf8(message, MAX_MESSAGE_BYTES));
    if (message.size() <= MAX_MESSAGE_BYTES)
        return;
    Append(line, "... [cut, the message had ");
    AppendNumber(line, static_cast<long long>(message.size()));
    Append(line, " bytes]");
}

} // namespace

void ComposeLine(LineBuffer& line, const LogRecord& record, std::chrono::system_clock::time_point now) {
    AppendTime(line, now);
    AppendLevel(line, record.level);
    AppendThread(line);
    AppendSite(line, record);
    AppendMessage(line, record.message);
    line.push_back('\n');
}

} // namespace BoostLogger
