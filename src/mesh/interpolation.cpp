// Pseudo-Laplacian node values and point values inside elements.

#include "mesh/interpolation.hpp"

#include <algorithm>
#include <cmath>

#include "core/omp.hpp"
#include "log/log.hpp"
#include "mesh/gradient_detail.hpp"

namespace vhd {

namespace {

inline double Unwrap360(double v, double ref) {
  if (v < ref - 180.0) return v + 360.0;
  if (v > ref + 180.0) return v - 360.0;
  return v;
}

inline double Wrap360(double v) {
  double w = std::fmod(v, 360.0);
  if (w < 0) w += 360.0;
  return w >= 360.0 ? 0.0 : w;
}

// Pseudo-Laplacian average at node (xn, yn) over the elements list[b .. e-1]
// with centroids (xc, yc). value(c, v) returns false for an element that takes
// no part, else its value in v. Returns false when no element takes part.
template <class Value>
bool PseudoLaplacian(double xn, double yn, const int* list, int b, int e, const double* xc, const double* yc,
                     bool geo, int mode, Value value, double& out) {
  double ref = 0, rx = 0, ry = 0, ixx = 0, iyy = 0, ixy = 0;
  int count = 0;
  for (int q = b; q < e; ++q) {
    const int c = list[q];
    double v = 0;
    if (!value(c, v)) continue;
    if (count == 0) ref = v;
    ++count;
    const double dx = detail::DeltaX(xn, xc[c], geo), dy = yc[c] - yn;
    rx += dx;
    ry += dy;
    ixx += dx * dx;
    iyy += dy * dy;
    ixy += dx * dy;
  }
  if (count == 0) return false;
  auto unwrapped = [&](double v) { return mode == kModeDirection ? Unwrap360(v, ref) : v; };
  const double det = ixx * iyy - ixy * ixy;
  double sw = 0, swv = 0;
  if (std::abs(det) > 1e-10 * ixx * iyy) {
    const double lx = (ixy * ry - iyy * rx) / det, ly = (ixy * rx - ixx * ry) / det;
    for (int q = b; q < e; ++q) {
      const int c = list[q];
      double v = 0;
      if (!value(c, v)) continue;
      const double dx = detail::DeltaX(xn, xc[c], geo), dy = yc[c] - yn;
      const double w = std::clamp(1.0 + lx * dx + ly * dy, 0.0, 2.0);
      sw += w;
      swv += w * unwrapped(v);
    }
  }
  if (!(std::abs(sw) > 1e-10)) {
    // Inverse-distance weights; a centroid on the node decides alone.
    sw = swv = 0;
    for (int q = b; q < e; ++q) {
      const int c = list[q];
      double v = 0;
      if (!value(c, v)) continue;
      const double dx = detail::DeltaX(xn, xc[c], geo), dy = yc[c] - yn;
      const double d = std::sqrt(dx * dx + dy * dy);
      if (d == 0) {
        sw = 1;
        swv = unwrapped(v);
        break;
      }
      sw += 1 / d;
      swv += unwrapped(v) / d;
    }
  }
  out = swv / sw;
  if (mode == kModeDirection) out = Wrap360(out);
  return true;
}

int OwnedNodes(const Mesh& mesh) { return mesh.nodes.nnodes_int > 0 ? mesh.nodes.nnodes_int : mesh.nodes.nnodes; }

// Node loop over the mesh's own node-element table. all_dry: the value of a
// node without a usable element; fallback (when not null) is used instead for
// such nodes, with every non-deleted element.
template <class Value, class Fallback>
void NodeLoop(const Mesh& mesh, Array1<double>& node_values, int mode, Value value, double all_dry,
              const Fallback* fallback, bool all_nodes = false) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  const bool geo = IsGeographic(mesh.projection);
  const int n = all_nodes ? nd.nnodes : OwnedNodes(mesh);
  VHD_OMP_PARALLEL_FOR
  for (int i = 1; i <= n; ++i) {
    double out = all_dry;
    const int b = nd.element_start[i], e = nd.element_start[i + 1];
    if (!PseudoLaplacian(nd.x[i], nd.y[i], nd.element_list.data(), b, e, el.xc.data(), el.yc.data(), geo, mode,
                         value, out) &&
        fallback != nullptr) {
      if (!PseudoLaplacian(nd.x[i], nd.y[i], nd.element_list.data(), b, e, el.xc.data(), el.yc.data(), geo, mode,
                           *fallback, out))
        out = all_dry;
    }
    node_values[i] = out;
  }
}

struct NoFallback {
  bool operator()(int, double&) const { return false; }
};

}  // namespace

