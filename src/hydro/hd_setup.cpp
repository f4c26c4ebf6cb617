// HD module setup: the sections HYDRODYNAMIC_MODULE, EQUATION, SPACE,
// SOLUTION_TECHNIQUE and INITIAL_CONDITIONS, the allocation of the flow
// state, the initial state, the velocity/flux conversions and the time-step
// statistics.

#include <algorithm>
#include <cmath>
#include <string>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

[[noreturn]] void KeyError(std::string_view routine, std::string_view key, long long value,
                           std::string_view expected) {
  FatalError(std::string(routine) + ": " + std::string(key) + " = " + std::to_string(value) + " in " +
             SktSectionPath() + " is not supported (" + std::string(expected) + ")");
}

void CheckRange(std::string_view routine, std::string_view key, int value, int lo, int hi) {
  if (value < lo || value > hi) {
    KeyError(routine, key, value, std::to_string(lo) + " to " + std::to_string(hi));
  }
}

void ReadMeshIndex(std::string_view key, int& index, int nmeshes) {
  SktReadKeyword(key, index, 1);
  if (index < 1 || index > nmeshes) {
    FatalError("SetupSpaceHD: " + std::string(key) + " = " + std::to_string(index) + " in " +
               SktSectionPath() + " but the run has " + std::to_string(nmeshes) + " mesh(es)");
  }
}

// Sections of the HD module for features this build does not have. Each is
// off when every one of its switches is 0; a switch that is absent takes the
// default given.
struct FeatureSwitch {
  const char* key = nullptr;
  int def = 0;
};

struct UnavailableFeature {
  const char* section;
  const char* title;
  FeatureSwitch switches[2];
};

constexpr UnavailableFeature kUnavailableFeatures[] = {
    {"INFILTRATION", "Infiltration", {{"type", 0}}},
    {"TEMPERATURE_SALINITY_MODULE", "Temperature and salinity", {{"temperature_mode", 0}, {"salinity_mode", 0}}},
};

}  // namespace

void RefuseUnavailableFeaturesHD() {
  for (const UnavailableFeature& feature : kUnavailableFeatures) {
    if (!OpenOptionalSectionHD(feature.section)) continue;
    for (const FeatureSwitch& sw : feature.switches) {
      if (!sw.key) continue;
      const bool given = SktHasKeyword(sw.key);
      int value = sw.def;
      SktReadKeyword(sw.key, value, sw.def);
      if (value > 0) {
        FatalError("SetupHD: " + std::string(feature.title) + " is not available in this build (" + sw.key +
                   " = " + std::to_string(value) + (given ? "" : ", the default") + " in " + SktSectionPath() +
                   ")");
      }
    }
    // Switched off: its other keywords are not read.
    SktSkipSection();
    SktCloseSection();
  }
}

// ---- setup -----------------------------------------------------------------------

void SetupHD(HdModule& hd, const RunControl& run, const TimeAxis& time, const ModuleSelection& modules,
             const std::vector<Mesh>& meshes) {
  std::vector<const Mesh*> pointers;
  for (const Mesh& m : meshes) pointers.push_back(&m);
  SetupHD(hd, run, time, modules, pointers);
}

