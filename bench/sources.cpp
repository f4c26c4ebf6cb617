// The HD sub-step with rain, evaporation and 100 point sources against the
// same step without them, on generated basins of 100,000 and 1,000,000
// jittered random triangles (first order, one stage).
//
//   bench_sources [--benchmark_filter=...]
// Counter: Melem_stages_per_s (elements x stages / wall-clock s). The
// forcing's share of the step is 1 - (rate with) / (rate without).

#include <benchmark/benchmark.h>

#include <cmath>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

#include "core/omp.hpp"
#include "hd_case.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "hydro/time_step.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"

namespace {

using namespace vhd;

// Rain of 100 mm/h and evaporation of 10 mm/h; 100 sources on a 10 x 10
// grid over the basin: 60 inflows of 1 m3/s, 20 sinks of 0.5 m3/s and 10
// connected pairs moving 2 m3/s.
std::string ForcingSetup(double size) {
  std::string s =
      "[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION]\ntype_of_precipitation = 1\n"
      "type_of_evaporation = 1\n"
      "[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION.PRECIPITATION]\nformat = 0\n"
      "constant_value = 2400.0\n"
      "[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION.EVAPORATION]\nconstant_value = 240.0\n"
      "[VantorHD.HYDRODYNAMIC_MODULE.SOURCES]\nnumber_of_sources = 100\n";
  for (int i = 1; i <= 100; ++i) {
    const double x = (((i - 1) % 10) + 0.37) * size / 10, y = (((i - 1) / 10) + 0.61) * size / 10;
    s += "[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_" + std::to_string(i) + "]\ncoordinates = [" +
         std::to_string(x) + ", " + std::to_string(y) + "]\n";
    if (i <= 60) {
      s += "constant_value = 1.0\n";
    } else if (i <= 80) {
      s += "constant_value = -0.5\n";
    } else if (i <= 90) {
      s += "type = 3\nconnected_source = " + std::to_string(i + 10) + "\nconstant_values = [2.0, 0.0, 0.0]\n";
    } else {
      s += "type = 5\n";
    }
  }
  return s;
}

// The shared first-order basin, with the rain, evaporation and sources
// above when forcing is on.
std::unique_ptr<bench::HdCase> MakeCase(int elements, bool forcing) {
  return bench::MakeHdCase(elements, 1, [forcing](HdModule& hd, const Mesh& mesh) {
    hd.time_axis.last_step = 1000000;
    if (!forcing) return;
    const double size = 10.0 * std::lround(std::sqrt(mesh.elements.nelements / 2.0));  // basin side (m)
    const std::string path = (std::filesystem::temp_directory_path() / "bench_sources.toml").string();
    std::ofstream(path) << "[VantorHD]\n[VantorHD.HYDRODYNAMIC_MODULE]\n" << ForcingSetup(size);
    SktOpenFile(path, false);
    SktOpenTarget("VantorHD");
    SktOpenSection("HYDRODYNAMIC_MODULE", kNoIndex, nullptr, false);
    SetupPrecipitationHD(hd, mesh);
    SetupSourcesHD(hd, mesh);
    SktCloseSection();
    SktClose();
    std::filesystem::remove(path);
  });
}

void BM_HdStepForcing(benchmark::State& state) {
  const int elements = static_cast<int>(state.range(0));
  const bool forcing = state.range(1) != 0;
  OmpSetThreads(static_cast<int>(state.range(2)));
  auto c = MakeCase(elements, forcing);
  int status = 0;
  double t = 0;
  for (auto _ : state) {
    const double dt = CALCTIMESTEPHD(c->hd, c->solver, c->mesh, t, t + 1e9);
    StepHD(c->hd, c->solver, c->mesh, t, dt, status);
    t += dt;
  }
  if (status < 0) state.SkipWithError("the HD state blew up");
  state.counters["Melem_stages_per_s"] =
      benchmark::Counter(c->hd.state.nelements * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  OmpSetThreads(1);
}

BENCHMARK(BM_HdStepForcing)
    ->ArgNames({"elements", "forcing", "threads"})
    ->Args({100'000, 0, 1})
    ->Args({100'000, 1, 1})
    ->Args({1'000'000, 0, 1})
    ->Args({1'000'000, 1, 1})
    ->Args({1'000'000, 0, 2})
    ->Args({1'000'000, 1, 2})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime()
    ->MinTime(2.0);

}  // namespace

BENCHMARK_MAIN();
