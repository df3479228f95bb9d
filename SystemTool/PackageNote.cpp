#include "SystemTool/PackageNote.h"

#include <algorithm>
#include <array>

// This file is linked as an object and not as a library: from a library, the linker leaves out what is not
// called.
namespace SystemTool::PackageNote {
namespace {

constexpr char TEXT[] = R"({"type":"program","name":"sync-service-report","version":")" SSR_VERSION R"("})";

/// A note as the ELF format defines it: three words, the owner and the text, each padded to a word.
struct alignas(std::uint32_t) Note {
    std::uint32_t ownerBytes = sizeof OWNER;
    std::uint32_t textBytes = sizeof TEXT;
    std::uint32_t type = TYPE;
    std::array<char, sizeof OWNER> owner{};
    std::array<char, sizeof TEXT> text{};
};
static_assert(sizeof OWNER % sizeof(std::uint32_t) == 0, "the text begins at a whole word");

constexpr Note Make() {
    Note note;
    std::copy(std::begin(OWNER), std::end(OWNER), note.owner.begin());
    std::copy(std::begin(TEXT), std::end(TEXT), note.text.begin());
    return note;
}

// We set the alignment ourselves: the compiler would align a record of this size to more than readers of
// notes accept.
[[gnu::section(".note.package"), gnu::used, gnu::aligned(sizeof(std::uint32_t))]] constexpr Note NOTE =
    Make();

} // namespace
} // namespace SystemTool::PackageNote
