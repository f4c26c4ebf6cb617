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
#include "mesh/cartography.hpp"
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

// The jet parameters of the current section, checked.
void ReadJet(JetModel& j) {
  SktReadKeyword("diameter", j.diameter, 0.2);
  SktReadKeyword("sigma", j.sigma, 0.0);
  SktReadKeyword("theta", j.theta, 0.0);
  SktReadKeyword("maximum_distance", j.maximum_distance, 500.0);
  SktReadKeyword("gamma", j.gamma, 0.01);
  SktReadKeyword("epsilon", j.epsilon, 0.1);
  SktReadKeyword("position", j.position, 2);
  SktReadKeyword("distribution", j.distribution, 2);
  SktReadKeyword("delta", j.delta, 5.0);
  SktReadKeyword("entrainment", j.entrainment, 0.07);
  SktReadKeyword("upstream", j.upstream, 1);
  SktReadKeyword("distance_upstream", j.distance_upstream, 10.0);
  SktReadKeyword("number_of_sections_radius", j.number_of_sections_radius, 3);
  SktReadKeyword("number_of_sections_circle", j.number_of_sections_circle, 12);
  SktReadKeyword("number_of_sections", j.number_of_sections, 5);
  const auto positive = [](const char* key, double v) {
    if (!(v > 0.0)) FatalError("SetupSourcesHD: " + std::string(key) + " = " + Number(v) + " in " + SktSectionPath() + " must be greater than 0");
  };
  positive("diameter", j.diameter);
  positive("maximum_distance", j.maximum_distance);
  positive("entrainment", j.entrainment);
  positive("number_of_sections", j.number_of_sections);
  if (j.gamma < 0.0 || j.epsilon < 0.0 || j.distance_upstream < 0.0 || std::abs(j.theta) > 90.0) {
    FatalError("SetupSourcesHD: gamma, epsilon and distance_upstream must not be negative and theta lie in -90 "
               "to 90 degrees in " + SktSectionPath());
  }
  j.points.resize(static_cast<std::size_t>(j.number_of_sections));
}

