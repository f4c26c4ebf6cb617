// Faces, element and face geometry, neighbour tables and sparse patterns.

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <new>
#include <string>
#include <vector>

#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

constexpr double kPi = 3.14159265358979323846;
constexpr double kTwoPi = 2 * kPi;

// Longitude x made continuous with the reference longitude (radians).
inline double Unwrap(double x, double ref) {
  const double d = x - ref;
  if (d < -kPi) return x + kTwoPi;
  if (d > kPi) return x - kTwoPi;
  return x;
}

// Longitude brought back into (-pi, pi].
inline double WrapLongitude(double x) {
  if (x > kPi) return x - kTwoPi;
  if (x <= -kPi) return x + kTwoPi;
  return x;
}

// Twice the signed area of triangle (1, 2, 3): positive counter-clockwise.
inline double TwiceArea(double x1, double y1, double x2, double y2, double x3, double y3) {
  return x1 * (y2 - y3) + x2 * (y3 - y1) + x3 * (y1 - y2);
}

// Length of the edge (x1,y1)-(x2,y2) in metres; geographic coordinates are
// radians on a sphere of the earth's radius.
inline double EdgeMetres(double x1, double y1, double x2, double y2, bool geographic) {
  if (!geographic) return std::hypot(x2 - x1, y2 - y1);
  const double c = std::cos(0.5 * (y1 + y2));
  return kMeshEarthRadius * std::hypot((x2 - x1) * c, y2 - y1);
}

struct Corners {
  int n = 0;
  double x[9], y[9], z[9];
};

// Node coordinates of element e (geographic longitudes continuous with node 1).
void LoadElement(const ElementTable& el, const NodeTable& nd, int e, bool geographic, Corners& c) {
  c.n = std::min(ElementNodeCount(el, e), 9);
  for (int j = 0; j < c.n; ++j) {
    const int k = ElementNode(el, e, j + 1);
    c.x[j] = nd.x[k];
    c.y[j] = nd.y[k];
    c.z[j] = nd.z[k];
    if (geographic && j > 0) c.x[j] = Unwrap(c.x[j], c.x[0]);
  }
}

// Number of corner nodes of the horizontal base of an element type (3 for
// triangles and prisms, 4 for quadrilaterals and hexahedra, else 0).
int BaseCorners(int type) {
  int dim = 0, shape = 0, ftype = 0;
  if (!ElementTypeInfo(type, dim, shape, ftype)) return 0;
  if (dim == 2) return shape == kShapeTriangle ? 3 : 4;
  if (dim == 3 && shape == kShapePrism) return 3;
  if (dim == 3 && shape == kShapeHexahedron) return 4;
  return 0;
}

// Twice the signed area of the base polygon of element e (shoelace).
double BaseOrientation(const ElementTable& el, const NodeTable& nd, int e, bool geographic) {
  const int nc = BaseCorners(el.type[e]);
  if (nc == 0) return 1.0;
  double x[4], y[4];
  for (int j = 0; j < nc; ++j) {
    const int k = ElementNode(el, e, j + 1);
    x[j] = nd.x[k];
    y[j] = nd.y[k];
    if (geographic && j > 0) x[j] = Unwrap(x[j], x[0]);
  }
  double s = 0;
  for (int j = 0; j < nc; ++j) {
    const int i = (j + 1) % nc;
    s += x[j] * y[i] - x[i] * y[j];
  }
  return s;
}

bool ElementHasNode(const ElementTable& el, int e, int node) {
  for (int p = el.node_start[e]; p < el.node_start[e + 1]; ++p)
    if (el.node_list[p] == node) return true;
  return false;
}

