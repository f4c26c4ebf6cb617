// Vertical levels, the layered 3D mesh and cross sections.

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

TEST(SigmaLevels, SigmaCOneGivesEquidistantLevels) {
  for (double b : {0.0, 0.4, 1.0})
    for (double theta : {0.0, 0.5, 2.0, 8.0}) {
      VerticalMesh v;
      v.number_of_layers = 7;
      v.vertical_mesh_type = 3;
      v.sigma_c = 1.0;
      v.b = b;
      v.theta = theta;
      CalcVerticalLevels(v, -10.0);
      for (int k = 0; k <= 7; ++k) EXPECT_NEAR(v.sigma_levels[k], k / 7.0, 1e-14) << b << " " << theta;
    }
}

TEST(SigmaLevels, TransformedLevelsRiseFromBedToSurface) {
  for (double b : {0.0, 0.5, 1.0}) {
    EXPECT_NEAR(TransformedSigmaLevel(-1.0, 0.2, b, 3.0), 0.0, 1e-14);
    EXPECT_NEAR(TransformedSigmaLevel(0.0, 0.2, b, 3.0), 1.0, 1e-14);
    double last = -1;
    for (int k = 0; k <= 20; ++k) {
      const double level = TransformedSigmaLevel(-1.0 + k / 20.0, 0.2, b, 3.0);
      EXPECT_GT(level, last);
      last = level;
    }
  }
  // b = 0 refines towards the surface, b = 1 towards both ends.
  EXPECT_LT(1.0 - TransformedSigmaLevel(-0.1, 0.0, 0.0, 4.0), 0.1);
  EXPECT_LT(TransformedSigmaLevel(-0.9, 0.0, 1.0, 4.0), 0.1);
}

std::string LogOf(void (*action)(VerticalMesh&), VerticalMesh& v) {
  test::TempDir dir;
  const std::string log = dir.file("levels.log");
  OpenLogFile(log);
  action(v);
  CloseLogFile();
  return test::ReadTextFile(log);
}

TEST(SigmaLevels, LayerThicknessSumWarnings) {
  auto levels = [](VerticalMesh& v) { CalcVerticalLevels(v, -10.0); };
  VerticalMesh v;
  v.number_of_layers = 4;
  v.vertical_mesh_type = 2;
  v.layer_thickness = {0.1, 0.2, 0.3, 0.4005};
  EXPECT_EQ(LogOf(levels, v).find("Sum of layer thickness"), std::string::npos);
  EXPECT_NEAR(v.sigma_levels[1], 0.1 / 1.0005, 1e-15);
  EXPECT_EQ(v.sigma_levels[4], 1.0);
  v.layer_thickness = {0.1, 0.2, 0.3, 0.402};
  EXPECT_NE(LogOf(levels, v).find("Warning: Sum of layer thickness is larger than 1"), std::string::npos);
  v.layer_thickness = {0.1, 0.2, 0.3, 0.398};
  EXPECT_NE(LogOf(levels, v).find("Warning: Sum of layer thickness is lower than 1"), std::string::npos);
  v.layer_thickness = {0.5, 0.5};
  EXPECT_FATAL(CalcVerticalLevels(v, -10.0), "layer_thickness must hold number_of_la");  // wrapped at 57
}

RectangleMeshSpec Basin(CellLayout layout) {
  RectangleMeshSpec s = test::Rectangle(0, 1000, 0, 600, 20, 12, layout, 0.2);
  s.seed = 7;
  s.code_west = 2;
  s.bed = [](double x, double y) { return -2.0 - 0.018 * x - 0.002 * y; };
  return s;
}

// Water volume of the 2D mesh with the surface at datum: area times the mean
// node depth, which a stack of prisms or hexahedra must reproduce exactly.
double Volume2D(const Mesh& m) {
  double v = 0;
  for (int e = 1; e <= m.elements.nelements; ++e) {
    const int n = ElementNodeCount(m.elements, e);
    double d = 0;
    for (int j = 1; j <= n; ++j) d -= m.nodes.z[ElementNode(m.elements, e, j)];
    v += m.elements.area[e] * d / n;
  }
  return v;
}

double Volume3D(const Mesh& m) {
  double v = 0;
  for (int e = 1; e <= m.elements.nelements; ++e) {
    EXPECT_GE(m.elements.area[e], 0.0) << "element " << e;
    v += m.elements.area[e];
  }
  return v;
}

