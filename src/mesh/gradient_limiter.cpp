// Barth-Jespersen, ENO and weighted gradient limiters.

#include "mesh/gradient_limiter.hpp"

#include <algorithm>
#include <array>
#include <string>
#include <type_traits>
#include <utility>

#include "core/omp.hpp"
#include "log/log.hpp"
#include "mesh/gradient_detail.hpp"

namespace vhd {

namespace {

using detail::FlagView;

// Barth-Jespersen factor from the bounds dmax >= 0, dmin <= 0 of the
// neighbour values about the element's own and the largest rise (>= 0) and
// deepest fall (<= 0) of the extrapolated face increments of the limiting
// faces. This is the minimum over those faces of min(1, dmax / d) (d > eps)
// and min(1, dmin / d) (d < -eps) to the bit: dmax / d falls as d grows and
// a correctly rounded quotient is monotonic, so the smallest quotient is the
// one of the largest rise, and likewise for the falls. A factor of zero is
// +0 whichever bound gave it, so that the limited gradient does not depend
// on the order of the faces.
inline double BarthJespersenFactor(double dmax, double dmin, double rise, double fall, double eps) {
  const double a_rise = rise > eps ? std::min(1.0, dmax / rise) : 1.0;
  const double a_fall = fall < -eps ? std::min(1.0, dmin / fall) : 1.0;
  return std::min(a_rise, a_fall) + 0.0;
}

// Barth-Jespersen factor alpha of one field on element e with unlimited
// gradient (gx, gy): slot j < count is a face towards an active neighbour
// when active[j], with neighbour nb[j] and face-centre offset (dx[j], dy[j]).
[[gnu::always_inline]] inline double BarthJespersenAlpha(const double* p, int e, double gx, double gy, int count,
                                                         const int* nb, const bool* active, const double* dx,
                                                         const double* dy, double eps) {
  const double pe = p[e];
  double pmax = pe, pmin = pe, rise = 0.0, fall = 0.0;
  for (int j = 0; j < count; ++j) {
    if (!active[j]) continue;
    pmax = std::max(pmax, p[nb[j]]);
    pmin = std::min(pmin, p[nb[j]]);
    const double d = gx * dx[j] + gy * dy[j];
    rise = std::max(rise, d);
    fall = std::min(fall, d);
  }
  return BarthJespersenFactor(pmax - pe, pmin - pe, rise, fall, eps);
}

// Raw arrays of n fields limited in one pass (outputs may be the inputs).
template <int n>
struct BarthJespersenFields {
  std::array<const double*, n> phi, gx_in, gy_in;
  std::array<double*, n> gx_out, gy_out;
};

// Barth-Jespersen through the precomputed table, the n fields of a group in
// one pass (the neighbours, their activity and the face offsets are read
// once for all of them). The factor is the one of BarthJespersenAlpha to the
// bit, written as selects (every face evaluated; an inactive face neither
// widens the bounds nor limits) so that the element loop runs in vector
// lanes. kFlags: element flags given (else every element is active).
template <bool kFlags, int n, int kFaces>
void BarthJespersenTableLanes(const LimiterGeometry2D& g, const int* flag, const BarthJespersenFields<n>& f,
                              double eps) {
  const int* neighbour = g.neighbour.data();
  const double* offset_x = g.dx.data();
  const double* offset_y = g.dy.data();
  const int nelements = g.nelements;
  // Local copies of the field pointers: the loop stores through doubles
  // cannot change them, so the fields unrolled below stay in vector lanes.
  const std::array<const double*, n> phi = f.phi, gx_in = f.gx_in, gy_in = f.gy_in;
  const std::array<double*, n> gx_out = f.gx_out, gy_out = f.gy_out;
  VHD_OMP_PARALLEL_FOR_SIMD
  for (int e = 1; e <= nelements; ++e) {
    const bool own = !kFlags || flag[e] == 1;
    // An inactive face (no neighbour, 0, or an inactive one) reads the
    // element itself, which leaves the bounds as they are. The index is
    // chosen by arithmetic, not by a condition: a load under a condition
    // keeps the loop out of vector lanes.
    int source[kFaces];
    bool active[kFaces];
    for (int j = 0; j < kFaces; ++j) {
      const int nb = neighbour[e * kFaces + j];
      active[j] = own & (nb != 0);
      if constexpr (kFlags) active[j] = active[j] & (flag[nb] == 1);  // flag[0] is a spare slot
      source[j] = e + (nb - e) * static_cast<int>(active[j]);
    }
#pragma GCC unroll 4
    for (int k = 0; k < n; ++k) {
      const double* p = phi[k];
      const double pe = p[e];
      const double gx = gx_in[k][e], gy = gy_in[k][e];
      double pmax = pe, pmin = pe, rise = 0.0, fall = 0.0;
      for (int j = 0; j < kFaces; ++j) {
        const double q = p[source[j]];
        pmax = std::max(pmax, q);
        pmin = std::min(pmin, q);
        const double offset = gx * offset_x[e * kFaces + j] + gy * offset_y[e * kFaces + j];  // formed for every face: a select, not a load
        const double d = active[j] ? offset : 0.0;
        rise = std::max(rise, d);
        fall = std::min(fall, d);
      }
      const double alpha = BarthJespersenFactor(pmax - pe, pmin - pe, rise, fall, eps);
      gx_out[k][e] = alpha * gx;
      gy_out[k][e] = alpha * gy;
    }
  }
}

template <int n>
void BarthJespersenTable(const LimiterGeometry2D& g, const Array1<int>& element_flags,
                         const BarthJespersenFields<n>& f, double eps) {
  auto with = [&](auto faces) {
    if (element_flags.empty()) {
      BarthJespersenTableLanes<false, n, faces>(g, nullptr, f, eps);
    } else {
      BarthJespersenTableLanes<true, n, faces>(g, element_flags.data(), f, eps);
    }
  };
  if (g.faces == 3) {
    with(std::integral_constant<int, 3>{});
  } else {
    with(std::integral_constant<int, kLimiterFaces2D>{});
  }
}

// Barth-Jespersen through the mesh face table: the same factor, with the
// neighbours and offsets gathered per element on the fly.
void BarthJespersenMesh(const Mesh& mesh, const Array1<int>& element_flags, const double* p, const double* gx_in,
                        const double* gy_in, double* gx_out, double* gy_out, double eps) {
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  const FlagView flags(element_flags, Array1<int>());
  const bool geo = IsGeographic(mesh.projection);
  const int n = el.nelements_int > 0 ? el.nelements_int : el.nelements;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    int nb[kMaxElementFaces];
    bool active[kMaxElementFaces];
    double dx[kMaxElementFaces], dy[kMaxElementFaces];
    const bool own = flags.Active(e);
    const int count = std::min(ElementFaceCount(el, e), kMaxElementFaces);
    for (int j = 0; j < count; ++j) {
      const int f = el.face_list[el.face_start[e] + j];
      nb[j] = f == 0 ? 0 : (fc.element1[f] == e ? fc.element2[f] : fc.element1[f]);
      active[j] = own && nb[j] != 0 && flags.Active(nb[j]);
      dx[j] = active[j] ? detail::DeltaX(el.xc[e], fc.xf[f], geo) : 0.0;
      dy[j] = active[j] ? fc.yf[f] - el.yc[e] : 0.0;
    }
    const double gx = gx_in[e], gy = gy_in[e];
    const double alpha = BarthJespersenAlpha(p, e, gx, gy, count, nb, active, dx, dy, eps);
    gx_out[e] = alpha * gx;
    gy_out[e] = alpha * gy;
  }
}

// Barth-Jespersen over all faces of the elements of a 3D mesh.
void BarthJespersen3D(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
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
    const double gx = gx_in[e], gy = gy_in[e], gz = gz_in[e];
    double alpha = 1.0;
    if (flags.Active(e)) {
      const double pe = p[e];
      double pmax = pe, pmin = pe, rise = 0.0, fall = 0.0;
      for (int q = el.face_start[e]; q < el.face_start[e + 1]; ++q) {
        const int f = el.face_list[q];
        if (f == 0) continue;
        const int nb = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
        if (nb == 0 || !flags.Active(nb)) continue;
        pmax = std::max(pmax, p[nb]);
        pmin = std::min(pmin, p[nb]);
        const double d = gx * detail::DeltaX(el.xc[e], fc.xf[f], geo) + gy * (fc.yf[f] - el.yc[e]) +
                         gz * (fc.zf[f] - el.zc[e]);
        rise = std::max(rise, d);
        fall = std::min(fall, d);
      }
      alpha = BarthJespersenFactor(pmax - pe, pmin - pe, rise, fall, eps);
    }
    gx_out[e] = alpha * gx;
    gy_out[e] = alpha * gy;
    gz_out[e] = alpha * gz;
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

void SetupLimiterGeometry2D(const Mesh& mesh, LimiterGeometry2D& geometry) {
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  const bool geo = IsGeographic(mesh.projection);
  LimiterGeometry2D& g = geometry;
  g.nelements = el.nelements_int > 0 ? el.nelements_int : el.nelements;
  g.faces = 3;
  for (int e = 1; e <= g.nelements; ++e) {
    if (ElementFaceCount(el, e) > kLimiterFaces2D)
      FatalError(SubstituteValue(
          SubstituteValue("SetupLimiterGeometry2D: element % has % faces; a 2D element has at most 4", el.id[e]),
          ElementFaceCount(el, e)));
    g.faces = std::max(g.faces, ElementFaceCount(el, e));
  }
  const std::size_t size = static_cast<std::size_t>(g.nelements + 1) * g.faces;
  g.neighbour.assign(size, 0);
  g.dx.assign(size, 0.0);
  g.dy.assign(size, 0.0);
  for (int e = 1; e <= g.nelements; ++e) {
    for (int j = 0; j < ElementFaceCount(el, e); ++j) {
      const int f = el.face_list[el.face_start[e] + j];
      if (f == 0) continue;
      const std::size_t k = static_cast<std::size_t>(e) * g.faces + j;
      g.neighbour[k] = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
      g.dx[k] = detail::DeltaX(el.xc[e], fc.xf[f], geo);
      g.dy[k] = fc.yf[f] - el.yc[e];
    }
  }
}

void CALCLIMITEDGRADIENTBJ2D(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                             const Array1<double>& gx_in, const Array1<double>& gy_in, Array1<double>& gx_out,
                             Array1<double>& gy_out, double eps) {
  BarthJespersenMesh(mesh, element_flags, phi.data(), gx_in.data(), gy_in.data(), gx_out.data(), gy_out.data(),
                     eps);
}

void CALCLIMITEDGRADIENTBJ2D(const LimiterGeometry2D& geometry, const Array1<double>& phi,
                             const Array1<int>& element_flags, const Array1<double>& gx_in,
                             const Array1<double>& gy_in, Array1<double>& gx_out, Array1<double>& gy_out,
                             double eps) {
  const BarthJespersenFields<1> f{{phi.data()}, {gx_in.data()}, {gy_in.data()}, {gx_out.data()}, {gy_out.data()}};
  BarthJespersenTable<1>(geometry, element_flags, f, eps);
}

void CALCLIMITEDGRADIENTALLBJ2D(const LimiterGeometry2D& geometry, const Array1<int>& element_flags,
                                std::span<const GradientField> fields, double eps) {
  detail::ForFieldGroups(static_cast<int>(fields.size()), [&](auto group, int first) {
    constexpr int n = decltype(group)::value;
    BarthJespersenFields<n> f;
    for (int i = 0; i < n; ++i) {
      const GradientField& field = fields[static_cast<std::size_t>(first + i)];
      f.phi[i] = field.value->data();
      f.gx_in[i] = f.gx_out[i] = field.gx->data();
      f.gy_in[i] = f.gy_out[i] = field.gy->data();
    }
    BarthJespersenTable<n>(geometry, element_flags, f, eps);
  });
}

void CALCLIMITEDGRADIENTBJ3D(const Mesh& mesh, const Array1<double>& phi, const Array1<int>& element_flags,
                             const Array1<double>& gx_in, const Array1<double>& gy_in, const Array1<double>& gz_in,
                             Array1<double>& gx_out, Array1<double>& gy_out, Array1<double>& gz_out, double eps) {
  BarthJespersen3D(mesh, phi, element_flags, gx_in.data(), gy_in.data(), gz_in.data(), gx_out.data(),
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
