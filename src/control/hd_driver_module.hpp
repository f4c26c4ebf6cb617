#pragma once
// The hydrodynamic module in the driver's HD slot: owns the module record,
// the solver tables and the outputs, knows the mesh it computes on, and hands
// the driver's calls to the free functions of the hydrodynamic and output
// libraries.

#include "control/module.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "output/hd_output.hpp"

namespace vhd {

class HdDriverModule final : public Module {
 public:
  void Setup(const ModuleContext& context) override;
  void InitialStep(double t, int& run_status) override;
  void OpenOutputs() override;
  void WriteOutput(int n) override;
  double TimeStep(double t, double t_end) override;
  void Step(const StepTimes& times, int& run_status) override;
  void CloseOutputs() override;
  void CloseInputs() override;
  void OutputStatistics() override;
  void PrintStatistics() override;
  void PrintTimings() override;
  double MeshSizeFigure() const override;

  const HdModule& hd() const { return hd_; }
  // For a module that changes the flow state between HD steps (the sand
  // transport moves the bed), and the mesh the state lives on.
  HdModule& mutable_hd() { return hd_; }
  const HdSolver& solver() const { return solver_; }
  const Mesh& mesh() const { return *mesh_; }

 private:
  HdModule hd_;
  HdSolver solver_;
  HdOutputs outputs_;
  const Mesh* mesh_ = nullptr;        // the velocity mesh of the domain
  const RunControl* run_ = nullptr;
  double dt_overall_ = 0.0;
  double t_state_ = 0.0;              // time of the current state (s since the start)
};

}  // namespace vhd
