#include <cctype>
#include <string>

#include "control/hd_driver_module.hpp"
#include "control/module.hpp"
#include "control/pt_driver_module.hpp"
#include "control/st_driver_module.hpp"
#include "control/tr_driver_module.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"

namespace vhd {

std::string_view ModuleKindName(ModuleKind kind) {
  static constexpr std::string_view kNames[kModuleKinds] = {"HD", "TR", "ST", "MT", "VT", "PT"};
  return kNames[static_cast<int>(kind)];
}

std::string_view ModuleModeKeyword(ModuleKind kind) {
  static constexpr std::string_view kKeys[kModuleKinds] = {
      "mode_of_hydrodynamic_module",   "mode_of_transport_module",
      "mode_of_sand_transport_module", "mode_of_mud_transport_module",
      "mode_of_vitrax_module",         "mode_of_particle_tracking_module"};
  return kKeys[static_cast<int>(kind)];
}

namespace {

std::string_view ModuleTitle(ModuleKind kind) {
  static constexpr std::string_view kTitles[kModuleKinds] = {"hydrodynamic",   "transport",
                                                             "sand transport", "mud transport",
                                                             "ecological",     "particle tracking"};
  return kTitles[static_cast<int>(kind)];
}

}  // namespace

int ModuleMode(const ModuleSelection& s, ModuleKind kind) {
  switch (kind) {
    case ModuleKind::HD:
      return s.hd;
    case ModuleKind::TR:
      return s.tr;
    case ModuleKind::ST:
      return s.st;
    case ModuleKind::MT:
      return s.mt;
    case ModuleKind::VT:
      return s.vt;
    case ModuleKind::PT:
      return s.pt;
  }
  return 0;
}

std::unique_ptr<Module> CreateModule(ModuleKind kind, int mode) {
  switch (kind) {
    case ModuleKind::HD:
      return std::make_unique<HdDriverModule>();
    case ModuleKind::ST:
      return std::make_unique<StDriverModule>();
    case ModuleKind::PT:
      return std::make_unique<PtDriverModule>(mode);
    case ModuleKind::TR:
      return std::make_unique<TrDriverModule>();
    default:
      return nullptr;
  }
}

std::string ModuleSectionName(ModuleKind kind) {
  std::string name(ModuleModeKeyword(kind).substr(std::string_view("mode_of_").size()));
  for (char& c : name) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  return name;
}

void SetupModules(ModuleSet& modules, const ModuleContext& run_context) {
  ModuleContext context = run_context;
  context.modules = &modules;
  for (const ModuleKind kind : kSetupOrder) {
    const int mode = ModuleMode(context.selection, kind);
    if (mode <= 0) {
      // The section of a module that is off is not read; its keywords are
      // not reported as unused.
      int status = 0;
      SktOpenSection(ModuleSectionName(kind), kNoIndex, &status, false);
      if (status == 0) {
        SktSkipSection();
        SktCloseSection();
      }
      continue;
    }
    std::unique_ptr<Module> module = CreateModule(kind, mode);
    if (!module)
      FatalError("MODULE_SELECTION: " + std::string(ModuleModeKeyword(kind)) + " = " +
                 std::to_string(mode) + ": the " + std::string(ModuleTitle(kind)) +
                 " module is not available in this build");
    module->Setup(context);
    modules.Set(kind, std::move(module));
  }
}

}  // namespace vhd
