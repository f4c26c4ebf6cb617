#pragma once
// Time-varying input data on the mesh: opening the data file of a
// input definition (io/dataspec.hpp) and the value at a time t on the caller's
// elements, nodes, faces or points.
//
// Kinds of file and where their values go:
//   .zrn0  point series: one value, the same for every target;
//   .zrn1  line series: nx values spread evenly along a line or boundary, the
//          first at its start and the last at its end (a boundary is walked
//          with the domain on its left); linear between them;
//   .zrn2  grid: bilinear in the grid cell that holds the target; the target
//          is converted into the grid's coordinates when the grid's
//          projection differs from the mesh's; targets beyond the grid take
//          the value at its edge (with a warning);
//   .zrnu  a file on the same mesh: element items onto elements and faces
//          (a face takes the mean of its elements), node items onto nodes,
//          elements and faces (mean of their nodes); points take the element
//          that holds them, or the linear node interpolant there.
// Delete values of the file take no part in the spatial weights; a target
// without a single usable value, or a step pair with a delete value, gives the
// delete value, which the soft start leaves alone.
//
// Time: a calendar file's time of t is t plus the seconds from its start
// date-time to the simulation start; a relative time axis counts seconds from
// the simulation start. The two file steps that bracket t are held in memory,
// already carried onto the targets; later steps are read as t passes them
// (a file is read forward; a jump back re-reads the bracket). Before the first
// step and after the last the values of those steps hold. Format 2 uses the
// data at the simulation start throughout.
//
// No allocation after FemDataOpen: every buffer is sized there.

#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "io/dataspec.hpp"
#include "io/zrn.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

enum class FemDataLocation { kElements, kNodes, kFaces, kPoints };

// What the caller wants of an input definition's file, and where.
struct FemDataRequest {
  FemDataExpect expect = FemDataExpect::kPoint;
  FemDataLocation location = FemDataLocation::kPoints;
  const Mesh* mesh = nullptr;
  // Elements, nodes or faces wanted, in order (for a line: the faces of the
  // boundary in walking order). Empty: every element, node or face of the mesh.
  std::vector<int> entities;
  // Points (location kPoints) in the mesh's coordinates (radians on a
  // "LONG/LAT" mesh); for a line, the points in order along it.
  std::vector<double> x, y;
  // Projection of the points when no mesh is given.
  std::string projection;
  // Per component (from 0), the item type the file's item must have; its
  // values are converted to the unit the engine computes in. Empty or
  // kUvqItemUndefined: no check and no conversion.
  std::vector<int> item_types;
};

// Opens and checks the file of an input definition of format 1, 2 or 3 and reads
// the first bracketing steps; formats 0 and 4 need no file and only record
// the number of targets. start: simulation start; duration: seconds to the
// simulation end. Formats 1 and 3 must cover the whole simulation.
void FemDataOpen(DataSpec& spec, const FemDataRequest& request, const ZrnDateTime& start,
                 double duration);
void FemDataOpen(DataSpec& spec, const FemDataRequest& request, const TimeAxis& time);

// Values of component k at time t (seconds since the simulation start) in
// values[1..number of targets] (format 0 and 4: in every entry of values).
void FemDataRead(DataSpec& spec, int k, double t, Array1<double>& values);
// The value of component k at time t at one target (from 1).
double FemDataValue(DataSpec& spec, int k, double t, int target = 1);
// Number of targets of an opened input definition.
int FemDataTargets(const DataSpec& spec);

// Empty when the mesh of a .zrnu file is the model's mesh as read from its
// mesh file (same counts, same element nodes in the file's numbering), else
// what differs ("element 7 has other nodes").
std::string MeshDifference(const ZrnMeshData& file_mesh, const Mesh& mesh);

// Closes the file (its summary goes to the log).
void FemDataClose(DataSpec& spec);

}  // namespace vhd
