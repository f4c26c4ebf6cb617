#pragma once
// Helpers of the particle tests: a generated mesh with a prescribed flow
// state (no hydrodynamic solve: the current is the exact field of the case),
// a setup file with its log, and the PT setup on them.

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "../hydro/setup_support.hpp"
#include "particles/pt_module.hpp"

namespace vhd::test {

// The flow state of a mesh: surface eta, bed from the nodes' mean, current
// u(x, y), v(x, y) at the element centres; dry where the depth is below
// h_dry.
struct FlowCase {
  std::function<double(double, double)> u = [](double, double) { return 0.0; };
  std::function<double(double, double)> v = [](double, double) { return 0.0; };
  double eta = 0.0;
  double h_dry = 0.005;
};

inline HdState MakeState(const Mesh& mesh, const FlowCase& flow) {
  HdState s;
  const int ne = mesh.elements.nelements;
  s.nelements = s.nelements_owned = s.nelements_local = ne;
  for (Array1<double>* a : {&s.eta, &s.d, &s.h, &s.u, &s.v, &s.P, &s.Q, &s.tau_x, &s.tau_y}) a->assign(ne, 0.0);
  s.wetdry.assign(ne, kWet);
  for (int e = 1; e <= ne; ++e) {
    double zb = 0.0;
    const int nc = ElementNodeCount(mesh.elements, e);
    for (int j = 1; j <= nc; ++j) zb += mesh.nodes.z[ElementNode(mesh.elements, e, j)];
    zb /= nc;
    s.d[e] = -zb;
    s.h[e] = std::max(0.0, flow.eta - zb);
    s.eta[e] = s.h[e] > 0.0 ? flow.eta : zb;
    if (s.h[e] < flow.h_dry) {
      s.wetdry[e] = kDry;
      continue;
    }
    s.u[e] = flow.u(mesh.elements.xc[e], mesh.elements.yc[e]);
    s.v[e] = flow.v(mesh.elements.xc[e], mesh.elements.yc[e]);
  }
  return s;
}

// A PT setup on one mesh: the setup text (the PT module section and its
// sections, the target line added), the time axis and the flow.
class PtFixture {
 public:
  ~PtFixture() {
    CloseOutputsPT(pt);
    SktClose();
    CloseLogFile();
  }
  void Setup(const std::string& body, const Mesh& m, double dt, int nsteps) {
    WriteTextFile(setup_path, "[VantorHD]\n" + body);
    SktOpenFile(setup_path, true);
    SktOpenTarget("VantorHD");
    time.dt = dt;
    time.first_step = 0;
    time.last_step = nsteps;
    SetupPT(pt, 2, run, time, {&m});
  }
  // Runs steps first .. last of the flow state.
  void Run(const HdState& state, int first, int last) {
    if (first == 1) UpdateInitStepPT(pt, state);
    for (int n = first; n <= last; ++n) {
      StepPT(pt, state, n);
      WriteOutputsPT(pt, n);
    }
  }
  void ExpectSetupStops(const std::string& body, const Mesh& m, const std::string& message) {
    ExpectStop([&] { Setup(body, m, 10.0, 10); }, log_path, message);
  }

  TempDir dir;
  std::string setup_path = dir.file("model.toml");
  std::string log_path = dir.file("model.log");
  RunControl run;
  TimeAxis time;
  PtModule pt;
};

// The PT module section with one class and the class's extra keys and
// process sections (texts with their own headers).
inline std::string PtModuleText(const std::string& class_keys = "", const std::string& more = "") {
  return "[VantorHD.PARTICLE_TRACKING_MODULE]\nmode = 2\n"
         "[VantorHD.PARTICLE_TRACKING_MODULE.CLASSES]\nnumber_of_classes = 1\n"
         "[VantorHD.PARTICLE_TRACKING_MODULE.CLASSES.CLASS_1]\nname = \"Test\"\n" +
         class_keys + more;
}

inline const std::string kPtPath = "[VantorHD.PARTICLE_TRACKING_MODULE.";

// A process sub-section of class 1.
inline std::string ClassSection(const std::string& path, const std::string& keys) {
  return kPtPath + "CLASSES.CLASS_1." + path + "]\n" + keys;
}

// One gridded source of rows x columns cell centres over the rectangle from
// (x0, y0), released once at step 1.
inline std::string GridSource(double x0, double y0, double width, double height, int rows, int columns,
                              const std::string& coordinate_type = "NON-UTM", const std::string& extra = "") {
  return kPtPath + "SOURCES]\nnumber_of_Sources = 1\n" + kPtPath +
         "SOURCES.SOURCE_1]\ntype = 2\nformat = 2\ninitial_source = true\nvertical_type = 1\n"
         "coordinate_type = \"" + coordinate_type + "\"\n" + extra + kPtPath +
         "SOURCES.SOURCE_1.GRIDDED_SOURCE]\nformat = 0\norigin = [" + std::to_string(x0) + ", " +
         std::to_string(y0) + "]\nwidth = " + std::to_string(width) + "\nheight = " + std::to_string(height) +
         "\nrows = " + std::to_string(rows) + "\ncolumns = " + std::to_string(columns) + "\n" + kPtPath +
         "SOURCES.SOURCE_1.CLASS_1]\nnumber_of_particles_per_timestep = " + std::to_string(rows * columns) + "\n";
}

// One point source at (x, y) releasing n particles once, at step 1.
inline std::string PointSource(double x, double y, int n, const std::string& extra = "") {
  return kPtPath + "SOURCES]\nnumber_of_Sources = 1\n" + kPtPath +
         "SOURCES.SOURCE_1]\ntype = 1\nformat = 0\ninitial_source = true\ncoordinate_type = \"NON-UTM\"\n"
         "coordinates = [" + std::to_string(x) + ", " + std::to_string(y) + ", 0.0]\n" + extra + kPtPath +
         "SOURCES.SOURCE_1.CLASS_1]\nnumber_of_particles_per_timestep = " + std::to_string(n) + "\n";
}

}  // namespace vhd::test
