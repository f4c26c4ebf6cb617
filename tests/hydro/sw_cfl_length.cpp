// The element length of the CFL rate on obtuse sliver triangles. A wave
// crosses such an element through its height, which can be far shorter than
// its shortest edge (edges 10, 10 and 19.9 m: height 1 m). A hump of water on
// a closed basin of these triangles must keep its energy from growing with the
// length 4 A / P (twice the inradius); the shortest edge lets the step exceed
// the crossing time of the height, and the run must show it.

#include <gtest/gtest.h>

#include <cmath>

#include "sw_case.hpp"

namespace vhd::test {
namespace {

constexpr double kDepth = 10.0;  // still water depth (m)
constexpr double kBase = 19.9;   // long edge of the slivers (m)
constexpr double kHeight = 1.0;  // their height (m)

// Energy of the water above the still level: potential g/2 eta^2 plus kinetic
// (P^2 + Q^2) / (2 h), over the basin (m5/s2).
double Energy(const SwCase& c) {
  const HdState& st = c.hd.state;
  double e = 0.0;
  for (int k = 1; k <= st.nelements; ++k) {
    const double kinetic = st.h[k] > 0 ? 0.5 * (st.P[k] * st.P[k] + st.Q[k] * st.Q[k]) / st.h[k] : 0.0;
    e += (0.5 * kPhysical.g * st.eta[k] * st.eta[k] + kinetic) * ElementAreaMetres(c.mesh, k);
  }
  return e;
}

struct Outcome {
  double energy_growth = 0;  // largest energy over the initial energy
  double length = 0;         // CFL length of the elements (m)
  int status = 0;
};

// A Gaussian hump of 0.1 m on 10 m of water, 60 s. The mesh is a grid of
// right triangles sheared by half a cell per row, which makes every element
// an isosceles sliver with the long edge along x.
Outcome RunHump(int order, bool shortest_edge) {
  SwCase c;
  RectangleMeshSpec spec;
  spec.nx = 20, spec.ny = 30;
  spec.x0 = 0, spec.x1 = spec.nx * kBase, spec.y0 = 0, spec.y1 = spec.ny * kHeight;
  spec.layout = CellLayout::kRightTriangles;
  spec.bed = [](double, double) { return -kDepth; };
  GenerateRectangleMesh(spec, c.mesh);
  for (int n = 1; n <= c.mesh.nodes.nnodes; ++n) c.mesh.nodes.x[n] -= 0.5 * kBase * c.mesh.nodes.y[n] / kHeight;
  MakeCaseOnMesh(c, 5.0);
  SetScheme(c.hd, 1, order);
  HdState& st = c.hd.state;
  if (shortest_edge) {
    for (int e = 1; e <= st.nelements; ++e) st.length[e] = c.mesh.elements.length[e];
  }
  const double xm = 0.5 * (spec.x1 - 0.5 * kBase * spec.ny), ym = 0.5 * spec.y1;
  StartCase(c, [&](double x, double y) { return 0.1 * std::exp(-(std::pow(x - xm, 2) + std::pow(y - ym, 2)) / 200.0); });

  Outcome o;
  o.length = st.length[1];
  const double e0 = Energy(c);
  while (c.t < 60.0 && c.run_status >= 0) {
    RunTo(c, c.t + 5.0);
    const double e = Energy(c);
    o.energy_growth = std::max(o.energy_growth, std::isfinite(e) ? e / e0 : 1e300);
  }
  o.status = c.run_status;
  return o;
}

TEST(CflLength, SliverTrianglesNeedTheLengthOfTheirHeight) {
  for (const int order : {1, 2}) {
    SCOPED_TRACE(order);
    const Outcome sound = RunHump(order, false);
    EXPECT_NEAR(sound.length, 4.0 * (0.5 * kBase * kHeight) / (kBase + 2.0 * std::hypot(0.5 * kBase, kHeight)), 1e-9);
    EXPECT_EQ(sound.status, 0);
    EXPECT_LE(sound.energy_growth, 1.0 + 1e-9);

    const Outcome shortest = RunHump(order, true);
    EXPECT_NEAR(shortest.length, std::hypot(0.5 * kBase, kHeight), 1e-9);
    std::printf("order %d: largest energy over the initial, 4 A / P %.3g, shortest edge %.3g (status %d)\n", order,
                sound.energy_growth, shortest.energy_growth, shortest.status);
    EXPECT_TRUE(shortest.status < 0 || shortest.energy_growth > 10.0);
  }
}

}  // namespace
}  // namespace vhd::test
