#pragma once
// Start-up settings of the run: the SYSTEM, TIME and MODULE_SELECTION
// sections of the target, the domain, and the thread count.

#include "core/run.hpp"
#include "mesh/domain.hpp"
#include "parallel/subdomain.hpp"

namespace vhd {

// Process-wide figures queried once at start-up, before any thread count is
// set (setting one changes what OpenMP reports as its maximum afterwards).
struct ComputeResources {
  int max_threads = 1;
  int nprocessors = 1;
};
ComputeResources QueryComputeResources();

// The thread count for a request (-1: all available): the smaller of the
// request, the number of processors and the maximum thread count; at least 1.
int ThreadCountFor(int request, const ComputeResources& resources);
// Applies ThreadCountFor to OpenMP and stores the count in run.
void SetThreadCount(int request, const ComputeResources& resources, RunControl& run);

inline constexpr int kMaxIOHandlesDefault = 2048;
// Section SYSTEM (optional): the number of files that may be open at once.
void ReadSystemSection();
// Section TIME on process 0 (or the single process), sent to the others.
void ReadTimeSection(TimeAxis& time, const RunControl& run);
// Section MODULE_SELECTION.
void ReadModuleSelection(ModuleSelection& selection);
// The domain and its meshes (section DOMAIN); sets the run dimension.
// Reads the domain and its meshes; with several processes, splits the 2D
// mesh over them (parallel/subdomain.hpp) into sub.
void SetupDomain(const RunControl& run, Domain& domain, ModuleSelection& selection, Subdomain& sub);

}  // namespace vhd
