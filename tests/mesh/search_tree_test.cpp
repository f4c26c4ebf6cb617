// Element search tree against an independent brute-force search.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>
#include <vector>

#include "mesh/search_tree.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::Generated;
using test::kLayouts;

// Brute force: element bounding boxes binned on a uniform grid; every element
// whose box holds the point is tested.
class BruteForce {
public:
  BruteForce(const Mesh& m, const SearchTree2D& tree, int nbins) : m_(m), tree_(tree), n_(nbins) {
    x0_ = y0_ = 1e300;
    x1_ = y1_ = -1e300;
    for (int i = 1; i <= m.nodes.nnodes; ++i) {
      x0_ = std::min(x0_, m.nodes.x[i]);
      x1_ = std::max(x1_, m.nodes.x[i]);
      y0_ = std::min(y0_, m.nodes.y[i]);
      y1_ = std::max(y1_, m.nodes.y[i]);
    }
    bins_.resize(static_cast<std::size_t>(n_) * n_);
    for (int e = 1; e <= m.elements.nelements; ++e) {
      double a = 1e300, b = -1e300, c = 1e300, d = -1e300;
      for (int j = 1; j <= ElementNodeCount(m.elements, e); ++j) {
        const int k = ElementNode(m.elements, e, j);
        a = std::min(a, m.nodes.x[k]);
        b = std::max(b, m.nodes.x[k]);
        c = std::min(c, m.nodes.y[k]);
        d = std::max(d, m.nodes.y[k]);
      }
      for (int i = Bin(a, x0_, x1_); i <= Bin(b, x0_, x1_); ++i)
        for (int j = Bin(c, y0_, y1_); j <= Bin(d, y0_, y1_); ++j) bins_[i + j * n_].push_back(e);
    }
  }
  // Every element holding the point, ascending.
  std::vector<int> Holding(double x, double y) const {
    std::vector<int> r;
    if (x < x0_ || x > x1_ || y < y0_ || y > y1_) return r;
    for (int e : bins_[Bin(x, x0_, x1_) + Bin(y, y0_, y1_) * n_])
      if (PointInElement2D(m_, tree_, e, x, y)) r.push_back(e);
    return r;
  }

private:
  int Bin(double v, double lo, double hi) const {
    return std::clamp(static_cast<int>((v - lo) / (hi - lo) * n_), 0, n_ - 1);
  }
  const Mesh& m_;
  const SearchTree2D& tree_;
  int n_;
  double x0_, x1_, y0_, y1_;
  std::vector<std::vector<int>> bins_;
};

TEST(SearchTree, EveryCentroidIsFoundInItsElement) {
  for (const auto& layout : kLayouts) {
    const Mesh m = Generated(layout.layout, 40, 30, 0.2, 19, {{20, 45, 30, 50}, {70, 90, 0, 20}});
    SearchTree2D tree;
    BuildSearchTree2D(m, tree);
    for (int e = 1; e <= m.elements.nelements; ++e)
      ASSERT_EQ(FindElementID2DSearchTree(m.elements.xc[e], m.elements.yc[e], m, tree), e) << layout.name;
    for (const SearchTree2D::Cell& c : tree.cells) ASSERT_LE(c.count, kSearchTreeCapacity);
  }
}

