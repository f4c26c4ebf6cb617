#pragma once
// External forcings of the HD module: wind stress and air pressure, the
// Coriolis parameter and the tidal potential (equilibrium tide).
//
// Setup reads the sections CORIOLIS, WIND_FORCING (with WIND_FRICTION) and
// TIDAL_POTENTIAL of the HD module; PrepareForcingHD, called once the solver
// tables exist, forms what depends on the mesh (Coriolis parameter, north
// rotation, latitudes and longitudes, gradient weights) and allocates the
// element source terms. UpdateForcingHD, once per sub-step before the stages,
// writes the momentum sources src_P, src_Q of every owned element:
//
//   wind     c_w W (u', v') (surface stress over water density, m2/s2),
//            scaled by h^2 / (2 h_mass)^2 in water thinner than 2 h_mass;
//   pressure -h / rho0 grad(p_air);
//   tide     +g h grad(eta_eq);
//   waves    the radiation-stress force over rho0 (see HdRadiationStress);
//   Coriolis the rotation of (P, Q) by the angle f dt in the Crank-Nicolson
//            (Cayley) form, written as a source: ((c - 1) P + s Q) / dt and
//            ((c - 1) Q - s P) / dt with c = (1 - a^2/4) / (1 + a^2/4),
//            s = a / (1 + a^2/4), a = f dt. A step without face terms turns
//            (P, Q) by exactly that rotation, so the speed is kept and the
//            period of an inertial oscillation is off by a^2 / 12 only.
//
// Only wet elements (code 1) take momentum sources; the element update gives
// the other elements none. Gradients are formed face by face from the
// differences to the neighbours, grad(q)_e = 1/A sum_faces (q_n - q_e)/2 n len
// (the face value is the mean of the two sides; a boundary face adds
// nothing): a uniform field has a gradient of exactly zero, so a uniform
// pressure leaves a lake at rest at rest on any mesh. Sources that come
// after the forcings in the update order (sources and sinks) add to src_P,
// src_Q; the forcings leave src_h alone.
//
// The fields the boundary tilting reads (bc.forcing of HdBoundary: coriolis,
// wind_x, wind_y, pressure_x, pressure_y) are filled here.

#include <string>
#include <vector>

#include "core/array1.hpp"
#include "hydro/element_field.hpp"
#include "io/dataspec.hpp"

namespace vhd {

struct HdModule;
struct HdSolver;
struct Mesh;

inline constexpr double kWaterOverAirDensity = 800.0;

struct HdWindForcing {
  int type = 0;    // 0 none, >= 1 wind included
  int format = 1;  // 0 constant, 1 time series, 3 map varying in time and domain
  double constant_speed = 0.0;      // m/s (format 0)
  double constant_direction = 0.0;  // degrees, where the wind comes from, clockwise from north
  std::string file_name;
  int item_speed = 1, item_direction = 2;              // format 1
  int item_pressure = 1, item_x = 2, item_y = 3;       // format 3
  double neutral_pressure = 101300.0;                  // Pa (read in hPa)
  int type_of_soft_start = 2;
  double soft_time_interval = 0.0;

  // WIND_FRICTION.
  int friction_type = 1;  // 0 constant, 1 linear in the wind speed
  double constant_friction = 0.0026;
  double friction_low = 0.0016, speed_low = 0.0;
  double friction_high = 0.0026, speed_high = 24.0;

