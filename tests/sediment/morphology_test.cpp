// The bed update with the flow: sand conserved in a closed basin over 1,000
// sub-steps of a sloshing flow over steep, partly dry terrain; a small hump
// travels at the celerity of linear theory; a lake at rest stays at rest over
// a changed bed; one and two threads give the same bits.

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "../hydro/sw_case.hpp"
#include "core/omp.hpp"
#include "hydro/bed_change.hpp"
#include "sediment/st_module.hpp"

namespace vhd {
namespace {

using test::SwCase;

// A basin of 24 x 6 cells of 10 m: a bumpy bed 2 m deep that rises steeply
// out of the water at the east end; the surface tilted 0.4 m, so that the
// water sloshes over the bumps and floods and dries the slope.
double BasinBed(double x, double y) {
  const double bumps = 0.3 * std::sin(0.09 * x) * std::cos(0.2 * y);
  return x < 180.0 ? -2.0 + bumps : -2.0 + bumps + 0.06 * (x - 180.0);
}

void MakeBasin(SwCase& c, CellLayout layout) {
  RectangleMeshSpec spec;
  spec.x1 = 240.0;
  spec.y1 = 60.0;
  spec.nx = 24;
  spec.ny = 6;
  spec.layout = layout;
  spec.jitter = 0.1;
  spec.bed = BasinBed;
  test::MakeCase(c, spec, 30.0);
  test::SetScheme(c.hd, 1, 2);
  test::SetFloodDry(c.hd, 0.005, 0.05, 0.1);
  c.hd.bed.type = kBedDragCoefficient;
  c.hd.bed.K.assign(c.hd.state.nelements, 0.004);
  test::StartCase(c, [](double x, double) { return 0.4 * std::cos(M_PI * x / 180.0); });
}

void MakeSand(StModule& st, const SwCase& c, int formula, double morphological_factor) {
  st.bed_load.formula = formula;
  st.grain_diameter = 2e-4;
  st.morphological_factor = morphological_factor;
  AllocateST(st, c.hd, c.mesh);
  SetupTimingST(st);
}

double BedVolume(const SwCase& c) {
  double v = 0.0;
  for (int e = 1; e <= c.hd.state.nelements_owned; ++e) v += -c.hd.state.d[e] * c.mesh.elements.area[e];
  return v;
}

// n sub-steps of the flow, each followed by the sand.
void RunSubSteps(SwCase& c, StModule& st, int n) {
  for (int k = 0; k < n && c.run_status >= 0; ++k) {
    const double dt = CALCTIMESTEPHD(c.hd, c.solver, c.mesh, c.t, c.t + 30.0);
    StepHD(c.hd, c.solver, c.mesh, c.t, dt, c.run_status);
    c.t += dt;
    StepST(st, c.hd, c.mesh, c.t, dt);
  }
}

TEST(Morphology, SandIsConservedInAClosedBasin) {
  for (const CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kQuadrilaterals, CellLayout::kMixed}) {
    for (int formula = 1; formula <= 4; ++formula) {
      SwCase c;
      MakeBasin(c, layout);
      StModule st;
      MakeSand(st, c, formula, 50.0);
      st.helical_flow = 1;
      AllocateST(st, c.hd, c.mesh);
      double scale = 0.0;
      for (int e = 1; e <= c.hd.state.nelements_owned; ++e)
        scale += std::fabs(c.hd.state.d[e]) * c.mesh.elements.area[e];
      const double v0 = BedVolume(c);
      RunSubSteps(c, st, 1000);
      ASSERT_GE(c.run_status, 0);
      double largest = 0.0;
      for (int e = 1; e <= st.nowned; ++e) largest = std::max(largest, std::fabs(st.bed_change[e]));
      EXPECT_GT(largest, 1e-3) << "formula " << formula << ": the bed hardly moved";
      EXPECT_LE(std::fabs(BedVolume(c) - v0), 1e-12 * scale) << "formula " << formula;
      EXPECT_LE(std::fabs(BedVolumeChangeST(st, RunControl{})), 1e-12 * scale);
      // The flow state stays consistent with the new bed.
      const HdState& s = c.hd.state;
      for (int e = 1; e <= s.nelements_owned; ++e) {
        ASSERT_GE(s.h[e], 0.0);
        if (s.wetdry[e] > 0) {
          ASSERT_NEAR(s.h[e], s.eta[e] + s.d[e], 1e-12);
        }
      }
    }
  }
}

TEST(Morphology, OneAndTwoThreadsGiveTheSameBits) {
  std::vector<double> d[2], qx[2];
  for (int threads = 1; threads <= 2; ++threads) {
    SwCase c;
    MakeBasin(c, CellLayout::kMixed);
    StModule st;
    MakeSand(st, c, 4, 50.0);
    st.helical_flow = 1;
    AllocateST(st, c.hd, c.mesh);
    OmpSetThreads(threads);
    RunSubSteps(c, st, 200);
    OmpSetThreads(1);
    d[threads - 1].assign(c.hd.state.d.begin(), c.hd.state.d.end());
    qx[threads - 1].assign(st.qx.begin(), st.qx.end());
  }
  EXPECT_EQ(d[0], d[1]);
  EXPECT_EQ(qx[0], qx[1]);
}

// ---- a hump in a uniform current ----------------------------------------------

// Meyer-Peter and Mueller written out for the celerity: q of speed U.
double Mpm(double U, double f, double d, double s, double theta_c) {
  const double a = (s - 1) * 9.81 * d;
  const double theta = f * U * U / a;
  const double skin = std::fmin(theta, double(0.06f) + double(0.4f) * theta * theta);
  return skin > theta_c ? 8 * d * std::sqrt(a) * std::pow(skin - theta_c, 1.5) : 0.0;
}

TEST(Morphology, HumpTravelsAtTheCelerityOfLinearTheory) {
  // A channel 400 m x 20 m of jittered triangles (2 m cells), open at both
  // ends, 2 m deep, discharge 2 m2/s; a sine-squared hump 0.02 m high and 40 m
  // long. The flow follows the bed quasi-steadily (rigid lid, constant
  // discharge: the bed update keeps the surface and the fluxes).
  SwCase c;
  RectangleMeshSpec spec;
  spec.x1 = 400.0;
  spec.y1 = 20.0;
  spec.nx = 200;
  spec.ny = 10;
  spec.layout = CellLayout::kRandomTriangles;
  spec.jitter = 0.1;
  spec.code_west = 2;
  spec.code_east = 2;
  const double depth = 2.0, amplitude = 0.02, x_hump = 100.0, length = 40.0, discharge = 2.0, f = 0.003;
  spec.bed = [&](double x, double) {
    const double r = (x - x_hump) / length;
    return -depth + (std::fabs(r) < 0.5 ? amplitude * std::pow(std::cos(M_PI * r), 2) : 0.0);
  };
  test::MakeCase(c, spec, 30.0);
  HdState& s = c.hd.state;
  for (int e = 1; e <= s.nelements; ++e) {
    s.eta[e] = 0.0;
    s.h[e] = s.d[e];
    s.P[e] = discharge;
    s.Q[e] = 0.0;
    s.u[e] = discharge / s.h[e];
    s.v[e] = 0.0;
    s.cf[e] = f;
    s.wetdry[e] = kWet;
  }
  StModule st;
  st.bed_load.formula = kBedLoadMeyerPeterMueller;
  st.grain_diameter = 3e-4;
  st.porosity = 0.4;
  AllocateST(st, c.hd, c.mesh);
  SetupTimingST(st);

  // Linear theory: c = dq/dz_b / (1 - porosity), u = discharge / (eta - z_b).
  const double eps = 1e-4;
  const double dq = Mpm(discharge / (depth - eps), f, 3e-4, 2.65, 0.047) -
                    Mpm(discharge / (depth + eps), f, 3e-4, 2.65, 0.047);
  const double celerity = dq / (2 * eps) / (1 - st.porosity);

  auto centroid = [&] {
    double m = 0.0, mx = 0.0;
    for (int e = 1; e <= s.nelements_owned; ++e) {
      const double x = c.mesh.elements.xc[e];
      if (x < 40.0 || x > 360.0) continue;
      const double bump = (-s.d[e] + depth) * c.mesh.elements.area[e];
      m += bump;
      mx += bump * x;
    }
    return mx / m;
  };
  const double x0 = centroid();
  const double dt = 2000.0, travel = 40.0;
  const int steps = static_cast<int>(travel / celerity / dt);
  double t = 0.0;
  for (int k = 0; k < steps; ++k) {
    t += dt;
    StepST(st, c.hd, c.mesh, t, dt);
  }
  const double speed = (centroid() - x0) / t;
  EXPECT_NEAR(speed / celerity, 1.0, 0.05) << "celerity " << celerity << " m/s, hump " << speed << " m/s";
  EXPECT_GT(centroid() - x0, 0.8 * travel);
}

// ---- lake at rest -----------------------------------------------------------------

TEST(Morphology, LakeAtRestStaysAtRestOverAChangedBed) {
  struct Scheme {
    int order, face_average_d;
  };
  for (const CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kQuadrilaterals, CellLayout::kMixed}) {
    for (const Scheme scheme : {Scheme{1, 0}, Scheme{2, 1}, Scheme{2, 2}}) {
      SwCase c;
      RectangleMeshSpec spec;
      spec.x1 = 240.0;
      spec.y1 = 60.0;
      spec.nx = 24;
      spec.ny = 6;
      spec.layout = layout;
      spec.jitter = 0.1;
      spec.bed = BasinBed;
      test::MakeCase(c, spec, 30.0);
      test::SetScheme(c.hd, 1, scheme.order);
      c.hd.solution.face_average_d = scheme.face_average_d;
      test::SetFloodDry(c.hd, 0.005, 0.05, 0.1);
      test::StartCase(c, [](double, double) { return 0.0; });
      // A bed change of up to 3 m, raising a band of wet elements out of the
      // water and deepening others, then the flow for 300 s.
      HdState& s = c.hd.state;
      Array1<double> dz;
      dz.assign(s.nelements, 0.0);
      for (int e = 1; e <= s.nelements_owned; ++e) {
        const double x = c.mesh.elements.xc[e], y = c.mesh.elements.yc[e];
        dz[e] = 0.5 * std::sin(0.05 * x + 0.3 * y) + (x > 150 && x < 170 ? 2.5 : 0.0);
        // A dry bed lowered below the lake would fill with water: dry
        // elements only rise.
        if (s.wetdry[e] == kDry) dz[e] = std::fabs(dz[e]);
      }
      const Array1<int> before = s.wetdry;
      ApplyBedChangeHD(c.hd, c.mesh, dz);
      int raised = 0;  // wet elements now above the water
      for (int e = 1; e <= s.nelements_owned; ++e) raised += before[e] == kWet && s.wetdry[e] == kDry ? 1 : 0;
      test::RunTo(c, 300.0);
      ASSERT_GE(c.run_status, 0);
      double speed = 0.0, level = 0.0;
      for (int e = 1; e <= s.nelements_owned; ++e) {
        speed = std::max(speed, std::hypot(s.u[e], s.v[e]));
        if (s.wetdry[e] == kWet) level = std::max(level, std::fabs(s.eta[e]));
      }
      EXPECT_LT(speed, 1e-12) << "order " << scheme.order << " face depth " << scheme.face_average_d;
      EXPECT_LT(level, 1e-12) << "order " << scheme.order << " face depth " << scheme.face_average_d;
      EXPECT_GT(raised, 3);
    }
  }
}

}  // namespace
}  // namespace vhd
