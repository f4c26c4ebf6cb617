#include "control/run_setup.hpp"

#include <sys/resource.h>

#include <algorithm>
#include <string>
#include <vector>

#include "control/date_time.hpp"
#include "core/omp.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "parallel/message_passing.hpp"
#include "parallel/partition.hpp"

namespace vhd {

ComputeResources QueryComputeResources() { return {OmpMaxThreads(), OmpNumProcs()}; }

int ThreadCountFor(int request, const ComputeResources& resources) {
  int n = request == -1 ? resources.max_threads : request;
  n = std::min(n, resources.nprocessors);
  n = std::min(resources.max_threads, n);
  return std::max(n, 1);
}

void SetThreadCount(int request, const ComputeResources& resources, RunControl& run) {
  run.nthreads = ThreadCountFor(request, resources);
  OmpSetThreads(run.nthreads);
}

namespace {

// Lets the process hold up to limit open files (bounded by the hard limit).
void SetOpenFileLimit(int limit) {
  rlimit rl{};
  if (getrlimit(RLIMIT_NOFILE, &rl) != 0) return;
  rlim_t wanted = static_cast<rlim_t>(limit);
  if (rl.rlim_max != RLIM_INFINITY && wanted > rl.rlim_max) {
    Warning(SubstituteValue("MaxIOHandles: the system allows at most % open files",
                            static_cast<long long>(rl.rlim_max)));
    wanted = rl.rlim_max;
  }
  rl.rlim_cur = wanted;
  setrlimit(RLIMIT_NOFILE, &rl);
}

}  // namespace

void ReadSystemSection() {
  int limit = kMaxIOHandlesDefault;
  int status = 0;
  SktOpenSection("SYSTEM", kNoIndex, &status);
  if (status == 0) {
    SktReadKeyword("MaxIOHandles", limit, kMaxIOHandlesDefault);
    SktCloseSection();
    if (limit < 512 || limit > 2048) FatalError("MaxIOHandles must be between 512 - 2048 !");
  }
  SetOpenFileLimit(limit);
}

void ReadTimeSection(TimeAxis& time, const RunControl& run) {
  if (run.process_id <= 0) {
    SktOpenSection("TIME");
    std::vector<int> start;
    SktReadKeyword("start_time", start, 6, std::vector<int>{2004, 1, 1, 0, 0, 0});
    SktReadKeyword("time_step_interval", time.dt, 30.0);
    SktReadKeyword("number_of_time_steps", time.last_step, 100);
    const std::string path = SktSectionPath();
    SktCloseSection();
    std::copy(start.begin(), start.end(), time.start.begin());
    if (!IsValidDateTime(time.start))
      FatalError(path +
                 ": start_time is not a valid date and time (year month day hour minute "
                 "second)");
    if (!(time.dt > 0.0)) FatalError(path + ": time_step_interval must be greater than 0");
    if (time.last_step < 0) FatalError(path + ": number_of_time_steps must not be negative");
  }
  time.first_step = 0;
  BroadcastTimeAxis(time, run);
}

void ReadModuleSelection(ModuleSelection& s) {
  SktOpenSection("MODULE_SELECTION");
  SktReadKeyword("mode_of_hydrodynamic_module", s.hd, 2);
  SktReadKeyword("hydrodynamic_features", s.features, 1);
  SktReadKeyword("mode_of_transport_module", s.tr, 0);
  if (s.features == 1) {
    SktReadKeyword("mode_of_mud_transport_module", s.mt, 0);
    SktReadKeyword("mode_of_sand_transport_module", s.st, 0);
  } else {
    s.mt = 0;
    s.st = 0;
  }
  SktReadKeyword("mode_of_vitrax_module", s.vt, 0);
  if (s.features == 1)
    SktReadKeyword("mode_of_particle_tracking_module", s.pt, 0);
  else
    s.pt = 0;
  SktCloseSection();
  if (s.hd <= 0) FatalError("The Hydrodynnamic module must be included");
}

void SetupDomain(const RunControl& run, Domain& domain, ModuleSelection& selection, Subdomain& sub) {
  SetupSpaceDiscretization(domain, selection);
  Mesh& mesh = domain.meshes[0].mesh;
  if (run.nprocesses <= 1) {
    SetupSubdomain(mesh, Array1<int>(), 2, run, sub);
    return;
  }
  if (domain.number_of_meshes != 1 || domain.number_of_dimensions != 2 || mesh.ndim != 2)
    FatalError("SetupDomain: a run on several processes needs one 2D mesh (number_of_meshes 1, "
               "number_of_dimensions 2)");
  const PartitionSettings& ps = domain.meshes[0].partition;
  const Array1<int> part = PartitionMesh(mesh, ps, run, run.nmachines);
  SetupSubdomain(mesh, part, ps.type_of_halo_layer, run, sub);
  PrintMeshSummary(mesh, 0, true);
}

}  // namespace vhd
