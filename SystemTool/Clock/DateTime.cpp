#include "SystemTool/Clock/DateTime.h"

#include <cstdio>
#include <ctime>
#include <iomanip>
#include <sstream>

namespace SystemTool::Clock {
namespace {

/// `format` with each %i replaced by the milliseconds. A doubled percent sign is skipped as a pair, so that
/// "%%i" stays a percent sign and an i.
std::string WithMilliseconds(const std::string& format, int milliseconds) {
    char digits[8];
    std::snprintf(digits, sizeof digits, "%03d", milliseconds);
    std::string text;
    for (std::size_t i = 0; i < format.size(); ++i) {
        if (format[i] != '%' || i + 1 == format.size())
            text += format[i];
        else if (format[++i] == 'i')
            text += digits;
        else
            text.append({'%', format[i]});
    }
    return text;
}

} // namespace

DateTime DateTime::Now() {
    return DateTime(std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now()));
}

std::string DateTime::ToString(const std::string& format) const {
    const auto wholeSeconds = std::chrono::floor<std::chrono::seconds>(m_time);
    const auto milliseconds = static_cast<int>((m_time - wholeSeconds).count());
    const std::time_t seconds = std::chrono::system_clock::to_time_t(wholeSeconds);
    std::tm local{};
    ::localtime_r(&seconds, &local);
    std::ostringstream text;
    text << std::put_time(&local, WithMilliseconds(format, milliseconds).c_str());
    return text.str();
}

} // namespace SystemTool::Clock
