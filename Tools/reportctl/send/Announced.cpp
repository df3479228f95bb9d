#include "Tools/reportctl/send/Announced.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <optional>

#include <sys/types.h>

#include "Common/ServiceConstants.h"
#include "Tools/reportctl/log/Files.h"
#include "Tools/reportctl/log/Line.h"

namespace reportctl::send {
namespace {

constexpr std::string_view ANNOUNCED = "Add metrik module :";

bool Runs(const std::string& process) {
    const auto number = static_cast<pid_t>(std::strtol(process.c_str(), nullptr, 10));
    return number > 0 && (::kill(number, 0) == 0 || errno == EPERM);
}

/// The process that wrote the file's last whole line; empty when that line is not a record.
std::string LastProcess(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::string last;
    for (std::string text; std::getline(file, text);)
        if (!file.eof())
            last = std::move(text);
    const auto line = log::ReadLine(last);
    return line ? line->process : std::string();
}

} // namespace

Announced::Announced(const std::string& logDirectory) {
    const auto live = log::LiveFile(logDirectory);
    auto files = log::RotatedFiles(logDirectory);
    m_process = LastProcess(live);
    if (!Runs(m_process))
        return;
    for (ReadFile(live); !m_isWhole && !files.empty(); files.pop_back())
        ReadFile(files.back());
}

void Announced::ReadFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    for (std::string text; std::getline(file, text);) {
        if (text.find(ANNOUNCED) == std::string::npos)
            continue;
        const auto line = log::ReadLine(text);
        if (!line || line->process != m_process || line->site != "Metrik/MetrikMgr" ||
            !line->message.starts_with(ANNOUNCED))
            continue;
        const auto module = line->message.substr(ANNOUNCED.size());
        m_modules.insert(module);
        m_isWhole |= module == SyncServiceReport::DEFAULT_MODULE_ID; // every service adds this module first
    }
}

} // namespace reportctl::send