// Local face of element e with exactly the n given nodes; 0 when none.
int LocalFaceWithNodes(const Mesh& mesh, int e, const int* fn, int n) {
  const ElementTable& el = mesh.elements;
  const RefElement& r = ElementShape(mesh, e);
  const int nf = r.NumberOfMeshFaces(), npf = r.NodesPerMeshFace();
  for (int lf = 1; lf <= nf; ++lf) {
    int count = 0;
    bool all = true;
    for (int j = 1; j <= npf && all; ++j) {
      const int local = r.MeshFaceNode(lf, j);
      if (local == 0) continue;
      ++count;
      const int node = ElementNode(el, e, local);
      all = std::find(fn, fn + n, node) != fn + n;
    }
    if (all && count == n) return lf;
  }
  return 0;
}

void CheckCounts(const ElementTable& el, int nnodes, const char* routine, bool spaced) {
  const std::string r(routine);
  if (el.nelements <= 0) FatalError(r + (spaced ? ": " : ":") + "Number of elements are <= 0");
  if (nnodes <= 0) FatalError(r + ": Number of nodes are <= 0");
}

}  // namespace

int BoundaryFaceCode(int code_a, int code_b) { return std::max({code_a, code_b, 1}); }

// ---- neighbour tables -------------------------------------------------------------------

void NodeElementTable_CRS(const ElementTable& el, int nnodes, Array1<int>& start, Array1<int>& list) {
  CheckCounts(el, nnodes, "NodeElementTable_CRS", true);
  try {
    // A node listed twice in one element (a collapsed edge of a cut cell)
    // lists the element once.
    auto repeated = [&el](int e, int p) {
      for (int q = el.node_start[e]; q < p; ++q)
        if (el.node_list[q] == el.node_list[p]) return true;
      return false;
    };
    start.assign(nnodes + 1, 0);
    for (int e = 1; e <= el.nelements; ++e) {
      if (el.id[e] == 0) continue;
      for (int p = el.node_start[e]; p < el.node_start[e + 1]; ++p) {
        const int k = el.node_list[p];
        if (k < 1 || k > nnodes)
          FatalError("NodeElementTable_CRS: Node " + std::to_string(k) + " of element " + std::to_string(e) +
                     " is outside 1 .. " + std::to_string(nnodes));
        if (!repeated(e, p)) ++start[k + 1];
      }
    }
    start[1] = 1;
    for (int k = 1; k <= nnodes; ++k) start[k + 1] += start[k];
    list.assign(std::max(start[nnodes + 1] - 1, 1), 0);
    std::vector<int> fill(start.raw());
    for (int e = 1; e <= el.nelements; ++e) {
      if (el.id[e] == 0) continue;
      for (int p = el.node_start[e]; p < el.node_start[e + 1]; ++p)
        if (!repeated(e, p)) list[fill[el.node_list[p]]++] = e;
    }
  } catch (const std::bad_alloc&) {
    FatalError("NodeElementTable_CRS: Out of memory");
  }
}

void CompNodeNodeTable_CRS(const ElementTable& el, int nnodes, Array1<int>& start, Array1<int>& list) {
  CheckCounts(el, nnodes, "CompNodeNodeTable_CRS", true);
  Array1<int> nestart, nelist;
  NodeElementTable_CRS(el, nnodes, nestart, nelist);
  try {
    // Neighbours of a node: every other node of the elements around it.
    std::vector<int> mark(static_cast<std::size_t>(nnodes) + 1, 0);
    std::vector<int> found;
    start.assign(nnodes + 1, 0);
    start[1] = 1;
    std::vector<int> all;
    all.reserve(static_cast<std::size_t>(nnodes) * 7);
    for (int k = 1; k <= nnodes; ++k) {
      found.clear();
      mark[k] = k;
      for (int q = nestart[k]; q < nestart[k + 1]; ++q) {
        const int e = nelist[q];
        for (int p = el.node_start[e]; p < el.node_start[e + 1]; ++p) {
          const int m = el.node_list[p];
          if (mark[m] != k) {
            mark[m] = k;
            found.push_back(m);
          }
        }
      }
      std::sort(found.begin(), found.end());
      all.insert(all.end(), found.begin(), found.end());
      start[k + 1] = start[k] + static_cast<int>(found.size());
    }
    list.assign(std::max(static_cast<int>(all.size()), 1), 0);
    std::copy(all.begin(), all.end(), list.begin());
  } catch (const std::bad_alloc&) {
    FatalError("CompNodeNodeTable_CRS: Out of memory");
  }
}