// 100,000 random points on a 100,000-element mesh with a hole, some points
// outside the mesh; then points on shared edges and on nodes, which belong to
// several elements: the first of them in the leaf's list is returned.
TEST(SearchTree, AgreesWithBruteForceOnALargeMesh) {
  const Mesh m = Generated(CellLayout::kRandomTriangles, 260, 196, 0.2, 23, {{100, 120, 80, 100}}, 260, 196);
  ASSERT_GE(m.elements.nelements, 100000);
  SearchTree2D tree;
  BuildSearchTree2D(m, tree);
  const BruteForce brute(m, tree, 400);
  std::mt19937 rng(29);
  std::uniform_real_distribution<double> ux(-5, 265), uy(-5, 201);
  int outside = 0, inside = 0;
  for (int p = 0; p < 100000; ++p) {
    const double x = ux(rng), y = uy(rng);
    const std::vector<int> holding = brute.Holding(x, y);
    const int found = FindElementID2DSearchTree(x, y, m, tree);
    if (holding.empty()) {
      ASSERT_EQ(found, 0) << x << " " << y;
      ++outside;
    } else {
      ASSERT_TRUE(std::find(holding.begin(), holding.end(), found) != holding.end()) << x << " " << y;
      if (holding.size() == 1) {
        ASSERT_EQ(found, holding[0]);
      }
      ++inside;
    }
  }
  EXPECT_GT(outside, 1000);  // the hole and the margin
  EXPECT_GT(inside, 90000);

  auto first_in_leaf = [&](double x, double y, const std::vector<int>& holding) {
    for (int e : SearchTreeLeaf(tree, x, y))
      if (std::find(holding.begin(), holding.end(), e) != holding.end()) return e;
    return 0;
  };
  int shared = 0;
  for (int f = 1; f <= m.faces.nfaces; f += 7) {
    if (m.faces.element2[f] == 0) continue;
    const double x = m.faces.xf[f], y = m.faces.yf[f];
    const std::vector<int> holding = brute.Holding(x, y);
    ASSERT_TRUE(std::find(holding.begin(), holding.end(), m.faces.element1[f]) != holding.end());
    ASSERT_TRUE(std::find(holding.begin(), holding.end(), m.faces.element2[f]) != holding.end());
    ASSERT_EQ(FindElementID2DSearchTree(x, y, m, tree), first_in_leaf(x, y, holding)) << "face " << f;
    ++shared;
  }
  for (int i = 1; i <= m.nodes.nnodes; i += 13) {
    const double x = m.nodes.x[i], y = m.nodes.y[i];
    const std::vector<int> holding = brute.Holding(x, y);
    ASSERT_EQ(static_cast<int>(holding.size()), NodeElementCount(m.nodes, i));
    ASSERT_EQ(FindElementID2DSearchTree(x, y, m, tree), first_in_leaf(x, y, holding)) << "node " << i;
  }
  EXPECT_GT(shared, 10000);
}

// A large element next to many small ones: deep quadrants lie wholly inside
// the large element, with none of its edges meeting them; it must be listed
// there all the same.
TEST(SearchTree, BoxInsideALargeElement) {
  const Mesh fine = Generated(CellLayout::kRightTriangles, 10, 10, 0.0, 1, {}, 1.0, 1.0);
  Mesh m;
  const int nn = fine.nodes.nnodes, ne = fine.elements.nelements;
  AllocateNodes(m.nodes, nn + 3);
  for (int i = 1; i <= nn; ++i) AddNode(m.nodes, i, fine.nodes.x[i], fine.nodes.y[i], 0, 0);
  AddNode(m.nodes, nn + 1, 1.0, 0.0, 0, 0);
  AddNode(m.nodes, nn + 2, 64.0, 0.0, 0, 0);
  AddNode(m.nodes, nn + 3, 0.0, 64.0, 0, 0);
  AllocateElementsBasic(m.elements, ne + 1, 3 * ne + 3);
  for (int e = 1; e <= ne; ++e) {
    int nodes[3];
    for (int j = 0; j < 3; ++j) nodes[j] = ElementNode(fine.elements, e, j + 1);
    AddElement(m.elements, e, 21, 3, nodes);
  }
  const int big[3] = {nn + 1, nn + 2, nn + 3};
  AddElement(m.elements, ne + 1, 21, 3, big);
  SetupShapeData(m);
  SearchTree2D tree;
  BuildSearchTree2D(m, tree);
  EXPECT_EQ(FindElementID2DSearchTree(3.0, 3.0, m, tree), ne + 1);
  EXPECT_EQ(FindElementID2DSearchTree(1.5, 1.5, m, tree), ne + 1);
  EXPECT_EQ(FindElementID2DSearchTree(40.0, 40.0, m, tree), 0);  // beyond the hypotenuse
  EXPECT_EQ(FindElementID2DSearchTree(-1.0, 3.0, m, tree), 0);   // outside the root box
  const BruteForce brute(m, tree, 64);
  std::mt19937 rng(2);
  std::uniform_real_distribution<double> u(0, 4);
  for (int p = 0; p < 20000; ++p) {
    const double x = u(rng), y = u(rng);
    const std::vector<int> holding = brute.Holding(x, y);
    const int found = FindElementID2DSearchTree(x, y, m, tree);
    if (holding.empty()) ASSERT_EQ(found, 0);
    else ASSERT_TRUE(std::find(holding.begin(), holding.end(), found) != holding.end()) << x << " " << y;
  }
}

