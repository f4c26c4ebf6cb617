// PT module setup: the sections of PARTICLE_TRACKING_MODULE (classes and their
// processes, sources, drift profile, wind, bed roughness, outputs), the
// search tree and the particle pool.

#include <algorithm>
#include <cmath>
#include <fstream>
#include <new>
#include <sstream>
#include <string>

#include "core/omp.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/femdata.hpp"
#include "mesh/interpolation.hpp"
#include "particles/pt_module.hpp"
#include "particles/pt_random.hpp"

namespace vhd {

namespace {

// A setup error: the message, then where it was found.
[[noreturn]] void SetupError(std::string_view text, std::string_view key = {}, const std::string& value = {}) {
  std::string where = " (" + SktSectionPath();
  if (!key.empty()) where += ", " + std::string(key) + " = " + value;
  FatalError(std::string(text) + where + ")");
}

bool OpenOptional(std::string_view name, int index = kNoIndex) {
  if (!SktSectionExists(name, index)) return false;
  SktOpenSection(name, index);
  return true;
}

// Converts a point from the source's projection to the mesh's coordinates.
void ToMesh(const PtModule& pt, const std::string& coordinate_type, double& x, double& y) {
  const bool same = coordinate_type == pt.mesh->projection;
  if (same) {
    if (pt.geographic) {
      x *= kDegToRad;
      y *= kDegToRad;
    }
    return;
  }
  CTqMapProjection from, to;
  std::string reason;
  if (from.Establish(coordinate_type, &reason) != kCartOk)
    SetupError("Unable to establish projection: " + coordinate_type, "coordinate_type", coordinate_type);
  to.Establish(pt.mesh->projection);
  double lon = 0.0, lat = 0.0;
  if (from.Proj2Geo(x, y, lon, lat) != kCartOk || to.Geo2Proj(lon, lat, x, y) != kCartOk)
    SetupError("Source coordinates cannot be converted from " + coordinate_type + " to the mesh projection " +
                   pt.mesh->projection,
               "coordinate_type", coordinate_type);
  if (pt.geographic) {
    x *= kDegToRad;
    y *= kDegToRad;
  }
}

void SetupProcesses(PtClass& c, bool three_d) {
  if (OpenOptional("DECAY")) {
    int type = 0;
    SktReadKeyword("type", type, 0);
    if (type < 0 || type > 1) SetupError("Type not supported for decay", "type", std::to_string(type));
    if (type == 1) SktReadKeyword("constant_value", c.decay_rate, 0.0);
    if (c.decay_rate < 0.0) SetupError("Decay rate must not be negative", "constant_value", NumberText(c.decay_rate));
    SktCloseSection();
  }
  if (OpenOptional("SETTLING")) {
    int type = 0, format = 0;
    SktReadKeyword("type", type, 0);
    if (type < 0 || type > 1) SetupError("Type not supported for settling", "type", std::to_string(type));
    if (type == 1) {
      SktReadKeyword("format", format, 0);
      if (format != 0) SetupError("Format not supported for settling", "format", std::to_string(format));
      SktReadKeyword("constant_value", c.settling_velocity, 0.0);
    }
    SktCloseSection();
  }
  if (OpenOptional("DISPERSION")) {
    if (OpenOptional("HORIZONTAL_DISPERSION")) {
      int type = 0;
      SktReadKeyword("type", type, 0);
      if (type < 0 || type > 1)
        SetupError("Type not supported for horizontal dispersion", "type", std::to_string(type));
      if (type == 1) SktReadKeyword("constant_value", c.horizontal_dispersion, 0.0);
      if (c.horizontal_dispersion < 0.0)
        SetupError("Dispersion coefficient must not be negative", "constant_value",
                   NumberText(c.horizontal_dispersion));
      SktCloseSection();
    }
    if (OpenOptional("VERTICAL_DISPERSION")) {
      int type = 0;
      SktReadKeyword("type", type, 0);
      if (type == 2 && !three_d) SetupError("Vertical dispersion cannot use Eddy Viscosity formulation in VX7KX");
      if (type < 0 || type > 1)
        SetupError("Type not supported for vertical dispersion", "type", std::to_string(type));
      if (type == 1) SktReadKeyword("constant_value", c.vertical_dispersion, 0.0);
      if (c.vertical_dispersion < 0.0)
        SetupError("Dispersion coefficient must not be negative", "constant_value",
                   NumberText(c.vertical_dispersion));
      SktCloseSection();
    }
    SktCloseSection();
  }
  if (OpenOptional("EROSION")) {
    int type = 0;
    SktReadKeyword("type", type, 0);
    if (type < 0 || type > 1) SetupError("Type not supported for erosion", "type", std::to_string(type));
    c.erosion = type == 1;
    if (c.erosion) SktReadKeyword("critical_shear_stress", c.critical_shear, 0.1);
    SktCloseSection();
  }
}

void SetupClasses(PtModule& pt, bool three_d) {
  SktOpenSection("CLASSES");
  int n = 1;
  SktReadKeyword("number_of_classes", n, 1);
  if (n < 1) SetupError("Number of classes must be a positive number", "number_of_classes", std::to_string(n));
  pt.classes.assign(static_cast<std::size_t>(n), PtClass{});
  for (int k = 1; k <= n; ++k) {
    PtClass& c = pt.classes[static_cast<std::size_t>(k - 1)];
    SktOpenSection("CLASS", k);
    WriteLogLine(SubstituteValue("Class %", k));
    SktReadKeyword("include", c.include, true);
    SktReadKeyword("name", c.name, std::string());
    SktReadKeyword("description", c.description, std::string());
    SktReadKeyword("flood_dry_type", c.flood_dry_type, 1);
    if (c.flood_dry_type < 0 || c.flood_dry_type > 1)
      SetupError("Type not supported for flood and dry of particles", "flood_dry_type",
                 std::to_string(c.flood_dry_type));
    SktReadKeyword("UVQ_type", c.uvq_type, 999);
    SktReadKeyword("UVQ_unit", c.uvq_unit, 999);
    SktReadKeyword("minimum_particle_mass", c.minimum_particle_mass, 0.0);
    SktReadKeyword("maximum_particle_mass", c.maximum_particle_mass, 1.0e30);
    SktReadKeyword("maximum_particle_age", c.maximum_particle_age, 1.0e30);
    if (c.minimum_particle_mass > c.maximum_particle_mass)
      SetupError("minimum_particle_mass is larger than maximum_particle_mass", "minimum_particle_mass",
                 NumberText(c.minimum_particle_mass));
    SetupProcesses(c, three_d);
    SktCloseSection();
  }
  SktCloseSection();
}

// Element of a point, or 0 (with the warning or error of a misplaced source).
int PlacePoint(const PtModule& pt, const PtSource& s, double x, double y) {
  const int e = FindElementID2DSearchTree(x, y, *pt.mesh, pt.tree);
  if (e > 0) return e;
  if (s.fail_on_misplaced) SetupError("Source, particle placed out of domain", "coordinates", "");
  Warning("Source, particle placed out of domain (" + SktSectionPath() + ")");
  return 0;
}

void SetupGridded(PtModule& pt, PtSource& s, const std::string& coordinate_type) {
  SktOpenSection("GRIDDED_SOURCE");
  int format = 0, rows = 1, columns = 1, fillmode = 1;
  SktReadKeyword("format", format, 0);
  if (format == 0) {
    std::vector<double> origin;
    double rotation = 0.0, width = 0.0, height = 0.0;
    SktReadKeyword("origin", origin, 2);
    SktReadKeyword("rotation", rotation, 0.0);
    SktReadKeyword("width", width);
    SktReadKeyword("height", height);
    SktReadKeyword("rows", rows, 1);
    SktReadKeyword("columns", columns, 1);
    SktReadKeyword("fillmode", fillmode, 1);
    if (rows < 1 || columns < 1)
      SetupError("A gridded source must have at least one column/row", rows < 1 ? "rows" : "columns",
                 std::to_string(rows < 1 ? rows : columns));
    if (fillmode < 1 || fillmode > 2)
      SetupError("Unknown fillmode for gridded source", "fillmode", std::to_string(fillmode));
    // fillmode 1: the cell centres of the grid; 2: its corners.
    const int nr = fillmode == 1 ? rows : rows + 1, nc = fillmode == 1 ? columns : columns + 1;
    if (static_cast<long long>(nr) * nc > 100000000LL)
      SetupError("A gridded source has at most 100000000 points", "rows", std::to_string(rows));
    const double off = fillmode == 1 ? 0.5 : 0.0;
    const double c = std::cos(rotation * kDegToRad), sn = std::sin(rotation * kDegToRad);
    for (int i = 0; i < nr; ++i)
      for (int j = 0; j < nc; ++j) {
        const double lx = (j + off) * width / columns, ly = (i + off) * height / rows;
        double x = origin[0] + lx * c - ly * sn, y = origin[1] + lx * sn + ly * c;
        ToMesh(pt, coordinate_type, x, y);
        s.px.push_back(x);
        s.py.push_back(y);
      }
  } else if (format == 1) {
    int npoints = 0;
    SktReadKeyword("npoints", npoints, 0);
    if (npoints > 0) {
      SktOpenSection("POINTS");
      for (int i = 1; i <= npoints; ++i) {
        std::vector<double> p;
        SktReadKeyword("point", p, 2, {}, SktArg{i});
        double x = p[0], y = p[1];
        ToMesh(pt, coordinate_type, x, y);
        s.px.push_back(x);
        s.py.push_back(y);
      }
      SktCloseSection();
    }
  } else {
    SetupError("Unknown format for gridded source!", "format", std::to_string(format));
  }
  // Points outside the domain take no part.
  std::vector<double> px, py;
  for (std::size_t i = 0; i < s.px.size(); ++i) {
    const int e = FindElementID2DSearchTree(s.px[i], s.py[i], *pt.mesh, pt.tree);
    if (e == 0) continue;
    px.push_back(s.px[i]);
    py.push_back(s.py[i]);
    s.pelement.push_back(e);
  }
  if (px.empty()) SetupError("No valid point definitions found for gridded source!");
  s.px = std::move(px);
  s.py = std::move(py);
  SktCloseSection();
}

void SetupGeometric(PtModule& pt, PtSource& s, const std::string& coordinate_type) {
  SktOpenSection("GEOMETRIC_SOURCE");
  bool distribute = true;
  int npoints = 0, nelements = 0;
  SktReadKeyword("distribute", distribute, true);
  SktReadKeyword("npoints", npoints, 0);
  SktReadKeyword("nelements", nelements, 0);
  if (npoints < 1) SetupError("A geometric source must have at least one point!", "npoints", std::to_string(npoints));
  if (distribute && nelements < 1)
    SetupError("A geometric source must have at least one element!", "nelements", std::to_string(nelements));
  std::vector<double> gx, gy;
  SktOpenSection("POINTS");
  for (int i = 1; i <= npoints; ++i) {
    std::vector<double> p;
    SktReadKeyword("point", p, 2, {}, SktArg{i});
    double x = p[0], y = p[1];
    ToMesh(pt, coordinate_type, x, y);
    gx.push_back(x);
    gy.push_back(y);
  }
  SktCloseSection();
  if (!distribute) {
    for (std::size_t i = 0; i < gx.size(); ++i) {
      const int e = PlacePoint(pt, s, gx[i], gy[i]);
      if (e == 0) continue;
      s.px.push_back(gx[i]);
      s.py.push_back(gy[i]);
      s.pelement.push_back(e);
    }
    if (s.px.empty()) SetupError("No valid point definitions found for geometric source!");
    SktCloseSection();
    return;
  }
  // Elements: polygons of point numbers, split into fans of triangles.
  SktOpenSection("ELEMENTS");
  double total = 0.0;
  for (int k = 1; k <= nelements; ++k) {
    const int np = SktNumberOfParams("element", k);
    if (np < 1) SetupError("An element must have one point!", "element", SubstituteValue("E_%", k));
    std::vector<int> ids;
    SktReadKeyword("element", ids, np, {}, SktArg{k});
    for (int id : ids)
      if (id < 1 || id > npoints)
        SetupError("Point number of a geometric source element out of range", "element", std::to_string(id));
    double area = 0.0;
    for (int j = 1; j + 1 < np; ++j) {
      const int a = ids[0] - 1, b = ids[static_cast<std::size_t>(j)] - 1, c = ids[static_cast<std::size_t>(j + 1)] - 1;
      const double ta = 0.5 * std::abs((gx[b] - gx[a]) * (gy[c] - gy[a]) - (gx[c] - gx[a]) * (gy[b] - gy[a]));
      s.tri.insert(s.tri.end(), {gx[a], gy[a], gx[b], gy[b], gx[c], gy[c]});
      total += ta;
      area += ta;
      s.tri_cumulative.push_back(total);
    }
    if (area <= 0.0) SetupError(SubstituteValue("Can not distribute particles to zero area element: E_%", k));
  }
  for (double& c : s.tri_cumulative) c /= total;
  SktCloseSection();
  SktCloseSection();
}

void ReadPlainTextSource(PtModule& pt, PtSource& s, const std::string& file, const std::string& coordinate_type) {
  std::ifstream in(file);
  if (!in) SetupError("An error occured when loading plaintext particle data", "file_name", file);
  std::string line;
  int line_no = 0;
  while (std::getline(in, line)) {
    ++line_no;
    if (line.find_first_not_of(" \t\r") == std::string::npos) continue;
    std::istringstream is(line);
    PtSource::FileParticle p;
    double step = 0.0, cls = 0.0;
    if (!(is >> step >> cls >> p.x >> p.y >> p.z >> p.mass))
      SetupError("unknown error while reading data from plaintext source", "file_name",
                 file + ", line " + std::to_string(line_no));
    p.step = static_cast<int>(step);
    p.cls = static_cast<int>(cls);
    if (p.cls < 1 || p.cls > static_cast<int>(pt.classes.size()))
      SetupError("Wrong number of classes defined in plaintext source", "file_name",
                 file + ", line " + std::to_string(line_no));
    ToMesh(pt, coordinate_type, p.x, p.y);
    s.file_particles.push_back(p);
  }
  if (s.file_particles.empty()) SetupError("No particles defined in plaintext source", "file_name", file);
}

void SetupSource(PtModule& pt, PtSource& s, const RunControl& run) {
  SktReadKeyword("include", s.include, true);
  SktReadKeyword("type", s.type, 1);
  SktReadKeyword("format", s.format, 0);
  if (s.type == kSourcePoint && s.format != 0 && s.format != 1)
    SetupError("Illegal format for point sources!", "format", std::to_string(s.format));
  if (s.type == kSourceArea && s.format != 2 && s.format != 3)
    SetupError("Illegal format for area sources!", "format", std::to_string(s.format));
  if (s.type == kSourceFile && s.format != 4 && s.format != 5)
    SetupError("Illegal format for file sources!", "format", std::to_string(s.format));
  if (s.type < 1 || s.type > 3) SetupError("Unknown source type!", "type", std::to_string(s.type));
  if (s.type == kSourcePoint && s.format == 1 && run.nprocesses > 1)
    SetupError("This source type is not capable of moving when using MPI");
  if (s.type == kSourceFile && s.format == 4) SetupError("Unknown source fromat!", "format", "4");

  std::string coordinate_type;
  SktReadKeyword("coordinate_type", coordinate_type, std::string("UTM-32"));
  SktReadKeyword("vertical_type", s.vertical_type, 1);
  if (s.vertical_type < 0 || s.vertical_type > 3)
    SetupError("Type not supported for the vertical placement of a source", "vertical_type",
               std::to_string(s.vertical_type));
  SktReadKeyword("fail_on_misplaced", s.fail_on_misplaced, false);
  // Release window: steps first_time_step .. last_time_step; an initial
  // source releases on its first step only.
  SktReadKeyword("first_time_step", s.first_step, 1);
  SktReadKeyword("last_time_step", s.last_step, pt.time.last_step);
  bool initial = false;
  SktReadKeyword("initial_source", initial, false);
  if (initial) s.last_step = s.first_step;
  if (s.first_step > s.last_step)
    SetupError("first_time_step is after last_time_step", "first_time_step", std::to_string(s.first_step));

  if (s.type == kSourcePoint) {
    // Fixed: coordinates = [x, y, z]; moving: coordinates = [[t, x, y, z], ...].
    if (s.format == 0) {
      std::vector<double> c;
      SktReadKeyword("coordinates", c, 3);
      s.times = {0.0};
      s.xs = {c[0]};
      s.ys = {c[1]};
      s.zs = {c[2]};
    } else {
      for (int i = 1; SktNumberOfParams("coordinates", i) == 4; ++i) {
        std::vector<double> c;
        SktReadKeyword("coordinates", c, 4, {}, SktArg{i});
        if (!s.times.empty() && c[0] <= s.times.back())
          SetupError("The times of a moving source must increase", "coordinates", NumberText(c[0]));
        s.times.push_back(c[0]);
        s.xs.push_back(c[1]);
        s.ys.push_back(c[2]);
        s.zs.push_back(c[3]);
      }
      if (s.times.empty())
        SetupError("A moving source needs coordinates = [[t, x, y, z], ...]", "coordinates", "");
    }
    for (std::size_t i = 0; i < s.xs.size(); ++i) {
      ToMesh(pt, coordinate_type, s.xs[i], s.ys[i]);
      if (s.format == 0) {
        const int e = PlacePoint(pt, s, s.xs[i], s.ys[i]);
        if (e == 0) s.include = false;
      }
    }
  } else if (s.type == kSourceArea) {
    if (s.format == 2) SetupGridded(pt, s, coordinate_type);
    else SetupGeometric(pt, s, coordinate_type);
  } else {
    std::string file;
    SktReadFileName("file_name", file);
    if (file.empty()) SetupError("file_name missing for a file source", "file_name", "");
    ReadPlainTextSource(pt, s, file, coordinate_type);
  }

  s.classes.assign(pt.classes.size(), PtSourceClass{});
  if (s.type == kSourceFile) return;
  for (std::size_t k = 1; k <= pt.classes.size(); ++k) {
    if (!OpenOptional("CLASS", static_cast<int>(k))) continue;
    PtSourceClass& sc = s.classes[k - 1];
    int format = 0;
    SktReadKeyword("format_particle", format, 0);
    if (format != 0) SetupError("Unknown format for particles per time step", "format_particle", std::to_string(format));
    SktReadKeyword("number_of_particles_per_timestep", sc.number_of_particles_per_timestep, 0);
    if (sc.number_of_particles_per_timestep < 0)
      SetupError("Unknown format for particles per time step", "number_of_particles_per_timestep",
                 std::to_string(sc.number_of_particles_per_timestep));
    SktReadKeyword("type_value", sc.type_value, 1.0);
    const PtClass& c = pt.classes[k - 1];
    if (sc.type_value < c.minimum_particle_mass) {
      Warning("WARNING: At least one source value smaller than minimum, source value clipped!");
      sc.type_value = c.minimum_particle_mass;
    }
    if (sc.type_value > c.maximum_particle_mass) {
      Warning("WARNING: At least one source value larger than maximum, source value clipped!");
      sc.type_value = c.maximum_particle_mass;
    }
    SktCloseSection();
  }
}

void SetupSources(PtModule& pt, const RunControl& run) {
  const char* name = SktSectionExists("SOURCES") ? "SOURCES" : "PARTICLE_SOURCES";
  if (!OpenOptional(name)) return;
  int n = 0;
  SktReadKeyword("number_of_Sources", n, 0);
  if (n < 0) SetupError("number_of_Sources must not be negative", "number_of_Sources", std::to_string(n));
  pt.sources.assign(static_cast<std::size_t>(n), PtSource{});
  for (int k = 1; k <= n; ++k) {
    SktOpenSection("SOURCE", k);
    SetupSource(pt, pt.sources[static_cast<std::size_t>(k - 1)], run);
    SktCloseSection();
  }
  SktCloseSection();
}

void SetupDrift(PtModule& pt) {
  PtDriftProfile& d = pt.drift;
  if (OpenOptional("DRIFT_PROFILE")) {
    SktReadKeyword("type", d.type, 0);
    if (d.type < 0 || d.type > 6) SetupError("Driftprofile type not supported", "type", std::to_string(d.type));
    if (OpenOptional("WIND_INDUCED_PROFILE")) {
      SktReadKeyword("wind_drift_factor", d.wind_drift_factor, 0.0);
      SktReadKeyword("depth_of_wind_influence", d.depth_of_wind_influence, 100.0);
      SktReadKeyword("offshore_limit", d.offshore_limit, 100.0);
      if (d.depth_of_wind_influence <= 0.0)
        SetupError("depth_of_wind_influence must be positive", "depth_of_wind_influence",
                   NumberText(d.depth_of_wind_influence));
      SktCloseSection();
    }
    if (OpenOptional("SURFACE_WIND_ACCELERATION")) {
      SktReadKeyword("wind_weight", d.wind_weight, 0.0);
      SktReadKeyword("wind_drift_angle_parameter", d.wind_drift_angle_parameter, 28.0);
      SktReadKeyword("kinematic_viscosity", d.kinematic_viscosity, 1.0e-6);
      SktReadKeyword("dynamic_viscosity", d.dynamic_viscosity, 0.001);
      if (d.kinematic_viscosity <= 0.0)
        SetupError("kinematic_viscosity must be positive", "kinematic_viscosity", NumberText(d.kinematic_viscosity));
      SktCloseSection();
    }
    SktCloseSection();
  }
  if (OpenOptional("BED_ROUGHNESS")) {
    int format = 0;
    SktReadKeyword("format", format, 0);
    if (format != 0) SetupError("Format not supported for bed roughness", "format", std::to_string(format));
    SktReadKeyword("constant_value", d.bed_roughness, 0.05);
    if (d.bed_roughness <= 0.0) SetupError("The bed roughness must be positive", "constant_value", NumberText(d.bed_roughness));
    SktCloseSection();
  }
}

void SetupWind(PtModule& pt) {
  if (!OpenOptional("WIND_FORCING")) return;
  int type = 0;
  SktReadKeyword("type", type, 0);
  if (type < 0 || type > 1) SetupError("Type not supported for PT Wind forcing", "type", std::to_string(type));
  pt.wind = type == 1;
  if (pt.wind) {
    ReadDataSpec(pt.wind_spec, 2, {0.0, 0.0});
    // Uniform wind only: a constant or a point series.
    if (pt.wind_spec.format > kDataFileOnce)
      SetupError("Format not supported for PT wind forcing", "format", std::to_string(pt.wind_spec.format));
    FemDataRequest request;
    request.expect = FemDataExpect::kPoint;
    request.projection = pt.mesh->projection;
    FemDataOpen(pt.wind_spec, request, pt.time);
  } else {
    SktSkipSection();
  }
  SktCloseSection();
}

void SetupOutputs(PtModule& pt) {
  if (!OpenOptional("OUTPUTS")) return;
  int n = 0;
  SktReadKeyword("number_of_outputs", n, 0);
  for (int k = 1; k <= n; ++k) {
    SktOpenSection("OUTPUT", k);
    PtOutput o;
    SktReadKeyword("include", o.include, true);
    if (!o.include) {
      SktSkipSection();
      SktCloseSection();
      continue;
    }
    SktReadFileName("file_name", o.file_name);
    if (o.file_name.empty()) SetupError("file_name missing for a particle track output", "file_name", "");
    o.netcdf = o.file_name.size() > 3 && o.file_name.compare(o.file_name.size() - 3, 3, ".nc") == 0;
    SktReadKeyword("first_time_step", o.first_step, 0);
    SktReadKeyword("last_time_step", o.last_step, pt.time.last_step);
    SktReadKeyword("time_step_frequency", o.frequency, 1);
    if (o.frequency < 1) SetupError("time_step_frequency must be at least 1", "time_step_frequency", std::to_string(o.frequency));
    if (o.first_step > o.last_step)
      SetupError("first_time_step is after last_time_step", "first_time_step", std::to_string(o.first_step));
    SktOpenSection("PARTICLE_TRACK");
    SktReadKeyword("first_particle", o.first_particle, 1);
    SktReadKeyword("last_particle", o.last_particle, 1 << 30);
    SktReadKeyword("particle_frequency", o.particle_frequency, 1);
    if (o.particle_frequency < 1)
      SetupError("Invalid particle frequency specified!", "particle_frequency", std::to_string(o.particle_frequency));
    SktReadKeyword("COMPRESSED", o.compressed, false);
    SktReadKeyword("INCLUDE_XSL", o.include_xsl, false);
    SktReadKeyword("HORIZONTAL_DIRECTION", o.horizontal_direction, false);
    SktReadKeyword("HORIZONTAL_SPEED", o.horizontal_speed, false);
    SktReadKeyword("VERTICAL_SPEED", o.vertical_speed, false);
    SktReadKeyword("AGE", o.age, false);
    SktReadKeyword("STATE_VARIABLE_1", o.mass, true);
    SktCloseSection();
    SktCloseSection();
    pt.outputs.push_back(std::move(o));
  }
  SktCloseSection();
}

// Particles the sources release over the whole run.
long long CountReleases(const PtModule& pt) {
  long long total = 0;
  const long long steps = pt.time.last_step - pt.time.first_step;
  for (const PtSource& s : pt.sources) {
    if (!s.include) continue;
    if (s.type == kSourceFile) {
      total += static_cast<long long>(s.file_particles.size());
      continue;
    }
    long long per_step = 0;
    for (const PtSourceClass& c : s.classes) per_step += c.number_of_particles_per_timestep;
    const long long first = std::max<long long>(s.first_step, pt.time.first_step + 1);
    const long long last = std::min<long long>(s.last_step, pt.time.last_step);
    total += per_step * std::max<long long>(0, std::min(steps, last - first + 1));
  }
  return total;
}

}  // namespace

void SetupPT(PtModule& pt, int selected_mode, const RunControl& run, const TimeAxis& time,
             const std::vector<const Mesh*>& meshes) {
  pt.time = time;
  pt.dt = time.dt;
  SktOpenSection("PARTICLE_TRACKING_MODULE");
  SktReadKeyword("mode", pt.mode, 0);
  if (pt.mode != selected_mode || pt.mode < 0 || pt.mode > 2) FatalError("mode is illegal");
  if (OpenOptional("SPACE")) {
    SktReadKeyword("number_of_2D_mesh_velocity", pt.mesh_number, 1);
    SktCloseSection();
  }
  if (pt.mesh_number < 1 || pt.mesh_number > static_cast<int>(meshes.size()))
    SetupError("SetupPT: the run has no such mesh", "number_of_2D_mesh_velocity", std::to_string(pt.mesh_number));
  const Mesh& mesh = *meshes[static_cast<std::size_t>(pt.mesh_number - 1)];
  pt.mesh = &mesh;
  pt.geographic = IsGeographic(mesh.projection);
  if (run.nprocesses > 1)
    FatalError("SetupPT: particle tracking runs on one process only; run it without mpirun or with -np 1");
  int discretization = 1;
  SktReadKeyword("discretization", discretization, 1);
  if (discretization != 1) FatalError("Only finite volume discretization supported for PT");
  int seed = 1;
  SktReadKeyword("seed", seed, 1);
  pt.seed = static_cast<std::uint64_t>(static_cast<std::uint32_t>(seed));
  if (OpenOptional("SOLUTION_TECHNIQUE")) {
    SktReadKeyword("type_of_vertical_interpolation", pt.type_of_vertical_interpolation, 1);
    SktReadKeyword("type_of_vertical_transport", pt.type_of_vertical_transport, 1);
    SktCloseSection();
  }
  BuildSearchTree2D(mesh, pt.tree);
  SetupClasses(pt, mesh.ndim == 3);
  SetupSources(pt, run);
  SetupDrift(pt);
  SetupWind(pt);
  SetupOutputs(pt);
  SktCloseSection();

  const long long capacity = CountReleases(pt);
  if (capacity > 2000000000LL)
    FatalError("SetupPT: the sources would release " + std::to_string(capacity) +
               " particles; at most 2000000000 can be tracked");
  pt.capacity = static_cast<int>(capacity);
  try {
    pt.particles.assign(pt.capacity);
  } catch (const std::bad_alloc&) {
    FatalError("SetupPT: Out of memory (a pool of " + std::to_string(capacity) + " particles)");
  }
  pt.nparticles = 0;
  const int nnodes = mesh.nodes.nnodes;
  pt.u0.assign(nnodes);
  pt.v0.assign(nnodes);
  pt.u1.assign(nnodes);
  pt.v1.assign(nnodes);
  pt.eta_node.assign(nnodes);
  pt.bed_node.assign(nnodes);
  for (int i = 1; i <= nnodes; ++i) pt.bed_node[i] = mesh.nodes.z[i];
  const std::size_t nc = pt.classes.size() + 1;
  pt.stats.amount_sources.assign(nc, 0.0);
  WriteValueLine("Particle pool capacity: %", pt.capacity);

  InitTiming(pt.timing, "PT", 4);
  AddTiming(pt.timing, kPtTimerStep, "Particle Track Simulation");
  AddTiming(pt.timing, kPtTimerForcings, "Update forcings");
  AddTiming(pt.timing, kPtTimerTracks, "Calculate particle tracks");
  AddTiming(pt.timing, kPtTimerTotal, "Total");
}

}  // namespace vhd
