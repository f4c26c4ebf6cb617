#pragma once
// Bed load of sand in a pure current (routine CALCBEDLOADCURRENT): for every
// wet element the volume of grains moved along the bed per unit width and
// time, from the depth-averaged velocity, the bed friction, the water depth
// and the grain diameter, corrected for the bed slope and turned by helical
// flow.
//
// Formulas (bed_load_formula): 1 Engelund-Hansen, 2 van Rijn,
// 3 Engelund-Fredsoe, 4 Meyer-Peter and Mueller; any other code moves no
// sand. With a = (s - 1) g d and the Shields parameter theta = f |U|^2 / a
// (u*^2 = f |U|^2):
//   1  q = 0.05 d sqrt(a) theta^2.5 / f
//   2  q = 0.053 sqrt(a) d T^2.1 / D*^0.3, T = (u*'/u*c)^2 - 1, with the
//      grain Chezy number Cg = 18 log10(2h/d), u*' = sqrt(g) |U| / Cg,
//      u*c = sqrt(a theta_ce) and the critical value from D*
//   3  q = 5 p d sqrt(a) (sqrt(theta') - 0.7 sqrt(0.05)), the skin Shields
//      parameter theta' from the logarithmic law over the skin depth
//      (iterated), p the probability of a grain moving
//   4  q = 8 d sqrt(a) (theta' - theta_ce)^1.5, theta' = min(theta, 0.06 + 0.4 theta^2)
// each only above its critical value theta_ce, raised on an adverse
// streamwise slope sl (1 + sl) and never below 0.01. The streamwise
// component is scaled by max(0, 1 - alpha_s sl), the transverse one is
// (tan delta - G st / phi) q with phi = min(theta, 0.06 + 0.4 theta)^m; the
// vector (streamwise, transverse to the left) is turned into x, y and scaled
// by the bed-load factor F.
//
// Guards beyond the formulas, where they would give no number: Meyer-Peter
// and Mueller moves nothing unless theta' exceeds theta_ce; van Rijn and
// Engelund-Fredsoe move nothing where their logarithmic law has no positive
// value (depths of the order of the grain diameter); the corrections apply
// only to a moving bed (q > 0), so that a zero friction leaves (0, 0).
//
// The constants the formulas name in single precision enter as the double of
// that float (kSingle below): the iteration tolerance 0.001, the factor 0.4
// and 0.05, 0.06, 0.053, 0.14, 0.04, 0.013, 0.24, -0.64, -0.1, 0.29, 2.1, 0.3.

#include "core/array1.hpp"

namespace vhd {

// The value of a single-precision constant as held in double.
constexpr double Single(float x) { return static_cast<double>(x); }

inline constexpr int kBedLoadEngelundHansen = 1;
inline constexpr int kBedLoadVanRijn = 2;
inline constexpr int kBedLoadEngelundFredsoe = 3;
inline constexpr int kBedLoadMeyerPeterMueller = 4;

inline constexpr double kBedLoadGravity = 9.81;          // m/s2
inline constexpr double kBedLoadSpeedSquaredFloor = 1e-4;  // m2/s2: no transport at or below
inline constexpr double kBedLoadShieldsFloor = 0.01;      // least critical Shields parameter

struct BedLoadSettings {
  int formula = kBedLoadEngelundHansen;
  double factor = 1.0;                      // F
  double streamwise_slope_factor = 5.0;     // alpha_s
  double transverse_slope_factor = 1.25;    // G
  double transverse_slope_exponent = 0.5;   // m
  double critical_shields = 0.047;          // theta_c
  double relative_density = 2.65;           // s
};

// The terms of a grain diameter d that do not change in time: a = (s - 1) g d,
// sqrt(a), van Rijn's D*, its critical Shields parameter and D*^0.3.
struct BedLoadGrain {
  double d = 0.0;
  double a = 0.0;
  double sqrt_a = 0.0;
  double dstar = 0.0;
  double van_rijn_critical = 0.0;
  double dstar_power = 0.0;
};
BedLoadGrain BedLoadGrainOf(double d, double relative_density);

// Per-element inputs of CALCBEDLOADCURRENT (arrays over the elements, from 1).
// grain may be null: every element then has grain_constant.
struct BedLoadInputs {
  const int* wet = nullptr;           // wet/dry code: transport where >= 1
  const double* u = nullptr;          // m/s
  const double* v = nullptr;          // m/s
  const double* friction = nullptr;   // f, u*^2 = f |U|^2
  const double* depth = nullptr;      // h (m)
  const BedLoadGrain* grain = nullptr;  // terms of the grain diameter d
  BedLoadGrain grain_constant;          // where grain is null
  const double* streamwise_slope = nullptr;  // sl, positive rising along the flow
  const double* transverse_slope = nullptr;  // st, positive rising to the left of the flow
  const double* tan_delta = nullptr;  // helical flow, positive turning the transport left
};

// Critical Shields parameter of van Rijn for the dimensionless grain size D*
// (each limit belongs to the branch below it).
double VanRijnCriticalShields(double dstar);
// Dimensionless grain size D* = d ((s - 1) g / nu^2)^(1/3), nu = 1e-6 m2/s.
double DimensionlessGrainSize(double d, double relative_density);
// Skin Shields parameter of Engelund-Fredsoe for speed |U|, depth h, grain
// diameter d, a = (s - 1) g d and theta; negative where the logarithmic law
// has no positive value.
double EngelundFredsoeSkinShields(double speed, double h, double d, double a, double theta);

// Magnitude q of the bed load along the flow (m2/s), before the corrections;
// sl raises the critical value.
double BedLoadMagnitude(const BedLoadSettings& s, const BedLoadGrain& grain, double speed, double f, double h,
                        double sl);
double BedLoadMagnitude(const BedLoadSettings& s, double speed, double f, double h, double d, double sl);

// Bed load (qx, qy) of one element.
void BedLoadElement(const BedLoadSettings& s, int wet, double u, double v, double f, double h,
                    const BedLoadGrain& grain, double sl, double st, double tan_delta, double& qx, double& qy);
void BedLoadElement(const BedLoadSettings& s, int wet, double u, double v, double f, double h, double d,
                    double sl, double st, double tan_delta, double& qx, double& qy);

// The bed load of elements 1 .. n (a static parallel loop; each iteration
// writes only its own element).
void CALCBEDLOADCURRENT(const BedLoadSettings& s, const BedLoadInputs& in, int n, Array1<double>& qx,
                        Array1<double>& qy);

}  // namespace vhd
