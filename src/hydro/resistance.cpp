// Bed resistance: the BED_RESISTANCE settings turned into a coefficient K per
// element, the drag coefficient c_f of each sub-step (bed shear stress
// tau = rho0 c_f |u| u), the surface drag under ice and the bed shear stress
// of the new state.
//
// K by stored type: 1 drag coefficient c_f; 2 g / C^2 (Chezy number C);
// 3 g / M^2 (Manning number M); 4, 5, 6 g / M^2 with M = 25.4 / ks^(1/6) from a
// roughness height ks (uniform, directional, or wave induced). For types 3 to
// 6 the drag coefficient depends on depth, c_f = K / h^(1/3).
//
// Directional roughness: four roughness heights for flow towards the east,
// north, west and south (constant_values or items in that order). The
// roughness of an element is the mean of the east/west and the north/south
// height that face the flow, weighted by the squares of the velocity
// components: ks = (u^2 ks_x + v^2 ks_y) / (u^2 + v^2), with ks_x = ks_east
// for u >= 0 and ks_west otherwise (likewise ks_y); at rest the mean of all
// four. The weights make ks a smooth function of the flow direction.
//
// Wave-induced roughness (type_of_wave_induced_roughness 0): the ripple
// roughness of a sand bed under waves and current after van Rijn (2007,
// J. Hydraul. Eng. 133(6)), ks = d50 (85 - 65 tanh(0.015 (psi - 150))),
// kept between 2.5 d50 (flat bed) and 0.075 m, with the mobility number
// psi = (U_w^2 + U^2) / ((s - 1) g d50): U the current speed, s the relative
// density, d50 the grain diameter and U_w = pi H / (T sinh(k h)) the
// near-bed peak orbital velocity of waves of height H and period T by linear
// theory (k = 2 pi / L, L from WaveLengthHD). With
// type_of_wave_height_correction 1 the height is first limited to
// wave_height_over_depth_limit times the depth (depth-limited breaking).
// Without waves (H = 0) the roughness follows from the current alone.

#include <algorithm>
#include <cmath>
#include <numbers>
#include <string>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

constexpr double kRippleMax = 0.075;  // largest ripple roughness (m)

// K of a roughness height ks: M = 25.4 / ks^(1/6), K = g / M^2.
inline double RoughnessToK(double ks) {
  const double M = 25.4 / std::pow(ks, 1.0 / 6.0);
  return kPhysical.g / (M * M);
}

struct CoefficientKind {
  const char* section;
  const char* name;  // for messages
  double def;
  const char* format_message;
};

CoefficientKind KindOf(int type) {
  switch (type) {
    case kBedDragCoefficient:
      return {"DRAG_COEFFICIENT", "drag coefficient", 0.01, "Format not supported for drag coefficient."};
    case kBedChezy:
      return {"CHEZY_NUMBER", "Chezy number", 32.0, "Format not supported for Chezy number."};
    case kBedManning:
      return {"MANNING_NUMBER", "Manning number", 32.0, "Format not supported for Manning number."};
    default:
      return {"ROUGHNESS", "roughness", 0.05, "Format not supported for roughness."};
  }
}

std::string SourceText(const ElementField& f, std::string_view section) {
  if (f.format == 0) return std::string(section) + "/constant_value";
  return "file " + ZrnLogName(f.file_name) + ", item " + std::to_string(f.item_number);
}

// K from the current coefficient values (types 1 to 4), over every element. A
// value that would give no or an infinite resistance stops the run naming the
// first such element.
void ConvertCoefficient(HdBedResistance& br, const Array1<int>& file_index, std::string_view who) {
  const Array1<double>& c = br.coefficient.values;
  const int n = c.size();
  const int type = br.type;
  const double g = kPhysical.g;
  const double* x = c.data();
  double* K = br.K.data();
  int bad = n + 1;
  VHD_OMP_PARALLEL_FOR_REDUCTION(min, bad)
  for (int e = 1; e <= n; ++e) {
    const double value = x[e];
    const bool ok = std::isfinite(value) && (type == kBedDragCoefficient ? value >= 0.0 : value > 0.0);
    if (!ok) {
      if (e < bad) bad = e;
      continue;
    }
    if (type == kBedDragCoefficient) {
      K[e] = value;
    } else if (type == kBedChezy || type == kBedManning) {
      K[e] = g / (value * value);
    } else {
      K[e] = RoughnessToK(value);
    }
  }
  if (bad <= n) {
    const CoefficientKind kind = KindOf(type);
    FatalError(std::string(who) + ": " + kind.name + " " + NumberText(x[bad]) + " of element " +
               std::to_string(FileIndex(file_index, bad)) + " (" + SourceText(br.coefficient, kind.section) + ") must be " +
               (type == kBedDragCoefficient ? "0 or more" : "greater than 0"));
  }
}

