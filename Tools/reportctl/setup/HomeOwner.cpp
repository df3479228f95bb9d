#include "Tools/reportctl/setup/HomeOwner.h"

#include <filesystem>

#include <fmt/format.h>
#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Tools/reportctl/terminal/ShellQuoted.h"

namespace reportctl::setup {
namespace {

std::filesystem::path NearestExisting(std::filesystem::path path) {
    std::error_code ignored;
    while (!std::filesystem::exists(path, ignored) && path.has_relative_path())
        path = path.parent_path();
    return path;
}

/// The command that runs set-up as that user on the same directory. `sudo -H` sets HOME to the user's own
/// home.
std::string CommandFor(const passwd* user, uid_t number, const std::string& data) {
    const auto name = user != nullptr ? std::string(user->pw_name) : fmt::format("'#{}'", number);
    if (user != nullptr && data == std::string(user->pw_dir) + "/.local/share")
        return fmt::format("sudo -H -u {} reportctl setup", name);
    return fmt::format("sudo -u {} env XDG_DATA_HOME={} reportctl setup", name, terminal::ShellQuoted(data));
}

} // namespace

std::optional<std::string> ReasonAgainstRoot(const std::string& data) {
    const auto directory = NearestExisting(data).string();
    struct stat status {};
    if (::geteuid() != 0 || ::stat(directory.c_str(), &status) != 0 || status.st_uid == 0)
        return std::nullopt;
    const passwd* const user = ::getpwuid(status.st_uid); // NOLINT(concurrency-mt-unsafe): the one thread
    return fmt::format(
        "{} belongs to {}, and set-up runs as root: what it made there would be root's, and that "
        "user's service could not use it. Run: {}",
        directory, user != nullptr ? user->pw_name : fmt::format("user {}", status.st_uid),
        CommandFor(user, status.st_uid, data));
}

} // namespace reportctl::setup
