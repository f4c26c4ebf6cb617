// Accuracy of the advection-dispersion solver on prescribed flows with exact
// solutions: a Gaussian pulse in uniform flow (convergence, order, no new
// extrema), the variance growth 2 D t of dispersion, linear decay against
// exp(-k t) and the closed form of each scheme, the rotating cone; the rules
// of single faces and elements; the messages.

#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <numbers>
#include <string>

#include "ad_case.hpp"

namespace vhd::test {
namespace {

double Gaussian(double x, double y, double x0, double y0, double sigma) {
  return std::exp(-((x - x0) * (x - x0) + (y - y0) * (y - y0)) / (2.0 * sigma * sigma));
}

RectangleMeshSpec Jittered(int nx, int ny, double dx, CellLayout layout, double x0 = 0.0, double y0 = 0.0) {
  RectangleMeshSpec spec = RectSpec(nx, ny, dx, dx, Flat(1.0), layout, x0, y0);
  spec.jitter = 0.15;
  return spec;
}

// Runs the case for nsteps flow steps.
void RunSteps(PrescribedCase& k, int nsteps) {
  for (int n = 0; n < nsteps; ++n) k.ad.Step(k.flow, k.comp);
}

// A pulse of sigma 100 m carried 1,000 m by 1 m/s on jittered triangles.
struct PulseResult {
  double l1, min, max;
};
PulseResult Pulse(int nx, int time_integration, int order) {
  PrescribedCase k;
  const double U = 1.0;
  k.Make(Jittered(nx, nx / 2, 2000.0 / nx, CellLayout::kRandomTriangles), 1.0, 100.0,
         [U](double, double y) { return U * y; }, Technique(time_integration, order), 0.9);
  k.Set([](double x, double y) { return Gaussian(x, y, 500.0, 500.0, 100.0); });
  RunSteps(k, 10);
  return {k.RelativeL1([](double x, double y) { return Gaussian(x, y, 1500.0, 500.0, 100.0); }), k.Min(), k.Max()};
}

TEST(TransportAccuracy, PulseErrorFallsWithResolutionAndSecondOrderIsBetter) {
  double previous[2] = {1e300, 1e300};
  for (int nx : {40, 80, 160}) {
    const PulseResult first = Pulse(nx, 1, 1);
    const PulseResult second = Pulse(nx, 3, 2);
    std::printf("pulse nx %d: L1 first order %.4f, second order %.4f; second-order range [%.3g, %.6f]\n", nx,
                first.l1, second.l1, second.min, second.max);
    EXPECT_LT(first.l1, previous[0]);
    EXPECT_LT(second.l1, previous[1]);
    EXPECT_LT(second.l1, first.l1);
    // The limited second order creates no new extremum: the range stays
    // within the initial [0, 1], to round-off (the limiter leaves increments
    // below its threshold of 1e-12 alone).
    EXPECT_GE(second.min, -1e-11);
    EXPECT_LE(second.max, 1.0);
    previous[0] = first.l1, previous[1] = second.l1;
  }
  // At the finest mesh the error of second order is well below first order.
  EXPECT_LT(previous[1], 0.5 * previous[0]);
}

// Variance of c about its centre, mean of x and y (m2).
double Variance(const PrescribedCase& k) {
  const ElementTable& E = k.c.mesh.elements;
  double s = 0, sx = 0, sy = 0;
  for (int e = 1; e <= E.nelements_int; ++e) {
    const double w = k.comp.c[e] * E.area[e];
    s += w, sx += w * E.xc[e], sy += w * E.yc[e];
  }
  const double mx = sx / s, my = sy / s;
  double v = 0;
  for (int e = 1; e <= E.nelements_int; ++e) {
    const double w = k.comp.c[e] * E.area[e];
    v += w * ((E.xc[e] - mx) * (E.xc[e] - mx) + (E.yc[e] - my) * (E.yc[e] - my));
  }
  return 0.5 * v / s;
}

// Variance growth over 1,000 s of a pulse of sigma 50 m carried by 0.1 m/s
// on 10 m jittered triangles with dispersion D.
double VarianceGrowth(double D) {
  PrescribedCase k;
  k.Make(Jittered(80, 60, 10.0, CellLayout::kRandomTriangles), 1.0, 50.0,
         [](double, double y) { return 0.1 * y; }, Technique(3, 2), 0.5);
  k.Set([](double x, double y) { return Gaussian(x, y, 300.0, 300.0, 50.0); });
  if (D > 0) k.comp.dispersion.assign(k.c.hd.state.nelements, D);
  const double v0 = Variance(k);
  RunSteps(k, 20);
  return Variance(k) - v0;
}

TEST(TransportAccuracy, DispersionGrowsTheVarianceByTwoDt) {
  const double t = 1000.0, D = 1.0;
  const double numerical = VarianceGrowth(0.0) / (2.0 * t);
  const double growth = VarianceGrowth(D);
  std::printf("dispersion D = 1: variance growth / (2 D t) = %.4f; numerical diffusion %.4f m2/s\n",
              growth / (2.0 * D * t), numerical);
  EXPECT_NEAR(growth / (2.0 * D * t), 1.0, 0.03);
  EXPECT_LT(numerical, 0.03);
}

TEST(TransportAccuracy, DecayIsImplicitPerStage) {
  // No flow, c = 1, k = 1e-4 1/s. Every scheme follows its closed form
  // (1 / (1 + dt k) per step for schemes 1 and 2, the product of the three
  // stage divisions for scheme 3) to round-off at any dt k, so it stays
  // positive and decreasing up to dt k = 10; with dt k = 1e-5 the mass
  // follows exp(-k t) to 1e-6; the decay booked is the mass lost.
  const double k = 1e-4;
  struct Row {
    int scheme;
    double dtk;
    int steps;
  } rows[] = {{1, 1e-5, 10000}, {3, 1e-5, 10000}, {1, 0.01, 100}, {2, 1.0, 10},
              {3, 1.0, 10},     {1, 10.0, 3},     {2, 10.0, 3},   {3, 10.0, 3}};
  for (const Row& r : rows) {
    SCOPED_TRACE("scheme " + std::to_string(r.scheme) + ", dt k " + std::to_string(r.dtk));
    PrescribedCase c;
    const double dt = r.dtk / k;
    c.Make(RectSpec(4, 4, 10.0, 10.0, Flat(2.0), CellLayout::kMixed), 2.0, dt, {}, Technique(r.scheme, 1), 1.0);
    c.Set([](double, double) { return 1.0; });
    c.comp.decay_constant = k;
    const double m0 = c.Integral();
    double expected = 1.0, previous = 1.0;
    const double z = r.dtk;
    const double step = r.scheme == 3
                            ? (1.0 / 3.0 + 2.0 / 3.0 * ((0.75 + 0.25 / (1 + z)) / (1 + 0.25 * z))) / (1 + 2.0 / 3.0 * z)
                            : 1.0 / (1.0 + z);
    for (int n = 0; n < r.steps; ++n) {
      c.ad.Step(c.flow, c.comp);
      expected *= step;
      const double ratio = c.Integral() / m0;
      EXPECT_GT(ratio, 0.0);
      EXPECT_LT(ratio, previous);
      previous = ratio;
    }
    EXPECT_NEAR(previous / expected, 1.0, 1e-15 * (r.steps + 10));
    if (r.dtk <= 1e-5) {
      EXPECT_NEAR(previous / std::exp(-k * dt * r.steps), 1.0, 1e-6);
    }
    double decayed = 0.0;
    for (int e = 1; e <= c.c.hd.state.nelements_owned; ++e) decayed += c.comp.decay_total[e];
    EXPECT_NEAR(decayed / (2.0 * m0), 1.0 - previous, 1e-12);
  }
}

TEST(TransportAccuracy, RotatingConeKeepsItsPeak) {
  // Solid-body rotation about the centre of a 100 x 100 mixed mesh of 1 m
  // cells, one full turn; a cone of radius 15 m and height 1 at (0, 25).
  const double omega = 2.0 * std::numbers::pi / 600.0;
  auto cone = [](double x, double y) { return std::max(0.0, 1.0 - std::hypot(x, y - 25.0) / 15.0); };
  double peak[2] = {0, 0};
  for (int order : {1, 2}) {
    PrescribedCase k;
    RectangleMeshSpec spec = RectSpec(100, 100, 1.0, 1.0, Flat(1.0), CellLayout::kMixed, -50.0, -50.0);
    k.Make(spec, 1.0, 60.0, [omega](double x, double y) { return -0.5 * omega * (x * x + y * y); },
           Technique(3, order), 0.9);
    k.Set(cone);
    const double peak0 = k.Max();
    RunSteps(k, 10);
    peak[order - 1] = k.Max() / peak0;
    std::printf("rotating cone, order %d: peak kept %.3f, L1 error %.3f, minimum %.3g\n", order, peak[order - 1],
                k.RelativeL1(cone), k.Min());
    EXPECT_GE(k.Min(), -1e-11);
  }
  EXPECT_GE(peak[1], 0.6);
  EXPECT_GT(peak[1], peak[0]);
}

// The rules of single faces and elements on a 10 x 4 strip of 10 m cells at
// rest: the left half (x < 50) holds c = 1, the right half 0, D = 5 m2/s
// unless the row says otherwise.
struct RuleCase {
  PrescribedCase k;
  explicit RuleCase(CellLayout layout) {
    k.Make(RectSpec(10, 4, 10.0, 10.0, Flat(1.0), layout), 1.0, 10.0, {}, Technique(1, 1), 1.0);
    k.Set([](double x, double) { return x < 50.0 ? 1.0 : 0.0; });
    k.comp.dispersion.assign(k.c.hd.state.nelements, 5.0);
  }
  double MassRight() const {
    double s = 0;
    for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e)
      if (k.c.mesh.elements.xc[e] > 50.0) s += k.comp.c[e] * k.c.mesh.elements.area[e];
    return s;
  }
};

TEST(TransportRules, FacesAndElements) {
  for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kRandomTriangles, CellLayout::kMixed}) {
    SCOPED_TRACE(static_cast<int>(layout));
    {  // Equal coefficients: the mass crosses the interface.
      RuleCase r(layout);
      r.k.ad.Step(r.k.flow, r.k.comp);
      EXPECT_GT(r.MassRight(), 1.0);
    }
    {  // D = 0 on one side: the face coefficient min(D_L + D_R, 4 D_L, 4 D_R) is 0.
      RuleCase r(layout);
      for (int e = 1; e <= r.k.c.hd.state.nelements; ++e)
        if (r.k.c.mesh.elements.xc[e] > 50.0) r.k.comp.dispersion[e] = 0.0;
      r.k.ad.Step(r.k.flow, r.k.comp);
      EXPECT_EQ(r.MassRight(), 0.0);
    }
    {  // A dry column between the halves: no dispersion across a wet/dry face.
      RuleCase r(layout);
      for (int e = 1; e <= r.k.c.hd.state.nelements; ++e) {
        const double x = r.k.c.mesh.elements.xc[e];
        if (x > 50.0 && x < 60.0) r.k.flow.wetdry[e] = r.k.flow.wetdry_end[e] = kDry;
      }
      r.k.ad.Step(r.k.flow, r.k.comp);
      EXPECT_EQ(r.MassRight(), 0.0);
    }
    {  // Below h_min an element keeps its concentration while the others change.
      RuleCase r(layout);
      int thin = 0;
      for (int e = 1; e <= r.k.c.hd.state.nelements && !thin; ++e)
        if (std::abs(r.k.c.mesh.elements.xc[e] - 55.0) < 5.0) thin = e;
      r.k.flow.h_start[thin] = r.k.flow.h_end[thin] = 0.5e-4;
      r.k.ad.Step(r.k.flow, r.k.comp);
      EXPECT_EQ(r.k.comp.c[thin], 0.0);
      EXPECT_GT(r.MassRight(), 0.0);
    }
    {  // Above the maximum: set to the maximum, the removed mass booked.
      RuleCase r(layout);
      r.k.comp.maximum = 0.5;
      r.k.ad.Step(r.k.flow, r.k.comp);
      double removed = 0.0, over = 0.0;
      for (int e = 1; e <= r.k.c.hd.state.nelements_owned; ++e) {
        removed += r.k.comp.clamp_correction[e];
        over = std::max(over, r.k.comp.c[e]);
      }
      EXPECT_EQ(over, 0.5);
      EXPECT_LT(removed, -100.0);
      EXPECT_NEAR(r.k.Integral() - 2000.0, removed, 1e-9);
    }
  }
}