void ReadSource(HdModule& hd, const Mesh& mesh, SourceRecord& s, int nsources) {
  SktReadKeyword("type", s.type, kSourceSimple);
  if (s.type < kSourceSimple || s.type > kSourceNoData) {
    FatalError("Type not supported for sources (type " + std::to_string(s.type) + " in " + SktSectionPath() +
               "; 1 to 5)");
  }
  if (s.type == kSourceJet) {
    JetModel& j = s.jet;
    SktReadKeyword("interpolation_type", j.vertical_position, 1);
    if (j.vertical_position < 2 || j.vertical_position > 4) {
      FatalError("Type of vertical position must be 2, 3 or 4 (interpolation_type " +
                 std::to_string(j.vertical_position) + " in " + SktSectionPath() + ")");
    }
  }
  ReadPosition(hd, mesh, s);
  if (s.type == kSourceJet) ReadJet(s.jet);
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

// Direction of true north at (x, y), degrees clockwise from the mesh's y
// axis (0 where the projection gives none).
double TrueNorth(const Mesh& mesh, double x, double y) {
  if (IsGeographic(mesh.projection) || !ProjectionCrsInfo(mesh.projection).known) return 0.0;
  CTqCartography cart;
  int status = 0;
  TqCartCreate(cart, mesh.projection, 0.0, 0.0, 0.0, &status);
  double angle = 0.0;
  if (status == 0) TqCartGetTrueNorth(cart, x, y, angle, &status);
  return status == 0 ? angle : 0.0;
}

// Gives every process the values of one element per jet: fill(s, v) writes
// the values v[0 .. 3] of jet s on the process that owns its element, the
// sum over the processes (0 elsewhere) hands them to all.
template <class Fill>
void ShareJetValues(HdModule& hd, Fill&& fill) {
  HdSources& src = hd.sources;
  std::fill(src.jet_values.begin(), src.jet_values.end(), 0.0);
  for (SourceRecord& s : src.sources)
    if (s.include && s.type == kSourceJet) fill(s, &src.jet_values[4 * static_cast<std::size_t>(s.number - 1)]);
  if (hd.subdomain && hd.subdomain->Active())
    SumOverProcesses(src.jet_values.data(), static_cast<int>(src.jet_values.size()), *hd.subdomain);
}

// The report of jet s at time t; end: its end element, -1 on land, -2
// outside the mesh; upstream: its upstream point 0 in water, 1 on land, 2
// outside the mesh.
void ReportJet(const Mesh& mesh, const SourceRecord& s, double t, int end, int upstream) {
  const JetModel& j = s.jet;
  const double scale = IsGeographic(mesh.projection) ? 1.0 / kDegToRad : 1.0;
  const std::string number = std::to_string(s.number);
  if (upstream != 0) {
    Warning(SubstituteValue("Time % (s).", t) + " " +
            SubstituteValue(upstream == 1 ? "Upstream ambient point of jet % on land"
                                          : "Upstream ambient point of jet % outside domain",
                            number));
  }
  if (end < 0) {
    Warning(SubstituteValue("Time % (s).", t) + " " +
            SubstituteValue(end == -1 ? "Position of jet % on land" : "Position of jet % outside domain", number));
  }
  WriteLogLine("");
  WriteLogLine("Source information");
  WriteValueLine("Source number            : %", s.number);
  WriteValueLine("Time                     : %", t);
  WriteValueLine("Receiving element        : %", mesh.elements.id[j.end_element]);
  for (std::size_t k = 0; k < j.points.size(); ++k) {
    const JetPoint& p = j.points[k];
    WriteValueLine("Point %", static_cast<int>(k + 1));
    WriteValueLine("  x end position          : %", p.x * scale);
    WriteValueLine("  y end position          : %", p.y * scale);
    WriteValueLine("  z end position          : %", p.z);
    WriteValueLine("  Discharge               : %", p.discharge);
    WriteValueLine("  Characteristic width    : %", p.width);
    WriteValueLine("  Dilution factor         : %", p.dilution);
    WriteValueLine("  Distance                : %", p.distance);
    WriteValueLine("  Stop code               : %", p.stop);
    WriteValueLine("  x end upstream position : %", j.x_upstream * scale);
    WriteValueLine("  y end upstream position : %", j.y_upstream * scale);
    WriteValueLine("  upstream distance       : %", j.distance_to_upstream);
  }
}

// The near field of every jet with a discharge: the current at the source,
// the ambient current upstream, the model, and the element where the jet
// ends (the source's own when the end lies on land or outside the mesh).
void UpdateJets(HdModule& hd, const Mesh& mesh, double t) {
  HdSources& src = hd.sources;
  const HdState& st = hd.state;
  const int nown = st.nelements_owned;
  const auto owned = [nown](int e) { return e >= 1 && e <= nown; };
  const bool geographic = IsGeographic(mesh.projection);
  const auto active = [](const SourceRecord& s) { return s.include && s.type == kSourceJet && s.values_new[0] > 0; };
  ShareJetValues(hd, [&](SourceRecord& s, double* v) {
    if (!active(s) || !owned(s.element)) return;
    v[0] = st.u[s.element], v[1] = st.v[s.element], v[2] = -st.d[s.element], v[3] = st.eta[s.element];
  });
  for (SourceRecord& s : src.sources) {
    if (!active(s)) continue;
    JetModel& j = s.jet;
    const double* v = &src.jet_values[4 * static_cast<std::size_t>(s.number - 1)];
    j.u_source = v[0], j.v_source = v[1], j.z_bed = v[2], j.z_surface = v[3];
    const double speed = std::hypot(j.u_source, j.v_source);
    const double mx = geographic ? hd.metric_radius * std::cos(s.y) : 1.0;
    const double my = geographic ? hd.metric_radius : 1.0;
    j.distance_to_upstream = speed > 0 ? j.distance_upstream : 0.0;
    j.x_upstream = s.x - (speed > 0 ? j.distance_upstream * j.u_source / speed / mx : 0.0);
    j.y_upstream = s.y - (speed > 0 ? j.distance_upstream * j.v_source / speed / my : 0.0);
    j.upstream_element = FindElementID2DSearchTree(j.x_upstream, j.y_upstream, mesh, src.tree);
  }
  ShareJetValues(hd, [&](SourceRecord& s, double* v) {
    const int e = s.jet.upstream_element;
    if (!active(s) || !owned(e)) return;
    v[0] = st.u[e], v[1] = st.v[e], v[2] = st.wetdry[e] == kWet ? 1.0 : 0.0;
  });
  std::vector<int>& keys = src.jet_keys;
  for (SourceRecord& s : src.sources) {
    if (!active(s)) continue;
    JetModel& j = s.jet;
    const double* v = &src.jet_values[4 * static_cast<std::size_t>(s.number - 1)];
    // Outside the mesh the current at the source serves; on land there is none.
    double ua = j.u_source, va = j.v_source;
    int upstream = 0;
    if (j.upstream_element == 0) {
      upstream = 2;
    } else if (v[2] == 0.0) {
      upstream = 1, ua = va = 0.0;
    } else {
      ua = v[0], va = v[1];
    }
    const double mx = geographic ? hd.metric_radius * std::cos(s.y) : 1.0;
    const double my = geographic ? hd.metric_radius : 1.0;
    RunJetModel(s, ua, va, j.z_bed, j.z_surface, mx, my);
    j.end_element = FindElementID2DSearchTree(j.points.back().x, j.points.back().y, mesh, src.tree);
    keys[static_cast<std::size_t>(s.number - 1)] = upstream;
  }
  ShareJetValues(hd, [&](SourceRecord& s, double* v) {
    if (active(s) && owned(s.jet.end_element)) v[0] = st.wetdry[s.jet.end_element] == kWet ? 1.0 : 0.0;
  });
  for (SourceRecord& s : src.sources) {
    if (!active(s)) continue;
    JetModel& j = s.jet;
    const bool wet = src.jet_values[4 * static_cast<std::size_t>(s.number - 1)] != 0.0;
    const int end = j.end_element == 0 ? -2 : wet ? j.end_element : -1;
    if (end < 0) {
      // The water goes in at the source.
      j.end_element = s.element;
      j.release_u = j.u_source, j.release_v = j.v_source;
    }
    const int upstream = keys[static_cast<std::size_t>(s.number - 1)];
    const int key = 4 * end + upstream;
    if (key != j.report_key) ReportJet(mesh, s, t, end, upstream);
    j.report_key = key;
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
    if (s.type == kSourceJet) {
      s.jet.north = TrueNorth(mesh, s.x, s.y);
      s.jet.end_element = s.element;
      src.has_jets = true;
    }
    OpenData(hd, mesh, s);
    ReadValues(s, 0.0);
    s.discharge = s.type == kSourceNoData ? 0.0 : s.values_new[0];
  }
  src.withdrawn.assign(src.sources.size(), 0.0);
  src.jet_values.assign(4 * src.sources.size(), 0.0);
  src.jet_keys.assign(src.sources.size(), 0);
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
  if (src.has_jets) {
    for (const SourceRecord& s : src.sources)
      if (s.include && s.type == kSourceJet) src.element_rate[s.jet.end_element] = 0.0;
    UpdateJets(hd, mesh, t);
    for (const SourceRecord& s : src.sources)
      if (s.include && s.type == kSourceJet) src.element_rate[s.jet.end_element] = 0.0;
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
      taker = s.type == kSourceJet ? s.jet.end_element : s.element;
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
      const bool jet = s.type == kSourceJet;
      solver.src_P[taker] += released * (jet ? s.jet.release_u : s.values_new[1]) / area[taker];
      solver.src_Q[taker] += released * (jet ? s.jet.release_v : s.values_new[2]) / area[taker];
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
