// The engine's own mesh files: the ascii mesh (header forms, units, bad
// input), the mesh check, and the zrnu mesh file.

#include <gtest/gtest.h>
#include <netcdf.h>

#include <string>
#include <vector>

#include "io/zrn.hpp"
#include "mesh/mesh.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::TempDir;
using test::WriteTextFile;

// Two triangles and a quadrilateral in a file of type 25 with 4 node slots.
const std::string kNodesAndElements =
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

// Full and short headers, commas, projections with blanks (bare or quoted),
// the default projection; rows with a 0 in the last slot are triangles.
TEST(ReadAsciiMesh, HeaderFormsGiveTheSameMesh) {
  TempDir dir;
  const std::string proj = "+proj=tmerc +lat_0=0 +lon_0=9 +k=0.9996 +x_0=500000 +datum=WGS84";
  WriteTextFile(dir.file("a.mesh"), "100079 1000 6 UTM-33\n" + kNodesAndElements);
  WriteTextFile(dir.file("b.mesh"), "6 UTM-33\n" + kNodesAndElements);
  WriteTextFile(dir.file("c.mesh"), "6\n" + kNodesAndElements);
  WriteTextFile(dir.file("d.mesh"), "100079, 1000, 6, UTM-33\n" + kNodesAndElements);
  WriteTextFile(dir.file("e.mesh"), "100079 1000 6   " + proj + "   \n" + kNodesAndElements);
  WriteTextFile(dir.file("f.mesh"), "6 \"" + proj + "\"\n" + kNodesAndElements);
  const Mesh a = ReadAscii(dir.file("a.mesh"));
  ExpectSameMesh(a, ReadAscii(dir.file("b.mesh")));
  ExpectSameMesh(a, ReadAscii(dir.file("d.mesh")));
  EXPECT_EQ(a.projection, "UTM-33");
  EXPECT_EQ(a.unit_code, 1000);
  Mesh c, e, f;
  ReadMeshFile(c, dir.file("c.mesh"));
  EXPECT_EQ(c.projection, "UTM-32");
  ReadMeshFile(e, dir.file("e.mesh"));
  ReadMeshFile(f, dir.file("f.mesh"));
  EXPECT_EQ(e.projection, proj);
  EXPECT_EQ(f.projection, proj);

  ASSERT_EQ(a.elements.nelements, 3);
  EXPECT_EQ(a.elements.type[1], 21);
  EXPECT_EQ(a.elements.type[2], 21);
  EXPECT_EQ(a.elements.type[3], 25);
  EXPECT_EQ(ElementNodeCount(a.elements, 1), 3);
  EXPECT_EQ(ElementNodeCount(a.elements, 3), 4);
  EXPECT_EQ(ElementNode(a.elements, 3, 4), 3);
}

TEST(ReadAsciiMesh, FeetBecomeMetresAndLongLatIsHeldInRadians) {
  TempDir dir;
  WriteTextFile(dir.file("a.mesh"), "100079 1014 6 NON-UTM\n" + kNodesAndElements);
  const Mesh m = ReadAscii(dir.file("a.mesh"));
  EXPECT_EQ(m.unit_code, 1014);
  EXPECT_NEAR(m.nodes.z[2], -2 * 0.3048, 1e-12);
  // Written back in feet, read again in metres.
  WriteMeshAscii(m, dir.file("b.mesh"));
  EXPECT_NEAR(ReadAscii(dir.file("b.mesh")).nodes.z[2], -2 * 0.3048, 1e-12);

  WriteTextFile(dir.file("c.mesh"), "6 LONG/LAT\n" + kNodesAndElements);
  Mesh g;
  ReadMeshFile(g, dir.file("c.mesh"));
  EXPECT_EQ(g.projection, "LONG/LAT");
  EXPECT_DOUBLE_EQ(g.nodes.x[2], 10 * 0.017453292519943295);
  EXPECT_DOUBLE_EQ(g.nodes.y[3], 10 * 0.017453292519943295);
  EXPECT_EQ(g.nodes.z[3], -3.0);
}

