// One transported component on the HD case of bench_hd_step: per HD sub-step
// the second-order HD step, then the gathering of its water movement and one
// transport step of the component (second order, Barth-Jespersen limiter,
// dispersion from a constant coefficient). Timed apart within each
// iteration, so that both shares come from the same run on the same machine,
// in CPU time of the process (all threads): on a shared machine the
// wall-clock time also counts the other processes' turns.
//
//   bench_transport [--benchmark_filter=...]
// Counters: Melem_updates_per_cpu_s (elements x transport sub-steps per
// CPU-second of the transport), Melem_stage_updates_per_cpu_s (times the
// stages of its time integration), ad_over_hd (transport CPU time over HD
// step CPU time), ad_over_hd_wall (the same in wall-clock time), substeps
// (transport sub-steps per HD sub-step).

#include <benchmark/benchmark.h>

#include <cmath>
#include <ctime>

#include "core/omp.hpp"
#include "hd_case.hpp"
#include "log/log.hpp"
#include "transport/ad_solver.hpp"

namespace {

using namespace vhd;

void BM_Transport(benchmark::State& state) {
  const int elements = static_cast<int>(state.range(0));
  const int scheme = static_cast<int>(state.range(1));
  const int threads = static_cast<int>(state.range(2));
  OmpSetThreads(threads);
  auto c = bench::MakeHdCase(elements, 2);
  AdSolutionTechnique technique;
  technique.scheme_of_time_integration = scheme;
  technique.scheme_of_space_discretization_horizontal = 2;
  AdSolver ad;
  ad.Setup(c->hd, c->solver, c->mesh, technique);
  AdFlow flow;
  AllocateFlowAD(c->hd, flow);
  AdComponent comp;
  AllocateComponentAD(c->hd, comp);
  const ElementTable& E = c->mesh.elements;
  for (int e = 1; e <= E.nelements; ++e) comp.c[e] = 1.0 + std::sin(E.xc[e] / 500.0) * std::cos(E.yc[e] / 700.0);
  comp.dispersion.assign(E.nelements, 0.1);
  BeginFlowAD(c->hd, flow);

  int status = 0;
  double t = 0, hd_wall = 0, ad_wall = 0;
  std::clock_t hd_cpu = 0, ad_cpu = 0;
  long long substeps = 0;
  for (auto _ : state) {
    const double t0 = WallSeconds();
    const std::clock_t c0 = std::clock();
    const double dt = CALCTIMESTEPHD(c->hd, c->solver, c->mesh, t, t + 1e9);
    StepHD(c->hd, c->solver, c->mesh, t, dt, status);
    const double t1 = WallSeconds();
    const std::clock_t c1 = std::clock();
    GatherFlowAD(c->hd, c->solver, c->mesh, dt, flow);
    substeps += ad.Step(flow, comp);
    const double t2 = WallSeconds();
    const std::clock_t c2 = std::clock();
    t += dt;
    hd_wall += t1 - t0;
    ad_wall += t2 - t1;
    hd_cpu += c1 - c0;
    ad_cpu += c2 - c1;
  }
  const double ad_seconds = static_cast<double>(ad_cpu) / CLOCKS_PER_SEC;
  if (status < 0) state.SkipWithError("the HD state blew up");
  const double ne = E.nelements;
  const double stages = scheme;
  state.counters["Melem_updates_per_cpu_s"] = ne * 1e-6 * static_cast<double>(substeps) / ad_seconds;
  state.counters["Melem_stage_updates_per_cpu_s"] = ne * stages * 1e-6 * static_cast<double>(substeps) / ad_seconds;
  state.counters["ad_over_hd"] = static_cast<double>(ad_cpu) / static_cast<double>(hd_cpu);
  state.counters["ad_over_hd_wall"] = ad_wall / hd_wall;
  state.counters["substeps"] = static_cast<double>(substeps) / static_cast<double>(state.iterations());
  state.counters["elements"] = ne;
  OmpSetThreads(1);
}

BENCHMARK(BM_Transport)
    ->ArgNames({"elements", "scheme", "threads"})
    ->Args({1'000'000, 1, 1})
    ->Args({1'000'000, 2, 1})
    ->Args({1'000'000, 3, 1})
    ->Args({1'000'000, 2, 2})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime()
    ->Iterations(8);

}  // namespace

BENCHMARK_MAIN();
