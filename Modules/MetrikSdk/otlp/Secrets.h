#pragma once

#include <string>
#include <utility>
#include <vector>

namespace MetrikSdk::otlp {

/// Keeps secrets out of texts for people. A collector may repeat the credentials that it refuses, and the
/// HTTP library repeats a proxy's address that it does not understand. Threads: any. Pure.
class Secrets {
public:
    /// The values of these headers are secrets, and what follows "Bearer " or "Basic " in them, too.
    explicit Secrets(const std::vector<std::pair<std::string, std::string>>& headers);

    /// An answer's body without the secrets, and without user and password of an address in it.
    std::string WithoutThem(std::string answer) const;

    /// The same for a message of the HTTP library. The address in it may lack its scheme.
    std::string WithoutThemInFault(std::string fault) const;

private:
    std::string WithoutValues(std::string text) const;

    std::vector<std::string> m_values; ///< The longest first.
};

} // namespace MetrikSdk::otlp
