// Meshes of other tools' formats: gmsh, 2dm, ADCIRC grids, fem, geo, quoddy
// and node/topology files; the domain setup.

#include <gtest/gtest.h>

#include <cmath>
#include <string>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/domain.hpp"
#include "mesh/reorder.hpp"
#include "mesh/mesh.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::TempDir;
using test::WriteTextFile;

// Every element anticlockwise, ids equal positions, and the expected counts.
void ExpectSoundMesh(const Mesh& m, int nnodes, int nelements) {
  ASSERT_EQ(m.nodes.nnodes, nnodes);
  ASSERT_EQ(m.elements.nelements, nelements);
  for (int e = 1; e <= nelements; ++e) EXPECT_GT(test::TwiceSignedArea(m, e), 0.0) << "element " << e;
  CheckMesh(m);
}

// Boundary faces of a mesh whose edges lie on x = x0, x = x1 or the two
// horizontal sides: the code of each face by the side it lies on.
void ExpectSideCodes(Mesh& m, double x0, double x1, int left, int right, int sides) {
  SetupMeshGeometry(m);
  int nleft = 0, nright = 0;
  for (int k = 1; k <= m.faces.nfaces; ++k) {
    if (m.faces.element2[k] != 0) {
      EXPECT_EQ(m.faces.code[k], 0);
      continue;
    }
    const double x = m.faces.xf[k];
    const int expected = std::abs(x - x0) < 1e-6 ? left : std::abs(x - x1) < 1e-6 ? right : sides;
    EXPECT_EQ(m.faces.code[k], expected) << "face at x = " << x << ", y = " << m.faces.yf[k];
    nleft += std::abs(x - x0) < 1e-6;
    nright += std::abs(x - x1) < 1e-6;
  }
  EXPECT_GT(nleft, 0);
  EXPECT_GT(nright, 0);
}

TEST(ReadGmsh, TwoOpenBoundariesKeepTheirCodesThroughTheAsciiMesh) {
  TempDir dir;
  for (const char* version : {"channel_v22.msh", "channel_v41.msh"}) {
    Mesh gmsh;
    ReadGmshMesh(gmsh, std::string(VHD_SOURCE_DIR) + "/tests/mesh/data/" + version, "UTM-32");
    WriteMeshAscii(gmsh, dir.file("channel.mesh"));
    Mesh m;
    ReadMeshFile(m, dir.file("channel.mesh"));
    EXPECT_EQ(m.projection, "UTM-32");
    for (int n = 1; n <= m.nodes.nnodes; ++n) EXPECT_EQ(m.nodes.z[n], -5.0);
    for (int e = 1; e <= m.elements.nelements; ++e) EXPECT_GT(test::TwiceSignedArea(m, e), 0.0);
    // Inflow (tag 2) on the left, outflow (tag 3) on the right, land elsewhere.
    ExpectSideCodes(m, 0.0, 1000.0, 2, 3, 1);
  }
}

TEST(ReadGmsh, BadFiles) {
  TempDir dir;
  WriteTextFile(dir.file("bin.msh"), "$MeshFormat\n4.1 1 8\n$EndMeshFormat\n");
  WriteTextFile(dir.file("old.msh"), "$MeshFormat\n3.0 0 8\n$EndMeshFormat\n");
  WriteTextFile(dir.file("tet.msh"),
                "$MeshFormat\n2.2 0 8\n$EndMeshFormat\n$Nodes\n1\n1 0 0 0\n$EndNodes\n$Elements\n1\n"
                "1 4 0 1 1 1 1\n$EndElements\n");
  Mesh m;
  EXPECT_FATAL(ReadGmshMesh(m, dir.file("bin.msh"), ""), "ReadGmshMesh: Binary files not supported");
  EXPECT_FATAL(ReadGmshMesh(m, dir.file("old.msh"), ""), "ReadGmshMesh: Version 3.0 not supported");
  EXPECT_FATAL(ReadGmshMesh(m, dir.file("tet.msh"), ""), "Element type 4 not supported");
}

// A 20 x 20 square of nodes 1 .. 9 (row by row, 10 apart, z = -node) and
// its four cells: rows "a b c" of three node numbers for each of the eight
// triangles, clockwise.
const int kTriangles[8][3] = {{1, 5, 2}, {1, 4, 5}, {2, 6, 3}, {2, 5, 6},
                              {4, 8, 5}, {4, 7, 8}, {5, 9, 6}, {5, 8, 9}};

double NodeX(int n) { return 10.0 * ((n - 1) % 3); }
double NodeY(int n) { return 10.0 * ((n - 1) / 3); }

