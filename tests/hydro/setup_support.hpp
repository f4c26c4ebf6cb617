#pragma once
// Helpers of the HD module tests: a generated mesh with its geometry, setup
// texts, a setup file with a log in a fresh folder, and the text of the log
// with wrapped message lines joined.

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "core/omp.hpp"
#include "core/run.hpp"
#include "hydro/hd_module.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"
#include "test_support.hpp"

namespace vhd::test {

// nx x ny cells of size dx x dy from (x0, y0), bed z(x, y).
inline RectangleMeshSpec RectSpec(int nx, int ny, double dx, double dy, std::function<double(double, double)> bed,
                                  CellLayout layout, double x0 = 0.0, double y0 = 0.0) {
  RectangleMeshSpec spec;
  spec.x0 = x0;
  spec.x1 = x0 + nx * dx;
  spec.y0 = y0;
  spec.y1 = y0 + ny * dy;
  spec.nx = nx;
  spec.ny = ny;
  spec.layout = layout;
  spec.bed = std::move(bed);
  return spec;
}

// The mesh of RectSpec (quadrilaterals unless told) with its geometry.
inline Mesh MakeMesh(int nx, int ny, double dx, double dy, std::function<double(double, double)> bed = {},
                     CellLayout layout = CellLayout::kQuadrilaterals, const std::string& projection = "NON-UTM",
                     double x0 = 0.0, double y0 = 0.0) {
  RectangleMeshSpec spec = RectSpec(nx, ny, dx, dy, std::move(bed), layout, x0, y0);
  spec.projection = projection;
  Mesh mesh;
  GenerateRectangleMesh(spec, mesh);
  SetupMeshGeometry(mesh);
  return mesh;
}

// A flat bed `depth` metres below datum.
inline std::function<double(double, double)> Flat(double depth) {
  return [depth](double, double) { return -depth; };
}

// The HD module section with mode 2, and a subsection of it with its keys.
inline const std::string kHd = "[VantorHD.HYDRODYNAMIC_MODULE]\nmode = 2\n";
inline std::string HdSection(const std::string& path, const std::string& keys) {
  return std::string("[VantorHD.HYDRODYNAMIC_MODULE.").append(path).append("]\n").append(keys);
}

// The log text with the continuation lines of wrapped messages joined to the
// line they continue, so that a long message can be searched as one text.
inline std::string JoinedLog(const std::string& path) {
  const std::string text = ReadTextFile(path);
  std::string out;
  std::size_t i = 0;
  while (i < text.size()) {
    if (text[i] == '\n') {
      std::size_t j = i + 1;
      while (j < text.size() && text[j] == ' ') ++j;
      // Continuation lines of "Fatal error: " and "Warning: " messages are
      // indented by the width of their prefix; a piece may itself begin with
      // a blank of the message.
      const std::size_t indent = j - i - 1;
      if (indent >= 9) {
        i += 1 + (indent >= 13 ? 13 : 9);
        continue;
      }
    }
    out += text[i++];
  }
  return out;
}

// Runs the statement of a death test. The child of a death test is a fork of
// a process whose OpenMP thread pool it does not inherit, so it works on one
// thread; parallel loops then run inline instead of waiting for lost workers.
template <class F>
void InChild(F&& statement) {
  OmpSetThreads(1);
  statement();
}

// Expects `statement` to stop the run and the log at log_path to hold `message`.
template <class F>
void ExpectStop(F&& statement, const std::string& log_path, const std::string& message) {
  EXPECT_EXIT(InChild(statement), testing::ExitedWithCode(1), "");
  const std::string log = JoinedLog(log_path);
  EXPECT_NE(log.find(message), std::string::npos) << "expected: " << message << "\nlog: " << log;
}

// A setup file in a fresh folder, opened with its log, and one HD setup run
// on a generated mesh.
class HdSetupFixture {
public:
  HdSetupFixture() = default;
  ~HdSetupFixture() {
    SktClose();
    CloseLogFile();
  }

  // Writes the setup text (the target line is added), opens it and the target.
  void Open(const std::string& body) {
    WriteTextFile(setup_path, "[VantorHD]\n" + body);
    SktOpenFile(setup_path, true);
    SktOpenTarget("VantorHD");
  }
  void Setup(const std::string& body, const Mesh& mesh, double dt = 30.0, int ndim = 2) {
    Open(body);
    time.dt = dt;
    modules.ndim = ndim;
    meshes.clear();
    meshes.push_back(mesh);
    SetupHD(hd, run, time, modules, meshes);
  }
  // Expects the setup to stop with `message` in the log.
  void ExpectSetupStops(const std::string& body, const Mesh& mesh, const std::string& message, int ndim = 2) {
    ExpectStop([&] { Setup(body, mesh, 30.0, ndim); }, log_path, message);
  }
  std::string Log() const { return JoinedLog(log_path); }

  TempDir dir;
  std::string setup_path = dir.file("model.toml");
  std::string log_path = dir.file("model.log");
  RunControl run;
  TimeAxis time;
  ModuleSelection modules;
  std::vector<Mesh> meshes;
  HdModule hd;
};

}  // namespace vhd::test
