#include "hydro/forcing_precipitation.hpp"

#include <algorithm>
#include <cstdio>
#include <string>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "hydro/sw_fluxes.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

// Reads one rate subsection (the current section): format (default
// default_format), constant_value, file_name, item_number and the linear soft
// start. A format other than 0, 1, 3 stops the run with format_message.
void ReadRate(DataSpec& spec, int default_format, const std::string& format_message) {
  InitDataSpec(spec, 1);
  SktReadKeyword("format", spec.format, default_format);
  if (spec.format != kDataConstant && spec.format != kDataFile && spec.format != kDataFileMap) {
    FatalError(format_message + " (format " + std::to_string(spec.format) + " in " + SktSectionPath() +
               "; 0 constant, 1 time series, 3 varying in time and domain)");
  }
  SktReadKeyword("constant_value", spec.constant_values[1], 0.0);
  if (spec.format != kDataConstant) {
    SktReadFileName("file_name", spec.file_name, std::string());
    SktReadKeyword("item_number", spec.item_numbers[1], 1);
    if (spec.file_name.empty()) FatalError("SetupPrecipitationHD: file_name is missing in " + SktSectionPath());
  }
  spec.type_of_soft_start = kSoftStartLinear;
  SktReadKeyword("soft_time_interval", spec.soft_time_interval, 0.0);
  if (spec.soft_time_interval < 0.0) {
    char value[32];
    std::snprintf(value, sizeof value, "%g", spec.soft_time_interval);
    FatalError("SetupPrecipitationHD: soft_time_interval = " + std::string(value) + " in " + SktSectionPath() +
               " must not be negative");
  }
}

// A field (format 3) is carried onto every element; a constant or a series
// (formats 0, 1) is one value for the whole domain.
void OpenRate(HdModule& hd, const Mesh& mesh, DataSpec& spec, Array1<double>& rate) {
  FemDataRequest request;
  request.expect = spec.format == kDataFileMap ? FemDataExpect::kArea : FemDataExpect::kPoint;
  request.location = FemDataLocation::kElements;
  request.mesh = &mesh;
  FemDataOpen(spec, request, hd.time_axis);
  if (spec.format == kDataFileMap) rate.assign(mesh.elements.nelements, 0.0);
}

// Rate (m/s) at time t: the data (mm/day, brought up from 0 by the linear
// soft start as it is read) converted; per element into rate for a field,
// else the value returned.
double ReadRateAt(DataSpec& spec, double t, Array1<double>& rate, int ne) {
  if (spec.format != kDataFileMap) return FemDataValue(spec, 1, t) * kMillimetresPerDay;
  FemDataRead(spec, 1, t, rate);
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) rate[e] *= kMillimetresPerDay;
  return 0.0;
}

}  // namespace

void SetupPrecipitationHD(HdModule& hd, const Mesh& mesh) {
  HdPrecipitation& p = hd.precipitation;
  if (!OpenOptionalSectionHD("PRECIPITATION_EVAPORATION")) return;
  SktReadKeyword("type_of_precipitation", p.type_of_precipitation, 0);
  if (p.type_of_precipitation < 0 || p.type_of_precipitation > 2) {
    FatalError("Type not supported for precipitation (type_of_precipitation " +
               std::to_string(p.type_of_precipitation) + " in " + SktSectionPath() +
               "; 0 none, 1 precipitation, 2 net precipitation)");
  }
  SktReadKeyword("type_of_evaporation", p.type_of_evaporation, 0);
  if (p.type_of_precipitation == 2) {
    // Net precipitation carries the evaporation itself.
    p.type_of_evaporation = 0;
  } else if (p.type_of_evaporation == 2) {
    FatalError("SetupPrecipitationHD: Evaporation from the heat exchange is not available in this build "
               "(type_of_evaporation = 2 in " + SktSectionPath() + ")");
  } else if (p.type_of_evaporation < 0 || p.type_of_evaporation > 2) {
    FatalError("Type not supported for evaporation (type_of_evaporation " + std::to_string(p.type_of_evaporation) +
               " in " + SktSectionPath() + "; 0 none, 1 specified in EVAPORATION)");
  }
  // Switched off: the subsections are not read.
  if (!p.Active()) SktSkipSection();
  if (p.type_of_precipitation > 0) {
    SktOpenSection("PRECIPITATION");
    ReadRate(p.precipitation, kDataFile, "Format not supported for precipitation");
    SktCloseSection();
  }
  if (p.type_of_evaporation == 1) {
    SktOpenSection("EVAPORATION");
    ReadRate(p.evaporation, kDataConstant, "Format not supported for evaporation");
    SktCloseSection();
  }
  SktCloseSection();
  if (p.type_of_precipitation > 0) OpenRate(hd, mesh, p.precipitation, p.precipitation_rate);
  if (p.type_of_evaporation == 1) OpenRate(hd, mesh, p.evaporation, p.evaporation_rate);
  if (p.Active()) {
    for (Array1<double>* a : {&p.gain, &p.loss, &p.gain_total, &p.loss_total}) a->assign(mesh.elements.nelements, 0.0);
  }
}

void UpdatePrecipitationHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt) {
  HdPrecipitation& p = hd.precipitation;
  if (!p.Active()) return;
  const int ne = mesh.elements.nelements;
  const int nown = hd.state.nelements_owned;
  const bool rain = p.type_of_precipitation > 0, net = p.type_of_precipitation == 2;
  const bool evaporation = p.type_of_evaporation == 1;
  const double p_all = rain ? ReadRateAt(p.precipitation, t, p.precipitation_rate, ne) : 0.0;
  const double e_all = evaporation ? ReadRateAt(p.evaporation, t, p.evaporation_rate, ne) : 0.0;
  const double* h = hd.state.h.data();
  const double* pr = p.precipitation_rate.empty() ? nullptr : p.precipitation_rate.data();
  const double* ev = p.evaporation_rate.empty() ? nullptr : p.evaporation_rate.data();
  const double* area = ElementAreasHD(solver, mesh);
  double *gain = p.gain.data(), *loss = p.loss.data();
  double *gain_total = p.gain_total.data(), *loss_total = p.loss_total.data();
  double* src_h = solver.src_h.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    // Rain and evaporation are not negative; a net rate below 0 evaporates.
    const double r = pr ? pr[e] : p_all;
    const double in = std::max(r, 0.0);
    double out = net ? std::max(-r, 0.0) : std::max(ev ? ev[e] : e_all, 0.0);
    // No more than the water present and what sources and rain bring in the
    // sub-step.
    out = std::min(out, std::max(0.0, h[e] / dt + src_h[e] + in));
    gain[e] = in;
    loss[e] = out;
    src_h[e] += in - out;
    gain_total[e] += in * area[e] * dt;
    loss_total[e] += out * area[e] * dt;
  }
}

void PrecipitationVolumesHD(const HdPrecipitation& p, int nown, ExactSum& precipitation, ExactSum& evaporation) {
  precipitation.Clear();
  evaporation.Clear();
  if (!p.Active()) return;
  for (int e = 1; e <= nown; ++e) {
    precipitation += p.gain_total[e];
    evaporation += -p.loss_total[e];
  }
}

void ClosePrecipitationHD(HdPrecipitation& p) {
  if (p.type_of_precipitation > 0) FemDataClose(p.precipitation);
  if (p.type_of_evaporation == 1) FemDataClose(p.evaporation);
}

}  // namespace vhd
