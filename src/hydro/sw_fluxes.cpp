#include "hydro/sw_fluxes.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <string>
#include <type_traits>
#include <vector>

#include "core/omp.hpp"
#include "hydro/reconstruction.hpp"
#include "log/log.hpp"

namespace vhd {

namespace {

// Settings and pointers read by the face loop, gathered once per stage.
struct FaceLoopInput {
  const int* e1;
  const int* e2;
  // Unit normal, its length and the face length per interior face, by the
  // face's position in interior_faces; the mesh's face lengths.
  const double *ex, *ey, *nn, *len;
  const double* face_length;
  const double *eta, *d, *h, *P, *Q;
  const int* code;
  const double* k;  // depth correction per element; null when none is active
  const double* face_d;
  bool second;
  const double *xf, *yf, *xc, *yc;  // face centres and centroids
  const int *face_start, *face_list;  // faces of each element
  const double *eta_x, *eta_y, *P_x, *P_y, *Q_x, *Q_y;
  bool eddy;
  const double *nu, *ux, *uy, *vx, *vy;
  double h_min, g, sqrt_g;
  // A wet side passes its velocity from this depth on: 0 (thin water keeps
  // its velocity) except with the type-4 solver, where it is h_min.
  double h_move;
  int solver, entropy_fix, fad, land_condition, face_value_limiter;
  bool preserve_dU, face_limit_dry;

