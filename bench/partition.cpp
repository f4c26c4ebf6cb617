// Set-up time and quality of the partition of a 1,000,000-element mesh of
// jittered random triangles (renumbered along the Hilbert curve, as the
// domain setup leaves it).
//
//   bench_partition [--benchmark_filter=...]
// Arguments: type_of_partitioning, number of sub-domains, METIS NCUTS (the
// number of partitions METIS computes to keep the best; 5 by default).
// Counters: cut_faces (interior faces between two sub-domains: the halo of
// one layer), imbalance (largest sub-domain over the mean).

#include <benchmark/benchmark.h>

#include <algorithm>
#include <cmath>
#include <vector>

#include "mesh/generate.hpp"
#include "mesh/reorder.hpp"
#include "parallel/partition.hpp"

namespace {

using namespace vhd;

constexpr int kElements = 1'000'000;

const Mesh& BigMesh() {
  static const Mesh mesh = [] {
    Mesh m;
    RectangleMeshSpec spec;
    const int n = static_cast<int>(std::lround(std::sqrt(kElements / 2.0)));
    spec.nx = spec.ny = n;
    spec.x1 = spec.y1 = n * 10.0;
    spec.layout = CellLayout::kRandomTriangles;
    spec.jitter = 0.2;
    GenerateRectangleMesh(spec, m);
    ReorderMesh(m, ElementOrder(m, kReorderHilbert, 1, m.elements.nelements));
    SetupMeshGeometry(m);
    return m;
  }();
  return mesh;
}

void BM_Partition(benchmark::State& state) {
  const Mesh& mesh = BigMesh();
  PartitionSettings ps;
  ps.type_of_partitioning = static_cast<int>(state.range(0));
  const int nparts = static_cast<int>(state.range(1));
  ps.use_METIS5_options = 1;
  ps.metis5_options.assign(kMetisOptionCount, kOptionNotGiven);
  ps.metis5_options[7] = static_cast<int>(state.range(2));  // option_7: NCUTS
  RunControl run;
  run.nprocesses = nparts;
  Array1<int> part;
  for (auto _ : state) part = PartitionMesh(mesh, ps, run);
  const FaceTable& fc = mesh.faces;
  long cut = 0;
  for (int f = 1; f <= fc.nfaces; ++f)
    if (fc.element2[f] > 0 && part[fc.element1[f]] != part[fc.element2[f]]) ++cut;
  std::vector<long> count(static_cast<std::size_t>(nparts) + 1, 0);
  for (int p : part) ++count[static_cast<std::size_t>(p)];
  const long largest = *std::max_element(count.begin(), count.end());
  state.counters["cut_faces"] = static_cast<double>(cut);
  state.counters["imbalance"] = largest * nparts / static_cast<double>(mesh.elements.nelements);
}

BENCHMARK(BM_Partition)
    ->ArgNames({"type", "nparts", "ncuts"})
    ->Args({kPartitionMetis5, 2, 5})
    ->Args({kPartitionMetis5, 2, 1})
    ->Args({kPartitionMetis5, 4, 5})
    ->Args({kPartitionMetis5, 16, 5})
    ->Args({kPartitionMetis5, 16, 1})
    ->Args({kPartitionNoMetis, 2, 1})
    ->Args({kPartitionNoMetis, 16, 1})
    ->Unit(benchmark::kMillisecond)
    ->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
