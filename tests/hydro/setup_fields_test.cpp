// Per-element settings from mesh data files: bed resistance read once
// (format 2) and varying in time (format 3), files that do not fit the run,
// and the initial conditions of types 2 and 3.

#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <string>

#include "hydro/hd_module.hpp"
#include "io/units.hpp"
#include "io/zrn.hpp"
#include "mesh/reorder.hpp"
#include "setup_support.hpp"

namespace vhd {
namespace {

using test::HdSection;
using test::kHd;
using test::MakeMesh;

// value(item, step, element)
using ItemValues = std::function<double(int, int, int)>;

// Writes a .zrnu file on the mesh with nitems element items and nsteps steps
// of dt seconds from 2004-01-01.
void WriteMeshFile(const std::string& name, const Mesh& mesh, int nitems, int nsteps, double dt,
                   const ItemValues& value) {
  const int ne = mesh.elements.nelements;
  ZrnMeshData m;
  m.node_id = mesh.nodes.id;
  m.x = mesh.nodes.x;
  m.y = mesh.nodes.y;
  m.z = mesh.nodes.z;
  m.node_code = mesh.nodes.code;
  m.element_id = mesh.elements.id;
  m.element_type = mesh.elements.type;
  m.node_start = mesh.elements.node_start;
  m.node_list = mesh.elements.node_list;
  ZrnFile w;
  zrnHeaderCreate(w, name, kZrnFileMesh2D, "HD test input");
  zrnSetMesh(w, m);
  zrnSetEqCalendarAxis(w, zrnDateTime({2004, 1, 1, 0, 0, 0}), dt);
  for (int k = 1; k <= nitems; ++k) {
    zrnSetItemInfo(w, k, "Item " + std::to_string(k), kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble);
    zrnSetItemAxisEqD4(w, k, kZrnLocationFace, ne);
  }
  zrnFileCreate(w);
  Array1<double> data(ne);
  for (int step = 0; step < nsteps; ++step) {
    for (int k = 1; k <= nitems; ++k) {
      for (int e = 1; e <= ne; ++e) data[e] = value(k, step, e);
      zrnWriteItemTimeStep(w, step * dt, data.begin(), ne);
    }
  }
  zrnFileClose(w);
  zrnHeaderDestroy(w);
}

Mesh Basin() { return MakeMesh(6, 4, 10.0, 10.0, [](double x, double) { return -3.0 + 0.1 * x; }); }

std::string Manning(const std::string& keys) { return kHd + HdSection("BED_RESISTANCE.MANNING_NUMBER", keys); }

TEST(CoefficientFiles, ManningNumbersPerElement) {
  test::HdSetupFixture f;
  const Mesh mesh = Basin();
  WriteMeshFile(f.dir.file("manning.zrnu"), mesh, 2, 1, 3600.0,
                [](int k, int, int e) { return k == 2 ? 20.0 + e : -1.0; });
  f.Setup(Manning("format = 2\nfile_name = \"manning.zrnu\"\nitem_number = 2\n"), mesh);
  for (int e = 1; e <= f.hd.state.nelements; ++e) {
    EXPECT_DOUBLE_EQ(f.hd.bed.K[e], 9.81 / ((20.0 + e) * (20.0 + e))) << e;
  }
}

TEST(CoefficientFiles, RenumberedMeshTakesEachValueFromItsPlaceInTheFile) {
  test::HdSetupFixture f;
  // The file is written on the mesh in its file order (value 20 + place).
  const Mesh in_file_order = Basin();
  WriteMeshFile(f.dir.file("manning.zrnu"), in_file_order, 1, 1, 3600.0, [](int, int, int k) { return 20.0 + k; });
  Mesh mesh;
  GenerateRectangleMesh(test::RectSpec(6, 4, 10.0, 10.0, [](double x, double) { return -3.0 + 0.1 * x; },
                                       CellLayout::kQuadrilaterals),
                        mesh);
  ReorderMesh(mesh, ElementOrder(mesh, kReorderHilbert, 1, mesh.elements.nelements));
  SetupMeshGeometry(mesh);
  f.Setup(Manning("format = 2\nfile_name = \"manning.zrnu\"\n"), mesh);
  int moved = 0;
  for (int e = 1; e <= f.hd.state.nelements; ++e) {
    const int k = mesh.elements.file_index[e];
    moved += k != e ? 1 : 0;
    EXPECT_EQ(mesh.elements.xc[e], in_file_order.elements.xc[k]);
    EXPECT_DOUBLE_EQ(f.hd.bed.K[e], 9.81 / ((20.0 + k) * (20.0 + k))) << e;
  }
  EXPECT_GT(moved, 0);
}

TEST(CoefficientFiles, ManningNumbersVaryingInTime) {
  // Steps at 0, 1 h and 2 h with M = 20, 40 and 30 everywhere; the run lasts
  // 100 steps of 30 s.
  test::HdSetupFixture f;
  const Mesh mesh = Basin();
  const double M[] = {20.0, 40.0, 30.0};
  WriteMeshFile(f.dir.file("manning_t.zrnu"), mesh, 1, 3, 3600.0, [&](int, int step, int) { return M[step]; });
  f.Setup(Manning("format = 3\nfile_name = \"manning_t.zrnu\"\n"), mesh);
  HdModule& hd = f.hd;
  for (int e = 1; e <= hd.state.nelements; ++e) hd.state.h[e] = 1.0;
  EXPECT_DOUBLE_EQ(hd.bed.K[1], 9.81 / 400.0);
  // Half way between the first two steps: M = 30, then K = g / M^2.
  CALCRESISTANCEBED(hd, f.meshes[0], 1800.0);
  EXPECT_NEAR(hd.bed.K[5], 9.81 / 900.0, 1e-15);
  EXPECT_NEAR(hd.state.cf[5], 9.81 / 900.0, 1e-15);
  CALCRESISTANCEBED(hd, f.meshes[0], 5400.0);
  EXPECT_NEAR(hd.bed.K[5], 9.81 / (35.0 * 35.0), 1e-15);
}

TEST(CoefficientFilesDeath, ShortFileOrFileOfAnotherMeshIsRefused) {
  {
    // Two steps 0 and 1000 s, but the run lasts 3000 s.
    test::HdSetupFixture f;
    const Mesh mesh = Basin();
    WriteMeshFile(f.dir.file("short.zrnu"), mesh, 1, 2, 1000.0, [](int, int, int) { return 30.0; });
    f.ExpectSetupStops(Manning("format = 3\nfile_name = \"short.zrnu\"\n"), mesh,
                       "The data does not cover the entire simulation");
  }
  test::HdSetupFixture f;
  WriteMeshFile(f.dir.file("other.zrnu"), MakeMesh(3, 3, 10.0, 10.0), 1, 1, 60.0, [](int, int, int) { return 0.01; });
  f.ExpectSetupStops(kHd + HdSection("EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY.CONSTANT_EDDY_FORMULATION",
                                     "format = 2\nfile_name = \"other.zrnu\"\n"),
                     Basin(), "Fatal error: SetupEddy: file ");
  const std::string log = f.Log();
  const std::size_t at = log.find("Fatal error: SetupEddy: file ");
  ASSERT_NE(at, std::string::npos);
  EXPECT_NE(log.substr(at, log.find('\n', at) - at)
                .find("other.zrnu, item 1 does not hold one value per element of the mesh (9 values, 24 elements)"),
            std::string::npos)
      << log;
}

// ---- initial conditions from files ------------------------------------------------------

TEST(InitialConditionFiles, SurfaceElevationItem) {
  test::HdSetupFixture f;
  const Mesh mesh = Basin();  // bed from -3 m to -0.6 m
  // A sloping surface from +0.5 m down to -2 m: the shallow east end dries.
  WriteMeshFile(f.dir.file("ini.zrnu"), mesh, 1, 1, 60.0,
                [&](int, int, int e) { return 0.5 - 0.05 * mesh.elements.xc[e]; });
  f.Setup(kHd + HdSection("FLOOD_AND_DRY", "type = 1\n") +
              HdSection("INITIAL_CONDITIONS", "type = 2\nfile_name_2d = \"ini.zrnu\"\n"),
          mesh);
  InitialiseStateHD(f.hd, f.meshes[0]);
  const HdState& s = f.hd.state;
  int dry = 0;
  for (int e = 1; e <= s.nelements; ++e) {
    const double eta = 0.5 - 0.05 * mesh.elements.xc[e];
    EXPECT_DOUBLE_EQ(s.h[e], s.eta[e] + s.d[e]);
    EXPECT_DOUBLE_EQ(s.h[e], std::max(0.0, eta + s.d[e]));
    if (s.wetdry[e] == kDry) ++dry;
  }
  EXPECT_GT(dry, 0);
}

TEST(InitialConditionFiles, DepthStillWaterDepthAndVelocityItems) {
  test::HdSetupFixture f;
  const Mesh mesh = Basin();
  // Items: 1 total depth (negative in element 3), 2 u, 3 v, 4 still water depth.
  const double uv_d[] = {0.5, -0.25, 4.0};
  WriteMeshFile(f.dir.file("ini3.zrnu"), mesh, 4, 1, 60.0,
                [&](int k, int, int e) { return k > 1 ? uv_d[k - 2] : e == 3 ? -0.2 : 1.0 + 0.1 * e; });
  f.Setup(kHd + HdSection("INITIAL_CONDITIONS",
                          "type = 3\nfile_name_2d = \"ini3.zrnu\"\nstill_water_depth_item_no = 4\n"),
          mesh);
  InitialiseStateHD(f.hd, f.meshes[0]);
  const HdState& s = f.hd.state;
  EXPECT_EQ(s.h[3], 0.0);
  for (int e = 1; e <= s.nelements; ++e) {
    EXPECT_EQ(s.d[e], 4.0);
    EXPECT_DOUBLE_EQ(s.h[e], s.eta[e] + s.d[e]);
    if (e != 3) {
      EXPECT_DOUBLE_EQ(s.h[e], 1.0 + 0.1 * e);
      EXPECT_DOUBLE_EQ(s.P[e], 0.5 * s.h[e]);
      EXPECT_DOUBLE_EQ(s.v[e], -0.25);
    }
  }
  EXPECT_NE(f.Log().find("1 negative total water depth(s)"), std::string::npos);
}

}  // namespace
}  // namespace vhd
