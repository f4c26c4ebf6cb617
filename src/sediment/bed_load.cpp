#include "sediment/bed_load.hpp"

#include <algorithm>
#include <cmath>

#include "core/omp.hpp"

namespace vhd {

namespace {

constexpr double kKinematicViscositySquared = 1e-12;  // (1e-6 m2/s)^2
// p of Engelund-Fredsoe: pi mu_d / 6 with the dynamic friction coefficient 0.51.
constexpr double kEngelundFredsoeP = 0.2670359859600069;
// 0.7 sqrt(0.05).
constexpr double kEngelundFredsoeShift = 0.15652475575938452;
constexpr int kEngelundFredsoeIterations = 100;

double CriticalWithSlope(double theta_c, double sl) { return std::max(kBedLoadShieldsFloor, (1.0 + sl) * theta_c); }

// x^1.5 and x^2.5 through the square root (within an ulp of pow, at a
// fraction of its cost).
double Pow15(double x) { return x * std::sqrt(x); }
double Pow25(double x) { return x * x * std::sqrt(x); }

}  // namespace

double DimensionlessGrainSize(double d, double relative_density) {
  return d * std::cbrt((relative_density - 1.0) * kBedLoadGravity / kKinematicViscositySquared);
}

double VanRijnCriticalShields(double dstar) {
  if (dstar <= 4.0) return Single(0.24f) / dstar;
  if (dstar <= 10.0) return Single(0.14f) * std::pow(dstar, Single(-0.64f));
  if (dstar <= 20.0) return Single(0.04f) * std::pow(dstar, Single(-0.1f));
  if (dstar <= 150.0) return Single(0.013f) * std::pow(dstar, Single(0.29f));
  return 0.055;
}

double EngelundFredsoeSkinShields(double speed, double h, double d, double a, double theta) {
  const double tolerance = Single(0.001f);
  double x = h;
  double theta_skin = -1.0;
  for (int k = 0; k < kEngelundFredsoeIterations; ++k) {
    const double log_law = 2.5 * std::log(x / (2.5 * d)) + 6.0;
    if (!(log_law > 0.0)) return -1.0;
    const double ustar = speed / log_law;
    theta_skin = ustar * ustar / a;
    const double x_new = h * theta_skin / theta;
    if (std::fabs(x_new / x - 1.0) < tolerance) break;
    x = x_new;
  }
  return theta_skin;
}

BedLoadGrain BedLoadGrainOf(double d, double relative_density) {
  BedLoadGrain g;
  g.d = d;
  g.a = (relative_density - 1.0) * kBedLoadGravity * d;
  g.sqrt_a = std::sqrt(g.a);
  g.dstar = DimensionlessGrainSize(d, relative_density);
  g.van_rijn_critical = VanRijnCriticalShields(g.dstar);
  g.dstar_power = std::pow(g.dstar, Single(0.3f));
  return g;
}

double BedLoadMagnitude(const BedLoadSettings& s, double speed, double f, double h, double d, double sl) {
  return BedLoadMagnitude(s, BedLoadGrainOf(d, s.relative_density), speed, f, h, sl);
}

double BedLoadMagnitude(const BedLoadSettings& s, const BedLoadGrain& grain, double speed, double f, double h,
                        double sl) {
  const double d = grain.d, a = grain.a, sqrt_a = grain.sqrt_a;
  const double theta = f * speed * speed / a;
  switch (s.formula) {
    case kBedLoadEngelundHansen: {
      if (!(theta > CriticalWithSlope(s.critical_shields, sl))) return 0.0;
      return Single(0.05f) * d * sqrt_a * Pow25(theta) / f;
    }
    case kBedLoadVanRijn: {
      const double theta_ce = CriticalWithSlope(grain.van_rijn_critical, sl);
      if (!(theta > theta_ce)) return 0.0;
      const double cg = 18.0 * std::log10(2.0 * h / d);
      if (!(cg > 0.0)) return 0.0;
      const double ustar_skin = std::sqrt(kBedLoadGravity) * speed / cg;
      const double ustar_c = std::sqrt(a * theta_ce);
      const double ratio = ustar_skin / ustar_c;
      const double t = ratio * ratio - 1.0;
      if (!(t > 0.0)) return 0.0;
      return Single(0.053f) * sqrt_a * d * std::pow(t, Single(2.1f)) / grain.dstar_power;
    }
    case kBedLoadEngelundFredsoe: {
      if (!(theta > CriticalWithSlope(s.critical_shields, sl))) return 0.0;
      const double theta_skin = EngelundFredsoeSkinShields(speed, h, d, a, theta);
      if (!(theta_skin > Single(0.05f))) return 0.0;
      const double r = kEngelundFredsoeP / (theta_skin - Single(0.05f));
      const double p = std::pow(1.0 + r * r * r * r, -0.25);
      return 5.0 * p * d * sqrt_a * (std::sqrt(theta_skin) - kEngelundFredsoeShift);
    }
    case kBedLoadMeyerPeterMueller: {
      const double theta_ce = CriticalWithSlope(s.critical_shields, sl);
      if (!(theta > theta_ce)) return 0.0;
      const double theta_skin = std::min(theta, Single(0.06f) + Single(0.4f) * theta * theta);
      if (!(theta_skin > theta_ce)) return 0.0;
      return 8.0 * d * sqrt_a * Pow15(theta_skin - theta_ce);
    }
    default:
      return 0.0;
  }
}

void BedLoadElement(const BedLoadSettings& s, int wet, double u, double v, double f, double h, double d,
                    double sl, double st, double tan_delta, double& qx, double& qy) {
  BedLoadElement(s, wet, u, v, f, h, BedLoadGrainOf(d, s.relative_density), sl, st, tan_delta, qx, qy);
}

void BedLoadElement(const BedLoadSettings& s, int wet, double u, double v, double f, double h,
                    const BedLoadGrain& grain, double sl, double st, double tan_delta, double& qx, double& qy) {
  qx = 0.0;
  qy = 0.0;
  const double speed2 = u * u + v * v;
  if (wet < 1 || !(speed2 > kBedLoadSpeedSquaredFloor)) return;
  const double speed = std::sqrt(speed2);
  const double q = BedLoadMagnitude(s, grain, speed, f, h, sl);
  if (!(q > 0.0)) return;
  const double theta = f * speed2 / grain.a;
  const double qs = std::max(0.0, 1.0 - s.streamwise_slope_factor * sl) * q;
  const double base = std::min(theta, Single(0.06f) + Single(0.4f) * theta);
  const double m = s.transverse_slope_exponent;
  const double phi = m == 0.5 ? std::sqrt(base) : std::pow(base, m);
  const double qn = (tan_delta - s.transverse_slope_factor * st / phi) * q;
  qx = s.factor * (u * qs - v * qn) / speed;
  qy = s.factor * (v * qs + u * qn) / speed;
}

void CALCBEDLOADCURRENT(const BedLoadSettings& s, const BedLoadInputs& in, int n, Array1<double>& qx,
                        Array1<double>& qy) {
  double* qx_data = qx.data();
  double* qy_data = qy.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    const BedLoadGrain& grain = in.grain ? in.grain[e] : in.grain_constant;
    BedLoadElement(s, in.wet[e], in.u[e], in.v[e], in.friction[e], in.depth[e], grain, in.streamwise_slope[e],
                   in.transverse_slope[e], in.tan_delta[e], qx_data[e], qy_data[e]);
  }
}

}  // namespace vhd
