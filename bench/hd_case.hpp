#pragma once
// The HD case every benchmark times against: a square basin of random
// jittered triangles (2 n^2 elements) with a sloping bed and a tilted
// surface, so that every face carries flow; first order (one stage) or
// second order (two stages, the engine's limiters). Benchmarks of other
// modules build on it and state their cost relative to its step.

#include <cmath>
#include <functional>
#include <memory>

#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "hydro/time_step.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"

namespace vhd::bench {

struct HdCase {
  Mesh mesh;
  HdModule hd;
  HdSolver solver;
};

// prepare, when given, adds settings to the module once its state is
// allocated and before the solver is set up (forcings, sources).
inline std::unique_ptr<HdCase> MakeHdCase(
    int elements, int order, const std::function<void(HdModule&, const Mesh&)>& prepare = {}) {
  auto c = std::make_unique<HdCase>();
  RectangleMeshSpec spec;
  const int n = static_cast<int>(std::lround(std::sqrt(elements / 2.0)));
  spec.nx = spec.ny = n;
  spec.x1 = spec.y1 = n * 10.0;
  spec.layout = CellLayout::kRandomTriangles;
  spec.jitter = 0.2;
  spec.bed = [](double x, double) { return -5.0 - 1e-4 * x; };
  GenerateRectangleMesh(spec, c->mesh);
  SetupMeshGeometry(c->mesh);
  HdModule& hd = c->hd;
  hd.bed.type = kBedNone;
  hd.eddy.horizontal.type = kEddyNone;
  hd.time_step.dt_max_HD = 1e9;
  // The engine's usual setting; the cost per element-stage does not depend on it.
  hd.time_step.CFL_critical_HD = 0.8;
  hd.flood_dry.elevation_limit = 1e6;
  HdSolutionTechnique& s = hd.solution;
  s.type_of_Riemann_solver = 1;
  s.scheme_of_space_discretization_horizontal = order;
  s.scheme_of_time_integration = order;
  s.face_value_limiter = order == 2 ? 2 : 0;
  s.gradient_limiter = order == 2 ? 3 : 0;
  s.preserve_dU = order == 2;
  s.face_average_d = order == 2 ? 1 : 0;
  s.face_limit_dry = order == 2;
  AllocateStateHD(hd, c->mesh);
  HdState& st = hd.state;
  for (int e = 1; e <= st.nelements; ++e) {
    st.eta[e] = 0.1 * std::sin(c->mesh.elements.xc[e] / spec.x1 * 6.283);
    st.h[e] = st.eta[e] + st.d[e];
  }
  if (prepare) prepare(hd, c->mesh);
  InitialFloodDryCodesHD(hd, c->mesh);
  SetupSolverHD(hd, c->mesh, c->solver);
  InitialStepHD(hd, c->solver, c->mesh);
  return c;
}

}  // namespace vhd::bench
