#pragma once
// The progress channel to a hosting shell.
//
// The environment variable TANO_PROGRESS selects where reports go: "NONE"
// drops them, "STDOUT" prints the messages on standard output, anything else
// (also unset) writes them to a message file next to the log ("<base>._spi_")
// as records "TAG text", flushed one by one so that the host can follow them.
// The host asks the run to stop by creating "<base>._kill_"; the channel tests
// for it after every step (in every mode) and, once seen, keeps answering
// "stop". Only process 0 (or the single process) keeps a channel.
//
// Reports after a step are throttled to one per 2 s of process CPU time; the
// last step always reports. The clocks are passed in by the caller.

#include <cstdio>
#include <string>
#include <string_view>

#include "control/date_time.hpp"

namespace vhd {

enum class ProgressMode { None, Stdout, File };

ProgressMode ProgressModeFromEnvironment(const char* value);
// "<log without its last .log and last .inp>" (each cut to the end).
std::string ProgressBaseName(std::string_view log_file);

inline constexpr double kProgressCpuInterval = 2.0;  // s of CPU time between reports

// True when step n reports in full (else only the stop request is tested).
bool ProgressReportDue(double cpu_now, double cpu_last_report, int n, int n_last);

// Figures of one full report.
struct ProgressFigures {
  long long comspd = 0;  // steps per CPU second times the mean mesh size figure
  int progre = 0;        // per mille
  long long timlft = 0;  // wall-clock seconds left
};

// State remembered between reports.
struct ProgressClock {
  int n_first = 0, n_last = 0;
  double factor = 0.0;       // 1000 / (n_last - n_first)
  double cpu_start = 0.0;    // CPU time at the start of the computation
  int n_report = 0;          // step of the last report
  double cpu_report = 0.0;   // CPU time of the last report
  double wall_report = 0.0;  // wall-clock time of the last report
  double mesh_sum = 0.0;     // sum of the mesh size figure over the steps so far
  int mesh_count = 0;
};

ProgressFigures ComputeProgressFigures(const ProgressClock& clock, int n, double cpu_now,
                                       double wall_now);

class ProgressChannel {
 public:
  ProgressChannel() = default;
  ProgressChannel(const ProgressChannel&) = delete;
  ProgressChannel& operator=(const ProgressChannel&) = delete;
  ~ProgressChannel();

  // Opens the channel for a log file name; removes a stale kill file. In file
  // mode a message file that cannot be created stops the run. Then announces
  // "Initializing" with the labels of the status and message fields.
  void Open(ProgressMode mode, std::string_view log_file);
  void Close();
  bool IsOpen() const { return open_; }
  const std::string& MessageFile() const { return message_file_; }
  const std::string& KillFile() const { return kill_file_; }

  // One record: the six-letter tag, one blank, the text (message file), or
  // the text of a MESSAG record (standard output). Writes without allocating.
  void Record(std::string_view tag, std::string_view text);
  void RecordInteger(std::string_view tag, long long value);

  // Before the first step: the start date-time, "Time step: n_first",
  // progress 0. Returns true when the host has asked to stop.
  bool Start(const DateTime& start, double dt, int n_first, int n_last, double cpu_now,
             double wall_now);
  // After step n, with the mesh size figure of this step. Returns true when
  // the host has asked to stop.
  bool Report(int n, double mesh_figure, double cpu_now, double wall_now);
  bool StopRequested();

  const ProgressClock& Clock() const { return clock_; }

 private:
  ProgressMode mode_ = ProgressMode::None;
  bool open_ = false;
  bool stop_ = false;
  std::FILE* file_ = nullptr;
  std::string message_file_, kill_file_;
  DateTime start_{};
  double dt_ = 0.0;
  ProgressClock clock_;
};

}  // namespace vhd
