// Pseudo-Laplacian node values and point values.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>

#include "mesh/interpolation.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::Generated;
using test::kLayouts;

constexpr double kDelete = -1e-35;

double Angle360Distance(double a, double b) {
  const double d = std::fmod(std::abs(a - b), 360.0);
  return std::min(d, 360.0 - d);
}

// Exact where no weight needs clipping (a moderately jittered mesh).
TEST(PseudoLaplacian, LinearFieldExactAtInteriorNodes) {
  for (const auto& layout : kLayouts) {
    const Mesh m = Generated(layout.layout, 16, 12, 0.1, 13, {{40, 60, 30, 50}});
    const int ne = m.elements.nelements, nn = m.nodes.nnodes;
    Array1<double> phi(ne), pn(nn);
    for (int e = 1; e <= ne; ++e) phi[e] = 4.0 - 0.3 * m.elements.xc[e] + 0.8 * m.elements.yc[e];
    CALCNODEVALUESPL2D(m, phi, pn, kDelete, kModeScalar);
    int interior = 0;
    for (int i = 1; i <= nn; ++i) {
      if (m.nodes.code[i] != 0) continue;
      ++interior;
      ASSERT_NEAR(pn[i], 4.0 - 0.3 * m.nodes.x[i] + 0.8 * m.nodes.y[i], 1e-10) << layout.name << " node " << i;
    }
    EXPECT_GT(interior, nn / 2);
  }
}

// The clipped weights are never negative: on a strongly distorted mesh a node
// value stays within the values of its elements.
TEST(PseudoLaplacian, NodeValuesStayWithinTheirElementValues) {
  const Mesh m = Generated(CellLayout::kRandomTriangles, 30, 24, 0.2, 31);
  const int ne = m.elements.nelements, nn = m.nodes.nnodes;
  std::mt19937 rng(4);
  std::uniform_real_distribution<double> u(-1, 1);
  Array1<double> phi(ne), pn(nn);
  for (int e = 1; e <= ne; ++e) phi[e] = u(rng);
  CALCNODEVALUESPL2D(m, phi, pn, kDelete, kModeScalar);
  for (int i = 1; i <= nn; ++i) {
    double lo = 1e300, hi = -1e300;
    for (int j = 1; j <= NodeElementCount(m.nodes, i); ++j) {
      lo = std::min(lo, phi[NodeElement(m.nodes, i, j)]);
      hi = std::max(hi, phi[NodeElement(m.nodes, i, j)]);
    }
    ASSERT_GE(pn[i], lo - 1e-14) << i;
    ASSERT_LE(pn[i], hi + 1e-14) << i;
  }
}

// The node in the middle of 2 x 2 equal squares.
TEST(PseudoLaplacian, FourEqualSquaresGiveThePlainMean) {
  const Mesh m = Generated(CellLayout::kQuadrilaterals, 2, 2, 0.0, 1, {}, 2.0, 2.0);
  ASSERT_EQ(m.elements.nelements, 4);
  const int centre = 5;  // nodes row by row: the middle of the 3 x 3 grid
  ASSERT_EQ(m.nodes.x[centre], 1.0);
  ASSERT_EQ(m.nodes.y[centre], 1.0);
  Array1<double> phi(4), pn(m.nodes.nnodes);
  phi[1] = 1;
  phi[2] = 2;
  phi[3] = 7;
  phi[4] = -4;
  CALCNODEVALUESPL2D(m, phi, pn, kDelete, kModeScalar);
  EXPECT_NEAR(pn[centre], 1.5, 1e-14);
  // A corner node has one element: its value.
  EXPECT_EQ(pn[1], 1.0);

  // Directions across north: 350 and 10 average to north, not south.
  phi[1] = 350;
  phi[2] = 10;
  phi[3] = 10;
  phi[4] = 350;
  CALCNODEVALUESPL2D(m, phi, pn, kDelete, kModeDirection);
  EXPECT_LT(Angle360Distance(pn[centre], 0.0), 1e-9) << pn[centre];
  EXPECT_GE(pn[centre], 0.0);
  EXPECT_LT(pn[centre], 360.0);
  phi[1] = 340;
  phi[2] = 20;
  phi[3] = 30;
  phi[4] = 350;
  CALCNODEVALUESPL2D(m, phi, pn, kDelete, kModeDirection);
  EXPECT_NEAR(pn[centre], 5.0, 1e-9);

  // Deleted elements take no part; a node with none left gets 0.
  phi[1] = kDelete;
  phi[2] = 4;
  phi[3] = 6;
  phi[4] = 8;
  CALCNODEVALUESPL2D(m, phi, pn, kDelete, kModeScalar);
  EXPECT_EQ(pn[1], 0.0);
  EXPECT_NEAR(pn[2], 4.0, 1e-14);  // south edge midpoint: elements 1 (deleted) and 2
  // Three squares around the centre at offsets (0.5,-0.5), (-0.5,0.5),
  // (0.5,0.5) with 4, 6, 8: the plane through them, 5 + 2 dx + 4 dy, at the node.
  EXPECT_NEAR(pn[centre], 5.0, 1e-12);
}

