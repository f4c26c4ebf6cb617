// Time-varying fields of the forcings (see forcing.hpp): the depth
// correction, the ice cover with the surface drag under it, and the wave
// radiation stresses. Each is read at the time of the update onto every
// local element (a halo element gets the same value as on its owner, so the
// face terms and gradients need no exchange); what depends on the state is
// formed for the owned elements.

#include <cmath>

#include "core/omp.hpp"
#include "hydro/forcing.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "hydro/sw_fluxes.hpp"
#include "mesh/femdata.hpp"

namespace vhd {

namespace {

// Component k of a field at time t into out (every element); a value the
// file does not hold (its delete value, not a number) counts as 0.
void ReadField(DataSpec& d, int k, double t, Array1<double>& out) {
  FemDataRead(d, k, t, out);
  const double del = d.state.open ? d.state.file.delete_value : kZrnDefaultDeleteValue;
  const int n = out.size();
  double* v = out.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    if (v[e] == del || !std::isfinite(v[e])) v[e] = 0.0;
  }
}

// Surface drag coefficient K_s of the ice roughness height k_s (m): the
// roughness of the bed resistance, M = 25.4 / k_s^(1/6), K_s = g / M^2.
void IceRoughnessToK(const ElementField& roughness, Array1<double>& K) {
  const int n = K.size();
  for (int e = 1; e <= n; ++e) {
    const double ks = roughness.values[e];
    K[e] = ks > 0.0 ? kPhysical.g * std::cbrt(ks) / (25.4 * 25.4) : 0.0;
  }
}

}  // namespace

void PrepareForcingFieldsHD(HdModule& hd, HdSolver& solver, int ne) {
  HdForcing& f = hd.forcing;
  if (f.depth.type > 0) {
    solver.depth_correction.assign(ne, 0.0);
    solver.surface_k.assign(ne, 0.0);
  }
  HdIce& ice = f.ice;
  if (ice.type > 0) {
    ice.concentration.assign(ne, 0.0);
    ice.thickness.assign(ne, 0.0);
    ice.wind_factor.assign(ne, 1.0);
    ice.cover.assign(ne, 0.0);
    hd.bed.K_surface.assign(ne, 0.0);
    IceRoughnessToK(ice.roughness, hd.bed.K_surface);
  }
  HdRadiationStress& rs = f.radiation;
  if (rs.type == 1) {
    for (Array1<double>* a : {&rs.sxx, &rs.sxy, &rs.syy}) a->assign(ne, 0.0);
  } else if (rs.type == 3) {
    for (Array1<double>* a : {&rs.fx, &rs.fy}) a->assign(ne, 0.0);
  }
}

void UpdateDepthCorrectionHD(HdModule& hd, HdSolver& solver, double t) {
  if (hd.forcing.depth.type == 0) return;
  ReadField(hd.forcing.depth.data, 1, t, solver.depth_correction);
}

double IceWindFactor(double c, double c_l, double c_u) {
  if (c <= c_l) return 1.0;
  if (c > c_u) return 0.0;
  return std::sqrt(1.0 - (c - c_l) / (c_u - c_l));
}

void UpdateIceHD(HdModule& hd, double t) {
  HdIce& ice = hd.forcing.ice;
  if (ice.type == 0) return;
  int k = 1;
  if (ice.Concentration()) ReadField(ice.data, k++, t, ice.concentration);
  if (ice.Thickness()) ReadField(ice.data, k, t, ice.thickness);
  if (UpdateElementFieldHD(ice.roughness, t, "UpdateIceHD")) IceRoughnessToK(ice.roughness, hd.bed.K_surface);
  const int nown = hd.state.nelements_owned;
  const bool concentration = ice.Concentration(), thickness = ice.Thickness();
  const double c_l = ice.c_cut_off_lower, c_u = ice.c_cut_off, cut = ice.thickness_cut_off;
  const double *c = ice.concentration.data(), *th = ice.thickness.data();
  double *wind = ice.wind_factor.data(), *cover = ice.cover.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    wind[e] = concentration ? IceWindFactor(c[e], c_l, c_u) : 1.0;
    cover[e] = (thickness ? th[e] > cut : c[e] > c_u) ? 1.0 : 0.0;
  }
  CALCDRAGCOEFMANNINGSURFACE(hd, ice.cover);
}

void UpdateRadiationStressHD(HdModule& hd, double t) {
  HdRadiationStress& rs = hd.forcing.radiation;
  if (rs.type == 1) {
    ReadField(rs.data, 1, t, rs.sxx);
    ReadField(rs.data, 2, t, rs.sxy);
    ReadField(rs.data, 3, t, rs.syy);
  } else if (rs.type == 3) {
    ReadField(rs.data, 1, t, rs.fx);
    ReadField(rs.data, 2, t, rs.fy);
  }
}

}  // namespace vhd
