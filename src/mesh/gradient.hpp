#pragma once
// Gradient reconstruction of cell-centred fields (module FEMGRADIENT).
//
// A second-order finite-volume step needs, in every element, the gradient of
// each cell-centred variable (water level, velocities, concentrations). Two
// families live here:
//
//  1. Stencil gradients. SetupGradient computes, once at setup, a linear
//     stencil per element: the gradient of element e is
//         dphi/dx(e) = sum_k wx[k] phi[index[k]],  k = start[e] .. start[e+1]-1
//     (likewise wy, and wz in 3D). Applying it (CALCGRADIENTELEMENT2D and
//     relatives) is one sparse product per field. Every stencil reproduces a
//     linear field exactly on elements whose neighbours all take part.
//
//     Gradient types (the `gradient_calculation` code of the schemes):
//       1  face neighbours: an element with few valid neighbours (a triangle
//          with at most 1, a quadrilateral with at most 2) takes the exact
//          gradient of the plane through its face points; others take the
//          least-squares gradient over the first ring;
//       2  least squares over the first ring of face neighbours, and over the
//          second ring too when the neighbourhood parameter exceeds 4;
//       3  least squares over the first and second rings always.
//     Least-squares weights are inverse squared distances: with offsets
//     d_i = x_i - x_e, w_i = 1/|d_i|^2, M = sum w_i d_i d_i^T, the gradient is
//     M^-1 sum w_i d_i (phi_i - phi_e).
//
//     A face takes part ("valid neighbour") when it has a second element, both
//     elements are active (element flag 1) and the face flag is positive.
//     The flags given at setup describe the permanent layout (excluded
//     elements, closed structures); drying and flooding do not rebuild a
//     stencil: the limiters take the current wet/dry codes instead.
//
//     Boundary treatment (the `boundary_correction` code), for a face without
//     a valid neighbour:
//       2  the ghost point is the mirror image of e's centroid in the face
//          line. SetupBoundaryGradient2D then corrects the rows of such
//          elements: the ghost carries the value extrapolated from e with
//          e's own gradient, which drops the ghost out of the normal
//          equations, so the row becomes the least-squares gradient over the
//          real neighbours (first ring, widened to the second ring where the
//          first does not determine a gradient). Boundary rows are then exact
//          for linear fields too. Where even two rings do not determine a
//          gradient the row keeps the mirrored ghost with e's own value (a
//          zero normal derivative at the wall).
//       other  type 1 puts a ghost with e's own value at the face centre (a
//          zero normal derivative); types 2 and 3 add no point.
//     An element with too few points to fix a gradient gets a zero gradient.
//
//  2. Green-Gauss ("simple") gradients computed directly from face values:
//     the face value is the distance-weighted mean of the two element values
//     (the nearer centroid weighs more), the element's own value on a
//     boundary face; grad phi(e) = (1/A) sum_faces (phi_f - phi_e) n L. The
//     "- phi_e" leaves the sum unchanged on a closed element (sum n L = 0) and
//     stands for the missing bed and surface faces of a layered column.
//
//  3. Node-based gradients: the gradient of the element's polygon (polyhedron
//     in 3D) from node values, by Green-Gauss over its edges (faces): exact
//     for fields linear in the coordinates.
//
// Units: gradients are field units per coordinate unit (per metre; per radian
// on a "LONG/LAT" mesh, where the solver applies the metric factors).
//
// Threads and processes: every apply routine is one static OpenMP loop over
// the owned elements (1 .. nelements_int); each iteration writes only its own
// element's entries. Halo entries of the outputs are left untouched for the
// halo exchange. The routines allocate nothing and may be called inside the
// time loop; they must be called outside a parallel region.
//
// Cost (2D, per element and field): the stencil product reads about 4 to 13
// weights for gradient types 1 and 2 on a triangle mesh, 10 to 30 with the
// second ring (type 3).

#include <span>

#include "core/array1.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

inline constexpr int kBoundaryMirror = 2;  // boundary treatment: mirrored centroid

// Precomputed linear gradient stencil in compressed-row form over elements.
struct GradientStencil {
  int ndim = 2;                // 2: wx, wy; 3: wx, wy, wz
  int type = 0;                // gradient type 1, 2, 3
  int boundary_treatment = 1;  // 2 = mirrored centroid
  int neighbourhood = 0;       // > 4: the second ring takes part (type 2)
  int nelements = 0;           // rows (all elements; halo rows are empty)
  int nowned = 0;              // owned elements: the rows the apply loops visit
  Array1<int> start;           // nelements + 1 entries, start[1] = 1
  Array1<int> index;           // element whose value entry k multiplies
  Array1<double> wx, wy, wz;   // weights (wz only in 3D)
  Array1<int> nvalid;          // faces of e whose neighbour took part
  Array1<int> nmissing;        // faces of e without a valid neighbour
};

// Element and face flags: element e is active when flags[e] == 1, face f is
// open when flags[f] > 0. An empty array means "all active" / "all open".

// Builds the stencil of gradient type 1, 2 or 3 for a mesh of dimension 2 or
// 3 (the stencil is replaced). Other types: "SetupGradient: Gradient type not
// supported". For a 2D mesh it ends with SetupBoundaryGradient2D.
void SetupGradient(const Mesh& mesh, int type, const Array1<int>& element_flags, const Array1<int>& face_flags,
                   int dimension, int boundary_treatment, int neighbourhood, GradientStencil& stencil);

