// Gradient application and limiting on a 1,000,000-element mesh (jittered
// triangles), with 1 and 2 threads: elements per second.

#include <benchmark/benchmark.h>

#include <cmath>

#include "core/omp.hpp"
#include "mesh/generate.hpp"
#include "mesh/gradient.hpp"
#include "mesh/gradient_limiter.hpp"

namespace {

using namespace vhd;

struct Case {
  Mesh mesh;
  GradientStencil first_ring, two_rings;
  Array1<double> phi, u, v, gx, gy, hx, hy, vx, vy;
};

Case& Shared() {
  static Case c = [] {
    Case k;
    RectangleMeshSpec s;
    s.x1 = 10000;
    s.y1 = 5000;
    s.nx = 1000;
    s.ny = 500;
    s.layout = CellLayout::kRandomTriangles;
    s.jitter = 0.2;
    GenerateRectangleMesh(s, k.mesh);
    SetupMeshGeometry(k.mesh);
    SetupGradient(k.mesh, 2, Array1<int>(), Array1<int>(), 2, kBoundaryMirror, 4, k.first_ring);
    SetupGradient(k.mesh, 3, Array1<int>(), Array1<int>(), 2, kBoundaryMirror, 4, k.two_rings);
    const int ne = k.mesh.elements.nelements;
    for (auto* a : {&k.phi, &k.u, &k.v, &k.gx, &k.gy, &k.hx, &k.hy, &k.vx, &k.vy}) a->assign(ne, 0.0);
    for (int e = 1; e <= ne; ++e) {
      const double x = k.mesh.elements.xc[e], y = k.mesh.elements.yc[e];
      k.phi[e] = std::sin(x / 700) * std::cos(y / 500);
      k.u[e] = std::cos(x / 900);
      k.v[e] = std::sin(y / 300);
    }
    return k;
  }();
  return c;
}

void Report(benchmark::State& state, const Case& c) {
  state.SetItemsProcessed(state.iterations() * c.mesh.elements.nelements);
  state.counters["elements"] = c.mesh.elements.nelements;
}

void BM_GradientFirstRing(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTELEMENT2D(c.first_ring, c.phi, c.gx, c.gy);
    benchmark::ClobberMemory();
  }
  Report(state, c);
}

void BM_GradientTwoRings(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTELEMENT2D(c.two_rings, c.phi, c.gx, c.gy);
    benchmark::ClobberMemory();
  }
  Report(state, c);
}

void BM_GradientVelocity(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTVELOCITYELEMENT2D(c.first_ring, c.u, c.v, c.gx, c.gy, c.vx, c.vy);
    benchmark::ClobberMemory();
  }
  Report(state, c);
}

void BM_BarthJespersen(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  CALCGRADIENTELEMENT2D(c.first_ring, c.phi, c.gx, c.gy);
  for (auto _ : state) {
    CALCLIMITEDGRADIENTBJ2D(c.mesh, c.phi, Array1<int>(), c.gx, c.gy, c.hx, c.hy, 1e-12);
    benchmark::ClobberMemory();
  }
  Report(state, c);
}

void BM_GreenGauss(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTSIMPLE2D(c.mesh, c.phi, c.gx, c.gy);
    benchmark::ClobberMemory();
  }
  Report(state, c);
}

BENCHMARK(BM_GradientFirstRing)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GradientTwoRings)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GradientVelocity)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_BarthJespersen)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GreenGauss)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
