// Open boundaries in channel flows against exact or well-known solutions:
// a tide through a level boundary (linear long-wave theory), steady discharge
// into a sloping frictional channel (Manning normal depth), outgoing waves at
// absorbing boundaries (reflection), periodic channels, and velocity and flux
// boundaries delivering their discharge.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <numbers>
#include <string>
#include <vector>

#include "bound_support.hpp"

namespace vhd {
namespace {

using test::BoundCase;
using test::Channel;
using test::CodeSection;
using test::Flat;
using test::WriteSeries;

constexpr double kG = 9.81;

int NearestElement(const Mesh& m, double x, double y) {
  int best = 1;
  double dmin = 1e300;
  for (int e = 1; e <= m.elements.nelements; ++e) {
    const double d = std::hypot(m.elements.xc[e] - x, m.elements.yc[e] - y);
    if (d < dmin) dmin = d, best = e;
  }
  return best;
}

// ---- tide through a level boundary --------------------------------------------------------

TEST(BoundFlow, TideInAClosedChannelFollowsLinearLongWaveTheory) {
  // Depth 10 m, period 20 min, channel an eighth of a wave length long,
  // closed at its east end; level a cos(wt) at the west end. Linear theory:
  //   eta(x, t) = a cos(k (L - x)) / cos(k L) cos(w t).
  const double H = 10.0, a = 0.01, T = 1200.0;
  const double c0 = std::sqrt(kG * H), w = 2 * std::numbers::pi / T, k = w / c0;
  const double L = c0 * T / 8.0;
  const int nx = 100;
  const double dx = L / nx, dt = 30.0;
  const int nsteps = static_cast<int>(2 * T / dt);
  auto exact = [&](double x) { return a * std::cos(k * (L - x)) / std::cos(k * L); };

  BoundCase b;
  TimeAxis time;
  WriteSeries(b.dir.file("tide.zrn0"), time, 10.0, static_cast<int>(2 * T / 10.0) + 2,
              [&](double t) { return a * std::cos(w * t); });
  b.Make(Channel(nx, 2, dx, dx, Flat(H), 2, 1), dt, nsteps,
         CodeSection(2, "type = 6\nformat = 1\nfile_name = \"tide.zrn0\"\nitem_number = 1\n"
                        "type_of_soft_start = 0\n"));
  b.Start([&](double x, double) { return exact(x); });

  // One period to settle, then the Fourier coefficients of the second.
  test::RunTo(b.c, T);
  const double gauges[] = {0.25 * L, 0.5 * L, 0.75 * L, L};
  std::vector<int> elements;
  for (double x : gauges) elements.push_back(NearestElement(b.c.mesh, x, dx));
  std::vector<double> ac(elements.size(), 0.0), as(elements.size(), 0.0);
  const int n = static_cast<int>(T / dt);
  for (int j = 1; j <= n; ++j) {
    test::RunTo(b.c, T + j * dt);
    const double t = T + j * dt;
    for (std::size_t g = 0; g < elements.size(); ++g) {
      ac[g] += 2.0 / n * b.c.hd.state.eta[elements[g]] * std::cos(w * t);
      as[g] += 2.0 / n * b.c.hd.state.eta[elements[g]] * std::sin(w * t);
    }
  }
  ASSERT_GE(b.c.run_status, 0);
  for (std::size_t g = 0; g < elements.size(); ++g) {
    const double x = b.c.mesh.elements.xc[elements[g]];
    const double amplitude = std::hypot(ac[g], as[g]);
    const double phase = std::atan2(as[g], ac[g]) * 180.0 / std::numbers::pi;
    EXPECT_NEAR(amplitude / exact(x), 1.0, 0.03) << "gauge at x = " << x;
    EXPECT_NEAR(phase, 0.0, 2.0) << "gauge at x = " << x << " (degrees)";
  }
}

// ---- steady discharge into a sloping frictional channel -----------------------------------

TEST(BoundFlow, DischargeReachesTheManningNormalDepth) {
  // Slope 1e-3, Manning number 30, 2 m2/s: normal depth (q / (M sqrt(S)))^(3/5).
  const double S = 1e-3, M = 30.0, q = 2.0, dx = 10.0;
  const int nx = 200, ny = 2;
  const double W = ny * dx, Q = q * W, length = nx * dx;
  const double hn = std::pow(q / (M * std::sqrt(S)), 0.6);
  const double x_last = length - 0.5 * dx;
  for (int approach : {1, 2, 3}) {
    BoundCase b;
    b.Make(Channel(nx, ny, dx, dx, [&](double x, double) { return -S * x; }, 2, 3), 100.0, 60,
           CodeSection(2, "type = 7\napproach = " + std::to_string(approach) + "\nconstant_value = " +
                              std::to_string(Q) + "\ntype_of_soft_start = 0\n") +
               CodeSection(3, "type = 6\nconstant_value = " + std::to_string(hn - S * x_last) +
                                  "\ntype_of_soft_start = 0\n"));
    HdModule& hd = b.c.hd;
    hd.bed.type = kBedManning;
    hd.bed.K.assign(hd.state.nelements, kG / (M * M));
    b.Start([&](double x, double) { return hn - S * x; });
    test::RunTo(b.c, 6000.0);
    ASSERT_GE(b.c.run_status, 0);

    double h_sum = 0.0;
    int count = 0;
    for (int e = 1; e <= hd.state.nelements; ++e) {
      if (b.c.mesh.elements.xc[e] < 0.25 * length) h_sum += hd.state.h[e], ++count;
    }
    EXPECT_NEAR(h_sum / count / hn, 1.0, 0.01) << "approach " << approach;
    // The inflow faces carry the discharge exactly where it is written
    // directly (approaches 2 and 3), the channel carries it everywhere.
    const double inflow = -b.BoundaryDischarge(2);
    EXPECT_NEAR(inflow / Q, 1.0, approach == 1 ? 5e-3 : 1e-12) << "approach " << approach;
    EXPECT_NEAR(b.CrossSectionDischarge(0.5 * length) / Q, 1.0, 5e-3) << "approach " << approach;
    EXPECT_NEAR(b.BoundaryDischarge(3) / Q, 1.0, 5e-3) << "approach " << approach;
  }
}

// ---- outgoing waves -----------------------------------------------------------------------

// A simple wave running east in a channel 10 km long and 10 m deep, closed in
// the west, with the boundary under test in the east. Returns the reflection:
// the largest level of the returning wave at a gauge 1.5 km from the
// boundary over the crest of the incident wave there.
double Reflection(const std::string& east) {
  const double H = 10.0, a = 0.05, L = 10000.0, x0 = 3000.0, sigma = 500.0, dx = 25.0;
  const double c0 = std::sqrt(kG * H);
  BoundCase b;
  b.Make(Channel(400, 2, dx, dx, Flat(H), 1, 2), 10.0, 110, east);
  b.Start([&](double x, double) { return a * std::exp(-std::pow((x - x0) / sigma, 2)); },
          [&](double x, double) {
            const double eta = a * std::exp(-std::pow((x - x0) / sigma, 2));
            return 2.0 * (std::sqrt(kG * (H + eta)) - c0);
          });
  const int gauge = NearestElement(b.c.mesh, L - 1500.0, dx);
  // The incident wave has passed the gauge before the reflection off the
  // boundary (at x = L, about t = 700 s) can return; the returning wave
  // passes it about 860 s.
  double incident = 0.0, reflected = 0.0;
  for (int j = 1; j <= 110; ++j) {
    test::RunTo(b.c, 10.0 * j);
    const double eta = b.c.hd.state.eta[gauge];
    if (10.0 * j <= 700.0) incident = std::max(incident, eta);
    if (10.0 * j >= 780.0) reflected = std::max(reflected, std::abs(eta));
  }
  EXPECT_GE(b.c.run_status, 0);
  EXPECT_GT(incident, 0.6 * a);  // the crest, somewhat spread by the first-order scheme
  return reflected / incident;
}

TEST(BoundFlow, OutgoingWaveLeavesWeaklyReflectingAndFlatherBoundaries) {
  EXPECT_GT(Reflection(CodeSection(2, "type = 1\n")), 0.8) << "a wall sends the wave back";
  EXPECT_LT(Reflection(CodeSection(2, "type = 10\nconstant_value = 0.0\n")), 0.01) << "weakly reflecting level";
  EXPECT_LT(Reflection(CodeSection(2, "type = 12\nconstant_value = 0.0\n") +
                       test::HdSection("BOUNDARY_CONDITIONS.CODE_2.DATA_2", "constant_values = [0.0, 0.0]\n")),
            0.01)
      << "Flather boundary";
}

// ---- periodic channel ------------------------------------------------------------------------

TEST(BoundFlow, UniformFlowInAPeriodicChannelStaysUniform) {
  for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kRightTriangles}) {
    BoundCase b;
    b.Make(Channel(20, 4, 10.0, 10.0, Flat(5.0), 2, 3, 1, 1, layout), 20.0, 10,
           CodeSection(2, "type = 15\ncode_cyclic = 3\n") + CodeSection(3, "type = 15\n"));
    b.Start([](double, double) { return 0.0; }, [](double, double) { return 1.0; });
    test::RunTo(b.c, 200.0);
    const HdState& st = b.c.hd.state;
    double err = 0.0;
    for (int e = 1; e <= st.nelements; ++e) {
      err = std::max({err, std::abs(st.h[e] - 5.0), std::abs(st.u[e] - 1.0), std::abs(st.v[e])});
    }
    EXPECT_LT(err, 1e-10);
  }
}

