#include "hydro/sources.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <numbers>
#include <string>

#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "hydro/sw_fluxes.hpp"
#include "io/setup.hpp"
#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {


std::string Describe(const SourceRecord& s) { return "source " + std::to_string(s.number) + ", " + s.name; }

// A coordinate or time in a message, without padding.
std::string Number(double v) {
  char text[32];
  std::snprintf(text, sizeof text, "%.10g", v);
  return text;
}

// Number of values a source of a type carries.
int ValueCount(int type) { return type == kSourceSimple ? 1 : type == kSourceNoData ? 0 : 3; }

// Locates a source at its position (x, y, mesh coordinates); outside the mesh
// stops the run. t < 0: at setup.
void Locate(const HdSources& src, const Mesh& mesh, SourceRecord& s, double t) {
  s.element = FindElementID2DSearchTree(s.x, s.y, mesh, src.tree);
  if (s.element > 0) return;
  const double scale = IsGeographic(mesh.projection) ? 1.0 / kDegToRad : 1.0;
  FatalError("Point outside domain (" + Describe(s) + " at x = " + Number(s.x * scale) + ", y = " +
             Number(s.y * scale) + (t >= 0 ? ", time " + Number(t) + " s" : std::string()) + ")");
}

void ReadPosition(HdModule& hd, const Mesh& mesh, SourceRecord& s) {
  const double scale = IsGeographic(mesh.projection) ? kDegToRad : 1.0;
  SktReadKeyword("format_coordinates", s.format_coordinates, 0);
  if (s.format_coordinates == 0) {
    std::vector<double> xy;
    SktReadKeyword("coordinates", xy, 2);
    if (xy.size() != 2) FatalError("SetupSourcesHD: coordinates (x, y) are missing in " + SktSectionPath());
    s.x = xy[0] * scale;
    s.y = xy[1] * scale;
  } else if (s.format_coordinates == 1) {
    InitDataSpec(s.position, 2);
    s.position.format = kDataFile;
    s.position.type_of_soft_start = kSoftStartNone;
    SktReadFileName("file_name_coordinates", s.position.file_name, std::string());
    if (s.position.file_name.empty())
      FatalError("SetupSourcesHD: file_name_coordinates is missing in " + SktSectionPath());
    std::vector<int> items;
    SktReadKeyword("item_numbers_coordinates", items, 2, std::vector<int>{1, 2});
    s.position.item_numbers[1] = items[0];
    s.position.item_numbers[2] = items[1];
    FemDataRequest request;
    request.expect = FemDataExpect::kPoint;
    request.location = FemDataLocation::kPoints;
    request.mesh = &mesh;
    request.x = {0.0};
    request.y = {0.0};
    FemDataOpen(s.position, request, hd.time_axis);
    s.x = FemDataValue(s.position, 1, 0.0) * scale;
    s.y = FemDataValue(s.position, 2, 0.0) * scale;
  } else {
    FatalError("Format not supported for source coordinates (format_coordinates " +
               std::to_string(s.format_coordinates) + " in " + SktSectionPath() + "; 0 fixed, 1 from a file)");
  }
}

void ReadSource(HdModule& hd, const Mesh& mesh, SourceRecord& s, int nsources) {
  SktReadKeyword("type", s.type, kSourceSimple);
  if (s.type < kSourceSimple || s.type > kSourceNoData) {
    FatalError("Type not supported for sources (type " + std::to_string(s.type) + " in " + SktSectionPath() +
               "; 1 to 5)");
  }
  if (s.type == kSourceJet) {
    int vertical = 1;
    SktReadKeyword("interpolation_type", vertical, 1);
    if (vertical == 1) {
      FatalError("Type of vertical position must be 2, 3 or 4 (interpolation_type 1 in " + SktSectionPath() +
                 ")");
    }
    FatalError("SetupSourcesHD: Jet sources (the near-field jet model) are not available in this build (type = 4 in " +
               SktSectionPath() + ")");
  }
  ReadPosition(hd, mesh, s);
  if (s.type == kSourceConnected) {
    SktReadKeyword("connected_source", s.connected_source, 0);
    if (s.connected_source < 1 || s.connected_source > nsources || s.connected_source == s.number) {
      FatalError("Illegal source number (connected_source " + std::to_string(s.connected_source) + " in " +
                 SktSectionPath() + "; another source of 1 to " + std::to_string(nsources) + ")");
    }
  }
  const int n = ValueCount(s.type);
  if (n == 0) return;
  ReadDataSpec(s.data, n);
  if (s.data.format == kDataSoftStartFactor && (s.type == kSourceStandard || s.type == kSourceConnected)) {
    FatalError("The format=4 is not allowed for the present type of source (" + Describe(s) + ", type " +
               std::to_string(s.type) + ")");
  }
}

