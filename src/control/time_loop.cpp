#include "control/time_loop.hpp"

#include <cmath>

#include "control/progress.hpp"
#include "control/signals.hpp"
#include "parallel/message_passing.hpp"

namespace vhd {

int RunSubSteps(ModuleSet& modules, int n, double dt, int& run_status) {
  Module* hd = modules.Get(ModuleKind::HD);
  const double t_end = n * dt;
  double t = (n - 1) * dt;
  int count = 0;
  while (std::fabs(t_end - t) > kSubStepTolerance) {
    double delta = hd ? hd->TimeStep(t, t_end) : t_end - t;
    if (!(delta > 0.0))
      FatalError(SubstituteValue("Time step " + std::to_string(n) +
                                     ": the hydrodynamic sub-step must be positive, found %",
                                 delta));
    delta = std::fmin(delta, t_end - t);
    t += delta;
    ++count;
    const StepTimes times{n, t, delta, t_end};
    for (const ModuleKind kind : kSubStepOrder) {
      Module* m = modules.Get(kind);
      if (!m) continue;
      m->Step(times, run_status);
      if (run_status < 0) return count;
    }
    StopIfSignalled();
  }
  return count;
}

namespace {

// Initial steps, opening of the outputs and the outputs at the first step
// (except hydrodynamics, whose first output follows the banner).
void RunInitialSteps(ModuleSet& modules, const ModuleSelection& selection, double t, int n_first,
                     int& run_status) {
  for (const ModuleKind kind : kInitialOrder) {
    Module* m = modules.Get(kind);
    if (!m) continue;
    if (!m->CheckCoupling(modules)) {
      modules.Remove(kind);
      continue;
    }
    const bool initial = kind != ModuleKind::HD || selection.hd > 1;
    if (initial && m->StartStep() == n_first) m->InitialStep(t, run_status);
    m->OpenOutputs();
    if (kind != ModuleKind::HD) m->WriteOutput(n_first);
  }
}

// The hydrodynamic mesh size figure of this step, summed over all processes.
double MeshSizeFigure(const ModuleSet& modules, const RunControl& run) {
  const Module* hd = modules.Get(ModuleKind::HD);
  const double local = hd ? hd->MeshSizeFigure() : 0.0;
  return SumOverProcesses(local, run);
}

}  // namespace

void RunTimeLoop(ModuleSet& modules, const TimeAxis& time, const ModuleSelection& selection,
                 RunControl& run, ProgressChannel* progress, TimingSet& overall) {
  StartTiming(overall, kTimerPre);
  const int n_first = time.first_step;
  const double t_first = time.TimeOfStep(n_first);
  int& run_status = run.run_status;
  Module* hd = modules.Get(ModuleKind::HD);

  RunInitialSteps(modules, selection, t_first, n_first, run_status);
  run_status = AgreeRunStatus(run_status, run);

  int n_done = n_first;
  if (run_status < 0) {
    if (hd) hd->WriteOutput(n_first);
    StopTiming(overall, kTimerPre);
  } else {
    WriteBanner("COMPUTATION STARTED");
    if (progress &&
        progress->Start(time.start, time.dt, n_first, time.last_step, CpuSeconds(), WallSeconds()))
      run_status = kRunStopRequested;
    run_status = AgreeRunStatus(run_status, run);
    StopTiming(overall, kTimerPre);
    if (hd) {
      StartTiming(overall, kTimerPre);
      hd->WriteOutput(n_first);
      StopTiming(overall, kTimerPre);
    }

    // A stop request seen before the first step ends the run before it. With
    // several processes every process takes part in the agreement on the run
    // status after each step, also one whose module failed, so that all of
    // them leave the loop together.
    for (int n = n_first + 1; n <= time.last_step && run_status == kRunNormal; ++n) {
      StartTiming(overall, kTimerCalc);
      n_done = n;
      RunSubSteps(modules, n, time.dt, run_status);
      const double mesh_figure = MeshSizeFigure(modules, run);
      if (run_status >= 0) {
        if (Module* pt = modules.Get(ModuleKind::PT)) {
          const double t_end = time.TimeOfStep(n);
          pt->Step(StepTimes{n, t_end, time.dt, t_end}, run_status);
        }

        StopTiming(overall, kTimerCalc);
        StartTiming(overall, kTimerPost);
        for (const ModuleKind kind : kOutputOrder)
          if (Module* m = modules.Get(kind)) m->WriteOutput(n);
        StopTiming(overall, kTimerPost);
        StartTiming(overall, kTimerCalc);

        if (progress && progress->Report(n, mesh_figure, CpuSeconds(), WallSeconds()) &&
            run_status == kRunNormal)
          run_status = kRunStopRequested;
      }
      run_status = AgreeRunStatus(run_status, run);
      StopTiming(overall, kTimerCalc);
      StopIfSignalled();
    }
    WriteBanner("COMPUTATION ENDED");
  }

  StartTiming(overall, kTimerPost);
  for (const ModuleKind kind : kOutputOrder) {
    Module* m = modules.Get(kind);
    if (!m) continue;
    if (run_status < 0) m->WriteOutput(-1);
    if (run_status > 0) m->FinishOutputs(n_done);
    m->CloseOutputs();
    m->CloseInputs();
  }
  if (run.nprocesses > 1) {
    BarrierAll(run);
    for (const ModuleKind kind : kOutputOrder)
      if (Module* m = modules.Get(kind)) m->OutputStatistics();
  }
  for (const ModuleKind kind : kReportOrder)
    if (Module* m = modules.Get(kind)) m->PrintStatistics();
  for (const ModuleKind kind : kReportOrder)
    if (Module* m = modules.Get(kind)) m->PrintTimings();
  StopTiming(overall, kTimerPost);
}

}  // namespace vhd
