// Data-file layer: creating, opening and closing files, static and dynamic
// records, meshes. Everything below talks to netCDF-C directly; netCDF
// failures are carried as NcFailure inside this file and become the numbered
// codes at each entry point.

#include <netcdf.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <set>
#include <utility>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "io/zrn_internal.hpp"
#include "log/log.hpp"

namespace vhd {

using zrn_detail::Fail;
using zrn_detail::Finish;

namespace {

constexpr const char* kSource = "VantorHD " VHD_VERSION;
constexpr const char* kMesh = "mesh2d";
// Attributes of a coordinate variable x, y or z holding the axis exactly: the
// coordinate values cannot give the spacing of a single-cell axis.
constexpr const char* kAxisOrigin = "zrn_axis_origin";
constexpr const char* kAxisSpacing = "zrn_axis_spacing";

struct NcFailure {
  std::string what;
};

void Check(int nc_status, const std::string& what) {
  if (nc_status != NC_NOERR) throw NcFailure{what + ": " + nc_strerror(nc_status)};
}

// The writer holds no HDF5 file lock, so that a result file can be opened by
// another program while the run goes on (the reader sees every flushed step).
void AllowConcurrentReaders() { setenv("HDF5_USE_FILE_LOCKING", "FALSE", 0); }

// ---- attributes ------------------------------------------------------------------------

void PutText(int ncid, int var, const char* name, const std::string& value) {
  Check(nc_put_att_text(ncid, var, name, value.size(), value.c_str()),
        std::string("attribute ") + name);
}
void PutInt(int ncid, int var, const char* name, int value) {
  Check(nc_put_att_int(ncid, var, name, NC_INT, 1, &value), std::string("attribute ") + name);
}
void PutDouble(int ncid, int var, const char* name, double value) {
  Check(nc_put_att_double(ncid, var, name, NC_DOUBLE, 1, &value),
        std::string("attribute ") + name);
}

bool HasAtt(int ncid, int var, const char* name) {
  int id = -1;
  return nc_inq_attid(ncid, var, name, &id) == NC_NOERR;
}

bool GetText(int ncid, int var, const char* name, std::string& value) {
  nc_type type;
  size_t len;
  if (nc_inq_att(ncid, var, name, &type, &len) != NC_NOERR) return false;
  if (type == NC_CHAR) {
    std::string s(len, '\0');
    if (len > 0 && nc_get_att_text(ncid, var, name, s.data()) != NC_NOERR) return false;
    while (!s.empty() && s.back() == '\0') s.pop_back();
    value = s;
    return true;
  }
  if (type == NC_STRING && len == 1) {
    char* p = nullptr;
    if (nc_get_att_string(ncid, var, name, &p) != NC_NOERR) return false;
    value = p != nullptr ? p : "";
    nc_free_string(1, &p);
    return true;
  }
  return false;
}

bool GetDoubles(int ncid, int var, const char* name, std::vector<double>& values) {
  nc_type type;
  size_t len;
  if (nc_inq_att(ncid, var, name, &type, &len) != NC_NOERR) return false;
  if (type == NC_CHAR || type == NC_STRING || len == 0) return false;
  values.resize(len);
  return nc_get_att_double(ncid, var, name, values.data()) == NC_NOERR;
}

bool GetDouble(int ncid, int var, const char* name, double& value) {
  std::vector<double> v;
  if (!GetDoubles(ncid, var, name, v)) return false;
  value = v[0];
  return true;
}

bool GetInt(int ncid, int var, const char* name, int& value) {
  double v;
  if (!GetDouble(ncid, var, name, v) || !std::isfinite(v)) return false;
  value = static_cast<int>(std::lround(v));
  return true;
}

std::string Lower(std::string s) {
  for (auto& c : s) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return s;
}

std::vector<std::string> Words(const std::string& s) {
  std::vector<std::string> out;
  std::size_t i = 0;
  while (i < s.size()) {
    while (i < s.size() && std::isspace(static_cast<unsigned char>(s[i]))) ++i;
    std::size_t j = i;
    while (j < s.size() && !std::isspace(static_cast<unsigned char>(s[j]))) ++j;
    if (j > i) out.push_back(s.substr(i, j - i));
    i = j;
  }
  return out;
}

// ---- names -------------------------------------------------------------------------------

// Variable name from an item name: lower case, '_' for other characters,
// unique in the file.
std::string VariableName(int ncid, const std::string& item_name) {
  std::string base;
  for (char c : item_name) {
    const auto u = static_cast<unsigned char>(c);
    base += std::isalnum(u) && u < 128 ? static_cast<char>(std::tolower(u)) : '_';
  }
  if (base.empty() || !std::isalpha(static_cast<unsigned char>(base[0]))) base = "item_" + base;
  std::string name = base;
  int id = -1;
  for (int k = 2; nc_inq_varid(ncid, name.c_str(), &id) == NC_NOERR ||
                  nc_inq_dimid(ncid, name.c_str(), &id) == NC_NOERR;
       ++k)
    name = base + "_" + std::to_string(k);
  return name;
}

// Whether a mesh reader would take a variable with this long_name for one
// part of a vector (x or y component, magnitude or direction) and look for
// the other part in the file: QGIS's mesh reader does, matching these words
// in the long_name, and refuses the whole file when the partner is missing.
bool LooksLikeVectorPart(const std::string& long_name) {
  static const char* const kParts[] = {", x-component", ", y-component", "u component of ",
                                       "v component of ", " magnitude", "direction"};
  const std::string name = Lower(long_name);
  for (const char* part : kParts)
    if (name.find(part) != std::string::npos) return true;
  return false;
}

bool IsLongLat(const std::string& projection) {
  const std::string p = Lower(projection);
  return p == "long/lat" || p == "lat/long" || p == "longlat";
}

// UTM zone of a projection string "UTM-32" (south zones "UTM-32S"); 0 when not UTM.
int UtmZone(const std::string& projection, bool& south) {
  int zone = 0;
  char hemi = 'N';
  south = false;
  const std::string p = Lower(projection);
  if (p.rfind("utm-", 0) != 0) return 0;
  const int n = std::sscanf(p.c_str() + 4, "%d%c", &zone, &hemi);
  if (n < 1 || zone < 1 || zone > 60) return 0;
  south = n == 2 && hemi == 's';
  return zone;
}

// ---- record shapes --------------------------------------------------------------------

// netCDF start/count of one record of an axis (after the time index when timed).
int RecordShape(const ZrnSpatialAxis& a, bool timed, int step, size_t* start, size_t* count) {
  int nd = 0;
  if (timed) {
    start[nd] = static_cast<size_t>(step);
    count[nd++] = 1;
  }
  switch (a.type) {
    case kZrnAxisD0: break;
    case kZrnAxisD1:
    case kZrnAxisD4:
      start[nd] = 0;
      count[nd++] = static_cast<size_t>(a.n[0]);
      break;
    case kZrnAxisD2:
      start[nd] = 0;
      count[nd++] = static_cast<size_t>(a.n[1]);
      start[nd] = 0;
      count[nd++] = static_cast<size_t>(a.n[0]);
      break;
    case kZrnAxisD3:
      for (int k = 2; k >= 0; --k) {
        start[nd] = 0;
        count[nd++] = static_cast<size_t>(a.n[k]);
      }
      break;
    default: break;
  }
  return nd;
}

bool SameAxis(const ZrnSpatialAxis& a, const ZrnSpatialAxis& b) {
  if (a.type != b.type) return false;
  if (a.type == kZrnAxisD4) return a.location == b.location && a.n[0] == b.n[0];
  const int nk = a.type == kZrnAxisD0 ? 0 : a.type == kZrnAxisD4 ? 1 : a.type;
  for (int k = 0; k < nk; ++k)
    if (a.n[k] != b.n[k] || a.x0[k] != b.x0[k] || a.dx[k] != b.dx[k]) return false;
  return true;
}

// Values that mean "no data": the delete value (compared in the item's precision) and NaN.
bool IsDelete(double v, double delete_value, int precision) {
  if (std::isnan(v)) return true;
  if (precision == kZrnFloat) return static_cast<float>(v) == static_cast<float>(delete_value);
  return v == delete_value;
}

// Values as a file stores them: no data as NaN, the fill value. A delete
// value near zero (the default 1e-35) stored as such would make QGIS's mesh
// reader, which takes every value within 2.2e-16 of the fill value for no
// data, blank every zero as well.
template <class T>
void StoreValues(const T* data, long n, double delete_value, int precision, T* stored) {
  for (long i = 0; i < n; ++i)
    stored[i] = IsDelete(static_cast<double>(data[i]), delete_value, precision)
                    ? std::numeric_limits<T>::quiet_NaN()
                    : data[i];
}

// Writes values of either type (no conversion, so that a float infinity
// stays one; netCDF refuses it from a double).
int PutValues(int ncid, int var, const size_t* start, const size_t* count, const float* v) {
  return nc_put_vara_float(ncid, var, start, count, v);
}
int PutValues(int ncid, int var, const size_t* start, const size_t* count, const double* v) {
  return nc_put_vara_double(ncid, var, start, count, v);
}

// The record buffer of the values' type.
std::vector<float>& RecordBuffer(ZrnFile& f, const float*) { return f.record_float; }
std::vector<double>& RecordBuffer(ZrnFile& f, const double*) { return f.record; }

// Sizes the record buffers of a file open for writing to its largest item.
void SizeRecord(ZrnFile& f) {
  long n = 0;
  for (const ZrnItemInfo& it : f.items) n = std::max(n, it.axis.Count());
  f.record.assign(static_cast<size_t>(n), 0.0);
  f.record_float.assign(static_cast<size_t>(n), 0.0f);
}

template <class T>
void AddStatistics(ZrnItemInfo& it, const T* data, long n, double delete_value) {
  for (long i = 0; i < n; ++i) {
    const double v = static_cast<double>(data[i]);
    if (IsDelete(v, delete_value, it.precision)) continue;
    if (it.nvalues == 0) {
      it.minimum = it.maximum = v;
    } else {
      it.minimum = std::min(it.minimum, v);
      it.maximum = std::max(it.maximum, v);
    }
    ++it.nvalues;
  }
}

// ---- creating a file ------------------------------------------------------------------

// A coordinate variable defined in this define-mode pass; its values are
// written once the definitions end.
struct NewCoordinate {
  const char* name;
  int n;
  double x0, dx;
};

struct SpatialDims {
  int x = -1, y = -1, z = -1;
  int nodes = -1, faces = -1, volumes = -1, max_face_nodes = -1, edges = -1, two = -1;
  std::vector<NewCoordinate> new_coordinates;
};

// Dimension ids of an axis, creating dimensions and coordinate variables as
// needed (define mode). Returns the count of ids written to ids.
int AxisDims(ZrnFile& f, SpatialDims& d, const ZrnSpatialAxis& a, int* ids) {
  const int ncid = f.ncid;
  const bool geo = IsLongLat(f.projection);
  auto coordinate = [&](int& dim, const char* name, int k, const char* axis_name) {
    const int n = a.n[k];
    if (dim >= 0) {
      size_t len = 0;
      Check(nc_inq_dimlen(ncid, dim, &len), "dimension");
      if (static_cast<int>(len) != n) throw NcFailure{std::string("axis ") + name + " size"};
      return dim;
    }
    Check(nc_def_dim(ncid, name, static_cast<size_t>(n), &dim), std::string("dimension ") + name);
    int var = -1;
    Check(nc_def_var(ncid, name, NC_DOUBLE, 1, &dim, &var), std::string("variable ") + name);
    PutDouble(ncid, var, kAxisOrigin, a.x0[k]);
    PutDouble(ncid, var, kAxisSpacing, a.dx[k]);
    d.new_coordinates.push_back(NewCoordinate{name, n, a.x0[k], a.dx[k]});
    const std::string ax = axis_name;
    if (ax == "X") {
      PutText(ncid, var, "standard_name", geo ? "longitude" : "projection_x_coordinate");
      PutText(ncid, var, "units", geo ? "degrees_east" : "m");
    } else if (ax == "Y") {
      PutText(ncid, var, "standard_name", geo ? "latitude" : "projection_y_coordinate");
      PutText(ncid, var, "units", geo ? "degrees_north" : "m");
    } else {
      PutText(ncid, var, "units", "m");
      PutText(ncid, var, "positive", "up");
    }
    PutText(ncid, var, "axis", axis_name);
    return dim;
  };
  auto mesh_dim = [&](int& dim, const char* name, int n) {
    if (dim < 0) {
      Check(nc_def_dim(ncid, name, static_cast<size_t>(n), &dim), std::string("dimension ") + name);
    } else {
      size_t len = 0;
      Check(nc_inq_dimlen(ncid, dim, &len), "dimension");
      if (static_cast<int>(len) != n) throw NcFailure{std::string("mesh dimension ") + name};
    }
    return dim;
  };
  switch (a.type) {
    case kZrnAxisD0: return 0;
    case kZrnAxisD1: ids[0] = coordinate(d.x, "x", 0, "X"); return 1;
    case kZrnAxisD2:
      ids[0] = coordinate(d.y, "y", 1, "Y");
      ids[1] = coordinate(d.x, "x", 0, "X");
      return 2;
    case kZrnAxisD3:
      ids[0] = coordinate(d.z, "z", 2, "Z");
      ids[1] = coordinate(d.y, "y", 1, "Y");
      ids[2] = coordinate(d.x, "x", 0, "X");
      return 3;
    case kZrnAxisD4:
      if (a.location == kZrnLocationFace) ids[0] = mesh_dim(d.faces, "mesh2d_nFaces", a.n[0]);
      else if (a.location == kZrnLocationNode) ids[0] = mesh_dim(d.nodes, "mesh2d_nNodes", a.n[0]);
      else ids[0] = mesh_dim(d.volumes, "mesh2d_nVolumes", a.n[0]);
      return 1;
    default: throw NcFailure{"undefined spatial axis"};
  }
}

// Values of the coordinate variables defined by AxisDims (data mode).
void PutCoordinateValues(int ncid, const SpatialDims& d) {
  for (const NewCoordinate& c : d.new_coordinates) {
    int var = -1;
    Check(nc_inq_varid(ncid, c.name, &var), std::string("variable ") + c.name);
    std::vector<double> v(static_cast<size_t>(c.n));
    for (int i = 0; i < c.n; ++i) v[static_cast<size_t>(i)] = c.x0 + i * c.dx;
    Check(nc_put_var_double(ncid, var, v.data()), std::string("values of ") + c.name);
  }
}

// The attributes and variable of one item (define mode).
int DefineItemVariable(ZrnFile& f, SpatialDims& d, int time_dim, ZrnItemInfo& it, bool timed,
                       int number, bool have_crs) {
  const int ncid = f.ncid;
  int dims[4];
  int nd = 0;
  if (timed) dims[nd++] = time_dim;
  nd += AxisDims(f, d, it.axis, dims + nd);
  it.var_name = VariableName(ncid, it.name);
  const nc_type type = it.precision == kZrnDouble ? NC_DOUBLE : NC_FLOAT;
  int var = -1;
  Check(nc_def_var(ncid, it.var_name.c_str(), type, nd, dims, &var), "variable " + it.var_name);
  if (it.compression > 0 && nd > 0)
    Check(nc_def_var_deflate(ncid, var, 1, 1, it.compression), "compression of " + it.var_name);
  // No data is stored as NaN (see StoreValues); the delete value itself is the
  // global zrn_delete_value.
  if (type == NC_FLOAT) {
    const float fill = std::numeric_limits<float>::quiet_NaN();
    Check(nc_put_att_float(ncid, var, "_FillValue", NC_FLOAT, 1, &fill), "fill value");
  } else {
    const double fill = std::numeric_limits<double>::quiet_NaN();
    Check(nc_put_att_double(ncid, var, "_FillValue", NC_DOUBLE, 1, &fill), "fill value");
  }
  // A mesh item named like a vector part keeps its name in zrn_item_name only,
  // so that every item opens as a dataset of its own.
  PutText(ncid, var, "zrn_item_name", it.name);
  if (it.axis.type != kZrnAxisD4 || !LooksLikeVectorPart(it.name))
    PutText(ncid, var, "long_name", it.name);
  const std::string units = uvqGetUnitUdunits(it.unit);
  if (!units.empty()) PutText(ncid, var, "units", units);
  PutInt(ncid, var, timed ? "zrn_item" : "zrn_static", number);
  PutInt(ncid, var, "zrn_item_type", it.item_type);
  PutInt(ncid, var, "zrn_unit", it.unit);
  PutInt(ncid, var, "zrn_value_type", it.value_type);
  if (it.axis.type == kZrnAxisD4) {
    PutText(ncid, var, "mesh", kMesh);
    if (it.axis.location == kZrnLocationFace) {
      PutText(ncid, var, "location", "face");
      PutText(ncid, var, "coordinates", "mesh2d_face_x mesh2d_face_y");
    } else if (it.axis.location == kZrnLocationNode) {
      PutText(ncid, var, "location", "node");
      PutText(ncid, var, "coordinates", "mesh2d_node_x mesh2d_node_y");
    }
  }
  if (have_crs && it.axis.type != kZrnAxisD0) PutText(ncid, var, "grid_mapping", "crs");
  return var;
}

// Checks a mesh before anything is written.
std::string MeshProblem(const ZrnMeshData& m) {
  const int nn = m.nnodes(), ne = m.nelements();
  if (nn < 1 || ne < 1) return "mesh has no nodes or no elements";
  if (m.y.size() != nn || m.z.size() != nn || m.node_id.size() != nn || m.node_code.size() != nn)
    return "node arrays differ in length";
  if (m.element_type.size() != ne || m.node_start.size() != ne + 1)
    return "element arrays differ in length";
  if (m.node_start[1] != 1 || m.node_start[ne + 1] - 1 != m.node_list.size())
    return "element node list is inconsistent";
  for (int e = 1; e <= ne; ++e) {
    const int k = m.node_start[e + 1] - m.node_start[e];
    if (k < 1 || k > 9) return "element " + std::to_string(e) + " has " + std::to_string(k) + " nodes";
    for (int j = m.node_start[e]; j < m.node_start[e + 1]; ++j)
      if (m.node_list[j] < 1 || m.node_list[j] > nn)
        return "element " + std::to_string(e) + " refers to node " + std::to_string(m.node_list[j]);
  }
  if ((!m.face_x.empty() && m.face_x.size() != ne) || m.face_x.size() != m.face_y.size())
    return "element centre arrays differ in length";
  return "";
}

// Edges (0-based node pairs) of a mesh of 3- and 4-node elements; empty when
// the mesh has other elements.
std::vector<std::pair<int, int>> MeshEdges(const ZrnMeshData& m) {
  std::vector<std::pair<int, int>> edges;
  for (int e = 1; e <= m.nelements(); ++e) {
    const int first = m.node_start[e], k = m.node_start[e + 1] - first;
    if (k != 3 && k != 4) return {};
    for (int j = 0; j < k; ++j) {
      const int a = m.node_list[first + j] - 1, b = m.node_list[first + (j + 1) % k] - 1;
      edges.emplace_back(std::min(a, b), std::max(a, b));
    }
  }
  std::sort(edges.begin(), edges.end());
  edges.erase(std::unique(edges.begin(), edges.end()), edges.end());
  return edges;
}

struct MeshVars {
  int topology = -1, node_x = -1, node_y = -1, node_z = -1, node_id = -1, node_code = -1;
  int face_nodes = -1, edge_nodes = -1, face_id = -1, face_type = -1, face_x = -1, face_y = -1;
};

MeshVars DefineMesh(ZrnFile& f, SpatialDims& d, int max_nodes, int nedges, bool have_crs) {
  const int ncid = f.ncid;
  const ZrnMeshData& m = f.mesh;
  const bool geo = IsLongLat(f.projection);
  MeshVars v;
  Check(nc_def_dim(ncid, "mesh2d_nNodes", static_cast<size_t>(m.nnodes()), &d.nodes), "nodes");
  Check(nc_def_dim(ncid, "mesh2d_nFaces", static_cast<size_t>(m.nelements()), &d.faces), "faces");
  Check(nc_def_dim(ncid, "mesh2d_nMax_face_nodes", static_cast<size_t>(max_nodes),
                   &d.max_face_nodes),
        "face nodes");
  if (nedges > 0) {
    Check(nc_def_dim(ncid, "mesh2d_nEdges", static_cast<size_t>(nedges), &d.edges), "edges");
    Check(nc_def_dim(ncid, "two", 2, &d.two), "two");
  }
  Check(nc_def_var(ncid, kMesh, NC_INT, 0, nullptr, &v.topology), "mesh topology");
  PutText(ncid, v.topology, "cf_role", "mesh_topology");
  PutText(ncid, v.topology, "long_name", "Topology data of 2D mesh");
  PutInt(ncid, v.topology, "topology_dimension", 2);
  PutText(ncid, v.topology, "node_coordinates", "mesh2d_node_x mesh2d_node_y");
  PutText(ncid, v.topology, "node_dimension", "mesh2d_nNodes");
  PutText(ncid, v.topology, "face_node_connectivity", "mesh2d_face_nodes");
  PutText(ncid, v.topology, "face_dimension", "mesh2d_nFaces");
  PutText(ncid, v.topology, "max_face_nodes_dimension", "mesh2d_nMax_face_nodes");
  if (nedges > 0) {
    PutText(ncid, v.topology, "edge_node_connectivity", "mesh2d_edge_nodes");
    PutText(ncid, v.topology, "edge_dimension", "mesh2d_nEdges");
  }
  PutText(ncid, v.topology, "face_coordinates", "mesh2d_face_x mesh2d_face_y");

  auto def = [&](const char* name, nc_type type, int dim, const char* long_name) {
    int var = -1;
    Check(nc_def_var(ncid, name, type, 1, &dim, &var), std::string("variable ") + name);
    PutText(ncid, var, "long_name", long_name);
    return var;
  };
  auto coord = [&](int var, bool is_x) {
    PutText(ncid, var, "standard_name",
            geo ? (is_x ? "longitude" : "latitude")
                : (is_x ? "projection_x_coordinate" : "projection_y_coordinate"));
    PutText(ncid, var, "units", geo ? (is_x ? "degrees_east" : "degrees_north") : "m");
    if (have_crs) PutText(ncid, var, "grid_mapping", "crs");
  };
  v.node_x = def("mesh2d_node_x", NC_DOUBLE, d.nodes, "x-coordinate of mesh nodes");
  coord(v.node_x, true);
  v.node_y = def("mesh2d_node_y", NC_DOUBLE, d.nodes, "y-coordinate of mesh nodes");
  coord(v.node_y, false);
  v.node_z = def("mesh2d_node_z", NC_DOUBLE, d.nodes, "bed level at mesh nodes");
  PutText(ncid, v.node_z, "units", "m");
  PutInt(ncid, v.node_z, "zrn_item_type", kUvqIBathymetry);
  PutInt(ncid, v.node_z, "zrn_unit", kUvqUmeter);
  PutText(ncid, v.node_z, "mesh", kMesh);
  PutText(ncid, v.node_z, "location", "node");
  PutText(ncid, v.node_z, "coordinates", "mesh2d_node_x mesh2d_node_y");
  if (have_crs) PutText(ncid, v.node_z, "grid_mapping", "crs");
  v.node_id = def("mesh2d_node_id", NC_INT, d.nodes, "node id");
  v.node_code = def("mesh2d_node_code", NC_INT, d.nodes, "node boundary code");
  int fdims[2] = {d.faces, d.max_face_nodes};
  Check(nc_def_var(ncid, "mesh2d_face_nodes", NC_INT, 2, fdims, &v.face_nodes), "face nodes");
  PutText(ncid, v.face_nodes, "cf_role", "face_node_connectivity");
  PutText(ncid, v.face_nodes, "long_name", "vertex nodes of mesh faces (counterclockwise)");
  PutInt(ncid, v.face_nodes, "start_index", 0);
  const int fill = -1;
  Check(nc_put_att_int(ncid, v.face_nodes, "_FillValue", NC_INT, 1, &fill), "face node fill");
  if (nedges > 0) {
    int edims[2] = {d.edges, d.two};
    Check(nc_def_var(ncid, "mesh2d_edge_nodes", NC_INT, 2, edims, &v.edge_nodes), "edge nodes");
    PutText(ncid, v.edge_nodes, "cf_role", "edge_node_connectivity");
    PutText(ncid, v.edge_nodes, "long_name", "start and end nodes of mesh edges");
    PutInt(ncid, v.edge_nodes, "start_index", 0);
  }
  v.face_id = def("mesh2d_face_id", NC_INT, d.faces, "element id");
  v.face_type = def("mesh2d_face_type", NC_INT, d.faces, "element type code");
  v.face_x = def("mesh2d_face_x", NC_DOUBLE, d.faces, "x-coordinate of face centres");
  coord(v.face_x, true);
  v.face_y = def("mesh2d_face_y", NC_DOUBLE, d.faces, "y-coordinate of face centres");
  coord(v.face_y, false);
  return v;
}

void WriteMesh(const ZrnFile& f, const MeshVars& v, int max_nodes,
               const std::vector<std::pair<int, int>>& edges) {
  const int ncid = f.ncid;
  const ZrnMeshData& m = f.mesh;
  const int ne = m.nelements();
  Check(nc_put_var_double(ncid, v.node_x, m.x.begin()), "node x");
  Check(nc_put_var_double(ncid, v.node_y, m.y.begin()), "node y");
  Check(nc_put_var_double(ncid, v.node_z, m.z.begin()), "node z");
  Check(nc_put_var_int(ncid, v.node_id, m.node_id.begin()), "node ids");
  Check(nc_put_var_int(ncid, v.node_code, m.node_code.begin()), "node codes");
  std::vector<int> fn(static_cast<size_t>(ne) * static_cast<size_t>(max_nodes), -1);
  std::vector<double> cx(static_cast<size_t>(ne)), cy(static_cast<size_t>(ne));
  for (int e = 1; e <= ne; ++e) {
    const int first = m.node_start[e], k = m.node_start[e + 1] - first;
    double sx = 0, sy = 0;
    for (int j = 0; j < k; ++j) {
      const int node = m.node_list[first + j];
      fn[static_cast<size_t>(e - 1) * static_cast<size_t>(max_nodes) + static_cast<size_t>(j)] =
          node - 1;
      sx += m.x[node];
      sy += m.y[node];
    }
    cx[static_cast<size_t>(e - 1)] = m.face_x.empty() ? sx / k : m.face_x[e];
    cy[static_cast<size_t>(e - 1)] = m.face_y.empty() ? sy / k : m.face_y[e];
  }
  Check(nc_put_var_int(ncid, v.face_nodes, fn.data()), "face nodes");
  if (!edges.empty()) {
    std::vector<int> en;
    en.reserve(edges.size() * 2);
    for (const auto& [a, b] : edges) {
      en.push_back(a);
      en.push_back(b);
    }
    Check(nc_put_var_int(ncid, v.edge_nodes, en.data()), "edge nodes");
  }
  Check(nc_put_var_int(ncid, v.face_id, m.element_id.begin()), "element ids");
  Check(nc_put_var_int(ncid, v.face_type, m.element_type.begin()), "element types");
  Check(nc_put_var_double(ncid, v.face_x, cx.data()), "face x");
  Check(nc_put_var_double(ncid, v.face_y, cy.data()), "face y");
}

// The grid mapping `crs` (define mode); false when nothing is known of the projection.
bool DefineCrs(const ZrnFile& f) {
  bool south = false;
  const int zone = UtmZone(f.projection, south);
  const bool geo = IsLongLat(f.projection);
  if (f.crs_wkt.empty() && zone == 0 && !geo) return false;
  int epsg = f.epsg;
  if (epsg == 0 && geo) epsg = 4326;
  if (epsg == 0 && zone > 0) epsg = (south ? 32700 : 32600) + zone;
  int var = -1;
  Check(nc_def_var(f.ncid, "crs", NC_INT, 0, nullptr, &var), "crs");
  if (geo) {
    PutText(f.ncid, var, "grid_mapping_name", "latitude_longitude");
    PutDouble(f.ncid, var, "semi_major_axis", 6378137.0);
    PutDouble(f.ncid, var, "inverse_flattening", 298.257223563);
  } else if (zone > 0) {
    PutText(f.ncid, var, "grid_mapping_name", "transverse_mercator");
    PutDouble(f.ncid, var, "scale_factor_at_central_meridian", 0.9996);
    PutDouble(f.ncid, var, "longitude_of_central_meridian", -183.0 + 6.0 * zone);
    PutDouble(f.ncid, var, "latitude_of_projection_origin", 0.0);
    PutDouble(f.ncid, var, "false_easting", 500000.0);
    PutDouble(f.ncid, var, "false_northing", south ? 10000000.0 : 0.0);
    PutDouble(f.ncid, var, "semi_major_axis", 6378137.0);
    PutDouble(f.ncid, var, "inverse_flattening", 298.257223563);
  }
  if (!f.crs_wkt.empty()) {
    PutText(f.ncid, var, "crs_wkt", f.crs_wkt);
    PutText(f.ncid, var, "wkt", f.crs_wkt);
  }
  if (epsg > 0) {
    PutInt(f.ncid, var, "epsg", epsg);
    PutText(f.ncid, var, "EPSG_code", "EPSG:" + std::to_string(epsg));
  }
  PutText(f.ncid, var, "zrn_projection", f.projection);
  return true;
}

// Which axis type a file kind holds (kind from the extension or the items).
int KindAxis(int kind) { return kind == 4 ? kZrnAxisD4 : kind; }

std::string CheckForCreate(const ZrnFile& f, int& kind) {
  if (f.time.type == kZrnTimeUndefined) return "no time axis";
  kind = zrnFileKind(f.name);
  const bool mesh_type = zrnIsMeshFileType(f.file_type);
  if (kind < 0) {
    kind = mesh_type ? 4 : (f.items.empty() ? 0 : f.items.front().axis.type);
    if (kind < 0) kind = 0;
  }
  if ((kind == 4) != mesh_type) return "file type " + std::to_string(f.file_type) + " for this file";
  if (kind == 4) {
    const std::string problem = MeshProblem(f.mesh);
    if (!problem.empty()) return problem;
  }
  for (std::size_t k = 0; k < f.items.size(); ++k) {
    const ZrnItemInfo& it = f.items[k];
    const std::string which = "item " + std::to_string(k + 1);
    if (it.name.empty()) return which + " has no name";
    if (it.axis.type != KindAxis(kind)) return which + " has a spatial axis of another file kind";
    if (kind == 4) {
      const int n = it.axis.location == kZrnLocationFace ? f.mesh.nelements()
                    : it.axis.location == kZrnLocationNode ? f.mesh.nnodes()
                                                           : it.axis.n[0];
      if (it.axis.n[0] != n) return which + " does not fit the mesh";
    } else if (!SameAxis(it.axis, f.items.front().axis)) {
      return which + " has another spatial axis than item 1";
    }
  }
  return "";
}

int CreateFile(ZrnFile& f) {
  if (!f.writing || f.header_ready || f.ncid >= 0)
    return Fail(f, kZrnErrCreateFile, "no header to create the file from");
  int kind = 0;
  const std::string problem = CheckForCreate(f, kind);
  if (!problem.empty()) {
    const int code = problem == "no time axis" ? kZrnErrTimeAxis
                     : problem.find("axis") != std::string::npos || problem.find("fit") != std::string::npos
                         ? kZrnErrSpatialAxis
                     : problem.rfind("file type", 0) == 0 ? kZrnErrFileType
                     : problem.rfind("item", 0) == 0      ? kZrnErrItem
                                                          : kZrnErrCreateFile;
    return Fail(f, code, problem);
  }
  AllowConcurrentReaders();
  int ncid = -1;
  int nc = nc_create(f.name.c_str(), NC_NETCDF4 | NC_CLASSIC_MODEL | NC_CLOBBER, &ncid);
  if (nc != NC_NOERR) return Fail(f, kZrnErrCreateFile, nc_strerror(nc));
  f.ncid = ncid;
  try {
    const bool mesh = kind == 4;
    PutText(ncid, NC_GLOBAL, "Conventions", mesh ? "CF-1.8 UGRID-1.0" : "CF-1.8");
    PutText(ncid, NC_GLOBAL, "title", f.title);
    PutText(ncid, NC_GLOBAL, "source", kSource);
    PutInt(ncid, NC_GLOBAL, "zrn_file_type", f.file_type);
    PutInt(ncid, NC_GLOBAL, "zrn_data_type", f.data_type);
    PutDouble(ncid, NC_GLOBAL, "zrn_delete_value", f.delete_value);
    PutText(ncid, NC_GLOBAL, "zrn_projection", f.projection);
    const double origin[2] = {f.origin_x, f.origin_y};
    Check(nc_put_att_double(ncid, NC_GLOBAL, "zrn_origin", NC_DOUBLE, 2, origin), "origin");
    PutDouble(ncid, NC_GLOBAL, "zrn_orientation", f.orientation);
    for (const auto& b : f.blocks) {
      const std::string att = "zrn_block_" + b.name;
      if (b.integer) {
        std::vector<int> iv(b.values.size());
        for (std::size_t i = 0; i < iv.size(); ++i) iv[i] = static_cast<int>(std::lround(b.values[i]));
        Check(nc_put_att_int(ncid, NC_GLOBAL, att.c_str(), NC_INT, iv.size(), iv.data()), att);
      } else {
        Check(nc_put_att_double(ncid, NC_GLOBAL, att.c_str(), NC_DOUBLE, b.values.size(),
                                b.values.data()),
              att);
      }
    }

    int time_dim = -1;
    Check(nc_def_dim(ncid, "time", NC_UNLIMITED, &time_dim), "time dimension");
    Check(nc_def_var(ncid, "time", NC_DOUBLE, 1, &time_dim, &f.time_varid), "time variable");
    const bool calendar = f.time.type == kZrnTimeEqCalendar || f.time.type == kZrnTimeNeqCalendar;
    PutText(ncid, f.time_varid, "standard_name", "time");
    PutText(ncid, f.time_varid, "long_name", "time");
    PutText(ncid, f.time_varid, "units",
            calendar ? "seconds since " + zrnDateTimeText(f.time.start) : std::string("seconds"));
    if (calendar) PutText(ncid, f.time_varid, "calendar", "standard");
    PutText(ncid, f.time_varid, "axis", "T");
    PutText(ncid, f.time_varid, "zrn_time_axis", zrn_detail::TimeAxisText(f.time.type));
    if (f.time.type == kZrnTimeEqCalendar || f.time.type == kZrnTimeEqRelative)
      PutDouble(ncid, f.time_varid, "zrn_time_step", f.time.dt);
    if (!calendar) PutDouble(ncid, f.time_varid, "zrn_time_start_offset", f.time.start_offset);

    const bool have_crs = DefineCrs(f);
    SpatialDims dims;
    MeshVars mesh_vars;
    std::vector<std::pair<int, int>> edges;
    int max_nodes = 0;
    if (mesh) {
      for (int e = 1; e <= f.mesh.nelements(); ++e)
        max_nodes = std::max(max_nodes, f.mesh.node_start[e + 1] - f.mesh.node_start[e]);
      edges = MeshEdges(f.mesh);
      mesh_vars = DefineMesh(f, dims, max_nodes, static_cast<int>(edges.size()), have_crs);
    }
    f.item_varid.clear();
    for (std::size_t k = 0; k < f.items.size(); ++k)
      f.item_varid.push_back(DefineItemVariable(f, dims, time_dim, f.items[k], true,
                                                static_cast<int>(k + 1), have_crs));
    Check(nc_enddef(ncid), "end of definitions");
    PutCoordinateValues(ncid, dims);
    if (mesh) WriteMesh(f, mesh_vars, max_nodes, edges);
    Check(nc_sync(ncid), "flush");
  } catch (const NcFailure& e) {
    nc_close(ncid);
    f.ncid = -1;
    return Fail(f, kZrnErrCreateFile, e.what);
  }
  f.mesh = ZrnMeshData{};
  SizeRecord(f);
  f.creator = kSource;
  f.header_ready = true;
  f.can_write = true;
  f.next_item = 1;
  f.current_step = 0;
  f.time.nsteps = 0;
  f.step_times.clear();
  f.dynamic_started = false;
  f.statics.clear();
  f.static_varid.clear();
  return kZrnOk;
}

// ---- opening a file --------------------------------------------------------------------

double TimeUnitSeconds(const std::string& unit) {
  static const std::pair<const char*, double> kUnits[] = {
      {"s", 1.0},          {"sec", 1.0},        {"secs", 1.0},      {"second", 1.0},
      {"seconds", 1.0},    {"min", 60.0},       {"mins", 60.0},     {"minute", 60.0},
      {"minutes", 60.0},   {"h", 3600.0},       {"hr", 3600.0},     {"hrs", 3600.0},
      {"hour", 3600.0},    {"hours", 3600.0},   {"d", 86400.0},     {"day", 86400.0},
      {"days", 86400.0}};
  for (const auto& [name, factor] : kUnits)
    if (unit == name) return factor;
  return 0.0;
}

// Item type from a CF standard name, for files written by other tools.
int ItemTypeFromStandardName(const std::string& sn) {
  static const std::pair<const char*, int> kNames[] = {
      {"sea_surface_height", kUvqIWaterLevel},
      {"sea_surface_height_above_geoid", kUvqIWaterLevel},
      {"sea_surface_height_above_mean_sea_level", kUvqIWaterLevel},
      {"water_surface_height_above_reference_datum", kUvqIWaterLevel},
      {"sea_floor_depth_below_sea_surface", kUvqIWaterDepth},
      {"wind_speed", kUvqIWindSpeed},
      {"wind_from_direction", kUvqIWindDirection},
      {"sea_water_temperature", kUvqITemperature},
      {"sea_water_salinity", kUvqISalinity},
      {"water_volume_transport_in_river_channel", kUvqIDischarge},
      {"air_pressure", kUvqIAirPressure},
      {"air_pressure_at_mean_sea_level", kUvqIAirPressure},
      {"air_temperature", kUvqIAirTemperature},
      {"relative_humidity", kUvqIRelativeHumidity},
      {"sea_water_speed", kUvqICurrentSpeed},
      {"eastward_sea_water_velocity", kUvqIUVelocity},
      {"northward_sea_water_velocity", kUvqIVVelocity},
      {"eastward_wind", kUvqIUVelocity},
      {"northward_wind", kUvqIVVelocity},
      {"altitude", kUvqIBathymetry},
  };
  for (const auto& [name, key] : kNames)
    if (sn == name) return key;
  return kUvqItemUndefined;
}

struct VarInfo {
  int id = -1;
  std::string name;
  nc_type type = NC_NAT;
  std::vector<int> dims;
};

std::vector<VarInfo> ListVariables(int ncid) {
  int nvars = 0;
  Check(nc_inq_nvars(ncid, &nvars), "variables");
  std::vector<VarInfo> out;
  for (int v = 0; v < nvars; ++v) {
    VarInfo vi;
    vi.id = v;
    char name[NC_MAX_NAME + 1];
    int nd = 0;
    Check(nc_inq_var(ncid, v, name, &vi.type, &nd, nullptr, nullptr), "variable");
    vi.dims.resize(static_cast<size_t>(nd));
    if (nd > 0) Check(nc_inq_vardimid(ncid, v, vi.dims.data()), "variable dimensions");
    vi.name = name;
    out.push_back(std::move(vi));
  }
  return out;
}

std::string DimName(int ncid, int dim) {
  char name[NC_MAX_NAME + 1];
  Check(nc_inq_dimname(ncid, dim, name), "dimension name");
  return name;
}

int DimLen(int ncid, int dim) {
  size_t len = 0;
  Check(nc_inq_dimlen(ncid, dim, &len), "dimension length");
  return static_cast<int>(len);
}

// Origin and spacing of the axis along dimension dim (0 and 1 without a
// coordinate variable). Our files keep both as attributes of the coordinate
// variable: exact, and the only record of the spacing of a single-cell axis.
// Files of other tools give them by the coordinate values (spacing over the
// whole span); so do ours once another tool has cut or reversed the axis:
// attributes that disagree with the values give way to them.
void AxisFromCoordinate(int ncid, int dim, int n, double& x0, double& dx) {
  x0 = 0.0;
  dx = 1.0;
  const std::string name = DimName(ncid, dim);
  int var = -1, ndims = 0, vdim = -1;
  if (n < 1 || nc_inq_varid(ncid, name.c_str(), &var) != NC_NOERR) return;
  Check(nc_inq_varndims(ncid, var, &ndims), "coordinate " + name);
  if (ndims != 1) return;  // not a coordinate variable (a curvilinear grid's 2D x)
  Check(nc_inq_vardimid(ncid, var, &vdim), "coordinate " + name);
  if (vdim != dim) return;
  std::vector<double> v(static_cast<size_t>(n));
  Check(nc_get_var_double(ncid, var, v.data()), "values of coordinate " + name);
  const double first = v.front(), last = v.back();
  if (!std::isfinite(first) || !std::isfinite(last))
    throw NcFailure{"coordinate " + name + " has values missing"};
  x0 = first;
  if (n >= 2 && last != first) dx = (last - first) / (n - 1);
  double origin = 0.0, spacing = 0.0;
  if (!GetDouble(ncid, var, kAxisOrigin, origin) || !GetDouble(ncid, var, kAxisSpacing, spacing) ||
      !std::isfinite(origin) || !std::isfinite(spacing) || spacing == 0.0)
    return;
  const double tol = 1e-9 * std::max({std::fabs(first), std::fabs(last), std::fabs(spacing)});
  const bool same_origin = std::fabs(origin - first) <= tol;
  if (n == 1) {
    dx = spacing;
    if (same_origin) x0 = origin;
  } else if (same_origin && std::fabs(spacing - dx) <= tol) {
    x0 = origin;
    dx = spacing;
  }
}

struct MeshDims {
  int nodes = -1, faces = -1, volumes = -1;
};

std::string AxisText(int n, double x0, double dx) {
  char text[96];
  std::snprintf(text, sizeof text, "%d from %.10g by %.10g", n, x0, dx);
  return text;
}

// How a grid axis differs from the coordinates x, y, z the file already has
// ("" when it fits them or the file has none of them).
std::string OtherAxisInFile(int ncid, const ZrnSpatialAxis& a) {
  static const char* const kNames[3] = {"x", "y", "z"};
  if (a.type < kZrnAxisD1 || a.type > kZrnAxisD3) return "";
  try {
    for (int k = 0; k < a.type; ++k) {
      int dim = -1;
      if (nc_inq_dimid(ncid, kNames[k], &dim) != NC_NOERR) continue;
      const int n = DimLen(ncid, dim);
      double x0 = 0.0, dx = 0.0;
      AxisFromCoordinate(ncid, dim, n, x0, dx);
      const double tol = 1e-9 * std::max({std::fabs(x0), std::fabs(x0 + (n - 1) * dx), std::fabs(dx)});
      if (n != a.n[k] || std::fabs(x0 - a.x0[k]) > tol || std::fabs(dx - a.dx[k]) > tol)
        return std::string("axis ") + kNames[k] + " (" + AxisText(a.n[k], a.x0[k], a.dx[k]) +
               ") differs from the file's (" + AxisText(n, x0, dx) + ")";
    }
  } catch (const NcFailure& e) {
    return e.what;
  }
  return "";
}

ZrnSpatialAxis AxisOfVariable(int ncid, const VarInfo& v, std::size_t first,
                              const MeshDims& md) {
  ZrnSpatialAxis a;
  const std::size_t nd = v.dims.size() - first;
  std::string location;
  GetText(ncid, v.id, "location", location);
  if (nd == 1 && (v.dims[first] == md.faces || v.dims[first] == md.nodes ||
                  v.dims[first] == md.volumes || location == "face" || location == "node")) {
    a.type = kZrnAxisD4;
    a.n[0] = DimLen(ncid, v.dims[first]);
    a.location = v.dims[first] == md.nodes || location == "node" ? kZrnLocationNode
                 : v.dims[first] == md.volumes                   ? kZrnLocationVolume
                                                                 : kZrnLocationFace;
    return a;
  }
  if (nd > 3) throw NcFailure{"variable " + v.name + " has more than three spatial dimensions"};
  a.type = static_cast<int>(nd);
  for (std::size_t k = 0; k < nd; ++k) {
    // Dimensions are stored slowest first: (z, y, x).
    const int dim = v.dims[first + nd - 1 - k];
    a.n[k] = DimLen(ncid, dim);
    AxisFromCoordinate(ncid, dim, a.n[k], a.x0[k], a.dx[k]);
  }
  return a;
}

ZrnItemInfo ItemOfVariable(const ZrnFile& f, const VarInfo& v, std::size_t first,
                           const MeshDims& md) {
  const int ncid = f.ncid;
  ZrnItemInfo it;
  it.var_name = v.name;
  if ((!GetText(ncid, v.id, "zrn_item_name", it.name) || it.name.empty()) &&
      (!GetText(ncid, v.id, "long_name", it.name) || it.name.empty()))
    it.name = v.name;
  std::string units, standard_name;
  GetText(ncid, v.id, "units", units);
  GetText(ncid, v.id, "standard_name", standard_name);
  if (!GetInt(ncid, v.id, "zrn_item_type", it.item_type))
    it.item_type = ItemTypeFromStandardName(standard_name);
  if (!GetInt(ncid, v.id, "zrn_unit", it.unit)) it.unit = uvqGetUnitKey(units);
  if (!GetInt(ncid, v.id, "zrn_value_type", it.value_type)) it.value_type = kZrnInstantaneous;
  it.precision = v.type == NC_DOUBLE || v.type == NC_INT || v.type == NC_INT64 ||
                         v.type == NC_UINT || v.type == NC_UINT64
                     ? kZrnDouble
                     : kZrnFloat;
  int shuffle = 0, deflate = 0, level = 0;
  if (nc_inq_var_deflate(ncid, v.id, &shuffle, &deflate, &level) == NC_NOERR && deflate)
    it.compression = level;
  it.axis = AxisOfVariable(ncid, v, first, md);
  return it;
}

double DefaultFill(nc_type type) {
  switch (type) {
    case NC_BYTE: return NC_FILL_BYTE;
    case NC_CHAR: return NC_FILL_CHAR;
    case NC_SHORT: return NC_FILL_SHORT;
    case NC_INT: return NC_FILL_INT;
    case NC_FLOAT: return NC_FILL_FLOAT;
    case NC_DOUBLE: return NC_FILL_DOUBLE;
    case NC_UBYTE: return NC_FILL_UBYTE;
    case NC_USHORT: return NC_FILL_USHORT;
    case NC_UINT: return NC_FILL_UINT;
    default: return std::numeric_limits<double>::quiet_NaN();
  }
}

// Fill value, missing value and packing of a variable.
void Packing(int ncid, int var, nc_type type, double& fill, double& missing, double& scale,
             double& offset) {
  if (!GetDouble(ncid, var, "_FillValue", fill)) fill = DefaultFill(type);
  if (!GetDouble(ncid, var, "missing_value", missing)) missing = fill;
  if (!GetDouble(ncid, var, "scale_factor", scale)) scale = 1.0;
  if (!GetDouble(ncid, var, "add_offset", offset)) offset = 0.0;
}

bool SameStored(double v, double fill, nc_type type) {
  if (type == NC_FLOAT) return static_cast<float>(v) == static_cast<float>(fill);
  return v == fill;
}

// Turns stored values into values: fill and missing values become the delete
// value, packed values are unpacked.
void Unpack(double* data, long n, double fill, double missing, double scale, double offset,
            nc_type type, double delete_value) {
  for (long i = 0; i < n; ++i) {
    const double v = data[i];
    if (std::isnan(v) || SameStored(v, fill, type) || SameStored(v, missing, type))
      data[i] = delete_value;
    else
      data[i] = v * scale + offset;
  }
}

void ReadTimeAxis(ZrnFile& f, const std::vector<VarInfo>& vars, int& time_dim) {
  const int ncid = f.ncid;
  time_dim = -1;
  int unlimited = -1;
  nc_inq_unlimdim(ncid, &unlimited);
  const VarInfo* tv = nullptr;
  for (const auto& v : vars)
    if (v.name == "time" && v.dims.size() == 1) tv = &v;
  for (const auto& v : vars) {
    if (tv != nullptr) break;
    std::string units, axis, sn;
    if (v.dims.size() != 1) continue;
    GetText(ncid, v.id, "units", units);
    GetText(ncid, v.id, "axis", axis);
    GetText(ncid, v.id, "standard_name", sn);
    const bool coord = DimName(ncid, v.dims[0]) == v.name;
    if (coord && (axis == "T" || sn == "time" || Lower(units).find(" since ") != std::string::npos))
      tv = &v;
  }
  f.time = ZrnTimeAxis{};
  f.step_times.clear();
  if (tv == nullptr) return;  // no time axis: static data only
  time_dim = tv->dims[0];
  f.time_varid = tv->id;
  std::string units, calendar, axis_text;
  if (!GetText(ncid, tv->id, "units", units))
    throw NcFailure{"time variable " + tv->name + " has no units"};
  const std::string lu = Lower(units);
  const auto since = lu.find(" since ");
  const std::string unit_word = Words(lu.substr(0, since)).empty() ? "" : Words(lu.substr(0, since))[0];
  const double to_seconds = TimeUnitSeconds(unit_word);
  if (to_seconds <= 0.0) throw NcFailure{"time unit '" + units + "' is not supported"};
  const bool is_calendar = since != std::string::npos;
  ZrnDateTime reference;
  if (is_calendar && !zrnParseDateTime(units.substr(since + 7), reference))
    throw NcFailure{"time units '" + units + "'"};
  if (GetText(ncid, tv->id, "calendar", calendar)) {
    const std::string c = Lower(calendar);
    if (c != "standard" && c != "gregorian" && c != "proleptic_gregorian")
      throw NcFailure{"calendar '" + calendar + "' is not supported"};
  }
  const int n = DimLen(ncid, time_dim);
  std::vector<double> t(static_cast<size_t>(n));
  if (n > 0) Check(nc_get_var_double(ncid, tv->id, t.data()), "time values");
  for (auto& v : t) {
    if (!std::isfinite(v) || std::fabs(v) > 1e30) throw NcFailure{"time value missing"};
    v *= to_seconds;
  }
  for (int k = 1; k < n; ++k)
    if (!(t[static_cast<size_t>(k)] > t[static_cast<size_t>(k - 1)]))
      throw NcFailure{"time values do not increase at step " + std::to_string(k)};
  // Calendar axes start at the first step; step times count from there.
  if (is_calendar) {
    const double origin = n > 0 ? std::floor(t[0]) : 0.0;
    f.time.start = zrnAddSeconds(reference, origin);
    for (auto& v : t) v -= origin;
  }
  f.step_times = t;
  f.time.nsteps = n;
  double dt = 0.0;
  const bool known = GetText(ncid, tv->id, "zrn_time_axis", axis_text) &&
                     zrn_detail::TimeAxisFromText(axis_text) != kZrnTimeUndefined;
  bool equidistant = true;
  if (known) {
    const int type = zrn_detail::TimeAxisFromText(axis_text);
    equidistant = type == kZrnTimeEqCalendar || type == kZrnTimeEqRelative;
    GetDouble(ncid, tv->id, "zrn_time_step", dt);
  } else if (n >= 2) {
    dt = (t.back() - t.front()) / (n - 1);
    for (int k = 1; k < n && equidistant; ++k)
      equidistant = std::fabs(t[static_cast<size_t>(k)] - t[static_cast<size_t>(k - 1)] - dt) <=
                    1e-6 * (1.0 + std::fabs(dt));
  }
  f.time.type = is_calendar ? (equidistant ? kZrnTimeEqCalendar : kZrnTimeNeqCalendar)
                            : (equidistant ? kZrnTimeEqRelative : kZrnTimeNeqRelative);
  f.time.dt = equidistant ? dt : 0.0;
  if (!is_calendar && !GetDouble(ncid, tv->id, "zrn_time_start_offset", f.time.start_offset))
    f.time.start_offset = n > 0 ? t[0] : 0.0;
}

int OpenFile(ZrnFile& f, const std::string& file_name, bool write_access) {
  zrnHeaderDestroy(f, nullptr);
  f.name = file_name;
  AllowConcurrentReaders();
  int ncid = -1;
  const int nc = nc_open(file_name.c_str(), write_access ? NC_WRITE : NC_NOWRITE, &ncid);
  if (nc != NC_NOERR) return Fail(f, kZrnErrOpen, nc_strerror(nc));
  f.ncid = ncid;
  int code = kZrnErrOpen;
  try {
    const auto vars = ListVariables(ncid);
    std::string text;
    f.title.clear();
    GetText(ncid, NC_GLOBAL, "title", f.title);
    if (GetText(ncid, NC_GLOBAL, "source", text)) f.creator = text;
    else f.creator.clear();
    GetInt(ncid, NC_GLOBAL, "zrn_data_type", f.data_type);
    GetDouble(ncid, NC_GLOBAL, "zrn_delete_value", f.delete_value);
    GetText(ncid, NC_GLOBAL, "zrn_projection", f.projection);
    std::vector<double> origin;
    if (GetDoubles(ncid, NC_GLOBAL, "zrn_origin", origin) && origin.size() == 2) {
      f.origin_x = origin[0];
      f.origin_y = origin[1];
    }
    GetDouble(ncid, NC_GLOBAL, "zrn_orientation", f.orientation);
    int natts = 0;
    Check(nc_inq_natts(ncid, &natts), "global attributes");
    for (int a = 0; a < natts; ++a) {
      char name[NC_MAX_NAME + 1];
      Check(nc_inq_attname(ncid, NC_GLOBAL, a, name), "attribute name");
      const std::string s = name;
      if (s.rfind("zrn_block_", 0) != 0) continue;
      ZrnCustomBlock b;
      b.name = s.substr(10);
      nc_type type;
      Check(nc_inq_atttype(ncid, NC_GLOBAL, name, &type), "attribute type");
      b.integer = type != NC_DOUBLE && type != NC_FLOAT;
      if (GetDoubles(ncid, NC_GLOBAL, name, b.values)) f.blocks.push_back(std::move(b));
    }
    int crs = -1;
    if (nc_inq_varid(ncid, "crs", &crs) == NC_NOERR) {
      if (!GetText(ncid, crs, "crs_wkt", f.crs_wkt)) GetText(ncid, crs, "spatial_ref", f.crs_wkt);
      GetInt(ncid, crs, "epsg", f.epsg);
    }

    // Mesh topology.
    MeshDims md;
    const VarInfo* topology = nullptr;
    for (const auto& v : vars) {
      std::string role;
      if (GetText(ncid, v.id, "cf_role", role) && role == "mesh_topology") {
        topology = &v;
        break;
      }
    }
    std::set<std::string> geometry;  // variables that describe the mesh, not items
    if (topology != nullptr) {
      geometry.insert(topology->name);
      std::string s;
      for (const char* att : {"node_coordinates", "face_node_connectivity", "edge_node_connectivity",
                              "face_coordinates", "edge_coordinates", "face_edge_connectivity",
                              "face_face_connectivity", "edge_face_connectivity", "boundary_node_connectivity"})
        if (GetText(ncid, topology->id, att, s))
          for (const auto& w : Words(s)) geometry.insert(w);
      const std::string p = topology->name;
      for (const char* suffix : {"_node_z", "_node_id", "_node_code", "_face_id", "_face_type"})
        geometry.insert(p + suffix);
      int fnv = -1;
      if (GetText(ncid, topology->id, "face_node_connectivity", s) && !Words(s).empty() &&
          nc_inq_varid(ncid, Words(s)[0].c_str(), &fnv) == NC_NOERR) {
        int fd[2];
        Check(nc_inq_vardimid(ncid, fnv, fd), "face nodes");
        md.faces = fd[0];
      }
      int xv = -1;
      if (GetText(ncid, topology->id, "node_coordinates", s) && !Words(s).empty() &&
          nc_inq_varid(ncid, Words(s)[0].c_str(), &xv) == NC_NOERR) {
        Check(nc_inq_vardimid(ncid, xv, &md.nodes), "node dimension");
      }
      nc_inq_dimid(ncid, "mesh2d_nVolumes", &md.volumes);
      if (md.nodes < 0 || md.faces < 0) throw NcFailure{"mesh topology without nodes or faces"};
    }
    int file_type = 0;
    const bool has_type = GetInt(ncid, NC_GLOBAL, "zrn_file_type", file_type);
    if (topology != nullptr) f.file_type = has_type && zrnIsMeshFileType(file_type) ? file_type : kZrnFileMesh2D;
    else f.file_type = kZrnFileData;
    if (zrnFileKind(file_name) == 4 && topology == nullptr) {
      code = kZrnErrFileType;
      throw NcFailure{"no mesh topology in a .zrnu file"};
    }
    if (topology != nullptr && zrnCustomBlockName(f.file_type) == "TANO_KX") {
      bool have_block = false;
      for (const auto& b : f.blocks) have_block = have_block || b.name == "TANO_KX";
      if (!have_block) {
        int tdim = 2;
        GetInt(ncid, topology->id, "topology_dimension", tdim);
        f.blocks.push_back(ZrnCustomBlock{
            "TANO_KX", true,
            {double(DimLen(ncid, md.nodes)), double(DimLen(ncid, md.faces)), double(tdim), 0.0, 0.0}});
      }
    }

    code = kZrnErrTimeAxis;
    int time_dim = -1;
    ReadTimeAxis(f, vars, time_dim);

    // Items: variables numbered by zrn_item / zrn_static, or, in files of
    // other tools, every non-coordinate variable along time in file order.
    code = kZrnErrItem;
    std::string bounds;
    if (f.time_varid >= 0) GetText(ncid, f.time_varid, "bounds", bounds);
    bool numbered = false;
    for (const auto& v : vars) numbered = numbered || HasAtt(ncid, v.id, "zrn_item");
    std::vector<std::pair<int, const VarInfo*>> dyn, sta;
    for (const auto& v : vars) {
      if (v.id == f.time_varid || v.name == bounds || geometry.count(v.name) > 0 || v.name == "crs")
        continue;
      if (v.type == NC_CHAR || v.type == NC_STRING) continue;
      const bool timed = !v.dims.empty() && v.dims[0] == time_dim;
      int number = 0;
      if (numbered || HasAtt(ncid, v.id, "zrn_static")) {
        if (timed && GetInt(ncid, v.id, "zrn_item", number)) dyn.emplace_back(number, &v);
        else if (!timed && GetInt(ncid, v.id, "zrn_static", number)) sta.emplace_back(number, &v);
      } else if (timed && !(v.dims.size() == 1 && DimName(ncid, v.dims[0]) == v.name)) {
        dyn.emplace_back(static_cast<int>(dyn.size()) + 1, &v);
      }
    }
    auto order = [&](std::vector<std::pair<int, const VarInfo*>>& list, const char* what) {
      std::sort(list.begin(), list.end(),
                [](const auto& a, const auto& b) { return a.first < b.first; });
      for (std::size_t k = 0; k < list.size(); ++k)
        if (list[k].first != static_cast<int>(k) + 1)
          throw NcFailure{std::string(what) + " numbers are not 1.." + std::to_string(list.size())};
    };
    order(dyn, "item");
    order(sta, "static item");
    code = kZrnErrSpatialAxis;
    for (const auto& [number, v] : dyn) {
      f.items.push_back(ItemOfVariable(f, *v, 1, md));
      f.item_varid.push_back(v->id);
      double fill, missing, scale, offset;
      Packing(ncid, v->id, v->type, fill, missing, scale, offset);
      f.fill.push_back(fill);
      f.missing.push_back(missing);
      f.scale.push_back(scale);
      f.offset.push_back(offset);
    }
    for (const auto& [number, v] : sta) {
      f.statics.push_back(ItemOfVariable(f, *v, 0, md));
      f.static_varid.push_back(v->id);
    }
  } catch (const NcFailure& e) {
    nc_close(ncid);
    f.ncid = -1;
    return Fail(f, code, e.what);
  }
  f.header_ready = true;
  f.can_write = write_access;
  f.next_item = 1;
  f.current_step = 0;
  f.next_static = 0;
  f.dynamic_started = false;
  return kZrnOk;
}

// ---- records ------------------------------------------------------------------------------

void Advance(ZrnFile& f) {
  if (++f.next_item > static_cast<int>(f.items.size())) {
    f.next_item = 1;
    ++f.current_step;
  }
}

template <class T>
int WriteRecord(ZrnFile& f, double time, const T* data, long n) {
  if (f.ncid < 0 || !f.writing || !f.header_ready)
    return Fail(f, kZrnErrWriteDynamic, "file is not open for writing");
  if (f.items.empty()) return Fail(f, kZrnErrDynamicBlock, "file has no dynamic items");
  const int item = f.next_item;
  ZrnItemInfo& it = f.items[static_cast<size_t>(item - 1)];
  const long count = it.axis.Count();
  if (n != count || data == nullptr)
    return Fail(f, kZrnErrWriteDynamic, "item " + std::to_string(item) + " takes " +
                                            std::to_string(count) + " values, got " +
                                            std::to_string(n));
  const int step = f.current_step;
  double t = time;
  if (f.time.type == kZrnTimeEqCalendar) t = step * f.time.dt;
  else if (f.time.type == kZrnTimeEqRelative) t = f.time.start_offset + step * f.time.dt;
  if (item == 1) {
    if (!std::isfinite(t)) return Fail(f, kZrnErrTimeAxis, "time of step is not finite");
    if (step > 0 && !(t > f.last_time))
      return Fail(f, kZrnErrTimeAxis, "time " + std::to_string(t) + " s does not follow " +
                                          std::to_string(f.last_time) + " s");
    const size_t index = static_cast<size_t>(step);
    const int nc = nc_put_var1_double(f.ncid, f.time_varid, &index, &t);
    if (nc != NC_NOERR) return Fail(f, kZrnErrWriteDynamic, nc_strerror(nc));
    if (step == 0) f.first_time = t;
    f.last_time = t;
  }
  size_t start[4], cnt[4];
  RecordShape(it.axis, true, step, start, cnt);
  T* stored = RecordBuffer(f, data).data();
  StoreValues(data, n, f.delete_value, it.precision, stored);
  const int nc = PutValues(f.ncid, f.item_varid[static_cast<size_t>(item - 1)], start, cnt, stored);
  if (nc != NC_NOERR) return Fail(f, kZrnErrWriteDynamic, nc_strerror(nc));
  AddStatistics(it, data, n, f.delete_value);
  f.dynamic_started = true;
  Advance(f);
  if (f.next_item == 1) {
    f.time.nsteps = f.current_step;
    if (f.flush_each_step) {
      const int s = nc_sync(f.ncid);
      if (s != NC_NOERR) return Fail(f, kZrnErrFlush, nc_strerror(s));
    }
  }
  return kZrnOk;
}

int ReadRecord(ZrnFile& f, int& item, double& time, double* data, long n) {
  if (f.ncid < 0 || !f.header_ready) return Fail(f, kZrnErrReadDynamic, "file is not open");
  if (f.items.empty()) return Fail(f, kZrnErrDynamicBlock, "file has no dynamic items");
  const int k = f.next_item;
  const int step = f.current_step;
  if (step >= f.time.nsteps)
    return Fail(f, kZrnErrReadDynamic, "no time step " + std::to_string(step) + " (file has " +
                                           std::to_string(f.time.nsteps) + ")");
  ZrnItemInfo& it = f.items[static_cast<size_t>(k - 1)];
  const long count = it.axis.Count();
  if (n != count || data == nullptr)
    return Fail(f, kZrnErrReadDynamic, "item " + std::to_string(k) + " holds " +
                                           std::to_string(count) + " values, asked for " +
                                           std::to_string(n));
  size_t start[4], cnt[4];
  RecordShape(it.axis, true, step, start, cnt);
  const int var = f.item_varid[static_cast<size_t>(k - 1)];
  const int nc = nc_get_vara_double(f.ncid, var, start, cnt, data);
  if (nc != NC_NOERR) return Fail(f, kZrnErrReadDynamic, nc_strerror(nc));
  nc_type type;
  nc_inq_vartype(f.ncid, var, &type);
  const size_t j = static_cast<size_t>(k - 1);
  Unpack(data, n, f.fill[j], f.missing[j], f.scale[j], f.offset[j], type, f.delete_value);
  AddStatistics(it, data, n, f.delete_value);
  item = k;
  time = f.step_times[static_cast<size_t>(step)];
  f.dynamic_started = true;
  Advance(f);
  return kZrnOk;
}

int FindStaticVar(const ZrnFile& f, int static_no) {
  if (static_no < 1 || static_no > static_cast<int>(f.statics.size())) return -1;
  return f.static_varid[static_cast<size_t>(static_no - 1)];
}

template <class T>
int WriteStatic(ZrnFile& f, int static_no, const T* data, long n) {
  if (f.ncid < 0 || !f.can_write) return Fail(f, kZrnErrWriteStatic, "file is not open for writing");
  if (f.dynamic_started) return Fail(f, kZrnErrStaticWriteAfterDynamic, "");
  const int var = FindStaticVar(f, static_no);
  if (var < 0) return Fail(f, kZrnErrStaticBlock, "no static item " + std::to_string(static_no));
  ZrnItemInfo& it = f.statics[static_cast<size_t>(static_no - 1)];
  if (n != it.axis.Count() || data == nullptr)
    return Fail(f, kZrnErrWriteStatic, "static item " + std::to_string(static_no) + " takes " +
                                           std::to_string(it.axis.Count()) + " values, got " +
                                           std::to_string(n));
  size_t start[4], cnt[4];
  RecordShape(it.axis, false, 0, start, cnt);
  std::vector<T> stored(static_cast<size_t>(n));
  StoreValues(data, n, f.delete_value, it.precision, stored.data());
  const int nc = PutValues(f.ncid, var, start, cnt, stored.data());
  if (nc != NC_NOERR) return Fail(f, kZrnErrWriteStatic, nc_strerror(nc));
  AddStatistics(it, data, n, f.delete_value);
  return kZrnOk;
}

}  // namespace

// ---- entry points -------------------------------------------------------------------------

int zrnFileCreate(ZrnFile& f, bool flush_each_step, int* status) {
  f.flush_each_step = flush_each_step;
  return Finish(f, CreateFile(f), status);
}

int zrnFileRead(ZrnFile& f, const std::string& file_name, int* status) {
  return Finish(f, OpenFile(f, file_name, false), status);
}

int zrnFileEdit(ZrnFile& f, const std::string& file_name, int* status) {
  return Finish(f, OpenFile(f, file_name, true), status);
}

int zrnFileAppend(ZrnFile& f, const std::string& file_name, bool flush_each_step, int* status) {
  int code = OpenFile(f, file_name, true);
  if (code == kZrnOk) {
    if (f.time.type == kZrnTimeUndefined) {
      nc_close(f.ncid);
      f.ncid = -1;
      code = Fail(f, kZrnErrTimeAxis, "file has no time axis to append to");
    } else {
      f.writing = true;
      SizeRecord(f);
      f.flush_each_step = flush_each_step;
      f.current_step = f.time.nsteps;
      if (f.time.nsteps > 0) {
        f.first_time = f.step_times.front();
        f.last_time = f.step_times.back();
      }
      f.step_times.clear();
      f.dynamic_started = true;
    }
  }
  return Finish(f, code, status);
}

int zrnFileFlush(ZrnFile& f, int* status) {
  if (f.ncid < 0) return Finish(f, Fail(f, kZrnErrFlush, "file is not open"), status);
  const int nc = nc_sync(f.ncid);
  return Finish(f, nc == NC_NOERR ? kZrnOk : Fail(f, kZrnErrFlush, nc_strerror(nc)), status);
}

int zrnFileClose(ZrnFile& f, int* status) {
  if (f.ncid < 0) return Finish(f, Fail(f, kZrnErrFlush, "file is not open"), status);
  const int nc = nc_close(f.ncid);
  f.ncid = -1;
  f.writing = false;
  f.can_write = false;
  for (const auto& line : ZrnSummaryLines(f)) WriteLogLine(line);
  return Finish(f, nc == NC_NOERR ? kZrnOk : Fail(f, kZrnErrFlush, nc_strerror(nc)), status);
}

int zrnFileDelete(const std::string& file_name, int* status) {
  if (std::remove(file_name.c_str()) != 0 && errno != ENOENT)
    return Finish(file_name, std::strerror(errno), kZrnErrOpen, status);
  return Finish(file_name, "", kZrnOk, status);
}

int zrnSetCustomBlockValue(ZrnFile& f, const std::string& name, int k, double value,
                           int* status) {
  for (auto& b : f.blocks) {
    if (b.name != name) continue;
    if (k < 1 || k > static_cast<int>(b.values.size()))
      return Finish(f, Fail(f, kZrnErrSetBlock, "block " + name + " has no value " + std::to_string(k)),
                    status);
    if (f.header_ready && !f.can_write)
      return Finish(f, Fail(f, kZrnErrSetBlock, "file is open for reading only"), status);
    b.values[static_cast<size_t>(k - 1)] = value;
    if (f.ncid >= 0) {
      const std::string att = "zrn_block_" + name;
      int nc = nc_redef(f.ncid);
      if (nc == NC_NOERR || nc == NC_EINDEFINE) {
        if (b.integer) {
          std::vector<int> iv(b.values.size());
          for (std::size_t i = 0; i < iv.size(); ++i) iv[i] = static_cast<int>(std::lround(b.values[i]));
          nc = nc_put_att_int(f.ncid, NC_GLOBAL, att.c_str(), NC_INT, iv.size(), iv.data());
        } else {
          nc = nc_put_att_double(f.ncid, NC_GLOBAL, att.c_str(), NC_DOUBLE, b.values.size(),
                                 b.values.data());
        }
        const int end = nc_enddef(f.ncid);
        if (nc == NC_NOERR) nc = end;
      }
      if (nc != NC_NOERR) return Finish(f, Fail(f, kZrnErrSetBlock, nc_strerror(nc)), status);
    }
    return Finish(f, kZrnOk, status);
  }
  return Finish(f, Fail(f, kZrnErrSetBlock, "no block " + name), status);
}

int zrnSetMesh(ZrnFile& f, const ZrnMeshData& mesh, int* status) {
  if (!f.writing || f.header_ready)
    return Finish(f, Fail(f, kZrnErrCreateHeader, "header is closed"), status);
  if (!zrnIsMeshFileType(f.file_type))
    return Finish(f, Fail(f, kZrnErrFileType, "a mesh needs a file type 2000..2004"), status);
  const std::string problem = MeshProblem(mesh);
  if (!problem.empty()) return Finish(f, Fail(f, kZrnErrCreateHeader, problem), status);
  f.mesh = mesh;
  const int code = zrnAddCustomBlock(
      f, "TANO_KX",
      std::vector<int>{mesh.nnodes(), mesh.nelements(), mesh.ndim, mesh.nlayers, mesh.nlayers_sigma},
      status);
  return code != kZrnOk ? code : Finish(f, kZrnOk, status);
}

int zrnReadMesh(ZrnFile& f, ZrnMeshData& mesh, int* status) {
  if (f.ncid < 0 || !zrnIsMeshFileType(f.file_type))
    return Finish(f, Fail(f, kZrnErrFileType, "not an open mesh file"), status);
  const int ncid = f.ncid;
  mesh = ZrnMeshData{};
  try {
    int topo = -1;
    for (const auto& v : ListVariables(ncid)) {
      std::string role;
      if (GetText(ncid, v.id, "cf_role", role) && role == "mesh_topology") {
        topo = v.id;
        break;
      }
    }
    if (topo < 0) throw NcFailure{"no mesh topology"};
    char tname[NC_MAX_NAME + 1];
    Check(nc_inq_varname(ncid, topo, tname), "topology");
    const std::string p = tname;
    std::string s;
    if (!GetText(ncid, topo, "node_coordinates", s) || Words(s).size() != 2)
      throw NcFailure{"node_coordinates must name two variables"};
    const auto xy = Words(s);
    if (!GetText(ncid, topo, "face_node_connectivity", s) || Words(s).empty())
      throw NcFailure{"no face_node_connectivity"};
    const std::string fname = Words(s)[0];
    int xv, yv, fv;
    Check(nc_inq_varid(ncid, xy[0].c_str(), &xv), xy[0]);
    Check(nc_inq_varid(ncid, xy[1].c_str(), &yv), xy[1]);
    Check(nc_inq_varid(ncid, fname.c_str(), &fv), fname);
    int ndim_nodes, fd[2], fnd = 0;
    Check(nc_inq_vardimid(ncid, xv, &ndim_nodes), "node dimension");
    Check(nc_inq_varndims(ncid, fv, &fnd), "face nodes");
    if (fnd != 2) throw NcFailure{fname + " must have two dimensions"};
    Check(nc_inq_vardimid(ncid, fv, fd), "face dimensions");
    const int nn = DimLen(ncid, ndim_nodes), ne = DimLen(ncid, fd[0]), width = DimLen(ncid, fd[1]);
    double v = 0;
    int st = 0;
    mesh.ndim = zrnGetCustomBlockValue(f, "TANO_KX", 3, v, &st) == kZrnOk ? int(v) : 2;
    mesh.nlayers = zrnGetCustomBlockValue(f, "TANO_KX", 4, v, &st) == kZrnOk ? int(v) : 0;
    mesh.nlayers_sigma =
        zrnGetCustomBlockValue(f, "TANO_KX", 5, v, &st) == kZrnOk ? int(v) : mesh.nlayers;
    mesh.x.assign(nn);
    mesh.y.assign(nn);
    mesh.z.assign(nn);
    mesh.node_id.assign(nn);
    mesh.node_code.assign(nn);
    Check(nc_get_var_double(ncid, xv, mesh.x.begin()), xy[0]);
    Check(nc_get_var_double(ncid, yv, mesh.y.begin()), xy[1]);
    int var = -1;
    if (nc_inq_varid(ncid, (p + "_node_z").c_str(), &var) == NC_NOERR)
      Check(nc_get_var_double(ncid, var, mesh.z.begin()), "node z");
    if (nc_inq_varid(ncid, (p + "_node_id").c_str(), &var) == NC_NOERR)
      Check(nc_get_var_int(ncid, var, mesh.node_id.begin()), "node ids");
    else
      for (int i = 1; i <= nn; ++i) mesh.node_id[i] = i;
    if (nc_inq_varid(ncid, (p + "_node_code").c_str(), &var) == NC_NOERR)
      Check(nc_get_var_int(ncid, var, mesh.node_code.begin()), "node codes");
    std::vector<int> fn(static_cast<size_t>(ne) * static_cast<size_t>(width));
    Check(nc_get_var_int(ncid, fv, fn.data()), fname);
    int start_index = 0, fill = NC_FILL_INT;
    GetInt(ncid, fv, "start_index", start_index);
    GetInt(ncid, fv, "_FillValue", fill);
    mesh.element_id.assign(ne);
    mesh.element_type.assign(ne);
    mesh.node_start.assign(ne + 1);
    mesh.node_start[1] = 1;
    std::vector<int> list;
    for (int e = 1; e <= ne; ++e) {
      int k = 0;
      for (int j = 0; j < width; ++j) {
        const int node = fn[static_cast<size_t>(e - 1) * static_cast<size_t>(width) + static_cast<size_t>(j)];
        if (node == fill || node < start_index) continue;
        if (node - start_index >= nn)
          throw NcFailure{"element " + std::to_string(e) + " refers to node " + std::to_string(node)};
        list.push_back(node - start_index + 1);
        ++k;
      }
      if (k < 3) throw NcFailure{"element " + std::to_string(e) + " has " + std::to_string(k) + " nodes"};
      mesh.node_start[e + 1] = mesh.node_start[e] + k;
      mesh.element_id[e] = e;
      mesh.element_type[e] = k == 3 ? 21 : k == 4 ? 25 : 0;
    }
    mesh.node_list.assign(static_cast<int>(list.size()));
    std::copy(list.begin(), list.end(), mesh.node_list.begin());
    if (nc_inq_varid(ncid, (p + "_face_id").c_str(), &var) == NC_NOERR)
      Check(nc_get_var_int(ncid, var, mesh.element_id.begin()), "element ids");
    if (nc_inq_varid(ncid, (p + "_face_type").c_str(), &var) == NC_NOERR)
      Check(nc_get_var_int(ncid, var, mesh.element_type.begin()), "element types");
    if (GetText(ncid, topo, "face_coordinates", s) && Words(s).size() == 2) {
      const auto fc = Words(s);
      int cxv, cyv;
      if (nc_inq_varid(ncid, fc[0].c_str(), &cxv) == NC_NOERR &&
          nc_inq_varid(ncid, fc[1].c_str(), &cyv) == NC_NOERR) {
        mesh.face_x.assign(ne);
        mesh.face_y.assign(ne);
        Check(nc_get_var_double(ncid, cxv, mesh.face_x.begin()), fc[0]);
        Check(nc_get_var_double(ncid, cyv, mesh.face_y.begin()), fc[1]);
      }
    }
  } catch (const NcFailure& e) {
    mesh = ZrnMeshData{};
    return Finish(f, Fail(f, kZrnErrReadStatic, e.what), status);
  }
  return Finish(f, kZrnOk, status);
}

// ---- static items ------------------------------------------------------------------------

int zrnStaticCreate(ZrnFile& f, const ZrnItemInfo& info, int& static_no, int* status) {
  if (f.ncid < 0 || !f.can_write)
    return Finish(f, Fail(f, kZrnErrWriteStatic, "file is not open for writing"), status);
  if (f.dynamic_started) return Finish(f, Fail(f, kZrnErrStaticWriteAfterDynamic, ""), status);
  if (info.name.empty() || (info.precision != kZrnFloat && info.precision != kZrnDouble))
    return Finish(f, Fail(f, kZrnErrItem, "static item '" + info.name + "'"), status);
  const std::string problem = zrn_detail::AxisProblem(info.axis);
  if (!problem.empty())
    return Finish(f, Fail(f, kZrnErrSpatialAxis, "static item '" + info.name + "': " + problem), status);
  const std::string other = OtherAxisInFile(f.ncid, info.axis);
  if (!other.empty())
    return Finish(f, Fail(f, kZrnErrSpatialAxis, "static item '" + info.name + "': " + other), status);
  ZrnItemInfo it = info;
  it.nvalues = 0;
  int code = kZrnOk;
  int nc = nc_redef(f.ncid);
  if (nc != NC_NOERR) return Finish(f, Fail(f, kZrnErrWriteStatic, nc_strerror(nc)), status);
  try {
    SpatialDims d;
    nc_inq_dimid(f.ncid, "x", &d.x);
    nc_inq_dimid(f.ncid, "y", &d.y);
    nc_inq_dimid(f.ncid, "z", &d.z);
    nc_inq_dimid(f.ncid, "mesh2d_nNodes", &d.nodes);
    nc_inq_dimid(f.ncid, "mesh2d_nFaces", &d.faces);
    nc_inq_dimid(f.ncid, "mesh2d_nVolumes", &d.volumes);
    int crs = -1;
    const bool have_crs = nc_inq_varid(f.ncid, "crs", &crs) == NC_NOERR;
    const int var = DefineItemVariable(f, d, -1, it, false,
                                       static_cast<int>(f.statics.size()) + 1, have_crs);
    Check(nc_enddef(f.ncid), "end of definitions");
    PutCoordinateValues(f.ncid, d);
    f.statics.push_back(it);
    f.static_varid.push_back(var);
    static_no = static_cast<int>(f.statics.size());
  } catch (const NcFailure& e) {
    nc_enddef(f.ncid);
    code = Fail(f, kZrnErrSpatialAxis, e.what);
  }
  return Finish(f, code, status);
}

int zrnStaticWrite(ZrnFile& f, int static_no, const double* data, long n, int* status) {
  return Finish(f, WriteStatic(f, static_no, data, n), status);
}

int zrnStaticWrite(ZrnFile& f, int static_no, const float* data, long n, int* status) {
  return Finish(f, WriteStatic(f, static_no, data, n), status);
}

int zrnStaticRead(ZrnFile& f, ZrnItemInfo& info, int* status) {
  if (f.ncid < 0) return Finish(f, Fail(f, kZrnErrReadStatic, "file is not open"), status);
  if (f.dynamic_started) return Finish(f, Fail(f, kZrnErrStaticAfterDynamic, ""), status);
  if (f.next_static >= static_cast<int>(f.statics.size()))
    return Finish(f, Fail(f, kZrnErrStaticBlock, "no static item " + std::to_string(f.next_static + 1)),
                  status);
  info = f.statics[static_cast<size_t>(f.next_static)];
  ++f.next_static;
  return Finish(f, kZrnOk, status);
}

int zrnStaticGetData(ZrnFile& f, double* data, long n, int* status) {
  if (f.ncid < 0 || f.next_static < 1)
    return Finish(f, Fail(f, kZrnErrReadStatic, "no static item read"), status);
  if (f.dynamic_started) return Finish(f, Fail(f, kZrnErrStaticAfterDynamic, ""), status);
  ZrnItemInfo& it = f.statics[static_cast<size_t>(f.next_static - 1)];
  const int var = f.static_varid[static_cast<size_t>(f.next_static - 1)];
  if (n != it.axis.Count() || data == nullptr)
    return Finish(f, Fail(f, kZrnErrReadStatic, "static item " + it.name + " holds " +
                                                    std::to_string(it.axis.Count()) +
                                                    " values, asked for " + std::to_string(n)),
                  status);
  size_t start[4], cnt[4];
  RecordShape(it.axis, false, 0, start, cnt);
  const int nc = nc_get_vara_double(f.ncid, var, start, cnt, data);
  if (nc != NC_NOERR) return Finish(f, Fail(f, kZrnErrReadStatic, nc_strerror(nc)), status);
  nc_type type;
  nc_inq_vartype(f.ncid, var, &type);
  double fill, missing, scale, offset;
  Packing(f.ncid, var, type, fill, missing, scale, offset);
  Unpack(data, n, fill, missing, scale, offset, type, f.delete_value);
  AddStatistics(it, data, n, f.delete_value);
  return Finish(f, kZrnOk, status);
}

int zrnStaticSkip(ZrnFile& f, int* status) {
  if (f.ncid < 0) return Finish(f, Fail(f, kZrnErrSkip, "file is not open"), status);
  if (f.dynamic_started) return Finish(f, Fail(f, kZrnErrStaticAfterDynamic, ""), status);
  if (f.next_static >= static_cast<int>(f.statics.size()))
    return Finish(f, Fail(f, kZrnErrStaticBlock, "no static item " + std::to_string(f.next_static + 1)),
                  status);
  ++f.next_static;
  return Finish(f, kZrnOk, status);
}

int zrnGetNoOfStatics(const ZrnFile& f, int& nstatics, int* status) {
  nstatics = static_cast<int>(f.statics.size());
  return Finish(f.name, "file is not open", f.header_ready ? kZrnOk : kZrnErrStaticCount, status);
}

// ---- dynamic items -------------------------------------------------------------------------

int zrnWriteItemTimeStep(ZrnFile& f, double time, const double* data, long n, int* status) {
  return Finish(f, WriteRecord(f, time, data, n), status);
}

int zrnWriteItemTimeStep(ZrnFile& f, double time, const float* data, long n, int* status) {
  return Finish(f, WriteRecord(f, time, data, n), status);
}

int zrnReadItemTimeStep(ZrnFile& f, int& item, double& time, double* data, long n, int* status) {
  return Finish(f, ReadRecord(f, item, time, data, n), status);
}

int zrnSkipItem(ZrnFile& f, int* status) {
  if (f.ncid < 0 || f.items.empty() || f.current_step >= f.time.nsteps)
    return Finish(f, Fail(f, kZrnErrSkip, "no record to skip"), status);
  f.dynamic_started = true;
  Advance(f);
  return Finish(f, kZrnOk, status);
}

int zrnSkipTimeStep(ZrnFile& f, int* status) {
  if (f.ncid < 0 || f.items.empty() || f.current_step >= f.time.nsteps)
    return Finish(f, Fail(f, kZrnErrSkip, "no time step to skip"), status);
  f.dynamic_started = true;
  f.next_item = 1;
  ++f.current_step;
  return Finish(f, kZrnOk, status);
}

int zrnFindItemDynamic(ZrnFile& f, int step, int item, int* status) {
  if (f.ncid < 0 || f.items.empty())
    return Finish(f, Fail(f, kZrnErrDynamicBlock, "file has no dynamic items"), status);
  if (item < 1 || item > static_cast<int>(f.items.size()))
    return Finish(f, Fail(f, kZrnErrItemNumber, "item " + std::to_string(item)), status);
  if (step < 0 || step >= f.time.nsteps)
    return Finish(f, Fail(f, kZrnErrDynamicBlock, "no time step " + std::to_string(step) +
                                                       " (file has " +
                                                       std::to_string(f.time.nsteps) + ")"),
                  status);
  f.dynamic_started = true;
  f.current_step = step;
  f.next_item = item;
  return Finish(f, kZrnOk, status);
}

int zrnGetDynamicPosition(const ZrnFile& f, int& step, int& item, int* status) {
  step = f.current_step;
  item = f.next_item;
  return Finish(f, kZrnOk, status);
}

}  // namespace vhd