  // Depth correction of element e (0 when none is active).
  double K(int e) const { return k ? k[e] : 0.0; }
};

inline double Clip(double value, double a, double b) {
  return std::min(std::max(value, std::min(a, b)), std::max(a, b));
}

// Face values of one side.
struct SideValues {
  double eta, P, Q;  // reconstructed (or centre) values
  double d, h;       // still water depth and depth passed to the flux
};

// Face d and face depth of a side from the face still water depth d_f: the
// depth is max(0, eta + d_f), and where the surface lies below the face bed
// the side's d is raised to -eta with it, so that the pre-balanced pressure
// g/2 (h^2 - d^2) stays zero for a surface at rest at datum.
inline void FaceDepth(SideValues& side, double df) {
  side.d = std::max(df, -side.eta);
  side.h = side.eta + side.d;
}

// A side that keeps its velocity but takes its depth at the face from d_f
// (FaceDepth), its momentum following that depth. Used where the face values
// are not all reconstructed:
//  - the deeper side of a face that fell back to first order next to a
//    nearly dry side (the nearly dry side keeps its centre values, d and h;
//    the deeper side's gradients are formed across the shore, where the eta
//    of dry elements is their bed, so it keeps its centre eta). With its
//    centre depth, the deeper side of a shore face on a beach would see the
//    water deeper than it is there, push it onto the beach and damp a run-up
//    and run-down;
//  - a wet side at a second-order land face, whose eta is reconstructed.
// Pressure and bed slope use the d that each side passes, so water at rest
// stays at rest.
inline void VelocityAtFaceDepth(SideValues& side, double df) {
  const double hc = side.h;
  FaceDepth(side, df);
  const double ratio = hc > 0 ? side.h / hc : 0.0;
  side.P *= ratio;
  side.Q *= ratio;
}

// Pressure depth at a wall: the depth at a reflecting wall (land condition
// 2), else the face depth itself; plus the depth correction k, as on every
// other face (without it a lake at rest with k > 0 would be pushed off the
// walls). Water leaving the wall (u_n <= 0) draws down through a rarefaction:
// the depth from the outgoing Riemann invariant u_n + 2 sqrt(g h). Water
// running into the wall is stopped by a shock: the two-shock depth
// h + u_n / g_K, g_K = sqrt(g/2 (h0 + h) / (h0 h)), with h0 the invariant's
// depth. (The invariant alone overstates it at high Froude numbers: 59 m
// against 12.3 m for 0.35 m at 45 m/s, which threw the water back faster
// than it came.)
double WallDepth(int land_condition, double un, double h, double k, double g) {
  if (land_condition == 2 && h > 0) {
    // (max(0, u_n + 2c))^2 / (4 g) written as h (1 + u_n / 2c)^2, which is h
    // itself to the last bit for water at rest.
    const double r = std::max(0.0, 1.0 + un / (2.0 * std::sqrt(g * h)));
    const double h0 = h * r * r;
    if (un <= 0) return h0 + k;
    return h + un / std::sqrt(0.5 * g * (h0 + h) / (h0 * h)) + k;
  }
  return h + k;
}

// Diffusive momentum flux of the eddy viscosity through a face of normal n,
// times the face length.
void EddyFlux(double nu, double hf, double ux, double uy, double vx, double vy, double nx, double ny,
              double len, double& Dx, double& Dy) {
  const double shear = uy + vx;
  Dx = hf * nu * (2.0 * ux * nx + shear * ny) * len;
  Dy = hf * nu * (shear * nx + 2.0 * vy * ny) * len;
}

// Momentum terms of wet element e against a wall (a land face, or a dry
// neighbour) from its face values side: no mass flux, the pressure of the
// wall depth and the bed-slope term, both with the side's face d (at rest
// the wall depth is the side's face depth, and the two cancel at any level),
// less the eddy stress of the element's own values. (ox, oy) is the unit
// normal out of the element, nn the length of the mesh normal and nlen that
// length times the face length.
inline void WallTerms(const FaceLoopInput& in, int e, const SideValues& side, double ox, double oy, double nn,
                      double nlen, double& mx, double& my) {
  const double g = in.g, hs = side.h, k = in.K(e);
  const double un = (hs >= in.h_min && hs > 0) ? (side.P * ox + side.Q * oy) * nn / hs : 0.0;
  const double hw = WallDepth(in.land_condition, un, hs, k, g);
  const double pw = 0.5 * g * (hw * hw - side.d * side.d) * nlen;
  const double b = g * (in.eta[e] + k) * side.d * nlen;
  double Dx = 0.0, Dy = 0.0;
  if (in.eddy) EddyFlux(in.nu[e], hs, in.ux[e], in.uy[e], in.vx[e], in.vy[e], ox, oy, nlen, Dx, Dy);
  mx = -(pw * ox - Dx) + b * ox;
  my = -(pw * oy - Dy) + b * oy;
}

// The side with which wet element e meets a dry neighbour as a wall: its face
// values, or its centre values where the face values are deeper. A dry
// neighbour lower than the element puts the face bed (the mean of the two
// beds) below the element's own, and the face depth over it exceeds the
// water the element holds: a film of 0.3 mm took 5 mm there, with it its
// velocity into the wall, and the two-shock wall depth of that (0.17 m)
// threw it back and forth at up to 8 g (Thacker bowl, 0.04 m elements).
inline SideValues WallSide(const FaceLoopInput& in, int e, const SideValues& face) {
  if (face.h <= in.h[e]) return face;
  return {in.eta[e], in.P[e], in.Q[e], in.d[e], in.h[e]};
}

// Terms of a land boundary face of wet element e (its element1).
void LandFaceTerms(const FaceLoopInput& in, HdSolver& s, const BoundaryFaceRecord& rec) {
  const int f = rec.face, e = rec.element;
  SideValues side{in.eta[e], in.P[e], in.Q[e], in.d[e], in.h[e]};
  if (in.second && !(in.face_limit_dry && 0.05 * (in.h_min + 2.0 * side.h) > side.h)) {
    // The wall sees the surface at the face, as the interior faces of the
    // element do: with the centre surface, a surface sloping along the wall
    // would press on the wall with the depth of the centre, and flow along a
    // wall would be pushed across. The gradient limiter does not look at
    // boundary faces, so the face surface is clipped to the range of the
    // element and its wet neighbours. The water at the wall moves with the
    // element's velocity (P and eta reconstructed apart could give a thin
    // face any speed).
    double lo = side.eta, hi = side.eta;
    for (int k = in.face_start[e]; k < in.face_start[e + 1]; ++k) {
      const int g = in.face_list[k];
      const int nb = g == 0 ? 0 : (in.e1[g] == e ? in.e2[g] : in.e1[g]);
      if (nb <= 0 || in.code[nb] != kWet) continue;
      lo = std::min(lo, in.eta[nb]);
      hi = std::max(hi, in.eta[nb]);
    }
    const double ax = in.xf[f] - in.xc[e], ay = in.yf[f] - in.yc[e];
    side.eta = std::clamp(side.eta + in.eta_x[e] * ax + in.eta_y[e] * ay, lo, hi);
    VelocityAtFaceDepth(side, in.fad != 0 ? in.face_d[f] : in.d[e]);
  } else if (in.fad != 0) {
    FaceDepth(side, in.face_d[f]);
  }
  double mx, my;
  WallTerms(in, e, side, rec.ex, rec.ey, rec.nn, rec.nn * in.face_length[f], mx, my);
  SetBoundaryFaceTerms(s, f, mx, my);
}

// Velocity (m/s) with which water leaving element e carries momentum: its
// centre velocity when it is wet and at least h_move deep, else 0 (flooded
// elements count as at rest, as in the fluxes).
// (Selects, so that the batched face loop runs it in vector lanes.)
inline void CarriedVelocity(bool wet, double h, double P, double Q, double h_move, double& u, double& v) {
  const bool moves = wet && h >= h_move && h > 0;
  const double inv = 1.0 / h;
  u = moves ? P * inv : 0.0;
  v = moves ? Q * inv : 0.0;
}

inline void CarriedVelocity(const int* code, const double* h, const double* P, const double* Q, double h_move,
                            int e, double& u, double& v) {
  CarriedVelocity(code[e] == kWet, h[e], P[e], Q[e], h_move, u, v);
}

// Bound of each velocity component at a face: the larger magnitude of that
// component of the velocities carried by its two sides.
inline void FaceVelocityBound(double uL, double vL, double uR, double vR, double& umax, double& vmax) {
  umax = std::max(std::abs(uL), std::abs(uR));
  vmax = std::max(std::abs(vL), std::abs(vR));
}

// Bounds the face velocity of a side componentwise by umax, vmax; the
// fluxes follow the velocity. (Selects, so that the batched face loop runs it
// in vector lanes.)
inline void BoundVelocity(RiemannSide& side, double umax, double vmax) {
  const bool cut_u = std::abs(side.u) > umax, cut_v = std::abs(side.v) > vmax;
  side.u = cut_u ? std::copysign(umax, side.u) : side.u;
  side.P = cut_u ? side.u * side.h : side.P;
  side.v = cut_v ? std::copysign(vmax, side.v) : side.v;
  side.Q = cut_v ? side.v * side.h : side.Q;
}

// A side of the flux on the bed at still water depth top: its surface eta
// (clipped to that bed) over it, its velocity kept and its fluxes following
// the new depth; k is its depth correction.
inline void ReconstructOnBed(RiemannSide& side, double eta, double top, double k) {
  side.d = top;
  side.h = std::max(0.0, eta + top);
  side.hp = side.h + k;
  side.P = side.u * side.h;
  side.Q = side.v * side.h;
}

// Momentum terms (mx, my) of a wet side of a face whose flux is limited by
// the factor theta < 1 (outflow limiter). Only their part beyond the
// hydrostatic one is scaled: at rest the terms of a side are
// -g/2 X^2 o |n| len (X = eta + k at the centre, o the unit normal out of
// the side; static_term = -g/2 X^2 |n| len), which sums to zero over the
// element, while the pressure in the flux, g/2 (h^2 - d^2), carries g X d
// against the bed-slope term: scaled alone, far below datum it pushed thin
// water by g X d (1 - theta). The eddy stress (ox, oy) D is not scaled.
inline void LimitSideTerms(double theta, double static_term, double ox, double oy, double Dx, double Dy, double& mx,
                           double& my) {
  const double sx = static_term * ox + Dx, sy = static_term * oy + Dy;
  mx = sx + theta * (mx - sx);
  my = sy + theta * (my - sy);
}

void ZeroFace(HdSolver& s, int f) { SetFaceTerms(s, f, 0.0, 0.0, 0.0, 0.0); }

// Depth below which a side makes a second-order face fall back to first
// order (with face_limit_dry), from the centre depths of its sides.
inline double FallBackDepth(const FaceLoopInput& in, double hL, double hR) { return 0.05 * (in.h_min + hL + hR); }

// Whether the centre velocities of the sides L, R of interior face i (unit
// normal from L to R) run together faster than twice the celerity of the
// thinner side: a bore or hydraulic jump stands at the face. Reconstructed
// there, the thin side took the surface of the deep side at the face (the
// clip allows anything between the two centres) with its own P: its water
// left as a deep, slow face state, carrying its mass without its momentum,
// and the thin element sped up as it drained. Jets running into the pond
// at the foot of a 20 % slope reached 1.3 times the energy bound
// 2 sqrt(g h0) + sqrt(2 g dz) that way, with every solver.
// (Written without divisions: closing speed times hL hR.)
inline bool BoreAtFace(const FaceLoopInput& in, int i, int L, int R) {
  const double hL = in.h[L], hR = in.h[R];
  const double ex = in.ex[i], ey = in.ey[i];
  const double closing = (in.P[L] * ex + in.Q[L] * ey) * hR - (in.P[R] * ex + in.Q[R] * ey) * hL;
  const double hh = hL * hR;
  return hh > 0 && closing > 0 && closing * closing > 4.0 * in.g * std::min(hL, hR) * hh * hh;
}

// Whether second-order face i between L and R falls back to first order:
// next to a nearly dry side (centre depth below FallBackDepth), or at a bore
// (BoreAtFace).
inline bool FallsBackToFirstOrder(const FaceLoopInput& in, int i, int L, int R) {
  if (!in.face_limit_dry) return false;
  const double hL = in.h[L], hR = in.h[R];
  const double limit = FallBackDepth(in, hL, hR);
  return limit > hL || limit > hR || BoreAtFace(in, i, L, R);
}

// Whether the reconstruction leaves a side of a second-order face (face
// depths hl, hr) without depth there: below the fall-back depth limit of its
// centre depths. The face then falls back to first order too. A film on a
// slope has its surface reconstructed along the bed; where that surface
// meets the face bed (the mean of two beds, below the film's own), the face
// depth is zero while the film's centre surface stands above the face bed by
// the bed step, and the pressure against the bed-slope term pushed the film
// with g/2 (eta_f - eta)^2 instead of g h (eta_f - eta): films of 0.2 mm in
// the Thacker bowl were driven at 3 g towards 60 m/s.
inline bool DrainedAtFace(const FaceLoopInput& in, double limit, double hl, double hr) {
  return in.face_limit_dry && (limit > hl || limit > hr);
}

// Depth by which the surface of a side (face depth h over face d) lies below
// the bed at still water depth d_top: 0 when it lies at or above it.
inline double SurfaceBelowBed(double h, double d, double d_top) { return std::max(0.0, (d - d_top) - h); }

// Whether both sides are deep enough at the face for the batched flux, and
// each side's surface lies at or above the higher of the two beds seen at the
// face (else the face takes the hydrostatic reconstruction of
// InteriorFaceTerms). With the central and Roe solvers the faces over thin
// water (h_L + h_R <= h_min), where they take the HLL flux, go to
// InteriorFaceTerms too, so that the batch forms their own flux alone.
inline bool PlainFaceDepths(const FaceLoopInput& in, double hl, double dl, double hr, double dr) {
  const double top = std::min(dl, dr);
  return hl >= in.h_move && hr >= in.h_move && hl > riemann_detail::kDryDepth && hr > riemann_detail::kDryDepth &&
         SurfaceBelowBed(hl, dl, top) == 0.0 && SurfaceBelowBed(hr, dr, top) == 0.0 &&
         (!HllAtDryFronts(in.solver) || hl + hr > in.h_min);
}

// Face values a, c of one field on the two sides of a face from the centre
// values ca, cb and the reconstructed increments da, dc: clipped to the
// range of the centre values (clip), and both set to their mean where their
// jump has the opposite sign to the jump of the centre values (keep_sign).
inline void FieldFaceValues(double ca, double cb, double da, double dc, bool clip, bool keep_sign, double& a,
                            double& c) {
  a = ca + da;
  c = cb + dc;
  if (clip) a = Clip(a, ca, cb), c = Clip(c, ca, cb);
  const bool opposite = keep_sign && (c - a) * (cb - ca) < 0;
  const double mean = 0.5 * (a + c);
  a = opposite ? mean : a;
  c = opposite ? mean : c;
}

// Face values of the two sides of interior face f (l, r hold the centre
// values on entry): with second order the reconstructed values, clipped and
// sign-kept as the settings ask; then the face d and face depth of each side.
// Returns true when a second-order face fell back to first order
// (FallsBackToFirstOrder, or a side drained at the face by the reconstruction:
// DrainedAtFace), always true with first order.
template <bool kSecond>
[[gnu::always_inline]] inline bool FaceSideValues(const FaceLoopInput& in, int f, int i, int L, int R, SideValues& l,
                                                  SideValues& r) {
  const double etaL = l.eta, etaR = r.eta;  // centre values
  const double hL = l.h, hR = r.h;
  bool first = !kSecond;
  if constexpr (kSecond) {
    first = FallsBackToFirstOrder(in, i, L, R);
    const double limit = FallBackDepth(in, hL, hR);
    if (!first) {
      const double xf = in.xf[f], yf = in.yf[f];
      const double ax = xf - in.xc[L], ay = yf - in.yc[L], bx = xf - in.xc[R], by = yf - in.yc[R];
      const bool clip = in.face_value_limiter > 0, keep = in.preserve_dU;
      SideValues a = l, b = r;
      FieldFaceValues(etaL, etaR, in.eta_x[L] * ax + in.eta_y[L] * ay, in.eta_x[R] * bx + in.eta_y[R] * by, clip,
                      keep, a.eta, b.eta);
      FieldFaceValues(l.P, r.P, in.P_x[L] * ax + in.P_y[L] * ay, in.P_x[R] * bx + in.P_y[R] * by, clip, keep, a.P,
                      b.P);
      FieldFaceValues(l.Q, r.Q, in.Q_x[L] * ax + in.Q_y[L] * ay, in.Q_x[R] * bx + in.Q_y[R] * by, clip, keep, a.Q,
                      b.Q);
      if (in.fad != 0) {
        FaceDepth(a, in.face_d[f]);
        FaceDepth(b, in.face_d[f]);
      }
      if (!DrainedAtFace(in, limit, a.h, b.h)) {
        l = a, r = b;
        return false;
      }
      first = true;
    }
    if (in.fad != 0 && (limit > hL) != (limit > hR)) VelocityAtFaceDepth(limit > hL ? r : l, in.face_d[f]);
  }
  // Face d and face depths from d_f, except with face_average_d 0 and at the
  // faces of a second-order run that fell back to first order, where each
  // side keeps its centre d and h. The type-4 solver keeps d_f at those faces
  // too: its contact speed u* = (u_L + u_R)/2 + c_L - c_R would move water at
  // rest whose two sides see different depths.
  if (in.fad != 0 && (!kSecond || in.solver == 4)) {
    const double df = in.face_d[f];
    FaceDepth(l, df);
    FaceDepth(r, df);
  }
  return first;
}

// Terms of interior face f (position i in interior_faces) from the face
// values l, r of its sides: the flux of the Riemann solver, or the land
// treatment of the wet side against a dry one, and the signed contributions
// of each side (scaled by theta, the outflow factor of the upwind element).
template <bool kSecond>
void InteriorFaceTerms(const FaceLoopInput& in, HdSolver& s, double* face_flux_len, int f,
                       int i, const SideValues& l, const SideValues& r, bool first, double theta) {
  const int L = in.e1[f], R = in.e2[f];
  const int cL = in.code[L], cR = in.code[R];
  const double etaL = in.eta[L], etaR = in.eta[R];  // centre values
  const double hL = in.h[L], hR = in.h[R];
  const double ex = in.ex[i], ey = in.ey[i], nn = in.nn[i];
  const double nlen = nn * in.len[i];  // length of the normal times the face length

  const bool riemann = RiemannFaceCase(cL, cR, etaL, in.d[L], etaR, in.d[R], kSecond);
  const double kL = in.K(L), kR = in.K(R);
  const double g = in.g;
  double Dx = 0.0, Dy = 0.0;

  if (riemann) {
    // A side moves water only where it has a velocity: a side that is not
    // wet passes P = Q = 0 with u = v = 0 (its momentum, e.g. what a flooded
    // element gathers, would otherwise push water out of it that carries no
    // momentum). A wet side passes its velocity down to h_move: thin water
    // that moves with the body next to it must keep moving, or a receding
    // film stays behind. The type-4 solver keeps thin sides at rest: its star
    // depths from the two-rarefaction contact speed pile water up between
    // thin sides that move apart.
    RiemannSide sl, sr;
    sl.wet = cL == kWet ? 1 : 0;
    sl.h = l.h, sl.d = l.d, sl.hp = l.h + kL;
    if (cL == kWet && l.h >= in.h_move && l.h > 0) {
      const double inv = 1.0 / l.h;
      sl.P = l.P, sl.Q = l.Q;
      sl.u = l.P * inv, sl.v = l.Q * inv;
    }
    sr.wet = cR == kWet ? 1 : 0;
    sr.h = r.h, sr.d = r.d, sr.hp = r.h + kR;
    if (cR == kWet && r.h >= in.h_move && r.h > 0) {
      const double inv = 1.0 / r.h;
      sr.P = r.P, sr.Q = r.Q;
      sr.u = r.P * inv, sr.v = r.Q * inv;
    }
    // Hydrostatic reconstruction where the surface of a side lies below the
    // bed of the other (a film below the face bed of its upper neighbour,
    // or sides that keep their centre d): both sides see the higher bed
    // (d_top, the smaller d), each with its depth above it and its own
    // velocity. A side whose surface lies a below that bed gets the wall
    // pressure g/2 a^2 back (term below), so water at rest stays at rest.
    // With two different d the flux would otherwise weigh one side's d
    // against the other's surface: near a film g/2 a^2 pushed it uphill and
    // the surface jump a across the step moved water.
    const double top = std::min(l.d, r.d);
    const double aL = SurfaceBelowBed(l.h, l.d, top), aR = SurfaceBelowBed(r.h, r.d, top);
    if (aL > 0 || aR > 0) {
      ReconstructOnBed(sl, l.h - l.d, top, kL);
      ReconstructOnBed(sr, r.h - r.d, top, kR);
    }
    if constexpr (kSecond) {
      // P and eta are reconstructed apart, so where the face depth is small
      // P / h can be far larger than any velocity of the two elements. Each
      // velocity component at the face is bounded by the larger magnitude of
      // that component at the two centres (P follows), which leaves smooth
      // flow alone and keeps thin water from being flung out.
      if (!first) {
        double uL, vL, uR, vR, umax, vmax;
        CarriedVelocity(in.code, in.h, in.P, in.Q, in.h_move, L, uL, vL);
        CarriedVelocity(in.code, in.h, in.P, in.Q, in.h_move, R, uR, vR);
        FaceVelocityBound(uL, vL, uR, vR, umax, vmax);
        BoundVelocity(sl, umax, vmax);
        BoundVelocity(sr, umax, vmax);
      }
    }
    RiemannFlux F =
        RiemannFaceFluxUnit(sl, sr, ex, ey, nn, in.h_min, in.solver, in.entropy_fix, in.len[i], g, in.sqrt_g);
    if (theta < 1.0) F.Fh *= theta, F.mass *= theta;
    if (in.eddy) {
      EddyFlux(0.5 * (in.nu[L] + in.nu[R]), 0.5 * (hL + hR), 0.5 * (in.ux[L] + in.ux[R]),
               0.5 * (in.uy[L] + in.uy[R]), 0.5 * (in.vx[L] + in.vx[R]), 0.5 * (in.vy[L] + in.vy[R]), ex, ey,
               nlen, Dx, Dy);
    }
    const double fx = F.momx - Dx, fy = F.momy - Dy;
    face_flux_len[f] = F.mass;
    // Bed-slope terms g X d |n| len of the wet sides (X = eta + k at the
    // centre) with the face d that the flux's pressure saw, so that pressure
    // and bed slope cancel for water at rest at any level. A flooded side
    // (mass only) receives the momentum that the water flowing in from the
    // wet side carries, which that side loses with its momentum flux.
    const double bd = g * F.d * nlen;
    double mx1 = 0.0, my1 = 0.0, mx2 = 0.0, my2 = 0.0;
    if (cL == kWet) {
      const double bL = (etaL + kL) * bd - 0.5 * g * aL * aL * nlen;
      mx1 = -fx + bL * ex;
      my1 = -fy + bL * ey;
      if (theta < 1.0) LimitSideTerms(theta, -0.5 * g * (etaL + kL) * (etaL + kL) * nlen, ex, ey, Dx, Dy, mx1, my1);
    } else if (F.mass < 0) {
      double u, v;
      CarriedVelocity(in.code, in.h, in.P, in.Q, in.h_move, R, u, v);
      mx1 = -F.mass * u;
      my1 = -F.mass * v;
    }
    if (cR == kWet) {
      const double bR = (etaR + kR) * bd - 0.5 * g * aR * aR * nlen;
      mx2 = fx - bR * ex;
      my2 = fy - bR * ey;
      if (theta < 1.0) LimitSideTerms(theta, -0.5 * g * (etaR + kR) * (etaR + kR) * nlen, -ex, -ey, -Dx, -Dy, mx2, my2);
    } else if (F.mass > 0) {
      double u, v;
      CarriedVelocity(in.code, in.h, in.P, in.Q, in.h_move, L, u, v);
      mx2 = F.mass * u;
      my2 = F.mass * v;
    }
    SetFaceTerms(s, f, mx1, my1, mx2, my2);
    return;
  }

  // Land treatment of the wet side, with at most its centre depth.
  face_flux_len[f] = 0.0;
  double mx, my;
  if (cL == kWet) {
    WallTerms(in, L, WallSide(in, L, l), ex, ey, nn, nlen, mx, my);
    SetFaceTerms(s, f, mx, my, 0.0, 0.0);
  } else {
    WallTerms(in, R, WallSide(in, R, r), -ex, -ey, nn, nlen, mx, my);
    SetFaceTerms(s, f, 0.0, 0.0, mx, my);
  }
}

// Face values l, r of interior face f and whether it fell back to first
// order (FaceSideValues); false for a face without a wet side, whose terms
// are set to zero before any arithmetic.
template <bool kSecond>
[[gnu::always_inline]] inline bool WetFaceValues(const FaceLoopInput& in, HdSolver& s, double* face_flux_len, int f, int i,
                          SideValues& l, SideValues& r, bool& first) {
  const int L = in.e1[f], R = in.e2[f];
  if (in.code[L] != kWet && in.code[R] != kWet) {  // dry-dry (or flooded) faces carry nothing
    ZeroFace(s, f);
    face_flux_len[f] = 0.0;
    return false;
  }
  l = {in.eta[L], in.P[L], in.Q[L], in.d[L], in.h[L]};
  r = {in.eta[R], in.P[R], in.Q[R], in.d[R], in.h[R]};
  first = FaceSideValues<kSecond>(in, f, i, L, R, l, r);
  return true;
}

// One interior face (position i in interior_faces), every case:
// classification, face values, flux and the signed contributions of each side.
template <bool kSecond>
inline void InteriorFace(const FaceLoopInput& in, HdSolver& s, double* face_flux_len, int i,
                         double theta = 1.0) {
  const int f = s.interior_faces[i];
  SideValues l, r;
  bool first;
  if (!WetFaceValues<kSecond>(in, s, face_flux_len, f, i, l, r, first)) return;
  InteriorFaceTerms<kSecond>(in, s, face_flux_len, f, i, l, r, first, theta);
}

// Interior faces whose two sides are wet and at least h_move deep at the face
// ("plain wet faces", most faces of a run) are gathered side by side in
// batches and their fluxes evaluated in vector lanes; they take exactly the
// path of InteriorFaceTerms for such faces, so the results do not depend on
// the batching. Every other face takes InteriorFaceTerms directly.
constexpr int kFaceBatch = 64;

struct WetFaceBatch {
  int n = 0;
  int face[kFaceBatch];      // mesh face
  int position[kFaceBatch];  // position in interior_faces
  // Face values per side (l, r): depth, face d, P, Q, depth correction (zero
  // without one) and the centre eta of the bed-slope term; the eddy flux
  // (zero without eddy viscosity).
  double hl[kFaceBatch], hr[kFaceBatch], dl[kFaceBatch], dr[kFaceBatch];
  double Pl[kFaceBatch], Pr[kFaceBatch], Ql[kFaceBatch], Qr[kFaceBatch];
  double kl[kFaceBatch] = {}, kr[kFaceBatch] = {}, etal[kFaceBatch], etar[kFaceBatch];
  double Dx[kFaceBatch] = {}, Dy[kFaceBatch] = {};
  // The face geometry, gathered only when the batch holds part of its chunk
  // (a batch of the whole chunk reads the solver's arrays in place).
  double ex[kFaceBatch], ey[kFaceBatch], nn[kFaceBatch], len[kFaceBatch];
  // Second order: the velocity bound of the face from the centre velocities
  // of its sides.
  double umax[kFaceBatch], vmax[kFaceBatch];
  // Results: mass flux times the face length, momentum terms of each side.
  double mass[kFaceBatch];
  double mx1[kFaceBatch], my1[kFaceBatch], mx2[kFaceBatch], my2[kFaceBatch];
};

// Eddy flux of entry i of the batch, interior face at position p between L and R.
inline void BatchEddyFlux(const FaceLoopInput& in, WetFaceBatch& b, int i, int p, int L, int R) {
  EddyFlux(0.5 * (in.nu[L] + in.nu[R]), 0.5 * (in.h[L] + in.h[R]), 0.5 * (in.ux[L] + in.ux[R]),
           0.5 * (in.uy[L] + in.uy[R]), 0.5 * (in.vx[L] + in.vx[R]), 0.5 * (in.vy[L] + in.vy[R]), in.ex[p], in.ey[p],
           in.nn[p] * in.len[p], b.Dx[i], b.Dy[i]);
}

// Adds face f (position in interior_faces) between L and R to the batch:
// returns its entry, whose face values the caller sets.
inline int AddBatchFace(const FaceLoopInput& in, WetFaceBatch& b, int f, int position, int L, int R) {
  const int i = b.n++;
  b.face[i] = f;
  b.position[i] = position;
  if (in.k) b.kl[i] = in.k[L], b.kr[i] = in.k[R];
  b.etal[i] = in.eta[L], b.etar[i] = in.eta[R];
  if (in.eddy) BatchEddyFlux(in, b, i, position, L, R);
  return i;
}

// Adds a plain wet face of a first-order run with its face values.
inline void AddWetFace(const FaceLoopInput& in, WetFaceBatch& b, int f, int position, int L, int R,
                       const SideValues& l, const SideValues& r) {
  const int i = AddBatchFace(in, b, f, position, L, R);
  b.hl[i] = l.h, b.hr[i] = r.h, b.dl[i] = l.d, b.dr[i] = r.d;
  b.Pl[i] = l.P, b.Pr[i] = r.P, b.Ql[i] = l.Q, b.Qr[i] = r.Q;
}

// Moves entry k of the batch to entry w.
inline void MoveBatchEntry(WetFaceBatch& b, int k, int w) {
  b.face[w] = b.face[k], b.position[w] = b.position[k];
  b.hl[w] = b.hl[k], b.hr[w] = b.hr[k], b.dl[w] = b.dl[k], b.dr[w] = b.dr[k];
  b.Pl[w] = b.Pl[k], b.Pr[w] = b.Pr[k], b.Ql[w] = b.Ql[k], b.Qr[w] = b.Qr[k];
  b.kl[w] = b.kl[k], b.kr[w] = b.kr[k], b.etal[w] = b.etal[k], b.etar[w] = b.etar[k];
  b.Dx[w] = b.Dx[k], b.Dy[w] = b.Dy[k], b.umax[w] = b.umax[k], b.vmax[w] = b.vmax[k];
}

// Fluxes and side contributions of the plain wet faces of a batch, the
// solver type fixed at compile time. (A function of its own: inlined into the
// chunk loop, the compiler no longer turns this loop into vector code.)
template <int kSolver, bool kSecond, bool kSharedD>
[[gnu::noinline]] void WetFaceKernel(const FaceLoopInput& in, WetFaceBatch& b, const double* __restrict gex,
                                     const double* __restrict gey, const double* __restrict gnn,
                                     const double* __restrict glen) {
  const int n = b.n;
  const double h_min = in.h_min, g = in.g, sqrt_g = in.sqrt_g;
  const int entropy_fix = in.entropy_fix;
  VHD_OMP_SIMD
  for (int i = 0; i < n; ++i) {
    RiemannSide sl, sr;
    sl.h = b.hl[i], sl.d = b.dl[i], sl.hp = b.hl[i] + b.kl[i];
    sl.P = b.Pl[i], sl.Q = b.Ql[i];
    const double invl = 1.0 / b.hl[i];
    sl.u = b.Pl[i] * invl, sl.v = b.Ql[i] * invl;
    sr.h = b.hr[i], sr.d = b.dr[i], sr.hp = b.hr[i] + b.kr[i];
    sr.P = b.Pr[i], sr.Q = b.Qr[i];
    const double invr = 1.0 / b.hr[i];
    sr.u = b.Pr[i] * invr, sr.v = b.Qr[i] * invr;
    if constexpr (kSecond) {
      BoundVelocity(sl, b.umax[i], b.vmax[i]);
      BoundVelocity(sr, b.umax[i], b.vmax[i]);
    }
    const double ex = gex[i], ey = gey[i], nn = gnn[i];
    RiemannFlux F;
    if constexpr (kSolver == 1) {
      F = RoeOnlyFaceFluxUnit<kSharedD>(sl, sr, ex, ey, nn, entropy_fix, glen[i], g, sqrt_g);
    } else {
      F = RiemannFaceFluxUnit(sl, sr, ex, ey, nn, h_min, kSolver, entropy_fix, glen[i], g, sqrt_g);
    }
    const double fx = F.momx - b.Dx[i], fy = F.momy - b.Dy[i];
    const double bd = g * F.d * (nn * glen[i]);
    const double bL = (b.etal[i] + b.kl[i]) * bd, bR = (b.etar[i] + b.kr[i]) * bd;
    b.mass[i] = F.mass;
    b.mx1[i] = -fx + bL * ex;
    b.my1[i] = -fy + bL * ey;
    b.mx2[i] = fx - bR * ex;
    b.my2[i] = fy - bR * ey;
  }
}

// The batch of the chunk of interior faces first .. last.
template <bool kSecond>
void WetFaceFluxes(const FaceLoopInput& in, WetFaceBatch& b, int first, int last) {
  const double *ex = in.ex + first, *ey = in.ey + first, *nn = in.nn + first, *len = in.len + first;
  if (b.n < last - first + 1) {  // part of the chunk: its geometry side by side
    for (int i = 0; i < b.n; ++i) {
      const int p = b.position[i];
      b.ex[i] = in.ex[p], b.ey[i] = in.ey[p], b.nn[i] = in.nn[p], b.len[i] = in.len[p];
    }
    ex = b.ex, ey = b.ey, nn = b.nn, len = b.len;
  }
  switch (in.solver) {
    case 1:
      // The batched faces of a second-order run with face d see one d on
      // both sides.
      if (kSecond && in.fad != 0) {
        WetFaceKernel<1, kSecond, true>(in, b, ex, ey, nn, len);
      } else {
        WetFaceKernel<1, kSecond, false>(in, b, ex, ey, nn, len);
      }
      break;
    case 2: WetFaceKernel<2, kSecond, false>(in, b, ex, ey, nn, len); break;
    case 3: WetFaceKernel<3, kSecond, false>(in, b, ex, ey, nn, len); break;
    case 4: WetFaceKernel<4, kSecond, false>(in, b, ex, ey, nn, len); break;
    default: WetFaceKernel<0, kSecond, false>(in, b, ex, ey, nn, len); break;
  }
}

// Second order: the faces of a chunk with two wet sides that keep their
// reconstruction (no fall-back to first order) are gathered side by side and
// their face values formed in vector lanes, exactly as FaceSideValues forms
// them, into the flux batch (entry k of both batches is the same face).
struct ReconstructionBatch {
  int L[kFaceBatch], R[kFaceBatch];
  // Centre values of each side, their gradients, the offsets from the
  // centroids to the face centre, and the face still water depth.
  double etaL[kFaceBatch], etaR[kFaceBatch], PL[kFaceBatch], PR[kFaceBatch], QL[kFaceBatch], QR[kFaceBatch];
  double dL[kFaceBatch], dR[kFaceBatch], hL[kFaceBatch], hR[kFaceBatch], df[kFaceBatch];
  double exL[kFaceBatch], eyL[kFaceBatch], PxL[kFaceBatch], PyL[kFaceBatch], QxL[kFaceBatch], QyL[kFaceBatch];
  double exR[kFaceBatch], eyR[kFaceBatch], PxR[kFaceBatch], PyR[kFaceBatch], QxR[kFaceBatch], QyR[kFaceBatch];
  double ax[kFaceBatch], ay[kFaceBatch], bx[kFaceBatch], by[kFaceBatch];
  double eta_l[kFaceBatch], eta_r[kFaceBatch];  // eta at the face
};

inline void AddReconstructedFace(const FaceLoopInput& in, WetFaceBatch& b, ReconstructionBatch& rb, int f,
                                 int position, int L, int R) {
  const int i = AddBatchFace(in, b, f, position, L, R);
  rb.L[i] = L, rb.R[i] = R;
  rb.etaL[i] = in.eta[L], rb.etaR[i] = in.eta[R], rb.PL[i] = in.P[L], rb.PR[i] = in.P[R];
  rb.QL[i] = in.Q[L], rb.QR[i] = in.Q[R], rb.dL[i] = in.d[L], rb.dR[i] = in.d[R];
  rb.hL[i] = in.h[L], rb.hR[i] = in.h[R], rb.df[i] = in.face_d[f];
  rb.exL[i] = in.eta_x[L], rb.eyL[i] = in.eta_y[L], rb.PxL[i] = in.P_x[L], rb.PyL[i] = in.P_y[L];
  rb.QxL[i] = in.Q_x[L], rb.QyL[i] = in.Q_y[L];
  rb.exR[i] = in.eta_x[R], rb.eyR[i] = in.eta_y[R], rb.PxR[i] = in.P_x[R], rb.PyR[i] = in.P_y[R];
  rb.QxR[i] = in.Q_x[R], rb.QyR[i] = in.Q_y[R];
  const double xf = in.xf[f], yf = in.yf[f];
  rb.ax[i] = xf - in.xc[L], rb.ay[i] = yf - in.yc[L], rb.bx[i] = xf - in.xc[R], rb.by[i] = yf - in.yc[R];
}

// Face values of the gathered faces and the velocity bound of each face from
// the centre velocities of its (wet) sides, the settings fixed at compile
// time.
template <bool kClip, bool kKeepSign, bool kFaceDepth>
[[gnu::noinline]] void ReconstructFaces(ReconstructionBatch& rb, WetFaceBatch& b, double h_move) {
  const int n = b.n;
  VHD_OMP_SIMD
  for (int i = 0; i < n; ++i) {
    const double ax = rb.ax[i], ay = rb.ay[i], bx = rb.bx[i], by = rb.by[i];
    SideValues l{0.0, 0.0, 0.0, rb.dL[i], rb.hL[i]}, r{0.0, 0.0, 0.0, rb.dR[i], rb.hR[i]};
    FieldFaceValues(rb.etaL[i], rb.etaR[i], rb.exL[i] * ax + rb.eyL[i] * ay, rb.exR[i] * bx + rb.eyR[i] * by, kClip,
                    kKeepSign, l.eta, r.eta);
    FieldFaceValues(rb.PL[i], rb.PR[i], rb.PxL[i] * ax + rb.PyL[i] * ay, rb.PxR[i] * bx + rb.PyR[i] * by, kClip,
                    kKeepSign, l.P, r.P);
    FieldFaceValues(rb.QL[i], rb.QR[i], rb.QxL[i] * ax + rb.QyL[i] * ay, rb.QxR[i] * bx + rb.QyR[i] * by, kClip,
                    kKeepSign, l.Q, r.Q);
    if constexpr (kFaceDepth) {
      FaceDepth(l, rb.df[i]);
      FaceDepth(r, rb.df[i]);
    }
    rb.eta_l[i] = l.eta, rb.eta_r[i] = r.eta;
    b.dl[i] = l.d, b.dr[i] = r.d, b.hl[i] = l.h, b.hr[i] = r.h;
    b.Pl[i] = l.P, b.Pr[i] = r.P, b.Ql[i] = l.Q, b.Qr[i] = r.Q;
    double uL, vL, uR, vR;
    CarriedVelocity(true, rb.hL[i], rb.PL[i], rb.QL[i], h_move, uL, vL);
    CarriedVelocity(true, rb.hR[i], rb.PR[i], rb.QR[i], h_move, uR, vR);
    FaceVelocityBound(uL, vL, uR, vR, b.umax[i], b.vmax[i]);
  }
}

void ReconstructFaces(const FaceLoopInput& in, ReconstructionBatch& rb, WetFaceBatch& b) {
  auto with = [&](auto clip, auto keep_sign) {
    if (in.fad != 0) {
      ReconstructFaces<clip, keep_sign, true>(rb, b, in.h_move);
    } else {
      ReconstructFaces<clip, keep_sign, false>(rb, b, in.h_move);
    }
  };
  auto with_clip = [&](auto clip) {
    if (in.preserve_dU) {
      with(clip, std::true_type{});
    } else {
      with(clip, std::false_type{});
    }
  };
  if (in.face_value_limiter > 0) {
    with_clip(std::true_type{});
  } else {
    with_clip(std::false_type{});
  }
}

// Interior faces first .. last of the face list, in batches. Every face that
// is not batched takes InteriorFaceTerms.
template <bool kSecond>
void InteriorFaceChunk(const FaceLoopInput& in, HdSolver& s, double* face_flux_len,
                       const int* faces, int first_index, int last_index, WetFaceBatch& b, ReconstructionBatch& rb) {
  b.n = 0;
  for (int i = first_index; i <= last_index; ++i) {
    const int f = faces[i];
    const int L = in.e1[f], R = in.e2[f];
    if constexpr (kSecond) {
      if (s.vector_faces && in.code[L] == kWet && in.code[R] == kWet) {
        if (!FallsBackToFirstOrder(in, i, L, R)) {
          AddReconstructedFace(in, b, rb, f, i, L, R);
          continue;
        }
      }
    }
    SideValues l, r;
    bool first;
    if (!WetFaceValues<kSecond>(in, s, face_flux_len, f, i, l, r, first)) continue;
    // First order: plain wet faces into the batch with their face values.
    const bool plain = in.code[L] == kWet && in.code[R] == kWet && PlainFaceDepths(in, l.h, l.d, r.h, r.d);
    if (!kSecond && s.vector_faces && plain) {
      AddWetFace(in, b, f, i, L, R, l, r);
    } else {
      InteriorFaceTerms<kSecond>(in, s, face_flux_len, f, i, l, r, first, 1.0);
    }
  }
  if constexpr (kSecond) {
    // The faces whose sides are too thin at the face for the batch leave it.
    ReconstructFaces(in, rb, b);
    int w = 0;
    for (int k = 0; k < b.n; ++k) {
      if (DrainedAtFace(in, FallBackDepth(in, rb.hL[k], rb.hR[k]), b.hl[k], b.hr[k])) {
        InteriorFace<true>(in, s, face_flux_len, b.position[k]);
      } else if (PlainFaceDepths(in, b.hl[k], b.dl[k], b.hr[k], b.dr[k])) {
        if (w != k) MoveBatchEntry(b, k, w);
        ++w;
      } else {
        const SideValues l{rb.eta_l[k], b.Pl[k], b.Ql[k], b.dl[k], b.hl[k]};
        const SideValues r{rb.eta_r[k], b.Pr[k], b.Qr[k], b.dr[k], b.hr[k]};
        InteriorFaceTerms<true>(in, s, face_flux_len, b.face[k], b.position[k], l, r, false, 1.0);
      }
    }
    b.n = w;
  }
  WetFaceFluxes<kSecond>(in, b, first_index, last_index);
  for (int i = 0; i < b.n; ++i) {
    const int f = b.face[i];
    SetFaceTerms(s, f, b.mx1[i], b.my1[i], b.mx2[i], b.my2[i]);
    face_flux_len[f] = b.mass[i];
  }
}

FaceLoopInput GatherInput(const HdModule& hd, const HdSolver& s, const Mesh& mesh) {
  const HdState& st = hd.state;
  const HdSolutionTechnique& sol = hd.solution;
  FaceLoopInput in;
  in.e1 = mesh.faces.element1.data();
  in.e2 = mesh.faces.element2.data();
  in.ex = s.interior_ex.data();
  in.ey = s.interior_ey.data();
  in.nn = s.interior_nn.data();
  in.len = s.interior_len.data();
  in.face_length = s.metric_face_length.empty() ? mesh.faces.length.data() : s.metric_face_length.data();
  in.eta = st.eta.data();
  in.d = st.d.data();
  in.h = st.h.data();
  in.P = st.P.data();
  in.Q = st.Q.data();
  in.code = st.wetdry.data();
  in.k = s.depth_correction.empty() ? nullptr : s.depth_correction.data();
  in.face_d = st.face_d.data();
  in.second = sol.scheme_of_space_discretization_horizontal == 2;
  in.xf = s.continuous_xf.empty() ? mesh.faces.xf.data() : s.continuous_xf.data();
  in.yf = mesh.faces.yf.data();
  in.xc = s.continuous_xc.empty() ? mesh.elements.xc.data() : s.continuous_xc.data();
  in.yc = mesh.elements.yc.data();
  in.face_start = mesh.elements.face_start.data();
  in.face_list = mesh.elements.face_list.data();
  in.eta_x = s.eta_x.data();
  in.eta_y = s.eta_y.data();
  in.P_x = s.P_x.data();
  in.P_y = s.P_y.data();
  in.Q_x = s.Q_x.data();
  in.Q_y = s.Q_y.data();
  in.eddy = hd.eddy.horizontal.type > 0;
  in.nu = st.nu_t.data();
  in.ux = st.ux.data();
  in.uy = st.uy.data();
  in.vx = st.vx.data();
  in.vy = st.vy.data();
  in.h_min = hd.flood_dry.mass_depth;
  in.h_move = sol.type_of_Riemann_solver == 4 ? in.h_min : 0.0;
  in.g = kPhysical.g;
  in.sqrt_g = std::sqrt(kPhysical.g);
  in.solver = sol.type_of_Riemann_solver;
  in.entropy_fix = sol.type_of_entropy_fix;
  in.fad = sol.face_average_d;
  in.land_condition = sol.type_of_land_condition;
  in.face_value_limiter = sol.face_value_limiter;
  in.preserve_dU = sol.preserve_dU;
  in.face_limit_dry = sol.face_limit_dry;
  return in;
}

// Face terms of the current state: interior faces, then boundary faces, into
// the face slots of the solver and the face mass fluxes of the state. Called
// by every thread of a parallel region; the two face loops write disjoint
// slots, so only the boundary loop ends with a barrier.
void FaceTerms(HdModule& hd, HdSolver& s, const Mesh& mesh, const FaceLoopInput& in) {
  HdState& st = hd.state;
  double* face_flux_len = st.face_flux_len.data();

  const int ni = s.interior_faces.size();
  const int* faces = s.interior_faces.data();
  const int nchunks = (ni + kFaceBatch - 1) / kFaceBatch;
  WetFaceBatch batch;  // one per thread, on its stack
  ReconstructionBatch reconstruction;
  VHD_OMP_FOR_NOWAIT
  for (int c = 0; c < nchunks; ++c) {
    const int first = 1 + c * kFaceBatch, last = std::min(ni, (c + 1) * kFaceBatch);
    if (in.second) {
      InteriorFaceChunk<true>(in, s, face_flux_len, faces, first, last, batch, reconstruction);
    } else {
      InteriorFaceChunk<false>(in, s, face_flux_len, faces, first, last, batch, reconstruction);
    }
  }

  const int nb = s.boundary_faces.size();
  VHD_OMP_FOR
  for (int i = 1; i <= nb; ++i) {
    const BoundaryFaceRecord& rec = s.boundary_faces[i];
    if (rec.kind != kBoundaryLand) {  // open boundary: its own outer state
      BoundaryFaceFluxHD(hd, s, mesh, rec);
      continue;
    }
    st.face_flux_len[rec.face] = 0.0;
    if (st.wetdry[rec.element] == kWet) {
      LandFaceTerms(in, s, rec);
    } else {
      SetBoundaryFaceTerms(s, rec.face, 0.0, 0.0);
    }
  }
}

// Sums of the face terms of element e in its local face order (its slots of
// the planes, kPlanes of them; a slot beyond the element's faces adds zero):
// the water entering it (sh: the face mass fluxes with the sign of the
// element's side), the momentum terms, and the outflow (the sum of the
// faces' outgoing water). mass is HdState::face_flux_len.
template <int kPlanes>
[[gnu::always_inline]] inline void ElementSums(const HdSolver& s, const double* mass, int e, double& sh, double& sP,
                                               double& sQ, double& out) {
  const int* slots = s.slot_face_side.data();
  const double* mom = s.face_momentum.data();
  sh = sP = sQ = out = 0.0;
  for (int j = 0; j < kPlanes; ++j) {
    const int m = slots[j * s.plane_stride + e];
    const double leaving = (m & 1) ? -mass[m >> 1] : mass[m >> 1];
    sh -= leaving;
    out += std::max(0.0, leaving);
    sP += mom[2 * m];
    sQ += mom[2 * m + 1];
  }
}

// Calls fn with std::integral_constant<int, planes> for the face planes of
// the solver (3: triangles only; 4: quadrilaterals present).
template <typename Fn>
void ForFacePlanes(const HdSolver& s, Fn&& fn) {
  if (s.face_planes == 3) {
    fn(std::integral_constant<int, 3>{});
  } else {
    fn(std::integral_constant<int, 4>{});
  }
}

// Element sums of the face terms into sum_h, sum_P, sum_Q of the solver
// (gathered from the faces in the local face order of each element, so the
// element update reads them in vector lanes), and the outflow limiter of a
// stage when dt > 0.
//
// Outflow limiter: the stage advances h from the base depth h_b of the step
// with the fluxes of the stage state, so with a second-order reconstruction
// or two stages (or a step at dt_min) an element can be sent out more water
// than it holds. An element with outflow O (m3/s, the sum of its outgoing
// face mass fluxes) and held volume V = A max(0, h_b + dt s_h) below dt O
// gets the factor theta = V / (dt O); every face multiplies its mass flux
// and the non-hydrostatic part of its momentum terms (LimitSideTerms; not the
// eddy stress) by the factor of its upwind element. Both sides of a face see
// the same mass flux, so mass stays conserved; incoming fluxes are not
// counted, so the new depth
// is never negative. Water at rest has no mass flux and is never touched.
// Returns the number of limited elements.
int ElementSumsHD(HdModule& hd, HdSolver& s, const Mesh& mesh, int ne, bool first_stage, double dt) {
  const HdState& st = hd.state;
  const double* mass = st.face_flux_len.data();
  const double* area = ElementAreasHD(s, mesh);
  const double* hbase = first_stage ? st.h.data() : st.h_old.data();
  const double* src_h = SourcesActive(s) ? s.src_h.data() : nullptr;
  double *sum_h = s.sum_h.data(), *sum_P = s.sum_P.data(), *sum_Q = s.sum_Q.data();
  double* factor = s.outflow_factor.data();
  int nlimited = 0;
  ForFacePlanes(s, [&](auto planes) {
    VHD_OMP_PARALLEL_FOR_REDUCTION(+, nlimited)
    for (int e = 1; e <= ne; ++e) {
      double sh, sP, sQ, out;
      ElementSums<planes>(s, mass, e, sh, sP, sQ, out);
      sum_h[e] = sh, sum_P[e] = sP, sum_Q[e] = sQ;
      if (dt > 0) {
        const double held = std::max(0.0, hbase[e] + (src_h ? dt * src_h[e] : 0.0)) * area[e];
        const bool limited = dt * out > held;
        factor[e] = limited ? held / (dt * out) : 1.0;
        nlimited += limited ? 1 : 0;
      }
    }
  });
  return nlimited;
}

// Faces whose upwind element is limited: the face terms formed again (from
// the same state, so with the same bits) with the flux scaled.
void LimitOutflowHD(HdModule& hd, HdSolver& s, const Mesh& mesh, const FaceLoopInput& in) {
  HdState& st = hd.state;
  double* face_flux_len = st.face_flux_len.data();
  const double* factor = s.outflow_factor.data();
  const int ni = s.interior_faces.size(), nb = s.boundary_faces.size();
  VHD_OMP_PARALLEL {
    VHD_OMP_FOR_NOWAIT
    for (int i = 1; i <= ni; ++i) {
      const int f = s.interior_faces[i];
      const double m = face_flux_len[f];
      if (m == 0) continue;
      const double theta = factor[m > 0 ? in.e1[f] : in.e2[f]];
      if (theta >= 1.0) continue;
      if (in.second) {
        InteriorFace<true>(in, s, face_flux_len, i, theta);
      } else {
        InteriorFace<false>(in, s, face_flux_len, i, theta);
      }
    }
    VHD_OMP_FOR_NOWAIT
    for (int i = 1; i <= nb; ++i) {
      const BoundaryFaceRecord& rec = s.boundary_faces[i];
      if (rec.kind == kBoundaryLand || !(face_flux_len[rec.face] > 0)) continue;
      const double theta = factor[rec.element];
      if (theta < 1.0) BoundaryFaceFluxHD(hd, s, mesh, rec, theta);
    }
  }
}

// Element update of a stage, in vector lanes (selects, no branches):
//   h = h_b + dt (dh/dt + s_h),
// and for wet elements P = P_b + dt (dP/dt + s_P), then the semi-implicit
// drag and the thin-water velocity; elements that are not wet take the plain
// update (their face terms carry only what water brings in). kFirst: the
// base state is the current one (kept in h_old, P_old, Q_old unless kLast);
// else it is h_old, P_old, Q_old. The depth is cut at 0 after every stage but
// the last. kIterate: the drag is formed a second time (discretisation 2).
// kSources: the element source terms are allocated (else they are zero).
template <bool kFirst, bool kLast, bool kIterate, bool kSources>
void UpdateElementsHD(HdModule& hd, const HdSolver& s, const Mesh& mesh, int ne, double dt) {
  HdState& st = hd.state;
  const double* area = ElementAreasHD(s, mesh);
  const int* code = st.wetdry.data();
  const double* d = st.d.data();
  const double* cf_bed = st.cf.data();
  const double* cf_surface = st.cf_surface.data();
  const double *src_h = s.src_h.data(), *src_P = s.src_P.data(), *src_Q = s.src_Q.data();
  const double *sum_h = s.sum_h.data(), *sum_P = s.sum_P.data(), *sum_Q = s.sum_Q.data();
  double *h = st.h.data(), *eta = st.eta.data(), *P = st.P.data(), *Q = st.Q.data();
  double *h_old = st.h_old.data(), *P_old = st.P_old.data(), *Q_old = st.Q_old.data();
  const double h_vel = s.thin_water_depth;
  const double h_vel4 = h_vel * h_vel * h_vel * h_vel;
  VHD_OMP_PARALLEL_FOR_SIMD
  for (int e = 1; e <= ne; ++e) {
    const double inv = 1.0 / area[e];
    const double dhdt = sum_h[e] * inv, dPdt = sum_P[e] * inv, dQdt = sum_Q[e] * inv;
    const double Pe = P[e], Qe = Q[e];  // state of the stage
    double hb, Pb, Qb;                  // base state of the step
    if constexpr (kFirst) {
      hb = h[e], Pb = Pe, Qb = Qe;
      if constexpr (!kLast) {
        h_old[e] = hb;
        P_old[e] = Pb;
        Q_old[e] = Qb;
      }
    } else {
      hb = h_old[e], Pb = P_old[e], Qb = Q_old[e];
    }
    double hn = hb + dt * (dhdt + (kSources ? src_h[e] : 0.0));

    // Wet: explicit update, then the semi-implicit drag r = cf |u| / h with
    // the velocity of the stage state over the new depth and (on request)
    // once more with the velocity of the result, at every depth (friction
    // acts on all water that moves; the implicit form keeps thin water
    // stable). Thin water below h_vel then carries the desingularised
    // velocity u = sqrt(2) h P / sqrt(h^4 + h_vel^4) (P = h u), which is
    // below P / h and tends to zero with the depth: a film whose momentum
    // the fluxes left out of step with its depth is not flung out.
    const double Ps = Pb + dt * (dPdt + (kSources ? src_P[e] : 0.0));
    const double Qs = Qb + dt * (dQdt + (kSources ? src_Q[e] : 0.0));
    const double cf = cf_bed[e] + cf_surface[e];
    const bool deep = hn > 0;
    const double ih = deep ? 1.0 / hn : 0.0;
    double u = Pe * ih, v = Qe * ih;
    double damped = 1.0 / (1.0 + dt * cf * std::sqrt(u * u + v * v) * ih);
    if constexpr (kIterate) {
      u = Ps * damped * ih, v = Qs * damped * ih;
      damped = 1.0 / (1.0 + dt * cf * std::sqrt(u * u + v * v) * ih);
    }
    const double h2 = hn * hn;
    const double thin = hn < h_vel ? std::sqrt(2.0) * h2 / std::sqrt(h2 * h2 + h_vel4) : 1.0;
    const double factor = deep ? (cf > 0 ? damped : 1.0) * thin : 0.0;
    const double Pw = Ps * factor;
    const double Qw = Qs * factor;

    const bool wet = code[e] == kWet;
    const double Pn = wet ? Pw : Pb + dt * dPdt;
    const double Qn = wet ? Qw : Qb + dt * dQdt;
    if constexpr (!kLast) hn = std::max(0.0, hn);
    h[e] = hn;
    eta[e] = hn - d[e];
    P[e] = Pn;
    Q[e] = Qn;
  }
}

// Areas, face lengths and the closure of the face normals of every element
// on the sphere (geographic meshes).
void SetupSphereHD(const Mesh& mesh, HdSolver& s) {
  const ElementTable& E = mesh.elements;
  const FaceTable& F = mesh.faces;
  const int ne = E.nelements, nf = F.nfaces;
  s.metric_area.assign(ne);
  s.metric_face_length.assign(nf);
  s.metric_closure_x.assign(ne, 0.0);
  s.metric_closure_y.assign(ne, 0.0);
  for (int e = 1; e <= ne; ++e) s.metric_area[e] = ElementAreaMetres(mesh, e);
  for (int f = 1; f <= nf; ++f) {
    double nx, ny, len;
    FaceMetres(mesh, f, nx, ny, len);
    s.metric_face_length[f] = len;
    const int a = F.element1[f], b = F.element2[f];
    s.metric_closure_x[a] += nx * len;
    s.metric_closure_y[a] += ny * len;
    if (b > 0) {
      s.metric_closure_x[b] -= nx * len;
      s.metric_closure_y[b] -= ny * len;
    }
  }
}

// Longitudes of the centroids and face centres taken into [cut, cut + 2 pi)
// with the cut in the widest gap between the node longitudes, when that gap
// is wider than every element (so no element crosses it); stored only when
// that moves a longitude, i.e. when the mesh crosses the 180-degree meridian.
void ContinuousLongitudesHD(const Mesh& mesh, HdSolver& s) {
  constexpr double two_pi = 2.0 * std::numbers::pi;
  auto wrap = [](double x) { return std::remainder(x, two_pi); };  // [-pi, pi]
  const NodeTable& nd = mesh.nodes;
  const ElementTable& E = mesh.elements;
  std::vector<double> lon(nd.nnodes);
  for (int n = 1; n <= nd.nnodes; ++n) lon[n - 1] = wrap(nd.x[n]);
  std::sort(lon.begin(), lon.end());
  double gap = lon.front() + two_pi - lon.back(), cut = lon.back() + 0.5 * gap;
  for (std::size_t i = 1; i < lon.size(); ++i) {
    if (lon[i] - lon[i - 1] > gap) gap = lon[i] - lon[i - 1], cut = lon[i - 1] + 0.5 * gap;
  }
  double widest = 0.0;
  for (int e = 1; e <= E.nelements; ++e) {
    const double x0 = nd.x[ElementNode(E, e, 1)];
    double lo = 0.0, hi = 0.0;
    for (int j = 2; j <= ElementNodeCount(E, e); ++j) {
      const double dx = wrap(nd.x[ElementNode(E, e, j)] - x0);
      lo = std::min(lo, dx), hi = std::max(hi, dx);
    }
    widest = std::max(widest, hi - lo);
  }
  if (gap <= widest) return;
  auto shifted = [&](double x) { return x - two_pi * std::floor((x - cut) / two_pi); };
  bool moved = false;
  for (int e = 1; e <= E.nelements && !moved; ++e) moved = shifted(E.xc[e]) != E.xc[e];
  if (!moved) return;
  s.continuous_xc.assign(E.nelements);
  s.continuous_xf.assign(mesh.faces.nfaces);
  for (int e = 1; e <= E.nelements; ++e) s.continuous_xc[e] = shifted(E.xc[e]);
  for (int f = 1; f <= mesh.faces.nfaces; ++f) s.continuous_xf[f] = shifted(mesh.faces.xf[f]);
}

// Terms of the sphere, added to the element sums of the stage for the wet
// elements (geographic meshes):
//  - the part of the pressure that the faces of an element leave over: for
//    a wet element every face carries g/2 (h_p^2 - d^2) with the bed-slope
//    term g X d (X = eta + k), which sum to -g/2 X^2 times the closure C of
//    its face normals at rest. C is zero on a plane, not on the sphere;
//    adding g/2 X^2 C makes the face terms the discrete -g h grad(eta)
//    again, so that water at rest stays at rest to round-off;
//  - the curvature of the east and north directions: per unit area
//    + P Q tan(lat) / (R h) east and - P^2 tan(lat) / (R h) north, for water
//    at least h_min deep (below it the update carries no velocity either).
void SphereTermsHD(const HdModule& hd, HdSolver& s, const Mesh& mesh, int ne) {
  const HdState& st = hd.state;
  const double* tan_lat = mesh.elements.tan_lat.data();
  const double g = kPhysical.g, h_min = hd.flood_dry.mass_depth;
  const double inv_radius = 1.0 / kMeshEarthRadius;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    if (st.wetdry[e] != kWet) continue;
    const double X = st.eta[e] + DepthCorrection(s, e);
    const double pressure = 0.5 * g * X * X;
    double cx = 0.0, cy = 0.0;
    const double h = st.h[e];
    if (h >= h_min && h > 0) {
      const double k = tan_lat[e] * inv_radius * s.metric_area[e] / h;
      cx = k * st.P[e] * st.Q[e];
      cy = -k * st.P[e] * st.P[e];
    }
    s.sum_P[e] += pressure * s.metric_closure_x[e] + cx;
    s.sum_Q[e] += pressure * s.metric_closure_y[e] + cy;
  }
}

}  // namespace

