// Setup of the sand-transport module: its sections, the allocation on the
// HD velocity mesh and the statistics block.

#include <string>

#include "hydro/hd_setup_fields.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "sediment/st_module.hpp"

namespace vhd {

namespace {

std::string Number(double value) { return SubstituteValue("%", value); }

// "SetupBedLoadST: porosity = 1 in VantorHD/.../SEDIMENT_DATA must be ..."
[[noreturn]] void KeyError(std::string_view routine, std::string_view key, const std::string& value,
                           std::string_view expected) {
  FatalError(std::string(routine) + ": " + std::string(key) + " = " + value + " in " + SktSectionPath() + " " +
             std::string(expected));
}

void ReadCode(std::string_view routine, std::string_view key, int& value, int def, int lo, int hi) {
  SktReadKeyword(key, value, def);
  if (value < lo || value > hi)
    KeyError(routine, key, std::to_string(value),
             "is not supported (" + std::to_string(lo) + " to " + std::to_string(hi) + ")");
}

void ReadPositive(std::string_view routine, std::string_view key, double& value, double def) {
  SktReadKeyword(key, value, def);
  if (!(value > 0.0)) KeyError(routine, key, Number(value), "must be greater than 0");
}

void ReadNonNegative(std::string_view routine, std::string_view key, double& value, double def) {
  SktReadKeyword(key, value, def);
  if (!(value >= 0.0)) KeyError(routine, key, Number(value), "must not be negative");
}

// Opens an optional section inside the current one; absent, its keys take
// their defaults (and are logged as such) with the parent section current.
bool OpenOptional(std::string_view name) {
  if (!SktSectionExists(name)) return false;
  SktOpenSection(name);
  return true;
}

}  // namespace

void SetupSedimentDataST(StModule& st, const Mesh& mesh) {
  constexpr std::string_view kWho = "SetupSedimentDataST";
  const bool open = OpenOptional("SEDIMENT_DATA");
  SktReadKeyword("format", st.grain_format, 0);
  if (st.grain_format != 0 && st.grain_format != 2)
    FatalError("Format not supported for grain diameter: format = " + std::to_string(st.grain_format) + " in " +
               SktSectionPath() + " (0 constant, 2 mesh data file)");
  const int ne = mesh.elements.nelements;
  if (st.grain_format == 0) {
    ReadPositive(kWho, "grain_diameter", st.grain_diameter, 2e-4);
    st.grain.assign(ne, st.grain_diameter);
  } else {
    SktReadFileName("file_name", st.grain_file, std::string());
    SktReadKeyword("item_number_for_grain_diameter", st.grain_item, 1);
    if (st.grain_file.empty()) FatalError(std::string(kWho) + ": file_name missing in " + SktSectionPath());
    ReadElementFileHD(st.grain_file, st.grain_item, mesh.elements.file_index, ne, st.grain, kWho);
    for (int e = 1; e <= ne; ++e) {
      if (st.grain[e] > 0.0) continue;
      FatalError(std::string(kWho) + ": file " + ZrnLogName(st.grain_file) + ", item " +
                 std::to_string(st.grain_item) + ": the grain diameter of element " +
                 std::to_string(FileIndex(mesh.elements.file_index, e)) + " is " + Number(st.grain[e]) +
                 "; it must be greater than 0");
    }
  }
  SktReadKeyword("relative_density", st.bed_load.relative_density, 2.65);
  if (!(st.bed_load.relative_density > 1.0))
    KeyError(kWho, "relative_density", Number(st.bed_load.relative_density), "must be greater than 1");
  SktReadKeyword("porosity", st.porosity, 0.4);
  if (!(st.porosity >= 0.0 && st.porosity < 1.0))
    KeyError(kWho, "porosity", Number(st.porosity), "must be at least 0 and less than 1");
  if (open) SktCloseSection();
}

void SetupBedLoadST(StModule& st) {
  constexpr std::string_view kWho = "SetupBedLoadST";
  const bool open = OpenOptional("BED_LOAD");
  BedLoadSettings& b = st.bed_load;
  SktReadKeyword("bed_load_formula", b.formula, 1);
  if (b.formula < kBedLoadEngelundHansen || b.formula > kBedLoadMeyerPeterMueller)
    Warning("bed_load_formula = " + std::to_string(b.formula) + " in " + SktSectionPath() +
            " selects none of the formulas 1 to 4: there is no bed load");
  ReadNonNegative(kWho, "bed_load_factor", b.factor, 1.0);
  ReadNonNegative(kWho, "streamwise_bedslope_factor", b.streamwise_slope_factor, 5.0);
  ReadNonNegative(kWho, "transverse_bedslope_factor", b.transverse_slope_factor, 1.25);
  ReadNonNegative(kWho, "transverse_bedslope_exponent", b.transverse_slope_exponent, 0.5);
  ReadPositive(kWho, "critical_shields_parameter", b.critical_shields, 0.047);
  if (open) SktCloseSection();
}

void SetupHelicalFlowST(StModule& st) {
  constexpr std::string_view kWho = "SetupHelicalFlowST";
  const bool open = OpenOptional("HELICAL_FLOW");
  ReadCode(kWho, "type", st.helical_flow, 0, 0, 1);
  if (st.helical_flow == 1) ReadNonNegative(kWho, "coefficient", st.helical_coefficient, 7.0);
  if (open) SktCloseSection();
}

void SetupMorphologyST(StModule& st) {
  constexpr std::string_view kWho = "SetupMorphologyST";
  const bool open = OpenOptional("MORPHOLOGY");
  ReadCode(kWho, "type", st.morphology, 1, 0, 1);
  if (st.morphology == 1) {
    ReadNonNegative(kWho, "morphological_factor", st.morphological_factor, 1.0);
    ReadNonNegative(kWho, "start_time", st.start_time, 0.0);
  }
  if (open) SktCloseSection();
}

void AllocateST(StModule& st, const HdModule& hd, const Mesh& mesh) {
  const HdState& s = hd.state;
  st.nelements = s.nelements;
  st.nowned = s.nelements_owned;
  st.nlocal = s.nelements_local;
  st.nfaces = s.nfaces;
  st.subdomain = hd.subdomain;
  const int ne = st.nelements;
  for (Array1<double>* a : {&st.qx, &st.qy, &st.sl, &st.st, &st.tan_delta, &st.depth_x, &st.depth_y, &st.dz,
                            &st.bed_change, &st.area})
    a->assign(ne, 0.0);
  if (st.grain.size() != ne) st.grain.assign(ne, st.grain_diameter);
  const double density = st.bed_load.relative_density;
  st.grain_terms_constant = BedLoadGrainOf(st.grain_diameter, density);
  if (st.grain_format == 2) {
    st.grain_terms.assign(ne, BedLoadGrain{});
    for (int e = 1; e <= ne; ++e) st.grain_terms[e] = BedLoadGrainOf(st.grain[e], density);
  }
  if (st.helical_flow == 1)
    for (Array1<double>* a : {&st.ux, &st.uy, &st.vx, &st.vy}) a->assign(ne, 0.0);
  for (int e = 1; e <= ne; ++e) st.area[e] = mesh.elements.area[e];
  st.face_q.assign(st.nfaces, 0.0);
  SetupGradient(mesh, 2, {}, {}, 2, kBoundaryMirror, 0, st.stencil);
  st.n_updates = 0;
}

void SetupTimingST(StModule& st) {
  InitTiming(st.timing, "ST", kStTimerCount);
  AddTiming(st.timing, kStTimerInputs, "Slopes and helical flow");
  AddTiming(st.timing, kStTimerBedLoad, "Bed load");
  AddTiming(st.timing, kStTimerBedUpdate, "Bed update");
  AddTiming(st.timing, kStTimerTotal, "Total ST");
}

void SetupST(StModule& st, const HdModule& hd, const Mesh& mesh) {
  if (hd.projection == 2)
    FatalError("SetupST: the sand transport module needs a mesh in projected coordinates; the mesh is "
               "geographic (LONG/LAT)");
  SetupSedimentDataST(st, mesh);
  SetupBedLoadST(st);
  SetupHelicalFlowST(st);
  SetupMorphologyST(st);
  AllocateST(st, hd, mesh);
  SetupTimingST(st);
}

double BedVolumeChangeST(const StModule& st, const RunControl& run) {
  ExactSum total;
  for (int e = 1; e <= st.nowned; ++e) total += st.bed_change[e] * st.area[e];
  total.SumOverProcesses(run);
  return total.Value();
}

void PrintStatisticsST(const StModule& st, const RunControl& run) {
  const double volume = BedVolumeChangeST(st, run);
  WriteBanner("Sand transport statistics");
  WriteValueLine("Bed updates            : %", st.n_updates);
  WriteValueLine("Bed volume change (m3) : %", volume);
}

}  // namespace vhd
