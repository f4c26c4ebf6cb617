// Layout of the log: header lines, messages, warnings, fatal errors, banners,
// value lines and the ways a run ends.

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "log/log.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

// A log in a fresh folder; Body() gives its lines after the two header lines.
class LogTest : public ::testing::Test {
protected:
  void SetUp() override {
    unsetenv("BUILDMODE");
    ASSERT_TRUE(OpenLogFile(log_path));
  }
  void TearDown() override { CloseLogFile(); }
  std::vector<std::string> Body() { return test::LogBody(log_path); }
  test::TempDir dir;
  std::string log_path = dir.file("model.log");
};

TEST(LogFileName, ProcessIdsAndExtensions) {
  EXPECT_EQ(LogFileName("model.txt", 0), "model.log");
  EXPECT_EQ(LogFileName("model.txt", 3), "model_p3.log");
  EXPECT_EQ(LogFileName("/runs/a.b/model.v2.toml", 12), "/runs/a.b/model.v2_p12.log");
  // A dot in a folder name is no extension.
  EXPECT_EQ(LogFileName("../run.d/model", -1), "../run.d/model.log");
}

TEST_F(LogTest, HeaderHoldsDateAndTime) {
  const std::vector<std::string> lines = test::SplitLines(test::ReadTextFile(log_path));
  ASSERT_GE(lines.size(), 2u);
  ASSERT_EQ(lines[0].size(), 68u);
  ASSERT_EQ(lines[1].size(), 66u);
  for (const std::string& line : {lines[0], lines[1]}) {
    EXPECT_EQ(line.substr(0, 60), std::string(60, ' '));
    EXPECT_EQ(line.substr(60).find_first_not_of("0123456789"), std::string::npos);
  }
  const int month = std::stoi(lines[0].substr(64, 2));
  const int hour = std::stoi(lines[1].substr(60, 2));
  EXPECT_TRUE(month >= 1 && month <= 12);
  EXPECT_TRUE(hour >= 0 && hour <= 23);
}

// Without a log, lines go to the screen and banners nowhere.
TEST(LogFile, UncreatableLogLeavesStandardOutput) {
  test::TempDir dir;
  EXPECT_FALSE(OpenLogFile(dir.file("missing/folder/model.log")));
  EXPECT_FALSE(LogIsOpen());
  testing::internal::CaptureStdout();
  WriteLogLine("to the screen   ");
  WriteBanner("Performance");
  EXPECT_EQ(testing::internal::GetCapturedStdout(), " to the screen\n");
}

TEST_F(LogTest, LinesAndMessagesTrimTrailingBlanksAndWrapAt70) {
  const std::string t(150, 'x');
  WriteLogLine("  indented   ");
  WriteLogLine("");
  WriteMessage(t + "   ");
  EXPECT_EQ(Body(), (std::vector<std::string>{"  indented", "", t.substr(0, 70), t.substr(70, 70), t.substr(140)}));
}

TEST_F(LogTest, WarningWrapsAt61) {
  const std::string t61(61, 'a');
  Warning(t61);
  Warning(t61 + "b");
  Warning("");
  EXPECT_EQ(Body(), (std::vector<std::string>{"", "Warning: " + t61, "", "Warning: " + t61,
                                              std::string(9, ' ') + "b", "", "Warning: "}));
}

TEST_F(LogTest, BannerArithmetic) {
  WriteBanner("COMPUTATION STARTED");
  WriteBanner("");
  const std::string t68(68, 'T');
  WriteBanner(t68);
  WriteBanner(t68 + "UV");  // longer than the rule: no "=" at all
  const std::vector<std::string> body = Body();
  ASSERT_EQ(body.size(), 8u);
  EXPECT_EQ(body[0], "");
  EXPECT_EQ(body[1], std::string(24, '=') + " COMPUTATION STARTED " + std::string(25, '='));
  EXPECT_EQ(body[3], std::string(70, '='));
  EXPECT_EQ(body[5], " " + t68 + " ");
  EXPECT_EQ(body[7], " " + t68 + "UV ");
}

