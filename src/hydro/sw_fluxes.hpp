#pragma once
// Shallow-water derivatives of the 2D finite-volume scheme.
//
// CALCDERIVATIVESW2D evaluates, for one stage of the HD time integration, the
// time derivatives of the conserved quantities of every owned element,
//     dh/dt = -1/A sum_faces F_h len
//     dP/dt = -1/A sum_faces (F_P - D_P) len + g eta grad(d) + sources
//     dQ/dt = -1/A sum_faces (F_Q - D_Q) len + g eta grad(d) + sources
// with F the numerical flux of RiemannFaceFlux (pre-balanced pressure
// g/2 (h^2 - d^2)), g eta grad(d) the bed-slope term formed face by face from
// the face still water depth, and D the diffusive momentum flux of the eddy
// viscosity; then advances the element state over the stage (element update
// with semi-implicit bed drag, see time_step.hpp).
//
// Inputs: HdState (eta, d, h, P, Q, wet/dry codes, cf, nu_t, velocity
// gradients), the mesh geometry, the settings of HdSolutionTechnique and
// h_min = mass_depth of HdFloodDry. Outputs: the face mass fluxes
// face_flux_len (m3/s) of HdState (positive from element1 to element2) and
// the new h, eta, P, Q.
//
// Threads. The face loop writes each face's terms by face (its mass flux and
// the momentum terms of both sides); a pass over the elements then sums each
// element's terms in its local face order. No two threads ever add to one
// element, and the order of additions is fixed, so results are the same to
// the last bit for any thread count. The face loop takes the
// faces in chunks: faces with two wet sides deep enough ("plain wet faces")
// have their flux evaluated side by side in vector lanes, by the same inline
// code as the scalar path of every other face.
//
// Choices made here:
//   - face_value_limiter > 0 clips each reconstructed face value of eta, P, Q
//     to the range of the two element-centre values across the face;
//   - with second order, each face velocity component is bounded by the
//     larger magnitude of that component at the two centres (P and eta are
//     reconstructed apart, and over thin water P / h could otherwise exceed
//     every velocity around); a side that is not wet passes P = Q = 0 with
//     its zero velocity, a wet side its velocity at any depth (with the
//     type-4 solver only from h_min on);
//   - with second order a land face sees the surface reconstructed to the
//     face, clipped to the range of the element and its wet neighbours (the
//     gradient limiter does not look at boundary faces), and the element's
//     velocity at that depth;
//   - a face that falls back to first order next to a nearly dry side keeps
//     the centre values, d and h of that side only: the deeper side passes
//     its centre eta and velocity with its depth at the face from d_f;
//   - a wet element takes its face terms and its drag at every depth (no
//     damping of the update in shallow water); below thin_water_depth it
//     carries the desingularised velocity sqrt(2) h P / sqrt(h^4 + h_v^4);
//   - the element depth correction k is zero (no depth correction is active);
//   - the bed-slope term is g X d n len for both components (the extra
//     g X^2/2 n_y len of the y form sums to zero over a closed element),
//     with d the face d that the pressure of the face saw: the flux's own
//     face d (RiemannFlux::d; d_f when both sides pass d_f) at Riemann
//     faces, the side's face d at walls. With d_f at every face for both
//     terms, pressure and bed slope would cancel only for a surface at
//     datum: where a side passes another d (its centre d with
//     face_average_d 0, or d clipped to the surface where the surface lies
//     below the face bed) a lake at rest at another level would start to
//     move;
//   - a flooded element (mass only) gains, at a face to a wet element, the
//     momentum that the water flowing in carries (the mass flux times the
//     wet element's centre velocity), which the wet element loses with its
//     momentum flux; otherwise the momentum carried into a flooding element
//     would be lost and dry-bed fronts would lag;
//   - the stage is limited so that no element loses more water than it holds
//     (outflow limiter, in CALCDERIVATIVESW2D);
//   - CALCVELOCITYFILTER2D blends: u_new = (1 - c) u + c u_mean with
//     c = filtering_coefficient and u_mean the area-weighted mean of the
//     element and its qualifying face neighbours.


#include "core/array1.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/riemann.hpp"
#include "mesh/gradient.hpp"
#include "mesh/gradient_limiter.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

// Kinds of prepared boundary-face records. Open boundary types add their kinds
// and fill the record's values before the face loop; the face loop calls
// BoundaryFaceTerms, which forms the outer state from the record.
inline constexpr int kBoundaryLand = 0;

