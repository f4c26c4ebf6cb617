// Element search on a 1,000,000-element mesh (jittered triangles): tree
// building, and point searches per second with 1 and 2 threads.

#include <benchmark/benchmark.h>

#include <random>
#include <vector>

#include "core/omp.hpp"
#include "mesh/generate.hpp"
#include "mesh/search_tree.hpp"

namespace {

using namespace vhd;

struct Case {
  Mesh mesh;
  SearchTree2D tree;
  std::vector<double> x, y;
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
    BuildSearchTree2D(k.mesh, k.tree);
    std::mt19937 rng(1);
    std::uniform_real_distribution<double> ux(0, 10000), uy(0, 5000);
    for (int p = 0; p < 100000; ++p) {
      k.x.push_back(ux(rng));
      k.y.push_back(uy(rng));
    }
    return k;
  }();
  return c;
}

void BM_BuildSearchTree(benchmark::State& state) {
  Case& c = Shared();
  for (auto _ : state) {
    SearchTree2D tree;
    BuildSearchTree2D(c.mesh, tree);
    benchmark::DoNotOptimize(tree.cells.data());
  }
  state.SetItemsProcessed(state.iterations() * c.mesh.elements.nelements);
}

void BM_FindElement(benchmark::State& state) {
  Case& c = Shared();
  OmpSetThreads(static_cast<int>(state.range(0)));
  const int n = static_cast<int>(c.x.size());
  long long found = 0;
  for (auto _ : state) {
    long long sum = 0;
    VHD_OMP_PARALLEL_FOR_REDUCTION(+, sum)
    for (int p = 0; p < n; ++p) sum += FindElementID2DSearchTree(c.x[p], c.y[p], c.mesh, c.tree) > 0;
    found = sum;
  }
  state.SetItemsProcessed(state.iterations() * n);
  state.counters["found"] = static_cast<double>(found);
}

BENCHMARK(BM_BuildSearchTree)->Unit(benchmark::kMillisecond)->Iterations(2);
BENCHMARK(BM_FindElement)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
