// HD sub-steps on generated meshes: element-stage updates per second, peak
// memory per element and the share of the memory bandwidth of a STREAM-like
// triad measured in the same run.
//
//   bench_hd_step [--benchmark_filter=...]
// Counters: Melem_stages_per_s (elements x stages / wall-clock s),
// Melem_stages_per_cpu_s (per CPU-second of all threads), GBps_triad, and
// peak_bytes_per_element: the process's maximum resident set over the
// element count, which is the case's own peak when it runs alone or after
// smaller cases (the cases are listed smallest first).

#include <benchmark/benchmark.h>

#include <cmath>
#include <ctime>
#include <sys/resource.h>
#include <map>
#include <memory>
#include <vector>

#include "hd_case.hpp"
#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/time_step.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace {

using namespace vhd;

// Triad a = b + s c over arrays far larger than the caches (GB/s, counting
// 3 x 8 bytes per entry).
double TriadBandwidth() {
  static double best = 0;
  if (best > 0) return best;
  // 60 MB, twice the L3 cache, and less than the smallest case, so that the
  // peak resident set is the case's own.
  const int n = 2'500'000;
  std::vector<double> a(n, 0.0), b(n, 1.0), c(n, 2.0);
  for (int rep = 0; rep < 10; ++rep) {
    const double t0 = WallSeconds();
    double* pa = a.data();
    const double* pb = b.data();
    const double* pc = c.data();
    VHD_OMP_PARALLEL_FOR
    for (int i = 0; i < n; ++i) pa[i] = pb[i] + 3.0 * pc[i];
    const double t = WallSeconds() - t0;
    best = std::max(best, 3.0 * 8.0 * n / t / 1e9);
  }
  benchmark::DoNotOptimize(a.data());
  return best;
}

void BM_HdStep(benchmark::State& state) {
  const int elements = static_cast<int>(state.range(0));
  const int order = static_cast<int>(state.range(1));
  const int threads = static_cast<int>(state.range(2));
  OmpSetThreads(threads);
  const double triad = TriadBandwidth();
  auto c = bench::MakeHdCase(elements, order);
  int status = 0;
  double t = 0;
  const std::clock_t cpu0 = std::clock();  // CPU time of every thread of the process
  for (auto _ : state) {
    const double dt = CALCTIMESTEPHD(c->hd, c->solver, c->mesh, t, t + 1e9);
    StepHD(c->hd, c->solver, c->mesh, t, dt, status);
    t += dt;
  }
  const double cpu = static_cast<double>(std::clock() - cpu0) / CLOCKS_PER_SEC;
  if (status < 0) state.SkipWithError("the HD state blew up");
  const int ne = c->hd.state.nelements;
  const double stages = order == 2 ? 2.0 : 1.0;
  // Per CPU-second of all threads: what the cores deliver on a shared machine.
  state.counters["Melem_stages_per_cpu_s"] = ne * stages * 1e-6 * static_cast<double>(state.iterations()) / cpu;
  state.counters["Melem_stages_per_s"] =
      benchmark::Counter(ne * stages * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  state.counters["GBps_triad"] = triad;
  state.counters["elements"] = ne;
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  state.counters["peak_bytes_per_element"] = 1024.0 * static_cast<double>(usage.ru_maxrss) / ne;
  OmpSetThreads(1);
}

BENCHMARK(BM_HdStep)
    ->ArgNames({"elements", "order", "threads"})
    ->Args({100'000, 1, 1})
    ->Args({100'000, 1, 2})
    ->Args({100'000, 2, 1})
    ->Args({100'000, 2, 2})
    ->Args({1'000'000, 1, 1})
    ->Args({1'000'000, 1, 2})
    ->Args({1'000'000, 2, 1})
    ->Args({1'000'000, 2, 2})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime()
    ->MinTime(2.0);

}  // namespace

BENCHMARK_MAIN();
