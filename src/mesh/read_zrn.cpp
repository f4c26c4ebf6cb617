// Meshes from data files: the flexible-mesh file (.zrnu, read and written) and
// the grid files (.zrn1, .zrn2, .zrn3) turned into meshes.
//
// Grid files: item 1 holds the values (the first time step of a dynamic item).
// Values equal to the file's delete value have no data and give no element;
// nor do values equal to the land value, held in the custom block "zland" of
// the file. Grid values stand at the cell centres x0 + i dx, y0 + j dy (i, j
// from 0); the mesh nodes of zrn2 and zrn3 grids are the cell corners, half a
// spacing away. The file's origin and orientation place the grid axes in the
// projection (easting = x0 + x cos(o) + y sin(o), northing = y0 - x sin(o) +
// y cos(o)).
//
// Line grids give 2-node lines between neighbouring points with data; the ends
// of every stretch get the land code. 3D grids give hexahedra or prisms whose
// first face is the lower one, anticlockwise seen from above, whichever way
// the file's axes run; the corners on the side walls of the water body (where
// a cell meets land or the edge of the grid in its layer) get the land code.

#include <algorithm>
#include <cmath>
#include <new>
#include <vector>

#include "io/zrn.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh/read_text.hpp"

namespace vhd {

namespace {

bool SameValue(double a, double b) { return std::abs(a - b) <= 1e-6 * std::abs(b); }

// ---- zrnu ------------------------------------------------------------------------------

// Moves every node to the position given by its id when the ids are a
// permutation of 1 .. n; element node numbers follow their nodes.
void ReorderNodes(ZrnMeshData& m) {
  const int n = m.nnodes();
  bool in_order = true;
  for (int p = 1; p <= n && in_order; ++p) in_order = m.node_id[p] == p;
  if (in_order) return;
  Warning("Reordering of node information");
  std::vector<char> seen(static_cast<std::size_t>(n) + 1, 0);
  for (int p = 1; p <= n; ++p) {
    const int id = m.node_id[p];
    if (id < 1 || id > n || seen[static_cast<std::size_t>(id)]) return;  // CheckMesh reports it
    seen[static_cast<std::size_t>(id)] = 1;
  }
  ZrnMeshData r;
  r.node_id.assign(n);
  r.x.assign(n);
  r.y.assign(n);
  r.z.assign(n);
  r.node_code.assign(n);
  for (int p = 1; p <= n; ++p) {
    const int k = m.node_id[p];
    r.node_id[k] = k;
    r.x[k] = m.x[p];
    r.y[k] = m.y[p];
    r.z[k] = m.z[p];
    r.node_code[k] = m.node_code[p];
  }
  for (int& node : m.node_list)
    if (node >= 1 && node <= n) node = m.node_id[node];
  m.node_id = std::move(r.node_id);
  m.x = std::move(r.x);
  m.y = std::move(r.y);
  m.z = std::move(r.z);
  m.node_code = std::move(r.node_code);
}

// ---- grids -----------------------------------------------------------------------------

struct GridData {
  ZrnSpatialAxis axis;
  std::vector<double> values;
  double delete_value = kZrnDefaultDeleteValue;
  bool has_land = false;
  double land = 0.0;
  std::string projection;
  CTqCartography place;  // origin and orientation only
};

// Opens a grid file and reads item 1 at step 0. Returns false when the file
// has no item of the wanted axis type (the caller names the fault).
bool ReadGrid(const std::string& routine, const std::string& file_name, int axis_type, GridData& g,
              const char* read_error, int* nitems_out = nullptr) {
  ZrnFile f;
  ZrnOpenInput(f, file_name);
  int nitems = 0;
  zrnGetNoOfItems(f, nitems);
  if (nitems_out) *nitems_out = nitems;
  int status = 0;
  if (nitems < 1 || zrnGetItemDim(f, 1, g.axis, &status) != 0 || g.axis.type != axis_type) {
    zrnHeaderDestroy(f, &status);
    return false;
  }
  zrnGetDeleteValFloat(f, g.delete_value);
  g.has_land = zrnGetCustomBlockValue(f, "zland", 1, g.land, &status) == 0;
  double x0 = 0, y0 = 0, orientation = 0;
  zrnGetGeoInfoUTMProj(f, g.projection, x0, y0, orientation);
  g.place.origin_x = x0;
  g.place.origin_y = y0;
  g.place.orientation = orientation;
  try {
    g.values.assign(static_cast<std::size_t>(g.axis.Count()), 0.0);
  } catch (const std::bad_alloc&) {
    FatalError(routine + ": Out of memory");
  }
  if (ZrnReadItemAtStep(f, 0, 1, g.values.data(), g.axis.Count(), &status) != 0) {
    WriteLogLine("  " + zrnErrorText(status) + ": " + ZrnLogName(file_name));
    FatalError(routine + ": " + read_error);
  }
  zrnFileClose(f);
  return true;
}

bool HasValue(const GridData& g, double v, bool use_land) {
  if (SameValue(v, g.delete_value)) return false;
  return !(use_land && g.has_land && SameValue(v, g.land));
}

}  // namespace

void ReadMeshBasicZrnu(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasicZrnu";
  ZrnFile f;
  ZrnOpenInput(f, file_name);
  if (!zrnIsMeshFileType(f.file_type)) FileError(routine, file_name, "Not a flexible-mesh data file");
  ReleaseMesh(mesh);

  const std::string block = zrnCustomBlockName(f.file_type);
  auto header_item = [&](int k, int& value) {
    double v = 0;
    int status = 0;
    if (zrnGetCustomBlockValue(f, block, k, v, &status) != 0) return false;
    value = static_cast<int>(std::lround(v));
    return true;
  };
  ZrnMeshData data;
  zrnReadMesh(f, data);
  int count = 0;
  if (header_item(1, count) && count != data.nnodes())
    FileError(routine, file_name, "Header gives " + std::to_string(count) + " nodes, the mesh holds " +
                                      std::to_string(data.nnodes()));
  if (header_item(2, count) && count != data.nelements())
    FileError(routine, file_name, "Header gives " + std::to_string(count) + " elements, the mesh holds " +
                                      std::to_string(data.nelements()));
  if (!header_item(3, mesh.ndim)) {
    Warning("ndim not found in file, ndim = 2 assumed");
    mesh.ndim = 2;
  }
  if (!header_item(4, mesh.nlayers)) {
    Warning("nlayers not found i file, nlayers = 0 assumed");
    mesh.nlayers = 0;
  }
  if (mesh.ndim == 2 || mesh.ndim == 3) {
    if (!header_item(5, mesh.nlayers_sigma)) {
      if (mesh.ndim == 3) Warning("nlayers_sigma not found in file");
      mesh.vertical_type = 1;
      mesh.nlayers_sigma = mesh.nlayers;
    } else if (mesh.nlayers_sigma != mesh.nlayers) {
      mesh.vertical_type = 2;
      mesh.nlayers_z = mesh.nlayers - mesh.nlayers_sigma;
    } else {
      mesh.vertical_type = 1;
    }
  }
  double x0 = 0, y0 = 0, orientation = 0;
  zrnGetGeoInfoUTMProj(f, mesh.projection, x0, y0, orientation);
  zrnFileClose(f);

  const int nn = data.nnodes(), ne = data.nelements();
  if (nn < 1 || ne < 1) FileError(routine, file_name, "Mesh without nodes or elements");
  ReorderNodes(data);

  AllocateNodes(mesh.nodes, nn);
  for (int n = 1; n <= nn; ++n)
    AddNode(mesh.nodes, data.node_id[n], data.x[n], data.y[n], data.z[n], data.node_code[n]);
  AllocateElementsBasic(mesh.elements, ne, std::max(1, data.node_start[ne + 1] - 1));
  for (int e = 1; e <= ne; ++e) {
    const int first = data.node_start[e];
    int type = data.element_type[e];
    int n = data.node_start[e + 1] - first;
    if (type == 25 && n == 3) type = 21;
    n = CollapseRepeatedLastNode(type, n, data.node_list.data() + first);
    const std::string where = "Element " + std::to_string(e);
    if (ElementTypeNodeCount(type) == 0)
      FileError(routine, file_name, where + " has the unknown element type " + std::to_string(type));
    if (n != ElementTypeNodeCount(type))
      FileError(routine, file_name, where + " has " + std::to_string(n) + " nodes, its type " + std::to_string(type) +
                                        " needs " + std::to_string(ElementTypeNodeCount(type)));
    for (int k = first; k < first + n; ++k) {
      if (data.node_list[k] < 1 || data.node_list[k] > nn)
        FileError(routine, file_name, where + " holds the node " + std::to_string(data.node_list[k]) +
                                          ", out of range 1 to " + std::to_string(nn));
    }
    int dimension = 0, shape = 0, function_type = 0;
    ElementTypeInfo(type, dimension, shape, function_type);
    if (dimension != mesh.ndim)
      FileError(routine, file_name, where + " has dimension " + std::to_string(dimension) + ", the header gives ndim " +
                                        std::to_string(mesh.ndim));
    AddElement(mesh.elements, data.element_id[e], type, n, data.node_list.data() + first);
  }
}

void WriteMeshZrnu(const Mesh& mesh, const std::string& file_name) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  if (nd.nnodes < 1 || el.nelements < 1) FileError("WriteMeshZrnu", file_name, "Mesh without nodes or elements");
  ZrnMeshData data;
  data.ndim = mesh.ndim;
  data.nlayers = mesh.nlayers;
  data.nlayers_sigma = mesh.nlayers_sigma;
  data.node_id.assign(nd.nnodes);
  data.x.assign(nd.nnodes);
  data.y.assign(nd.nnodes);
  data.z.assign(nd.nnodes);
  data.node_code.assign(nd.nnodes);
  for (int n = 1; n <= nd.nnodes; ++n) {
    data.node_id[n] = nd.id[n];
    data.x[n] = nd.x[n];
    data.y[n] = nd.y[n];
    data.z[n] = nd.z[n];
    data.node_code[n] = nd.code[n];
  }
  data.element_id.assign(el.nelements);
  data.element_type.assign(el.nelements);
  data.node_start.assign(el.nelements + 1);
  data.node_list.assign(el.node_start[el.nelements + 1] - 1);
  for (int e = 1; e <= el.nelements; ++e) {
    data.element_id[e] = el.id[e];
    data.element_type[e] = el.type[e];
    data.node_start[e] = el.node_start[e];
  }
  data.node_start[el.nelements + 1] = el.node_start[el.nelements + 1];
  for (int k = 1; k < el.node_start[el.nelements + 1]; ++k) data.node_list[k] = el.node_list[k];

