#include "Tools/reportctl/service/Program.h"

#include <filesystem>
#include <string_view>

#include <fmt/format.h>

#include "SystemTool/IO/Directory.h"
#include "SystemTool/Version.h"
#include "Tools/reportctl/service/Processes.h"

namespace reportctl::service {
namespace {

constexpr auto NAME = "SyncServiceReport";

std::string Line(const std::string& name, const std::string& version, const std::string& buildId) {
    return fmt::format("{} {} (build {})", name, version.empty() ? "of unknown version" : version,
                       buildId.empty() ? "unknown" : buildId);
}

std::string ServiceLine() {
    const auto path = ProgramPath();
    if (path.empty())
        return fmt::format("{} is not installed beside reportctl", NAME);
    const auto program = SystemTool::Version::Of(path);
    return fmt::format("{}, {}", Line(NAME, program.version, program.buildId), path);
}

} // namespace

std::string ProgramPath() {
    const auto here = SystemTool::IO::Directory::GetExcutableDirectory();
    for (const auto& folder : {here + SSR_PROGRAMS_FROM_BIN + "/", here}) {
        std::error_code error;
        if (std::filesystem::is_regular_file(folder + NAME, error))
            return std::filesystem::path(folder + NAME).lexically_normal().string();
    }
    return {};
}

bool IsService(pid_t process) {
    constexpr std::size_t SHOWN_TO_ALL = 15;
    const auto name = ProgramNameOf(process);
    return name == NAME || name == std::string_view(NAME).substr(0, SHOWN_TO_ALL);
}

std::string VersionText() {
    return Line("reportctl", SystemTool::Version::Number(), SystemTool::Version::BuildId()) + "\n" +
           ServiceLine();
}

} // namespace reportctl::service
