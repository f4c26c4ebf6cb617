#pragma once
// Outputs of the hydrodynamic module: the items of PARAMETERS_2D, the mass
// budgets of the water volume, discharges through lines and the volume
// balance of the run.
//
// Items (logical keys of PARAMETERS_2D; true selects the item, whose name is
// also its netCDF variable name), element values of the flow state:
//   SURFACE_ELEVATION "Surface elevation" (m)     TOTAL_WATER_DEPTH "Total water depth" (m)
//   STILL_WATER_DEPTH "Still water depth" (m)     U_VELOCITY "U velocity", V_VELOCITY "V velocity" (m/s)
//   CURRENT_SPEED "Current speed" (m/s)           CURRENT_DIRECTION "Current direction" (degrees
//       clockwise from true north, the way the current goes)
//   P_FLUX "P flux", Q_FLUX "Q flux" (m2/s)       WET_DRY_CODE "Wet dry code" (0 dry, 1 wet, 2 flooded)
//   CFL_NUMBER "CFL number" (of the last sub-step) BED_SHEAR_STRESS "Bed shear stress" (N/m2), with
//       BED_SHEAR_STRESS_X "Bed shear stress x", BED_SHEAR_STRESS_Y "Bed shear stress y"
//   DRAG_COEFFICIENT "Drag coefficient"           EDDY_VISCOSITY "Eddy viscosity" (m2/s)
//   running maxima over the run, updated after every sub-step:
//   MAXIMUM_WATER_DEPTH "Maximum water depth", MAXIMUM_CURRENT_SPEED "Maximum current speed" (wet
//   elements), MAXIMUM_SURFACE_ELEVATION "Maximum surface elevation" (elements holding water; the
//   delete value where an element never held water).
//
// How the driver's adapter calls this module's outputs:
//   SetupOutputsHD      at the end of the HD setup (reads OUTPUTS in HYDRODYNAMIC_MODULE)
//   OpenOutputFilesHD   after the initial state (the start of the volume and budget accounting)
//   UpdateOutputsHD     after every HD sub-step (accumulated terms, running maxima)
//   WriteOutputHD2D     with each step n and the time of the state (n = -1 after a failure)
//   CloseOutputFilesHD, OutputStatisticsHD (several processes), PrintVolumeBalanceHD
//                       (after the time-step statistics; every process calls it)

#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "mesh/mesh.hpp"
#include "output/output_spec.hpp"
#include "output/volume_balance.hpp"

namespace vhd {

// Item codes of the HD outputs (their order in PARAMETERS_2D).
enum HdOutputItemCode {
  kHdSurfaceElevation = 1,
  kHdTotalWaterDepth,
  kHdStillWaterDepth,
  kHdUVelocity,
  kHdVVelocity,
  kHdCurrentSpeed,
  kHdCurrentDirection,
  kHdPFlux,
  kHdQFlux,
  kHdWetDryCode,
  kHdCflNumber,
  kHdBedShearStress,
  kHdBedShearStressX,
  kHdBedShearStressY,
  kHdDragCoefficient,
  kHdEddyViscosity,
  kHdMaximumWaterDepth,
  kHdMaximumCurrentSpeed,
  kHdMaximumSurfaceElevation,
  kHdItemCount = kHdMaximumSurfaceElevation
};

struct HdItemDefinition {
  const char* key;  // logical key of PARAMETERS_2D
  OutputItem item;
};
// The item table in key order (entry k-1 is item code k).
const std::vector<HdItemDefinition>& HdOutputItems();

struct HdOutputs {
  OutputList list;

  // Running maxima (allocated when an output selects one).
  bool track_maxima = false;
  Array1<double> max_depth, max_speed, max_elevation;

  // Direction of true north per element, degrees clockwise from the mesh's y
  // axis (0 where the projection gives none: geographic and local meshes).
  bool need_north = false;
  Array1<double> true_north;

  RunControl run;  // the processes of the run

  // Accounting of the water volume (this process's owned elements and
  // boundary faces, m3), as exact sums so that the totals over the processes
  // do not depend on the split of the mesh.
  // (The volumes of sources, precipitation and evaporation are booked by
  // their own records in the module.)
  ExactSum initial_volume;
  ExactSum boundaries;
  ExactSum defect_start;  // the module's volume correction at the start
  Array1<int> boundary_faces;  // owned faces on the model boundary

  // Work arrays, sized when the files are opened.
  Array1<double> area;    // element area (m2)
  Array1<double> values;  // element values of one item
  Array1<double> nodes;   // node values of one item
  Array1<double> volume;  // element volume h A (m3)
  Array1<double> rate;    // element rate of precipitation and evaporation (m3/s)
};

// mesh: the HD velocity mesh.
void SetupOutputsHD(HdOutputs& out, const Mesh& mesh, const RunControl& run, const TimeAxis& time);
void OpenOutputFilesHD(HdOutputs& out, const HdModule& hd, const Mesh& mesh);
void UpdateOutputsHD(HdOutputs& out, const HdModule& hd, const HdSolver& solver, const Mesh& mesh, double dt);
// t: time of the state in seconds since the start (n * dt for a step n).
void WriteOutputHD2D(HdOutputs& out, const HdModule& hd, const Mesh& mesh, int n, double t);
void CloseOutputFilesHD(HdOutputs& out);
// With several processes, after all processes closed their files: merges
// the per-process files (process 0) and logs the "Output Statistics".
void OutputStatisticsHD(HdOutputs& out, const RunControl& run);

// Element values of item code on the owned elements (the delete value in
// masked elements, flood_and_dry as in output_spec.hpp).
void HdItemValues(const HdOutputs& out, const HdModule& hd, const Mesh& mesh, int code, int flood_and_dry,
                  double delete_value, Array1<double>& values);

// The balance of the run, summed over all processes.
VolumeBalance VolumeBalanceHD(const HdOutputs& out, const HdModule& hd, const Mesh& mesh, const RunControl& run);
// The "Volume balance" block, and the report "VolumeBalance" (flow computed;
// process 0 or a single process).
void PrintVolumeBalanceHD(const HdOutputs& out, const HdModule& hd, const Mesh& mesh, const RunControl& run);

}  // namespace vhd
