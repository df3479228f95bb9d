#include <fmt/format.h>
#include <fmt/ranges.h>

#include "Tools/reportctl/pages/Completions.h"
#include "Tools/reportctl/pages/Mdoc.h"

namespace reportctl::pages {
namespace {

std::string Quoted(const std::string& text) {
    std::string quoted = "'";
    for (const char c : text) {
        if (c == '\'' || c == '\\')
            quoted += '\\';
        quoted += c;
    }
    return quoted + "'";
}

/// The condition that the command line names this command and no command below it.
std::string Condition(const Command& command) {
    std::string condition;
    for (std::size_t i = 1; i < command.path.size(); ++i)
        condition += fmt::format("__fish_seen_subcommand_from {}; and ", command.path[i]);
    std::string below;
    for (const auto& sub : command.commands)
        below += " " + sub.path.back();
    if (!below.empty())
        return condition + "not __fish_seen_subcommand_from" + below;
    return condition.substr(0, condition.size() - std::string("; and ").size());
}

std::string Value(const Option& option) {
    if (option.value.empty())
        return {};
    if (option.choices.empty())
        return " -r -F";
    return fmt::format(" -x -a '{}'", fmt::join(option.choices, " "));
}

std::string Names(const Option& option) {
    std::string names;
    for (const auto& name : option.names)
        names += name.starts_with("--") ? " -l " + name.substr(2) : " -s " + name.substr(1);
    return names;
}

std::string Lines(const Command& command) {
    const auto begin = fmt::format("complete -c {} -n {}", command.path.front(), Quoted(Condition(command)));
    std::string lines;
    for (const auto& sub : command.commands)
        lines += fmt::format("{} -a {} -d {}\n", begin, sub.path.back(),
                             Quoted(mdoc::FirstSentence(sub.description)));
    for (const auto& option : command.options)
        if (option.isPositional)
            lines += fmt::format("{} -F\n", begin);
        else
            lines += fmt::format("{}{}{} -d {}\n", begin, Names(option), Value(option),
                                 Quoted(mdoc::FirstSentence(option.description)));
    for (const auto& sub : command.commands)
        lines += Lines(sub);
    return lines;
}

} // namespace

std::string FishCompletion(const Command& program) {
    return fmt::format("# completion of {0} for fish\ncomplete -c {0} -f\n", program.Name()) + Lines(program);
}

} // namespace reportctl::pages
