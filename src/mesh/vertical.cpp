// Vertical discretisation (sigma and combined sigma/z levels) and the layered
// 3D mesh stacked on a 2D mesh.
//
// Levels of a column. Global level g runs from 0 (the lowest z-level
// interface) to G = nlayers_z + nlayers_sigma (the surface); layer m lies
// between levels m-1 and m. The z part holds the fixed interfaces z_levels
// (g = 0 .. nlayers_z, the last one z_sigma); the sigma part spreads the
// sigma fractions between its bottom and the surface. A node whose bed lies
// above z_sigma (and every node of a pure sigma mesh) has sigma layers only,
// from its bed. A node whose bed lies inside the z part starts with the z
// layer that the bed cuts:
//   type_of_bathymetry_adjustment 1: the cut layer runs from the bed to its
//     upper interface; when it is thinner than minimum_layer_thickness_zlevel
//     it joins the layer above;
//   type_of_bathymetry_adjustment 2: the bed moves to the nearer interface
//     (whole layers only).
// A bed below the lowest interface extends the lowest layer down to it.
// An element column starts at the lowest layer of its nodes; where a node
// starts higher, the element's nodes at the missing levels sit on that node's
// lowest level (a cut cell whose side may have zero height). The surface is
// at datum (eta = 0); water depths are max(0, -bed).

#include <algorithm>
#include <cmath>
#include <new>
#include <string>
#include <vector>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

double TransformedSigmaLevel(double s, double sigma_c, double b, double theta) {
  double f = s;  // the limit of both parts for theta -> 0
  if (theta > 1e-8) {
    const double t2 = std::tanh(0.5 * theta);
    f = (1 - b) * std::sinh(theta * s) / std::sinh(theta) + b * (std::tanh(theta * (s + 0.5)) - t2) / (2 * t2);
  }
  return 1 + sigma_c * s + (1 - sigma_c) * f;
}

void CalcVerticalLevels(VerticalMesh& v, double deepest_bed) {
  const int n = v.number_of_layers;
  if (n < 1) FatalError("SetupVerticalMesh: number_of_layers must be >= 1, found " + std::to_string(n));
  v.sigma_levels.assign(static_cast<std::size_t>(n) + 1, 0.0);
  switch (v.vertical_mesh_type) {
    case 1:
      for (int k = 0; k <= n; ++k) v.sigma_levels[k] = static_cast<double>(k) / n;
      break;
    case 2: {
      if (static_cast<int>(v.layer_thickness.size()) != n)
        FatalError("SetupVerticalMesh: layer_thickness must hold number_of_layers values");
      double sum = 0;
      for (double t : v.layer_thickness) {
        if (!(t > 0)) FatalError("SetupVerticalMesh: layer_thickness values must be positive");
        sum += t;
      }
      if (sum > 1.001) Warning("Sum of layer thickness is larger than 1");
      if (sum < 0.999) Warning("Sum of layer thickness is lower than 1");
      // The fractions are scaled to fill the water column.
      double acc = 0;
      for (int k = 1; k <= n; ++k) {
        acc += v.layer_thickness[k - 1];
        v.sigma_levels[k] = acc / sum;
      }
      v.sigma_levels[n] = 1.0;
      break;
    }
    case 3:
      for (int k = 0; k <= n; ++k)
        v.sigma_levels[k] = TransformedSigmaLevel(-1.0 + static_cast<double>(k) / n, v.sigma_c, v.b, v.theta);
      v.sigma_levels[0] = 0.0;
      v.sigma_levels[n] = 1.0;
      for (int k = 1; k <= n; ++k)
        if (!(v.sigma_levels[k] > v.sigma_levels[k - 1]))
          FatalError("SetupVerticalMesh: sigma_c, b and theta give levels that do not rise from bed to surface");
      break;
    default:
      StopRun("Type not supported for vertical_mesh_type: " + std::to_string(v.vertical_mesh_type));
  }

  v.z_levels.clear();
  if (v.vertical_mesh_type_overall == 1) return;
  if (v.vertical_mesh_type_overall != 2)
    StopRun("Type not supported for vertical_mesh_type_overall: " + std::to_string(v.vertical_mesh_type_overall));
  const int nz = v.number_of_layers_zlevel;
  if (nz < 1) FatalError("SetupVerticalMesh: number_of_layers_zlevel must be >= 1, found " + std::to_string(nz));
  std::vector<double> thickness;
  if (v.vertical_mesh_type_zlevel == 1) {
    if (!(v.constant_layer_thickness_zlevel > 0))
      v.constant_layer_thickness_zlevel = std::max(v.z_sigma - deepest_bed, 1e-3) / nz;
    thickness.assign(static_cast<std::size_t>(nz), v.constant_layer_thickness_zlevel);
  } else if (v.vertical_mesh_type_zlevel == 2) {
    if (static_cast<int>(v.variable_layer_thickness_zlevel.size()) != nz)
      FatalError("SetupVerticalMesh: variable_layer_thickness_zlevel must hold number_of_layers_zlevel values");
    thickness = v.variable_layer_thickness_zlevel;
    for (double t : thickness)
      if (!(t > 0)) FatalError("SetupVerticalMesh: variable_layer_thickness_zlevel values must be positive");
  } else {
    StopRun("Type not supported for vertical_mesh_type_zlevel: " + std::to_string(v.vertical_mesh_type_zlevel));
  }
  v.z_levels.assign(static_cast<std::size_t>(nz) + 1, v.z_sigma);
  for (int m = nz - 1; m >= 0; --m) v.z_levels[m] = v.z_levels[m + 1] - thickness[m];
  if (v.minimum_layer_thickness_zlevel <= 0)
    v.minimum_layer_thickness_zlevel = 0.1 * *std::min_element(thickness.begin(), thickness.end());
}

