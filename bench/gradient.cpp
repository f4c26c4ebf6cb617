// Gradient application and limiting on a 1,000,000-element mesh (jittered
// triangles), with 1 and 2 threads. Rates are element-fields per second:
// elements x fields handled per call.
//
//   BM_GradientFirstRing, BM_GradientTwoRings  one field, least squares over
//                                              one / two rings of neighbours
//   BM_GradientVelocity                        two fields (u, v) in one pass
//   BM_GradientThreeFields                     three fields in one pass
//   BM_BarthJespersen                          one field through the mesh
//   BM_BarthJespersenTable                     one field through the
//                                              precomputed limiter table
//   BM_Reconstruct/threads/fused               the flow solver's per-stage
//       work on eta, P, Q with wet/dry flags (a dry strip along one side):
//       fused 0: per field, gradient then limiter through the mesh;
//       fused 1: the three gradients in one pass, then the three limiters in
//       one pass through the table
//   BM_GreenGauss                              Green-Gauss from face values

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
  LimiterGeometry2D limiter;
  Array1<int> wet;  // wet/dry codes: 1 wet, 0 dry
  Array1<double> eta, P, Q;
  Array1<double> eta_x, eta_y, P_x, P_y, Q_x, Q_y, lim_x, lim_y;
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
    SetupLimiterGeometry2D(k.mesh, k.limiter);
    const int ne = k.mesh.elements.nelements;
    k.wet.assign(ne, 1);
    for (auto* a : {&k.eta, &k.P, &k.Q, &k.eta_x, &k.eta_y, &k.P_x, &k.P_y, &k.Q_x, &k.Q_y, &k.lim_x, &k.lim_y})
      a->assign(ne, 0.0);
    for (int e = 1; e <= ne; ++e) {
      const double x = k.mesh.elements.xc[e], y = k.mesh.elements.yc[e];
      k.eta[e] = std::sin(x / 700) * std::cos(y / 500);
      k.P[e] = std::cos(x / 900);
      k.Q[e] = std::sin(y / 300);
      if (x > 9000) k.wet[e] = 0;
    }
    return k;
  }();
  return c;
}

void Report(benchmark::State& state, const Case& c, int fields) {
  state.SetItemsProcessed(state.iterations() * c.mesh.elements.nelements * fields);
  state.counters["elements"] = c.mesh.elements.nelements;
  state.counters["fields"] = fields;
}

void BM_GradientFirstRing(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTELEMENT2D(c.first_ring, c.eta, c.eta_x, c.eta_y);
    benchmark::ClobberMemory();
  }
  Report(state, c, 1);
}

void BM_GradientTwoRings(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTELEMENT2D(c.two_rings, c.eta, c.eta_x, c.eta_y);
    benchmark::ClobberMemory();
  }
  Report(state, c, 1);
}

void BM_GradientVelocity(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTVELOCITYELEMENT2D(c.first_ring, c.P, c.Q, c.P_x, c.P_y, c.Q_x, c.Q_y);
    benchmark::ClobberMemory();
  }
  Report(state, c, 2);
}

void BM_GradientThreeFields(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  const GradientField fields[3] = {{&c.eta, &c.eta_x, &c.eta_y}, {&c.P, &c.P_x, &c.P_y}, {&c.Q, &c.Q_x, &c.Q_y}};
  for (auto _ : state) {
    CALCGRADIENTALLELEMENT2D(c.first_ring, fields);
    benchmark::ClobberMemory();
  }
  Report(state, c, 3);
}

void BM_BarthJespersen(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  CALCGRADIENTELEMENT2D(c.first_ring, c.eta, c.eta_x, c.eta_y);
  for (auto _ : state) {
    CALCLIMITEDGRADIENTBJ2D(c.mesh, c.eta, Array1<int>(), c.eta_x, c.eta_y, c.lim_x, c.lim_y, 1e-12);
    benchmark::ClobberMemory();
  }
  Report(state, c, 1);
}

void BM_BarthJespersenTable(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  CALCGRADIENTELEMENT2D(c.first_ring, c.eta, c.eta_x, c.eta_y);
  for (auto _ : state) {
    CALCLIMITEDGRADIENTBJ2D(c.limiter, c.eta, Array1<int>(), c.eta_x, c.eta_y, c.lim_x, c.lim_y, 1e-12);
    benchmark::ClobberMemory();
  }
  Report(state, c, 1);
}

void BM_Reconstruct(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  const bool fused = state.range(1) != 0;
  const GradientField fields[3] = {{&c.eta, &c.eta_x, &c.eta_y}, {&c.P, &c.P_x, &c.P_y}, {&c.Q, &c.Q_x, &c.Q_y}};
  for (auto _ : state) {
    if (fused) {
      CALCGRADIENTALLELEMENT2D(c.first_ring, fields);
      CALCLIMITEDGRADIENTALLBJ2D(c.limiter, c.wet, fields, 1e-12);
    } else {
      for (const GradientField& f : fields) {
        CALCGRADIENTELEMENT2D(c.first_ring, *f.value, *f.gx, *f.gy);
        CALCLIMITEDGRADIENTBJ2D(c.mesh, *f.value, c.wet, *f.gx, *f.gy, *f.gx, *f.gy, 1e-12);
      }
    }
    benchmark::ClobberMemory();
  }
  Report(state, c, 3);
}

void BM_GreenGauss(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    CALCGRADIENTSIMPLE2D(c.mesh, c.eta, c.eta_x, c.eta_y);
    benchmark::ClobberMemory();
  }
  Report(state, c, 1);
}

BENCHMARK(BM_GradientFirstRing)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GradientTwoRings)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GradientVelocity)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GradientThreeFields)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_BarthJespersen)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_BarthJespersenTable)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(BM_Reconstruct)
    ->ArgNames({"threads", "fused"})
    ->ArgsProduct({{1, 2}, {0, 1}})
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);
BENCHMARK(BM_GreenGauss)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
