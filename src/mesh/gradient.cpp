// Gradient stencils: construction at setup and application in the time loop.

#include "mesh/gradient.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <new>
#include <vector>

#include "core/omp.hpp"
#include "log/log.hpp"
#include "mesh/gradient_detail.hpp"

namespace vhd {

namespace {

using detail::FlagView;

// One point of a stencil: the element whose value it carries and its offset
// from the centroid of the element the row belongs to.
struct StencilPoint {
  int index = 0;
  double dx = 0, dy = 0, dz = 0;
};

// One row under construction: element numbers and weights.
struct Row {
  std::vector<int> index;
  std::vector<double> wx, wy, wz;
  void Clear() {
    index.clear();
    wx.clear();
    wy.clear();
    wz.clear();
  }
  void Add(int i, double ax, double ay, double az) {
    index.push_back(i);
    wx.push_back(ax);
    wy.push_back(ay);
    wz.push_back(az);
  }
};

// Geometry access for the construction.
class StencilGeometry {
public:
  StencilGeometry(const Mesh& mesh, int dimension)
      : m_(mesh), three_d_(dimension == 3), geo_(IsGeographic(mesh.projection)) {}

  int Across(int f, int e) const {
    return m_.faces.element1[f] == e ? m_.faces.element2[f] : m_.faces.element1[f];
  }
  // Offset of element b's centroid from element a's centroid.
  StencilPoint Offset(int a, int b) const {
    const ElementTable& el = m_.elements;
    StencilPoint p;
    p.index = b;
    p.dx = detail::DeltaX(el.xc[a], el.xc[b], geo_);
    p.dy = el.yc[b] - el.yc[a];
    p.dz = three_d_ ? el.zc[b] - el.zc[a] : 0.0;
    return p;
  }
  // Offset of the face centre of f from e's centroid.
  StencilPoint FaceCentre(int e, int f) const {
    StencilPoint p;
    p.index = e;
    p.dx = detail::DeltaX(m_.elements.xc[e], m_.faces.xf[f], geo_);
    p.dy = m_.faces.yf[f] - m_.elements.yc[e];
    p.dz = three_d_ ? m_.faces.zf[f] - m_.elements.zc[e] : 0.0;
    return p;
  }
  // Offset of the mirror image of e's centroid in the face line (plane) of f:
  // twice the projection of (face centre - centroid) on the unit normal.
  StencilPoint Mirror(int e, int f) const {
    const FaceTable& fc = m_.faces;
    StencilPoint p = FaceCentre(e, f);
    const double nz = three_d_ ? fc.nz[f] : 0.0;
    const double s = 2.0 * (p.dx * fc.nx[f] + p.dy * fc.ny[f] + p.dz * nz);
    p.dx = s * fc.nx[f];
    p.dy = s * fc.ny[f];
    p.dz = s * nz;
    return p;
  }

