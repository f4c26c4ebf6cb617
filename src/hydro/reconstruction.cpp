#include "hydro/reconstruction.hpp"

#include "core/omp.hpp"
#include "mesh/gradient.hpp"
#include "mesh/gradient_limiter.hpp"

namespace vhd {

namespace {

// Gradient of one field limited by ENO or the weighted limiter, with the
// wet/dry codes as activity flags: the limiters read the neighbours'
// unlimited gradients from the work arrays.
void LimitedGradient(const HdModule& hd, HdSolver& s, const Mesh& mesh, const Array1<double>& phi,
                     Array1<double>& gx, Array1<double>& gy) {
  CALCGRADIENTELEMENT2D(s.gradient, phi, s.gradient_x, s.gradient_y);
  if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&s.gradient_x, &s.gradient_y});
  CALCLIMITEDGRADIENT2D(hd.solution.gradient_limiter, mesh, phi, hd.state.wetdry, Array1<int>(), s.gradient_x,
                        s.gradient_y, gx, gy, s.limiter_epsilon);
}

}  // namespace

void SetupReconstructionHD(const HdModule& hd, const Mesh& mesh, HdSolver& s) {
  const HdSolutionTechnique& sol = hd.solution;
  // A gradient stencil reaches two rings of neighbours (the second ring
  // where the first is short, at boundaries and for the wider stencils).
  if (hd.subdomain && hd.subdomain->Active() && hd.subdomain->halo_layers < 2)
    FatalError("SetupReconstructionHD: type_of_halo_layer 1 is too thin for the gradients of the "
               "second-order scheme and of the eddy viscosity; use type_of_halo_layer 2");
  // The permanent layout: every element active, every face open.
  SetupGradient(mesh, sol.gradient_calculation, Array1<int>(), Array1<int>(), 2, sol.boundary_correction, 0,
                s.gradient);
  const bool second = sol.scheme_of_space_discretization_horizontal == 2;
  if (second && sol.gradient_limiter == kLimiterBarthJespersen) SetupLimiterGeometry2D(mesh, s.limiter_geometry);
  if (second && (sol.gradient_limiter == kLimiterENO || sol.gradient_limiter == kLimiterWeighted)) {
    s.gradient_x.assign(mesh.elements.nelements, 0.0);
    s.gradient_y.assign(mesh.elements.nelements, 0.0);
  }
}

void UpdateReconstructionHD(HdModule& hd, HdSolver& s, const Mesh& mesh) {
  const HdState& st = hd.state;
  const int limiter = hd.solution.gradient_limiter;
  // With a depth correction k the surface that drives the flow is eta + k;
  // reconstructing its gradient keeps a lake at rest (eta + k uniform) at
  // rest where k varies.
  const Array1<double>* surface = &st.eta;
  if (!s.depth_correction.empty()) {
    const int n = st.nelements;
    const double *eta = st.eta.data(), *k = s.depth_correction.data();
    double* x = s.surface_k.data();
    VHD_OMP_PARALLEL_FOR
    for (int e = 1; e <= n; ++e) x[e] = eta[e] + k[e];
    surface = &s.surface_k;
  }
  if (limiter == kLimiterNone || limiter == kLimiterBarthJespersen) {
    // The three fields in one pass over the stencil and the limiter table.
    const GradientField fields[3] = {
        {surface, &s.eta_x, &s.eta_y}, {&st.P, &s.P_x, &s.P_y}, {&st.Q, &s.Q_x, &s.Q_y}};
    CALCGRADIENTALLELEMENT2D(s.gradient, fields);
    if (limiter == kLimiterBarthJespersen)
      CALCLIMITEDGRADIENTALLBJ2D(s.limiter_geometry, st.wetdry, fields, s.limiter_epsilon);
  } else {
    LimitedGradient(hd, s, mesh, *surface, s.eta_x, s.eta_y);
    LimitedGradient(hd, s, mesh, st.P, s.P_x, s.P_y);
    LimitedGradient(hd, s, mesh, st.Q, s.Q_x, s.Q_y);
  }
  // Gradients are formed for the owned elements; the faces to the halo read
  // the owners' ones.
  if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&s.eta_x, &s.eta_y, &s.P_x, &s.P_y, &s.Q_x, &s.Q_y});
}

void UpdateGradientsHD(HdModule& hd, HdSolver& s, const Mesh& mesh) {
  HdState& st = hd.state;
  CALCGRADIENTVELOCITYELEMENT2D(s.gradient, st.u, st.v, st.ux, st.uy, st.vx, st.vy);
  if (!IsGeographic(mesh.projection)) return;
  // Per radian of longitude and latitude -> per metre east and north.
  const double* cos_lat = mesh.elements.cos_lat.data();
  const int ne = st.nelements_owned;
  for (int e = 1; e <= ne; ++e) {
    const double east = 1.0 / (kMeshEarthRadius * cos_lat[e]), north = 1.0 / kMeshEarthRadius;
    st.ux[e] *= east;
    st.vx[e] *= east;
    st.uy[e] *= north;
    st.vy[e] *= north;
  }
}

}  // namespace vhd
