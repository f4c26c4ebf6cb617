// Particle tracking on the HD benchmark basin of 1,000,000 jittered random
// triangles (bench/hd_case.hpp) with a swirling current: 1,000,000
// particles spread over the basin, advected (Heun, with the element walk)
// and dispersed (D = 1 m2/s) each step of 10 s; and the rate at which the
// track files take one output step of all particles.
//
//   bench_particles [--benchmark_filter=...]
// Counters: Mparticle_steps_per_s (particle steps / wall-clock s, the step's
// node-value updates of the current included), Mparticles_per_s (particles
// written / s) and MB_per_s (file bytes / s) for the track files.

#include <benchmark/benchmark.h>

#include <cmath>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

#include "core/omp.hpp"
#include "hd_case.hpp"
#include "io/setup.hpp"
#include "particles/pt_module.hpp"

namespace {

using namespace vhd;

struct PtCase {
  std::unique_ptr<bench::HdCase> hd;
  PtModule pt;
  int n = 0;
};

// The setup of the module: one dispersing class and a 1000 x 1000 grid of
// release points over the basin, released at once; one output when a file
// name is given.
std::unique_ptr<PtCase> MakePtCase(const std::string& track_file) {
  auto c = std::make_unique<PtCase>();
  c->hd = bench::MakeHdCase(1'000'000, 1);
  const Mesh& mesh = c->hd->mesh;
  HdState& st = c->hd->hd.state;
  const double size = mesh.nodes.x[mesh.nodes.nnodes] - mesh.nodes.x[1];
  for (int e = 1; e <= st.nelements; ++e) {
    const double x = mesh.elements.xc[e] / size * 6.283, y = mesh.elements.yc[e] / size * 6.283;
    st.u[e] = 0.5 * std::sin(x) * std::cos(y);
    st.v[e] = -0.5 * std::cos(x) * std::sin(y);
  }
  std::string s =
      "[VantorHD]\n[VantorHD.PARTICLE_TRACKING_MODULE]\nmode = 2\n"
      "[VantorHD.PARTICLE_TRACKING_MODULE.CLASSES.CLASS_1]\n"
      "[VantorHD.PARTICLE_TRACKING_MODULE.CLASSES.CLASS_1.DISPERSION.HORIZONTAL_DISPERSION]\n"
      "type = 1\nconstant_value = 1.0\n"
      "[VantorHD.PARTICLE_TRACKING_MODULE.SOURCES]\nnumber_of_Sources = 1\n"
      "[VantorHD.PARTICLE_TRACKING_MODULE.SOURCES.SOURCE_1]\ntype = 2\nformat = 2\ninitial_source = true\n"
      "coordinate_type = \"NON-UTM\"\n"
      "[VantorHD.PARTICLE_TRACKING_MODULE.SOURCES.SOURCE_1.GRIDDED_SOURCE]\norigin = [0.0, 0.0]\n"
      "width = " + std::to_string(size) + "\nheight = " + std::to_string(size) + "\nrows = 1000\ncolumns = 1000\n"
      "[VantorHD.PARTICLE_TRACKING_MODULE.SOURCES.SOURCE_1.CLASS_1]\nnumber_of_particles_per_timestep = 1000000\n";
  if (!track_file.empty())
    s += "[VantorHD.PARTICLE_TRACKING_MODULE.OUTPUTS]\nnumber_of_outputs = 1\n"
         "[VantorHD.PARTICLE_TRACKING_MODULE.OUTPUTS.OUTPUT_1]\nfile_name = \"" + track_file + "\"\n"
         "[VantorHD.PARTICLE_TRACKING_MODULE.OUTPUTS.OUTPUT_1.PARTICLE_TRACK]\nAGE = true\n";
  const std::string path = (std::filesystem::temp_directory_path() / "bench_particles.toml").string();
  std::ofstream(path) << s;
  SktOpenFile(path, false);
  SktOpenTarget("VantorHD");
  TimeAxis time;
  time.dt = 10.0;
  time.last_step = 1'000'000;
  RunControl run;
  SetupPT(c->pt, 2, run, time, {&mesh});
  SktClose();
  std::filesystem::remove(path);
  UpdateInitStepPT(c->pt, st);
  StepPT(c->pt, st, ++c->n);  // the release
  return c;
}

void BM_ParticleStep(benchmark::State& state) {
  OmpSetThreads(static_cast<int>(state.range(0)));
  auto c = MakePtCase("");
  for (auto _ : state) StepPT(c->pt, c->hd->hd.state, ++c->n);
  state.counters["Mparticle_steps_per_s"] =
      benchmark::Counter(c->pt.nparticles * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  OmpSetThreads(1);
}

BENCHMARK(BM_ParticleStep)->ArgNames({"threads"})->Arg(1)->Arg(2)->Unit(benchmark::kMillisecond)->UseRealTime()->MinTime(5.0);

void BM_TrackWrite(benchmark::State& state) {
  const std::string ext = state.range(0) == 0 ? ".xml" : ".nc";
  const std::string file = (std::filesystem::temp_directory_path() / ("bench_tracks" + ext)).string();
  auto c = MakePtCase(file);
  OpenOutputsPT(c->pt);
  for (auto _ : state) WriteOutputsPT(c->pt, c->n);
  CloseOutputsPT(c->pt);
  const double bytes = static_cast<double>(std::filesystem::file_size(file));
  state.counters["Mparticles_per_s"] =
      benchmark::Counter(c->pt.nparticles * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  state.counters["MB_per_s"] = benchmark::Counter(bytes * 1e-6, benchmark::Counter::kIsRate);
  std::filesystem::remove(file);
}

BENCHMARK(BM_TrackWrite)->ArgNames({"netcdf"})->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->UseRealTime()->MinTime(5.0);

}  // namespace

BENCHMARK_MAIN();
