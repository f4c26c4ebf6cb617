// Setup of the forcings: the sections CORIOLIS, WIND_FORCING (with
// WIND_FRICTION), TIDAL_POTENTIAL, DEPTH, ICE (with ROUGHNESS) and
// RADIATION_STRESS of the HD module, their checks and messages.

#include <algorithm>
#include <array>
#include <cmath>
#include <string>
#include <vector>

#include "hydro/forcing.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

// " (key = value in section; expected)".
std::string Where(std::string_view key, const std::string& value, std::string_view expected = {}) {
  return " (" + std::string(key) + " = " + value + " in " + SktSectionPath() +
         (expected.empty() ? "" : "; " + std::string(expected)) + ")";
}

std::string Text(int v) { return std::to_string(v); }
std::string Text(double v) {
  const std::string t = NumberText(v);
  return t.substr(std::min(t.find_first_not_of(' '), t.size()));
}

// Reads the data keys of a field of n components from the current section:
// format (default 0); for format 0 constant_value (n = 1) or constant_values
// (default 0); for formats 1 to 3 file_name and one item key per component
// (defaults 1, 2, ...). Any other format stops the run with format_message.
// No soft start.
void ReadFieldData(DataSpec& spec, const std::vector<const char*>& item_keys, const std::string& format_message) {
  const int n = static_cast<int>(item_keys.size());
  InitDataSpec(spec, n);
  SktReadKeyword("format", spec.format, kDataConstant);
  if (spec.format < kDataConstant || spec.format > kDataFileMap) {
    FatalError(format_message + Where("format", Text(spec.format), "0 constant, 1 or 3 read at every time, 2 read once"));
  }
  if (spec.format == kDataConstant) {
    if (n == 1) {
      SktReadKeyword("constant_value", spec.constant_values[1], 0.0);
    } else {
      std::vector<double> v(static_cast<std::size_t>(n), 0.0);
      SktReadKeyword("constant_values", v, n, v);
      for (int k = 1; k <= n; ++k) spec.constant_values[k] = v[static_cast<std::size_t>(k - 1)];
    }
  } else {
    SktReadFileName("file_name", spec.file_name, std::string());
    if (spec.file_name.empty()) FatalError("Missing data file name: keyword file_name in section " + SktSectionPath());
    for (int k = 1; k <= n; ++k) SktReadKeyword(item_keys[static_cast<std::size_t>(k - 1)], spec.item_numbers[k], k);
  }
  spec.type_of_soft_start = kSoftStartNone;
}

// Opens the data of a field on the elements of the mesh: a point series
// gives one value for the whole mesh, a grid or mesh file one per element.
void OpenElementData(HdModule& hd, const Mesh& mesh, DataSpec& spec) {
  FemDataRequest request;
  request.expect = FemDataExpect::kArea;
  request.location = FemDataLocation::kElements;
  request.mesh = &mesh;
  FemDataOpen(spec, request, hd.time_axis);
}

}  // namespace

bool ForcingActiveHD(const HdModule& hd) {
  const HdForcing& f = hd.forcing;
  return f.wind.type > 0 || f.coriolis.type > 0 || f.tide.type > 0 || f.depth.type > 0 || f.ice.type > 0 ||
         f.radiation.type > 0;
}

void SetupCoriolisHD(HdModule& hd) {
  HdCoriolis& c = hd.forcing.coriolis;
  // Without the section there is no Coriolis force, so that setups written
  // before it existed run as they did.
  c.type = 0;
  if (!OpenOptionalSectionHD("CORIOLIS")) return;
  SktReadKeyword("type", c.type, 2);
  if (c.type < 0 || c.type > 2) FatalError("Type not supported for Coriolis forcing" + Where("type", Text(c.type)));
  if (c.type == 1) {
    c.latitude_given = SktHasKeyword("latitude");
    if (c.latitude_given) {
      SktReadKeyword("latitude", c.latitude, 0.0);
      if (!(c.latitude >= -90.0 && c.latitude <= 90.0)) {
        FatalError("wrong latitude specified for coriolis forcing" + Where("latitude", Text(c.latitude)));
      }
    }
    c.coefficient_given = SktHasKeyword("coriolis_coefficient");
    if (c.coefficient_given) SktReadKeyword("coriolis_coefficient", c.coefficient, 0.0);
  }
  SktCloseSection();
}

