#pragma once
// Mesh generator for tests, benchmarks and examples: the rectangle
// [x0, x1] x [y0, y1] divided into nx x ny cells, each cell one quadrilateral
// or two triangles, optionally with jittered interior nodes and rectangular
// holes. The result is a filled Mesh (nodes with bed levels and boundary
// codes, elements) ready for SetupMeshGeometry.
//
// Numbering: nodes row by row from the south-west corner (west to east, then
// south to north), elements cell by cell in the same order (the two triangles
// of a cell one after the other); unused grid nodes (inside holes) are left
// out. Elements run counter-clockwise.
//
// Boundary codes: a node on a side of the rectangle takes that side's code, a
// corner the lower of its two sides' codes, a node on the rim of a hole the
// hole code (the lower code where a hole touches a side). With the face-code
// rule of mesh.hpp every boundary face then carries the code of the side or
// hole it lies on. Interior nodes have code 0.
//
// Jitter moves every node that is neither on the rectangle's sides nor on a
// hole's rim by up to `jitter` cell sizes in x and in y (uniformly, from a
// generator seeded by `seed`, so the same seed gives the same mesh). jitter is
// limited to 0.2, which keeps every element at least a fifth of its regular
// area and every quadrilateral convex; the domain area stays exact.

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "mesh/mesh.hpp"

namespace vhd {

enum class CellLayout {
  kRightTriangles,   // two triangles per cell, diagonal south-west to north-east
  kRandomTriangles,  // two triangles per cell, diagonal direction drawn per cell
  kQuadrilaterals,   // one quadrilateral per cell
  kMixed,            // per cell a quadrilateral (quad_fraction) or two random triangles
};

// A hole [x0, x1] x [y0, y1]; its edges are moved to the nearest cell lines.
struct RectangleHole {
  double x0 = 0, x1 = 0, y0 = 0, y1 = 0;
};

struct RectangleMeshSpec {
  double x0 = 0.0, x1 = 1.0, y0 = 0.0, y1 = 1.0;
  int nx = 10, ny = 10;
  CellLayout layout = CellLayout::kRightTriangles;
  double jitter = 0.0;         // fraction of the cell size, 0 .. 0.2
  std::uint64_t seed = 1;      // jitter, diagonals and mixed cells
  double quad_fraction = 0.5;  // kMixed only
  std::vector<RectangleHole> holes;
  int code_west = 1, code_east = 1, code_south = 1, code_north = 1;  // land = 1
  int code_holes = 1;
  std::function<double(double, double)> bed;  // bed level z(x, y) in m; 0 when empty
  std::string projection = "NON-UTM";
};

// Fills mesh (cleared first). Bad sizes (nx or ny below 1, x1 <= x0, y1 <= y0)
// or holes that leave no cell are fatal errors naming the value.
void GenerateRectangleMesh(const RectangleMeshSpec& spec, Mesh& mesh);

// Area of the generated domain: the rectangle minus the snapped holes.
double GeneratedDomainArea(const RectangleMeshSpec& spec);

}  // namespace vhd
