#pragma once

#include <string>

namespace MetrikSdk::otlp {

/// The text in the gzip format. Throws std::bad_alloc. Any thread.
std::string Gzip(const std::string& text);

} // namespace MetrikSdk::otlp
