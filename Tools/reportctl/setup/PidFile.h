#pragma once

#include <string>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::setup {

/// Makes sure of the pid file in the directory that every user's service locks it in: empty, mode 0666, and
/// the directory's owner's. That last one is why the service is not left to make it: a kernel with
/// fs.protected_regular refuses a file in such a directory to everybody but its owner, unless it belongs to
/// the directory's owner. The first user's service would keep out every other user's.
///
/// One that is there is looked at and never opened: a running service's id is in it. A symbolic link is
/// refused. When the right to make it is missing, the failure tells the command that makes it.
void EnsurePidFile(terminal::Worklog& log, const std::string& directory);

/// The command with which an administrator makes the pid file in this directory, where there is none.
std::string CommandForPidFile(const std::string& directory);

} // namespace reportctl::setup
