// Result files: a mesh result read by xarray and netCDF4 with the state
// written; points, lines and grids that sample a linear field exactly; the
// area subsets; a file that stays readable after its writer is killed.

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "output_support.hpp"

namespace vhd::test {
namespace {

constexpr const char* kOut1 = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]\n";
constexpr const char* kHead = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 1\n";
constexpr const char* kItems =
    "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]\nSURFACE_ELEVATION = true\nU_VELOCITY = true\n"
    "CURRENT_DIRECTION = true\nWET_DRY_CODE = true\n";

// A linear surface, exact under node averaging and linear interpolation.
double Linear(double x, double y) { return 0.25 + 0.002 * x - 0.001 * y; }

// Values of item `item` at step `step` of a file.
std::vector<double> ReadItem(const std::string& path, int step, int item) {
  ZrnFile f;
  zrnFileRead(f, path);
  const long n = f.items.at(static_cast<std::size_t>(item - 1)).axis.Count();
  std::vector<double> v(static_cast<std::size_t>(n));
  ZrnReadItemAtStep(f, step, item, v.data(), n);
  zrnFileClose(f);
  return v;
}

TEST(OutputFiles, MeshResultOpensInXarrayWithTheStateWritten) {
  OutputCase c;
  c.MakeMesh(6, 4, 10.0, 10.0, [](double x, double) { return -1.0 - 0.05 * x; }, CellLayout::kMixed);
  c.Setup(std::string(kHead) + kOut1 + "file_name = \"area.zrnu\"\ntitle = \"Flow\"\n" + kItems);
  c.Fill(Linear, [](double x, double) { return 0.1 + 0.01 * x; }, [](double, double y) { return -0.02 * y; });
  c.Start();
  WriteOutputHD2D(c.out, c.hd, c.mesh, 0, 0.0);
  c.hd.state.eta[3] = 0.75;  // a changed state is what the next record holds
  WriteOutputHD2D(c.out, c.hd, c.mesh, 1, 30.0);
  CloseOutputFilesHD(c.out);

  std::ofstream expected(c.File("expected.txt"));
  expected.precision(17);
  for (int e = 1; e <= c.mesh.elements.nelements; ++e)
    expected << c.hd.state.eta[e] << " " << c.hd.state.u[e] << "\n";
  expected.close();
  const std::string script = R"(
import sys
import numpy as np
import netCDF4
import xarray as xr
path, expected = sys.argv[1], np.loadtxt(sys.argv[2])
ds = xr.open_dataset(path)
assert "UGRID-1.0" in ds.attrs["Conventions"], ds.attrs
eta = ds["surface_elevation"]
assert eta.attrs["long_name"] == "Surface elevation" and eta.attrs["units"] == "m", eta.attrs
assert ds["time"].values.size == 2
assert np.array_equal(eta.values[1], expected[:, 0]), abs(eta.values[1] - expected[:, 0]).max()
assert np.array_equal(ds["u_velocity"].values[1], expected[:, 1])
assert set(np.unique(ds["wet_dry_code"].values)) <= {0.0, 1.0, 2.0}
nc = netCDF4.Dataset(path)
for name in nc.ncattrs():
    assert isinstance(nc.getncattr(name), (str, np.ndarray, np.number, int, float)), name
assert nc.variables["mesh2d_face_nodes"].dtype == np.int32
print("ok")
)";
  std::string out;
  EXPECT_EQ(RunPython(c.dir, script, c.File("area.zrnu") + " " + c.File("expected.txt"), out), 0) << out;
}

TEST(OutputFiles, PointsTakeTheNodeInterpolatedValue) {
  OutputCase c;
  c.MakeMesh(10, 8, 10.0, 10.0, [](double, double) { return -3.0; }, CellLayout::kRandomTriangles);
  c.Setup(std::string(kHead) + kOut1 + "file_name = \"pts.zrn0\"\nformat = 0\nnumber_of_points = 3\n" +
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.POINT_1]\nname = \"A\"\nx = 43.3\ny = 37.9\n" +
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.POINT_2]\nname = \"B\"\nx = 61.0\ny = 22.2\n" +
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.POINT_3]\nname = \"Out\"\nx = 500.0\ny = 5.0\n" + kItems);
  c.Fill(Linear, [](double, double) { return 0.3; }, [](double, double) { return -0.3; });
  c.Start();
  WriteOutputHD2D(c.out, c.hd, c.mesh, 0, 0.0);
  CloseOutputFilesHD(c.out);
  const std::string log = c.Log();
  EXPECT_NE(log.find("Point Output Information"), std::string::npos);
  EXPECT_NE(log.find("SetupPointDomain: Only 2 points inside domain"), std::string::npos) << log;
  // Items run item by item, point by point: A, B, Out for each item.
  EXPECT_NEAR(ReadItem(c.File("pts.zrn0"), 0, 1)[0], Linear(43.3, 37.9), 1e-12);
  EXPECT_NEAR(ReadItem(c.File("pts.zrn0"), 0, 2)[0], Linear(61.0, 22.2), 1e-12);
  EXPECT_EQ(ReadItem(c.File("pts.zrn0"), 0, 3)[0], 1e-35);
  EXPECT_NEAR(ReadItem(c.File("pts.zrn0"), 0, 4)[0], 0.3, 1e-12);
  // A current to the south-east, on a mesh with grid north as north.
  EXPECT_NEAR(ReadItem(c.File("pts.zrn0"), 0, 7)[0], 135.0, 1e-9);
  ZrnFile f;
  zrnFileRead(f, c.File("pts.zrn0"));
  EXPECT_EQ(f.items.at(0).name, "A: Surface elevation");
  zrnFileClose(f);
}

