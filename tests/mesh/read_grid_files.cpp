// Grid data files turned into meshes: line grids (.zrn1, .dt1) into 1D meshes
// of lines, 3D grids (.zrn3) into hexahedra or prisms, with the bathymetry
// grid (.zrn2) as the reference for the horizontal placement, and
// bathymetry grids (.zrn2) into quadrilaterals or triangles. Every expected
// value follows from the grid definition (origin, orientation, axis origin and
// spacing): a grid value stands at the cell centre x0 + i dx, a mesh node of a
// 2D or 3D grid at a cell corner half a spacing away, and a local point (x, y)
// lies at easting x0 + x cos(o) + y sin(o), northing y0 - x sin(o) + y cos(o).

#include <gtest/gtest.h>
#include <netcdf.h>

#include <cmath>
#include <filesystem>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "io/setup.hpp"
#include "io/units.hpp"
#include "io/zrn.hpp"
#include "mesh/mesh.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::TempDir;
using test::WriteTextFile;

constexpr double kLand = 99.0;
constexpr double kNoData = -999.0;  // the delete value of the test files
constexpr double kTol = 1e-6;

// What a grid file holds: item 1 on an axis of 1 to 3 dimensions.
struct GridFile {
  int dims = 2;
  int n[3] = {1, 1, 1};
  double x0[3] = {0, 0, 0};
  double dx[3] = {1, 1, 1};
  double origin_x = 0, origin_y = 0, orientation = 0;
  bool land = true;  // the file names kLand as its land value
  int nsteps = 1;
  int nitems = 1;
};

void WriteAscendingGrid(const std::string& path, const GridFile& g, const std::vector<double>& values) {
  ZrnFile f;
  ASSERT_EQ(zrnHeaderCreate(f, path, kZrnFileData, "Grid"), 0);
  zrnSetDeleteValFloat(f, kNoData);
  zrnSetGeoInfoUTMProj(f, "UTM-32", g.origin_x, g.origin_y, g.orientation);
  if (g.land) zrnAddCustomBlock(f, "zland", std::vector<double>{kLand});
  zrnSetEqCalendarAxis(f, ZrnDateTime{}, 60.0);
  for (int item = 1; item <= g.nitems; ++item) {
    zrnSetItemInfo(f, item, "Bed level " + std::to_string(item), kUvqIBathymetry, kUvqUmeter, kZrnDouble);
    if (g.dims == 1) zrnSetItemAxisEqD1(f, item, g.n[0], g.x0[0], g.dx[0]);
    if (g.dims == 2) zrnSetItemAxisEqD2(f, item, g.n[0], g.n[1], g.x0[0], g.x0[1], g.dx[0], g.dx[1]);
    if (g.dims == 3)
      zrnSetItemAxisEqD3(f, item, g.n[0], g.n[1], g.n[2], g.x0[0], g.x0[1], g.x0[2], g.dx[0], g.dx[1], g.dx[2]);
  }
  ASSERT_EQ(zrnFileCreate(f, false), 0);
  for (int s = 0; s < g.nsteps; ++s)
    for (int item = 1; item <= g.nitems; ++item)
      ASSERT_EQ(zrnWriteItemTimeStep(f, 0.0, values.data(), static_cast<long>(values.size())), 0);
  ASSERT_EQ(zrnFileClose(f), 0);
}

// A grid with descending axes as other tools write them (rasters from north to
// south, depths downward): the file is written ascending and its coordinate
// values are then reversed behind the layer's back, as such a tool leaves them.
void WriteGrid(const std::string& path, const GridFile& g, const std::vector<double>& values) {
  GridFile ascending = g;
  for (double& d : ascending.dx) d = std::abs(d);
  WriteAscendingGrid(path, ascending, values);
  const char* names[3] = {"x", "y", "z"};
  for (int k = 0; k < g.dims; ++k) {
    if (g.dx[k] > 0) continue;
    int ncid = -1, var = -1;
    ASSERT_EQ(nc_open(path.c_str(), NC_WRITE, &ncid), NC_NOERR);
    ASSERT_EQ(nc_inq_varid(ncid, names[k], &var), NC_NOERR);
    std::vector<double> c;
    for (int i = 0; i < g.n[k]; ++i) c.push_back(g.x0[k] + i * g.dx[k]);
    ASSERT_EQ(nc_put_var_double(ncid, var, c.data()), NC_NOERR);
    ASSERT_EQ(nc_close(ncid), NC_NOERR);
  }
}