void SetupWindHD(HdModule& hd) {
  HdWindForcing& w = hd.forcing.wind;
  w.type = 0;
  if (!OpenOptionalSectionHD("WIND_FORCING")) return;
  SktReadKeyword("type", w.type, 0);
  if (w.type <= 0) {
    w.type = 0;
    SktSkipSection();
    SktCloseSection();
    return;
  }
  SktReadKeyword("format", w.format, 1);
  InitDataSpec(w.data, w.format == 3 ? 3 : 2);
  switch (w.format) {
    case 0:
      SktReadKeyword("constant_speed", w.constant_speed, 0.0);
      SktReadKeyword("constant_direction", w.constant_direction, 0.0);
      if (!(w.constant_speed >= 0.0 && std::isfinite(w.constant_speed))) {
        FatalError("SetupWindHD: the wind speed must not be negative" + Where("constant_speed", Text(w.constant_speed)));
      }
      break;
    case 1:
      SktReadFileName("file_name", w.file_name);
      SktReadKeyword("item_number_for_speed", w.item_speed, 1);
      SktReadKeyword("item_number_for_direction", w.item_direction, 2);
      break;
    case 3:
      SktReadFileName("file_name", w.file_name);
      SktReadKeyword("item_number_for_pressure", w.item_pressure, 1);
      SktReadKeyword("item_number_for_x_velocity", w.item_x, 2);
      SktReadKeyword("item_number_for_y_velocity", w.item_y, 3);
      break;
    default:
      FatalError("Format not supported for wind conditions." + Where("format", Text(w.format)));
  }
  double neutral_hpa = 1013.0;
  SktReadKeyword("neutral_pressure", neutral_hpa, 1013.0);
  w.neutral_pressure = 100.0 * neutral_hpa;
  if (!(w.neutral_pressure >= 44400.0 && w.neutral_pressure <= 199900.0)) {
    FatalError("Invalid neutral pressure" + Where("neutral_pressure", Text(neutral_hpa), "444 to 1999 hPa expected"));
  }
  SktReadKeyword("type_of_soft_start", w.type_of_soft_start, 2);
  SktReadKeyword("soft_time_interval", w.soft_time_interval, 0.0);
  if (!(w.soft_time_interval >= 0.0)) {
    FatalError("SetupWindHD: the soft time interval must not be negative" +
               Where("soft_time_interval", Text(w.soft_time_interval)));
  }

  const bool friction = OpenOptionalSectionHD("WIND_FRICTION");
  if (friction) {
    SktReadKeyword("type", w.friction_type, 1);
    if (w.friction_type != 0 && w.friction_type != 1) {
      FatalError("Wind friction type not" + Where("type", Text(w.friction_type), "0 or 1 expected"));
    }
    if (w.friction_type == 0) {
      SktReadKeyword("constant_friction", w.constant_friction, 0.0026);
    } else {
      SktReadKeyword("linear_friction_low", w.friction_low, 0.0016);
      SktReadKeyword("linear_speed_low", w.speed_low, 0.0);
      SktReadKeyword("linear_friction_high", w.friction_high, 0.0026);
      SktReadKeyword("linear_speed_high", w.speed_high, 24.0);
      if (!(w.speed_high > w.speed_low)) {
        FatalError("SetupWindHD: linear_speed_high must exceed linear_speed_low (" + Text(w.speed_high) +
                   " and " + Text(w.speed_low) + " in " + SktSectionPath() + ")");
      }
    }
    SktCloseSection();
  }
  SktCloseSection();

  // The data of formats 1 and 3 (opened on the mesh when the solver is set
  // up); the soft start of the section is applied by the wind update itself.
  DataSpec& d = w.data;
  d.format = w.format == 0 ? kDataConstant : kDataFile;
  d.file_name = w.file_name;
  if (w.format == 1) {
    d.item_numbers[1] = w.item_speed;
    d.item_numbers[2] = w.item_direction;
    d.time_interpolation[2] = kTimeInterpolationCircular;
  } else if (w.format == 3) {
    d.item_numbers[1] = w.item_pressure;
    d.item_numbers[2] = w.item_x;
    d.item_numbers[3] = w.item_y;
  }
  d.type_of_soft_start = kSoftStartNone;
  for (int k = 1; k <= d.n; ++k) d.no_soft_start[k] = 1;
}

