#include "SystemTool/Version.h"

#include <fstream>

#include <mach-o/loader.h>

// Written for the product's home system; the project's own tests run on Linux only.
namespace SystemTool::Version {
namespace {

template <typename T>
T At(std::ifstream& file, std::streamoff offset) {
    T value{};
    file.seekg(offset);
    file.read(reinterpret_cast<char*>(&value), sizeof value);
    return value;
}

template <std::size_t N>
std::string Hexadecimal(const std::uint8_t (&bytes)[N]) {
    static constexpr char DIGITS[] = "0123456789abcdef";
    std::string text;
    for (const auto byte : bytes) {
        text += DIGITS[byte >> 4U];
        text += DIGITS[byte & 0xFU];
    }
    return text;
}

} // namespace

/// The version stays empty: the note that holds it exists only in ELF files.
Program Of(const std::string& file) {
    std::ifstream input(file, std::ios::binary);
    const auto header = At<mach_header_64>(input, 0);
    std::streamoff offset = sizeof header;
    for (std::uint32_t i = 0; input && header.magic == MH_MAGIC_64 && i < header.ncmds; ++i) {
        const auto command = At<load_command>(input, offset);
        if (command.cmd == LC_UUID)
            return {.version = {}, .buildId = Hexadecimal(At<uuid_command>(input, offset).uuid)};
        offset += command.cmdsize;
    }
    return {};
}

} // namespace SystemTool::Version
