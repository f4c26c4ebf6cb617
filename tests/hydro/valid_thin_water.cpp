// Thin water on a flat bed slows down by bed friction alone. Uniform flow of
// depth h and velocity u with Manning number M obeys
//     du/dt = -g u |u| / (M^2 h^(4/3)),   so   u(t) = u0 / (1 + k u0 t),
// k = g / (M^2 h^(4/3)). Water that is wet and moving, from a few centimetres
// deep up to half a metre, must follow this law (within 5 %) in the middle of
// a long channel, whatever the depths at which flooding and drying act.

#include <gtest/gtest.h>

#include <cmath>

#include "sw_case.hpp"

namespace vhd::test {
namespace {

constexpr double g = 9.81;
constexpr double kManning = 32.0;

TEST(ThinWater, FrictionSlowsMovingWaterAtEveryDepth) {
  struct Run {
    double depth;
    CellLayout layout;
    int order;
  };
  const Run runs[] = {
      {0.02, CellLayout::kRandomTriangles, 1}, {0.08, CellLayout::kQuadrilaterals, 2},
      {0.08, CellLayout::kMixed, 1},           {0.5, CellLayout::kRandomTriangles, 2},
  };
  constexpr double u0 = 1.0, t_end = 20.0;
  for (const Run& r : runs) {
    SwCase c;
    RectangleMeshSpec spec;
    spec.x0 = 0, spec.x1 = 600.0, spec.y0 = 0, spec.y1 = 30.0;
    spec.nx = 60, spec.ny = 3;
    spec.layout = r.layout;
    spec.jitter = 0.2;
    MakeCase(c, spec, 1.0);
    SetScheme(c.hd, 1, r.order);
    SetFloodDry(c.hd, 0.005, 0.05, 0.1);
    c.hd.bed.type = kBedManning;
    c.hd.bed.K.assign(c.hd.state.nelements, g / (kManning * kManning));
    StartCase(c, [&](double, double) { return r.depth; }, [&](double, double) { return u0; });
    // Water thinner than the mass depth starts flooded (at rest); this water
    // has been moving: wet, with its momentum.
    HdState& st = c.hd.state;
    for (int e = 1; e <= st.nelements; ++e) {
      st.wetdry[e] = kWet;
      st.P[e] = u0 * st.h[e];
    }
    InitialStepHD(c.hd, c.solver, c.mesh);
    c.hd.cfl_rate_max_ready = -1.0;
    RunTo(c, t_end);
    ASSERT_EQ(c.run_status, 0);

    const double k = g / (kManning * kManning * std::pow(r.depth, 4.0 / 3.0));
    const double exact = u0 / (1.0 + k * u0 * t_end);
    // Mean velocity of the middle reach (the walls' disturbances travel at
    // most (u0 + sqrt(g h)) t_end = 64 m in).
    double u_sum = 0.0, area = 0.0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double x = c.mesh.elements.xc[e];
      if (x < 200.0 || x > 400.0) continue;
      u_sum += st.u[e] * c.mesh.elements.area[e];
      area += c.mesh.elements.area[e];
    }
    const double u = u_sum / area;
    std::printf("depth %.2f m, order %d: u %.4f m/s, exact %.4f m/s, error %.2f %%\n", r.depth, r.order, u, exact,
                100.0 * std::abs(u - exact) / exact);
    EXPECT_NEAR(u, exact, 0.05 * exact) << "depth " << r.depth;
  }
}

}  // namespace
}  // namespace vhd::test
