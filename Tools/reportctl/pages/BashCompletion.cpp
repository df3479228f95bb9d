#include <algorithm>

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "Tools/reportctl/pages/Completions.h"

namespace reportctl::pages {
namespace {

struct Tables {
    std::string commands; ///< patterns for the words that lead to a command
    std::string values;   ///< cases that complete an option's value
    std::string words;    ///< cases for the words that may come next in a command
};

std::string ValueCase(const Command& command, const Option& option) {
    std::string patterns;
    for (const auto& name : option.names)
        patterns += fmt::format("{}\"{} {}\"", patterns.empty() ? "" : " | ", command.Name(), name);
    if (option.choices.empty())
        return fmt::format("    {}) compopt -o default; return ;;\n", patterns);
    return fmt::format("    {}) words=\"{}\" ;;\n", patterns, fmt::join(option.choices, " "));
}

/// Whether the command's word is the name of a file. The words of other commands are texts and ids.
bool TakesFile(const Command& command) {
    return std::any_of(command.options.begin(), command.options.end(), [](const Option& option) {
        const auto& name = option.names.front();
        return option.isPositional && (name == "FILE" || name == "DIRECTORY");
    });
}

void Add(Tables& tables, const Command& command) {
    std::vector<std::string> words;
    for (const auto& sub : command.commands) {
        words.push_back(sub.path.back());
        tables.commands += fmt::format("{}\"{}\"", tables.commands.empty() ? "" : " | ", sub.Name());
    }
    for (const auto& option : command.options) {
        if (option.isPositional)
            continue;
        words.insert(words.end(), option.names.begin(), option.names.end());
        if (!option.value.empty())
            tables.values += ValueCase(command, option);
    }
    tables.words += fmt::format("    \"{}\") words=\"{}\"{} ;;\n", command.Name(), fmt::join(words, " "),
                                TakesFile(command) ? " takes_file=yes" : "");
    for (const auto& sub : command.commands)
        Add(tables, sub);
}

} // namespace

std::string BashCompletion(const Command& program) {
    Tables tables;
    Add(tables, program);
    return fmt::format(R"(# completion of {0} for bash
_{0}() {{
    local current=${{COMP_WORDS[COMP_CWORD]}} previous=${{COMP_WORDS[COMP_CWORD - 1]}}
    local command={0} words="" takes_file="" i
    for ((i = 1; i < COMP_CWORD; i++)); do
        case "$command ${{COMP_WORDS[i]}}" in
        {1}) command+=" ${{COMP_WORDS[i]}}" ;;
        esac
    done
    case "$command" in
{2}    esac
    case "$command $previous" in
{3}    esac
    if [ -n "$takes_file" ] && [[ $current != -* ]]; then compopt -o default; return; fi
    COMPREPLY=($(compgen -W "$words" -- "$current"))
    # Nothing fits: a file's name may.
    [ ${{#COMPREPLY[@]}} -gt 0 ] || compopt -o default
}}
complete -F _{0} {0}
)",
                       program.Name(), tables.commands, tables.words, tables.values);
}

} // namespace reportctl::pages