// Easting and northing of a local point of the grid.
std::pair<double, double> Placed(const GridFile& g, double x, double y) {
  const double o = g.orientation * kDegToRad;
  return {g.origin_x + x * std::cos(o) + y * std::sin(o), g.origin_y - x * std::sin(o) + y * std::cos(o)};
}

// Node at a position (0 when none).
int NodeAt(const Mesh& m, double x, double y, double z) {
  for (int n = 1; n <= m.nodes.nnodes; ++n)
    if (std::abs(m.nodes.x[n] - x) < kTol && std::abs(m.nodes.y[n] - y) < kTol && std::abs(m.nodes.z[n] - z) < kTol)
      return n;
  return 0;
}

// A layered 3D element: the first half of its nodes is the bottom face,
// anticlockwise seen from above, the second half the same corners one level up.
void ExpectLayeredElement(const Mesh& m, int e, int corners, double area, double dz) {
  ASSERT_EQ(ElementNodeCount(m.elements, e), 2 * corners) << "element " << e;
  EXPECT_NEAR(test::TwiceSignedArea(m, e, 1, corners), 2 * area, kTol) << "element " << e;
  const double zb = m.nodes.z[ElementNode(m.elements, e, 1)];
  for (int j = 1; j <= corners; ++j) {
    const int b = ElementNode(m.elements, e, j), t = ElementNode(m.elements, e, j + corners);
    EXPECT_NEAR(m.nodes.z[b], zb, kTol) << "element " << e;
    EXPECT_NEAR(m.nodes.x[t], m.nodes.x[b], kTol) << "element " << e;
    EXPECT_NEAR(m.nodes.y[t], m.nodes.y[b], kTol) << "element " << e;
    EXPECT_NEAR(m.nodes.z[t], zb + dz, kTol) << "element " << e;
  }
}

// Reads a mesh through the setup file, as a run does.
Mesh ReadThroughSetup(const TempDir& dir, const std::string& keys) {
  test::OpenDomainSection(dir, keys);
  Mesh mesh;
  ReadMesh(mesh);
  SktCloseSection();
  SktClose();
  return mesh;
}

// ---- line grids ------------------------------------------------------------------------------

// Points at local x = 100, 150, ..., turned 90 degrees: the local x axis points
// south, so point i lies at easting 1000, northing 2000 - (100 + 50 i).
GridFile LineGrid(int nx) {
  return {.dims = 1, .n = {nx, 1, 1}, .x0 = {100, 0, 0}, .dx = {50, 1, 1}, .origin_x = 1000, .origin_y = 2000,
          .orientation = 90};
}

TEST(ReadLineGrid, StretchesOfWaterBecomeLinesThroughTheGridPoints) {
  TempDir dir;
  // Water at 0..2 and 5..6; land at 3, no data at 4.
  const std::vector<double> v = {-1, -2, -3, kLand, kNoData, -6, -7};
  WriteGrid(dir.file("line.zrn1"), LineGrid(7), v);
  Mesh m;
  ReadMeshFile(m, dir.file("line.zrn1"));
  EXPECT_EQ(m.ndim, 1);
  EXPECT_EQ(m.projection, "UTM-32");
  ASSERT_EQ(m.nodes.nnodes, 5);
  ASSERT_EQ(m.elements.nelements, 3);
  std::vector<int> node_of_point(7, 0);
  for (int i : {0, 1, 2, 5, 6}) {
    node_of_point[i] = NodeAt(m, 1000.0, 2000.0 - (100.0 + 50.0 * i), v[i]);
    ASSERT_NE(node_of_point[i], 0) << "point " << i;
  }
  // The ends of a stretch are boundary nodes, the point inside is not.
  for (int i : {0, 2, 5, 6}) EXPECT_EQ(m.nodes.code[node_of_point[i]], 1) << "point " << i;
  EXPECT_EQ(m.nodes.code[node_of_point[1]], 0);
  std::set<std::pair<int, int>> lines;
  for (int e = 1; e <= 3; ++e) {
    EXPECT_EQ(m.elements.type[e], 11);
    ASSERT_EQ(ElementNodeCount(m.elements, e), 2);
    const int a = ElementNode(m.elements, e, 1), b = ElementNode(m.elements, e, 2);
    lines.insert({std::min(a, b), std::max(a, b)});
  }
  auto line = [&](int i, int j) { return std::make_pair(node_of_point[i], node_of_point[j]); };
  EXPECT_EQ(lines, (std::set<std::pair<int, int>>{line(0, 1), line(1, 2), line(5, 6)}));
}

