// Track files of the PT module: the XML track file (streamed with libxml2's
// text writer, optionally gzip-compressed, with its XSL style sheet) and,
// for an output whose name ends in ".nc", a CF trajectory file (netCDF-4,
// indexed ragged array: one observation per particle and output step).

#include <libxml/xmlwriter.h>
#include <netcdf.h>

#include <cmath>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "io/zrn.hpp"
#include "log/log.hpp"
#include "particles/pt_module.hpp"

namespace vhd {

namespace {

constexpr double kRadToDeg = 57.29577951308232;
constexpr const char* kNamespace = "urn:vantorhd:particle-track:1.0";

const char* kStyleSheet = R"XSL(<?xml version="1.0" encoding="utf-8"?>
<xsl:stylesheet version="1.0" xmlns:xsl="http://www.w3.org/1999/XSL/Transform">
  <xsl:output method="html" encoding="utf-8"/>
  <xsl:variable name="ParticleStyleSheetVersion" select="'v0.4a'"/>
  <xsl:template match="/qrvdata">
    <html>
      <head>
        <title>Particle tracks</title>
        <style>.hidden { display: none; } .head { cursor: pointer; font-weight: bold; }</style>
        <script type="text/javascript">
          function toggle(kind, id) {
            var e = document.getElementById(kind + id);
            if (e) e.className = e.className == 'hidden' ? '' : 'hidden';
          }
        </script>
      </head>
      <body>
        <h1>Particle tracks</h1>
        <p>Style sheet <xsl:value-of select="$ParticleStyleSheetVersion"/></p>
        <div class="head" onclick="toggle('node_', 'attributes')">Data attributes</div>
        <div id="node_attributes" class="hidden">
          <table>
            <xsl:for-each select="DataAttributes/*">
              <tr><td><xsl:value-of select="name()"/></td><td><xsl:value-of select="."/></td></tr>
            </xsl:for-each>
          </table>
        </div>
        <div class="head" onclick="toggle('node_', 'classes')">Classes</div>
        <div id="node_classes" class="hidden">
          <xsl:for-each select="ParticleClassDefinition">
            <p>Class <xsl:value-of select="ClassID"/>: <xsl:value-of select="Name"/></p>
            <table>
              <tr><th>code</th><th>Name</th><th>UVQType</th><th>UVQUnit</th></tr>
              <xsl:for-each select="var">
                <tr><td><xsl:value-of select="code"/></td><td><xsl:value-of select="Name"/></td>
                    <td><xsl:value-of select="UVQType"/></td><td><xsl:value-of select="UVQUnit"/></td></tr>
              </xsl:for-each>
            </table>
          </xsl:for-each>
        </div>
        <xsl:for-each select="TimeStep">
          <xsl:variable name="step" select="@nr"/>
          <div class="head" onclick="toggle('timestep_node_', '{$step}')">
            Time step <xsl:value-of select="$step"/>: <xsl:value-of select="DateTime"/>
          </div>
          <div id="timestep_node_{$step}" class="hidden">
            <xsl:for-each select="ParticleClass">
              <xsl:variable name="class" select="@id"/>
              <div class="head" onclick="toggle('timestep_class_node_', '{$step}_{$class}')">
                Class <xsl:value-of select="$class"/> (<xsl:value-of select="count(Particle)"/> particles)
              </div>
              <div id="timestep_class_node_{$step}_{$class}" class="hidden">
                <div class="head" onclick="toggle('timestep_class_particle_node_', '{$step}_{$class}')">Particles</div>
                <table id="timestep_class_particle_node_{$step}_{$class}" class="hidden">
                  <xsl:for-each select="Particle">
                    <tr><td><xsl:value-of select="@Nr"/></td><td><xsl:value-of select="Source/@ID"/></td>
                        <td><xsl:value-of select="."/></td></tr>
                  </xsl:for-each>
                </table>
              </div>
            </xsl:for-each>
          </div>
        </xsl:for-each>
      </body>
    </html>
  </xsl:template>
</xsl:stylesheet>
)XSL";

const xmlChar* X(const char* s) { return reinterpret_cast<const xmlChar*>(s); }

bool Selected(const PtOutput& o, int id) {
  return id >= o.first_particle && id <= o.last_particle && (id - o.first_particle) % o.particle_frequency == 0;
}

bool Active(const Particle& p) { return p.state == kParticleSuspended || p.state == kParticleSedimented; }

bool Due(const PtOutput& o, int n) {
  return n < 0 || (n >= o.first_step && n <= o.last_step && (n - o.first_step) % o.frequency == 0);
}

// Values of one particle in the order of the class definition.
int ParticleValues(const PtModule& pt, const PtOutput& o, const Particle& p, double* v) {
  int k = 0;
  const double f = pt.geographic ? kRadToDeg : 1.0;
  v[k++] = p.x * f;
  v[k++] = p.y * f;
  v[k++] = p.z;
  if (o.mass) v[k++] = p.mass;
  if (o.vertical_speed) v[k++] = p.w;
  if (o.horizontal_speed) v[k++] = std::hypot(p.u, p.v);
  if (o.horizontal_direction) {
    // Direction towards which the particle moves, degrees clockwise from north.
    double d = std::atan2(p.u, p.v) * kRadToDeg;
    if (d < 0.0) d += 360.0;
    v[k++] = d;
  }
  if (o.age) v[k++] = p.age;
  return k;
}

}  // namespace

