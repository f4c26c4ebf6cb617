// The HD step on one mesh in three numberings: as generated (row by row),
// shuffled at random (as a mesh generator may number it), and shuffled and
// then renumbered by the engine (type_of_reordering 1 Hilbert curve, 2
// reverse Cuthill-McKee); and the set-up time of the renumbering beside the
// set-up of the mesh's tables and geometry.
//
//   bench_mesh_order [--benchmark_filter=...]
// Numbering argument: 0 generated, 1 shuffled, 2 shuffled + Hilbert,
// 3 shuffled + reverse Cuthill-McKee. Counters: Melem_stages_per_s (wall
// clock), Melem_stages_per_cpu_s (per CPU-second of all threads) and
// face_distance, the mean |element1 - element2| over the interior faces.

#include <benchmark/benchmark.h>

#include <chrono>
#include <cmath>
#include <ctime>
#include <memory>
#include <numeric>
#include <random>
#include <vector>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "hydro/time_step.hpp"
#include "mesh/generate.hpp"
#include "mesh/mesh.hpp"
#include "mesh/reorder.hpp"

namespace {

using namespace vhd;

constexpr int kElements = 1'000'000;

double Seconds() {
  return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count();
}

// Jittered random triangles (2 n^2 elements) with a sloping bed, before
// SetupMeshGeometry; shuffled: elements in a random order, nodes renumbered by
// their first use in it (so in a random order too).
void MakeMesh(bool shuffled, Mesh& mesh, double& side) {
  RectangleMeshSpec spec;
  const int n = static_cast<int>(std::lround(std::sqrt(kElements / 2.0)));
  spec.nx = spec.ny = n;
  spec.x1 = spec.y1 = side = n * 10.0;
  spec.layout = CellLayout::kRandomTriangles;
  spec.jitter = 0.2;
  spec.bed = [](double x, double) { return -5.0 - 1e-4 * x; };
  GenerateRectangleMesh(spec, mesh);
  if (!shuffled) return;
  std::vector<int> order(static_cast<std::size_t>(mesh.elements.nelements));
  std::iota(order.begin(), order.end(), 1);
  std::shuffle(order.begin(), order.end(), std::mt19937_64(12345));
  ReorderMesh(mesh, order);
  // The shuffled numbering is the user's.
  mesh.elements.file_index.clear();
  mesh.nodes.file_index.clear();
}

struct Case {
  Mesh mesh;
  HdModule hd;
  HdSolver solver;
};

// Second order, two stages, flooding and drying on; a tilted surface so that
// every face carries flow.
std::unique_ptr<Case> MakeCase(int numbering) {
  auto c = std::make_unique<Case>();
  double side = 0;
  MakeMesh(numbering > 0, c->mesh, side);
  if (numbering >= 2) {
    const int type = numbering == 2 ? kReorderHilbert : kReorderCuthillMcKee;
    ReorderMesh(c->mesh, ElementOrder(c->mesh, type, 1, c->mesh.elements.nelements));
  }
  SetupMeshGeometry(c->mesh);
  HdModule& hd = c->hd;
  hd.bed.type = kBedNone;
  hd.eddy.horizontal.type = kEddyNone;
  hd.time_step.dt_max_HD = 1e9;
  hd.time_step.CFL_critical_HD = 0.8;
  hd.flood_dry.type = 1;
  hd.flood_dry.drying_depth = 0.005;
  hd.flood_dry.flooding_depth = 0.05;
  hd.flood_dry.mass_depth = 0.1;
  hd.flood_dry.elevation_limit = 1e6;
  HdSolutionTechnique& s = hd.solution;
  s.type_of_Riemann_solver = 1;
  s.scheme_of_space_discretization_horizontal = 2;
  s.scheme_of_time_integration = 2;
  s.face_value_limiter = 2;
  s.gradient_limiter = 3;
  s.preserve_dU = true;
  s.face_average_d = 1;
  s.face_limit_dry = true;
  AllocateStateHD(hd, c->mesh);
  HdState& st = hd.state;
  for (int e = 1; e <= st.nelements; ++e) {
    st.eta[e] = 0.1 * std::sin(c->mesh.elements.xc[e] / side * 6.283);
    st.h[e] = st.eta[e] + st.d[e];
  }
  InitialFloodDryCodesHD(hd, c->mesh);
  SetupSolverHD(hd, c->mesh, c->solver);
  InitialStepHD(hd, c->solver, c->mesh);
  return c;
}

double MeanFaceDistance(const Mesh& mesh) {
  const FaceTable& fc = mesh.faces;
  double sum = 0;
  long count = 0;
  for (int f = 1; f <= fc.nfaces; ++f) {
    if (fc.element2[f] == 0) continue;
    sum += std::abs(fc.element1[f] - fc.element2[f]);
    ++count;
  }
  return count > 0 ? sum / static_cast<double>(count) : 0.0;
}

void BM_StepByNumbering(benchmark::State& state) {
  const int numbering = static_cast<int>(state.range(0));
  const int threads = static_cast<int>(state.range(1));
  OmpSetThreads(threads);
  auto c = MakeCase(numbering);
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
  state.counters["Melem_stages_per_cpu_s"] = ne * 2.0 * 1e-6 * static_cast<double>(state.iterations()) / cpu;
  state.counters["Melem_stages_per_s"] =
      benchmark::Counter(ne * 2.0 * 1e-6, benchmark::Counter::kIsIterationInvariantRate);
  state.counters["face_distance"] = MeanFaceDistance(c->mesh);
  OmpSetThreads(1);
}

BENCHMARK(BM_StepByNumbering)
    ->ArgNames({"numbering", "threads"})
    ->ArgsProduct({{0, 1, 2, 3}, {1, 2}})
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime()
    ->MinTime(2.0);

// Set-up of the shuffled mesh: the renumbering (order and ReorderMesh) and
// SetupMeshGeometry (faces, neighbour tables, geometry) after it; the
// counter reorder_share is the first over the second.
void BM_ReorderSetup(benchmark::State& state) {
  const int type = static_cast<int>(state.range(0));
  Mesh shuffled;
  double side = 0;
  MakeMesh(true, shuffled, side);
  double reorder = 0, geometry = 0;
  for (auto _ : state) {
    state.PauseTiming();
    Mesh mesh = shuffled;
    state.ResumeTiming();
    const double t0 = Seconds();
    ReorderMesh(mesh, ElementOrder(mesh, type, 1, mesh.elements.nelements));
    const double t1 = Seconds();
    SetupMeshGeometry(mesh);
    const double t2 = Seconds();
    reorder += t1 - t0;
    geometry += t2 - t1;
    benchmark::DoNotOptimize(mesh.faces.nfaces);
  }
  const double n = static_cast<double>(state.iterations());
  state.counters["reorder_ms"] = 1e3 * reorder / n;
  state.counters["geometry_ms"] = 1e3 * geometry / n;
  state.counters["reorder_share"] = reorder / geometry;
}

BENCHMARK(BM_ReorderSetup)->ArgName("type")->Arg(kReorderHilbert)->Arg(kReorderCuthillMcKee)->Unit(benchmark::kMillisecond)->Iterations(3);

}  // namespace

BENCHMARK_MAIN();
