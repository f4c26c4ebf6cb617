// Timers, their tables, and the end-of-run memory and performance blocks.

#include <fmt/core.h>
#include <sys/resource.h>

#include <chrono>
#include <ctime>
#include <string>

#include "log/log.hpp"

namespace vhd {

namespace {

double SecondsOf(clockid_t id) {
  timespec ts{};
  clock_gettime(id, &ts);
  return static_cast<double>(ts.tv_sec) + 1e-9 * static_cast<double>(ts.tv_nsec);
}

void StartClocks(Timing& t) {
  t.cpu_start = CpuSeconds();
  t.elapsed_start = ElapsedSeconds();
  t.wall_start = WallSeconds();
}

const std::string kRule = "  " + std::string(66, '-');

}  // namespace

double CpuSeconds() { return SecondsOf(CLOCK_PROCESS_CPUTIME_ID); }

// Seconds since an arbitrary fixed point, as the threading runtime measures
// elapsed time.
double ElapsedSeconds() {
  return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count();
}

// The kernel's monotonic clock never steps back (no wrap-around, no clock
// setting), so readings need no correction.
double WallSeconds() { return SecondsOf(CLOCK_MONOTONIC); }

void InitTiming(TimingSet& set, std::string_view name, int n) {
  if (n < 1) FatalError("InitTiming: Wrong number of timings");
  set.name = std::string(name);
  set.timers.assign(n, Timing{});
  for (int k = 1; k <= n; ++k) set.timers[k - 1].name = SubstituteValue("task_%", k);
  set.order.clear();
}

void AddTiming(TimingSet& set, int k, std::string_view name) {
  set.order.push_back(k);
  if (k < 1 || k > static_cast<int>(set.timers.size())) FatalError("AddTiming: Wrong timing number");
  Timing& t = set.timers[k - 1];
  t.name = std::string(name);
  StartClocks(t);
}

void StartTiming(TimingSet& set, int k) {
  if (k < 1 || k > static_cast<int>(set.timers.size())) return;
  StartClocks(set.timers[k - 1]);
}

void StopTiming(TimingSet& set, int k) {
  if (k < 1 || k > static_cast<int>(set.timers.size())) return;
  Timing& t = set.timers[k - 1];
  t.cpu_total += CpuSeconds() - t.cpu_start;
  t.elapsed_total += ElapsedSeconds() - t.elapsed_start;
  t.wall_total += WallSeconds() - t.wall_start;
}

void PrintTimings(const TimingSet& set, int count) {
  const int added = static_cast<int>(set.order.size());
  if (count < 0 || count > added) count = added;
  if (count == 0 || !LogIsOpen()) return;
  std::string title(set.name);
  title.erase(title.find_last_not_of(' ') + 1);
  WriteBanner(title + " Timings");
  WriteLogLine(kRule);
  WriteLogLine(fmt::format("  {:<4}{:30}{:>16}{:>16}", "Task", "", "CPU time", "Elapsed time"));
  WriteLogLine(kRule);
  for (int i = 0; i < count; ++i) {
    const int k = set.order[i];
    if (k < 1 || k > static_cast<int>(set.timers.size())) continue;
    const Timing& t = set.timers[k - 1];
    if (t.name == "Total") WriteLogLine(kRule);
    WriteLogLine(fmt::format("  {:<34}{:16.2f}{:16.2f}", t.name, t.cpu_total, t.wall_total));
  }
  WriteLogLine(kRule);
  WriteBanner("");
}

double PeakMemoryMiB() {
  rusage usage{};
  if (getrusage(RUSAGE_SELF, &usage) != 0) return 0.0;
  return static_cast<double>(usage.ru_maxrss) / 1024.0;  // KiB on Linux
}

void PrintMemoryUsage(double peak_mib, double gpu_mib) {
  if (peak_mib == 0.0) return;
  WriteBanner("Memory Usage");
  if (gpu_mib < 0.0) {
    WriteLogLine(fmt::format("  {:<22}{:34}{:10.2f}", "Peak memory usage (MB)", "", peak_mib));
  } else {
    WriteLogLine(fmt::format("  {:<26}{:30}{:10.2f}", "Peak memory usage CPU (MB)", "", peak_mib));
    WriteLogLine(fmt::format("  {:<26}{:30}{:10.2f}", "Peak memory usage GPU (MB)", "", gpu_mib));
  }
  WriteBanner("");
}

void PrintPerformance(int threads, const std::vector<int>& gpu_devices, bool gpu_double) {
  WriteBanner("Performance");
  if (gpu_devices.empty()) {
    WriteValueLine("Number of threads: %", threads);
  } else {
    WriteValueLine("Number of threads on CPU: %", threads);
    std::string list;
    for (const int d : gpu_devices) list += fmt::format("{}{}", list.empty() ? "" : " ", d);
    WriteValueLine("GPU devices: %", list);
    WriteLogLine(gpu_double ? "  Double precision GPU calculations" : "  Single precision GPU calculations");
  }
  WriteBanner("");
}

}  // namespace vhd