void CreateNodeElementConnectivity(Mesh& mesh) {
  NodeElementTable_CRS(mesh.elements, mesh.nodes.nnodes, mesh.nodes.element_start, mesh.nodes.element_list);
}

void CreateNodeNodeConnectivity(Mesh& mesh) {
  CompNodeNodeTable_CRS(mesh.elements, mesh.nodes.nnodes, mesh.nodes.node_start, mesh.nodes.node_list);
}

void CreateElementFaceConnectivity(Mesh& mesh) {
  ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  try {
    el.face_start.assign(el.nelements + 1, 0);
    el.face_start[1] = 1;
    for (int e = 1; e <= el.nelements; ++e)
      el.face_start[e + 1] = el.face_start[e] + (el.shape[e] == 0 ? 0 : ElementShape(mesh, e).NumberOfMeshFaces());
    el.face_list.assign(std::max(el.face_start[el.nelements + 1] - 1, 1), 0);
  } catch (const std::bad_alloc&) {
    FatalError("CreateElementFaceConnectivity: Out of memory");
  }
  for (int f = 1; f <= fc.nfaces; ++f) {
    el.face_list[el.face_start[fc.element1[f]] + fc.localface1[f] - 1] = f;
    if (fc.element2[f] > 0) el.face_list[el.face_start[fc.element2[f]] + fc.localface2[f] - 1] = f;
  }
}

// ---- faces ----------------------------------------------------------------------------------

int FindFaceInElement(const Mesh& mesh, int e, const int* face_nodes, int n) {
  const int lf = LocalFaceWithNodes(mesh, e, face_nodes, n);
  if (lf == 0) FatalError("FindFaceInElement:  Failed finding a neighbour element");
  return lf;
}

