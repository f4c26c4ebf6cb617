#pragma once
// Time integration of the 2D hydrodynamics and its time-step control.
//
// Within one overall time step [t0, t1] of the run the HD state advances with
// variable sub-steps dt chosen from the CFL condition
//     r = (|u| + |v| + 2 sqrt(g h)) / L,   dt = CFL_critical / max r
// (bounded by dt_min_HD and dt_max_HD, and split so that the sub-steps end
// exactly at t1), each with a one-stage (forward Euler) or two-stage
// (midpoint) scheme over the derivatives of CALCDERIVATIVESW2D. After the
// stages the optional CFL correction limits velocities, flooding and drying
// updates the wet/dry codes and the velocities and bed shear stress follow.
//
// Driver entry points, in the order of a run:
//   SetupSolverHD (sw_fluxes.hpp)  after SetupHD, before the time loop
//   InitialStepHD                   after InitialiseStateHD
//   per overall step, until t reaches t1 (to 1e-6 s):
//     dt = CALCTIMESTEPHD(hd, solver, mesh, t, t1)
//     StepHD(hd, solver, mesh, t, dt, run_status); t += dt
//   (AdvanceHD does this loop for runs without other modules)
//   PrintTimeStepStatisticsHD (hd_module.hpp) at the end of the run.

#include <string_view>

#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

// The CFL number assigned where the rate is negative (a single-precision
// constant, as held in double).
inline constexpr double kCflFloor = static_cast<double>(1.0e-35f);

// CFL number of an element of rate r (1/s, negative where not formed) over a
// step dt.
inline double CflNumber(double rate, double dt) { return rate >= 0 ? rate * dt : kCflFloor; }

// CFL rates of the current state into state.cfl_rate (1/s; -1 where the
// element is not wet or has no depth); returns the largest rate (0 when none
// is positive).
double CalcCflRatesHD(HdModule& hd, const HdSolver& solver, const Mesh& mesh);

// Sub-step (s) for the HD time t towards the end of the overall step t_end:
// the CFL step bounded by dt_min and dt_max, then the remainder t_end - t
// taken whole when the step reaches it (to a relative 1e-6), otherwise split
// into equal steps none larger than the CFL step. The rates are those that
// the last StepHD formed for the state it left (hd.cfl_rate_max_ready), else
// CalcCflRatesHD's: code that changes the HD state between StepHD and this
// call sets hd.cfl_rate_max_ready = -1.
double CALCTIMESTEPHD(HdModule& hd, const HdSolver& solver, const Mesh& mesh, double t, double t_end);

// The splitting rule alone: step for a CFL step dt_cfl (already bounded)
// and a remainder R = t_end - t.
double SplitTimeStepHD(double dt_cfl, double remainder);

// CFL correction after the stages: in wet elements whose CFL number with step
// dt exceeds 1, P and Q are scaled so that |u| + |v| = L / (2 dt) - 2 c, or
// set to 0 when that is not positive.
void CHECKTIMESTEPHD(HdModule& hd, const Mesh& mesh, double dt);

// CFL-violation report of one module: every wet element whose CFL number
// (CflNumber of its rate cfl_rate over dt) exceeds 1.00001 increments count; while count <= maximum a warning block names the
// element; the line on the maximum is written once, when count reaches it.
// error_level 1 stops the run once count exceeds maximum, 2 at the first
// violation. still_depth may be null (no depth line); length is the element
// length of the rate (the "length" line). title is the block's
// first line ("CFL condition violated in HD calculation").
void ReportCflViolations(std::string_view title, const Mesh& mesh, const Array1<double>& cfl_rate,
                         const Array1<int>& code, const Array1<double>* still_depth,
                         const Array1<double>& length, double t, double dt, long long& count, int maximum,
                         int error_level);

// Initial step: velocities from the fluxes, face fluxes zeroed, derivatives
// of the initial state.
void InitialStepHD(HdModule& hd, HdSolver& solver, const Mesh& mesh);

// One HD sub-step from t to t + dt: statistics, CFL numbers and report,
// bed resistance, eddy viscosity, the stages, CFL correction, flooding and
// drying, velocities, bed shear stress and the blow-up check. A failure sets
// run_status to -1.
void StepHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt, int& run_status);

// The HD advance over one overall step [t0, t1]; stops at once when a
// sub-step fails (run_status < 0).
void AdvanceHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t0, double t1, int& run_status);

}  // namespace vhd