TEST(LayeredMesh, SigmaColumnsKeepVolumeAndCloseInteriorElements) {
  for (CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kQuadrilaterals}) {
    const Mesh m2 = test::Built(Basin(layout));
    Mesh m3;
    VerticalMesh v;
    v.number_of_layers = 5;
    v.vertical_mesh_type = 3;
    v.sigma_c = 0.3;
    v.b = 0.5;
    v.theta = 3;
    CalcVerticalLevels(v, -30);
    BuildLayeredMesh(m2, v, m3);
    const int ne2 = m2.elements.nelements, nf2 = m2.faces.nfaces;
    ASSERT_EQ(m3.elements.nelements, 5 * ne2);
    ASSERT_EQ(m3.faces.nfaces, 5 * nf2 + 4 * ne2);
    EXPECT_EQ(m3.nfaces_vertical, 5 * nf2);
    EXPECT_EQ(m3.nodes.nnodes, 6 * m2.nodes.nnodes);
    EXPECT_EQ(GetMeshDimension(m3), 3);
    EXPECT_NEAR(Volume3D(m3), Volume2D(m2), 1e-12 * Volume2D(m2));

    // Interior layers: every face present, outward normals weighted by area sum to zero.
    std::vector<double> s[3];
    for (auto& a : s) a.assign(m3.elements.nelements + 1, 0.0);
    const FaceTable& f = m3.faces;
    for (int k = 1; k <= f.nfaces; ++k) {
      const double w[3] = {f.nx[k] * f.length[k], f.ny[k] * f.length[k], f.nz[k] * f.length[k]};
      for (int d = 0; d < 3; ++d) {
        s[d][f.element1[k]] += w[d];
        if (f.element2[k] > 0) s[d][f.element2[k]] -= w[d];
      }
      if (k <= m3.nfaces_vertical) EXPECT_EQ(f.nz[k], 0.0);
      else EXPECT_GT(f.nz[k], 0.9);
      if (f.element2[k] > 0) {
        const int a = f.element1[k], b = f.element2[k];
        const double dot = (m3.elements.xc[b] - m3.elements.xc[a]) * f.nx[k] +
                           (m3.elements.yc[b] - m3.elements.yc[a]) * f.ny[k] +
                           (m3.elements.zc[b] - m3.elements.zc[a]) * f.nz[k];
        EXPECT_GT(dot, 0) << "face " << k;
      }
    }
    for (int e = 1; e <= m3.elements.nelements; ++e) {
      const int layer = m3.element_layer[e];
      if (layer == 1 || layer == 5) continue;
      const double scale = m3.elements.area[e];
      for (int d = 0; d < 3; ++d) EXPECT_NEAR(s[d][e], 0.0, 1e-10 * scale) << "element " << e;
    }
    // Boundary codes carry over to the side faces.
    for (int k = 1; k <= m3.nfaces_vertical; ++k)
      EXPECT_EQ(f.code[k], m2.faces.code[m3.face_column[k]]);
  }
}

TEST(LayeredMesh, CombinedSigmaZColumnsFollowTheBed) {
  const Mesh m2 = test::Built(Basin(CellLayout::kMixed));
  Mesh m3;
  VerticalMesh v;
  v.vertical_mesh_type_overall = 2;
  v.number_of_layers = 4;
  v.z_sigma = -3.0;
  v.number_of_layers_zlevel = 9;
  v.constant_layer_thickness_zlevel = 2.0;
  v.minimum_layer_thickness_zlevel = 0.2;
  CalcVerticalLevels(v, -23.0);
  ASSERT_EQ(v.z_levels.size(), 10u);
  EXPECT_DOUBLE_EQ(v.z_levels[0], -21.0);
  BuildLayeredMesh(m2, v, m3);
  EXPECT_EQ(m3.nlayers, 13);
  EXPECT_EQ(m3.vertical_type, 2);
  EXPECT_NEAR(Volume3D(m3), Volume2D(m2), 1e-12 * Volume2D(m2));

  // A column holds the sigma layers plus the z layers its deepest node cuts.
  for (int e = 1; e <= m2.elements.nelements; ++e) {
    double deepest = 0;
    for (int j = 1; j <= ElementNodeCount(m2.elements, e); ++j)
      deepest = std::min(deepest, m2.nodes.z[ElementNode(m2.elements, e, j)]);
    const int layers = m3.column_element_start[e + 1] - m3.column_element_start[e];
    if (deepest >= -3.0) {
      EXPECT_EQ(layers, 4) << "element " << e;
    } else {
      const int cut = static_cast<int>(std::ceil((-3.0 - std::max(deepest, -21.0)) / 2.0 - 1e-12));
      EXPECT_GE(layers, 4 + cut - 1) << "element " << e;
      EXPECT_LE(layers, 4 + cut) << "element " << e;
    }
  }
  // Side faces against a shallower column are land.
  int steps = 0;
  for (int k = 1; k <= m3.nfaces_vertical; ++k)
    if (m3.faces.element2[k] == 0 && m2.faces.element2[m3.face_column[k]] != 0) {
      ++steps;
      EXPECT_EQ(m3.faces.code[k], 1);
    }
  EXPECT_GT(steps, 0);
}

