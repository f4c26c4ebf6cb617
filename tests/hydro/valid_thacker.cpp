// Thacker's planar oscillation in a parabolic bowl, with flooding and
// drying: the water body keeps a plane surface and a uniform velocity while
// its circular shoreline travels round the bowl. Depth error after one
// period on a sequence of meshes, the velocity amplitude at the centre and
// the position of the shoreline against the exact solution.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <numbers>

#include "sw_case.hpp"

namespace vhd::test {
namespace {

constexpr double g = 9.81;
constexpr double kH0 = 0.1;       // depth at the centre of the bowl at rest (m)
constexpr double kA = 1.0;        // radius of the shoreline at rest (m)
constexpr double kEta = 0.5;      // orbit radius of the water body (m)
constexpr double kHalf = 2.0;     // the domain is [-2, 2] x [-2, 2] m
constexpr double kPi = std::numbers::pi;

// Exact solution (Thacker 1981, planar surface): bed
//   z = -h0 (1 - r^2 / a^2),
// surface
//   eta = eta0 h0 / a^2 (2 x cos wt + 2 y sin wt - eta0),
// velocity u = -eta0 w sin wt, v = eta0 w cos wt, with w = sqrt(2 g h0) / a.
// The water covers the disc of radius a centred at eta0 (cos wt, sin wt).
struct Thacker {
  double omega = std::sqrt(2 * g * kH0) / kA;
  double period = 2 * kPi / omega;
  static double Bed(double x, double y) { return -kH0 * (1 - (x * x + y * y) / (kA * kA)); }
  double Surface(double x, double y, double t) const {
    const double wt = omega * t;
    return kEta * kH0 / (kA * kA) * (2 * x * std::cos(wt) + 2 * y * std::sin(wt) - kEta);
  }
  double Depth(double x, double y, double t) const { return std::max(0.0, Surface(x, y, t) - Bed(x, y)); }
  double U(double t) const { return -kEta * omega * std::sin(omega * t); }
  double V(double t) const { return kEta * omega * std::cos(omega * t); }
  // Distance of (x, y) from the centre of the wet disc at time t.
  double Radius(double x, double y, double t) const {
    const double wt = omega * t;
    return std::hypot(x - kEta * std::cos(wt), y - kEta * std::sin(wt));
  }
  // The depth is h0 (1 - rho^2 / a^2) at distance rho from the centre of the
  // disc, so the centroid of the water is that centre.
  double CentreX(double t) const { return kEta * std::cos(omega * t); }
  double CentreY(double t) const { return kEta * std::sin(omega * t); }
};

struct Result {
  double dx = 0;
  double l1 = 0;            // mean |h - h_exact| over the exact wet disc after one period (m)
  double speed_loss = 0;    // 1 - |u| / (eta0 w) at the centre after one period
  double shore_error = 0;   // largest distance from the exact shoreline of an element
                            // that is wet where the exact solution is dry or dry where
                            // it is wet, over the samples (m)
  double centroid_error = 0;  // largest distance of the centroid of the water from
                              // the exact one, over the samples (m)
  double volume_error = 0;  // |V(T) - V(0) - booked mass correction| / V(0)
  long long steps = 0;
  double exact_steps = 0;   // sub-steps over the period that the exact flow's CFL step allows
  int status = 0;
};

Result RunBowl(int n, int solver, int order) {
  const Thacker exact;
  SwCase c;
  RectangleMeshSpec spec;
  spec.x0 = spec.y0 = -kHalf;
  spec.x1 = spec.y1 = kHalf;
  spec.nx = spec.ny = n;
  spec.layout = CellLayout::kQuadrilaterals;
  spec.jitter = 0.1;
  spec.seed = 11;
  spec.bed = Thacker::Bed;
  constexpr int kSamples = 32;  // per period
  MakeCase(c, spec, exact.period / kSamples);
  SetScheme(c.hd, solver, order);
  // The flood/dry depths scaled to the 0.1 m bowl (1 %, 0.5 % and 0.1 % of
  // h0), with the CFL correction that flooding and drying switches on.
  SetFloodDry(c.hd, 1e-4, 5e-4, 1e-3);
  c.hd.time_step.CFL_correction_HD = 1;
  StartCase(
      c, [&](double x, double y) { return exact.Surface(x, y, 0.0); }, [&](double, double) { return exact.U(0); },
      [&](double, double) { return exact.V(0); });
  const double volume0 = Volume(c);

  const HdState& st = c.hd.state;
  const ElementTable& el = c.mesh.elements;
  int centre = 1;
  for (int e = 1; e <= st.nelements; ++e) {
    if (std::hypot(el.xc[e], el.yc[e]) < std::hypot(el.xc[centre], el.yc[centre])) centre = e;
  }
  Result r;
  r.dx = 2 * kHalf / n;
  // An element counts as under water from the mass depth on (thinner water
  // is a draining film or newly flooded, mass-only land).
  const double wet_depth = c.hd.flood_dry.mass_depth;
  for (int k = 1; k <= kSamples && c.run_status >= 0; ++k) {
    const double t = k * exact.period / kSamples;
    RunTo(c, t);
    double volume = 0, mx = 0, my = 0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double rho = exact.Radius(el.xc[e], el.yc[e], t);
      if ((st.h[e] > wet_depth) != (rho < kA)) r.shore_error = std::max(r.shore_error, std::abs(rho - kA));
      const double v = std::max(0.0, st.h[e]) * el.area[e];
      volume += v, mx += v * el.xc[e], my += v * el.yc[e];
    }
    r.centroid_error =
        std::max(r.centroid_error, std::hypot(mx / volume - exact.CentreX(t), my / volume - exact.CentreY(t)));
  }
  const double T = exact.period;
  double err = 0;
  for (int e = 1; e <= st.nelements; ++e) err += std::abs(st.h[e] - exact.Depth(el.xc[e], el.yc[e], T)) * el.area[e];
  r.l1 = err / (kPi * kA * kA);
  r.speed_loss = 1 - std::hypot(st.u[centre], st.v[centre]) / (kEta * exact.omega);
  r.volume_error = std::abs(Volume(c) - volume0 - c.hd.flood_dry.mass_correction.Value()) / volume0;
  r.steps = c.hd.n_steps;
  // The largest CFL rate (|u| + |v| + 2 sqrt(g h)) / L of the exact flow:
  // its speed eta0 w in the worst direction, its deepest water h0 (at the
  // centre of the disc) and the smallest element length.
  const double rate = (std::sqrt(2.0) * kEta * exact.omega + 2 * std::sqrt(g * kH0)) /
                      *std::min_element(st.length.begin(), st.length.end());
  r.exact_steps = T * rate / c.hd.time_step.CFL_critical_HD;
  r.status = c.run_status;
  return r;
}

void Print(int order, const Result& r, const Result* coarser) {
  std::printf("Thacker order %d, dx %.3f m: L1 depth %.5f m = %.2f %% of h0", order, r.dx, r.l1, 100 * r.l1 / kH0);
  if (coarser) std::printf(" (rate %.2f)", std::log(coarser->l1 / r.l1) / std::log(coarser->dx / r.dx));
  std::printf(
      ", centre speed loss %.2f %% per period, water centroid within %.2f elements, water deeper than the mass "
      "depth within %.2f elements of the shoreline, %lld steps (exact flow's CFL step: %.0f)\n",
      100 * r.speed_loss, r.centroid_error / r.dx, r.shore_error / r.dx, r.steps, r.exact_steps);
}

// HLL, first and second order, on 0.08 m and 0.04 m quadrilaterals: the run
// stays sound, keeps its volume and its errors fall with resolution. At
// second order the sub-steps stay within 1.5 times those that the exact
// flow's CFL step allows: films at the drying margin once set the step at
// 15 to 60 m/s (2,565 and 2,451 sub-steps against 214 and 436).
TEST(ValidThacker, PlanarOscillationConvergesOnCoarseMeshes) {
  for (int order : {1, 2}) {
    const Result coarse = RunBowl(50, 2, order);
    const Result fine = RunBowl(100, 2, order);
    Print(order, coarse, nullptr);
    Print(order, fine, &coarse);
    for (const Result* r : {&coarse, &fine}) {
      EXPECT_EQ(r->status, 0) << "order " << order << ", dx " << r->dx;
      EXPECT_LT(r->volume_error, 1e-12) << "order " << order << ", dx " << r->dx;
    }
    EXPECT_LT(fine.l1, coarse.l1) << "order " << order;
    if (order == 2) {
      for (const Result* r : {&coarse, &fine}) EXPECT_LT(r->steps, 1.5 * r->exact_steps) << "dx " << r->dx;
    }
    EXPECT_LT(fine.speed_loss, coarse.speed_loss) << "order " << order;
  }
}

// The accuracy bars on 0.02 m elements (40,000 quadrilaterals, about 900
// steps): L1 depth error below 1 % of h0, falling from 0.04 m, less than 5 %
// loss of the centre speed per period, and the water moving with the exact
// body: its centroid within one element of the exact one at every sample.
// (Draining streams of 1 to 2 mm, just above the mass depth, lag on the
// receding side; the run prints how far from the shoreline they reach.)
TEST(ValidThacker, PlanarOscillationMeetsTheAccuracyBarsOnFineMesh) {
  const Result coarse = RunBowl(100, 2, 2);
  const Result fine = RunBowl(200, 2, 2);
  Print(2, coarse, nullptr);
  Print(2, fine, &coarse);
  EXPECT_EQ(fine.status, 0);
  EXPECT_LT(fine.volume_error, 1e-12);
  EXPECT_LT(fine.l1, coarse.l1);
  EXPECT_LT(fine.l1, 0.01 * kH0);
  EXPECT_LT(fine.speed_loss, 0.05);
  EXPECT_LT(fine.centroid_error, fine.dx);
}

}  // namespace
}  // namespace vhd::test
