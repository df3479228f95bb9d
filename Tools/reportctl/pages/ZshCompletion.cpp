#include <fmt/format.h>
#include <fmt/ranges.h>

#include "Tools/reportctl/pages/Completions.h"
#include "Tools/reportctl/pages/Mdoc.h"

namespace reportctl::pages {
namespace {

/// Escapes a description for single quotes. Brackets and colons are escaped, too, because they have a meaning
/// in _arguments and _describe.
std::string Quoted(const std::string& text) {
    std::string quoted;
    for (const char c : text) {
        if (c == '\'')
            quoted += "'\\'";
        else if (c == '[' || c == ']' || c == ':' || c == '\\')
            quoted += '\\';
        quoted += c;
    }
    return quoted;
}

std::string Value(const Option& option) {
    if (option.value.empty())
        return {};
    if (option.choices.empty())
        return fmt::format(":{}:_files", Quoted(option.value));
    return fmt::format(":{}:({})", Quoted(option.value), fmt::join(option.choices, " "));
}

std::string Arguments(const Command& command) {
    std::string text;
    for (const auto& option : command.options) {
        if (option.isPositional) {
            if (command.commands.empty()) // otherwise the first word is the name of a command
                text += fmt::format(" \\\n        '::{}:_files'", Quoted(option.names.front()));
            continue;
        }
        for (const auto& name : option.names)
            text += fmt::format(" \\\n        '{}[{}]{}'", name,
                                Quoted(mdoc::FirstSentence(option.description)), Value(option));
    }
    return text;
}

std::string Descriptions(const Command& command) {
    std::string text;
    for (const auto& sub : command.commands)
        text += fmt::format("            '{}:{}'\n", sub.path.back(),
                            Quoted(mdoc::FirstSentence(sub.description)));
    return text;
}

std::string Branches(const Command& command) {
    std::string text;
    for (const auto& sub : command.commands)
        text += fmt::format("        {}) _{} ;;\n", sub.path.back(), sub.Name("_"));
    return text;
}

/// The shell function of a command, and those of the commands below it. A function completes the command's
/// own options, and hands the rest to the function of the next command on the line.
std::string Function(const Command& command) {
    if (command.commands.empty())
        return fmt::format("_{}() {{\n    _arguments -s{}\n}}\n", command.Name("_"), Arguments(command));
    auto text = fmt::format(R"(_{}() {{
    local context state line
    typeset -A opt_args
    _arguments -s -C{} \
        '1: :->command' \
        '*:: :->rest'
    case $state in
    command)
        local -a commands=(
{}        )
        _describe command commands
        ;;
    rest)
        case $line[1] in
{}        esac
        ;;
    esac
}}
)",
                            command.Name("_"), Arguments(command), Descriptions(command), Branches(command));
    for (const auto& sub : command.commands)
        text += Function(sub);
    return text;
}

} // namespace

std::string ZshCompletion(const Command& program) {
    return fmt::format("#compdef {0}\n# completion of {0} for zsh\n{1}_{0} \"$@\"\n", program.Name(),
                       Function(program));
}

} // namespace reportctl::pages