// Connected pairs: each source named by one partner at most, and included.
void CheckConnections(const std::vector<SourceRecord>& sources) {
  std::vector<int> named_by(sources.size(), 0);
  for (const SourceRecord& s : sources) {
    if (!s.include || s.type != kSourceConnected) continue;
    const SourceRecord& partner = sources[static_cast<std::size_t>(s.connected_source - 1)];
    int& by = named_by[static_cast<std::size_t>(s.connected_source - 1)];
    if (by != 0) {
      FatalError("Source no. " + std::to_string(s.connected_source) + " is connected to more than one source (" +
                 std::to_string(by) + " and " + std::to_string(s.number) + ")");
    }
    by = s.number;
    if (!partner.include) {
      FatalError("Connected source not included (source " + std::to_string(s.number) + " names source " +
                 std::to_string(partner.number) + ", which has include = 0)");
    }
  }
}

void OpenData(HdModule& hd, const Mesh& mesh, SourceRecord& s) {
  if (ValueCount(s.type) == 0) return;
  FemDataRequest request;
  const int format = s.data.format;
  request.expect = format == kDataFileOnce || format == kDataFileMap ? FemDataExpect::kArea : FemDataExpect::kPoint;
  request.location = FemDataLocation::kPoints;
  request.mesh = &mesh;
  request.x = {s.x};
  request.y = {s.y};
  FemDataOpen(s.data, request, hd.time_axis);
}

void ReadValues(SourceRecord& s, double t) {
  const int n = ValueCount(s.type);
  for (int k = 0; k < n; ++k) {
    s.values_old[k] = s.values_new[k];
    s.values_new[k] = FemDataValue(s.data, k + 1, t);
  }
}

}  // namespace

void SetupSourcesHD(HdModule& hd, const Mesh& mesh) {
  HdSources& src = hd.sources;
  if (!OpenOptionalSectionHD("SOURCES")) return;
  SktReadKeyword("number_of_sources", src.number_of_sources, 0);
  if (src.number_of_sources < 0) {
    FatalError("SetupSourcesHD: number_of_sources = " + std::to_string(src.number_of_sources) + " in " +
               SktSectionPath() + " must not be negative");
  }
  SktReadKeyword("output_type", src.output_type, 0);
  if (src.output_type != 0) {
    SktReadFileName("output_file_name", src.output_file_name, std::string("source_data.zrn0"));
    SktReadKeyword("output_frequency", src.output_frequency, 1);
    if (src.output_frequency < 1) {
      FatalError("SetupSourcesHD: output_frequency = " + std::to_string(src.output_frequency) + " in " +
                 SktSectionPath() + " must be 1 or more");
    }
    SktReadKeyword("merge_data", src.merge_data, 0);
  }
  // No sources: the subsections are not read.
  if (src.number_of_sources == 0) SktSkipSection();
  if (src.number_of_sources > 0) BuildSearchTree2D(mesh, src.tree);
  src.sources.resize(static_cast<std::size_t>(src.number_of_sources));
  for (int i = 1; i <= src.number_of_sources; ++i) {
    SourceRecord& s = src.sources[static_cast<std::size_t>(i - 1)];
    s.number = i;
    s.name = "SOURCE_" + std::to_string(i);
    SktOpenSection("SOURCE", i);
    int include = 1;
    SktReadKeyword("include", include, 1);
    s.include = include != 0;
    if (s.include) {
      ReadSource(hd, mesh, s, src.number_of_sources);
    } else {
      SktSkipSection();
    }
    SktCloseSection();
  }
  SktCloseSection();
  CheckConnections(src.sources);
  for (SourceRecord& s : src.sources) {
    if (!s.include) continue;
    Locate(src, mesh, s, -1.0);
    OpenData(hd, mesh, s);
    ReadValues(s, 0.0);
    s.discharge = s.type == kSourceNoData ? 0.0 : s.values_new[0];
  }
  src.withdrawn.assign(src.sources.size(), 0.0);
  src.element_rate.assign(mesh.elements.nelements, 0.0);
}

void UpdateSourcesHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt) {
  HdSources& src = hd.sources;
  if (!src.Active()) return;
  const HdState& st = hd.state;
  const int nown = st.nelements_owned;
  const double* area = ElementAreasHD(solver, mesh);
  const auto owned = [nown](int e) { return e >= 1 && e <= nown; };
  const auto source = [&src](int number) -> SourceRecord& {
    return src.sources[static_cast<std::size_t>(number - 1)];
  };
  for (SourceRecord& s : src.sources) {
    if (!s.include) continue;
    src.element_rate[s.element] = 0.0;
    if (s.format_coordinates == 1) {
      s.x = FemDataValue(s.position, 1, t) * (IsGeographic(mesh.projection) ? kDegToRad : 1.0);
      s.y = FemDataValue(s.position, 2, t) * (IsGeographic(mesh.projection) ? kDegToRad : 1.0);
      Locate(src, mesh, s, t);
      src.element_rate[s.element] = 0.0;
    }
    ReadValues(s, t);
  }
  // The element giving water for a source's discharge q, and the one
  // receiving it (0: none).
  const auto sides = [&](const SourceRecord& s, double q, int& giver, int& taker) {
    giver = taker = 0;
    if (s.type == kSourceConnected) {
      const int other = source(s.connected_source).element;
      giver = q >= 0 ? s.element : other;
      taker = q >= 0 ? other : s.element;
    } else if (q < 0) {
      giver = s.element;
    } else {
      taker = s.element;
    }
  };
  // Withdrawals first, each limited by the water its element holds then.
  std::fill(src.withdrawn.begin(), src.withdrawn.end(), 0.0);
  for (SourceRecord& s : src.sources) {
    if (!s.include || s.type == kSourceNoData) continue;
    const double q = s.values_new[0];
    int giver, taker;
    sides(s, q, giver, taker);
    if (!owned(giver)) continue;
    const double held = std::max(0.0, st.h[giver] / dt + solver.src_h[giver]) * area[giver];
    const double w = std::min(std::abs(q), held);
    if (w == 0.0) continue;
    src.withdrawn[static_cast<std::size_t>(s.number - 1)] = w;
    solver.src_h[giver] -= w / area[giver];
    if (st.wetdry[giver] == kWet) {
      solver.src_P[giver] -= w * st.u[giver] / area[giver];
      solver.src_Q[giver] -= w * st.v[giver] / area[giver];
    }
    src.element_rate[giver] -= w;
    src.outflow += -w * dt;
  }
  if (hd.subdomain && hd.subdomain->Active())
    SumOverProcesses(src.withdrawn.data(), static_cast<int>(src.withdrawn.size()), *hd.subdomain);
  // Releases: a connected source gives what it withdrew.
  for (SourceRecord& s : src.sources) {
    if (!s.include || s.type == kSourceNoData) continue;
    const double q = s.values_new[0];
    const double w = src.withdrawn[static_cast<std::size_t>(s.number - 1)];
    int giver, taker;
    sides(s, q, giver, taker);
    const double released = s.type == kSourceConnected ? w : (taker > 0 ? q : 0.0);
    s.discharge = s.type == kSourceConnected ? (q >= 0 ? w : -w) : (taker > 0 ? q : -w);
    if (!owned(taker) || released == 0.0) continue;
    solver.src_h[taker] += released / area[taker];
    if (st.wetdry[taker] == kWet && s.type != kSourceSimple) {
      solver.src_P[taker] += released * s.values_new[1] / area[taker];
      solver.src_Q[taker] += released * s.values_new[2] / area[taker];
    }
    src.element_rate[taker] += released;
    src.inflow += released * dt;
  }
}

void OpenSourceOutputHD(HdModule& hd) {
  HdSources& src = hd.sources;
  if (!src.Active() || src.output_type == 0 || hd.process_id > 0) return;
  ZrnFile& f = src.file;
  bool ok = zrnHeaderCreate(f, src.output_file_name, kZrnFileData, "Sources") == 0;
  ok = ok && zrnSetEqCalendarAxis(f, zrnDateTime(hd.time_axis.start), hd.time_axis.dt * src.output_frequency) == 0;
  int k = 0;
  for (const SourceRecord& s : src.sources) {
    if (!s.include) continue;
    ++k;
    ok = ok && zrnSetItemInfo(f, k, "Discharge " + s.name, kUvqIDischarge, kUvqUm3PerSec, kZrnDouble) == 0;
    ok = ok && zrnSetItemAxisEqD0(f, k) == 0;
  }
  ok = ok && k > 0 && zrnFileCreate(f) == 0;
  if (!ok) FatalError("OpenSourceOutputHD: Unable to create " + ZrnLogName(src.output_file_name));
  src.file_open = true;
}

void WriteSourceOutputHD(HdModule& hd, int n, double t) {
  HdSources& src = hd.sources;
  if (!src.file_open || n < 0 || n % src.output_frequency != 0) return;
  for (const SourceRecord& s : src.sources) {
    if (!s.include) continue;
    if (zrnWriteItemTimeStep(src.file, t, &s.discharge, 1) != 0)
      FatalError("WriteSourceOutputHD: Unable to write " + ZrnLogName(src.output_file_name));
  }
}

void CloseSourcesHD(HdModule& hd) {
  HdSources& src = hd.sources;
  if (src.file_open) zrnFileClose(src.file);
  src.file_open = false;
  for (SourceRecord& s : src.sources) {
    if (!s.include) continue;
    if (ValueCount(s.type) > 0) FemDataClose(s.data);
    if (s.format_coordinates == 1) FemDataClose(s.position);
  }
}

}  // namespace vhd
