#pragma once
// Approximate Riemann solvers of the 2D shallow-water equations at one face.
//
// Conserved quantities per side: surface elevation eta (m), fluxes P = h u and
// Q = h v (m2/s). The momentum flux carries the pre-balanced pressure
//     p = g/2 (h_p^2 - d^2)          (m3/s2)
// with h_p the pressure depth and d the still water depth that the side sees
// at the face, so that a lake at rest (eta = 0, u = v = 0) has zero flux; the
// bed-slope term g eta grad(d) that completes the equations is added by the
// caller. The mass component of the jump U_R - U_L is the jump of eta
// (h_p - d per side), which keeps the upwind dissipation zero at rest over an
// uneven bed.
//
// Every solver works in the frame of the unit normal n^ = n/|n| (normal and
// tangential components) and scales its result by |n| (|n| = 1 on Cartesian
// meshes; on geographic meshes the normal carries metric factors).
//
// Solver types (type_of_Riemann_solver):
//   0 central flux, no dissipation; the HLL flux (type 2) when a side is
//     dry or h_L + h_R <= h_min, as with type 1: without dissipation a
//     front running onto a dry bed blows up
//   1 Roe with optional entropy fix; the HLL flux (type 2) when a side is
//     dry or h_L + h_R <= h_min: the central flux there has no dissipation,
//     and at thin fronts on steep slopes it flung films out at hundreds of
//     m/s; the Roe flux has no dry-front speed
//   2 HLL with two-rarefaction wave-speed estimates (Toro)
//   3 HLLC with Roe-averaged wave speeds and a contact wave carrying the
//     tangential momentum
//   4 HLLC with two-rarefaction speeds, contact speed u* and the mean of the
//     two side pressures in the star region
// A side is dry for the HLL family when its wet flag is not 1 or its depth is
// at most 1e-10 m; the outer wave of the other side is then its dry-front
// speed u_n -+ 2 sqrt(g h). Type 4 takes only a side without depth as dry:
// its star depths would otherwise move water from a wet side into a flooded
// side at rest at the same level.
//
// Everything is defined inline here so that the face loop of the solver
// inlines the whole flux; RiemannFaceFluxUnit is the face loop's entry with
// the unit normal, its length and sqrt(g) prepared once.

#include <algorithm>
#include <cmath>

