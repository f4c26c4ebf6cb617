// Output sections: step selection, emergency records, skipped outputs and the
// refusal of formats that do not fit the mesh.

#include <gtest/gtest.h>

#include <filesystem>

#include "output_support.hpp"

namespace vhd::test {
namespace {

std::string AreaOutput(int i, const std::string& file, const std::string& keys) {
  return "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_" + std::to_string(i) + "]\nfile_name = \"" + file +
         "\"\nformat = 2\n" + keys + "\n[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_" + std::to_string(i) +
         ".PARAMETERS_2D]\nSURFACE_ELEVATION = true\n";
}

// Times of the records in seconds since the simulation start.
std::vector<double> StepTimes(const std::string& path, const TimeAxis& time) {
  ZrnFile f;
  zrnFileRead(f, path);
  const double offset = zrnSecondsBetween(zrnDateTime(time.start), f.time.start);
  std::vector<double> t;
  for (double s : f.step_times) t.push_back(offset + s);
  zrnFileClose(f);
  return t;
}

TEST(OutputSteps, FirstLastAndFrequencySelectTheSteps) {
  OutputCase c;
  c.MakeMesh(4, 3, 10.0, 10.0, [](double, double) { return -2.0; });
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 1\n" +
          AreaOutput(1, "area.zrnu", "first_time_step = 10\nlast_time_step = 20\ntime_step_frequency = 5"));
  c.Fill([](double x, double) { return 0.01 * x; });
  c.Start();
  for (int n = 0; n <= 30; ++n) WriteOutputHD2D(c.out, c.hd, c.mesh, n, n * c.time.dt);
  CloseOutputFilesHD(c.out);
  EXPECT_EQ(StepTimes(c.File("area.zrnu"), c.time), (std::vector<double>{300.0, 450.0, 600.0}));
  EXPECT_NE(c.Log().find("Data File Summary"), std::string::npos);
}

TEST(OutputSteps, StepMinusOneWritesTheStateOnceMore) {
  OutputCase c;
  c.MakeMesh(4, 3, 10.0, 10.0, [](double, double) { return -2.0; });
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 1\n" +
          AreaOutput(1, "area.zrnu", "time_step_frequency = 2"));
  c.Fill([](double, double) { return 0.0; });
  c.Start();
  for (int n = 0; n <= 4; ++n) WriteOutputHD2D(c.out, c.hd, c.mesh, n, n * c.time.dt);
  // The run fails in the middle of step 5: the state at 137 s is written.
  WriteOutputHD2D(c.out, c.hd, c.mesh, -1, 137.0);
  // A failure right after a record of the same state adds nothing.
  WriteOutputHD2D(c.out, c.hd, c.mesh, -1, 137.0);
  CloseOutputFilesHD(c.out);
  EXPECT_EQ(StepTimes(c.File("area.zrnu"), c.time), (std::vector<double>{0.0, 60.0, 120.0, 137.0}));
}

TEST(OutputSetup, ExcludedOutputReadsNothingAndWritesNoFile) {
  OutputCase c;
  c.MakeMesh(2, 2, 10.0, 10.0, [](double, double) { return -1.0; });
  c.time.last_step = 17;
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 2\n" +
          AreaOutput(1, "skipped.zrnu", "include = 0\ntitle = \"never read\"") + AreaOutput(2, "kept.zrnu", ""));
  c.Fill([](double, double) { return 0.0; });
  c.Start();
  CloseOutputFilesHD(c.out);
  ASSERT_EQ(c.out.list.outputs.size(), 1u);
  EXPECT_EQ(c.out.list.outputs[0].number, 2);
  EXPECT_EQ(c.out.list.outputs[0].last_time_step, 17);  // the run's last step by default
  EXPECT_FALSE(std::filesystem::exists(c.File("skipped.zrnu")));
  EXPECT_TRUE(std::filesystem::exists(c.File("kept.zrnu")));
  const std::string log = c.Log();
  EXPECT_EQ(log.find("never read"), std::string::npos);
  EXPECT_EQ(log.find("skipped.zrnu"), std::string::npos);
}

void SetupAndExpectFatal(const std::string& body, const std::string& text) {
  OutputCase c;
  c.MakeMesh(2, 2, 10.0, 10.0, [](double, double) { return -1.0; });
  const std::string log = c.log_path;
  EXPECT_EXIT(
      {
        OmpSetThreads(1);
        c.Setup(body);
      },
      ::testing::ExitedWithCode(1), "");
  EXPECT_NE(ReadTextFile(log).find(text), std::string::npos) << ReadTextFile(log);
}

TEST(OutputSetupDeathTest, RefusalsCarryTheSystemsText) {
  const std::string head = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 1\n";
  const std::string out1 = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]\n";
  SetupAndExpectFatal(head + out1 + "file_name = \"v.zrnu\"\nformat = 3\n" +
                          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]\nSURFACE_ELEVATION = true\n",
                      "SpecOutputDomain: Output format not supported");
  SetupAndExpectFatal(head + out1 + "file_name = \"p.zrnu\"\nformat = 0\nnumber_of_points = 1\n" +
                          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.POINT_1]\nx = 5.0\ny = 5.0\n" +
                          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]\nSURFACE_ELEVATION = true\n",
                      "SetupPointDomain: Wrong file type");
  SetupAndExpectFatal(head + out1 + "file_name = \"b.zrn0\"\ntype = 9\n", "SpecOutputFileHD: Output type not supported");
  SetupAndExpectFatal(head + out1 + "file_name = \"b.zrn0\"\ntype = 3\nformat = 0\n" +
                          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.MASSBUDGET]\nFLOW = 0\n",
                      "SpecMassBudget: No components selected");
  SetupAndExpectFatal(head + out1 + "file_name = \"b.zrn0\"\ntype = 3\nformat = 0\n" +
                          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.MASSBUDGET]\nMASS_TOTAL = 0\n" +
                          "MASS_WET = 0\nMASS_REAL_WET = 0\nMASS_DRY = 0\nMASS_TRANSPORT = 0\nMASS_SOURCE = 0\n" +
                          "MASS_PROCES = 0\nMASS_DEFECT = 0\nMASS_ERROR = 0\n",
                      "SpecMassBudget: No items selected");
}

}  // namespace
}  // namespace vhd::test
