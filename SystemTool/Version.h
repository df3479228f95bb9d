#pragma once

#include <string>

/// Which build this is. For people, logs and support: two programs with the same version and build id are the
/// same file. Safe from any thread and during static initialisation; nothing throws, what is not known is an
/// empty text.
namespace SystemTool::Version {

/// The version of this build, such as "0.2.0": the one that CMakeLists.txt names.
const char* Number();

/// The build id of the running program: the linker's digest of its contents, in hexadecimal digits. The debug
/// symbols of a build are found by it. Read from the program's file at each call, also when an upgrade has
/// replaced that file.
std::string BuildId();

struct Program {
    std::string version;
    std::string buildId;
};

/// What a program's file says of itself, without running it: the service takes any argument for no argument,
/// and starts. Empty texts for a file that is missing or no program of ours.
Program Of(const std::string& file);

} // namespace SystemTool::Version
