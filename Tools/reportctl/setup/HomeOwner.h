#pragma once

#include <optional>
#include <string>

namespace reportctl::setup {

/// The reason why set-up must not make the user's data directory `data`, with the command to use instead.
/// Nothing when set-up may make it.
///
/// After `sudo`, set-up can run as root with another user's home. Its files would belong to root, and that
/// user's service could not open them. The directory's owner shows this: the owner of `data`, or of its
/// nearest parent that exists.
std::optional<std::string> ReasonAgainstRoot(const std::string& data);

} // namespace reportctl::setup
