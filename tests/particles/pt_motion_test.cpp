// Particle motion against exact solutions: uniform current, solid-body
// rotation, random-walk dispersion, settling, decay, ageing, wind drift, dry
// land and closed and open boundaries; bitwise equality for 1 and 2 threads.

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <numbers>

#include "core/omp.hpp"
#include "particles/pt_random.hpp"
#include "pt_support.hpp"

namespace vhd::test {
namespace {

Mesh MixedMesh(int nx, int ny, double dx, double x0, double y0, std::function<double(double, double)> bed,
               int code_west = 1, int code_east = 1) {
  RectangleMeshSpec spec = RectSpec(nx, ny, dx, dx, std::move(bed), CellLayout::kMixed, x0, y0);
  spec.jitter = 0.15;
  spec.seed = 7;
  spec.code_west = code_west;
  spec.code_east = code_east;
  Mesh mesh;
  GenerateRectangleMesh(spec, mesh);
  SetupMeshGeometry(mesh);
  return mesh;
}

struct MeshLayoutCase {
  const char* name;
  CellLayout layout;
};

class UniformCurrent : public testing::TestWithParam<MeshLayoutCase> {};

// Without dispersion every particle moves exactly u t across hundreds of
// elements, whatever the shape of the elements.
TEST_P(UniformCurrent, MovesExactlyUTimesT) {
  RectangleMeshSpec spec = RectSpec(200, 50, 20.0, 20.0, Flat(5.0), GetParam().layout);
  spec.jitter = 0.15;
  spec.seed = 3;
  Mesh mesh;
  GenerateRectangleMesh(spec, mesh);
  SetupMeshGeometry(mesh);
  const double u = 0.5, v = 0.05, dt = 10.0;
  const int nsteps = 600;
  FlowCase flow;
  flow.u = [u](double, double) { return u; };
  flow.v = [v](double, double) { return v; };
  const HdState state = MakeState(mesh, flow);
  PtFixture f;
  f.Setup(PtModuleText("", GridSource(100.0, 100.0, 400.0, 500.0, 5, 4)), mesh, dt, nsteps);
  f.Run(state, 1, nsteps);
  ASSERT_EQ(f.pt.nparticles, 20);
  const double t = nsteps * dt;
  for (int i = 1; i <= 20; ++i) {
    const int row = (i - 1) / 4, col = (i - 1) % 4;
    const Particle& p = f.pt.particles[i];
    const double x0 = 100.0 + (col + 0.5) * 100.0, y0 = 100.0 + (row + 0.5) * 100.0;
    EXPECT_EQ(p.state, kParticleSuspended);
    EXPECT_NEAR(p.x, x0 + u * t, 1e-9) << "particle " << i;
    EXPECT_NEAR(p.y, y0 + v * t, 1e-9) << "particle " << i;
    EXPECT_TRUE(PointInElement2D(mesh, f.pt.tree, p.element, p.x, p.y));
  }
}

INSTANTIATE_TEST_SUITE_P(Layouts, UniformCurrent,
                         testing::Values(MeshLayoutCase{"triangles", CellLayout::kRandomTriangles},
                                         MeshLayoutCase{"quadrilaterals", CellLayout::kQuadrilaterals},
                                         MeshLayoutCase{"mixed", CellLayout::kMixed}),
                         [](const testing::TestParamInfo<MeshLayoutCase>& i) { return i.param.name; });

// Solid-body rotation: after one turn every particle is back at its start
// within 0.5 % of its radius (second order in time).
TEST(ParticleMotion, SolidBodyRotationReturnsAfterOneTurn) {
  const Mesh mesh = MixedMesh(50, 50, 40.0, -1000.0, -1000.0, Flat(10.0));
  const double period = 3600.0, omega = 2.0 * std::numbers::pi / period, dt = 18.0;
  const int nsteps = static_cast<int>(period / dt);
  FlowCase flow;
  flow.u = [omega](double, double y) { return -omega * y; };
  flow.v = [omega](double x, double) { return omega * x; };
  const HdState state = MakeState(mesh, flow);
  PtFixture f;
  f.Setup(PtModuleText("", GridSource(-600.0, -100.0, 1200.0, 200.0, 1, 6)), mesh, dt, nsteps);
  f.Run(state, 1, nsteps / 2);
  // Half a turn: on the other side of the centre.
  for (int i = 1; i <= 6; ++i) {
    const double x0 = -600.0 + (i - 0.5) * 200.0, r = std::abs(x0);
    EXPECT_NEAR(f.pt.particles[i].x, -x0, 0.005 * r);
  }
  f.Run(state, nsteps / 2 + 1, nsteps);
  for (int i = 1; i <= 6; ++i) {
    const Particle& p = f.pt.particles[i];
    const double x0 = -600.0 + (i - 0.5) * 200.0, r = std::abs(x0);
    EXPECT_LT(std::hypot(p.x - x0, p.y), 0.005 * r) << "radius " << r;
  }
}

double Variance(const std::vector<double>& a, double& mean) {
  mean = 0.0;
  for (double x : a) mean += x;
  mean /= static_cast<double>(a.size());
  double var = 0.0;
  for (double x : a) var += (x - mean) * (x - mean);
  return var / static_cast<double>(a.size() - 1);
}

// Dispersion without current: the variance grows as 2 D t, the mean stays.
TEST(ParticleMotion, DispersionVarianceGrowsAsTwoDt) {
  const Mesh mesh = MixedMesh(50, 50, 40.0, -1000.0, -1000.0, Flat(10.0));
  const double D = 1.0, dt = 10.0;
  const int n = 10000, nsteps = 100;
  const HdState state = MakeState(mesh, FlowCase{});
  PtFixture f;
  f.Setup(PtModuleText("", ClassSection("DISPERSION.HORIZONTAL_DISPERSION", "type = 1\nconstant_value = 1.0\n") +
                               PointSource(0.0, 0.0, n)),
          mesh, dt, nsteps);
  for (int stage = 1; stage <= 2; ++stage) {
    f.Run(state, stage == 1 ? 1 : nsteps / 2 + 1, stage * nsteps / 2);
    std::vector<double> xs, ys;
    for (int i = 1; i <= n; ++i) {
      xs.push_back(f.pt.particles[i].x);
      ys.push_back(f.pt.particles[i].y);
    }
    const double t = stage * nsteps / 2 * dt, expected = 2.0 * D * t;
    double mx = 0, my = 0;
    EXPECT_NEAR(Variance(xs, mx), expected, 0.03 * expected);
    EXPECT_NEAR(Variance(ys, my), expected, 0.03 * expected);
    // Three standard errors of the mean.
    const double se = 3.0 * std::sqrt(expected / n);
    EXPECT_NEAR(mx, 0.0, se);
    EXPECT_NEAR(my, 0.0, se);
  }
}

// A small closed basin on a steep slope with thin water at its shallow end:
// no particle leaves it, none enters dry land, all stay in their element.
TEST(ParticleMotion, ClosedBasinOnSteepSlopeKeepsEveryParticle) {
  // Bed from -2 m in the west to +2 m in the east over 200 m: dry east half.
  const Mesh mesh = MixedMesh(20, 10, 10.0, 0.0, 0.0, [](double x, double) { return -2.0 + 0.02 * x; });
  FlowCase flow;
  flow.eta = 0.01;  // thin water up to x = 100.5 m
  flow.u = [](double, double) { return 0.05; };
  const HdState state = MakeState(mesh, flow);
  PtFixture f;
  f.Setup(PtModuleText("", ClassSection("DISPERSION.HORIZONTAL_DISPERSION", "type = 1\nconstant_value = 5.0\n") +
                               PointSource(60.0, 50.0, 2000)),
          mesh, 10.0, 200);
  f.Run(state, 1, 200);
  EXPECT_EQ(f.pt.stats.lost_boundary, 0);
  for (int i = 1; i <= f.pt.nparticles; ++i) {
    const Particle& p = f.pt.particles[i];
    ASSERT_EQ(p.state, kParticleSuspended);
    ASSERT_TRUE(PointInElement2D(mesh, f.pt.tree, p.element, p.x, p.y)) << "particle " << i;
    ASSERT_NE(state.wetdry[p.element], kDry) << "particle " << i;
    ASSERT_GE(p.x, 0.0);
    ASSERT_LE(p.x, 200.0);
    ASSERT_GE(p.y, 0.0);
    ASSERT_LE(p.y, 100.0);
    ASSERT_GE(p.z, -2.0 - 1e-9);
    // On the shore the bed at the particle may lie above the surface.
    ASSERT_LE(p.z, std::max(0.01, -2.0 + 0.02 * p.x) + 1e-9);
  }
}

// An open boundary in the east: particles carried across it are lost and
// counted; a closed wall in the west stops the others on the wall.
TEST(ParticleMotion, OpenBoundaryLosesAndClosedBoundaryStops) {
  const Mesh mesh = MixedMesh(30, 10, 10.0, 0.0, 0.0, Flat(5.0), 1, 2);
  FlowCase east;
  east.u = [](double, double) { return 1.0; };
  PtFixture f;
  f.Setup(PtModuleText("", GridSource(100.0, 20.0, 100.0, 60.0, 3, 5)), mesh, 10.0, 40);
  f.Run(MakeState(mesh, east), 1, 40);
  EXPECT_EQ(f.pt.stats.lost_boundary, 15);
  for (int i = 1; i <= 15; ++i) EXPECT_EQ(f.pt.particles[i].state, kParticleLost);

  FlowCase west;
  west.u = [](double, double) { return -1.0; };
  PtFixture g;
  g.Setup(PtModuleText("", GridSource(100.0, 20.0, 100.0, 60.0, 3, 5)), mesh, 10.0, 40);
  g.Run(MakeState(mesh, west), 1, 40);
  EXPECT_EQ(g.pt.stats.lost_boundary, 0);
  for (int i = 1; i <= 15; ++i) {
    EXPECT_EQ(g.pt.particles[i].state, kParticleSuspended);
    EXPECT_NEAR(g.pt.particles[i].x, 0.0, 1e-9);
  }
}

// Settling from the surface reaches the bed after h / w_s.
TEST(ParticleMotion, SettlingReachesBedAfterDepthOverSpeed) {
  const Mesh mesh = MixedMesh(10, 10, 10.0, 0.0, 0.0, Flat(10.0));
  const HdState state = MakeState(mesh, FlowCase{});
  PtFixture f;
  const double ws = 0.01, dt = 10.0;  // 10 m at 1 cm/s: 1000 s, 100 steps
  f.Setup(PtModuleText("", ClassSection("SETTLING", "type = 1\nformat = 0\nconstant_value = 0.01\n") +
                               PointSource(50.0, 50.0, 10)),
          mesh, dt, 110);
  f.Run(state, 1, 99);
  for (int i = 1; i <= 10; ++i) {
    EXPECT_EQ(f.pt.particles[i].state, kParticleSuspended);
    EXPECT_NEAR(f.pt.particles[i].z, -ws * 99 * dt, 1e-9);
  }
  f.Run(state, 100, 101);
  for (int i = 1; i <= 10; ++i) {
    EXPECT_EQ(f.pt.particles[i].state, kParticleSedimented);
    EXPECT_NEAR(f.pt.particles[i].z, -10.0, 1e-12);
  }
}

// Decay: the mass follows exp(-k t); ageing: particles older than the
// maximum age die.
TEST(ParticleMotion, DecayAndAgeing) {
  const Mesh mesh = MixedMesh(10, 10, 10.0, 0.0, 0.0, Flat(10.0));
  const HdState state = MakeState(mesh, FlowCase{});
  PtFixture f;
  const double k = 1.0e-3, dt = 10.0;
  f.Setup(PtModuleText("maximum_particle_age = 505.0\n",
                       ClassSection("DECAY", "type = 1\nconstant_value = 0.001\n") + PointSource(50.0, 50.0, 4)),
          mesh, dt, 60);
  for (int n = 1; n <= 50; ++n) {
    f.Run(state, n, n);
    for (int i = 1; i <= 4; ++i) EXPECT_NEAR(f.pt.particles[i].mass, std::exp(-k * n * dt), 1e-13);
  }
  EXPECT_EQ(f.pt.stats.dead, 0);
  f.Run(state, 51, 51);  // age 510 s > 505 s
  EXPECT_EQ(f.pt.stats.dead, 4);
  for (int i = 1; i <= 4; ++i) EXPECT_EQ(f.pt.particles[i].state, kParticleDead);
}

// Wind drift at three wind speeds: speed factor * W, turned clockwise from
// the wind by beta * exp(-3e-9 W^3 / (g nu)).
TEST(ParticleMotion, WindDriftSpeedAndAngle) {
  const Mesh mesh = MixedMesh(20, 20, 50.0, 0.0, 0.0, Flat(10.0));
  const HdState state = MakeState(mesh, FlowCase{});
  for (double w : {2.0, 8.0, 15.0}) {
    PtFixture f;
    const std::string wind = kPtPath + "DRIFT_PROFILE]\ntype = 2\n" + kPtPath +
                             "DRIFT_PROFILE.WIND_INDUCED_PROFILE]\nwind_drift_factor = 0.03\n" + kPtPath +
                             "WIND_FORCING]\ntype = 1\nformat = 0\nconstant_values = [" + std::to_string(w) +
                             ", 0.0]\n";
    f.Setup(PtModuleText("", PointSource(200.0, 500.0, 1) + wind), mesh, 10.0, 10);
    f.Run(state, 1, 10);
    const Particle& p = f.pt.particles[1];
    const double theta = 28.0 * std::exp(-3.0e-9 * w * w * w / (9.81 * 1.0e-6));
    const double speed = 0.03 * w;
    EXPECT_NEAR(std::hypot(p.x - 200.0, p.y - 500.0), speed * 100.0, 1e-9) << "wind " << w;
    EXPECT_NEAR(std::atan2(-(p.y - 500.0), p.x - 200.0) * 180.0 / std::numbers::pi, theta, 1e-9) << "wind " << w;
  }
}

// The same tracks on 1 and 2 threads, bit for bit, with dispersion, current
// and walls.
TEST(ParticleMotion, OneAndTwoThreadsGiveTheSameBits) {
  const Mesh mesh = MixedMesh(30, 30, 10.0, 0.0, 0.0, [](double x, double) { return -3.0 + 0.02 * x; });
  FlowCase flow;
  flow.eta = 0.1;
  flow.u = [](double, double y) { return 0.2 + 0.001 * y; };
  flow.v = [](double x, double) { return 0.1 - 0.0005 * x; };
  const HdState state = MakeState(mesh, flow);
  std::vector<Particle> result[2];
  for (int threads = 1; threads <= 2; ++threads) {
    OmpSetThreads(threads);
    PtFixture f;
    f.Setup(PtModuleText("", ClassSection("DISPERSION.HORIZONTAL_DISPERSION", "type = 1\nconstant_value = 0.5\n") +
                                 ClassSection("DISPERSION.VERTICAL_DISPERSION", "type = 1\nconstant_value = 0.001\n") +
                                 PointSource(50.0, 150.0, 3000)),
            mesh, 5.0, 100);
    f.Run(state, 1, 100);
    result[threads - 1].assign(f.pt.particles.begin(), f.pt.particles.end());
  }
  OmpSetThreads(2);
  ASSERT_EQ(result[0].size(), result[1].size());
  EXPECT_EQ(std::memcmp(result[0].data(), result[1].data(), result[0].size() * sizeof(Particle)), 0);
}

// The counter-based generator: a pure function of its keys, uniform and
// normal to within the sampling error.
TEST(ParticleRandom, CounterBasedNumbersAreKeyedAndDistributed) {
  EXPECT_EQ(RandomBitsPT(1, 2, 3, 0), RandomBitsPT(1, 2, 3, 0));
  EXPECT_NE(RandomBitsPT(1, 2, 3, 0), RandomBitsPT(2, 2, 3, 0));
  EXPECT_NE(RandomBitsPT(1, 2, 3, 0), RandomBitsPT(1, 3, 3, 0));
  EXPECT_NE(RandomBitsPT(1, 2, 3, 0), RandomBitsPT(1, 2, 4, 0));
  EXPECT_NE(RandomBitsPT(1, 2, 3, 0), RandomBitsPT(1, 2, 3, 1));
  const int n = 200000;
  double s1 = 0, s2 = 0, su = 0;
  for (int i = 0; i < n / 2; ++i) {
    double a = 0, b = 0;
    RandomNormalPairPT(9, static_cast<std::uint64_t>(i), 5, 0, a, b);
    s1 += a + b;
    s2 += a * a + b * b;
    su += RandomUniformPT(9, static_cast<std::uint64_t>(i), 6, 0);
  }
  EXPECT_NEAR(s1 / n, 0.0, 4.0 / std::sqrt(n));
  EXPECT_NEAR(s2 / n, 1.0, 4.0 * std::sqrt(2.0 / n));
  EXPECT_NEAR(su / (n / 2), 0.5, 4.0 * std::sqrt(1.0 / 12.0 / (n / 2)));
}

}  // namespace
}  // namespace vhd::test
