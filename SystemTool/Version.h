#pragma once

#include <string>

/// Identifies a build, for people, logs and support: two programs with the same version and build id are the
/// same file. Safe from any thread and during static initialisation. Nothing throws; a value that is not
/// known is an empty text.
namespace SystemTool::Version {

/// The version of this build, such as "0.2.0": the one that CMakeLists.txt names.
const char* Number();

/// The build id of the running program: the linker's digest of its contents, in hexadecimal digits. It finds
/// the debug symbols of a build. Each call reads it from the program's own file, also after an upgrade has
/// replaced that file.
std::string BuildId();

struct Program {
    std::string version;
    std::string buildId;
};

/// Reads version and build id from a program's file. We cannot ask the program: the service takes no
/// arguments, so `--version` would start it. The texts are empty when the file is missing or is no program of
/// ours.
Program Of(const std::string& file);

} // namespace SystemTool::Version
