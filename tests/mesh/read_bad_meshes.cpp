// Mesh files that would break the solver are refused with the file and the
// node or element named: non-finite values, repeated nodes, zero areas,
// duplicated elements and nodes, header counts the file cannot hold. A
// quadrilateral with its last node repeated is read as a triangle.

#include <gtest/gtest.h>
#include <malloc.h>
#include <netcdf.h>
#include <sys/resource.h>

#include <cmath>
#include <limits>
#include <string>
#include <vector>

#include "mesh/domain.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::TempDir;
using test::WriteTextFile;

// Two unit squares side by side, as quadrilaterals: nodes 1-3 along y = 0,
// 4-6 along y = 1.
const std::string kTwoSquares =
    "6 UTM-32\n"
    "1 0 0 -1 1\n2 1 0 -1 1\n3 2 0 -1 1\n"
    "4 0 1 -1 1\n5 1 1 -1 1\n6 2 1 -1 1\n"
    "2 4 25\n"
    "1 1 2 5 4\n"
    "2 2 3 6 5\n";

// Triangle 2 has its three nodes on one line.
const std::string kFlat = "4\n1 0 0 -1 1\n2 1 0 -1 1\n3 2 0 -1 1\n4 0 1 -1 1\n2 3 21\n1 1 2 4\n2 1 2 3\n";

std::string Edited(std::string text, const std::string& from, const std::string& to) {
  return text.replace(text.find(from), from.size(), to);
}

TEST(ReadBadMesh, FaultsAreRefusedNamingFileAndPlace) {
  TempDir dir;
  struct Case {
    const char* file;
    std::string text, message;
  };
  const Case cases[] = {
      {"repeat.mesh", Edited(kTwoSquares, "1 1 2 5 4", "1 1 2 2 4"), "Element 1 holds the node 2 twice"},
      {"repeat3.mesh", Edited(kTwoSquares, "1 1 2 5 4", "1 1 5 5 0"), "Element 1 holds the node 5 twice"},
      {"twice.mesh", Edited(Edited(kTwoSquares, "2 4 25", "3 4 25"), "2 2 3 6 5\n", "2 2 3 6 5\n3 3 6 5 2\n"),
       "Elements 2 and 3 have the same nodes"},
      {"flat.mesh", kFlat, "Element 2 has zero area"},
      {"thin.mesh", Edited(kFlat, "3 2 0 -1 1", "3 2 1e-12 -1 1"), "Element 2 has zero area"},
      {"same.mesh", Edited(kTwoSquares, "5 1 1 -1 1", "5 2 1 -1 1"), "Nodes 5 and 6 lie at one position"},
      {"code.mesh", Edited(kTwoSquares, "6 2 1 -1 1", "6 2 1 -1 100000"),
       "Node 6 has the boundary code 100000, more than 99999"},
      {"many.mesh", Edited(kTwoSquares, "2 4 25", "200000000 4 25"),
       "Header gives 200000000 elements, more than the file can hold (file "},
      {"nodes.mesh", Edited(kTwoSquares, "6 UTM-32", "2000000000 UTM-32"),
       "Header gives 2000000000 nodes, more than the file can hold"},
  };
  Mesh m;
  for (const Case& c : cases) {
    SCOPED_TRACE(c.file);
    WriteTextFile(dir.file(c.file), c.text);
    EXPECT_FATAL(ReadMeshFile(m, dir.file(c.file)), c.message);
  }
  // The geometry checks hold without check_mesh too, and name the file.
  EXPECT_FATAL(ReadMeshFile(m, dir.file("flat.mesh"), {}, 0),
               "ReadMesh: Element 2 has zero area (file " + dir.file("flat.mesh") + ")");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("same.mesh"), {}, 0), "Nodes 5 and 6 lie at one position");
  // The faults of the mesh check name the file in the line before them.
  WriteTextFile(dir.file("ids.mesh"), Edited(kTwoSquares, "2 2 3 6 5", "7 2 3 6 5"));
  EXPECT_FATAL(ReadMeshFile(m, dir.file("ids.mesh")), "Mesh file: " + dir.file("ids.mesh") +
                                                         "\n \n Fatal error: The element indicices and IDs must be the same");
}

