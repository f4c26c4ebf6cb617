#pragma once
// Small helpers shared by the test programs.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

namespace vhd::test {

// A fresh, empty directory under the system's temporary folder, removed when
// the object goes out of scope.
class TempDir {
public:
  TempDir();
  ~TempDir();
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;
  const std::filesystem::path& path() const { return path_; }
  std::string file(const std::string& name) const { return (path_ / name).string(); }

private:
  std::filesystem::path path_;
};

std::string ReadTextFile(const std::string& path);
void WriteTextFile(const std::string& path, const std::string& text);

// The lines of a text, without their line ends.
std::vector<std::string> SplitLines(const std::string& text);

// The lines of a log file after its two header lines.
std::vector<std::string> LogBody(const std::string& log_path);

// Standard output of a finished death test with the continuation lines of
// wrapped messages joined to their first line.
std::string JoinedOutput(const std::string& path);

// Runs Debian's Python (/usr/bin/python3) on a script text with arguments;
// returns its exit status and fills `output` with what it printed.
int RunPython(const TempDir& dir, const std::string& script, const std::string& args, std::string& output);

}  // namespace vhd::test

// A fatal error ends the process with status 1 and writes its text, wrapped,
// to standard output (when no log is open). The statement runs in a death test
// whose standard output goes to a file; the joined text must hold `text`.
#define EXPECT_FATAL(statement, text)                                               \
  do {                                                                              \
    vhd::test::TempDir fatal_dir_;                                                  \
    const std::string fatal_out_ = fatal_dir_.file("stdout.txt");                   \
    EXPECT_EXIT(                                                                    \
        {                                                                           \
          if (!std::freopen(fatal_out_.c_str(), "w", stdout)) std::abort();         \
          statement;                                                                \
        },                                                                          \
        testing::ExitedWithCode(1), "");                                            \
    EXPECT_THAT(vhd::test::JoinedOutput(fatal_out_), testing::HasSubstr(text));     \
  } while (0)
