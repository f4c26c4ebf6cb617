#pragma once
// The sand-transport (ST) module: bed load in a pure current and the bed
// level it moves.
//
// Setup (sections inside SAND_TRANSPORT_MODULE; every key is logged, absent
// keys with " (default)"):
//   SEDIMENT_DATA  format 0: grain_diameter (m, 0.0002) for every element;
//                  format 2: file_name, item_number_for_grain_diameter (1), a
//                  mesh data file with one value per element;
//                  relative_density s (2.65), porosity (0.4)
//   BED_LOAD       bed_load_formula (1), bed_load_factor (1.0),
//                  streamwise_bedslope_factor (5.0), transverse_bedslope_factor
//                  (1.25), transverse_bedslope_exponent (0.5),
//                  critical_shields_parameter (0.047, the value of Meyer-Peter
//                  and Mueller; van Rijn's formula takes its own from D*)
//   HELICAL_FLOW   type (0 off, 1 from the streamline curvature),
//                  coefficient (7.0): tan delta = coefficient h / R
//   MORPHOLOGY     type (1: the bed level follows the bed load, 0: fixed bed),
//                  morphological_factor (1.0), start_time (s after the
//                  simulation start, 0)
//   OUTPUTS        the module's outputs (control/st_driver_module.hpp)
//
// Per sub-step (StepST), after the hydrodynamics: the inputs of the bed load
// from the flow (friction cf of the bed resistance, u*^2 = cf |U|^2; the bed
// gradient turned into the flow's frame: sl along the flow, st to its left;
// tan delta from the curvature of the streamlines), CALCBEDLOADCURRENT, then
// from start_time on the bed update
//     (1 - porosity) dz_b/dt = -morphological_factor div q
// by finite volumes: the bed load through a face is the normal component of
// the bed load of its upwind element, upwind with respect to the mean of the
// two elements' normal components (so an element without bed load never
// loses sand); closed boundaries pass none, open boundaries pass the bed
// load of their element. The new bed goes to the hydrodynamics through
// ApplyBedChangeHD (hydro/bed_change.hpp), which keeps a lake at rest at rest.
//
// Owned elements 1 .. nelements_owned are computed; the halo takes the
// owners' bed loads before the face pass and the owners' bed after the
// update, so that every process forms the values one process forms.

#include <string>

#include "core/array1.hpp"
#include "hydro/hd_module.hpp"
#include "log/log.hpp"
#include "mesh/gradient.hpp"
#include "mesh/mesh.hpp"
#include "parallel/exact_sum.hpp"
#include "sediment/bed_load.hpp"

namespace vhd {

inline constexpr int kStTimerInputs = 1;    // slopes, helical flow
inline constexpr int kStTimerBedLoad = 2;   // CALCBEDLOADCURRENT
inline constexpr int kStTimerBedUpdate = 3; // face fluxes, bed change, hand-over
inline constexpr int kStTimerTotal = 4;
inline constexpr int kStTimerCount = 4;

struct StModule {
  BedLoadSettings bed_load;
  int grain_format = 0;          // 0 constant, 2 mesh data file
  double grain_diameter = 2e-4;  // m, format 0
  std::string grain_file;
  int grain_item = 1;
  double porosity = 0.4;
  int helical_flow = 0;          // 0 off, 1 from the streamline curvature
  double helical_coefficient = 7.0;
  int morphology = 1;            // 0 fixed bed, 1 bed update
  double morphological_factor = 1.0;
  double start_time = 0.0;       // s after the simulation start

  int nelements = 0, nowned = 0, nlocal = 0, nfaces = 0;
  Subdomain* subdomain = nullptr;

  // Per element.
  Array1<double> grain;                   // grain diameter (m)
  // Terms of the grain diameter for the bed load: one for a constant
  // diameter, else per element.
  BedLoadGrain grain_terms_constant;
  Array1<BedLoadGrain> grain_terms;
  Array1<double> qx, qy;                  // bed load (m2/s)
  Array1<double> sl, st, tan_delta;       // inputs of the bed load
  Array1<double> depth_x, depth_y;        // gradient of the still water depth d
  Array1<double> ux, uy, vx, vy;          // velocity gradients (helical flow)
  Array1<double> dz;                      // bed change of the last update (m)
  Array1<double> bed_change;              // bed change since the start (m)
  Array1<double> area;                    // element area (m2)
  // Per face: bed-load volume through the face (m3/s), positive from
  // element1 to element2 (faces of owned elements).
  Array1<double> face_q;

  GradientStencil stencil;  // least squares over the first ring

  long long n_updates = 0;  // bed updates made

  TimingSet timing;
};

// Reads the sections of the module (SAND_TRANSPORT_MODULE must be the
// current section) and allocates the module on the HD velocity mesh.
// Refuses a geographic mesh.
void SetupST(StModule& st, const HdModule& hd, const Mesh& mesh);
// Section readers of SetupST, each inside the current section.
void SetupSedimentDataST(StModule& st, const Mesh& mesh);
void SetupBedLoadST(StModule& st);
void SetupHelicalFlowST(StModule& st);
void SetupMorphologyST(StModule& st);
// Allocates the arrays and builds the gradient stencil (after the readers).
void AllocateST(StModule& st, const HdModule& hd, const Mesh& mesh);

// Inputs of the bed load from the flow state: bed slopes in the flow's
// frame and tan delta of helical flow (owned elements).
void CalcBedLoadInputsST(StModule& st, const HdModule& hd);
// Bed load of the owned elements from the current flow state.
void CalcBedLoadST(StModule& st, const HdModule& hd);
// Bed change over a morphological time dt_morph (s, already multiplied by
// the morphological factor) from the current bed load into st.dz (owned
// elements).
void CalcBedChangeST(StModule& st, const Mesh& mesh, double dt_morph);
// One sub-step from t - dt to t: inputs, bed load and, from start_time on,
// the bed update handed to the hydrodynamics.
void StepST(StModule& st, HdModule& hd, const Mesh& mesh, double t, double dt);

// Curvature (1/m) of the streamline through a point with velocity (u, v)
// and velocity gradients: positive where the flow turns left.
double StreamlineCurvature(double u, double v, double ux, double uy, double vx, double vy);

void SetupTimingST(StModule& st);
// Bed volume change since the start (m3, sum of bed_change times area over
// the owned elements of all processes, summed exactly; collective).
double BedVolumeChangeST(const StModule& st, const RunControl& run);
// The "Sand transport statistics" block of the log (collective).
void PrintStatisticsST(const StModule& st, const RunControl& run);

}  // namespace vhd
