#include "output/hd_output.hpp"

#include <cmath>
#include <limits>

#include "core/omp.hpp"
#include "io/setup.hpp"
#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "hydro/time_step.hpp"
#include "parallel/message_passing.hpp"

namespace vhd {

namespace {

constexpr double kRadToDeg = 57.29577951308232;
constexpr double kNeverWet = std::numeric_limits<double>::lowest();

OutputItem Item(int code, const char* name, int type, int unit, int mode = 1, bool discrete = false,
                bool wet_only = true) {
  OutputItem it;
  it.code = code;
  it.name = name;
  it.item_type = type;
  it.unit = unit;
  it.mode = mode;
  it.discrete = discrete;
  it.wet_only = wet_only;
  return it;
}

bool IsMaximum(int code) { return code >= kHdMaximumWaterDepth && code <= kHdMaximumSurfaceElevation; }

void ReadItemsHD(OutputSpec& spec, void* context) {
  HdOutputs& out = *static_cast<HdOutputs*>(context);
  for (const HdItemDefinition& def : HdOutputItems()) {
    bool on = false;
    SktReadKeyword(def.key, on, false);
    if (!on) continue;
    spec.items.push_back(def.item);
    if (IsMaximum(def.item.code)) out.track_maxima = true;
    if (def.item.code == kHdCurrentDirection) out.need_north = true;
  }
}

int Owned(const Mesh& mesh) {
  return mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
}

void SetupTrueNorth(HdOutputs& out, const Mesh& mesh) {
  const int ne = mesh.elements.nelements;
  out.true_north.assign(ne, 0.0);
  if (IsGeographic(mesh.projection) || !ProjectionCrsInfo(mesh.projection).known) return;
  CTqCartography cart;
  int status = 0;
  TqCartCreate(cart, mesh.projection, 0.0, 0.0, 0.0, &status);
  int failed = 0;
  for (int e = 1; e <= ne && status == 0; ++e) {
    int st = 0;
    double angle = 0.0;
    TqCartGetTrueNorth(cart, mesh.elements.xc[e], mesh.elements.yc[e], angle, &st);
    if (st == 0) out.true_north[e] = angle;
    else ++failed;
  }
  if (status != 0 || failed > 0)
    Warning("SetupOutputsHD: the direction of true north is not known for " +
            (status != 0 ? std::string("the projection ") + mesh.projection
                         : std::to_string(failed) + " elements") +
            "; current directions there are taken from grid north");
}

double Speed(const HdState& s, int e) { return std::sqrt(s.u[e] * s.u[e] + s.v[e] * s.v[e]); }

void UpdateMaxima(HdOutputs& out, const HdState& s, int nown) {
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    out.max_depth[e] = std::max(out.max_depth[e], s.h[e]);
    if (s.wetdry[e] == kWet) out.max_speed[e] = std::max(out.max_speed[e], Speed(s, e));
    if (s.wetdry[e] > 0) out.max_elevation[e] = std::max(out.max_elevation[e], s.eta[e]);
  }
}

void ElementVolumes(HdOutputs& out, const HdState& s, int nown) {
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) out.volume[e] = s.h[e] * out.area[e];
}

// Discharge through a section, summed over all processes (collective): each
// face counts on the process that owns its element1.
double Discharge(const DischargeSpec& d, const HdState& s, const Mesh& mesh, const RunControl& run) {
  ExactSum q;
  const int n = d.section.faces.size();
  for (int k = 1; k <= n; ++k) {
    const int f = d.section.faces[k];
    if (mesh.faces.element1[f] <= s.nelements_owned) q += d.section.sign[k] * s.face_flux_len[f];
  }
  q.SumOverProcesses(run);
  return q.Value();
}

}  // namespace

