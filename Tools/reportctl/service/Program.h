#pragma once

#include <string>

/// The service's program, as it is installed with this reportctl.
namespace reportctl::service {

/// Its path: where the installation puts it, or beside reportctl, as in a build. Empty when it is at neither
/// place.
std::string ProgramPath();

/// For --version: a line for reportctl and one for the service, whose version is read from its file. Running
/// it would start it: it takes no arguments.
std::string VersionText();

} // namespace reportctl::service
