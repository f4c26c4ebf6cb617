// Setup cost of a large mesh: generating a mesh of about 1,000,000 jittered
// triangles (or mixed triangles and quadrilaterals), reading it back from an
// ASCII .mesh and a .zrnu file, and building its faces, geometry and
// neighbour tables. Reports the peak resident memory of the process as a
// counter (MiB).

#include <benchmark/benchmark.h>

#include <filesystem>
#include <string>

#include "log/log.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"
#include "mesh/read_mesh.hpp"

namespace {

vhd::RectangleMeshSpec MillionSpec(vhd::CellLayout layout) {
  vhd::RectangleMeshSpec s;
  s.x1 = 70800.0;
  s.y1 = 70700.0;
  s.nx = 708;
  s.ny = 707;
  if (layout == vhd::CellLayout::kMixed) s.nx = s.ny = 816;  // half of the cells are quadrilaterals
  s.layout = layout;
  s.jitter = 0.2;
  s.seed = 12345;
  s.code_west = 2;
  s.code_east = 3;
  s.bed = [](double x, double y) { return -5.0 - 1e-4 * x - 5e-5 * y; };
  return s;
}

void BM_GenerateMesh(benchmark::State& state) {
  const vhd::RectangleMeshSpec spec = MillionSpec(vhd::CellLayout::kRandomTriangles);
  for (auto _ : state) {
    vhd::Mesh mesh;
    vhd::GenerateRectangleMesh(spec, mesh);
    benchmark::DoNotOptimize(mesh.elements.node_list.data());
    state.counters["elements"] = mesh.elements.nelements;
  }
  state.counters["peak_MiB"] = vhd::PeakMemoryMiB();
}

void BM_SetupMeshGeometry(benchmark::State& state) {
  const auto layout = static_cast<vhd::CellLayout>(state.range(0));
  vhd::Mesh basic;
  vhd::GenerateRectangleMesh(MillionSpec(layout), basic);
  for (auto _ : state) {
    state.PauseTiming();
    vhd::Mesh mesh = basic;
    state.ResumeTiming();
    vhd::SetupMeshGeometry(mesh);
    benchmark::DoNotOptimize(mesh.faces.nx.data());
    state.counters["elements"] = mesh.elements.nelements;
    state.counters["faces"] = mesh.faces.nfaces;
  }
  state.counters["peak_MiB"] = vhd::PeakMemoryMiB();
}

// Reading the generated mesh from a file (0: ASCII .mesh, 1: .zrnu) and
// building its geometry: the whole mesh setup of a run.
void BM_ReadMeshAndGeometry(benchmark::State& state) {
  const std::string file = (std::filesystem::temp_directory_path() /
                            (state.range(0) == 0 ? "vhd_bench_1m.mesh" : "vhd_bench_1m.zrnu"))
                               .string();
  {
    vhd::Mesh generated;
    vhd::GenerateRectangleMesh(MillionSpec(vhd::CellLayout::kRandomTriangles), generated);
    if (state.range(0) == 0) vhd::WriteMeshAscii(generated, file);
    else vhd::WriteMeshZrnu(generated, file);
  }
  for (auto _ : state) {
    vhd::Mesh mesh;
    vhd::ReadMeshFile(mesh, file);
    vhd::SetupMeshGeometry(mesh);
    benchmark::DoNotOptimize(mesh.faces.nx.data());
    state.counters["elements"] = mesh.elements.nelements;
  }
  state.counters["peak_MiB"] = vhd::PeakMemoryMiB();
  std::filesystem::remove(file);
}

}  // namespace

BENCHMARK(BM_ReadMeshAndGeometry)->Arg(0)->Arg(1)->Unit(benchmark::kMillisecond)->Iterations(2);
BENCHMARK(BM_GenerateMesh)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_SetupMeshGeometry)
    ->Arg(static_cast<int>(vhd::CellLayout::kRandomTriangles))
    ->Arg(static_cast<int>(vhd::CellLayout::kMixed))
    ->Unit(benchmark::kMillisecond)
    ->Iterations(3);

BENCHMARK_MAIN();