  int file_type = kZrnFileMesh2D;
  if (mesh.ndim == 3) file_type = mesh.vertical_type == 2 ? kZrnFileMesh3DSigmaZ : kZrnFileMesh3DSigma;
  const ProjectionCrs crs = ProjectionCrsInfo(mesh.projection);
  ZrnFile f;
  zrnHeaderCreate(f, file_name, file_type, "Mesh");
  zrnSetGeoInfoUTMProj(f, mesh.projection, 0.0, 0.0, 0.0, crs.wkt, crs.epsg);
  zrnSetEqCalendarAxis(f, ZrnDateTime{}, 1.0);  // a mesh file has no time steps
  zrnSetMesh(f, data);
  zrnFileCreate(f, false);
  zrnFileClose(f);
}

void ReadMeshBasicZrn1(Mesh& mesh, const std::string& file_name) {
  const std::string routine = "ReadMeshBasicZrn1";
  GridData g;
  int nitems = 0;
  if (!ReadGrid(routine, file_name, kZrnAxisD1, g, "Error Reading data file", &nitems)) {
    if (nitems < 1) FatalError(routine + ": Wrong number of items in file");
    FatalError(routine + ": Wrong mesh file");
  }
  const int nx = g.axis.n[0];
  MeshBuilder b(routine, file_name);
  b.DropUnusedNodes();  // a lone water point between land points is on no line
  int wet = 0;
  try {
    b.Reserve(nx, nx, 2);
    int previous = 0;  // file id of the previous point with data
    for (int i = 0; i < nx; ++i) {
      const double v = g.values[static_cast<std::size_t>(i)];
      if (!HasValue(g, v, true)) {
        previous = 0;
        continue;
      }
      ++wet;
      double x = 0, y = 0;
      g.place.Xy2Proj(g.axis.x0[0] + i * g.axis.dx[0], 0.0, x, y);
      b.AddNode(i + 1, x, y, v);
      if (previous != 0) {
        const int line[2] = {previous, i + 1};
        b.AddElement(11, line, 2);
      }
      previous = i + 1;
    }
  } catch (const std::bad_alloc&) {
    FatalError(routine + ": Out of memory");
  }
  if (wet == 0) FatalError("Input bathymetry consists of pure land values. Mesh cannot be generated.");
  if (b.ElementCount() == 0) FileError(routine, file_name, "No two neighbouring grid points hold water");
  b.Build(mesh, g.projection);
  // The ends of every stretch of line elements are boundary nodes.
  std::vector<int> uses(static_cast<std::size_t>(mesh.nodes.nnodes) + 1, 0);
  for (int e = 1; e <= mesh.elements.nelements; ++e)
    for (int j = 1; j <= 2; ++j) ++uses[static_cast<std::size_t>(ElementNode(mesh.elements, e, j))];
  for (int n = 1; n <= mesh.nodes.nnodes; ++n)
    if (uses[static_cast<std::size_t>(n)] == 1) mesh.nodes.code[n] = 1;
  mesh.ndim = 1;
}