TEST(ReadAsciiMesh, BadInputEndsWithAMessageNamingFileAndLine) {
  TempDir dir;
  // The good file with one piece of text replaced.
  auto edited = [](const std::string& from, const std::string& to) {
    std::string text = kNodesAndElements;
    return "6\n" + text.replace(text.find(from), from.size(), to);
  };
  struct Case {
    const char* file;
    std::string text, message;
  };
  const Case cases[] = {
      {"short.mesh", "3 UTM-32\n1 0 0 0 0\n2 1 0 0 0\n", "ReadMeshBasicAscii: Unexpected end of file, node 3 of 3"},
      {"badnode.mesh", "2\n1 0 0 0 0\n2 1 x 0 0\n", "Node line must hold id, x, y, z, code"},
      {"range.mesh", edited("3 2 5 6 3", "3 2 5 6 9"), "Node number 9 out of range 0 to 6"},
      {"type.mesh", edited("3 4 25", "3 4 29"), "Unknown element type 29"},
      {"two.mesh", edited("2 1 3 4 0", "2 1 3 0 0"), "Element with 2 nodes does not fit element type 25"},
      {"few.mesh", "6\n" + kNodesAndElements.substr(0, 100), "Unexpected end of file, element"},
      {"unit.mesh", "100079 1400 6\n" + kNodesAndElements, "Unit code 1400 is not a unit of length"},
  };
  Mesh m;
  for (const Case& c : cases) {
    SCOPED_TRACE(c.file);
    WriteTextFile(dir.file(c.file), c.text);
    EXPECT_FATAL(ReadMeshBasicAscii(m, dir.file(c.file)), c.message);
  }
  EXPECT_FATAL(ReadMeshBasicAscii(m, dir.file("badnode.mesh")), "(file " + dir.file("badnode.mesh") + ", line 3)");
  EXPECT_FATAL(ReadMeshBasicAscii(m, dir.file("missing.mesh")), "ReadMeshBasicAscii: Unable to open file (file ");
  WriteTextFile(dir.file("proj.mesh"), "6 Nowhere Grid\n" + kNodesAndElements);
  EXPECT_FATAL(ReadMeshFile(m, dir.file("proj.mesh")), "Fatal error: Unable to establish projection: Nowhere Grid");
}

TEST(CheckMeshTest, FindsEveryFault) {
  TempDir dir;
  WriteTextFile(dir.file("ok.mesh"), "6\n" + kNodesAndElements);
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
  std::string text = "7\n" + kNodesAndElements;
  text.insert(text.find("3 4 25"), "7 5 5 5 0\n");
  WriteTextFile(dir.file("orphan.mesh"), text);
  EXPECT_FATAL(ReadMeshFile(m, dir.file("orphan.mesh")), "Node not included in mesh: 7");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("orphan.mesh")), "Fatal error: Nodes not included in mesh");
  // Without the check the mesh is taken as it is.
  ReadMeshFile(m, dir.file("orphan.mesh"), {}, 0);
  EXPECT_EQ(m.nodes.nnodes, 7);
}

// ---- zrnu ----------------------------------------------------------------------------------

// A zrnu file of two triangles whose node ids are given per file position;
// without `header_items` an older file, whose block of header items holds
// only the two counts.
void WriteTwoTriangles(const std::string& path, const std::vector<int>& ids, bool header_items = true) {
  Mesh m;
  m.projection = "UTM-32";
  AllocateNodes(m.nodes, 4);
  const double xy[4][2] = {{0, 0}, {1, 0}, {1, 1}, {0, 1}};
  for (int p = 1; p <= 4; ++p) AddNode(m.nodes, ids[p - 1], xy[p - 1][0], xy[p - 1][1], -p, p == 4 ? 2 : 1);
  AllocateElementsBasic(m.elements, 2, 6);
  const int t1[3] = {1, 2, 3}, t2[3] = {1, 3, 4};
  AddElement(m.elements, 1, 21, 3, t1);
  AddElement(m.elements, 2, 21, 3, t2);
  WriteMeshZrnu(m, path);
  if (!header_items) {
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
  WriteTextFile(dir.file("a.mesh"), "100079 1000 6 LONG/LAT\n" + kNodesAndElements);
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

}  // namespace
}  // namespace vhd
