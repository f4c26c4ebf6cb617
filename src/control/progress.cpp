#include "control/progress.hpp"

#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>

#include "log/log.hpp"

namespace vhd {

ProgressMode ProgressModeFromEnvironment(const char* value) {
  if (value == nullptr) return ProgressMode::File;
  const std::string_view v(value);
  if (v == "NONE") return ProgressMode::None;
  if (v == "STDOUT") return ProgressMode::Stdout;
  return ProgressMode::File;
}

std::string ProgressBaseName(std::string_view log_file) {
  std::string base(log_file);
  for (const char* cut : {".log", ".inp"}) {
    const auto pos = base.rfind(cut);
    if (pos != std::string::npos) base.erase(pos);
  }
  return base;
}

bool ProgressReportDue(double cpu_now, double cpu_last_report, int n, int n_last) {
  return n == n_last || cpu_now - cpu_last_report >= kProgressCpuInterval;
}

ProgressFigures ComputeProgressFigures(const ProgressClock& clock, int n, double cpu_now,
                                       double wall_now) {
  ProgressFigures f;
  const double cpu = cpu_now - clock.cpu_start;
  const double mesh_mean = clock.mesh_count > 0 ? clock.mesh_sum / clock.mesh_count : 0.0;
  if (cpu > 0.0) f.comspd = std::llround((n - clock.n_first) / cpu * mesh_mean);
  f.progre = static_cast<int>(std::min(1000.0, (n - clock.n_first) * clock.factor));
  const int steps = n - clock.n_report;
  if (n < clock.n_last && steps > 0) {
    const double left = (clock.n_last - n) * (wall_now - clock.wall_report) / steps;
    f.timlft = std::max(0LL, std::llround(left));
  }
  return f;
}

ProgressChannel::~ProgressChannel() { Close(); }

void ProgressChannel::Open(ProgressMode mode, std::string_view log_file) {
  Close();
  mode_ = mode;
  stop_ = false;
  const std::string base = ProgressBaseName(log_file);
  message_file_ = base + "._spi_";
  kill_file_ = base + "._kill_";
  std::remove(kill_file_.c_str());
  if (mode_ == ProgressMode::File) {
    file_ = std::fopen(message_file_.c_str(), "w");
    if (file_ == nullptr) StopRun("Unable to open TqKwo2 message file: " + message_file_);
  }
  open_ = true;
  Record("MESSAG", "Initializing");
  RecordInteger("PROGRE", 0);
  Record("STALBL", "Simulation date and time [YYYY-MM-DD hh:mm:ss]");
  Record("MESLBL", "Simulation info");
}

void ProgressChannel::Close() {
  if (file_) std::fclose(file_);
  file_ = nullptr;
  open_ = false;
}

void ProgressChannel::Record(std::string_view tag, std::string_view text) {
  if (!open_) return;
  if (mode_ == ProgressMode::File) {
    std::fprintf(file_, "%.*s %.*s\n", static_cast<int>(tag.size()), tag.data(),
                 static_cast<int>(text.size()), text.data());
    std::fflush(file_);
  } else if (mode_ == ProgressMode::Stdout && tag == "MESSAG") {
    std::printf("%.*s\n", static_cast<int>(text.size()), text.data());
    std::fflush(stdout);
  }
}

void ProgressChannel::RecordInteger(std::string_view tag, long long value) {
  char text[32];
  std::snprintf(text, sizeof text, "%lld", value);
  Record(tag, text);
}

bool ProgressChannel::StopRequested() {
  if (!open_) return false;
  if (!stop_ && ::access(kill_file_.c_str(), F_OK) == 0) stop_ = true;
  return stop_;
}

namespace {

void WriteStatus(ProgressChannel& channel, const DateTime& start, double seconds) {
  const DateTime now = AddSeconds(start, seconds);
  char text[64];
  std::snprintf(text, sizeof text, "%04d-%02d-%02d %02d:%02d:%02d", now[0], now[1], now[2], now[3],
                now[4], now[5]);
  channel.Record("STATUS", text);
}

void WriteStepMessage(ProgressChannel& channel, int n) {
  char text[32];
  std::snprintf(text, sizeof text, "Time step: %d", n);
  channel.Record("MESSAG", text);
}

}  // namespace

bool ProgressChannel::Start(const DateTime& start, double dt, int n_first, int n_last,
                            double cpu_now, double wall_now) {
  start_ = start;
  dt_ = dt;
  clock_ = ProgressClock{};
  clock_.n_first = n_first;
  clock_.n_last = n_last;
  clock_.factor = n_last > n_first ? 1000.0 / (n_last - n_first) : 0.0;
  clock_.cpu_start = cpu_now;
  clock_.n_report = n_first;
  clock_.cpu_report = cpu_now;
  clock_.wall_report = wall_now;
  if (open_) {
    WriteStatus(*this, start_, n_first * dt_);
    Record("MESLBL", "Simulation time step");
    WriteStepMessage(*this, n_first);
    RecordInteger("PROGRE", 0);
  }
  return StopRequested();
}

bool ProgressChannel::Report(int n, double mesh_figure, double cpu_now, double wall_now) {
  clock_.mesh_sum += mesh_figure;
  ++clock_.mesh_count;
  if (open_ && ProgressReportDue(cpu_now, clock_.cpu_report, n, clock_.n_last)) {
    const ProgressFigures f = ComputeProgressFigures(clock_, n, cpu_now, wall_now);
    WriteStatus(*this, start_, n * dt_);
    WriteStepMessage(*this, n);
    RecordInteger("COMSPD", f.comspd);
    RecordInteger("PROGRE", f.progre);
    RecordInteger("TIMLFT", f.timlft);
    clock_.n_report = n;
    clock_.cpu_report = cpu_now;
    clock_.wall_report = wall_now;
  }
  return StopRequested();
}

}  // namespace vhd