TEST(BoundFlow, PeriodicChannelConservesMassAsAWaveCrossesTheSeam) {
  BoundCase b;
  b.Make(Channel(40, 2, 10.0, 10.0, Flat(5.0), 2, 3), 10.0, 30,
         CodeSection(2, "type = 15\n") + CodeSection(3, "type = 15\n"));
  // A crest running east: level and velocity of a simple wave on 0.5 m/s.
  auto eta0 = [](double x, double) { return 0.2 * std::exp(-std::pow((x - 300.0) / 30.0, 2)); };
  b.Start(eta0, [&](double x, double y) {
    return 0.5 + 2.0 * (std::sqrt(kG * (5.0 + eta0(x, y))) - std::sqrt(kG * 5.0));
  });
  const double v0 = test::Volume(b.c);
  test::RunTo(b.c, 20.0);  // at 7.5 m/s the crest crosses x = 400 m into the west end
  const HdState& st = b.c.hd.state;
  int crest = 1;
  for (int e = 2; e <= st.nelements; ++e)
    if (st.eta[e] > st.eta[crest]) crest = e;
  EXPECT_LT(b.c.mesh.elements.xc[crest], 120.0) << "the crest re-enters in the west";
  EXPECT_NEAR(test::Volume(b.c) / v0, 1.0, 1e-13);
}

