#pragma once
// Helpers of the boundary-condition tests: a generated channel with the HD
// settings of sw_case.hpp, boundary conditions read from a setup text, and
// sums of face fluxes along boundaries and cross sections.

#include <cmath>
#include <functional>
#include <string>

#include "hydro/bound.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "setup_support.hpp"
#include "sw_case.hpp"
#include "test_support.hpp"

namespace vhd::test {

// A channel run whose boundary conditions come from a setup file.
struct BoundCase {
  ~BoundCase() {
    SktClose();
    CloseLogFile();
  }

  // Generates the mesh (MakeCase) and reads the BOUNDARY_CONDITIONS sections
  // given in `sections` (their TOML text, without the section path prefix
  // "[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS"). nsteps overall
  // steps make up the simulation (the coverage of data files).
  void Make(const RectangleMeshSpec& spec, double overall_dt, int nsteps, const std::string& setup_text) {
    MakeCase(c, spec, overall_dt);
    c.hd.time_axis.dt = overall_dt;
    c.hd.time_axis.last_step = nsteps;
    WriteTextFile(setup_path, "[VantorHD]\n" + setup_text);
    SktOpenFile(setup_path, true);
    SktOpenTarget("VantorHD");
    SktOpenSection("HYDRODYNAMIC_MODULE", kNoIndex, nullptr, false);
    SetupBoundCondHD(c.hd, c.mesh, c.hd.boundary);
    SktCloseSection();
  }

  // Initial state from functions of position, then the solver and the
  // initial step (which brings the boundary values to t = 0).
  void Start(const std::function<double(double, double)>& eta0,
             const std::function<double(double, double)>& u0 = {}) {
    HdState& st = c.hd.state;
    for (int e = 1; e <= st.nelements; ++e) {
      const double x = c.mesh.elements.xc[e], y = c.mesh.elements.yc[e];
      st.h[e] = std::max(0.0, eta0(x, y) + st.d[e]);
      st.eta[e] = st.h[e] - st.d[e];
      st.u[e] = u0 ? u0(x, y) : 0.0;
      st.v[e] = 0.0;
    }
    CALCFLUXFROMVELOCITY(st);
    InitialFloodDryCodesHD(c.hd, c.mesh);
    SetupSolverHD(c.hd, c.mesh, c.solver);
    InitialStepHD(c.hd, c.solver, c.mesh);
  }

  // Sum of the face mass fluxes (m3/s, out of the domain positive) through
  // the faces of a boundary code.
  double BoundaryDischarge(int code) const {
    double sum = 0.0;
    for (int f = 1; f <= c.mesh.faces.nfaces; ++f)
      if (c.mesh.faces.element2[f] == 0 && c.mesh.faces.code[f] == code) sum += c.hd.state.face_flux_len[f];
    return sum;
  }

  // Discharge (m3/s) in +x through the interior faces on the line x = x0.
  double CrossSectionDischarge(double x0) const {
    double sum = 0.0;
    const FaceTable& F = c.mesh.faces;
    for (int f = 1; f <= F.nfaces; ++f) {
      if (F.element2[f] == 0 || std::abs(F.xf[f] - x0) > 1e-6 || std::abs(F.nx[f]) < 0.5) continue;
      sum += c.hd.state.face_flux_len[f] * (F.nx[f] > 0 ? 1.0 : -1.0);
    }
    return sum;
  }

  std::string Log() const { return JoinedLog(log_path); }

  TempDir dir;
  std::string setup_path = dir.file("model.toml");
  std::string log_path = dir.file("model.log");
  SwCase c;
};

// A straight channel along x: nx x ny quadrilaterals of dx x dy, bed z(x, y),
// codes of the four sides.
inline RectangleMeshSpec Channel(int nx, int ny, double dx, double dy, std::function<double(double, double)> bed,
                                 int west, int east, int south = 1, int north = 1,
                                 CellLayout layout = CellLayout::kQuadrilaterals) {
  RectangleMeshSpec s;
  s.x0 = 0.0;
  s.x1 = nx * dx;
  s.y0 = 0.0;
  s.y1 = ny * dy;
  s.nx = nx;
  s.ny = ny;
  s.layout = layout;
  s.bed = std::move(bed);
  s.code_west = west;
  s.code_east = east;
  s.code_south = south;
  s.code_north = north;
  return s;
}

inline std::string CodeSection(int code, const std::string& body) {
  return "[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_" + std::to_string(code) + "]\n" + body;
}

}  // namespace vhd::test
