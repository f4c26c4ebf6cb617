#pragma once
// The hydrodynamic slot of a build without the flow solver: it takes the
// whole overall step as one sub-step and computes nothing. The log says so,
// so that no one mistakes a run with it for a flow computation.

#include "control/module.hpp"

namespace vhd {

class MinimalHdModule final : public Module {
 public:
  void Setup(const ModuleContext& context) override;
  void Step(const StepTimes& /*times*/, int& /*run_status*/) override {}
  double MeshSizeFigure() const override { return nelements_; }

 private:
  double nelements_ = 0.0;  // elements of the hydrodynamic (first) mesh
};

}  // namespace vhd
