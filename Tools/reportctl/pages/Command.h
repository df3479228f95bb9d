#pragma once

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace reportctl::pages {

/// The command line as the manual pages and the completions show it: read from the very objects that parse it
/// and print --help, so that none of the three can differ from the others.
struct Option {
    std::vector<std::string> names; ///< with their dashes, the short ones first; a positional's one name
    std::string value;              ///< what --help calls its value, such as "INT"; empty for a flag
    std::string limits;             ///< which values there are, in the words of --help; empty: any
    std::string description;
    std::string group; ///< the heading that --help puts it under
    bool isPositional = false;
    bool isRequired = false;
    std::string defaultValue;          ///< empty: none that --help shows
    std::vector<std::string> choices;  ///< the only values there are, when --help lists them
    std::vector<std::string> needs;    ///< what must be given with it
    std::vector<std::string> excludes; ///< what cannot be given with it
};

struct Command {
    std::vector<std::string> path; ///< "reportctl", then the names down to this one
    std::string description;
    std::string footer;
    std::vector<Option> options; ///< in the order of --help; none that it hides
    std::vector<Command> commands;

    /// "reportctl send init", or with another separator.
    std::string Name(const std::string& separator = " ") const;
};

/// Reads an app with all below it.
Command Read(const CLI::App& app, const std::vector<std::string>& parents = {});

} // namespace reportctl::pages