void SetupHD(HdModule& hd, const RunControl& run, const TimeAxis& time, const ModuleSelection& modules,
             const std::vector<const Mesh*>& meshes) {
  hd.overall_dt = time.dt;
  hd.time_axis = time;
  hd.process_id = run.process_id;
  hd.nprocesses = run.nprocesses;
  hd.use_gpu = !run.gpu_devices.empty();
  hd.ndim = modules.ndim;

  SktOpenSection("HYDRODYNAMIC_MODULE");
  SktReadKeyword("mode", hd.mode, 2);
  if (hd.mode != modules.hd) FatalError("mode is illegal");
  if (hd.mode < 1) {
    SktSkipSection();
    SktCloseSection();
    return;
  }
  SetupEquationHD(hd);
  if (hd.ndim == 3) {
    FatalError("SetupHD: 3D hydrodynamics is not available; this engine solves the 2D "
               "(depth-integrated) equations only - set number_of_dimensions = 2 in DOMAIN");
  }
  SetupSpaceHD(hd, meshes);
  const Mesh& mesh = *meshes[static_cast<std::size_t>(hd.number_of_2D_mesh_velocity - 1)];
  AllocateStateHD(hd, mesh);
  SetupFloodDryHD(hd);
  SetupDepthHD(hd, mesh);
  SetupEddy(hd, mesh);
  SetupBedResistanceHD(hd, mesh);
  SetupCoriolisHD(hd);
  SetupWindHD(hd);
  RefuseUnavailableFeaturesHD();
  SetupPrecipitationHD(hd, mesh);
  SetupSourcesHD(hd, mesh);
  SetupRadiationStressHD(hd, mesh);
  SetupIceHD(hd, mesh);
  SetupTideHD(hd);
  SetupSolutionMethodHD(hd);
  if (hd.mode == 2) SetupInitialConditionsHD(hd);
  SetupBoundCondHD(hd, mesh, hd.boundary);
  SetupTimingHD(hd);
  SktCloseSection();
}

int MapFormulationHD(int formulation, int ndim) {
  if (formulation == 4) return 1;
  if (ndim == 3 && formulation == 5) return 3;
  if (ndim == 3 && formulation == 6) return 2;
  return formulation;
}

void SetupEquationHD(HdModule& hd) {
  const bool open = OpenOptionalSectionHD("EQUATION");
  int formulation = 1;
  if (open) {
    SktReadKeyword("formulation", formulation, 1);
    SktReadKeyword("time_formulation", hd.time_formulation, 2);
  }
  hd.formulation = MapFormulationHD(formulation, hd.ndim);
  if (hd.ndim == 2 && hd.formulation != 1) {
    KeyError("SetupEquationHD", "formulation", formulation,
             "a 2D run solves the hydrostatic shallow-water equations: 1, or the legacy 4");
  }
  if (hd.ndim == 3 && (hd.formulation < 1 || hd.formulation > 3)) {
    KeyError("SetupEquationHD", "formulation", formulation, "1 to 6");
  }
  if (open) SktCloseSection();
}

void SetupSpaceHD(HdModule& hd, const std::vector<const Mesh*>& meshes) {
  const int n = static_cast<int>(meshes.size());
  if (n < 1) FatalError("SetupSpaceHD: the run has no mesh");
  if (OpenOptionalSectionHD("SPACE")) {
    ReadMeshIndex("number_of_2D_mesh_geometry", hd.number_of_2D_mesh_geometry, n);
    ReadMeshIndex("number_of_2D_mesh_velocity", hd.number_of_2D_mesh_velocity, n);
    ReadMeshIndex("number_of_2D_mesh_elevation", hd.number_of_2D_mesh_elevation, n);
    SktCloseSection();
  }
  const bool same = hd.number_of_2D_mesh_geometry == hd.number_of_2D_mesh_velocity &&
                    hd.number_of_2D_mesh_velocity == hd.number_of_2D_mesh_elevation;
  hd.mesh_flag = same ? 2 : 1;
  const Mesh& geometry = *meshes[static_cast<std::size_t>(hd.number_of_2D_mesh_geometry - 1)];
  hd.projection = IsGeographic(geometry.projection) ? 2 : 1;
  hd.metric_radius = hd.projection == 2 ? kPhysical.earth_radius : 1.0;
  const Mesh& velocity = *meshes[static_cast<std::size_t>(hd.number_of_2D_mesh_velocity - 1)];
  if (velocity.ndim != 2 || velocity.elements.nelements < 1) {
    FatalError("SetupSpaceHD: mesh " + std::to_string(hd.number_of_2D_mesh_velocity) +
               " (number_of_2D_mesh_velocity) is not a 2D mesh with elements");
  }
}

