// Node, element and face tables and the shape table of reference elements.

#include "mesh/mesh.hpp"

#include <new>
#include <string>

#include "log/log.hpp"

namespace vhd {

bool IsGeographic(const std::string& projection) { return projection == "LONG/LAT"; }

// ---- tables ----------------------------------------------------------------------------

void AllocateNodes(NodeTable& nodes, int nnodes_max) {
  if (nnodes_max < 1) FatalError("AllocateNodesBasic: nnodess_max must be >= 0");
  try {
    nodes.nnodes_max = nnodes_max;
    nodes.nnodes = nodes.nnodes_all = nodes.nnodes_int = 0;
    nodes.id.assign(nnodes_max, 0);
    nodes.code.assign(nnodes_max, 0);
    nodes.x.assign(nnodes_max, 0.0);
    nodes.y.assign(nnodes_max, 0.0);
    nodes.z.assign(nnodes_max, 0.0);
    nodes.value.assign(nnodes_max, 0.0);
  } catch (const std::bad_alloc&) {
    FatalError("AllocateNodes: Out of memory");
  }
}

void AddNode(NodeTable& nodes, int id, double x, double y, double z, int code) {
  if (nodes.nnodes >= nodes.nnodes_max) FatalError("AddNode: nnodes_max is to small");
  const int n = ++nodes.nnodes;
  nodes.nnodes_all = n;
  nodes.nnodes_int = n;
  nodes.id[n] = id;
  nodes.x[n] = x;
  nodes.y[n] = y;
  nodes.z[n] = z;
  nodes.code[n] = code;
}

void AllocateElementsBasic(ElementTable& elements, int nelements_max, int nindexes_max) {
  if (nelements_max < 1) FatalError("AllocateElementsBasic: nelements_max must be >= 0");
  if (nindexes_max < 1) FatalError("AllocateElementsBasic: nindexes_max must be >= 0");
  try {
    elements.nelements_max = nelements_max;
    elements.nindexes_max = nindexes_max;
    elements.nelements = elements.nelements_all = elements.nelements_int = 0;
    elements.id.assign(nelements_max, 0);
    elements.type.assign(nelements_max, 0);
    elements.shape.assign(nelements_max, 0);
    elements.node_start.assign(nelements_max + 1, 0);
    elements.node_list.assign(nindexes_max, 0);
    elements.node_start[1] = 1;
  } catch (const std::bad_alloc&) {
    FatalError("AllocateElementsBasic: Out of memory");
  }
}

void AddElement(ElementTable& elements, int id, int type, int nnodes, const int* node_numbers) {
  int count = 0;
  for (int j = 0; j < nnodes; ++j)
    if (node_numbers[j] != 0) ++count;
  const int e = elements.nelements + 1;
  if (e > elements.nelements_max) FatalError("AddElement: nelements_max is to small");
  const int first = elements.node_start[e];
  if (first + count - 1 > elements.nindexes_max) FatalError("AddElement: nindexes_max is to small");
  int pos = first;
  for (int j = 0; j < nnodes; ++j)
    if (node_numbers[j] != 0) elements.node_list[pos++] = node_numbers[j];
  elements.node_start[e + 1] = pos;
  elements.id[e] = id;
  elements.type[e] = type;
  elements.nelements = elements.nelements_all = elements.nelements_int = e;
}

void AllocateFacesBasic(FaceTable& faces, int nfaces_max, int nindexes_max) {
  if (nfaces_max < 1) FatalError("AllocateFacesBasic: nfaces_max must be >= 0");
  if (nindexes_max < 1) FatalError("AllocateFacesBasic: nindexes_max must be >= 0");
  try {
    faces.nfaces_max = nfaces_max;
    faces.nindexes_max = nindexes_max;
    faces.nfaces = faces.nfaces_int = faces.nboundary_faces = 0;
    faces.id.assign(nfaces_max, 0);
    faces.code.assign(nfaces_max, 0);
    faces.element1.assign(nfaces_max, 0);
    faces.element2.assign(nfaces_max, 0);
    faces.localface1.assign(nfaces_max, 0);
    faces.localface2.assign(nfaces_max, 0);
    faces.node_start.assign(nfaces_max + 1, 0);
    faces.node_list.assign(nindexes_max, 0);
    faces.node_start[1] = 1;
  } catch (const std::bad_alloc&) {
    FatalError("AllocateFaces: Out of memory");
  }
}

void ReleaseMesh(Mesh& mesh) {
  const int number = mesh.number;
  mesh = Mesh{};
  mesh.number = number;
  mesh.ndim = 0;
  mesh.nlayers = 0;
}

// ---- element types ------------------------------------------------------------------------

bool ElementTypeInfo(int type, int& dimension, int& shape, int& function_type) {
  switch (type) {
    case 11: case 12: dimension = 1; shape = kShapeLine; function_type = type - 10; return true;
    case 21: case 22: case 23: case 24:
      dimension = 2; shape = kShapeTriangle; function_type = type - 20; return true;
    case 25: case 26: case 27: case 28:
      dimension = 2; shape = kShapeQuadrilateral; function_type = type - 24; return true;
    case 31: dimension = 3; shape = kShapeTetrahedron; function_type = 1; return true;
    case 32: dimension = 3; shape = kShapePrism; function_type = 1; return true;
    case 33: dimension = 3; shape = kShapeHexahedron; function_type = 1; return true;
    case 41: case 42: case 43: dimension = type - 40; shape = kShapePoint; function_type = 1; return true;
    default: return false;
  }
}

// ---- reference elements --------------------------------------------------------------------

namespace {

// Shape functions of a reference element at one point of its reference
// coordinates; n[j] for node j+1.
void ShapeValues(const RefElement& r, double xi, double eta, double zeta, double* n) {
  if (r.shape == kShapePoint) {
    n[0] = 1.0;
    return;
  }
  if (r.dimension == 1) {  // line on [-1, 1]; node 3 at the middle
    if (r.function_type == 1) {
      n[0] = 0.5 * (1 - xi);
      n[1] = 0.5 * (1 + xi);
    } else {
      n[0] = 0.5 * xi * (xi - 1);
      n[1] = 0.5 * xi * (xi + 1);
      n[2] = 1 - xi * xi;
    }
    return;
  }
  if (r.dimension == 2 && r.shape == kShapeTriangle) {
    const double l1 = 1 - xi - eta, l2 = xi, l3 = eta, bubble = 27 * l1 * l2 * l3;
    switch (r.function_type) {
      case 1: n[0] = l1; n[1] = l2; n[2] = l3; break;
      case 2:  // linear plus centre bubble
        n[0] = l1 - bubble / 3; n[1] = l2 - bubble / 3; n[2] = l3 - bubble / 3; n[3] = bubble; break;
      default: {  // quadratic, with the centre bubble for type 4
        const double c = r.function_type == 4 ? bubble / 9 : 0.0;
        n[0] = l1 * (2 * l1 - 1) + c;
        n[1] = l2 * (2 * l2 - 1) + c;
        n[2] = l3 * (2 * l3 - 1) + c;
        n[3] = 4 * l1 * l2 - 4 * c;
        n[4] = 4 * l2 * l3 - 4 * c;
        n[5] = 4 * l3 * l1 - 4 * c;
        if (r.function_type == 4) n[6] = bubble;
      }
    }
    return;
  }
  if (r.dimension == 2) {  // quadrilateral on [-1, 1]^2, corners counter-clockwise
    static const double cx[4] = {-1, 1, 1, -1}, cy[4] = {-1, -1, 1, 1};
    switch (r.function_type) {
      case 1:
      case 2: {
        const double bubble = (1 - xi * xi) * (1 - eta * eta);
        const double c = r.function_type == 2 ? bubble / 4 : 0.0;
        for (int j = 0; j < 4; ++j) n[j] = 0.25 * (1 + cx[j] * xi) * (1 + cy[j] * eta) - c;
        if (r.function_type == 2) n[4] = bubble;
        break;
      }
      case 3:  // serendipity: mid-side nodes 5..8 on the edges 1-2, 2-3, 3-4, 4-1
        for (int j = 0; j < 4; ++j)
          n[j] = 0.25 * (1 + cx[j] * xi) * (1 + cy[j] * eta) * (cx[j] * xi + cy[j] * eta - 1);
        n[4] = 0.5 * (1 - xi * xi) * (1 - eta);
        n[5] = 0.5 * (1 + xi) * (1 - eta * eta);
        n[6] = 0.5 * (1 - xi * xi) * (1 + eta);
        n[7] = 0.5 * (1 - xi) * (1 - eta * eta);
        break;
      default: {  // biquadratic Lagrange, node 9 at the centre
        auto q = [](int k, double s) {  // 1D quadratic at -1 (k=0), 0 (k=1), 1 (k=2)
          return k == 0 ? 0.5 * s * (s - 1) : k == 2 ? 0.5 * s * (s + 1) : 1 - s * s;
        };
        static const int ix[9] = {0, 2, 2, 0, 1, 2, 1, 0, 1}, iy[9] = {0, 0, 2, 2, 0, 1, 2, 1, 1};
        for (int j = 0; j < 9; ++j) n[j] = q(ix[j], xi) * q(iy[j], eta);
      }
    }
    return;
  }
  if (r.shape == kShapeTetrahedron) {
    n[0] = 1 - xi - eta - zeta; n[1] = xi; n[2] = eta; n[3] = zeta;
    return;
  }
  if (r.shape == kShapePrism) {  // triangle (xi, eta) x [-1, 1]
    const double l[3] = {1 - xi - eta, xi, eta};
    for (int j = 0; j < 3; ++j) {
      n[j] = l[j] * 0.5 * (1 - zeta);
      n[j + 3] = l[j] * 0.5 * (1 + zeta);
    }
    return;
  }
  static const double cx[4] = {-1, 1, 1, -1}, cy[4] = {-1, -1, 1, 1};  // hexahedron
  for (int j = 0; j < 4; ++j) {
    const double h = 0.25 * (1 + cx[j] * xi) * (1 + cy[j] * eta);
    n[j] = h * 0.5 * (1 - zeta);
    n[j + 4] = h * 0.5 * (1 + zeta);
  }
}

void AddGauss(RefElement& r, double xi, double eta, double zeta, double w) {
  r.gauss_xi.push_back(xi);
  r.gauss_eta.push_back(eta);
  r.gauss_zeta.push_back(zeta);
  r.gauss_weight.push_back(w);
}

// Gauss-Legendre points and weights on [-1, 1] with 1 .. 3 points.
void Legendre(int n, double* p, double* w) {
  if (n == 1) {
    p[0] = 0; w[0] = 2;
  } else if (n == 2) {
    p[0] = -0.57735026918962576; p[1] = -p[0]; w[0] = w[1] = 1;
  } else {
    p[0] = -0.7745966692414834; p[1] = 0; p[2] = -p[0];
    w[0] = w[2] = 5.0 / 9.0; w[1] = 8.0 / 9.0;
  }
}

// Symmetric triangle rules on (0,0),(1,0),(0,1), weights summing to 1/2:
// 3 points (degree 2) for linear functions, 7 points (degree 5) otherwise.
void TriangleRule(int npoints, std::vector<double>& xi, std::vector<double>& eta, std::vector<double>& w) {
  if (npoints == 3) {
    xi = {1.0 / 6, 2.0 / 3, 1.0 / 6};
    eta = {1.0 / 6, 1.0 / 6, 2.0 / 3};
    w = {1.0 / 6, 1.0 / 6, 1.0 / 6};
    return;
  }
  const double a1 = 0.059715871789770, b1 = 0.470142064105115;
  const double a2 = 0.797426985353087, b2 = 0.101286507323456;
  const double w1 = 0.132394152788506 / 2, w2 = 0.125939180544827 / 2;
  xi = {1.0 / 3, a1, b1, b1, a2, b2, b2};
  eta = {1.0 / 3, b1, a1, b1, b2, a2, b2};
  w = {0.225 / 2, w1, w1, w1, w2, w2, w2};
}

// Gauss rule of a reference element.
void SetupGaussValue(RefElement& r) {
  try {
    double p[3], w[3];
    if (r.shape == kShapePoint) {
      AddGauss(r, 0, 0, 0, 1);
    } else if (r.dimension == 1) {
      const int n = r.function_type == 1 ? 2 : 3;
      Legendre(n, p, w);
      for (int i = 0; i < n; ++i) AddGauss(r, p[i], 0, 0, w[i]);
    } else if (r.dimension == 2 && r.shape == kShapeTriangle) {
      std::vector<double> xi, eta, wt;
      TriangleRule(r.function_type == 1 ? 3 : 7, xi, eta, wt);
      for (std::size_t i = 0; i < xi.size(); ++i) AddGauss(r, xi[i], eta[i], 0, wt[i]);
    } else if (r.dimension == 2) {
      const int n = r.function_type == 1 ? 2 : 3;
      Legendre(n, p, w);
      for (int j = 0; j < n; ++j)
        for (int i = 0; i < n; ++i) AddGauss(r, p[i], p[j], 0, w[i] * w[j]);
    } else if (r.shape == kShapeTetrahedron) {
      const double a = 0.1381966011250105, b = 0.5854101966249685;
      AddGauss(r, a, a, a, 1.0 / 24);
      AddGauss(r, b, a, a, 1.0 / 24);
      AddGauss(r, a, b, a, 1.0 / 24);
      AddGauss(r, a, a, b, 1.0 / 24);
    } else if (r.shape == kShapePrism) {
      std::vector<double> xi, eta, wt;
      TriangleRule(3, xi, eta, wt);
      Legendre(2, p, w);
      for (int k = 0; k < 2; ++k)
        for (std::size_t i = 0; i < xi.size(); ++i) AddGauss(r, xi[i], eta[i], p[k], wt[i] * w[k]);
    } else {
      Legendre(2, p, w);
      for (int k = 0; k < 2; ++k)
        for (int j = 0; j < 2; ++j)
          for (int i = 0; i < 2; ++i) AddGauss(r, p[i], p[j], p[k], w[i] * w[j] * w[k]);
    }
    r.ngauss = static_cast<int>(r.gauss_weight.size());
  } catch (const std::bad_alloc&) {
    FatalError("SetupGaussValue: Out of memory");
  }
}

// Shape functions and reference derivatives at the Gauss points. Every shape
// function here is a polynomial of degree at most two in each reference
// coordinate, for which a central difference is exact; the step only sets
// the rounding.
void SetShapeFunc(RefElement& r) {
  try {
    const int nn = r.nnodes, ng = r.ngauss;
    r.shape_value.assign(static_cast<std::size_t>(nn) * ng, 0.0);
    r.shape_dxi.assign(static_cast<std::size_t>(nn) * ng, 0.0);
    r.shape_deta.assign(static_cast<std::size_t>(nn) * ng, 0.0);
    r.shape_dzeta.assign(static_cast<std::size_t>(nn) * ng, 0.0);
    const double h = 0.25;
    double np[9], nm[9];
    for (int g = 0; g < ng; ++g) {
      const double xi = r.gauss_xi[g], eta = r.gauss_eta[g], zeta = r.gauss_zeta[g];
      double* v = &r.shape_value[static_cast<std::size_t>(g) * nn];
      ShapeValues(r, xi, eta, zeta, v);
      if (r.shape == kShapePoint) continue;
      double* d[3] = {&r.shape_dxi[static_cast<std::size_t>(g) * nn],
                      &r.shape_deta[static_cast<std::size_t>(g) * nn],
                      &r.shape_dzeta[static_cast<std::size_t>(g) * nn]};
      for (int k = 0; k < r.dimension; ++k) {
        const double s[3][3] = {{h, 0, 0}, {0, h, 0}, {0, 0, h}};
        ShapeValues(r, xi + s[k][0], eta + s[k][1], zeta + s[k][2], np);
        ShapeValues(r, xi - s[k][0], eta - s[k][1], zeta - s[k][2], nm);
        for (int j = 0; j < nn; ++j) d[k][j] = (np[j] - nm[j]) / (2 * h);
      }
    }
  } catch (const std::bad_alloc&) {
    FatalError("SetShapeFunc: Out of memory");
  }
}

}  // namespace

void SetRefElement(int dimension, int shape, int function_type, RefElement& ref) {
  try {
    ref = RefElement{};
    ref.dimension = dimension;
    ref.shape = shape;
    ref.function_type = function_type;
    if (shape == kShapePoint) {
      ref.nnodes = 1;
    } else if (dimension == 1) {
      ref.nnodes = function_type == 1 ? 2 : 3;
      ref.nedges = 1;
      ref.nodes_per_edge = 2;
      ref.edge_nodes = {1, 2};
    } else if (dimension == 2 && shape == kShapeTriangle) {
      static const int nn[5] = {0, 3, 4, 6, 7};
      ref.nnodes = nn[function_type];
      ref.nedges = 3;
      if (function_type <= 2) {
        ref.nodes_per_edge = 2;
        ref.edge_nodes = {1, 2, 2, 3, 3, 1};
      } else {
        ref.nodes_per_edge = 3;
        ref.edge_nodes = {1, 2, 4, 2, 3, 5, 3, 1, 6};
      }
    } else if (dimension == 2) {
      static const int nn[5] = {0, 4, 5, 8, 9};
      ref.nnodes = nn[function_type];
      ref.nedges = 4;
      if (function_type <= 2) {
        ref.nodes_per_edge = 2;
        ref.edge_nodes = {1, 2, 2, 3, 3, 4, 4, 1};
      } else {
        ref.nodes_per_edge = 3;
        ref.edge_nodes = {1, 2, 5, 2, 3, 6, 3, 4, 7, 4, 1, 8};
      }
    } else if (shape == kShapeTetrahedron) {
      ref.nnodes = 4;
      ref.nedges = 6;
      ref.nodes_per_edge = 2;
      ref.edge_nodes = {1, 2, 2, 3, 3, 1, 1, 4, 2, 4, 3, 4};
      ref.nfaces = 4;
      ref.nodes_per_face = 3;
      ref.face_nodes = {1, 3, 2, 1, 2, 4, 2, 3, 4, 3, 1, 4};
    } else if (shape == kShapePrism) {
      // Side faces first, in the order of the base triangle's edges, then the
      // bottom and the top triangle.
      ref.nnodes = 6;
      ref.nedges = 9;
      ref.nodes_per_edge = 2;
      ref.edge_nodes = {1, 2, 2, 3, 3, 1, 4, 5, 5, 6, 6, 4, 1, 4, 2, 5, 3, 6};
      ref.nfaces = 5;
      ref.nodes_per_face = 4;
      ref.face_nodes = {1, 2, 5, 4, 2, 3, 6, 5, 3, 1, 4, 6, 1, 3, 2, 0, 4, 5, 6, 0};
    } else {
      ref.nnodes = 8;
      ref.nedges = 12;
      ref.nodes_per_edge = 2;
      ref.edge_nodes = {1, 2, 2, 3, 3, 4, 4, 1, 5, 6, 6, 7, 7, 8, 8, 5, 1, 5, 2, 6, 3, 7, 4, 8};
      ref.nfaces = 6;
      ref.nodes_per_face = 4;
      ref.face_nodes = {1, 2, 6, 5, 2, 3, 7, 6, 3, 4, 8, 7, 4, 1, 5, 8, 1, 4, 3, 2, 5, 6, 7, 8};
    }
  } catch (const std::bad_alloc&) {
    FatalError("SetRefElement: Out of memory");
  }
  SetupGaussValue(ref);
  SetShapeFunc(ref);
}

void SetupShapeData(Mesh& mesh) {
  ElementTable& el = mesh.elements;
  mesh.shapes.clear();
  int last_type = -1, last_shape = 0;
  for (int e = 1; e <= el.nelements; ++e) {
    if (el.id[e] == 0) {
      el.shape[e] = 0;
      continue;
    }
    if (el.type[e] == last_type) {  // runs of one type are the rule
      el.shape[e] = last_shape;
      continue;
    }
    int dim = 0, shape = 0, ftype = 0;
    if (!ElementTypeInfo(el.type[e], dim, shape, ftype))
      StopRun("Type not supported for element " + std::to_string(e) + ": element type code " +
              std::to_string(el.type[e]));
    int found = 0;
    for (std::size_t k = 0; k < mesh.shapes.size(); ++k) {
      const RefElement& r = mesh.shapes[k];
      if (r.dimension == dim && r.shape == shape && r.function_type == ftype) found = static_cast<int>(k) + 1;
    }
    if (found == 0) {
      if (static_cast<int>(mesh.shapes.size()) >= kMaxShapes) FatalError("SetupShapeData:Too many shapes");
      mesh.shapes.emplace_back();
      SetRefElement(dim, shape, ftype, mesh.shapes.back());
      found = static_cast<int>(mesh.shapes.size());
    }
    el.shape[e] = found;
    last_type = el.type[e];
    last_shape = found;
  }
}

int GetMeshDimension(const Mesh& mesh) {
  const ElementTable& el = mesh.elements;
  int dim = 0;
  for (int e = 1; e <= el.nelements; ++e) {
    if (el.shape[e] == 0) continue;
    const int d = mesh.shapes[el.shape[e] - 1].dimension;
    if (dim == 0) dim = d;
    if (d != dim) FatalError("GetMeshDimension:Elements with different dimension detected in mesh");
  }
  return dim;
}

void PrintShapeData(const RefElement& ref) {
  WriteLogLine("Shape information");
  WriteValueLine("Dimensions                 : %", ref.dimension);
  WriteValueLine("Type of element            : %", ref.shape);
  WriteValueLine("Type of function           : %", ref.function_type);
  WriteValueLine("Number of nodes            : %", ref.nnodes);
  WriteValueLine("Number of edges            : %", ref.nedges);
  WriteValueLine("Number of edge nodes       : %", ref.nodes_per_edge);
  WriteValueLine("Number of faces            : %", ref.nfaces);
  WriteValueLine("Number of faces nodes      : %", ref.nodes_per_face);
  WriteValueLine("Number of Gauss point      : %", ref.ngauss);
}

void PrintShapeData(const Mesh& mesh) {
  for (const RefElement& r : mesh.shapes) PrintShapeData(r);
}

}  // namespace vhd
