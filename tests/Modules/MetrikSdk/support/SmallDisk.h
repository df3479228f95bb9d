#pragma once

#include <functional>
#include <string>

/// Runs `test` in a child process that sees a file system of `bytes` bytes mounted at `directory`, which
/// no other process sees. Without the right to mount (some containers) it returns Unavailable.
enum class SmallDiskResult { Passed, Failed, Unavailable };
SmallDiskResult RunOnSmallDisk(const std::string& directory, int bytes, const std::function<void()>& test);