namespace vhd {

// State of one side of the face, all values at the face.
struct RiemannSide {
  int wet = 1;      // 1 when the side's element is wet (code 1)
  double h = 0;     // depth for the wave speeds (m)
  double d = 0;     // still water depth at the face seen by this side (m)
  double hp = 0;    // pressure depth h_p: face depth plus depth correction (m)
  double P = 0;     // depth-integrated flux in x (m2/s)
  double Q = 0;     // depth-integrated flux in y (m2/s)
  double u = 0;     // velocity in x (m/s); 0 for a dry or too shallow side
  double v = 0;     // velocity in y (m/s)
};

// Result of RiemannFaceFlux. Fluxes are positive from left to right, i.e. in
// the direction of the normal.
struct RiemannFlux {
  double Fh = 0;    // mass flux per unit face length (m2/s)
  double mass = 0;  // mass flux times face length (m3/s)
  double momx = 0;  // x-momentum flux times face length (m4/s2)
  double momy = 0;  // y-momentum flux times face length (m4/s2)
  double d = 0;     // still water depth at the face seen by the flux (m)
};

// Numerical flux through one face from left side L to right side R.
//   nx, ny      face normal pointing from L to R (unit length on Cartesian
//               meshes)
//   h_min       minimum depth of the flux computation (m); the Roe solver
//               takes the HLL flux when h_L + h_R <= h_min
//   solver      type 0..4 (above); other values give the central flux
//   entropy_fix 0 none, 1 Harten-Hyman type fix of the Roe eigenvalues
//   length      face length (m); multiplies every output except Fh
//   g           gravity (m/s2)
// Pure and re-entrant: no state, safe to call from any thread.
inline RiemannFlux RiemannFaceFlux(const RiemannSide& L, const RiemannSide& R, double nx, double ny,
                                   double h_min, int solver, int entropy_fix, double length, double g);

// The same flux for a normal given as its unit vector (ex, ey) and its length
// nn (nx = nn ex, ny = nn ey), with sqrt_g = sqrt(g): the form the face loop
// calls with the face geometry prepared at setup.
inline RiemannFlux RiemannFaceFluxUnit(const RiemannSide& L, const RiemannSide& R, double ex, double ey,
                                       double nn, double h_min, int solver, int entropy_fix, double length,
                                       double g, double sqrt_g);

// Roe's flux of type 1 without its HLL fallback, for faces where the caller
// knows that the fallback is not taken (both sides wet, deeper than 1e-10 m,
// h_L + h_R > h_min): the same bits as RiemannFaceFluxUnit of type 1 there,
// without forming the HLL flux beside it. kSharedD: the caller knows that
// both sides see the same d, so the part of the flux jump due to a step in d
// (zero then) is not formed.
template <bool kSharedD = false>
inline RiemannFlux RoeOnlyFaceFluxUnit(const RiemannSide& L, const RiemannSide& R, double ex, double ey, double nn,
                                       int entropy_fix, double length, double g, double sqrt_g);

// ---- the solvers, in the frame of the unit normal -----------------------------
//
// Each returns the mass flux, the normal and the tangential momentum flux per
// unit length for a unit normal, and the face d.

struct SideFrame {
  bool dry;       // dry for the HLL family: not wet or no depth
  bool empty;     // no depth (h <= 1e-10)
  bool wet;       // wet flag is 1
  double h;       // depth for wave speeds
  double sqh;     // sqrt(max(0, h))
  double d;       // face still water depth
  double eta;     // h_p - d
  double p;       // g/2 (h_p^2 - d^2)
  double qn, qt;  // normal and tangential flux
  double un, ut;  // normal and tangential velocity
  double c;       // sqrt(g h)
};

struct FrameFlux {
  double mass, mn, mt, d;
};

namespace riemann_detail {
inline constexpr double kDryDepth = 1e-10;  // a side at most this deep is dry (HLL family)
inline constexpr double kDegenerateSpeed = 1e-10;
}  // namespace riemann_detail

// A side in the frame of the unit normal (ex, ey).
inline SideFrame MakeSideFrame(const RiemannSide& s, double ex, double ey, double g, double sqrt_g) {
  SideFrame f;
  f.wet = s.wet == 1;
  f.empty = s.h <= riemann_detail::kDryDepth;
  f.dry = !f.wet || f.empty;
  f.h = s.h;
  f.sqh = std::sqrt(std::max(0.0, s.h));
  f.d = s.d;
  f.eta = s.hp - s.d;
  f.p = 0.5 * g * (s.hp * s.hp - s.d * s.d);
  f.qn = s.P * ex + s.Q * ey;
  f.qt = -s.P * ey + s.Q * ex;
  f.un = s.u * ex + s.v * ey;
  f.ut = -s.u * ey + s.v * ex;
  f.c = sqrt_g * f.sqh;
  return f;
}

// Physical flux of one side: (q_n, q_n u_n + p, q_t u_n).
inline FrameFlux PhysicalFlux(const SideFrame& s) {
  return {s.qn, s.qn * s.un + s.p, s.qt * s.un, s.d};
}

inline FrameFlux MeanFlux(const FrameFlux& a, const FrameFlux& b) {
  return {0.5 * (a.mass + b.mass), 0.5 * (a.mn + b.mn), 0.5 * (a.mt + b.mt), 0.5 * (a.d + b.d)};
}

inline FrameFlux CentralFlux(const SideFrame& L, const SideFrame& R) {
  return MeanFlux(PhysicalFlux(L), PhysicalFlux(R));
}

// HLL average of the two physical fluxes for S_L < 0 < S_R (Harten, Lax, van
// Leer): [S_R F_L - S_L F_R + S_L S_R (U_R - U_L)] / (S_R - S_L), with eta as
// the mass component of U.
inline FrameFlux HllStar(const SideFrame& L, const SideFrame& R, const FrameFlux& FL, const FrameFlux& FR,
                         double SL, double SR) {
  const double w = 1.0 / (SR - SL);
  const double sls = SL * SR;
  return {(SR * FL.mass - SL * FR.mass + sls * (R.eta - L.eta)) * w,
          (SR * FL.mn - SL * FR.mn + sls * (R.qn - L.qn)) * w,
          (SR * FL.mt - SL * FR.mt + sls * (R.qt - L.qt)) * w,
          (SR * L.d - SL * R.d) * w};
}

// Roe's linearisation with the eigen-decomposition of the shallow-water
// Jacobian: waves u_n + c, u_n (shear), u_n - c. kSharedD: both sides see
// the same d (the step term below is zero and not formed).
template <bool kSharedD = false>
inline FrameFlux RoeFlux(const SideFrame& L, const SideFrame& R, int entropy_fix, double g) {
  const FrameFlux central = CentralFlux(L, R);
  const double c0 = std::sqrt(0.5 * g * (L.h + R.h));
  // Roe averages of the velocity where both sides are wet, else the mean.
  // One division for both 1 / (sl + sr) and 1 / c0.
  const double sl = L.sqh, sr = R.sqh;
  const bool roe = L.wet & R.wet & (sl + sr > 0);
  const double q = 1.0 / ((roe ? sl + sr : 1.0) * c0);
  const double w = c0 * q;
  const double inv_c0 = roe ? (sl + sr) * q : q;
  const double un = roe ? (sl * L.un + sr * R.un) * w : 0.5 * (L.un + R.un);
  const double ut = roe ? (sl * L.ut + sr * R.ut) * w : 0.5 * (L.ut + R.ut);
  const double deta = R.eta - L.eta;
  const double dqn = R.qn - L.qn;
  const double dqt = R.qt - L.qt;
  const double l1 = un + c0, l2 = un, l3 = un - c0;
  double a1 = std::abs(l1), a2 = std::abs(l2), a3 = std::abs(l3);
  if (entropy_fix == 1) {
    auto fix = [](double l, double abs_l, double lL, double lR) {
      return std::max(abs_l, std::max(0.0, std::max(l - lL, lR - l)));
    };
    a1 = fix(l1, a1, L.un + L.c, R.un + R.c);
    a2 = fix(l2, a2, L.un, R.un);
    a3 = fix(l3, a3, L.un - L.c, R.un - R.c);
  }
  const double s = 0.5 * (dqn - un * deta) * inv_c0;
  // Where the two sides see different still water depths (dd = d_R - d_L),
  // the flux jump holds, beyond the waves of the jump of eta, the change of
  // the momentum flux with the depth at fixed eta and q: sn = -u_n^2 dd
  // normal, st = -u_n u_t dd tangential (its part g eta dd is the bed-slope
  // term, which the caller adds with the mean d). That part is upwinded with
  // the signs of the waves that carry it: strengths +-sn / (2 c0) on the
  // outer waves, st on the shear wave. Without it a thin fast side running
  // onto a deeper side over a bed step gained u_n^2 dd / 2 of momentum per
  // unit length (1.3 times the energy bound on a dry 20 % plane at first
  // order). At rest, or with one d for both sides, it is zero.
  double w1 = a1 * (0.5 * deta + s);
  double w3 = a3 * (0.5 * deta - s);
  double b = a2 * (dqt - ut * deta);
  if constexpr (!kSharedD) {
    const double dd = R.d - L.d;
    const double sw = -0.5 * un * un * dd * inv_c0, st = -un * ut * dd;
    w1 += (l1 > 0 ? sw : (l1 < 0 ? -sw : 0.0));
    w3 -= (l3 > 0 ? sw : (l3 < 0 ? -sw : 0.0));
    b += (l2 > 0 ? st : (l2 < 0 ? -st : 0.0));
  }
  const double Dh = w1 + w3;
  const double Dn = (un + c0) * w1 + (un - c0) * w3;
  const double Dt = ut * (w1 + w3) + b;
  return {central.mass - 0.5 * Dh, central.mn - 0.5 * Dn, central.mt - 0.5 * Dt, central.d};
}

// Two-rarefaction estimates of the outer wave speeds (Toro). The sums are
// grouped so that swapping the sides (and the normal) negates each speed to
// the last bit: a face's flux then does not depend on which of its elements
// is numbered first.
inline void TwoRarefactionSpeeds(const SideFrame& L, const SideFrame& R, double& SL, double& SR, double& ustar) {
  ustar = 0.5 * (L.un + R.un) + (L.c - R.c);
  const double cstar = 0.25 * (L.un - R.un) + 0.5 * (L.c + R.c);
  SL = L.dry ? R.un - 2.0 * R.c : std::min(L.un - L.c, ustar - cstar);
  SR = R.dry ? L.un + 2.0 * L.c : std::max(R.un + R.c, ustar + cstar);
}

// Selects a or b as a whole; written as selects of values (no early return)
// so that a loop over many faces can evaluate every case and pick per face.
inline FrameFlux SelectFlux(bool take_a, const FrameFlux& a, const FrameFlux& b) {
  return {take_a ? a.mass : b.mass, take_a ? a.mn : b.mn, take_a ? a.mt : b.mt, take_a ? a.d : b.d};
}

// Upwind flux of the outer wave speeds SL, SR: the left flux for SL >= 0, the
// right flux for SR <= 0, else the star flux (the mean where the two speeds
// coincide and the star flux is undefined).
inline FrameFlux UpwindSelect(double SL, double SR, const FrameFlux& FL, const FrameFlux& FR,
                              const FrameFlux& star) {
  const bool degenerate = std::abs(SR - SL) <= riemann_detail::kDegenerateSpeed;
  return SelectFlux(SL >= 0, FL, SelectFlux(SR <= 0, FR, SelectFlux(degenerate, MeanFlux(FL, FR), star)));
}

inline FrameFlux HllFlux(const SideFrame& L, const SideFrame& R) {
  double SL, SR, ustar;
  TwoRarefactionSpeeds(L, R, SL, SR, ustar);
  const FrameFlux FL = PhysicalFlux(L);
  const FrameFlux FR = PhysicalFlux(R);
  return UpwindSelect(SL, SR, FL, FR, HllStar(L, R, FL, FR, SL, SR));
}

// HLLC after Toro: the HLL mass and normal momentum, the tangential momentum
// carried by the contact wave S*.
inline FrameFlux HllcFlux(const SideFrame& L, const SideFrame& R, double g) {
  const double sl = L.sqh, sr = R.sqh;
  const double uroe = sl + sr > 0 ? (sl * L.un + sr * R.un) / (sl + sr) : 0.5 * (L.un + R.un);
  const double croe = std::sqrt(0.5 * g * (L.h + R.h));
  const double SL = L.dry ? R.un - 2.0 * R.c : std::min(L.un - L.c, uroe - croe);
  const double SR = R.dry ? L.un + 2.0 * L.c : std::max(R.un + R.c, uroe + croe);
  const FrameFlux FL = PhysicalFlux(L);
  const FrameFlux FR = PhysicalFlux(R);
  FrameFlux star = HllStar(L, R, FL, FR, SL, SR);
  const double num = SL * R.h * (R.un - SR) - SR * L.h * (L.un - SL);
  const double den = R.h * (R.un - SR) - L.h * (L.un - SL);
  const double Sstar = den != 0 ? num / den : 0.5 * (SL + SR);
  star.mt = star.mass * (Sstar >= 0 ? L.ut : R.ut);
  return UpwindSelect(SL, SR, FL, FR, star);
}

// HLLC with contact speed u* of the two-rarefaction estimate and the mean of
// the two side pressures in the star region.
inline FrameFlux HllcMeanPressureFlux(const SideFrame& L, const SideFrame& R) {
  double SL, SR, Sstar;
  SideFrame l = L, r = R;
  l.dry = L.empty;
  r.dry = R.empty;
  TwoRarefactionSpeeds(l, r, SL, SR, Sstar);
  // One side without depth: its dry-front speed is the contact.
  const bool only_left = !L.empty && R.empty, only_right = L.empty && !R.empty;
  const double front_left = L.un + 2.0 * L.c, front_right = R.un - 2.0 * R.c;
  SL = only_left ? L.un - L.c : only_right ? front_right : SL;
  SR = only_left ? front_left : only_right ? R.un + R.c : SR;
  Sstar = only_left ? front_left : only_right ? front_right : Sstar;
  const double pstar = 0.5 * (L.p + R.p);
  const double dstar = 0.5 * (L.d + R.d);
  constexpr double eps = 1e-16;
  // Star state on the side of the contact.
  const bool left = Sstar >= 0;
  const double h = left ? L.h : R.h, un = left ? L.un : R.un, S = left ? SL : SR;
  const double hs = h * (S - un + eps) / (S - Sstar + eps);
  const double qs = hs * Sstar;
  const FrameFlux star{qs, qs * Sstar + pstar, qs * (left ? L.ut : R.ut), dstar};
  return SelectFlux(SL >= 0, PhysicalFlux(L), SelectFlux(SR <= 0, PhysicalFlux(R), star));
}

// Whether a solver type without a dry-front speed of its own (the central
// flux and Roe: every type but 2, 3 and 4) takes the HLL flux at dry sides
// and over thin water.
inline bool HllAtDryFronts(int solver) { return solver < 2 || solver > 4; }

// Whether such a solver takes the HLL flux at a face: a side dry for the
// HLL family, or h_L + h_R <= h_min.
inline bool FaceTakesHll(const SideFrame& L, const SideFrame& R, double h_min) {
  return L.h + R.h <= h_min || L.dry || R.dry;
}

// Back to x, y and to the length of the (possibly scaled) normal.
inline RiemannFlux FaceFluxFromFrame(const FrameFlux& f, double ex, double ey, double nn, double length) {
  const double scale = nn * length;
  RiemannFlux out;
  out.Fh = f.mass * nn;
  out.mass = f.mass * scale;
  out.momx = (f.mn * ex - f.mt * ey) * scale;
  out.momy = (f.mn * ey + f.mt * ex) * scale;
  out.d = f.d;
  return out;
}

[[gnu::always_inline]] inline RiemannFlux RiemannFaceFluxUnit(const RiemannSide& L, const RiemannSide& R,
                                                               double ex, double ey, double nn, double h_min,
                                                               int solver, int entropy_fix, double length,
                                                               double g, double sqrt_g) {
  const SideFrame fl = MakeSideFrame(L, ex, ey, g, sqrt_g);
  const SideFrame fr = MakeSideFrame(R, ex, ey, g, sqrt_g);
  FrameFlux f;
  switch (solver) {
    case 1:
      f = SelectFlux(FaceTakesHll(fl, fr, h_min), HllFlux(fl, fr), RoeFlux(fl, fr, entropy_fix, g));
      break;
    case 2: f = HllFlux(fl, fr); break;
    case 3: f = HllcFlux(fl, fr, g); break;
    case 4: f = HllcMeanPressureFlux(fl, fr); break;
    default: f = SelectFlux(FaceTakesHll(fl, fr, h_min), HllFlux(fl, fr), CentralFlux(fl, fr)); break;
  }
  return FaceFluxFromFrame(f, ex, ey, nn, length);
}

template <bool kSharedD>
[[gnu::always_inline]] inline RiemannFlux RoeOnlyFaceFluxUnit(const RiemannSide& L, const RiemannSide& R, double ex,
                                                               double ey, double nn, int entropy_fix, double length,
                                                               double g, double sqrt_g) {
  const SideFrame fl = MakeSideFrame(L, ex, ey, g, sqrt_g);
  const SideFrame fr = MakeSideFrame(R, ex, ey, g, sqrt_g);
  return FaceFluxFromFrame(RoeFlux<kSharedD>(fl, fr, entropy_fix, g), ex, ey, nn, length);
}

inline RiemannFlux RiemannFaceFlux(const RiemannSide& L, const RiemannSide& R, double nx, double ny,
                                   double h_min, int solver, int entropy_fix, double length, double g) {
  const double nn = std::sqrt(nx * nx + ny * ny);
  return RiemannFaceFluxUnit(L, R, nx / nn, ny / nn, nn, h_min, solver, entropy_fix, length, g, std::sqrt(g));
}

}  // namespace vhd
