#pragma once
// Quadtree over the elements of a 2D mesh: which element holds a point?
//
// The root cell is the bounding box of all node coordinates. A leaf lists up
// to kSearchTreeCapacity (20) elements, each element in every leaf whose box
// it meets (an edge of the element meets the box, or the box lies inside the
// element). A full leaf that receives one more element splits into its four
// quadrants (split at the box midpoints; children in the order south-west,
// south-east, north-west, north-east) and its elements go to the quadrants
// they meet. When the quadrants together would hold 3 x 20 entries or more
// (3 x (n - 1) for a leaf that already holds n > 20) the split would not
// separate the elements, as around a node shared by more than 20 elements:
// the leaf keeps them all and lists more than 20. So does a leaf at depth
// kSearchTreeMaxDepth (many elements crowded on one point).
//
// A point is found by descending into the first child whose box holds it
// (bounds inclusive) and testing the leaf's elements in list order with area
// coordinates (tolerance 1e-10: a point on an edge belongs to both elements
// and the first in the leaf's list wins); quadrilaterals are tested as the
// triangles (1, 2, 3) and (1, 3, 4). Points outside the root box, or inside it
// but in no element, give 0.
//
// A layered 3D mesh is searched through its 2D columns: the tree lists the
// column numbers (the 2D element numbers) with the bottom corner nodes of each
// column, and the search returns the column.
//
// Threads: the tree is built once on the main thread; searches only read it
// and may run from several threads at once.

#include <span>
#include <vector>

#include "mesh/mesh.hpp"

namespace vhd {

inline constexpr int kSearchTreeCapacity = 20;
inline constexpr int kSearchTreeMaxDepth = 60;

struct SearchTree2D {
  struct Cell {
    double xmin = 0, ymin = 0, xmax = 0, ymax = 0;
    int child = 0;  // first of the four children (consecutive), 0 for a leaf
    int count = 0;  // elements listed in a leaf; -1 marks an inner cell
    int block = 0;  // position of the leaf's list in `entries`
    int capacity = kSearchTreeCapacity;  // slots of the leaf's list
  };
  std::vector<Cell> cells;  // cells[0] is the root
  std::vector<int> entries; // leaf lists, `capacity` slots per leaf
  bool columns = false;     // built over the columns of a layered 3D mesh
  int nitems = 0;           // elements (columns) inserted
};

// Builds the tree (replacing it). A 3D mesh without layers is the fatal error
// "BuildSearchTree2D: Mesh must be 2D or 3D layered".
void BuildSearchTree2D(const Mesh& mesh, SearchTree2D& tree);
// Inserts element (column) e into the tree below the root.
void InsertElementd2DSearchTree(const Mesh& mesh, SearchTree2D& tree, int e);
// The element (column) holding (x, y), or 0.
int FindElementID2DSearchTree(double x, double y, const Mesh& mesh, const SearchTree2D& tree);

// The list of the leaf that a search for (x, y) ends in (empty outside the
// root box).
std::span<const int> SearchTreeLeaf(const SearchTree2D& tree, double x, double y);
// Point-in-element test of the search (area coordinates with tolerance) for
// element (column) e.
bool PointInElement2D(const Mesh& mesh, const SearchTree2D& tree, int e, double x, double y);

}  // namespace vhd
