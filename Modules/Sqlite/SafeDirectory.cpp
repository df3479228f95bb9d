#include "Modules/Sqlite/SafeDirectory.h"

#include <array>
#include <cerrno>
#include <climits>
#include <filesystem>
#include <optional>
#include <system_error>
#include <vector>

#include <sys/stat.h>

#include "Modules/Sqlite/Trust.h"
#include "SystemTool/Errno.h"
#include "SystemTool/IO/MakeDirectories.h"
#include "SystemTool/Platform.h"

namespace Sqlite {
namespace {

namespace fs = std::filesystem;
using SystemTool::IO::Descriptor;

constexpr int MAX_LINKS = 40; ///< As many as the operating system follows.

enum class Missing { Make, Leave };

[[noreturn]] void Fail(const std::string& what, int error = errno) {
    throw std::system_error(error, std::generic_category(), what);
}

/// The path without dots and doubled separators. Dots are removed from the text alone: when there is a link
/// before "..", the result may be another directory than the one that the system would find. That is safe,
/// because the result is checked like any other path.
std::string Normal(const std::string& path) {
    if (path.empty() || path.front() != '/' || path.find('\0') != std::string::npos)
        throw UnsafePath("not an absolute path");
    auto normal = fs::path(path).lexically_normal().string();
    const auto first = normal.find_first_not_of('/'); // lexically_normal may keep two slashes at the start
    normal = first == std::string::npos ? "/" : normal.substr(first - 1);
    while (normal.size() > 1 && normal.ends_with('/'))
        normal.pop_back();
    return normal;
}

bool IsIn(const std::string& path, const std::string& directory) {
    return !directory.empty() && path.starts_with(directory) &&
           (path.size() == directory.size() || path[directory.size()] == '/');
}

std::vector<std::string> NamesOf(const std::string& path) {
    std::vector<std::string> names;
    for (const auto& name : fs::path(path).relative_path())
        names.push_back(name.string());
    return names;
}

/// The data directory's path without links. With Missing::Make, it makes the directory and its missing
/// parents: the path comes from the environment, which is trusted.
std::string RealHome(const std::string& home, Missing missing) {
    if (home.empty() || home.front() != '/')
        return {};
    const auto normal = Normal(home);
    if (missing == Missing::Make)
        if (const auto failure = SystemTool::IO::MakeDirectories(normal))
            Fail("Cannot make the directory " + failure.path, failure.error);
    std::error_code error;
    const auto real = fs::weakly_canonical(normal, error).string();
    return error ? normal : Normal(real);
}

/// The walk along one path, from the data directory or from the root. It ends at the wanted directory, at the
/// first link, or at the first directory that does not exist and is not to be made.
class Way {
public:
    Way(const std::string& path, const std::string& home, Missing missing)
        : m_isBelowHome(IsIn(path, home)), m_missing(missing),
          m_names(NamesOf(m_isBelowHome ? path.substr(home.size()) : path)),
          m_path(m_isBelowHome ? home : "/") {
        if (m_isBelowHome && m_names.size() > SafeDirectory::MAX_LEVELS)
            throw UnsafePath("the path has too many levels");
    }

    /// Returns the path from which to begin again when there is a link. Returns nothing when the walk is at
    /// its end.
    std::optional<std::string> Go() {
        m_directory = Descriptor(::open(m_path.c_str(), SafeDirectory::LOOK_FLAGS));
        if (m_directory.Number() < 0 && errno == ENOENT && m_missing == Missing::Leave)
            return std::nullopt;
        if (m_directory.Number() < 0)
            Fail("Cannot open the directory " + m_path);
        for (; m_next < m_names.size(); ++m_next) {
            if (m_next > 0 || !m_isBelowHome)
                RequireSafe();
            struct stat status {};
            if (!Look(status))
                return std::nullopt;
            if (S_ISLNK(status.st_mode))
                return Target(status);
            Enter(status);
        }
        RequireSafe();
        return std::nullopt;
    }

    SafeDirectory Result() {
        for (; m_next < m_names.size(); ++m_next) // components that do not exist yet
            m_path = Child();
        return {m_path, std::move(m_directory)};
    }

private:
    std::string Child() const { return (m_path == "/" ? "" : m_path) + "/" + m_names[m_next]; }

