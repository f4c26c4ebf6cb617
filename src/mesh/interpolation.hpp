#pragma once
// Interpolation from element values to nodes and to points.
//
// Node values (pseudo-Laplacian). For a node with the centroids of its
// surrounding elements at offsets (dx_i, dy_i), with R = sum d_i and
// I = sum d_i d_i^T, the weights w_i = 1 + lambda . d_i (lambda chosen so that
// sum w_i d_i = 0, which makes the average exact for linear fields) are
// clipped to [0, 2] and the node value is sum w_i phi_i / sum w_i. Where the
// system is singular (|det I| <= 1e-10 Ixx Iyy) or the weights sum to zero,
// inverse-distance weights take over. Elements whose value equals the delete
// value take no part; a node without a usable element gets 0.
//
// Modes: 1 an ordinary scalar; 2 a direction in degrees: values are unwrapped
// around the first usable one (more than 180 below: +360, more than 180 above:
// -360) and the result is brought back into [0, 360).
//
// Wet variants (wet code per element: 1 wet, 0 dry, 2 flooded; only code 1
// counts as wet):
//   CALCNODEVALUESWETPL2D   wet elements only; a node whose elements are all
//                           dry gets the delete value (no value there);
//   CALCNODEVALUES2WETPL2D  wet elements only; a node whose elements are all
//                           dry takes the value over all its elements (a
//                           continuous field also over dry land).
// 3D (layered meshes): a 3D node averages the elements around it (the layers
// above and below it), weighted by the horizontal offsets of their centroids,
// which are the same in every layer. The wet flags of the 3D variants belong
// to the 2D columns (the 2D element of each 3D element), except for
// CALCNODEVALUES3WETPL3D, whose flags belong to the 3D elements (z-level cells
// that are dry within a wet column).
//
// Threads: the node routines are static OpenMP loops over the owned nodes;
// each iteration writes only its own node. No allocation.

#include "core/array1.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

inline constexpr int kModeScalar = 1;
inline constexpr int kModeDirection = 2;

// Node values of the owned nodes (all_nodes: of every node of the mesh,
// from element values that are complete on the whole mesh).
void CALCNODEVALUESPL2D(const Mesh& mesh, const Array1<double>& values, Array1<double>& node_values,
                        double delete_value, int mode, bool all_nodes = false);
void CALCNODEVALUESWETPL2D(const Mesh& mesh, const Array1<double>& values, const Array1<int>& wet,
                           Array1<double>& node_values, double delete_value, int mode);
void CALCNODEVALUES2WETPL2D(const Mesh& mesh, const Array1<double>& values, const Array1<int>& wet,
                            Array1<double>& node_values, double delete_value, int mode);

void CALCNODEVALUESPL3D(const Mesh& mesh3d, const Array1<double>& values, Array1<double>& node_values,
                        double delete_value, int mode);
void CALCNODEVALUESWETPL3D(const Mesh& mesh3d, const Array1<double>& values, const Array1<int>& wet2d,
                           Array1<double>& node_values, double delete_value, int mode);
void CALCNODEVALUES2WETPL3D(const Mesh& mesh3d, const Array1<double>& values, const Array1<int>& wet2d,
                            Array1<double>& node_values, double delete_value, int mode);
void CALCNODEVALUES3WETPL3D(const Mesh& mesh3d, const Array1<double>& values, const Array1<int>& wet3d,
                            Array1<double>& node_values, double delete_value, int mode);
// Node values of one layer (1 = bottom) on the 2D mesh: each 2D node averages
// the layer's 3D elements of the wet columns around it (columns with fewer
// layers take no part); node_values has the 2D mesh's nodes.
void CALCNODEVALUESWETPL3DLAYER(const Mesh& mesh2d, const Mesh& mesh3d, int layer, const Array1<double>& values,
                                const Array1<int>& wet2d, Array1<double>& node_values, double delete_value,
                                int mode);

// Value at point (x, y) inside 2D element e from the element's node values:
// linear in a triangle; in a quadrilateral the plane of the triangle (1, 2, 3)
// or (1, 3, 4) that holds the point (their mean when both do; the nearer one
// when the point lies outside). A delete value at any node gives the delete
// value. Other node counts: "CalcPointValue2D: Interpolation not possible for
// this type of element".
double CalcPointValue2D(const Mesh& mesh, double x, double y, int e, const Array1<double>& node_values,
                        double delete_value, int mode);
// Layered element (prism or hexahedron): the 2D rule on its bottom and top
// node rings, then linear in z between the two (clipped to the element).
double CalcPointValue3D(const Mesh& mesh3d, double x, double y, double z, int e, const Array1<double>& node_values,
                        double delete_value, int mode);

}  // namespace vhd
