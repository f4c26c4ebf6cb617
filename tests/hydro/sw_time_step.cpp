// Time-step control: the splitting of the overall step, the dry domain, the
// CFL correction and volume conservation with identical bits for 1 and 2
// threads; the element sources and the depth correction in the step.

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <vector>

#include "sw_case.hpp"

namespace vhd::test {
namespace {

TEST(SwTimeStep, OverallStepIsSplitIntoEqualSteps) {
  // 30 s with a CFL step of 7 s: five steps of 6 s.
  EXPECT_DOUBLE_EQ(SplitTimeStepHD(7.0, 30.0), 6.0);
  // Then 24 s remain: with the same CFL step four steps of 6 s.
  EXPECT_DOUBLE_EQ(SplitTimeStepHD(7.0, 24.0), 6.0);
  // A step within a relative 1e-6 of the remainder takes the whole remainder.
  EXPECT_DOUBLE_EQ(SplitTimeStepHD(30.0 * (1 - 5e-7), 30.0), 30.0);
  EXPECT_DOUBLE_EQ(SplitTimeStepHD(45.0, 30.0), 30.0);
  EXPECT_DOUBLE_EQ(SplitTimeStepHD(10.0, 30.0), 10.0);
}

TEST(SwTimeStep, DryDomainTakesTheLargestStepAndCflDrivesTheRest) {
  SwCase c;
  RectangleMeshSpec spec;
  spec.nx = spec.ny = 4;
  spec.bed = [](double, double) { return 1.0; };  // bed above datum: all dry
  MakeCase(c, spec, 30.0);
  SetFloodDry(c.hd, 0.005, 0.05, 0.1);
  c.hd.time_step.dt_max_HD = 30.0;
  StartCase(c, [](double, double) { return 0.0; });
  EXPECT_DOUBLE_EQ(CALCTIMESTEPHD(c.hd, c.solver, c.mesh, 0.0, 30.0), 30.0);

  // Depth 10 m, at rest: r = 2 sqrt(g h) / L for each element.
  SwCase w;
  spec.bed = [](double, double) { return -10.0; };
  MakeCase(w, spec, 30.0);
  w.hd.time_step.CFL_critical_HD = 1.0;
  w.hd.time_step.dt_min_HD = 1e-4;  // below the CFL step of these elements
  StartCase(w, [](double, double) { return 0.0; });
  // L = 4 A / P, the element length of the rate.
  double rmax = 0;
  for (int e = 1; e <= w.hd.state.nelements; ++e) {
    double perimeter = 0;
    for (int j = 1; j <= ElementFaceCount(w.mesh.elements, e); ++j)
      perimeter += w.mesh.faces.length[ElementFace(w.mesh.elements, e, j)];
    rmax = std::max(rmax, 2 * std::sqrt(9.81 * 10.0) * perimeter / (4 * w.mesh.elements.area[e]));
  }
  const double dt = CALCTIMESTEPHD(w.hd, w.solver, w.mesh, 0.0, 30.0);
  EXPECT_DOUBLE_EQ(dt, 30.0 / (std::floor((30.0 - 30e-6) * rmax) + 1));
  EXPECT_LE(dt * rmax, 1.0);
}

TEST(SwTimeStep, CflCorrectionLimitsTheSpeed) {
  SwCase c;
  RectangleMeshSpec spec;
  spec.nx = spec.ny = 2;
  spec.bed = [](double, double) { return -1.0; };
  MakeCase(c, spec, 1.0);
  StartCase(c, [](double, double) { return 0.0; }, [](double, double) { return 30.0; },
            [](double, double) { return -10.0; });
  HdState& st = c.hd.state;
  const double dt = 0.02, L = st.length[1], cel = std::sqrt(9.81);
  CHECKTIMESTEPHD(c.hd, c.mesh, dt);
  const double a = L / (2 * dt) - 2 * cel;
  ASSERT_GT(a, 0);
  EXPECT_NEAR(std::abs(st.P[1]) + std::abs(st.Q[1]), a, 1e-12);
  EXPECT_NEAR(st.P[1] / st.Q[1], -3.0, 1e-12);
}

// A closed basin with a sloshing surface, flooding and drying on over a
// sloping beach: the volume changes only by the booked mass correction, and
// 1 and 2 threads give the same bits.
struct BasinRun {
  int threads = 1;
  int solver = 1;
  bool vector_faces = true;  // plain wet faces in vector lanes
  bool eddy = false;         // constant eddy viscosity
};

// Returns the number of steps.
long long RunBasin(const BasinRun& run, std::vector<double>& h, double& volume0, double& volume1,
                   double& correction) {
  SwCase c;
  RectangleMeshSpec spec;
  spec.nx = 24;
  spec.ny = 12;
  spec.x1 = 2.0;
  spec.layout = CellLayout::kRandomTriangles;
  spec.jitter = 0.2;
  spec.seed = 9;
  spec.bed = [](double x, double) { return -0.3 + 0.25 * x; };
  MakeCase(c, spec, 0.01);
  SetScheme(c.hd, run.solver, 2);
  SetFloodDry(c.hd, 0.002, 0.005, 0.01);
  c.hd.time_step.dt_max_HD = 0.005;
  if (run.eddy) {
    c.hd.eddy.horizontal.type = kEddyConstant;
    c.hd.eddy.horizontal.value.values.assign(c.hd.state.nelements, 0.01);
    AllocateVelocityGradientsHD(c.hd.state);
  }
  c.solver.vector_faces = run.vector_faces;
  OmpSetThreads(run.threads);
  StartCase(c, [](double x, double y) { return 0.05 * std::cos(3.14159 * x / 2) + 0.01 * y; });
  volume0 = Volume(c);
  RunTo(c, 5.0);
  volume1 = Volume(c);
  correction = c.hd.flood_dry.mass_correction.Value();
  h.assign(c.hd.state.h.begin(), c.hd.state.h.end());
  OmpSetThreads(1);
  return c.hd.n_steps;
}

TEST(SwTimeStep, ClosedBasinConservesVolumeAndThreadsAgreeBitwise) {
  std::vector<double> h1, h2;
  double v0, v1, corr, w0, w1, corr2;
  EXPECT_EQ(RunBasin({.threads = 1}, h1, v0, v1, corr), 1000);
  EXPECT_LT(std::abs(v1 - corr - v0), 1e-12 * v0) << "mass correction " << corr;
  RunBasin({.threads = 2}, h2, w0, w1, corr2);
  ASSERT_EQ(h1.size(), h2.size());
  EXPECT_EQ(std::memcmp(h1.data(), h2.data(), h1.size() * sizeof(double)), 0);
}

// The faces evaluated side by side in vector lanes give the bits of the
// scalar path, for every solver, with and without eddy viscosity.
TEST(SwTimeStep, VectorAndScalarFacePathsAgreeBitwise) {
  for (int solver = 0; solver <= 4; ++solver) {
    for (bool eddy : {false, true}) {
      SCOPED_TRACE(testing::Message() << "solver " << solver << " eddy " << eddy);
      std::vector<double> h1, h2;
      double v0, v1, corr;
      RunBasin({.solver = solver, .vector_faces = true, .eddy = eddy}, h1, v0, v1, corr);
      RunBasin({.solver = solver, .vector_faces = false, .eddy = eddy}, h2, v0, v1, corr);
      ASSERT_EQ(h1.size(), h2.size());
      EXPECT_EQ(std::memcmp(h1.data(), h2.data(), h1.size() * sizeof(double)), 0);
    }
  }
}

// A closed lake at rest over a flat bed (2 m deep, 10 m square).
void MakeFlatLake(SwCase& c, int order) {
  RectangleMeshSpec spec;
  spec.nx = spec.ny = 10;
  spec.x1 = spec.y1 = 10.0;
  spec.layout = CellLayout::kRandomTriangles;
  spec.jitter = 0.2;
  spec.bed = [](double, double) { return -2.0; };
  MakeCase(c, spec, 1.0);
  SetScheme(c.hd, 1, order);
  StartCase(c, [](double, double) { return 0.0; });
}

// Element sources reach the update: uniform rain raises a lake at rest
// evenly (eta = r t, no flow), and a uniform momentum source gives
// P = s_P dt over the first sub-step.
TEST(SwTimeStep, ElementSourcesEnterTheUpdate) {
  for (int order : {1, 2}) {
    SCOPED_TRACE(testing::Message() << "order " << order);
    SwCase c;
    MakeFlatLake(c, order);
    const int ne = c.hd.state.nelements;
    c.solver.src_h.assign(ne, 1e-3);
    c.solver.src_P.assign(ne, 0.0);
    c.solver.src_Q.assign(ne, 0.0);
    RunTo(c, 5.0);
    for (int e = 1; e <= ne; ++e) {
      ASSERT_NEAR(c.hd.state.eta[e], 5e-3, 1e-13) << "element " << e;
      ASSERT_LT(std::abs(c.hd.state.u[e]) + std::abs(c.hd.state.v[e]), 1e-12) << "element " << e;
    }
  }
  SwCase c;
  MakeFlatLake(c, 1);
  const int ne = c.hd.state.nelements;
  c.solver.src_h.assign(ne, 0.0);
  c.solver.src_P.assign(ne, 1e-3);
  c.solver.src_Q.assign(ne, -2e-3);
  StepHD(c.hd, c.solver, c.mesh, 0.0, 0.01, c.run_status);
  for (int e = 1; e <= ne; ++e) {
    ASSERT_DOUBLE_EQ(c.hd.state.P[e], 1e-5) << "element " << e;
    ASSERT_DOUBLE_EQ(c.hd.state.Q[e], -2e-5) << "element " << e;
  }
}

// A depth correction raises the pressure depth: a lake at rest with k on
// its left half only pushes water across the line where k jumps (both
// elements there accelerate towards +x and water moves right), elsewhere
// nothing moves, and the batched and scalar face paths agree.
TEST(SwTimeStep, DepthCorrectionEntersThePressure) {
  for (int order : {1, 2}) {
    std::vector<double> first_path;
    for (bool vector_faces : {true, false}) {
      SCOPED_TRACE(testing::Message() << "order " << order << " vector " << vector_faces);
      SwCase c;
      MakeFlatLake(c, order);
      c.solver.vector_faces = vector_faces;
      const Mesh& m = c.mesh;
      const int ne = m.elements.nelements;
      c.solver.depth_correction.assign(ne, 0.0);
      for (int e = 1; e <= ne; ++e) c.solver.depth_correction[e] = m.elements.xc[e] < 5.0 ? 0.01 : 0.0;
      Array1<double> dhdt, dPdt, dQdt;
      CalcDerivativesOnlySW2D(c.hd, c.solver, c.mesh, &dhdt, &dPdt, &dQdt);
      std::vector<int> at_jump(ne + 1, 0);
      for (int f = 1; f <= m.faces.nfaces; ++f) {
        const int a = m.faces.element1[f], b = m.faces.element2[f];
        if (b > 0 && c.solver.depth_correction[a] != c.solver.depth_correction[b]) at_jump[a] = at_jump[b] = 1;
      }
      double mass = 0.0;
      int n_jump = 0;
      for (int e = 1; e <= ne; ++e) {
        mass += dhdt[e] * m.elements.area[e];
        if (at_jump[e]) {
          ++n_jump;
          EXPECT_GT(dPdt[e], 1e-3) << "element " << e;
          EXPECT_EQ(dhdt[e] > 0, c.solver.depth_correction[e] == 0.0) << "element " << e;
        } else {
          EXPECT_LT(std::abs(dhdt[e]) + std::abs(dPdt[e]) + std::abs(dQdt[e]), 1e-12) << "element " << e;
        }
      }
      EXPECT_GT(n_jump, 10);
      EXPECT_LT(std::abs(mass), 1e-14);
      std::vector<double> all(dhdt.begin(), dhdt.end());
      all.insert(all.end(), dPdt.begin(), dPdt.end());
      if (first_path.empty()) {
        first_path = all;
      } else {
        EXPECT_EQ(std::memcmp(first_path.data(), all.data(), all.size() * sizeof(double)), 0);
      }
    }
  }
}

}  // namespace
}  // namespace vhd::test