// ---- velocity and flux boundaries -----------------------------------------------------------

TEST(BoundFlow, VelocityAndFluxBoundariesDeliverTheirDischarge) {
  const double H = 2.0, M = 25.0, dx = 20.0, W = 40.0;
  struct Row {
    std::string keys;
    int type;
  } rows[] = {{"type = 4\nconstant_values = [0.5, 0.0]\n", 4},
              {"type = 5\nconstant_values = [1.0, 0.0]\n", 5},
              {"type = 11\nconstant_values = [0.5, 0.0]\n", 11}};
  for (const Row& r : rows) {
    BoundCase b;
    b.Make(Channel(50, 2, dx, dx, Flat(H), 2, 3), 100.0, 40,
           CodeSection(2, r.keys) + CodeSection(3, "type = 6\nconstant_value = 0.0\n"));
    HdModule& hd = b.c.hd;
    hd.bed.type = kBedManning;
    hd.bed.K.assign(hd.state.nelements, kG / (M * M));
    b.Start([](double, double) { return 0.0; });
    test::RunTo(b.c, 4000.0);
    ASSERT_GE(b.c.run_status, 0);
    // Type 4: the data velocity times the depth inside the boundary; 5: the
    // data flux; 11: the data velocity over the still water depth.
    double prescribed = r.type == 5 ? 1.0 * W : r.type == 11 ? 0.5 * H * W : 0.0;
    for (int j = 1; r.type == 4 && j <= b.NFaces(2); ++j)
      prescribed += 0.5 * hd.state.h[b.Face(2, j).element] * b.c.mesh.faces.length[b.Face(2, j).face];
    EXPECT_NEAR(-b.BoundaryDischarge(2) / prescribed, 1.0, 0.01) << "type " << r.type;
    EXPECT_NEAR(b.CrossSectionDischarge(500.0) / prescribed, 1.0, 0.01) << "type " << r.type;
  }
}

}  // namespace
}  // namespace vhd