  // Data of formats 1 (speed, direction) and 3 (pressure, x and y velocity);
  // values per element for format 3 (1 .. nelements).
  DataSpec data;
  Array1<double> pressure;  // air pressure (Pa) per element
  Array1<double> map_p, map_u, map_v;
  // Per element: cos and sin of the angle from the mesh's y axis to true
  // north (clockwise); empty when the mesh axes point east and north.
  Array1<double> north_cos, north_sin;
  // Last update: soft-start factor; wind (east, north) and stress factor
  // c_w W of formats 0 and 1 (the same for every element); the delete value
  // of the map (format 3).
  double soft = 1.0;
  double u = 0.0, v = 0.0, stress_factor = 0.0;
  double map_delete = 0.0;
};

struct HdCoriolis {
  int type = 0;  // 0 none, 1 constant, 2 varying with the latitude (absent section: 0)
  double latitude = 0.0;     // degrees (type 1)
  bool latitude_given = false;
  double coefficient = 0.0;  // f (1/s), type 1
  bool coefficient_given = false;
  Array1<double> f;          // per element (1/s)
};

struct TidalConstituent {
  std::string name;
  int species = 1;      // 0 long-period, 1 diurnal, 2 semi-diurnal
  int constituent = 1;
  double amplitude = 0.0;  // m
  double period = 0.0;     // s, period_scaling applied
  double earthtide = 1.0;
  double nodal_number_1 = 1.0, nodal_number_2 = 0.0, nodal_number_3 = 0.0;
  std::vector<int> arguments;
  double phase = 0.0;  // degrees
  // Built-in constituents: angular speed (rad/s) and V0 + u of the start (rad).
  double omega = 0.0;
  double v0u = 0.0;
};

struct HdTidalPotential {
  int type = 0;    // 0 none, 1 constituents in the setup file, 2 data file, 3 built-in
  int format = 0;  // type 1: 0 constituents in CONSTITUENT subsections
  double period_scaling = 1.0;
  std::vector<TidalConstituent> constituents;
  std::string file_name;
  int item_number = 1;
  DataSpec data;  // type 2
  // Start of the simulation in days from the epoch of the astronomical
  // arguments (1899-12-31 12:00).
  double start_days = 0.0;
  // Per element: latitude and longitude (rad) and the equilibrium tide (m).
  Array1<double> lat, lon, eta_eq;
  // Per constituent of the last update: amplitude factor A_k (m) and
  // argument chi_k (rad).
  std::vector<double> amp, arg;
  Array1<double> grad_x, grad_y;  // gradient of eta_eq (-)
};

// DEPTH: a time-varying correction k (m) of the bed per element, written to
// HdSolver::depth_correction, which the face terms read: the bed and the
// surface that drives the flow are raised by k over the water column h, so
// that the pressure and bed-slope terms see the surface eta + k (a lake at
// rest has eta + k uniform) while the water held stays h. Formats: 0 a
// constant (constant_value), 1 and 3 a file read at every time (a point
// series for the whole mesh or a map), 2 a file read once.
struct HdDepthCorrection {
  int type = 0;  // 0 none, >= 1 correction included
  DataSpec data;
};

// ICE: concentration (fraction) and/or thickness (m) per element. The
// concentration shelters the water from the wind: up to c_cut_off_lower the
// wind acts fully, above c_cut_off not at all, in between its components are
// scaled by sqrt(1 - (c - c_l) / (c_u - c_l)). An ice-covered element (thickness
// above thickness_cut_off; without thickness data, a concentration above
// c_cut_off) has the surface drag c_f,s = K_s / h^(1/3) of the ice roughness
// (subsection ROUGHNESS: roughness height k_s, K_s = g k_s^(1/3) / 25.4^2).
struct HdIce {
  int type = 0;  // 0 none, 1 concentration, 2 thickness, 3 both
  double thickness_cut_off = 1e-6;
  double c_cut_off = 0.9, c_cut_off_lower = 0.9;
  // Components of data: concentration (types 1, 3) first, then thickness
  // (types 2, 3); formats as for DEPTH.
  DataSpec data;
  int roughness_type = 0;  // 0 roughness height k_s (m)
  ElementField roughness;
  // Per element: the values read, the wind factor (1 open water, 0 no wind)
  // and the ice-cover factor (1 covered, 0 open) of the last update.
  Array1<double> concentration, thickness, wind_factor, cover;
  bool Concentration() const { return type == 1 || type == 3; }
  bool Thickness() const { return type == 2 || type == 3; }
};

// RADIATION_STRESS: type 1 reads the wave radiation stresses Sxx, Sxy, Syy
// (N/m), type 3 the force components (N/m2), from a map varying in time and
// domain (format 3), brought up from 0 by a sine soft start over
// soft_time_interval. The momentum term of a wet element is the force over
// rho0: -(dSxx/dx + dSxy/dy, dSxy/dx + dSyy/dy) / rho0 for type 1, with the
// face-difference gradient of the other forcings (a uniform stress gives no
// force), the components as read over rho0 for type 3.
struct HdRadiationStress {
  int type = 0;  // 0 none, 1 stresses, 3 force components
  int format = 1;
  DataSpec data;
  Array1<double> sxx, sxy, syy;  // type 1 (N/m)
  Array1<double> fx, fy;         // type 3 (N/m2)
};

struct HdForcing {
  HdWindForcing wind;
  HdCoriolis coriolis;
  HdTidalPotential tide;
  HdDepthCorrection depth;
  HdIce ice;
  HdRadiationStress radiation;
  // Gradient weights, in the element face layout of the mesh (face_start):
  // the neighbour across (0 on the boundary or beyond the local mesh) and
  // n_x len / (2 A), n_y len / (2 A) out of the element (1/m).
  Array1<int> grad_neighbour;
  Array1<double> grad_wx, grad_wy;
  bool prepared = false;
};

// ---- setup ------------------------------------------------------------------

// Section readers (inside HYDRODYNAMIC_MODULE, the current section), with
// their checks and messages. A run without the CORIOLIS section has no
// Coriolis force; a CORIOLIS section without a type has type 2.
void SetupCoriolisHD(HdModule& hd);
void SetupWindHD(HdModule& hd);
void SetupTideHD(HdModule& hd);
// DEPTH ("SetupDepth do not support discretization=1" with separate meshes),
// ICE and RADIATION_STRESS; their data files are opened on the mesh.
void SetupDepthHD(HdModule& hd, const Mesh& mesh);
void SetupIceHD(HdModule& hd, const Mesh& mesh);
void SetupRadiationStressHD(HdModule& hd, const Mesh& mesh);
void CloseForcingDataHD(HdModule& hd);

// Whether any of the forcings is on.
bool ForcingActiveHD(const HdModule& hd);

// Mesh-dependent forcing data and the element source terms; called at the
// end of SetupSolverHD. Stops the run on a projection a forcing cannot use
// ("NON-UTM not allowed in case of coriolis forcing", "SetupTide: wrong
// projection"). Does nothing when no forcing is on.
void PrepareForcingHD(HdModule& hd, const Mesh& mesh, HdSolver& solver);

// The arrays of the depth correction, ice and radiation stress for ne
// elements (from PrepareForcingHD).
void PrepareForcingFieldsHD(HdModule& hd, HdSolver& solver, int ne);

// ---- update -------------------------------------------------------------------

// Forcings at time t (s since the simulation start) for a sub-step of dt:
// depth correction, wind, ice, tide, radiation stress, then the momentum
// sources of the owned elements.
void UpdateForcingHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt);