void SetupSolverHD(HdModule& hd, const Mesh& mesh, HdSolver& s) {
  const int ne = mesh.elements.nelements;
  const int ne_owned = mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : ne;
  const int nf = mesh.faces.nfaces;
  const FaceTable& F = mesh.faces;
  const ElementTable& E = mesh.elements;
  // The gradient stencil first: its construction's temporaries are gone
  // before the solver's own arrays take their memory.
  if (hd.solution.scheme_of_space_discretization_horizontal == 2 || hd.eddy.horizontal.type > 0) {
    SetupReconstructionHD(hd, mesh, s);
  }

  int n_interior = 0, n_boundary = 0;
  for (int f = 1; f <= nf; ++f) {
    const int a = F.element1[f], b = F.element2[f];
    if (b > 0) {
      if (a <= ne_owned || b <= ne_owned) ++n_interior;
    } else if (a > 0 && a <= ne_owned) {
      ++n_boundary;
    }
  }
  s.interior_faces.assign(n_interior);
  s.boundary_faces.assign(n_boundary);
  int ki = 0, kb = 0;
  for (int f = 1; f <= nf; ++f) {
    const int a = F.element1[f], b = F.element2[f];
    if (b > 0) {
      if (a <= ne_owned || b <= ne_owned) s.interior_faces[++ki] = f;
    } else if (a > 0 && a <= ne_owned) {
      BoundaryFaceRecord& r = s.boundary_faces[++kb];
      r.face = f;
      r.element = a;
      r.kind = kBoundaryLand;
    }
  }
  LinkBoundaryFacesHD(hd.boundary, s);

  // Face slots: plane j of element e for its local face j.
  int planes = 0;
  for (int e = 1; e <= ne; ++e) planes = std::max(planes, ElementFaceCount(E, e));
  if (planes > 4) {
    FatalError(SubstituteValue("SetupSolverHD: an element of the mesh has % faces; a 2D element has at most 4",
                               planes));
  }
  s.face_planes = planes < 4 ? 3 : 4;
  s.plane_stride = ne;
  s.face_momentum.assign(4 * nf + 3, 0.0);
  s.slot_face_side.assign(s.face_planes * ne, 0);
  for (int e = 1; e <= ne; ++e) {
    for (int j = 1; j <= ElementFaceCount(E, e); ++j) {
      const int f = ElementFace(E, e, j);
      s.slot_face_side[(j - 1) * ne + e] = 2 * f + (F.element1[f] == e ? 0 : 1);
    }
  }

  // Face still water depth, the unit normal and its length.
  const bool second = hd.solution.scheme_of_space_discretization_horizontal == 2;
  const int fad = hd.solution.face_average_d;
  HdState& st = hd.state;
  st.face_d.assign(nf);
  for (int f = 1; f <= nf; ++f) {
    const int a = F.element1[f], b = F.element2[f];
    if (fad == 2) {
      double zsum = 0.0;
      const int nn = FaceNodeCount(F, f);
      for (int j = 1; j <= nn; ++j) zsum += mesh.nodes.z[FaceNode(F, f, j)];
      st.face_d[f] = -zsum / nn;
    } else {
      st.face_d[f] = b > 0 ? 0.5 * (st.d[a] + st.d[b]) : st.d[a];
    }
  }
  const bool geographic = IsGeographic(mesh.projection);
  if (geographic) {
    SetupSphereHD(mesh, s);
    ContinuousLongitudesHD(mesh, s);
  }
  auto unit_normal = [&](int f, double& ex, double& ey, double& nn) {
    if (geographic) {
      double len;
      FaceMetres(mesh, f, ex, ey, len);
      nn = 1.0;
      return;
    }
    nn = std::sqrt(F.nx[f] * F.nx[f] + F.ny[f] * F.ny[f]);
    ex = nn > 0 ? F.nx[f] / nn : 0.0;
    ey = nn > 0 ? F.ny[f] / nn : 0.0;
  };
  for (Array1<double>* a : {&s.interior_ex, &s.interior_ey, &s.interior_nn, &s.interior_len}) a->assign(n_interior);
  for (int i = 1; i <= n_interior; ++i) {
    const int f = s.interior_faces[i];
    unit_normal(f, s.interior_ex[i], s.interior_ey[i], s.interior_nn[i]);
    s.interior_len[i] = geographic ? s.metric_face_length[f] : F.length[f];
  }
  for (BoundaryFaceRecord& rec : s.boundary_faces) unit_normal(rec.face, rec.ex, rec.ey, rec.nn);

  s.outflow_factor.assign(ne, 1.0);
  if (hd.precipitation.Active() || hd.sources.Active()) {
    for (Array1<double>* a : {&s.src_h, &s.src_P, &s.src_Q}) a->assign(ne, 0.0);
  }
  for (Array1<double>* a : {&s.sum_h, &s.sum_P, &s.sum_Q}) a->assign(ne, 0.0);
  if (second) {
    for (Array1<double>* a : {&s.eta_x, &s.eta_y, &s.P_x, &s.P_y, &s.Q_x, &s.Q_y}) a->assign(ne, 0.0);
  }
  if (second && hd.solution.type_of_filtering >= 1) {
    s.filter_u.assign(ne, 0.0);
    s.filter_v.assign(ne, 0.0);
    s.filter_weight.assign(ne);
    for (int e = 1; e <= ne; ++e) s.filter_weight[e] = ElementAreaMetres(mesh, e);
  }
  s.thin_water_depth = hd.flood_dry.type > 0 ? 2.0 * hd.flood_dry.drying_depth : 0.0;
  PrepareForcingHD(hd, mesh, s);
}

