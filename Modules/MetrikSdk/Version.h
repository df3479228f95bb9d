#pragma once

namespace MetrikSdk {

/// What GetSdkVersion tells, and what collectors see as the scope's version.
constexpr const char* SDK_VERSION = "1.0.0";

} // namespace MetrikSdk