// ---- 2D ----------------------------------------------------------------------------------------

void CALCNODEVALUESPL2D(const Mesh& mesh, const Array1<double>& values, Array1<double>& node_values,
                        double delete_value, int mode, bool all_nodes) {
  const double* p = values.data();
  auto value = [=](int c, double& v) {
    v = p[c];
    return v != delete_value;
  };
  NodeLoop(mesh, node_values, mode, value, 0.0, static_cast<const NoFallback*>(nullptr), all_nodes);
}

void CALCNODEVALUESWETPL2D(const Mesh& mesh, const Array1<double>& values, const Array1<int>& wet,
                           Array1<double>& node_values, double delete_value, int mode) {
  const double* p = values.data();
  const int* w = wet.data();
  auto value = [=](int c, double& v) {
    v = p[c];
    return w[c] == 1 && v != delete_value;
  };
  NodeLoop(mesh, node_values, mode, value, delete_value, static_cast<const NoFallback*>(nullptr));
}

void CALCNODEVALUES2WETPL2D(const Mesh& mesh, const Array1<double>& values, const Array1<int>& wet,
                            Array1<double>& node_values, double delete_value, int mode) {
  const double* p = values.data();
  const int* w = wet.data();
  auto value = [=](int c, double& v) {
    v = p[c];
    return w[c] == 1 && v != delete_value;
  };
  auto any = [=](int c, double& v) {
    v = p[c];
    return v != delete_value;
  };
  NodeLoop(mesh, node_values, mode, value, 0.0, &any);
}

// ---- 3D ----------------------------------------------------------------------------------------

void CALCNODEVALUESPL3D(const Mesh& mesh3d, const Array1<double>& values, Array1<double>& node_values,
                        double delete_value, int mode) {
  CALCNODEVALUESPL2D(mesh3d, values, node_values, delete_value, mode);
}

void CALCNODEVALUESWETPL3D(const Mesh& mesh3d, const Array1<double>& values, const Array1<int>& wet2d,
                           Array1<double>& node_values, double delete_value, int mode) {
  const double* p = values.data();
  const int* w = wet2d.data();
  const int* column = mesh3d.element_column.data();
  auto value = [=](int c, double& v) {
    v = p[c];
    return w[column[c]] == 1 && v != delete_value;
  };
  NodeLoop(mesh3d, node_values, mode, value, delete_value, static_cast<const NoFallback*>(nullptr));
}

void CALCNODEVALUES2WETPL3D(const Mesh& mesh3d, const Array1<double>& values, const Array1<int>& wet2d,
                            Array1<double>& node_values, double delete_value, int mode) {
  const double* p = values.data();
  const int* w = wet2d.data();
  const int* column = mesh3d.element_column.data();
  auto value = [=](int c, double& v) {
    v = p[c];
    return w[column[c]] == 1 && v != delete_value;
  };
  auto any = [=](int c, double& v) {
    v = p[c];
    return v != delete_value;
  };
  NodeLoop(mesh3d, node_values, mode, value, 0.0, &any);
}

void CALCNODEVALUES3WETPL3D(const Mesh& mesh3d, const Array1<double>& values, const Array1<int>& wet3d,
                            Array1<double>& node_values, double delete_value, int mode) {
  CALCNODEVALUESWETPL2D(mesh3d, values, wet3d, node_values, delete_value, mode);
}

void CALCNODEVALUESWETPL3DLAYER(const Mesh& mesh2d, const Mesh& mesh3d, int layer, const Array1<double>& values,
                                const Array1<int>& wet2d, Array1<double>& node_values, double delete_value,
                                int mode) {
  const double* p = values.data();
  const int* w = wet2d.data();
  const int* cstart = mesh3d.column_element_start.data();
  auto value = [=](int c, double& v) {
    const int e = cstart[c] + layer - 1;
    if (layer < 1 || e >= cstart[c + 1] || w[c] != 1) return false;
    v = p[e];
    return v != delete_value;
  };
  NodeLoop(mesh2d, node_values, mode, value, delete_value, static_cast<const NoFallback*>(nullptr));
}

// ---- point values ------------------------------------------------------------------------------