void ReadMeshBasicZrn2(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid) {
  const std::string routine = "ReadMeshBasicZrn2";
  const int type = grid.type_of_element == 0 ? 25 : grid.type_of_element;
  if (type != 21 && type != 25) FatalError("Type not supported for type_of_element of a grid mesh");

  GridData geometry, bathy;
  if (grid.type_of_grid == 1) {
    if (!ReadGrid(routine, file_name, kZrnAxisD2, geometry, "Error Reading data file"))
      FatalError(routine + ": Wrong mesh file");
  } else if (grid.type_of_grid == 2) {
    if (FileExtension(grid.filename_grid) != "zrn2") FatalError("Illegal input file");
    if (!ReadGrid(routine, grid.filename_grid, kZrnAxisD2, geometry, "Error Reading data file"))
      FatalError(routine + ": Wrong grid file");
    if (!ReadGrid(routine, file_name, kZrnAxisD2, bathy, "Error Reading data file"))
      FatalError(routine + ": Wrong bathy file");
    for (int k = 0; k < 2; ++k) {
      if (bathy.axis.n[k] != geometry.axis.n[k] || !SameValue(bathy.axis.dx[k], geometry.axis.dx[k]) ||
          std::abs(bathy.axis.x0[k] - geometry.axis.x0[k]) > 1e-6 * std::abs(geometry.axis.dx[k]))
        FatalError(routine + ": Wrong bathy file");
    }
  } else {
    FatalError("Grid type not supported");
  }
  if (!geometry.has_land) Warning("zland not found i file, all point included");

  const int nx = geometry.axis.n[0], ny = geometry.axis.n[1];
  const double x0 = geometry.axis.x0[0], y0 = geometry.axis.x0[1];
  const double dx = geometry.axis.dx[0], dy = geometry.axis.dx[1];
  auto cell_value = [&](int i, int j, double& z) {
    const std::size_t k = static_cast<std::size_t>(j) * nx + i;
    if (!HasValue(geometry, geometry.values[k], true)) return false;
    z = geometry.values[k];
    if (grid.type_of_grid == 2) {
      z = bathy.values[k];
      if (!HasValue(bathy, z, false)) return false;
    }
    return true;
  };

  MeshBuilder b(routine, file_name);
  try {
    // Corner (i, j), i = 0 .. nx, j = 0 .. ny: mean of the cells around it.
    const std::size_t ncorners = static_cast<std::size_t>(nx + 1) * (ny + 1);
    std::vector<double> zsum(ncorners, 0.0);
    std::vector<int> count(ncorners, 0);
    std::vector<char> active(static_cast<std::size_t>(nx) * ny, 0);
    for (int j = 0; j < ny; ++j) {
      for (int i = 0; i < nx; ++i) {
        double z = 0;
        if (!cell_value(i, j, z)) continue;
        active[static_cast<std::size_t>(j) * nx + i] = 1;
        for (int c = 0; c < 4; ++c) {
          const std::size_t k = static_cast<std::size_t>(j + c / 2) * (nx + 1) + i + (c % 2);
          zsum[k] += z;
          ++count[k];
        }
      }
    }
    for (int j = 0; j <= ny; ++j) {
      for (int i = 0; i <= nx; ++i) {
        const std::size_t k = static_cast<std::size_t>(j) * (nx + 1) + i;
        if (count[k] == 0) continue;
        double x = 0, y = 0;
        geometry.place.Xy2Proj(x0 + (i - 0.5) * dx, y0 + (j - 0.5) * dy, x, y);
        b.AddNode(static_cast<int>(k) + 1, x, y, zsum[k] / count[k]);
      }
    }
    const bool flip = dx * dy < 0;  // keep the nodes anticlockwise
    for (int j = 0; j < ny; ++j) {
      for (int i = 0; i < nx; ++i) {
        if (!active[static_cast<std::size_t>(j) * nx + i]) continue;
        auto corner = [&](int di, int dj) { return (j + dj) * (nx + 1) + i + di + 1; };
        int q[4] = {corner(0, 0), corner(1, 0), corner(1, 1), corner(0, 1)};
        if (flip) std::swap(q[1], q[3]);
        if (type == 25) {
          b.AddElement(25, q, 4);
        } else {
          const int t1[3] = {q[0], q[1], q[2]}, t2[3] = {q[0], q[2], q[3]};
          b.AddElement(21, t1, 3);
          b.AddElement(21, t2, 3);
        }
      }
    }
  } catch (const std::bad_alloc&) {
    FatalError(routine + ": Out of memory");
  }
  if (b.ElementCount() == 0)
    FatalError("Input bathymetry consists of pure land values. Mesh cannot be generated.");
  b.Build(mesh, geometry.projection);
}

