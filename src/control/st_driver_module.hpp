#pragma once
// The sand-transport module in the driver's ST slot: owns the module record
// and its outputs and works on the flow state of the hydrodynamic module,
// whose bed it moves.
//
// Output items (logical keys of PARAMETERS_2D in OUTPUTS/OUTPUT_i of
// SAND_TRANSPORT_MODULE, type 1 outputs only):
//   BED_LOAD_X "Bed load x", BED_LOAD_Y "Bed load y",
//   BED_LOAD_MAGNITUDE "Bed load magnitude"   (m2/s, volume of grains)
//   BED_LEVEL "Bed level"                     (m, negative below datum)
//   BED_LEVEL_CHANGE "Bed level change"       (m since the start)

#include "control/module.hpp"
#include "output/output_spec.hpp"
#include "sediment/st_module.hpp"

namespace vhd {

class HdDriverModule;

enum StOutputItemCode {
  kStBedLoadX = 1,
  kStBedLoadY,
  kStBedLoadMagnitude,
  kStBedLevel,
  kStBedLevelChange,
};

class StDriverModule final : public Module {
 public:
  void Setup(const ModuleContext& context) override;
  void InitialStep(double t, int& run_status) override;
  void OpenOutputs() override;
  void WriteOutput(int n) override;
  void Step(const StepTimes& times, int& run_status) override;
  void CloseOutputs() override;
  void PrintStatistics() override;
  void PrintTimings() override;

  const StModule& st() const { return st_; }

 private:
  StModule st_;
  OutputList outputs_;
  Array1<double> values_, nodes_;  // output work arrays
  HdModule* hd_ = nullptr;
  const Mesh* mesh_ = nullptr;
  const RunControl* run_ = nullptr;
  double dt_overall_ = 0.0;
  double t_state_ = 0.0;
};

}  // namespace vhd