  const Mesh& mesh() const { return m_; }
  bool three_d() const { return three_d_; }

private:
  const Mesh& m_;
  bool three_d_;
  bool geo_;
};

bool ValidNeighbour(const StencilGeometry& g, const FlagView& flags, int e, int f, int& nb) {
  nb = g.Across(f, e);
  return nb > 0 && flags.Active(e) && flags.Active(nb) && flags.Open(f);
}

// Ghost points of faces without a valid neighbour.
enum class Ghost { kNone, kFaceCentre, kMirror };

// First ring of e: one point per face (valid neighbour or ghost). Counts the
// valid and the missing neighbours.
void FirstRing(const StencilGeometry& g, const FlagView& flags, int e, Ghost ghost, std::vector<StencilPoint>& pts,
               int& nvalid, int& nmissing) {
  const ElementTable& el = g.mesh().elements;
  pts.clear();
  nvalid = nmissing = 0;
  for (int j = 1; j <= ElementFaceCount(el, e); ++j) {
    const int f = ElementFace(el, e, j);
    if (f == 0) continue;  // bed or surface side of a layered column
    int nb = 0;
    if (ValidNeighbour(g, flags, e, f, nb)) {
      pts.push_back(g.Offset(e, nb));
      ++nvalid;
      continue;
    }
    ++nmissing;
    if (ghost == Ghost::kMirror) pts.push_back(g.Mirror(e, f));
    else if (ghost == Ghost::kFaceCentre) pts.push_back(g.FaceCentre(e, f));
  }
}

bool Listed(const std::vector<StencilPoint>& pts, int e, int element) {
  if (element == e) return true;
  for (const StencilPoint& p : pts)
    if (p.index == element) return true;
  return false;
}

// Adds the second ring: the valid neighbours of e's valid neighbours that are
// not yet in the stencil. A ghost of a neighbour carries that neighbour's
// number, which is already listed, so ghosts are not added here.
void SecondRing(const StencilGeometry& g, const FlagView& flags, int e, std::vector<StencilPoint>& pts) {
  const ElementTable& el = g.mesh().elements;
  const std::size_t nfirst = pts.size();
  for (std::size_t i = 0; i < nfirst; ++i) {
    const int n = pts[i].index;
    if (n == e) continue;
    for (int j = 1; j <= ElementFaceCount(el, n); ++j) {
      const int f = ElementFace(el, n, j);
      if (f == 0) continue;
      int nn = 0;
      if (!ValidNeighbour(g, flags, n, f, nn) || Listed(pts, e, nn)) continue;
      pts.push_back(g.Offset(e, nn));
    }
  }
}

// Least-squares row with inverse-squared-distance weights; e's own entry gets
// minus the sum of the others. Returns false (row empty) when the points do
// not determine a gradient. In 3D a mesh with a single layer has no vertical
// spread: the row then falls back to the horizontal gradient (wz = 0).
bool LeastSquaresRow(int e, const std::vector<StencilPoint>& pts, bool three_d, Row& row) {
  row.Clear();
  if (pts.size() < 2) return false;
  double m[3][3] = {{0, 0, 0}, {0, 0, 0}, {0, 0, 0}};
  for (const StencilPoint& p : pts) {
    const double d2 = p.dx * p.dx + p.dy * p.dy + p.dz * p.dz;
    if (d2 <= 0) continue;
    const double w = 1.0 / d2;
    const double d[3] = {p.dx, p.dy, p.dz};
    for (int a = 0; a < 3; ++a)
      for (int b = 0; b < 3; ++b) m[a][b] += w * d[a] * d[b];
  }
  double inv[3][3] = {{0, 0, 0}, {0, 0, 0}, {0, 0, 0}};
  constexpr double kSingular = 1e-10;
  bool solved = false;
  if (three_d) {
    const double c00 = m[1][1] * m[2][2] - m[1][2] * m[2][1];
    const double c01 = m[1][2] * m[2][0] - m[1][0] * m[2][2];
    const double c02 = m[1][0] * m[2][1] - m[1][1] * m[2][0];
    const double det = m[0][0] * c00 + m[0][1] * c01 + m[0][2] * c02;
    if (det > kSingular * m[0][0] * m[1][1] * m[2][2] && det > 0) {
      inv[0][0] = c00 / det;
      inv[1][0] = c01 / det;
      inv[2][0] = c02 / det;
      inv[0][1] = (m[0][2] * m[2][1] - m[0][1] * m[2][2]) / det;
      inv[1][1] = (m[0][0] * m[2][2] - m[0][2] * m[2][0]) / det;
      inv[2][1] = (m[0][1] * m[2][0] - m[0][0] * m[2][1]) / det;
      inv[0][2] = (m[0][1] * m[1][2] - m[0][2] * m[1][1]) / det;
      inv[1][2] = (m[0][2] * m[1][0] - m[0][0] * m[1][2]) / det;
      inv[2][2] = (m[0][0] * m[1][1] - m[0][1] * m[1][0]) / det;
      solved = true;
    }
  }
  if (!solved) {
    const double det = m[0][0] * m[1][1] - m[0][1] * m[1][0];
    if (!(det > kSingular * m[0][0] * m[1][1]) || det <= 0) return false;
    inv[0][0] = m[1][1] / det;
    inv[0][1] = -m[0][1] / det;
    inv[1][0] = -m[1][0] / det;
    inv[1][1] = m[0][0] / det;
  }
  row.Add(e, 0, 0, 0);
  double sx = 0, sy = 0, sz = 0;
  for (const StencilPoint& p : pts) {
    const double d2 = p.dx * p.dx + p.dy * p.dy + p.dz * p.dz;
    if (d2 <= 0) continue;
    const double w = 1.0 / d2;
    const double ax = w * (inv[0][0] * p.dx + inv[0][1] * p.dy + inv[0][2] * p.dz);
    const double ay = w * (inv[1][0] * p.dx + inv[1][1] * p.dy + inv[1][2] * p.dz);
    const double az = w * (inv[2][0] * p.dx + inv[2][1] * p.dy + inv[2][2] * p.dz);
    row.Add(p.index, ax, ay, az);
    sx += ax;
    sy += ay;
    sz += az;
  }
  row.wx[0] = -sx;
  row.wy[0] = -sy;
  row.wz[0] = -sz;
  return true;
}

// Exact gradient of the plane through three points, or the diagonal formula
// of the quadrilateral through four (points in local face order).
bool InterpolationRow(const std::vector<StencilPoint>& p, Row& row) {
  row.Clear();
  double scale = 0;
  for (const StencilPoint& q : p) scale = std::max(scale, q.dx * q.dx + q.dy * q.dy);
  if (p.size() == 3) {
    const double d = p[0].dx * (p[1].dy - p[2].dy) + p[1].dx * (p[2].dy - p[0].dy) + p[2].dx * (p[0].dy - p[1].dy);
    if (!(std::abs(d) > 1e-12 * scale)) return false;
    row.Add(p[0].index, (p[1].dy - p[2].dy) / d, (p[2].dx - p[1].dx) / d, 0);
    row.Add(p[1].index, (p[2].dy - p[0].dy) / d, (p[0].dx - p[2].dx) / d, 0);
    row.Add(p[2].index, (p[0].dy - p[1].dy) / d, (p[1].dx - p[0].dx) / d, 0);
    return true;
  }
  if (p.size() == 4) {
    const double x13 = p[0].dx - p[2].dx, y13 = p[0].dy - p[2].dy;
    const double x24 = p[1].dx - p[3].dx, y24 = p[1].dy - p[3].dy;
    const double d = x13 * y24 - x24 * y13;
    if (!(std::abs(d) > 1e-12 * scale)) return false;
    row.Add(p[0].index, y24 / d, -x24 / d, 0);
    row.Add(p[1].index, -y13 / d, x13 / d, 0);
    row.Add(p[2].index, -y24 / d, x24 / d, 0);
    row.Add(p[3].index, y13 / d, -x13 / d, 0);
    return true;
  }
  return false;
}

// Row of element e for its gradient type (empty row: zero gradient).
void BuildRow(const StencilGeometry& g, const FlagView& flags, const GradientStencil& s, int e,
              std::vector<StencilPoint>& pts, Row& row, int& nvalid, int& nmissing) {
  row.Clear();
  nvalid = nmissing = 0;
  if (!flags.Active(e)) return;
  const bool mirror = s.boundary_treatment == kBoundaryMirror;
  const int nfaces = ElementFaceCount(g.mesh().elements, e);
  if (s.type == 1 && !g.three_d()) {
    FirstRing(g, flags, e, mirror ? Ghost::kMirror : Ghost::kFaceCentre, pts, nvalid, nmissing);
    if ((nfaces == 3 && nvalid <= 1) || (nfaces == 4 && nvalid <= 2)) {
      InterpolationRow(pts, row);
      return;
    }
  }
  FirstRing(g, flags, e, mirror ? Ghost::kMirror : Ghost::kNone, pts, nvalid, nmissing);
  if (s.type == 3 || s.neighbourhood > 4) SecondRing(g, flags, e, pts);
  LeastSquaresRow(e, pts, g.three_d(), row);
}

// Appends a row, merging entries that name the same element.
void AppendRow(const Row& row, int e, GradientStencil& s, std::vector<int>& idx, std::vector<double>& wx,
               std::vector<double>& wy, std::vector<double>& wz) {
  const std::size_t first = idx.size();
  for (std::size_t k = 0; k < row.index.size(); ++k) {
    std::size_t q = first;
    while (q < idx.size() && idx[q] != row.index[k]) ++q;
    if (q == idx.size()) {
      idx.push_back(row.index[k]);
      wx.push_back(0);
      wy.push_back(0);
      wz.push_back(0);
    }
    wx[q] += row.wx[k];
    wy[q] += row.wy[k];
    wz[q] += row.wz[k];
  }
  // Weights of a consistent row sum to zero: a row that names one element
  // only (ghosts of e and e itself) is the zero gradient, stored empty.
  if (idx.size() == first + 1) {
    idx.pop_back();
    wx.pop_back();
    wy.pop_back();
    wz.pop_back();
  }
  s.start[e + 1] = static_cast<int>(idx.size()) + 1;
}

void StoreEntries(GradientStencil& s, const std::vector<int>& idx, const std::vector<double>& wx,
                  const std::vector<double>& wy, const std::vector<double>& wz) {
  const int n = static_cast<int>(idx.size());
  s.index.assign(std::max(n, 1), 0);
  s.wx.assign(std::max(n, 1), 0.0);
  s.wy.assign(std::max(n, 1), 0.0);
  if (s.ndim == 3) s.wz.assign(std::max(n, 1), 0.0);
  else s.wz.clear();
  std::copy(idx.begin(), idx.end(), s.index.begin());
  std::copy(wx.begin(), wx.end(), s.wx.begin());
  std::copy(wy.begin(), wy.end(), s.wy.begin());
  if (s.ndim == 3) std::copy(wz.begin(), wz.end(), s.wz.begin());
}

}  // namespace

void SetupGradient(const Mesh& mesh, int type, const Array1<int>& element_flags, const Array1<int>& face_flags,
                   int dimension, int boundary_treatment, int neighbourhood, GradientStencil& stencil) {
  if (type < 1 || type > 3) FatalError("SetupGradient: Gradient type not supported");
  GradientStencil& s = stencil;
  s = GradientStencil();
  s.ndim = dimension == 3 ? 3 : 2;
  s.type = type;
  s.boundary_treatment = boundary_treatment;
  s.neighbourhood = neighbourhood;
  s.nelements = mesh.elements.nelements;
  s.nowned = mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : s.nelements;

  const StencilGeometry g(mesh, s.ndim);
  const FlagView flags(element_flags, face_flags);
  std::vector<int> idx;
  std::vector<double> wx, wy, wz;
  std::vector<StencilPoint> pts;
  Row row;
  try {
    s.start.assign(s.nelements + 1, 1);
    s.nvalid.assign(s.nelements, 0);
    s.nmissing.assign(s.nelements, 0);
    idx.reserve(static_cast<std::size_t>(s.nowned) * (type == 3 ? 12 : 4));
    wx.reserve(idx.capacity());
    wy.reserve(idx.capacity());
    wz.reserve(idx.capacity());
    for (int e = 1; e <= s.nelements; ++e) {
      row.Clear();
      if (e <= s.nowned && mesh.elements.id[e] != 0)
        BuildRow(g, flags, s, e, pts, row, s.nvalid[e], s.nmissing[e]);
      AppendRow(row, e, s, idx, wx, wy, wz);
    }
  } catch (const std::bad_alloc&) {
    FatalError("SetupGradient: Cannot allocate memory");
  }
  try {
    StoreEntries(s, idx, wx, wy, wz);
  } catch (const std::bad_alloc&) {
    FatalError("SetupGradient: Can't allocate memory");
  }
  if (s.ndim == 2) SetupBoundaryGradient2D(mesh, element_flags, face_flags, boundary_treatment, s);
}

void SetupBoundaryGradient2D(const Mesh& mesh, const Array1<int>& element_flags, const Array1<int>& face_flags,
                             int boundary_treatment, GradientStencil& stencil) {
  GradientStencil& s = stencil;
  if (boundary_treatment != kBoundaryMirror) return;
  const StencilGeometry g(mesh, 2);
  const FlagView flags(element_flags, face_flags);
  const bool two_rings = s.type == 3 || s.neighbourhood > 4;
  std::vector<int> idx;
  std::vector<double> wx, wy, wz;
  std::vector<StencilPoint> pts;
  Row row;
  try {
    Array1<int> old_start = s.start;
    idx.reserve(static_cast<std::size_t>(s.index.size()) + 16);
    wx.reserve(idx.capacity());
    wy.reserve(idx.capacity());
    wz.reserve(idx.capacity());
    for (int e = 1; e <= s.nelements; ++e) {
      row.Clear();
      bool corrected = false;
      if (e <= s.nowned && s.nmissing[e] > 0 && flags.Active(e) && mesh.elements.id[e] != 0) {
        int nvalid = 0, nmissing = 0;
        FirstRing(g, flags, e, Ghost::kNone, pts, nvalid, nmissing);
        if (two_rings) SecondRing(g, flags, e, pts);
        corrected = LeastSquaresRow(e, pts, false, row);
        if (!corrected && !two_rings) {
          SecondRing(g, flags, e, pts);
          corrected = LeastSquaresRow(e, pts, false, row);
        }
      }
      if (!corrected) {
        row.Clear();
        for (int k = old_start[e]; k < old_start[e + 1]; ++k) row.Add(s.index[k], s.wx[k], s.wy[k], 0.0);
      }
      AppendRow(row, e, s, idx, wx, wy, wz);
    }
    StoreEntries(s, idx, wx, wy, wz);
  } catch (const std::bad_alloc&) {
    FatalError("SetupBoundaryGradient2D: Can't allocate memory");
  }
}

// ---- application ------------------------------------------------------------------------------

namespace {

// The 2D stencil applied to n fields in one pass: each entry's element number
// and weights are loaded once; per field the sums run over the entries in
// stencil order, as for one field alone.
template <int n>
void ApplyStencil2D(const GradientStencil& s, const std::array<const double*, n> phi,
                    const std::array<double*, n> gx, const std::array<double*, n> gy) {
  const int* start = s.start.data();
  const int* index = s.index.data();
  const double* wx = s.wx.data();
  const double* wy = s.wy.data();
  const int nowned = s.nowned;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nowned; ++e) {
    double ax[n], ay[n];
    for (int i = 0; i < n; ++i) ax[i] = ay[i] = 0.0;
    for (int k = start[e]; k < start[e + 1]; ++k) {
      const int j = index[k];
      const double cx = wx[k], cy = wy[k];
      for (int i = 0; i < n; ++i) {
        const double v = phi[i][j];
        ax[i] += cx * v;
        ay[i] += cy * v;
      }
    }
    for (int i = 0; i < n; ++i) {
      gx[i][e] = ax[i];
      gy[i][e] = ay[i];
    }
  }
}

}  // namespace

