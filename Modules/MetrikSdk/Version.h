#pragma once

namespace MetrikSdk {

/// What GetSdkVersion returns, and what collectors see as the version of the scope.
constexpr const char* SDK_VERSION = "1.0.0";

} // namespace MetrikSdk
