// Domain setup of a single process: meshes, depth adjustments, geometry and
// the mesh summary.

#include "mesh/domain.hpp"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>

#include <fmt/format.h>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh/reorder.hpp"

namespace vhd {

namespace {

constexpr double kRadToDeg = 57.29577951308232;
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

double HighestNode(const Mesh& mesh) {
  double zmax = -std::numeric_limits<double>::max();
  for (int n = 1; n <= mesh.nodes.nnodes; ++n) zmax = std::max(zmax, mesh.nodes.z[n]);
  return zmax;
}

// Keys and mesh of one mesh from the open section.
void SetupOneMesh(DomainMesh& dm, int number, int number_of_dimensions) {
  Mesh& mesh = dm.mesh;
  mesh.number = number;
  ReadMesh(mesh);
  mesh.number = number;
  if (mesh.ndim == 1 || mesh.ndim == 2) {
    SktReadKeyword("datum_depth", dm.datum_depth, 0.0);
    for (int n = 1; n <= mesh.nodes.nnodes; ++n) mesh.nodes.z[n] -= dm.datum_depth;
    const double zmax = HighestNode(mesh);
    SktReadKeyword("minimum_depth", dm.minimum_depth, zmax);
    SktReadKeyword("thresshold_depth", dm.thresshold_depth, zmax);
    AdjustMeshDepths(mesh, dm.minimum_depth, dm.thresshold_depth);
    if (mesh.ndim == 2) {
      SktReadKeyword("number_of_domains", dm.number_of_domains, 16);
      SktReadKeyword("type_of_reordering", dm.type_of_reordering, kReorderHilbert);
      dm.partition.number_of_domains = dm.number_of_domains;
      ReadPartitionKeys(dm.partition, number_of_dimensions);
      if (dm.type_of_reordering != kReorderNone)
        ReorderMesh(mesh, ElementOrder(mesh, dm.type_of_reordering, 1, mesh.elements.nelements));
    }
  }
  SetupMeshGeometry(mesh);
  if (number_of_dimensions == 3 && mesh.ndim == 2) {
    SetupVerticalMesh(mesh, dm.minimum_depth, dm.vertical);
    BuildLayeredMesh(mesh, dm.vertical, dm.mesh3d);
    dm.mesh3d.number = number;
  }
}

}  // namespace

void AdjustMeshDepths(Mesh& mesh, double minimum_depth, double thresshold_depth) {
  NodeTable& nd = mesh.nodes;
  for (int n = 1; n <= nd.nnodes; ++n) {
    if (nd.code[n] != 0 && nd.z[n] > minimum_depth && nd.z[n] <= thresshold_depth) nd.z[n] = minimum_depth;
  }
}

void SetupSpaceDiscretization(Domain& domain, ModuleSelection& selection) {
  SktOpenSection("DOMAIN");
  SktReadKeyword("number_of_dimensions", domain.number_of_dimensions, 2);
  if (domain.number_of_dimensions != 2 && domain.number_of_dimensions != 3)
    FatalError("SetupSpaceDiscretization: number_of_dimensions must be 2 or 3");
  SktReadKeyword("number_of_meshes", domain.number_of_meshes, 1);
  if (domain.number_of_meshes > kMaxMeshes) FatalError("SetupSpaceDiscretization: Too many meshes");
  if (domain.number_of_meshes < 1) FatalError("SetupSpaceDiscretization: number_of_meshes must be at least 1");
  domain.meshes.clear();
  domain.meshes.resize(static_cast<std::size_t>(domain.number_of_meshes));
  if (domain.number_of_meshes == 1) {
    SetupOneMesh(domain.meshes[0], 1, domain.number_of_dimensions);
  } else {
    const int found = SktNumberOfSectionInstances("Mesh");
    if (found < domain.number_of_meshes)
      FatalError("SetupSpaceDiscretization: " + std::to_string(domain.number_of_meshes) + " meshes, but " +
                 std::to_string(found) + " Mesh sections in " + SktSectionPath());
    for (int i = 1; i <= domain.number_of_meshes; ++i) {
      SktOpenSection("Mesh", kNoIndex, nullptr, true, i);
      SetupOneMesh(domain.meshes[static_cast<std::size_t>(i - 1)], i, domain.number_of_dimensions);
      SktCloseSection();
    }
  }
  SktCloseSection();
  selection.ndim = domain.number_of_dimensions;
  for (const DomainMesh& dm : domain.meshes) {
    PrintMeshSummary(dm.mesh);
    if (dm.mesh3d.nodes.nnodes > 0) PrintMeshSummary(dm.mesh3d);
  }
}

void PrintMeshSummary(const Mesh& mesh, int nsections, bool subdomain) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  const bool three_d = mesh.ndim == 3;
  WriteLogLine("");
  WriteLogLine(!subdomain ? "Mesh information"
                          : (three_d ? "Mesh information - 3D (subdomain)" : "Mesh information - 2D (subdomain)"));
  WriteValueLine("Number of nodes            : %", nd.nnodes);
  WriteValueLine("Number of elements         : %", el.nelements);
  WriteValueLine("Number of faces            : %", fc.nfaces);
  if (subdomain) {
    WriteValueLine("Number of nodes (int.)     : %", nd.nnodes_int);
    WriteValueLine("Number of elements (int.)  : %", el.nelements_int);
    WriteValueLine("Number of faces (int.)     : %", fc.nfaces_int);
  }
  WriteValueLine("Number of sections         : %", nsections);
  double lo[3] = {0, 0, 0}, hi[3] = {0, 0, 0};
  if (nd.nnodes > 0) {
    lo[0] = hi[0] = nd.x[1];
    lo[1] = hi[1] = nd.y[1];
    lo[2] = hi[2] = nd.z[1];
  }
  // A value that is not a number shows in both extremes.
  for (int n = 2; n <= nd.nnodes; ++n) {
    const double v[3] = {nd.x[n], nd.y[n], nd.z[n]};
    for (int k = 0; k < 3; ++k) {
      lo[k] = std::isnan(lo[k]) || std::isnan(v[k]) ? kNaN : std::min(lo[k], v[k]);
      hi[k] = std::isnan(hi[k]) || std::isnan(v[k]) ? kNaN : std::max(hi[k], v[k]);
    }
  }
  const bool geographic = IsGeographic(mesh.projection);
  const double f = geographic ? kRadToDeg : 1.0;
  const std::string unit = geographic ? "(degree)" : "(m)";
  WriteValueLine("Min x-coordinate " + unit + "       : %", lo[0] * f);
  WriteValueLine("Max x-coordinate " + unit + "       : %", hi[0] * f);
  WriteValueLine("Min y-coordinate " + unit + "       : %", lo[1] * f);
  WriteValueLine("Max y-coordinate " + unit + "       : %", hi[1] * f);
  WriteValueLine("Min z-coordinate (m)       : %", lo[2]);
  WriteValueLine("Max z-coordinate (m)       : %", hi[2]);

  // Faces and points per boundary code.
  std::map<int, std::pair<int, int>> table;
  for (int k = 1; k <= fc.nfaces; ++k)
    if (fc.element2[k] == 0 && fc.code[k] != 0) ++table[fc.code[k]].first;
  for (int n = 1; n <= nd.nnodes; ++n)
    if (nd.code[n] != 0) ++table[nd.code[n]].second;
  WriteLogLine("");
  WriteLogLine(!subdomain ? "Boundary information"
                          : (three_d ? "Boundary information - 3D (subdomain)"
                                     : "Boundary information - 2D (subdomain)"));
  WriteLogLine("  Boundary code     number of faces    number of points");
  for (const auto& [code, counts] : table)
    WriteLogLine(fmt::format("  {:13d}{:20d}{:20d}", code, counts.first, counts.second));
}

}  // namespace vhd
