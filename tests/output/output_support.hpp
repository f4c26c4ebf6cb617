#pragma once
// Helpers of the output tests: a generated mesh with an HD state that the
// test fills with a known field, a setup file whose HYDRODYNAMIC_MODULE holds
// the outputs under test, and the HD solver for runs that need face fluxes.

#include <cmath>
#include <functional>
#include <string>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "hydro/time_step.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/generate.hpp"
#include "output/hd_output.hpp"
#include "test_support.hpp"

namespace vhd::test {

using Field = std::function<double(double, double)>;

class OutputCase {
public:
  OutputCase() {
    OmpSetThreads(1);
    time.dt = 30.0;
    time.last_step = 40;
  }
  ~OutputCase() {
    SktClose();
    CloseLogFile();
  }

  // nx x ny cells of dx x dy from the origin, bed level z(x, y).
  void MakeMesh(int nx, int ny, double dx, double dy, Field bed = {},
                CellLayout layout = CellLayout::kQuadrilaterals) {
    RectangleMeshSpec spec;
    spec.x1 = nx * dx;
    spec.y1 = ny * dy;
    spec.nx = nx;
    spec.ny = ny;
    spec.layout = layout;
    spec.bed = std::move(bed);
    GenerateRectangleMesh(spec, mesh);
    SetupMeshGeometry(mesh);
  }

  // Drying and flooding switched on.
  void FloodDry() {
    hd.flood_dry.type = 1;
    hd.flood_dry.drying_depth = 0.005;
    hd.flood_dry.flooding_depth = 0.05;
    hd.flood_dry.mass_depth = 0.1;
  }

  // Writes the setup file (the HYDRODYNAMIC_MODULE table and the body), opens
  // it with its log, allocates the state and reads the outputs.
  void Setup(const std::string& body) {
    WriteTextFile(setup_path, "[VantorHD]\n[VantorHD.HYDRODYNAMIC_MODULE]\nmode = 2\n" + body);
    SktOpenFile(setup_path, true);
    SktOpenTarget("VantorHD");
    hd.bed.type = kBedNone;
    hd.eddy.horizontal.type = kEddyNone;
    hd.overall_dt = time.dt;
    hd.time_step.CFL_critical_HD = 0.9;
    hd.time_step.dt_max_HD = time.dt;
    hd.time_step.dt_min_HD = 0.01;
    hd.flood_dry.elevation_limit = 1e6;
    AllocateStateHD(hd, mesh);
    SetupOutputsHD(out, mesh, run, time);
  }

  // State from a surface elevation and a velocity (functions of the centroid).
  void Fill(const Field& eta, const Field& u = {}, const Field& v = {}) {
    HdState& s = hd.state;
    for (int e = 1; e <= s.nelements; ++e) {
      const double x = mesh.elements.xc[e], y = mesh.elements.yc[e];
      s.h[e] = std::max(0.0, eta(x, y) + s.d[e]);
      s.eta[e] = s.h[e] - s.d[e];
      s.u[e] = u ? u(x, y) : 0.0;
      s.v[e] = v ? v(x, y) : 0.0;
    }
    CALCFLUXFROMVELOCITY(s);
  }

  // Flood/dry codes, solver tables and the initial step, then the files.
  void Start() {
    InitialFloodDryCodesHD(hd, mesh);
    SetupSolverHD(hd, mesh, solver);
    InitialStepHD(hd, solver, mesh);
    OpenOutputFilesHD(out, hd, mesh);
  }

  // Overall steps n0+1 .. n1 with the outputs of every sub-step and step.
  void Run(int n0, int n1) {
    for (int n = n0 + 1; n <= n1; ++n) {
      double t = (n - 1) * time.dt;
      const double t1 = n * time.dt;
      while (std::fabs(t1 - t) > 1e-6 && status >= 0) {
        const double dt = CALCTIMESTEPHD(hd, solver, mesh, t, t1);
        StepHD(hd, solver, mesh, t, dt, status);
        UpdateOutputsHD(out, hd, solver, mesh, dt);
        t += dt;
      }
      WriteOutputHD2D(out, hd, mesh, n, t1);
    }
  }

  std::string Log() const { return ReadTextFile(log_path); }
  std::string File(const std::string& name) const { return dir.file(name); }

  TempDir dir;
  std::string setup_path = dir.file("model.toml");
  std::string log_path = dir.file("model.log");
  Mesh mesh;
  HdModule hd;
  HdSolver solver;
  RunControl run;
  TimeAxis time;
  HdOutputs out;
  int status = 0;
};

}  // namespace vhd::test