void SetupDirectional(HdModule& hd, bool parent_open) {
  HdBedResistance& br = hd.bed;
  const int ne = hd.state.nelements;
  const bool open = parent_open && OpenOptionalSectionHD("DIRECTIONAL_ROUGHNESS");
  if (open) {
    SktReadKeyword("format", br.directional_format, 0);
    if (br.directional_format != 0 && br.directional_format != 2) {
      FatalError("Format not supported for directional roughness.");
    }
    if (br.directional_format == 0) {
      SktReadKeyword("constant_values", br.directional_constants, 4, std::vector<double>{0.05, 0.05, 0.05, 0.05});
    } else {
      SktReadFileName("file_name", br.directional_file, std::string());
      SktReadKeyword("item_numbers", br.directional_items, 4, std::vector<int>{1, 2, 3, 4});
    }
  }
  for (int k = 0; k < 4; ++k) {
    if (br.directional_format == 0) {
      br.ks_directional[k].assign(ne, br.directional_constants[static_cast<std::size_t>(k)]);
    } else {
      ReadElementFileHD(br.directional_file, br.directional_items[static_cast<std::size_t>(k)],
                        hd.state.element_file_index, ne,
                        br.ks_directional[k], "SetupBedResistanceHD");
    }
    for (int e = 1; e <= ne; ++e) {
      if (!(br.ks_directional[k][e] > 0.0)) {
        FatalError("SetupBedResistanceHD: directional roughness " + NumberText(br.ks_directional[k][e]) +
                   " of element " + std::to_string(FileIndex(hd.state.element_file_index, e)) + " (value " + std::to_string(k + 1) +
                   ") must be greater than 0");
      }
    }
  }
  if (open) SktCloseSection();
}

void SetupWaveInduced(HdModule& hd, bool parent_open) {
  HdBedResistance& br = hd.bed;
  const int ne = hd.state.nelements;
  const bool open = parent_open && OpenOptionalSectionHD("WAVE_INDUCED_ROUGHNESS");
  br.grain_diameter.constant_value = 0.0002;
  br.grain_diameter.values.assign(ne, 0.0002);
  if (open) {
    SktReadKeyword("type_of_wave_induced_roughness", br.type_of_wave_induced_roughness, 0);
    if (br.type_of_wave_induced_roughness != 0) FatalError("Type not supported for wave induced roughness");
    SktReadKeyword("update_frequency", br.update_frequency, 1);
    if (br.update_frequency < 1) {
      FatalError("SetupBedResistanceHD: update_frequency = " + std::to_string(br.update_frequency) + " in " +
                 SktSectionPath() + " must be 1 or more");
    }
    if (OpenOptionalSectionHD("GRAIN_DIAMETER")) {
      ReadElementFieldHD(br.grain_diameter, 0.0002, hd.state.element_file_index, ne, false, "Format not supported for grain diamete.",
                         "SetupBedResistanceHD", hd.time_axis);
      SktCloseSection();
    }
    SktReadKeyword("relative_density", br.relative_density, 2.65);
    SktReadKeyword("type_of_wave_height_correction", br.type_of_wave_height_correction, 0);
    if (br.type_of_wave_height_correction == 1) {
      SktReadKeyword("wave_height_over_depth_limit", br.wave_height_over_depth_limit, 0.85);
    }
    SktCloseSection();
  }
  if (!(br.relative_density > 1.0)) {
    FatalError("SetupBedResistanceHD: relative_density = " + NumberText(br.relative_density) +
               " must be greater than 1");
  }
  for (int e = 1; e <= ne; ++e) {
    if (!(br.grain_diameter.values[e] > 0.0)) {
      FatalError("SetupBedResistanceHD: grain diameter " + NumberText(br.grain_diameter.values[e]) +
                 " of element " + std::to_string(FileIndex(hd.state.element_file_index, e)) +
                 " must be greater than 0");
    }
  }
  br.wave_height.assign(ne, 0.0);
  br.wave_period.assign(ne, 0.0);
  br.wave_direction.assign(ne, 0.0);
  br.ks_wave.assign(ne, 0.0);
}