void CALCGRADIENTELEMENT2D(const GradientStencil& s, const Array1<double>& phi, Array1<double>& gx,
                           Array1<double>& gy) {
  ApplyStencil2D<1>(s, {phi.data()}, {gx.data()}, {gy.data()});
}

void CALCGRADIENTALLELEMENT2D(const GradientStencil& s, std::span<const GradientField> fields) {
  detail::ForFieldGroups(static_cast<int>(fields.size()), [&](auto group, int first) {
    constexpr int n = decltype(group)::value;
    std::array<const double*, n> phi;
    std::array<double*, n> gx, gy;
    for (int i = 0; i < n; ++i) {
      const GradientField& f = fields[static_cast<std::size_t>(first + i)];
      phi[i] = f.value->data();
      gx[i] = f.gx->data();
      gy[i] = f.gy->data();
    }
    ApplyStencil2D<n>(s, phi, gx, gy);
  });
}

void CALCGRADIENTELEMENT3D(const GradientStencil& s, const Array1<double>& phi, Array1<double>& gx,
                           Array1<double>& gy, Array1<double>& gz) {
  const int* start = s.start.data();
  const int* index = s.index.data();
  const double* wx = s.wx.data();
  const double* wy = s.wy.data();
  const double* wz = s.ndim == 3 ? s.wz.data() : nullptr;
  const double* p = phi.data();
  double* ox = gx.data();
  double* oy = gy.data();
  double* oz = gz.data();
  const int n = s.nowned;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    double ax = 0, ay = 0, az = 0;
    for (int k = start[e]; k < start[e + 1]; ++k) {
      const double v = p[index[k]];
      ax += wx[k] * v;
      ay += wy[k] * v;
      if (wz) az += wz[k] * v;
    }
    ox[e] = ax;
    oy[e] = ay;
    oz[e] = az;
  }
}

