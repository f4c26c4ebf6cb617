// meshconvert: converts between the engine's mesh formats, or from any mesh
// format the engine reads, keeping node ids, coordinates, bed levels, codes,
// element ids and types and the projection.
//
//   meshconvert input.<mesh|zrnu|2dm|14|...> output.<mesh|zrnu>
//
// Coordinates are copied as the input holds them (degrees for "LONG/LAT").

#include <cstdio>
#include <string>

#include "mesh/read_mesh.hpp"
#include "mesh/read_text.hpp"

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: meshconvert input output.mesh|output.zrnu\n");
    return 2;
  }
  const std::string output = argv[2];
  const std::string ext = vhd::FileExtension(output);
  if (ext != "mesh" && ext != "zrnu") {
    std::fprintf(stderr, "meshconvert: the output must be a .mesh or .zrnu file\n");
    return 2;
  }
  vhd::Mesh mesh;
  vhd::ReadMeshBasic(mesh, argv[1]);
  if (ext == "zrnu") {
    vhd::WriteMeshZrnu(mesh, output);
  } else {
    vhd::WriteMeshAscii(mesh, output);
  }
  std::printf("%s: %d nodes, %d elements\n", output.c_str(), mesh.nodes.nnodes, mesh.elements.nelements);
  return 0;
}