double CflLengthHD(const Mesh& mesh, int e) {
  const ElementTable& el = mesh.elements;
  double perimeter = 0.0;
  for (int j = 1; j <= ElementFaceCount(el, e); ++j) perimeter += FaceLengthMetres(mesh, ElementFace(el, e, j));
  return perimeter > 0.0 ? 4.0 * ElementAreaMetres(mesh, e) / perimeter : el.length[e];
}

void AllocateVelocityGradientsHD(HdState& s) {
  if (s.ux.size() == s.nelements) return;
  for (Array1<double>* a : {&s.ux, &s.uy, &s.vx, &s.vy}) a->assign(s.nelements, 0.0);
}

void AllocateStateHD(HdModule& hd, const Mesh& mesh) {
  HdState& s = hd.state;
  const ElementTable& el = mesh.elements;
  const int ne = el.nelements;
  s.nelements = ne;
  s.nelements_owned = el.nelements_int > 0 ? el.nelements_int : ne;
  s.nelements_local = hd.subdomain ? hd.subdomain->nlocal : ne;
  s.nfaces = mesh.faces.nfaces;
  s.nnodes = mesh.nodes.nnodes;
  s.element_file_index = el.file_index;

  for (Array1<double>* a : {&s.eta, &s.d, &s.h, &s.P, &s.Q, &s.u, &s.v, &s.length, &s.h_old, &s.P_old, &s.Q_old,
                            &s.cf, &s.cf_surface, &s.tau_x, &s.tau_y, &s.nu_t, &s.cfl_rate}) {
    a->assign(ne, 0.0);
  }
  if (hd.eddy.horizontal.type > 0) AllocateVelocityGradientsHD(s);
  s.wetdry.assign(ne, kWet);
  s.wetdry_old.assign(ne, kWet);
  s.face_flux_len.assign(s.nfaces, 0.0);
  s.face_d.assign(s.nfaces, 0.0);
  s.z_node.assign(s.nnodes, 0.0);
  hd.flood_dry.mass_cut.assign(ne, 0.0);

  const bool has_metric = el.cos_lat.size() >= ne && el.tan_lat.size() >= ne;
  if (hd.projection == 2) {
    s.cos_lat.assign(ne, 1.0);
    s.tan_lat.assign(ne, 0.0);
  }
  for (int e = 1; e <= ne; ++e) {
    s.d[e] = -el.zc[e];
    s.length[e] = CflLengthHD(mesh, e);
    if (hd.projection == 2 && has_metric) {
      s.cos_lat[e] = el.cos_lat[e];
      s.tan_lat[e] = el.tan_lat[e];
    }
    s.eta[e] = 0.0;
    s.h[e] = s.d[e];
  }
  for (int n = 1; n <= s.nnodes; ++n) s.z_node[n] = mesh.nodes.z[n];
  for (int f = 1; f <= s.nfaces; ++f) {
    const int e1 = mesh.faces.element1[f];
    const int e2 = mesh.faces.element2[f];
    s.face_d[f] = e2 > 0 ? 0.5 * (s.d[e1] + s.d[e2]) : s.d[e1];
  }
}

