// Green-Gauss ("simple") gradients from face values and node-based gradients.

#include <cmath>
#include <limits>

#include "core/omp.hpp"
#include "mesh/gradient.hpp"
#include "mesh/gradient_detail.hpp"
#include "mesh/interpolation.hpp"

namespace vhd {

namespace {

int OwnedElements(const Mesh& mesh) {
  return mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
}

// Distance-weighted face value seen from e: the nearer centroid weighs more;
// e's own value on a boundary face.
inline double FaceValue(const FaceTable& fc, int f, int e, const double* p) {
  const int nb = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
  if (nb == 0) return p[e];
  const double de = fc.element1[f] == e ? fc.dist1[f] : fc.dist2[f];
  const double dn = fc.element1[f] == e ? fc.dist2[f] : fc.dist1[f];
  const double sum = de + dn;
  if (!(sum > 0)) return 0.5 * (p[e] + p[nb]);
  return (dn * p[e] + de * p[nb]) / sum;
}

// Green-Gauss sum of (phi_f - phi_e) n L over the faces of e, divided by the
// element area (volume). side_only: vertical faces of a layered mesh only.
template <bool kThree>
void GreenGauss(const Mesh& mesh, int e, const double* p, bool side_only, double& gx, double& gy, double& gz) {
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  double sx = 0, sy = 0, sz = 0;
  for (int q = el.face_start[e]; q < el.face_start[e + 1]; ++q) {
    const int f = el.face_list[q];
    if (f == 0 || (side_only && mesh.face_column[f] == 0)) continue;
    const double s = (fc.element1[f] == e ? 1.0 : -1.0) * (FaceValue(fc, f, e, p) - p[e]) * fc.length[f];
    sx += s * fc.nx[f];
    sy += s * fc.ny[f];
    if (kThree) sz += s * fc.nz[f];
  }
  const double a = el.area[e];
  gx = a > 0 ? sx / a : 0.0;
  gy = a > 0 ? sy / a : 0.0;
  gz = a > 0 ? sz / a : 0.0;
}

// Gradient of the polygon of nc corners from node values (Green-Gauss over
// its edges with the edge-mean values; exact for linear fields).
inline void PolygonGradient(const Mesh& mesh, int e, int first, int nc, const double* pn, bool geo, double& gx,
                            double& gy) {
  const ElementTable& el = mesh.elements;
  const NodeTable& nd = mesh.nodes;
  double x[4], y[4], v[4];
  for (int j = 0; j < nc; ++j) {
    const int k = ElementNode(el, e, first + j);
    x[j] = j == 0 ? 0.0 : detail::DeltaX(nd.x[ElementNode(el, e, first)], nd.x[k], geo);
    y[j] = nd.y[k];
    v[j] = pn[k];
  }
  double a2 = 0, sx = 0, sy = 0;
  for (int j = 0; j < nc; ++j) {
    const int i = (j + 1) % nc;
    a2 += x[j] * y[i] - x[i] * y[j];
    sx += (v[j] + v[i]) * (y[i] - y[j]);
    sy -= (v[j] + v[i]) * (x[i] - x[j]);
  }
  gx = a2 != 0 ? sx / a2 : 0.0;
  gy = a2 != 0 ? sy / a2 : 0.0;
}

inline int CornerCount(const Mesh& mesh, int e) {
  const RefElement& r = ElementShape(mesh, e);
  return r.dimension == 2 ? r.nedges : (r.shape == kShapePrism ? 3 : 4);
}

// Gradient of a 3D element from node values: Green-Gauss over its faces split
// into triangles, with the volume of the same triangulated surface.
void PolyhedronGradient(const Mesh& mesh, int e, const double* pn, double& gx, double& gy, double& gz) {
  const ElementTable& el = mesh.elements;
  const NodeTable& nd = mesh.nodes;
  const RefElement& r = ElementShape(mesh, e);
  const double xc = el.xc[e], yc = el.yc[e], zc = el.zc[e];
  double sx = 0, sy = 0, sz = 0, vol3 = 0;
  for (int lf = 1; lf <= r.nfaces; ++lf) {
    int nodes[4];
    int n = 0;
    for (int j = 1; j <= r.nodes_per_face && n < 4; ++j)
      if (r.FaceNode(lf, j) != 0) nodes[n++] = ElementNode(el, e, r.FaceNode(lf, j));
    for (int t = 0; t + 2 < n; ++t) {
      const int a = nodes[0], b = nodes[t + 1], c = nodes[t + 2];
      const double ax = nd.x[a] - xc, ay = nd.y[a] - yc, az = nd.z[a] - zc;
      const double bx = nd.x[b] - xc, by = nd.y[b] - yc, bz = nd.z[b] - zc;
      const double cx = nd.x[c] - xc, cy = nd.y[c] - yc, cz = nd.z[c] - zc;
      double ux = bx - ax, uy = by - ay, uz = bz - az, wx = cx - ax, wy = cy - ay, wz = cz - az;
      double qx = 0.5 * (uy * wz - uz * wy), qy = 0.5 * (uz * wx - ux * wz), qz = 0.5 * (ux * wy - uy * wx);
      const double mx = (ax + bx + cx) / 3, my = (ay + by + cy) / 3, mz = (az + bz + cz) / 3;
      if (mx * qx + my * qy + mz * qz < 0) {
        qx = -qx;
        qy = -qy;
        qz = -qz;
      }
      const double val = (pn[a] + pn[b] + pn[c]) / 3;
      sx += val * qx;
      sy += val * qy;
      sz += val * qz;
      vol3 += mx * qx + my * qy + mz * qz;
    }
  }
  const double vol = vol3 / 3;
  gx = vol > 0 ? sx / vol : 0.0;
  gy = vol > 0 ? sy / vol : 0.0;
  gz = vol > 0 ? sz / vol : 0.0;
}

}  // namespace

// ---- Green-Gauss from face values ----------------------------------------------------------

void CALCGRADIENTSIMPLE2D(const Mesh& mesh, const Array1<double>& phi, Array1<double>& gx, Array1<double>& gy) {
  const int n = OwnedElements(mesh);
  const double* p = phi.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    double z = 0;
    GreenGauss<false>(mesh, e, p, false, gx[e], gy[e], z);
  }
}

