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
    std::function<std::string()> content; ///< may throw: then the reason is the content
};

/// What support needs, in the order of the list. Nothing in it changes anything.
std::vector<Part> AllParts(const Redaction& redaction);

} // namespace reportctl::bundle
