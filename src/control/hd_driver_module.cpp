#include "control/hd_driver_module.hpp"

#include <vector>

#include "hydro/time_step.hpp"
#include "log/log.hpp"

namespace vhd {

void HdDriverModule::Setup(const ModuleContext& context) {
  std::vector<const Mesh*> meshes;
  for (const DomainMesh& dm : context.domain.meshes) meshes.push_back(&dm.mesh);
  hd_.subdomain = &context.subdomain;
  SetupHD(hd_, context.run, context.time, context.selection, meshes);
  mesh_ = meshes[static_cast<std::size_t>(hd_.number_of_2D_mesh_velocity - 1)];
  run_ = &context.run;
  dt_overall_ = context.time.dt;
  SetupSolverHD(hd_, *mesh_, solver_);
  SetupOutputsHD(outputs_, *mesh_, context.run, context.time);
}

void HdDriverModule::InitialStep(double t, int& /*run_status*/) {
  InitialiseStateHD(hd_, *mesh_);
  InitialStepHD(hd_, solver_, *mesh_);
  t_state_ = t;
}

void HdDriverModule::OpenOutputs() {
  OpenOutputFilesHD(outputs_, hd_, *mesh_);
  OpenSourceOutputHD(hd_);
}

void HdDriverModule::WriteOutput(int n) {
  // Step -1 writes the current state at the time it was reached.
  const double t = n >= 0 ? n * dt_overall_ : t_state_;
  WriteOutputHD2D(outputs_, hd_, *mesh_, n, t);
  WriteSourceOutputHD(hd_, n, t);
}

double HdDriverModule::TimeStep(double t, double t_end) {
  return CALCTIMESTEPHD(hd_, solver_, *mesh_, t, t_end);
}

void HdDriverModule::Step(const StepTimes& times, int& run_status) {
  // The driver hands the time reached at the end of the sub-step.
  StepHD(hd_, solver_, *mesh_, times.t - times.dt, times.dt, run_status);
  t_state_ = times.t;
  UpdateOutputsHD(outputs_, hd_, solver_, *mesh_, times.dt);
}

void HdDriverModule::CloseOutputs() { CloseOutputFilesHD(outputs_); }

void HdDriverModule::CloseInputs() {
  CloseBoundaryDataHD(hd_.boundary);
  ClosePrecipitationHD(hd_.precipitation);
  CloseForcingDataHD(hd_);
  CloseSourcesHD(hd_);
}

void HdDriverModule::OutputStatistics() { OutputStatisticsHD(outputs_, *run_); }

void HdDriverModule::PrintStatistics() {
  PrintTimeStepStatisticsHD(hd_);
  PrintVolumeBalanceHD(outputs_, hd_, *mesh_, *run_);
}

void HdDriverModule::PrintTimings() { vhd::PrintTimings(hd_.timing); }

double HdDriverModule::MeshSizeFigure() const {
  // Owned elements: the figure is summed over the processes.
  return mesh_ ? static_cast<double>(mesh_->elements.nelements_int) : 0.0;
}

}  // namespace vhd
