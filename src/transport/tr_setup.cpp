// Transport module setup: the section TRANSPORT_MODULE up to its outputs.

#include <algorithm>
#include <cmath>
#include <new>
#include <string>
#include <vector>

#include "hydro/hd_setup_fields.hpp"
#include "io/setup.hpp"
#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"
#include "transport/tr_module.hpp"

namespace vhd {

namespace {

// " (key = value in path)": where a refused value was read.
std::string Where(std::string_view key, long long value) {
  return " (" + std::string(key) + " = " + std::to_string(value) + " in " + SktSectionPath() + ")";
}

[[noreturn]] void OutOfMemory(std::string_view routine) { FatalError(std::string(routine) + ": Out of memory"); }

// Opens section name inside the current one and its subsection COMPONENT_k;
// returns how many of the two were opened (the keys of an absent one keep
// their defaults).
int OpenComponentSection(std::string_view name, int k) {
  if (!OpenOptionalSectionHD(name)) return 0;
  if (SktSectionExists("COMPONENT", k)) {
    SktOpenSection("COMPONENT", k);
    return 2;
  }
  return 1;
}

void CloseSections(int n) {
  for (int i = 0; i < n; ++i) SktCloseSection();
}

// A mesh number of SPACE: the transport fields live on the meshes of the flow.
void ReadMeshNumber(std::string_view key, int& value, int flow) {
  SktReadKeyword(key, value, flow);
  if (value != flow)
    FatalError("SetupEquationTR: Type not supported for mesh" + Where(key, value) +
               "; the transport fields live on the flow's mesh " + std::to_string(flow));
}

// The record of component k; section_open: COMPONENTS is the current section.
void ReadComponent(TrComponent& c, int k, bool section_open) {
  const std::string number = std::to_string(k);
  c.name = "COMPONENT_" + number;
  c.description = "Concentration - component " + number;
  if (section_open && SktSectionExists("COMPONENT", k)) {
    SktOpenSection("COMPONENT", k);
    SktReadKeyword("name", c.name, c.name);
    SktReadKeyword("type", c.type, 2);
    SktReadKeyword("dimension", c.dimension, 3);
    SktReadKeyword("description", c.description, c.description);
    SktReadKeyword("UVQ_type", c.UVQ_type, kUvqIComponentConcentration);
    SktReadKeyword("UVQ_unit", c.UVQ_unit, kUvqUnonDim);
    SktReadKeyword("minimum_value", c.minimum_value, -1e10);
    SktReadKeyword("maximum_value", c.maximum_value, 1e10);
    if (c.type != 1 && c.type != 2)
      FatalError("SetupEquationTR: Type not supported for components" + Where("type", c.type) +
                 "; 1 kept, 2 solved");
    if (c.dimension != 2 && c.dimension != 3)
      FatalError("SetupEquationTR: Type not supported for dimension" + Where("dimension", c.dimension) +
                 "; 2 or 3");
    if (c.name.empty() || c.name.size() > 255)
      FatalError("SetupEquationTR: the name of component " + number + " in " + SktSectionPath() +
                 " must hold 1 to 255 characters");
    if (c.description.size() > 255) c.description.resize(255);
    if (!(c.minimum_value <= c.maximum_value))
      FatalError("SetupEquationTR: minimum_value is above maximum_value in " + SktSectionPath());
    SktCloseSection();
  }
  if (c.UVQ_type == kUvqIConcentration && c.UVQ_unit == kUvqUgPerM3) {
    c.UVQ_type = kUvqIComponentConcentration;
    c.UVQ_unit = kUvqUnonDim;
  }
}

// A time-varying value of water that enters or leaves (what: "precipitation",
// "evaporation", "infiltration") on the elements.
void ReadWaterConcentration(TrWaterConcentration& w, std::string_view type_key, std::string_view section,
                            const std::string& what, const std::string& format_message, const Mesh& mesh,
                            const TimeAxis& time) {
  SktReadKeyword(type_key, w.type, 1);
  if (w.type != kAdExchangeNothing && w.type != kAdExchangeValue && w.type != kAdExchangeAmbient)
    FatalError("Type not supported for " + what + Where(type_key, w.type) +
               "; 0 nothing, 1 the given value, 2 the element's concentration");
  InitDataSpec(w.data, 1);
  if (w.type != kAdExchangeValue) return;
  const bool open = OpenOptionalSectionHD(section);
  static constexpr int kFormats[] = {kDataConstant, kDataFile, kDataFileOnce, kDataFileMap};
  if (open) {
    ReadDataSpec(w.data, 1, kFormats, format_message);
    SktCloseSection();
  }
  FemDataRequest request;
  request.expect = FemDataExpect::kArea;
  request.location = FemDataLocation::kElements;
  request.mesh = &mesh;
  FemDataOpen(w.data, request, time);
}

void ReadSourceConcentration(TrSourceConcentration& s, const Mesh& mesh, const SourceRecord& hd_source,
                             const TimeAxis& time) {
  SktReadKeyword("type", s.type, 1);
  if (s.type != 1 && s.type != 2) FatalError("Type not supported for sources" + Where("type", s.type));
  static constexpr int kFormats[] = {kDataConstant, kDataFile, kDataFileOnce};
  ReadDataSpec(s.data, 1, kFormats, "SetupSourceAD: Not implemented - a source concentration is a constant (0) "
                                    "or a point series (1, 2)");
  FemDataRequest request;
  request.expect = FemDataExpect::kPoint;
  request.location = FemDataLocation::kPoints;
  request.mesh = &mesh;
  request.x = {hd_source.x};
  request.y = {hd_source.y};
  FemDataOpen(s.data, request, time);
}

// Faces of code c in the HD face list (walking order).
std::vector<int> CodeFaces(const HdBoundary& bc, int code) {
  std::vector<int> faces;
  const BoundaryCondition& b = bc.codes[code];
  for (int j = 0; j < b.nfaces; ++j) faces.push_back(bc.faces[b.first_face + j].face);
  return faces;
}

std::string CodeSection(int code, int k) {
  return "TRANSPORT_MODULE/BOUNDARY_CONDITIONS/CODE_" + std::to_string(code) + "/COMPONENT_" + std::to_string(k);
}

void ReadBoundaryCode(TrBoundaryCode& b, const HdModule& hd, const Mesh& mesh, int code) {
  SktReadKeyword("type", b.type, kTrBoundaryNone);
  switch (b.type) {
    case kTrBoundaryNone:
      break;
    case kTrBoundaryValue:
    case kTrBoundaryAlong: {
      ReadDataSpec(b.data, 1);
      const std::vector<int> faces = CodeFaces(hd.boundary, code);
      if (faces.empty()) break;
      FemDataRequest request;
      request.expect = b.type == kTrBoundaryValue ? FemDataExpect::kPoint : FemDataExpect::kLine;
      request.location = FemDataLocation::kFaces;
      request.mesh = &mesh;
      request.entities = faces;
      FemDataOpen(b.data, request, hd.time_axis);
      break;
    }
    case kTrBoundaryCyclic:
      SktReadKeyword("code_cyclic", b.code_cyclic, 0);
      break;
    default:
      FatalError("Format not supported for data input" + Where("type", b.type));
  }
}

// The partner of cyclic code `code`: code_cyclic when that is another
// cyclic code, else the first other cyclic code with as many faces; 0 when
// there is none.
template <class IsCyclic>
int CyclicPartner(const HdBoundary& bc, int code, int code_cyclic, IsCyclic is_cyclic) {
  if (code_cyclic != 0)
    return code_cyclic >= 1 && code_cyclic <= bc.ncodes && code_cyclic != code && is_cyclic(code_cyclic) ? code_cyclic
                                                                                                         : 0;
  for (int p = 1; p <= bc.ncodes; ++p)
    if (p != code && is_cyclic(p) && bc.codes[p].nfaces == bc.codes[code].nfaces) return p;
  return 0;
}

// Cyclic partners of the codes of component k, paired as the flow's (the
// solver takes the flow's pairs).
void PairCyclicTR(TrComponentData& d, const HdBoundary& bc, const Mesh& mesh, int k) {
  for (int code = 1; code <= bc.ncodes; ++code) {
    TrBoundaryCode& b = d.codes[code];
    if (b.type != kTrBoundaryCyclic) continue;
    const int partner =
        CyclicPartner(bc, code, b.code_cyclic, [&](int p) { return d.codes[p].type == kTrBoundaryCyclic; });
    if (partner == 0)
      FatalError("SetupBoundCondTR: Cyclic boundary not identified (" + CodeSection(code, k) + ", code_cyclic " +
                 std::to_string(b.code_cyclic) + ")");
    const int flow_partner = CyclicPartner(bc, code, bc.codes[code].code_cyclic,
                                           [&](int p) { return bc.codes[p].type == kBcCyclic; });
    if (partner != flow_partner)
      FatalError("SetupBoundCondTR: Cyclic boundary not identified (" + CodeSection(code, k) + " pairs code " +
                 std::to_string(code) + " with code " + std::to_string(partner) + ", the flow with code " +
                 std::to_string(flow_partner) + ")");
    const BoundaryCondition& mine = bc.codes[code];
    const BoundaryCondition& other = bc.codes[partner];
    if (mine.nfaces != other.nfaces)
      FatalError("SetupBoundCondTR: The number of faces must be the same (code " + std::to_string(code) + ": " +
                 std::to_string(mine.nfaces) + ", code " + std::to_string(partner) + ": " +
                 std::to_string(other.nfaces) + ")");
    const int n = mine.nfaces;
    for (int j = 1; j <= n; ++j) {
      const int fa = bc.faces[mine.first_face + j - 1].face;
      const int fb = bc.faces[other.first_face + n - j].face;
      const double la = FaceLengthMetres(mesh, fa), lb = FaceLengthMetres(mesh, fb);
      if (std::abs(la - lb) > 1e-6 * la)
        FatalError("SetupBoundCondTR: Length of faces must be identical (face " + std::to_string(fa) + " of code " +
                   std::to_string(code) + ": " + NumberText(la, 12) + " m, face " + std::to_string(fb) +
                   " of code " + std::to_string(partner) + ": " + NumberText(lb, 12) + " m)");
    }
    b.partner = partner;
  }
}

// HORIZONTAL_DISPERSION of the current DISPERSION/COMPONENT_k section (when
// present): the type and the scaled eddy viscosity or the coefficient, each a
// constant or a map of the mesh (the coefficient's map may vary in time).
void ReadDispersion(TrComponentData& d, const HdModule& hd, const Mesh& mesh, const TimeAxis& time) {
  AdDispersion& disp = d.dispersion;
  if (!OpenOptionalSectionHD("HORIZONTAL_DISPERSION")) return;
  SktReadKeyword("type", disp.type, kAdDispersionScaledEddy);
  const int ne = mesh.elements.nelements;
  const Array1<int>& file_index = hd.state.element_file_index;
  switch (disp.type) {
    case kAdDispersionNone:
      break;
    case kAdDispersionScaledEddy:
      if (OpenOptionalSectionHD("SCALED_EDDY_VISCOSITY")) {
        SktReadKeyword("format", disp.format, 0);
        if (disp.format == 0) {
          SktReadKeyword("sigma", disp.sigma, 1.0);
        } else if (disp.format == 2) {
          std::string file;
          int item = 1;
          SktReadFileName("file_name", file, std::string());
          SktReadKeyword("item_number", item, 1);
          if (file.empty()) FatalError("SetupDiffusion: file_name missing in " + SktSectionPath());
          ReadElementFileHD(file, item, file_index, ne, disp.field, "SetupDiffusion");
        } else {
          FatalError("Format not supported for dispersion" + Where("format", disp.format) +
                     "; 0 constant, 2 a map of the mesh");
        }
        SktCloseSection();
      }
      if (!(disp.sigma > 0.0)) FatalError("SetupDiffusion: sigma must be positive in " + SktSectionPath());
      break;
    case kAdDispersionCoefficient:
      if (OpenOptionalSectionHD("DISPERSION_COEFFICIENT")) {
        ReadElementFieldHD(d.dispersion_map, 0.01, file_index, ne, true,
                           "Format not supported for dispersion coef. (format in " + SktSectionPath() + ")",
                           "SetupDiffusion", time);
        disp.format = d.dispersion_map.format;
        disp.constant_value = d.dispersion_map.constant_value;
        if (disp.format != 0) disp.field = d.dispersion_map.values;
        SktCloseSection();
      }
      break;
    default:
      FatalError("Type not supported for dispersion" + Where("type", disp.type) +
                 "; 0 none, 1 scaled eddy viscosity, 2 dispersion coefficient");
  }
  SktReadKeyword("minimum_dispersion", disp.minimum_dispersion, 0.0);
  SktReadKeyword("maximum_dispersion", disp.maximum_dispersion, 1.0e10);
  if (!(disp.minimum_dispersion <= disp.maximum_dispersion))
    FatalError("SetupDiffusion: minimum_dispersion is above maximum_dispersion in " + SktSectionPath());
  SktCloseSection();
}

}  // namespace

void SetupSolutionMethodTR(TrModule& tr) {
  AdSolutionTechnique& s = tr.solution;
  if (!OpenOptionalSectionHD("SOLUTION_TECHNIQUE")) return;
  const AdSolutionTechnique def;
  SktReadKeyword("scheme_of_time_integration", s.scheme_of_time_integration, def.scheme_of_time_integration);
  SktReadKeyword("scheme_of_space_discretization_horizontal", s.scheme_of_space_discretization_horizontal,
                 def.scheme_of_space_discretization_horizontal);
  if (tr.ndim == 3)
    SktReadKeyword("scheme_of_space_discretization_vertical", s.scheme_of_space_discretization_vertical,
                   def.scheme_of_space_discretization_vertical);
  // Gradients serve the second order and the tangential part of the dispersion.
  SktReadKeyword("gradient_calculation", s.gradient_calculation, def.gradient_calculation);
  SktReadKeyword("gradient_limiter", s.gradient_limiter, def.gradient_limiter);
  SktReadKeyword("face_value_limiter", s.face_value_limiter, def.face_value_limiter);
  SktReadKeyword("boundary_correction", s.boundary_correction, def.boundary_correction);
  SktReadKeyword("h_min", s.h_min, def.h_min);
  if (s.scheme_of_time_integration == 2)
    SktReadKeyword("maximum_number_of_iterations", s.maximum_number_of_iterations, def.maximum_number_of_iterations);
  if (!(s.h_min >= 0.0)) FatalError("SetupSolutionMethodTR: h_min must not be negative in " + SktSectionPath());
  SktCloseSection();
}

void SetupStructureTR(TrModule& tr, const HdModule& hd, const Mesh& mesh, const TimeAxis& time,
                      const ModuleSelection& selection) {
  tr.time_axis = time;
  tr.ndim = selection.ndim;
  SktOpenSection("TRANSPORT_MODULE");
  SktReadKeyword("mode", tr.mode, 0);
  if (tr.mode != selection.tr)
    FatalError("mode is illegal (mode = " + std::to_string(tr.mode) + " in " + SktSectionPath() +
               ", mode_of_transport_module = " + std::to_string(selection.tr) + ")");
  SetupEquationTR(tr, hd, time, selection.ndim);
  SetupSolutionMethodTR(tr);
  SetupPropertyTR(tr, hd, mesh);
  SetupInitialConditionsTR(tr, hd, mesh);
  SetupBoundCondTR(tr, hd, mesh);
  SktCloseSection();

  InitTiming(tr.timing, "Transport Simulation", kTrTimerTotal);
  AddTiming(tr.timing, kTrTimerForcings, "Update forcings");
  AddTiming(tr.timing, kTrTimerSolve, "Solve Advection-Dispersion eq.");
  AddTiming(tr.timing, kTrTimerTotal, "Total");
}

void SetupEquationTR(TrModule& tr, const HdModule& hd, const TimeAxis& time, int ndim) {
  if (OpenOptionalSectionHD("EQUATION")) {
    SktReadKeyword("formulation", tr.formulation, 4);
    SktCloseSection();
  }
  if (tr.formulation != 4)
    FatalError("SetupEquationTR: Type not supported for formulation" + Where("formulation", tr.formulation) +
               "; 4, the advection-dispersion equation");

  tr.start_time_step = time.first_step;
  if (OpenOptionalSectionHD("TIME")) {
    SktReadKeyword("start_time_step", tr.start_time_step, time.first_step);
    if (tr.start_time_step < time.first_step)
      FatalError("Illegal start time step" + Where("start_time_step", tr.start_time_step));
    SktCloseSection();
  }
  tr.start_time = tr.start_time_step * time.dt;

  if (OpenOptionalSectionHD("SPACE")) {
    ReadMeshNumber("number_of_2D_mesh_geometry", tr.number_of_2D_mesh_geometry, hd.number_of_2D_mesh_geometry);
    ReadMeshNumber("number_of_2D_mesh_velocity", tr.number_of_2D_mesh_velocity, hd.number_of_2D_mesh_velocity);
    ReadMeshNumber("number_of_2D_mesh_concentration", tr.number_of_2D_mesh_concentration,
                   hd.number_of_2D_mesh_velocity);
    if (ndim == 3) {
      ReadMeshNumber("number_of_3D_mesh_geometry", tr.number_of_3D_mesh_geometry, hd.number_of_3D_mesh_geometry);
      ReadMeshNumber("number_of_3D_mesh_velocity", tr.number_of_3D_mesh_velocity, hd.number_of_3D_mesh_velocity);
      ReadMeshNumber("number_of_3D_mesh_concentration", tr.number_of_3D_mesh_concentration,
                     hd.number_of_3D_mesh_velocity);
    }
    SktCloseSection();
  }

  const bool open = OpenOptionalSectionHD("COMPONENTS");
  if (open) SktReadKeyword("number_of_components", tr.number_of_components, 1);
  if (tr.number_of_components < 1)
    FatalError("Number of components must be a positive number" +
               Where("number_of_components", tr.number_of_components));
  try {
    tr.components.assign(tr.number_of_components);
    tr.data.assign(tr.number_of_components);
  } catch (const std::bad_alloc&) {
    OutOfMemory("SetupEquationTR");
  }
  for (int k = 1; k <= tr.number_of_components; ++k) {
    ReadComponent(tr.components[k], k, open);
  }
  if (open) SktCloseSection();
  for (int k = 1; k <= tr.number_of_components; ++k) {
    const TrComponent& c = tr.components[k];
    for (int j = 1; j < k; ++j)
      if (tr.components[j].name == c.name)
        FatalError("SetupEquationTR: components " + std::to_string(j) + " and " + std::to_string(k) +
                   " have the same name \"" + c.name + "\"");
    if (ndim == 3 && c.type == 2 && c.dimension == 2) FatalError("SetupEquationTR: AD2D state variables not allowed");
    std::vector<int>& list = c.type == 1 ? (c.dimension == 2 ? tr.type1_2d : tr.type1_3d)
                                         : (c.dimension == 2 ? tr.type2_2d : tr.type2_3d);
    list.push_back(k);
  }
}

void SetupPropertyTR(TrModule& tr, const HdModule& hd, const Mesh& mesh) {
  if (hd.mode != 2) FatalError("Flow data from input not possible");
  const int ne = mesh.elements.nelements;
  const Array1<int>& file_index = hd.state.element_file_index;
  const int nsources = hd.sources.number_of_sources;
  for (int k = 1; k <= tr.number_of_components; ++k) {
    TrComponentData& d = tr.data[k];

    int opened = OpenComponentSection("DISPERSION", k);
    if (opened == 2) ReadDispersion(d, hd, mesh, tr.time_axis);
    CloseSections(opened);

    opened = OpenComponentSection("DECAY", k);
    if (opened == 2) {
      SktReadKeyword("type", d.decay_type, 0);
      if (d.decay_type != 0 && d.decay_type != 1)
        FatalError("Type not supported for decay" + Where("type", d.decay_type));
    }
    if (d.decay_type == 1) {
      ReadElementFieldHD(d.decay, 0.0, file_index, ne, true, "Format not supported for decay (format in " + SktSectionPath() + ")",
                         "SetupPropertyTR", tr.time_axis);
    } else {
      d.decay.values.assign(ne, 0.0);
    }
    CloseSections(opened);

    opened = OpenComponentSection("PRECIPITATION_EVAPORATION", k);
    d.precipitation.type = d.evaporation.type = 1;
    if (opened == 2) {
      ReadWaterConcentration(d.precipitation, "type_of_precipitation", "PRECIPITATION", "precipitation",
                             "Format not supported for precipitation", mesh, tr.time_axis);
      ReadWaterConcentration(d.evaporation, "type_of_evaporation", "EVAPORATION", "evaporation",
                             "Format not supported for evaporation", mesh, tr.time_axis);
    } else {
      InitDataSpec(d.precipitation.data, 1);
      InitDataSpec(d.evaporation.data, 1);
    }
    CloseSections(opened);

    opened = OpenComponentSection("INFILTRATION", k);
    d.infiltration.type = 1;
    if (opened == 2) {
      ReadWaterConcentration(d.infiltration, "type_of_infiltration", "INFILTRATION", "infiltration",
                             "Format not supported for infiltration.", mesh, tr.time_axis);
    } else {
      InitDataSpec(d.infiltration.data, 1);
    }
    CloseSections(opened);

    try {
      d.sources.resize(static_cast<std::size_t>(nsources));
    } catch (const std::bad_alloc&) {
      OutOfMemory("SetupSourceAD");
    }
    opened = OpenComponentSection("SOURCES", k);
    for (int i = 1; i <= nsources; ++i) {
      TrSourceConcentration& s = d.sources[static_cast<std::size_t>(i - 1)];
      const SourceRecord& hs = hd.sources.sources[static_cast<std::size_t>(i - 1)];
      if (opened == 2 && SktSectionExists("SOURCE", i)) {
        SktOpenSection("SOURCE", i);
        ReadSourceConcentration(s, mesh, hs, tr.time_axis);
        SktCloseSection();
      } else {
        InitDataSpec(s.data, 1);
      }
    }
    CloseSections(opened);
  }
}

void SetupInitialConditionsTR(TrModule& tr, const HdModule& hd, const Mesh& mesh) {
  const int ne = mesh.elements.nelements;
  for (int k = 1; k <= tr.number_of_components; ++k) {
    TrComponentData& d = tr.data[k];
    const int opened = OpenComponentSection("INITIAL_CONDITIONS", k);
    if (opened == 2) {
      SktReadKeyword("type", d.initial_type, 1);
      if (d.initial_type != 1) FatalError("Initial condition type not supported" + Where("type", d.initial_type));
      ReadElementFieldHD(d.initial, 0.0, hd.state.element_file_index, ne, false,
                         "Initial condition format not supported (format in " + SktSectionPath() + ")",
                         "SetupInitialConditionsTR", tr.time_axis);
    } else {
      d.initial.values.assign(ne, 0.0);
    }
    CloseSections(opened);
    const TrComponent& c = tr.components[k];
    d.ad.name = c.name;
    d.ad.minimum = c.minimum_value;
    d.ad.maximum = c.maximum_value;
    AllocateComponentAD(hd, d.ad);
  }
}

void SetupBoundCondTR(TrModule& tr, const HdModule& hd, const Mesh& mesh) {
  const HdBoundary& bc = hd.boundary;
  int status = 0;
  SktOpenSection("BOUNDARY_CONDITIONS", kNoIndex, &status);
  const bool have_section = status == 0;
  for (int k = 1; k <= tr.number_of_components; ++k) {
    TrComponentData& d = tr.data[k];
    try {
      d.codes.assign(bc.ncodes);
      d.ad.boundary_type.assign(bc.faces.size(), kAdBoundaryNone);
      d.ad.boundary_c.assign(bc.faces.size(), 0.0);
      int nmax = 0;
      for (int code = 1; code <= bc.ncodes; ++code) nmax = std::max(nmax, bc.codes[code].nfaces);
      d.work.assign(std::max(nmax, mesh.elements.nelements), 0.0);
    } catch (const std::bad_alloc&) {
      OutOfMemory("SetupBoundCondTR");
    }
    for (int code = 1; code <= bc.ncodes; ++code) {
      TrBoundaryCode& b = d.codes[code];
      InitDataSpec(b.data, 1);
      int opened = 0;
      if (have_section && SktSectionExists("CODE", code)) {
        SktOpenSection("CODE", code);
        opened = 1;
        if (SktSectionExists("COMPONENT", k)) {
          SktOpenSection("COMPONENT", k);
          opened = 2;
          ReadBoundaryCode(b, hd, mesh, code);
        }
      }
      CloseSections(opened);
      const int hd_type = bc.codes[code].type;
      const bool open_flow = bc.codes[code].nfaces > 0 && hd_type != kBcLand && hd_type != kBcLand2;
      if ((hd_type == kBcCyclic) != (b.type == kTrBoundaryCyclic) && bc.codes[code].nfaces > 0)
        FatalError("SetupBoundCondTR: the flow boundary of code " + std::to_string(code) + " is " +
                   (hd_type == kBcCyclic ? "cyclic" : "not cyclic") + ", the transport boundary type " +
                   std::to_string(b.type) + " of " + CodeSection(code, k) + " must " +
                   (hd_type == kBcCyclic ? "be" : "not be") + " 6 (cyclic)");
      if (!open_flow && (b.type == kTrBoundaryValue || b.type == kTrBoundaryAlong) &&
          bc.codes[code].nfaces > 0)
        Warning(CodeSection(code, k) + ": the flow boundary of code " + std::to_string(code) +
                " is land; its transport data are not used");
    }
    PairCyclicTR(d, bc, mesh, k);
    // The solver's kind of every face of the flow's face list.
    for (int code = 1; code <= bc.ncodes; ++code) {
      const BoundaryCondition& hb = bc.codes[code];
      const TrBoundaryCode& b = d.codes[code];
      // A cyclic face takes the element behind its partner face as the flow does.
      const int kind = b.type == kTrBoundaryValue || b.type == kTrBoundaryAlong ? kAdBoundaryValue : kAdBoundaryNone;
      for (int j = 0; j < hb.nfaces; ++j) d.ad.boundary_type[hb.first_face + j] = kind;
    }
  }
  if (have_section) SktCloseSection();
}

}  // namespace vhd