void ReadMeshBasicZrn3(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid) {
  const std::string routine = "ReadMeshBasicZrn3";
  const int type = grid.type_of_element == 0 ? 33 : grid.type_of_element;
  if (type != 32 && type != 33) FatalError("Type not supported for type_of_element of a 3D grid mesh");
  GridData g;
  if (!ReadGrid(routine, file_name, kZrnAxisD3, g, "Error reading data file"))
    FatalError(routine + ": Wrong mesh file");
  const int nx = g.axis.n[0], ny = g.axis.n[1], nz = g.axis.n[2];
  auto corner = [&](int i, int j, int k) { return (k * (ny + 1) + j) * (nx + 1) + i + 1; };
  auto cell = [&](int i, int j, int k) { return (static_cast<std::size_t>(k) * ny + j) * nx + i; };

  MeshBuilder b(routine, file_name);
  try {
    std::vector<char> active(static_cast<std::size_t>(nx) * ny * nz, 0);
    for (int k = 0; k < nz; ++k)
      for (int j = 0; j < ny; ++j)
        for (int i = 0; i < nx; ++i) active[cell(i, j, k)] = HasValue(g, g.values[cell(i, j, k)], true);
    auto is_active = [&](int i, int j, int k) {
      return i >= 0 && i < nx && j >= 0 && j < ny && active[cell(i, j, k)];
    };
    // Corners in use: 1 inside the water body, 2 on its side walls (land
    // code), where an active cell meets land or the edge of the grid in its layer.
    std::vector<char> used(static_cast<std::size_t>(nx + 1) * (ny + 1) * (nz + 1), 0);
    for (int k = 0; k < nz; ++k)
      for (int j = 0; j < ny; ++j)
        for (int i = 0; i < nx; ++i) {
          if (!active[cell(i, j, k)]) continue;
          for (int m = 0; m < 8; ++m) {
            char& u = used[corner(i + m % 2, j + (m / 2) % 2, k + m / 4) - 1];
            u = std::max<char>(u, 1);
          }
          // A side wall facing land or the edge of the grid: its two corners in
          // both levels of the layer.
          auto wall = [&](int ia, int ja, int ib, int jb) {
            for (int kk = k; kk <= k + 1; ++kk) used[corner(ia, ja, kk) - 1] = used[corner(ib, jb, kk) - 1] = 2;
          };
          if (!is_active(i - 1, j, k)) wall(i, j, i, j + 1);
          if (!is_active(i + 1, j, k)) wall(i + 1, j, i + 1, j + 1);
          if (!is_active(i, j - 1, k)) wall(i, j, i + 1, j);
          if (!is_active(i, j + 1, k)) wall(i, j + 1, i + 1, j + 1);
        }
    for (int k = 0; k <= nz; ++k)
      for (int j = 0; j <= ny; ++j)
        for (int i = 0; i <= nx; ++i) {
          const char u = used[corner(i, j, k) - 1];
          if (u == 0) continue;
          double x = 0, y = 0;
          g.place.Xy2Proj(g.axis.x0[0] + (i - 0.5) * g.axis.dx[0], g.axis.x0[1] + (j - 0.5) * g.axis.dx[1], x, y);
          b.AddNode(corner(i, j, k), x, y, g.axis.x0[2] + (k - 0.5) * g.axis.dx[2], u == 2 ? 1 : 0);
        }
    // Bottom face first, anticlockwise seen from above, then the face above it,
    // whichever way the file's axes run.
    const bool flip = g.axis.dx[0] * g.axis.dx[1] < 0;
    const int below = g.axis.dx[2] > 0 ? 0 : 1;
    for (int k = 0; k < nz; ++k)
      for (int j = 0; j < ny; ++j)
        for (int i = 0; i < nx; ++i) {
          if (!active[cell(i, j, k)]) continue;
          const int kb = k + below, kt = k + 1 - below;
          int q[4] = {corner(i, j, kb), corner(i + 1, j, kb), corner(i + 1, j + 1, kb), corner(i, j + 1, kb)};
          if (flip) std::swap(q[1], q[3]);
          const int up = corner(i, j, kt) - corner(i, j, kb);
          if (type == 33) {
            const int h[8] = {q[0], q[1], q[2], q[3], q[0] + up, q[1] + up, q[2] + up, q[3] + up};
            b.AddElement(33, h, 8);
          } else {
            const int p1[6] = {q[0], q[1], q[2], q[0] + up, q[1] + up, q[2] + up};
            const int p2[6] = {q[0], q[2], q[3], q[0] + up, q[2] + up, q[3] + up};
            b.AddElement(32, p1, 6);
            b.AddElement(32, p2, 6);
          }
        }
  } catch (const std::bad_alloc&) {
    FatalError(routine + ": Out of memory");
  }
  if (b.ElementCount() == 0)
    FatalError("Input bathymetry consists of pure land values. Mesh cannot be generated.");
  b.Build(mesh, g.projection);
  mesh.ndim = 3;
  mesh.nlayers = nz;
  mesh.nlayers_sigma = nz;
  mesh.vertical_type = 1;
}

}  // namespace vhd
