#pragma once

#include <string>

/// The service's program, as it is installed with this reportctl.
namespace reportctl::service {

/// The path of the service's program: where the installation puts it, or beside reportctl, as in a build.
/// Empty when it is at neither place.
std::string ProgramPath();

/// The text of --version: a line for reportctl and a line for the service. The service's version is read from
/// its file. We cannot ask the program: it takes no arguments, so `--version` would start the service.
std::string VersionText();

} // namespace reportctl::service
