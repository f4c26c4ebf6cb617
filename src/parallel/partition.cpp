// The partition of a 2D mesh over the processes: keys, the METIS 5 options,
// the element graph and weights, the partition types, the checks, the log
// summary and the partition file.

#include "parallel/partition.hpp"

#include <metis.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <set>

#include <fmt/format.h>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/femdata.hpp"
#include "mesh/reorder.hpp"

namespace vhd {

static_assert(sizeof(idx_t) == sizeof(int), "the METIS options are held as int");
static_assert(kMetisOptionCount == METIS_NOPTIONS && kMetisOptionNumbering == METIS_OPTION_NUMBERING);

namespace {

constexpr double kRadToDeg = 57.29577951308232;

std::string PartitionFileText(const std::string& file) { return "partition file " + ZrnLogName(file); }

// ---- files ------------------------------------------------------------------------------

// Values of element item `item`, step 0, of the .zrnu file `file` over
// `mesh`, by element position. `key` names the setup keys in messages.
Array1<double> ReadElementItem(const Mesh& mesh, const std::string& file, int item, const std::string& key,
                               const std::string& section) {
  const std::string where = " (" + key + " in " + section + ")";
  if (file.empty()) FatalError("PartitionMesh: no file given" + where);
  if (zrnFileKind(file) != 4) FatalError("PartitionMesh: " + ZrnLogName(file) + " is not a .zrnu file" + where);
  ZrnFile f;
  int status = 0;
  if (ZrnOpenInput(f, file, &status) != kZrnOk)
    FatalError("PartitionMesh: cannot open " + ZrnLogName(file) + where + ": " + zrnErrorText(status));
  auto refuse = [&](const std::string& text) {
    zrnHeaderDestroy(f);
    FatalError("PartitionMesh: " + ZrnLogName(file) + where + ": " + text);
  };
  if (!zrnIsMeshFileType(f.file_type)) refuse("not a flexible-mesh file");
  ZrnMeshData file_mesh;
  if (zrnReadMesh(f, file_mesh, &status) != kZrnOk) refuse("cannot read its mesh: " + zrnErrorText(status));
  const std::string difference = MeshDifference(file_mesh, mesh);
  if (!difference.empty()) refuse("not on the mesh of the run: " + difference);
  const int nitems = static_cast<int>(f.items.size());
  if (item < 1 || item > nitems)
    refuse("item " + std::to_string(item) + " asked for, the file has " + std::to_string(nitems) + " items");
  const ZrnSpatialAxis& axis = f.items[static_cast<std::size_t>(item - 1)].axis;
  const int ne = mesh.elements.nelements;
  if (axis.type != kZrnAxisD4 || axis.location != kZrnLocationFace || axis.n[0] != ne)
    refuse("item " + std::to_string(item) + " does not hold one value per element");
  std::vector<double> in_file_order(static_cast<std::size_t>(ne));
  if (ZrnReadItemAtStep(f, 0, item, in_file_order.data(), ne, &status) != kZrnOk)
    refuse("cannot read item " + std::to_string(item) + ": " + zrnErrorText(status));
  const double delete_value = f.delete_value;
  zrnFileClose(f);
  Array1<double> values(ne);
  for (int e = 1; e <= ne; ++e) {
    const int k = FileIndex(mesh.elements.file_index, e);
    const double v = in_file_order[static_cast<std::size_t>(k - 1)];
    if (v == delete_value || !std::isfinite(v))
      FatalError("PartitionMesh: " + ZrnLogName(file) + where + ": element " + std::to_string(mesh.elements.id[e]) +
                 " has no value");
    values[e] = v;
  }
  return values;
}

// Sub-domain numbers of a partition file (type 1).
Array1<int> ReadPartitionFile(const Mesh& mesh, const PartitionSettings& ps) {
  const Array1<double> v = ReadElementItem(mesh, ps.file_name_partitioning, ps.item_number_partitioning,
                                           "file_name_partitioning, item_number_partitioning", ps.section);
  Array1<int> part(mesh.elements.nelements);
  for (int e = 1; e <= mesh.elements.nelements; ++e) {
    const double t = std::trunc(v[e]);
    if (t < 1 || t > std::numeric_limits<int>::max())
      FatalError("PartitionMesh: " + PartitionFileText(ps.file_name_partitioning) + ": element " +
                 std::to_string(mesh.elements.id[e]) + " has the sub-domain number " + fmt::format("{}", v[e]) +
                 "; sub-domains count from 1");
    part[e] = static_cast<int>(t);
  }
  return part;
}

// ---- weights ----------------------------------------------------------------------------

// Element weights as METIS integers (empty: every element weighs the same).
// File weights are scaled so that the largest is 1000 (and their sum stays
// well within 32 bits); every weight is at least 1.
std::vector<idx_t> ElementWeights(const Mesh& mesh, const PartitionSettings& ps, const Mesh* mesh3d) {
  const int ne = mesh.elements.nelements;
  std::vector<idx_t> w;
  if (ps.type_of_weighting == kWeightLayers) {
    if (mesh3d == nullptr || mesh3d->column_element_start.empty()) return w;
    if (mesh3d->column_element_start.size() != ne + 1)
      FatalError("PartitionMesh: the layered mesh is not built over the partitioned 2D mesh");
    w.resize(static_cast<std::size_t>(ne));
    for (int c = 1; c <= ne; ++c)
      w[static_cast<std::size_t>(c - 1)] = mesh3d->column_element_start[c + 1] - mesh3d->column_element_start[c];
  } else if (ps.type_of_weighting == kWeightFile) {
    const Array1<double> v = ReadElementItem(mesh, ps.file_name_weighting, ps.item_number_weighting,
                                             "file_name_weighting, item_number_weighting", ps.section);
    double largest = 0, sum = 0;
    for (int e = 1; e <= ne; ++e) {
      if (v[e] <= 0)
        FatalError("PartitionMesh: weight file " + ZrnLogName(ps.file_name_weighting) + ": element " +
                   std::to_string(mesh.elements.id[e]) + " has the weight " + fmt::format("{}", v[e]) +
                   "; weights must be positive");
      largest = std::max(largest, v[e]);
      sum += v[e];
    }
    const double scale = std::min(1000.0 / largest, 1073741824.0 / sum);
    w.resize(static_cast<std::size_t>(ne));
    for (int e = 1; e <= ne; ++e)
      w[static_cast<std::size_t>(e - 1)] = std::max<idx_t>(1, static_cast<idx_t>(std::lround(v[e] * scale)));
  }
  return w;
}

// Share of the load of every sub-domain (summing to 1): sub-domain 1 gets 1/m
// of the others' share with small_master_partition m >= 2.
std::vector<double> TargetShares(const PartitionSettings& ps, int nparts) {
  std::vector<double> share(static_cast<std::size_t>(nparts), 1.0);
  if (ps.small_master_partition >= 2 && nparts > 1) share[0] = 1.0 / ps.small_master_partition;
  double total = 0;
  for (double s : share) total += s;
  for (double& s : share) s /= total;
  return share;
}

// ---- partitioners -----------------------------------------------------------------------

// Elements joined through their interior faces, counting from 0 (CSR).
void ElementGraph(const Mesh& mesh, std::vector<idx_t>& xadj, std::vector<idx_t>& adjncy) {
  const ElementTable& el = mesh.elements;
  const FaceTable& fc = mesh.faces;
  xadj.assign(static_cast<std::size_t>(el.nelements) + 1, 0);
  adjncy.clear();
  adjncy.reserve(static_cast<std::size_t>(2 * fc.nfaces));
  for (int e = 1; e <= el.nelements; ++e) {
    for (int j = 1; j <= ElementFaceCount(el, e); ++j) {
      const int f = ElementFace(el, e, j);
      const int other = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
      if (other > 0 && other != e) adjncy.push_back(other - 1);
    }
    xadj[static_cast<std::size_t>(e)] = static_cast<idx_t>(adjncy.size());
  }
}

std::string MetisErrorText(int code) {
  switch (code) {
    case METIS_ERROR_INPUT: return "the graph or the options are not valid (METIS_ERROR_INPUT)";
    case METIS_ERROR_MEMORY: return "out of memory (METIS_ERROR_MEMORY)";
    default: return "error " + std::to_string(code);
  }
}

// Contiguous slices of the elements along the Hilbert curve through their
// centres, each holding its share of the weight; every slice gets at least
// one element (nparts <= elements).
Array1<int> PartitionWithoutMetis(const Mesh& mesh, const std::vector<idx_t>& weights,
                                  const std::vector<double>& share) {
  const int ne = mesh.elements.nelements;
  const int nparts = static_cast<int>(share.size());
  const std::vector<int> order = ElementOrder(mesh, kReorderHilbert, 1, ne);
  auto weight = [&](int e) { return weights.empty() ? 1.0 : static_cast<double>(weights[static_cast<std::size_t>(e - 1)]); };
  double total = 0;
  for (int e = 1; e <= ne; ++e) total += weight(e);
  Array1<int> part(ne);
  int p = 1, in_part = 0;
  double before = 0, bound = share[0] * total;  // weight up to the end of sub-domain p
  for (int i = 0; i < ne; ++i) {
    const int e = order[static_cast<std::size_t>(i)];
    const double w = weight(e);
    // Next sub-domain when this element's middle lies past the bound, or when
    // the elements left are just enough for one each.
    if (p < nparts && in_part > 0 && (before + 0.5 * w > bound || ne - i == nparts - p)) {
      bound += share[static_cast<std::size_t>(p)] * total;
      ++p;
      in_part = 0;
    }
    part[e] = p;
    ++in_part;
    before += w;
  }
  return part;
}

Array1<int> PartitionWithMetis(const Mesh& mesh, const PartitionSettings& ps, int nparts,
                               const std::vector<idx_t>& weights, const std::vector<double>& share) {
  const int ne = mesh.elements.nelements;
  Array1<int> part(ne, 1);
  if (nparts == 1) return part;
  std::vector<idx_t> xadj, adjncy;
  ElementGraph(mesh, xadj, adjncy);
  std::vector<idx_t> options = Metis5Options(ps, nparts);
  std::vector<real_t> tpwgts(share.begin(), share.end());
  idx_t nvtxs = ne, ncon = 1, np = nparts, objval = 0;
  std::vector<idx_t> result(static_cast<std::size_t>(ne), 0);
  idx_t* vwgt = weights.empty() ? nullptr : const_cast<idx_t*>(weights.data());
  const bool kway = options[METIS_OPTION_PTYPE] == METIS_PTYPE_KWAY;
  const int rc = kway ? METIS_PartGraphKway(&nvtxs, &ncon, xadj.data(), adjncy.data(), vwgt, nullptr, nullptr, &np,
                                            tpwgts.data(), nullptr, options.data(), &objval, result.data())
                      : METIS_PartGraphRecursive(&nvtxs, &ncon, xadj.data(), adjncy.data(), vwgt, nullptr, nullptr,
                                                 &np, tpwgts.data(), nullptr, options.data(), &objval, result.data());
  if (rc != METIS_OK)
    FatalError(std::string(kway ? "METIS5_PARTGRAPHKWAY" : "METIS5_PARTGRAPHRECURSIVE") + ": " + MetisErrorText(rc));
  for (int e = 1; e <= ne; ++e) part[e] = result[static_cast<std::size_t>(e - 1)] + 1;
  std::vector<int> count(static_cast<std::size_t>(nparts) + 1, 0);
  for (int e = 1; e <= ne; ++e) ++count[static_cast<std::size_t>(part[e])];
  for (int p = 1; p <= nparts; ++p) {
    if (count[static_cast<std::size_t>(p)] == 0) {
      Warning("METIS left sub-domain " + std::to_string(p) + " of " + std::to_string(nparts) +
              " without elements; the partition without METIS (type 3) is used");
      return PartitionWithoutMetis(mesh, weights, share);
    }
  }
  return part;
}

// ---- checks, summary, file --------------------------------------------------------------

[[noreturn]] void IllegalNumber(const std::string& detail) { FatalError("Illegal number of partitions: " + detail); }

void CheckElementCount(const Mesh& mesh, int nparts) {
  if (mesh.elements.nelements < nparts)
    FatalError("Number of elements in 2D mesh must be larger or equal to the number of subdomains (" +
               std::to_string(mesh.elements.nelements) + " elements, " + std::to_string(nparts) + " sub-domains)");
}

void WriteSummary(const Mesh& mesh, const Array1<int>& part, int nparts, const Mesh* mesh3d) {
  const int ne = mesh.elements.nelements;
  std::vector<long long> count(static_cast<std::size_t>(nparts) + 1, 0);
  const bool layered = mesh3d != nullptr && !mesh3d->column_element_start.empty();
  for (int e = 1; e <= ne; ++e)
    count[static_cast<std::size_t>(part[e])] +=
        layered ? mesh3d->column_element_start[e + 1] - mesh3d->column_element_start[e] : 1;
  WriteLogLine("");
  WriteLogLine("Partition");
  WriteValueLine("Number of partitions: %", nparts);
  WriteLogLine("");
  if (!layered) {
    WriteLogLine("  Partition    Number of 2D elements");
    for (int p = 1; p <= nparts; ++p)
      WriteLogLine(fmt::format("  {:9d}{:25d}", p, count[static_cast<std::size_t>(p)]));
    return;
  }
  // Neighbouring sub-domains (sharing a face) of every sub-domain.
  std::vector<std::set<int>> neighbours(static_cast<std::size_t>(nparts) + 1);
  const FaceTable& fc = mesh.faces;
  for (int f = 1; f <= fc.nfaces; ++f) {
    const int a = fc.element1[f], b = fc.element2[f];
    if (a > 0 && b > 0 && part[a] != part[b]) {
      neighbours[static_cast<std::size_t>(part[a])].insert(part[b]);
      neighbours[static_cast<std::size_t>(part[b])].insert(part[a]);
    }
  }
  WriteLogLine("  Partition    Total elements           Domains");
  for (int p = 1; p <= nparts; ++p)
    WriteLogLine(fmt::format("  {:9d}{:18d}{:18d}", p, count[static_cast<std::size_t>(p)],
                             neighbours[static_cast<std::size_t>(p)].size()));
}

}  // namespace

// ---- METIS options -----------------------------------------------------------------------

std::vector<int> Metis5Options(const PartitionSettings& ps, int nparts) {
  std::vector<idx_t> o(METIS_NOPTIONS);
  METIS_SetDefaultOptions(o.data());
  const bool kway = nparts >= 8;
  o[METIS_OPTION_PTYPE] = kway ? METIS_PTYPE_KWAY : METIS_PTYPE_RB;
  o[METIS_OPTION_UFACTOR] = kway ? 30 : 1;
  o[METIS_OPTION_OBJTYPE] = METIS_OBJTYPE_CUT;
  o[METIS_OPTION_NITER] = 20;
  o[METIS_OPTION_NCUTS] = 5;
  o[METIS_OPTION_SEED] = 5489;
  o[METIS_OPTION_NUMBERING] = 0;
  if (static_cast<int>(ps.metis5_options.size()) == METIS_NOPTIONS) {
    for (int k = 1; k < METIS_NOPTIONS; ++k) {
      const int v = ps.metis5_options[static_cast<std::size_t>(k)];
      if (IsMetisOptionKey(k) && v != kOptionNotGiven) o[static_cast<std::size_t>(k)] = v;
    }
  }
  return {o.begin(), o.end()};
}

// ---- the partition ----------------------------------------------------------------------

Array1<int> PartitionMesh(const Mesh& mesh, const PartitionSettings& ps, const RunControl& run, int nmachines,
                          const Mesh* mesh3d) {
  const int ne = mesh.elements.nelements;
  const int nprocesses = std::max(1, run.nprocesses);
  if (mesh.ndim != 2 || mesh.elements.face_start.empty())
    FatalError("PartitionMesh: the mesh must be a 2D mesh with its faces set up");
  if (ps.type_of_partitioning < kPartitionFile || ps.type_of_partitioning > kPartitionMultiLayer)
    FatalError("Illegal type of partitioning: type_of_partitioning = " + std::to_string(ps.type_of_partitioning) +
               " in " + ps.section);
  if (ps.number_of_domains_given && ps.number_of_domains < 0)
    IllegalNumber("number_of_domains = " + std::to_string(ps.number_of_domains) + " in " + ps.section);
  const int requested = ps.number_of_domains_given ? ps.number_of_domains : 0;

  Array1<int> part;
  int nparts = 0;
  if (ps.type_of_partitioning == kPartitionFile) {
    part = ReadPartitionFile(mesh, ps);
    for (int e = 1; e <= ne; ++e) nparts = std::max(nparts, part[e]);
    const std::string file = PartitionFileText(ps.file_name_partitioning);
    if (requested != 0 && requested != nparts)
      IllegalNumber("number_of_domains = " + std::to_string(requested) + " in " + ps.section + ", the " + file +
                    " holds " + std::to_string(nparts) + " sub-domains");
    if (nparts != nprocesses)
      IllegalNumber("the " + file + " holds " + std::to_string(nparts) + " sub-domains, the run has " +
                    std::to_string(nprocesses) + " processes (one process per sub-domain)");
    CheckElementCount(mesh, nparts);
    std::vector<int> count(static_cast<std::size_t>(nparts) + 1, 0);
    for (int e = 1; e <= ne; ++e) ++count[static_cast<std::size_t>(part[e])];
    for (int p = 1; p <= nparts; ++p)
      if (count[static_cast<std::size_t>(p)] == 0)
        IllegalNumber("sub-domain " + std::to_string(p) + " of the " + file + " has no element");
  } else {
    if (requested != 0 && requested != nprocesses)
      IllegalNumber("number_of_domains = " + std::to_string(requested) + " in " + ps.section + ", the run has " +
                    std::to_string(nprocesses) + " processes (one process per sub-domain)");
    nparts = nprocesses;
    CheckElementCount(mesh, nparts);
    if (ps.type_of_partitioning == kPartitionMetis4)
      WriteLogLine("METIS 4 is not available in this build: type_of_partitioning 4 runs as METIS 5 (type 2)");
    if (ps.type_of_partitioning == kPartitionMultiLayer) {
      if (nmachines > 1)
        FatalError("CalcMultiLayerPartitionMetis: the multi-layer partition over " + std::to_string(nmachines) +
                   " machines is not available in this build; use type_of_partitioning 2 in " + ps.section);
      WriteLogLine(
          "CalcMultiLayerPartitionMetis: Multi-Layer Metis requires more than one machine - Using Metis5 approach");
    }
    const std::vector<idx_t> weights = ElementWeights(mesh, ps, mesh3d);
    const std::vector<double> share = TargetShares(ps, nparts);
    part = ps.type_of_partitioning == kPartitionNoMetis ? PartitionWithoutMetis(mesh, weights, share)
                                                        : PartitionWithMetis(mesh, ps, nparts, weights, share);
  }
  WriteSummary(mesh, part, nparts, mesh3d);
  if (ps.write_partitioning > 0 && run.process_id <= 0) {
    if (ps.type_of_partitioning == kPartitionFile) {
      WriteLogLine("The partition was read from a file and is not written again");
    } else {
      const std::string name = !ps.file_name_partitioning.empty()
                                   ? ps.file_name_partitioning
                                   : ps.folder + "partitioning_" + std::to_string(nparts) + ".zrnu";
      if (zrnFileKind(name) != 4)
        FatalError("PartitionMesh: the partition file " + ZrnLogName(name) +
                   " must be a .zrnu file (file_name_partitioning in " + ps.section + ")");
      WritePartitionFile(mesh, part, name);
    }
  }
  return part;
}

void WritePartitionFile(const Mesh& mesh, const Array1<int>& partition, const std::string& file_name) {
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  const int nn = nd.nnodes, ne = el.nelements;
  const bool geographic = IsGeographic(mesh.projection);
  ZrnMeshData m;
  m.ndim = 2;
  m.node_id.assign(nn);
  m.x.assign(nn);
  m.y.assign(nn);
  m.z.assign(nn);
  m.node_code.assign(nn);
  for (int n = 1; n <= nn; ++n) {
    const int k = FileIndex(nd.file_index, n);
    m.node_id[k] = nd.id[n];
    m.x[k] = geographic ? nd.x[n] * kRadToDeg : nd.x[n];
    m.y[k] = geographic ? nd.y[n] * kRadToDeg : nd.y[n];
    m.z[k] = nd.z[n];
    m.node_code[k] = nd.code[n];
  }
  const Array1<int> in_file_order = FileOrder(el.file_index, ne);
  m.element_id.assign(ne);
  m.element_type.assign(ne);
  m.node_start.assign(ne + 1);
  m.node_list.assign(el.node_start[ne + 1] - 1);
  std::vector<float> values(static_cast<std::size_t>(ne));
  int pos = 1;
  for (int k = 1; k <= ne; ++k) {
    const int e = in_file_order[k];
    m.element_id[k] = el.id[e];
    m.element_type[k] = el.type[e];
    m.node_start[k] = pos;
    for (int j = 1; j <= ElementNodeCount(el, e); ++j) m.node_list[pos++] = FileIndex(nd.file_index, ElementNode(el, e, j));
    values[static_cast<std::size_t>(k - 1)] = static_cast<float>(partition[e]);
  }
  m.node_start[ne + 1] = pos;

  const ProjectionCrs crs = ProjectionCrsInfo(mesh.projection);
  ZrnFile f;
  zrnHeaderCreate(f, file_name, kZrnFileMesh2D, "KX Partition");
  zrnSetGeoInfoUTMProj(f, mesh.projection, 0.0, 0.0, 0.0, crs.known ? crs.wkt : std::string(), crs.epsg);
  zrnSetEqCalendarAxis(f, ZrnDateTime{1990, 1, 1, 12, 0, 0}, 1.0);
  zrnSetItemInfo(f, 1, "Partition", kUvqItemUndefined, kUvqUnitUndefined, kZrnFloat);
  zrnSetItemAxisEqD4(f, 1, kZrnLocationFace, ne);
  zrnSetMesh(f, m);
  zrnFileCreate(f, false);
  zrnWriteItemTimeStep(f, 0.0, values.data(), ne);
  zrnFileClose(f);
}

}  // namespace vhd
