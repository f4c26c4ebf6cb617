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
// Concentration types of the water that enters or leaves (each with a
// time-varying value in its own subsection):
//   type_of_precipitation, type_of_evaporation: 0 the water carries nothing
//   (evaporation leaves the component behind, which concentrates), 1 the
//   water carries the value of PRECIPITATION or EVAPORATION, 2 the water
//   carries the concentration of its element;
//   type_of_infiltration: the same codes; the HD module of this build has no
//   infiltration, so no water carries it (the setting is read and kept).
// Sources, type 1: the released water carries the given concentration;
// type 2: the given value is an excess over the ambient concentration.
// Withdrawn water always carries the concentration of its element.
//
// Boundary types per code and component (water that leaves always carries
// the concentration of its element, the outflow rule):
//   1  no data: water that enters carries the concentration of the inner
//      element;
//   2  water that enters carries one value for the whole boundary: a
//      constant or a point series (.zrn0);
//   3  water that enters carries values along the boundary: a line series
//      (.zrn1) spread from the first to the last face, or a constant or a
//      point series;
//   6  cyclic: water that enters carries the concentration of the element
//      behind the partner face; the flow boundary must be cyclic too, and
//      the code's partner is code_cyclic, or the one cyclic code with the
//      same number of faces.
// Land faces carry nothing whatever the type.
//
// Time: the transport steps with every HD sub-step, over the volumes that
// sub-step moved (ad_solver.hpp). Time-varying inputs are taken at the
// middle of the sub-step. Before start_time_step the module only follows
// the depths; at the start its components take their initial conditions.

#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "hydro/hd_module.hpp"
#include "io/dataspec.hpp"
#include "log/log.hpp"
#include "hydro/sw_fluxes.hpp"
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
inline constexpr int kTrBoundaryAlong = 3;
inline constexpr int kTrBoundaryCyclic = 6;

// Boundary data of one code for one component.
struct TrBoundaryCode {
  int type = kTrBoundaryNone;
  int code_cyclic = 0;
  int partner = 0;  // cyclic: the partner code
  DataSpec data;    // types 2 and 3, on the code's faces in walking order
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
  AdComponent ad;               // concentration, limits, inputs of the solver, what it booked
  AdDispersion dispersion;
  ElementField dispersion_map;  // format 3 coefficient: the file that fills dispersion.field
  int decay_type = 0;           // 0 none, 1 first-order decay with the rate field
  ElementField decay;           // rate (1/s)
  TrWaterConcentration precipitation, evaporation, infiltration;
  std::vector<TrSourceConcentration> sources;  // per HD source (index 0 is SOURCE_1)
  int initial_type = 1;
  ElementField initial;         // concentration
  Array1<TrBoundaryCode> codes; // per boundary code 1 .. ncodes
  Array1<double> work;          // values of one input on the code's faces or the elements
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
  AdSolver solver;
  AdFlow flow;
  bool started = false;          // the components hold their initial conditions and are advanced
  long long n_steps = 0;         // transport steps (one per HD sub-step from the start)
  long long n_substeps = 0;      // solver sub-steps over all components

  TimeAxis time_axis;
  TimingSet timing;
};

// Reads TRANSPORT_MODULE (up to, not including, OUTPUTS) inside the current
// section (the target), for the flow of hd on its velocity mesh.
void SetupStructureTR(TrModule& tr, const HdModule& hd, const Mesh& mesh, const TimeAxis& time,
                      const ModuleSelection& selection);

// Section readers called by SetupStructureTR, in this order; each opens its
// sections inside TRANSPORT_MODULE (the current section).
void SetupEquationTR(TrModule& tr, const HdModule& hd, const TimeAxis& time, int ndim);
void SetupSolutionMethodTR(TrModule& tr);
void SetupPropertyTR(TrModule& tr, const HdModule& hd, const Mesh& mesh);
void SetupInitialConditionsTR(TrModule& tr, const HdModule& hd, const Mesh& mesh);
void SetupBoundCondTR(TrModule& tr, const HdModule& hd, const Mesh& mesh);

// After the HD setup of its solver: the advection-dispersion solver and the
// flow record.
void SetupSolverTR(TrModule& tr, const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh);

// Gives every component its initial condition and makes the current depths
// the start of the first transport step. The driver calls it at the start
// time: in the initial step, or after the HD sub-step that reached it.
void InitialStepTR(TrModule& tr, const HdModule& hd);

// The HD sub-step of length dt ending at t, just taken by StepHD: the flow
// it moved, the time-varying inputs at its middle, the dispersion and one
// solver step of every type-2 component. Before InitialStepTR only the
// depths are followed.
void StepTR(TrModule& tr, const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh, double t, double dt);

// Closes the input data files (each logs its "Data File Summary").
void CloseInputsTR(TrModule& tr);

}  // namespace vhd
