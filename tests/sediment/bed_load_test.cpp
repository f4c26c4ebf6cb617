// The bed load of a pure current against the formulas evaluated here on their
// own, over a table of velocities, depths and grain diameters that reaches
// every branch, and the edge cases of the thresholds.

#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "core/omp.hpp"
#include "sediment/bed_load.hpp"

namespace vhd {
namespace {

constexpr double g = 9.81;
// The two constants of Engelund-Fredsoe as the routine defines them: named
// pi 0.51 / 6 and 0.7 sqrt(0.05), they differ from those expressions by
// 2.3e-6 and 1.7e-8 relative; the given values are the ones used.
constexpr double kP = 0.2670359859600069;
constexpr double kShift = 0.15652475575938452;

// ---- the formulas written out again, from their definitions ----------------

struct Ref {
  int formula;
  double s = 2.65, theta_c = 0.047, alpha_s = 5.0, G = 1.25, m = 0.5, F = 1.0;
};

double RefCritical(double sl, double theta_c) { return std::fmax(0.01, (1 + sl) * theta_c); }

double RefDstar(double d, double s) { return d * std::pow((s - 1) * g / 1e-12, 1.0 / 3.0); }

double RefVanRijnCritical(double ds) {
  if (ds <= 4) return double(0.24f) / ds;
  if (ds <= 10) return double(0.14f) * std::pow(ds, double(-0.64f));
  if (ds <= 20) return double(0.04f) * std::pow(ds, double(-0.1f));
  if (ds <= 150) return double(0.013f) * std::pow(ds, double(0.29f));
  return 0.055;
}

double RefSkin(double U, double h, double d, double a, double theta) {
  double x = h, ts = 0;
  for (int i = 0; i < 100; ++i) {
    const double us = U / (2.5 * std::log(x / (2.5 * d)) + 6);
    ts = us * us / a;
    const double xn = h * ts / theta;
    const bool done = std::fabs(xn / x - 1) < double(0.001f);
    x = xn;
    if (done) break;
  }
  return ts;
}

double RefQ(const Ref& r, double U, double f, double h, double d, double sl) {
  const double a = (r.s - 1) * g * d;
  const double theta = f * U * U / a;
  if (r.formula == 1) {
    if (theta <= RefCritical(sl, r.theta_c)) return 0;
    return double(0.05f) * d * std::sqrt(a) * std::pow(theta, 2.5) / f;
  }
  if (r.formula == 2) {
    const double ds = RefDstar(d, r.s);
    const double tce = RefCritical(sl, RefVanRijnCritical(ds));
    if (theta <= tce) return 0;
    const double us = std::sqrt(g) * U / (18 * std::log10(2 * h / d));
    const double T = std::pow(us / std::sqrt(a * tce), 2) - 1;
    return T > 0 ? double(0.053f) * std::sqrt(a) * d * std::pow(T, double(2.1f)) / std::pow(ds, double(0.3f)) : 0;
  }
  if (r.formula == 3) {
    if (theta <= RefCritical(sl, r.theta_c)) return 0;
    const double ts = RefSkin(U, h, d, a, theta);
    const double p = ts > double(0.05f) ? std::pow(1 + std::pow(kP / (ts - double(0.05f)), 4), -0.25) : 0;
    return 5 * p * d * std::sqrt(a) * (std::sqrt(ts) - kShift);
  }
  if (r.formula == 4) {
    const double tce = RefCritical(sl, r.theta_c);
    if (theta <= tce) return 0;
    const double ts = std::fmin(theta, double(0.06f) + double(0.4f) * theta * theta);
    return ts > tce ? 8 * d * std::sqrt(a) * std::pow(ts - tce, 1.5) : 0;
  }
  return 0;
}

void RefVector(const Ref& r, double u, double v, double f, double h, double d, double sl, double st, double td,
               double& qx, double& qy) {
  const double U = std::hypot(u, v);
  const double q = U * U > 1e-4 ? RefQ(r, U, f, h, d, sl) : 0.0;
  if (q == 0) {
    qx = qy = 0;
    return;
  }
  const double theta = f * U * U / ((r.s - 1) * g * d);
  const double qs = std::fmax(0, 1 - r.alpha_s * sl) * q;
  const double qn = (td - r.G * st / std::pow(std::fmin(theta, double(0.06f) + double(0.4f) * theta), r.m)) * q;
  // Streamwise along (u, v)/U, transverse along the left normal (-v, u)/U.
  qx = r.F * (qs * u / U + qn * -v / U);
  qy = r.F * (qs * v / U + qn * u / U);
}

BedLoadSettings Settings(const Ref& r) {
  BedLoadSettings s;
  s.formula = r.formula;
  s.relative_density = r.s;
  s.critical_shields = r.theta_c;
  s.streamwise_slope_factor = r.alpha_s;
  s.transverse_slope_factor = r.G;
  s.transverse_slope_exponent = r.m;
  s.factor = r.F;
  return s;
}

void ExpectNear(double got, double want, const std::string& what) {
  EXPECT_NEAR(got, want, 1e-12 * std::fabs(want) + 1e-300) << what;
}

// ---- the table ----------------------------------------------------------------

struct Flow {
  double u, v, h, d, f, sl, st, td;
};

TEST(BedLoad, EveryFormulaOverTheTable) {
  // Speeds from near the floor to strong currents, shallow and deep water,
  // fine sand to gravel (D* from about 1 to about 250: every van Rijn
  // branch), flat and sloping beds, helical flow.
  const std::vector<double> speeds = {0.0101, 0.15, 0.4, 0.8, 1.5, 3.0};
  const std::vector<double> depths = {0.05, 0.5, 3.0, 20.0};
  const std::vector<double> grains = {4e-5, 1.5e-4, 3e-4, 8e-4, 2e-3, 1e-2};
  const std::vector<std::vector<double>> beds = {{0, 0, 0}, {0.02, -0.03, 0.05}, {-0.1, 0.08, -0.02}};
  int moving[5] = {0, 0, 0, 0, 0};
  int total = 0;
  for (int formula = 1; formula <= 5; ++formula) {
    Ref r{formula};
    const BedLoadSettings s = Settings(r);
    for (double U : speeds)
      for (double h : depths)
        for (double d : grains)
          for (const auto& b : beds) {
            const double f = 0.003 * std::pow(h / 2.0, -1.0 / 3.0);  // a Manning-like drag
            const double u = 0.6 * U, v = -0.8 * U;
            double qx, qy, rx, ry;
            BedLoadElement(s, 1, u, v, f, h, d, b[0], b[1], b[2], qx, qy);
            RefVector(r, u, v, f, h, d, b[0], b[1], b[2], rx, ry);
            const std::string what = "formula " + std::to_string(formula) + " U " + std::to_string(U) + " h " +
                                     std::to_string(h) + " d " + std::to_string(d);
            ExpectNear(qx, rx, what);
            ExpectNear(qy, ry, what);
            ++total;
            if (rx != 0 || ry != 0) ++moving[formula - 1];
          }
  }
  // Every formula moves sand somewhere in the table and rests somewhere; a
  // code outside 1 .. 4 never moves it.
  for (int k = 0; k < 4; ++k) {
    EXPECT_GT(moving[k], 20) << "formula " << k + 1;
    EXPECT_LT(moving[k], total / 5) << "formula " << k + 1;
  }
  EXPECT_EQ(moving[4], 0);
}

TEST(BedLoad, VanRijnBranchesTakeTheLowerFormulaAtTheirLimits) {
  struct Case {
    double dstar, want;
  };
  const Case cases[] = {
      {1.0, double(0.24f)},
      {4.0, double(0.24f) / 4.0},
      {std::nextafter(4.0, 5.0), double(0.14f) * std::pow(std::nextafter(4.0, 5.0), double(-0.64f))},
      {10.0, double(0.14f) * std::pow(10.0, double(-0.64f))},
      {std::nextafter(10.0, 11.0), double(0.04f) * std::pow(std::nextafter(10.0, 11.0), double(-0.1f))},
      {20.0, double(0.04f) * std::pow(20.0, double(-0.1f))},
      {std::nextafter(20.0, 21.0), double(0.013f) * std::pow(std::nextafter(20.0, 21.0), double(0.29f))},
      {150.0, double(0.013f) * std::pow(150.0, double(0.29f))},
      {std::nextafter(150.0, 151.0), 0.055},
  };
  for (const Case& c : cases) EXPECT_EQ(VanRijnCriticalShields(c.dstar), c.want) << c.dstar;
  // The grain diameter of D* = 1 for s = 2.65.
  EXPECT_NEAR(DimensionlessGrainSize(1.0 / std::cbrt(1.65 * g / 1e-12), 2.65), 1.0, 1e-14);
}

TEST(BedLoad, SpeedAtTheFloorMovesNothing) {
  for (int formula = 1; formula <= 4; ++formula) {
    BedLoadSettings s;
    s.formula = formula;
    double qx = 1, qy = 1;
    // |U| = 0.01 m/s: |U|^2 = 1e-4 is not above the floor, whatever the
    // friction (for formulas 1 and 4 this friction would move grains).
    BedLoadElement(s, 1, 0.01, 0.0, 50.0, 1.0, 1e-4, 0, 0, 0.5, qx, qy);
    EXPECT_EQ(qx, 0.0);
    EXPECT_EQ(qy, 0.0);
    if (formula == 1 || formula == 4) {
      EXPECT_GT(BedLoadMagnitude(s, 0.01, 50.0, 1.0, 1e-4, 0.0), 0.0);
      BedLoadElement(s, 1, 0.0101, 0.0, 50.0, 1.0, 1e-4, 0, 0, 0.5, qx, qy);
      EXPECT_GT(std::hypot(qx, qy), 0.0) << formula;
    }
    // A dry element moves nothing; a flooded one (code 2) moves as a wet one.
    BedLoadElement(s, 0, 2.0, 0.0, 0.004, 1.0, 3e-4, 0, 0, 0.0, qx, qy);
    EXPECT_EQ(qx, 0.0);
    double wx, wy;
    BedLoadElement(s, 1, 2.0, 0.0, 0.004, 1.0, 3e-4, 0, 0, 0.0, wx, wy);
    BedLoadElement(s, 2, 2.0, 0.0, 0.004, 1.0, 3e-4, 0, 0, 0.0, qx, qy);
    EXPECT_GT(wx, 0.0);
    EXPECT_EQ(qx, wx);
  }
}

TEST(BedLoad, SteepAdverseSlopeStopsStreamwiseTransportButNotTransverse) {
  for (int formula = 1; formula <= 4; ++formula) {
    Ref r{formula};
    const BedLoadSettings s = Settings(r);
    // alpha_s sl = 1.25 >= 1; flow along +x; bed rising to the left (st > 0)
    // drives the transverse part to the right (-y).
    const double sl = 0.25, st = 0.05;
    double qx, qy, rx, ry;
    BedLoadElement(s, 1, 2.5, 0.0, 0.004, 2.0, 3e-4, sl, st, 0.0, qx, qy);
    RefVector(r, 2.5, 0.0, 0.004, 2.0, 3e-4, sl, st, 0.0, rx, ry);
    EXPECT_EQ(qx, 0.0) << formula;
    EXPECT_LT(qy, 0.0) << formula;
    ExpectNear(qy, ry, "formula " + std::to_string(formula));
  }
}

TEST(BedLoad, EngelundFredsoeBelowSkinThresholdMovesNothing) {
  // Above theta_ce but with a skin Shields parameter of at most 0.05: deep
  // water over fine sand at a moderate speed.
  Ref r{3};
  const BedLoadSettings s = Settings(r);
  const double h = 10.0, d = 2e-4, f = 0.004, a = 1.65 * g * d;
  int checked = 0;
  for (double U = 0.2; U < 1.0; U += 0.01) {
    const double theta = f * U * U / a;
    if (theta <= 0.047) continue;
    const double skin = RefSkin(U, h, d, a, theta);
    if (skin > 0.05) break;
    double qx, qy;
    BedLoadElement(s, 1, U, 0.0, f, h, d, 0, 0, 0, qx, qy);
    EXPECT_EQ(qx, 0.0) << U;
    ++checked;
  }
  EXPECT_GT(checked, 3);
  // The skin Shields parameter is the fixed point of the logarithmic law over
  // the skin depth h theta'/theta (to the iteration's tolerance).
  const double U = 1.2, theta = f * U * U / a;
  const double skin = EngelundFredsoeSkinShields(U, h, d, a, theta);
  const double hs = h * skin / theta;
  const double us = U / (2.5 * std::log(hs / (2.5 * d)) + 6);
  EXPECT_NEAR(us * us / a, skin, 2e-3 * skin);
  EXPECT_LT(skin, theta);
}

TEST(BedLoad, HelicalFlowTurnsTransportLeft) {
  for (int formula = 1; formula <= 4; ++formula) {
    BedLoadSettings s;
    s.formula = formula;
    struct Dir {
      double u, v;
    };
    for (const Dir dir : {Dir{2.0, 0.0}, Dir{0.0, 2.0}, Dir{-1.2, 1.6}}) {
      double qx0, qy0, qx, qy;
      BedLoadElement(s, 1, dir.u, dir.v, 0.004, 2.0, 3e-4, 0, 0, 0.0, qx0, qy0);
      BedLoadElement(s, 1, dir.u, dir.v, 0.004, 2.0, 3e-4, 0, 0, 0.2, qx, qy);
      // The cross product of the flow and the transport is positive: left.
      EXPECT_GT(dir.u * qy - dir.v * qx, 0.0) << formula;
      EXPECT_NEAR(dir.u * qy0 - dir.v * qx0, 0.0, 1e-18);
      // The streamwise part is that without helical flow; the angle is atan 0.2.
      EXPECT_NEAR((qx * dir.u + qy * dir.v) / (qx0 * dir.u + qy0 * dir.v), 1.0, 1e-12);
      EXPECT_NEAR(std::atan2(dir.u * qy - dir.v * qx, qx * dir.u + qy * dir.v), std::atan(0.2), 1e-12);
    }
  }
}

TEST(BedLoad, GuardsGiveNoTransportWhereFormulasGiveNoNumber) {
  // Meyer-Peter and Mueller with theta above theta_ce = 0.5 but theta' =
  // 0.06 + 0.4 theta^2 below it; van Rijn and Engelund-Fredsoe in water
  // shallower than their logarithmic laws allow (h = d / 6); zero friction
  // with a transverse slope. Each gives exactly no transport; the first
  // case, with a gentler slope, moves.
  struct Case {
    int formula;
    double u, h, f, sl, st;
    bool moves;
  };
  const Case cases[] = {
      {4, 0.853, 2.0, 0.004, 0.5 / 0.047 - 1.0, 0.0, false},
      {4, 0.853, 2.0, 0.004, 0.0, 0.0, true},
      {2, 2.0, 5e-5, 0.05, 0.0, 0.0, false},
      {3, 2.0, 5e-5, 0.05, 0.0, 0.0, false},
      {1, 2.0, 1.0, 0.0, 0.0, 0.3, false},
  };
  for (const Case& c : cases) {
    BedLoadSettings s;
    s.formula = c.formula;
    s.streamwise_slope_factor = 0.0;
    double qx, qy;
    BedLoadElement(s, 1, c.u, 0.0, c.f, c.h, 3e-4, c.sl, c.st, 0.0, qx, qy);
    if (c.moves) {
      EXPECT_GT(qx, 0.0) << c.formula;
    } else {
      EXPECT_EQ(qx, 0.0) << c.formula;
      EXPECT_EQ(qy, 0.0) << c.formula;
    }
  }
}

TEST(BedLoad, ElementLoopIsTheElementFormulaOnOneAndTwoThreads) {
  const int n = 2000;
  std::vector<int> wet(n + 1);
  std::vector<double> u(n + 1), v(n + 1), f(n + 1), h(n + 1), d(n + 1), sl(n + 1), st(n + 1), td(n + 1);
  for (int e = 1; e <= n; ++e) {
    wet[e] = e % 7 == 0 ? 0 : (e % 11 == 0 ? 2 : 1);
    u[e] = 1.5 * std::sin(0.01 * e);
    v[e] = 1.2 * std::cos(0.013 * e);
    f[e] = 0.002 + 0.001 * std::sin(0.1 * e) * std::sin(0.1 * e);
    h[e] = 0.05 + 0.01 * (e % 300);
    d[e] = 1e-4 + 1e-6 * (e % 500);
    sl[e] = 0.05 * std::sin(0.3 * e);
    st[e] = 0.05 * std::cos(0.2 * e);
    td[e] = 0.1 * std::sin(0.05 * e);
  }
  for (int formula = 1; formula <= 4; ++formula) {
    BedLoadSettings s;
    s.formula = formula;
    std::vector<BedLoadGrain> grain(n + 1);
    for (int e = 1; e <= n; ++e) grain[e] = BedLoadGrainOf(d[e], s.relative_density);
    BedLoadInputs in;
    in.wet = wet.data();
    in.u = u.data();
    in.v = v.data();
    in.friction = f.data();
    in.depth = h.data();
    in.grain = grain.data();
    in.streamwise_slope = sl.data();
    in.transverse_slope = st.data();
    in.tan_delta = td.data();
    Array1<double> qx1, qy1, qx2, qy2;
    qx1.assign(n, 0.0), qy1.assign(n, 0.0), qx2.assign(n, 0.0), qy2.assign(n, 0.0);
    OmpSetThreads(1);
    CALCBEDLOADCURRENT(s, in, n, qx1, qy1);
    OmpSetThreads(2);
    CALCBEDLOADCURRENT(s, in, n, qx2, qy2);
    OmpSetThreads(1);
    for (int e = 1; e <= n; ++e) {
      double qx, qy;
      BedLoadElement(s, wet[e], u[e], v[e], f[e], h[e], d[e], sl[e], st[e], td[e], qx, qy);
      ASSERT_EQ(qx1[e], qx);
      ASSERT_EQ(qy1[e], qy);
      ASSERT_EQ(qx2[e], qx);
      ASSERT_EQ(qy2[e], qy);
    }
  }
}

}  // namespace
}  // namespace vhd
