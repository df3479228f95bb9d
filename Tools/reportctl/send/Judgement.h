#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace reportctl::send {

/// What the service would do with a text.
struct Judgement {
    std::string what;                  ///< in words, with where it goes: event "B1", for the store
    std::vector<std::string> errors;   ///< why it would be refused, cut, lost or without effect
    std::vector<std::string> warnings; ///< it is taken, but something about it will surprise
};

/// Judges a datagram's text as the service would, with the same parser and the same order of questions. What
/// depends on the service's state (whether a module was announced, whether the store is there) is not judged.
///
/// The line between errors and warnings: a report that would not end where its sender means it to is an
/// error, since the sender would not learn of the loss.
Judgement Judge(const std::string& text);

/// The same for a text of which only the length is known, which no datagram can hold.
Judgement JudgeLonger(std::uint64_t bytes);

} // namespace reportctl::send
