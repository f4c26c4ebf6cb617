#pragma once
// The hydrodynamic (HD) module: its one process-wide record, the shared flow
// state and the physical constants.
//
// HdModule holds every setting of the HD sections of the setup file
// (HYDRODYNAMIC_MODULE, EQUATION, SPACE, SOLUTION_TECHNIQUE, FLOOD_AND_DRY,
// EDDY_VISCOSITY, BED_RESISTANCE, INITIAL_CONDITIONS), the run statistics of
// the HD time stepping, the HD timing set and the flow state HdState. The
// driver creates one HdModule and hands it to every HD routine; transport,
// outputs and sediment modules read the state after each HD step.
//
// State per element (2D, depth integrated), units SI:
//   eta  surface elevation above datum (m)
//   d    still water depth, positive downwards (bed level = -d) (m)
//   h    total depth h = eta + d >= 0 (m)
//   P, Q depth-integrated fluxes P = h u, Q = h v (m2/s)
//   u, v depth-averaged velocity, P/h and Q/h in wet elements, else 0 (m/s)
//   wet/dry code: 0 dry, 1 wet, 2 flooded (takes part in the mass balance
//   only); "full participation" is always tested as code == 1.
//
// All arrays are Array1 (entities from 1); owned elements come first, halo
// elements after them, and every loop that writes results runs over the owned
// elements only.
//
// Entry points (setup, initial state, conversions, flooding and drying, bed
// resistance, eddy viscosity, statistics) are declared at the end; the
// solver's own work arrays and kernels (face fluxes, time integration) live in
// their own header.

#include <cmath>
#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "hydro/bound.hpp"
#include "hydro/element_field.hpp"
#include "hydro/forcing.hpp"
#include "hydro/forcing_precipitation.hpp"
#include "hydro/sources.hpp"
#include "io/zrn.hpp"
#include "log/log.hpp"
#include "parallel/exact_sum.hpp"
#include "parallel/subdomain.hpp"

namespace vhd {

struct Mesh;

// ---- physical constants ------------------------------------------------------

// Fixed table read by all HD routines.
struct PhysicalConstants {
  double stefan_boltzmann = 5.6697e-8;  // W/(m2 K4)
  double von_karman = 0.4;
  double earth_rotation = 7.292e-05;    // rad/s
  double earth_radius = 6366707.0;      // m
  double heat_constant_1 = 1.4207e-05;  // used by the heat-exchange code
  double heat_constant_2 = 1.7722e-05;  // used by the heat-exchange code
  double cp_air = 1007.0;               // J/(kg K)
  double cp_water = 4217.0;             // J/(kg K)
  double rho_ice = 917.0;               // kg/m3
  double rho_air = 1.3;                 // kg/m3
  double rho0 = 1010.0;                 // reference density of water, kg/m3
  double g = 9.81;                      // gravity, m/s2
};
inline constexpr PhysicalConstants kPhysical{};

// ---- flow state ----------------------------------------------------------------

inline constexpr int kDry = 0;
inline constexpr int kWet = 1;
inline constexpr int kFlooded = 2;

struct HdState {
  int nelements = 0;        // elements of the velocity mesh (owned + halo)
  int nelements_owned = 0;  // owned elements 1 .. nelements_owned
  // Owned and halo elements 1 .. nelements_local: the elements whose values
  // are valid after a halo exchange (parallel/subdomain.hpp); the rest of the
  // mesh is not read in the time loop.
  int nelements_local = 0;
  int nfaces = 0;
  int nnodes = 0;
  // Place of each element in the mesh file (mesh/reorder.hpp): files read
  // per element hold that order, messages name that number. Empty when the
  // mesh is in file order.
  Array1<int> element_file_index;

  // Per element.
  Array1<double> eta, d, h;       // m
  Array1<double> P, Q;            // m2/s
  Array1<double> u, v;            // m/s
  Array1<int> wetdry;             // 0 dry, 1 wet, 2 flooded
  Array1<int> wetdry_old;         // code before the last flood/dry check
  Array1<double> length;          // characteristic length for the CFL number (m)

  // State at the start of the HD step, U(n): the base of the second stage of
  // the two-stage scheme (the working arrays h, P, Q hold U* between the
  // stages; a one-stage step does not store it).
  Array1<double> h_old, P_old, Q_old;