TEST(ReadLineGrid, ALoneWaterPointIsLeftOut) {
  TempDir dir;
  // Point 3 has land on both sides: no line passes through it.
  WriteGrid(dir.file("line.zrn1"), LineGrid(7), {-1, -2, kLand, -4, kLand, -6, -7});
  WriteGrid(dir.file("single.zrn1"), LineGrid(3), {kLand, -2, kLand});
  Mesh m;
  ReadMeshFile(m, dir.file("line.zrn1"));
  EXPECT_EQ(m.nodes.nnodes, 4);
  EXPECT_EQ(m.elements.nelements, 2);
  EXPECT_EQ(NodeAt(m, 1000.0, 2000.0 - 250.0, -4), 0);
  EXPECT_NE(NodeAt(m, 1000.0, 2000.0 - 350.0, -6), 0);
  EXPECT_FATAL(ReadMeshFile(m, dir.file("single.zrn1")), "ReadMeshBasicZrn1: No two neighbouring grid points hold water");
}

TEST(ReadLineGrid, Dt1FileWithoutLandValueThroughTheSetupFile) {
  TempDir dir;
  GridFile g = LineGrid(4);
  g.land = false;  // 99 is an ordinary value then
  WriteGrid(dir.file("line.dt1"), g, {-1, kLand, -3, -4});
  const Mesh m = ReadThroughSetup(dir, "file_name = \"line.dt1\"\n");
  EXPECT_EQ(m.ndim, 1);
  EXPECT_EQ(m.nodes.nnodes, 4);
  EXPECT_EQ(m.elements.nelements, 3);
  const int middle = NodeAt(m, 1000.0, 2000.0 - 150.0, kLand);
  ASSERT_NE(middle, 0);
  EXPECT_EQ(m.nodes.code[middle], 0);
}

TEST(ReadLineGrid, BadFilesAreNamed) {
  TempDir dir;
  // A plane grid under the extension of another kind (files are created by kind).
  WriteGrid(dir.file("plane.zrn2"), {.n = {2, 2, 1}}, {-1, -2, -3, -4});
  std::filesystem::copy_file(dir.file("plane.zrn2"), dir.file("plane.zrn1"));
  GridFile empty = LineGrid(3);
  empty.nitems = 0;
  WriteGrid(dir.file("empty.zrn1"), empty, {});
  GridFile no_steps = LineGrid(3);
  no_steps.nsteps = 0;
  WriteGrid(dir.file("nosteps.zrn1"), no_steps, {-1, -2, -3});
  WriteGrid(dir.file("land.zrn1"), LineGrid(3), {kLand, kNoData, kLand});

  Mesh m;
  EXPECT_FATAL(ReadMeshFile(m, dir.file("plane.zrn1")), "Fatal error: ReadMeshBasicZrn1: Wrong mesh file");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("empty.zrn1")),
               "Fatal error: ReadMeshBasicZrn1: Wrong number of items in file");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("nosteps.zrn1")), "Fatal error: ReadMeshBasicZrn1: Error Reading data file");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("land.zrn1")),
               "Input bathymetry consists of pure land values. Mesh cannot be generated.");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("missing.zrn1")), "missing.zrn1");
}

// ---- 3D grids --------------------------------------------------------------------------------

// 2 x 2 cells in 2 layers: cell centres x, y = 5, 15 and z = -15, -5, so the
// corners lie at 0, 10, 20 and the levels at -20, -10, 0. The upper cell at
// x = 15, y = 15 holds no water. With `reversed` the y and z axes run the other
// way (from 15 and -5 with spacing -10): the same cells in another order.
GridFile Block(bool reversed) {
  if (reversed) return {.dims = 3, .n = {2, 2, 2}, .x0 = {5, 15, -5}, .dx = {10, -10, -10}};
  return {.dims = 3, .n = {2, 2, 2}, .x0 = {5, 5, -15}, .dx = {10, 10, 10}};
}

// Values of the block with `hole` (land or no data) in the upper cell at x, y = 15.
std::vector<double> BlockValues(const GridFile& g, double hole = kLand) {
  std::vector<double> v;
  for (int k = 0; k < 2; ++k)
    for (int j = 0; j < 2; ++j)
      for (int i = 0; i < 2; ++i) {
        const double x = g.x0[0] + i * g.dx[0], y = g.x0[1] + j * g.dx[1], z = g.x0[2] + k * g.dx[2];
        v.push_back(x == 15 && y == 15 && z == -5 ? hole : 1.0);
      }
  return v;
}

