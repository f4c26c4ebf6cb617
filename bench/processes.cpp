// The HD step on several message-passing processes: the second-order
// two-stage step with flooding and drying on a generated mesh of random
// jittered triangles, split by METIS (the engine's default partition) with
// two halo layers, as a run on several processes sets it up.
//
//   mpirun -np P bench_processes [elements] [steps]      (default 1000000 20)
//   OMP_NUM_THREADS=T sets the threads of each process.
// Process 0 prints one line: processes, threads, seconds per sub-step,
// million element-stages per second (owned elements of all processes),
// the largest halo of a process, the halo exchange time per sub-step (the
// largest over the processes) and the peak resident memory per process.

#include <mpi.h>
#include <sys/resource.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "hydro/time_step.hpp"
#include "log/log.hpp"
#include "mesh/generate.hpp"
#include "mesh/reorder.hpp"
#include "parallel/message_passing.hpp"
#include "parallel/partition.hpp"
#include "parallel/subdomain.hpp"

int main(int argc, char** argv) {
  using namespace vhd;
  RunControl run;
  StartMessagePassing(argc, argv, run);
  const int elements = argc > 1 ? std::atoi(argv[1]) : 1000000;
  const int steps = argc > 2 ? std::atoi(argv[2]) : 20;
  if (run.nprocesses > 1) InitMpiTimings();

  Mesh mesh;
  RectangleMeshSpec spec;
  const int n = static_cast<int>(std::lround(std::sqrt(elements / 2.0)));
  spec.nx = spec.ny = n;
  spec.x1 = spec.y1 = n * 10.0;
  spec.layout = CellLayout::kRandomTriangles;
  spec.jitter = 0.2;
  spec.bed = [](double x, double) { return -5.0 - 1e-4 * x; };
  GenerateRectangleMesh(spec, mesh);
  ReorderMesh(mesh, ElementOrder(mesh, kReorderHilbert, 1, mesh.elements.nelements));
  SetupMeshGeometry(mesh);
  Subdomain sub;
  Array1<int> part;
  if (run.nprocesses > 1) part = PartitionMesh(mesh, PartitionSettings{}, run);
  SetupSubdomain(mesh, part, 2, run, sub);

  HdModule hd;
  hd.subdomain = &sub;
  hd.process_id = run.process_id;
  hd.nprocesses = run.nprocesses;
  hd.bed.type = kBedNone;
  hd.eddy.horizontal.type = kEddyNone;
  hd.time_step.dt_max_HD = 1e9;
  hd.time_step.CFL_critical_HD = 0.8;
  hd.flood_dry.type = 2;
  hd.flood_dry.drying_depth = 0.005;
  hd.flood_dry.flooding_depth = 0.05;
  hd.flood_dry.mass_depth = 0.1;
  hd.flood_dry.elevation_limit = 1e6;
  HdSolutionTechnique& s = hd.solution;
  s.scheme_of_space_discretization_horizontal = 2;
  s.scheme_of_time_integration = 2;
  s.face_value_limiter = 2;
  s.gradient_limiter = 3;
  s.preserve_dU = true;
  s.face_average_d = 1;
  s.face_limit_dry = true;
  AllocateStateHD(hd, mesh);
  HdState& st = hd.state;
  for (int e = 1; e <= st.nelements; ++e) {
    st.eta[e] = 0.1 * std::sin(mesh.elements.xc[e] / spec.x1 * 6.283);
    st.h[e] = st.eta[e] + st.d[e];
  }
  InitialFloodDryCodesHD(hd, mesh);
  HdSolver solver;
  SetupSolverHD(hd, mesh, solver);
  InitialStepHD(hd, solver, mesh);

  int status = 0;
  double t = 0.0;
  for (int k = 0; k < 2; ++k) {  // warm-up
    const double dt = CALCTIMESTEPHD(hd, solver, mesh, t, t + 1e9);
    StepHD(hd, solver, mesh, t, dt, status);
    t += dt;
  }
  TimingSet& mpi = MpiTimings();
  const double halo_before = mpi.timers.empty() ? 0.0 : mpi.timers[kMpiTimerHalo - 1].wall_total;
  MPI_Barrier(MPI_COMM_WORLD);
  const double start = MPI_Wtime();
  for (int k = 0; k < steps; ++k) {
    const double dt = CALCTIMESTEPHD(hd, solver, mesh, t, t + 1e9);
    StepHD(hd, solver, mesh, t, dt, status);
    t += dt;
  }
  MPI_Barrier(MPI_COMM_WORLD);
  const double seconds = (MPI_Wtime() - start) / steps;
  double halo = mpi.timers.empty() ? 0.0 : (mpi.timers[kMpiTimerHalo - 1].wall_total - halo_before) / steps;
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  double peak = usage.ru_maxrss / 1024.0;
  int halo_elements = sub.nlocal - sub.nowned;
  if (run.nprocesses > 1) {
    MPI_Allreduce(MPI_IN_PLACE, &halo, 1, MPI_DOUBLE, MPI_MAX, MPI_COMM_WORLD);
    MPI_Allreduce(MPI_IN_PLACE, &peak, 1, MPI_DOUBLE, MPI_MAX, MPI_COMM_WORLD);
    MPI_Allreduce(MPI_IN_PLACE, &halo_elements, 1, MPI_INT, MPI_MAX, MPI_COMM_WORLD);
  }
  if (run.process_id <= 0)
    std::printf("elements %d processes %d threads %d: %.4f s per sub-step, %.2f M element-stages/s, "
                "largest halo %d elements, halo exchange %.5f s per sub-step, peak %.0f MiB per process%s\n",
                mesh.elements.nelements, run.nprocesses, OmpMaxThreads(), seconds,
                2.0 * mesh.elements.nelements / seconds / 1e6, halo_elements, halo, peak,
                status < 0 ? " (blew up)" : "");
  EndMessagePassing(run);
  return 0;
}
