#include "Tools/reportctl/service/Environment.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>

#include <unistd.h>

#include "Tools/reportctl/service/Lock.h"
#include "Tools/reportctl/service/Processes.h"

namespace reportctl::service {
namespace {

namespace fs = std::filesystem;

void Add(std::map<std::string, std::string>& variables, const std::string& text) {
    if (const auto equals = text.find('='); equals != std::string::npos)
        variables.emplace(text.substr(0, equals), text.substr(equals + 1));
}

std::map<std::string, std::string> OwnVariables() {
    std::map<std::string, std::string> variables;
    for (char** variable = environ; *variable != nullptr; ++variable)
        Add(variables, *variable);
    return variables;
}

/// The variables that a process was started with. In /proc, each of them ends with a zero byte.
std::optional<std::map<std::string, std::string>> Of(const fs::path& process) {
    std::ifstream file(process / "environ", std::ios::binary);
    std::map<std::string, std::string> variables;
    for (std::string text; std::getline(file, text, '\0');)
        Add(variables, text);
    return variables.empty() ? std::nullopt : std::optional(std::move(variables));
}

/// Whether both environments name the same data directory. When they differ, the process serves other files
/// than those that this program looks at, so its settings are not ours.
bool HasSameData(const std::map<std::string, std::string>& one,
                 const std::map<std::string, std::string>& other) {
    const auto dataOf = [](const auto& variables) {
        const auto found = variables.find("XDG_DATA_HOME");
        return found == variables.end() ? std::string() : found->second;
    };
    return dataOf(one) == dataOf(other);
}

} // namespace

const char* Environment::Find(const std::string& name) const {
    const auto found = variables.find(name);
    return found == variables.end() ? nullptr : found->second.c_str();
}

Environment Own() {
    return {0, OwnVariables()};
}

void TakeOverProxies(const Environment& environment) {
    for (const auto* name : PROXIES)
        if (const auto* value = environment.Find(name))
            ::setenv(name, value, 1); // NOLINT(concurrency-mt-unsafe): this program has one thread
        else
            ::unsetenv(name); // NOLINT(concurrency-mt-unsafe)
}

Environment OfTheService() {
    auto own = OwnVariables();
    if (const auto process = LockedService(); process && OwnerOf(*process) == ::geteuid())
        if (auto variables = Of("/proc/" + std::to_string(*process));
            variables && HasSameData(*variables, own))
            return {*process, std::move(*variables)};
    return {0, std::move(own)};
}

} // namespace reportctl::service
