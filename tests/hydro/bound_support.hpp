#pragma once
// Helpers of the boundary-condition tests: a generated channel with the HD
// settings of sw_case.hpp, boundary conditions read from a setup text, and
// sums of face fluxes along boundaries and cross sections.

#include <cmath>
#include <functional>
#include <string>

#include "hydro/bound.hpp"
#include "io/units.hpp"
#include "io/zrn.hpp"
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
  // of `setup_text` (CodeSection). nsteps overall steps make up the
  // simulation (the coverage of data files).
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

  // Initial state, solver and initial step (StartCase).
  void Start(const std::function<double(double, double)>& eta0,
             const std::function<double(double, double)>& u0 = {}) {
    StartCase(c, eta0, u0);
  }

  // The boundary face conditions of a code, j = 1 .. nfaces.
  const BoundaryFaceCondition& Face(int code, int j) const {
    const HdBoundary& bc = c.hd.boundary;
    return bc.faces[bc.codes[code].first_face + j - 1];
  }
  int NFaces(int code) const { return c.hd.boundary.codes[code].nfaces; }

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

// A point series of one item at the start of the time axis, every dt seconds.
inline void WriteSeries(const std::string& name, const TimeAxis& time, double dt, int nsteps,
                 const std::function<double(double)>& value) {
  ZrnFile f;
  ASSERT_EQ(zrnHeaderCreate(f, name, kZrnFileData, "boundary series"), 0);
  ASSERT_EQ(zrnSetEqCalendarAxis(f, zrnDateTime(time.start), dt), 0);
  ASSERT_EQ(zrnSetItemInfo(f, 1, "Level", kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble), 0);
  ASSERT_EQ(zrnSetItemAxisEqD0(f, 1), 0);
  ASSERT_EQ(zrnFileCreate(f), 0);
  for (int s = 0; s < nsteps; ++s) {
    const double v = value(s * dt);
    ASSERT_EQ(zrnWriteItemTimeStep(f, 0.0, &v, 1), 0);
  }
  ASSERT_EQ(zrnFileClose(f), 0);
}

// A straight channel along x: nx x ny cells of dx x dy, bed z(x, y), codes of
// the four sides.
inline RectangleMeshSpec Channel(int nx, int ny, double dx, double dy, std::function<double(double, double)> bed,
                                 int west, int east, int south = 1, int north = 1,
                                 CellLayout layout = CellLayout::kQuadrilaterals) {
  RectangleMeshSpec s = RectSpec(nx, ny, dx, dy, std::move(bed), layout);
  s.code_west = west;
  s.code_east = east;
  s.code_south = south;
  s.code_north = north;
  return s;
}

inline std::string CodeSection(int code, const std::string& body) {
  return HdSection("BOUNDARY_CONDITIONS.CODE_" + std::to_string(code), body);
}

}  // namespace vhd::test
