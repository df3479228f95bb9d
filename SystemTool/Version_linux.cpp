#include "SystemTool/Version.h"

#include <algorithm>
#include <cstring>
#include <fstream>
#include <string_view>

#include <link.h>

#include "SystemTool/PackageNote.h"

// Reads the notes of an ELF file. A note has an owner, a type and contents; notes are in segments of their
// own.
namespace SystemTool::Version {
namespace {

// Ours have some hundred bytes, but a damaged file may claim any length.
constexpr std::size_t MOST_NOTE_BYTES = 65536;
constexpr std::size_t WORD = 4;
constexpr std::size_t DOUBLE_WORD = 8;

using Header = ElfW(Ehdr);
using Segment = ElfW(Phdr);
using NoteHeader = ElfW(Nhdr);

template <typename T>
T At(std::ifstream& file, std::uint64_t offset) {
    T value{};
    file.seekg(static_cast<std::streamoff>(offset));
    file.read(reinterpret_cast<char*>(&value), sizeof value);
    return value;
}

std::string Contents(std::ifstream& file, const Segment& segment) {
    if (segment.p_filesz > MOST_NOTE_BYTES)
        return {};
    std::string bytes(segment.p_filesz, '\0');
    file.seekg(static_cast<std::streamoff>(segment.p_offset));
    file.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    return file ? bytes : std::string{};
}

std::string Hexadecimal(std::string_view bytes) {
    static constexpr char DIGITS[] = "0123456789abcdef";
    std::string text;
    for (const char byte : bytes) {
        text += DIGITS[static_cast<unsigned char>(byte) >> 4U];
        text += DIGITS[static_cast<unsigned char>(byte) & 0xFU];
    }
    return text;
}

std::string VersionIn(std::string_view json) {
    const auto key = json.find(PackageNote::VERSION_KEY);
    if (key == std::string_view::npos)
        return {};
    json.remove_prefix(key + std::strlen(PackageNote::VERSION_KEY));
    return std::string(json.substr(0, json.find('"')));
}

void Take(Program& program, std::uint32_t type, std::string_view owner, std::string_view contents) {
    if (type == NT_GNU_BUILD_ID && owner == std::string_view(ELF_NOTE_GNU, sizeof ELF_NOTE_GNU))
        program.buildId = Hexadecimal(contents);
    else if (type == PackageNote::TYPE &&
             owner == std::string_view(PackageNote::OWNER, sizeof PackageNote::OWNER))
        program.version = VersionIn(contents);
}

/// Reads the first note and removes it from `notes`. False when there is none, or when the note claims to be
/// longer than `notes` is.
bool TakeOne(Program& program, std::string_view& notes, std::size_t alignment) {
    const auto padded = [alignment](std::size_t size) {
        return (size + alignment - 1) / alignment * alignment;
    };
    NoteHeader header{};
    if (notes.size() < sizeof header)
        return false;
    std::memcpy(&header, notes.data(), sizeof header);
    const std::size_t contents = padded(sizeof header + header.n_namesz);
    if (contents + header.n_descsz > notes.size())
        return false;
    Take(program, header.n_type, notes.substr(sizeof header, header.n_namesz),
         notes.substr(contents, header.n_descsz));
    notes.remove_prefix(std::min(notes.size(), padded(contents + header.n_descsz)));
    return true;
}

bool IsOfThisMachinesKind(const Header& header) {
    return std::memcmp(header.e_ident, ELFMAG, SELFMAG) == 0 &&
           header.e_ident[EI_CLASS] == (sizeof(void*) == 8 ? ELFCLASS64 : ELFCLASS32) &&
           header.e_phentsize == sizeof(Segment);
}

} // namespace

Program Of(const std::string& file) {
    Program program;
    std::ifstream input(file, std::ios::binary);
    const auto header = At<Header>(input, 0);
    if (!input || !IsOfThisMachinesKind(header))
        return program;
    for (std::size_t i = 0; i < header.e_phnum && input; ++i) {
        const auto segment = At<Segment>(input, header.e_phoff + i * sizeof(Segment));
        if (!input || segment.p_type != PT_NOTE)
            continue;
        const auto bytes = Contents(input, segment);
        std::string_view notes = bytes;
        while (TakeOne(program, notes, segment.p_align == DOUBLE_WORD ? DOUBLE_WORD : WORD)) {
        }
    }
    return program;
}

} // namespace SystemTool::Version
