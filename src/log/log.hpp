#pragma once
// Messages, the log file and run statistics.
//
// Every part of the engine reports through these few routines: a warning that
// lets the run go on, a fatal error that ends the process, a plain stop with a
// message and an exit status, lines and banners in the log, lines with one
// substituted value, and timers whose totals are printed as tables.
//
// While no log is open, every line goes to standard output instead (one record
// per line, one leading blank). All routines run on the main thread, outside
// parallel regions.

#include <string>
#include <string_view>
#include <vector>

namespace vhd {

// ---- log file -------------------------------------------------------------

// Log file name for a setup file path and a process id (-1 or 0: the path
// itself; k >= 1: "model_pk.txt" -> "model_pk.log").
std::string LogFileName(std::string_view setup_path, int process_id);
// Opens (replacing) the log and writes the two date/time header lines.
// Returns false when it cannot be created (lines then go to standard output).
bool OpenLogFile(const std::string& name);
void CloseLogFile();
bool LogIsOpen();
const std::string& LogFilePath();

// ---- messages -------------------------------------------------------------

void WriteLogLine(std::string_view text);
void WriteMessage(std::string_view text);  // pieces of 70 characters
void WriteBanner(std::string_view text);   // centred in 70 "=" (log only)
void Warning(std::string_view text);       // "Warning: " pieces of 61
[[noreturn]] void FatalError(std::string_view text);  // "Fatal error: " pieces of 57, exit 1
[[noreturn]] void StopRun(std::string_view text, int status = 1);

// The end of StopRun(text, status) with status != 0 for a signal handler:
// only async-signal-safe calls (write, _exit), no message passing shutdown.
// The log lines written before are all on disk, since every record is flushed.
[[noreturn]] void StopRunInSignalHandler(std::string_view text, int status) noexcept;

// Process exit through the progress library: runs the installed exit hook
// (message passing shutdown) and ends the process with the status.
[[noreturn]] void kwoExit(int status);
using ExitHook = void (*)(int status);
void SetExitHook(ExitHook hook);

// ---- numbers in text --------------------------------------------------------

// Text of x right-adjusted in w characters (w <= 20; messages use 10).
std::string NumberText(double x, int w = 10);
// The template with its first "%" replaced by the value's text.
std::string SubstituteValue(std::string_view templ, double value);
std::string SubstituteValue(std::string_view templ, int value);
std::string SubstituteValue(std::string_view templ, long long value);
std::string SubstituteValue(std::string_view templ, float value);
std::string SubstituteValue(std::string_view templ, std::string_view value);
std::string SubstituteValue(std::string_view templ, const char* value);
// Two blanks + SubstituteValue(templ, value), as one log line.
template <class T>
void WriteValueLine(std::string_view templ, const T& value) {
  WriteLogLine("  " + SubstituteValue(templ, value));
}

// ---- timers -----------------------------------------------------------------

struct Timing {
  std::string name;
  double cpu_start = 0, cpu_total = 0;
  double elapsed_start = 0, elapsed_total = 0;
  double wall_start = 0, wall_total = 0;
};

struct TimingSet {
  std::string name;
  std::vector<Timing> timers;  // timers[k-1] is timer k
  std::vector<int> order;      // timer numbers in the order they were added
};

void InitTiming(TimingSet& set, std::string_view name, int n);
void AddTiming(TimingSet& set, int k, std::string_view name);
void StartTiming(TimingSet& set, int k);
void StopTiming(TimingSet& set, int k);
// count < 0: all added timers.
void PrintTimings(const TimingSet& set, int count = -1);

// Clocks used by the timers (seconds): process CPU time, the runtime's
// elapsed-time clock and the monotonic wall clock.
double CpuSeconds();
double ElapsedSeconds();
double WallSeconds();

// ---- end-of-run blocks --------------------------------------------------------

// Peak resident set size of the process in MiB (0 when unknown).
double PeakMemoryMiB();
// "Memory Usage" block; skipped when peak_mib is 0. gpu_mib < 0: no GPU line.
void PrintMemoryUsage(double peak_mib, double gpu_mib = -1.0);
// "Performance" block.
void PrintPerformance(int threads, const std::vector<int>& gpu_devices = {}, bool gpu_double = true);

}  // namespace vhd
