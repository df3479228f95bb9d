#pragma once

#include <string>

namespace Sqlite {

/// Follows `path` from the root to its end, as the system does, and throws UnsafePath when another user could
/// have put a symbolic link there, or could replace one. A link must belong to this user or root. So must its
/// directory, and no other user may write to it, unless its sticky bit keeps them from replacing the link.
///
/// Directories without a link in them are not checked, and neither is the file at the end. A path that ends
/// early, because something does not exist or may not be looked at, passes: the call that opens it reports
/// that.
void RequireOurLinks(const std::string& path);

} // namespace Sqlite