    void RequireSafe() {
        struct stat status {};
        if (::fstat(m_directory.Number(), &status) != 0)
            Fail("Cannot look at " + m_path);
        RequireOursAlone(status, m_path);
    }

    void Enter(const struct stat& status) {
        if (!S_ISDIR(status.st_mode))
            throw UnsafePath(Child() + " is no directory");
        Descriptor child(
            ::openat(m_directory.Number(), m_names[m_next].c_str(), SafeDirectory::LOOK_FLAGS | O_NOFOLLOW));
        if (child.Number() < 0)
            Refuse();
        m_path = Child();
        m_directory = std::move(child);
    }

    /// False when the component is missing and is not to be made.
    bool Look(struct stat& status) {
        const auto* name = m_names[m_next].c_str();
        if (::fstatat(m_directory.Number(), name, &status, AT_SYMLINK_NOFOLLOW) == 0)
            return true;
        if (errno != ENOENT)
            Refuse();
        if (!m_isBelowHome)
            throw UnsafePath(Child() + " does not exist, and is only made below the user's data directory");
        if (m_missing == Missing::Leave)
            return false;
        if (::mkdirat(m_directory.Number(), name, SystemTool::IO::PRIVATE_DIRECTORY) == 0)
            GiveBackWhatTheUmaskTook(name);
        else if (errno != EEXIST)
            Fail("Cannot make the directory " + Child());
        if (::fstatat(m_directory.Number(), name, &status, AT_SYMLINK_NOFOLLOW) != 0)
            Fail("Cannot look at " + Child());
        return true;
    }

    /// The umask of a host may take rights of the owner away from a new directory. A file system without
    /// modes refuses the change, but the directory can be used all the same.
    void GiveBackWhatTheUmaskTook(const char* name) const {
        [[maybe_unused]] const int ignored =
            ::fchmodat(m_directory.Number(), name, SystemTool::IO::PRIVATE_DIRECTORY, AT_SYMLINK_NOFOLLOW);
    }

    std::string Target(const struct stat& link) const {
        if (!IsOurs(link))
            throw UnsafePath("the link " + Child() + " belongs to another user");
        std::array<char, PATH_MAX> text{};
        const auto length =
            ::readlinkat(m_directory.Number(), m_names[m_next].c_str(), text.data(), text.size());
        if (length < 0)
            Refuse();
        std::string target(text.data(), static_cast<std::size_t>(length));
        if (!target.starts_with('/'))
            target = m_path + "/" + target;
        for (auto i = m_next + 1; i < m_names.size(); ++i)
            target += "/" + m_names[i];
        return target;
    }

    /// A lack of descriptors or memory and a read error may pass, so they throw std::system_error. All other
    /// errors are the path's fault.
    [[noreturn]] void Refuse() const {
        if (errno == EMFILE || errno == ENFILE || errno == ENOMEM || errno == EIO)
            Fail("Cannot open the directory " + Child());
        throw UnsafePath(Child() + ": " + SystemTool::ErrnoText(errno));
    }

    const bool m_isBelowHome;
    const Missing m_missing;
    const std::vector<std::string> m_names;
    std::size_t m_next = 0;
    std::string m_path; ///< The path of m_directory.
    Descriptor m_directory;
};

SafeDirectory Find(const std::string& wanted, const std::string& home, Missing missing) {
    auto path = Normal(wanted);
    const auto realHome = RealHome(home, missing);
    if (!realHome.empty() && IsIn(path, Normal(home)))
        path = Normal(realHome + "/" + path.substr(Normal(home).size()));
    for (int links = 0; links < MAX_LINKS; ++links) {
        Way way(path, realHome, missing);
        const auto target = way.Go();
        if (!target)
            return way.Result();
        path = Normal(*target);
    }
    throw UnsafePath("too many links");
}

} // namespace

SafeDirectory SafeDirectory::Open(const std::string& path, const std::string& home) {
    return Find(path, home, Missing::Make);
}

std::string SafeDirectory::Resolve(const std::string& path, const std::string& home) {
    return Find(path, home, Missing::Leave).Path();
}

std::string SafeDirectory::PathOf(const std::string& file) const {
    return SystemTool::Platform::PathThrough(Number()) + "/" + file;
}

} // namespace Sqlite