void SetupSolutionMethodHD(HdModule& hd) {
  static constexpr const char* kWho = "SetupSolutionMethodHD";
  HdSolutionTechnique& st = hd.solution;
  HdTimeStepControl& tc = hd.time_step;
  const bool open = OpenOptionalSectionHD("SOLUTION_TECHNIQUE");
  // Without the section every key takes its default (the readers below are
  // only called with the section open).
  auto read_int = [&](std::string_view key, int& value, int def) {
    value = def;
    if (open) SktReadKeyword(key, value, def);
  };
  auto read_bool = [&](std::string_view key, bool& value, bool def) {
    value = def;
    if (open) SktReadKeyword(key, value, def);
  };
  auto read_double = [&](std::string_view key, double& value, double def) {
    value = def;
    if (open) SktReadKeyword(key, value, def);
  };

  read_int("scheme_of_time_integration", st.scheme_of_time_integration, 1);
  CheckRange(kWho, "scheme_of_time_integration", st.scheme_of_time_integration, 1, 2);
  read_int("scheme_of_space_discretization_horizontal", st.scheme_of_space_discretization_horizontal, 1);
  CheckRange(kWho, "scheme_of_space_discretization_horizontal", st.scheme_of_space_discretization_horizontal,
             1, 2);
  const bool second = st.scheme_of_space_discretization_horizontal == 2;

  // Presets of the reconstruction for the order chosen.
  st.gradient_calculation = 2;
  st.gradient_limiter = 0;
  st.face_value_limiter = second ? 2 : 0;
  st.boundary_correction = 1;
  st.preserve_dU = second;
  st.face_average_d = second ? 1 : 0;
  st.face_limit_dry = second;
  if (second) {
    read_int("gradient_calculation", st.gradient_calculation, st.gradient_calculation);
    read_int("gradient_limiter", st.gradient_limiter, st.gradient_limiter);
    read_int("face_value_limiter", st.face_value_limiter, st.face_value_limiter);
    read_int("boundary_correction", st.boundary_correction, st.boundary_correction);
    read_bool("preserve_dU", st.preserve_dU, st.preserve_dU);
    read_int("face_average_d", st.face_average_d, st.face_average_d);
    read_bool("face_limit_dry", st.face_limit_dry, st.face_limit_dry);
  } else if (hd.ice_type >= 2) {
    read_int("gradient_limiter", st.gradient_limiter, st.gradient_limiter);
    read_int("boundary_correction", st.boundary_correction, st.boundary_correction);
  }
  CheckRange(kWho, "gradient_calculation", st.gradient_calculation, 1, 3);
  CheckRange(kWho, "gradient_limiter", st.gradient_limiter, 0, 3);
  CheckRange(kWho, "face_value_limiter", st.face_value_limiter, 0, 3);
  CheckRange(kWho, "boundary_correction", st.boundary_correction, 1, 2);
  CheckRange(kWho, "face_average_d", st.face_average_d, 0, 2);
  st.s_blend = second ? 1.0 : 0.0;

  st.type_of_filtering = 0;
  st.filtering_coefficient = 0.01;
  if (second) {
    read_int("type_of_filtering", st.type_of_filtering, 0);
    CheckRange(kWho, "type_of_filtering", st.type_of_filtering, 0, 1);
    if (st.type_of_filtering > 0) read_double("filtering_coefficient", st.filtering_coefficient, 0.01);
  }
  read_int("type_of_Riemann_solver", st.type_of_Riemann_solver, 1);
  CheckRange(kWho, "type_of_Riemann_solver", st.type_of_Riemann_solver, 0, 4);
  st.type_of_entropy_fix = 1;
  if (st.type_of_Riemann_solver == 1) {
    read_int("type_of_entropy_fix", st.type_of_entropy_fix, 1);
    CheckRange(kWho, "type_of_entropy_fix", st.type_of_entropy_fix, 0, 1);
  }
  const int fd = hd.flood_dry.type;
  const bool fd_corrected = fd == 1 || fd == 3;
  read_int("bed_resistance_discretization", st.bed_resistance_discretization, fd_corrected ? 2 : 1);
  CheckRange(kWho, "bed_resistance_discretization", st.bed_resistance_discretization, 1, 2);
  read_int("type_of_land_condition", st.type_of_land_condition, 2);
  CheckRange(kWho, "type_of_land_condition", st.type_of_land_condition, 1, 2);

  // Time-step control.
  const double dt_min_default = std::min(0.01, hd.overall_dt / 100.0);
  read_double("CFL_critical_HD", tc.CFL_critical_HD, 1.0);
  read_double("dt_min_HD", tc.dt_min_HD, dt_min_default);
  read_double("dt_max_HD", tc.dt_max_HD, hd.overall_dt);
  read_int("CFL_correction_HD", tc.CFL_correction_HD, fd_corrected ? 1 : 0);
  read_double("CFL_critical_AD", tc.CFL_critical_AD, 1.0);
  read_double("dt_min_AD", tc.dt_min_AD, dt_min_default);
  read_double("dt_max_AD", tc.dt_max_AD, hd.overall_dt);
  read_double("CFL_critical_substeps_AD", tc.CFL_critical_substeps_AD, 0.8);
  read_int("error_level", tc.error_level, 0);
  read_int("maximum_number_of_errors", tc.maximum_number_of_errors, 200);
  CheckRange(kWho, "CFL_correction_HD", tc.CFL_correction_HD, 0, 1);
  CheckRange(kWho, "error_level", tc.error_level, 0, 2);
  auto positive = [&](std::string_view key, double value) {
    if (!(value > 0.0)) {
      FatalError(std::string(kWho) + ": " + std::string(key) + " = " + NumberText(value) + " in " +
                 (open ? SktSectionPath() : std::string("SOLUTION_TECHNIQUE")) + " must be greater than 0");
    }
  };
  positive("CFL_critical_HD", tc.CFL_critical_HD);
  positive("dt_min_HD", tc.dt_min_HD);
  positive("CFL_critical_AD", tc.CFL_critical_AD);
  positive("dt_min_AD", tc.dt_min_AD);
  if (tc.dt_max_HD < tc.dt_min_HD) {
    FatalError(std::string(kWho) + ": dt_max_HD (" + NumberText(tc.dt_max_HD) +
               ") is smaller than dt_min_HD (" + NumberText(tc.dt_min_HD) + ")");
  }
  if (tc.dt_max_AD < tc.dt_min_AD) {
    FatalError(std::string(kWho) + ": dt_max_AD (" + NumberText(tc.dt_max_AD) +
               ") is smaller than dt_min_AD (" + NumberText(tc.dt_min_AD) + ")");
  }

  if (hd.use_gpu) {
    read_int("dynamic_list", st.dynamic_list, 1);
    if (hd.formulation == 2 || hd.formulation == 3) {
      FatalError("Non-hydrostatic Navier Stokes equations can not bw used with GPU");
    }
    if (st.gradient_calculation == 1) FatalError("This type of gradient calculation is not available using GPU");
    if (st.gradient_limiter >= 1 && st.gradient_limiter <= 3) {
      FatalError("This type of gradient limiter is not available using GPU");
    }
    if (st.face_value_limiter == 1 || st.face_value_limiter == 3) {
      FatalError("This type of face value limiter is not available using GPU");
    }
    if (st.boundary_correction == 2) FatalError("This type of boundary correction is not available using GPU");
    if (st.type_of_Riemann_solver == 0 || st.type_of_Riemann_solver == 2 || st.type_of_Riemann_solver == 3) {
      FatalError("This type of Riemann solver is not available using GPU");
    }
  }
  if (open) SktCloseSection();
}