// "1 2 3 3" in a quadrilateral file is a triangle: in the ascii mesh, in the
// formats read through the mesh builder (here clockwise, so the builder turns
// it), and in a zrnu file; the faces then match without a gap.
TEST(ReadBadMesh, QuadrilateralWithItsLastNodeRepeatedIsATriangle) {
  TempDir dir;
  const std::string ascii = Edited(Edited(kTwoSquares, "2 4 25", "3 4 25"), "2 2 3 6 5\n", "2 2 3 6 6\n3 2 6 5 5\n");
  WriteTextFile(dir.file("a.mesh"), ascii);
  std::string sms = "MESH2D\n";
  for (int n = 1; n <= 6; ++n)
    sms += "ND " + std::to_string(n) + " " + std::to_string((n - 1) % 3) + " " + std::to_string((n - 1) / 3) +
           " -1\n";
  sms += "E4Q 1 1 2 5 4\nE4Q 2 2 5 6 6\nE4Q 3 2 6 3 3\n";
  WriteTextFile(dir.file("a.2dm"), sms);

  Mesh a, b, c;
  ReadMeshFile(a, dir.file("a.mesh"));
  ReadMeshFile(b, dir.file("a.2dm"));
  Mesh quads = a;  // the same rows as quadrilaterals in a zrnu file
  AllocateElementsBasic(quads.elements, 3, 12);
  const int rows[3][4] = {{1, 2, 5, 4}, {2, 3, 6, 6}, {2, 6, 5, 5}};
  for (int e = 1; e <= 3; ++e) AddElement(quads.elements, e, 25, 4, rows[e - 1]);
  WriteMeshZrnu(quads, dir.file("a.zrnu"));
  ReadMeshFile(c, dir.file("a.zrnu"));
  for (Mesh* m : {&a, &b, &c}) {
    ASSERT_EQ(m->elements.nelements, 3);
    EXPECT_EQ(m->elements.type[1], 25);
    for (int e = 2; e <= 3; ++e) {
      EXPECT_EQ(m->elements.type[e], 21);
      EXPECT_EQ(ElementNodeCount(m->elements, e), 3);
    }
    SetupMeshGeometry(*m);
    EXPECT_EQ(m->faces.nfaces, 8);  // 2 interior faces, 6 boundary faces
    EXPECT_EQ(m->faces.nboundary_faces, 6);
    EXPECT_NEAR(m->elements.area[2], 0.5, 1e-12);
    EXPECT_NEAR(m->elements.area[3], 0.5, 1e-12);
  }
}

// A zrnu mesh (written without checks) with a value that is not a number,
// or with a header that does not fit its elements.
TEST(ReadBadMesh, ZrnuNodesMustBeFinite) {
  TempDir dir;
  const double nan = std::numeric_limits<double>::quiet_NaN(), inf = std::numeric_limits<double>::infinity();
  struct Case {
    int node;
    double x, y, z;
  };
  for (const Case& c : {Case{2, nan, 0, -1}, Case{3, 1, inf, -1}, Case{4, 0, 1, nan}, Case{1, 0, 0, -inf}}) {
    Mesh m;
    AllocateNodes(m.nodes, 4);
    const double xy[4][2] = {{0, 0}, {1, 0}, {1, 1}, {0, 1}};
    for (int p = 1; p <= 4; ++p) {
      if (p == c.node) AddNode(m.nodes, p, c.x, c.y, c.z, 1);
      else AddNode(m.nodes, p, xy[p - 1][0], xy[p - 1][1], -1, 1);
    }
    AllocateElementsBasic(m.elements, 2, 6);
    const int t1[3] = {1, 2, 3}, t2[3] = {1, 3, 4};
    AddElement(m.elements, 1, 21, 3, t1);
    AddElement(m.elements, 2, 21, 3, t2);
    m.projection = "UTM-32";
    WriteMeshZrnu(m, dir.file("a.zrnu"));
    Mesh r;
    EXPECT_FATAL(ReadMeshFile(r, dir.file("a.zrnu")), "ReadMesh: Node " + std::to_string(c.node) +
                                                          " has a coordinate or bed level that is not a finite number");
  }
  // A header that calls the two triangles a 3D mesh.
  int ncid = -1;
  const int items[5] = {4, 2, 3, 5, 5};
  ASSERT_EQ(nc_open(dir.file("a.zrnu").c_str(), NC_WRITE, &ncid), NC_NOERR);
  ASSERT_EQ(nc_redef(ncid), NC_NOERR);
  ASSERT_EQ(nc_put_att_int(ncid, NC_GLOBAL, "zrn_block_TANO_KX", NC_INT, 5, items), NC_NOERR);
  ASSERT_EQ(nc_close(ncid), NC_NOERR);
  Mesh r;
  EXPECT_FATAL(ReadMeshFile(r, dir.file("a.zrnu")), "Element 1 has dimension 2, the header gives ndim 3 (file ");
}

