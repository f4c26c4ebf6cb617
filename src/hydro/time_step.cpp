#include "hydro/time_step.hpp"

#include <algorithm>
#include <cmath>

#include "core/omp.hpp"
#include "hydro/reconstruction.hpp"
#include "log/log.hpp"

namespace vhd {

namespace {

constexpr double kRadToDeg = 57.29577951308232;

// CFL rate of one element (1/s): (|u| + |v| + 2 sqrt(g h)) / length (without
// the gravity wave when it is not part of the explicit step); -1 where the
// element is not wet or has no depth.
inline double CflRate(int code, double eta, double d, double u, double v, double length, bool gravity) {
  const double h = eta + d;
  if (code != kWet || !(h > 0)) return -1.0;
  return (std::abs(u) + std::abs(v) + (gravity ? 2.0 * std::sqrt(kPhysical.g * h) : 0.0)) / length;
}

// The end of a sub-step in one pass over the elements: the velocities from
// the fluxes (every element, halo included, as CALCVELOCITYFROMFLUX), the bed
// shear stress of the new state and the CFL rates of the next step (owned
// elements, as CALCBEDSHEARSTRESS and CalcCflRatesHD), and the blow-up test
// of CheckBlowUpHD. Returns true when an owned element fails that test, so
// that CheckBlowUpHD walks the elements only then; rmax is the largest rate.
bool VelocityStressAndBlowUpTest(HdModule& hd, const HdSolver& solver, double& rmax) {
  HdState& st = hd.state;
  const int ne = st.nelements_local, nown = st.nelements_owned;
  const double limit = hd.flood_dry.elevation_limit;
  const bool depth_test = hd.flood_dry.type <= 0;
  const bool gravity = solver.implicit_gravity == 0;
  const int* code = st.wetdry.data();
  const double* h = st.h.data();
  const double* eta = st.eta.data();
  const double* d = st.d.data();
  const double* P = st.P.data();
  const double* Q = st.Q.data();
  const double* cf = st.cf.data();
  const double* length = st.length.data();
  double* u = st.u.data();
  double* v = st.v.data();
  double* tau_x = st.tau_x.data();
  double* tau_y = st.tau_y.data();
  double* rate = st.cfl_rate.data();
  int failed = 0;
  double r = 0.0;
  // The owned elements in vector lanes, then the velocities of the halo.
  VHD_OMP_PARALLEL_FOR_SIMD_REDUCTION(max, failed, r)
  for (int e = 1; e <= nown; ++e) {
    const double ue = VelocityFromFluxHD(code[e], h[e], P[e]);
    const double ve = VelocityFromFluxHD(code[e], h[e], Q[e]);
    u[e] = ue;
    v[e] = ve;
    BedShearStressHD(cf[e], ue, ve, tau_x[e], tau_y[e]);
    const double re = CflRate(code[e], eta[e], d[e], ue, ve, length[e], gravity);
    rate[e] = re;
    r = std::max(r, re);
    const bool bad = (!(eta[e] <= limit)) | (depth_test & (!(h[e] > 0.0)));
    failed = std::max(failed, bad ? 1 : 0);
  }
  for (int e = nown + 1; e <= ne; ++e) {
    u[e] = VelocityFromFluxHD(code[e], h[e], P[e]);
    v[e] = VelocityFromFluxHD(code[e], h[e], Q[e]);
  }
  rmax = r;
  return failed != 0;
}

}  // namespace

double CalcCflRatesHD(HdModule& hd, const HdSolver& solver, const Mesh& mesh) {
  HdState& st = hd.state;
  const int ne = st.nelements_owned;
  const bool gravity = solver.implicit_gravity == 0;
  (void)mesh;
  double rmax = 0.0;
  VHD_OMP_PARALLEL_FOR_REDUCTION(max, rmax)
  for (int e = 1; e <= ne; ++e) {
    st.cfl_rate[e] = CflRate(st.wetdry[e], st.eta[e], st.d[e], st.u[e], st.v[e], st.length[e], gravity);
    rmax = std::max(rmax, st.cfl_rate[e]);
  }
  return rmax;
}

double SplitTimeStepHD(double dt, double remainder) {
  const double reduced = remainder - 1e-6 * remainder;
  if (dt > reduced) return remainder;
  return remainder / (std::floor(reduced / dt) + 1.0);
}

double CALCTIMESTEPHD(HdModule& hd, const HdSolver& solver, const Mesh& mesh, double t, double t_end) {
  const HdTimeStepControl& c = hd.time_step;
  // The rates of the state left by the last sub-step come with its end pass.
  double rmax = hd.cfl_rate_max_ready >= 0 ? hd.cfl_rate_max_ready : CalcCflRatesHD(hd, solver, mesh);
  if (hd.subdomain) rmax = MaxOverProcesses(rmax, *hd.subdomain);
  hd.cfl_rate_max_ready = -1.0;
  hd.cfl_rate_max_of_step = rmax;
  double dt;
  if (c.CFL_critical_HD / c.dt_max_HD > rmax) {
    dt = c.dt_max_HD;
  } else {
    dt = std::max(c.dt_min_HD, c.CFL_critical_HD / rmax);
  }
  return SplitTimeStepHD(dt, t_end - t);
}

void CHECKTIMESTEPHD(HdModule& hd, const Mesh& mesh, double dt) {
  HdState& st = hd.state;
  const int ne = st.nelements_owned;
  const double g = kPhysical.g;
  (void)mesh;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    const double h = st.h[e];
    if (st.wetdry[e] != kWet || h <= 0) continue;
    const double u = st.P[e] / h, v = st.Q[e] / h;
    const double c = std::sqrt(g * h);
    const double s = std::abs(u) + std::abs(v);
    const double L = st.length[e];
    if ((s + 2.0 * c) * dt / L > 1.0) {
      const double a = L / (2.0 * dt) - 2.0 * c;
      if (s > 1e-6 && a > 0) {
        st.P[e] *= a / s;
        st.Q[e] *= a / s;
      } else {
        st.P[e] = st.Q[e] = 0.0;
      }
    }
  }
}

