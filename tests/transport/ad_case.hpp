#pragma once
// Helpers of the transport tests: a component carried by the real HD solver
// on a generated mesh (boundaries, sources and rain read from a setup text),
// or by a prescribed divergence-free flow built from a stream function, and
// the component's mass and budget.

#include <cmath>
#include <functional>
#include <string>

#include "../hydro/bound_support.hpp"
#include "hydro/forcing_precipitation.hpp"
#include "hydro/sources.hpp"
#include "hydro/time_step.hpp"
#include "transport/ad_solver.hpp"

namespace vhd::test {

// A component on the flow of an HD case.
struct AdCase {
  ~AdCase() {
    SktClose();
    CloseLogFile();
  }

  // Mesh and HD settings (order 1 or 2), then the boundary, source and
  // rain sections of setup_text (inside the HD module section).
  void Make(const RectangleMeshSpec& spec, int hd_order, double overall_dt, int nsteps,
            const std::string& setup_text) {
    MakeCase(c, spec, overall_dt);
    SetScheme(c.hd, 1, hd_order);
    c.hd.time_axis.dt = overall_dt;
    c.hd.time_axis.last_step = nsteps;
    WriteTextFile(setup_path, "[VantorHD]\n" + setup_text);
    SktOpenFile(setup_path, true);
    SktOpenTarget("VantorHD");
    SktOpenSection("HYDRODYNAMIC_MODULE", kNoIndex, nullptr, false);
    SetupBoundCondHD(c.hd, c.mesh, c.hd.boundary);
    SetupPrecipitationHD(c.hd, c.mesh);
    SetupSourcesHD(c.hd, c.mesh);
    SktCloseSection();
  }

  // Initial HD state, the solver and the component with c0(x, y).
  void Start(const AdSolutionTechnique& technique, const std::function<double(double, double)>& eta0,
             const std::function<double(double, double)>& c0) {
    StartCase(c, eta0);
    ad.Setup(c.hd, c.solver, c.mesh, technique);
    AllocateFlowAD(c.hd, flow);
    AllocateComponentAD(c.hd, comp);
    for (int e = 1; e <= c.hd.state.nelements; ++e) comp.c[e] = c0(c.mesh.elements.xc[e], c.mesh.elements.yc[e]);
    BeginFlowAD(c.hd, flow);
    mass0 = Mass();
  }

  // One overall step: HD sub-steps, each followed by the transport.
  void Step() {
    const double t1 = c.t + c.hd.overall_dt;
    while (std::abs(t1 - c.t) > 1e-6 && c.run_status >= 0) {
      const double dt = std::min(CALCTIMESTEPHD(c.hd, c.solver, c.mesh, c.t, t1), t1 - c.t);
      StepHD(c.hd, c.solver, c.mesh, c.t, dt, c.run_status);
      c.t += dt;
      GatherFlowAD(c.hd, c.solver, c.mesh, dt, flow);
      substeps += ad.Step(flow, comp);
      ++hd_steps;
      if (after_substep) after_substep();
    }
  }

  // Mass sum c h A over the owned elements.
  double Mass() const {
    ExactSum m;
    const double* area = ElementAreasHD(c.solver, c.mesh);
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) m.Add(comp.c[e] * c.hd.state.h[e] * area[e]);
    return m.Value();
  }

  // Mass that entered since the start by every booked path.
  double Booked() const {
    ExactSum s;
    s.Add(comp.boundary_inflow);
    s.Subtract(comp.boundary_outflow);
    s.Add(comp.source_inflow);
    s.Subtract(comp.source_outflow);
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) {
      s.Add(comp.clamp_total[e]);
      s.Add(comp.drying_total[e]);
      s.Add(comp.surface_total[e]);
      s.Add(-comp.decay_total[e]);
    }
    return s.Value();
  }

  // Largest |c - value| over the owned elements.
  double Deviation(double value) const {
    double d = 0.0;
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) d = std::max(d, std::abs(comp.c[e] - value));
    return d;
  }

  TempDir dir;
  std::string setup_path = dir.file("model.toml");
  std::string log_path = dir.file("model.log");
  SwCase c;
  AdSolver ad;
  AdFlow flow;
  AdComponent comp;
  double mass0 = 0.0;
  long long substeps = 0, hd_steps = 0;
  std::function<void()> after_substep;
};

