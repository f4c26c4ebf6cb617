#pragma once
// The time loop: the initial steps, the overall steps 1 .. N with their
// sub-steps, the outputs of every step, the progress reports with the host's
// stop request, and the closing of all outputs.
//
// Inside overall step n (from (n-1)*dt to n*dt) the hydrodynamic module
// chooses each sub-step; every active module advances over it in the order
// HD, TR, ST, MT, VT until the step is filled to within 1e-6 s; particle
// tracking then moves once over the whole step. A module that sets run_status
// negative ends the loop at once; every module then writes its current state
// (step -1) before the outputs are closed.

#include "control/module.hpp"
#include "core/run.hpp"
#include "log/log.hpp"

namespace vhd {

class ProgressChannel;

inline constexpr double kSubStepTolerance = 1e-6;  // s

// Timers of the Overall set.
inline constexpr int kTimerPre = 1, kTimerCalc = 2, kTimerPost = 3, kTimerTotal = 4;

// Sub-steps of overall step n: each module advances over every sub-step the
// hydrodynamic module chooses. Returns the number of sub-steps taken; stops
// early when run_status turns negative.
int RunSubSteps(ModuleSet& modules, int n, double dt, int& run_status);

// The loop and everything after it up to the module timings (timers 1 to 3 of
// overall). progress may be null (processes other than 0).
void RunTimeLoop(ModuleSet& modules, const TimeAxis& time, const ModuleSelection& selection,
                 RunControl& run, ProgressChannel* progress, TimingSet& overall);

}  // namespace vhd