struct BoundaryFaceRecord {
  int face = 0;     // mesh face
  int element = 0;  // inner element (element1 of the face)
  int kind = kBoundaryLand;
  double values[8] = {0, 0, 0, 0, 0, 0, 0, 0};  // prepared outer values of the kind
  double ex = 0, ey = 0, nn = 0;  // unit outward normal and the length of the mesh normal (as interior faces)
};

// The solver's own setup-time tables and work arrays (allocated once).
struct HdSolver {
  // Interior faces handled by this process (element2 > 0 and at least one
  // owned side), and the prepared boundary faces.
  Array1<int> interior_faces;
  Array1<BoundaryFaceRecord> boundary_faces;

  // Face planes: every element has face_planes slots (the largest face count
  // of the mesh's elements: 3 for triangles, 4 with quadrilaterals); the slot
  // of local face j (0-based) of element e is j * plane_stride + e.
  int face_planes = 0;
  int plane_stride = 0;

  // Per interior face, in the order of interior_faces (so that the faces of
  // a chunk of the face loop lie side by side): the unit normal (ex, ey), the
  // length nn of the mesh normal (nx = nn ex; nn is 1 on Cartesian meshes)
  // and the face length. On a geographic mesh the normal and the length are
  // those on the sphere (FaceMetres: east and north components, metres) and
  // nn is 1. (The face still water depth d_f of the bed-slope term is
  // HdState::face_d, set here at setup.)
  Array1<double> interior_ex, interior_ey, interior_nn, interior_len;

  // Geographic meshes only (empty on Cartesian meshes, whose own areas and
  // lengths serve): element areas (m2) and face lengths (m) on the sphere,
  // and per element the sum over its faces of the outward unit normal times
  // the face length (m). On the sphere that sum is not zero (an element's
  // faces nearer the pole are shorter); the element update balances the face
  // pressures with it (SphereTermsHD in sw_fluxes.cpp).
  Array1<double> metric_area, metric_face_length, metric_closure_x, metric_closure_y;
  // Geographic mesh across the 180-degree meridian: the longitudes of the
  // centroids and face centres made continuous over the mesh, for the
  // offsets of the face reconstruction (empty otherwise, and for a mesh
  // around the whole globe).
  Array1<double> continuous_xc, continuous_xf;

  // Momentum terms of the current stage, four per face f at 4f .. 4f + 3:
  // x and y of the element1 side, then of the element2 side (m4/s2; zero on
  // the outer side of a boundary face). The face loop writes them in face
  // order; the mass flux of the face is HdState::face_flux_len.
  Array1<double> face_momentum;
  // Per slot (planes above): 2f + s for face f of the slot, s = 0 where the
  // element is the face's element1 and 1 where it is element2, so that the
  // slot's momentum terms are face_momentum[2 (2f + s)] and the next, and the
  // water leaving the element is face_flux_len[f] with the sign of the side.
  // A slot beyond an element's own faces holds 0: face 0, whose mass flux and
  // momentum terms (the spare entries) stay zero.
  Array1<int> slot_face_side;

  // Gradient stencil (second order or eddy viscosity), built once at setup,
  // and the unlimited gradients read by the ENO and weighted limiters.
  GradientStencil gradient;
  // Neighbours and face offsets of the Barth-Jespersen limiter, built once.
  LimiterGeometry2D limiter_geometry;
  Array1<double> gradient_x, gradient_y;
  // Per element: limited gradients of eta, P, Q (second order).
  Array1<double> eta_x, eta_y, P_x, P_y, Q_x, Q_y;
  // Element source terms of the stage: depth (m/s) for every element,
  // momentum (m2/s2) for wet elements. Allocated together (one per element)
  // and filled by the forcings and sources that act; empty while none does,
  // and the element update then adds nothing.
  Array1<double> src_h, src_P, src_Q;
  // Per element: the factor (0..1] of its outgoing mass fluxes in the
  // current stage (outflow limiter, see CALCDERIVATIVESW2D).
  Array1<double> outflow_factor;
  // Per element: the sums of the face terms of the stage (the water entering
  // it, m3/s, and its momentum terms, m4/s2).
  Array1<double> sum_h, sum_P, sum_Q;
  // Element depth correction k (m): allocated and filled by a depth
  // correction when one is active; empty in ordinary runs, where k is 0.
  Array1<double> depth_correction;
  // eta + k per element, whose gradient the second-order reconstruction
  // takes for the surface while a depth correction is active.
  Array1<double> surface_k;
  // Weight of the velocity filter (element area, m2), and scratch for it
  // (allocated when the filter is on).
  Array1<double> filter_weight, filter_u, filter_v;

