#pragma once
// Start and end of message passing, and the few collective calls of the run
// driver. With a single process (message passing could not be started, or
// only one process takes part) the process id is -1 and every call here is a
// plain local operation.
//
// A failing call ends the run with the text of the message-passing library.
// StartMessagePassing installs the exit hook of the log layer, so that a
// fatal error on one process aborts all processes instead of leaving them
// waiting.

#include "core/run.hpp"
#include "log/log.hpp"

namespace vhd {

// Ends the run with the library's text of a failed message-passing call
// (rc: its return code).
void CheckMpiCall(int rc);

// MPI_Init; fills process_id and nprocesses of run.
void StartMessagePassing(int& argc, char**& argv, RunControl& run);
// Barrier and MPI_Finalize (nothing with a single process).
void EndMessagePassing(const RunControl& run);

void BarrierAll(const RunControl& run);
// Process 0 sends its values; the others take them.
void BroadcastTimeAxis(TimeAxis& time, const RunControl& run);
void BroadcastInt(int& value, const RunControl& run);
double SumOverProcesses(double value, const RunControl& run);
// The run status every process continues with: an error (negative) on any
// process wins, else the status of process 0 (which alone sees stop requests).
int AgreeRunStatus(int status, const RunControl& run);

// The "Computing Environment" block of the log: processor names, counts of
// processes, processors, threads and machines.
// Sets run.nmachines.
void WriteComputingEnvironment(RunControl& run, int max_threads, int nprocessors);

// Timers of the message-passing calls (only used with several processes).
TimingSet& MpiTimings();
inline constexpr int kMpiTimerTotal = 1, kMpiTimerHalo = 4, kMpiTimerAdditional = 5;
void InitMpiTimings();

}  // namespace vhd