void ClearElementSources(HdSolver& s, int n, bool momentum) {
  double *h = s.src_h.data(), *P = s.src_P.data(), *Q = s.src_Q.data();
  if (!momentum) {
    VHD_OMP_PARALLEL_FOR_SIMD
    for (int e = 1; e <= n; ++e) h[e] = 0.0;
    return;
  }
  VHD_OMP_PARALLEL_FOR_SIMD
  for (int e = 1; e <= n; ++e) h[e] = P[e] = Q[e] = 0.0;
}

void BoundaryFaceTerms(const HdModule& hd, HdSolver& s, const Mesh& mesh, const BoundaryFaceRecord& rec) {
  LandFaceTerms(GatherInput(hd, s, mesh), s, rec);
}

void CalcDerivativesOnlySW2D(HdModule& hd, HdSolver& s, const Mesh& mesh, Array1<double>* dhdt,
                             Array1<double>* dPdt, Array1<double>* dQdt) {
  // Face terms, then the element sums in local face order divided by the area.
  const FaceLoopInput in = GatherInput(hd, s, mesh);
  const int ne =
      mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
  const double* area = ElementAreasHD(s, mesh);
  const bool sums = dhdt != nullptr && dPdt != nullptr && dQdt != nullptr;
  if (sums) {
    for (Array1<double>* a : {dhdt, dPdt, dQdt}) a->assign(mesh.elements.nelements, 0.0);
  }
  VHD_OMP_PARALLEL { FaceTerms(hd, s, mesh, in); }
  if (!sums) return;
  ElementSumsHD(hd, s, mesh, ne, true, 0.0);
  if (!s.metric_area.empty()) SphereTermsHD(hd, s, mesh, ne);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    const double inv = 1.0 / area[e];
    (*dhdt)[e] = s.sum_h[e] * inv;
    (*dPdt)[e] = s.sum_P[e] * inv;
    (*dQdt)[e] = s.sum_Q[e] * inv;
  }
}