// Volume through face f over dt of the depth-integrated flow h (u, v) of
// stream function psi (u = dpsi/dy, v = -dpsi/dx): h (psi(B) - psi(A)) with
// the nodes A, B of the face ordered so that the mesh normal lies to the
// right of A -> B. Exact for a straight face, so every element's faces sum
// to zero up to round-off.
inline double StreamVolume(const Mesh& mesh, int f, double h, double dt,
                           const std::function<double(double, double)>& psi) {
  const FaceTable& F = mesh.faces;
  const NodeTable& N = mesh.nodes;
  int a = FaceNode(F, f, 1), b = FaceNode(F, f, 2);
  const double tx = N.x[b] - N.x[a], ty = N.y[b] - N.y[a];
  if (ty * F.nx[f] - tx * F.ny[f] < 0) std::swap(a, b);
  return h * dt * (psi(N.x[b], N.y[b]) - psi(N.x[a], N.y[a]));
}

// A component on a prescribed flow: an HD case at rest at depth h (for the
// mesh tables) and a flow record of constant depth with the volumes of
// stream function psi over steps of dt.
struct PrescribedCase {
  void Make(const RectangleMeshSpec& spec, double depth, double dt, const std::function<double(double, double)>& psi,
            const AdSolutionTechnique& technique, double cfl_ad) {
    MakeCase(c, spec, dt);
    c.hd.time_step.CFL_critical_AD = cfl_ad;
    c.hd.time_step.dt_max_AD = dt;
    StartCase(c, [](double, double) { return 0.0; });
    for (int e = 1; e <= c.hd.state.nelements; ++e) c.hd.state.h[e] = depth;
    // Every boundary face open: water leaves with the element's
    // concentration and enters with the boundary value (0).
    const FaceTable& F = c.mesh.faces;
    int nb = 0;
    for (int f = 1; f <= F.nfaces; ++f) nb += F.element2[f] == 0 ? 1 : 0;
    c.hd.boundary.faces.assign(nb);
    for (int f = 1, i = 0; f <= F.nfaces; ++f) {
      if (F.element2[f] != 0) continue;
      BoundaryFaceCondition& fc = c.hd.boundary.faces[++i];
      fc.face = f, fc.element = F.element1[f], fc.code = F.code[f], fc.type = kBcLevel;
    }
    ad.Setup(c.hd, c.solver, c.mesh, technique);
    AllocateFlowAD(c.hd, flow);
    AllocateComponentAD(c.hd, comp);
    BeginFlowAD(c.hd, flow);
    flow.dt = dt;
    for (int e = 1; e <= c.hd.state.nelements; ++e) {
      flow.h_start[e] = flow.h_end[e] = depth;
      flow.wetdry[e] = flow.wetdry_end[e] = kWet;
    }
    for (int f = 1; f <= c.mesh.faces.nfaces; ++f)
      flow.face_volume[f] = psi ? StreamVolume(c.mesh, f, depth, dt, psi) : 0.0;
    for (int i = 1; i <= comp.boundary_type.size(); ++i) comp.boundary_type[i] = kAdBoundaryValue;
  }
  void Set(const std::function<double(double, double)>& c0) {
    for (int e = 1; e <= c.hd.state.nelements; ++e) comp.c[e] = c0(c.mesh.elements.xc[e], c.mesh.elements.yc[e]);
  }
  // Integral of c over the domain (times the constant depth: the mass).
  double Integral() const {
    double s = 0.0;
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) s += comp.c[e] * c.mesh.elements.area[e];
    return s;
  }
  // L1 norm of c - exact over the L1 norm of exact.
  double RelativeL1(const std::function<double(double, double)>& exact) const {
    double err = 0.0, norm = 0.0;
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) {
      const double x = exact(c.mesh.elements.xc[e], c.mesh.elements.yc[e]);
      err += std::abs(comp.c[e] - x) * c.mesh.elements.area[e];
      norm += std::abs(x) * c.mesh.elements.area[e];
    }
    return err / norm;
  }
  double Max() const {
    double m = -1e300;
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) m = std::max(m, comp.c[e]);
    return m;
  }
  double Min() const {
    double m = 1e300;
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) m = std::min(m, comp.c[e]);
    return m;
  }
  SwCase c;
  AdSolver ad;
  AdFlow flow;
  AdComponent comp;
};

inline AdSolutionTechnique Technique(int time_integration, int order) {
  AdSolutionTechnique t;
  t.scheme_of_time_integration = time_integration;
  t.scheme_of_space_discretization_horizontal = order;
  return t;
}

}  // namespace vhd::test
