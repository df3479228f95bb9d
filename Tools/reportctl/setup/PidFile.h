#pragma once

#include <string>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::setup {

/// Makes the pid file that the service of every user locks: empty, mode 0666, and owned by the directory's
/// owner. The service must not make it itself, because then it would belong to the first user. A kernel with
/// fs.protected_regular lets other users open a file in such a directory only when the file belongs to the
/// directory's owner. So the first user's service would keep out the services of all other users.
///
/// A pid file that is there already is checked but not opened, because it holds a running service's process
/// id. A symbolic link is refused. When this user may not make the file, the failure names the command that
/// makes it.
void EnsurePidFile(terminal::Worklog& log, const std::string& directory);

/// The command with which an administrator makes the pid file in this directory.
std::string CommandForPidFile(const std::string& directory);

} // namespace reportctl::setup