namespace {

// Area coordinates (xi, eta) of P in triangle (a, b, c): P = a + xi (b - a) +
// eta (c - a). Returns false for a degenerate triangle.
inline bool AreaCoordinates(double px, double py, double ax, double ay, double bx, double by, double cx, double cy,
                            double& xi, double& eta) {
  const double d = (bx - ax) * (cy - ay) - (by - ay) * (cx - ax);
  if (d == 0) return false;
  xi = ((px - ax) * (cy - ay) - (py - ay) * (cx - ax)) / d;
  eta = ((bx - ax) * (py - ay) - (by - ay) * (px - ax)) / d;
  return true;
}

inline bool InsideTolerance(double xi, double eta) {
  return xi >= -1e-10 && xi <= 1.0000000001 && eta >= -1e-10 && eta <= 1.0000000001 && xi + eta <= 1.0000000001;
}

// Plane value in the 2D ring of nc corner nodes list[0 .. nc-1] (node numbers)
// with values v (already unwrapped). Returns false for a degenerate element.
double RingValue(const NodeTable& nd, const int* nodes, int nc, const double* v, double x, double y, bool geo) {
  double px[4], py[4];
  for (int j = 0; j < nc; ++j) {
    px[j] = detail::DeltaX(nd.x[nodes[0]], nd.x[nodes[j]], geo);
    py[j] = nd.y[nodes[j]];
  }
  const double qx = detail::DeltaX(nd.x[nodes[0]], x, geo);
  auto plane = [&](int a, int b, int c, double& val, double& worst) {
    double xi = 0, eta = 0;
    if (!AreaCoordinates(qx, y, px[a], py[a], px[b], py[b], px[c], py[c], xi, eta)) {
      worst = -1e300;
      return false;
    }
    val = v[a] + xi * (v[b] - v[a]) + eta * (v[c] - v[a]);
    worst = std::min({xi, eta, 1.0 - xi - eta});
    return InsideTolerance(xi, eta);
  };
  double v1 = 0, w1 = 0;
  const bool in1 = plane(0, 1, 2, v1, w1);
  if (nc == 3) return v1;
  double v2 = 0, w2 = 0;
  const bool in2 = plane(0, 2, 3, v2, w2);
  if (in1 && in2) return 0.5 * (v1 + v2);
  if (in1) return v1;
  if (in2) return v2;
  return w1 >= w2 ? v1 : v2;
}

}  // namespace

double CalcPointValue2D(const Mesh& mesh, double x, double y, int e, const Array1<double>& node_values,
                        double delete_value, int mode) {
  const ElementTable& el = mesh.elements;
  const int nc = ElementNodeCount(el, e);
  if (nc != 3 && nc != 4) FatalError("CalcPointValue2D: Interpolation not possible for this type of element");
  int nodes[4];
  double v[4];
  for (int j = 0; j < nc; ++j) {
    nodes[j] = ElementNode(el, e, j + 1);
    v[j] = node_values[nodes[j]];
    if (v[j] == delete_value) return delete_value;
    if (mode == kModeDirection && j > 0) v[j] = Unwrap360(v[j], v[0]);
  }
  const double r = RingValue(mesh.nodes, nodes, nc, v, x, y, IsGeographic(mesh.projection));
  return mode == kModeDirection ? Wrap360(r) : r;
}

double CalcPointValue3D(const Mesh& mesh3d, double x, double y, double z, int e, const Array1<double>& node_values,
                        double delete_value, int mode) {
  const ElementTable& el = mesh3d.elements;
  const NodeTable& nd = mesh3d.nodes;
  const int n = ElementNodeCount(el, e);
  if (n != 6 && n != 8) FatalError("CalcPointValue3D: Interpolation not possible for this type of element");
  const int nc = n / 2;
  const bool geo = IsGeographic(mesh3d.projection);
  int bottom[4], top[4];
  double vb[4], vt[4], zb[4], zt[4];
  for (int j = 0; j < nc; ++j) {
    bottom[j] = ElementNode(el, e, j + 1);
    top[j] = ElementNode(el, e, nc + j + 1);
    vb[j] = node_values[bottom[j]];
    vt[j] = node_values[top[j]];
    if (vb[j] == delete_value || vt[j] == delete_value) return delete_value;
    if (mode == kModeDirection) {
      vb[j] = Unwrap360(vb[j], node_values[bottom[0]]);
      vt[j] = Unwrap360(vt[j], node_values[bottom[0]]);
    }
    zb[j] = nd.z[bottom[j]];
    zt[j] = nd.z[top[j]];
  }
  const double lb = RingValue(nd, bottom, nc, zb, x, y, geo), lt = RingValue(nd, bottom, nc, zt, x, y, geo);
  const double pb = RingValue(nd, bottom, nc, vb, x, y, geo), pt = RingValue(nd, bottom, nc, vt, x, y, geo);
  const double t = lt != lb ? std::clamp((z - lb) / (lt - lb), 0.0, 1.0) : 0.5;
  const double r = pb + t * (pt - pb);
  return mode == kModeDirection ? Wrap360(r) : r;
}

}  // namespace vhd
