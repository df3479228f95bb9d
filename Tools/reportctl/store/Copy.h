#pragma once

#include <functional>
#include <string>

namespace reportctl::store {

/// Copies the database at `from` into the new file `to`, mode 0600, as it is at one moment, with the rows
/// that are still in its write-ahead log. Programs that write to it go on meanwhile. Then checks the whole
/// copy.
///
/// `progress` is called with the pages copied and the pages there are.
///
/// Throws SQLite::Exception, and std::runtime_error when the copy is not sound, which means that the original
/// is not.
void CopyDatabase(const std::string& from, const std::string& to,
                  const std::function<void(int done, int total)>& progress);

} // namespace reportctl::store
