#include "output/data_merge.hpp"

#include <algorithm>
#include <cmath>
#include <map>

#include "io/zrn.hpp"
#include "log/log.hpp"
#include "output/output_spec.hpp"
#include "parallel/message_passing.hpp"

namespace vhd {

namespace {

bool SameTime(double a, double b) { return std::fabs(a - b) <= 1e-6 * std::max(1.0, std::fabs(a)); }

void CheckFiles(const std::vector<ZrnFile>& in, const std::vector<std::string>& files, bool mesh) {
  const ZrnFile& a = in.front();
  for (std::size_t k = 1; k < in.size(); ++k) {
    const ZrnFile& b = in[k];
    const bool calendar = a.time.type == kZrnTimeEqCalendar || a.time.type == kZrnTimeNeqCalendar;
    if (b.time.type != a.time.type ||
        (calendar ? zrnSecondsBetween(a.time.start, b.time.start) != 0.0
                  : !SameTime(a.time.start_offset, b.time.start_offset)))
      FatalError("DataMerge: Time start mismatch, file: " + files[k]);
    const std::size_t n = std::min(a.step_times.size(), b.step_times.size());
    bool same = a.time.type == kZrnTimeNeqCalendar || a.time.type == kZrnTimeNeqRelative || SameTime(a.time.dt, b.time.dt);
    for (std::size_t s = 0; s < n && same; ++s) same = SameTime(a.step_times[s], b.step_times[s]);
    if (!same) FatalError("DataMerge: Timestep mismatch, file: " + files[k]);
    if (a.time.nsteps != b.time.nsteps) FatalError("DataMerge: Number of timesteps mismatch, file: " + files[k]);
    if (a.items.size() != b.items.size()) FatalError("DataMerge: Number of variables mismatch, file: " + files[k]);
    if (!mesh)
      for (std::size_t i = 0; i < a.items.size(); ++i)
        if (a.items[i].axis.Count() != b.items[i].axis.Count())
          FatalError("DataMerge: Number of items mismatch, file: " + files[k]);
  }
}

void SetTimeAxis(ZrnFile& o, const ZrnFile& a) {
  switch (a.time.type) {
    case kZrnTimeEqCalendar: zrnSetEqCalendarAxis(o, a.time.start, a.time.dt); break;
    case kZrnTimeNeqCalendar: zrnSetNeqCalendarAxis(o, a.time.start); break;
    case kZrnTimeEqRelative: zrnSetEqTimeAxis(o, a.time.start_offset, a.time.dt); break;
    default: zrnSetNeqTimeAxis(o, a.time.start_offset); break;
  }
}

// Merged mesh: for every merged element its file and position there.
struct MeshJoin {
  ZrnMeshData mesh;
  std::vector<std::pair<int, int>> source;  // (file, element), element from 1
};

MeshJoin JoinMeshes(const std::vector<ZrnMeshData>& meshes, int ordering) {
  MeshJoin j;
  std::map<int, int> seen;
  for (std::size_t k = 0; k < meshes.size(); ++k)
    for (int e = 1; e <= meshes[k].nelements(); ++e)
      if (seen.emplace(meshes[k].element_id[e], 1).second) j.source.emplace_back(static_cast<int>(k), e);
  if (ordering == 2)
    std::stable_sort(j.source.begin(), j.source.end(), [&](const auto& a, const auto& b) {
      return meshes[a.first].element_id[a.second] < meshes[b.first].element_id[b.second];
    });
  std::map<int, int> node_of_id;  // node id -> merged node
  std::vector<std::pair<int, int>> nodes;
  int nlist = 0;
  for (const auto& [k, e] : j.source) {
    const ZrnMeshData& m = meshes[static_cast<std::size_t>(k)];
    for (int p = m.node_start[e]; p < m.node_start[e + 1]; ++p) {
      ++nlist;
      const int n = m.node_list[p];
      if (node_of_id.emplace(m.node_id[n], static_cast<int>(nodes.size()) + 1).second) nodes.emplace_back(k, n);
    }
  }
  ZrnMeshData& o = j.mesh;
  const int nn = static_cast<int>(nodes.size()), ne = static_cast<int>(j.source.size());
  o.ndim = meshes.front().ndim;
  o.node_id.assign(nn);
  o.x.assign(nn);
  o.y.assign(nn);
  o.z.assign(nn);
  o.node_code.assign(nn);
  for (int i = 1; i <= nn; ++i) {
    const auto [k, n] = nodes[static_cast<std::size_t>(i - 1)];
    const ZrnMeshData& m = meshes[static_cast<std::size_t>(k)];
    o.node_id[i] = m.node_id[n];
    o.x[i] = m.x[n];
    o.y[i] = m.y[n];
    o.z[i] = m.z[n];
    o.node_code[i] = m.node_code[n];
  }
  o.element_id.assign(ne);
  o.element_type.assign(ne);
  o.node_start.assign(ne + 1);
  o.node_list.assign(nlist);
  int pos = 1;
  for (int i = 1; i <= ne; ++i) {
    const auto [k, e] = j.source[static_cast<std::size_t>(i - 1)];
    const ZrnMeshData& m = meshes[static_cast<std::size_t>(k)];
    o.element_id[i] = m.element_id[e];
    o.element_type[i] = m.element_type[e];
    o.node_start[i] = pos;
    for (int p = m.node_start[e]; p < m.node_start[e + 1]; ++p)
      o.node_list[pos++] = node_of_id[m.node_id[m.node_list[p]]];
  }
  o.node_start[ne + 1] = pos;
  return j;
}

}  // namespace

void DataMerge(const std::vector<std::string>& files, const std::string& output, MergeRule rule, double land_value,
               int ordering) {
  std::vector<ZrnFile> in(files.size());
  for (std::size_t k = 0; k < files.size(); ++k) ZrnOpenInput(in[k], files[k]);
  const bool mesh = rule == MergeRule::kMergeMesh;
  CheckFiles(in, files, mesh);
  const ZrnFile& a = in.front();

  MeshJoin join;
  if (mesh) {
    std::vector<ZrnMeshData> meshes(in.size());
    for (std::size_t k = 0; k < in.size(); ++k) zrnReadMesh(in[k], meshes[k]);
    join = JoinMeshes(meshes, ordering);
  }

  ZrnFile o;
  zrnHeaderCreate(o, output, a.file_type, a.title);
  zrnSetDeleteValFloat(o, a.delete_value);
  zrnSetGeoInfoUTMProj(o, a.projection, a.origin_x, a.origin_y, a.orientation, a.crs_wkt, a.epsg);
  SetTimeAxis(o, a);
  const int nitems = static_cast<int>(a.items.size());
  for (int i = 1; i <= nitems; ++i) {
    const ZrnItemInfo& it = a.items[static_cast<std::size_t>(i - 1)];
    zrnSetItemInfo(o, i, it.name, it.item_type, it.unit, it.precision);
    zrnSetItemValueType(o, i, it.value_type);
    const ZrnSpatialAxis& ax = it.axis;
    switch (ax.type) {
      case kZrnAxisD0: zrnSetItemAxisEqD0(o, i); break;
      case kZrnAxisD1: zrnSetItemAxisEqD1(o, i, ax.n[0], ax.x0[0], ax.dx[0]); break;
      case kZrnAxisD2: zrnSetItemAxisEqD2(o, i, ax.n[0], ax.n[1], ax.x0[0], ax.x0[1], ax.dx[0], ax.dx[1]); break;
      case kZrnAxisD3:
        zrnSetItemAxisEqD3(o, i, ax.n[0], ax.n[1], ax.n[2], ax.x0[0], ax.x0[1], ax.x0[2], ax.dx[0], ax.dx[1],
                           ax.dx[2]);
        break;
      default: zrnSetItemAxisEqD4(o, i, ax.location, join.mesh.nelements()); break;
    }
  }
  if (mesh) zrnSetMesh(o, join.mesh);
  zrnFileCreate(o, true);

  std::vector<std::vector<double>> buf(in.size());
  std::vector<double> merged;
  const double del = a.delete_value;
  for (int s = 0; s < a.time.nsteps; ++s) {
    for (int i = 1; i <= nitems; ++i) {
      double time = 0.0;
      for (std::size_t k = 0; k < in.size(); ++k) {
        const long n = in[k].items[static_cast<std::size_t>(i - 1)].axis.Count();
        buf[k].resize(static_cast<std::size_t>(n));
        int item = 0;
        zrnReadItemTimeStep(in[k], item, time, buf[k].data(), n);
      }
      time = a.step_times[static_cast<std::size_t>(s)];
      if (mesh) {
        merged.resize(join.source.size());
        for (std::size_t j = 0; j < join.source.size(); ++j)
          merged[j] = buf[static_cast<std::size_t>(join.source[j].first)][static_cast<std::size_t>(join.source[j].second - 1)];
      } else {
        const std::size_t n = buf.front().size();
        merged.assign(n, 0.0);
        for (std::size_t v = 0; v < n; ++v) {
          if (rule == MergeRule::kMergeSum) {
            double sum = 0.0;
            bool any = false;
            for (const auto& b : buf)
              if (b[v] != del) {
                sum += b[v];
                any = true;
              }
            merged[v] = any ? sum : del;
          } else {
            double value = land_value;
            for (const auto& b : buf) {
              if (b[v] != del && b[v] != land_value) {
                value = b[v];
                break;
              }
              if (b[v] == del) value = del;
            }
            merged[v] = value;
          }
        }
      }
      zrnWriteItemTimeStep(o, time, merged.data(), static_cast<long>(merged.size()));
    }
  }
  zrnFileClose(o);
  for (ZrnFile& f : in) zrnFileClose(f);
}

void MergeOutputFiles(OutputList& list, const RunControl& run) {
  if (run.nprocesses <= 1) return;
  if (run.process_id == 0) {
    for (const OutputSpec& spec : list.outputs) {
      if (spec.merge <= 0 || spec.file_kind < 0) continue;
      std::vector<std::string> files;
      for (int p = 0; p < run.nprocesses; ++p) files.push_back(ProcessFileName(spec.file_name, p, run.nprocesses));
      const MergeRule rule = spec.file_kind == 4 ? MergeRule::kMergeMesh
                             : spec.type == kOutputField2D ? MergeRule::kMergeFirst
                                                           : MergeRule::kMergeSum;
      DataMerge(files, spec.file_name, rule, spec.file_kind == 2 ? spec.land_value : spec.delete_value,
                spec.ordering);
      if (spec.merge == 2)
        for (const auto& f : files) zrnFileDelete(f);
    }
  }
  BarrierAll(run);
  WriteBanner("Output Statistics " + list.module);
  for (const OutputSpec& spec : list.outputs) {
    WriteLogLine("  Output " + std::to_string(spec.number) + " : " + ZrnLogName(spec.path));
    WriteValueLine("    Records written : %", spec.records);
  }
  WriteBanner("");
}

}  // namespace vhd
