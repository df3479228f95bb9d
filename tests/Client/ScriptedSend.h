#pragma once

/// What stands between the library and the system's send() in the tests' programs: the next call fails with
/// this error, once, and sends nothing.
void FailNextSend(int error);

/// From now on, the system forgets to tell of refusals.
void SwallowRefusals();
