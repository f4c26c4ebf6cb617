// Discharge through a line, mass budgets of a polygon and the volume
// balance of a run, against exact amounts.

#include <gtest/gtest.h>

#include <filesystem>

#include "io/units.hpp"
#include "output_support.hpp"

namespace vhd::test {
namespace {

std::vector<double> ReadStep(const std::string& path, int step) {
  ZrnFile f;
  zrnFileRead(f, path);
  std::vector<double> v;
  for (int i = 1; i <= static_cast<int>(f.items.size()); ++i) {
    double x = 0;
    ZrnReadItemAtStep(f, step, i, &x, 1);
    v.push_back(x);
  }
  zrnFileClose(f);
  return v;
}

TEST(Discharge, UniformFlowCarriesDepthTimesVelocityTimesWidth) {
  OutputCase c;
  // A channel 200 m long and 50 m wide, 2 m deep, flowing east at 0.5 m/s.
  c.MakeMesh(20, 5, 10.0, 10.0, [](double, double) { return -2.0; }, CellLayout::kRandomTriangles);
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 1\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]\nfile_name = \"q.zrn0\"\ntype = 4\nformat = 1\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.DISCHARGE]\nPOSITIVE_ACCUMULATED_DISCHARGE = true\n"
          "NEGATIVE_ACCUMULATED_DISCHARGE = true\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.LINE]\n"
          "x_first = 100.0\ny_first = -5.0\nx_last = 100.0\ny_last = 55.0\n");
  c.Fill([](double, double) { return 0.0; }, [](double, double) { return 0.5; });
  c.Start();  // the face fluxes of the initial state
  for (int k = 0; k < 3; ++k) UpdateOutputsHD(c.out, c.hd, c.solver, c.mesh, 10.0);
  WriteOutputHD2D(c.out, c.hd, c.mesh, 1, 30.0);
  CloseOutputFilesHD(c.out);
  const std::vector<double> q = ReadStep(c.File("q.zrn0"), 0);
  ASSERT_EQ(q.size(), 4u);
  EXPECT_NEAR(q[0], 2.0 * 0.5 * 50.0, 1e-9);    // to the right of the line, walking north
  EXPECT_NEAR(q[1], 50.0 * 30.0, 1e-7);
  EXPECT_NEAR(q[2], 50.0 * 30.0, 1e-7);
  EXPECT_EQ(q[3], 0.0);
}

// A basin with a sloping bed, partly dry, released from a tilted surface.
void RunBasin(OutputCase& c, int steps) {
  c.MakeMesh(16, 8, 10.0, 10.0, [](double x, double) { return -1.0 + 0.0125 * x; }, CellLayout::kMixed);
  c.FloodDry();
  c.time.dt = 5.0;
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 1\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]\nfile_name = \"budget.zrn0\"\ntype = 3\nformat = 0\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.MASSBUDGET]\nnumber_of_points = 4\nwrite_section = 1\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.MASSBUDGET.POINT_1]\nx = -1.0\ny = -1.0\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.MASSBUDGET.POINT_2]\nx = 60.0\ny = -1.0\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.MASSBUDGET.POINT_3]\nx = 60.0\ny = 81.0\n"
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.MASSBUDGET.POINT_4]\nx = -1.0\ny = 81.0\n");
  c.Fill([](double x, double) { return 0.3 - 0.004 * x; });
  c.Start();
  WriteOutputHD2D(c.out, c.hd, c.mesh, 0, 0.0);
  c.Run(0, steps);
  ASSERT_EQ(c.status, 0);
}

// The run's volume balance and the budget of the western half both close.
TEST(VolumeBalance, ClosedBasinConservesTheVolumeAndThePolygonBudgetCloses) {
  OutputCase c;
  RunBasin(c, 12);
  const VolumeBalance b = VolumeBalanceHD(c.out, c.hd, c.mesh, c.run);
  EXPECT_GT(b.initial, 100.0);
  EXPECT_LT(std::fabs(b.Continuity()), 1e-9 * b.initial) << b.Continuity();
  EXPECT_EQ(b.boundaries, 0.0);
  EXPECT_GT(b.final_wet, 0.0);

  PrintVolumeBalanceHD(c.out, c.hd, c.mesh, c.run);
  CloseOutputFilesHD(c.out);
  const std::string log = c.Log();
  const auto at = log.find("Volume balance");
  ASSERT_NE(at, std::string::npos);
  EXPECT_NE(log.find("  Continuity balance (m**3)                          : ", at), std::string::npos);
  EXPECT_NE(log.find("  Volume defect (m**3)                               : ", at), std::string::npos);
  EXPECT_NE(log.find("  Initial volume in model area (m**3)                : ", at), std::string::npos);
  EXPECT_EQ(log.find("River"), std::string::npos);
  EXPECT_EQ(log.find("Urban"), std::string::npos);
  const std::string html = ReadTextFile(c.File("model_VolumeBalance.html"));
  EXPECT_NE(html.find("Continuity balance (m**3)"), std::string::npos);

  ZrnFile f;
  zrnFileRead(f, c.File("budget.zrn0"));
  ASSERT_EQ(f.items.size(), 9u);
  EXPECT_EQ(f.items[0].name, "Total area, Flow");
  EXPECT_EQ(f.items[8].name, "Error, Flow");
  EXPECT_EQ(f.time.nsteps, 13);
  zrnFileClose(f);
  const std::vector<double> start = ReadStep(c.File("budget.zrn0"), 0);
  const std::vector<double> end = ReadStep(c.File("budget.zrn0"), 12);
  // The western half loses water to the east through its border.
  EXPECT_LT(end[4], -1.0);
  EXPECT_NEAR(end[0], start[0] + end[4] + end[5] + end[6] + end[7], 1e-9 * start[0]);
  EXPECT_LT(std::fabs(end[8]), 1e-9 * start[0]);
  EXPECT_NEAR(end[1] + end[3], end[0], 1e-9 * start[0]);
  EXPECT_TRUE(std::filesystem::exists(c.File("budget.xyz")));
}

}  // namespace
}  // namespace vhd::test
