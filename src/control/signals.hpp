#pragma once
// Floating-point mode and signal handling of the process.

#include <string_view>

namespace vhd {

// Flushes denormal results to zero and treats denormal inputs as zero on the
// calling thread; threads started afterwards inherit the mode.
void SetFlushToZero();

// Handlers for abort, illegal instruction, interrupt, segmentation fault,
// termination and floating-point exception; each stop writes the signal's
// message and ends the run as StopRun does, with the signal number as exit
// status. A floating-point underflow is ignored.
//   - Interrupt and termination are requests: the handler only notes them,
//     and the run stops at the next StopIfSignalled. A second request, or
//     none of those calls within grace_seconds, stops the run at once.
//   - A fault (abort, illegal instruction, segmentation fault, floating-point
//     exception) stops the run at once.
// A stop at once uses only async-signal-safe calls: the message goes to the
// log and standard output with write, and the process ends with _exit
// (without the message passing shutdown).
void InstallSignalHandlers(unsigned grace_seconds = 10);

// A safe point of the run: stops it through StopRun when an interrupt or
// termination request came by signal.
void StopIfSignalled();

// Message of a signal; for SIGFPE the sub-code (si_code) picks the text.
// Empty for a floating-point underflow (which is ignored) and for signals
// that have no handler.
std::string_view SignalMessage(int signo, int fpe_code);

}  // namespace vhd
