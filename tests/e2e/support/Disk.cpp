#include "tests/e2e/support/Disk.h"

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <system_error>

#include <sys/mount.h>

namespace {

void Mount(const std::string& directory, unsigned long flags, const std::string& options) {
    if (::mount("test", directory.c_str(), "tmpfs", flags, options.c_str()) != 0)
        throw std::system_error(errno, std::generic_category(), "mount " + directory);
}

} // namespace

Disk::Disk(std::string directory, std::uintmax_t bytes) : m_directory(std::move(directory)) {
    std::filesystem::create_directories(m_directory);
    Mount(m_directory, 0, "mode=700,size=" + std::to_string(bytes));
}

Disk::~Disk() {
    ::umount2(m_directory.c_str(), MNT_DETACH);
}

void Disk::Fill() const {
    std::ofstream filler(Filler(), std::ios::app);
    while (const auto room = std::filesystem::space(m_directory).available) {
        filler.clear();
        filler << std::string(room, 'x') << std::flush;
    }
}

void Disk::MakeRoom() const {
    std::filesystem::remove(Filler());
}

void Disk::ForbidWriting() const {
    Remount(MS_RDONLY);
}

void Disk::AllowWriting() const {
    Remount(0);
}

void Disk::Remount(unsigned long flags) const {
    Mount(m_directory, MS_REMOUNT | flags, "");
}
