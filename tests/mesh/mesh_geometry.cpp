// Faces, geometry and neighbour tables: the small cases by hand, and the
// properties that must hold on any valid mesh checked on generated meshes.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <map>
#include <vector>

#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

Mesh TwoTriangles() {
  Mesh m;
  AllocateNodes(m.nodes, 4);
  AddNode(m.nodes, 1, 0, 0, -1, 1);
  AddNode(m.nodes, 2, 2, 0, -1, 1);
  AddNode(m.nodes, 3, 2, 1, -1, 1);
  AddNode(m.nodes, 4, 0, 1, -1, 1);
  AllocateElementsBasic(m.elements, 2, 6);
  const int t1[3] = {1, 2, 3}, t2[3] = {1, 3, 4};
  AddElement(m.elements, 1, 21, 3, t1);
  AddElement(m.elements, 2, 21, 3, t2);
  return m;
}

TEST(Faces, TwoTrianglesGiveFiveFacesInCreationOrder) {
  Mesh m = TwoTriangles();
  SetupMeshGeometry(m);
  const FaceTable& f = m.faces;
  ASSERT_EQ(f.nfaces, 5);
  EXPECT_EQ(f.nboundary_faces, 4);
  // Element 1: edges 1-2, 2-3 (boundary), 3-1 (shared); element 2: 3-4, 4-1.
  const int e1[5] = {1, 1, 1, 2, 2}, e2[5] = {0, 0, 2, 0, 0};
  const int l1[5] = {1, 2, 3, 2, 3}, l2[5] = {0, 0, 1, 0, 0};
  const int na[5] = {1, 2, 3, 3, 4}, nb[5] = {2, 3, 1, 4, 1};
  for (int k = 1; k <= 5; ++k) {
    EXPECT_EQ(f.id[k], k);
    EXPECT_EQ(f.element1[k], e1[k - 1]) << k;
    EXPECT_EQ(f.element2[k], e2[k - 1]) << k;
    EXPECT_EQ(f.localface1[k], l1[k - 1]) << k;
    EXPECT_EQ(f.localface2[k], l2[k - 1]) << k;
    EXPECT_EQ(FaceNode(f, k, 1), na[k - 1]) << k;
    EXPECT_EQ(FaceNode(f, k, 2), nb[k - 1]) << k;
    EXPECT_EQ(f.code[k], e2[k - 1] == 0 ? 1 : 0) << k;
  }
  // The shared face runs from (2,1) to (0,0): normal (1,-2)/sqrt(5), out of element 1.
  EXPECT_NEAR(f.length[3], std::sqrt(5.0), 1e-15);
  EXPECT_NEAR(f.nx[3], -1 / std::sqrt(5.0), 1e-15);
  EXPECT_NEAR(f.ny[3], 2 / std::sqrt(5.0), 1e-15);
  EXPECT_NEAR(f.xf[3], 1.0, 1e-15);
  EXPECT_NEAR(f.yf[3], 0.5, 1e-15);
  EXPECT_NEAR(m.elements.area[1], 1.0, 1e-15);
  EXPECT_NEAR(m.elements.xc[1], 4.0 / 3, 1e-15);
  EXPECT_NEAR(m.elements.yc[1], 1.0 / 3, 1e-15);
  EXPECT_NEAR(m.elements.length[1], 1.0, 1e-15);
  EXPECT_NEAR(f.dist1[3], std::hypot(1.0 / 3, 1.0 / 6), 1e-15);
  EXPECT_NEAR(f.dist12[3], std::hypot(2.0 / 3, 1.0 / 3), 1e-15);
  // Element-face table in local face order.
  EXPECT_EQ(ElementFaceCount(m.elements, 2), 3);
  EXPECT_EQ(ElementFace(m.elements, 2, 1), 3);
  EXPECT_EQ(ElementFace(m.elements, 2, 3), 5);
  // Node 1 lies in both elements, node 2 only in the first.
  EXPECT_EQ(NodeElementCount(m.nodes, 1), 2);
  EXPECT_EQ(NodeElementCount(m.nodes, 2), 1);
  EXPECT_EQ(NodeNeighbourCount(m.nodes, 1), 3);
  EXPECT_NEAR(m.nodes.area[1], 2.0 / 3, 1e-15);
}