std::string XmlEncodingPT(int code_page) {
  if (code_page >= 1250 && code_page <= 1258) return "windows-" + std::to_string(code_page);
  if (code_page >= 28591 && code_page <= 28599) return "iso-8859-" + std::to_string(code_page - 28590);
  if (code_page == 437 || code_page == 850 || code_page == 874) return "US-ASCII";
  if (code_page == 65001) return "utf-8";
  Warning("Warning, XML code '" + std::to_string(code_page) + "' page unkown");
  return "utf-8";
}

struct PtOutput::Writer {
  xmlTextWriterPtr xml = nullptr;
  // netCDF
  int ncid = -1;
  int v_index = -1, v_time = -1;
  std::vector<int> v_values;
  std::vector<int> trajectory_of_id;  // id -> trajectory index (from 0), -1 when not selected
  std::size_t obs = 0;
  std::vector<int> buf_index;
  std::vector<double> buf_time;
  std::vector<std::vector<double>> buf_values;
};

namespace {

void XmlFail(const PtOutput& o) { FatalError("WriteOutputsPT: writing the particle track file " + o.file_name + " failed"); }

void NcCheck(int status, const PtOutput& o, const char* what) {
  if (status != NC_NOERR)
    FatalError("WriteOutputsPT: " + std::string(what) + " of " + o.file_name + ": " + nc_strerror(status));
}

struct VarInfo {
  const char* code;
  const char* name;
  const char* type;
  const char* unit;
};

std::vector<VarInfo> Variables(const PtModule& pt, const PtOutput& o) {
  std::vector<VarInfo> v;
  const char* xy_type = pt.geographic ? "uvqILatLong" : "uvqIGeographicalCoordinate";
  const char* xy_unit = pt.geographic ? "uvqUdegree" : "uvqUmeter";
  v.push_back({"x", "x coordinate", xy_type, xy_unit});
  v.push_back({"y", "y coordinate", xy_type, xy_unit});
  v.push_back({"z", "z coordinate", "uvqIWaterDepth", "uvqUmeter"});
  if (o.mass) v.push_back({"STATE_VARIABLE_1", "Mass", "uvqIItemUndefined", "uvqUUnitUndefined"});
  if (o.vertical_speed) v.push_back({"vspeed", "vertical speed", "uvqICurrentSpeed", "uvqUmeterPerSec"});
  if (o.horizontal_speed) v.push_back({"hspeed", "horizontal speed", "uvqICurrentSpeed", "uvqUmeterPerSec"});
  if (o.horizontal_direction) v.push_back({"hdir", "horizontal direction", "uvqIAngle", "uvqUdegree"});
  if (o.age) v.push_back({"age", "age", "uvqITimeScale", "uvqUsec"});
  return v;
}

std::string StepDateTime(const PtModule& pt, double t) {
  return zrnDateTimeText(zrnAddSeconds(zrnDateTime(pt.time.start), t));
}

void OpenXml(PtModule& pt, PtOutput& o) {
  o.writer->xml = xmlNewTextWriterFilename(o.file_name.c_str(), o.compressed ? 9 : 0);
  xmlTextWriterPtr w = o.writer->xml;
  if (!w) FatalError("OpenOutputsPT: cannot create the particle track file " + o.file_name);
  xmlTextWriterSetIndent(w, 1);
  const std::string encoding = XmlEncodingPT(65001);
  bool ok = xmlTextWriterStartDocument(w, "1.0", encoding.c_str(), nullptr) >= 0;
  if (o.include_xsl) {
    const std::string pi = "type=\"text/xsl\" href=\"" + o.xsl_name + "\"";
    ok = ok && xmlTextWriterWritePI(w, X("xml-stylesheet"), X(pi.c_str())) >= 0;
    const std::filesystem::path xsl = std::filesystem::path(o.file_name).parent_path() / o.xsl_name;
    std::ofstream out(xsl);
    out << kStyleSheet;
    if (!out) FatalError("OpenOutputsPT: cannot write the style sheet " + xsl.string());
  }
  ok = ok && xmlTextWriterStartElement(w, X("qrvdata")) >= 0;
  ok = ok && xmlTextWriterWriteAttribute(w, X("xmlns:QRVParticleTrack"), X(kNamespace)) >= 0;
  ok = ok && xmlTextWriterStartElement(w, X("DataAttributes")) >= 0;
  ok = ok && xmlTextWriterWriteFormatElement(w, X("TimeStepSeconds"), "%.17g", pt.dt) >= 0;
  ok = ok && xmlTextWriterWriteElement(w, X("Engine"), X("VantorPT.exe")) >= 0;
  ok = ok && xmlTextWriterWriteElement(w, X("StartTime"), X(StepDateTime(pt, 0.0).c_str())) >= 0;
  ok = ok && xmlTextWriterWriteElement(w, X("ExpectedEndTime"), X(StepDateTime(pt, pt.time.EndTime()).c_str())) >= 0;
  ok = ok && xmlTextWriterWriteElement(w, X("Projection"), X(pt.mesh->projection.c_str())) >= 0;
  ok = ok && xmlTextWriterEndElement(w) >= 0;
  const std::vector<VarInfo> vars = Variables(pt, o);
  for (std::size_t k = 1; k <= pt.classes.size(); ++k) {
    const PtClass& c = pt.classes[k - 1];
    ok = ok && xmlTextWriterStartElement(w, X("ParticleClassDefinition")) >= 0;
    ok = ok && xmlTextWriterWriteFormatElement(w, X("ClassID"), "%d", static_cast<int>(k)) >= 0;
    ok = ok && xmlTextWriterWriteElement(w, X("Name"), X(c.name.c_str())) >= 0;
    ok = ok && xmlTextWriterWriteFormatElement(w, X("NrVariables"), "%d", static_cast<int>(vars.size())) >= 0;
    for (const VarInfo& v : vars) {
      ok = ok && xmlTextWriterStartElement(w, X("var")) >= 0;
      ok = ok && xmlTextWriterWriteElement(w, X("code"), X(v.code)) >= 0;
      ok = ok && xmlTextWriterWriteElement(w, X("Name"), X(v.name)) >= 0;
      ok = ok && xmlTextWriterWriteElement(w, X("UVQType"), X(v.type)) >= 0;
      ok = ok && xmlTextWriterWriteElement(w, X("UVQUnit"), X(v.unit)) >= 0;
      ok = ok && xmlTextWriterEndElement(w) >= 0;
    }
    ok = ok && xmlTextWriterEndElement(w) >= 0;
  }
  if (!ok) XmlFail(o);
}

void WriteXmlStep(const PtModule& pt, PtOutput& o, int n, double t) {
  xmlTextWriterPtr w = o.writer->xml;
  bool ok = xmlTextWriterStartElement(w, X("TimeStep")) >= 0;
  ok = ok && xmlTextWriterWriteFormatAttribute(w, X("nr"), "%d", n) >= 0;
  ok = ok && xmlTextWriterWriteElement(w, X("DateTime"), X(StepDateTime(pt, t).c_str())) >= 0;
  double v[16];
  char text[512];
  for (std::size_t k = 1; k <= pt.classes.size() && ok; ++k) {
    ok = xmlTextWriterStartElement(w, X("ParticleClass")) >= 0;
    ok = ok && xmlTextWriterWriteFormatAttribute(w, X("id"), "%d", static_cast<int>(k)) >= 0;
    for (int i = 1; i <= pt.nparticles && ok; ++i) {
      const Particle& p = pt.particles[i];
      if (p.cls != static_cast<int>(k) || !Active(p) || !Selected(o, i)) continue;
      char number[16];
      ok = xmlTextWriterStartElement(w, X("Particle")) >= 0;
      std::snprintf(number, sizeof number, "%d", i);
      ok = ok && xmlTextWriterWriteAttribute(w, X("Nr"), X(number)) >= 0;
      ok = ok && xmlTextWriterStartElement(w, X("Source")) >= 0;
      std::snprintf(number, sizeof number, "%d", p.source);
      ok = ok && xmlTextWriterWriteAttribute(w, X("ID"), X(number)) >= 0;
      ok = ok && xmlTextWriterEndElement(w) >= 0;
      const int nv = ParticleValues(pt, o, p, v);
      int len = 0;
      for (int j = 0; j < nv; ++j)
        len += std::snprintf(text + len, sizeof text - static_cast<std::size_t>(len), j ? " %.12g" : "%.12g", v[j]);
      ok = ok && xmlTextWriterWriteCDATA(w, X(text)) >= 0;
      ok = ok && xmlTextWriterEndElement(w) >= 0;
    }
    ok = ok && xmlTextWriterEndElement(w) >= 0;
  }
  ok = ok && xmlTextWriterEndElement(w) >= 0;
  if (!ok) XmlFail(o);
}

void OpenNetcdf(PtModule& pt, PtOutput& o) {
  PtOutput::Writer& wr = *o.writer;
  NcCheck(nc_create(o.file_name.c_str(), NC_CLOBBER | NC_NETCDF4, &wr.ncid), o, "creating");
  const int nc = wr.ncid;
  // The trajectories: the selected ids of the pool.
  wr.trajectory_of_id.assign(static_cast<std::size_t>(pt.capacity) + 1, -1);
  std::vector<int> ids;
  for (int i = 1; i <= pt.capacity; ++i)
    if (Selected(o, i)) {
      wr.trajectory_of_id[static_cast<std::size_t>(i)] = static_cast<int>(ids.size());
      ids.push_back(i);
    }
  int d_traj = 0, d_obs = 0;
  NcCheck(nc_def_dim(nc, "trajectory", std::max<std::size_t>(ids.size(), 1), &d_traj), o, "dimension trajectory");
  NcCheck(nc_def_dim(nc, "obs", NC_UNLIMITED, &d_obs), o, "dimension obs");
  auto text = [&](int var, const char* name, const std::string& value) {
    NcCheck(nc_put_att_text(nc, var, name, value.size(), value.c_str()), o, name);
  };
  text(NC_GLOBAL, "Conventions", "CF-1.8");
  text(NC_GLOBAL, "featureType", "trajectory");
  text(NC_GLOBAL, "title", "Particle tracks");
  text(NC_GLOBAL, "source", "VantorHD particle tracking");
  text(NC_GLOBAL, "projection", pt.mesh->projection);
  int v_traj = 0;
  NcCheck(nc_def_var(nc, "trajectory", NC_INT, 1, &d_traj, &v_traj), o, "variable trajectory");
  text(v_traj, "cf_role", "trajectory_id");
  text(v_traj, "long_name", "particle number");
  NcCheck(nc_def_var(nc, "trajectory_index", NC_INT, 1, &d_obs, &wr.v_index), o, "variable trajectory_index");
  text(wr.v_index, "long_name", "trajectory of the observation");
  text(wr.v_index, "instance_dimension", "trajectory");
  NcCheck(nc_def_var(nc, "time", NC_DOUBLE, 1, &d_obs, &wr.v_time), o, "variable time");
  text(wr.v_time, "standard_name", "time");
  text(wr.v_time, "units", "seconds since " + StepDateTime(pt, 0.0));
  const std::vector<VarInfo> vars = Variables(pt, o);
  for (const VarInfo& v : vars) {
    std::string name = v.code;
    if (pt.geographic && name == "x") name = "lon";
    if (pt.geographic && name == "y") name = "lat";
    if (name == "STATE_VARIABLE_1") name = "mass";
    int id = 0;
    NcCheck(nc_def_var(nc, name.c_str(), NC_DOUBLE, 1, &d_obs, &id), o, "variable");
    text(id, "long_name", v.name);
    if (name == "lon") text(id, "standard_name", "longitude"), text(id, "units", "degrees_east");
    else if (name == "lat") text(id, "standard_name", "latitude"), text(id, "units", "degrees_north");
    else if (name == "x") text(id, "standard_name", "projection_x_coordinate"), text(id, "units", "m");
    else if (name == "y") text(id, "standard_name", "projection_y_coordinate"), text(id, "units", "m");
    else if (name == "z") text(id, "units", "m"), text(id, "positive", "up"), text(id, "long_name", "level above datum");
    else if (name == "hdir") text(id, "units", "degree");
    else if (name == "age") text(id, "units", "s");
    else if (name == "mass") text(id, "units", "1");
    else text(id, "units", "m s-1");
    if (name == "x" || name == "y" || name == "lon" || name == "lat" || name == "z" || name == "mass" ||
        name == "age" || name == "hspeed" || name == "hdir" || name == "vspeed")
      text(id, "coordinates", pt.geographic ? "time lat lon z" : "time y x z");
    wr.v_values.push_back(id);
  }
  NcCheck(nc_enddef(nc), o, "definitions");
  if (!ids.empty()) {
    const std::size_t start = 0, count = ids.size();
    NcCheck(nc_put_vara_int(nc, v_traj, &start, &count, ids.data()), o, "writing trajectory");
  }
  // Buffers for one output step.
  const std::size_t cap = ids.size();
  wr.buf_index.resize(cap);
  wr.buf_time.resize(cap);
  wr.buf_values.assign(vars.size(), std::vector<double>(cap));
}

void WriteNetcdfStep(const PtModule& pt, PtOutput& o, double t) {
  PtOutput::Writer& wr = *o.writer;
  double v[16];
  std::size_t m = 0;
  for (int i = 1; i <= pt.nparticles; ++i) {
    const Particle& p = pt.particles[i];
    if (!Active(p) || !Selected(o, i)) continue;
    const int nv = ParticleValues(pt, o, p, v);
    wr.buf_index[m] = wr.trajectory_of_id[static_cast<std::size_t>(i)];
    wr.buf_time[m] = t;
    for (int j = 0; j < nv; ++j) wr.buf_values[static_cast<std::size_t>(j)][m] = v[j];
    ++m;
  }
  if (m == 0) return;
  const std::size_t start = wr.obs, count = m;
  NcCheck(nc_put_vara_int(wr.ncid, wr.v_index, &start, &count, wr.buf_index.data()), o, "writing");
  NcCheck(nc_put_vara_double(wr.ncid, wr.v_time, &start, &count, wr.buf_time.data()), o, "writing");
  for (std::size_t j = 0; j < wr.v_values.size(); ++j)
    NcCheck(nc_put_vara_double(wr.ncid, wr.v_values[j], &start, &count, wr.buf_values[j].data()), o, "writing");
  wr.obs += m;
}

}  // namespace

