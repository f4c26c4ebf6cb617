#pragma once
// Meshes and helpers shared by the gradient, interpolation and search tests.

#include <gtest/gtest.h>

#include <unistd.h>

#include <string>

#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"

namespace vhd::gradtest {

// A fatal error ends the process with status 1 and its message (the first 57
// characters) on standard output, which is sent to the death test's stderr.
#define VHD_EXPECT_FATAL(statement, text) \
  EXPECT_EXIT(                            \
      {                                   \
        dup2(2, 1);                       \
        statement;                        \
      },                                  \
      testing::ExitedWithCode(1), text)

inline Mesh Generated(CellLayout layout, int nx, int ny, double jitter, std::uint64_t seed = 7,
                      std::vector<RectangleHole> holes = {}, double x1 = 100.0, double y1 = 80.0) {
  RectangleMeshSpec s;
  s.x0 = 0;
  s.x1 = x1;
  s.y0 = 0;
  s.y1 = y1;
  s.nx = nx;
  s.ny = ny;
  s.layout = layout;
  s.jitter = jitter;
  s.seed = seed;
  s.holes = std::move(holes);
  Mesh m;
  GenerateRectangleMesh(s, m);
  SetupMeshGeometry(m);
  return m;
}

struct NamedLayout {
  const char* name;
  CellLayout layout;
};

inline const NamedLayout kLayouts[] = {{"jittered triangles", CellLayout::kRandomTriangles},
                                       {"mixed", CellLayout::kMixed},
                                       {"quadrilaterals", CellLayout::kQuadrilaterals}};

}  // namespace vhd::gradtest