// Elements around a node of high valence meet every quadrant of any box
// around the node, so no split separates them: the leaf keeps them all. A fan
// of n triangles around the centre of the bounding box (the first split
// point), and 25 copies of one triangle (all in every quadrant).
TEST(SearchTree, ElementsThatNoSplitSeparatesShareOneLeaf) {
  for (const int n : {21, 24, 64}) {
    SCOPED_TRACE(n);
    Mesh m;
    AllocateNodes(m.nodes, n + 1);
    AddNode(m.nodes, 1, 0, 0, 0, 0);
    for (int k = 0; k < n; ++k) {
      const double a = 2 * M_PI * k / n;
      AddNode(m.nodes, k + 2, std::cos(a), std::sin(a), 0, 1);
    }
    AllocateElementsBasic(m.elements, n, 3 * n);
    for (int k = 0; k < n; ++k) {
      const int tri[3] = {1, k + 2, (k + 1) % n + 2};
      AddElement(m.elements, k + 1, 21, 3, tri);
    }
    SetupMeshGeometry(m);
    SearchTree2D tree;
    BuildSearchTree2D(m, tree);
    int largest = 0;
    for (const SearchTree2D::Cell& c : tree.cells) largest = std::max(largest, c.count);
    EXPECT_EQ(largest, n);
    for (int e = 1; e <= n; ++e) ASSERT_EQ(FindElementID2DSearchTree(m.elements.xc[e], m.elements.yc[e], m, tree), e);
    const BruteForce brute(m, tree, 16);
    std::mt19937 rng(n);
    std::uniform_real_distribution<double> u(-1.05, 1.05);
    for (int p = 0; p < 5000; ++p) {
      const double x = u(rng), y = u(rng);
      const std::vector<int> holding = brute.Holding(x, y);
      const int found = FindElementID2DSearchTree(x, y, m, tree);
      if (holding.empty()) ASSERT_EQ(found, 0) << x << " " << y;
      else ASSERT_TRUE(std::find(holding.begin(), holding.end(), found) != holding.end()) << x << " " << y;
    }
  }

  Mesh m;
  AllocateNodes(m.nodes, 3);
  AddNode(m.nodes, 1, 0, 0, 0, 0);
  AddNode(m.nodes, 2, 1, 0, 0, 0);
  AddNode(m.nodes, 3, 0, 1, 0, 0);
  AllocateElementsBasic(m.elements, 25, 75);
  const int tri[3] = {1, 2, 3};
  for (int e = 1; e <= 25; ++e) AddElement(m.elements, e, 21, 3, tri);
  SetupShapeData(m);
  SearchTree2D tree;
  BuildSearchTree2D(m, tree);
  EXPECT_EQ(FindElementID2DSearchTree(0.2, 0.2, m, tree), 1);
  EXPECT_EQ(SearchTreeLeaf(tree, 0.2, 0.2).size(), 25u);
}

TEST(SearchTree, LayeredMeshSearchesItsColumns) {
  RectangleMeshSpec spec = test::Rectangle(0, 50, 0, 40, 10, 8, CellLayout::kMixed, 0.2);
  spec.bed = [](double, double) { return -5.0; };
  Mesh m2;
  const Mesh m3 = test::Layered(spec, 3, -5.0, m2);
  SearchTree2D tree;
  BuildSearchTree2D(m3, tree);
  for (int c = 1; c <= m2.elements.nelements; ++c)
    ASSERT_EQ(FindElementID2DSearchTree(m2.elements.xc[c], m2.elements.yc[c], m3, tree), c);

  Mesh flat = m3;
  flat.nlayers = 0;
  EXPECT_FATAL(BuildSearchTree2D(flat, tree), "BuildSearchTree2D: Mesh must be 2D or 3D layered");
}

}  // namespace
}  // namespace vhd