void OpenOutputsPT(PtModule& pt) {
  for (PtOutput& o : pt.outputs) {
    o.writer = std::make_shared<PtOutput::Writer>();
    if (o.netcdf) OpenNetcdf(pt, o);
    else OpenXml(pt, o);
  }
}

void WriteOutputsPT(PtModule& pt, int n) {
  for (PtOutput& o : pt.outputs) {
    if (!o.writer || !Due(o, n)) continue;
    const double t = n >= 0 ? n * pt.dt : pt.t_state;
    if (o.netcdf) WriteNetcdfStep(pt, o, t);
    else WriteXmlStep(pt, o, n, t);
  }
}

void CloseOutputsPT(PtModule& pt) {
  for (PtOutput& o : pt.outputs) {
    if (!o.writer) continue;
    PtOutput::Writer& wr = *o.writer;
    if (wr.xml) {
      const bool ok = xmlTextWriterEndDocument(wr.xml) >= 0;
      xmlFreeTextWriter(wr.xml);
      wr.xml = nullptr;
      if (!ok) XmlFail(o);
    }
    if (wr.ncid >= 0) {
      NcCheck(nc_close(wr.ncid), o, "closing");
      wr.ncid = -1;
    }
    o.writer.reset();
  }
}

}  // namespace vhd