void CalcFaces(Mesh& mesh, int& nfaces, int& nboundary_faces) {
  ElementTable& el = mesh.elements;
  NodeTable& nd = mesh.nodes;
  if (el.nelements <= 0) FatalError("CalcFaces: Number of elements are <= 0");
  if (nd.nnodes <= 0) FatalError("CalcFaces: Number of nodes are <= 0");
  if (mesh.shapes.empty()) SetupShapeData(mesh);
  NodeElementTable_CRS(el, nd.nnodes, nd.element_start, nd.element_list);

  const int ne = el.nelements;
  std::vector<std::uint8_t> done;
  std::vector<int> e1, e2, l1, l2, code, fstart, fnodes;
  try {
    done.assign(static_cast<std::size_t>(ne + 1) * kMaxElementFaces, 0);
    const std::size_t guess = static_cast<std::size_t>(ne) * 2 + 16;
    for (auto* v : {&e1, &e2, &l1, &l2, &code, &fstart}) v->reserve(guess);
    fnodes.reserve(guess * 2);
  } catch (const std::bad_alloc&) {
    FatalError("CalcFace: Out of memory");
  }
  auto flag = [&](int e, int lf) -> std::uint8_t& {
    return done[static_cast<std::size_t>(e) * kMaxElementFaces + (lf - 1)];
  };

  nboundary_faces = 0;
  int fn[kMaxElementFaces];
  try {
    for (int e = 1; e <= ne; ++e) {
      if (el.shape[e] == 0) continue;
      const RefElement& r = ElementShape(mesh, e);
      const int nf = r.NumberOfMeshFaces(), npf = r.NodesPerMeshFace();
      for (int lf = 1; lf <= nf; ++lf) {
        if (flag(e, lf)) continue;
        int n = 0;
        for (int j = 1; j <= npf; ++j) {
          const int local = r.MeshFaceNode(lf, j);
          if (local != 0) fn[n++] = ElementNode(el, e, local);
        }
        int nb = 0, lfnb = 0;
        for (int q = nd.element_start[fn[0]]; q < nd.element_start[fn[0] + 1]; ++q) {
          const int c = nd.element_list[q];
          if (c == e) continue;
          bool all = true;
          for (int j = 1; j < n && all; ++j) all = ElementHasNode(el, c, fn[j]);
          if (!all) continue;
          const int lfc = FindFaceInElement(mesh, c, fn, n);
          if (flag(c, lfc)) continue;  // already paired: a third element on one face
          nb = c;
          lfnb = lfc;
          break;
        }
        int a = e, la = lf, b = nb, lb = lfnb;
        if (nb > 0 && RunOrder(el, nb) < RunOrder(el, e)) {
          // The face takes the neighbour's side and its local node order.
          std::swap(a, b);
          std::swap(la, lb);
          const RefElement& rn = ElementShape(mesh, a);
          n = 0;
          for (int j = 1; j <= npf; ++j) {
            const int local = rn.MeshFaceNode(la, j);
            if (local != 0) fn[n++] = ElementNode(el, a, local);
          }
        }
        e1.push_back(a);
        e2.push_back(b);
        l1.push_back(la);
        l2.push_back(lb);
        fstart.push_back(n);
        int c = 0;
        if (nb == 0) {
          ++nboundary_faces;
          for (int j = 0; j < n; ++j) c = std::max(c, nd.code[fn[j]]);
          c = BoundaryFaceCode(c, 0);
        }
        code.push_back(c);
        fnodes.insert(fnodes.end(), fn, fn + n);
        flag(e, lf) = 1;
        if (nb > 0) flag(nb, lfnb) = 1;
      }
    }
  } catch (const std::bad_alloc&) {
    FatalError("CalcFace: Out of memory");
  }
  nfaces = static_cast<int>(e1.size());
  if (nfaces == 0) FatalError("CalcFace: nfaces is zero");

  FaceTable& fc = mesh.faces;
  AllocateFacesBasic(fc, nfaces, static_cast<int>(fnodes.size()));
  int pos = 1;
  for (int f = 1; f <= nfaces; ++f) {
    fc.id[f] = f;
    fc.element1[f] = e1[f - 1];
    fc.element2[f] = e2[f - 1];
    fc.localface1[f] = l1[f - 1];
    fc.localface2[f] = l2[f - 1];
    fc.code[f] = code[f - 1];
    for (int j = 0; j < fstart[f - 1]; ++j, ++pos) fc.node_list[pos] = fnodes[pos - 1];
    fc.node_start[f + 1] = pos;
  }
  fc.nfaces = fc.nfaces_int = nfaces;
  fc.nboundary_faces = nboundary_faces;
}

// ---- geometry -------------------------------------------------------------------------------

