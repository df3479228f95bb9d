#pragma once

#include <cstdint>

/// The note in each program and plug-in of ours that tells its version: the desktop's common form for such
/// notes, which core dump tools read as well. Its text is JSON.
namespace SystemTool::PackageNote {

constexpr char OWNER[] = "FDO";
constexpr std::uint32_t TYPE = 0xcafe1a7e;
constexpr char VERSION_KEY[] = R"("version":")";

} // namespace SystemTool::PackageNote