void UpdateDirectionalK(HdModule& hd) {
  HdBedResistance& br = hd.bed;
  const HdState& s = hd.state;
  const int nown = s.nelements_owned;
  const double* u = s.u.data();
  const double* v = s.v.data();
  const double* east = br.ks_directional[0].data();
  const double* north = br.ks_directional[1].data();
  const double* west = br.ks_directional[2].data();
  const double* south = br.ks_directional[3].data();
  double* K = br.K.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    const double u2 = u[e] * u[e];
    const double v2 = v[e] * v[e];
    double ks;
    if (u2 + v2 > 0.0) {
      const double kx = u[e] >= 0.0 ? east[e] : west[e];
      const double ky = v[e] >= 0.0 ? north[e] : south[e];
      ks = (u2 * kx + v2 * ky) / (u2 + v2);
    } else {
      ks = 0.25 * (east[e] + north[e] + west[e] + south[e]);
    }
    K[e] = RoughnessToK(ks);
  }
}

}  // namespace

// Roughness height of a sand bed under waves and current (header comment).
double WaveInducedRoughness(double d50, double relative_density, double current_speed, double wave_height,
                            double wave_period, double depth) {
  double uw2 = 0.0;
  if (wave_height > 0.0 && wave_period > 0.0 && depth > 0.0) {
    const double L = WaveLengthHD(wave_period, depth);
    const double kh = 2.0 * std::numbers::pi * depth / L;
    const double uw = std::numbers::pi * wave_height / (wave_period * std::sinh(kh));
    uw2 = uw * uw;
  }
  const double psi = (uw2 + current_speed * current_speed) / ((relative_density - 1.0) * kPhysical.g * d50);
  const double ks = d50 * (85.0 - 65.0 * std::tanh(0.015 * (psi - 150.0)));
  return std::max(2.5 * d50, std::min(kRippleMax, ks));
}

void SetupBedResistanceHD(HdModule& hd, const Mesh& mesh) {
  (void)mesh;
  HdBedResistance& br = hd.bed;
  const int ne = hd.state.nelements;
  const bool open = OpenOptionalSectionHD("BED_RESISTANCE");
  int type = 4;
  if (open) SktReadKeyword("type", type, 4);
  if (type == 0) {
    br.type = kBedNone;
  } else if (type >= 2 && type <= 7) {
    br.type = type - 1;
  } else {
    FatalError("Type not supported for bed resistance");
  }
  br.K.assign(ne, 0.0);
  br.K_surface.assign(ne, 0.0);

  if (br.type >= kBedDragCoefficient && br.type <= kBedRoughness) {
    const CoefficientKind kind = KindOf(br.type);
    br.coefficient.constant_value = kind.def;
    br.coefficient.format = 0;
    if (open && OpenOptionalSectionHD(kind.section)) {
      ReadElementFieldHD(br.coefficient, kind.def, hd.state.element_file_index, ne, true, kind.format_message, "SetupBedResistanceHD",
                         hd.time_axis);
      SktCloseSection();
    } else {
      br.coefficient.values.assign(ne, kind.def);
    }
    ConvertCoefficient(br, hd.state.element_file_index, "SetupBedResistanceHD");
  } else if (br.type == kBedDirectionalRoughness) {
    SetupDirectional(hd, open);
    UpdateDirectionalK(hd);
  } else if (br.type == kBedWaveRoughness) {
    SetupWaveInduced(hd, open);
  }
  if (open) SktCloseSection();
}

