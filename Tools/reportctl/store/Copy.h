#pragma once

#include <functional>
#include <string>

namespace reportctl::store {

/// Copies the database at `from` into the new file `to`, mode 0600, and then checks the whole copy. It has
/// the database's state of one moment, with the rows that are still in its write-ahead log. Other programs
/// may write to the database meanwhile.
///
/// `progress` is called with the number of pages copied and the number of all pages.
///
/// Throws SQLite::Exception. Throws std::runtime_error when the copy is damaged, which means that the
/// original is damaged.
void CopyDatabase(const std::string& from, const std::string& to,
                  const std::function<void(int done, int total)>& progress);

} // namespace reportctl::store
