#include "SystemTool/PackageNote.h"

#include <algorithm>
#include <array>

// Linked into programs and plug-ins as an object, because the linker leaves out of a library what is not
// called.
namespace SystemTool::PackageNote {
namespace {

constexpr char TEXT[] = R"({"type":"program","name":"sync-service-report","version":")" SSR_VERSION R"("})";

/// As the ELF format lays a note out: three words, the owner and the text, each padded to a word.
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

// The alignment by name: the compiler would align a record of this size by more than a reader of notes
// accepts.
[[gnu::section(".note.package"), gnu::used, gnu::aligned(sizeof(std::uint32_t))]] constexpr Note NOTE =
    Make();

} // namespace
} // namespace SystemTool::PackageNote
