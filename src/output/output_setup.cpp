// Reading of the OUTPUTS section and the setup of each output's domain.

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <limits>
#include <sstream>

#include "io/setup.hpp"
#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/interpolation.hpp"
#include "mesh/reorder.hpp"
#include "output/output_spec.hpp"

namespace vhd {

namespace {

constexpr double kRadToDeg = 57.29577951308232;

std::string Where(const OutputSpec& spec) { return " (section " + spec.section + ")"; }

// Bounding box of the nodes in setup-file coordinates.
void MeshBox(const Mesh& mesh, double& xmin, double& xmax, double& ymin, double& ymax) {
  xmin = ymin = std::numeric_limits<double>::max();
  xmax = ymax = std::numeric_limits<double>::lowest();
  for (int n = 1; n <= mesh.nodes.nnodes; ++n) {
    xmin = std::min(xmin, mesh.nodes.x[n]);
    xmax = std::max(xmax, mesh.nodes.x[n]);
    ymin = std::min(ymin, mesh.nodes.y[n]);
    ymax = std::max(ymax, mesh.nodes.y[n]);
  }
  xmin = FromMeshCoordinate(mesh, xmin);
  xmax = FromMeshCoordinate(mesh, xmax);
  ymin = FromMeshCoordinate(mesh, ymin);
  ymax = FromMeshCoordinate(mesh, ymax);
}

void EnsureTree(OutputList& list, const Mesh& mesh) {
  if (list.have_tree) return;
  BuildSearchTree2D(mesh, list.tree);
  list.have_tree = true;
}

// Element that holds (x, y), 0 when none does.
int FindMeshElement(const OutputList& list, const Mesh& mesh, double x, double y) {
  return FindElementID2DSearchTree(x, y, mesh, list.tree);
}

int CountInside(const std::vector<OutputPoint>& points) {
  int n = 0;
  for (const auto& p : points) n += p.element > 0 ? 1 : 0;
  return n;
}

std::string Coordinates(const Mesh& mesh, double x, double y) {
  return NumberText(FromMeshCoordinate(mesh, x), 14) + " " + NumberText(FromMeshCoordinate(mesh, y), 14);
}

void ReadRequiredDouble(const std::string& routine, std::string_view key, double& value) {
  int flag = 0;
  SktReadKeyword(key, value, std::nullopt, SktArg{1, 1, &flag});
  if (flag != 0)
    FatalError(routine + ": keyword " + std::string(key) + " missing in section " + SktSectionPath());
}

// The polyline of a LINE section (first and last point, or a point file).
void ReadLinePolyline(const Mesh& mesh, bool sampled, int& npoints, std::vector<double>& x, std::vector<double>& y) {
  int input_format = 1;
  SktReadKeyword("input_format", input_format, 1);
  if (sampled) SktReadKeyword("npoints", npoints, 2);
  x.clear();
  y.clear();
  if (input_format == 1) {
    double xf = 0, yf = 0, xl = 0, yl = 0;
    ReadRequiredDouble("SetupLineDomain", "x_first", xf);
    ReadRequiredDouble("SetupLineDomain", "y_first", yf);
    ReadRequiredDouble("SetupLineDomain", "x_last", xl);
    ReadRequiredDouble("SetupLineDomain", "y_last", yl);
    x = {ToMeshCoordinate(mesh, xf), ToMeshCoordinate(mesh, xl)};
    y = {ToMeshCoordinate(mesh, yf), ToMeshCoordinate(mesh, yl)};
  } else if (input_format == 2) {
    int number_of_points = 0;
    SktReadKeyword("number_of_points", number_of_points, 0);
    std::string file;
    int flag = 0;
    SktReadFileName("input_file_name", file, std::nullopt, SktArg{1, 1, &flag});
    if (flag != 0) FatalError("SetupLineDomain: keyword input_file_name missing in section " + SktSectionPath());
    ReadPointFile("SetupLineDomain", file, x, y);
    if (number_of_points > 0) {
      if (static_cast<int>(x.size()) < number_of_points)
        FatalError("SetupLineDomain: Too few points on line - " + file + " holds " + std::to_string(x.size()) +
                   " points, number_of_points is " + std::to_string(number_of_points));
      x.resize(static_cast<std::size_t>(number_of_points));
      y.resize(static_cast<std::size_t>(number_of_points));
    }
    for (std::size_t k = 0; k < x.size(); ++k) {
      x[k] = ToMeshCoordinate(mesh, x[k]);
      y[k] = ToMeshCoordinate(mesh, y[k]);
    }
  } else {
    FatalError("SetupLineDomain: input_format must be 1 (first and last point) or 2 (point file), section " +
               SktSectionPath() + " gives " + std::to_string(input_format));
  }
  if (x.size() < 2 || (sampled && npoints < 2)) FatalError("SetupLineDomain: Too few points on line");
}

void SetupDischargeDomain(OutputSpec& spec, const Mesh& mesh, const OutputList& list) {
  if (spec.file_kind != 0 && spec.file_kind != -1) FatalError("SetupLineDomain: Wrong file type");
  SktOpenSection("LINE");
  int npoints = 0;
  std::vector<double> x, y;
  ReadLinePolyline(mesh, false, npoints, x, y);
  SktCloseSection();
  (void)list;
  MeshSection& s = spec.discharge.section;
  SetupSection2D(mesh, x, y, s);
  s.x = x;
  s.y = y;
  const int n = s.faces.size();
  WriteLogLine("");
  WriteLogLine("  Discharge Output Information");
  WriteLogLine("    From                : " + Coordinates(mesh, x.front(), y.front()));
  WriteLogLine("    To                  : " + Coordinates(mesh, x.back(), y.back()));
  WriteValueLine("  Faces in section    : %", n);
}

void ReadDischargeItems(OutputSpec& spec) {
  SktOpenSection("DISCHARGE");
  static const struct {
    const char* key;
    const char* name;
    int code;
    int value_type;
    bool def;
  } kItems[] = {
      {"DISCHARGE", "Discharge", kDischarge, kZrnInstantaneous, true},
      {"ACCUMULATED_DISCHARGE", "Accumulated discharge", kDischargeAccumulated, kZrnAccumulated, true},
      {"POSITIVE_ACCUMULATED_DISCHARGE", "Positive accumulated discharge", kDischargePositive, kZrnAccumulated,
       false},
      {"NEGATIVE_ACCUMULATED_DISCHARGE", "Negative accumulated discharge", kDischargeNegative, kZrnAccumulated,
       false},
  };
  for (const auto& it : kItems) {
    bool on = it.def;
    SktReadKeyword(it.key, on, it.def);
    if (!on) continue;
    OutputItem item;
    item.code = it.code;
    item.name = it.name;
    item.item_type = it.code == kDischarge ? kUvqIDischarge : kUvqIVolume;
    item.unit = it.code == kDischarge ? kUvqUm3PerSec : kUvqUm3;
    item.value_type = it.value_type;
    spec.items.push_back(item);
  }
  SktCloseSection();
}

void BudgetItems(OutputSpec& spec) {
  const MassBudgetSpec& b = spec.budget;
  for (std::size_t c = 0; c < b.components.size(); ++c) {
    for (int k = 1; k <= kBudgetItems; ++k) {
      if (b.item_flags[static_cast<std::size_t>(k - 1)] != 1) continue;
      OutputItem item;
      item.code = static_cast<int>(c) * 100 + k;
      item.name = std::string(BudgetItemLabel(k)) + b.components[c].name;
      item.item_type = b.components[c].index == 0 ? kUvqIVolume : kUvqIMass;
      item.unit = b.components[c].index == 0 ? kUvqUm3 : kUvqUkilogram;
      item.value_type = k >= kBudgetTransport && k <= kBudgetDefect ? kZrnAccumulated : kZrnInstantaneous;
      spec.items.push_back(item);
    }
  }
}

void ReadOutput(OutputSpec& spec, OutputList& list, const OutputModuleInfo& info, const Mesh& mesh,
                const RunControl& run, const TimeAxis& time) {
  const std::string routine = "SpecOutputFile" + info.module;
  int flag = 0;
  SktReadFileName("file_name", spec.file_name, std::nullopt, SktArg{1, 1, &flag});
  if (flag != 0) FatalError(routine + ": keyword file_name missing in section " + spec.section);
  SktReadKeyword("title", spec.title, std::string());
  if (spec.title.size() > 40) spec.title.resize(40);
  SktReadKeyword("type", spec.type, 1);
  SktReadKeyword("format", spec.format, 2);
  SktReadKeyword("delete_value", spec.delete_value, 1e-35);
  spec.file_kind = zrnFileKind(spec.file_name);
  if (spec.file_kind == 2 || spec.file_kind == 3) SktReadKeyword("land_value", spec.land_value, 10.0);
  SktReadKeyword("flood_and_dry", spec.flood_and_dry, 1);
  if (run.nprocesses > 1 && spec.file_kind == 4 && (spec.format == 2 || spec.format == 3))
    SktReadKeyword("ordering", spec.ordering, 2);
  else
    spec.ordering = 1;
  SktReadKeyword("precision", spec.precision, 2);
  SktReadKeyword("first_time_step", spec.first_time_step, time.first_step);
  SktReadKeyword("last_time_step", spec.last_time_step, time.last_step);
  SktReadKeyword("time_step_frequency", spec.time_step_frequency, 1);
  SktReadKeyword("number_of_variables", spec.number_of_variables, 0);
  if (spec.number_of_variables > 0)
    SktReadKeyword("type_of_variables", spec.type_of_variables, spec.number_of_variables,
                   std::vector<int>(static_cast<std::size_t>(spec.number_of_variables), 0));
  SktReadKeyword("interpolation_type", spec.interpolation_type, 1);
  if (spec.interpolation_type != 1) SktReadKeyword("interpolation_subtype", spec.interpolation_subtype, 1);

  if (spec.precision != 1 && spec.precision != 2)
    FatalError(routine + ": precision must be 1 (single) or 2 (double), found " + std::to_string(spec.precision) +
               Where(spec));
  if (spec.time_step_frequency < 1)
    FatalError(routine + ": time_step_frequency must be at least 1, found " +
               std::to_string(spec.time_step_frequency) + Where(spec));
  if (spec.flood_and_dry < 0 || spec.flood_and_dry > 2)
    FatalError(routine + ": flood_and_dry must be 0, 1 or 2, found " + std::to_string(spec.flood_and_dry) +
               Where(spec));
  if (spec.interpolation_type != 1 && spec.interpolation_type != 2)
    FatalError("ExtractData: Interpolation is not implemented - interpolation_type " +
               std::to_string(spec.interpolation_type) + Where(spec) + "; 1 interpolates, 2 takes element values");
  if (spec.first_time_step > spec.last_time_step)
    Warning(routine + ": first_time_step is after last_time_step in " + spec.section +
            ": only a record after a failure will be written");

  switch (spec.type) {
    case kOutputField2D:
      SktOpenSection("PARAMETERS_2D");
      info.read_items(spec, info.context);
      SktCloseSection();
      if (spec.items.empty())
        FatalError(routine + ": No items selected in " + spec.section + "/PARAMETERS_2D");
      break;
    case kOutputMassBudget:
      SpecMassBudget(spec.budget, info.budget_components, mesh, spec.file_name);
      BudgetItems(spec);
      break;
    case kOutputDischarge:
      if (!info.discharge)
        FatalError(routine + ": Output type not supported - type 4 (a discharge is an output of the flow)" +
                   Where(spec));
      ReadDischargeItems(spec);
      if (spec.items.empty()) FatalError(routine + ": No items selected in " + spec.section + "/DISCHARGE");
      break;
    default:
      FatalError(routine + ": Output type not supported - type " + std::to_string(spec.type) + Where(spec));
  }

  spec.domain = SpecOutputDomain(spec, mesh.ndim);
  switch (spec.type) {
    case kOutputMassBudget:
      if (spec.file_kind != 0 && spec.file_kind != -1)
        FatalError("SpecMassBudget: Wrong file type - a mass budget is a time series (.zrn0)" + Where(spec));
      break;
    case kOutputDischarge:
      if (spec.domain != OutputDomain::kLine)
        FatalError(routine + ": a discharge output needs a line (format 1)" + Where(spec));
      SetupDischargeDomain(spec, mesh, list);
      break;
    default:
      if (spec.domain == OutputDomain::kPoints) SetupPointDomain(spec, mesh, list);
      else if (spec.domain == OutputDomain::kLine) SetupLineDomain(spec, mesh, list);
      else if (spec.domain == OutputDomain::kArea) SetupAreaDomain(spec, mesh, list);
      else FatalError("SpecOutputDomain: Output format not supported - no 3D outputs in a 2D run" + Where(spec));
  }
  // Process 0 writes the whole file: the other processes send it their
  // values (and write nothing), so there are no per-process files to merge.
  spec.path = spec.file_name;
  spec.write = run.process_id <= 0;
  spec.merge = list.merge_data;
}

}  // namespace

double ToMeshCoordinate(const Mesh& mesh, double value) {
  return IsGeographic(mesh.projection) ? value * kDegToRad : value;
}
double FromMeshCoordinate(const Mesh& mesh, double value) {
  return IsGeographic(mesh.projection) ? value * kRadToDeg : value;
}

bool PointInPolygon(double x, double y, const std::vector<double>& px, const std::vector<double>& py) {
  bool in = false;
  const std::size_t n = px.size();
  for (std::size_t i = 0, j = n - 1; i < n; j = i++) {
    if ((py[i] > y) != (py[j] > y) && x < (px[j] - px[i]) * (y - py[i]) / (py[j] - py[i]) + px[i]) in = !in;
  }
  return in;
}

void ReadPointFile(const std::string& routine, const std::string& file, std::vector<double>& x,
                   std::vector<double>& y, std::vector<std::string>* names) {
  std::ifstream in(file);
  if (!in) FatalError(routine + ": Unable to open point file " + file);
  x.clear();
  y.clear();
  if (names) names->clear();
  std::string line;
  int number = 0;
  while (std::getline(in, line)) {
    ++number;
    const auto first = line.find_first_not_of(" \t\r");
    if (first == std::string::npos || line[first] == '#') continue;
    std::istringstream s(line);
    double a = 0, b = 0;
    if (!(s >> a >> b) || !std::isfinite(a) || !std::isfinite(b))
      FatalError(routine + ": point file " + file + ", line " + std::to_string(number) +
                 ": expected \"x y [name]\", found \"" + line + "\"");
    x.push_back(a);
    y.push_back(b);
    if (names) {
      std::string name;
      std::getline(s >> std::ws, name);
      while (!name.empty() && (name.back() == '\r' || name.back() == ' ')) name.pop_back();
      names->push_back(name.empty() ? "Point " + std::to_string(x.size()) : name);
    }
  }
}

void ReadPointInput(const std::string& routine, const Mesh& mesh, std::vector<double>& x, std::vector<double>& y,
                    std::vector<std::string>* names) {
  int input_format = 1;
  SktReadKeyword("input_format", input_format, 1);
  x.clear();
  y.clear();
  if (names) names->clear();
  if (input_format == 1) {
    int n = 0;
    SktReadKeyword("number_of_points", n, 0);
    for (int j = 1; j <= n; ++j) {
      SktOpenSection("POINT", j);
      std::string name;
      SktReadKeyword("name", name, "Point " + std::to_string(j));
      double px = 0, py = 0;
      ReadRequiredDouble(routine, "x", px);
      ReadRequiredDouble(routine, "y", py);
      SktCloseSection();
      x.push_back(ToMeshCoordinate(mesh, px));
      y.push_back(ToMeshCoordinate(mesh, py));
      if (names) names->push_back(name);
    }
  } else if (input_format == 2) {
    std::string file;
    int flag = 0;
    SktReadFileName("input_file_name", file, std::nullopt, SktArg{1, 1, &flag});
    if (flag != 0) FatalError(routine + ": keyword input_file_name missing in section " + SktSectionPath());
    ReadPointFile(routine, file, x, y, names);
    for (std::size_t k = 0; k < x.size(); ++k) {
      x[k] = ToMeshCoordinate(mesh, x[k]);
      y[k] = ToMeshCoordinate(mesh, y[k]);
    }
  } else {
    FatalError(routine + ": input_format must be 1 (POINT sections) or 2 (point file), section " +
               SktSectionPath() + " gives " + std::to_string(input_format));
  }
}

bool OutputStepDue(const OutputSpec& spec, int n) {
  if (n == -1) return true;
  return n >= spec.first_time_step && n <= spec.last_time_step &&
         (n - spec.first_time_step) % spec.time_step_frequency == 0;
}

OutputDomain SpecOutputDomain(const OutputSpec& spec, int dim) {
  const int f = spec.format;
  if (dim == 1) {
    if (f == 0) return OutputDomain::kPoints;
    if (f == 1) return OutputDomain::kArea;
  } else if (dim == 2) {
    if (f == 0) return OutputDomain::kPoints;
    if (f == 1) return OutputDomain::kLine;
    if (f == 2) return OutputDomain::kArea;
  } else if (dim == 3) {
    if (f == 0) return OutputDomain::kPoints;
    if (f == 1) return OutputDomain::kLine;
    if (f == 2) return OutputDomain::kPlane;
    if (f == 3) return OutputDomain::kVolume;
  }
  FatalError("SpecOutputDomain: Output format not supported - format " + std::to_string(f) + " on a mesh of " +
             "dimension " + std::to_string(dim) + Where(spec));
}

void SetupPointDomain(OutputSpec& spec, const Mesh& mesh, OutputList& list) {
  if (spec.file_kind != 0 && spec.file_kind != -1) FatalError("SetupPointDomain: Wrong file type");
  std::vector<double> x, y;
  std::vector<std::string> names;
  ReadPointInput("SetupPointDomain", mesh, x, y, &names);
  if (x.empty()) FatalError("SetupPointDomain: no points given" + Where(spec));
  EnsureTree(list, mesh);
  spec.points.clear();
  for (std::size_t k = 0; k < x.size(); ++k)
    spec.points.push_back(OutputPoint{names[k], x[k], y[k], FindMeshElement(list, mesh, x[k], y[k])});
  const int inside = CountInside(spec.points);
  WriteLogLine("");
  WriteLogLine("  Point Output Information");
  for (const auto& p : spec.points)
    WriteLogLine("    " + p.name + " : " + Coordinates(mesh, p.x, p.y) + "  element " +
                 (p.element > 0 ? std::to_string(mesh.elements.id[p.element]) : std::string("outside")));
  if (inside == 0) Warning("SetupPointDomain: No points inside domain");
  else if (inside < static_cast<int>(spec.points.size()))
    Warning(SubstituteValue("SetupPointDomain: Only % points inside domain", inside));
}

void SetupLineDomain(OutputSpec& spec, const Mesh& mesh, OutputList& list) {
  if (spec.file_kind != 1 && spec.file_kind != -1) FatalError("SetupLineDomain: Wrong file type");
  SktOpenSection("LINE");
  int npoints = 2;
  std::vector<double> x, y;
  ReadLinePolyline(mesh, true, npoints, x, y);
  SktCloseSection();
  // Points spaced evenly along the polyline.
  std::vector<double> along(x.size(), 0.0);
  for (std::size_t k = 1; k < x.size(); ++k) along[k] = along[k - 1] + std::hypot(x[k] - x[k - 1], y[k] - y[k - 1]);
  spec.line_length = along.back();
  if (!(spec.line_length > 0.0)) FatalError("SetupLineDomain: Too few points on line - the line has no length");
  EnsureTree(list, mesh);
  spec.points.clear();
  std::size_t seg = 1;
  for (int i = 0; i < npoints; ++i) {
    const double s = spec.line_length * i / (npoints - 1);
    while (seg + 1 < x.size() && along[seg] < s) ++seg;
    const double len = along[seg] - along[seg - 1];
    const double w = len > 0 ? std::clamp((s - along[seg - 1]) / len, 0.0, 1.0) : 0.0;
    const double px = x[seg - 1] + w * (x[seg] - x[seg - 1]);
    const double py = y[seg - 1] + w * (y[seg] - y[seg - 1]);
    spec.points.push_back(OutputPoint{"", px, py, FindMeshElement(list, mesh, px, py)});
  }
  spec.x0 = 0.0;
  spec.dx = FromMeshCoordinate(mesh, spec.line_length) / (npoints - 1);
  const int inside = CountInside(spec.points);
  WriteLogLine("");
  WriteLogLine("  Line Output Information");
  WriteLogLine("    From                : " + Coordinates(mesh, x.front(), y.front()));
  WriteLogLine("    To                  : " + Coordinates(mesh, x.back(), y.back()));
  WriteValueLine("  Number of points    : %", npoints);
  WriteValueLine("  Points inside       : %", inside);
  WriteValueLine("  Point spacing       : %", spec.dx);
  if (inside == 0) Warning("SetupLineDomain: No points inside domain");
  else if (inside < npoints) Warning(SubstituteValue("SetupLineDomain: % points outside domain", npoints - inside));
}

void SetupAreaDomain(OutputSpec& spec, const Mesh& mesh, OutputList& list) {
  if (spec.file_kind != 4 && spec.file_kind != 2 && spec.file_kind != -1)
    FatalError("SetupAreaDomain: Wrong file type");
  double xmin, xmax, ymin, ymax;
  MeshBox(mesh, xmin, xmax, ymin, ymax);
  const ElementTable& el = mesh.elements;
  const int nown = el.nelements;  // every element: process 0 writes the whole mesh

  if (spec.file_kind == 2) {
    // A regular grid sampled from the mesh.
    const double extent = std::max(xmax - xmin, ymax - ymin);
    double ds_default = extent > 0 ? extent / 100.0 : 1.0;
    const bool has_area = SktSectionExists("AREA");
    if (has_area) SktOpenSection("AREA");
    SktReadKeyword("x_origo", spec.x0, xmin);
    SktReadKeyword("x_ds", spec.dx, ds_default);
    SktReadKeyword("x_npoints", spec.nx, static_cast<int>(std::floor((xmax - xmin) / ds_default)) + 1);
    SktReadKeyword("y_origo", spec.y0, ymin);
    SktReadKeyword("y_ds", spec.dy, ds_default);
    SktReadKeyword("y_npoints", spec.ny, static_cast<int>(std::floor((ymax - ymin) / ds_default)) + 1);
    SktReadKeyword("orientation", spec.orientation, 0.0);
    if (has_area) SktCloseSection();
    if (!(spec.dx > 0) || !(spec.dy > 0) || spec.nx < 1 || spec.ny < 1)
      FatalError("SetupAreaDomain: the grid needs x_ds, y_ds > 0 and x_npoints, y_npoints >= 1" + Where(spec));
    EnsureTree(list, mesh);
    const double o = spec.orientation * kDegToRad;
    spec.points.clear();
    spec.points.reserve(static_cast<std::size_t>(spec.nx) * static_cast<std::size_t>(spec.ny));
    int inside = 0;
    for (int j = 0; j < spec.ny; ++j) {
      for (int i = 0; i < spec.nx; ++i) {
        const double a = i * spec.dx, b = j * spec.dy;
        const double px = ToMeshCoordinate(mesh, spec.x0 + a * std::cos(o) + b * std::sin(o));
        const double py = ToMeshCoordinate(mesh, spec.y0 - a * std::sin(o) + b * std::cos(o));
        const int e = FindMeshElement(list, mesh, px, py);
        inside += e > 0 ? 1 : 0;
        spec.points.push_back(OutputPoint{"", px, py, e});
      }
    }
    if (inside == 0) Warning("SetupAreaDomain: No elements in selected area");
    return;
  }

  // Elements of the mesh: all, or those whose centroid lies in a polygon or box.
  SktReadKeyword("compress", spec.compress, 1);
  std::vector<double> px, py;
  double bx0 = xmin, bx1 = xmax, by0 = ymin, by1 = ymax;
  if (SktSectionExists("AREA")) {
    SktOpenSection("AREA");
    ReadPointInput("SetupAreaDomain", mesh, px, py);
    if (px.empty()) {
      SktReadKeyword("x_min", bx0, xmin);
      SktReadKeyword("x_max", bx1, xmax);
      SktReadKeyword("y_min", by0, ymin);
      SktReadKeyword("y_max", by1, ymax);
    } else if (px.size() < 3) {
      FatalError("SetupAreaDomain: a polygon needs at least 3 points, section " + SktSectionPath() + " gives " +
                 std::to_string(px.size()));
    }
    SktCloseSection();
  }
  bx0 = ToMeshCoordinate(mesh, bx0);
  bx1 = ToMeshCoordinate(mesh, bx1);
  by0 = ToMeshCoordinate(mesh, by0);
  by1 = ToMeshCoordinate(mesh, by1);
  spec.selected.assign(nown, 0);
  int count = 0;
  for (int e = 1; e <= nown; ++e) {
    const double x = el.xc[e], y = el.yc[e];
    const bool in = px.empty() ? (x >= bx0 && x <= bx1 && y >= by0 && y <= by1) : PointInPolygon(x, y, px, py);
    spec.selected[e] = in ? 1 : 0;
    count += in ? 1 : 0;
  }
  if (count == 0) {
    Warning("SetupAreaDomain: No elements in selected area");
    spec.elements.clear();
    return;
  }
  // Written in the mesh file's order of the elements.
  spec.elements.assign(spec.compress == 1 ? count : nown);
  const Array1<int> in_file_order = FileOrder(el.file_index, el.nelements);
  int k = 0;
  for (int e : in_file_order)
    if (e <= nown && (spec.compress != 1 || spec.selected[e])) spec.elements[++k] = e;
}

void SetupOutputs(OutputList& list, const OutputModuleInfo& info, const Mesh& mesh, const RunControl& run,
                  const TimeAxis& time) {
  list.module = info.module;
  list.process_id = run.process_id;
  list.nprocesses = run.nprocesses;
  list.time = time;
  list.outputs.clear();
  int status = 0;
  SktOpenSection("OUTPUTS", kNoIndex, &status);
  if (status != 0) return;  // a module without outputs
  SktReadKeyword("number_of_outputs", list.number_of_outputs, 0);
  SktReadKeyword("merge_data", list.merge_data, run.merge_data_default);
  list.outputs.reserve(static_cast<std::size_t>(std::max(0, list.number_of_outputs)));
  for (int i = 1; i <= list.number_of_outputs; ++i) {
    SktOpenSection("OUTPUT", i);
    OutputSpec spec;
    spec.number = i;
    spec.section = SktSectionPath();
    SktReadKeyword("include", spec.include, 1);
    if (spec.include != 1) SktSkipSection();
    if (spec.include == 1) {
      ReadOutput(spec, list, info, mesh, run, time);
      const bool empty_area = spec.domain == OutputDomain::kArea && spec.file_kind == 4 && spec.elements.empty();
      if (!empty_area) list.outputs.push_back(std::move(spec));
    }
    SktCloseSection();
  }
  SktCloseSection();
}

}  // namespace vhd