TEST(Faces, ClockwiseElementStillGetsOutwardNormals) {
  Mesh m = TwoTriangles();
  std::swap(m.elements.node_list[2], m.elements.node_list[3]);  // element 1 as 1, 3, 2
  SetupMeshGeometry(m);
  EXPECT_NEAR(m.elements.area[1], 1.0, 1e-15);
  for (int k = 1; k <= m.faces.nfaces; ++k) {
    const int e = m.faces.element1[k];
    const double s = (m.faces.xf[k] - m.elements.xc[e]) * m.faces.nx[k] +
                     (m.faces.yf[k] - m.elements.yc[e]) * m.faces.ny[k];
    EXPECT_GT(s, 0) << "face " << k;
  }
}

TEST(Faces, LinearFieldHasExactTriangleDerivatives) {
  const Mesh m = test::Built(test::Rectangle(0, 1, 0, 1, 6, 6, CellLayout::kRandomTriangles, 0.2));
  for (int e = 1; e <= m.elements.nelements; ++e) {
    double gx = 0, gy = 0;
    for (int j = 1; j <= 3; ++j) {
      const int k = ElementNode(m.elements, e, j);
      const double phi = 2.0 + 3.0 * m.nodes.x[k] - 5.0 * m.nodes.y[k];
      gx += m.elements.dndx[3 * (e - 1) + j] * phi;
      gy += m.elements.dndy[3 * (e - 1) + j] * phi;
    }
    EXPECT_NEAR(gx, 3.0, 1e-12);
    EXPECT_NEAR(gy, -5.0, 1e-12);
  }
}

TEST(Faces, LongLatElementAcrossTheDateLineIsSmall) {
  const double r = kDegToRad;
  Mesh m;
  m.projection = "LONG/LAT";
  AllocateNodes(m.nodes, 4);
  AddNode(m.nodes, 1, 179.5 * r, 10 * r, 0, 1);
  AddNode(m.nodes, 2, -179.5 * r, 10 * r, 0, 1);
  AddNode(m.nodes, 3, -179.5 * r, 11 * r, 0, 1);
  AddNode(m.nodes, 4, 179.5 * r, 11 * r, 0, 1);
  AllocateElementsBasic(m.elements, 1, 4);
  const int q[4] = {1, 2, 3, 4};
  AddElement(m.elements, 1, 25, 4, q);
  SetupMeshGeometry(m);
  EXPECT_NEAR(m.elements.area[1], r * r, 1e-15);
  EXPECT_NEAR(std::abs(m.elements.xc[1]), M_PI, 1e-12);
  EXPECT_NEAR(m.elements.yc[1], 10.5 * r, 1e-15);
  EXPECT_NEAR(m.elements.cos_lat[1], std::cos(10.5 * r), 1e-15);
  // The shortest edge in metres is the northern one, at 11 degrees north.
  EXPECT_NEAR(m.elements.length[1], kMeshEarthRadius * r * std::cos(11 * r), 1e-6);
  ASSERT_EQ(m.faces.nfaces, 4);
  EXPECT_NEAR(m.faces.length[1], r, 1e-15);  // 179.5 -> -179.5 east: one degree
  EXPECT_NEAR(m.faces.nx[1], 0.0, 1e-12);
  EXPECT_NEAR(m.faces.ny[1], -1.0, 1e-12);
  EXPECT_NEAR(std::abs(m.faces.xf[1]), M_PI, 1e-12);
}

TEST(Faces, HoleOnTheSideTakesTheLowerCodeAtItsCorners) {
  // A notch cut into the open west boundary: its rim is land, and the open
  // boundary keeps the two faces on either side of the notch.
  RectangleMeshSpec s = test::Rectangle(0, 1, 0, 1, 8, 8);
  s.code_west = 2;
  s.holes.push_back({0.0, 0.5, 0.25, 0.75});
  const Mesh m = test::Built(s);
  int open = 0, rim = 0;
  for (int k = 1; k <= m.faces.nfaces; ++k) {
    if (m.faces.code[k] == 2) {
      ++open;
      EXPECT_NEAR(m.faces.xf[k], 0.0, 1e-15);
    }
    const bool on_rim = m.faces.element2[k] == 0 && m.faces.xf[k] > 1e-12 && m.faces.xf[k] < 0.5 + 1e-12 &&
                        m.faces.yf[k] > 0.2 && m.faces.yf[k] < 0.8;
    if (on_rim) {
      ++rim;
      EXPECT_EQ(m.faces.code[k], 1);
    }
  }
  EXPECT_EQ(open, 4);
  EXPECT_EQ(rim, 12);
}

// ---- properties on generated meshes -------------------------------------------------

struct Case {
  const char* name;
  RectangleMeshSpec spec;
};

