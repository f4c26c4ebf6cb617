#include "control/pt_driver_module.hpp"

#include <vector>

#include "control/hd_driver_module.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"

namespace vhd {

void PtDriverModule::Setup(const ModuleContext& context) {
  std::vector<const Mesh*> meshes;
  for (const DomainMesh& dm : context.domain.meshes) meshes.push_back(&dm.mesh);
  SetupPT(pt_, mode_, context.run, context.time, meshes);
}

bool PtDriverModule::CheckCoupling(const ModuleSet& modules) {
  const auto* hd = dynamic_cast<const HdDriverModule*>(modules.Get(ModuleKind::HD));
  if (!hd) FatalError("SetupPT: particle tracking needs the hydrodynamic module (mode_of_hydrodynamic_module)");
  if (hd->hd().number_of_2D_mesh_velocity != pt_.mesh_number)
    FatalError("SetupPT: the particles move on mesh " + std::to_string(pt_.mesh_number) +
               " but the hydrodynamic module computes on mesh " +
               std::to_string(hd->hd().number_of_2D_mesh_velocity) + " (number_of_2D_mesh_velocity)");
  hd_ = &hd->hd().state;
  return true;
}

void PtDriverModule::InitialStep(double /*t*/, int& /*run_status*/) { UpdateInitStepPT(pt_, *hd_); }

void PtDriverModule::OpenOutputs() { OpenOutputsPT(pt_); }

void PtDriverModule::WriteOutput(int n) { WriteOutputsPT(pt_, n); }

void PtDriverModule::Step(const StepTimes& times, int& /*run_status*/) { StepPT(pt_, *hd_, times.n); }

void PtDriverModule::CloseOutputs() { CloseOutputsPT(pt_); }

void PtDriverModule::CloseInputs() {
  if (pt_.wind) FemDataClose(pt_.wind_spec);
}

void PtDriverModule::PrintStatistics() { PrintStatisticsPT(pt_); }

void PtDriverModule::PrintTimings() { vhd::PrintTimings(pt_.timing); }

}  // namespace vhd
