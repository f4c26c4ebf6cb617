#pragma once
// A small HD run without a setup file, for the solver's validation tests: a
// generated mesh, the module settings set in code, the state from a function
// of position, and the HD advance over overall steps.

#include <cmath>
#include <functional>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "hydro/time_step.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"

namespace vhd::test {

struct SwCase {
  Mesh mesh;
  HdModule hd;
  HdSolver solver;
  double t = 0.0;
  int run_status = 0;
};

// Settings of a scheme: first order one stage, or second order two stages
// with the second-order presets.
inline void SetScheme(HdModule& hd, int solver_type, int order) {
  HdSolutionTechnique& s = hd.solution;
  s.type_of_Riemann_solver = solver_type;
  s.type_of_entropy_fix = 1;
  s.scheme_of_space_discretization_horizontal = order;
  s.scheme_of_time_integration = order;
  s.face_value_limiter = order == 2 ? 2 : 0;
  s.preserve_dU = order == 2;
  s.face_average_d = order == 2 ? 1 : 0;
  s.face_limit_dry = order == 2;
  s.type_of_land_condition = 2;
}

inline void SetFloodDry(HdModule& hd, double h_dry, double h_flood, double h_mass) {
  hd.flood_dry.type = 1;
  hd.flood_dry.drying_depth = h_dry;
  hd.flood_dry.flooding_depth = h_flood;
  hd.flood_dry.mass_depth = h_mass;
}

// Completes the filled mesh c.mesh and allocates the state. Defaults: no bed
// resistance, no eddy viscosity, no flooding and drying, CFL 0.9, dt_max =
// overall step.
inline void MakeCaseOnMesh(SwCase& c, double overall_dt) {
  // Validation runs use one thread: the machine is shared, and the thread
  // test sets its own counts.
  OmpSetThreads(1);
  SetupMeshGeometry(c.mesh);
  HdModule& hd = c.hd;
  hd.bed.type = kBedNone;
  hd.eddy.horizontal.type = kEddyNone;
  hd.flood_dry.type = 0;
  hd.overall_dt = overall_dt;
  hd.time_step.CFL_critical_HD = 0.9;
  hd.time_step.dt_max_HD = overall_dt;
  hd.time_step.dt_min_HD = std::min(0.01, overall_dt / 100);
  hd.time_step.CFL_correction_HD = 0;
  hd.flood_dry.elevation_limit = 1e6;
  // As the module setup sets them from the mesh's projection.
  hd.projection = IsGeographic(c.mesh.projection) ? 2 : 1;
  hd.metric_radius = hd.projection == 2 ? kPhysical.earth_radius : 1.0;
  AllocateStateHD(hd, c.mesh);
}

// Generates the mesh (the bed from spec.bed) and makes the case on it.
inline void MakeCase(SwCase& c, const RectangleMeshSpec& spec, double overall_dt) {
  GenerateRectangleMesh(spec, c.mesh);
  MakeCaseOnMesh(c, overall_dt);
}

// Initial surface and velocity as functions of the centroid; depths below
// zero are cut (dry, surface on the bed). Then codes, solver setup and the
// initial step.
inline void StartCase(SwCase& c, const std::function<double(double, double)>& eta0,
                      const std::function<double(double, double)>& u0 = {},
                      const std::function<double(double, double)>& v0 = {}) {
  HdState& st = c.hd.state;
  for (int e = 1; e <= st.nelements; ++e) {
    const double x = c.mesh.elements.xc[e], y = c.mesh.elements.yc[e];
    st.h[e] = std::max(0.0, eta0(x, y) + st.d[e]);
    st.eta[e] = st.h[e] - st.d[e];
    st.u[e] = u0 ? u0(x, y) : 0.0;
    st.v[e] = v0 ? v0(x, y) : 0.0;
  }
  CALCFLUXFROMVELOCITY(st);
  InitialFloodDryCodesHD(c.hd, c.mesh);
  SetupSolverHD(c.hd, c.mesh, c.solver);
  InitialStepHD(c.hd, c.solver, c.mesh);
}

// Advances over overall steps of hd.overall_dt until t_end.
inline void RunTo(SwCase& c, double t_end) {
  const double t0 = c.t, dt = c.hd.overall_dt;
  const int n = static_cast<int>(std::ceil((t_end - t0) / dt - 1e-9));
  for (int k = 1; k <= n && c.run_status >= 0; ++k) {
    const double t1 = k == n ? t_end : t0 + k * dt;
    AdvanceHD(c.hd, c.solver, c.mesh, c.t, t1, c.run_status);
    c.t = t1;
  }
}

// Volume of water sum h A over the owned elements (m3, also on the sphere).
inline double Volume(const SwCase& c) {
  double v = 0.0;
  for (int e = 1; e <= c.hd.state.nelements_owned; ++e) v += c.hd.state.h[e] * ElementAreaMetres(c.mesh, e);
  return v;
}

}  // namespace vhd::test
