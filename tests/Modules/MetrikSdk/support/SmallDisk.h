#pragma once

#include <functional>
#include <string>

/// Runs `test` in a child process that has a file system of `bytes` bytes mounted at `directory`. No other
/// process sees that file system. Returns Unavailable when mounting is not allowed, as in some containers.
enum class SmallDiskResult { Passed, Failed, Unavailable };
SmallDiskResult RunOnSmallDisk(const std::string& directory, int bytes, const std::function<void()>& test);
