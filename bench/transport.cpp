// One transported component on the HD case of bench_hd_step: per HD sub-step
// the second-order HD step, then the gathering of its water movement and one
// transport step of the component (second order, Barth-Jespersen limiter,
// dispersion from a constant coefficient). Timed apart within each
// iteration, so that both shares come from the same run on the same machine.
//
//   bench_transport [--benchmark_filter=...]
// Counters: Melem_updates_per_s (elements x transport sub-steps per second
// of the transport, one thread), Melem_stage_updates_per_s (times the stages
// of its time integration), ad_over_hd (transport time over HD step time),
// substeps (transport sub-steps per HD sub-step).

#include <benchmark/benchmark.h>

#include <cmath>

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
  auto c = bench::MakeCase(elements, 2);
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
  double t = 0, hd_seconds = 0, ad_seconds = 0;
  long long substeps = 0;
  for (auto _ : state) {
    const double t0 = WallSeconds();
    const double dt = CALCTIMESTEPHD(c->hd, c->solver, c->mesh, t, t + 1e9);
    StepHD(c->hd, c->solver, c->mesh, t, dt, status);
    const double t1 = WallSeconds();
    GatherFlowAD(c->hd, c->solver, c->mesh, dt, flow);
    substeps += ad.Step(flow, comp);
    const double t2 = WallSeconds();
    t += dt;
    hd_seconds += t1 - t0;
    ad_seconds += t2 - t1;
  }
  if (status < 0) state.SkipWithError("the HD state blew up");
  const double ne = E.nelements;
  const double stages = scheme;
  state.counters["Melem_updates_per_s"] = ne * 1e-6 * static_cast<double>(substeps) / ad_seconds;
  state.counters["Melem_stage_updates_per_s"] = ne * stages * 1e-6 * static_cast<double>(substeps) / ad_seconds;
  state.counters["ad_over_hd"] = ad_seconds / hd_seconds;
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
    ->MinTime(2.0);

}  // namespace

BENCHMARK_MAIN();