TEST(OutputFiles, LineAndGridSampleTheField) {
  OutputCase c;
  c.MakeMesh(10, 10, 10.0, 10.0, [](double, double) { return -3.0; }, CellLayout::kRightTriangles);
  const std::string line = std::string(kOut1) + "file_name = \"line.zrn1\"\nformat = 1\n" +
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.LINE]\nnpoints = 11\n" +
                           "x_first = 5.0\ny_first = 50.0\nx_last = 125.0\ny_last = 50.0\n" +
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]\nSURFACE_ELEVATION = true\n";
  const std::string grid = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]\nfile_name = \"grid.zrn2\"\n"
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.AREA]\nx_origo = 2.5\nx_ds = 5.0\n"
                           "x_npoints = 21\ny_origo = 12.5\ny_ds = 5.0\ny_npoints = 5\n"
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]\nSURFACE_ELEVATION = true\n";
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 2\n" + line + grid);
  c.Fill(Linear);
  c.Start();
  WriteOutputHD2D(c.out, c.hd, c.mesh, 0, 0.0);
  CloseOutputFilesHD(c.out);
  EXPECT_NE(c.Log().find("SetupLineDomain: 3 points outside domain"), std::string::npos);
  const std::vector<double> l = ReadItem(c.File("line.zrn1"), 0, 1);
  ASSERT_EQ(l.size(), 11u);
  // Exact away from the boundary, where node averages of a linear field are exact.
  for (int i = 1; i < 8; ++i) EXPECT_NEAR(l[static_cast<std::size_t>(i)], Linear(5.0 + 12.0 * i, 50.0), 1e-12) << i;
  for (int i = 8; i < 11; ++i) EXPECT_EQ(l[static_cast<std::size_t>(i)], 1e-35);
  const std::vector<double> g = ReadItem(c.File("grid.zrn2"), 0, 1);
  ASSERT_EQ(g.size(), 105u);
  for (int j = 0; j < 5; ++j)
    for (int i = 0; i < 21; ++i) {
      const double x = 2.5 + 5.0 * i, y = 12.5 + 5.0 * j;
      const double v = g[static_cast<std::size_t>(j * 21 + i)];
      if (x > 10.0 && x < 90.0) EXPECT_NEAR(v, Linear(x, y), 1e-12) << x << " " << y;
      else if (x > 100.0) EXPECT_EQ(v, 10.0);  // land value beyond the mesh
      else EXPECT_NE(v, 10.0);
    }
}

TEST(OutputFiles, AreaSubsetsAndDryElements) {
  OutputCase c;
  // The bed rises above datum in the east: elements there are dry.
  c.MakeMesh(10, 4, 10.0, 10.0, [](double x, double) { return x < 70.0 ? -1.0 : 0.5; });
  const std::string box = std::string(kOut1) + "file_name = \"box.zrnu\"\n" +
                          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.AREA]\nx_min = 0.0\nx_max = 40.0\n" +
                          "y_min = 0.0\ny_max = 20.0\n" + kItems;
  const std::string poly = "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]\nfile_name = \"poly.zrnu\"\ncompress = 0\n"
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.AREA]\nnumber_of_points = 3\n"
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.AREA.POINT_1]\nx = 0.0\ny = 0.0\n"
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.AREA.POINT_2]\nx = 100.0\ny = 0.0\n"
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.AREA.POINT_3]\nx = 100.0\ny = 40.0\n"
                           "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]\nSURFACE_ELEVATION = true\n";
  c.FloodDry();
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 2\n" + box + poly);
  c.Fill([](double, double) { return 0.0; });
  c.Start();
  WriteOutputHD2D(c.out, c.hd, c.mesh, 0, 0.0);
  CloseOutputFilesHD(c.out);
  // Box: the 4 x 2 cells in its corner (centroids inside).
  EXPECT_EQ(ReadItem(c.File("box.zrnu"), 0, 1).size(), 8u);
  // Polygon without compression: the whole mesh, delete value outside and where dry.
  const std::vector<double> p = ReadItem(c.File("poly.zrnu"), 0, 1);
  ASSERT_EQ(p.size(), 40u);
  for (int e = 1; e <= 40; ++e) {
    const double x = c.mesh.elements.xc[e], y = c.mesh.elements.yc[e];
    const bool inside = y < 0.4 * x;
    const bool dry = x > 70.0;
    EXPECT_EQ(p[static_cast<std::size_t>(e - 1)], inside && !dry ? 0.0 : 1e-35) << e;
  }
}

