// Choice of the mesh reader, completion of the projection and the mesh checks.

#include "mesh/read_mesh.hpp"

#include <algorithm>
#include <cmath>
#include <new>
#include <span>
#include <tuple>
#include <vector>

#include "io/setup.hpp"
#include "io/zrn.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/read_text.hpp"

namespace vhd {

namespace {

// Boundary codes name setup sections one by one and size the boundary
// tables; larger codes are faults of the file.
constexpr int kMaxNodeCode = 99999;

void ReadByExtension(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid) {
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

[[noreturn]] void Refuse(const std::string& file_name, const std::string& what) {
  FileError("ReadMesh", file_name, what);
}

// Corner nodes of a 2D element in local order (3 or 4); 0 for other elements.
int Corners2D(const ElementTable& el, int e) {
  int dimension = 0, shape = 0, function_type = 0;
  if (!ElementTypeInfo(el.type[e], dimension, shape, function_type) || dimension != 2) return 0;
  return shape == kShapeTriangle ? 3 : (shape == kShapeQuadrilateral ? 4 : 0);
}

}  // namespace

void ReadMeshBasic(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid) {
  try {
    ReadByExtension(mesh, file_name, grid);
  } catch (const std::bad_alloc&) {
    ReleaseMesh(mesh);
    Refuse(file_name, "Out of memory");
  }
  CheckMeshGeometry(mesh, file_name);
}

void CheckMeshGeometry(const Mesh& mesh, const std::string& file_name) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  for (int n = 1; n <= nd.nnodes; ++n) {
    if (!std::isfinite(nd.x[n]) || !std::isfinite(nd.y[n]) || !std::isfinite(nd.z[n]))
      Refuse(file_name, "Node " + std::to_string(n) + " has a coordinate or bed level that is not a finite number");
    if (nd.code[n] > kMaxNodeCode)
      Refuse(file_name, "Node " + std::to_string(n) + " has the boundary code " + std::to_string(nd.code[n]) +
                            ", more than " + std::to_string(kMaxNodeCode));
  }

  // Nodes of every element in ascending order: a repeated node and two
  // elements with the same nodes show as equal neighbours.
  std::vector<int> sorted(el.node_list.data(), el.node_list.data() + el.node_start[el.nelements + 1]);
  for (int e = 1; e <= el.nelements; ++e) {
    const auto first = sorted.begin() + el.node_start[e], last = sorted.begin() + el.node_start[e + 1];
    std::sort(first, last);
    const auto twice = std::adjacent_find(first, last);
    if (twice != last)
      Refuse(file_name, "Element " + std::to_string(e) + " holds the node " + std::to_string(*twice) + " twice");
  }
  std::vector<int> order(static_cast<std::size_t>(el.nelements));
  for (int e = 1; e <= el.nelements; ++e) order[static_cast<std::size_t>(e - 1)] = e;
  auto nodes_of = [&](int e) {
    return std::span<const int>(sorted.data() + el.node_start[e],
                                static_cast<std::size_t>(el.node_start[e + 1] - el.node_start[e]));
  };
  auto less = [&](int a, int b) {
    const auto p = nodes_of(a), q = nodes_of(b);
    if (std::lexicographical_compare(p.begin(), p.end(), q.begin(), q.end())) return true;
    return std::equal(p.begin(), p.end(), q.begin(), q.end()) && a < b;
  };
  std::sort(order.begin(), order.end(), less);
  for (std::size_t i = 1; i < order.size(); ++i) {
    const auto p = nodes_of(order[i - 1]), q = nodes_of(order[i]);
    if (std::equal(p.begin(), p.end(), q.begin(), q.end()))
      Refuse(file_name, "Elements " + std::to_string(order[i - 1]) + " and " + std::to_string(order[i]) +
                            " have the same nodes");
  }

  // Zero area: twice the area (triangles (1, 2, 3) and (1, 3, 4)) against the
  // square of the longest edge, with coordinates relative to the first node.
  for (int e = 1; e <= el.nelements; ++e) {
    const int nc = Corners2D(el, e);
    if (nc == 0) continue;
    double x[4], y[4], longest = 0.0;
    for (int j = 0; j < nc; ++j) {
      const int k = ElementNode(el, e, j + 1);
      x[j] = nd.x[k] - nd.x[ElementNode(el, e, 1)];
      y[j] = nd.y[k] - nd.y[ElementNode(el, e, 1)];
    }
    double twice_area = 0.0;
    for (int j = 0; j < nc; ++j) {
      const int i = (j + 1) % nc;
      twice_area += x[j] * y[i] - x[i] * y[j];
      longest = std::max(longest, (x[i] - x[j]) * (x[i] - x[j]) + (y[i] - y[j]) * (y[i] - y[j]));
    }
    if (std::abs(twice_area) <= 1e-10 * longest)
      Refuse(file_name, "Element " + std::to_string(e) + " has zero area");
  }

  // Two nodes at one position (x, y; with z in a layered 3D mesh).
  const bool with_z = mesh.ndim == 3;
  std::vector<int> by_place(static_cast<std::size_t>(nd.nnodes));
  for (int n = 1; n <= nd.nnodes; ++n) by_place[static_cast<std::size_t>(n - 1)] = n;
  auto place = [&](int n) { return std::make_tuple(nd.x[n], nd.y[n], with_z ? nd.z[n] : 0.0); };
  std::sort(by_place.begin(), by_place.end(),
            [&](int a, int b) { return std::make_pair(place(a), a) < std::make_pair(place(b), b); });
  for (std::size_t i = 1; i < by_place.size(); ++i) {
    if (place(by_place[i - 1]) == place(by_place[i]))
      Refuse(file_name, "Nodes " + std::to_string(by_place[i - 1]) + " and " + std::to_string(by_place[i]) +
                            " lie at one position");
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
  if (check_mesh > 0) CheckMesh(mesh, file_name);
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
  if (check_mesh > 0) CheckMesh(mesh, file_name);
}

void CheckMesh(const Mesh& mesh, const std::string& file_name) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  auto fail = [&](const std::string& text) {
    if (!file_name.empty()) WriteLogLine("  Mesh file: " + ZrnLogName(file_name));
    FatalError(text);
  };
  for (int n = 1; n <= nd.nnodes; ++n) {
    if (nd.id[n] != n) {
      WriteLogLine("  Node " + std::to_string(n) + " has the id " + std::to_string(nd.id[n]));
      fail("The node indicices and IDs must be the same");
    }
  }
  for (int e = 1; e <= el.nelements; ++e) {
    if (el.id[e] != e) {
      WriteLogLine("  Element " + std::to_string(e) + " has the id " + std::to_string(el.id[e]));
      fail("The element indicices and IDs must be the same");
    }
  }
  std::vector<char> used(static_cast<std::size_t>(nd.nnodes) + 1, 0);
  for (int e = 1; e <= el.nelements; ++e) {
    for (int j = 1; j <= ElementNodeCount(el, e); ++j) {
      const int n = ElementNode(el, e, j);
      if (n < 1) {
        WriteLogLine("  Element " + std::to_string(e) + " holds the node " + std::to_string(n));
        fail("Node in the element table is lower than 1");
      }
      if (n > nd.nnodes) {
        WriteLogLine("  Element " + std::to_string(e) + " holds the node " + std::to_string(n));
        fail("Node in the element table is larger than the number of nodes");
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
  if (missing) fail("Nodes not included in mesh");
}

}  // namespace vhd
