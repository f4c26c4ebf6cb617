#include "hydro/reconstruction.hpp"

#include "mesh/gradient.hpp"
#include "mesh/gradient_limiter.hpp"

namespace vhd {

namespace {

// Gradient of one field, limited with the wet/dry codes as activity flags.
// Barth-Jespersen scales in place; ENO and the weighted limiter read the
// neighbours' unlimited gradients from the work arrays.
void LimitedGradient(const HdModule& hd, HdSolver& s, const Mesh& mesh, const Array1<double>& phi,
                     Array1<double>& gx, Array1<double>& gy) {
  const int limiter = hd.solution.gradient_limiter;
  const Array1<int>& active = hd.state.wetdry;
  switch (limiter) {
    case kLimiterNone:
      CALCGRADIENTELEMENT2D(s.gradient, phi, gx, gy);
      return;
    case kLimiterBarthJespersen:
      CALCGRADIENTELEMENT2D(s.gradient, phi, gx, gy);
      CALCLIMITEDGRADIENTBJ2D(mesh, phi, active, gx, gy, gx, gy, s.limiter_epsilon);
      return;
    default:
      CALCGRADIENTELEMENT2D(s.gradient, phi, s.gradient_x, s.gradient_y);
      CALCLIMITEDGRADIENT2D(limiter, mesh, phi, active, Array1<int>(), s.gradient_x, s.gradient_y, gx, gy,
                            s.limiter_epsilon);
      return;
  }
}

}  // namespace

void SetupReconstructionHD(const HdModule& hd, const Mesh& mesh, HdSolver& s) {
  const HdSolutionTechnique& sol = hd.solution;
  // The permanent layout: every element active, every face open.
  SetupGradient(mesh, sol.gradient_calculation, Array1<int>(), Array1<int>(), 2, sol.boundary_correction, 0,
                s.gradient);
  const bool second = sol.scheme_of_space_discretization_horizontal == 2;
  if (second && (sol.gradient_limiter == kLimiterENO || sol.gradient_limiter == kLimiterWeighted)) {
    s.gradient_x.assign(mesh.elements.nelements, 0.0);
    s.gradient_y.assign(mesh.elements.nelements, 0.0);
  }
}

void UpdateReconstructionHD(HdModule& hd, HdSolver& s, const Mesh& mesh) {
  const HdState& st = hd.state;
  LimitedGradient(hd, s, mesh, st.eta, s.eta_x, s.eta_y);
  LimitedGradient(hd, s, mesh, st.P, s.P_x, s.P_y);
  LimitedGradient(hd, s, mesh, st.Q, s.Q_x, s.Q_y);
}

void UpdateGradientsHD(HdModule& hd, HdSolver& s, const Mesh& mesh) {
  (void)mesh;
  HdState& st = hd.state;
  CALCGRADIENTVELOCITYELEMENT2D(s.gradient, st.u, st.v, st.ux, st.uy, st.vx, st.vy);
}

}  // namespace vhd