  // Velocity gradients of the element (1/s, metric factors applied on
  // geographic meshes), formed from the state at the start of the sub-step;
  // read by the Smagorinsky model and the diffusive face fluxes. Allocated
  // only with eddy viscosity (AllocateVelocityGradientsHD).
  Array1<double> ux, uy, vx, vy;

  // Bed resistance and eddy viscosity.
  Array1<double> cf;          // bed drag coefficient (-), tau = rho0 cf |u| u
  Array1<double> cf_surface;  // surface (ice) drag coefficient (-)
  Array1<double> tau_x, tau_y;  // bed shear stress (N/m2)
  Array1<double> nu_t;        // horizontal eddy viscosity (m2/s)

  // CFL rate r (1/s, -1 where not computed) of the current state; the CFL
  // number of a step dt is CflNumber(r, dt).
  Array1<double> cfl_rate;

  // Metric factors: cos and tan of the latitude of the element centre on
  // geographic meshes (empty on Cartesian meshes).
  Array1<double> cos_lat, tan_lat;

  // Per face: mass flux times the face length (m3/s), positive from element1
  // to element2; still water depth at the face used by the bed-slope term (m).
  Array1<double> face_flux_len, face_d;

  // Per node: bed level (m, negative below datum).
  Array1<double> z_node;
};

// ---- settings ------------------------------------------------------------------

struct HdFloodDry {
  int type = 0;                 // 0 off, > 0 on
  double drying_depth = 0.0;    // h_dry (0.005 m when on)
  double flooding_depth = 0.0;  // h_flood (0.05 m when on)
  double mass_depth = 0.0;      // h_mass = h_min of the fluxes (0.1 m when on)
  int maximum_number_of_iterations = 10;

  // Statistics and the blow-up limit.
  long long n_wet = 0;              // elements with code > 0 after the last check
  // Volume added when negative depths were cut (m3), this process's owned
  // elements; an exact sum, so that its total over the processes has the
  // same bits for any number of threads and processes.
  ExactSum mass_correction;
  double elevation_limit = 0.0;     // blow-up limit of the surface elevation (m)
  double elevation_margin = 100.0;  // limit = highest initial surface or bed + this margin (m)
  // Volume added in each element by the last check (m3).
  Array1<double> mass_cut;
};

// Stored bed-resistance codes (the setup's type minus one).
inline constexpr int kBedNone = 0;
inline constexpr int kBedDragCoefficient = 1;
inline constexpr int kBedChezy = 2;
inline constexpr int kBedManning = 3;
inline constexpr int kBedRoughness = 4;
inline constexpr int kBedDirectionalRoughness = 5;
inline constexpr int kBedWaveRoughness = 6;

struct HdBedResistance {
  int type = kBedManning;   // stored code 0 .. 6
  ElementField coefficient; // drag coefficient, Chezy, Manning number or roughness ks
  Array1<double> K;         // per element: cf = K (codes 1, 2) or K / h^(1/3) (codes 3 to 6)

  // Directional roughness: roughness heights ks (m) for flow towards the
  // east, north, west and south; the flow direction weighs the two nearest.
  int directional_format = 0;
  std::vector<double> directional_constants{0.05, 0.05, 0.05, 0.05};
  std::string directional_file;
  std::vector<int> directional_items{1, 2, 3, 4};
  Array1<double> ks_directional[4];

  // Wave-induced roughness.
  int type_of_wave_induced_roughness = 0;
  int update_frequency = 1;
  ElementField grain_diameter;   // d50 (m)
  double relative_density = 2.65;
  int type_of_wave_height_correction = 0;
  double wave_height_over_depth_limit = 0.85;
  long long wave_update_count = 0;
  // Wave fields per element (significant height m, peak period s, direction
  // degrees), filled by the wave forcing; 0 height means no waves.
  Array1<double> wave_height, wave_period, wave_direction;
  Array1<double> ks_wave;  // current roughness height (m)

