#include "Modules/BoostLogger/RotatedFiles.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <numeric>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace BoostLogger {

namespace {

/// No rotation reaches this number. A file whose name has this number or a larger one is not ours, and must
/// not count as our last rotated file.
constexpr std::uint64_t MAX_NUMBER = 1'000'000'000'000'000;

struct CloseDirectory {
    void operator()(DIR* directory) const { closedir(directory); }
};

} // namespace

std::vector<RotatedFile> FilesToDelete(std::vector<RotatedFile> files, std::int64_t budgetBytes) {
    std::sort(files.begin(), files.end(), [](const auto& a, const auto& b) { return a.number < b.number; });
    std::int64_t total =
        std::accumulate(files.begin(), files.end(), std::int64_t{0},
                        [](std::int64_t sum, const auto& file) { return sum + file.sizeBytes; });
    auto kept = files.begin();
    for (; kept != files.end() && total > budgetBytes; ++kept)
        total -= kept->sizeBytes;
    files.erase(kept, files.end());
    return files;
}

RotatedFiles::RotatedFiles(std::string directory, const std::string& liveName)
    : m_directory(std::move(directory)), m_prefix(std::filesystem::path(liveName).stem().string() + "_"),
      m_suffix(std::filesystem::path(liveName).extension().string()) {}

FileFailure RotatedFiles::TakeIn(const std::string& livePath) {
    for (const RotatedFile& file : List())
        m_lastNumber = std::max(m_lastNumber, file.number);
    if (std::rename(livePath.c_str(), PathOf(m_lastNumber + 1).c_str()) != 0)
        return {errno, "rotate the file"};
    ++m_lastNumber;
    return {};
}

void RotatedFiles::Prune(std::int64_t budgetBytes) {
    for (const RotatedFile& file : FilesToDelete(List(), budgetBytes))
        unlink(PathOf(file.number).c_str());
}

std::optional<std::uint64_t> RotatedFiles::NumberOf(std::string_view name) const {
    if (!name.starts_with(m_prefix) || !name.ends_with(m_suffix) ||
        name.size() <= m_prefix.size() + m_suffix.size())
        return std::nullopt;
    name.remove_prefix(m_prefix.size());
    name.remove_suffix(m_suffix.size());
    std::uint64_t number = 0;
    const auto [end, error] = std::from_chars(name.data(), name.data() + name.size(), number);
    const bool ours = error == std::errc() && end == name.data() + name.size() && name.front() != '0';
    return ours && number < MAX_NUMBER ? std::optional(number) : std::nullopt;
}

std::vector<RotatedFile> RotatedFiles::List() const {
    std::vector<RotatedFile> files;
    const std::unique_ptr<DIR, CloseDirectory> directory(opendir(m_directory.c_str()));
    if (!directory)
        return files;
    // NOLINTNEXTLINE(concurrency-mt-unsafe): unsafe for threads that share a DIR; this one is ours alone
    while (const dirent* entry = readdir(directory.get())) {
        struct stat status {};
        const auto number = NumberOf(entry->d_name);
        if (number && fstatat(dirfd(directory.get()), entry->d_name, &status, AT_SYMLINK_NOFOLLOW) == 0)
            files.push_back({*number, status.st_size});
    }
    return files;
}

std::string RotatedFiles::PathOf(std::uint64_t number) const {
    return m_directory + "/" + m_prefix + std::to_string(number) + m_suffix;
}

} // namespace BoostLogger