// Header counts of other text formats against the file size, and running out
// of memory while reading ends with a message naming the file.
TEST(ReadBadMesh, HugeCountsFailFast) {
  TempDir dir;
  WriteTextFile(dir.file("a.14"), "grid\n200000000 3\n1 0 0 1\n2 1 0 1\n3 0 1 1\n1 3 1 2 3\n");
  WriteTextFile(dir.file("a.fem"), "DIMENS\n3 200000000 3\nNODE\n1 2 3\nCOOR\n0 1 0\n0 0 1\n");
  WriteTextFile(dir.file("b.fem"), "DIMENS\n2000000000 1 3\nNODE\n1 2 3\nCOOR\n0 1 0\n0 0 1\n");
  Mesh m;
  EXPECT_FATAL(ReadMeshFile(m, dir.file("a.14")), "Header gives 200000000 elements, more than the file can hold");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("a.fem")), "Header gives 200000000 elements, more than the file can hold");
  EXPECT_FATAL(ReadMeshFile(m, dir.file("b.fem")), "Header gives 2000000000 nodes, more than the file can hold");

#if !defined(__SANITIZE_ADDRESS__)
  // A 1,000,000-node ADCIRC grid read with 8 MB of address space to spare.
  std::string text = "grid\n1 1000000\n";
  for (int n = 1; n <= 1000000; ++n) text += std::to_string(n) + " " + std::to_string(n) + " 0 1\n";
  text += "1 3 1 2 3\n";
  WriteTextFile(dir.file("big.14"), text);
  EXPECT_FATAL(
      {
        // The address space in use now, from /proc, and 8 MB more; the free
        // memory the heap holds from earlier tests is given back first.
        malloc_trim(0);
        rlimit limit{};
        getrlimit(RLIMIT_AS, &limit);
        const std::string status = test::ReadTextFile("/proc/self/status");
        const std::size_t at = status.find("VmSize:");
        limit.rlim_cur = (std::stoull(status.substr(at + 7)) + 8 * 1024) * 1024;
        setrlimit(RLIMIT_AS, &limit);
        ReadMeshFile(m, dir.file("big.14"));
      },
      "ReadMesh: Out of memory (file " + dir.file("big.14") + ")");
#endif
}

// The summary shows a value that is not a number rather than skipping it.
TEST(ReadBadMesh, SummaryShowsNaN) {
  const Mesh good = test::Generated(CellLayout::kRightTriangles, 4, 3, 0.0);
  Mesh m = good;
  m.nodes.z[5] = std::numeric_limits<double>::quiet_NaN();
  testing::internal::CaptureStdout();
  PrintMeshSummary(m);
  const std::string out = testing::internal::GetCapturedStdout();
  EXPECT_NE(out.find("Min z-coordinate (m)       : NaN"), std::string::npos) << out;
  EXPECT_NE(out.find("Max z-coordinate (m)       : NaN"), std::string::npos) << out;
}

}  // namespace
}  // namespace vhd
