#include <gtest/gtest.h>

#include <netcdf.h>

#include <cmath>
#include <string>

#include "io/zrn.hpp"
#include "io/units.hpp"
#include "mesh/mesh.hpp"
#include "mesh/read_mesh.hpp"
#include "read_support.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

using test::TempDir;
using test::WriteTextFile;

// Two triangles and a quadrilateral in a file of type 25 with 4 node slots.
const char* kNodesAndElements =
    "1 0 0 -1 1\n"
    "2 10 0 -2 1\n"
    "3 10 10 -3 0\n"
    "4 0 10 -4 2\n"
    "5 20 0 -5 1\n"
    "6 20 10 -6 1\n"
    "3 4 25\n"
    "1 1 2 3 0\n"
    "2 1 3 4 0\n"
    "3 2 5 6 3\n";

Mesh ReadAscii(const std::string& path) {
  Mesh mesh;
  ReadMeshBasicAscii(mesh, path);
  return mesh;
}

void ExpectSameMesh(const Mesh& a, const Mesh& b) {
  ASSERT_EQ(a.nodes.nnodes, b.nodes.nnodes);
  ASSERT_EQ(a.elements.nelements, b.elements.nelements);
  EXPECT_EQ(a.projection, b.projection);
  for (int n = 1; n <= a.nodes.nnodes; ++n) {
    EXPECT_EQ(a.nodes.id[n], b.nodes.id[n]);
    EXPECT_EQ(a.nodes.x[n], b.nodes.x[n]);
    EXPECT_EQ(a.nodes.y[n], b.nodes.y[n]);
    EXPECT_EQ(a.nodes.z[n], b.nodes.z[n]);
    EXPECT_EQ(a.nodes.code[n], b.nodes.code[n]);
  }
  for (int e = 1; e <= a.elements.nelements; ++e) {
    EXPECT_EQ(a.elements.id[e], b.elements.id[e]);
    EXPECT_EQ(a.elements.type[e], b.elements.type[e]);
    ASSERT_EQ(ElementNodeCount(a.elements, e), ElementNodeCount(b.elements, e));
    for (int j = 1; j <= ElementNodeCount(a.elements, e); ++j)
      EXPECT_EQ(ElementNode(a.elements, e, j), ElementNode(b.elements, e, j));
  }
}

TEST(ReadAsciiMesh, HeaderFormsGiveTheSameMesh) {
  TempDir dir;
  WriteTextFile(dir.file("a.mesh"), std::string("100079 1000 6 UTM-33\n") + kNodesAndElements);
  WriteTextFile(dir.file("b.mesh"), std::string("6 UTM-33\n") + kNodesAndElements);
  WriteTextFile(dir.file("c.mesh"), std::string("6\n") + kNodesAndElements);
  WriteTextFile(dir.file("d.mesh"), std::string("100079, 1000, 6, UTM-33\n") + kNodesAndElements);
  const Mesh a = ReadAscii(dir.file("a.mesh"));
  ExpectSameMesh(a, ReadAscii(dir.file("b.mesh")));
  ExpectSameMesh(a, ReadAscii(dir.file("d.mesh")));
  EXPECT_EQ(a.projection, "UTM-33");
  EXPECT_EQ(a.ndim, 2);
  EXPECT_EQ(a.unit_code, 1000);
  Mesh c;
  ReadMeshFile(c, dir.file("c.mesh"));
  EXPECT_EQ(c.projection, "UTM-32");
}

TEST(ReadAsciiMesh, ProjectionWithBlanksStaysWhole) {
  TempDir dir;
  const std::string proj = "+proj=tmerc +lat_0=0 +lon_0=9 +k=0.9996 +x_0=500000 +datum=WGS84";
  WriteTextFile(dir.file("a.mesh"), "100079 1000 6   " + proj + "   \n" + kNodesAndElements);
  WriteTextFile(dir.file("b.mesh"), "6 \"" + proj + "\"\n" + kNodesAndElements);
  Mesh a, b;
  ReadMeshFile(a, dir.file("a.mesh"));
  ReadMeshFile(b, dir.file("b.mesh"));
  EXPECT_EQ(a.projection, proj);
  EXPECT_EQ(b.projection, proj);
}

TEST(ReadAsciiMesh, QuadrilateralRowsWithZeroAreTriangles) {
  TempDir dir;
  WriteTextFile(dir.file("a.mesh"), std::string("6\n") + kNodesAndElements);
  const Mesh m = ReadAscii(dir.file("a.mesh"));
  ASSERT_EQ(m.elements.nelements, 3);
  EXPECT_EQ(m.elements.type[1], 21);
  EXPECT_EQ(m.elements.type[2], 21);
  EXPECT_EQ(m.elements.type[3], 25);
  EXPECT_EQ(ElementNodeCount(m.elements, 1), 3);
  EXPECT_EQ(ElementNodeCount(m.elements, 3), 4);
  EXPECT_EQ(ElementNode(m.elements, 3, 4), 3);
}

