#pragma once
// Helpers of the mesh-reading and cartography tests.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "test_support.hpp"

namespace vhd::test {

// Standard output of a finished death test with the continuation lines of
// wrapped messages joined to their first line.
inline std::string JoinedOutput(const std::string& path) {
  std::string text = ReadTextFile(path);
  const std::string continuation = "\n" + std::string(14, ' ');
  for (std::size_t at = text.find(continuation); at != std::string::npos; at = text.find(continuation, at))
    text.erase(at, continuation.size());
  return text;
}

}  // namespace vhd::test

// A fatal error ends the process with status 1 and writes its text, wrapped,
// to standard output (no log is open in these tests). The statement runs in a
// death test whose standard output goes to a file; the joined text must hold
// `text`.
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
