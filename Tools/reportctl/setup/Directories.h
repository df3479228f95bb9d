#pragma once

#include <string>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::setup {

/// Makes the user's own directory with mode 0700, and its parents. When the directory is there with another
/// mode, the mode is corrected. It may be a symbolic link to a directory: the user may keep the data
/// elsewhere.
void EnsurePrivateDirectory(terminal::Worklog& log, const std::string& path);

/// Makes a directory with mode 1777: every user of the machine may make files in it, and only the owner of a
/// file may remove it. Every user may read its parents. When it is there with another mode, the mode is
/// corrected. A symbolic link is refused: the user who made the link would choose a directory that every user
/// may write to. When this user may not make the directory, the failure names the command that makes it and
/// the pid file in it. Returns true when the directory is there, or when a dry run would make it.
bool EnsureSharedDirectory(terminal::Worklog& log, const std::string& path);

} // namespace reportctl::setup
