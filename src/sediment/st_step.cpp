// The sub-step of the sand-transport module: inputs of the bed load from the
// flow, the bed load, and the bed update handed to the hydrodynamics.

#include <algorithm>
#include <cmath>

#include "core/omp.hpp"
#include "hydro/bed_change.hpp"
#include "sediment/st_module.hpp"

namespace vhd {

double StreamlineCurvature(double u, double v, double ux, double uy, double vx, double vy) {
  const double speed2 = u * u + v * v;
  if (!(speed2 > 0.0)) return 0.0;
  // Rate of turning of the flow direction atan2(v, u) along the streamline.
  return (u * (u * vx - v * ux) + v * (u * vy - v * uy)) / (speed2 * std::sqrt(speed2));
}

void CalcBedLoadInputsST(StModule& st, const HdModule& hd) {
  const HdState& s = hd.state;
  const int nown = st.nowned;
  // The bed level is -d: its gradient is minus that of d (exactly).
  CALCGRADIENTELEMENT2D(st.stencil, s.d, st.depth_x, st.depth_y);
  const bool helical = st.helical_flow == 1;
  if (helical) CALCGRADIENTVELOCITYELEMENT2D(st.stencil, s.u, s.v, st.ux, st.uy, st.vx, st.vy);
  const double coefficient = st.helical_coefficient;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    const double u = s.u[e], v = s.v[e];
    const double speed = std::sqrt(u * u + v * v);
    if (s.wetdry[e] < 1 || !(speed > 0.0)) {
      st.sl[e] = 0.0;
      st.st[e] = 0.0;
      st.tan_delta[e] = 0.0;
      continue;
    }
    // Along the flow, and to its left (the normal (-v, u)).
    const double bx = -st.depth_x[e], by = -st.depth_y[e];
    st.sl[e] = (bx * u + by * v) / speed;
    st.st[e] = (by * u - bx * v) / speed;
    st.tan_delta[e] =
        helical ? coefficient * s.h[e] * StreamlineCurvature(u, v, st.ux[e], st.uy[e], st.vx[e], st.vy[e]) : 0.0;
  }
}

void CalcBedLoadST(StModule& st, const HdModule& hd) {
  const HdState& s = hd.state;
  BedLoadInputs in;
  in.wet = s.wetdry.data();
  in.u = s.u.data();
  in.v = s.v.data();
  in.friction = s.cf.data();
  in.depth = s.h.data();
  in.grain = st.grain_format == 2 ? st.grain_terms.data() : nullptr;
  in.grain_constant = st.grain_terms_constant;
  in.streamwise_slope = st.sl.data();
  in.transverse_slope = st.st.data();
  in.tan_delta = st.tan_delta.data();
  CALCBEDLOADCURRENT(st.bed_load, in, st.nowned, st.qx, st.qy);
}

void CalcBedChangeST(StModule& st, const Mesh& mesh, double dt_morph) {
  if (st.subdomain) ExchangeHalo(*st.subdomain, {&st.qx, &st.qy});
  const FaceTable& faces = mesh.faces;
  const int nown = st.nowned, nlocal = st.nlocal;
  const double* qx = st.qx.data();
  const double* qy = st.qy.data();
  double* face_q = st.face_q.data();
  VHD_OMP_PARALLEL_FOR
  for (int f = 1; f <= st.nfaces; ++f) {
    const int a = faces.element1[f], b = faces.element2[f];
    if (a > nlocal || b > nlocal || (a > nown && (b == 0 || b > nown))) continue;
    const double nx = faces.nx[f], ny = faces.ny[f];
    const double qa = qx[a] * nx + qy[a] * ny;
    double q = 0.0;
    if (b > 0) {
      const double qb = qx[b] * nx + qy[b] * ny;
      const double mean = qa + qb;
      q = mean > 0.0 ? qa : (mean < 0.0 ? qb : 0.0);
    } else if (faces.code[f] >= 2) {
      q = qa;  // open boundary: the element's own bed load passes
    }
    face_q[f] = q * faces.length[f];
  }
  const ElementTable& el = mesh.elements;
  const double factor = dt_morph / (1.0 - st.porosity);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    double out = 0.0;
    const int nf = ElementFaceCount(el, e);
    for (int j = 1; j <= nf; ++j) {
      const int f = ElementFace(el, e, j);
      out += faces.element1[f] == e ? face_q[f] : -face_q[f];
    }
    st.dz[e] = -factor * out / st.area[e];
  }
}

void StepST(StModule& st, HdModule& hd, const Mesh& mesh, double t, double dt) {
  StartTiming(st.timing, kStTimerTotal);
  StartTiming(st.timing, kStTimerInputs);
  CalcBedLoadInputsST(st, hd);
  StopTiming(st.timing, kStTimerInputs);
  StartTiming(st.timing, kStTimerBedLoad);
  CalcBedLoadST(st, hd);
  StopTiming(st.timing, kStTimerBedLoad);
  // The part of the sub-step from the start of the bed update on.
  const double dt_bed = t - std::max(t - dt, st.start_time);
  if (st.morphology == 1 && dt_bed > 0.0) {
    StartTiming(st.timing, kStTimerBedUpdate);
    CalcBedChangeST(st, mesh, st.morphological_factor * dt_bed);
    ApplyBedChangeHD(hd, mesh, st.dz);
    const int nown = st.nowned;
    VHD_OMP_PARALLEL_FOR
    for (int e = 1; e <= nown; ++e) st.bed_change[e] += st.dz[e];
    ++st.n_updates;
    StopTiming(st.timing, kStTimerBedUpdate);
  }
  StopTiming(st.timing, kStTimerTotal);
}

}  // namespace vhd