void ReportCflViolations(std::string_view title, const Mesh& mesh, const Array1<double>& cfl_rate,
                         const Array1<int>& code, const Array1<double>* still_depth,
                         const Array1<double>& length, double t, double dt, long long& count, int maximum,
                         int error_level) {
  const int ne = mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
  const bool geographic = IsGeographic(mesh.projection);
  const double scale = geographic ? kRadToDeg : 1.0;
  bool violated = false;
  const ElementTable& el = mesh.elements;
  for (int e = 1; e <= ne; ++e) {
    const double cfl = CflNumber(cfl_rate[e], dt);
    if (code[e] != kWet || !(cfl > 1.00001)) continue;
    violated = true;
    ++count;
    if (count <= maximum) {
      Warning(title);
      WriteValueLine("time                  : %", t);
      WriteValueLine("time step interval    : %", dt);
      WriteValueLine("element number        : %", el.id[e]);
      WriteValueLine("CFL number            : %", cfl);
      WriteValueLine("x-coordinate (center) : %", mesh.elements.xc[e] * scale);
      WriteValueLine("y-coordinate (center) : %", mesh.elements.yc[e] * scale);
      if (still_depth) WriteValueLine("still water depth     : %", (*still_depth)[e]);
      WriteValueLine("length                : %", length[e]);
    }
    if (count == maximum) Warning("Number of CFL condition violations is larger than 200");
  }
  if ((error_level == 1 && count > maximum) || (error_level == 2 && violated)) {
    FatalError("Simulation stopped due to CFL violation");
  }
}

void InitialStepHD(HdModule& hd, HdSolver& solver, const Mesh& mesh) {
  HdState& st = hd.state;
  CALCVELOCITYFROMFLUX(st);
  for (int f = 1; f <= st.face_flux_len.size(); ++f) st.face_flux_len[f] = 0.0;
  // Forcings and boundary values at the first time of the run (both values
  // of each boundary pair).
  const double t0 = hd.time_axis.TimeOfStep(hd.time_axis.first_step);
  UpdateForcingHD(hd, solver, mesh, t0, hd.time_step.dt_max_HD);
  UpdateBoundaryValuesHD(hd, mesh, t0);
  if (hd.eddy.horizontal.type > 0) {
    UpdateGradientsHD(hd, solver, mesh);
    if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&st.ux, &st.uy, &st.vx, &st.vy});
  }
  CalcDerivativesOnlySW2D(hd, solver, mesh);
}

void StepHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt, int& run_status) {
  HdState& st = hd.state;
  TimingSet& timing = hd.timing;
  const bool timed = !timing.timers.empty();
  auto start = [&](int k) { if (timed) StartTiming(timing, k); };
  auto stop = [&](int k) { if (timed) StopTiming(timing, k); };
  start(kHdTimerTotal);

  RecordTimeStepHD(hd, dt);
  // CFL numbers: the elements are scanned only when the largest rate of the
  // state violates the condition (no CFL number exceeds its one, rounding
  // being monotonic), and the report walks them again only when one of them
  // is violated.
  const int ne = st.nelements_owned;
  int violated = 0;
  const double rate_max = hd.cfl_rate_max_of_step;
  hd.cfl_rate_max_of_step = -1.0;
  if (!(rate_max >= 0 && CflNumber(rate_max, dt) <= 1.00001)) {
    VHD_OMP_PARALLEL_FOR_SIMD_REDUCTION(max, violated)
    for (int e = 1; e <= ne; ++e) {
      const bool over = (CflNumber(st.cfl_rate[e], dt) > 1.00001) & (st.wetdry[e] == kWet);
      violated = std::max(violated, over ? 1 : 0);
    }
  }
  if (violated) {
    ReportCflViolations("CFL condition violated in HD calculation", mesh, st.cfl_rate, st.wetdry, &st.d, st.length,
                        t, dt, hd.n_cfl_violations, hd.time_step.maximum_number_of_errors,
                        hd.time_step.error_level);
  }
  const double t_new = t + dt;

  start(kHdTimerForcings);
  // The forcings first: the level tilting of the boundaries reads them.
  UpdateForcingHD(hd, solver, mesh, t_new, dt);
  UpdateBoundaryValuesHD(hd, mesh, t_new);
  if (hd.sources.Active() || hd.precipitation.Active()) {
    // Sources before precipitation and evaporation, whose limit counts
    // what the sources bring.
    // The forcings set the momentum terms of every owned element; the
    // sources and precipitation add theirs.
    ClearElementSources(solver, st.nelements_owned, !ForcingActiveHD(hd));
    UpdateSourcesHD(hd, solver, mesh, t_new, dt);
    UpdatePrecipitationHD(hd, solver, mesh, t_new, dt);
  }
  stop(kHdTimerForcings);

  start(kHdTimerProperties);
  CALCRESISTANCEBED(hd, mesh, t_new);
  if (hd.eddy.horizontal.type > 0) {
    UpdateGradientsHD(hd, solver, mesh);
    CALCEDDYVISCOSITYHD(hd, mesh);
    if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&st.ux, &st.uy, &st.vx, &st.vy, &st.nu_t});
  }
  stop(kHdTimerProperties);

  const bool two_stage = hd.solution.scheme_of_time_integration == 2;
  const bool second = hd.solution.scheme_of_space_discretization_horizontal == 2;
  const int nstages = two_stage ? 2 : 1;
  for (int stage = 1; stage <= nstages; ++stage) {
    const double factor = (two_stage && stage == 1) ? 0.5 : 1.0;
    start(kHdTimerDerivatives);
    if (second) UpdateReconstructionHD(hd, solver, mesh);
    CALCDERIVATIVESW2D(hd, solver, mesh, stage, factor * dt, stage == nstages);
    stop(kHdTimerDerivatives);
    if (second && hd.solution.type_of_filtering >= 1) {
      // The filter averages over the neighbours' new state.
      if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&st.h, &st.eta, &st.P, &st.Q});
      CALCVELOCITYFILTER2D(hd, solver, mesh);
    }
    // The next stage reads the halo's new state.
    if (hd.subdomain && stage < nstages) ExchangeHalo(*hd.subdomain, {&st.h, &st.eta, &st.P, &st.Q});
  }

  start(kHdTimerFloodDry);
  if (hd.time_step.CFL_correction_HD == 1) CHECKTIMESTEPHD(hd, mesh, dt);
  CHECKFLOODDRYHD(hd, mesh);
  if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&st.h, &st.eta, &st.P, &st.Q}, {&st.wetdry});
  double rmax = 0.0;
  int failed = VelocityStressAndBlowUpTest(hd, solver, rmax) ? 1 : 0;
  if (hd.subdomain) failed = MaxOverProcesses(failed, *hd.subdomain);
  if (failed) {
    int status = 0;
    if (!CheckBlowUpHD(hd, mesh, t_new, &status)) run_status = -1;
  }
  hd.cfl_rate_max_ready = rmax;
  stop(kHdTimerFloodDry);
  stop(kHdTimerTotal);
}

void AdvanceHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t0, double t1, int& run_status) {
  double t = t0;
  while (std::abs(t1 - t) > 1e-6) {
    const double dt = CALCTIMESTEPHD(hd, solver, mesh, t, t1);
    StepHD(hd, solver, mesh, t, dt, run_status);
    t += dt;
    if (run_status < 0) return;
  }
}

}  // namespace vhd