const std::vector<HdItemDefinition>& HdOutputItems() {
  static const std::vector<HdItemDefinition> kItems = {
      {"SURFACE_ELEVATION", Item(kHdSurfaceElevation, "Surface elevation", kUvqIWaterLevel, kUvqUmeter)},
      {"TOTAL_WATER_DEPTH",
       Item(kHdTotalWaterDepth, "Total water depth", kUvqIWaterDepth, kUvqUmeter, 1, false, false)},
      {"STILL_WATER_DEPTH",
       Item(kHdStillWaterDepth, "Still water depth", kUvqIWaterDepth, kUvqUmeter, 1, false, false)},
      {"U_VELOCITY", Item(kHdUVelocity, "U velocity", kUvqIUVelocity, kUvqUmeterPerSec)},
      {"V_VELOCITY", Item(kHdVVelocity, "V velocity", kUvqIVVelocity, kUvqUmeterPerSec)},
      {"CURRENT_SPEED", Item(kHdCurrentSpeed, "Current speed", kUvqICurrentSpeed, kUvqUmeterPerSec)},
      {"CURRENT_DIRECTION",
       Item(kHdCurrentDirection, "Current direction", kUvqICurrentDirection, kUvqUdegree, 2)},
      {"P_FLUX", Item(kHdPFlux, "P flux", kUvqIFlowFlux, kUvqUm2PerSec)},
      {"Q_FLUX", Item(kHdQFlux, "Q flux", kUvqIFlowFlux, kUvqUm2PerSec)},
      {"WET_DRY_CODE", Item(kHdWetDryCode, "Wet dry code", kUvqItemUndefined, kUvqUnonDim, 1, true, false)},
      {"CFL_NUMBER", Item(kHdCflNumber, "CFL number", kUvqItemUndefined, kUvqUnonDim)},
      {"BED_SHEAR_STRESS", Item(kHdBedShearStress, "Bed shear stress", kUvqIPressure, kUvqUpascal)},
      {"BED_SHEAR_STRESS_X", Item(kHdBedShearStressX, "Bed shear stress x", kUvqIPressure, kUvqUpascal)},
      {"BED_SHEAR_STRESS_Y", Item(kHdBedShearStressY, "Bed shear stress y", kUvqIPressure, kUvqUpascal)},
      {"DRAG_COEFFICIENT", Item(kHdDragCoefficient, "Drag coefficient", kUvqItemUndefined, kUvqUnonDim)},
      {"EDDY_VISCOSITY", Item(kHdEddyViscosity, "Eddy viscosity", kUvqIEddyViscosity, kUvqUm2PerSec)},
      {"MAXIMUM_WATER_DEPTH",
       Item(kHdMaximumWaterDepth, "Maximum water depth", kUvqIWaterDepth, kUvqUmeter, 1, false, false)},
      {"MAXIMUM_CURRENT_SPEED",
       Item(kHdMaximumCurrentSpeed, "Maximum current speed", kUvqICurrentSpeed, kUvqUmeterPerSec, 1, false, false)},
      {"MAXIMUM_SURFACE_ELEVATION", Item(kHdMaximumSurfaceElevation, "Maximum surface elevation", kUvqIWaterLevel,
                                         kUvqUmeter, 1, false, false)},
  };
  return kItems;
}

void SetupOutputsHD(HdOutputs& out, const Mesh& mesh, const RunControl& run, const TimeAxis& time) {
  out.run = run;
  OutputModuleInfo info;
  info.module = "HD";
  info.read_items = ReadItemsHD;
  info.context = &out;
  // Called from the module's setup, or afterwards with the target current.
  const bool reopen = SktLevel() == 0;
  if (reopen) SktOpenSection("HYDRODYNAMIC_MODULE", kNoIndex, nullptr, false);
  SetupOutputs(out.list, info, mesh, run, time);
  if (reopen) SktCloseSection();
}

void OpenOutputFilesHD(HdOutputs& out, const HdModule& hd, const Mesh& mesh) {
  const HdState& s = hd.state;
  const int ne = mesh.elements.nelements;
  const int nown = Owned(mesh);
  const bool geographic = hd.projection == 2;
  out.area.assign(ne, 0.0);
  for (int e = 1; e <= ne; ++e)
    out.area[e] = geographic ? mesh.elements.area[e] * hd.metric_radius * hd.metric_radius * s.cos_lat[e]
                             : mesh.elements.area[e];
  out.values.assign(ne, 0.0);
  out.nodes.assign(mesh.nodes.nnodes, 0.0);
  out.volume.assign(ne, 0.0);
  out.rate.assign(ne, 0.0);
  if (out.need_north) SetupTrueNorth(out, mesh);
  if (out.track_maxima) {
    out.max_depth.assign(ne, 0.0);
    out.max_speed.assign(ne, 0.0);
    out.max_elevation.assign(ne, kNeverWet);
    UpdateMaxima(out, s, nown);
  }

  int nb = 0;
  const FaceTable& fc = mesh.faces;
  for (int f = 1; f <= fc.nfaces; ++f) nb += fc.element2[f] == 0 && fc.element1[f] <= nown ? 1 : 0;
  out.boundary_faces.assign(nb);
  nb = 0;
  for (int f = 1; f <= fc.nfaces; ++f)
    if (fc.element2[f] == 0 && fc.element1[f] <= nown) out.boundary_faces[++nb] = f;

  ElementVolumes(out, s, nown);
  out.initial_volume.Clear();
  for (int e = 1; e <= nown; ++e) out.initial_volume += out.volume[e];
  out.boundaries.Clear();
  out.defect_start = hd.flood_dry.mass_correction;
  for (OutputSpec& spec : out.list.outputs) {
    if (spec.type != kOutputMassBudget) continue;
    for (std::size_t c = 0; c < spec.budget.components.size(); ++c)
      if (spec.budget.components[c].index == 0) StartBudget(spec.budget, static_cast<int>(c), out.volume);
  }
  OpenOutputFiles(out.list, mesh);
}

