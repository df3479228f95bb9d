#pragma once

#include <string>

namespace Metrik {

/// The text in the gzip format. Throws std::bad_alloc. Any thread.
std::string Gzip(const std::string& text);

} // namespace Metrik