// Wind (UPDATEWIND) at time t: soft start; one wind and stress factor for
// formats 0 and 1; the map and the air pressure per owned element for format
// 3. The stress per element (rotation, friction) is formed with the sources.
void UPDATEWIND(HdModule& hd, double t);
// Tide (UPDATETIDE): the equilibrium tide of the owned elements at time t.
void UPDATETIDE(HdModule& hd, double t);
// Depth correction k at time t into solver.depth_correction (every local
// element: the faces read the neighbours' k).
void UpdateDepthCorrectionHD(HdModule& hd, HdSolver& solver, double t);
// Ice at time t: concentration and thickness, the wind and ice-cover factors
// of the owned elements, and the surface drag of the state at its start.
void UpdateIceHD(HdModule& hd, double t);
// Wind factor of ice concentration c between the cut-offs c_l <= c_u.
double IceWindFactor(double c, double c_l, double c_u);
// Radiation-stress fields at time t (every local element).
void UpdateRadiationStressHD(HdModule& hd, double t);

// Pieces shared with the checks.
// Wind friction coefficient c at wind speed W.
double WindFrictionHD(const HdWindForcing& w, double speed);
// Wind components (east, north) of speed W from direction theta (degrees, where
// the wind comes from, clockwise from north).
void WindComponentsHD(double speed, double direction, double& u, double& v);
// Longitude of the Moon's ascending node (degrees) at T Julian centuries
// from the epoch, in the form of tide type 1 or type 3.
double LunarNodeDegrees(int type, double T);
// The six built-in constituents with V0 + u and the nodal factors of the
// start T (Julian centuries).
std::vector<TidalConstituent> BuiltinConstituents(double T);
// Nodal factor f of built-in constituent k (0 .. 5: M2, S2, N2, K2, K1, O1)
// at node N (rad).
double BuiltinNodalFactor(int k, double N);
// Days from the epoch of the astronomical arguments to a date-time.
double DaysFromTideEpoch(int year, int month, int day, int hour, int minute, double second);
// Latitude function L_s(phi) of species s.
double TideLatitudeFunction(int species, double lat);

}  // namespace vhd