TEST(PseudoLaplacian, WetVariants) {
  const Mesh m = Generated(CellLayout::kQuadrilaterals, 2, 2, 0.0, 1, {}, 2.0, 2.0);
  Array1<double> phi(4), pn(m.nodes.nnodes), qn(m.nodes.nnodes);
  for (int e = 1; e <= 4; ++e) phi[e] = e;
  Array1<int> wet(4, 1);
  wet[1] = 0;  // dry
  wet[4] = 2;  // flooded: not wet
  CALCNODEVALUESWETPL2D(m, phi, wet, pn, kDelete, kModeScalar);
  CALCNODEVALUES2WETPL2D(m, phi, wet, qn, kDelete, kModeScalar);
  // Node 1 touches only the dry element 1.
  EXPECT_EQ(pn[1], kDelete);
  EXPECT_EQ(qn[1], 1.0);
  // Node 2 touches elements 1 and 2: only 2 is wet.
  EXPECT_EQ(pn[2], 2.0);
  EXPECT_EQ(qn[2], 2.0);
  // The centre: elements 2 and 3 are wet.
  EXPECT_NEAR(pn[5], 2.5, 1e-14);
  EXPECT_NEAR(qn[5], 2.5, 1e-14);
}

TEST(PointValue, LinearNodeFieldAndSpecialValues) {
  for (const auto& layout : kLayouts) {
    const Mesh m = Generated(layout.layout, 6, 5, 0.2, 3);
    const int nn = m.nodes.nnodes;
    Array1<double> pn(nn);
    for (int i = 1; i <= nn; ++i) pn[i] = 2.0 + 0.5 * m.nodes.x[i] - 0.25 * m.nodes.y[i];
    std::mt19937 rng(1);
    std::uniform_real_distribution<double> u(0, 1);
    for (int e = 1; e <= m.elements.nelements; ++e) {
      // A random point inside: a convex combination of the corners.
      const int nc = ElementNodeCount(m.elements, e);
      double w[4], sw = 0, x = 0, y = 0;
      for (int j = 0; j < nc; ++j) sw += (w[j] = u(rng) + 0.01);
      for (int j = 0; j < nc; ++j) {
        const int k = ElementNode(m.elements, e, j + 1);
        x += w[j] / sw * m.nodes.x[k];
        y += w[j] / sw * m.nodes.y[k];
      }
      ASSERT_NEAR(CalcPointValue2D(m, x, y, e, pn, kDelete, kModeScalar), 2.0 + 0.5 * x - 0.25 * y, 1e-12)
          << layout.name << " element " << e;
    }
    Array1<double> dn = pn;
    dn[ElementNode(m.elements, 1, 2)] = kDelete;
    EXPECT_EQ(CalcPointValue2D(m, m.elements.xc[1], m.elements.yc[1], 1, dn, kDelete, kModeScalar), kDelete);
  }
  // Directions in one triangle: 350, 10, 10 at the corners.
  const Mesh m = Generated(CellLayout::kRightTriangles, 1, 1, 0.0, 1, {}, 1.0, 1.0);
  Array1<double> dir(m.nodes.nnodes, 10.0);
  dir[ElementNode(m.elements, 1, 1)] = 350.0;
  const double v = CalcPointValue2D(m, m.elements.xc[1], m.elements.yc[1], 1, dir, kDelete, kModeDirection);
  EXPECT_NEAR(v, 10.0 - 20.0 / 3.0, 1e-12);
}