TEST(TransportRules, Messages) {
  struct Row {
    const char* what;
    void (*change)(AdSolutionTechnique&);
    const char* message;
  } rows[] = {
      {"time integration", [](AdSolutionTechnique& t) { t.scheme_of_time_integration = 4; },
       "Type not supported for scheme_of_time_integration (AD): 4"},
      {"space", [](AdSolutionTechnique& t) { t.scheme_of_space_discretization_horizontal = 0; },
       "Type not supported for scheme_of_space_discretization_horizontal (AD): 0"},
      {"gradient", [](AdSolutionTechnique& t) { t.gradient_calculation = 5; },
       "Type not supported for gradient_calculation (AD): 5"},
      {"limiter", [](AdSolutionTechnique& t) { t.gradient_limiter = 7; },
       "Type not supported for gradient_limiter (AD): 7"},
      {"h_min", [](AdSolutionTechnique& t) { t.h_min = -1.0; }, "SetupAD: h_min must be >= 0"},
  };
  for (const Row& r : rows) {
    SCOPED_TRACE(r.what);
    AdSolutionTechnique t;
    r.change(t);
    EXPECT_FATAL(
        {
          PrescribedCase k;
          k.Make(RectSpec(2, 2, 10.0, 10.0, Flat(1.0), CellLayout::kQuadrilaterals), 1.0, 10.0, {}, t, 1.0);
        },
        r.message);
  }
  PrescribedCase k;
  k.Make(RectSpec(2, 2, 10.0, 10.0, Flat(1.0), CellLayout::kQuadrilaterals), 1.0, 10.0, {}, Technique(1, 1), 1.0);
  AdDispersion d;
  d.type = 3;
  Array1<double> D;
  EXPECT_FATAL(ComputeDispersionAD(d, k.c.hd, D), "Dispersion type not implemented yet");
  AdFlow fresh;
  AllocateFlowAD(k.c.hd, fresh);
  EXPECT_FATAL(GatherFlowAD(k.c.hd, k.c.solver, k.c.mesh, 1.0, fresh),
               "GatherFlowAD: the transport has no start depths (BeginFlowAD was not called)");
}