void SetupVerticalMesh(const Mesh& mesh2d, double minimum_depth, VerticalMesh& v) {
  double deepest = 0;
  for (int k = 1; k <= mesh2d.nodes.nnodes; ++k) deepest = std::min(deepest, mesh2d.nodes.z[k]);
  SktReadKeyword("vertical_mesh_type_overall", v.vertical_mesh_type_overall, 1);
  SktReadKeyword("number_of_layers", v.number_of_layers, 10);
  if (v.vertical_mesh_type_overall == 2) SktReadKeyword("z_sigma", v.z_sigma, 0.5 * minimum_depth);
  SktReadKeyword("vertical_mesh_type", v.vertical_mesh_type, 1);
  if (v.vertical_mesh_type == 2) {
    if (SktNumberOfParams("layer_thickness") != v.number_of_layers)
      FatalError("SetupVerticalMesh: " + SktSectionPath() + "/layer_thickness must hold " +
                 std::to_string(v.number_of_layers) + " values");
    SktReadKeyword("layer_thickness", v.layer_thickness, v.number_of_layers);
  }
  if (v.vertical_mesh_type == 3) {
    SktReadKeyword("sigma_c", v.sigma_c, 0.0);
    SktReadKeyword("b", v.b, 0.0);
    SktReadKeyword("theta", v.theta, 2.0);
  }
  if (v.vertical_mesh_type_overall == 2) {
    SktReadKeyword("number_of_layers_zlevel", v.number_of_layers_zlevel, 10);
    SktReadKeyword("vertical_mesh_type_zlevel", v.vertical_mesh_type_zlevel, 1);
    if (v.vertical_mesh_type_zlevel == 1) {
      SktReadKeyword("constant_layer_thickness_zlevel", v.constant_layer_thickness_zlevel,
                     std::max(v.z_sigma - deepest, 1e-3) / std::max(v.number_of_layers_zlevel, 1));
    } else {
      if (SktNumberOfParams("variable_layer_thickness_zlevel") != v.number_of_layers_zlevel)
        FatalError("SetupVerticalMesh: " + SktSectionPath() + "/variable_layer_thickness_zlevel must hold " +
                   std::to_string(v.number_of_layers_zlevel) + " values");
      SktReadKeyword("variable_layer_thickness_zlevel", v.variable_layer_thickness_zlevel,
                     v.number_of_layers_zlevel);
    }
    SktReadKeyword("type_of_bathymetry_adjustment", v.type_of_bathymetry_adjustment, 1);
    SktReadKeyword("minimum_layer_thickness_zlevel", v.minimum_layer_thickness_zlevel, 0.0);
    SktReadKeyword("area_factor_cutcell", v.area_factor_cutcell, 0.1);
    if (v.type_of_bathymetry_adjustment != 1 && v.type_of_bathymetry_adjustment != 2)
      StopRun("Type not supported for type_of_bathymetry_adjustment: " +
              std::to_string(v.type_of_bathymetry_adjustment));
  }
  CalcVerticalLevels(v, deepest);
}

