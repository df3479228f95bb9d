#pragma once

#include <string>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::setup {

/// Makes sure of a directory of the user's own, mode 0700, with its parents. One that is there with other
/// rights is corrected. It may be a symbolic link to a directory: the user may keep the data elsewhere.
void EnsurePrivateDirectory(terminal::Worklog& log, const std::string& path);

/// Makes sure of a directory in which every user of the machine may make files, and only the owner of a file
/// may remove it: mode 1777. Every user may read its parents. A symbolic link is refused: the user who put it
/// there would choose which directory every user may write to. When the right to make it is missing, the
/// failure tells the command that makes it, with the pid file in it. True when it is there, or a dry run
/// would make it.
bool EnsureSharedDirectory(terminal::Worklog& log, const std::string& path);

} // namespace reportctl::setup