void CalcElementValues(ElementTable& el, const NodeTable& nd, const std::string& projection) {
  const bool geo = IsGeographic(projection);
  const int ne = el.nelements;
  try {
    for (auto* a : {&el.area, &el.xc, &el.yc, &el.zc, &el.length}) a->assign(ne, 0.0);
    el.dndx.assign(3 * ne, 0.0);
    el.dndy.assign(3 * ne, 0.0);
    el.cos_lat.assign(ne, 1.0);
    el.tan_lat.assign(ne, 0.0);
  } catch (const std::bad_alloc&) {
    FatalError("CalcElementValues: Out of memory");
  }
  Corners c;
  for (int e = 1; e <= ne; ++e) {
    if (el.id[e] == 0) continue;
    LoadElement(el, nd, e, geo, c);
    double sx = 0, sy = 0, sz = 0;
    for (int j = 0; j < c.n; ++j) {
      sx += c.x[j];
      sy += c.y[j];
      sz += c.z[j];
    }
    el.xc[e] = geo ? WrapLongitude(sx / c.n) : sx / c.n;
    el.yc[e] = sy / c.n;
    el.zc[e] = sz / c.n;
    if (geo) {
      el.cos_lat[e] = std::cos(el.yc[e]);
      el.tan_lat[e] = std::tan(el.yc[e]);
    }
    int dim = 0, shape = 0, ftype = 0;
    ElementTypeInfo(el.type[e], dim, shape, ftype);
    if (shape == kShapePoint) continue;
    auto edge = [&](int a, int b) { return EdgeMetres(c.x[a], c.y[a], c.x[b], c.y[b], geo); };
    const double* x = c.x;
    const double* y = c.y;
    const double* z = c.z;
    if (dim == 1) {
      el.area[e] = std::hypot(x[1] - x[0], y[1] - y[0]);
      el.length[e] = edge(0, 1);
    } else if (dim == 2 && shape == kShapeTriangle) {
      const double a2 = TwiceArea(x[0], y[0], x[1], y[1], x[2], y[2]);
      el.area[e] = 0.5 * std::abs(a2);
      if (a2 != 0) {
        double* dx = &el.dndx[3 * (e - 1) + 1];
        double* dy = &el.dndy[3 * (e - 1) + 1];
        dx[0] = (y[1] - y[2]) / a2;
        dx[1] = (y[2] - y[0]) / a2;
        dx[2] = (y[0] - y[1]) / a2;
        dy[0] = (x[2] - x[1]) / a2;
        dy[1] = (x[0] - x[2]) / a2;
        dy[2] = (x[1] - x[0]) / a2;
      }
      el.length[e] = std::min({edge(0, 1), edge(1, 2), edge(2, 0)});
    } else if (dim == 2) {
      el.area[e] = 0.5 * std::abs(TwiceArea(x[0], y[0], x[1], y[1], x[2], y[2]) +
                                  TwiceArea(x[0], y[0], x[2], y[2], x[3], y[3]));
      el.length[e] = std::min({edge(0, 1), edge(1, 2), edge(2, 3), edge(3, 0)});
    } else if (shape == kShapeTetrahedron) {
      const double ax = x[1] - x[0], ay = y[1] - y[0], az = z[1] - z[0];
      const double bx = x[2] - x[0], by = y[2] - y[0], bz = z[2] - z[0];
      const double cx = x[3] - x[0], cy = y[3] - y[0], cz = z[3] - z[0];
      el.area[e] = std::abs(ax * (by * cz - bz * cy) - ay * (bx * cz - bz * cx) + az * (bx * cy - by * cx)) / 6;
      double len = 1e300;
      for (int a = 0; a < 4; ++a)
        for (int b = a + 1; b < 4; ++b)
          len = std::min(len, std::sqrt(std::pow(edge(a, b), 2) + (z[b] - z[a]) * (z[b] - z[a])));
      el.length[e] = len;
    } else if (shape == kShapePrism) {
      const double base = 0.5 * std::abs(TwiceArea(x[0], y[0], x[1], y[1], x[2], y[2]));
      el.area[e] = ((z[3] - z[0]) + (z[4] - z[1]) + (z[5] - z[2])) / 3 * base;
      el.length[e] = std::min({edge(0, 1), edge(1, 2), edge(2, 0)});
      if (el.area[e] <= 0) WriteLogLine("ZERO AREA");
    } else {
      const double base = 0.5 * std::abs(TwiceArea(x[0], y[0], x[1], y[1], x[2], y[2]) +
                                         TwiceArea(x[0], y[0], x[2], y[2], x[3], y[3]));
      el.area[e] = 0.25 * ((z[4] - z[0]) + (z[5] - z[1]) + (z[6] - z[2]) + (z[7] - z[3])) * base;
      el.length[e] = std::min({edge(0, 1), edge(1, 2), edge(2, 3), edge(3, 0)});
      if (el.area[e] <= 0) WriteLogLine("ZERO AREA");
    }
  }
}