void SetupInitialConditionsHD(HdModule& hd) {
  HdInitialConditions& ic = hd.initial;
  if (!OpenOptionalSectionHD("INITIAL_CONDITIONS")) return;
  SktReadKeyword("type", ic.type, 0);
  switch (ic.type) {
    case 0:
      break;
    case 1:
      SktReadKeyword("surface_elevation_constant", ic.surface_elevation_constant, 0.0);
      SktReadKeyword("u_velocity_constant", ic.u_velocity_constant, 0.0);
      SktReadKeyword("v_velocity_constant", ic.v_velocity_constant, 0.0);
      break;
    case 2:
      SktReadFileName("file_name_2d", ic.file_name_2d, std::string());
      SktReadKeyword("surface_elevation_item_no", ic.surface_elevation_item_no, 1);
      break;
    case 3:
      SktReadFileName("file_name_2d", ic.file_name_2d, std::string());
      SktReadKeyword("total_water_depth_item_no", ic.total_water_depth_item_no, 1);
      SktReadKeyword("still_water_depth_item_no", ic.still_water_depth_item_no, 0);
      SktReadKeyword("u_velocity_item_no", ic.u_velocity_item_no, 2);
      SktReadKeyword("v_velocity_item_no", ic.v_velocity_item_no, 3);
      break;
    default:
      FatalError("Type not supported for initial conditions");
  }
  if ((ic.type == 2 || ic.type == 3) && ic.file_name_2d.empty()) {
    FatalError("SetupInitialConditionsHD: file_name_2d missing in " + SktSectionPath());
  }
  SktCloseSection();
}

