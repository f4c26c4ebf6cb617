#include "test_support.hpp"

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <random>
#include <sstream>
#include <stdexcept>

#include <sys/wait.h>
#include <unistd.h>

namespace vhd::test {

TempDir::TempDir() {
  std::random_device rd;
  auto base = std::filesystem::temp_directory_path();
  for (int attempt = 0; attempt < 100; ++attempt) {
    auto candidate = base / ("vhd_test_" + std::to_string(getpid()) + "_" + std::to_string(rd()));
    if (std::filesystem::create_directory(candidate)) {
      path_ = candidate;
      return;
    }
  }
  throw std::runtime_error("TempDir: cannot create a temporary directory");
}

TempDir::~TempDir() {
  std::error_code ec;
  std::filesystem::remove_all(path_, ec);
}

std::string ReadTextFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::ostringstream s;
  s << in.rdbuf();
  return s.str();
}

void WriteTextFile(const std::string& path, const std::string& text) {
  std::ofstream out(path, std::ios::binary);
  out << text;
}

std::vector<std::string> SplitLines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return lines;
}

std::vector<std::string> LogBody(const std::string& log_path) {
  std::vector<std::string> lines = SplitLines(ReadTextFile(log_path));
  lines.erase(lines.begin(), lines.begin() + std::min<std::size_t>(2, lines.size()));
  return lines;
}

std::string JoinedOutput(const std::string& path) {
  std::string text = ReadTextFile(path);
  const std::string continuation = std::string("\n").append(14, ' ');
  for (std::size_t at = text.find(continuation); at != std::string::npos; at = text.find(continuation, at))
    text.erase(at, continuation.size());
  return text;
}

int RunPython(const TempDir& dir, const std::string& script, const std::string& args, std::string& output) {
  const std::string path = dir.file("script.py"), log = dir.file("script.out");
  WriteTextFile(path, script);
  const int rc = std::system(("/usr/bin/python3 " + path + " " + args + " > " + log + " 2>&1").c_str());
  output = ReadTextFile(log);
  return WIFEXITED(rc) ? WEXITSTATUS(rc) : -1;
}

}  // namespace vhd::test
