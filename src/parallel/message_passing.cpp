#include "parallel/message_passing.hpp"

// The C interface only (Open MPI would otherwise pull in its C++ bindings,
// which the build does not link).
#define OMPI_SKIP_MPICXX 1
#define MPICH_SKIP_MPICXX 1
#include <mpi.h>
#include <unistd.h>

#include <algorithm>
#include <limits>
#include <map>
#include <string>
#include <vector>

namespace vhd {

namespace {

int g_nprocesses = 1;
TimingSet g_mpi_timings;

void Check(int rc) { CheckMpiCall(rc); }

bool MpiActive() {
  int initialized = 0, finalized = 0;
  MPI_Initialized(&initialized);
  MPI_Finalized(&finalized);
  return initialized && !finalized;
}

// Runs on every process exit: a process leaving on its own while others run
// takes all of them down; a single process just finalizes.
void AbortOrFinalize(int status) {
  if (!MpiActive()) return;
  if (g_nprocesses > 1)
    MPI_Abort(MPI_COMM_WORLD, status);
  else
    MPI_Finalize();
}

}  // namespace

void CheckMpiCall(int rc) {
  if (rc == MPI_SUCCESS) return;
  char text[MPI_MAX_ERROR_STRING];
  int length = 0;
  MPI_Error_string(rc, text, &length);
  FatalError(std::string(text, static_cast<std::size_t>(length)));
}

void StartMessagePassing(int& argc, char**& argv, RunControl& run) {
  run.process_id = -1;
  run.nprocesses = 1;
  int provided = 0;
  if (MPI_Init_thread(&argc, &argv, MPI_THREAD_FUNNELED, &provided) != MPI_SUCCESS) return;
  SetExitHook(AbortOrFinalize);
  MPI_Comm_set_errhandler(MPI_COMM_WORLD, MPI_ERRORS_RETURN);
  int rank = 0, size = 1;
  Check(MPI_Comm_rank(MPI_COMM_WORLD, &rank));
  Check(MPI_Comm_size(MPI_COMM_WORLD, &size));
  g_nprocesses = size;
  if (size > 1) {
    run.process_id = rank;
    run.nprocesses = size;
  }
}

void EndMessagePassing(const RunControl& run) {
  if (!MpiActive()) return;
  if (run.nprocesses > 1) Check(MPI_Barrier(MPI_COMM_WORLD));
  MPI_Finalize();
}

void BarrierAll(const RunControl& run) {
  if (run.nprocesses > 1) Check(MPI_Barrier(MPI_COMM_WORLD));
}

void BroadcastTimeAxis(TimeAxis& time, const RunControl& run) {
  if (run.nprocesses <= 1) return;
  Check(MPI_Bcast(time.start.data(), 6, MPI_INT, 0, MPI_COMM_WORLD));
  Check(MPI_Bcast(&time.dt, 1, MPI_DOUBLE, 0, MPI_COMM_WORLD));
  Check(MPI_Bcast(&time.last_step, 1, MPI_INT, 0, MPI_COMM_WORLD));
}

void BroadcastInt(int& value, const RunControl& run) {
  if (run.nprocesses <= 1) return;
  Check(MPI_Bcast(&value, 1, MPI_INT, 0, MPI_COMM_WORLD));
}

double SumOverProcesses(double value, const RunControl& run) {
  if (run.nprocesses <= 1) return value;
  double sum = 0.0;
  Check(MPI_Allreduce(&value, &sum, 1, MPI_DOUBLE, MPI_SUM, MPI_COMM_WORLD));
  return sum;
}

int AgreeRunStatus(int status, const RunControl& run) {
  if (run.nprocesses <= 1) return status;
  // One reduction gives the smallest status of all and the status of
  // process 0 (the others offer the largest integer there).
  int local[2] = {status, run.process_id == 0 ? status : std::numeric_limits<int>::max()};
  int global[2] = {0, 0};
  Check(MPI_Allreduce(local, global, 2, MPI_INT, MPI_MIN, MPI_COMM_WORLD));
  return global[0] < 0 ? global[0] : global[1];
}

void WriteComputingEnvironment(RunControl& run, int max_threads, int nprocessors) {
  char name[MPI_MAX_PROCESSOR_NAME] = {};
  int length = 0;
  if (MpiActive())
    Check(MPI_Get_processor_name(name, &length));
  else
    gethostname(name, sizeof name - 1);
  std::vector<char> all(static_cast<std::size_t>(run.nprocesses) * MPI_MAX_PROCESSOR_NAME, '\0');
  if (run.nprocesses > 1)
    Check(MPI_Allgather(name, MPI_MAX_PROCESSOR_NAME, MPI_CHAR, all.data(), MPI_MAX_PROCESSOR_NAME,
                        MPI_CHAR, MPI_COMM_WORLD));
  else
    std::copy(name, name + MPI_MAX_PROCESSOR_NAME, all.begin());
  std::map<std::string, int> machines;
  for (int p = 0; p < run.nprocesses; ++p)
    ++machines[std::string(all.data() + static_cast<std::size_t>(p) * MPI_MAX_PROCESSOR_NAME)];

  run.nmachines = static_cast<int>(machines.size());
  WriteBanner("Computing Environment");
  WriteValueLine("Local processor name : %", name);
  WriteValueLine("Number of processes  : %", run.nprocesses);
  WriteValueLine("Local process id     : %", run.process_id);
  WriteValueLine("Number of processors : %", nprocessors);
  WriteValueLine("Max number of threads: %", max_threads);
  WriteValueLine("Number of machines   : %", static_cast<int>(machines.size()));
  for (const auto& [machine, count] : machines)
    WriteValueLine("Machine " + machine + " (%)", count);
  WriteBanner("");
}

TimingSet& MpiTimings() { return g_mpi_timings; }

void InitMpiTimings() {
  InitTiming(g_mpi_timings, "MPI Communication", 9);
  AddTiming(g_mpi_timings, kMpiTimerHalo, "Halo data");
  AddTiming(g_mpi_timings, kMpiTimerAdditional, "Additional data");
  AddTiming(g_mpi_timings, kMpiTimerTotal, "Total");
}

}  // namespace vhd
