#pragma once

#include <string>

#include <sys/types.h>

/// The service's program, as it is installed with this reportctl.
namespace reportctl::service {

/// The path of the service's program: where the installation puts it, or beside reportctl, as in a build.
/// Empty when it is at neither place.
std::string ProgramPath();

/// Whether the process runs the service's program, also when it is another user's: then only the first 15
/// characters of its name are known.
bool IsService(pid_t process);

/// The text of --version: a line for reportctl and a line for the service. The service's version is read from
/// its file. We cannot ask the program: it takes no arguments, so `--version` would start the service.
std::string VersionText();

} // namespace reportctl::service