void SetupTideHD(HdModule& hd) {
  HdTidalPotential& tp = hd.forcing.tide;
  tp.type = 0;
  if (!OpenOptionalSectionHD("TIDAL_POTENTIAL")) return;
  SktReadKeyword("type", tp.type, 0);
  if (tp.type == 0) {
    SktSkipSection();
    SktCloseSection();
    return;
  }
  if (tp.type < 0 || tp.type > 3) FatalError("Type not supported for tide conditions" + Where("type", Text(tp.type)));
  const std::array<int, 6>& s = hd.time_axis.start;
  tp.start_days = DaysFromTideEpoch(s[0], s[1], s[2], s[3], s[4], s[5]);
  if (tp.type == 1) {
    SktReadKeyword("format", tp.format, 0);
    if (tp.format != 0) {
      FatalError("Format not supported for tide conditions" + Where("format", Text(tp.format), "0: constituents in CONSTITUENT sections"));
    }
    SktReadKeyword("period_scaling", tp.period_scaling, 1.0);
    int n = 0;
    SktReadKeyword("number_of_constituents", n, 0);
    if (n < 1) {
      FatalError("SetupTide: number_of_constituents = " + std::to_string(n) + " in " + SktSectionPath() +
                 " (at least 1 expected)");
    }
    tp.constituents.assign(static_cast<std::size_t>(n), TidalConstituent{});
    for (int k = 1; k <= n; ++k) {
      if (!SktSectionExists("CONSTITUENT", k)) {
        FatalError("SetupTide: section CONSTITUENT_" + std::to_string(k) + " missing in " + SktSectionPath());
      }
      SktOpenSection("CONSTITUENT", k);
      TidalConstituent& c = tp.constituents[static_cast<std::size_t>(k - 1)];
      SktReadKeyword("name", c.name, std::string());
      SktReadKeyword("species", c.species, 1);
      SktReadKeyword("constituent", c.constituent, 1);
      SktReadKeyword("amplitude", c.amplitude, 0.0);
      SktReadKeyword("period", c.period, 0.0);
      SktReadKeyword("earthtide", c.earthtide, 1.0);
      SktReadKeyword("nodal_number_1", c.nodal_number_1, 1.0);
      SktReadKeyword("nodal_number_2", c.nodal_number_2, 0.0);
      SktReadKeyword("nodal_number_3", c.nodal_number_3, 0.0);
      const int nargs = SktNumberOfParams("arguments");
      if (nargs > 0) SktReadKeyword("arguments", c.arguments, nargs);
      SktReadKeyword("phase", c.phase, 0.0);
      if (c.species < 0 || c.species > 2) {
        FatalError("SetupTide: species = " + std::to_string(c.species) + " in " + SktSectionPath() +
                   " is not supported (0 long-period, 1 diurnal, 2 semi-diurnal)");
      }
      c.period *= tp.period_scaling;
      if (!(c.period > 0.0) || !std::isfinite(c.period)) {
        FatalError("SetupTide: period = " + Text(c.period) + " s in " + SktSectionPath() +
                   " (period times period_scaling must be positive)");
      }
      SktCloseSection();
    }
  } else if (tp.type == 2) {
    SktReadFileName("file_name", tp.file_name);
    SktReadKeyword("item_number", tp.item_number, 1);
    InitDataSpec(tp.data, 1);
    tp.data.format = kDataFile;
    tp.data.file_name = tp.file_name;
    tp.data.item_numbers[1] = tp.item_number;
    tp.data.type_of_soft_start = kSoftStartNone;
  } else {
    const double T = tp.start_days / 36525.0;
    tp.constituents = BuiltinConstituents(T);
  }
  SktCloseSection();
  tp.amp.assign(tp.constituents.size(), 0.0);
  tp.arg.assign(tp.constituents.size(), 0.0);
}

void SetupDepthHD(HdModule& hd, const Mesh& mesh) {
  HdDepthCorrection& dc = hd.forcing.depth;
  dc.type = 0;
  if (!OpenOptionalSectionHD("DEPTH")) return;
  SktReadKeyword("type", dc.type, 0);
  if (dc.type < 0) FatalError("Type not supported" + Where("type", Text(dc.type), "0 none, 1 or more: depth correction"));
  if (dc.type == 0) {
    SktSkipSection();
    SktCloseSection();
    return;
  }
  // One correction per element of the mesh: not with separate geometry,
  // velocity and elevation meshes.
  if (hd.mesh_flag == 1) FatalError("SetupDepth do not support discretization=1 (separate 2D meshes in SPACE)");
  ReadFieldData(dc.data, {"item_number"}, "Format not supported");
  SktCloseSection();
  if (dc.data.format != kDataConstant) OpenElementData(hd, mesh, dc.data);
}

