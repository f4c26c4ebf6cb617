#include "control/driver.hpp"

#include <cstdio>
#include <cstdlib>
#include <string>

#include "control/command_line.hpp"
#include "control/module.hpp"
#include "control/progress.hpp"
#include "control/run_setup.hpp"
#include "control/signals.hpp"
#include "control/time_loop.hpp"
#include "core/run.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "parallel/message_passing.hpp"

namespace vhd {

namespace {

constexpr const char* kTargetName = "VantorHD";

// Target-level keywords. They only matter with several processes, but a
// single process reads them too, so that a setup file shared by both kinds of
// run is not warned about; it keeps its log whatever delete_logfile says.
void ReadTargetKeywords(RunControl& run) {
  SktReadKeyword("delete_logfile", run.delete_logfile, 1);
  SktReadKeyword("merge_data_default", run.merge_data_default, 2);
  if (run.process_id < 0) run.delete_logfile = 0;
}

void WriteCompletion(int run_status) {
  WriteLogLine("");
  if (run_status == kRunNormal)
    WriteLogLine("  Normal run completion");
  else if (run_status == kRunStopRequested)
    WriteLogLine("  Run cancelled by user");
  else
    WriteLogLine("  Abnormal run completion");
}

}  // namespace

int RunVantorHD(int argc, char** argv) {
  SetFlushToZero();
  RunControl run;
  StartMessagePassing(argc, argv, run);
  const ComputeResources resources = QueryComputeResources();
  InstallSignalHandlers();

  const CommandLine cl = ScanCommandLine(argc, argv);
  run.program_path = cl.program;
  if (!cl.error.empty()) StopRun(cl.error);
  run.setup_file = cl.setup_file;
  run.gpu_devices = cl.gpu_devices;
  int status = 0;
  SktOpenFile(run.setup_file, true, run.process_id, &status);
  if (status != 0) StopRun(run.program_path + ": Unable to open " + run.setup_file);
  run.log_file = LogFileName(run.setup_file, run.process_id);
  WriteComputingEnvironment(run, resources.max_threads, resources.nprocessors);
  SktOpenTarget(kTargetName);

  SetThreadCount(2, resources, run);

  TimingSet overall;
  InitTiming(overall, "Overall", 4);
  AddTiming(overall, kTimerPre, "Pre-processing");
  AddTiming(overall, kTimerCalc, "Calculation");
  AddTiming(overall, kTimerPost, "Post-processing");
  AddTiming(overall, kTimerTotal, "Total");
  if (run.nprocesses > 1) InitMpiTimings();
  StartTiming(overall, kTimerTotal);
  StartTiming(overall, kTimerPre);

  ProgressChannel progress;
  if (run.process_id <= 0)
    progress.Open(ProgressModeFromEnvironment(std::getenv("TANO_PROGRESS")), run.log_file);
  ReadTargetKeywords(run);

  ReadSystemSection();
  TimeAxis time;
  ReadTimeSection(time, run);
  ModuleSelection selection;
  Domain domain;
  Subdomain subdomain;
  SetupDomain(run, domain, selection, subdomain);
  StopIfSignalled();
  ReadModuleSelection(selection);

  int nthreads = run.process_id <= 0 ? ThreadCountFor(-1, resources) : 0;
  BroadcastInt(nthreads, run);
  SetThreadCount(nthreads, resources, run);

  ModuleSet modules;
  SetupModules(modules, ModuleContext{run, time, selection, domain, subdomain});
  SktReportUnusedKeywords();
  StopIfSignalled();

  StopTiming(overall, kTimerPre);
  RunTimeLoop(modules, time, selection, run, run.process_id <= 0 ? &progress : nullptr, overall);

  if (run.nprocesses > 1) PrintTimings(MpiTimings());
  StopTiming(overall, kTimerTotal);
  PrintTimings(overall);

  PrintMemoryUsage(PeakMemoryMiB());
  PrintPerformance(run.nthreads, run.gpu_devices);
  StopIfSignalled();
  WriteCompletion(run.run_status);
  progress.Close();
  SktClose();
  CloseLogFile();
  if (run.process_id >= 1 && run.delete_logfile >= 1) std::remove(run.log_file.c_str());
  EndMessagePassing(run);
  // A run ended by a module's failure (negative run status) must not look
  // like a success to the caller.
  kwoExit(run.run_status < 0 ? 1 : 0);
}

}  // namespace vhd
