// Timing sets, their table, and the end-of-run blocks.

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "log/log.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

// A fresh log; Body() gives its lines after the two header lines.
class TimingLog : public ::testing::Test {
protected:
  void SetUp() override { ASSERT_TRUE(OpenLogFile(log)); }
  void TearDown() override { CloseLogFile(); }
  std::vector<std::string> Body() {
    CloseLogFile();
    return test::LogBody(log);
  }
  test::TempDir dir;
  std::string log = dir.file("t.log");
};

const std::string kRule = "  " + std::string(66, '-');

TEST(Timing, ClocksAccumulateOverIntervals) {
  TimingSet set;
  InitTiming(set, "Overall", 2);
  AddTiming(set, 1, "Calculation");
  for (int i = 0; i < 2; ++i) {
    StartTiming(set, 1);
    const double end = WallSeconds() + 0.02;
    volatile double sink = 0;
    while (WallSeconds() < end) sink = sink + 1.0;
    StopTiming(set, 1);
  }
  const Timing& t = set.timers[0];
  EXPECT_GE(t.wall_total, 0.04);
  EXPECT_GE(t.elapsed_total, 0.04);
  EXPECT_GT(t.cpu_total, 0.0);
  // A timer that never ran stays at zero; numbers out of range are ignored.
  StartTiming(set, 3);
  StopTiming(set, 0);
  EXPECT_EQ(set.timers[1].wall_total, 0.0);
}

TEST_F(TimingLog, WrongNumbersAreFatal) {
  TimingSet set;
  EXPECT_EXIT(InitTiming(set, "Bad", 0), testing::ExitedWithCode(1), "");
  EXPECT_EQ(Body()[1], "Fatal error: InitTiming: Wrong number of timings");
  InitTiming(set, "Overall", 4);
  ASSERT_TRUE(OpenLogFile(log));
  EXPECT_EXIT(AddTiming(set, 5, "Too far"), testing::ExitedWithCode(1), "");
  EXPECT_EQ(Body()[1], "Fatal error: AddTiming: Wrong timing number");
}

TEST_F(TimingLog, TableLayoutWithRuleAboveTotal) {
  TimingSet set;
  InitTiming(set, "Overall  ", 4);
  AddTiming(set, 1, "Pre-processing");
  AddTiming(set, 2, "Calculation");
  AddTiming(set, 4, "Total");
  set.timers[0].cpu_total = 1.234;
  set.timers[0].wall_total = 2.5;
  set.timers[1].cpu_total = 1234.567;
  set.timers[1].wall_total = 0.004;
  PrintTimings(set);
  const std::vector<std::string> body = Body();
  ASSERT_EQ(body.size(), 12u);
  EXPECT_EQ(body[1], std::string(26, '=') + " Overall Timings " + std::string(27, '='));
  EXPECT_EQ(body[2], kRule);
  EXPECT_EQ(body[3], "  Task" + std::string(30, ' ') + "        CPU time    Elapsed time");
  EXPECT_EQ(body[4], kRule);
  EXPECT_EQ(body[5], "  Pre-processing" + std::string(20, ' ') + "            1.23            2.50");
  EXPECT_EQ(body[6], "  Calculation" + std::string(23, ' ') + "         1234.57            0.00");
  EXPECT_EQ(body[7], kRule);
  EXPECT_EQ(body[8].substr(0, 7), "  Total");
  EXPECT_EQ(body[8].size(), 68u);
  EXPECT_EQ(body[9], kRule);
  EXPECT_EQ(body[11], std::string(70, '='));
}

TEST_F(TimingLog, CountLimitsTheRowsAndZeroPrintsNothing) {
  TimingSet set;
  InitTiming(set, "MPI Communication", 9);
  PrintTimings(set);
  AddTiming(set, 4, "Halo data");
  AddTiming(set, 5, "Additional data");
  PrintTimings(set, 1);
  const std::vector<std::string> body = Body();
  ASSERT_EQ(body.size(), 9u);
  EXPECT_EQ(body[5].substr(0, 11), "  Halo data");
}

TEST_F(TimingLog, MemoryAndPerformanceBlocks) {
  EXPECT_GT(PeakMemoryMiB(), 0.0);
  PrintMemoryUsage(0.0);
  PrintMemoryUsage(12.345);
  PrintMemoryUsage(100.0, 2048.5);
  PrintPerformance(4);
  PrintPerformance(8, {0, 1}, false);
  const std::vector<std::string> b = Body();
  ASSERT_EQ(b.size(), 23u);
  EXPECT_EQ(b[1], std::string(28, '=') + " Memory Usage " + std::string(28, '='));
  EXPECT_EQ(b[2], "  Peak memory usage (MB)" + std::string(34, ' ') + "     12.35");
  EXPECT_EQ(b[4], std::string(70, '='));
  EXPECT_EQ(b[7], "  Peak memory usage CPU (MB)" + std::string(30, ' ') + "    100.00");
  EXPECT_EQ(b[8], "  Peak memory usage GPU (MB)" + std::string(30, ' ') + "   2048.50");
  EXPECT_EQ(b[12], std::string(28, '=') + " Performance " + std::string(29, '='));
  EXPECT_EQ(b[13], "  Number of threads: 4");
  EXPECT_EQ(b[18], "  Number of threads on CPU: 8");
  EXPECT_EQ(b[19], "  GPU devices: 0 1");
  EXPECT_EQ(b[20], "  Single precision GPU calculations");
  EXPECT_EQ(b[22], std::string(70, '='));
}

}  // namespace
}  // namespace vhd
