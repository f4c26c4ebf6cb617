// Choice of the mesh reader, completion of the projection and the mesh checks.

#include "mesh/read_mesh.hpp"

#include <vector>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/read_text.hpp"

namespace vhd {

void ReadMeshBasic(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid) {
  const std::string ext = FileExtension(file_name);
  if (ext == "mesh") {
    ReadMeshBasicAscii(mesh, file_name);
  } else if (ext == "zrnu") {
    ReadMeshBasicZrnu(mesh, file_name);
  } else if (ext == "zrn1" || ext == "dt1") {
    ReadMeshBasicZrn1(mesh, file_name);
  } else if (ext == "zrn2") {
    ReadMeshBasicZrn2(mesh, file_name, grid);
  } else if (ext == "zrn3") {
    ReadMeshBasicZrn3(mesh, file_name, grid);
  } else if (ext == "fem") {
    ReadMeshBasicFem(mesh, file_name);
  } else if (ext == "geo") {
    ReadMeshBasicGeo(mesh, file_name);
  } else if (ext == "2dm") {
    ReadMeshBasic2dm(mesh, file_name);
  } else if (ext == "14") {
    ReadMeshBasicADCIRC(mesh, file_name);
  } else if (ext == "bat") {
    ReadMeshBasicQUODDY(mesh, file_name);
  } else {
    ReadMeshBasicNodeTopo(mesh, file_name);
  }
}

void CompleteMeshProjection(Mesh& mesh) {
  std::string projection(TrimBlanks(mesh.projection));
  if (projection.empty()) projection = "UTM-32";
  if (LowerCase(projection) == "long/lat") projection = "LONG/LAT";

  CTqCartography cart;
  int status = 0;
  TqCartCreate(cart, projection, 0.0, 0.0, 0.0, &status);
  if (status != kCartOk) {
    std::string reason;
    cart.projection.Establish(projection, &reason);
    WriteLogLine("  Projection of the mesh: " + reason);
    FatalError("Unable to establish projection: " + projection);
  }
  // Every geographic system is held as "LONG/LAT": the geometry and the
  // solver know geographic coordinates by that name only.
  if (cart.projection.kind() == CTqMapProjection::Kind::Geographic && projection != "LONG/LAT") {
    WriteLogLine("  Geographic projection " + projection + " is used as LONG/LAT");
    projection = "LONG/LAT";
  }
  mesh.projection = projection;
  if (IsGeographic(mesh.projection)) {
    for (int n = 1; n <= mesh.nodes.nnodes; ++n) {
      mesh.nodes.x[n] *= kDegToRad;
      mesh.nodes.y[n] *= kDegToRad;
    }
  }
}

void ReadMeshFile(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid, int check_mesh) {
  ReadMeshBasic(mesh, file_name, grid);
  CompleteMeshProjection(mesh);
  if (check_mesh > 0) CheckMesh(mesh);
}

void ReadMesh(Mesh& mesh) {
  std::string file_name;
  SktReadFileName("file_name", file_name);
  if (file_name.empty()) FatalError("ReadMesh: No file_name given in " + SktSectionPath());
  GridMeshOptions grid;
  const std::string ext = FileExtension(file_name);
  if (ext == "zrn2" || ext == "zrn3") {
    SktReadKeyword("type_of_element", grid.type_of_element, ext == "zrn2" ? 25 : 33);
    if (ext == "zrn2") {
      SktReadKeyword("type_of_grid", grid.type_of_grid, 1);
      if (grid.type_of_grid == 2) SktReadFileName("filename_grid", grid.filename_grid);
    }
  }
  ReadMeshBasic(mesh, file_name, grid);
  CompleteMeshProjection(mesh);
  int check_mesh = 1;
  SktReadKeyword("check_mesh", check_mesh, 1);
  if (check_mesh > 0) CheckMesh(mesh);
}

void CheckMesh(const Mesh& mesh) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  for (int n = 1; n <= nd.nnodes; ++n) {
    if (nd.id[n] != n) {
      WriteLogLine("  Node " + std::to_string(n) + " has the id " + std::to_string(nd.id[n]));
      FatalError("The node indicices and IDs must be the same");
    }
  }
  for (int e = 1; e <= el.nelements; ++e) {
    if (el.id[e] != e) {
      WriteLogLine("  Element " + std::to_string(e) + " has the id " + std::to_string(el.id[e]));
      FatalError("The element indicices and IDs must be the same");
    }
  }
  std::vector<char> used(static_cast<std::size_t>(nd.nnodes) + 1, 0);
  for (int e = 1; e <= el.nelements; ++e) {
    for (int j = 1; j <= ElementNodeCount(el, e); ++j) {
      const int n = ElementNode(el, e, j);
      if (n < 1) {
        WriteLogLine("  Element " + std::to_string(e) + " holds the node " + std::to_string(n));
        FatalError("Node in the element table is lower than 1");
      }
      if (n > nd.nnodes) {
        WriteLogLine("  Element " + std::to_string(e) + " holds the node " + std::to_string(n));
        FatalError("Node in the element table is larger than the number of nodes");
      }
      used[static_cast<std::size_t>(n)] = 1;
    }
  }
  bool missing = false;
  for (int n = 1; n <= nd.nnodes; ++n) {
    if (!used[static_cast<std::size_t>(n)]) {
      WriteLogLine("Node not included in mesh: " + std::to_string(n));
      missing = true;
    }
  }
  if (missing) FatalError("Nodes not included in mesh");
}

}  // namespace vhd