// ---- initial state -------------------------------------------------------------------

void InitialiseStateHD(HdModule& hd, const Mesh& mesh) {
  static constexpr const char* kWho = "InitialiseStateHD";
  HdState& s = hd.state;
  const HdInitialConditions& ic = hd.initial;
  const int ne = s.nelements;

  for (int e = 1; e <= ne; ++e) {
    s.eta[e] = 0.0;
    s.u[e] = 0.0;
    s.v[e] = 0.0;
  }
  if (ic.type == 1) {
    for (int e = 1; e <= ne; ++e) {
      s.eta[e] = ic.surface_elevation_constant;
      s.u[e] = ic.u_velocity_constant;
      s.v[e] = ic.v_velocity_constant;
    }
  } else if (ic.type == 2) {
    ReadElementFileHD(ic.file_name_2d, ic.surface_elevation_item_no, s.element_file_index, ne, s.eta, kWho);
  } else if (ic.type == 3) {
    ZrnFile file;
    ZrnOpenInput(file, ic.file_name_2d);
    const Array1<int>& order = s.element_file_index;
    Array1<double> scratch;
    ReadElementItemHD(file, ic.total_water_depth_item_no, 0, order, ne, s.h, scratch, kWho);
    if (ic.still_water_depth_item_no > 0) {
      ReadElementItemHD(file, ic.still_water_depth_item_no, 0, order, ne, s.d, scratch, kWho);
    }
    ReadElementItemHD(file, ic.u_velocity_item_no, 0, order, ne, s.u, scratch, kWho);
    ReadElementItemHD(file, ic.v_velocity_item_no, 0, order, ne, s.v, scratch, kWho);
    zrnFileClose(file);
    zrnHeaderDestroy(file);
    if (ic.still_water_depth_item_no > 0) {
      for (int f = 1; f <= s.nfaces; ++f) {
        const int e1 = mesh.faces.element1[f];
        const int e2 = mesh.faces.element2[f];
        s.face_d[f] = e2 > 0 ? 0.5 * (s.d[e1] + s.d[e2]) : s.d[e1];
      }
    }
    int negative = 0;
    for (int e = 1; e <= ne; ++e) {
      if (s.h[e] < 0.0) {
        ++negative;
        s.h[e] = 0.0;
      }
      s.eta[e] = s.h[e] - s.d[e];
    }
    if (negative > 0) {
      Warning(std::string(kWho) + ": " + std::to_string(negative) + " negative total water depth(s) in " +
              ZrnLogName(ic.file_name_2d) + " set to 0");
    }
  }
  // A surface below the bed means no water: the surface is put on the bed, so
  // that h = eta + d >= 0 holds in every element.
  for (int e = 1; e <= ne; ++e) {
    if (s.eta[e] + s.d[e] < 0.0) s.eta[e] = -s.d[e];
    s.h[e] = s.eta[e] + s.d[e];
  }
  CALCFLUXFROMVELOCITY(s);
  InitialFloodDryCodesHD(hd, mesh);
  if (hd.flood_dry.type > 0) CHECKFLOODDRYHD(hd, mesh);
  CALCVELOCITYFROMFLUX(s);

  double highest = -1e300;
  for (int e = 1; e <= s.nelements_owned; ++e) highest = std::max({highest, s.eta[e], -s.d[e]});
  hd.flood_dry.elevation_limit = highest + hd.flood_dry.elevation_margin;
  for (int e = 1; e <= ne; ++e) {
    s.h_old[e] = s.h[e];
    s.P_old[e] = s.P[e];
    s.Q_old[e] = s.Q[e];
  }
}

