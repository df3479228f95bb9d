#pragma once

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace reportctl::pages {

/// An option as the manual pages and the completions show it. It is read from the objects that parse the
/// command line and print --help, so pages, completions and --help always agree.
struct Option {
    std::vector<std::string> names; ///< with their dashes, short names first; a positional has one name
    std::string value;              ///< the name of its value in --help, such as "INT"; empty for a flag
    std::string limits;             ///< the allowed values, in the words of --help; empty when any is allowed
    std::string description;
    std::string group; ///< its heading in --help
    bool isPositional = false;
    bool isRequired = false;
    bool isRepeatable = false;         ///< a positional that takes several values
    std::string defaultValue;          ///< the default in --help; empty when there is none
    std::vector<std::string> choices;  ///< the allowed values, when --help lists them
    std::vector<std::string> needs;    ///< the options that must be given with it
    std::vector<std::string> excludes; ///< the options that cannot be given with it
};

/// A command, with its options and the commands below it.
struct Command {
    std::vector<std::string> path; ///< "reportctl", then the names of the commands down to this command
    std::string description;
    std::string footer;
    std::vector<Option> options; ///< in the order of --help, without hidden options
    std::vector<Command> commands;

    /// "reportctl send init", or with another separator.
    std::string Name(const std::string& separator = " ") const;
};

/// Reads a command with all commands below it.
Command Read(const CLI::App& app, const std::vector<std::string>& parents = {});

} // namespace reportctl::pages