TEST(ReadOtherFormats, Sms2dmWithNodeStringsAndDryElements) {
  TempDir dir;
  std::string text = "MESH2D\nMESHNAME \"test\"\ncoordinate_type UTM-33\nelement_attribute 9\n";
  for (int e = 0; e < 8; ++e)
    text += "E3T " + std::to_string(e + 1) + " " + std::to_string(kTriangles[e][0]) + " " +
            std::to_string(kTriangles[e][1]) + " " + std::to_string(kTriangles[e][2]) + " 1\n";
  text += "E3T 9 3 6 10 9\n";  // dry: left out with its node 10
  for (int n = 1; n <= 9; ++n)
    text += "ND " + std::to_string(n) + " " + std::to_string(NodeX(n)) + " " + std::to_string(NodeY(n)) + " " +
            std::to_string(-n) + "\n";
  text += "ND 10 30 10 -10\nNS 7 4 -1\nNS 3 6 -9 outflow\n";
  WriteTextFile(dir.file("a.2dm"), text);
  Mesh m;
  testing::internal::CaptureStdout();
  ReadMeshFile(m, dir.file("a.2dm"));
  EXPECT_NE(testing::internal::GetCapturedStdout().find("Number of dry elements     : 1"), std::string::npos);
  ExpectSoundMesh(m, 9, 8);
  EXPECT_EQ(m.projection, "UTM-33");
  EXPECT_EQ(m.nodes.z[5], -5.0);
  ExpectSideCodes(m, 0.0, 20.0, 2, 3, 1);
}

TEST(ReadOtherFormats, AdcircGridWithOpenAndLandBoundaries) {
  TempDir dir;
  std::string text = "test grid\n8 9\n";
  for (int n = 1; n <= 9; ++n)
    text += std::to_string(n) + " " + std::to_string(NodeX(n)) + " " + std::to_string(NodeY(n)) + " " +
            std::to_string(n) + "\n";
  for (int e = 0; e < 8; ++e)
    text += std::to_string(e + 1) + " 3 " + std::to_string(kTriangles[e][0]) + " " +
            std::to_string(kTriangles[e][1]) + " " + std::to_string(kTriangles[e][2]) + "\n";
  text += "1 = open boundaries\n3 = open boundary nodes\n3 0\n7\n4\n1\n"
          "1 = land boundaries\n7 = land boundary nodes\n7 0\n1\n2\n3\n6\n9\n8\n7\n";
  WriteTextFile(dir.file("a.14"), text);
  Mesh m;
  ReadMeshFile(m, dir.file("a.14"));
  ExpectSoundMesh(m, 9, 8);
  EXPECT_EQ(m.nodes.z[3], -3.0);  // depth positive down
  EXPECT_EQ(m.projection, "UTM-32");
  ExpectSideCodes(m, 0.0, 20.0, 2, 1, 1);
  WriteTextFile(dir.file("q.14"), "quads\n1 4\n1 0 0 1\n2 1 0 1\n3 1 1 1\n4 0 1 1\n1 4 1 2 3 4\n");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("q.14")), "Fatal error: ReadMeshBasicADCIRC: Element type not supported");
}

TEST(ReadOtherFormats, FemGeoQuoddyAndNodeTopology) {
  TempDir dir;
  WriteTextFile(dir.file("a.fem"),
                "PROBLEM: test\ncoordinate_type NON-UTM\nUVQ_unit_XY 1001\nDIMENS\n4 2 3\nNODE\n1 2 3\n1 3 4\n"
                "COOR\n0, 1, 1, 0\n0, 0, 1, 1\nELEV_I\n-2 1-3\n-7 4\nEND\n");
  Mesh fem;
  ReadMeshFile(fem, dir.file("a.fem"));
  ExpectSoundMesh(fem, 4, 2);
  EXPECT_EQ(fem.nodes.x[2], 1000.0);  // kilometres to metres
  EXPECT_EQ(fem.nodes.z[3], -2.0);
  EXPECT_EQ(fem.nodes.z[4], -7.0);
  for (int n = 1; n <= 4; ++n) EXPECT_EQ(fem.nodes.code[n], 1);

  WriteTextFile(dir.file("a.geo"),
                "coordinate_type LONG/LAT\nVertices 4\n0 0 -1 1\n1 0 -1 1\n1 1 -1 3\n0 1 -1 3\n"
                "Quadrilaterals\n1\n1 4 3 2\nEnd\n");
  Mesh geo;
  ReadMeshFile(geo, dir.file("a.geo"));
  ExpectSoundMesh(geo, 4, 1);
  EXPECT_EQ(geo.nodes.code[3], 3);
  EXPECT_DOUBLE_EQ(geo.nodes.x[2], 0.017453292519943295);

  WriteTextFile(dir.file("q.nod"), "1 0 0\n2 1 0\n3 1 1\n4 0 1\n");
  WriteTextFile(dir.file("q.ele"), "1 1 2 3\n2 1 3 4\n");
  WriteTextFile(dir.file("q.bat"), "1 3\n2 3\n3 4\n4 4\n");
  Mesh quoddy;
  ReadMeshFile(quoddy, dir.file("q.bat"));
  ExpectSoundMesh(quoddy, 4, 2);
  EXPECT_EQ(quoddy.nodes.z[4], -4.0);

  // Node and topology files, numbered from 0, with boundary markers.
  WriteTextFile(dir.file("t.node"), "4 2 1 1\n0 0 0 -1 1\n1 1 0 -2 1\n2 1 1 -3 4\n3 0 1 -4 4\n");
  WriteTextFile(dir.file("t.ele"), "2 3 0\n0 0 1 2\n1 0 2 3\n");
  Mesh topo;
  ReadMeshFile(topo, dir.file("t.xyz"));
  ExpectSoundMesh(topo, 4, 2);
  EXPECT_EQ(topo.nodes.z[3], -3.0);
  EXPECT_EQ(topo.nodes.code[3], 4);
  std::remove(dir.file("q.ele").c_str());
  EXPECT_FATAL(ReadMeshFile(quoddy, dir.file("q.bat")), "Fatal error: ReadMeshBasicQUODDY: Error reading mesh information");
  WriteTextFile(dir.file("u.node"), "2 2 0 0\n1 0 0\n2 1 0\n");
  WriteTextFile(dir.file("u.ele"), "1 3 0\n1 1 2 5\n");
  EXPECT_FATAL(ReadMeshFile(topo, dir.file("u.any")), "Unknown node 5 (file ");
}

