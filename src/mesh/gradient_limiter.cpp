// Barth-Jespersen, ENO and weighted gradient limiters.

#include "mesh/gradient_limiter.hpp"

#include <algorithm>
#include <string>

#include "core/omp.hpp"
#include "log/log.hpp"
#include "mesh/gradient_detail.hpp"

namespace vhd {

namespace {

using detail::FlagView;

// Barth-Jespersen over the faces of each element; gz pointers are null in 2D.
template <bool kThree>
void BarthJespersen(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                    const double* gx_in, const double* gy_in, const double* gz_in, double* gx_out,
                    double* gy_out, double* gz_out, double eps) {
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  const FlagView flags(element_flags, Array1<int>());
  const bool geo = IsGeographic(mesh.projection);
  const int n = el.nelements_int > 0 ? el.nelements_int : el.nelements;
  const double* p = phi.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    const double gx = gx_in[e], gy = gy_in[e], gz = kThree ? gz_in[e] : 0.0;
    double alpha = 1.0;
    if (flags.Active(e)) {
      const double pe = p[e];
      double pmax = pe, pmin = pe;
      const int f0 = el.face_start[e], f1 = el.face_start[e + 1];
      for (int q = f0; q < f1; ++q) {
        const int f = el.face_list[q];
        if (f == 0) continue;
        const int nb = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
        if (nb == 0 || !flags.Active(nb)) continue;
        pmax = std::max(pmax, p[nb]);
        pmin = std::min(pmin, p[nb]);
      }
      const double dmax = pmax - pe, dmin = pmin - pe;
      for (int q = f0; q < f1; ++q) {
        const int f = el.face_list[q];
        if (f == 0) continue;
        const int nb = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
        if (nb == 0 || !flags.Active(nb)) continue;
        double d = gx * detail::DeltaX(el.xc[e], fc.xf[f], geo) + gy * (fc.yf[f] - el.yc[e]);
        if (kThree) d += gz * (fc.zf[f] - el.zc[e]);
        double af = 1.0;
        if (d > eps) af = std::min(1.0, dmax / d);
        else if (d < -eps) af = std::min(1.0, dmin / d);
        alpha = std::min(alpha, af);
      }
    }
    gx_out[e] = alpha * gx;
    gy_out[e] = alpha * gy;
    if (kThree) gz_out[e] = alpha * gz;
  }
}

// ENO: the smallest of the candidate gradients (strictly smaller replaces).
template <bool kThree>
void Eno(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags, const double* gx_in,
         const double* gy_in, const double* gz_in, double* gx_out, double* gy_out, double* gz_out) {
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  const FlagView flags(element_flags, face_flags);
  const int n = el.nelements_int > 0 ? el.nelements_int : el.nelements;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    int best = e;
    if (flags.Active(e)) {
      auto size = [&](int c) {
        return gx_in[c] * gx_in[c] + gy_in[c] * gy_in[c] + (kThree ? gz_in[c] * gz_in[c] : 0.0);
      };
      double smallest = size(e);
      for (int q = el.face_start[e]; q < el.face_start[e + 1]; ++q) {
        const int f = el.face_list[q];
        if (f == 0 || !flags.Open(f)) continue;
        const int nb = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
        if (nb == 0 || !flags.Active(nb)) continue;
        const double s = size(nb);
        if (s < smallest) {
          smallest = s;
          best = nb;
        }
      }
    }
    gx_out[e] = gx_in[best];
    gy_out[e] = gy_in[best];
    if (kThree) gz_out[e] = gz_in[best];
  }
}

}  // namespace

void CALCLIMITEDGRADIENTBJ2D(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                             const Array1<double>& gx_in, const Array1<double>& gy_in, Array1<double>& gx_out,
                             Array1<double>& gy_out, double eps) {
  BarthJespersen<false>(mesh, phi, element_flags, gx_in.data(), gy_in.data(), nullptr, gx_out.data(),
                        gy_out.data(), nullptr, eps);
}

void CALCLIMITEDGRADIENTBJ3D(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                             const Array1<double>& gx_in, const Array1<double>& gy_in, const Array1<double>& gz_in,
                             Array1<double>& gx_out, Array1<double>& gy_out, Array1<double>& gz_out, double eps) {
  BarthJespersen<true>(mesh, phi, element_flags, gx_in.data(), gy_in.data(), gz_in.data(), gx_out.data(),
                       gy_out.data(), gz_out.data(), eps);
}

void CALCLIMITEDGRADIENTENO2D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                              const Array1<double>& gx_in, const Array1<double>& gy_in, Array1<double>& gx_out,
                              Array1<double>& gy_out) {
  Eno<false>(mesh, element_flags, face_flags, gx_in.data(), gy_in.data(), nullptr, gx_out.data(), gy_out.data(),
             nullptr);
}

