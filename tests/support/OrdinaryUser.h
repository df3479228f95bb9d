#pragma once

#include <algorithm>
#include <string>
#include <vector>

#include <unistd.h>

/// Rights do not bind root: a test about rights gives its own up, and `directory` with the `files` in it to
/// the user that it becomes. Only in a child process, since there is no way back. True when the process is an
/// ordinary user's.
inline bool BecomeOrdinaryUser(const std::string& directory, std::vector<std::string> files = {}) {
    constexpr uid_t NOBODY = 65534;
    if (::geteuid() != 0)
        return true;
    files.push_back(directory);
    const auto give = [](const std::string& path) { return ::chown(path.c_str(), NOBODY, NOBODY) == 0; };
    return std::all_of(files.begin(), files.end(), give) && ::setgid(NOBODY) == 0 && ::setuid(NOBODY) == 0;
}