// Boundary rows of a 2D stencil (see the header comment); runs after the
// interior stencil was built with the same flags.
void SetupBoundaryGradient2D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                             int boundary_treatment, GradientStencil& stencil);

// ---- stencil application (hot loop: one pass over the stencil per call) ----

// One field and its gradient arrays: the multi-field routines take a span of
// these (for instance eta, P and Q of the flow solver).
struct GradientField {
  const Array1<double>* value = nullptr;
  Array1<double>* gx = nullptr;
  Array1<double>* gy = nullptr;
};

// gx, gy (gz) must hold at least nelements entries.
void CALCGRADIENTELEMENT2D(const GradientStencil& s, const Array1<double>& phi, Array1<double>& gx,
                           Array1<double>& gy);
// Several fields (for instance eta, P, Q) in one pass over the stencil (more
// than four fields: one pass per group of four): each stencil entry's element
// number and weights are read once for all fields. Each field's gradient
// equals CALCGRADIENTELEMENT2D on it alone, bit for bit.
void CALCGRADIENTALLELEMENT2D(const GradientStencil& s, std::span<const GradientField> fields);
void CALCGRADIENTELEMENT3D(const GradientStencil& s, const Array1<double>& phi, Array1<double>& gx,
                           Array1<double>& gy, Array1<double>& gz);
// Both velocity components in one pass over the stencil.
void CALCGRADIENTVELOCITYELEMENT2D(const GradientStencil& s, const Array1<double>& u, const Array1<double>& v,
                                   Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                   Array1<double>& vy);
void CALCGRADIENTVELOCITYELEMENT3D(const GradientStencil& s, const Array1<double>& u, const Array1<double>& v,
                                   const Array1<double>& w, Array1<double>& ux, Array1<double>& uy,
                                   Array1<double>& uz, Array1<double>& vx, Array1<double>& vy,
                                   Array1<double>& vz, Array1<double>& wx, Array1<double>& wy,
                                   Array1<double>& wz);

// ---- Green-Gauss ("simple") gradients ----

void CALCGRADIENTSIMPLE2D(const Mesh& mesh, const Array1<double>& phi, Array1<double>& gx, Array1<double>& gy);
// Several fields (for instance eta, d, P, Q) in one pass over the faces.
void CALCGRADIENTALLSIMPLE2D(const Mesh& mesh, std::span<const GradientField> fields);
void CALCGRADIENTSIMPLEVELOCITY2D(const Mesh& mesh, const Array1<double>& u, const Array1<double>& v,
                                  Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                  Array1<double>& vy);
// Over the faces of a 3D mesh (areas, 3D normals, volumes).
void CALCGRADIENTSIMPLE3D(const Mesh& mesh, const Array1<double>& phi, Array1<double>& gx, Array1<double>& gy,
                          Array1<double>& gz);
// Horizontal velocity gradients along the layers of a layered 3D mesh: the
// Green-Gauss sum over the vertical (side) faces of each element only.
void CALCGRADIENTSIGMASIMPLEVELOCITY3D(const Mesh& mesh, const Array1<double>& u, const Array1<double>& v,
                                       Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                       Array1<double>& vy);

// ---- node-based gradients ----

// Gradient of each element from node values (corner nodes of the element).
void CALCGRADIENTNODEVALUES2D(const Mesh& mesh, const Array1<double>& node_values, Array1<double>& gx,
                              Array1<double>& gy);
void CALCGRADIENTVELOCITYNODEVALUES2D(const Mesh& mesh, const Array1<double>& un, const Array1<double>& vn,
                                      Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                      Array1<double>& vy);
// Element velocity gradients through node values: the pseudo-Laplacian node
// values of u and v (over all elements) go to the caller's work arrays un, vn
// (nnodes entries), then the node-based gradient follows.
void CALCGRADIENTVELOCITYELEMENTVALUES2D(const Mesh& mesh, const Array1<double>& u, const Array1<double>& v,
                                         Array1<double>& un, Array1<double>& vn, Array1<double>& ux,
                                         Array1<double>& uy, Array1<double>& vx, Array1<double>& vy);
// 3D elements: Green-Gauss over the element's faces split into triangles.
void CALCGRADIENTNODEVALUES3D(const Mesh& mesh, const Array1<double>& node_values, Array1<double>& gx,
                              Array1<double>& gy, Array1<double>& gz);
void CALCGRADIENTVELOCITYNODEVALUES3D(const Mesh& mesh, const Array1<double>& un, const Array1<double>& vn,
                                      Array1<double>& ux, Array1<double>& uy, Array1<double>& uz,
                                      Array1<double>& vx, Array1<double>& vy, Array1<double>& vz);
// Horizontal gradient along the layer of each element of a layered 3D mesh:
// the mean of the 2D node-based gradients of its bottom and top node rings.
void CALCGRADIENTNODEVALUES3DLAYER(const Mesh& mesh, const Array1<double>& node_values, Array1<double>& gx,
                                   Array1<double>& gy);

}  // namespace vhd
