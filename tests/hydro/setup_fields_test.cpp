// Per-element settings from mesh data files: bed resistance read once
// (format 2) and varying in time (format 3), eddy viscosity from a file, and
// the initial conditions of types 2 and 3.

#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <string>

#include "hydro/hd_module.hpp"
#include "io/units.hpp"
#include "io/zrn.hpp"
#include "setup_support.hpp"

namespace vhd {
namespace {

using test::MakeMesh;

// value(item, step, element)
using ItemValues = std::function<double(int, int, int)>;

// Writes a .zrnu file on the mesh with nitems element items and nsteps steps
// of dt seconds from the start date-time.
void WriteMeshFile(const std::string& name, const Mesh& mesh, int nitems, int nsteps, double dt,
                   const ItemValues& value, const std::array<int, 6>& start = {2004, 1, 1, 0, 0, 0}) {
  ZrnMeshData m;
  const int nn = mesh.nodes.nnodes;
  const int ne = mesh.elements.nelements;
  m.x.assign(nn);
  m.y.assign(nn);
  m.z.assign(nn);
  m.node_id.assign(nn);
  m.node_code.assign(nn);
  for (int i = 1; i <= nn; ++i) {
    m.x[i] = mesh.nodes.x[i];
    m.y[i] = mesh.nodes.y[i];
    m.z[i] = mesh.nodes.z[i];
    m.node_id[i] = i;
    m.node_code[i] = mesh.nodes.code[i];
  }
  m.element_id.assign(ne);
  m.element_type.assign(ne);
  m.node_start.assign(ne + 1);
  m.node_list.assign(mesh.elements.node_list.size());
  for (int e = 1; e <= ne + 1; ++e) m.node_start[e] = mesh.elements.node_start[e];
  for (int j = 1; j <= m.node_list.size(); ++j) m.node_list[j] = mesh.elements.node_list[j];
  for (int e = 1; e <= ne; ++e) {
    m.element_id[e] = e;
    m.element_type[e] = mesh.elements.type[e];
  }
  ZrnFile w;
  zrnHeaderCreate(w, name, kZrnFileMesh2D, "HD test input");
  zrnSetMesh(w, m);
  zrnSetEqCalendarAxis(w, zrnDateTime(start), dt);
  for (int k = 1; k <= nitems; ++k) {
    zrnSetItemInfo(w, k, "Item " + std::to_string(k), kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble);
    zrnSetItemAxisEqD4(w, k, kZrnLocationFace, ne);
  }
  zrnFileCreate(w);
  std::vector<double> data(static_cast<std::size_t>(ne));
  for (int step = 0; step < nsteps; ++step) {
    for (int k = 1; k <= nitems; ++k) {
      for (int e = 1; e <= ne; ++e) data[static_cast<std::size_t>(e - 1)] = value(k, step, e);
      zrnWriteItemTimeStep(w, step * dt, data.data(), ne);
    }
  }
  zrnFileClose(w);
  zrnHeaderDestroy(w);
}

const char* kHd = "[VantorHD.HYDRODYNAMIC_MODULE]\nmode = 2\n";

Mesh Basin() { return MakeMesh(6, 4, 10.0, 10.0, [](double x, double) { return -3.0 + 0.1 * x; }); }

TEST(CoefficientFiles, ManningNumbersPerElement) {
  test::HdSetupFixture f;
  const Mesh mesh = Basin();
  WriteMeshFile(f.dir.file("manning.zrnu"), mesh, 2, 1, 3600.0,
                [](int k, int, int e) { return k == 2 ? 20.0 + e : -1.0; });
  f.Setup(std::string(kHd) +
              "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]\n"
              "format = 2\nfile_name = \"manning.zrnu\"\nitem_number = 2\n",
          mesh);
  for (int e = 1; e <= f.hd.state.nelements; ++e) {
    EXPECT_DOUBLE_EQ(f.hd.bed.K[e], 9.81 / ((20.0 + e) * (20.0 + e))) << e;
  }
}

TEST(CoefficientFiles, ManningNumbersVaryingInTime) {
  // Steps at 0, 1 h and 2 h with M = 20, 40 and 30 everywhere; the run lasts
  // 100 steps of 30 s.
  test::HdSetupFixture f;
  const Mesh mesh = Basin();
  const double M[] = {20.0, 40.0, 30.0};
  WriteMeshFile(f.dir.file("manning_t.zrnu"), mesh, 1, 3, 3600.0, [&](int, int step, int) { return M[step]; });
  f.Setup(std::string(kHd) +
              "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]\n"
              "format = 3\nfile_name = \"manning_t.zrnu\"\n",
          mesh);
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

TEST(CoefficientFiles, TimeVaryingFileMustCoverTheRun) {
  test::HdSetupFixture f;
  const Mesh mesh = Basin();
  // Two steps 0 and 1000 s, but the run lasts 3000 s.
  WriteMeshFile(f.dir.file("short.zrnu"), mesh, 1, 2, 1000.0, [](int, int, int) { return 30.0; });
  EXPECT_EXIT(test::InChild([&] {
                f.Setup(std::string(kHd) +
                            "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]\n"
                            "format = 3\nfile_name = \"short.zrnu\"\n",
                        mesh);
              }),
              testing::ExitedWithCode(1), "");
  EXPECT_NE(f.Log().find("The data does not cover the entire simulation"), std::string::npos);
}

TEST(CoefficientFiles, FileOfAnotherMeshIsRefused) {
  test::HdSetupFixture f;
  const Mesh other = MakeMesh(3, 3, 10.0, 10.0);
  WriteMeshFile(f.dir.file("other.zrnu"), other, 1, 1, 60.0, [](int, int, int) { return 0.01; });
  EXPECT_EXIT(test::InChild([&] {
                f.Setup(std::string(kHd) +
                            "[VantorHD.HYDRODYNAMIC_MODULE.EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY."
                            "CONSTANT_EDDY_FORMULATION]\nformat = 2\nfile_name = \"other.zrnu\"\n",
                        Basin());
              }),
              testing::ExitedWithCode(1), "");
  const std::string log = f.Log();
  const std::size_t at = log.find("Fatal error: SetupEddy: file ");
  ASSERT_NE(at, std::string::npos) << log;
  const std::string message = log.substr(at, log.find('\n', at) - at);
  EXPECT_NE(message.find("other.zrnu, item 1 does not hold one value per element of the mesh (9 values, 24 elements)"),
            std::string::npos)
      << message;
}

TEST(CoefficientFiles, EddyViscosityPerElement) {
  test::HdSetupFixture f;
  const Mesh mesh = Basin();
  WriteMeshFile(f.dir.file("eddy.zrnu"), mesh, 1, 1, 60.0, [](int, int, int e) { return 0.001 * e; });
  f.Setup(std::string(kHd) +
              "[VantorHD.HYDRODYNAMIC_MODULE.EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY."
              "CONSTANT_EDDY_FORMULATION]\nformat = 2\nfile_name = \"eddy.zrnu\"\n",
          mesh);
  CALCEDDYVISCOSITYHD(f.hd, f.meshes[0]);
  EXPECT_DOUBLE_EQ(f.hd.state.nu_t[7], 0.007);
}

// ---- initial conditions from files ------------------------------------------------------

TEST(InitialConditionFiles, SurfaceElevationItem) {
  test::HdSetupFixture f;
  const Mesh mesh = Basin();  // bed from -3 m to -0.6 m
  // A sloping surface from +0.5 m down to -2 m: the shallow east end dries.
  WriteMeshFile(f.dir.file("ini.zrnu"), mesh, 1, 1, 60.0,
                [&](int, int, int e) { return 0.5 - 0.05 * mesh.elements.xc[e]; });
  f.Setup(std::string(kHd) +
              "[VantorHD.HYDRODYNAMIC_MODULE.FLOOD_AND_DRY]\ntype = 1\n"
              "[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]\ntype = 2\nfile_name_2d = \"ini.zrnu\"\n",
          mesh);
  InitialiseStateHD(f.hd, f.meshes[0]);
  const HdState& s = f.hd.state;
  int dry = 0;
  for (int e = 1; e <= s.nelements; ++e) {
    const double eta = 0.5 - 0.05 * mesh.elements.xc[e];
    EXPECT_GE(s.h[e], 0.0);
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
  WriteMeshFile(f.dir.file("ini3.zrnu"), mesh, 4, 1, 60.0, [](int k, int, int e) {
    switch (k) {
      case 1:
        return e == 3 ? -0.2 : 1.0 + 0.1 * e;
      case 2:
        return 0.5;
      case 3:
        return -0.25;
      default:
        return 4.0;
    }
  });
  f.Setup(std::string(kHd) +
              "[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]\ntype = 3\nfile_name_2d = \"ini3.zrnu\"\n"
              "still_water_depth_item_no = 4\n",
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
