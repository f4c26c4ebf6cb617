#pragma once
// Gradient limiters: scale or replace an element's unlimited gradient so that
// the values reconstructed at its face centres create no new extrema.
//
// Limiter codes of the schemes: 0 none, 1 ENO, 2 weighted ("simple"),
// 3 Barth-Jespersen.
//
//  Barth-Jespersen: with phi_max, phi_min the extremes of phi over e and its
//    active face neighbours, and for each face with an active neighbour the
//    extrapolated increment D = g . (x_f - x_e):
//      alpha_f = min(1, (phi_max - phi_e)/D) if D > eps,
//                min(1, (phi_min - phi_e)/D) if D < -eps, else 1;
//    the limited gradient is min_f(alpha_f) g, with eps >= 0 the scheme's
//    small threshold. Faces without an active neighbour (boundary, dry)
//    neither widen the bounds nor limit, so an element whose neighbours are
//    all dry keeps its gradient.
//  ENO: of e's own gradient and the gradients of its valid face neighbours
//    (a face without a valid neighbour offers e's own gradient again), the one
//    of smallest magnitude; a candidate replaces the choice only when strictly
//    smaller, so ties keep e's own gradient or the earlier face.
//  Weighted: candidates g_i as for ENO, one per face (e's own gradient stands
//    for a face without a valid neighbour); with s_i = |g_i|^2 / 2 the weight
//    of candidate i is the product of the other candidates' s_j plus 1e-4, and
//    the limited gradient is sum w_i g_i / sum w_i. On a triangle with three
//    valid neighbours these are the classic three-gradient weights; a
//    quadrilateral uses its four candidates (products of three); an element
//    with fewer valid neighbours mixes its own gradient in for the missing
//    ones, and one with none keeps its own gradient.
//
// A neighbour is active when its element flag equals 1 (the wet code: 1 wet,
// 0 dry, 2 flooded); a valid neighbour (ENO, weighted) is active, e itself is
// active and the face flag is positive. Empty flag arrays mean "all active" /
// "all open". Inactive elements keep their gradient unchanged.
//
// Threads: static OpenMP loops over the owned elements, each writing only its
// own outputs; no allocation, callable in the time loop outside a parallel
// region. Barth-Jespersen may limit in place (output arrays = input arrays);
// ENO and the weighted limiter read the neighbours' unlimited gradients and
// need separate output arrays.
//
// Fast 2D Barth-Jespersen: LimiterGeometry2D holds, per element and local
// face, the element across the face and the offset of the face centre from
// the centroid, so that the time loop reads three small rows per element
// instead of walking the face table and recomputing offsets. The table is
// pure geometry (no flags), built once at setup; drying and flooding need no
// rebuild. All Barth-Jespersen entry points give the same results bit for bit,
// whether a field is limited alone, with others in one pass, through the mesh
// or through the table, on any number of threads.

#include <array>
#include <span>

#include "core/array1.hpp"
#include "mesh/gradient.hpp"
#include <vector>

#include "mesh/mesh.hpp"

namespace vhd {

inline constexpr int kLimiterNone = 0;
inline constexpr int kLimiterENO = 1;
inline constexpr int kLimiterWeighted = 2;
inline constexpr int kLimiterBarthJespersen = 3;

// Most local faces per element in the 2D limiter table.
inline constexpr int kLimiterFaces2D = 4;

// Per-element neighbours and face-centre offsets of a 2D mesh, in the
// element's local face order, `faces` slots per element: 3 when every owned
// element is a triangle, else 4. Slot j of element e (index e * faces + j):
// neighbour is the element across local face j+1 (0: boundary face, or the
// unused fourth slot of a triangle), (dx, dy) the face centre minus e's
// centroid (x taken the short way round the globe on a geographic mesh).
// 60 bytes per element on a triangle mesh, 80 with quadrilaterals;
// neighbours may be halo elements, whose values the limiter reads.
struct LimiterGeometry2D {
  int nelements = 0;  // rows: the owned elements, which the limiter loops visit
  int faces = 0;
  std::vector<int> neighbour;
  std::vector<double> dx, dy;
};

// Builds the table of the owned elements of a 2D mesh (the table is
// replaced). An element with more than four faces (a 3D mesh) is the fatal
// error "SetupLimiterGeometry2D: element % has % faces; a 2D element has at
// most 4".
void SetupLimiterGeometry2D(const Mesh& mesh, LimiterGeometry2D& geometry);

// Barth-Jespersen through the mesh face table (no setup needed).
void CALCLIMITEDGRADIENTBJ2D(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                             const Array1<double>& gx_in, const Array1<double>& gy_in, Array1<double>& gx_out,
                             Array1<double>& gy_out, double eps);
// The same through the precomputed table: the hot-loop form.
void CALCLIMITEDGRADIENTBJ2D(const LimiterGeometry2D& geometry, const Array1<double>& phi,
                             const Array1<int>& element_flags, const Array1<double>& gx_in,
                             const Array1<double>& gy_in, Array1<double>& gx_out, Array1<double>& gy_out,
                             double eps);
// Several fields (for instance eta, P, Q) limited in place in one pass over
// the elements (more than four fields: one pass per group of four): field i
// scales *fields[i].gx and *fields[i].gy by its own alpha from
// *fields[i].value. Each field's result equals limiting it alone; the fields'
// gradient arrays must be distinct.
void CALCLIMITEDGRADIENTALLBJ2D(const LimiterGeometry2D& geometry, const Array1<int>& element_flags,
                                std::span<const GradientField> fields, double eps);

void CALCLIMITEDGRADIENTBJ3D(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                             const Array1<double>& gx_in, const Array1<double>& gy_in, const Array1<double>& gz_in,
                             Array1<double>& gx_out, Array1<double>& gy_out, Array1<double>& gz_out, double eps);

void CALCLIMITEDGRADIENTENO2D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                              const Array1<double>& gx_in, const Array1<double>& gy_in, Array1<double>& gx_out,
                              Array1<double>& gy_out);
void CALCLIMITEDGRADIENTENO3D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                              const Array1<double>& gx_in, const Array1<double>& gy_in,
                              const Array1<double>& gz_in, Array1<double>& gx_out, Array1<double>& gy_out,
                              Array1<double>& gz_out);

void CALCLIMITEDGRADIENTSIMPLE2D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                                 const Array1<double>& gx_in, const Array1<double>& gy_in, Array1<double>& gx_out,
                                 Array1<double>& gy_out);

// The limiter chosen by its code (0 copies the gradient). An unknown code
// stops the run with "Type not supported for gradient limiter".
void CALCLIMITEDGRADIENT2D(int code, const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                           const Array1<int>& face_flags, const Array1<double>& gx_in, const Array1<double>& gy_in,
                           Array1<double>& gx_out, Array1<double>& gy_out, double eps);
// Code 2 is the fatal error "Simple limiter not implemented in 3D".
void CALCLIMITEDGRADIENT3D(int code, const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                           const Array1<int>& face_flags, const Array1<double>& gx_in, const Array1<double>& gy_in,
                           const Array1<double>& gz_in, Array1<double>& gx_out, Array1<double>& gy_out,
                           Array1<double>& gz_out, double eps);

}  // namespace vhd
