#pragma once

#include <algorithm>
#include <string>
#include <vector>

#include <unistd.h>

/// Makes this process an ordinary user's, and gives that user `directory` and the `files` in it. A test about
/// rights needs it, because root may do everything. Only in a child process, because a process cannot become
/// root again. True when the process belongs to an ordinary user.
inline bool BecomeOrdinaryUser(const std::string& directory, std::vector<std::string> files = {}) {
    constexpr uid_t NOBODY = 65534;
    if (::geteuid() != 0)
        return true;
    files.push_back(directory);
    const auto give = [](const std::string& path) { return ::chown(path.c_str(), NOBODY, NOBODY) == 0; };
    return std::all_of(files.begin(), files.end(), give) && ::setgid(NOBODY) == 0 && ::setuid(NOBODY) == 0;
}
