// Creating, writing and closing the output files.

#include <algorithm>

#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/interpolation.hpp"
#include "mesh/reorder.hpp"
#include "output/output_spec.hpp"

namespace vhd {

namespace {

constexpr double kRadToDeg = 57.29577951308232;

// The elements written by an area output as a mesh of their own: the nodes
// they use, in the mesh file's order of the nodes, numbered from 1.
ZrnMeshData SubMesh(const Mesh& mesh, const Array1<int>& elements) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  const bool geographic = IsGeographic(mesh.projection);
  Array1<int> renumber(nd.nnodes, 0);
  int nlist = 0;
  for (int e : elements) {
    nlist += ElementNodeCount(el, e);
    for (int j = 1; j <= ElementNodeCount(el, e); ++j) renumber[ElementNode(el, e, j)] = 1;
  }
  const Array1<int> in_file_order = FileOrder(nd.file_index, nd.nnodes);
  int nn = 0;
  for (int n : in_file_order)
    if (renumber[n]) renumber[n] = ++nn;
  ZrnMeshData m;
  m.ndim = 2;
  m.node_id.assign(nn);
  m.x.assign(nn);
  m.y.assign(nn);
  m.z.assign(nn);
  m.node_code.assign(nn);
  for (int n = 1; n <= nd.nnodes; ++n) {
    const int k = renumber[n];
    if (k == 0) continue;
    m.node_id[k] = nd.id[n];
    m.x[k] = geographic ? nd.x[n] * kRadToDeg : nd.x[n];
    m.y[k] = geographic ? nd.y[n] * kRadToDeg : nd.y[n];
    m.z[k] = nd.z[n];
    m.node_code[k] = nd.code[n];
  }
  const int ne = elements.size();
  m.element_id.assign(ne);
  m.element_type.assign(ne);
  m.node_start.assign(ne + 1);
  m.node_list.assign(nlist);
  int pos = 1;
  for (int k = 1; k <= ne; ++k) {
    const int e = elements[k];
    m.element_id[k] = el.id[e];
    m.element_type[k] = el.type[e];
    m.node_start[k] = pos;
    for (int j = 1; j <= ElementNodeCount(el, e); ++j) m.node_list[pos++] = renumber[ElementNode(el, e, j)];
  }
  m.node_start[ne + 1] = pos;
  return m;
}

void DefineItem(ZrnFile& f, int k, const OutputItem& item, const std::string& name, int precision) {
  zrnSetItemInfo(f, k, name, item.item_type, item.unit, precision == 1 ? kZrnFloat : kZrnDouble);
  zrnSetItemValueType(f, k, item.value_type);
}

void OpenOne(OutputSpec& spec, const Mesh& mesh, const OutputList& list) {
  if (spec.format >= 5) FatalError("OpenOutputFiles: Output format not supported");
  if (!spec.write) {  // another process writes it; this one only takes part
    spec.open = spec.file_kind >= 0;
    spec.records = 0;
    return;
  }
  if (spec.file_kind < 0) {
    Warning("OpenOutputFiles: " + spec.file_name + " has no data-file extension (.zrn0, .zrn1, .zrn2, .zrnu): " +
            "output " + std::to_string(spec.number) + " writes no file");
    return;
  }
  ZrnFile& f = spec.file;
  const bool mesh_file = spec.file_kind == 4;
  zrnHeaderCreate(f, spec.path, mesh_file ? kZrnFileMesh2D : kZrnFileData, spec.title);
  zrnSetDeleteValFloat(f, spec.delete_value);
  const ProjectionCrs crs = ProjectionCrsInfo(mesh.projection);
  // A grid along the axes carries its coordinates on its axes; a turned grid
  // has its own origin and orientation in the header.
  const bool grid = spec.file_kind == 2;
  const bool turned = grid && spec.orientation != 0.0;
  zrnSetGeoInfoUTMProj(f, mesh.projection, turned ? spec.x0 : 0.0, turned ? spec.y0 : 0.0,
                       turned ? spec.orientation : 0.0, crs.known ? crs.wkt : std::string(), crs.epsg);
  zrnSetNeqCalendarAxis(f, zrnDateTime(list.time.start));

  std::size_t record = 1;
  int k = 0;
  if (spec.domain == OutputDomain::kPoints && spec.type == kOutputField2D) {
    for (const OutputItem& item : spec.items) {
      for (const OutputPoint& p : spec.points) {
        DefineItem(f, ++k, item, p.name + ": " + item.name, spec.precision);
        zrnSetItemAxisEqD0(f, k);
      }
    }
  } else {
    for (const OutputItem& item : spec.items) {
      DefineItem(f, ++k, item, item.name, spec.precision);
      if (spec.type != kOutputField2D) {
        zrnSetItemAxisEqD0(f, k);
      } else if (spec.domain == OutputDomain::kLine) {
        zrnSetItemAxisEqD1(f, k, static_cast<int>(spec.points.size()), spec.x0, spec.dx);
        record = spec.points.size();
      } else if (grid) {
        zrnSetItemAxisEqD2(f, k, spec.nx, spec.ny, turned ? 0.0 : spec.x0, turned ? 0.0 : spec.y0, spec.dx,
                           spec.dy);
        record = spec.points.size();
      } else {
        zrnSetItemAxisEqD4(f, k, kZrnLocationFace, spec.elements.size());
        record = static_cast<std::size_t>(spec.elements.size());
      }
    }
  }
  if (mesh_file) zrnSetMesh(f, SubMesh(mesh, spec.elements));
  zrnFileCreate(f, true);
  spec.buffer.assign(std::max(record, spec.points.size()), spec.delete_value);
  spec.open = true;
  spec.records = 0;
}

}  // namespace

