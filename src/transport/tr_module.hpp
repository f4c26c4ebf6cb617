#pragma once
// The transport (TR) module: a user-defined list of dissolved components
// carried by the flow of the hydrodynamic module.
//
// Setup (SetupStructureTR) reads the section TRANSPORT_MODULE in this order:
//   mode                   must equal mode_of_transport_module
//   EQUATION               formulation
//   TIME                   start_time_step (from the run's first step on)
//   SPACE                  the mesh numbers of the fields the module stores
//   COMPONENTS             number_of_components and COMPONENT_k: type,
//                          dimension, description, UVQ_type, UVQ_unit,
//                          minimum_value, maximum_value
//   SOLUTION_TECHNIQUE     the advection-dispersion scheme
//   SetupPropertyTR        per component (each section with COMPONENT_k):
//                          DISPERSION, DECAY, PRECIPITATION_EVAPORATION,
//                          INFILTRATION, SOURCES (SOURCE_i per HD source)
//   INITIAL_CONDITIONS     COMPONENT_k: constant or a map of the mesh
//   BOUNDARY_CONDITIONS    CODE_c with COMPONENT_k per boundary code
//   OUTPUTS                read by the module's output layer
//
// Component types: 2 is solved by the advection-dispersion step; 1 is a
// field that keeps its initial values (not transported: a tracer of
// nothing, kept for outputs and budgets).
//
// Concentration types of the water that enters or leaves (each in its own
// subsection with a time-varying value):
//   precipitation  type 0: rain carries nothing; 1: rain carries the value of
//                  PRECIPITATION;
//   evaporation    type 0: evaporation takes nothing (the component stays
//                  behind and concentrates); 1: the evaporated water takes
//                  the value of EVAPORATION;
//   infiltration   type 0: nothing; 1: the value of INFILTRATION. The HD
//                  module of this build has no infiltration, so no water
//                  carries it; the setting is read and kept.
// Sources, type 1: the released water carries the given concentration;
// type 2: the given value is an excess over the ambient concentration.
// Withdrawn water always carries the concentration of its element.
//
// Boundary types per code and component:
//   1  no data: water that enters carries the concentration of the inner
//      element (the gradient across the boundary is zero);
//   2  a time-varying concentration, one value per face (a constant, a
//      point series, or a line series along the boundary), carried by the
//      water that enters; water that leaves carries the inner concentration
//      (the outflow rule);
//   3  as 2, and the dispersive flux across the face is formed against the
//      boundary value, so the value holds at the face also where the water
//      leaves or stands still;
//   6  cyclic: the face sees the element behind the partner code's face
//      (code_cyclic, or the one cyclic code with the same face count).
// Land faces (HD types 1 and 2) carry nothing whatever the type.

#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "hydro/hd_module.hpp"
#include "io/dataspec.hpp"
#include "log/log.hpp"
#include "transport/ad_solver.hpp"

namespace vhd {

struct Mesh;

// Component record.
struct TrComponent {
  std::string name;        // "COMPONENT_k" by default; item and keyword name
  int type = 2;            // 1 kept, 2 solved
  int dimension = 3;       // 2 depth-averaged, 3 layered
  std::string description; // "Concentration - component k" by default
  int UVQ_type = 100201;
  int UVQ_unit = 99000;
  double minimum_value = -1e10;
  double maximum_value = 1e10;
  int output_item_type = 999;
  int output_unit = 0;
};

inline constexpr int kTrBoundaryNone = 1;
inline constexpr int kTrBoundaryValue = 2;
inline constexpr int kTrBoundaryValueDispersive = 3;
inline constexpr int kTrBoundaryCyclic = 6;

// Boundary data of one code for one component.
struct TrBoundaryCode {
  int type = kTrBoundaryNone;
  int code_cyclic = 0;
  int partner = 0;  // cyclic: the partner code
  DataSpec data;    // types 2 and 3
};

// Water that enters or leaves with a concentration (precipitation,
// evaporation, infiltration).
struct TrWaterConcentration {
  int type = 1;
  DataSpec data;
};

// The component's concentration at one HD source.
struct TrSourceConcentration {
  int type = 1;  // 1 the value is the concentration, 2 an excess over the ambient
  DataSpec data;
};

// Everything the module holds per component beside its record.
struct TrComponentData {
  AdDispersion dispersion;
  int decay_type = 0;          // 0 none, 1 first-order decay with the rate field
  ElementField decay;          // rate (1/s)
  TrWaterConcentration precipitation, evaporation, infiltration;
  std::vector<TrSourceConcentration> sources;  // per HD source (index 0 is SOURCE_1)
  int initial_type = 1;
  ElementField initial;        // concentration
  Array1<TrBoundaryCode> codes;  // per boundary code 1 .. ncodes
  // Per boundary face of the HD face list: the new and the old value
  // (values[2k-1] new, values[2k] old of face condition k).
  Array1<double> boundary_values;
  Array1<double> c;            // concentration per element
};

// Timers of the transport timing set.
inline constexpr int kTrTimerForcings = 1;
inline constexpr int kTrTimerSolve = 2;
inline constexpr int kTrTimerTotal = 3;

struct TrModule {
  int mode = 0;
  int ndim = 2;
  int formulation = 4;
  int start_time_step = 0;
  double start_time = 0.0;  // s since the simulation start
  int number_of_2D_mesh_geometry = 1;
  int number_of_2D_mesh_velocity = 1;
  int number_of_2D_mesh_concentration = 1;
  int number_of_3D_mesh_geometry = 1;
  int number_of_3D_mesh_velocity = 1;
  int number_of_3D_mesh_concentration = 1;
  int number_of_components = 1;
  Array1<TrComponent> components;  // 1 .. number_of_components
  // Components by type and dimension (numbers from 1).
  std::vector<int> type1_2d, type1_3d, type2_2d, type2_3d;

  AdSolutionTechnique solution;
  Array1<TrComponentData> data;  // 1 .. number_of_components

  TimeAxis time_axis;
  int process_id = -1;
  int nprocesses = 1;
  TimingSet timing;
};

// Reads TRANSPORT_MODULE (up to, not including, OUTPUTS) inside the current
// section (the target), for the flow of hd on its velocity mesh.
void SetupStructureTR(TrModule& tr, const HdModule& hd, const Mesh& mesh, const RunControl& run,
                      const TimeAxis& time, const ModuleSelection& selection);

// Section readers called by SetupStructureTR, in this order; each opens its
// sections inside TRANSPORT_MODULE (the current section).
void SetupEquationTR(TrModule& tr, const HdModule& hd, const TimeAxis& time, int ndim);
void SetupSolutionMethodTR(TrModule& tr, const HdModule& hd);
void SetupPropertyTR(TrModule& tr, const HdModule& hd, const Mesh& mesh);
void SetupInitialConditionsTR(TrModule& tr, const HdModule& hd, const Mesh& mesh);
void SetupBoundCondTR(TrModule& tr, const HdModule& hd, const Mesh& mesh);

}  // namespace vhd