TEST_F(LogTest, ValueLines) {
  WriteValueLine("Number of threads: %", 4);
  WriteValueLine("Time step: % s   ", 0.5);
  WriteValueLine("Mesh file: %", "  basin.mesh  ");
  WriteValueLine("Count % of %", 2LL);
  WriteValueLine("Factor %", 0.1f);
  EXPECT_EQ(Body(), (std::vector<std::string>{"  Number of threads: 4", "  Time step: 0.5 s",
                                              "  Mesh file: basin.mesh", "  Count 2 of %", "  Factor 0.1"}));
  // A template without a place keeps the value after a blank.
  EXPECT_EQ(SubstituteValue("Value", 3), "Value 3");
}

TEST_F(LogTest, FatalErrorWrapsAt57AndExitsWithOne) {
  const std::string t57(57, 'f');
  EXPECT_EXIT(FatalError(t57), testing::ExitedWithCode(1), "");
  EXPECT_EQ(Body(), (std::vector<std::string>{"", "Fatal error: " + t57, "Abnormal completion"}));
  ASSERT_TRUE(OpenLogFile(log_path));
  EXPECT_EXIT(FatalError(t57 + "g"), testing::ExitedWithCode(1), "");
  EXPECT_EQ(Body(), (std::vector<std::string>{"", "Fatal error: " + t57, std::string(13, ' ') + "g",
                                              "Abnormal completion"}));
}

TEST(FatalError, WithoutLogGoesToStandardOutput) {
  CloseLogFile();
  test::TempDir dir;
  const std::string out = dir.file("stdout.txt");
  EXPECT_EXIT(
      {
        std::freopen(out.c_str(), "w", stdout);
        FatalError("SktOpenFile : Unable to open x.toml");
      },
      testing::ExitedWithCode(1), "");
  EXPECT_EQ(test::ReadTextFile(out), " \n Fatal error: SktOpenFile : Unable to open x.toml\n");
}

TEST_F(LogTest, StopRunStatusAndCompletionLine) {
  EXPECT_EXIT(StopRun("Run stopped  "), testing::ExitedWithCode(1), "");
  EXPECT_EQ(Body(), (std::vector<std::string>{"Run stopped", "Abnormal completion"}));
  ASSERT_TRUE(OpenLogFile(log_path));
  EXPECT_EXIT(StopRun("Done", 0), testing::ExitedWithCode(0), "");
  EXPECT_EQ(Body(), (std::vector<std::string>{"Done", "Successful completion"}));
  ASSERT_TRUE(OpenLogFile(log_path));
  EXPECT_EXIT(StopRun("Termination request", 15), testing::ExitedWithCode(15), "");
  EXPECT_EQ(Body(), (std::vector<std::string>{"Termination request", "Abnormal completion"}));
}

TEST_F(LogTest, NightBuildKeepsTheScreenQuiet) {
  const std::string out = dir.file("stdout.txt");
  for (const bool night : {true, false}) {
    EXPECT_EXIT(
        {
          std::freopen(out.c_str(), "w", stdout);
          if (night) setenv("BUILDMODE", "NIGHT", 1);
          StopRun("loud");
        },
        testing::ExitedWithCode(1), "");
    EXPECT_EQ(test::ReadTextFile(out), night ? "" : " loud\n");
  }
}

TEST(KwoExit, RunsTheExitHookWithTheStatus) {
  CloseLogFile();
  test::TempDir dir;
  static std::string marker;
  marker = dir.file("hook.txt");
  EXPECT_EXIT(
      {
        SetExitHook([](int status) { test::WriteTextFile(marker, std::to_string(status)); });
        kwoExit(7);
      },
      testing::ExitedWithCode(7), "");
  EXPECT_EQ(test::ReadTextFile(marker), "7");
}

}  // namespace
}  // namespace vhd
