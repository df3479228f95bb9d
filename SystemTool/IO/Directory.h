#pragma once

#include <string>

/// Paths of directories. Safe from any thread and during static initialisation.
namespace SystemTool::IO::Directory {

/// The directory of the running executable, ending in a separator, so that a file name can be appended
/// directly. "./" when the system does not say where the executable is. The misspelling is part of the name:
/// the suite's programs share it.
std::string GetExcutableDirectory();

/// Copies `in` to `out` and replaces each backslash by a slash. Returns false and leaves `out` unchanged for
/// a text that cannot be a path: an empty one, or one with a zero byte. `in` and `out` may be the same
/// string.
bool TransformAsUnixPath(const std::string& in, std::string& out);

} // namespace SystemTool::IO::Directory
