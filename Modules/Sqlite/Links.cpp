#include "Modules/Sqlite/Links.h"

#include <filesystem>
#include <system_error>

#include <sys/stat.h>

#include "Modules/Sqlite/Trust.h"

namespace Sqlite {
namespace {

namespace fs = std::filesystem;

constexpr int MAX_LINKS = 40; ///< As many as the operating system follows.

void RequireUnchangeable(const struct stat& link, const fs::path& path) {
    if (!IsOurs(link))
        throw UnsafePath("the link " + path.string() + " belongs to another user");
    const auto directory = path.parent_path().string();
    struct stat status {};
    if (::stat(directory.c_str(), &status) != 0)
        throw UnsafePath(directory + " cannot be looked at");
    // Here the sticky bit is enough: the link is there already, and other users cannot remove or rename it.
    if (!IsOurs(status) || (status.st_mode & S_ISVTX) == 0)
        RequireOursAlone(status, directory);
}

/// The walk along a path. What it has passed holds no link, so ".." is there what it is in a text.
class Walk {
public:
    explicit Walk(const fs::path& path) : m_rest(path.relative_path()) {}

    /// Goes on by one component. False when the walk has ended.
    bool Next() {
        if (m_rest.empty())
            return false;
        const auto next = m_passed / *m_rest.begin();
        m_rest = WithoutFirst(m_rest);
        struct stat status {};
        if (::lstat(next.c_str(), &status) != 0)
            return false;
        if (S_ISLNK(status.st_mode))
            return Follow(status, next);
        m_passed = next.lexically_normal();
        return true;
    }

private:
    static fs::path WithoutFirst(const fs::path& path) {
        fs::path rest;
        for (auto name = std::next(path.begin()); name != path.end(); ++name)
            rest /= *name;
        return rest;
    }

    bool Follow(const struct stat& status, const fs::path& link) {
        RequireUnchangeable(status, link);
        if (++m_links > MAX_LINKS)
            return false;
        std::error_code error;
        const auto target = fs::read_symlink(link, error);
        if (error)
            return false;
        if (target.is_absolute())
            m_passed = "/";
        m_rest = target.relative_path() / m_rest;
        return true;
    }

    fs::path m_passed = "/";
    fs::path m_rest;
    int m_links = 0;
};

} // namespace

void RequireOurLinks(const std::string& path) {
    std::error_code error;
    const auto absolute = std::filesystem::absolute(path, error);
    if (error)
        return;
    for (Walk walk(absolute); walk.Next();) {
    }
}

} // namespace Sqlite
