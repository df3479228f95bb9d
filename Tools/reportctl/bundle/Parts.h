#pragma once

#include <functional>
#include <string>
#include <vector>

#include "Tools/reportctl/bundle/Redaction.h"

namespace reportctl::bundle {

/// One file of a bundle.
struct Part {
    std::string name;
    std::string about;                    ///< for the list of contents
    std::function<std::string()> content; ///< may throw; the bundle then has the reason as the content
};

/// All files that support needs, in the order of the list of contents. Making them changes nothing.
std::vector<Part> AllParts(const Redaction& redaction);

} // namespace reportctl::bundle
