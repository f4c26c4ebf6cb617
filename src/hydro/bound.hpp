#pragma once
// Hydrodynamic boundary conditions: the open-boundary codes of the mesh turned
// into conditions on the boundary faces of the 2D shallow-water solver.
//
// Boundary codes come from the face codes of the mesh: 1 land, 2 and higher
// open boundaries. Each code 1 .. ncodes has one BoundaryCondition, read from
// the setup section BOUNDARY_CONDITIONS.CODE_<code> of the HD module; every
// boundary face has one BoundaryFaceCondition, in code order and, within a
// code, in the order of the boundary walk (the domain on the left).
//
// Boundary types and what the face carries (components of the value pairs):
//    1, 2  land (closed wall)                        -
//    4     velocity (u, v), m/s                      u, v
//    5     depth-integrated flux (p, q), m2/s        p, q
//    6     surface level, m                          level
//    7     discharge, m3/s; per face the discharge   q (m2/s, positive into
//          per unit width after distribution          the domain)
//    9     transmissive (outgoing characteristics    the data value (unused
//          from inside, the incoming one of the      by the flux), incoming
//          inner state at the start of the run)      characteristic R- (m/s)
//   10     level, weakly reflecting                  level, incoming
//                                                    characteristic R- (m/s),
//                                                    outgoing characteristic
//                                                    R0 of the start (m/s)
//   11     velocity, weakly reflecting               u, v
//   12     Flather (level and velocity)              level, u, v[, Q (m3/s)]
//   15     cyclic (periodic)                         partner element
//
// Value pairs. Component k of a face holds values[2(k-1)] (new: the value at
// the time of the last update, as read) and values[2(k-1)+1] (old: the value
// at the time of the update before, with the corrections of its kind). Every
// update shifts new into old and stores the fresh value as new; then the
// corrections (discharge distribution, level tilting, Flather constraint,
// radiation-stress correction) work on the old values with the state of that
// time, and the face fluxes read the old values. The HD step from t to t + dt
// updates at t + dt, so its fluxes see the boundary at t, consistent with the
// explicit stages; the first update fills both values.
//
// Settings interpreted here where the product leaves them open:
//   - land types 1 and 2 are treated alike; internal_land_boundary_type is
//     kept for the modules that tell them apart;
//   - type_secondary: level (6) 2 = no tangential inflow velocity; discharge
//     (7) 3 = tangential flux from inside also on inflow; other values as 1;
//   - the data value of a transmissive boundary (9) is read (transport reuses
//     the codes) but does not enter the flux. The outer state is not the
//     inner state itself: that condition leaves the incoming characteristic
//     to the boundary element, which on triangles drifts with the flow across
//     the element's inner faces (a simple wave came back at 37 %, and grew
//     without bound at second order). The face keeps the incoming
//     characteristic u_n - 2 sqrt(g h) of its inner element at the first
//     update and forms the outer state as the weakly reflecting level (10)
//     does: waves leave, the state of the start is the water outside;
//   - weakly reflecting level (10): the level is the height of a simple wave
//     that runs into the water outside, R- = R0 - 4 sqrt(g h_l), with R0 the
//     outgoing characteristic u_n + 2 sqrt(g h) of the inner element at the
//     first update (h_l the depth the level gives). Still water at the datum
//     (R0 = 2 sqrt(g d)) would push a lake at rest at any other level into
//     motion: at 1.3 m above the datum the water entered at 0.015 m/s and
//     the level of a closed basin doubled;
//   - discharge (7): the outer depth joins the discharge with the outgoing
//     characteristic u_n + 2c of the inner element (the cubic of approach
//     2), so that the Riemann solver of approaches 1 and 3 sees one wave
//     running into the domain and passes the discharge; where the inner
//     element has no velocity (not wet, or below h_min) every approach
//     writes the flux of that outer state directly (the Riemann solver
//     against a side at rest passed half the discharge onto a dry bed), as
//     do approaches 1 and 3 with Riemann solvers 0 and 4, which do not
//     return the outer flux for a single wave;
//   - the discharge weights use the local conveyance factor 1/sqrt(K) with K
//     the element's bed-resistance coefficient (cf = K h^(-1/3) for Manning
//     types), 1 without bed resistance; the face value q_j = Q w_j / sum(w L)
//     so that the face values carry exactly the discharge Q;
//   - a discharge (7) or level (6, 12) item of format 4 (the soft-start factor
//     itself) is taken as its value, without a further correction; the
//     radiation-stress correction of a discharge boundary has no formula and
//     leaves the discharge alone;
//   - weakly reflecting velocity (11): the data velocity u_d carries the
//     discharge per width -u_d.n d over the still water depth d; the outer
//     depth solves 2 c^3 - R+ c^2 + g d u_d.n = 0 (c = sqrt(g h_b)), the
//     cubic of a discharge boundary; the tangential velocity comes from the
//     data on inflow and from inside on outflow;
//   - type_of_tilting 1 (the only one available) integrates the slope face
//     by face; type_of_relaxation 0 (the only one available) applies no
//     relaxation zone; other values stop the run;
//   - open boundaries carry no diffusive (eddy-viscosity) momentum flux.
//
// Forcing fields of the level tilting and the radiation-stress correction
// (per element, zero until the forcings that fill them run): Coriolis
// parameter, kinematic wind stress, air-pressure gradient and radiation-stress
// force.

#include <string>

#include "core/array1.hpp"
#include "io/dataspec.hpp"

