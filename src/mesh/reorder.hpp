#pragma once
// Renumbering of a read mesh for memory locality.
//
// Meshes from mesh generators number their elements in no spatial order, so
// the two elements of a face can lie far apart in memory and every face of
// the flux loop misses the caches. The domain setup therefore renumbers the
// elements of a 2D mesh before its faces and tables are built:
//   type_of_reordering 0  the file's order is kept;
//                      1  elements along a Hilbert curve through their centres;
//                      2  reverse Cuthill-McKee order of the element graph
//                         (elements joined through their edges).
// Nodes are then numbered in the order the elements first use them, and the
// faces, built element by element, come out in the order the face loop
// visits them.
//
// Both orders depend on the geometry only (ties are broken by the centre
// coordinates), so the same mesh numbered in two ways gets the same internal
// order and the same results, bit for bit.
//
// The user's numbering stays with the mesh: `id` keeps every node's and
// element's number as read, and `file_index` (ElementTable, NodeTable) the
// position each one had in the mesh file. Outputs on the mesh and inputs per
// element or node go through FileOrder; messages print `id`.

#include <vector>

#include "mesh/mesh.hpp"

namespace vhd {

inline constexpr int kReorderNone = 0;
inline constexpr int kReorderHilbert = 1;
inline constexpr int kReorderCuthillMcKee = 2;

// The element order of a reordering type over the elements first .. last
// (positions, inclusive) of a mesh without faces: result[k] is the element
// that goes to place first + k. Type 0 gives first .. last unchanged; a type
// other than 0, 1 and 2 is the fatal error "Illegal type of reordering".
// A later partitioning orders the owned elements of a sub-domain this way
// and puts the halo after them.
std::vector<int> ElementOrder(const Mesh& mesh, int type_of_reordering, int first, int last);

// Applies an element order to a mesh that has no faces yet: order[k-1] is the
// element that becomes element k (a permutation of 1 .. nelements). Nodes are
// renumbered in the order of their first use by the new elements (nodes used
// by no element follow in their old order). `file_index` of both tables is
// carried along, so it keeps pointing into the mesh file.
void ReorderMesh(Mesh& mesh, const std::vector<int>& order);

// Position in the mesh of the k-th element (node) of the mesh file.
// The tables hold file_index (position -> file place); this is its inverse,
// the identity for a mesh in file order.
Array1<int> FileOrder(const Array1<int>& file_index, int count);

// Hilbert index of the cell (x, y) of a 2^16 x 2^16 grid.
unsigned HilbertIndex(unsigned x, unsigned y);

}  // namespace vhd