void CALCGRADIENTALLSIMPLE2D(const Mesh& mesh, std::span<const GradientField> fields) {
  const int n = OwnedElements(mesh);
  const int nfields = static_cast<int>(fields.size());
  const GradientField* fl = fields.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    for (int i = 0; i < nfields; ++i) {
      double z = 0;
      GreenGauss<false>(mesh, e, fl[i].value->data(), false, (*fl[i].gx)[e], (*fl[i].gy)[e], z);
    }
  }
}

void CALCGRADIENTSIMPLEVELOCITY2D(const Mesh& mesh, const Array1<double>& u, const Array1<double>& v,
                                  Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                  Array1<double>& vy) {
  const int n = OwnedElements(mesh);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    double z = 0;
    GreenGauss<false>(mesh, e, u.data(), false, ux[e], uy[e], z);
    GreenGauss<false>(mesh, e, v.data(), false, vx[e], vy[e], z);
  }
}

void CALCGRADIENTSIMPLE3D(const Mesh& mesh, const Array1<double>& phi, Array1<double>& gx, Array1<double>& gy,
                          Array1<double>& gz) {
  const int n = OwnedElements(mesh);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) GreenGauss<true>(mesh, e, phi.data(), false, gx[e], gy[e], gz[e]);
}

void CALCGRADIENTSIGMASIMPLEVELOCITY3D(const Mesh& mesh, const Array1<double>& u, const Array1<double>& v,
                                       Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                       Array1<double>& vy) {
  const int n = OwnedElements(mesh);
  const bool layered = !mesh.face_column.empty();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    double z = 0;
    GreenGauss<false>(mesh, e, u.data(), layered, ux[e], uy[e], z);
    GreenGauss<false>(mesh, e, v.data(), layered, vx[e], vy[e], z);
  }
}

// ---- from node values ----------------------------------------------------------------------

void CALCGRADIENTNODEVALUES2D(const Mesh& mesh, const Array1<double>& node_values, Array1<double>& gx,
                              Array1<double>& gy) {
  const int n = OwnedElements(mesh);
  const bool geo = IsGeographic(mesh.projection);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) PolygonGradient(mesh, e, 1, CornerCount(mesh, e), node_values.data(), geo, gx[e], gy[e]);
}

void CALCGRADIENTVELOCITYNODEVALUES2D(const Mesh& mesh, const Array1<double>& un, const Array1<double>& vn,
                                      Array1<double>& ux, Array1<double>& uy, Array1<double>& vx,
                                      Array1<double>& vy) {
  const int n = OwnedElements(mesh);
  const bool geo = IsGeographic(mesh.projection);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    const int nc = CornerCount(mesh, e);
    PolygonGradient(mesh, e, 1, nc, un.data(), geo, ux[e], uy[e]);
    PolygonGradient(mesh, e, 1, nc, vn.data(), geo, vx[e], vy[e]);
  }
}

void CALCGRADIENTVELOCITYELEMENTVALUES2D(const Mesh& mesh, const Array1<double>& u, const Array1<double>& v,
                                         Array1<double>& un, Array1<double>& vn, Array1<double>& ux,
                                         Array1<double>& uy, Array1<double>& vx, Array1<double>& vy) {
  // A NaN delete value never compares equal: every element takes part.
  const double none = std::numeric_limits<double>::quiet_NaN();
  CALCNODEVALUESPL2D(mesh, u, un, none, 1);
  CALCNODEVALUESPL2D(mesh, v, vn, none, 1);
  CALCGRADIENTVELOCITYNODEVALUES2D(mesh, un, vn, ux, uy, vx, vy);
}

void CALCGRADIENTNODEVALUES3D(const Mesh& mesh, const Array1<double>& node_values, Array1<double>& gx,
                              Array1<double>& gy, Array1<double>& gz) {
  const int n = OwnedElements(mesh);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) PolyhedronGradient(mesh, e, node_values.data(), gx[e], gy[e], gz[e]);
}

void CALCGRADIENTVELOCITYNODEVALUES3D(const Mesh& mesh, const Array1<double>& un, const Array1<double>& vn,
                                      Array1<double>& ux, Array1<double>& uy, Array1<double>& uz,
                                      Array1<double>& vx, Array1<double>& vy, Array1<double>& vz) {
  const int n = OwnedElements(mesh);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    PolyhedronGradient(mesh, e, un.data(), ux[e], uy[e], uz[e]);
    PolyhedronGradient(mesh, e, vn.data(), vx[e], vy[e], vz[e]);
  }
}

void CALCGRADIENTNODEVALUES3DLAYER(const Mesh& mesh, const Array1<double>& node_values, Array1<double>& gx,
                                   Array1<double>& gy) {
  const int n = OwnedElements(mesh);
  const bool geo = IsGeographic(mesh.projection);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    const int nc = CornerCount(mesh, e);
    double bx = 0, by = 0, tx = 0, ty = 0;
    PolygonGradient(mesh, e, 1, nc, node_values.data(), geo, bx, by);
    PolygonGradient(mesh, e, nc + 1, nc, node_values.data(), geo, tx, ty);
    gx[e] = 0.5 * (bx + tx);
    gy[e] = 0.5 * (by + ty);
  }
}

}  // namespace vhd
