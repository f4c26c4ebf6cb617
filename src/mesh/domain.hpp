#pragma once
// The computational domain of a single process: up to 4 meshes read from the
// files named in the setup section DOMAIN, with the depth adjustments, the
// partitioning keys, the vertical mesh of a 3D run, the geometry and the mesh
// summary in the log.
//
// Setup keys (section DOMAIN; with number_of_meshes > 1, the mesh keys stand in
// one sub-section Mesh per mesh, [[VantorHD.DOMAIN.Mesh]]):
//   number_of_dimensions  2      2 or 3 (a 3D run stacks layers on the 2D mesh)
//   number_of_meshes      1      at most 4
//   file_name             -      mesh file (reader chosen by the extension)
//   check_mesh            1      > 0: CheckMesh after reading
//   datum_depth           0      subtracted from every node's z
//   minimum_depth, thresshold_depth   highest z: nodes with a non-zero code
//                         and minimum_depth < z <= thresshold_depth get z = minimum_depth
//   number_of_domains     16     handed to the domain partitioning (2D meshes)
//   type_of_reordering    1      element order of a 2D mesh (mesh/reorder.hpp): 0 the
//                                file's, 1 Hilbert curve, 2 reverse Cuthill-McKee

#include <vector>

#include "core/run.hpp"
#include "mesh/mesh.hpp"
#include "mesh/partition_keys.hpp"

namespace vhd {

inline constexpr int kMaxMeshes = 4;

struct DomainMesh {
  Mesh mesh;              // as read (2D, or 1D/3D from a grid file)
  Mesh mesh3d;            // layered mesh over `mesh` in a 3D run (else empty)
  VerticalMesh vertical;  // 3D run only
  double datum_depth = 0.0;
  double minimum_depth = 0.0;
  double thresshold_depth = 0.0;
  int number_of_domains = 16;
  int type_of_reordering = 1;
  PartitionSettings partition;  // keys of the partitioning (2D meshes)
};

struct Domain {
  int number_of_dimensions = 2;
  int number_of_meshes = 1;
  std::vector<DomainMesh> meshes;  // meshes[i-1] is mesh i
};

// Reads the section DOMAIN (opened and closed here) and every mesh, applies
// the depth adjustments, builds the geometry (and the layered mesh of a 3D
// run) and writes the summary of every mesh. Sets selection.ndim.
void SetupSpaceDiscretization(Domain& domain, ModuleSelection& selection);

// Minimum depth on boundary nodes: every node with a non-zero code and
// minimum_depth < z <= thresshold_depth gets z = minimum_depth.
void AdjustMeshDepths(Mesh& mesh, double minimum_depth, double thresshold_depth);

// "Mesh information" block with the boundary table (log).
void PrintMeshSummary(const Mesh& mesh, int nsections = 0, bool subdomain = false);

}  // namespace vhd