void CalcFaceValues(FaceTable& fc, const ElementTable& el, const NodeTable& nd, const std::string& projection) {
  const bool geo = IsGeographic(projection);
  const int nf = fc.nfaces;
  try {
    for (auto* a : {&fc.length, &fc.nx, &fc.ny, &fc.nz, &fc.xf, &fc.yf, &fc.zf, &fc.dist1, &fc.dist2, &fc.dist12})
      a->assign(nf, 0.0);
    fc.cos_lat.assign(nf, 1.0);
  } catch (const std::bad_alloc&) {
    FatalError("CalcFaceValues: Out of memory");
  }
  for (int f = 1; f <= nf; ++f) {
    const int n = std::min(FaceNodeCount(fc, f), 4);
    const int e1 = fc.element1[f], e2 = fc.element2[f];
    double x[4], y[4], z[4];
    for (int j = 0; j < n; ++j) {
      const int k = FaceNode(fc, f, j + 1);
      x[j] = nd.x[k];
      y[j] = nd.y[k];
      z[j] = nd.z[k];
      if (geo && j > 0) x[j] = Unwrap(x[j], x[0]);
    }
    double sx = 0, sy = 0, sz = 0;
    for (int j = 0; j < n; ++j) {
      sx += x[j];
      sy += y[j];
      sz += z[j];
    }
    const double xf = sx / n, yf = sy / n, zf = sz / n;

    int dim = 0, shape = 0, ftype = 0;
    ElementTypeInfo(el.type[e1], dim, shape, ftype);
    const bool side_face = dim == 3 && fc.localface1[f] <= BaseCorners(el.type[e1]);
    double nx = 0, ny = 0, nz = 0, len = 0;
    if (dim <= 2 || side_face) {
      // Horizontal normal to the right of the edge 1 -> 2: out of an element
      // whose nodes run counter-clockwise, flipped for a clockwise element.
      const double dx = x[1] - x[0], dy = y[1] - y[0];
      const double l = std::hypot(dx, dy);
      if (l > 0) {
        nx = dy / l;
        ny = -dx / l;
      }
      if (BaseOrientation(el, nd, e1, geo) < 0) {
        nx = -nx;
        ny = -ny;
      }
      len = l;
      // Mean height times length; a side of a cut cell may have zero height
      // by construction and is not reported.
      if (side_face) len = 0.5 * (std::abs(z[3] - z[0]) + std::abs(z[2] - z[1])) * l;
    } else {
      // Cross product of the edges (two triangles for a quadrilateral),
      // oriented out of element1.
      const double ax = x[1] - x[0], ay = y[1] - y[0], az = z[1] - z[0];
      const double bx = x[2] - x[0], by = y[2] - y[0], bz = z[2] - z[0];
      nx = 0.5 * (ay * bz - az * by);
      ny = 0.5 * (az * bx - ax * bz);
      nz = 0.5 * (ax * by - ay * bx);
      if (n == 4) {
        const double cx = x[3] - x[0], cy = y[3] - y[0], cz = z[3] - z[0];
        nx += 0.5 * (by * cz - bz * cy);
        ny += 0.5 * (bz * cx - bx * cz);
        nz += 0.5 * (bx * cy - by * cx);
      }
      len = std::sqrt(nx * nx + ny * ny + nz * nz);
      if (len > 0) {
        nx /= len;
        ny /= len;
        nz /= len;
      } else {
        WriteLogLine("ZERO AREA");
      }
      const double xc = geo ? Unwrap(el.xc[e1], xf) : el.xc[e1];
      if ((xf - xc) * nx + (yf - el.yc[e1]) * ny + (zf - el.zc[e1]) * nz < 0) {
        nx = -nx;
        ny = -ny;
        nz = -nz;
      }
    }
    fc.length[f] = len;
    fc.nx[f] = nx;
    fc.ny[f] = ny;
    fc.nz[f] = nz;
    fc.xf[f] = geo ? WrapLongitude(xf) : xf;
    fc.yf[f] = yf;
    fc.zf[f] = zf;
    if (geo) fc.cos_lat[f] = std::cos(yf);

    // Distances in the plane of the coordinates (3D: with z).
    const bool use_z = dim == 3;
    auto dist = [&](double ax, double ay, double az, double bx, double by, double bz) {
      const double dx = geo ? Unwrap(bx, ax) - ax : bx - ax;
      return std::sqrt(dx * dx + (by - ay) * (by - ay) + (use_z ? (bz - az) * (bz - az) : 0.0));
    };
    fc.dist1[f] = dist(xf, yf, zf, el.xc[e1], el.yc[e1], el.zc[e1]);
    if (e2 > 0) {
      fc.dist2[f] = dist(xf, yf, zf, el.xc[e2], el.yc[e2], el.zc[e2]);
      fc.dist12[f] = dist(el.xc[e1], el.yc[e1], el.zc[e1], el.xc[e2], el.yc[e2], el.zc[e2]);
    } else {
      const double dx = geo ? xf - Unwrap(el.xc[e1], xf) : xf - el.xc[e1];
      fc.dist12[f] =
          2 * std::abs(dx * nx + (yf - el.yc[e1]) * ny + (use_z ? (zf - el.zc[e1]) * nz : 0.0));
    }
  }
}

