#include "control/progress.hpp"

#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <vector>

#include "test_support.hpp"

namespace vhd {
namespace {

TEST(ProgressChannel, ModeFromEnvironment) {
  EXPECT_EQ(ProgressModeFromEnvironment(nullptr), ProgressMode::File);
  EXPECT_EQ(ProgressModeFromEnvironment("NONE"), ProgressMode::None);
  EXPECT_EQ(ProgressModeFromEnvironment("STDOUT"), ProgressMode::Stdout);
  EXPECT_EQ(ProgressModeFromEnvironment("none"), ProgressMode::File);
  EXPECT_EQ(ProgressModeFromEnvironment(""), ProgressMode::File);
}

TEST(ProgressChannel, BaseNameCutsTheLastLogAndInp) {
  EXPECT_EQ(ProgressBaseName("/runs/model.log"), "/runs/model");
  EXPECT_EQ(ProgressBaseName("/runs/model.inp.log"), "/runs/model");
  EXPECT_EQ(ProgressBaseName("/runs/a.log.dir/model.log"), "/runs/a.log.dir/model");
  EXPECT_EQ(ProgressBaseName("model"), "model");
}

TEST(ProgressChannel, ThrottleByCpuTimeButAlwaysTheLastStep) {
  EXPECT_FALSE(ProgressReportDue(11.9, 10.0, 5, 100));
  EXPECT_TRUE(ProgressReportDue(12.0, 10.0, 5, 100));
  EXPECT_TRUE(ProgressReportDue(10.0, 10.0, 100, 100));
}

TEST(ProgressChannel, Figures) {
  ProgressClock c;
  c.n_first = 0;
  c.n_last = 400;
  c.factor = 1000.0 / 400;
  c.cpu_start = 100.0;
  c.n_report = 100;
  c.wall_report = 50.0;
  c.mesh_sum = 3 * 2000.0;
  c.mesh_count = 3;
  // 200 steps in 4 s of CPU time on a mesh of 2000 elements; 100 steps took
  // 10 s of wall-clock time since the last report, 200 steps are left.
  const ProgressFigures f = ComputeProgressFigures(c, 200, 104.0, 60.0);
  EXPECT_EQ(f.comspd, 200 / 4 * 2000);
  EXPECT_EQ(f.progre, 500);
  EXPECT_EQ(f.timlft, 20);

  const ProgressFigures last = ComputeProgressFigures(c, 400, 104.0, 60.0);
  EXPECT_EQ(last.progre, 1000);
  EXPECT_EQ(last.timlft, 0);

  // No CPU time yet and no mesh: no division by zero.
  ProgressClock fresh;
  fresh.n_last = 10;
  fresh.factor = 100.0;
  const ProgressFigures early = ComputeProgressFigures(fresh, 1, 0.0, 0.0);
  EXPECT_EQ(early.comspd, 0);
  EXPECT_EQ(early.progre, 100);
  EXPECT_GE(early.timlft, 0);
}

TEST(ProgressChannel, MessageFileRecords) {
  test::TempDir dir;
  ProgressChannel p;
  p.Open(ProgressMode::File, dir.file("run.log"));
  EXPECT_EQ(p.MessageFile(), dir.file("run._spi_"));
  EXPECT_EQ(p.KillFile(), dir.file("run._kill_"));
  EXPECT_FALSE(p.Start({2004, 1, 1, 0, 0, 0}, 60.0, 0, 4, 0.0, 0.0));
  // Steps 1 and 2 within 2 s of CPU time: no records; step 3 after 2.5 s.
  EXPECT_FALSE(p.Report(1, 10.0, 0.5, 1.0));
  EXPECT_FALSE(p.Report(2, 10.0, 1.0, 2.0));
  EXPECT_FALSE(p.Report(3, 10.0, 2.5, 3.0));
  // Step 4 is the last one: it reports although little time has passed.
  EXPECT_FALSE(p.Report(4, 10.0, 2.6, 4.0));
  p.Close();

  const std::vector<std::string> expected{
      "MESSAG Initializing",
      "PROGRE 0",
      "STALBL Simulation date and time [YYYY-MM-DD hh:mm:ss]",
      "MESLBL Simulation info",
      "STATUS 2004-01-01 00:00:00",
      "MESLBL Simulation time step",
      "MESSAG Time step: 0",
      "PROGRE 0",
      "STATUS 2004-01-01 00:03:00",
      "MESSAG Time step: 3",
      "COMSPD 12",  // 3 steps / 2.5 s * 10
      "PROGRE 750",
      "TIMLFT 1",  // 1 step left, 3 s for 3 steps
      "STATUS 2004-01-01 00:04:00",
      "MESSAG Time step: 4",
      "COMSPD 15",  // 4 / 2.6 * 10 = 15.4
      "PROGRE 1000",
      "TIMLFT 0",
  };
  EXPECT_EQ(test::SplitLines(test::ReadTextFile(dir.file("run._spi_"))), expected);
}

TEST(ProgressChannel, KillFileStopsAndStaysSeen) {
  test::TempDir dir;
  test::WriteTextFile(dir.file("run._kill_"), "");
  ProgressChannel p;
  p.Open(ProgressMode::None, dir.file("run.inp.log"));
  // A kill file from an earlier run is removed at opening.
  EXPECT_FALSE(std::ifstream(dir.file("run._kill_")).good());
  EXPECT_FALSE(p.Start({2004, 1, 1, 0, 0, 0}, 1.0, 0, 100, 0.0, 0.0));
  EXPECT_FALSE(p.Report(1, 0.0, 0.0, 0.0));
  test::WriteTextFile(dir.file("run._kill_"), "");
  EXPECT_TRUE(p.Report(2, 0.0, 0.0, 0.0));
  std::remove(dir.file("run._kill_").c_str());
  EXPECT_TRUE(p.Report(3, 0.0, 0.0, 0.0));
  // NONE writes no message file.
  EXPECT_FALSE(std::ifstream(dir.file("run._spi_")).good());
}

TEST(ProgressChannel, UnwritableMessageFileStopsTheRun) {
  EXPECT_EXIT(
      {
        ProgressChannel p;
        p.Open(ProgressMode::File, "/nonexistent-folder/run.log");
      },
      ::testing::ExitedWithCode(1), "");
}

}  // namespace
}  // namespace vhd
