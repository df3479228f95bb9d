#include "Tools/reportctl/service/Processes.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string_view>

#include <fmt/format.h>
#include <pwd.h>
#include <sys/stat.h>

#include "Common/Wire.h"

namespace reportctl::service {
namespace {

namespace fs = std::filesystem;

// 127.0.0.1 and 0.0.0.0, as the kernel's tables write addresses; then the same as addresses of IPv6. A socket
// at the last one receives what is sent to IPv4 addresses, too, unless it was told not to.
constexpr auto LOOPBACK = "0100007F";
constexpr auto ANY_ADDRESS = "00000000";
constexpr auto LOOPBACK_IN_IPV6 = "0000000000000000FFFF00000100007F";
constexpr auto ANY_IPV6_ADDRESS = "00000000000000000000000000000000";

std::string Folder(pid_t process) {
    return fmt::format("/proc/{}", process);
}

std::string ContentOf(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

std::string TargetOf(const fs::path& link) {
    std::error_code error;
    return fs::read_symlink(link, error).string();
}

template <typename Number>
void ReadNumber(std::string_view text, Number& number, int base = 10) {
    std::from_chars(text.data(), text.data() + text.size(), number, base);
}

/// The socket in a line of the kernel's table, without its address. The fifth word is what waits to be sent
/// and to be read, in hexadecimal digits with a colon between.
BoundSocket SocketIn(const std::vector<std::string>& words) {
    BoundSocket socket;
    ReadNumber(words[7], socket.owner);
    ReadNumber(words[9], socket.inode);
    ReadNumber(std::string_view(words[4]).substr(words[4].find(':') + 1), socket.unreadBytes, 16);
    if (words.size() > 12)
        ReadNumber(words[12], socket.dropped);
    return socket;
}

/// The sockets that are bound to one of these addresses: one of IPv4, one of IPv6.
std::vector<BoundSocket> SocketsAt(const std::array<std::string, 2>& addresses) {
    constexpr std::array TABLES = {"/proc/net/udp", "/proc/net/udp6"};
    std::vector<BoundSocket> sockets;
    for (std::size_t i = 0; i < TABLES.size(); ++i) {
        std::ifstream table(TABLES[i]);
        for (std::string line; std::getline(table, line);) {
            std::istringstream fields(line);
            const std::vector<std::string> words{std::istream_iterator<std::string>(fields), {}};
            if (words.size() >= 10 && words[1] == addresses[i])
                sockets.push_back(SocketIn(words));
        }
    }
    return sockets;
}

} // namespace

std::string NameOf(uid_t user) {
    passwd entry{};
    passwd* found = nullptr;
    std::array<char, 16384> buffer{};
    if (::getpwuid_r(user, &entry, buffer.data(), buffer.size(), &found) != 0 || found == nullptr)
        return std::to_string(user);
    return found->pw_name;
}

std::optional<std::string> ProgramNameOf(pid_t process) {
    // When an upgrade has replaced the program's file, the system adds " (deleted)" to the path.
    if (const auto path = TargetOf(Folder(process) + "/exe"); !path.empty())
        return fs::path(path.substr(0, path.rfind(" (deleted)"))).filename().string();
    auto name = ContentOf(Folder(process) + "/comm");
    if (name.empty())
        return std::nullopt;
    name.pop_back();
    return name;
}

std::optional<uid_t> OwnerOf(pid_t process) {
    struct stat status {};
    if (::stat(Folder(process).c_str(), &status) != 0)
        return std::nullopt;
    return status.st_uid;
}

std::optional<std::string> EnvironmentOf(pid_t process, const std::string& name) {
    std::istringstream variables(ContentOf(Folder(process) + "/environ"));
    for (std::string variable; std::getline(variables, variable, '\0');)
        if (variable.starts_with(name + "="))
            return variable.substr(name.size() + 1);
    return std::nullopt;
}

std::optional<bool> HasLoaded(pid_t process, const std::string& library) {
    const auto maps = ContentOf(Folder(process) + "/maps");
    if (maps.empty())
        return std::nullopt;
    return maps.find("/" + library) != std::string::npos;
}

std::optional<bool> HasSocket(pid_t process, std::uint64_t inode) {
    const auto wanted = fmt::format("socket:[{}]", inode);
    std::error_code error;
    fs::directory_iterator files(Folder(process) + "/fd", error);
    if (error)
        return std::nullopt;
    return std::any_of(begin(files), end(files),
                       [&](const fs::directory_entry& file) { return TargetOf(file.path()) == wanted; });
}

std::optional<pid_t> ProcessOfSocket(std::uint64_t inode) {
    std::error_code error;
    for (const auto& entry : fs::directory_iterator("/proc", error)) {
        const auto name = entry.path().filename().string();
        pid_t process = 0;
        if (std::from_chars(name.data(), name.data() + name.size(), process).ec == std::errc() &&
            HasSocket(process, inode).value_or(false))
            return process;
    }
    return std::nullopt;
}

std::vector<BoundSocket> SocketsAtTheServicesPort() {
    const auto port = fmt::format(":{:04X}", Wire::PORT);
    auto sockets = SocketsAt({LOOPBACK + port, LOOPBACK_IN_IPV6 + port});
    for (auto& socket : sockets)
        socket.isAtTheServicesAddress = true;
    const auto any = SocketsAt({ANY_ADDRESS + port, ANY_IPV6_ADDRESS + port});
    sockets.insert(sockets.end(), any.begin(), any.end());
    return sockets;
}

} // namespace reportctl::service