void CALCGRADIENTVELOCITYELEMENT2D(const GradientStencil& s, const Array1<double>& u, const Array1<double>& v,
                                   Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                   Array1<double>& vy) {
  ApplyStencil2D<2>(s, {u.data(), v.data()}, {ux.data(), vx.data()}, {uy.data(), vy.data()});
}

void CALCGRADIENTVELOCITYELEMENT3D(const GradientStencil& s, const Array1<double>& u, const Array1<double>& v,
                                   const Array1<double>& w, Array1<double>& ux, Array1<double>& uy,
                                   Array1<double>& uz, Array1<double>& vx, Array1<double>& vy,
                                   Array1<double>& vz, Array1<double>& wx, Array1<double>& wy,
                                   Array1<double>& wz) {
  const int* start = s.start.data();
  const int* index = s.index.data();
  const double* cx = s.wx.data();
  const double* cy = s.wy.data();
  const double* cz = s.ndim == 3 ? s.wz.data() : nullptr;
  const double* pu = u.data();
  const double* pv = v.data();
  const double* pw = w.data();
  double* out[9] = {ux.data(), uy.data(), uz.data(), vx.data(), vy.data(), vz.data(), wx.data(), wy.data(), wz.data()};
  const int n = s.nowned;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    double a[9] = {0, 0, 0, 0, 0, 0, 0, 0, 0};
    for (int k = start[e]; k < start[e + 1]; ++k) {
      const int i = index[k];
      const double c[3] = {cx[k], cy[k], cz ? cz[k] : 0.0};
      const double val[3] = {pu[i], pv[i], pw[i]};
      for (int q = 0; q < 3; ++q)
        for (int d = 0; d < 3; ++d) a[3 * q + d] += c[d] * val[q];
    }
    for (int q = 0; q < 9; ++q) out[q][e] = a[q];
  }
}

}  // namespace vhd
