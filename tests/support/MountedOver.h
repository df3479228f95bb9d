#pragma once

#include <fstream>
#include <stdexcept>
#include <string>

#include <sys/mount.h>

/// Puts one file in the place of another while this object exists. Makes the other file when there is none.
/// Needs the sandbox, which has mounts of its own.
class MountedOver {
public:
    MountedOver(const std::string& file, std::string place) : m_place(std::move(place)) {
        std::ofstream(m_place, std::ios::app).close();
        if (::mount(file.c_str(), m_place.c_str(), nullptr, MS_BIND, nullptr) != 0)
            throw std::runtime_error("cannot mount " + file + " over " + m_place);
    }
    ~MountedOver() { ::umount2(m_place.c_str(), MNT_DETACH); }
    MountedOver(const MountedOver&) = delete;
    MountedOver& operator=(const MountedOver&) = delete;

private:
    std::string m_place;
};
