#pragma once

namespace SystemTool::IO {

/// Opens /dev/null for each of the descriptors 0 to 2 that is closed. Otherwise a file, database or socket
/// that is opened later could get such a number, and text that a library prints would go into that file. Call
/// it first in main: nothing that runs before main leaves a descriptor open.
///
/// Standard input is opened for writing only, the other two for reading only. So reading and writing fail
/// just as on a closed descriptor, and a program can notice that.
///
/// Failure: without /dev/null, the descriptors stay closed.
void OpenClosedStandardDescriptors();

} // namespace SystemTool::IO