  // Surface (ice) resistance: K_s per element (0 when there is no ice).
  Array1<double> K_surface;
};

// Stored eddy-viscosity codes (0, 1 as read; 3 .. 6 stored one lower).
inline constexpr int kEddyNone = 0;
inline constexpr int kEddyConstant = 1;
inline constexpr int kEddySmagorinsky = 2;
inline constexpr int kEddyLogLaw = 3;
inline constexpr int kEddyKEpsilon = 4;
inline constexpr int kEddyType5 = 5;

struct HdEddyRecord {
  int type = kEddyConstant;  // stored code
  ElementField value;        // constant viscosity (m2/s) or Smagorinsky constant Cs
  int Ri_damping = 0;
  double Ri_a = 10.0;
  double Ri_b = 0.5;
  double minimum_eddy_viscosity = 0.0;
  double maximum_eddy_viscosity = 1.0e10;
  std::vector<double> mixing_length_constants{0.41, -0.41};
};

struct HdEddyViscosity {
  HdEddyRecord horizontal;
  HdEddyRecord vertical;  // 3D only
};

struct HdSolutionTechnique {
  int scheme_of_time_integration = 1;
  int scheme_of_space_discretization_horizontal = 1;
  int gradient_calculation = 2;
  int gradient_limiter = 0;
  int face_value_limiter = 0;
  int boundary_correction = 1;
  bool preserve_dU = false;
  int face_average_d = 0;
  bool face_limit_dry = false;
  double s_blend = 0.0;
  int type_of_filtering = 0;
  double filtering_coefficient = 0.01;
  int type_of_Riemann_solver = 1;
  int type_of_Riemann_solver_zlevel = 1;
  int type_of_entropy_fix = 1;
  int vertical_convective_discretization = 1;
  int bed_resistance_discretization = 1;
  int type_of_land_condition = 2;
  int type_of_land_condition_zlevel = 1;
  int non_hydrostatic = 1;
  int dynamic_list = 1;  // GPU runs only
};

struct HdTimeStepControl {
  double CFL_critical_HD = 1.0;
  double dt_min_HD = 0.01;
  double dt_max_HD = 30.0;
  int CFL_correction_HD = 0;
  double CFL_critical_AD = 1.0;
  double dt_min_AD = 0.01;
  double dt_max_AD = 30.0;
  double CFL_critical_substeps_AD = 0.8;
  int error_level = 0;
  int maximum_number_of_errors = 200;
};

struct HdInitialConditions {
  int type = 0;
  double surface_elevation_constant = 0.0;
  double u_velocity_constant = 0.0;
  double v_velocity_constant = 0.0;
  double w_velocity_constant = 0.0;
  std::string file_name_2d;
  int surface_elevation_item_no = 1;
  int total_water_depth_item_no = 1;
  int still_water_depth_item_no = 0;  // 0 = not given
  int u_velocity_item_no = 2;
  int v_velocity_item_no = 3;
  std::string file_name_3d;
  int w_velocity_item_no = 3;
};

// Timers of the HD timing set.
inline constexpr int kHdTimerForcings = 1;     // forcings and boundary values
inline constexpr int kHdTimerProperties = 2;   // bed resistance, eddy viscosity
inline constexpr int kHdTimerDerivatives = 3;  // face fluxes and derivatives
inline constexpr int kHdTimerUpdate = 4;       // element update of the stages
inline constexpr int kHdTimerFloodDry = 5;     // flood/dry check, velocities, stress
inline constexpr int kHdTimerTotal = 6;
inline constexpr int kHdTimerCount = 6;

struct HdModule {
  int mode = 2;       // 0 off, 2 flow computed
  int ndim = 2;       // 2 or 3, from the driver
  int formulation = 1;
  int time_formulation = 2;
  int number_of_2D_mesh_geometry = 1;
  int number_of_2D_mesh_velocity = 1;
  int number_of_2D_mesh_elevation = 1;
  int number_of_3D_mesh_geometry = 1;
  int number_of_3D_mesh_velocity = 1;
  int number_of_3D_mesh_pressure = 1;
  int mesh_flag = 2;        // 1 separate 2D meshes, 2 one mesh
  int projection = 1;       // 1 Cartesian, 2 geographic ("LONG/LAT")
  double metric_radius = 1.0;  // earth radius on geographic meshes, else 1

  // Run settings copied at setup.
  double overall_dt = 30.0;  // time_step_interval of the run (s)
  TimeAxis time_axis;        // simulation start and steps (time-varying input)
  int process_id = -1;       // -1 for a single process
  int nprocesses = 1;
  // This process's part of the mesh and the halo exchanges (set by the
  // driver; null in a unit test of one process).
  Subdomain* subdomain = nullptr;
  bool use_gpu = false;
  int ice_type = 0;          // ice-cover type of the forcing setup

