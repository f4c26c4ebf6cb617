// Quadtree element search.

#include "mesh/search_tree.hpp"

#include <algorithm>
#include <new>
#include <vector>

#include "log/log.hpp"

namespace vhd {

namespace {

struct Corners {
  int n = 0;
  double x[4], y[4];
};

// Corner nodes of element (column) e: 3 for a triangle, 4 for a
// quadrilateral, 0 for any other shape (not searchable).
void LoadCorners(const Mesh& mesh, const SearchTree2D& tree, int e, Corners& c) {
  const ElementTable& el = mesh.elements;
  int elem = e;
  c.n = 0;
  if (tree.columns) {
    elem = mesh.column_element_start[e];
    const int nn = ElementNodeCount(el, elem);
    c.n = nn == 6 ? 3 : (nn == 8 ? 4 : 0);
  } else if (el.shape[e] > 0) {
    const RefElement& r = ElementShape(mesh, e);
    if (r.dimension == 2) c.n = r.shape == kShapeTriangle ? 3 : 4;
  }
  for (int j = 0; j < c.n; ++j) {
    const int k = ElementNode(el, elem, j + 1);
    c.x[j] = mesh.nodes.x[k];
    c.y[j] = mesh.nodes.y[k];
  }
}

// Area-coordinate test of P in triangle (a, b, c) with the search tolerance.
inline bool InTriangle(double px, double py, double ax, double ay, double bx, double by, double cx, double cy) {
  const double d = (bx - ax) * (cy - ay) - (by - ay) * (cx - ax);
  if (d == 0) return false;
  const double xi = ((px - ax) * (cy - ay) - (py - ay) * (cx - ax)) / d;
  const double eta = ((bx - ax) * (py - ay) - (by - ay) * (px - ax)) / d;
  return xi >= -1e-10 && xi <= 1.0000000001 && eta >= -1e-10 && eta <= 1.0000000001 && xi + eta <= 1.0000000001;
}

bool InCorners(const Corners& c, double x, double y) {
  if (c.n < 3) return false;
  if (InTriangle(x, y, c.x[0], c.y[0], c.x[1], c.y[1], c.x[2], c.y[2])) return true;
  return c.n == 4 && InTriangle(x, y, c.x[0], c.y[0], c.x[2], c.y[2], c.x[3], c.y[3]);
}

// Does the element meet the box? An edge meets it unless both its end points
// lie beyond one side of the box or all four box corners lie strictly on one
// side of its line; a box inside the element has its centre inside.
bool Meets(const Corners& c, const SearchTree2D::Cell& b) {
  if (c.n < 3) return false;
  for (int j = 0; j < c.n; ++j) {
    const int i = (j + 1) % c.n;
    const double ax = c.x[j], ay = c.y[j], bx = c.x[i], by = c.y[i];
    if ((ax < b.xmin && bx < b.xmin) || (ax > b.xmax && bx > b.xmax) || (ay < b.ymin && by < b.ymin) ||
        (ay > b.ymax && by > b.ymax))
      continue;
    int pos = 0, neg = 0;
    const double qx[4] = {b.xmin, b.xmax, b.xmax, b.xmin}, qy[4] = {b.ymin, b.ymin, b.ymax, b.ymax};
    for (int k = 0; k < 4; ++k) {
      const double s = (bx - ax) * (qy[k] - ay) - (by - ay) * (qx[k] - ax);
      if (s > 0) ++pos;
      else if (s < 0) ++neg;
    }
    if (pos < 4 && neg < 4) return true;
  }
  return InCorners(c, 0.5 * (b.xmin + b.xmax), 0.5 * (b.ymin + b.ymax));
}

SearchTree2D::Cell Quadrant(const SearchTree2D::Cell& p, int k) {
  SearchTree2D::Cell q;
  const double xm = 0.5 * (p.xmin + p.xmax), ym = 0.5 * (p.ymin + p.ymax);
  q.xmin = (k & 1) ? xm : p.xmin;
  q.xmax = (k & 1) ? p.xmax : xm;
  q.ymin = (k & 2) ? ym : p.ymin;
  q.ymax = (k & 2) ? p.ymax : ym;
  return q;
}

// Moves the list of a leaf to the end of `entries` with room for twice as
// many elements (the old slots stay unused).
void GrowLeaf(SearchTree2D& tree, int cell) {
  SearchTree2D::Cell& leaf = tree.cells[cell];
  const int block = static_cast<int>(tree.entries.size());
  tree.entries.resize(tree.entries.size() + 2 * static_cast<std::size_t>(leaf.capacity), 0);
  std::copy_n(tree.entries.begin() + leaf.block, leaf.count, tree.entries.begin() + block);
  leaf.block = block;
  leaf.capacity *= 2;
}

void Append(SearchTree2D& tree, int cell, int e) {
  if (tree.cells[cell].count == tree.cells[cell].capacity) GrowLeaf(tree, cell);
  SearchTree2D::Cell& leaf = tree.cells[cell];
  tree.entries[static_cast<std::size_t>(leaf.block + leaf.count)] = e;
  ++leaf.count;
}

void Insert(const Mesh& mesh, SearchTree2D& tree, int cell, int e, const Corners& ce, int depth) {
  if (!Meets(ce, tree.cells[cell])) return;
  if (tree.cells[cell].count < 0) {
    const int first = tree.cells[cell].child;
    for (int k = 0; k < 4; ++k) Insert(mesh, tree, first + k, e, ce, depth + 1);
    return;
  }
  const SearchTree2D::Cell leaf = tree.cells[cell];
  if (leaf.count < kSearchTreeCapacity || depth >= kSearchTreeMaxDepth) {
    Append(tree, cell, e);
    return;
  }
  // Full leaf: split into the four quadrants, unless the split would not
  // separate the elements (they all meet at one point, such as the elements
  // around a node of high valence): the leaf then takes one more.
  const int nitems = leaf.count + 1;
  std::vector<int> items(static_cast<std::size_t>(nitems));
  std::vector<Corners> corners(static_cast<std::size_t>(nitems));
  std::copy_n(tree.entries.begin() + leaf.block, leaf.count, items.begin());
  items[leaf.count] = e;
  SearchTree2D::Cell quadrant[4];
  for (int k = 0; k < 4; ++k) quadrant[k] = Quadrant(leaf, k);
  int placements = 0;
  for (int i = 0; i < nitems; ++i) {
    if (i < leaf.count) LoadCorners(mesh, tree, items[i], corners[i]);
    else corners[i] = ce;
    for (int k = 0; k < 4; ++k) placements += Meets(corners[i], quadrant[k]) ? 1 : 0;
  }
  if (placements >= 3 * (nitems - 1)) {
    Append(tree, cell, e);
    return;
  }

  const int first = static_cast<int>(tree.cells.size());
  for (int k = 0; k < 4; ++k) {
    quadrant[k].block = k == 0 ? leaf.block : static_cast<int>(tree.entries.size()) + (k - 1) * kSearchTreeCapacity;
    quadrant[k].capacity = k == 0 ? leaf.capacity : kSearchTreeCapacity;
    tree.cells.push_back(quadrant[k]);
  }
  tree.entries.resize(tree.entries.size() + 3 * kSearchTreeCapacity, 0);
  tree.cells[cell].child = first;
  tree.cells[cell].count = -1;
  for (int i = 0; i < nitems; ++i)
    for (int k = 0; k < 4; ++k) Insert(mesh, tree, first + k, items[static_cast<std::size_t>(i)],
                                       corners[static_cast<std::size_t>(i)], depth + 1);
}

inline bool Holds(const SearchTree2D::Cell& c, double x, double y) {
  return x >= c.xmin && x <= c.xmax && y >= c.ymin && y <= c.ymax;
}

// Leaf cell of the descent for (x, y); -1 outside the root box.
int LeafOf(const SearchTree2D& tree, double x, double y) {
  if (tree.cells.empty() || !Holds(tree.cells[0], x, y)) return -1;
  int cell = 0;
  while (tree.cells[cell].count < 0) {
    const int first = tree.cells[cell].child;
    int next = -1;
    for (int k = 0; k < 4 && next < 0; ++k)
      if (Holds(tree.cells[first + k], x, y)) next = first + k;
    if (next < 0) FatalError("FindElementID2DSearchTree: Error in search tree");
    cell = next;
  }
  return cell;
}

}  // namespace

void BuildSearchTree2D(const Mesh& mesh, SearchTree2D& tree) {
  tree = SearchTree2D();
  if (mesh.ndim == 3 && mesh.nlayers <= 0) FatalError("BuildSearchTree2D: Mesh must be 2D or 3D layered");
  tree.columns = mesh.ndim == 3;
  tree.nitems = tree.columns ? mesh.column_element_start.size() - 1 : mesh.elements.nelements;
  const NodeTable& nd = mesh.nodes;
  SearchTree2D::Cell root;
  if (nd.nnodes > 0) {
    root.xmin = root.xmax = nd.x[1];
    root.ymin = root.ymax = nd.y[1];
  }
  for (int i = 2; i <= nd.nnodes; ++i) {
    root.xmin = std::min(root.xmin, nd.x[i]);
    root.xmax = std::max(root.xmax, nd.x[i]);
    root.ymin = std::min(root.ymin, nd.y[i]);
    root.ymax = std::max(root.ymax, nd.y[i]);
  }
  try {
    tree.cells.reserve(static_cast<std::size_t>(tree.nitems) / 4 + 16);
    tree.entries.reserve(static_cast<std::size_t>(tree.nitems) * 3 + kSearchTreeCapacity);
    tree.cells.push_back(root);
    tree.entries.assign(kSearchTreeCapacity, 0);
    for (int e = 1; e <= tree.nitems; ++e) InsertElementd2DSearchTree(mesh, tree, e);
  } catch (const std::bad_alloc&) {
    FatalError("BuildSearchTree2D: Out of memory");
  }
}

void InsertElementd2DSearchTree(const Mesh& mesh, SearchTree2D& tree, int e) {
  Corners c;
  LoadCorners(mesh, tree, e, c);
  if (c.n < 3 || tree.cells.empty()) return;
  Insert(mesh, tree, 0, e, c, 0);
}

int FindElementID2DSearchTree(double x, double y, const Mesh& mesh, const SearchTree2D& tree) {
  const int cell = LeafOf(tree, x, y);
  if (cell < 0) return 0;
  const SearchTree2D::Cell& leaf = tree.cells[cell];
  for (int i = 0; i < leaf.count; ++i) {
    const int e = tree.entries[static_cast<std::size_t>(leaf.block + i)];
    if (PointInElement2D(mesh, tree, e, x, y)) return e;
  }
  return 0;
}

std::span<const int> SearchTreeLeaf(const SearchTree2D& tree, double x, double y) {
  const int cell = LeafOf(tree, x, y);
  if (cell < 0) return {};
  const SearchTree2D::Cell& leaf = tree.cells[cell];
  return {tree.entries.data() + leaf.block, static_cast<std::size_t>(leaf.count)};
}

bool PointInElement2D(const Mesh& mesh, const SearchTree2D& tree, int e, double x, double y) {
  Corners c;
  LoadCorners(mesh, tree, e, c);
  return InCorners(c, x, y);
}

}  // namespace vhd
