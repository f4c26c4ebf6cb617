#pragma once
// The particle-tracking module in the driver's PT slot: owns the PT record,
// reads the flow of the hydrodynamic module (found in CheckCoupling) and
// hands the driver's calls to the particle library.

#include "control/module.hpp"
#include "particles/pt_module.hpp"

namespace vhd {

class PtDriverModule final : public Module {
 public:
  explicit PtDriverModule(int mode) : mode_(mode) {}
  void Setup(const ModuleContext& context) override;
  bool CheckCoupling(const ModuleSet& modules) override;
  void InitialStep(double t, int& run_status) override;
  void OpenOutputs() override;
  void WriteOutput(int n) override;
  void Step(const StepTimes& times, int& run_status) override;
  void CloseOutputs() override;
  void CloseInputs() override;
  void PrintStatistics() override;
  void PrintTimings() override;

 private:
  int mode_ = 0;
  PtModule pt_;
  const HdState* hd_ = nullptr;
};

}  // namespace vhd
