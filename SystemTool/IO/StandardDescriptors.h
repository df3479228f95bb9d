#pragma once

namespace SystemTool::IO {

/// Opens /dev/null for each of the descriptors 0 to 2 that is closed, so that no file, database or socket
/// that is opened later gets its number: what a library prints would go into that file. First thing in main:
/// what runs before opens nothing that stays open.
///
/// Opened the other way round, for writing in the place of standard input and for reading in the places of
/// the two others. So reading and writing fail as they do where the descriptor is closed, and a program can
/// tell.
///
/// Failure: without /dev/null they stay closed.
void OpenClosedStandardDescriptors();

} // namespace SystemTool::IO