void CheckProperties(const RectangleMeshSpec& s, const Mesh& m, bool count_edges) {
  const ElementTable& el = m.elements;
  const FaceTable& f = m.faces;
  // Areas.
  long double total = 0;
  for (int e = 1; e <= el.nelements; ++e) {
    ASSERT_GT(el.area[e], 0) << "element " << e;
    total += el.area[e];
  }
  const double domain = GeneratedDomainArea(s);
  EXPECT_NEAR(static_cast<double>(total), domain, 1e-12 * domain);

  // Normals: unit, from element1 to element2, closing every element.
  std::vector<double> sx(el.nelements + 1, 0.0), sy(el.nelements + 1, 0.0), per(el.nelements + 1, 0.0);
  int bad_direction = 0;
  for (int k = 1; k <= f.nfaces; ++k) {
    const int a = f.element1[k], b = f.element2[k];
    EXPECT_NEAR(std::hypot(f.nx[k], f.ny[k]), 1.0, 1e-14);
    if (b > 0 && (el.xc[b] - el.xc[a]) * f.nx[k] + (el.yc[b] - el.yc[a]) * f.ny[k] <= 0) ++bad_direction;
    const double wx = f.nx[k] * f.length[k], wy = f.ny[k] * f.length[k];
    sx[a] += wx;
    sy[a] += wy;
    per[a] += f.length[k];
    if (b > 0) {
      sx[b] -= wx;
      sy[b] -= wy;
      per[b] += f.length[k];
    }
  }
  EXPECT_EQ(bad_direction, 0);
  int open_elements = 0;
  for (int e = 1; e <= el.nelements; ++e)
    if (std::abs(sx[e]) > 1e-13 * per[e] || std::abs(sy[e]) > 1e-13 * per[e]) ++open_elements;
  EXPECT_EQ(open_elements, 0);

  // Face count: distinct element edges, or Euler's formula for a disc with holes.
  if (count_edges) {
    std::vector<std::uint64_t> edges;
    for (int e = 1; e <= el.nelements; ++e) {
      const int n = ElementNodeCount(el, e);
      for (int j = 1; j <= n; ++j) {
        std::uint64_t a = ElementNode(el, e, j), b = ElementNode(el, e, j % n + 1);
        if (a > b) std::swap(a, b);
        edges.push_back(a << 32 | b);
      }
    }
    std::sort(edges.begin(), edges.end());
    EXPECT_EQ(std::unique(edges.begin(), edges.end()) - edges.begin(), f.nfaces);
  }
  EXPECT_EQ(m.nodes.nnodes - f.nfaces + el.nelements, 1 - static_cast<int>(s.holes.size()));

  // Element-face table agrees with the face table.
  for (int e = 1; e <= el.nelements; ++e)
    for (int j = 1; j <= ElementFaceCount(el, e); ++j) {
      const int k = ElementFace(el, e, j);
      ASSERT_GT(k, 0);
      const bool first = f.element1[k] == e && f.localface1[k] == j;
      const bool second = f.element2[k] == e && f.localface2[k] == j;
      ASSERT_TRUE(first || second) << "element " << e << " local face " << j;
    }
}

// Boundary faces per code against the generator's sides and holes.
void CheckBoundaryCodes(const RectangleMeshSpec& s, const Mesh& m) {
  std::map<int, int> expected, found;
  int hole_faces = 0;
  for (const RectangleHole& h : s.holes)
    hole_faces += 2 * static_cast<int>(std::lround((h.x1 - h.x0) / ((s.x1 - s.x0) / s.nx)) +
                                       std::lround((h.y1 - h.y0) / ((s.y1 - s.y0) / s.ny)));
  expected[s.code_west] += s.ny;
  expected[s.code_east] += s.ny;
  expected[s.code_south] += s.nx;
  expected[s.code_north] += s.nx;
  expected[s.code_holes] += hole_faces;
  int nboundary = 0;
  for (int k = 1; k <= m.faces.nfaces; ++k)
    if (m.faces.element2[k] == 0) {
      ++found[m.faces.code[k]];
      ++nboundary;
    } else {
      ASSERT_EQ(m.faces.code[k], 0);
    }
  EXPECT_EQ(nboundary, m.faces.nboundary_faces);
  EXPECT_EQ(found, expected);
}

class GeneratedMesh : public testing::TestWithParam<Case> {};

TEST_P(GeneratedMesh, GeometryAndConnectivityHold) {
  const RectangleMeshSpec& s = GetParam().spec;
  const Mesh m = test::Built(s);
  CheckProperties(s, m, true);
  CheckBoundaryCodes(s, m);
}

