#pragma once

/// Replaces the system's send() in the test programs: the next call fails with this error, once, and sends
/// nothing.
void FailNextSend(int error);

/// From now on, the system does not report refused datagrams.
void SwallowRefusals();