TEST(ReadAsciiMesh, BedLevelsInFeetBecomeMetres) {
  TempDir dir;
  WriteTextFile(dir.file("a.mesh"), std::string("100079 1014 6 NON-UTM\n") + kNodesAndElements);
  const Mesh m = ReadAscii(dir.file("a.mesh"));
  EXPECT_EQ(m.unit_code, 1014);
  EXPECT_NEAR(m.nodes.z[2], -2 * 0.3048, 1e-12);
  // Written back in feet, read again in metres.
  WriteMeshAscii(m, dir.file("b.mesh"));
  EXPECT_NEAR(ReadAscii(dir.file("b.mesh")).nodes.z[2], -2 * 0.3048, 1e-12);
}

TEST(ReadAsciiMesh, LongLatIsHeldInRadians) {
  TempDir dir;
  WriteTextFile(dir.file("a.mesh"), std::string("6 LONG/LAT\n") + kNodesAndElements);
  Mesh m;
  ReadMeshFile(m, dir.file("a.mesh"));
  EXPECT_EQ(m.projection, "LONG/LAT");
  EXPECT_DOUBLE_EQ(m.nodes.x[2], 10 * 0.017453292519943295);
  EXPECT_DOUBLE_EQ(m.nodes.y[3], 10 * 0.017453292519943295);
  EXPECT_EQ(m.nodes.z[3], -3.0);
}

TEST(ReadAsciiMesh, BadInputEndsWithAMessageNamingFileAndLine) {
  TempDir dir;
  auto write = [&](const std::string& name, const std::string& text) {
    WriteTextFile(dir.file(name), text);
    return dir.file(name);
  };
  Mesh m;
  EXPECT_FATAL(ReadMeshBasicAscii(m, dir.file("missing.mesh")),
               "ReadMeshBasicAscii: Unable to open file (file ");
  const std::string short_nodes = write("short.mesh", "8 UTM-32\n1 0 0 0 0\n2 1 0 0 0\n");
  EXPECT_FATAL(ReadMeshBasicAscii(m, short_nodes), "ReadMeshBasicAscii: Unexpected end of file, node 3 of 8");
  const std::string bad_node = write("badnode.mesh", "2\n1 0 0 0 0\n2 1 x 0 0\n");
  EXPECT_FATAL(ReadMeshBasicAscii(m, bad_node), "Node line must hold id, x, y, z, code");
  EXPECT_FATAL(ReadMeshBasicAscii(m, bad_node), "(file " + bad_node + ", line 3)");
  std::string text(kNodesAndElements);
  text.replace(text.find("3 2 5 6 3"), 9, "3 2 5 6 9");
  const std::string out_of_range = write("range.mesh", "6\n" + text);
  EXPECT_FATAL(ReadMeshBasicAscii(m, out_of_range), "Node number 9 out of range 0 to 6");
  text = kNodesAndElements;
  text.replace(text.find("3 4 25"), 6, "3 4 29");
  const std::string bad_type = write("type.mesh", "6\n" + text);
  EXPECT_FATAL(ReadMeshBasicAscii(m, bad_type), "Unknown element type 29");
  text = kNodesAndElements;
  text.replace(text.find("2 1 3 4 0"), 9, "2 1 3 0 0");
  const std::string two_nodes = write("two.mesh", "6\n" + text);
  EXPECT_FATAL(ReadMeshBasicAscii(m, two_nodes), "Element with 2 nodes does not fit element type 25");
  const std::string few_elements = write("few.mesh", "6\n" + std::string(kNodesAndElements).substr(0, 100));
  EXPECT_FATAL(ReadMeshBasicAscii(m, few_elements), "Unexpected end of file, element");
  const std::string unknown = write("proj.mesh", std::string("6 Nowhere Grid\n") + kNodesAndElements);
  EXPECT_FATAL(ReadMeshFile(m, unknown), "Fatal error: Unable to establish projection: Nowhere Grid");
  const std::string bad_unit = write("unit.mesh", std::string("100079 1400 6\n") + kNodesAndElements);
  EXPECT_FATAL(ReadMeshBasicAscii(m, bad_unit), "Unit code 1400 is not a unit of length");
}