  HdFloodDry flood_dry;
  HdBedResistance bed;
  HdEddyViscosity eddy;
  HdSolutionTechnique solution;
  HdTimeStepControl time_step;
  HdInitialConditions initial;

  // Time-step statistics of the run.
  long long n_steps = 0;
  double dt_smallest = 0.0;
  double dt_largest = 0.0;
  double dt_sum = 0.0;
  double dt_last = 0.0;  // the last sub-step (s)
  long long n_cfl_violations = 0;
  // Largest CFL rate (1/s) of the state left by the last sub-step, formed in
  // its end-of-step pass with state.cfl_rate; taken (once) by the next
  // CALCTIMESTEPHD instead of a pass of its own. Negative: not available.
  double cfl_rate_max_ready = -1.0;
  // Largest CFL rate of state.cfl_rate as CALCTIMESTEPHD used it, for the
  // next StepHD, which then scans the elements for violations only when this
  // rate itself violates (every CFL number is at most its one). Negative:
  // not available (StepHD scans).
  double cfl_rate_max_of_step = -1.0;

  TimingSet timing;
  HdState state;
  HdBoundary boundary;  // boundary codes and boundary faces
  HdForcing forcing;    // wind, air pressure, Coriolis, tidal potential
  HdPrecipitation precipitation;  // PRECIPITATION_EVAPORATION
  HdSources sources;              // SOURCES
};

// ---- entry points ----------------------------------------------------------------

// Reads the HD sections in the setup order (HYDRODYNAMIC_MODULE/mode, EQUATION,
// SPACE, FLOOD_AND_DRY, EDDY_VISCOSITY, BED_RESISTANCE, SOLUTION_TECHNIQUE,
// INITIAL_CONDITIONS), allocates the state on the velocity mesh and creates
// the HD timing set. The setup file's target must be the current section.
// meshes are the run's meshes (indices of SPACE count from 1 into it).
void SetupHD(HdModule& hd, const RunControl& run, const TimeAxis& time, const ModuleSelection& modules,
             const std::vector<const Mesh*>& meshes);
void SetupHD(HdModule& hd, const RunControl& run, const TimeAxis& time, const ModuleSelection& modules,
             const std::vector<Mesh>& meshes);

// Section readers called by SetupHD, in this order; each opens and closes its
// own section inside HYDRODYNAMIC_MODULE (the current section).
void SetupEquationHD(HdModule& hd);
// Legacy formulation codes: 4 is read as 1; in 3D also 5 as 3 and 6 as 2.
int MapFormulationHD(int formulation, int ndim);
void SetupSpaceHD(HdModule& hd, const std::vector<const Mesh*>& meshes);
void SetupFloodDryHD(HdModule& hd);
void SetupEddy(HdModule& hd, const Mesh& mesh);
void SetupBedResistanceHD(HdModule& hd, const Mesh& mesh);
void SetupSolutionMethodHD(HdModule& hd);
// Forcing, source and temperature-salinity sections of the HD module for
// features this build does not have: a section that switches one on (type or
// mode above 0, or sources listed) is a fatal error saying so; one that
// leaves it off is skipped.
void RefuseUnavailableFeaturesHD();
void SetupInitialConditionsHD(HdModule& hd);

// Allocates every HdState array for the mesh (codes 1, metric arrays, bed
// levels, element lengths).
void AllocateStateHD(HdModule& hd, const Mesh& mesh);
// Allocates the velocity gradients (ux, uy, vx, vy) once; called for a
// module with horizontal eddy viscosity.
void AllocateVelocityGradientsHD(HdState& s);

// Element length of the CFL rate (m): L = 4 A / P, A the area and P the
// perimeter (the sum of the face lengths). For water at rest the rate
// 2 sqrt(g h) / L then gives dt sqrt(g h) = CFL 2 A / P, the bound under
// which the first-order update of an element is a convex combination of its
// own and its neighbours' states; on a square it is the edge. The shortest
// edge overestimates the admissible step on thin triangles (whose height is
// far below their shortest edge), where runs at CFL 0.8 blew up. In metres
// on every mesh (FaceMetres, ElementAreaMetres).
double CflLengthHD(const Mesh& mesh, int e);

// Initial state from the initial conditions, ending with the initial
// flood/dry codes; afterwards h = eta + d >= 0 in every element and the
// blow-up elevation limit is set.
void InitialiseStateHD(HdModule& hd, const Mesh& mesh);

// Per-element formulas shared by the whole-array routines below and the fused
// end-of-step pass of the time stepping.
// Velocity from flux: flux / h for a wet element (code 1) with h > 0, else 0.
inline double VelocityFromFluxHD(int code, double h, double flux) {
  return code == kWet && h > 0.0 ? flux / h : 0.0;
}
// Bed shear stress (N/m2) of drag coefficient cf and velocity (u, v).
inline void BedShearStressHD(double cf, double u, double v, double& tau_x, double& tau_y) {
  const double speed = std::sqrt(u * u + v * v);
  tau_x = kPhysical.rho0 * cf * u * speed;
  tau_y = kPhysical.rho0 * cf * v * speed;
}

// u = P/h, v = Q/h for wet elements (code 1), else 0.
void CALCVELOCITYFROMFLUX(HdState& s);
// P = u h, Q = v h.
void CALCFLUXFROMVELOCITY(HdState& s);
// The same for one component: 1 = x (u, P), 2 = y (v, Q).
void CALCVELOCITYFROMFLUXCOMPONENT(HdState& s, int component);
void CALCFLUXFROMVELOCITYCOMPONENT(HdState& s, int component);

// Flooding and drying after a sub-step (and at initialisation): new codes from
// the depths, flooding of dry neighbours across faces, momentum reset, count
// of wet elements; negative depths of drying elements are cut to 0 and the
// volume is booked in flood_dry.mass_correction.
void CHECKFLOODDRYHD(HdModule& hd, const Mesh& mesh);
// Initial codes from the initial depths (no face pass, no momentum reset).
void InitialFloodDryCodesHD(HdModule& hd, const Mesh& mesh);

// Blow-up check at HD time t: elevation above the limit, or (flooding and
// drying off) a non-positive depth. Writes the report block of the first
// offending element. With status: sets *status = -1 and returns; without:
// ends the run with the fatal error. Returns true when the state is sound.
bool CheckBlowUpHD(HdModule& hd, const Mesh& mesh, double t, int* status = nullptr);

// Bed resistance of a sub-step at time t: time-varying coefficients,
// directional or wave-induced roughness, then cf per element.
void CALCRESISTANCEBED(HdModule& hd, const Mesh& mesh, double t);
// cf = K / h^(1/3) (third-order series of h^(1/6)) for wet elements.
void CALCDRAGCOEFMANNINGBED(HdModule& hd);
// Surface drag under ice: ice_factor[e] > 0 marks ice-covered elements.
void CALCDRAGCOEFMANNINGSURFACE(HdModule& hd, const Array1<double>& ice_factor);
// tau = rho0 cf |u| u for wet elements, else 0.
void CALCBEDSHEARSTRESS(HdModule& hd);
// Drag coefficient of depth h for coefficient K (series of h^(1/6)).
double ManningDragCoefficient(double K, double h);
// Roughness height (m) of a sand bed (grain diameter d50, m) under a current
// and waves of height H and period T in depth h (model in resistance.cpp).
double WaveInducedRoughness(double d50, double relative_density, double current_speed, double wave_height,
                            double wave_period, double depth);
// Wave length (m) of period T (s) in depth h (m).
double WaveLengthHD(double T, double h);

// Horizontal eddy viscosity of a sub-step from the state at its start (the
// velocity gradients ux .. vy of the state must be current).
void CALCEDDYVISCOSITYHD(HdModule& hd, const Mesh& mesh);
void CALCSMAGORINSKY2D(HdModule& hd, const Mesh& mesh);
// nu_t = max(nu_t, nu_mud) element by element.
void CORREDDYMUD(HdModule& hd, const Array1<double>& nu_mud);

// Statistics: record one HD step; write the time-step statistics block.
void RecordTimeStepHD(HdModule& hd, double dt);
void PrintTimeStepStatisticsHD(const HdModule& hd);
// Creates the HD timing set with its timers.
void SetupTimingHD(HdModule& hd);

}  // namespace vhd