void CALCLIMITEDGRADIENTENO3D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                              const Array1<double>& gx_in, const Array1<double>& gy_in,
                              const Array1<double>& gz_in, Array1<double>& gx_out, Array1<double>& gy_out,
                              Array1<double>& gz_out) {
  Eno<true>(mesh, element_flags, face_flags, gx_in.data(), gy_in.data(), gz_in.data(), gx_out.data(),
            gy_out.data(), gz_out.data());
}

void CALCLIMITEDGRADIENTSIMPLE2D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                                 const Array1<double>& gx_in, const Array1<double>& gy_in, Array1<double>& gx_out,
                                 Array1<double>& gy_out) {
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  const FlagView flags(element_flags, face_flags);
  const int n = el.nelements_int > 0 ? el.nelements_int : el.nelements;
  const double* gx = gx_in.data();
  const double* gy = gy_in.data();
  double* ox = gx_out.data();
  double* oy = gy_out.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    if (!flags.Active(e)) {
      ox[e] = gx[e];
      oy[e] = gy[e];
      continue;
    }
    int cand[kMaxElementFaces];
    int m = 0;
    for (int q = el.face_start[e]; q < el.face_start[e + 1] && m < kMaxElementFaces; ++q) {
      const int f = el.face_list[q];
      if (f == 0) continue;
      const int nb = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
      cand[m++] = (nb > 0 && flags.Open(f) && flags.Active(nb)) ? nb : e;
    }
    double s[kMaxElementFaces];
    for (int i = 0; i < m; ++i) s[i] = 0.5 * (gx[cand[i]] * gx[cand[i]] + gy[cand[i]] * gy[cand[i]]);
    double sw = 0, ax = 0, ay = 0;
    for (int i = 0; i < m; ++i) {
      double w = 1.0;
      for (int j = 0; j < m; ++j)
        if (j != i) w *= s[j];
      w += 0.0001;
      sw += w;
      ax += w * gx[cand[i]];
      ay += w * gy[cand[i]];
    }
    ox[e] = m > 0 ? ax / sw : gx[e];
    oy[e] = m > 0 ? ay / sw : gy[e];
  }
}

void CALCLIMITEDGRADIENT2D(int code, const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                           const Array1<int>& face_flags, const Array1<double>& gx_in, const Array1<double>& gy_in,
                           Array1<double>& gx_out, Array1<double>& gy_out, double eps) {
  switch (code) {
    case kLimiterNone: {
      const int n = mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
      if (&gx_out != &gx_in) std::copy(gx_in.data() + 1, gx_in.data() + n + 1, gx_out.data() + 1);
      if (&gy_out != &gy_in) std::copy(gy_in.data() + 1, gy_in.data() + n + 1, gy_out.data() + 1);
      return;
    }
    case kLimiterENO:
      CALCLIMITEDGRADIENTENO2D(mesh, element_flags, face_flags, gx_in, gy_in, gx_out, gy_out);
      return;
    case kLimiterWeighted:
      CALCLIMITEDGRADIENTSIMPLE2D(mesh, element_flags, face_flags, gx_in, gy_in, gx_out, gy_out);
      return;
    case kLimiterBarthJespersen:
      CALCLIMITEDGRADIENTBJ2D(mesh, phi, element_flags, gx_in, gy_in, gx_out, gy_out, eps);
      return;
    default:
      StopRun(SubstituteValue("Type not supported for gradient limiter: %", code));
  }
}

void CALCLIMITEDGRADIENT3D(int code, const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                           const Array1<int>& face_flags, const Array1<double>& gx_in, const Array1<double>& gy_in,
                           const Array1<double>& gz_in, Array1<double>& gx_out, Array1<double>& gy_out,
                           Array1<double>& gz_out, double eps) {
  switch (code) {
    case kLimiterNone: {
      const int n = mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
      if (&gx_out != &gx_in) std::copy(gx_in.data() + 1, gx_in.data() + n + 1, gx_out.data() + 1);
      if (&gy_out != &gy_in) std::copy(gy_in.data() + 1, gy_in.data() + n + 1, gy_out.data() + 1);
      if (&gz_out != &gz_in) std::copy(gz_in.data() + 1, gz_in.data() + n + 1, gz_out.data() + 1);
      return;
    }
    case kLimiterENO:
      CALCLIMITEDGRADIENTENO3D(mesh, element_flags, face_flags, gx_in, gy_in, gz_in, gx_out, gy_out, gz_out);
      return;
    case kLimiterWeighted:
      FatalError("Simple limiter not implemented in 3D");
    case kLimiterBarthJespersen:
      CALCLIMITEDGRADIENTBJ3D(mesh, phi, element_flags, gx_in, gy_in, gz_in, gx_out, gy_out, gz_out, eps);
      return;
    default:
      StopRun(SubstituteValue("Type not supported for gradient limiter: %", code));
  }
}

}  // namespace vhd