  // Depth below which a wet element carries the desingularised velocity of
  // the element update (twice the drying depth; 0 without flooding and
  // drying).
  double thin_water_depth = 0.0;
  // 1 when the gravity-wave term is not part of the explicit step (CFL rate
  // without 2 sqrt(g h)); 0 for the explicit shallow-water equations.
  int implicit_gravity = 0;
  // Threshold of the Barth-Jespersen limiter (same unit as the variable).
  double limiter_epsilon = 1e-12;
  // Plain wet faces take the batched path in vector lanes; false sends every
  // face through the scalar path, which gives the same bits (for checks).
  bool vector_faces = true;
};

// Element areas (m2) of the fluxes: the solver's own on a geographic mesh,
// else the mesh's.
inline const double* ElementAreasHD(const HdSolver& s, const Mesh& mesh) {
  return s.metric_area.empty() ? mesh.elements.area.data() : s.metric_area.data();
}

// Whether element source terms act in the stage (all three allocated).
inline bool SourcesActive(const HdSolver& s) {
  return !s.src_h.empty() && !s.src_P.empty() && !s.src_Q.empty();
}

// Zeroes the element source terms of elements 1 .. n before the forcings
// and sources of a sub-step add theirs.
// momentum false: only src_h (the forcings have just set src_P, src_Q).
void ClearElementSources(HdSolver& s, int n, bool momentum = true);

// Depth correction k of element e (0 when no depth correction is active).
inline double DepthCorrection(const HdSolver& s, int e) {
  return s.depth_correction.empty() ? 0.0 : s.depth_correction[e];
}

// Builds the solver tables for the velocity mesh of the module; allocates
// every work array. Called once after SetupHD.
void SetupSolverHD(HdModule& hd, const Mesh& mesh, HdSolver& solver);

// Derivatives of one stage and the element update, in one pass over the
// elements after the face loops. Stage 1 takes the current state as the base
// of the step and, when more stages follow, stores it in h_old, P_old, Q_old;
// later stages advance from that base. dt_stage is the stage step (s); last_stage is true for the final
// stage of the step (the depth is cut at 0 after every other stage).
void CALCDERIVATIVESW2D(HdModule& hd, HdSolver& solver, const Mesh& mesh, int stage, double dt_stage,
                        bool last_stage);

// Face terms of the current state without an update (the face fluxes of the
// initial state); with dhdt, dPdt, dQdt given, also the derivatives of every
// owned element into them (allocated here; for checks of balance, not for
// the time loop).
void CalcDerivativesOnlySW2D(HdModule& hd, HdSolver& solver, const Mesh& mesh, Array1<double>* dhdt = nullptr,
                             Array1<double>* dPdt = nullptr, Array1<double>* dQdt = nullptr);

// Velocity filter after a stage (second order, type_of_filtering >= 1).
void CALCVELOCITYFILTER2D(HdModule& hd, HdSolver& solver, const Mesh& mesh);

// Whether a face between elements of wet/dry codes cL, cR (centre surface
// eta and still water depth d of each) takes the Riemann flux: two wet sides
// always; a wet and a flooded side with second order, or when the wet side's
// surface lies above the flooded side's bed; otherwise (wet against dry) the
// wet side sees a wall. Faces without a wet side carry nothing and are not
// asked.
inline bool RiemannFaceCase(int cL, int cR, double etaL, double dL, double etaR, double dR, bool second) {
  if (cL == kWet && cR == kWet) return true;
  if (cL == kWet && cR == kFlooded) return second || etaL + dR > 0;
  if (cL == kFlooded && cR == kWet) return second || dL + etaR > 0;
  return false;
}

// Momentum terms of face f for both sides (its mass flux goes into
// HdState::face_flux_len).
inline void SetFaceTerms(HdSolver& s, int f, double mx1, double my1, double mx2, double my2) {
  double* m = s.face_momentum.data() + 4 * f;
  m[0] = mx1, m[1] = my1, m[2] = mx2, m[3] = my2;
}

// Momentum terms of boundary face f for its inner side (element1).
inline void SetBoundaryFaceTerms(HdSolver& s, int f, double mx, double my) {
  double* m = s.face_momentum.data() + 4 * f;
  m[0] = mx, m[1] = my;
}

// Terms of a boundary face closed as land (the record's face and inner
// element1, which must be wet): the wall pressure and the bed-slope term into
// the slot of the inner side. For faces outside the face loop (a cyclic face
// whose partner is dry); the face loop forms its land faces itself.
void BoundaryFaceTerms(const HdModule& hd, HdSolver& solver, const Mesh& mesh,
                       const BoundaryFaceRecord& record);

}  // namespace vhd