TEST(Sections, BoundarySectionWalksTheBoundary) {
  const Mesh m = test::Built(Basin(CellLayout::kRandomTriangles));
  MeshSection s;
  SetupMeshSection(m, 2, s);
  ASSERT_EQ(s.faces.size(), 12);
  for (int k = 2; k <= s.faces.size(); ++k)
    EXPECT_EQ(FaceNode(m.faces, s.faces[k - 1], 2), FaceNode(m.faces, s.faces[k], 1));
  // The domain lies to the left: the west boundary is walked from north to south.
  EXPECT_GT(m.faces.yf[s.faces[1]], m.faces.yf[s.faces[12]]);
  EXPECT_FATAL(SetupMeshSection(m, 0, s), "SetupMeshSection: No boundary specified");
}

// The faces of a section separate the elements on its two sides, so a uniform
// flow (1, 0) carries exactly the height of the domain across a line from the
// south to the north boundary.
TEST(Sections, PolylineSectionCarriesTheWholeFlow) {
  Mesh m2;
  const Mesh m3 = test::Layered(Basin(CellLayout::kMixed), 3, -30, m2);
  const std::vector<std::vector<double>> xs = {{500, 500}, {400, 730, 380}, {300, 620, 450, 520}};
  const std::vector<std::vector<double>> ys = {{-1, 601}, {-10, 300, 610}, {-5, 200, 420, 605}};
  for (std::size_t p = 0; p < xs.size(); ++p) {
    MeshSection s;
    SetupSection2D(m2, xs[p], ys[p], s);
    double flux = 0;
    for (int k = 1; k <= s.faces.size(); ++k) flux += s.sign[k] * m2.faces.nx[s.faces[k]] * m2.faces.length[s.faces[k]];
    EXPECT_NEAR(flux, 600.0, 1e-9) << "polyline " << p;
  }
  MeshSection line;
  SetupSection2D(m2, xs[0], ys[0], line);
  MeshSection layered;
  SetupMeshSectionlayer(m3, line, layered);
  EXPECT_EQ(layered.faces.size(), 3 * line.faces.size());
  MeshSection outside;
  EXPECT_FATAL(SetupSection2D(m2, {2000, 2100}, {0, 600}, outside),
               "SetupSection2D: Number of faces is zero in section");
}

TEST(LayeredMesh, FacesFromTheElementTablesAgree) {
  // Faces built from the prisms' own face tables: the layered faces plus the
  // bed and surface faces, which the layered mesh leaves out.
  Mesh m2;
  const Mesh m3 = test::Layered(Basin(CellLayout::kMixed), 3, -30, m2);
  Mesh generic = m3;
  int nfaces = 0, nboundary = 0;
  CalcFaces(generic, nfaces, nboundary);
  EXPECT_EQ(nfaces, m3.faces.nfaces + 2 * m2.elements.nelements);
  EXPECT_EQ(nboundary, m3.faces.nboundary_faces + 2 * m2.elements.nelements);
}

TEST(SigmaLevels, KeysReadFromTheDomainSection) {
  test::TempDir dir;
  test::OpenDomainSection(dir,
                          "vertical_mesh_type_overall = 2\n"
                          "number_of_layers = 3\n"
                          "vertical_mesh_type = 2\n"
                          "layer_thickness = [0.5, 0.3, 0.2]\n"
                          "number_of_layers_zlevel = 4\n");
  Mesh m2;
  GenerateRectangleMesh(Basin(CellLayout::kQuadrilaterals), m2);
  VerticalMesh v;
  SetupVerticalMesh(m2, -4.0, v);
  SktCloseSection();
  SktClose();
  EXPECT_DOUBLE_EQ(v.z_sigma, -2.0);  // half of minimum_depth
  ASSERT_EQ(v.sigma_levels.size(), 4u);
  EXPECT_NEAR(v.sigma_levels[1], 0.5, 1e-15);
  EXPECT_NEAR(v.sigma_levels[2], 0.8, 1e-15);
  // Four z layers of equal thickness from z_sigma down to the deepest bed.
  double deepest = 0;
  for (int k = 1; k <= m2.nodes.nnodes; ++k) deepest = std::min(deepest, m2.nodes.z[k]);
  ASSERT_EQ(v.z_levels.size(), 5u);
  EXPECT_NEAR(v.z_levels[0], deepest, 1e-12);
}

}  // namespace
}  // namespace vhd