void UpdateOutputsHD(HdOutputs& out, const HdModule& hd, const HdSolver& solver, const Mesh& mesh, double dt) {
  const HdState& s = hd.state;
  const int nown = Owned(mesh);
  // Volume through the model boundary: a positive face flux leaves element1.
  for (int f : out.boundary_faces)
    if (s.face_flux_len[f] != 0.0) out.boundaries += -s.face_flux_len[f] * dt;

  // Sources (their discharge per element) and precipitation less
  // evaporation (the process term) of the sub-step.
  const bool sources = hd.sources.Active();
  const bool process = hd.precipitation.Active();
  if (process) {
    const double* area = ElementAreasHD(solver, mesh);
    const HdPrecipitation& p = hd.precipitation;
    for (int e = 1; e <= nown; ++e) out.rate[e] = (p.gain[e] - p.loss[e]) * area[e];
  }

  const bool cuts = hd.flood_dry.type > 0 && hd.flood_dry.mass_cut.size() >= nown;
  for (OutputSpec& spec : out.list.outputs) {
    if (spec.type == kOutputMassBudget) {
      for (std::size_t c = 0; c < spec.budget.components.size(); ++c) {
        if (spec.budget.components[c].index != 0) continue;
        const int k = static_cast<int>(c);
        AccumulateBudgetTransport(spec.budget, k, s.face_flux_len, dt);
        if (sources) AccumulateBudgetSource(spec.budget, k, hd.sources.element_rate, dt);
        if (process) AccumulateBudgetProcess(spec.budget, k, out.rate, dt);
        if (cuts) AccumulateBudgetDefect(spec.budget, k, hd.flood_dry.mass_cut);
      }
    } else if (spec.type == kOutputDischarge) {
      const double q = Discharge(spec.discharge, s, mesh, out.run);
      spec.discharge.accumulated += q * dt;
      if (q > 0) spec.discharge.positive += q * dt;
      else spec.discharge.negative += q * dt;
    }
  }
  if (out.track_maxima) UpdateMaxima(out, s, nown);
}

void HdItemValues(const HdOutputs& out, const HdModule& hd, const Mesh& mesh, int code, int flood_and_dry,
                  double delete_value, Array1<double>& values) {
  const HdState& s = hd.state;
  const int ne = mesh.elements.nelements;
  const int nown = Owned(mesh);
  const OutputItem& item = HdOutputItems()[static_cast<std::size_t>(code - 1)].item;
  const bool mask = item.wet_only && flood_and_dry > 0;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    if (mask && (s.wetdry[e] == kDry || (flood_and_dry == 2 && s.wetdry[e] != kWet))) {
      values[e] = delete_value;
      continue;
    }
    double v = 0.0;
    switch (code) {
      case kHdSurfaceElevation: v = s.eta[e]; break;
      case kHdTotalWaterDepth: v = s.h[e]; break;
      case kHdStillWaterDepth: v = s.d[e]; break;
      case kHdUVelocity: v = s.u[e]; break;
      case kHdVVelocity: v = s.v[e]; break;
      case kHdCurrentSpeed: v = Speed(s, e); break;
      case kHdCurrentDirection: {
        if (s.u[e] == 0.0 && s.v[e] == 0.0) break;
        v = std::atan2(s.u[e], s.v[e]) * kRadToDeg - out.true_north[e];
        v = std::fmod(v, 360.0);
        if (v < 0) v += 360.0;
        break;
      }
      case kHdPFlux: v = s.P[e]; break;
      case kHdQFlux: v = s.Q[e]; break;
      case kHdWetDryCode: v = s.wetdry[e]; break;
      case kHdCflNumber: v = CflNumber(s.cfl_rate[e], hd.dt_last); break;
      case kHdBedShearStress: v = std::sqrt(s.tau_x[e] * s.tau_x[e] + s.tau_y[e] * s.tau_y[e]); break;
      case kHdBedShearStressX: v = s.tau_x[e]; break;
      case kHdBedShearStressY: v = s.tau_y[e]; break;
      case kHdDragCoefficient: v = s.cf[e]; break;
      case kHdEddyViscosity: v = s.nu_t[e]; break;
      case kHdMaximumWaterDepth: v = out.max_depth[e]; break;
      case kHdMaximumCurrentSpeed: v = out.max_speed[e]; break;
      case kHdMaximumSurfaceElevation:
        v = out.max_elevation[e] == kNeverWet ? delete_value : out.max_elevation[e];
        break;
      default: break;
    }
    values[e] = v;
  }
  for (int e = nown + 1; e <= ne; ++e) values[e] = delete_value;
}

