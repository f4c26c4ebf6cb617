#include "control/minimal_hd.hpp"

#include "io/setup.hpp"
#include "log/log.hpp"

namespace vhd {

void MinimalHdModule::Setup(const ModuleContext& context) {
  if (!context.domain.meshes.empty())
    nelements_ = context.domain.meshes.front().mesh.elements.nelements;
  WriteLogLine("");
  WriteLogLine("  Hydrodynamic module: minimal module (flow not computed)");
  if (SktSectionExists("HYDRODYNAMIC_MODULE"))
    Warning("Section HYDRODYNAMIC_MODULE is not read: this build has no flow solver");
}

}  // namespace vhd