void FaceMetres(const Mesh& mesh, int f, double& nx, double& ny, double& length) {
  const FaceTable& fc = mesh.faces;
  if (!IsGeographic(mesh.projection)) {
    nx = fc.nx[f], ny = fc.ny[f], length = fc.length[f];
    return;
  }
  // The stored normal (dlat, -dlon) / L with the east component of the edge
  // shortened by cos(lat): (R dlat, -R cos(lat) dlon) = R L (nx, cos(lat) ny).
  const double mx = fc.nx[f], my = fc.ny[f] * fc.cos_lat[f];
  const double m = std::hypot(mx, my);
  nx = m > 0 ? mx / m : 0.0;
  ny = m > 0 ? my / m : 0.0;
  length = kMeshEarthRadius * fc.length[f] * m;
}

double FaceLengthMetres(const Mesh& mesh, int f) {
  double nx, ny, length;
  FaceMetres(mesh, f, nx, ny, length);
  return length;
}

double ElementAreaMetres(const Mesh& mesh, int e) {
  const ElementTable& el = mesh.elements;
  if (!IsGeographic(mesh.projection)) return el.area[e];
  return el.area[e] * kMeshEarthRadius * kMeshEarthRadius * el.cos_lat[e];
}

void OrderNodeElements(Mesh& mesh) {
  NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  auto by_centre = [&el](int a, int b) {
    if (el.xc[a] != el.xc[b]) return el.xc[a] < el.xc[b];
    if (el.yc[a] != el.yc[b]) return el.yc[a] < el.yc[b];
    if (el.zc[a] != el.zc[b]) return el.zc[a] < el.zc[b];
    return a < b;
  };
  for (int n = 1; n <= nd.nnodes; ++n)
    std::sort(nd.element_list.data() + nd.element_start[n], nd.element_list.data() + nd.element_start[n + 1],
              by_centre);
}

void CalcNodeValues(Mesh& mesh) {
  NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  try {
    nd.area.assign(nd.nnodes, 0.0);
  } catch (const std::bad_alloc&) {
    FatalError("CalcNodeValues: Out of memory");
  }
  // Summed over the node's element list, whose order does not depend on the
  // numbering; a node listed twice in one element takes its share twice.
  for (int i = 1; i <= nd.nnodes; ++i) {
    double a = 0;
    for (int q = nd.element_start[i]; q < nd.element_start[i + 1]; ++q) {
      const int e = nd.element_list[q];
      if (el.id[e] == 0) continue;
      const int n = ElementNodeCount(el, e);
      for (int j = 1; j <= n; ++j)
        if (ElementNode(el, e, j) == i) a += el.area[e] / n;
    }
    nd.area[i] = a;
  }
}

// ---- sparse patterns ---------------------------------------------------------------------------