void WriteOutputHD2D(HdOutputs& out, const HdModule& hd, const Mesh& mesh, int n, double t) {
  bool volumes = false;
  for (OutputSpec& spec : out.list.outputs) {
    if (!BeginOutputRecord(spec, n, t)) continue;
    switch (spec.type) {
      case kOutputField2D:
        for (const OutputItem& item : spec.items) {
          HdItemValues(out, hd, mesh, item.code, spec.flood_and_dry, spec.delete_value, out.values);
          // Process 0 writes the values of every process.
          if (hd.subdomain) GatherOwned(*hd.subdomain, out.values);
          WriteFieldItem(spec, mesh, item, out.values, out.nodes, t);
        }
        break;
      case kOutputMassBudget: {
        if (!volumes) ElementVolumes(out, hd.state, Owned(mesh));
        volumes = true;
        const BudgetAmounts now = BudgetAmountsOf(spec.budget, out.volume, hd.state.wetdry, out.run);
        for (const OutputItem& item : spec.items)
          WriteValueItem(spec, BudgetItemValue(spec.budget, item.code / 100, item.code % 100, now, out.run), t);
        break;
      }
      case kOutputDischarge:
        for (const OutputItem& item : spec.items) {
          const DischargeSpec& d = spec.discharge;
          const double v = item.code == kDischarge ? Discharge(d, hd.state, mesh, out.run)
                           : item.code == kDischargeAccumulated ? d.accumulated
                           : item.code == kDischargePositive    ? d.positive
                                                                : d.negative;
          WriteValueItem(spec, v, t);
        }
        break;
      default: FatalError("WriteOutputHD2D: Output type not supported");
    }
    EndOutputRecord(spec, t);
  }
}

void CloseOutputFilesHD(HdOutputs& out) { CloseOutputFiles(out.list); }

void OutputStatisticsHD(HdOutputs& out, const RunControl& run) {
  if (run.nprocesses <= 1) return;
  WriteBanner("Output Statistics " + out.list.module);
  for (const OutputSpec& spec : out.list.outputs) {
    WriteLogLine("  Output " + std::to_string(spec.number) + " : " + ZrnLogName(spec.path) +
                 (spec.write ? "" : " (written by process 0)"));
    WriteValueLine("    Records written : %", spec.records);
  }
  WriteBanner("");
}

VolumeBalance VolumeBalanceHD(const HdOutputs& out, const HdModule& hd, const Mesh& mesh, const RunControl& run) {
  const HdState& s = hd.state;
  const int nown = Owned(mesh);
  ExactSum wet, dry;
  for (int e = 1; e <= nown; ++e) {
    const double v = s.h[e] * out.area[e];
    if (s.wetdry[e] > 0) wet += v;
    else dry += v;
  }
  ExactSum defect = hd.flood_dry.mass_correction;
  defect.Subtract(out.defect_start);
  auto total = [&](ExactSum part) {
    part.SumOverProcesses(run);
    return part.Value();
  };
  VolumeBalance b;
  b.initial = total(out.initial_volume);
  b.final_wet = total(wet);
  b.final_dry = total(dry);
  b.source_inflow = total(hd.sources.inflow);
  b.source_outflow = total(hd.sources.outflow);
  ExactSum precipitation, evaporation;
  PrecipitationVolumesHD(hd.precipitation, nown, precipitation, evaporation);
  b.precipitation = total(precipitation);
  b.evaporation = total(evaporation);
  b.boundaries = total(out.boundaries);
  b.defect = total(defect);
  b.show_sources = hd.mode > 1;
  b.show_defect = hd.flood_dry.type > 0;
  return b;
}

void PrintVolumeBalanceHD(const HdOutputs& out, const HdModule& hd, const Mesh& mesh, const RunControl& run) {
  const VolumeBalance b = VolumeBalanceHD(out, hd, mesh, run);
  PrintVolumeBalance(b);
  if (hd.mode > 1 && run.process_id <= 0) WriteVolumeBalanceReport(b);
}

}  // namespace vhd