namespace {

// Lowest layer of a node column and the level of its bed.
struct NodeColumn {
  int bottom_layer;  // first layer m (the column has levels bottom_layer-1 .. G)
  double bed;        // z of level bottom_layer-1
};

NodeColumn ColumnOfNode(const VerticalMesh& v, double zb, int nz) {
  const double bed = std::min(zb, 0.0);
  if (nz == 0 || bed >= v.z_sigma) return {nz + 1, bed};
  if (bed <= v.z_levels[0]) return {1, bed};
  int m = 1;  // the z layer that the bed cuts: z_levels[m-1] < bed <= z_levels[m]
  while (m < nz && bed > v.z_levels[m]) ++m;
  if (v.type_of_bathymetry_adjustment == 2) {
    if (v.z_levels[m] - bed < bed - v.z_levels[m - 1]) return {m + 1, v.z_levels[m]};
    return {m, v.z_levels[m - 1]};
  }
  if (v.z_levels[m] - bed < v.minimum_layer_thickness_zlevel) return {m + 1, bed};
  return {m, bed};
}

}  // namespace

void BuildLayeredMesh(const Mesh& m2, const VerticalMesh& v, Mesh& m3) {
  const ElementTable& e2 = m2.elements;
  const NodeTable& n2 = m2.nodes;
  const FaceTable& f2 = m2.faces;
  if (f2.nfaces == 0 || e2.face_start.empty())
    FatalError("BuildLayeredMesh: the 2D mesh needs its faces (SetupMeshGeometry) first");
  const int ls = v.number_of_layers;
  const int nz = v.vertical_mesh_type_overall == 2 ? static_cast<int>(v.z_levels.size()) - 1 : 0;
  const int top = nz + ls;  // G

  ReleaseMesh(m3);
  m3.number = m2.number;
  m3.unit_code = m2.unit_code;
  m3.projection = m2.projection;
  m3.ndim = 3;
  m3.nlayers = top;
  m3.vertical_type = nz > 0 ? 2 : 1;
  m3.nlayers_sigma = ls;
  m3.nlayers_z = nz;
  m3.vertical = v;
  m3.nlevels = top + 1;

  // Node columns.
  std::vector<NodeColumn> col(static_cast<std::size_t>(n2.nnodes) + 1);
  m3.column_node_start.assign(n2.nnodes + 1, 0);
  m3.column_node_start[1] = 1;
  for (int k = 1; k <= n2.nnodes; ++k) {
    col[k] = ColumnOfNode(v, n2.z[k], nz);
    m3.column_node_start[k + 1] = m3.column_node_start[k] + (top - col[k].bottom_layer + 2);
  }
  const int nnodes3 = m3.column_node_start[n2.nnodes + 1] - 1;
  AllocateNodes(m3.nodes, nnodes3);
  m3.node_column.assign(nnodes3, 0);
  m3.node_level.assign(nnodes3, 0);
  for (int k = 1; k <= n2.nnodes; ++k) {
    const NodeColumn& c = col[k];
    const double sigma_bottom = c.bottom_layer > nz ? c.bed : v.z_sigma;
    for (int g = c.bottom_layer - 1; g <= top; ++g) {
      double z;
      if (g == c.bottom_layer - 1 && g < nz) z = c.bed;
      else if (g <= nz && nz > 0) z = v.z_levels[g];
      else z = sigma_bottom + v.sigma_levels[g - nz] * (0.0 - sigma_bottom);
      if (g == nz && c.bottom_layer > nz) z = sigma_bottom;
      const int id = m3.nodes.nnodes + 1;
      AddNode(m3.nodes, id, n2.x[k], n2.y[k], z, n2.code[k]);
      m3.node_column[id] = k;
      m3.node_level[id] = g + 1;
    }
  }
  // 3D node of 2D node k at global level g (its lowest level where it has no g).
  auto node3 = [&](int k, int g) {
    return m3.column_node_start[k] + (std::max(g, col[k].bottom_layer - 1) - (col[k].bottom_layer - 1));
  };

  // Element columns.
  std::vector<int> bottom(static_cast<std::size_t>(e2.nelements) + 1, top + 1);
  m3.column_element_start.assign(e2.nelements + 1, 0);
  m3.column_element_start[1] = 1;
  for (int e = 1; e <= e2.nelements; ++e) {
    const int n = ElementNodeCount(e2, e);
    if (e2.id[e] != 0) {
      if (e2.type[e] != 21 && e2.type[e] != 25)
        StopRun("Type not supported for layered meshes: element " + std::to_string(e) + " of type " +
                std::to_string(e2.type[e]));
      for (int j = 1; j <= n; ++j) bottom[e] = std::min(bottom[e], col[ElementNode(e2, e, j)].bottom_layer);
    }
    m3.column_element_start[e + 1] = m3.column_element_start[e] + (e2.id[e] != 0 ? top - bottom[e] + 1 : 0);
  }
  const int ne3 = m3.column_element_start[e2.nelements + 1] - 1;
  if (ne3 <= 0) FatalError("BuildLayeredMesh: the 2D mesh has no elements");
  AllocateElementsBasic(m3.elements, ne3, 8 * ne3);
  m3.element_column.assign(ne3, 0);
  m3.element_layer.assign(ne3, 0);
  for (int e = 1; e <= e2.nelements; ++e) {
    if (e2.id[e] == 0) continue;
    const int n = ElementNodeCount(e2, e);
    for (int m = bottom[e]; m <= top; ++m) {
      int nodes[8];
      for (int j = 1; j <= n; ++j) {
        nodes[j - 1] = node3(ElementNode(e2, e, j), m - 1);
        nodes[j - 1 + n] = node3(ElementNode(e2, e, j), m);
      }
      const int id = m3.elements.nelements + 1;
      AddElement(m3.elements, id, n == 3 ? 32 : 33, 2 * n, nodes);
      m3.element_column[id] = e;
      m3.element_layer[id] = m;
    }
  }
  auto element3 = [&](int e, int m) {  // 3D element of column e in layer m, or 0
    return e == 0 || m < bottom[e] ? 0 : m3.column_element_start[e] + (m - bottom[e]);
  };

  // Faces: the vertical faces of every 2D face, bottom to top, then the
  // horizontal faces between the layers of every column.
  std::vector<int> fe1, fe2, fl1, fl2, fcode, fcol, fnodes, fcount;
  int nvertical = 0;
  try {
    m3.column_face_start.assign(f2.nfaces + 1, 0);
    m3.column_face_start[1] = 1;
    for (int f = 1; f <= f2.nfaces; ++f) {
      const int a = f2.element1[f], b = f2.element2[f];
      const int lowest = b > 0 ? std::min(bottom[a], bottom[b]) : bottom[a];
      const int na = FaceNode(f2, f, 1), nb = FaceNode(f2, f, 2);
      for (int m = lowest; m <= top; ++m) {
        int x1 = element3(a, m), x2 = element3(b, m), l1 = f2.localface1[f], l2 = f2.localface2[f];
        int p = na, q = nb;
        if (x1 == 0) {  // only the deeper column reaches this layer: it owns the face
          std::swap(x1, x2);
          std::swap(l1, l2);
          std::swap(p, q);
        }
        fe1.push_back(x1);
        fe2.push_back(x2);
        fl1.push_back(l1);
        fl2.push_back(x2 > 0 ? l2 : 0);
        fcode.push_back(x2 > 0 ? 0 : (b > 0 ? 1 : f2.code[f]));
        fcol.push_back(f);
        for (int node : {node3(p, m - 1), node3(q, m - 1), node3(q, m), node3(p, m)}) fnodes.push_back(node);
        fcount.push_back(4);
        ++nvertical;
      }
      m3.column_face_start[f + 1] = nvertical + 1;
    }
    for (int e = 1; e <= e2.nelements; ++e) {
      if (e2.id[e] == 0) continue;
      const int n = ElementNodeCount(e2, e);
      for (int m = bottom[e]; m < top; ++m) {
        fe1.push_back(element3(e, m));
        fe2.push_back(element3(e, m + 1));
        fl1.push_back(n == 3 ? 5 : 6);
        fl2.push_back(n == 3 ? 4 : 5);
        fcode.push_back(0);
        fcol.push_back(0);
        for (int j = 1; j <= n; ++j) fnodes.push_back(node3(ElementNode(e2, e, j), m));
        fcount.push_back(n);
      }
    }
  } catch (const std::bad_alloc&) {
    FatalError("BuildLayeredMesh: Out of memory");
  }
  const int nf3 = static_cast<int>(fe1.size());
  FaceTable& f3 = m3.faces;
  AllocateFacesBasic(f3, nf3, static_cast<int>(fnodes.size()));
  m3.face_column.assign(nf3, 0);
  int pos = 1, nboundary = 0;
  for (int k = 1; k <= nf3; ++k) {
    f3.id[k] = k;
    f3.element1[k] = fe1[k - 1];
    f3.element2[k] = fe2[k - 1];
    f3.localface1[k] = fl1[k - 1];
    f3.localface2[k] = fl2[k - 1];
    f3.code[k] = fcode[k - 1];
    m3.face_column[k] = fcol[k - 1];
    if (fe2[k - 1] == 0) ++nboundary;
    for (int j = 0; j < fcount[k - 1]; ++j, ++pos) f3.node_list[pos] = fnodes[pos - 1];
    f3.node_start[k + 1] = pos;
  }
  f3.nfaces = f3.nfaces_int = nf3;
  f3.nboundary_faces = nboundary;
  m3.nfaces_vertical = nvertical;

  // Column consistency: every column holds its layers once, and the vertical
  // faces of a 2D face span the deeper of its two element columns.
  std::vector<int> per_column(static_cast<std::size_t>(e2.nelements) + 1, 0);
  for (int x = 1; x <= ne3; ++x) ++per_column[m3.element_column[x]];
  for (int e = 1; e <= e2.nelements; ++e)
    if (per_column[e] != m3.column_element_start[e + 1] - m3.column_element_start[e])
      FatalError("Inconsistant number of element layers");
  for (int f = 1; f <= f2.nfaces; ++f) {
    const int a = f2.element1[f], b = f2.element2[f];
    const int layers = std::max(per_column[a], b > 0 ? per_column[b] : 0);
    if (m3.column_face_start[f + 1] - m3.column_face_start[f] != layers)
      FatalError("Inconsistant number of face layers");
  }

  SetupShapeData(m3);
  CreateElementFaceConnectivity(m3);
  CreateNodeElementConnectivity(m3);
  CreateNodeNodeConnectivity(m3);
  CalcElementValues(m3.elements, m3.nodes, m3.projection);
  OrderNodeElements(m3);
  CalcFaceValues(m3.faces, m3.elements, m3.nodes, m3.projection);
  CalcNodeValues(m3);
}

}  // namespace vhd