void CALCDERIVATIVESW2D(HdModule& hd, HdSolver& s, const Mesh& mesh, int stage, double dt,
                        bool last_stage) {
  // Face terms (with the outflow limiter), then the derivatives and the
  // element update of the stage in one pass over the elements. The first
  // stage takes the current state as the base of the step and, when more
  // stages follow, keeps it in h_old, P_old, Q_old for them.
  const FaceLoopInput in = GatherInput(hd, s, mesh);
  const int ne =
      mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
  const bool first_stage = stage == 1;
  VHD_OMP_PARALLEL { FaceTerms(hd, s, mesh, in); }
  int nlimited = ElementSumsHD(hd, s, mesh, ne, first_stage, dt);
  if (hd.subdomain && hd.subdomain->Active()) {
    // A face between an owned and a halo element takes the factor of its
    // upwind side, which the halo element's owner formed.
    ExchangeHalo(*hd.subdomain, {&s.outflow_factor});
    for (int e = ne + 1; e <= hd.state.nelements_local && nlimited == 0; ++e)
      if (s.outflow_factor[e] < 1.0) nlimited = 1;
  }
  if (nlimited > 0) {
    LimitOutflowHD(hd, s, mesh, in);
    ElementSumsHD(hd, s, mesh, ne, first_stage, 0.0);
  }
  if (!s.metric_area.empty()) SphereTermsHD(hd, s, mesh, ne);
  auto with_sources = [&](auto first, auto last, auto iterate) {
    if (!SourcesActive(s)) {
      UpdateElementsHD<first, last, iterate, false>(hd, s, mesh, ne, dt);
    } else {
      UpdateElementsHD<first, last, iterate, true>(hd, s, mesh, ne, dt);
    }
  };
  auto update = [&](auto first, auto last) {
    if (hd.solution.bed_resistance_discretization == 2) {
      with_sources(first, last, std::true_type{});
    } else {
      with_sources(first, last, std::false_type{});
    }
  };
  if (!first_stage) {
    update(std::false_type{}, std::false_type{});
  } else if (last_stage) {
    update(std::true_type{}, std::true_type{});
  } else {
    update(std::true_type{}, std::false_type{});
  }
}

