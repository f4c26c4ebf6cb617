#include "hydro/reconstruction.hpp"

#include <algorithm>
#include <cmath>

#include "core/omp.hpp"

namespace vhd {

namespace {

// Least-squares gradients of nv fields over the taking-part face neighbours
// of element e, optionally limited (Barth-Jespersen).
template <int nv>
void ElementGradients(const HdSolver& s, const Mesh& mesh, const int* code, const double* const* phi, int e,
                      bool limit, double eps, double* gx, double* gy) {
  const FaceTable& F = mesh.faces;
  const double xe = mesh.elements.xc[e], ye = mesh.elements.yc[e];
  double mxx = 0, mxy = 0, myy = 0;
  double bx[nv] = {}, by[nv] = {};
  int count = 0;
  const int k0 = s.element_face_start[e], k1 = s.element_face_start[e + 1];
  for (int k = k0; k < k1; ++k) {
    const int f = s.element_face_code[k] >> 1;
    const int nb = (s.element_face_code[k] & 1) ? F.element1[f] : F.element2[f];
    if (nb <= 0 || code[nb] == kDry) continue;
    const double dx = mesh.elements.xc[nb] - xe, dy = mesh.elements.yc[nb] - ye;
    const double w = 1.0 / (dx * dx + dy * dy);
    mxx += w * dx * dx;
    mxy += w * dx * dy;
    myy += w * dy * dy;
    for (int v = 0; v < nv; ++v) {
      const double dphi = phi[v][nb] - phi[v][e];
      bx[v] += w * dx * dphi;
      by[v] += w * dy * dphi;
    }
    ++count;
  }
  const double det = mxx * myy - mxy * mxy;
  if (count < 2 || !(det > 1e-10 * (mxx + myy) * (mxx + myy))) {
    for (int v = 0; v < nv; ++v) gx[v] = gy[v] = 0.0;
    return;
  }
  for (int v = 0; v < nv; ++v) {
    gx[v] = (myy * bx[v] - mxy * by[v]) / det;
    gy[v] = (mxx * by[v] - mxy * bx[v]) / det;
  }
  if (!limit) return;
  for (int v = 0; v < nv; ++v) {
    double lo = phi[v][e], hi = phi[v][e];
    for (int k = k0; k < k1; ++k) {
      const int f = s.element_face_code[k] >> 1;
      const int nb = (s.element_face_code[k] & 1) ? F.element1[f] : F.element2[f];
      if (nb <= 0 || code[nb] == kDry) continue;
      lo = std::min(lo, phi[v][nb]);
      hi = std::max(hi, phi[v][nb]);
    }
    double alpha = 1.0;
    for (int k = k0; k < k1; ++k) {
      const int f = s.element_face_code[k] >> 1;
      const bool second_side = s.element_face_code[k] & 1;
      const int nb = second_side ? F.element1[f] : F.element2[f];
      if (nb <= 0 || code[nb] == kDry) continue;
      const double rx = second_side ? s.rx2[f] : s.rx1[f];
      const double ry = second_side ? s.ry2[f] : s.ry1[f];
      const double delta = gx[v] * rx + gy[v] * ry;
      if (delta > eps) {
        alpha = std::min(alpha, (hi - phi[v][e]) / delta);
      } else if (delta < -eps) {
        alpha = std::min(alpha, (lo - phi[v][e]) / delta);
      }
    }
    gx[v] *= alpha;
    gy[v] *= alpha;
  }
}

}  // namespace

void UpdateReconstructionHD(HdModule& hd, HdSolver& s, const Mesh& mesh) {
  HdState& st = hd.state;
  const int ne = st.nelements_owned;
  const int* code = st.wetdry.data();
  const double* phi[3] = {st.eta.data(), st.P.data(), st.Q.data()};
  const bool limit = hd.solution.gradient_limiter == 3;
  const double eps = s.limiter_epsilon;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    double gx[3], gy[3];
    if (code[e] == kDry) {
      gx[0] = gx[1] = gx[2] = gy[0] = gy[1] = gy[2] = 0.0;
    } else {
      ElementGradients<3>(s, mesh, code, phi, e, limit, eps, gx, gy);
    }
    s.eta_x[e] = gx[0], s.eta_y[e] = gy[0];
    s.P_x[e] = gx[1], s.P_y[e] = gy[1];
    s.Q_x[e] = gx[2], s.Q_y[e] = gy[2];
  }
}

void UpdateGradientsHD(HdModule& hd, HdSolver& s, const Mesh& mesh) {
  HdState& st = hd.state;
  const int ne = st.nelements_owned;
  // Velocities of wet elements; others count as not taking part.
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    const bool wet = st.wetdry[e] == kWet && st.h[e] > 0;
    s.filter_u[e] = wet ? st.P[e] / st.h[e] : 0.0;
    s.filter_v[e] = wet ? st.Q[e] / st.h[e] : 0.0;
  }
  const int* code = st.wetdry.data();
  const double* phi[2] = {s.filter_u.data(), s.filter_v.data()};
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) {
    double gx[2] = {0, 0}, gy[2] = {0, 0};
    if (code[e] == kWet) ElementGradients<2>(s, mesh, code, phi, e, false, 0.0, gx, gy);
    st.ux[e] = gx[0], st.uy[e] = gy[0];
    st.vx[e] = gx[1], st.vy[e] = gy[1];
  }
}

}  // namespace vhd
