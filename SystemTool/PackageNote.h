#pragma once

#include <cstdint>

/// The note with the version, which each of our programs and plug-ins holds. It has the common form for such
/// notes on Linux, which core dump tools read, too. Its text is JSON.
namespace SystemTool::PackageNote {

constexpr char OWNER[] = "FDO";
constexpr std::uint32_t TYPE = 0xcafe1a7e;
constexpr char VERSION_KEY[] = R"("version":")";

} // namespace SystemTool::PackageNote
