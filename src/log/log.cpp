// Log file, messages and process exit.

#include "log/log.hpp"

#include <fmt/core.h>

#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>

namespace vhd {

namespace {

struct LogState {
  std::string path;
  std::FILE* file = nullptr;
  ExitHook exit_hook = nullptr;
};

LogState& State() {
  static LogState state;
  return state;
}

// What a signal handler may read: the log's file descriptor (-1: none) and
// whether the user's copy of a stop message is dropped (BUILDMODE=NIGHT).
volatile std::sig_atomic_t g_log_fd = -1;
volatile std::sig_atomic_t g_night_build = 0;

std::string_view TrimRight(std::string_view text) {
  const auto end = text.find_last_not_of(' ');
  return end == std::string_view::npos ? std::string_view{} : text.substr(0, end + 1);
}

void WriteLine(std::FILE* out, std::string_view prefix, std::string_view line) {
  const std::string record = std::string(prefix).append(line).append("\n");
  std::fwrite(record.data(), 1, record.size(), out);
  std::fflush(out);
}

// One record: to the log as it is, or to standard output with one leading
// blank when no log is open. Every record is flushed so that the log is
// complete up to the last line whatever ends the process.
void WriteRecord(std::string_view line) {
  LogState& s = State();
  WriteLine(s.file ? s.file : stdout, s.file ? "" : " ", line);
}

void ShowToUser(std::string_view line) { WriteLine(stdout, " ", line); }

bool NightBuild() {
  const char* mode = std::getenv("BUILDMODE");
  return mode && std::string_view(mode) == "NIGHT";
}

// The text in pieces of `width` characters: the first behind `head`, the
// others behind as many blanks; an empty text gives `head` alone. The lines
// go to the log and, when a log is open and `show` is set, to the user too.
void WriteWrapped(std::string_view head, std::string_view text, std::size_t width, bool show) {
  const std::string_view body = TrimRight(text);
  const std::string indent(head.size(), ' ');
  const bool copy = show && LogIsOpen() && !NightBuild();
  WriteRecord("");
  if (copy) ShowToUser("");
  std::size_t pos = 0;
  do {
    const std::string line = std::string(pos == 0 ? head : indent) + std::string(body.substr(pos, width));
    WriteRecord(line);
    if (copy) ShowToUser(line);
    pos += width;
  } while (pos < body.size());
}

}  // namespace

// ---- log file -------------------------------------------------------------

std::string LogFileName(std::string_view setup_path, int process_id) {
  std::string name(setup_path);
  // Only a "." in the last path component marks an extension ("../run.d/model"
  // has none).
  const auto slash = name.find_last_of("/\\");
  const auto base = slash == std::string::npos ? 0 : slash + 1;
  auto dot = name.rfind('.');
  if (dot != std::string::npos && dot < base) dot = std::string::npos;
  if (process_id >= 1) {
    if (dot == std::string::npos) {
      name += fmt::format("_p{}", process_id);
    } else {
      name = fmt::format("{}_p{}{}", name.substr(0, dot), process_id, name.substr(dot));
    }
    dot = name.rfind('.');
    if (dot != std::string::npos && dot < base) dot = std::string::npos;
  }
  if (dot != std::string::npos) name.erase(dot);
  return name + ".log";
}

bool OpenLogFile(const std::string& name) {
  LogState& s = State();
  CloseLogFile();
  s.file = std::fopen(name.c_str(), "w");
  if (!s.file) return false;
  s.path = name;
  g_night_build = NightBuild() ? 1 : 0;
  g_log_fd = fileno(s.file);
  const std::time_t now = std::time(nullptr);
  std::tm local{};
  localtime_r(&now, &local);
  WriteRecord(fmt::format("{:60}{:04}{:02}{:02}", "", local.tm_year + 1900, local.tm_mon + 1, local.tm_mday));
  WriteRecord(fmt::format("{:60}{:02}{:02}{:02}", "", local.tm_hour, local.tm_min, local.tm_sec));
  return true;
}

void CloseLogFile() {
  LogState& s = State();
  g_log_fd = -1;
  if (s.file) std::fclose(s.file);
  s.file = nullptr;
  s.path.clear();
}

bool LogIsOpen() { return State().file != nullptr; }

const std::string& LogFilePath() { return State().path; }

// ---- messages -------------------------------------------------------------

void WriteLogLine(std::string_view text) { WriteRecord(TrimRight(text)); }

void WriteMessage(std::string_view text) {
  const std::string_view body = TrimRight(text);
  std::size_t pos = 0;
  do {
    WriteLogLine(body.substr(pos, 70));
    pos += 70;
  } while (pos < body.size());
}

void WriteBanner(std::string_view text) {
  if (!LogIsOpen()) return;
  const std::string_view body = TrimRight(text);
  WriteRecord("");
  if (body.empty()) {
    WriteRecord(std::string(70, '='));
    return;
  }
  const int n = static_cast<int>(body.size());
  const int left = (68 - n) / 2;
  const int right = 68 - n - left;
  std::string line(left > 0 ? left : 0, '=');
  line += ' ';
  line += body;
  line += ' ';
  line.append(right > 0 ? right : 0, '=');
  WriteRecord(line);
}

void Warning(std::string_view text) { WriteWrapped("Warning: ", text, 61, false); }

void FatalError(std::string_view text) {
  WriteWrapped("Fatal error: ", text, 57, true);
  if (LogIsOpen()) WriteRecord("Abnormal completion");
  kwoExit(1);
}

void StopRun(std::string_view text, int status) {
  const std::string_view body = TrimRight(text);
  const bool log = LogIsOpen();
  if (log) WriteLogLine(body);
  // Without a log the user's copy is the only record, so it is never dropped.
  if (!log || !NightBuild()) ShowToUser(body);
  if (log) WriteRecord(status == 0 ? "Successful completion" : "Abnormal completion");
  kwoExit(status);
}

namespace {

void WriteAll(int fd, std::string_view text) noexcept {
  const char* p = text.data();
  std::size_t n = text.size();
  while (n > 0) {
    const ssize_t written = ::write(fd, p, n);
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) return;
    p += written;
    n -= static_cast<std::size_t>(written);
  }
}

}  // namespace

void StopRunInSignalHandler(std::string_view text, int status) noexcept {
  const int fd = g_log_fd;
  if (fd >= 0) {
    WriteAll(fd, text);
    WriteAll(fd, "\n");
  }
  if (fd < 0 || !g_night_build) {
    WriteAll(STDOUT_FILENO, " ");
    WriteAll(STDOUT_FILENO, text);
    WriteAll(STDOUT_FILENO, "\n");
  }
  if (fd >= 0) WriteAll(fd, "Abnormal completion\n");
  _exit(status);
}

void SetExitHook(ExitHook hook) { State().exit_hook = hook; }

void kwoExit(int status) {
  LogState& s = State();
  if (s.file) std::fflush(s.file);
  std::fflush(stdout);
  if (s.exit_hook) s.exit_hook(status);
  std::exit(status);
}

}  // namespace vhd
