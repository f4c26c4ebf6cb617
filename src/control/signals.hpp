#pragma once
// Floating-point mode and signal handling of the process.

#include <string_view>

namespace vhd {

// Flushes denormal results to zero and treats denormal inputs as zero on the
// calling thread; threads started afterwards inherit the mode.
void SetFlushToZero();

// Handlers for abort, illegal instruction, interrupt, segmentation fault,
// termination and floating-point exception: each writes its message and ends
// the run as StopRun does, with the signal number as exit status. A
// floating-point underflow is ignored.
void InstallSignalHandlers();

// Message of a signal; for SIGFPE the sub-code (si_code) picks the text.
// Empty for a floating-point underflow (which is ignored) and for signals
// that have no handler.
std::string_view SignalMessage(int signo, int fpe_code);

}  // namespace vhd
