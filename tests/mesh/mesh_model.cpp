// Table capacities and the shape table of reference elements.

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "mesh/mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

TEST(MeshTables, CapacitiesAreEnforced) {
  EXPECT_FATAL({ ElementTable e; AllocateElementsBasic(e, 0, 3); },
               "AllocateElementsBasic: nelements_max must be >= 0");
  EXPECT_FATAL(
      {
        NodeTable n;
        AllocateNodes(n, 1);
        AddNode(n, 1, 0, 0, 0, 0);
        AddNode(n, 2, 0, 0, 0, 0);
      },
      "AddNode: nnodes_max is to small");
  const int tri[3] = {1, 2, 3};
  EXPECT_FATAL(
      {
        ElementTable e;
        AllocateElementsBasic(e, 1, 6);
        AddElement(e, 1, 21, 3, tri);
        AddElement(e, 2, 21, 3, tri);
      },
      "AddElement: nelements_max is to small");
  EXPECT_FATAL(
      {
        ElementTable e;
        AllocateElementsBasic(e, 2, 5);
        AddElement(e, 1, 21, 3, tri);
        AddElement(e, 2, 21, 3, tri);
      },
      "AddElement: nindexes_max is to small");
}

// A mesh of one element per type code, all sharing nodes 1 .. 9.
Mesh MeshOfTypes(const std::vector<int>& types) {
  Mesh m;
  AllocateNodes(m.nodes, 9);
  for (int k = 1; k <= 9; ++k) AddNode(m.nodes, k, k, 0, 0, 0);
  AllocateElementsBasic(m.elements, static_cast<int>(types.size()), 9 * static_cast<int>(types.size()));
  const int nodes[9] = {1, 2, 3, 4, 5, 6, 7, 8, 9};
  static const int count[] = {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 2, 3, 0, 0, 0, 0, 0, 0, 0, 0, 3, 4, 6, 7,
                              4, 5, 8, 9, 0, 0, 4, 6, 8, 0, 0, 0, 0, 0, 0, 0, 1, 1, 1};
  int id = 0;
  for (int t : types) AddElement(m.elements, ++id, t, count[t], nodes);
  return m;
}

TEST(ShapeTable, DistinctShapesAreSharedAndLimited) {
  Mesh m = MeshOfTypes({21, 25, 21, 25, 21});
  SetupShapeData(m);
  ASSERT_EQ(m.shapes.size(), 2u);
  EXPECT_EQ(m.elements.shape[1], 1);
  EXPECT_EQ(m.elements.shape[2], 2);
  EXPECT_EQ(m.elements.shape[5], 1);
  EXPECT_EQ(GetMeshDimension(m), 2);

  Mesh m3 = MeshOfTypes({32, 33, 32});
  SetupShapeData(m3);
  EXPECT_EQ(m3.shapes.size(), 2u);
  EXPECT_EQ(GetMeshDimension(m3), 3);

  EXPECT_FATAL({ Mesh f = MeshOfTypes({21, 22, 23, 24, 25}); SetupShapeData(f); }, "SetupShapeData:Too many shapes");
  EXPECT_FATAL(
      {
        Mesh f = MeshOfTypes({21, 32});
        SetupShapeData(f);
        GetMeshDimension(f);
      },
      "GetMeshDimension:Elements with different dimension detect");  // wrapped at 57
  EXPECT_FATAL(
      {
        Mesh f = MeshOfTypes({21});
        f.elements.type[1] = 29;
        SetupShapeData(f);
      },
      "Type not supported for element 1");
}

// Reference node coordinates of the 2D shapes (triangle (0,0),(1,0),(0,1);
// square [-1,1]^2), in local node order.
std::vector<std::array<double, 2>> ReferenceNodes(int type) {
  const std::vector<std::array<double, 2>> tri6 = {{0, 0}, {1, 0}, {0, 1}, {0.5, 0}, {0.5, 0.5}, {0, 0.5}};
  const std::vector<std::array<double, 2>> quad9 = {{-1, -1}, {1, -1}, {1, 1}, {-1, 1}, {0, -1},
                                                    {1, 0},   {0, 1},  {-1, 0}, {0, 0}};
  switch (type) {
    case 21: return {tri6.begin(), tri6.begin() + 3};
    case 22: return {{0, 0}, {1, 0}, {0, 1}, {1.0 / 3, 1.0 / 3}};
    case 23: return tri6;
    case 24: { auto v = tri6; v.push_back({1.0 / 3, 1.0 / 3}); return v; }
    case 25: return {quad9.begin(), quad9.begin() + 4};
    case 26: return {{-1, -1}, {1, -1}, {1, 1}, {-1, 1}, {0, 0}};
    case 27: return {quad9.begin(), quad9.begin() + 8};
    default: return quad9;
  }
}

// Shape functions of every 2D type: they interpolate (nodal), reproduce
// linear functions with their derivatives, and the Gauss weights integrate
// the reference area.
TEST(ShapeTable, ShapeFunctionsAndGaussRulesOf2DTypes) {
  for (int type = 21; type <= 28; ++type) {
    int dim = 0, shape = 0, ftype = 0;
    ElementTypeInfo(type, dim, shape, ftype);
    RefElement r;
    SetRefElement(dim, shape, ftype, r);
    const auto nodes = ReferenceNodes(type);
    ASSERT_EQ(static_cast<int>(nodes.size()), r.nnodes);
    double wsum = 0;
    for (int g = 0; g < r.ngauss; ++g) {
      wsum += r.gauss_weight[g];
      double sum = 0, fx = 0, fy = 0, dfx = 0, dfy = 0, dsum = 0;
      for (int j = 0; j < r.nnodes; ++j) {
        const std::size_t k = static_cast<std::size_t>(g) * r.nnodes + j;
        sum += r.shape_value[k];
        fx += r.shape_value[k] * nodes[j][0];
        fy += r.shape_value[k] * nodes[j][1];
        dfx += r.shape_dxi[k] * nodes[j][0];
        dfy += r.shape_deta[k] * nodes[j][1];
        dsum += r.shape_dxi[k] + r.shape_deta[k];
      }
      EXPECT_NEAR(sum, 1.0, 1e-13) << type;
      EXPECT_NEAR(fx, r.gauss_xi[g], 1e-13) << type;
      EXPECT_NEAR(fy, r.gauss_eta[g], 1e-13) << type;
      EXPECT_NEAR(dfx, 1.0, 1e-12) << type;
      EXPECT_NEAR(dfy, 1.0, 1e-12) << type;
      EXPECT_NEAR(dsum, 0.0, 1e-12) << type;
    }
    EXPECT_NEAR(wsum, shape == kShapeTriangle ? 0.5 : 4.0, 1e-12) << type;
  }
}

TEST(ShapeTable, GaussRulesIntegrateTheVolumeOf3DShapes) {
  const double volume[4] = {0, 1.0 / 6, 1.0, 8.0};  // tetrahedron, prism, hexahedron
  for (int shape = kShapeTetrahedron; shape <= kShapeHexahedron; ++shape) {
    RefElement r;
    SetRefElement(3, shape, 1, r);
    double w = 0;
    for (double x : r.gauss_weight) w += x;
    EXPECT_NEAR(w, volume[shape], 1e-13);
    for (int g = 0; g < r.ngauss; ++g) {
      double s = 0;
      for (int j = 0; j < r.nnodes; ++j) s += r.shape_value[static_cast<std::size_t>(g) * r.nnodes + j];
      EXPECT_NEAR(s, 1.0, 1e-13);
    }
  }
}

}  // namespace
}  // namespace vhd
