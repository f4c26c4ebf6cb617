// Time-varying input data on the mesh: FemDataOpen (file checks, the spatial
// map from the file's points, line, grid or mesh onto the targets, the first
// bracketing steps) and the value at a time t.

#include "mesh/femdata.hpp"

#include <algorithm>
#include <cmath>
#include <new>
#include <utility>

#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/reorder.hpp"
#include "mesh/search_tree.hpp"

namespace vhd {

namespace {

[[noreturn]] void Refuse(std::string text, const std::string& file,
                         const std::string& detail = "") {
  while (!text.empty() && text.back() == ' ') text.pop_back();
  text += ": " + ZrnLogName(file);
  if (!detail.empty()) text += " (" + detail + ")";
  FatalError(text);
}

bool IsDeleteValue(double v, double delete_value) {
  return v == delete_value || std::abs(v - delete_value) <= 1e-6 * std::abs(delete_value);
}

// ---- targets -------------------------------------------------------------------------

int CountTargets(const FemDataRequest& r) {
  if (!r.entities.empty() && r.location != FemDataLocation::kPoints)
    return static_cast<int>(r.entities.size());
  if (r.location == FemDataLocation::kPoints) return std::max<int>(1, static_cast<int>(r.x.size()));
  if (r.mesh == nullptr) return 1;
  switch (r.location) {
    case FemDataLocation::kElements:
      return r.mesh->elements.nelements;
    case FemDataLocation::kNodes:
      return r.mesh->nodes.nnodes;
    default:
      return r.mesh->faces.nfaces;
  }
}

int Entity(const FemDataRequest& r, int i) {
  return r.entities.empty() ? i : r.entities[static_cast<std::size_t>(i - 1)];
}

// Coordinates of target i in the mesh's coordinates, degrees on a
// geographic mesh (as data files hold them).
void TargetPoint(const FemDataRequest& r, int i, bool geographic, double& x, double& y) {
  if (r.location == FemDataLocation::kPoints) {
    x = r.x[static_cast<std::size_t>(i - 1)];
    y = r.y[static_cast<std::size_t>(i - 1)];
  } else {
    const Mesh& m = *r.mesh;
    const int e = Entity(r, i);
    switch (r.location) {
      case FemDataLocation::kElements:
        x = m.elements.xc[e];
        y = m.elements.yc[e];
        break;
      case FemDataLocation::kNodes:
        x = m.nodes.x[e];
        y = m.nodes.y[e];
        break;
      default:
        x = m.faces.xf[e];
        y = m.faces.yf[e];
        break;
    }
  }
  if (geographic) {
    x /= kDegToRad;
    y /= kDegToRad;
  }
}

void SetMapSize(DataFileState& st, int nweights) {
  st.nweights = nweights;
  const auto size = static_cast<std::size_t>(st.ntargets) * static_cast<std::size_t>(nweights);
  st.source.assign(size, 0);
  st.weight.assign(size, 0.0);
}

void SetWeight(DataFileState& st, int i, int j, long source, double weight) {
  const auto p = static_cast<std::size_t>(i - 1) * static_cast<std::size_t>(st.nweights) +
                 static_cast<std::size_t>(j);
  st.source[p] = source;
  st.weight[p] = weight;
}

// Position between 0 and n - 1 of a fraction p of the way, as the lower
// index and the weight of the upper one.
void LinearIndex(double position, int n, long& i, double& w) {
  if (n <= 1) {
    i = 0;
    w = 0.0;
    return;
  }
  position = std::clamp(position, 0.0, static_cast<double>(n - 1));
  i = std::min(static_cast<long>(std::floor(position)), static_cast<long>(n - 2));
  w = position - static_cast<double>(i);
}

// ---- spatial maps ------------------------------------------------------------------------

void MapUniform(DataFileState& st) {
  SetMapSize(st, 1);
  for (int i = 1; i <= st.ntargets; ++i) SetWeight(st, i, 0, 0, 1.0);
}

// Fraction of the way along the line for every target.
std::vector<double> LineFractions(const FemDataRequest& r, int ntargets, const std::string& file) {
  std::vector<double> s(static_cast<std::size_t>(ntargets), 0.0);
  double total = 0.0;
  if (r.location == FemDataLocation::kFaces) {
    // Face centres along the boundary walk: half a face in from each end.
    if (r.mesh == nullptr) Refuse("No mesh supplied", file);
    for (int i = 1; i <= ntargets; ++i) {
      const double len = r.mesh->faces.length[Entity(r, i)];
      s[static_cast<std::size_t>(i - 1)] = total + 0.5 * len;
      total += len;
    }
  } else if (r.location == FemDataLocation::kPoints) {
    for (int i = 2; i <= ntargets; ++i) {
      const auto k = static_cast<std::size_t>(i - 1);
      total += std::hypot(r.x[k] - r.x[k - 1], r.y[k] - r.y[k - 1]);
      s[k] = total;
    }
  } else {
    Refuse("Error in FemDataOpen", file, "values along a line go to faces or points");
  }
  for (double& v : s) v = total > 0.0 ? v / total : 0.0;
  return s;
}

void MapLine(DataFileState& st, const FemDataRequest& r, const ZrnSpatialAxis& axis) {
  const std::vector<double> s = LineFractions(r, st.ntargets, st.file.name);
  SetMapSize(st, 2);
  const int nx = axis.n[0];
  for (int i = 1; i <= st.ntargets; ++i) {
    long lo = 0;
    double w = 0.0;
    LinearIndex(s[static_cast<std::size_t>(i - 1)] * (nx - 1), nx, lo, w);
    SetWeight(st, i, 0, lo, 1.0 - w);
    SetWeight(st, i, 1, nx > 1 ? lo + 1 : lo, nx > 1 ? w : 0.0);
  }
}

std::string ProjectionOrLocal(const std::string& p) { return p.empty() ? "NON-UTM" : p; }

// Target coordinates -> the grid's local coordinates.
struct GridCoordinates {
  bool convert = false;  // through geographic coordinates
  CTqCartography mesh_cart, file_cart;
};

void SetupGridCoordinates(GridCoordinates& g, const std::string& mesh_projection,
                          const ZrnFile& f) {
  std::string file_projection;
  double x0 = 0, y0 = 0, orientation = 0;
  zrnGetGeoInfoUTMProj(f, file_projection, x0, y0, orientation);
  const std::string mp = ProjectionOrLocal(mesh_projection);
  const std::string fp = ProjectionOrLocal(file_projection);
  int status = 0;
  TqCartCreate(g.file_cart, fp, x0, y0, orientation, &status);
  if (status != kCartOk) Refuse("Error in FemDataOpen", f.name, "unknown projection " + fp);
  if (IsNonUtm(mp) || IsNonUtm(fp)) {
    if (IsNonUtm(mp) != IsNonUtm(fp))
      Warning("Data file " + ZrnLogName(f.name) + " in projection " + fp + " on a mesh in " + mp +
              ": coordinates are taken as they are");
    return;
  }
  const bool identical = TqCartAreProjectionsIdentical(mp, fp, &status);
  if (status != kCartOk)
    Refuse("Error in FemDataOpen", f.name, "cannot compare projections " + mp + " and " + fp);
  if (identical) return;
  TqCartCreate(g.mesh_cart, mp, 0.0, 0.0, 0.0, &status);
  if (status != kCartOk) Refuse("Error in FemDataOpen", f.name, "unknown mesh projection " + mp);
  g.convert = true;
}

void ToGrid(const GridCoordinates& g, double x, double y, double& gx, double& gy,
            const std::string& file) {
  if (g.convert) {
    double lon = 0, lat = 0;
    int status = 0;
    TqCartProj2Geo(g.mesh_cart, x, y, lon, lat, &status);
    if (status == kCartOk) TqCartGeo2Proj(g.file_cart, lon, lat, x, y, &status);
    if (status != kCartOk)
      Refuse("Error in FemDataOpen", file,
             "cannot convert point " + NumberText(x, 1) + ", " + NumberText(y, 1) +
                 " into the grid's projection");
  }
  g.file_cart.Proj2Xy(x, y, gx, gy);
}

void MapGrid(DataFileState& st, const FemDataRequest& r, const ZrnSpatialAxis& axis) {
  const std::string& mesh_projection = r.mesh != nullptr ? r.mesh->projection : r.projection;
  const bool geographic = r.mesh != nullptr && IsGeographic(r.mesh->projection);
  if (r.location != FemDataLocation::kPoints && r.mesh == nullptr)
    Refuse("No mesh supplied", st.file.name);
  GridCoordinates g;
  SetupGridCoordinates(g, mesh_projection, st.file);
  const int nx = axis.n[0], ny = axis.n[1];
  SetMapSize(st, 4);
  int outside = 0;
  constexpr double kEdge = 1e-6;  // of a grid cell
  for (int i = 1; i <= st.ntargets; ++i) {
    double x = 0, y = 0, gx = 0, gy = 0;
    TargetPoint(r, i, geographic, x, y);
    ToGrid(g, x, y, gx, gy, st.file.name);
    const double fi = (gx - axis.x0[0]) / axis.dx[0];
    const double fj = (gy - axis.x0[1]) / axis.dx[1];
    if (fi < -kEdge || fi > nx - 1 + kEdge || fj < -kEdge || fj > ny - 1 + kEdge) ++outside;
    long i0 = 0, j0 = 0;
    double wx = 0, wy = 0;
    LinearIndex(fi, nx, i0, wx);
    LinearIndex(fj, ny, j0, wy);
    const long i1 = nx > 1 ? i0 + 1 : i0, j1 = ny > 1 ? j0 + 1 : j0;
    SetWeight(st, i, 0, j0 * nx + i0, (1 - wx) * (1 - wy));
    SetWeight(st, i, 1, j0 * nx + i1, wx * (1 - wy));
    SetWeight(st, i, 2, j1 * nx + i0, (1 - wx) * wy);
    SetWeight(st, i, 3, j1 * nx + i1, wx * wy);
  }
  if (outside > 0)
    Warning(SubstituteValue("% points lie outside the grid of data file ", outside) +
            ZrnLogName(st.file.name) + "; they take the values at its edge");
}

void CheckSameMesh(const ZrnMeshData& fm, const Mesh& m, const std::string& file) {
  const std::string difference = MeshDifference(fm, m);
  if (!difference.empty()) Refuse("Wrong data file", file, difference);
}

// Area coordinates of (x, y) in the triangle of nodes a, b, c, or false when
// the point lies outside it.
bool AreaCoordinates(const NodeTable& nd, int a, int b, int c, double x, double y, double w[3]) {
  const double det =
      (nd.x[b] - nd.x[a]) * (nd.y[c] - nd.y[a]) - (nd.x[c] - nd.x[a]) * (nd.y[b] - nd.y[a]);
  if (det == 0.0) return false;
  const double xi =
      ((x - nd.x[a]) * (nd.y[c] - nd.y[a]) - (nd.x[c] - nd.x[a]) * (y - nd.y[a])) / det;
  const double eta =
      ((nd.x[b] - nd.x[a]) * (y - nd.y[a]) - (x - nd.x[a]) * (nd.y[b] - nd.y[a])) / det;
  constexpr double kTol = 1e-10;
  if (xi < -kTol || eta < -kTol || xi + eta > 1.0 + kTol) return false;
  w[0] = 1.0 - xi - eta;
  w[1] = xi;
  w[2] = eta;
  return true;
}

void MapMesh(DataFileState& st, const FemDataRequest& r, const ZrnSpatialAxis& axis) {
  const std::string& file = st.file.name;
  if (r.mesh == nullptr) Refuse("No mesh supplied", file);
  const Mesh& m = *r.mesh;
  const int ft = st.file.file_type;
  if (ft == kZrnFileMesh3DSigmaZ) Refuse("Only sigma formulation is possible", file);
  if (ft == kZrnFileMesh3DSigma || axis.location == kZrnLocationVolume) {
    if (m.ndim == 2) Refuse("3D Zrnu to 2D mesh not supported", file);
    Refuse("Wrong dimension", file, "layered items are not read onto a mesh here");
  }
  if (m.ndim != 2) Refuse("Wrong dimension", file, "the mesh must be 2D");
  ZrnMeshData fm;
  int status = 0;
  zrnReadMesh(st.file, fm, &status);
  if (status != kZrnOk)
    Refuse("Error in FemDataOpen", file, "cannot read its mesh: " + zrnErrorText(status));
  CheckSameMesh(fm, m, file);
  const bool on_nodes = axis.location == kZrnLocationNode;
  const long expected = on_nodes ? m.nodes.nnodes : m.elements.nelements;
  if (axis.n[0] != expected)
    Refuse("Wrong data file", file,
           "an item holds " + std::to_string(axis.n[0]) + " values, the mesh has " +
               std::to_string(expected) + (on_nodes ? " nodes" : " elements"));
  const ElementTable& el = m.elements;
  const FaceTable& fc = m.faces;
  int nweights = 1;
  if (on_nodes) {
    for (int e = 1; e <= el.nelements; ++e) nweights = std::max(nweights, ElementNodeCount(el, e));
  } else {
    nweights = 2;
  }
  SetMapSize(st, nweights);
  // The file holds elements and nodes in the mesh file's order.
  auto file_element = [&el](int e) { return FileIndex(el.file_index, e) - 1; };
  auto file_node = [&m](int n) { return FileIndex(m.nodes.file_index, n) - 1; };
  SearchTree2D tree;
  if (r.location == FemDataLocation::kPoints) BuildSearchTree2D(m, tree);
  for (int i = 1; i <= st.ntargets; ++i) {
    const int e = r.location == FemDataLocation::kPoints ? 0 : Entity(r, i);
    switch (r.location) {
      case FemDataLocation::kElements:
        if (on_nodes) {
          const int n = ElementNodeCount(el, e);
          for (int j = 1; j <= n; ++j) SetWeight(st, i, j - 1, file_node(ElementNode(el, e, j)), 1.0 / n);
        } else {
          SetWeight(st, i, 0, file_element(e), 1.0);
        }
        break;
      case FemDataLocation::kNodes:
        if (!on_nodes)
          Refuse("Wrong data file", file,
                 "node values are wanted and the item holds element values");
        SetWeight(st, i, 0, file_node(e), 1.0);
        break;
      case FemDataLocation::kFaces:
        if (on_nodes) {
          const int n = FaceNodeCount(fc, e);
          for (int j = 1; j <= n; ++j) SetWeight(st, i, j - 1, file_node(FaceNode(fc, e, j)), 1.0 / n);
        } else if (fc.element2[e] > 0) {
          SetWeight(st, i, 0, file_element(fc.element1[e]), 0.5);
          SetWeight(st, i, 1, file_element(fc.element2[e]), 0.5);
        } else {
          SetWeight(st, i, 0, file_element(fc.element1[e]), 1.0);
        }
        break;
      case FemDataLocation::kPoints: {
        const double x = r.x[static_cast<std::size_t>(i - 1)],
                     y = r.y[static_cast<std::size_t>(i - 1)];
        const int h = FindElementID2DSearchTree(x, y, m, tree);
        if (h == 0)
          Refuse("Error in FemDataOpen", file,
                 "point " + std::to_string(i) + " (" + NumberText(x, 1) + ", " + NumberText(y, 1) +
                     ") lies outside the mesh");
        if (!on_nodes) {
          SetWeight(st, i, 0, file_element(h), 1.0);
          break;
        }
        // Linear in the triangle of the element that holds the point
        // (a quadrilateral as the triangles 1-2-3 and 1-3-4).
        const int n = ElementNodeCount(el, h);
        const int a = ElementNode(el, h, 1), b = ElementNode(el, h, 2), c = ElementNode(el, h, 3);
        double w[3] = {1.0, 0.0, 0.0};
        if (AreaCoordinates(m.nodes, a, b, c, x, y, w) || n < 4) {
          SetWeight(st, i, 0, file_node(a), w[0]);
          SetWeight(st, i, 1, file_node(b), w[1]);
          SetWeight(st, i, 2, file_node(c), w[2]);
        } else {
          const int d = ElementNode(el, h, 4);
          AreaCoordinates(m.nodes, a, c, d, x, y, w);
          SetWeight(st, i, 0, file_node(a), w[0]);
          SetWeight(st, i, 1, file_node(c), w[1]);
          SetWeight(st, i, 2, file_node(d), w[2]);
        }
        break;
      }
    }
  }
}

// ---- kinds of file --------------------------------------------------------------------------

// Refuses a file whose items do not fit what the caller expects.
void CheckKind(const DataFileState& st, const ZrnSpatialAxis& axis) {
  const std::string& file = st.file.name;
  const int t = axis.type;
  const bool mesh_file = t == kZrnAxisD4 && zrnIsMeshFileType(st.file.file_type);
  switch (st.expect) {
    case FemDataExpect::kPoint:
      if ((t == kZrnAxisD1 || t == kZrnAxisD2) && axis.Count() > 1)
        Refuse("Invalid data file - the file must contain information for only one point", file);
      if (t != kZrnAxisD0 && t != kZrnAxisD1 && t != kZrnAxisD2)
        Refuse("Invalid data file - the file must contain point information ", file);
      break;
    case FemDataExpect::kLine:
      if (t != kZrnAxisD0 && t != kZrnAxisD1)
        Refuse("Invalid data file - the file must contain line information", file);
      break;
    case FemDataExpect::kGrid:
      if (t == kZrnAxisD3) Refuse("Wrong dimension", file, "a 3D grid");
      if (t != kZrnAxisD0 && t != kZrnAxisD2)
        Refuse("Invalid data file - the file must be a zrn2 file", file);
      break;
    case FemDataExpect::kMesh:
      if (!mesh_file) Refuse("Invalid data file - the file must be a zrnu file", file);
      break;
    case FemDataExpect::kArea:
      if (t == kZrnAxisD3) Refuse("Wrong dimension", file, "a 3D grid");
      if (t != kZrnAxisD0 && t != kZrnAxisD2 && !mesh_file)
        Refuse("Invalid data file - the file must contain area information", file);
      break;
  }
}

void BuildMap(DataFileState& st, const FemDataRequest& r, const ZrnSpatialAxis& axis) {
  const bool uniform = axis.type == kZrnAxisD0 ||
                       ((axis.type == kZrnAxisD1 || axis.type == kZrnAxisD2) && axis.Count() == 1);
  if (!uniform && r.location == FemDataLocation::kPoints && r.x.empty())
    Refuse("Error in FemDataOpen", st.file.name,
           "values that vary in space need the points they go to");
  switch (axis.type) {
    case kZrnAxisD0:
      MapUniform(st);
      break;
    case kZrnAxisD1:
      if (axis.n[0] == 1) {
        MapUniform(st);
      } else {
        MapLine(st, r, axis);
      }
      break;
    case kZrnAxisD2:
      if (axis.Count() == 1) {
        MapUniform(st);
      } else {
        MapGrid(st, r, axis);
      }
      break;
    case kZrnAxisD4:
      MapMesh(st, r, axis);
      break;
    default:
      Refuse("Illegal data file", st.file.name, "unknown spatial axis");
  }
}

// ---- reading steps ----------------------------------------------------------------------------

// Carries the record just read onto the targets of component k.
void MapRecord(const DataSpec& spec, int k, Array1<double>& out) {
  const DataFileState& st = spec.state;
  const double del = st.file.delete_value;
  const bool circular = spec.time_interpolation[k] >= kTimeInterpolationCircular;
  const int nw = st.nweights;
  for (int i = 1; i <= st.ntargets; ++i) {
    const std::size_t base = static_cast<std::size_t>(i - 1) * static_cast<std::size_t>(nw);
    double sum = 0.0, wsum = 0.0, first = 0.0;
    bool have_first = false;
    for (int j = 0; j < nw; ++j) {
      const double w = st.weight[base + static_cast<std::size_t>(j)];
      if (w == 0.0) continue;
      double v = st.record[static_cast<std::size_t>(st.source[base + static_cast<std::size_t>(j)])];
      if (IsDeleteValue(v, del)) continue;
      if (circular) {
        if (!have_first) {
          first = v;
          have_first = true;
        } else if (v < first - 180.0) {
          v += 360.0;
        } else if (v > first + 180.0) {
          v -= 360.0;
        }
      }
      sum += w * v;
      wsum += w;
    }
    double v = wsum > 0.0 ? sum / wsum : del;
    if (wsum > 0.0 && st.unit_from[k] != st.unit_to[k])
      uvqConvertUnit(st.unit_from[k], st.unit_to[k], v);
    out[i] = v;
  }
}

void ReadStep(DataSpec& spec, int step, Array1<Array1<double>>& dest) {
  DataFileState& st = spec.state;
  for (int k = 1; k <= spec.n; ++k) {
    int status = 0;
    ZrnReadItemAtStep(st.file, step, spec.item_numbers[k], st.record.data(), st.record_size,
                      &status);
    if (status != kZrnOk)
      Refuse("Error Reading data file", st.file.name,
             "item " + std::to_string(spec.item_numbers[k]) + " of step " + std::to_string(step) +
                 ": " + zrnErrorText(status));
    MapRecord(spec, k, dest[k]);
  }
}

// Makes step1 and step1 + 1 the steps that bracket t (t1 < t <= t2), held to
// the first and last pair of the file.
void UpdateBracket(DataSpec& spec, double t) {
  DataFileState& st = spec.state;
  const std::vector<double>& times = st.times;
  if (st.nsteps == 1) {
    if (st.step1 < 0) {
      ReadStep(spec, 0, st.a);
      for (int k = 1; k <= spec.n; ++k) std::copy(st.a[k].begin(), st.a[k].end(), st.b[k].begin());
      st.step1 = 0;
      st.t1 = st.t2 = times[0];
    }
    return;
  }
  const int last_pair = st.nsteps - 2;
  int s = 0;
  if (t > times[static_cast<std::size_t>(last_pair)]) {
    s = last_pair;
  } else if (t > times[1]) {
    s = static_cast<int>(std::lower_bound(times.begin(), times.end(), t) - times.begin()) - 1;
  }
  if (s == st.step1) return;
  if (st.step1 >= 0 && s == st.step1 + 1) {
    std::swap(st.a, st.b);
    ReadStep(spec, s + 1, st.b);
  } else {
    ReadStep(spec, s, st.a);
    ReadStep(spec, s + 1, st.b);
  }
  st.step1 = s;
  st.t1 = times[static_cast<std::size_t>(s)];
  st.t2 = times[static_cast<std::size_t>(s + 1)];
}

// Brings the bracket of a file input definition to time t and returns the
// weight of the later step.
double BringToTime(DataSpec& spec, double t) {
  DataFileState& st = spec.state;
  if (!st.open) FatalError("FemDataRead: data file not opened: " + ZrnLogName(spec.file_name));
  const double td = spec.format == kDataFileOnce ? 0.0 : t;
  UpdateBracket(spec, td);
  return st.t2 > st.t1 ? std::clamp((td - st.t1) / (st.t2 - st.t1), 0.0, 1.0) : 0.0;
}

// Value of component k at target i between the bracketing steps (weight w of
// the later one), with the soft-start factor f applied.
double TargetValue(const DataSpec& spec, int k, double f, double w, int i) {
  const DataFileState& st = spec.state;
  const double a = st.a[k][i], b = st.b[k][i];
  const double del = st.file.delete_value;
  if ((IsDeleteValue(a, del) && w < 1.0) || (IsDeleteValue(b, del) && w > 0.0)) return del;
  const double v = w == 0.0   ? a
                   : w == 1.0 ? b
                              : InterpolateInTime(spec.time_interpolation[k], a, b, w);
  return ApplySoftStart(spec, k, f, v);
}

void OpenFile(DataSpec& spec, const FemDataRequest& request, const ZrnDateTime& start,
              double duration) {
  DataFileState& st = spec.state;
  const std::string& name = spec.file_name;
  if (zrnFileKind(name) < 0)
    Refuse("Illegal data file", name, "the name must end in .zrn0, .zrn1, .zrn2, .zrn3 or .zrnu");
  ZrnOpenInput(st.file, name);
  st.open = true;

  int nitems = 0;
  zrnGetNoOfItems(st.file, nitems);
  ZrnSpatialAxis axis;
  for (int k = 1; k <= spec.n; ++k) {
    const int item = spec.item_numbers[k];
    if (item < 1 || item > nitems)
      Refuse("Invalid number of items in ZRN file", name,
             "item " + std::to_string(item) + " asked for, the file has " + std::to_string(nitems));
    ZrnSpatialAxis a;
    zrnGetItemDim(st.file, item, a);
    if (k == 1) {
      axis = a;
    } else if (a.type != axis.type || a.Count() != axis.Count()) {
      Refuse("Wrong dimension", name,
             "items " + std::to_string(spec.item_numbers[1]) + " and " + std::to_string(item) +
                 " differ in their spatial axes");
    }
  }
  st.axis_type = axis.type;
  st.record_size = axis.Count();
  CheckKind(st, axis);

  // Units: check each item against the type the caller requires and convert
  // to the unit the engine computes in.
  st.unit_from.assign(spec.n, kUvqUnitUndefined);
  st.unit_to.assign(spec.n, kUvqUnitUndefined);
  for (int k = 1; k <= spec.n; ++k) {
    const auto j = static_cast<std::size_t>(k - 1);
    const int required = j < request.item_types.size() ? request.item_types[j] : kUvqItemUndefined;
    if (required == kUvqItemUndefined) continue;
    ZrnCheckItemUnit(st.file, spec.item_numbers[k], required);
    std::string item_name;
    int item_type = 0, unit = 0, value_type = 0;
    zrnGetItemInfo(st.file, spec.item_numbers[k], item_name, item_type, unit, value_type);
    if (unit != kUvqUnitUndefined) {
      st.unit_from[k] = unit;
      st.unit_to[k] = uvqGetItemUserUnit(required);
    }
  }

  // Time axis in simulation seconds.
  st.nsteps = st.file.time.nsteps;
  if (st.nsteps < 1) Refuse("Error Reading data file", name, "the file has no time steps");
  const int type = st.file.time.type;
  st.offset = (type == kZrnTimeEqCalendar || type == kZrnTimeNeqCalendar)
                  ? zrnSecondsBetween(st.file.time.start, start)
                  : 0.0;
  st.times.assign(static_cast<std::size_t>(st.nsteps), 0.0);
  for (int s = 0; s < st.nsteps; ++s) {
    double seconds = 0;
    zrnGetStepTime(st.file, s, seconds);
    st.times[static_cast<std::size_t>(s)] = seconds - st.offset;
  }
  st.first_time = st.times.front();
  st.last_time = st.times.back();
  if (spec.format != kDataFileOnce)
    CheckDataCoverage(st.nsteps, st.first_time, st.last_time, 0.0, duration, name);

  BuildMap(st, request, axis);
  st.record.assign(static_cast<std::size_t>(st.record_size), 0.0);
  st.a.assign(spec.n, Array1<double>());
  st.b.assign(spec.n, Array1<double>());
  for (int k = 1; k <= spec.n; ++k) {
    st.a[k].assign(st.ntargets, 0.0);
    st.b[k].assign(st.ntargets, 0.0);
  }
  st.step1 = -1;
  UpdateBracket(spec, 0.0);
}

}  // namespace

std::string MeshDifference(const ZrnMeshData& fm, const Mesh& m) {
  const ElementTable& el = m.elements;
  const Array1<int> in_file_order = FileOrder(el.file_index, el.nelements);
  if (fm.nnodes() != m.nodes.nnodes || fm.nelements() != el.nelements)
    return "the file's mesh has " + std::to_string(fm.nnodes()) + " nodes and " + std::to_string(fm.nelements()) +
           " elements, the model's " + std::to_string(m.nodes.nnodes) + " and " + std::to_string(el.nelements);
  for (int k = 1; k <= el.nelements; ++k) {
    const int e = in_file_order[k];
    const int n = ElementNodeCount(el, e);
    bool same = fm.node_start[k + 1] - fm.node_start[k] == n;
    for (int j = 1; same && j <= n; ++j)
      same = fm.node_list[fm.node_start[k] + j - 1] == FileIndex(m.nodes.file_index, ElementNode(el, e, j));
    if (!same) return "element " + std::to_string(k) + " has other nodes";
  }
  return {};
}

void FemDataOpen(DataSpec& spec, const FemDataRequest& request, const ZrnDateTime& start,
                 double duration) {
  FemDataClose(spec);
  DataFileState& st = spec.state;
  st.expect = request.expect;
  if (request.location == FemDataLocation::kPoints && request.x.size() != request.y.size())
    FatalError("FemDataOpen: the points have " + std::to_string(request.x.size()) + " x and " +
               std::to_string(request.y.size()) + " y coordinates");
  st.ntargets = CountTargets(request);
  if (spec.format != kDataFile && spec.format != kDataFileOnce && spec.format != kDataFileMap)
    return;
  if (request.location != FemDataLocation::kPoints && request.mesh == nullptr &&
      (request.expect != FemDataExpect::kPoint || !request.entities.empty()))
    Refuse("No mesh supplied", spec.file_name);
  try {
    OpenFile(spec, request, start, duration);
  } catch (const std::bad_alloc&) {
    FatalError("FemDataOpen: Out of memory: " + ZrnLogName(spec.file_name));
  }
}

void FemDataOpen(DataSpec& spec, const FemDataRequest& request, const TimeAxis& time) {
  FemDataOpen(spec, request, zrnDateTime(time.start), time.EndTime());
}

void FemDataRead(DataSpec& spec, int k, double t, Array1<double>& values) {
  const double f = SoftStartFactor(spec, t);
  if (spec.format == kDataSoftStartFactor) {
    for (double& v : values) v = f;
    return;
  }
  if (spec.format == kDataConstant) {
    const double v = ApplySoftStart(spec, k, f, spec.constant_values[k]);
    for (double& x : values) x = v;
    return;
  }
  const int n = spec.state.ntargets;
  if (values.size() < n)
    FatalError("FemDataRead: " + std::to_string(n) + " values wanted from " +
               ZrnLogName(spec.file_name) + ", room for " + std::to_string(values.size()));
  const double w = BringToTime(spec, t);
  for (int i = 1; i <= n; ++i) values[i] = TargetValue(spec, k, f, w, i);
}

double FemDataValue(DataSpec& spec, int k, double t, int target) {
  const double f = SoftStartFactor(spec, t);
  if (spec.format == kDataSoftStartFactor) return f;
  if (spec.format == kDataConstant) return ApplySoftStart(spec, k, f, spec.constant_values[k]);
  if (target < 1 || target > spec.state.ntargets)
    FatalError("FemDataRead: target " + std::to_string(target) + " of " +
               std::to_string(spec.state.ntargets) + " in " + ZrnLogName(spec.file_name));
  return TargetValue(spec, k, f, BringToTime(spec, t), target);
}

int FemDataTargets(const DataSpec& spec) { return spec.state.ntargets; }

void FemDataClose(DataSpec& spec) {
  DataFileState& st = spec.state;
  if (st.open) zrnFileClose(st.file);
  st = DataFileState{};
}

}  // namespace vhd