TEST(PointValue, OtherElementTypesAreFatal) {
  Mesh m;
  AllocateNodes(m.nodes, 2);
  AddNode(m.nodes, 1, 0, 0, 0, 0);
  AddNode(m.nodes, 2, 1, 0, 0, 0);
  AllocateElementsBasic(m.elements, 1, 2);
  const int line[2] = {1, 2};
  AddElement(m.elements, 1, 11, 2, line);
  Array1<double> pn(2, 1.0);
  EXPECT_FATAL(CalcPointValue2D(m, 0.5, 0, 1, pn, kDelete, kModeScalar),
               "CalcPointValue2D: Interpolation not possible for this typ");
}

// Layered mesh: node values from the layers around a node, point values
// inside prisms and hexahedra, for a field linear in x, y and z.
TEST(PseudoLaplacian, LayeredMeshNodeAndPointValues) {
  RectangleMeshSpec spec = test::Rectangle(0, 60, 0, 40, 6, 4, CellLayout::kMixed, 0.1);
  spec.bed = [](double x, double) { return -6.0 - 0.05 * x; };
  Mesh m2;
  const Mesh m3 = test::Layered(spec, 3, -20.0, m2);
  const int ne = m3.elements.nelements, nn = m3.nodes.nnodes;
  auto field = [](double x, double y, double z) { return 1.0 + 0.1 * x + 0.2 * y + 0.3 * z; };
  Array1<double> phi(ne), pn(nn), wn(nn);
  for (int e = 1; e <= ne; ++e) phi[e] = 1.0 + 0.1 * m3.elements.xc[e] + 0.2 * m3.elements.yc[e];
  CALCNODEVALUESPL3D(m3, phi, pn, kDelete, kModeScalar);
  for (int i = 1; i <= nn; ++i) {
    if (m2.nodes.code[m3.node_column[i]] != 0) continue;
    ASSERT_NEAR(pn[i], 1.0 + 0.1 * m3.nodes.x[i] + 0.2 * m3.nodes.y[i], 1e-10) << i;
  }
  // Dry columns: WET gives the delete value where every column is dry,
  // 2WET the value over all elements.
  Array1<int> wet2d(m2.elements.nelements, 0), wet3d(ne, 0);
  CALCNODEVALUESWETPL3D(m3, phi, wet2d, wn, kDelete, kModeScalar);
  EXPECT_EQ(wn[1], kDelete);
  CALCNODEVALUES2WETPL3D(m3, phi, wet2d, wn, kDelete, kModeScalar);
  EXPECT_EQ(wn[1], pn[1]);
  CALCNODEVALUES3WETPL3D(m3, phi, wet3d, wn, kDelete, kModeScalar);
  EXPECT_EQ(wn[1], kDelete);
  // One layer on the 2D nodes.
  wet2d.assign(m2.elements.nelements, 1);
  Array1<double> layer(m2.nodes.nnodes);
  CALCNODEVALUESWETPL3DLAYER(m2, m3, 2, phi, wet2d, layer, kDelete, kModeScalar);
  for (int i = 1; i <= m2.nodes.nnodes; ++i) {
    if (m2.nodes.code[i] != 0) continue;
    ASSERT_NEAR(layer[i], 1.0 + 0.1 * m2.nodes.x[i] + 0.2 * m2.nodes.y[i], 1e-10) << i;
  }

  for (int i = 1; i <= nn; ++i) pn[i] = field(m3.nodes.x[i], m3.nodes.y[i], m3.nodes.z[i]);
  for (int e = 1; e <= ne; ++e) {
    const double x = m3.elements.xc[e], y = m3.elements.yc[e], z = m3.elements.zc[e];
    ASSERT_NEAR(CalcPointValue3D(m3, x, y, z, e, pn, kDelete, kModeScalar), field(x, y, z), 1e-10) << e;
  }
}

}  // namespace
}  // namespace vhd
