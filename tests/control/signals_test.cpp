// Signals: a termination request is taken up at the next safe point of the
// run, a fault stops the run at once without taking any lock, and both leave
// the signal's message and "Abnormal completion" in the log and end with the
// signal number.

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstdio>
#include <string>
#include <thread>

#include "control/signals.hpp"
#include "log/log.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

class SignalsTest : public ::testing::Test {
protected:
  void SetUp() override { unsetenv("BUILDMODE"); }
  // Opens the log and installs the handlers (in the child of a death test).
  void Start(unsigned grace_seconds = 10) {
    OpenLogFile(log_path);
    WriteLogLine("before");
    InstallSignalHandlers(grace_seconds);
  }
  // The log after the two header lines.
  std::string Log() const {
    const std::string text = test::ReadTextFile(log_path);
    std::size_t pos = 0;
    for (int k = 0; k < 2 && pos != std::string::npos; ++k) pos = text.find('\n', pos) + 1;
    return text.substr(pos);
  }
  test::TempDir dir;
  std::string log_path = dir.file("model.log");
};

TEST_F(SignalsTest, TerminationRequestStopsAtTheNextSafePoint) {
  EXPECT_EXIT(
      {
        Start();
        std::raise(SIGTERM);
        WriteLogLine("after the request");
        StopIfSignalled();
        WriteLogLine("after the safe point");
      },
      ::testing::ExitedWithCode(SIGTERM), "");
  EXPECT_EQ(Log(), "before\nafter the request\nTermination request\nAbnormal completion\n");
}

// A fault while another thread holds the lock of standard output (the
// handler must not wait for it) ends the run at once; a watchdog turns a hang
// into another exit status.
TEST_F(SignalsTest, FaultStopsAtOnceWithoutTakingLocks) {
  EXPECT_EXIT(
      {
        Start();
        std::atomic<bool> locked{false};
        std::thread holder([&locked] {
          flockfile(stdout);
          locked = true;
          for (;;) pause();
        });
        while (!locked) std::this_thread::yield();
        alarm(5);
        std::raise(SIGSEGV);
        holder.join();
      },
      ::testing::ExitedWithCode(SIGSEGV), "");
  EXPECT_EQ(Log(), "before\nIllegal storage access\nAbnormal completion\n");
}

// A second request does not wait for a safe point; nor does a request that
// none is reached for within the grace time.
TEST_F(SignalsTest, SecondRequestOrGraceTimeStopsAtOnce) {
  EXPECT_EXIT(
      {
        Start();
        std::raise(SIGTERM);
        std::raise(SIGINT);
        WriteLogLine("not reached");
      },
      ::testing::ExitedWithCode(SIGINT), "");
  EXPECT_EQ(Log(), "before\nControl-C send\nAbnormal completion\n");
  EXPECT_EXIT(
      {
        Start(1);
        std::raise(SIGINT);
        for (;;) pause();
      },
      ::testing::ExitedWithCode(SIGINT), "");
  EXPECT_EQ(Log(), "before\nControl-C send\nAbnormal completion\n");
}

}  // namespace
}  // namespace vhd
