#include "hydro/riemann.hpp"

#include <algorithm>

namespace vhd {

namespace {

constexpr double kDryDepth = 1e-10;     // a side at most this deep is dry (HLL family)
constexpr double kDegenerateSpeed = 1e-10;

SideFrame ToFrame(const RiemannSide& s, double ex, double ey, double g) {
  SideFrame f;
  f.wet = s.wet == 1;
  f.empty = s.h <= kDryDepth;
  f.dry = !f.wet || f.empty;
  f.h = s.h;
  f.d = s.d;
  f.eta = s.hp - s.d;
  f.p = 0.5 * g * (s.hp * s.hp - s.d * s.d);
  f.qn = s.P * ex + s.Q * ey;
  f.qt = -s.P * ey + s.Q * ex;
  f.un = s.u * ex + s.v * ey;
  f.ut = -s.u * ey + s.v * ex;
  f.c = std::sqrt(g * std::max(0.0, s.h));
  return f;
}

FrameFlux Mean(const FrameFlux& a, const FrameFlux& b) {
  return {0.5 * (a.mass + b.mass), 0.5 * (a.mn + b.mn), 0.5 * (a.mt + b.mt), 0.5 * (a.d + b.d)};
}

// HLL average of the two physical fluxes for S_L < 0 < S_R (Harten, Lax, van
// Leer): [S_R F_L - S_L F_R + S_L S_R (U_R - U_L)] / (S_R - S_L), with eta as
// the mass component of U.
FrameFlux HllStar(const SideFrame& L, const SideFrame& R, const FrameFlux& FL, const FrameFlux& FR,
                  double SL, double SR) {
  const double w = 1.0 / (SR - SL);
  const double sls = SL * SR;
  return {(SR * FL.mass - SL * FR.mass + sls * (R.eta - L.eta)) * w,
          (SR * FL.mn - SL * FR.mn + sls * (R.qn - L.qn)) * w,
          (SR * FL.mt - SL * FR.mt + sls * (R.qt - L.qt)) * w,
          (SR * L.d - SL * R.d) * w};
}

}  // namespace

FrameFlux CentralFlux(const SideFrame& L, const SideFrame& R) {
  return Mean(PhysicalFlux(L), PhysicalFlux(R));
}

// Roe's linearisation with the eigen-decomposition of the shallow-water
// Jacobian: waves u_n + c, u_n (shear), u_n - c.
FrameFlux RoeFlux(const SideFrame& L, const SideFrame& R, int entropy_fix, double g) {
  const FrameFlux central = CentralFlux(L, R);
  const double c0 = std::sqrt(0.5 * g * (L.h + R.h));
  double un, ut;
  const double sl = std::sqrt(std::max(0.0, L.h));
  const double sr = std::sqrt(std::max(0.0, R.h));
  if (L.wet && R.wet && sl + sr > 0) {
    un = (sl * L.un + sr * R.un) / (sl + sr);
    ut = (sl * L.ut + sr * R.ut) / (sl + sr);
  } else {
    un = 0.5 * (L.un + R.un);
    ut = 0.5 * (L.ut + R.ut);
  }
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
  const double s = 0.5 * (dqn - un * deta) / c0;
  const double w1 = a1 * (0.5 * deta + s);
  const double w3 = a3 * (0.5 * deta - s);
  const double b = a2 * (dqt - ut * deta);
  const double Dh = w1 + w3;
  const double Dn = (un + c0) * w1 + (un - c0) * w3;
  const double Dt = ut * (w1 + w3) + b;
  return {central.mass - 0.5 * Dh, central.mn - 0.5 * Dn, central.mt - 0.5 * Dt, central.d};
}

// Two-rarefaction estimates of the outer wave speeds (Toro).
static void TwoRarefactionSpeeds(const SideFrame& L, const SideFrame& R, double& SL, double& SR,
                                 double& ustar) {
  ustar = 0.5 * (L.un + R.un) + L.c - R.c;
  const double cstar = 0.25 * (L.un - R.un) + 0.5 * (L.c + R.c);
  SL = L.dry ? R.un - 2.0 * R.c : std::min(L.un - L.c, ustar - cstar);
  SR = R.dry ? L.un + 2.0 * L.c : std::max(R.un + R.c, ustar + cstar);
}

FrameFlux HllFlux(const SideFrame& L, const SideFrame& R) {
  double SL, SR, ustar;
  TwoRarefactionSpeeds(L, R, SL, SR, ustar);
  const FrameFlux FL = PhysicalFlux(L);
  if (SL >= 0) return FL;
  const FrameFlux FR = PhysicalFlux(R);
  if (SR <= 0) return FR;
  if (std::abs(SR - SL) <= kDegenerateSpeed) return Mean(FL, FR);
  return HllStar(L, R, FL, FR, SL, SR);
}

// HLLC after Toro: the HLL mass and normal momentum, the tangential momentum
// carried by the contact wave S*.
FrameFlux HllcFlux(const SideFrame& L, const SideFrame& R, double g) {
  const double sl = std::sqrt(std::max(0.0, L.h));
  const double sr = std::sqrt(std::max(0.0, R.h));
  const double uroe = sl + sr > 0 ? (sl * L.un + sr * R.un) / (sl + sr) : 0.5 * (L.un + R.un);
  const double croe = std::sqrt(0.5 * g * (L.h + R.h));
  const double SL = L.dry ? R.un - 2.0 * R.c : std::min(L.un - L.c, uroe - croe);
  const double SR = R.dry ? L.un + 2.0 * L.c : std::max(R.un + R.c, uroe + croe);
  const FrameFlux FL = PhysicalFlux(L);
  if (SL >= 0) return FL;
  const FrameFlux FR = PhysicalFlux(R);
  if (SR <= 0) return FR;
  if (std::abs(SR - SL) <= kDegenerateSpeed) return Mean(FL, FR);
  FrameFlux F = HllStar(L, R, FL, FR, SL, SR);
  const double num = SL * R.h * (R.un - SR) - SR * L.h * (L.un - SL);
  const double den = R.h * (R.un - SR) - L.h * (L.un - SL);
  const double Sstar = den != 0 ? num / den : 0.5 * (SL + SR);
  F.mt = F.mass * (Sstar >= 0 ? L.ut : R.ut);
  return F;
}

// HLLC with contact speed u* of the two-rarefaction estimate and the mean of
// the two side pressures in the star region.
FrameFlux HllcMeanPressureFlux(const SideFrame& L, const SideFrame& R) {
  double SL, SR, Sstar;
  SideFrame l = L, r = R;
  l.dry = L.empty;
  r.dry = R.empty;
  TwoRarefactionSpeeds(l, r, SL, SR, Sstar);
  if (!L.empty && R.empty) {
    SL = L.un - L.c;
    SR = Sstar = L.un + 2.0 * L.c;
  } else if (L.empty && !R.empty) {
    SL = Sstar = R.un - 2.0 * R.c;
    SR = R.un + R.c;
  }
  if (SL >= 0) return PhysicalFlux(L);
  if (SR <= 0) return PhysicalFlux(R);
  const double pstar = 0.5 * (L.p + R.p);
  const double dstar = 0.5 * (L.d + R.d);
  constexpr double eps = 1e-16;
  if (Sstar >= 0) {
    const double hs = L.h * (SL - L.un + eps) / (SL - Sstar + eps);
    const double qs = hs * Sstar;
    return {qs, qs * Sstar + pstar, qs * L.ut, dstar};
  }
  const double hs = R.h * (SR - R.un + eps) / (SR - Sstar + eps);
  const double qs = hs * Sstar;
  return {qs, qs * Sstar + pstar, qs * R.ut, dstar};
}

RiemannFlux RiemannFaceFlux(const RiemannSide& L, const RiemannSide& R, double nx, double ny,
                            double h_min, int solver, int entropy_fix, double length, double g) {
  const double nn = std::sqrt(nx * nx + ny * ny);
  const double ex = nx / nn, ey = ny / nn;
  const SideFrame fl = ToFrame(L, ex, ey, g);
  const SideFrame fr = ToFrame(R, ex, ey, g);
  FrameFlux f;
  switch (solver) {
    case 1:
      f = L.h + R.h <= h_min ? CentralFlux(fl, fr) : RoeFlux(fl, fr, entropy_fix, g);
      break;
    case 2: f = HllFlux(fl, fr); break;
    case 3: f = HllcFlux(fl, fr, g); break;
    case 4: f = HllcMeanPressureFlux(fl, fr); break;
    default: f = CentralFlux(fl, fr); break;
  }
  // Back to x, y and to the length of the (possibly scaled) normal.
  const double mx = f.mn * ex - f.mt * ey;
  const double my = f.mn * ey + f.mt * ex;
  RiemannFlux out;
  out.Fh = f.mass * nn;
  out.mass = out.Fh * length;
  out.momx = mx * nn * length;
  out.momy = my * nn * length;
  out.d = f.d;
  return out;
}

}  // namespace vhd
