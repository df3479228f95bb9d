#include "Tools/reportctl/pages/Command.h"

#include <algorithm>
#include <set>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <fmt/ranges.h>

namespace reportctl::pages {
namespace {

/// The values in a type such as "TEXT:{csv,jsonl}". CLI11 writes the set of an option's allowed values like
/// that.
std::vector<std::string> ChoicesIn(const std::string& type) {
    const auto begin = type.find('{');
    const auto end = type.find('}', begin);
    if (begin == std::string::npos || end == std::string::npos)
        return {};
    auto values = CLI::detail::split(type.substr(begin + 1, end - begin - 1), ',');
    for (auto& value : values) // CLI11 writes a mapping as "name->number"
        value = value.substr(0, value.find("->"));
    return values;
}

std::vector<std::string> NamesOf(const CLI::Option& option) {
    std::vector<std::string> names;
    for (const auto& name : option.get_snames())
        names.push_back("-" + name);
    for (const auto& name : option.get_lnames())
        names.push_back("--" + name);
    if (names.empty())
        names.push_back(option.get_name(true));
    return names;
}

/// The names are sorted, because CLI11 keeps the options in the order of their addresses.
std::vector<std::string> NamesOf(const std::set<CLI::Option*>& options) {
    std::vector<std::string> names;
    names.reserve(options.size());
    for (const auto* option : options)
        names.push_back(NamesOf(*option).back());
    std::sort(names.begin(), names.end());
    return names;
}

bool IsOneWord(const std::string& text) {
    return text.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZ") == std::string::npos;
}

/// "TEXT:TIME" is a value called TIME, "INT:NONNEGATIVE" an INT, and "INT:INT in [1 - 9]" an INT with limits.
void ReadType(Option& read, const std::string& type) {
    const auto colon = type.find(':');
    read.value = type.substr(0, colon);
    read.choices = ChoicesIn(type);
    if (colon == std::string::npos)
        return;
    const auto check = type.substr(colon + 1);
    if (!IsOneWord(check))
        read.limits = check;
    else if (read.value == "TEXT")
        read.value = check;
}

Option ReadOption(const CLI::Option& option) {
    Option read;
    read.names = NamesOf(option);
    if (option.get_type_size() != 0)
        ReadType(read, option.get_type_name());
    read.description = option.get_description();
    read.group = option.get_group();
    read.isPositional = option.get_snames().empty() && option.get_lnames().empty();
    read.isRequired = option.get_required();
    read.isRepeatable = read.isPositional && option.get_items_expected_max() > 1;
    read.defaultValue = option.get_default_str();
    read.needs = NamesOf(option.get_needs());
    read.excludes = NamesOf(option.get_excludes());
    return read;
}

} // namespace

std::string Command::Name(const std::string& separator) const {
    return fmt::format("{}", fmt::join(path, separator));
}

Command Read(const CLI::App& app, const std::vector<std::string>& parents) {
    Command command;
    command.path = parents;
    command.path.push_back(app.get_name());
    command.description = app.get_description();
    command.footer = app.get_footer();
    for (const auto* option : app.get_options([](const CLI::Option* o) { return !o->get_group().empty(); }))
        command.options.push_back(ReadOption(*option));
    for (const auto* sub : app.get_subcommands([](const CLI::App* a) { return !a->get_group().empty(); }))
        command.commands.push_back(Read(*sub, command.path));
    return command;
}

} // namespace reportctl::pages