// ---- velocity and flux ---------------------------------------------------------------
// These run over every element, halo included: each element's values follow
// from its own h, P, Q (exchanged between processes), so the halo velocities
// that gradient stencils read stay current without a further exchange.

void CALCVELOCITYFROMFLUX(HdState& s) {
  CALCVELOCITYFROMFLUXCOMPONENT(s, 1);
  CALCVELOCITYFROMFLUXCOMPONENT(s, 2);
}

void CALCFLUXFROMVELOCITY(HdState& s) {
  CALCFLUXFROMVELOCITYCOMPONENT(s, 1);
  CALCFLUXFROMVELOCITYCOMPONENT(s, 2);
}

void CALCVELOCITYFROMFLUXCOMPONENT(HdState& s, int component) {
  const double* flux = component == 1 ? s.P.data() : s.Q.data();
  double* vel = component == 1 ? s.u.data() : s.v.data();
  const double* h = s.h.data();
  const int* code = s.wetdry.data();
  const int ne = s.nelements;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) vel[e] = VelocityFromFluxHD(code[e], h[e], flux[e]);
}

void CALCFLUXFROMVELOCITYCOMPONENT(HdState& s, int component) {
  double* flux = component == 1 ? s.P.data() : s.Q.data();
  const double* vel = component == 1 ? s.u.data() : s.v.data();
  const double* h = s.h.data();
  const int ne = s.nelements;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= ne; ++e) flux[e] = vel[e] * h[e];
}

// ---- statistics and timings -------------------------------------------------------------

void RecordTimeStepHD(HdModule& hd, double dt) {
  if (hd.n_steps == 0) {
    hd.dt_smallest = dt;
    hd.dt_largest = dt;
  } else {
    hd.dt_smallest = std::min(hd.dt_smallest, dt);
    hd.dt_largest = std::max(hd.dt_largest, dt);
  }
  ++hd.n_steps;
  hd.dt_last = dt;
  hd.dt_sum += dt;
}

void PrintTimeStepStatisticsHD(const HdModule& hd) {
  const double average = hd.n_steps > 0 ? hd.dt_sum / static_cast<double>(hd.n_steps) : 0.0;
  WriteLogLine("");
  WriteBanner("HD Time Step Statistics");
  WriteValueLine("Number of time steps  : %", hd.n_steps);
  WriteValueLine("Minimum time step (s) : %", hd.dt_smallest);
  WriteValueLine("Maximum time step (s) : %", hd.dt_largest);
  WriteValueLine("Average time step (s) : %", average);
  WriteBanner("");
}

void SetupTimingHD(HdModule& hd) {
  InitTiming(hd.timing, "Hydrodynamics", kHdTimerCount);
  AddTiming(hd.timing, kHdTimerForcings, "Forcings and boundary values");
  AddTiming(hd.timing, kHdTimerProperties, "Bed resistance and eddy viscosity");
  AddTiming(hd.timing, kHdTimerDerivatives, "Fluxes and derivatives");
  AddTiming(hd.timing, kHdTimerUpdate, "Element update");
  AddTiming(hd.timing, kHdTimerFloodDry, "Flood and dry");
  AddTiming(hd.timing, kHdTimerTotal, "Total");
}

}  // namespace vhd