TEST(TransportRules, DispersionCoefficient) {
  // D = nu_t / sigma (constant or per element) or the coefficient, clamped.
  PrescribedCase k;
  k.Make(RectSpec(2, 1, 10.0, 10.0, Flat(1.0), CellLayout::kQuadrilaterals), 1.0, 10.0, {}, Technique(1, 1), 1.0);
  HdState& st = k.c.hd.state;
  st.nu_t.assign(st.nelements, 0.0);
  st.nu_t[1] = 2.0, st.nu_t[2] = 40.0;
  Array1<double> D;
  AdDispersion d;
  d.sigma = 0.5;
  d.maximum_dispersion = 50.0;
  ComputeDispersionAD(d, k.c.hd, D);
  EXPECT_EQ(D[1], 4.0);
  EXPECT_EQ(D[2], 50.0);
  d.format = 1;
  d.field.assign(st.nelements, 4.0);
  ComputeDispersionAD(d, k.c.hd, D);
  EXPECT_EQ(D[1], 0.5);
  EXPECT_EQ(D[2], 10.0);
  d.type = kAdDispersionCoefficient;
  d.format = 0;
  d.minimum_dispersion = 0.1;
  ComputeDispersionAD(d, k.c.hd, D);
  EXPECT_EQ(D[1], 0.1);
  d.type = kAdDispersionNone;
  ComputeDispersionAD(d, k.c.hd, D);
  EXPECT_TRUE(D.empty());
}

}  // namespace
}  // namespace vhd::test