void ExpectBlockMesh(const Mesh& m, int type) {
  EXPECT_EQ(m.ndim, 3);
  EXPECT_EQ(m.nlayers, 2);
  ASSERT_EQ(m.nodes.nnodes, 26);  // 27 corners less the one only the dry cell has
  EXPECT_EQ(NodeAt(m, 20, 20, 0), 0);
  for (double z : {-20.0, -10.0, 0.0})
    for (double y : {0.0, 10.0, 20.0})
      for (double x : {0.0, 10.0, 20.0}) {
        if (x == 20 && y == 20 && z == 0) continue;
        const int n = NodeAt(m, x, y, z);
        ASSERT_NE(n, 0) << x << " " << y << " " << z;
        // Only the bottom of the middle column lies inside the water body; the
        // node above it touches the side of the dry cell.
        EXPECT_EQ(m.nodes.code[n], x == 10 && y == 10 && z == -20 ? 0 : 1) << x << " " << y << " " << z;
      }
  const bool prisms = type == 32;
  ASSERT_EQ(m.elements.nelements, prisms ? 14 : 7);
  for (int e = 1; e <= m.elements.nelements; ++e) {
    EXPECT_EQ(m.elements.type[e], type);
    ExpectLayeredElement(m, e, prisms ? 3 : 4, prisms ? 50.0 : 100.0, 10.0);
    double x = 0, y = 0, z = 0;
    const int nn = ElementNodeCount(m.elements, e);
    for (int j = 1; j <= nn; ++j) {
      x += m.nodes.x[ElementNode(m.elements, e, j)] / nn;
      y += m.nodes.y[ElementNode(m.elements, e, j)] / nn;
      z += m.nodes.z[ElementNode(m.elements, e, j)] / nn;
    }
    EXPECT_FALSE(x > 10 && y > 10 && z > -10) << "element " << e << " fills the dry cell";
  }
}

// Hexahedra by default, prisms through the setup file or the options; a dry
// cell of land or of no data; axes running either way.
TEST(Read3DGrid, CellsBecomeHexahedraOrPrismsBetweenTheLevels) {
  for (const bool reversed : {false, true}) {
    SCOPED_TRACE(reversed ? "axes running south and downward" : "ascending axes");
    TempDir dir;
    const GridFile g = Block(reversed);
    WriteGrid(dir.file("block.zrn3"), g, BlockValues(g, reversed ? kNoData : kLand));
    Mesh hexahedra, prisms;
    ReadMeshFile(hexahedra, dir.file("block.zrn3"));
    ExpectBlockMesh(hexahedra, 33);
    GridMeshOptions options;
    options.type_of_element = 32;
    if (reversed) ReadMeshFile(prisms, dir.file("block.zrn3"), options);
    else prisms = ReadThroughSetup(dir, "file_name = \"block.zrn3\"\ntype_of_element = 32\n");
    ExpectBlockMesh(prisms, 32);
  }
}

// A turned and shifted 3D grid stands on the corners of the bathymetry grid of
// the same horizontal axes.
TEST(Read3DGrid, PlacedLikeTheBathymetryGrid) {
  TempDir dir;
  const GridFile g3{.dims = 3, .n = {3, 2, 2}, .x0 = {25, -10, -3}, .dx = {50, 20, 2}, .origin_x = 500000,
                    .origin_y = 6000000, .orientation = 30};
  GridFile g2 = g3;
  g2.dims = 2;
  WriteGrid(dir.file("g.zrn3"), g3, std::vector<double>(12, -1.0));
  WriteGrid(dir.file("g.zrn2"), g2, {-1, -2, -3, -4, -5, -6});
  Mesh m3, m2;
  ReadMeshFile(m3, dir.file("g.zrn3"));
  ReadMeshFile(m2, dir.file("g.zrn2"));
  ASSERT_EQ(m2.nodes.nnodes, 12);
  ASSERT_EQ(m3.nodes.nnodes, 36);
  ASSERT_EQ(m3.elements.nelements, 12);
  for (int j = 0; j < 3; ++j)
    for (int i = 0; i < 4; ++i) {
      const auto [x, y] = Placed(g3, 25 + (i - 0.5) * 50, -10 + (j - 0.5) * 20);
      int found2 = 0;  // bed levels of the 2D mesh are means of the cells: look up by x, y
      for (int n = 1; n <= m2.nodes.nnodes; ++n)
        if (std::abs(m2.nodes.x[n] - x) < kTol && std::abs(m2.nodes.y[n] - y) < kTol) ++found2;
      EXPECT_EQ(found2, 1) << "corner " << i << " " << j;
      for (double z : {-4.0, -2.0, 0.0}) EXPECT_NE(NodeAt(m3, x, y, z), 0) << "corner " << i << " " << j << " " << z;
    }
  for (int e = 1; e <= 12; ++e) ExpectLayeredElement(m3, e, 4, 50.0 * 20.0, 2.0);
}

