#include "SystemTool/IO/Directory.h"

#include <algorithm>

#include "SystemTool/Platform.h"

namespace SystemTool::IO::Directory {

std::string GetExcutableDirectory() {
    const auto path = Platform::ExecutablePath();
    const auto separator = path.rfind('/');
    return separator == std::string::npos ? "./" : path.substr(0, separator + 1);
}

bool TransformAsUnixPath(const std::string& in, std::string& out) {
    if (in.empty() || in.find('\0') != std::string::npos)
        return false;
    out = in;
    std::replace(out.begin(), out.end(), '\\', '/');
    return true;
}

} // namespace SystemTool::IO::Directory
