// Element and node order: the same mesh in any numbering gets the same
// internal order, the renumbered mesh is the same mesh, and the orders keep
// face neighbours close.

#include <gtest/gtest.h>

#include <algorithm>
#include <numeric>
#include <random>

#include "mesh/reorder.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

Mesh Unbuilt(CellLayout layout, int nx, int ny) {
  RectangleMeshSpec s = test::Rectangle(0, 10.0 * nx, 0, 10.0 * ny, nx, ny, layout, 0.2);
  s.seed = 3;
  Mesh m;
  GenerateRectangleMesh(s, m);
  return m;
}

// The mesh with its elements in a random order (nodes follow their first use)
// and that order taken as the file's.
Mesh Shuffled(Mesh m, unsigned seed) {
  std::vector<int> order(static_cast<std::size_t>(m.elements.nelements));
  std::iota(order.begin(), order.end(), 1);
  std::shuffle(order.begin(), order.end(), std::mt19937(seed));
  ReorderMesh(m, order);
  m.elements.file_index.clear();
  m.nodes.file_index.clear();
  return m;
}

Mesh Reordered(Mesh m, int type) {
  ReorderMesh(m, ElementOrder(m, type, 1, m.elements.nelements));
  return m;
}

double MeanFaceDistance(Mesh m) {
  SetupMeshGeometry(m);
  double sum = 0;
  int n = 0;
  for (int f = 1; f <= m.faces.nfaces; ++f) {
    if (m.faces.element2[f] == 0) continue;
    sum += std::abs(m.faces.element1[f] - m.faces.element2[f]);
    ++n;
  }
  return sum / n;
}

// Node coordinates of element e in local order.
std::vector<double> Corners(const Mesh& m, int e) {
  std::vector<double> c;
  for (int j = 1; j <= ElementNodeCount(m.elements, e); ++j) {
    const int n = ElementNode(m.elements, e, j);
    c.insert(c.end(), {m.nodes.x[n], m.nodes.y[n], m.nodes.z[n]});
  }
  return c;
}

struct OrderCase {
  CellLayout layout;
  int type;
};

class MeshOrder : public ::testing::TestWithParam<OrderCase> {};

TEST_P(MeshOrder, SameOrderFromAnyNumberingAndTheSameMesh) {
  const OrderCase p = GetParam();
  const Mesh generated = Unbuilt(p.layout, 24, 17);
  const Mesh shuffled = Shuffled(generated, 11);
  const Mesh a = Reordered(generated, p.type);
  const Mesh b = Reordered(shuffled, p.type);
  ASSERT_EQ(a.elements.nelements, generated.elements.nelements);
  ASSERT_EQ(a.nodes.nnodes, generated.nodes.nnodes);
  for (int e = 1; e <= a.elements.nelements; ++e) {
    // The same element at every place, whatever the numbering read.
    ASSERT_EQ(Corners(a, e), Corners(b, e)) << e;
    // file_index points at the same element in the file read.
    EXPECT_EQ(Corners(a, e), Corners(generated, a.elements.file_index[e])) << e;
    EXPECT_EQ(Corners(b, e), Corners(shuffled, b.elements.file_index[e])) << e;
    EXPECT_EQ(a.elements.id[e], generated.elements.id[a.elements.file_index[e]]);
    EXPECT_EQ(a.elements.type[e], generated.elements.type[a.elements.file_index[e]]);
  }
  // Nodes in the order of their first use; each keeps its id, code and place.
  int next = 1;
  for (int q = 1; q < a.elements.node_start[a.elements.nelements + 1]; ++q) {
    const int n = a.elements.node_list[q];
    ASSERT_LE(n, next);
    if (n == next) ++next;
  }
  for (int n = 1; n <= a.nodes.nnodes; ++n) {
    const int k = a.nodes.file_index[n];
    EXPECT_EQ(a.nodes.id[n], generated.nodes.id[k]);
    EXPECT_EQ(a.nodes.code[n], generated.nodes.code[k]);
    EXPECT_EQ(a.nodes.x[n], generated.nodes.x[k]);
  }
  // Face neighbours far closer than in the shuffled numbering (about a third
  // of the elements apart there).
  const double shuffled_distance = MeanFaceDistance(shuffled);
  EXPECT_GT(shuffled_distance, 0.25 * shuffled.elements.nelements);
  EXPECT_LT(MeanFaceDistance(b), 0.1 * shuffled_distance);
}

INSTANTIATE_TEST_SUITE_P(Layouts, MeshOrder,
                         ::testing::Values(OrderCase{CellLayout::kRandomTriangles, kReorderHilbert},
                                           OrderCase{CellLayout::kQuadrilaterals, kReorderHilbert},
                                           OrderCase{CellLayout::kMixed, kReorderHilbert},
                                           OrderCase{CellLayout::kRandomTriangles, kReorderCuthillMcKee},
                                           OrderCase{CellLayout::kMixed, kReorderCuthillMcKee}));

TEST(MeshOrder, RenumberingTwiceKeepsTheFilePlaces) {
  const Mesh generated = Unbuilt(CellLayout::kMixed, 9, 7);
  const Mesh twice = Reordered(Reordered(generated, kReorderCuthillMcKee), kReorderHilbert);
  for (int e = 1; e <= twice.elements.nelements; ++e)
    EXPECT_EQ(Corners(twice, e), Corners(generated, twice.elements.file_index[e])) << e;
  const Array1<int> place = FileOrder(twice.elements.file_index, twice.elements.nelements);
  for (int k = 1; k <= twice.elements.nelements; ++k) EXPECT_EQ(twice.elements.file_index[place[k]], k);
}

TEST(MeshOrder, NoneKeepsTheFileOrderAndUnknownTypesStop) {
  const Mesh generated = Unbuilt(CellLayout::kRightTriangles, 3, 2);
  std::vector<int> expected(static_cast<std::size_t>(generated.elements.nelements));
  std::iota(expected.begin(), expected.end(), 1);
  EXPECT_EQ(ElementOrder(generated, kReorderNone, 1, generated.elements.nelements), expected);
  EXPECT_FATAL(ElementOrder(generated, 3, 1, generated.elements.nelements),
               "Fatal error: Illegal type of reordering");
}

TEST(MeshOrder, HilbertIndexVisitsNeighbouringCells) {
  // Along the curve every step moves to an edge neighbour: on the 2^16 grid,
  // the cells of the lowest 4096 indices fill the 64 x 64 corner square.
  std::vector<int> at(4096, -1);
  for (unsigned x = 0; x < 64; ++x)
    for (unsigned y = 0; y < 64; ++y) {
      const unsigned d = HilbertIndex(x, y);
      ASSERT_LT(d, 4096u);
      at[d] = static_cast<int>(x * 64 + y);
    }
  for (unsigned d = 1; d < 4096; ++d) {
    const int a = at[d - 1], b = at[d];
    EXPECT_EQ(std::abs(a / 64 - b / 64) + std::abs(a % 64 - b % 64), 1) << d;
  }
}

}  // namespace
}  // namespace vhd