TEST(OutputFiles, ResultStaysReadableAfterTheWriterIsKilled) {
  OutputCase c;
  c.MakeMesh(5, 5, 10.0, 10.0, [](double, double) { return -2.0; });
  c.Setup(std::string(kHead) + kOut1 + "file_name = \"killed.zrnu\"\n" + kItems);
  c.Fill(Linear);
  std::cout.flush();
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    OmpSetThreads(1);
    c.Start();
    for (int n = 0; n <= 4; ++n) WriteOutputHD2D(c.out, c.hd, c.mesh, n, n * c.time.dt);
    raise(SIGKILL);  // the run dies before it closes its files
    _exit(0);
  }
  int status = 0;
  waitpid(child, &status, 0);
  ASSERT_TRUE(WIFSIGNALED(status));
  ZrnFile f;
  ASSERT_EQ(zrnFileRead(f, c.File("killed.zrnu"), &status), 0) << f.detail;
  EXPECT_EQ(f.time.nsteps, 5);
  zrnFileClose(f);
  const std::vector<double> eta = ReadItem(c.File("killed.zrnu"), 4, 1);
  EXPECT_NEAR(eta[0], Linear(c.mesh.elements.xc[1], c.mesh.elements.yc[1]), 1e-14);
}

}  // namespace
}  // namespace vhd::test

namespace vhd::test {
namespace {

bool IsPng(const std::string& path) {
  const std::string s = ReadTextFile(path);
  return s.size() > 1000 && s.compare(0, 8, "\x89PNG\r\n\x1a\n") == 0;
}

int RunPlot(const OutputCase& c, const std::string& args) {
  const std::string cmd = "/usr/bin/python3 " VHD_SOURCE_DIR "/tools/plot_result.py " + args + " > " +
                          c.File("plot.txt") + " 2>&1";
  const int rc = std::system(cmd.c_str());
  return WIFEXITED(rc) ? WEXITSTATUS(rc) : -1;
}

TEST(PlotTool, WritesMapsAndTimeSeries) {
  OutputCase c;
  c.MakeMesh(8, 5, 10.0, 10.0, [](double, double) { return -2.0; }, CellLayout::kMixed);
  c.Setup("[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]\nnumber_of_outputs = 2\n" + std::string(kOut1) +
          "file_name = \"area.zrnu\"\n" + kItems +
          "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]\nfile_name = \"pts.zrn0\"\nformat = 0\n"
          "number_of_points = 1\n[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.POINT_1]\nname = \"A\"\n"
          "x = 35.0\ny = 25.0\n[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]\n"
          "SURFACE_ELEVATION = true\nCURRENT_SPEED = true\n");
  c.Fill(Linear);
  c.Start();
  for (int n = 0; n <= 3; ++n) {
    for (int e = 1; e <= c.mesh.elements.nelements; ++e) c.hd.state.eta[e] += 0.01 * n;
    WriteOutputHD2D(c.out, c.hd, c.mesh, n, n * c.time.dt);
  }
  CloseOutputFilesHD(c.out);
  EXPECT_EQ(RunPlot(c, c.File("area.zrnu") + " --item 'Surface elevation' --step 2 -o " + c.File("map.png")), 0)
      << ReadTextFile(c.File("plot.txt"));
  EXPECT_TRUE(IsPng(c.File("map.png")));
  EXPECT_EQ(RunPlot(c, c.File("area.zrnu") + " --item u_velocity --max -o " + c.File("max.png")), 0)
      << ReadTextFile(c.File("plot.txt"));
  EXPECT_TRUE(IsPng(c.File("max.png")));
  EXPECT_EQ(RunPlot(c, c.File("pts.zrn0") + " -o " + c.File("series.png")), 0) << ReadTextFile(c.File("plot.txt"));
  EXPECT_TRUE(IsPng(c.File("series.png")));
  // An unknown item is refused with the list of items.
  EXPECT_EQ(RunPlot(c, c.File("area.zrnu") + " --item Salinity -o " + c.File("none.png")), 1);
  EXPECT_NE(ReadTextFile(c.File("plot.txt")).find("Surface elevation"), std::string::npos);
}

}  // namespace
}  // namespace vhd::test
