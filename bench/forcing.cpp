// The HD sub-step with wind, air pressure and Coriolis on against the same
// step without forcing, on generated meshes of random triangles.
//
//   bench_forcing [--benchmark_filter=...]
// Counters: Melem_stages_per_s (elements x stages / wall-clock s) and
// Melem_stages_per_cpu_s (per CPU-second of all threads). Argument forcing:
// 0 none; 1 wind and air pressure as a map of format 3 (values per element
// at every step; a constant map, so the time is that of the update, not of
// reading a file) and Coriolis of type 1; 2 Coriolis only; 3 a uniform wind
// (format 0) only.

#include <benchmark/benchmark.h>

#include <cmath>
#include <ctime>
#include <memory>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "hydro/time_step.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"

namespace {

using namespace vhd;

struct Case {
  Mesh mesh;
  HdModule hd;
  HdSolver solver;
};

// A square basin of random jittered triangles (2 n^2 elements) in UTM zone
// 32 with a sloping bed and a tilted surface, as bench_hd_step.
std::unique_ptr<Case> MakeCase(int elements, int order, int forcing) {
  auto c = std::make_unique<Case>();
  RectangleMeshSpec spec;
  const int n = static_cast<int>(std::lround(std::sqrt(elements / 2.0)));
  spec.nx = spec.ny = n;
  spec.x0 = 500000.0, spec.y0 = 6000000.0;
  spec.x1 = spec.x0 + n * 10.0, spec.y1 = spec.y0 + n * 10.0;
  spec.layout = CellLayout::kRandomTriangles;
  spec.jitter = 0.2;
  spec.projection = "UTM-32";
  spec.bed = [x0 = spec.x0](double x, double) { return -5.0 - 1e-4 * (x - x0); };
  GenerateRectangleMesh(spec, c->mesh);
  SetupMeshGeometry(c->mesh);
  HdModule& hd = c->hd;
  hd.bed.type = kBedNone;
  hd.eddy.horizontal.type = kEddyNone;
  hd.time_step.dt_max_HD = 1e9;
  hd.time_step.CFL_critical_HD = 0.8;
  hd.flood_dry.elevation_limit = 1e6;
  HdSolutionTechnique& s = hd.solution;
  s.type_of_Riemann_solver = 1;
  s.scheme_of_space_discretization_horizontal = order;
  s.scheme_of_time_integration = order;
  s.face_value_limiter = order == 2 ? 2 : 0;
  s.gradient_limiter = order == 2 ? 3 : 0;
  s.preserve_dU = order == 2;
  s.face_average_d = order == 2 ? 1 : 0;
  s.face_limit_dry = order == 2;
  HdWindForcing& w = hd.forcing.wind;
  if (forcing == 1) {
    w.type = 1;
    w.format = 3;
    InitDataSpec(w.data, 3, {990.0, 12.0, -5.0});
    w.data.type_of_soft_start = kSoftStartNone;
  } else if (forcing == 3) {
    w.type = 1;
    w.format = 0;
    w.constant_speed = 13.0;
    w.constant_direction = 290.0;
  }
  if (forcing == 1 || forcing == 2) {
    hd.forcing.coriolis.type = 1;
    hd.forcing.coriolis.coefficient_given = true;
    hd.forcing.coriolis.coefficient = 1.2e-4;
  }
  AllocateStateHD(hd, c->mesh);
  HdState& st = hd.state;
  for (int e = 1; e <= st.nelements; ++e) {
    st.eta[e] = 0.1 * std::sin((c->mesh.elements.xc[e] - spec.x0) / (n * 10.0) * 6.283);
    st.h[e] = st.eta[e] + st.d[e];
  }
  InitialFloodDryCodesHD(hd, c->mesh);
  SetupSolverHD(hd, c->mesh, c->solver);
  InitialStepHD(hd, c->solver, c->mesh);
  return c;
}

void BM_HdStepForcing(benchmark::State& state) {
  const int elements = static_cast<int>(state.range(0));
  const int order = static_cast<int>(state.range(1));
  const int threads = static_cast<int>(state.range(2));
  const int forcing = static_cast<int>(state.range(3));
  OmpSetThreads(threads);
  auto c = MakeCase(elements, order, forcing);
  int status = 0;
  double t = 0;
  const std::clock_t cpu0 = std::clock();
  for (auto _ : state) {
    const double dt = CALCTIMESTEPHD(c->hd, c->solver, c->mesh, t, t + 1e9);
    StepHD(c->hd, c->solver, c->mesh, t, dt, status);
    t += dt;
  }
  const double cpu = static_cast<double>(std::clock() - cpu0) / CLOCKS_PER_SEC;
  if (status < 0) state.SkipWithError("the HD state blew up");
  const int ne = c->hd.state.nelements;
  const double stages = order == 2 ? 2.0 : 1.0;
  state.counters["Melem_stages_per_cpu_s"] = ne * stages * 1e-6 * static_cast<double>(state.iterations()) / cpu;
  state.counters["Melem_stages_per_s"] =
      benchmark::Counter(ne * stages * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  OmpSetThreads(1);
}

BENCHMARK(BM_HdStepForcing)
    ->ArgNames({"elements", "order", "threads", "forcing"})
    ->Args({1'000'000, 1, 1, 0})
    ->Args({1'000'000, 1, 1, 1})
    ->Args({1'000'000, 1, 1, 2})
    ->Args({1'000'000, 1, 1, 3})
    ->Args({1'000'000, 2, 1, 0})
    ->Args({1'000'000, 2, 1, 1})
    ->Args({1'000'000, 2, 2, 0})
    ->Args({1'000'000, 2, 2, 1})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime()
    ->MinTime(2.0);

}  // namespace

BENCHMARK_MAIN();
