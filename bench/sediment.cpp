// Sand transport against the HD step on the basin of hd_case.hpp: one sub-step
// of the sand module (bed slopes, helical flow, bed load, bed update handed to
// the flow state) per iteration, and the second-order two-stage HD sub-step it
// follows, timed in the same program.
//
//   bench_sediment [--benchmark_filter=...]
// Counters: Melem_per_s (elements / wall-clock s). The ratio of the two times
// per sub-step is the share the sand adds to the flow (bench/README.md).
//
// The sand step (helical flow off or on) runs on the case's state after one
// HD step, with a current
// of 0.3 to 0.9 m/s set in it, a drag coefficient of 0.02 (the case's bed
// resistance is off) and a grain diameter of 0.1 mm, so that the sand moves
// in every element and each formula runs its full path (moving_share).

#include <benchmark/benchmark.h>

#include <cmath>
#include <memory>

#include "core/omp.hpp"
#include "hd_case.hpp"
#include "hydro/time_step.hpp"
#include "sediment/st_module.hpp"

namespace {

using namespace vhd;

void BM_HdStepOrder2(benchmark::State& state) {
  OmpSetThreads(static_cast<int>(state.range(1)));
  auto c = bench::MakeHdCase(static_cast<int>(state.range(0)), 2);
  int status = 0;
  double t = 0;
  for (auto _ : state) {
    const double dt = CALCTIMESTEPHD(c->hd, c->solver, c->mesh, t, t + 1e9);
    StepHD(c->hd, c->solver, c->mesh, t, dt, status);
    t += dt;
  }
  if (status < 0) state.SkipWithError("the HD state blew up");
  state.counters["Melem_per_s"] =
      benchmark::Counter(c->hd.state.nelements * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  OmpSetThreads(1);
}

void BM_SandStep(benchmark::State& state) {
  OmpSetThreads(static_cast<int>(state.range(3)));
  auto c = bench::MakeHdCase(static_cast<int>(state.range(0)), 2);
  int status = 0;
  const double dt = CALCTIMESTEPHD(c->hd, c->solver, c->mesh, 0.0, 1e9);
  StepHD(c->hd, c->solver, c->mesh, 0.0, dt, status);
  // A current of 0.3 to 0.9 m/s that meanders (curved streamlines).
  HdState& s = c->hd.state;
  for (int e = 1; e <= s.nelements; ++e) {
    const double x = c->mesh.elements.xc[e], y = c->mesh.elements.yc[e];
    s.u[e] = 0.6 + 0.3 * std::sin(y / 300.0);
    s.v[e] = 0.3 * std::cos(x / 300.0);
    s.P[e] = s.u[e] * s.h[e];
    s.Q[e] = s.v[e] * s.h[e];
    s.cf[e] = 0.02;
  }
  StModule st;
  st.bed_load.formula = static_cast<int>(state.range(1));
  st.grain_diameter = 1e-4;
  st.helical_flow = static_cast<int>(state.range(2));
  st.morphological_factor = 10.0;
  AllocateST(st, c->hd, c->mesh);
  SetupTimingST(st);
  double t = dt;
  for (auto _ : state) {
    t += dt;
    StepST(st, c->hd, c->mesh, t, dt);
  }
  long long moving = 0;
  for (int e = 1; e <= st.nowned; ++e) moving += st.qx[e] != 0.0 || st.qy[e] != 0.0 ? 1 : 0;
  state.counters["moving_share"] = static_cast<double>(moving) / st.nowned;
  state.counters["Melem_per_s"] =
      benchmark::Counter(s.nelements * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  OmpSetThreads(1);
}

BENCHMARK(BM_HdStepOrder2)
    ->ArgNames({"elements", "threads"})
    ->Args({1'000'000, 1})
    ->Args({1'000'000, 2})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime()
    ->MinTime(2.0);

BENCHMARK(BM_SandStep)
    ->ArgNames({"elements", "formula", "helical", "threads"})
    ->Args({1'000'000, 1, 0, 1})
    ->Args({1'000'000, 2, 0, 1})
    ->Args({1'000'000, 3, 0, 1})
    ->Args({1'000'000, 4, 0, 1})
    ->Args({1'000'000, 4, 1, 1})
    ->Args({1'000'000, 4, 0, 2})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime()
    ->MinTime(2.0);

}  // namespace

BENCHMARK_MAIN();