void CALCRESISTANCEBED(HdModule& hd, const Mesh& mesh, double t) {
  (void)mesh;
  HdBedResistance& br = hd.bed;
  if (br.type == kBedNone) return;
  if (br.type <= kBedRoughness) {
    if (UpdateElementFieldHD(br.coefficient, t, "CALCRESISTANCEBED")) {
      ConvertCoefficient(br, hd.state.element_file_index, "CALCRESISTANCEBED");
    }
  } else if (br.type == kBedDirectionalRoughness) {
    UpdateDirectionalK(hd);
  } else if (br.type == kBedWaveRoughness) {
    if (br.wave_update_count % br.update_frequency == 0) {
      const HdState& s = hd.state;
      const int nown = s.nelements_owned;
      const bool correct = br.type_of_wave_height_correction == 1;
      VHD_OMP_PARALLEL_FOR
      for (int e = 1; e <= nown; ++e) {
        if (s.wetdry[e] != kWet) continue;
        const double speed = std::sqrt(s.u[e] * s.u[e] + s.v[e] * s.v[e]);
        double H = br.wave_height[e];
        if (correct) H = std::min(H, br.wave_height_over_depth_limit * s.h[e]);
        br.ks_wave[e] = WaveInducedRoughness(br.grain_diameter.values[e], br.relative_density, speed, H,
                                             br.wave_period[e], s.h[e]);
        br.K[e] = RoughnessToK(br.ks_wave[e]);
      }
    }
    ++br.wave_update_count;
  }
  CALCDRAGCOEFMANNINGBED(hd);
}

double ManningDragCoefficient(double K, double h) {
  // The cubic series of h^(1/6) = exp(x) rises with x everywhere but falls to
  // zero near h = 0.07 mm; below h = e^-6 (2.5 mm) the drag is therefore held
  // at its value there, which keeps it finite and monotone on thin films.
  const double x = std::max(-1.0, 0.166667 * std::log(h));
  const double e = 1.0 + x * (1.0 + x * (0.5 + 0.166667 * x));
  return K / (e * e);
}

void CALCDRAGCOEFMANNINGBED(HdModule& hd) {
  HdState& s = hd.state;
  const HdBedResistance& br = hd.bed;
  const int nown = s.nelements_owned;
  double* cf = s.cf.data();
  const double* K = br.K.data();
  const double* h = s.h.data();
  const int* code = s.wetdry.data();
  if (br.type == kBedNone) {
    VHD_OMP_PARALLEL_FOR
    for (int e = 1; e <= nown; ++e) cf[e] = 0.0;
  } else if (br.type == kBedDragCoefficient || br.type == kBedChezy) {
    VHD_OMP_PARALLEL_FOR
    for (int e = 1; e <= nown; ++e) cf[e] = K[e];
  } else {
    VHD_OMP_PARALLEL_FOR
    for (int e = 1; e <= nown; ++e) {
      if (code[e] == kWet && h[e] > 0.0) cf[e] = ManningDragCoefficient(K[e], h[e]);
    }
  }
}

void CALCDRAGCOEFMANNINGSURFACE(HdModule& hd, const Array1<double>& ice_factor) {
  HdState& s = hd.state;
  const int nown = s.nelements_owned;
  const double* Ks = hd.bed.K_surface.data();
  const double* ice = ice_factor.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    s.cf_surface[e] =
        s.wetdry[e] == kWet && ice[e] > 0.0 && s.h[e] > 0.0 ? ManningDragCoefficient(Ks[e], s.h[e]) : 0.0;
  }
}

void CALCBEDSHEARSTRESS(HdModule& hd) {
  HdState& s = hd.state;
  const int nown = s.nelements_owned;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    const double u = VelocityFromFluxHD(s.wetdry[e], s.h[e], s.P[e]);
    const double v = VelocityFromFluxHD(s.wetdry[e], s.h[e], s.Q[e]);
    BedShearStressHD(s.cf[e], u, v, s.tau_x[e], s.tau_y[e]);
  }
}

double WaveLengthHD(double T, double h) {
  if (!(h > 0.0)) FatalError("Water depth <= 0.0 in WaveLengthHD");
  if (!(T > 0.0)) FatalError("Wave Period <= 0.0 in WaveLengthHD");
  const double L0 = kPhysical.g * T * T / (2.0 * std::numbers::pi);
  return L0 * std::pow(std::tanh(std::pow(2.0 * std::numbers::pi * h / L0, 0.75)), 2.0 / 3.0);
}

}  // namespace vhd