// ---- the domain setup ------------------------------------------------------------------------

const char* kSquareMesh =
    "4 UTM-32\n1 0 0 -1 1\n2 10 0 -2 1\n3 10 10 0.5 2\n4 0 10 -3 0\n2 3 21\n1 1 2 3\n2 1 3 4\n";

TEST(DomainSetup, DepthAdjustmentsAndSummary) {
  TempDir dir;
  WriteTextFile(dir.file("square.mesh"), kSquareMesh);
  WriteTextFile(dir.file("run.toml"),
                "[VantorHD.DOMAIN]\nfile_name = \"square.mesh\"\ndatum_depth = 1.0\n"
                "minimum_depth = -2.5\nthresshold_depth = -0.5\n");
  SktOpenFile(dir.file("run.toml"), true);
  SktOpenTarget("VantorHD");
  Domain domain;
  ModuleSelection selection;
  SetupSpaceDiscretization(domain, selection);
  const std::string log_path = LogFilePath();
  SktClose();
  CloseLogFile();
  ASSERT_EQ(domain.meshes.size(), 1u);
  const Mesh& m = domain.meshes[0].mesh;
  // Datum: z - 1 -> -2, -3, -0.5, -4. Boundary nodes between -2.5 and -0.5
  // (above the first, not above the second) go to -2.5; node 4 has code 0.
  // Node k of the file, wherever the element order put it.
  const Array1<int> at = FileOrder(m.nodes.file_index, m.nodes.nnodes);
  EXPECT_EQ(m.nodes.z[at[1]], -2.5);
  EXPECT_EQ(m.nodes.z[at[2]], -3.0);
  EXPECT_EQ(m.nodes.z[at[3]], -2.5);
  EXPECT_EQ(m.nodes.z[at[4]], -4.0);
  EXPECT_EQ(domain.meshes[0].number_of_domains, 16);
  EXPECT_EQ(selection.ndim, 2);
  EXPECT_EQ(m.faces.nfaces, 5);
  const std::string log = test::ReadTextFile(log_path);
  for (const char* line : {"Mesh information", "  Number of nodes            : 4",
                           "  Number of faces            : 5", "  Max x-coordinate (m)       : 10",
                           "Boundary information", "  Boundary code     number of faces    number of points"}) {
    EXPECT_NE(log.find(line), std::string::npos) << line << "\n" << log;
  }
  // Code 1: faces 1-2 and 4-1 (the face 4-1 has node codes 0 and 1), nodes 1, 2;
  // code 2: faces 2-3 and 3-4, node 3.
  EXPECT_NE(log.find("              1                   2                   2"), std::string::npos) << log;
  EXPECT_NE(log.find("              2                   2                   1"), std::string::npos) << log;
}

TEST(DomainSetup, AtMostFourMeshes) {
  TempDir dir;
  WriteTextFile(dir.file("run.toml"), "[VantorHD.DOMAIN]\nnumber_of_meshes = 5\n");
  EXPECT_FATAL(
      {
        SktOpenFile(dir.file("run.toml"), false);
        SktOpenTarget("VantorHD");
        Domain domain;
        ModuleSelection selection;
        SetupSpaceDiscretization(domain, selection);
      },
      "Fatal error: SetupSpaceDiscretization: Too many meshes");
}

}  // namespace
}  // namespace vhd