TEST(CheckMeshTest, FindsEveryFault) {
  TempDir dir;
  WriteTextFile(dir.file("ok.mesh"), std::string("6\n") + kNodesAndElements);
  Mesh m;
  ReadMeshFile(m, dir.file("ok.mesh"));
  Mesh bad = ReadAscii(dir.file("ok.mesh"));
  bad.nodes.id[2] = 7;
  EXPECT_FATAL(CheckMesh(bad), "The node indicices and IDs must be the same");
  bad = ReadAscii(dir.file("ok.mesh"));
  bad.elements.id[3] = 1;
  EXPECT_FATAL(CheckMesh(bad), "The element indicices and IDs must be the same");
  bad = ReadAscii(dir.file("ok.mesh"));
  bad.elements.node_list[2] = -1;
  EXPECT_FATAL(CheckMesh(bad), "Node in the element table is lower than 1");
  bad.elements.node_list[2] = 7;
  EXPECT_FATAL(CheckMesh(bad), "Node in the element table is larger than the number of nodes");
  std::string text = std::string("7\n") + kNodesAndElements;
  text.insert(text.find("3 4 25"), "7 5 5 5 0\n");
  WriteTextFile(dir.file("orphan.mesh"), text);
  EXPECT_FATAL(ReadMeshFile(m, dir.file("orphan.mesh")), "Node not included in mesh: 7");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("orphan.mesh")), "Fatal error: Nodes not included in mesh");
  // Without the check the mesh is taken as it is.
  ReadMeshFile(m, dir.file("orphan.mesh"), {}, 0);
  EXPECT_EQ(m.nodes.nnodes, 7);
}

// ---- zrnu ----------------------------------------------------------------------------------

// A zrnu file of two triangles whose node ids are given per file position.
void WriteTwoTriangles(const std::string& path, const std::vector<int>& ids, bool header_items = true) {
  ZrnMeshData d;
  d.node_id.assign(4);
  d.x.assign(4);
  d.y.assign(4);
  d.z.assign(4);
  d.node_code.assign(4);
  const double xy[4][2] = {{0, 0}, {1, 0}, {1, 1}, {0, 1}};
  for (int p = 1; p <= 4; ++p) {
    d.node_id[p] = ids[static_cast<std::size_t>(p - 1)];
    d.x[p] = xy[p - 1][0];
    d.y[p] = xy[p - 1][1];
    d.z[p] = -p;
    d.node_code[p] = p == 4 ? 2 : 1;
  }
  d.element_id.assign(2);
  d.element_type.assign(2);
  d.node_start.assign(3);
  d.node_list.assign(6);
  const int nodes[6] = {1, 2, 3, 1, 3, 4};
  for (int k = 1; k <= 6; ++k) d.node_list[k] = nodes[k - 1];
  d.node_start[1] = 1;
  d.node_start[2] = 4;
  d.node_start[3] = 7;
  for (int e = 1; e <= 2; ++e) {
    d.element_id[e] = e;
    d.element_type[e] = 21;
  }
  ZrnFile f;
  zrnHeaderCreate(f, path, kZrnFileMesh2D, "Mesh");
  zrnSetGeoInfoUTMProj(f, "UTM-32", 0, 0, 0);
  zrnSetEqCalendarAxis(f, ZrnDateTime{}, 1.0);
  zrnSetMesh(f, d);
  zrnFileCreate(f, false);
  zrnFileClose(f);
  if (!header_items) {
    // An older file: the block of header items holds only the two counts.
    int ncid = -1;
    const int counts[2] = {4, 2};
    ASSERT_EQ(nc_open(path.c_str(), NC_WRITE, &ncid), NC_NOERR);
    ASSERT_EQ(nc_redef(ncid), NC_NOERR);
    ASSERT_EQ(nc_put_att_int(ncid, NC_GLOBAL, "zrn_block_TANO_KX", NC_INT, 2, counts), NC_NOERR);
    ASSERT_EQ(nc_close(ncid), NC_NOERR);
  }
}

TEST(ReadZrnuMesh, NodesMoveToThePositionOfTheirIds) {
  TempDir dir;
  WriteTwoTriangles(dir.file("a.zrnu"), {3, 1, 2, 4});
  Mesh m;
  testing::internal::CaptureStdout();
  ReadMeshFile(m, dir.file("a.zrnu"));
  const std::string out = testing::internal::GetCapturedStdout();
  EXPECT_NE(out.find("Warning: Reordering of node information"), std::string::npos) << out;
  ASSERT_EQ(m.nodes.nnodes, 4);
  // File position 1 (id 3) is now node 3, and so on.
  EXPECT_EQ(m.nodes.x[3], 0.0);
  EXPECT_EQ(m.nodes.z[3], -1.0);
  EXPECT_EQ(m.nodes.z[1], -2.0);
  EXPECT_EQ(m.nodes.z[2], -3.0);
  for (int n = 1; n <= 4; ++n) EXPECT_EQ(m.nodes.id[n], n);
  // Elements still join the same points: element 1 is (0,0), (1,0), (1,1).
  EXPECT_EQ(ElementNode(m.elements, 1, 1), 3);
  EXPECT_EQ(ElementNode(m.elements, 1, 2), 1);
  EXPECT_EQ(ElementNode(m.elements, 1, 3), 2);
  EXPECT_EQ(m.projection, "UTM-32");
  EXPECT_EQ(m.ndim, 2);
}

