// gmsh2mesh: converts a gmsh mesh (.msh, ASCII 2.2 or 4.1) into an ASCII
// mesh file (.mesh) or, with a .zrnu output name, a flexible-mesh data file.
//
//   gmsh2mesh input.msh output.mesh [projection]
//
// Triangles and quadrilaterals become the elements, node z the bed level.
// Boundary lines in physical groups give the node codes: the group with
// physical tag t gives code t (a group named "land" gives 1), so tag 1 is
// land and tags 2, 3, ... are open boundaries; boundary nodes in no group are
// land. The projection (default blank, read as "UTM-32") is written to the
// header, e.g. "LONG/LAT" or "EPSG:25832".

#include <cstdio>
#include <string>

#include "mesh/read_mesh.hpp"
#include "mesh/read_text.hpp"

int main(int argc, char** argv) {
  if (argc < 3 || argc > 4) {
    std::fprintf(stderr, "usage: gmsh2mesh input.msh output.mesh|output.zrnu [projection]\n");
    return 2;
  }
  const std::string output = argv[2];
  vhd::Mesh mesh;
  vhd::ReadGmshMesh(mesh, argv[1], argc == 4 ? argv[3] : "");
  if (vhd::FileExtension(output) == "zrnu") {
    vhd::WriteMeshZrnu(mesh, output);
  } else {
    vhd::WriteMeshAscii(mesh, output);
  }
  std::printf("%s: %d nodes, %d elements\n", output.c_str(), mesh.nodes.nnodes, mesh.elements.nelements);
  return 0;
}
