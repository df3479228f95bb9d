#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace reportctl::send {

/// What the service would do with a text.
struct Judgement {
    std::string what;                  ///< what it is and where it goes, such as: event "B1", for the store
    std::vector<std::string> errors;   ///< why it would be refused, cut, lost or without effect
    std::vector<std::string> warnings; ///< the service takes it, but something in it has an unexpected effect
};

/// Judges a datagram's text as the service would, with the same parser and the same order of checks. It does
/// not judge what depends on the service's state, such as whether a module was announced or whether the store
/// exists.
///
/// It is an error when a report would not arrive where its sender wants it, because the sender would not
/// learn of the loss.
Judgement Judge(const std::string& text);

/// Judges a text that is too long for a datagram, of which only the length is known.
Judgement JudgeLonger(std::uint64_t bytes);

} // namespace reportctl::send