void OpenOutputFiles(OutputList& list, const Mesh& mesh) {
  for (OutputSpec& spec : list.outputs) OpenOne(spec, mesh, list);
}

bool BeginOutputRecord(const OutputSpec& spec, int n, double t) {
  if (!spec.open || !OutputStepDue(spec, n)) return false;
  return spec.records == 0 || t > spec.last_time;
}

void WriteFieldItem(OutputSpec& spec, const Mesh& mesh, const OutputItem& item, const Array1<double>& values,
                    Array1<double>& node_values, double t) {
  if (!spec.write) return;
  const double del = spec.delete_value;
  double* buf = spec.buffer.data();
  if (spec.domain == OutputDomain::kArea && spec.file_kind == 4) {
    const int n = spec.elements.size();
    for (int k = 1; k <= n; ++k) {
      const int e = spec.elements[k];
      buf[k - 1] = (spec.compress == 1 || spec.selected[e]) ? values[e] : del;
    }
    zrnWriteItemTimeStep(spec.file, t, buf, n);
    return;
  }
  const bool interpolate = spec.interpolation_type == 1 && !item.discrete;
  // The values are complete on the whole mesh (process 0 gathered them).
  if (interpolate) CALCNODEVALUESPL2D(mesh, values, node_values, del, item.mode, true);
  const double outside = spec.file_kind == 2 ? spec.land_value : del;
  const std::size_t np = spec.points.size();
  for (std::size_t k = 0; k < np; ++k) {
    const OutputPoint& p = spec.points[k];
    const int e = p.element;
    if (e == 0) buf[k] = outside;
    else if (values[e] == del) buf[k] = del;
    else if (interpolate) buf[k] = CalcPointValue2D(mesh, p.x, p.y, e, node_values, del, item.mode);
    else buf[k] = values[e];
  }
  if (spec.domain == OutputDomain::kPoints) {
    for (std::size_t k = 0; k < np; ++k) zrnWriteItemTimeStep(spec.file, t, buf + k, 1);
  } else {
    zrnWriteItemTimeStep(spec.file, t, buf, static_cast<long>(np));
  }
}

void WriteValueItem(OutputSpec& spec, double value, double t) {
  if (!spec.write) return;
  spec.buffer[0] = value;
  zrnWriteItemTimeStep(spec.file, t, spec.buffer.data(), 1);
}

void EndOutputRecord(OutputSpec& spec, double t) {
  ++spec.records;
  spec.last_time = t;
}

void CloseOutputFiles(OutputList& list) {
  for (OutputSpec& spec : list.outputs) {
    if (!spec.open) continue;
    if (spec.write) zrnFileClose(spec.file);
    spec.open = false;
  }
}

}  // namespace vhd