TEST(Read3DGrid, BadFilesAreNamed) {
  TempDir dir;
  WriteGrid(dir.file("plane.zrn2"), {.n = {2, 2, 1}}, {-1, -2, -3, -4});
  std::filesystem::copy_file(dir.file("plane.zrn2"), dir.file("plane.zrn3"));
  WriteGrid(dir.file("land.zrn3"), Block(false), std::vector<double>(8, kLand));
  WriteGrid(dir.file("block.zrn3"), Block(false), BlockValues(Block(false)));

  Mesh m;
  EXPECT_FATAL(ReadMeshFile(m, dir.file("plane.zrn3")), "Fatal error: ReadMeshBasicZrn3: Wrong mesh file");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("land.zrn3")),
               "Input bathymetry consists of pure land values. Mesh cannot be generated.");
  GridMeshOptions triangles;
  triangles.type_of_element = 21;
  EXPECT_FATAL(ReadMeshFile(m, dir.file("block.zrn3"), triangles), "Fatal error: Type not supported for");
}

// ---- bathymetry grids -----------------------------------------------------------------------------------

// A 3 x 2 bathymetry grid with cell centres at x = 5, 15, 25 and y = 5, 15.
GridFile Bathymetry(bool land) { return {.n = {3, 2, 1}, .x0 = {5, 5, 0}, .dx = {10, 10, 1}, .land = land}; }

TEST(ReadGridMesh, CellsBecomeElementsAndLandIsLeftOut) {
  TempDir dir;
  // Row y = 5: -1, -2, land; row y = 15: -3, -4, -5.
  WriteGrid(dir.file("g.zrn2"), Bathymetry(true), {-1, -2, kLand, -3, -4, -5});
  Mesh quads;
  ReadMeshFile(quads, dir.file("g.zrn2"));
  EXPECT_EQ(quads.elements.nelements, 5);
  EXPECT_EQ(quads.nodes.nnodes, 11);  // 12 corners less the land cell's lone corner
  for (int e = 1; e <= 5; ++e) EXPECT_EQ(quads.elements.type[e], 25);
  // The corner at (10, 10) is shared by the cells -1, -2, -3, -4.
  bool found = false;
  for (int n = 1; n <= quads.nodes.nnodes; ++n) {
    if (quads.nodes.x[n] == 10.0 && quads.nodes.y[n] == 10.0) {
      EXPECT_DOUBLE_EQ(quads.nodes.z[n], -2.5);
      EXPECT_EQ(quads.nodes.code[n], 0);
      found = true;
    } else {
      EXPECT_NE(quads.nodes.code[n], 0);
    }
  }
  EXPECT_TRUE(found);
  GridMeshOptions triangles;
  triangles.type_of_element = 21;
  Mesh tri;
  ReadMeshFile(tri, dir.file("g.zrn2"), triangles);
  EXPECT_EQ(tri.elements.nelements, 10);
  EXPECT_EQ(tri.elements.type[1], 21);
}

TEST(ReadGridMesh, GridFaults) {
  TempDir dir;
  WriteGrid(dir.file("noland.zrn2"), Bathymetry(false), {-1, -2, kLand, -3, -4, -5});
  Mesh m;
  testing::internal::CaptureStdout();
  ReadMeshFile(m, dir.file("noland.zrn2"));
  EXPECT_NE(testing::internal::GetCapturedStdout().find("Warning: zland not found i file, all point included"),
            std::string::npos);
  EXPECT_EQ(m.elements.nelements, 6);
  WriteGrid(dir.file("land.zrn2"), Bathymetry(true), std::vector<double>(6, kLand));
  EXPECT_FATAL(ReadMeshFile(m, dir.file("land.zrn2")),
               "Input bathymetry consists of pure land values. Mesh cannot be generated.");
  GridMeshOptions grid;
  grid.type_of_grid = 3;
  EXPECT_FATAL(ReadMeshFile(m, dir.file("noland.zrn2"), grid), "Fatal error: Grid type not supported");
  grid.type_of_grid = 2;
  grid.filename_grid = dir.file("noland.zrn3");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("noland.zrn2"), grid), "Fatal error: Illegal input file");
  grid.filename_grid = dir.file("noland.zrn2");
  ReadMeshFile(m, dir.file("land.zrn2"), grid);  // geometry from the grid file, z from the bathymetry
  EXPECT_EQ(m.elements.nelements, 6);
  EXPECT_DOUBLE_EQ(m.nodes.z[1], 99.0);
}

}  // namespace
}  // namespace vhd
