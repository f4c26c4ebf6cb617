#pragma once
// The interface through which every module plugs into the run.
//
// The driver knows six module slots (hydrodynamics HD, transport TR, sand
// transport ST, mud transport MT, ecology VT, particle tracking PT) and calls
// the modules that are active in fixed orders; a module only fills in the
// operations below. The calls come from the main thread, outside parallel
// regions, once per run, per step or per sub-step, never per element: one
// virtual call each is of no cost.
//
// Adding a module: derive from Module, and let CreateModule (modules.cpp)
// return it for its slot. Nothing in the time loop changes.

#include <array>
#include <memory>
#include <string>
#include <string_view>

#include "core/run.hpp"
#include "mesh/domain.hpp"
#include "parallel/subdomain.hpp"

namespace vhd {

enum class ModuleKind { HD, TR, ST, MT, VT, PT };
inline constexpr int kModuleKinds = 6;

// Name of a slot ("HD", "TR", ...), the keyword of its mode and the name of
// its setup section ("mode_of_transport_module" -> "TRANSPORT_MODULE").
std::string_view ModuleKindName(ModuleKind kind);
std::string_view ModuleModeKeyword(ModuleKind kind);
std::string ModuleSectionName(ModuleKind kind);
// Mode of a slot in the module selection.
int ModuleMode(const ModuleSelection& selection, ModuleKind kind);

// One sub-step (or, for particle tracking, one whole step) of the loop.
struct StepTimes {
  int n = 0;           // overall step being computed
  double t = 0.0;      // time reached at the end of this (sub-)step, s since the start
  double dt = 0.0;     // length of this (sub-)step, s
  double t_end = 0.0;  // end of the overall step n, s since the start
};

class ModuleSet;

// What the driver hands every module at setup.
struct ModuleContext {
  RunControl& run;
  const TimeAxis& time;
  const ModuleSelection& selection;
  Domain& domain;  // the meshes of this process
  Subdomain& subdomain;  // this process's part of the 2D mesh
  // The modules set up before this one (set by SetupModules).
  const ModuleSet* modules = nullptr;
};

class Module {
 public:
  virtual ~Module() = default;

  // Reads the module's sections and allocates its state.
  virtual void Setup(const ModuleContext& context) = 0;
  // Step on which the module starts (its own TIME section); the initial step
  // is taken when it equals the run's first step.
  virtual int StartStep() const { return 0; }
  // Before the initial step: checks the coupling with the other active
  // modules; false switches this module off for the rest of the run.
  virtual bool CheckCoupling(const ModuleSet& /*modules*/) { return true; }
  // Brings the module to the start time t.
  virtual void InitialStep(double /*t*/, int& /*run_status*/) {}
  virtual void OpenOutputs() {}
  // Writes the outputs due at step n; n = -1 writes the current state now.
  virtual void WriteOutput(int /*n*/) {}
  // The sub-step from t towards t_end (hydrodynamics chooses the sub-steps of
  // all modules; 0 < result <= t_end - t).
  virtual double TimeStep(double t, double t_end) { return t_end - t; }
  // Advances the module over one (sub-)step; may set run_status negative.
  virtual void Step(const StepTimes& times, int& run_status) = 0;
  // When the host stopped the run after step n: closing records of outputs
  // that would have gone on past n.
  virtual void FinishOutputs(int /*n*/) {}
  virtual void CloseOutputs() {}
  // Closes the module's input data files (each logs its "Data File Summary").
  virtual void CloseInputs() {}
  // With several processes, after the outputs are closed.
  virtual void OutputStatistics() {}
  virtual void PrintStatistics() {}
  virtual void PrintTimings() {}
  // Size figure of the module's mesh on this process (hydrodynamics: its
  // element count); scales the computation speed reported to the host.
  virtual double MeshSizeFigure() const { return 0.0; }
};

// The active modules, one slot per kind.
class ModuleSet {
 public:
  Module* Get(ModuleKind kind) const { return slots_[static_cast<int>(kind)].get(); }
  bool IsActive(ModuleKind kind) const { return Get(kind) != nullptr; }
  void Set(ModuleKind kind, std::unique_ptr<Module> module) {
    slots_[static_cast<int>(kind)] = std::move(module);
  }
  void Remove(ModuleKind kind) { slots_[static_cast<int>(kind)].reset(); }

 private:
  std::array<std::unique_ptr<Module>, kModuleKinds> slots_;
};

// Orders in which the driver calls the modules.
inline constexpr std::array<ModuleKind, 6> kSetupOrder = {
    ModuleKind::HD, ModuleKind::TR, ModuleKind::MT, ModuleKind::ST, ModuleKind::VT, ModuleKind::PT};
inline constexpr std::array<ModuleKind, 6> kInitialOrder = {
    ModuleKind::HD, ModuleKind::TR, ModuleKind::ST, ModuleKind::MT, ModuleKind::VT, ModuleKind::PT};
inline constexpr std::array<ModuleKind, 5> kSubStepOrder = {
    ModuleKind::HD, ModuleKind::TR, ModuleKind::ST, ModuleKind::MT, ModuleKind::VT};
inline constexpr std::array<ModuleKind, 6> kOutputOrder = kInitialOrder;
inline constexpr std::array<ModuleKind, 6> kReportOrder = kSetupOrder;

// The module built for a slot and mode; nullptr when this build has none.
std::unique_ptr<Module> CreateModule(ModuleKind kind, int mode);

// Creates and sets up the active modules in setup order. A selected module
// that this build does not have is a fatal error naming its keyword. The
// section of a module that is off is skipped: its keywords are not reported
// as unused.
void SetupModules(ModuleSet& modules, const ModuleContext& context);

}  // namespace vhd
