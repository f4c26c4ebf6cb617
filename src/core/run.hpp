#pragma once
// Run-wide records that the driver fills at start-up and hands to every
// module: the process and thread layout, the simulation time axis, the module
// selection and the run status.

#include <array>
#include <string>
#include <vector>

namespace vhd {

// Run status passed by reference to every module step.
inline constexpr int kRunNormal = 0;
inline constexpr int kRunStopRequested = 1;  // the host asked to stop (kill file)
// Negative values: an error reported by a module routine.

struct RunControl {
  int process_id = -1;  // message-passing rank from 0; -1 for a single process
  int nprocesses = 1;
  int nmachines = 1;  // machines the processes run on
  int nthreads = 1;
  int run_status = kRunNormal;
  std::string setup_file;
  std::string log_file;
  std::string program_path;
  int delete_logfile = 1;
  int merge_data_default = 2;
  std::vector<int> gpu_devices;
};

// Simulation time axis: step n (0 .. N) lies at n*dt seconds after the start.
struct TimeAxis {
  std::array<int, 6> start{2004, 1, 1, 0, 0, 0};  // Y M D h m s
  double dt = 30.0;                               // time_step_interval (s)
  int first_step = 0;
  int last_step = 100;                            // number_of_time_steps
  double TimeOfStep(int n) const { return n * dt; }
  double EndTime() const { return last_step * dt; }
};

struct ModuleSelection {
  int hd = 2;       // mode_of_hydrodynamic_module
  int features = 1; // hydrodynamic_features
  int tr = 0;
  int mt = 0;
  int st = 0;
  int vt = 0;
  int pt = 0;
  int ndim = 2;     // run dimension from the domain setup
};

}  // namespace vhd
