#pragma once
// The transport module in the driver's TR slot: owns the module record and
// its outputs, reads the flow of the HD module (set up before it) and hands
// the driver's calls to the transport and output libraries.

#include "control/hd_driver_module.hpp"
#include "control/module.hpp"
#include "output/tr_output.hpp"
#include "transport/tr_module.hpp"

namespace vhd {

class TrDriverModule final : public Module {
 public:
  void Setup(const ModuleContext& context) override;
  int StartStep() const override { return tr_.start_time_step; }
  void InitialStep(double t, int& run_status) override;
  void OpenOutputs() override;
  void WriteOutput(int n) override;
  void Step(const StepTimes& times, int& run_status) override;
  void CloseOutputs() override;
  void CloseInputs() override;
  void OutputStatistics() override;
  void PrintStatistics() override;
  void PrintTimings() override;

  const TrModule& tr() const { return tr_; }

 private:
  void Start();

  TrModule tr_;
  TrOutputs outputs_;
  const HdDriverModule* hd_ = nullptr;
  const RunControl* run_ = nullptr;
  double dt_overall_ = 0.0;
  double t_state_ = 0.0;  // time of the current state (s since the start)
};

}  // namespace vhd
