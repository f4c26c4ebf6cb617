#include "control/tr_driver_module.hpp"

#include "log/log.hpp"

namespace vhd {

void TrDriverModule::Setup(const ModuleContext& context) {
  const Module* hd = context.modules ? context.modules->Get(ModuleKind::HD) : nullptr;
  hd_ = dynamic_cast<const HdDriverModule*>(hd);
  if (!hd_) FatalError("Flow data from input not possible");
  run_ = &context.run;
  dt_overall_ = context.time.dt;
  const Mesh& mesh = hd_->mesh();
  SetupStructureTR(tr_, hd_->hd(), mesh, context.time, context.selection);
  SetupOutputsTR(outputs_, tr_, mesh, context.run, context.time);
  SetupSolverTR(tr_, hd_->hd(), hd_->solver(), mesh);
}

void TrDriverModule::Start() {
  InitialStepTR(tr_, hd_->hd());
  StartBudgetsTR(outputs_, tr_, hd_->hd(), hd_->mesh());
}

void TrDriverModule::InitialStep(double t, int& /*run_status*/) {
  InitialStepTR(tr_, hd_->hd());
  t_state_ = t;
}

void TrDriverModule::OpenOutputs() {
  OpenOutputFilesTR(outputs_, hd_->mesh());
  if (tr_.started) StartBudgetsTR(outputs_, tr_, hd_->hd(), hd_->mesh());
}

void TrDriverModule::WriteOutput(int n) {
  // Step -1 writes the current state at the time it was reached.
  const double t = n >= 0 ? n * dt_overall_ : t_state_;
  WriteOutputTR(outputs_, tr_, hd_->hd(), hd_->mesh(), n, t);
}

void TrDriverModule::Step(const StepTimes& times, int& /*run_status*/) {
  const bool running = tr_.started;
  StepTR(tr_, hd_->hd(), hd_->solver(), hd_->mesh(), times.t, times.dt);
  t_state_ = times.t;
  if (running) {
    UpdateOutputsTR(outputs_, hd_->hd(), hd_->mesh(), times.dt);
  } else if (times.t >= tr_.start_time - 1e-6) {
    // The HD sub-step reached the start time: the transport starts from here.
    Start();
  }
}

void TrDriverModule::CloseOutputs() { CloseOutputFilesTR(outputs_); }

void TrDriverModule::CloseInputs() { CloseInputsTR(tr_); }

void TrDriverModule::OutputStatistics() { OutputStatisticsTR(outputs_, *run_); }

void TrDriverModule::PrintStatistics() {
  WriteBanner("Transport Statistics");
  WriteValueLine("Number of transport steps              : %", static_cast<double>(tr_.n_steps));
  WriteValueLine("Number of advection-dispersion steps   : %", static_cast<double>(tr_.n_substeps));
  WriteBanner("");
}

void TrDriverModule::PrintTimings() { vhd::PrintTimings(tr_.timing); }

}  // namespace vhd
