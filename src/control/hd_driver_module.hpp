#pragma once
// The hydrodynamic module in the driver's HD slot: owns the module record,
// the solver tables and the mesh it computes on, and hands the driver's calls
// to the free functions of the hydrodynamic library.

#include "control/module.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"

namespace vhd {

class HdDriverModule final : public Module {
 public:
  void Setup(const ModuleContext& context) override;
  void InitialStep(double t, int& run_status) override;
  double TimeStep(double t, double t_end) override;
  void Step(const StepTimes& times, int& run_status) override;
  void PrintStatistics() override;
  void PrintTimings() override;
  double MeshSizeFigure() const override;

  const HdModule& hd() const { return hd_; }

 private:
  HdModule hd_;
  HdSolver solver_;
  const Mesh* mesh_ = nullptr;  // the velocity mesh of the domain
};

}  // namespace vhd
