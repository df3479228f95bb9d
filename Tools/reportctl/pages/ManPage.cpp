#include "Tools/reportctl/pages/ManPage.h"

#include <algorithm>
#include <cctype>

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "Tools/reportctl/pages/Mdoc.h"

namespace reportctl::pages {
namespace {

constexpr auto PROGRAM_PATH_LENGTH = 1U;

std::string UpperCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
    return text;
}

/// The option's names and value in mdoc, such as "Fl h , Fl -help Ar TEXT".
std::string Terms(const Option& option, const std::string& separator) {
    if (option.isPositional)
        return "Ar " + mdoc::Words(option.names.front());
    std::string terms;
    for (const auto& name : option.names)
        terms += (terms.empty() ? "" : separator) + "Fl " + name.substr(1);
    return terms + (option.value.empty() ? "" : " Ar " + mdoc::Words(option.value));
}

std::string Synopsis(const Command& command) {
    auto text = fmt::format(".Nm {}\n", command.path.front());
    for (std::size_t i = 1; i < command.path.size(); ++i)
        text += fmt::format(".Cm {}\n", command.path[i]);
    for (const auto& option : command.options)
        text += fmt::format("{} {}{}\n", option.isRequired ? "." : ".Op", Terms(option, " | "),
                            option.isRepeatable ? " ..." : "");
    if (!command.commands.empty())
        text += ".Op Ar command Op Ar option ...\n";
    return text;
}

/// The option's facts that --help shows beside the description.
std::string Remarks(const Option& option) {
    std::string text;
    if (!option.limits.empty())
        text += fmt::format("Its values: {}.\n", mdoc::Words(option.limits));
    if (!option.defaultValue.empty())
        text += fmt::format("By default: {}.\n", mdoc::Words(option.defaultValue));
    if (!option.needs.empty())
        text += fmt::format("Goes with {} only.\n",
                            mdoc::Words(fmt::format("{}", fmt::join(option.needs, ", "))));
    if (!option.excludes.empty())
        text += fmt::format("Not together with {}.\n",
                            mdoc::Words(fmt::format("{}", fmt::join(option.excludes, ", "))));
    return text;
}

std::string WithFullStop(const std::string& text) {
    return text.empty() || text.ends_with('.') ? text : text + ".";
}

std::string Items(const Command& command, const std::string& group, bool isPositional) {
    std::string items;
    for (const auto& option : command.options)
        if (option.isPositional == isPositional && (isPositional || option.group == group))
            items += fmt::format(".It {}\n{}{}", Terms(option, " , "),
                                 mdoc::Paragraphs(WithFullStop(option.description)), Remarks(option));
    return items;
}

std::string List(const std::string& introduction, const std::string& items) {
    if (items.empty())
        return {};
    return fmt::format(".Pp\n{}:\n.Bl -tag -width Ds\n{}.El\n", introduction, items);
}

/// The groups of the options, each once, in the order of --help.
std::vector<std::string> Groups(const Command& command) {
    std::vector<std::string> groups;
    for (const auto& option : command.options)
        if (!option.isPositional && std::find(groups.begin(), groups.end(), option.group) == groups.end())
            groups.push_back(option.group);
    return groups;
}

std::string Options(const Command& command) {
    auto text = List("The arguments are as follows", Items(command, "", true));
    for (const auto& group : Groups(command))
        text += List(group == "Options" ? "The options are as follows" : mdoc::Words(group),
                     Items(command, group, false));
    return text;
}

/// A section for each command below this command, with everything that --help says about it.
std::string Sections(const Command& command) {
    std::string text;
    for (const auto& sub : command.commands)
        text += fmt::format(".Ss {}\n{}.Pp\n{}{}{}", sub.Name(), Synopsis(sub),
                            mdoc::Paragraphs(WithFullStop(sub.description)), Options(sub), Sections(sub));
    return text;
}

std::string CommandList(const Command& command) {
    std::string items;
    for (const auto& sub : command.commands)
        items += fmt::format(".It Xr {} 1\n{}", sub.Name("-"),
                             mdoc::Paragraphs(mdoc::FirstSentence(sub.description) + "."));
    return List("The commands are as follows", items);
}

std::string Description(const Command& command) {
    auto text = ".Sh DESCRIPTION\n" + mdoc::Paragraphs(WithFullStop(command.description)) + Options(command);
    if (command.path.size() == PROGRAM_PATH_LENGTH)
        return text + CommandList(command);
    return text + Sections(command);
}

/// The paragraphs that --help prints below the options. Readers of manual pages look for each kind in another
/// section.
struct Footer {
    std::string notes;
    std::string examples;
    std::string exitCodes;
};

Footer ReadFooter(const std::string& text) {
    static constexpr std::string_view EXAMPLES = "Example";
    static constexpr std::string_view EXIT_CODES = "Exit codes:";
    Footer footer;
    for (std::size_t begin = 0; begin < text.size();) {
        const auto end = std::min(text.find("\n\n", begin), text.size());
        const auto paragraph = text.substr(begin, end - begin);
        begin = end + 2;
        if (paragraph.starts_with(EXIT_CODES))
            footer.exitCodes += paragraph + "\n\n";
        else if (paragraph.starts_with(EXAMPLES))
            footer.examples += paragraph.substr(std::min(paragraph.size(), paragraph.find('\n'))) + "\n\n";
        else
            footer.notes += paragraph + "\n\n";
    }
    return footer;
}

std::string Section(const std::string& heading, const std::string& text) {
    const auto paragraphs = mdoc::Paragraphs(text);
    return paragraphs.empty() ? "" : fmt::format(".Sh {}\n{}", heading, paragraphs);
}

std::string SeeAlso(const Command& command) {
    std::string text = ".Sh SEE ALSO\n";
    if (command.path.size() > PROGRAM_PATH_LENGTH)
        text += ".Xr reportctl 1 ,\n";
    return text + ".Xr hublink-report.env 5 ,\n.Xr SyncServiceReport 8\n";
}

} // namespace

std::string ManPage(const Command& command, const std::string& date) {
    const auto name = command.Name("-");
    const auto footer = ReadFooter(command.footer);
    return fmt::format(".Dd {}\n.Dt {} 1\n.Os\n.Sh NAME\n.Nm {}\n.Nd {}\n.Sh SYNOPSIS\n{}", date,
                       UpperCase(name), name, mdoc::Words(mdoc::FirstSentence(command.description)),
                       Synopsis(command)) +
           Description(command) + (footer.notes.empty() ? "" : ".Pp\n" + mdoc::Paragraphs(footer.notes)) +
           Section("EXIT STATUS", footer.exitCodes) + Section("EXAMPLES", footer.examples) + SeeAlso(command);
}

} // namespace reportctl::pages
