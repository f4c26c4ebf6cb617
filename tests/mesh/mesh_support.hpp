#pragma once
// Helpers shared by the mesh tests: generated and layered meshes, signed
// areas, and reading through a setup file.

#include <cstdint>
#include <string>
#include <vector>

#include "io/setup.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"
#include "test_support.hpp"

namespace vhd::test {

// Generated mesh with its geometry set up.
inline Mesh Built(const RectangleMeshSpec& s) {
  Mesh m;
  GenerateRectangleMesh(s, m);
  SetupMeshGeometry(m);
  return m;
}

inline RectangleMeshSpec Rectangle(double x0, double x1, double y0, double y1, int nx, int ny,
                                   CellLayout layout = CellLayout::kRightTriangles, double jitter = 0.0) {
  RectangleMeshSpec s;
  s.x0 = x0;
  s.x1 = x1;
  s.y0 = y0;
  s.y1 = y1;
  s.nx = nx;
  s.ny = ny;
  s.layout = layout;
  s.jitter = jitter;
  return s;
}

inline Mesh Generated(CellLayout layout, int nx, int ny, double jitter, std::uint64_t seed = 7,
                      std::vector<RectangleHole> holes = {}, double x1 = 100.0, double y1 = 80.0) {
  RectangleMeshSpec s = Rectangle(0, x1, 0, y1, nx, ny, layout, jitter);
  s.seed = seed;
  s.holes = std::move(holes);
  return Built(s);
}

// The 2D mesh of `s` (set up in m2) and its equidistant sigma layers over a
// datum `depth`.
inline Mesh Layered(const RectangleMeshSpec& s, int layers, double depth, Mesh& m2) {
  m2 = Built(s);
  VerticalMesh v;
  v.number_of_layers = layers;
  CalcVerticalLevels(v, depth);
  Mesh m3;
  BuildLayeredMesh(m2, v, m3);
  return m3;
}

inline Mesh Layered(const RectangleMeshSpec& s, int layers, double depth) {
  Mesh m2;
  return Layered(s, layers, depth, m2);
}

struct NamedLayout {
  const char* name;
  CellLayout layout;
};

inline const NamedLayout kLayouts[] = {{"jittered triangles", CellLayout::kRandomTriangles},
                                       {"mixed", CellLayout::kMixed},
                                       {"quadrilaterals", CellLayout::kQuadrilaterals}};

// Twice the signed area of the polygon through nodes first .. first + count - 1
// of element e (all its nodes when count is 0), relative to its first node
// (projected coordinates are large).
inline double TwiceSignedArea(const Mesh& m, int e, int first = 1, int count = 0) {
  const int n = count > 0 ? count : ElementNodeCount(m.elements, e), o = ElementNode(m.elements, e, first);
  double a = 0;
  for (int j = 0; j < n; ++j) {
    const int p = ElementNode(m.elements, e, first + j), q = ElementNode(m.elements, e, first + (j + 1) % n);
    a += (m.nodes.x[p] - m.nodes.x[o]) * (m.nodes.y[q] - m.nodes.y[o]) -
         (m.nodes.x[q] - m.nodes.x[o]) * (m.nodes.y[p] - m.nodes.y[o]);
  }
  return a;
}

// Writes `keys` into the DOMAIN section of a setup file in dir and opens that
// section; the caller closes it (SktCloseSection, SktClose).
inline void OpenDomainSection(const TempDir& dir, const std::string& keys) {
  WriteTextFile(dir.file("run.toml"), "[VantorHD.DOMAIN]\n" + keys);
  SktOpenFile(dir.file("run.toml"), false);
  SktOpenTarget("VantorHD");
  SktOpenSection("DOMAIN");
}

}  // namespace vhd::test