namespace vhd {

struct HdModule;
struct HdSolver;
struct Mesh;
struct BoundaryFaceRecord;

inline constexpr int kBcLand = 1;
inline constexpr int kBcLand2 = 2;
inline constexpr int kBcVelocity = 4;
inline constexpr int kBcFlux = 5;
inline constexpr int kBcLevel = 6;
inline constexpr int kBcDischarge = 7;
inline constexpr int kBcTransmissive = 9;
inline constexpr int kBcLevelWeak = 10;
inline constexpr int kBcVelocityWeak = 11;
inline constexpr int kBcFlather = 12;
inline constexpr int kBcCyclic = 15;

inline constexpr int kBcMaxValues = 8;

// One boundary code.
struct BoundaryCondition {
  int code = 0;
  int type = kBcLand;
  int type_secondary = 1;
  int approach = 1;
  int type_of_vertical_profile = 1;
  int type_of_coriolis_correction = 0;
  int type_of_wind_correction = 0;
  int type_of_tilting = 1;
  int type_of_tilting_point = 1;
  int point_tilting = 1;  // after setup: the chosen tilting face (1 .. nfaces)
  int type_of_pressure_correction = 0;
  int type_of_radiation_stress_correction = 0;
  int code_cyclic = 0;
  int type_interpolation_constrain = 0;
  int type_of_data = 2;
  int ndata = 0;
  DataSpec data[3];
  int data_first_component[3] = {1, 1, 1};  // component of the item's first value
  int type_of_relaxation = 0;
  double distance = 10000.0;  // m
  int first_face = 0;         // first face condition of the code (0: none)
  int nfaces = 0;
  int nsections = 0;          // connected stretches of the code's faces
  // Values of one component at the code's faces, as read (1 .. nfaces).
  Array1<double> buffer;
};

// One boundary face.
struct BoundaryFaceCondition {
  int face = 0;
  int element = 0;  // inner element (element1 of the face)
  int code = 0;
  int type = kBcLand;
  int type_secondary = 1;
  int approach = 1;
  int nvalues = 2;
  double values[kBcMaxValues] = {0, 0, 0, 0, 0, 0, 0, 0};
};

// Component k (from 1) of a face: the new and the old value.
inline double& NewValue(BoundaryFaceCondition& c, int k) { return c.values[2 * (k - 1)]; }
inline double& OldValue(BoundaryFaceCondition& c, int k) { return c.values[2 * (k - 1) + 1]; }
inline double OldValue(const BoundaryFaceCondition& c, int k) { return c.values[2 * (k - 1) + 1]; }
inline double NewValue(const BoundaryFaceCondition& c, int k) { return c.values[2 * (k - 1)]; }

// Per-element forcing fields read by the boundary corrections.
struct BoundaryForcingFields {
  Array1<double> coriolis;                  // Coriolis parameter f (1/s)
  Array1<double> wind_x, wind_y;            // kinematic wind stress tau / rho (m2/s2)
  Array1<double> pressure_x, pressure_y;    // air-pressure gradient (Pa/m)
  Array1<double> radiation_x, radiation_y;  // radiation-stress force / rho, per unit area (m2/s2)
};

struct HdBoundary {
  int internal_land_boundary_type = 1;
  int ncodes = 0;
  Array1<BoundaryCondition> codes;         // 1 .. ncodes
  Array1<BoundaryFaceCondition> faces;     // every boundary face
  Array1<int> face_condition;              // per mesh face: its face condition (0: none)
  BoundaryForcingFields forcing;
  Array1<double> work;                     // along-boundary sums (largest nfaces)
  bool filled = false;                     // the first update fills both values
};

// Reads BOUNDARY_CONDITIONS inside the current setup section (the HD module
// section), checks it, chooses the tilting points and builds the face list
// (CalcFaceBC). A missing section or CODE subsection gives the defaults (a
// land boundary; a warning for an open code). hd supplies the run (processes,
// time axis) and the state's still water depths; mesh is the velocity mesh.
void SetupBoundCondHD(HdModule& hd, const Mesh& mesh, HdBoundary& bc);

// Closes the data files of the boundary codes; each logs its "Data File
// Summary". Called once at the end of the run.
void CloseBoundaryDataHD(HdBoundary& bc);

// Builds the face-condition list from the codes' faces, with the cyclic
// pairing and its checks.
void CalcFaceBC(const Mesh& mesh, HdBoundary& bc);

// Marks the solver's boundary-face records of open codes with their type, so
// that the face loop calls BoundaryFaceFluxHD for them. Called by the solver
// setup; a module without boundary setup keeps every face closed.
void LinkBoundaryFacesHD(const HdBoundary& bc, HdSolver& solver);

// Brings the boundary values to time t (seconds since the simulation start):
// reads every data item at every face, shifts the value pairs, then the
// discharge distribution, the level tilting, the Flather constraint and the
// radiation-stress correction. Runs on the main thread; no allocation.
void UpdateBoundaryValuesHD(HdModule& hd, const Mesh& mesh, double t);

// The corrections, each on the old values of one code (exposed for tests).
void DistributeDischargeHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& code);
void TiltLevelHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& code);
void ConstrainFlatherHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& code);
void CorrectRadiationStressHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& code);

// Contributions of one open boundary face from its face condition: the face
// mass flux and the momentum slots of the inner element in the solver's face
// arrays, and the face flux of the state. Called from the boundary-face loop
// for every face of an open code, whatever the wet/dry code of its element.
// theta (0..1] multiplies the face's flux (mass and momentum, not the bed
// slope) when the outflow of the inner element is limited.
void BoundaryFaceFluxHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, const BoundaryFaceRecord& record,
                        double theta = 1.0);

// Positive root c of 2 c^3 - R c^2 - g q = 0 joining a discharge per width q
// (positive into the domain) with the outgoing characteristic R = u_n + 2c:
// the subcritical (largest) root; c = max(0, R/3) (critical flow) when there
// is none.
double DischargeCelerity(double q, double R, double g);

}  // namespace vhd
