#pragma once

#include <string_view>

#include <boost/container/small_vector.hpp>

namespace SystemTool::Text {

/// A line that is being built. It lives on the stack of the thread that logs, and a usual record fits into it
/// without an allocation. Nothing of it remains after the call, so nothing has to be destroyed when the
/// process exits.
using LineBuffer = boost::container::small_vector<char, 4096>;

inline void Append(LineBuffer& line, std::string_view text) {
    line.insert(line.end(), text.begin(), text.end());
}

inline std::string_view TextOf(const LineBuffer& line) {
    return {line.data(), line.size()};
}

} // namespace SystemTool::Text