RectangleMeshSpec Spec(CellLayout layout, int nx, int ny, double jitter, std::vector<RectangleHole> holes) {
  RectangleMeshSpec s = test::Rectangle(-250.0, 1750.0, 1000.0, 2300.0, nx, ny, layout, jitter);
  s.seed = 20240611;
  s.holes = std::move(holes);
  s.code_west = 2;
  s.code_east = 3;
  s.code_north = 4;
  s.code_holes = 1;
  s.bed = [](double x, double y) { return -10.0 - 1e-3 * x + 2e-3 * y; };
  return s;
}

INSTANTIATE_TEST_SUITE_P(
    Meshes, GeneratedMesh,
    testing::Values(Case{"jittered_triangles", Spec(CellLayout::kRandomTriangles, 80, 63, 0.2, {})},
                    Case{"right_triangles", Spec(CellLayout::kRightTriangles, 71, 71, 0.0, {})},
                    Case{"jittered_quads", Spec(CellLayout::kQuadrilaterals, 100, 100, 0.15, {})},
                    Case{"mixed", Spec(CellLayout::kMixed, 90, 80, 0.2, {})},
                    Case{"holes", Spec(CellLayout::kMixed, 100, 130, 0.2,
                                       {{0.0, 200.0, 1200.0, 1500.0}, {500.0, 1300.0, 1800.0, 1900.0}})}),
    [](const testing::TestParamInfo<Case>& info) { return std::string(info.param.name); });

TEST(Generator, SameSeedSameMeshOtherSeedOtherMesh) {
  RectangleMeshSpec s = Spec(CellLayout::kMixed, 20, 20, 0.2, {});
  Mesh a, b, c;
  GenerateRectangleMesh(s, a);
  GenerateRectangleMesh(s, b);
  s.seed += 1;
  GenerateRectangleMesh(s, c);
  EXPECT_EQ(a.nodes.x.raw(), b.nodes.x.raw());
  EXPECT_EQ(a.elements.node_list.raw(), b.elements.node_list.raw());
  EXPECT_NE(a.nodes.x.raw(), c.nodes.x.raw());
  EXPECT_DOUBLE_EQ(a.nodes.z[1], -10.0 - 1e-3 * s.x0 + 2e-3 * s.y0);
  EXPECT_FATAL({ RectangleMeshSpec bad; bad.nx = 0; Mesh m; GenerateRectangleMesh(bad, m); },
               "GenerateRectangleMesh: nx must be >= 1");
}

TEST(SparsePatterns, SymmetricWithDiagonal) {
  const Mesh m = test::Built(Spec(CellLayout::kMixed, 7, 5, 0.1, {}));
  SparsePattern nodes, elements;
  CompSpIndexMesh(m, nodes, elements);
  for (const SparsePattern* p : {&nodes, &elements}) {
    std::vector<std::pair<int, int>> entries;
    for (int r = 1; r <= p->nrows; ++r) {
      EXPECT_EQ(p->column[p->diagonal[r]], r);
      for (int q = p->row_start[r]; q < p->row_start[r + 1]; ++q) {
        if (q > p->row_start[r]) {
          EXPECT_LT(p->column[q - 1], p->column[q]);
        }
        entries.emplace_back(r, p->column[q]);
      }
    }
    std::vector<std::pair<int, int>> transposed;
    for (auto [a, b] : entries) transposed.emplace_back(b, a);
    std::sort(transposed.begin(), transposed.end());
    EXPECT_EQ(entries, transposed);
  }
  // Element rows: the element and its face neighbours.
  for (int e = 1; e <= m.elements.nelements; ++e) {
    int neighbours = 0;
    for (int j = 1; j <= ElementFaceCount(m.elements, e); ++j)
      neighbours += m.faces.element2[ElementFace(m.elements, e, j)] != 0;
    EXPECT_EQ(elements.row_start[e + 1] - elements.row_start[e], neighbours + 1);
  }
}

TEST(Faces, ErrorsOnEmptyOrBrokenMeshes) {
  int nf = 0, nb = 0;
  Mesh empty;
  EXPECT_FATAL(CalcFaces(empty, nf, nb), "CalcFaces: Number of elements are <= 0");
  Mesh broken = TwoTriangles();
  broken.elements.node_list[2] = 9;
  EXPECT_FATAL(CalcFaces(broken, nf, nb), "Node 9 of element 1 is outside");
}

}  // namespace
}  // namespace vhd