namespace {

// Pattern from rows of neighbour lists, adding the diagonal and sorting.
void BuildPattern(int nrows, const Array1<int>& start, const Array1<int>& list, SparsePattern& p) {
  p.nrows = nrows;
  p.row_start.assign(nrows + 1, 0);
  p.row_start[1] = 1;
  for (int r = 1; r <= nrows; ++r) p.row_start[r + 1] = p.row_start[r] + (start[r + 1] - start[r]) + 1;
  p.column.assign(p.row_start[nrows + 1] - 1, 0);
  p.diagonal.assign(nrows, 0);
  for (int r = 1; r <= nrows; ++r) {
    int* row = &p.column[p.row_start[r]];
    int n = 0;
    row[n++] = r;
    for (int q = start[r]; q < start[r + 1]; ++q) row[n++] = list[q];
    std::sort(row, row + n);
    p.diagonal[r] = p.row_start[r] + static_cast<int>(std::find(row, row + n, r) - row);
  }
}

}  // namespace

void CreateSpStructureMeshCRS(const Mesh& mesh, SparsePattern& element_pattern) {
  const ElementTable& el = mesh.elements;
  if (el.nelements <= 0) FatalError("CreateSpStructureMeshCRS:Number of elements are <= 0");
  if (mesh.nodes.nnodes <= 0) FatalError("CreateSpStructureMeshCRS: Number of nodes are <= 0");
  try {
    // Face neighbours of every element, in its local face order.
    const int ne = el.nelements;
    const FaceTable& fc = mesh.faces;
    Array1<int> start(ne + 1, 0), list;
    for (int f = 1; f <= fc.nfaces; ++f)
      if (fc.element2[f] > 0) {
        ++start[fc.element1[f] + 1];
        ++start[fc.element2[f] + 1];
      }
    start[1] = 1;
    for (int e = 1; e <= ne; ++e) start[e + 1] += start[e];
    list.assign(std::max(start[ne + 1] - 1, 1), 0);
    std::vector<int> fill(start.raw());
    for (int f = 1; f <= fc.nfaces; ++f)
      if (fc.element2[f] > 0) {
        list[fill[fc.element1[f]]++] = fc.element2[f];
        list[fill[fc.element2[f]]++] = fc.element1[f];
      }
    BuildPattern(ne, start, list, element_pattern);
  } catch (const std::bad_alloc&) {
    FatalError("CreateSpStructureMeshCRS: Out of memory");
  }
}

void CompSpIndexMesh(const Mesh& mesh, SparsePattern& node_pattern, SparsePattern& element_pattern) {
  Array1<int> start, list;
  CompNodeNodeTable_CRS(mesh.elements, mesh.nodes.nnodes, start, list);
  try {
    BuildPattern(mesh.nodes.nnodes, start, list, node_pattern);
  } catch (const std::bad_alloc&) {
    FatalError("CompSpIndexMesh: Out of memory");
  }
  CreateSpStructureMeshCRS(mesh, element_pattern);
}

// ---- the whole setup ---------------------------------------------------------------------------

void SetupMeshGeometry(Mesh& mesh) {
  SetupShapeData(mesh);
  GetMeshDimension(mesh);
  int nfaces = 0, nboundary = 0;
  CalcFaces(mesh, nfaces, nboundary);
  CreateElementFaceConnectivity(mesh);
  CreateNodeNodeConnectivity(mesh);
  CalcElementValues(mesh.elements, mesh.nodes, mesh.projection);
  OrderNodeElements(mesh);
  CalcFaceValues(mesh.faces, mesh.elements, mesh.nodes, mesh.projection);
  CalcNodeValues(mesh);
  if (mesh.nodes.nnodes_int == 0) mesh.nodes.nnodes_int = mesh.nodes.nnodes;
  if (mesh.elements.nelements_int == 0) mesh.elements.nelements_int = mesh.elements.nelements;
  if (mesh.faces.nfaces_int == 0) mesh.faces.nfaces_int = mesh.faces.nfaces;
}

}  // namespace vhd
