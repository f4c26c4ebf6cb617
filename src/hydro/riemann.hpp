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
//   0 central flux, no dissipation
//   1 Roe with optional entropy fix; central flux when h_L + h_R <= h_min
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
//               returns the central flux when h_L + h_R <= h_min
//   solver      type 0..4 (above); other values give the central flux
//   entropy_fix 0 none, 1 Harten-Hyman type fix of the Roe eigenvalues
//   length      face length (m); multiplies every output except Fh
//   g           gravity (m/s2)
// Pure and re-entrant: no state, safe to call from any thread.
RiemannFlux RiemannFaceFlux(const RiemannSide& L, const RiemannSide& R, double nx, double ny,
                            double h_min, int solver, int entropy_fix, double length, double g);

// ---- the solvers, in the frame of the unit normal -----------------------------
//
// Each returns the mass flux, the normal and the tangential momentum flux per
// unit length for a unit normal, and the face d.

struct SideFrame {
  bool dry;       // dry for the HLL family: not wet or no depth
  bool empty;     // no depth (h <= 1e-10)
  bool wet;       // wet flag is 1
  double h;       // depth for wave speeds
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

// Physical flux of one side: (q_n, q_n u_n + p, q_t u_n).
inline FrameFlux PhysicalFlux(const SideFrame& s) {
  return {s.qn, s.qn * s.un + s.p, s.qt * s.un, s.d};
}

FrameFlux CentralFlux(const SideFrame& L, const SideFrame& R);
FrameFlux RoeFlux(const SideFrame& L, const SideFrame& R, int entropy_fix, double g);
FrameFlux HllFlux(const SideFrame& L, const SideFrame& R);
FrameFlux HllcFlux(const SideFrame& L, const SideFrame& R, double g);
FrameFlux HllcMeanPressureFlux(const SideFrame& L, const SideFrame& R);

}  // namespace vhd
