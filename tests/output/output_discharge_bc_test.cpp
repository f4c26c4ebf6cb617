// Discharge outputs of a steady channel flow fed by a discharge boundary:
// a sloping frictional channel with the discharge given at its upstream end
// and the level at its downstream end. Once the flow is steady, every line
// that cuts the channel from bank to bank carries the boundary's discharge,
// whatever faces it crosses; the values are read back from the files.

#include <gtest/gtest.h>

#include <cmath>
#include <map>
#include <string>
#include <vector>

#include "../hydro/bound_support.hpp"
#include "io/zrn.hpp"
#include "output/hd_output.hpp"

namespace vhd {
namespace {

constexpr double kG = 9.81;

// The records of a point file: the time of each step and the values of each
// item by name.
struct PointRecords {
  std::vector<double> time;
  std::map<std::string, std::vector<double>> items;
};

PointRecords ReadPointFile(const std::string& path) {
  PointRecords r;
  ZrnFile f;
  int status = 0;
  zrnFileRead(f, path, &status);
  EXPECT_EQ(status, 0) << path;
  if (status != 0) return r;
  r.time = f.step_times;
  for (int step = 0; step < f.time.nsteps; ++step)
    for (int k = 1; k <= static_cast<int>(f.items.size()); ++k) {
      const ZrnItemInfo& item = f.items[static_cast<std::size_t>(k - 1)];
      EXPECT_EQ(item.axis.type, kZrnAxisD0) << item.name;
      double v = 0.0;
      EXPECT_EQ(ZrnReadItemAtStep(f, step, k, &v, 1), 0) << path << " step " << step;
      r.items[item.name].push_back(v);
    }
  zrnFileClose(f);
  return r;
}

std::string DischargeOutput(int number, const std::string& file, double x_first, double y_first, double x_last,
                            double y_last) {
  const std::string section = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_" + std::to_string(number) + "]\n";
  const std::string prefix = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_" + std::to_string(number);
  return section + "file_name = \"" + file + "\"\ntype = 4\nformat = 1\ntime_step_frequency = 10\n" + prefix +
         ".DISCHARGE]\nDISCHARGE = true\nACCUMULATED_DISCHARGE = true\n" + prefix + ".LINE]\nx_first = " +
         std::to_string(x_first) + "\ny_first = " + std::to_string(y_first) + "\nx_last = " +
         std::to_string(x_last) + "\ny_last = " + std::to_string(y_last) + "\n";
}

TEST(DischargeOutput, LinesAcrossASteadyChannelCarryTheBoundaryDischarge) {
  // Slope 1e-3, Manning number 30, 2 m2/s over a width of 40 m on triangles
  // whose diagonals run both ways, so that a line meets a staircase of faces.
  const double S = 1e-3, M = 30.0, q = 2.0, dx = 10.0, dt = 100.0;
  const int nx = 100, ny = 4, nsteps = 60;
  const double W = ny * dx, Q = q * W, length = nx * dx;
  const double hn = std::pow(q / (M * std::sqrt(S)), 0.6);
  const double x_last = length - 0.5 * dx;

  test::BoundCase b;
  const std::string outputs =
      "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 3\n" +
      DischargeOutput(1, "straight.zrn0", 500.0, -5.0, 500.0, W + 5.0) +
      DischargeOutput(2, "slanted.zrn0", 300.0, -5.0, 700.0, W + 5.0) +
      DischargeOutput(3, "reversed.zrn0", 700.0, W + 5.0, 300.0, -5.0);
  b.Make(test::Channel(nx, ny, dx, dx, [&](double x, double) { return -S * x; }, 2, 3, 1, 1,
                       CellLayout::kRandomTriangles),
         dt, nsteps,
         test::CodeSection(2, "type = 7\napproach = 2\nconstant_value = " + std::to_string(Q) +
                                  "\ntype_of_soft_start = 0\n") +
             test::CodeSection(3, "type = 6\nconstant_value = " + std::to_string(hn - S * x_last) +
                                      "\ntype_of_soft_start = 0\n") +
             outputs);
  HdModule& hd = b.c.hd;
  Mesh& mesh = b.c.mesh;
  hd.bed.type = kBedManning;
  hd.bed.K.assign(hd.state.nelements, kG / (M * M));
  // On these triangles the outflow through the level boundary keeps
  // oscillating from sub-step to sub-step at a CFL number of 0.8 and above;
  // at 0.5 the flow settles to a steady state.
  hd.time_step.CFL_critical_HD = 0.5;

  HdOutputs out;
  RunControl run;
  SetupOutputsHD(out, mesh, run, hd.time_axis);
  ASSERT_EQ(out.list.outputs.size(), 3u);

  // The uniform flow at the normal depth; the discharge boundary and the
  // discrete friction settle it to the scheme's own steady state.
  b.Start([&](double x, double) { return hn - S * x; }, [&](double, double) { return q / hn; });
  OpenOutputFilesHD(out, hd, mesh);
  WriteOutputHD2D(out, hd, mesh, 0, 0.0);
  int status = 0;
  for (int n = 1; n <= nsteps && status >= 0; ++n) {
    double t = (n - 1) * dt;
    const double t1 = n * dt;
    while (std::fabs(t1 - t) > 1e-6 && status >= 0) {
      const double sub = CALCTIMESTEPHD(hd, b.c.solver, mesh, t, t1);
      StepHD(hd, b.c.solver, mesh, t, sub, status);
      UpdateOutputsHD(out, hd, b.c.solver, mesh, sub);
      t += sub;
    }
    WriteOutputHD2D(out, hd, mesh, n, t1);
  }
  ASSERT_EQ(status, 0);
  CloseOutputFilesHD(out);
  EXPECT_NEAR(-b.BoundaryDischarge(2) / Q, 1.0, 1e-12) << "the boundary faces carry the given discharge";

  struct Expect {
    const char* file;
    double sign;
  } files[] = {{"straight.zrn0", 1.0}, {"slanted.zrn0", 1.0}, {"reversed.zrn0", -1.0}};
  for (const Expect& e : files) {
    SCOPED_TRACE(e.file);
    const PointRecords r = ReadPointFile(b.dir.file(e.file));
    ASSERT_EQ(r.time.size(), static_cast<std::size_t>(nsteps / 10 + 1));
    for (std::size_t k = 0; k < r.time.size(); ++k) EXPECT_NEAR(r.time[k], 10.0 * dt * k, 1e-9);
    ASSERT_EQ(r.items.count("Discharge"), 1u);
    ASSERT_EQ(r.items.count("Accumulated discharge"), 1u);
    const std::vector<double>& discharge = r.items.at("Discharge");
    const std::vector<double>& accumulated = r.items.at("Accumulated discharge");
    // Steady: the last record carries the boundary's discharge, positive to
    // the right of the line walked from its first to its last point.
    EXPECT_NEAR(e.sign * discharge.back() / Q, 1.0, 1e-6);
    // Over the last interval between records the volume through the line
    // is the discharge times the interval.
    const std::size_t last = r.time.size() - 1;
    const double interval = r.time[last] - r.time[last - 1];
    EXPECT_NEAR(e.sign * (accumulated[last] - accumulated[last - 1]) / (Q * interval), 1.0, 1e-6);
    EXPECT_EQ(accumulated.front(), 0.0);
  }
}

}  // namespace
}  // namespace vhd