void CALCVELOCITYFILTER2D(HdModule& hd, HdSolver& s, const Mesh& mesh) {
  HdState& st = hd.state;
  const int ne = mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
  const double h_min = hd.flood_dry.mass_depth;
  const double c = hd.solution.filtering_coefficient;
  const FaceTable& F = mesh.faces;
  auto qualifies = [&](int e) { return st.wetdry[e] == kWet && st.h[e] >= h_min && st.h[e] > 0; };
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    s.filter_u[e] = st.h[e] > 0 ? st.P[e] / st.h[e] : 0.0;
    s.filter_v[e] = st.h[e] > 0 ? st.Q[e] / st.h[e] : 0.0;
    if (!(st.wetdry[e] == kWet && st.h[e] > h_min)) continue;
    double w = s.filter_weight[e];
    double su = w * s.filter_u[e], sv = w * s.filter_v[e];
    for (int j = 1; j <= ElementFaceCount(mesh.elements, e); ++j) {
      const int f = ElementFace(mesh.elements, e, j);
      const int nb = F.element1[f] == e ? F.element2[f] : F.element1[f];
      if (nb <= 0 || !qualifies(nb)) continue;
      const double wn = s.filter_weight[nb];
      w += wn;
      su += wn * st.P[nb] / st.h[nb];
      sv += wn * st.Q[nb] / st.h[nb];
    }
    s.filter_u[e] = (1.0 - c) * s.filter_u[e] + c * su / w;
    s.filter_v[e] = (1.0 - c) * s.filter_v[e] + c * sv / w;
  }
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    if (st.wetdry[e] == kWet && st.h[e] > h_min) {
      st.P[e] = s.filter_u[e] * st.h[e];
      st.Q[e] = s.filter_v[e] * st.h[e];
    }
  }
}

}  // namespace vhd