void SetupIceHD(HdModule& hd, const Mesh& mesh) {
  HdIce& ice = hd.forcing.ice;
  ice.type = 0;
  hd.ice_type = 0;
  if (!OpenOptionalSectionHD("ICE")) return;
  SktReadKeyword("type", ice.type, 0);
  if (ice.type == 0) {
    SktSkipSection();
    SktCloseSection();
    return;
  }
  if (ice.type < 0 || ice.type > 3) {
    FatalError("Type not supported for ice conditions." +
               Where("type", Text(ice.type), "1 concentration, 2 thickness, 3 concentration and thickness"));
  }
  hd.ice_type = ice.type;
  if (ice.Thickness()) {
    SktReadKeyword("thickness_cut_off", ice.thickness_cut_off, 1e-6);
    if (!(ice.thickness_cut_off >= 0.0)) {
      FatalError("SetupIceHD: the thickness cut-off must not be negative" +
                 Where("thickness_cut_off", Text(ice.thickness_cut_off)));
    }
  }
  SktReadKeyword("c_cut_off", ice.c_cut_off, 0.9);
  SktReadKeyword("c_cut_off_lower", ice.c_cut_off_lower, ice.c_cut_off);
  if (!(ice.c_cut_off_lower <= ice.c_cut_off)) {
    FatalError("Illegal lower cut off value (c_cut_off_lower = " + Text(ice.c_cut_off_lower) + " exceeds c_cut_off = " +
               Text(ice.c_cut_off) + " in " + SktSectionPath() + ")");
  }
  std::vector<const char*> items;
  if (ice.Concentration()) items.push_back("item_number_concentration");
  if (ice.Thickness()) items.push_back("item_number_thickness");
  ReadFieldData(ice.data, items, "Format not supported for ice conditions.");
  // The ice roughness: a roughness height, 0 (no surface drag) by default.
  ElementField& r = ice.roughness;
  r.format = 0;
  r.constant_value = 0.0;
  const int ne = mesh.elements.nelements;
  if (OpenOptionalSectionHD("ROUGHNESS")) {
    SktReadKeyword("type", ice.roughness_type, 0);
    if (ice.roughness_type != 0) {
      FatalError("SetupIceHD: the ice roughness type is not supported" +
                 Where("type", Text(ice.roughness_type), "0: roughness height in m"));
    }
    ReadElementFieldHD(r, 0.0, hd.state.element_file_index, ne, true, "Format not supported for roughness.",
                       "SetupIceHD", hd.time_axis);
    SktCloseSection();
  } else {
    r.values.assign(ne, 0.0);
  }
  for (int e = 1; e <= ne; ++e) {
    if (!(r.values[e] >= 0.0)) {
      FatalError("SetupIceHD: the ice roughness of element " + std::to_string(mesh.elements.id[e]) + " is " +
                 Text(r.values[e]) + " m (a roughness height must not be negative)");
    }
  }
  SktCloseSection();
  if (ice.data.format != kDataConstant) OpenElementData(hd, mesh, ice.data);
}

void SetupRadiationStressHD(HdModule& hd, const Mesh& mesh) {
  HdRadiationStress& rs = hd.forcing.radiation;
  rs.type = 0;
  if (!OpenOptionalSectionHD("RADIATION_STRESS")) return;
  SktReadKeyword("type", rs.type, 0);
  if (rs.type == 0) {
    SktSkipSection();
    SktCloseSection();
    return;
  }
  if (rs.type < 0 || rs.type > 5) {
    FatalError("Type not supported for radiation stress variation." +
               Where("type", Text(rs.type), "1 stresses or 3 force components from a file"));
  }
  if (rs.type != 1 && rs.type != 3) {
    FatalError("SetupHD: Radiation stress from the wave module is not available in this build" +
               Where("type", Text(rs.type), "1 stresses or 3 force components from a file"));
  }
  SktReadKeyword("format", rs.format, 1);
  if (rs.format != kDataFileMap) {
    FatalError("Format not supported for radiation stress." + Where("format", Text(rs.format), "3 varying in time and domain"));
  }
  DataSpec& d = rs.data;
  InitDataSpec(d, rs.type == 1 ? 3 : 2);
  d.format = kDataFileMap;
  SktReadKeyword("soft_time_interval", d.soft_time_interval, 0.0);
  if (!(d.soft_time_interval >= 0.0)) {
    FatalError("SetupRadiationStressHD: the soft time interval must not be negative" +
               Where("soft_time_interval", Text(d.soft_time_interval)));
  }
  d.type_of_soft_start = kSoftStartSine;
  SktReadFileName("file_name", d.file_name, std::string());
  if (d.file_name.empty()) FatalError("Missing data file name: keyword file_name in section " + SktSectionPath());
  if (rs.type == 1) {
    SktReadKeyword("item_number_for_sxx", d.item_numbers[1], 1);
    SktReadKeyword("item_number_for_sxy", d.item_numbers[2], 2);
    SktReadKeyword("item_number_for_syy", d.item_numbers[3], 3);
  } else {
    SktReadKeyword("item_number_for_rx", d.item_numbers[1], 1);
    SktReadKeyword("item_number_for_ry", d.item_numbers[2], 2);
  }
  SktCloseSection();
  OpenElementData(hd, mesh, d);
}

void CloseForcingDataHD(HdModule& hd) {
  HdForcing& f = hd.forcing;
  for (DataSpec* d : {&f.depth.data, &f.ice.data, &f.radiation.data}) {
    if (d->state.open) FemDataClose(*d);
  }
}

}  // namespace vhd