TEST(ReadZrnuMesh, IdsThatAreNoPermutationStopTheRun) {
  TempDir dir;
  WriteTwoTriangles(dir.file("a.zrnu"), {1, 2, 2, 5});
  Mesh m;
  EXPECT_FATAL(ReadMeshFile(m, dir.file("a.zrnu")), "Fatal error: The node indicices and IDs must be the same");
  ReadMeshFile(m, dir.file("a.zrnu"), {}, 0);
  EXPECT_EQ(m.nodes.id[4], 5);
}

TEST(ReadZrnuMesh, MissingHeaderItemsAreWarnings) {
  TempDir dir;
  WriteTwoTriangles(dir.file("a.zrnu"), {1, 2, 3, 4}, false);
  Mesh m;
  testing::internal::CaptureStdout();
  ReadMeshBasicZrnu(m, dir.file("a.zrnu"));
  const std::string out = testing::internal::GetCapturedStdout();
  EXPECT_NE(out.find("Warning: ndim not found in file, ndim = 2 assumed"), std::string::npos) << out;
  EXPECT_NE(out.find("Warning: nlayers not found i file, nlayers = 0 assumed"), std::string::npos);
  EXPECT_EQ(out.find("nlayers_sigma"), std::string::npos);  // only for 3D meshes
  EXPECT_EQ(m.ndim, 2);
  EXPECT_EQ(m.nlayers, 0);
  EXPECT_EQ(m.vertical_type, 1);
}

TEST(ReadZrnuMesh, AsciiToZrnuAndBackKeepsEverything) {
  TempDir dir;
  WriteTextFile(dir.file("a.mesh"), std::string("100079 1000 6 LONG/LAT\n") + kNodesAndElements);
  const Mesh a = ReadAscii(dir.file("a.mesh"));
  WriteMeshZrnu(a, dir.file("a.zrnu"));
  Mesh b;
  ReadMeshBasicZrnu(b, dir.file("a.zrnu"));
  ExpectSameMesh(a, b);
  WriteMeshAscii(b, dir.file("b.mesh"));
  ExpectSameMesh(a, ReadAscii(dir.file("b.mesh")));
  // The data file carries the coordinate reference for other tools.
  ZrnFile f;
  ZrnOpenInput(f, dir.file("a.zrnu"));
  EXPECT_EQ(f.epsg, 4326);
  zrnHeaderDestroy(f);
}

// ---- grids -----------------------------------------------------------------------------------

// A 3 x 2 bathymetry grid with cell centres at x = 5, 15, 25 and y = 5, 15.
void WriteGrid(const std::string& path, const std::vector<double>& values, bool land) {
  ZrnFile f;
  zrnHeaderCreate(f, path, kZrnFileData, "Bathymetry");
  zrnSetGeoInfoUTMProj(f, "UTM-32", 0, 0, 0);
  if (land) zrnAddCustomBlock(f, "zland", std::vector<double>{99.0});
  zrnSetEqCalendarAxis(f, ZrnDateTime{}, 60.0);
  zrnSetItemInfo(f, 1, "Bathymetry", kUvqIBathymetry, kUvqUmeter, kZrnDouble);
  zrnSetItemAxisEqD2(f, 1, 3, 2, 5.0, 5.0, 10.0, 10.0);
  zrnFileCreate(f, false);
  zrnWriteItemTimeStep(f, 0.0, values.data(), static_cast<long>(values.size()));
  zrnFileClose(f);
}

TEST(ReadGridMesh, CellsBecomeElementsAndLandIsLeftOut) {
  TempDir dir;
  // Row y = 5: -1, -2, land; row y = 15: -3, -4, -5.
  WriteGrid(dir.file("g.zrn2"), {-1, -2, 99, -3, -4, -5}, true);
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
  WriteGrid(dir.file("noland.zrn2"), {-1, -2, 99, -3, -4, -5}, false);
  Mesh m;
  testing::internal::CaptureStdout();
  ReadMeshFile(m, dir.file("noland.zrn2"));
  EXPECT_NE(testing::internal::GetCapturedStdout().find("Warning: zland not found i file, all point included"),
            std::string::npos);
  EXPECT_EQ(m.elements.nelements, 6);
  WriteGrid(dir.file("land.zrn2"), {99, 99, 99, 99, 99, 99}, true);
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
